/*
 * vamrnb — AMR narrowband speech codec.
 *
 * Public interface: library lifecycle, decoder and encoder instances, the
 * buffer descriptors they exchange with the caller, and the status codes.
 * Every function has C linkage; nothing here throws.  The header compiles as
 * C11 and as C++17 on its own.
 */
#ifndef VAMRNB_H
#define VAMRNB_H

#include <stddef.h>
#include <stdint.h>

#if defined(_WIN32) && !defined(VAMRNB_STATIC)
#  define VAMRNB_API __declspec(dllimport)
#elif defined(__GNUC__)
#  define VAMRNB_API __attribute__((visibility("default")))
#else
#  define VAMRNB_API
#endif

#ifdef __cplusplus
extern "C" {
#endif

#define VAMRNB_VERSION_MAJOR 0
#define VAMRNB_VERSION_MINOR 1
#define VAMRNB_VERSION_PATCH 0

/* ---- status codes ------------------------------------------------------ */
enum {
    AMRNB_OK                 = 0,
    AMRNB_ERR_NO_MEMORY      = -2, /* create: instance or working record could not be allocated */
    AMRNB_ERR_UNSUPPORTED    = -3, /* reserved config word set, encoder mode not 0..7, or output format refused */
    AMRNB_ERR_BAD_FRAME_TYPE = -5, /* frame type 10, 11 (or above 15): nothing decoded */
    AMRNB_ERR_BAD_LAYOUT     = -8  /* output stage: channel setting not 0, 1 or 2 */
};

/* ---- codec modes (value = frame type of the speech frame) -------------- */
enum vamrnb_mode {
    MR475 = 0, MR515 = 1, MR59 = 2, MR67 = 3,
    MR74 = 4, MR795 = 5, MR102 = 6, MR122 = 7,
    MRDTX = 8
};

/* ---- encoder transmit frame types --------------------------------------- */
enum vamrnb_tx_type {
    TX_SPEECH_GOOD = 0, TX_SID_FIRST = 1, TX_SID_UPDATE = 2, TX_NO_DATA = 3
};

/* ---- decoder reception frame types -------------------------------------- */
enum vamrnb_rx_type {
    RX_SPEECH_GOOD = 0, RX_SPEECH_DEGRADED = 1, RX_ONSET = 2, RX_SPEECH_BAD = 3,
    RX_SID_FIRST = 4, RX_SID_UPDATE = 5, RX_SID_BAD = 6, RX_NO_DATA = 7
};

/* ---- records exchanged with the caller ----------------------------------
 * On a 32-bit target every field is one 32-bit word; the word numbers in the
 * comments are the positions callers rely on. */

/* Configuration, four words copied at creation. */
typedef union codec_config {
    int32_t word[4];
    struct { int32_t reserved, layout, channels, sample_format; } dec;
    struct { int32_t dtx, reserved, vad_option, mode; } enc;
} codec_config;

/* One frame of compressed data. */
typedef struct bitstream_buffer {
    uint8_t  *data;            /* word 0 */
    uintptr_t reserved;        /* word 1, not read */
    uint32_t  size;            /* word 2: bytes available (decoder) / room (encoder) */
} bitstream_buffer;

/* PCM buffers: [0] interleaved buffer, [1], [2] per-channel buffers. */
typedef struct pcm_buffer {
    uint32_t samples[8];       /* words 0-7 */
    uint32_t bytes[8];         /* words 8-15 */
    void    *data[16];         /* words 16-31 */
    uint32_t channels;         /* word 32 */
    uint32_t bits_per_sample;  /* word 33 */
    uint32_t reserved;         /* word 34 */
    uint32_t layout;           /* word 35 */
} pcm_buffer;

/* Result of one decode or encode call. */
typedef struct frame_info {
    uint32_t produced;         /* word 0 */
    uint32_t bytes;            /* word 1 */
    uint32_t frame_count;      /* word 2, initialised by the caller */
    union { uint32_t channels; uint32_t frame_type; };  /* word 3: decoder / encoder */
    uint32_t bits_per_sample;  /* word 4 */
} frame_info;

/* Opaque instances. */
typedef struct vamrnb_decoder vamrnb_decoder;
typedef struct vamrnb_encoder vamrnb_encoder;

/* ---- library lifecycle --------------------------------------------------- */
VAMRNB_API extern int32_t vamrnb_inited;
VAMRNB_API int32_t vamrnb_platform_init(int32_t *out);
VAMRNB_API int32_t vamrnb_platform_deinit(int32_t value);
VAMRNB_API int32_t vamrnb_init(void);
VAMRNB_API void    vamrnb_deinit(void);

/* ---- decoder ------------------------------------------------------------- */
VAMRNB_API vamrnb_decoder *vamrnbd_create(const codec_config *config, int32_t *error);
VAMRNB_API void    vamrnbd_reset(vamrnb_decoder *dec);
VAMRNB_API int32_t vamrnbd_decode(vamrnb_decoder *dec, const bitstream_buffer *in,
                                  pcm_buffer *out, frame_info *info);
VAMRNB_API void    vamrnbd_delete(vamrnb_decoder *dec);

/* ---- encoder ------------------------------------------------------------- */
VAMRNB_API vamrnb_encoder *vamrnbe_create(const codec_config *config, int32_t *error);
VAMRNB_API int32_t vamrnbe_encode(vamrnb_encoder *enc, const pcm_buffer *in,
                                  bitstream_buffer *out, frame_info *info);
/* Requested mode for the frames encoded from the next call on (0..7). */
VAMRNB_API int32_t vamrnbe_set_mode(vamrnb_encoder *enc, int32_t mode);
VAMRNB_API void    vamrnbe_delete(vamrnb_encoder *enc);

/* ---- processor features ------------------------------------------------
 * The signal-processing kernels pick vector code for the features the
 * processor has.  vamrnb_set_cpu_flags restricts them to the features in mask
 * (0: portable scalar code only; the default allows all) and returns the
 * previous mask.  Every choice gives the same output bits. */
#define VAMRNB_CPU_SSE41 0x1u
#define VAMRNB_CPU_AVX2  0x2u
#define VAMRNB_CPU_NEON  0x4u
VAMRNB_API uint32_t vamrnb_set_cpu_flags(uint32_t mask);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_H */
