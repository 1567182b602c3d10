/**
 * @file vamrnb.h
 * @brief vamrnb, an AMR narrowband (AMR-NB) speech codec: the caller's interface.
 *
 * Library lifecycle, decoder and encoder instances, the records they exchange
 * with the caller and the status codes.  Every function has C linkage and
 * nothing here throws; the header compiles as C11 and as C++17 on its own.
 *
 * @par Frames
 * Both directions work on one 20 ms frame per call: 160 samples of 8 kHz
 * linear PCM on the audio side, and one frame of the octet-aligned storage
 * format (RFC 4867 section 5, without the "#!AMR\n" file header) on the
 * compressed side: a table-of-contents byte followed by the frame's bits,
 * 1 to #VAMRNB_MAX_FRAME_BYTES bytes in all.  The size of a frame follows
 * from its table-of-contents byte: frame type `(toc >> 3) & 15` indexes
 * vamrnb_tbl_packed_size (vamrnb_tables.h).
 *
 * @par Typical use
 * Create one instance per stream with vamrnbd_create() or vamrnbe_create(),
 * call vamrnbd_decode() or vamrnbe_encode() once per frame, and release the
 * instance with vamrnbd_delete() or vamrnbe_delete().  vamrnb_init() and
 * vamrnb_platform_init() are optional: instances work without them.
 *
 * @par Threads
 * The library starts no threads and takes no locks.  Instances share no
 * mutable data: different instances may be used on different threads at the
 * same time, but one instance must be used by one thread at a time.  Two
 * settings are process-wide and written without synchronisation of their
 * own: the #vamrnb_inited flag (vamrnb_init(), vamrnb_deinit()) and the
 * processor-feature mask (vamrnb_set_cpu_flags()); change them while no
 * instance is working.
 *
 * @par Null pointers
 * Pointer arguments must not be null unless the function's documentation
 * says otherwise: the error-out pointer of the create functions and the
 * arguments of vamrnb_platform_init(), vamrnbd_delete(), vamrnbe_delete()
 * and vcmn_mfree_align32() may be null, and the functions of
 * vamrnb_stream.h answer a null pointer with a status of their own.
 * A build with debug checks (CMake option VAMRNB_DEBUG_CHECKS, or any build
 * without NDEBUG) stops with a message naming the function and the argument
 * when a forbidden null pointer arrives; an ordinary release build does not
 * test them.
 *
 * @par Printed text
 * The library prints one kind of message only, to standard output, and
 * carries on: the fixed-point division vamrnb_div_s() (vamrnb_dsp.h), when
 * given a negative argument or a dividend larger than the divisor, prints
 * "Division Error var1=<num>  var2=<den>", and for a zero divisor also
 * "Division by 0, Fatal error ".  The codec itself only divides like that
 * when the encoder runs with DTX on and a vad_option other than 0 or 1
 * (codec_config::enc): detector option 1 then starts from all-zero levels,
 * and its divisions print these lines.  Use 0 or 1.
 */
#ifndef VAMRNB_H
#define VAMRNB_H

#include <stddef.h>
#include <stdint.h>

/** @cond VAMRNB_INTERNAL */
#if defined(_WIN32) && !defined(VAMRNB_STATIC)
#  define VAMRNB_API __declspec(dllimport)
#elif defined(__GNUC__)
#  define VAMRNB_API __attribute__((visibility("default")))
#else
#  define VAMRNB_API
#endif
/** @endcond */

#ifdef __cplusplus
extern "C" {
#endif

/** Major version of this header and library. */
#define VAMRNB_VERSION_MAJOR 0
/** Minor version of this header and library. */
#define VAMRNB_VERSION_MINOR 1
/** Patch level of this header and library. */
#define VAMRNB_VERSION_PATCH 0

/** Samples in one frame (20 ms at 8 kHz), per channel. */
#define VAMRNB_FRAME_SAMPLES 160
/** Largest storage-format frame in bytes (an MR122 speech frame); an encoder
 *  output buffer of this size always holds a whole frame. */
#define VAMRNB_MAX_FRAME_BYTES 32

/* ---- status codes ------------------------------------------------------ */
/** Status codes.  Success is 0, every failure is negative; no other negative
 *  values leave the library. */
enum {
    AMRNB_OK                 = 0,  /**< Success. */
    AMRNB_ERR_NO_MEMORY      = -2, /**< A create function could not allocate its memory. */
    AMRNB_ERR_UNSUPPORTED    = -3, /**< A create function was given a non-zero reserved
                                        configuration word or (encoder) a mode outside
                                        0..7; or vamrnbd_decode() was asked for a sample
                                        format or channel setting it does not support. */
    AMRNB_ERR_BAD_FRAME_TYPE = -5, /**< vamrnbd_decode(): the frame's type is 10 or 11;
                                        nothing was decoded and no output produced. */
    AMRNB_ERR_BAD_LAYOUT     = -8  /**< vamrnbd_decode(): the output stage met a channel
                                        setting other than 0, 1 or 2 while writing.  The
                                        same setting is refused first with
                                        #AMRNB_ERR_UNSUPPORTED, so callers do not see this
                                        value in practice; it is reserved. */
};

/* ---- codec modes (value = frame type of the speech frame) -------------- */
/** Codec modes.  The value is also the storage-format frame type of the
 *  mode's speech frames and the row of the per-mode tables. */
enum vamrnb_mode {
    MR475 = 0, /**< 4.75 kbit/s, 95 bits, 13-byte frames. */
    MR515 = 1, /**< 5.15 kbit/s, 103 bits, 14-byte frames. */
    MR59 = 2,  /**< 5.90 kbit/s, 118 bits, 16-byte frames. */
    MR67 = 3,  /**< 6.70 kbit/s, 134 bits, 18-byte frames. */
    MR74 = 4,  /**< 7.40 kbit/s, 148 bits, 20-byte frames. */
    MR795 = 5, /**< 7.95 kbit/s, 159 bits, 21-byte frames. */
    MR102 = 6, /**< 10.2 kbit/s, 204 bits, 27-byte frames. */
    MR122 = 7, /**< 12.2 kbit/s, 244 bits, 32-byte frames. */
    MRDTX = 8  /**< Comfort-noise parameters (SID frame, frame type 8, 6 bytes). */
};

/* ---- encoder transmit frame types --------------------------------------- */
/** Frame types the encoder transmits under DTX (vamrnbe_encode() reports the
 *  storage-format frame type instead: the mode, 8 for SID, 15 for no data). */
enum vamrnb_tx_type {
    TX_SPEECH_GOOD = 0, /**< Speech frame. */
    TX_SID_FIRST = 1,   /**< First SID frame after speech (STI bit 0). */
    TX_SID_UPDATE = 2,  /**< Periodic SID update (STI bit 1). */
    TX_NO_DATA = 3      /**< Nothing to send: a no-data frame (frame type 15). */
};

/* ---- decoder reception frame types -------------------------------------- */
/** Classification of a received frame inside the decoder.  A caller selects
 *  them through the table-of-contents byte it passes: Q = 1 speech gives
 *  RX_SPEECH_GOOD, Q = 0 speech RX_SPEECH_BAD, a SID frame RX_SID_FIRST,
 *  RX_SID_UPDATE or (Q = 0) RX_SID_BAD, frame types 9 and 12 to 15
 *  RX_NO_DATA. */
enum vamrnb_rx_type {
    RX_SPEECH_GOOD = 0,     /**< Speech frame received intact. */
    RX_SPEECH_DEGRADED = 1, /**< Speech frame with errors in less sensitive bits (not produced
                                 from the storage format). */
    RX_ONSET = 2,           /**< Speech onset announcement (not produced from the storage
                                 format). */
    RX_SPEECH_BAD = 3,      /**< Speech frame marked bad (Q = 0): concealed. */
    RX_SID_FIRST = 4,       /**< First SID frame of a silence period. */
    RX_SID_UPDATE = 5,      /**< SID update. */
    RX_SID_BAD = 6,         /**< SID frame marked bad (Q = 0). */
    RX_NO_DATA = 7          /**< Nothing received, or a frame lost: concealment or comfort
                                 noise continues. */
};

/* ---- records exchanged with the caller ----------------------------------
 * On a 32-bit target every field is one 32-bit word; the word numbers in the
 * comments are the positions callers rely on. */

/** Configuration, four 32-bit words given to a create function and copied
 *  into the instance; the caller's record is not read again.  The decoder
 *  reads the words as @c dec, the encoder as @c enc. */
typedef union codec_config {
    int32_t word[4]; /**< The four words by position. */
    /** Decoder configuration (vamrnbd_create()). */
    struct {
        int32_t reserved;      /**< Word 0: must be 0; any other value makes vamrnbd_create()
                                    fail with #AMRNB_ERR_UNSUPPORTED. */
        int32_t layout;        /**< Word 1: 1 = all channels interleaved in pcm_buffer::data[0];
                                    any other value = one buffer per channel, data[1] and
                                    data[2]. */
        int32_t channels;      /**< Word 2: 1 = one channel; 2 = two channels carrying the same
                                    signal; 0 = one channel, accepted with sample format 0 only.
                                    Other values make vamrnbd_decode() return
                                    #AMRNB_ERR_UNSUPPORTED. */
        int32_t sample_format; /**< Word 3: 0 = signed 16-bit samples (int16_t, the machine's
                                    byte order); 1 = signed 8-bit, each sample
                                    (s + 128) >> 8 saturated to -128..127; 2 = 16-bit as 0
                                    (saturated to 16 bits, which changes nothing); 3 = 24-bit
                                    samples s << 8 packed in three bytes, least significant
                                    first (0x00, low byte, high byte).  Other values make
                                    vamrnbd_decode() return #AMRNB_ERR_UNSUPPORTED. */
    } dec;
    /** Encoder configuration (vamrnbe_create()). */
    struct {
        int32_t dtx;           /**< Word 0: exactly 1 switches voice activity detection and
                                    discontinuous transmission (SID and no-data frames) on; any
                                    other value switches both off. */
        int32_t reserved;      /**< Word 1: must be 0; any other value makes vamrnbe_create()
                                    fail with #AMRNB_ERR_UNSUPPORTED. */
        int32_t vad_option;    /**< Word 2, read only with DTX on: 0 = voice activity detector
                                    option 1 (sub-band levels); exactly 1 = option 2 (spectral);
                                    any other value runs option 1 from an all-zero start. */
        int32_t mode;          /**< Word 3: codec mode, 0..7 (#MR475 .. #MR122); other values
                                    make vamrnbe_create() fail with #AMRNB_ERR_UNSUPPORTED.
                                    Change it later with vamrnbe_set_mode(). */
    } enc;
} codec_config;

/** One frame of compressed data in the storage format. */
typedef struct bitstream_buffer {
    uint8_t  *data;            /**< Word 0, set by the caller: first byte of the frame (decoder
                                    input) or of the room for it (encoder output).  Must not be
                                    null. */
    uintptr_t reserved;        /**< Word 1: not read. */
    uint32_t  size;            /**< Word 2, set by the caller: bytes readable at @c data
                                    (decoder) or writable there (encoder). */
} bitstream_buffer;

/** PCM buffers.  Index 0 of the arrays is the interleaved buffer, indices
 *  1 and 2 the first and second channel's own buffers; the other entries are
 *  not used.  The caller sets the buffer addresses; vamrnbd_decode() fills
 *  the counts and the format fields, vamrnbe_encode() reads data[0] only. */
typedef struct pcm_buffer {
    uint32_t samples[8];       /**< Words 0-7, set by the decoder: samples written, per buffer
                                    (interleaved: channels x 160; per channel: 160). */
    uint32_t bytes[8];         /**< Words 8-15, set by the decoder: bytes written, per buffer. */
    void    *data[16];         /**< Words 16-31, set by the caller: buffer addresses.  Decoder,
                                    interleaved layout: data[0], room for
                                    channels x 160 x bits_per_sample / 8 bytes (at most 960);
                                    one buffer per channel: data[1] and, with two channels,
                                    data[2], each room for 160 x bits_per_sample / 8 bytes.
                                    The decoder cannot see how large the buffers are: they
                                    must have that room.  Encoder: data[0], 160 int16_t
                                    samples, of which only the 13 most significant bits
                                    count. */
    uint32_t channels;         /**< Word 32, set by the decoder: channels written, 1 or 2. */
    uint32_t bits_per_sample;  /**< Word 33, set by the decoder: 16, 8 or 24. */
    uint32_t reserved;         /**< Word 34: not used. */
    uint32_t layout;           /**< Word 35, set by the decoder: a copy of the configured
                                    layout word (1 = interleaved). */
} pcm_buffer;

/** Result of one decode or encode call. */
typedef struct frame_info {
    uint32_t produced;         /**< Word 0: 1 when a frame was produced; the decoder sets 0
                                    when it refuses a frame type. */
    uint32_t bytes;            /**< Word 1: storage-format bytes the decoder consumed, or the
                                    encoder wrote. */
    uint32_t frame_count;      /**< Word 2: frame counter; the caller initialises it (usually
                                    to 0) and every successful call adds 1. */
    /** Word 3: meaning depends on the direction. */
    union {
        uint32_t channels;     /**< Decoder: channels written, 1 or 2. */
        uint32_t frame_type;   /**< Encoder: frame type written, 0..7 (the mode of a speech
                                    frame), 8 (SID) or 15 (no data). */
    };
    uint32_t bits_per_sample;  /**< Word 4: decoder: bits per output sample, 16, 8 or 24;
                                    not written by the encoder. */
} frame_info;

/** A decoder instance (opaque). */
typedef struct vamrnb_decoder vamrnb_decoder;
/** An encoder instance (opaque). */
typedef struct vamrnb_encoder vamrnb_encoder;

/* ---- library lifecycle --------------------------------------------------- */
/** Initialisation flag: 0 at load time, 1 after vamrnb_init(), 0 again after
 *  vamrnb_deinit().  Nothing in the codec reads it. */
VAMRNB_API extern int32_t vamrnb_inited;

/**
 * Platform hook for hosts that call one at start-up; does nothing else.
 * @param out where to store 0; may be null, then nothing is stored.
 * @return 0.
 */
VAMRNB_API int32_t vamrnb_platform_init(int32_t *out);

/**
 * Platform hook for hosts that call one at shut-down; does nothing.
 * @param value any value.
 * @return @p value unchanged.
 */
VAMRNB_API int32_t vamrnb_platform_deinit(int32_t value);

/**
 * Sets #vamrnb_inited to 1.  Optional, harmless when repeated; allocates
 * nothing.  Call it from one thread while no instance is working.
 * @return 0.
 */
VAMRNB_API int32_t vamrnb_init(void);

/** Sets #vamrnb_inited back to 0.  Optional; frees nothing (instances stay
 *  usable until deleted). */
VAMRNB_API void    vamrnb_deinit(void);

/* ---- decoder ------------------------------------------------------------- */
/**
 * Creates a decoder instance in its initial (homed) state.
 * @param config the output configuration (codec_config::dec), copied; must
 *               not be null.
 * @param error  receives #AMRNB_OK, #AMRNB_ERR_NO_MEMORY (allocation failed)
 *               or #AMRNB_ERR_UNSUPPORTED (reserved word not 0); may be null.
 * @return the instance, or null on failure.  Release it with vamrnbd_delete().
 *         The sample format and channel setting are checked by
 *         vamrnbd_decode(), not here.
 */
VAMRNB_API vamrnb_decoder *vamrnbd_create(const codec_config *config, int32_t *error);

/**
 * Returns a decoder to its initial state (as after creation, without
 * reallocating), for instance before an unrelated stream.  The configuration
 * is kept.
 * @param dec the decoder; must not be null.
 */
VAMRNB_API void    vamrnbd_reset(vamrnb_decoder *dec);

/**
 * Decodes one storage-format frame into one frame of 160 samples per channel.
 *
 * The frame type comes from the table-of-contents byte: 0 to 7 speech
 * (Q bit 0 marks it bad and it is concealed), 8 SID (comfort noise), 9 and
 * 12 to 15 no data (the decoder conceals a lost frame or continues comfort
 * noise, and still produces 160 samples), 10 and 11 refused.  Pass a lost
 * frame as the single byte 0x7C (frame type 15).  A decoder homing frame
 * resets the decoder after its output; one that follows creation or another
 * homing frame is answered with the homing pattern (every 16-bit sample
 * 0x0008) instead of being decoded.
 *
 * @param dec  the decoder; must not be null.
 * @param in   the frame: in->data points at its table-of-contents byte,
 *             in->size bytes are readable (more than one frame is fine:
 *             only the first is read, and info->bytes says how far to
 *             advance).  A frame shorter than its type's size is decoded
 *             with the missing bits taken as 1 (info->bytes then counts
 *             the bytes that were there).  Must not be null, nor
 *             in->data.
 * @param out  the output buffers (see pcm_buffer::data for the room each
 *             needs); the decoder fills in the counts, channels, bits per
 *             sample and layout.  Must not be null, nor the buffer
 *             addresses the configured layout uses.
 * @param info the result (see frame_info); the caller initialises
 *             frame_count once.  Must not be null.
 * @return #AMRNB_OK; #AMRNB_ERR_BAD_FRAME_TYPE for frame types 10 and 11
 *         (info->produced = 0, nothing else changes);
 *         #AMRNB_ERR_UNSUPPORTED for a sample format above 3, a channel
 *         setting other than 0, 1 or 2, or channel setting 0 with a format
 *         other than 0; the frame has then been decoded and the decoder's
 *         state advanced, but no samples are written and @p info is left
 *         alone; #AMRNB_ERR_BAD_LAYOUT is reserved (see its description).
 */
VAMRNB_API int32_t vamrnbd_decode(vamrnb_decoder *dec, const bitstream_buffer *in,
                                  pcm_buffer *out, frame_info *info);

/**
 * Releases a decoder instance and everything it owns.
 * @param dec the decoder; may be null (nothing happens).
 */
VAMRNB_API void    vamrnbd_delete(vamrnb_decoder *dec);

/* ---- encoder ------------------------------------------------------------- */
/**
 * Creates an encoder instance.
 * @param config the configuration (codec_config::enc: DTX, voice activity
 *               detector, mode), copied; must not be null.
 * @param error  receives #AMRNB_OK, #AMRNB_ERR_NO_MEMORY (an allocation
 *               failed) or #AMRNB_ERR_UNSUPPORTED (reserved word not 0, or
 *               mode outside 0..7); may be null.
 * @return the instance, or null on failure.  Release it with vamrnbe_delete().
 *         There is no reset: a new stream takes a new instance.
 */
VAMRNB_API vamrnb_encoder *vamrnbe_create(const codec_config *config, int32_t *error);

/**
 * Encodes one frame of 160 samples into one storage-format frame.
 *
 * With DTX off every frame is a speech frame of the current mode; with DTX
 * on, silent stretches give SID frames (6 bytes) and no-data frames (the
 * byte 0x7C alone), which are to be stored or sent like any other frame.
 *
 * @param enc  the encoder; must not be null.
 * @param in   the input: in->data[0] points at 160 int16_t samples (only
 *             their 13 most significant bits are used); no other field is
 *             read.  Must not be null, nor in->data[0].
 * @param out  the room for the frame: out->data, out->size bytes.  Give
 *             #VAMRNB_MAX_FRAME_BYTES (32) bytes; with less, the frame is
 *             cut at out->size bytes (info->bytes says how many were
 *             written) and nothing is written past the end.  Must not be
 *             null, nor out->data.
 * @param info the result: produced = 1, bytes = bytes written, frame_count
 *             + 1, frame_type = type written (0..7, 8 or 15).  Must not be
 *             null.
 * @return #AMRNB_OK always.
 */
VAMRNB_API int32_t vamrnbe_encode(vamrnb_encoder *enc, const pcm_buffer *in,
                                  bitstream_buffer *out, frame_info *info);

/**
 * Changes the codec mode from the next vamrnbe_encode() call on, so that a
 * stream may switch rates at any frame.
 * @param enc  the encoder; must not be null.
 * @param mode the new mode, 0..7 (#MR475 .. #MR122).
 * @return #AMRNB_OK, or #AMRNB_ERR_UNSUPPORTED for a mode outside 0..7 (the
 *         mode in use is kept).
 */
VAMRNB_API int32_t vamrnbe_set_mode(vamrnb_encoder *enc, int32_t mode);

/**
 * Releases an encoder instance and everything it owns.
 * @param enc the encoder; may be null (nothing happens).
 */
VAMRNB_API void    vamrnbe_delete(vamrnb_encoder *enc);

/* ---- processor features ------------------------------------------------ */
/** Processor feature: SSE4.1 kernels (x86). */
#define VAMRNB_CPU_SSE41 0x1u
/** Processor feature: AVX2 kernels (x86). */
#define VAMRNB_CPU_AVX2  0x2u
/** Processor feature: Advanced SIMD (NEON) kernels (ARM). */
#define VAMRNB_CPU_NEON  0x4u

/**
 * Restricts the signal-processing kernels to the processor features in
 * @p mask.  The kernels otherwise use every feature the processor has; every
 * choice gives the same output bits, only the speed differs.  The mask is
 * process-wide, like #vamrnb_inited: it applies to all instances, and
 * should be changed while no instance is working.
 * @param mask an OR of VAMRNB_CPU_* flags; 0 selects the portable code;
 *             features the processor lacks are ignored.  Every value is
 *             accepted.
 * @return the previous mask (all bits set at start-up).
 */
VAMRNB_API uint32_t vamrnb_set_cpu_flags(uint32_t mask);

/* ---- status texts and version ------------------------------------------ */

/**
 * Short English text for a status code: those of this header, of
 * vamrnb_stream.h, and "unknown status" for any other value.
 * @param status  A status returned by a function of the library.
 * @return A static, NUL-terminated string; never NULL.
 */
VAMRNB_API const char *vamrnb_strerror(int32_t status);

/**
 * Version of the library actually loaded, as "MAJOR.MINOR.PATCH"; it equals
 * the VAMRNB_VERSION_* macros of the header the library was built with.
 * @return A static, NUL-terminated string.
 */
VAMRNB_API const char *vamrnb_version(void);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_H */
