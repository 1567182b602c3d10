/**
 * @file vamrnb_rtp.h
 * @brief AMR over RTP: payload packing and parsing, mode requests, SDP.
 *
 * Packs the storage-format frames the encoder emits into one RTP payload and
 * parses a received payload back into storage-format frames that
 * vamrnbd_decode takes, in both payload modes (bandwidth-efficient and
 * octet-aligned, the latter optionally with frame CRCs); applies a received
 * codec mode request to an encoder; reads and writes the SDP `a=fmtp`
 * parameters of `AMR/8000`.
 *
 * Nothing here allocates or keeps global state: separate states may be used
 * from separate threads.  The RTP header itself (sequence number, timestamp,
 * marker) stays with the caller; these functions see only the payload.
 * The header compiles as C11 and as C++17 on its own.
 */
#ifndef VAMRNB_RTP_H
#define VAMRNB_RTP_H

#include <stddef.h>
#include <stdint.h>

#include "vamrnb.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * @defgroup rtp_status RTP status codes
 * Results of the functions in this header, besides AMRNB_OK (0).  They lie
 * apart from the codec's own status values so the two never collide.
 * @{
 */
#define VAMRNB_RTP_ERR_ARGUMENT    (-160) /**< null pointer, or a value outside its range */
#define VAMRNB_RTP_ERR_NO_ROOM     (-161) /**< output buffer too small; nothing usable was written */
#define VAMRNB_RTP_ERR_TRUNCATED   (-162) /**< table of contents or frame data runs past the end of the input */
#define VAMRNB_RTP_ERR_FRAME_TYPE  (-163) /**< reserved frame type (12 to 14) in the input */
#define VAMRNB_RTP_ERR_TRAILING    (-164) /**< whole bytes left over after the last frame */
#define VAMRNB_RTP_ERR_TOO_MANY    (-165) /**< more frames than maxptime allows in one packet */
#define VAMRNB_RTP_ERR_UNSUPPORTED (-166) /**< interleaving, robust sorting or more than one channel */
#define VAMRNB_RTP_ERR_SDP         (-167) /**< an fmtp parameter has a value it cannot take */
/** @} */

/** Codec mode request meaning "no request". */
#define VAMRNB_RTP_CMR_NONE 15

/**
 * Payload parameters of one RTP session, as negotiated in SDP.  Fill with
 * vamrnb_rtp_params_default() or vamrnb_rtp_fmtp_parse(); pack and parse
 * read octet_align, crc, robust_sorting, interleaving, channels and maxptime.
 */
typedef struct vamrnb_rtp_params {
    int32_t  octet_align;            /**< 1: octet-aligned mode; 0: bandwidth-efficient (default) */
    uint32_t mode_set;               /**< bit m set: mode m may be used; 0xFF when unrestricted */
    int32_t  mode_change_period;     /**< mode changes only every this many frames: 1 (default) or 2 */
    int32_t  mode_change_capability; /**< 1 (default) or 2: the peer can restrict changes to every other frame */
    int32_t  mode_change_neighbor;   /**< 1: change only to a neighbouring mode of the set; 0 (default) */
    int32_t  maxptime;               /**< most audio per packet in ms; 0 when not given */
    int32_t  crc;                    /**< 1: a CRC per frame (octet-aligned only); 0 (default) */
    int32_t  robust_sorting;         /**< 1: robust sorting (not supported here); 0 (default) */
    int32_t  interleaving;           /**< frames per interleaving group (not supported here); 0 (default) */
    int32_t  channels;               /**< audio channels; only 1 is supported */
    int32_t  max_red;                /**< most redundancy delay in ms; -1 when not given */
} vamrnb_rtp_params;

/**
 * What a pack or parse call found and wrote.
 */
typedef struct vamrnb_rtp_info {
    uint32_t frames;     /**< frames in the payload */
    uint32_t bytes;      /**< bytes written to the output */
    int32_t  cmr;        /**< codec mode request carried by the payload (0..15, 15 = none) */
    uint32_t crc_errors; /**< parse, crc mode: frames whose CRC did not match (their Q is written as 0) */
} vamrnb_rtp_info;

/**
 * Sets every parameter to its value when absent from SDP: bandwidth-efficient,
 * all modes, period 1, capability 1, no neighbour rule, no maxptime, no CRC,
 * no robust sorting, no interleaving, one channel, no max-red.
 * @param params parameters to fill
 */
VAMRNB_API void vamrnb_rtp_params_default(vamrnb_rtp_params *params);

/**
 * Packs storage-format frames into one RTP payload.
 *
 * The frames lie back to back in `frames` as the encoder writes them: each a
 * table-of-contents byte followed by its bits, NO_DATA frames as the single
 * byte 0x7C.  Their frame types and quality bits go into the payload's table
 * of contents in the same order.
 * @param params   session parameters (payload mode, CRC, maxptime)
 * @param cmr      codec mode request to send, 0..7, or VAMRNB_RTP_CMR_NONE
 * @param frames   storage-format frames, back to back
 * @param size     bytes in `frames`
 * @param payload  output buffer for the payload
 * @param capacity bytes available at `payload`
 * @param info     receives frames packed and payload bytes written (may be null)
 * @return AMRNB_OK, or VAMRNB_RTP_ERR_ARGUMENT (no frame, null pointer, bad
 *         cmr), _TRUNCATED (last frame cut short), _FRAME_TYPE, _TOO_MANY,
 *         _UNSUPPORTED, _NO_ROOM
 */
VAMRNB_API int32_t vamrnb_rtp_pack(const vamrnb_rtp_params *params, int32_t cmr,
                                   const uint8_t *frames, size_t size,
                                   uint8_t *payload, size_t capacity,
                                   vamrnb_rtp_info *info);

/**
 * Parses one RTP payload into storage-format frames, back to back, ready to
 * be handed one after another to vamrnbd_decode.  Each frame's quality bit
 * is in its table-of-contents byte.  A payload is either accepted whole or
 * refused; the input is never read past `size`.
 * @param params   session parameters (payload mode, CRC)
 * @param payload  the RTP payload (after the RTP header, without RTP padding)
 * @param size     bytes in `payload`
 * @param frames   output buffer for the frames
 * @param capacity bytes available at `frames`
 * @param info     receives the CMR, the frame count, the bytes written and
 *                 the CRC failures (may be null)
 * @return AMRNB_OK, or VAMRNB_RTP_ERR_ARGUMENT, _TRUNCATED, _FRAME_TYPE,
 *         _TRAILING, _UNSUPPORTED, _NO_ROOM
 */
VAMRNB_API int32_t vamrnb_rtp_parse(const vamrnb_rtp_params *params,
                                    const uint8_t *payload, size_t size,
                                    uint8_t *frames, size_t capacity,
                                    vamrnb_rtp_info *info);

/**
 * Follows the codec mode requests received from the peer.  Keep one per
 * encoder; all fields are private to the functions below.
 */
typedef struct vamrnb_rtp_cmr_state {
    uint32_t mode_set; /**< allowed modes, bit per mode */
    int32_t  period;   /**< frames between change opportunities */
    int32_t  neighbor; /**< 1: one step through the set at a time */
    int32_t  mode;     /**< mode the encoder was last set to */
    int32_t  target;   /**< mode the peer asked for, within the set */
    uint32_t frame;    /**< frames counted since the start */
} vamrnb_rtp_cmr_state;

/**
 * Starts following mode requests for an encoder.
 * @param state  state to set up
 * @param params session parameters (mode_set, mode_change_period, mode_change_neighbor)
 * @param mode   the encoder's current mode (0..7); it is moved into the mode set
 * @return AMRNB_OK, or VAMRNB_RTP_ERR_ARGUMENT (null pointer, mode out of
 *         range, empty mode set)
 */
VAMRNB_API int32_t vamrnb_rtp_cmr_init(vamrnb_rtp_cmr_state *state,
                                       const vamrnb_rtp_params *params, int32_t mode);

/**
 * Records a received codec mode request.  A request outside the mode set
 * asks for the highest mode of the set below it (the lowest of the set if
 * there is none); VAMRNB_RTP_CMR_NONE and the reserved values 8..14 change
 * nothing.
 * @param state state from vamrnb_rtp_cmr_init
 * @param cmr   the CMR field of a received payload
 */
VAMRNB_API void vamrnb_rtp_cmr_request(vamrnb_rtp_cmr_state *state, int32_t cmr);

/**
 * Call once before encoding each frame: at a change opportunity (every
 * mode_change_period frames) moves the encoder towards the requested mode,
 * one neighbour at a time when mode_change_neighbor is set, through
 * vamrnbe_set_mode.
 * @param state state from vamrnb_rtp_cmr_init
 * @param enc   the encoder that produces the frame (may be null to only
 *              follow the state)
 * @return the mode the frame will be encoded in (0..7)
 */
VAMRNB_API int32_t vamrnb_rtp_cmr_next(vamrnb_rtp_cmr_state *state, vamrnb_encoder *enc);

/**
 * Reads the format parameters of `AMR/8000`: either the whole attribute
 * ("a=fmtp:97 octet-align=1; mode-set=0,2,5,7") or the parameter list alone.
 * Parameters it does not know are ignored; missing ones take their default.
 * CRC, robust sorting and interleaving imply the octet-aligned mode.
 * @param text   NUL-terminated text
 * @param params receives the parameters
 * @return AMRNB_OK, or VAMRNB_RTP_ERR_ARGUMENT (null pointer),
 *         VAMRNB_RTP_ERR_SDP (a known parameter with a value it cannot
 *         take), VAMRNB_RTP_ERR_UNSUPPORTED (channels other than 1)
 */
VAMRNB_API int32_t vamrnb_rtp_fmtp_parse(const char *text, vamrnb_rtp_params *params);

/**
 * Writes the parameter list for an `a=fmtp:<pt> ` line, naming only the
 * parameters that differ from their defaults (an empty string when none do),
 * for example "octet-align=1;mode-set=0,2,5,7".
 * @param params   parameters to write
 * @param text     output buffer; always NUL-terminated when capacity > 0
 * @param capacity bytes available at `text`
 * @param length   receives the length written, without the NUL (may be null)
 * @return AMRNB_OK, or VAMRNB_RTP_ERR_ARGUMENT, VAMRNB_RTP_ERR_SDP (a value
 *         out of range), VAMRNB_RTP_ERR_NO_ROOM
 */
VAMRNB_API int32_t vamrnb_rtp_fmtp_format(const vamrnb_rtp_params *params,
                                          char *text, size_t capacity, size_t *length);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_RTP_H */
