// RTP payload parsing: reads the codec mode request and the chain of
// table-of-contents entries, checks that the frames they announce fill the
// payload exactly (up to the final padding of the bandwidth-efficient mode),
// verifies frame CRCs when the session uses them, and writes every frame
// back out in storage format.  Every length is checked before a byte is read,
// and nothing is written unless the whole payload is good.
#include "format/rtp_payload.h"

using namespace vamrnb::rtp;

namespace {

struct toc_walk {
    uint32_t frames = 0;
    size_t data_bits = 0;
    size_t data_bytes = 0;      // octet-aligned: bytes of frame data
    size_t storage = 0;         // bytes the frames need in storage format
    uint32_t crc_frames = 0;
};

// Follows the F bits of the table of contents; `entry` gives the FT/Q bits
// (the five bits F is followed by) of the i-th entry and whether it fits.
template <typename Entry>
int32_t read_toc(Entry entry, toc_walk &w) {
    for (uint32_t follow = 1; follow;) {
        uint32_t bits = 0;
        if (!entry(w.frames, bits)) return VAMRNB_RTP_ERR_TRUNCATED;
        follow = bits >> 5;
        const int ft = static_cast<int>((bits >> 1) & 15);
        if (reserved_type(ft)) return VAMRNB_RTP_ERR_FRAME_TYPE;
        ++w.frames;
        w.data_bits += static_cast<size_t>(frame_bits(ft));
        w.data_bytes += static_cast<size_t>(storage_bytes(ft) - 1);
        w.storage += static_cast<size_t>(storage_bytes(ft));
        if (frame_bits(ft) > 0) ++w.crc_frames;
    }
    return AMRNB_OK;
}

// Storage-format ToC byte from the six F/FT/Q bits of a payload entry.
inline uint8_t storage_toc(uint32_t entry) { return static_cast<uint8_t>((entry & 0x1Fu) << 2); }

int32_t parse_octet_aligned(const vamrnb_rtp_params *p, const uint8_t *in, size_t size,
                            uint8_t *out, size_t capacity, vamrnb_rtp_info &info) {
    toc_walk w;
    const int32_t st = read_toc(
        [&](uint32_t i, uint32_t &bits) {
            if (1 + static_cast<size_t>(i) >= size) return false;
            bits = in[1 + i] >> 2;
            return true;
        },
        w);
    if (st) return st;
    const size_t crc_bytes = p->crc ? w.crc_frames : 0;
    const size_t need = 1 + w.frames + crc_bytes + w.data_bytes;
    if (need > size) return VAMRNB_RTP_ERR_TRUNCATED;
    if (need < size) return VAMRNB_RTP_ERR_TRAILING;
    if (w.storage > capacity) return VAMRNB_RTP_ERR_NO_ROOM;

    const uint8_t *toc = in + 1;
    const uint8_t *crc = toc + w.frames;
    const uint8_t *data = crc + crc_bytes;
    for (uint32_t i = 0; i < w.frames; ++i) {
        uint8_t head = storage_toc(toc[i] >> 2);
        const int ft = (head >> 3) & 15;
        const int bytes = storage_bytes(ft) - 1;
        if (p->crc && frame_bits(ft) > 0) {
            if (*crc++ != crc8(data, crc_bits(ft))) {
                head = static_cast<uint8_t>(head & ~0x04u);
                ++info.crc_errors;
            }
        }
        *out++ = head;
        for (int k = 0; k < bytes; ++k) *out++ = data[k];
        data += bytes;
    }
    info.frames = w.frames;
    info.bytes = static_cast<uint32_t>(w.storage);
    return AMRNB_OK;
}

int32_t parse_bandwidth_efficient(const uint8_t *in, size_t size, uint8_t *out, size_t capacity,
                                  vamrnb_rtp_info &info) {
    const size_t total_bits = size * 8;
    toc_walk w;
    const int32_t st = read_toc(
        [&](uint32_t i, uint32_t &bits) {
            const size_t pos = 4 + 6 * static_cast<size_t>(i);
            if (pos + 6 > total_bits) return false;
            bits = get_bits(in, pos, 6);
            return true;
        },
        w);
    if (st) return st;
    const size_t data_start = 4 + 6 * static_cast<size_t>(w.frames);
    const size_t end = data_start + w.data_bits;
    if (end > total_bits) return VAMRNB_RTP_ERR_TRUNCATED;
    if (total_bits - end >= 8) return VAMRNB_RTP_ERR_TRAILING;
    if (w.storage > capacity) return VAMRNB_RTP_ERR_NO_ROOM;

    size_t bit = data_start;
    for (uint32_t i = 0; i < w.frames; ++i) {
        const uint32_t entry = get_bits(in, 4 + 6 * static_cast<size_t>(i), 6);
        const uint8_t head = storage_toc(entry);
        const int ft = (head >> 3) & 15;
        *out++ = head;
        int left = frame_bits(ft);
        for (; left >= 8; left -= 8, bit += 8) *out++ = static_cast<uint8_t>(get_bits(in, bit, 8));
        if (left > 0) {
            *out++ = static_cast<uint8_t>(get_bits(in, bit, left) << (8 - left));
            bit += static_cast<size_t>(left);
        }
    }
    info.frames = w.frames;
    info.bytes = static_cast<uint32_t>(w.storage);
    return AMRNB_OK;
}

}  // namespace

extern "C" VAMRNB_API int32_t vamrnb_rtp_parse(const vamrnb_rtp_params *params,
                                               const uint8_t *payload, size_t size,
                                               uint8_t *frames, size_t capacity,
                                               vamrnb_rtp_info *info) {
    vamrnb_rtp_info result{0, 0, VAMRNB_RTP_CMR_NONE, 0};
    if (info) *info = result;
    if (!params || (!payload && size) || !frames) return VAMRNB_RTP_ERR_ARGUMENT;
    if (const int32_t st = check_params(params)) return st;
    // The smallest payload is the CMR and one table-of-contents entry.
    if (size < 2) return VAMRNB_RTP_ERR_TRUNCATED;

    result.cmr = payload[0] >> 4;
    const int32_t st = params->octet_align
        ? parse_octet_aligned(params, payload, size, frames, capacity, result)
        : parse_bandwidth_efficient(payload, size, frames, capacity, result);
    if (st) return st;
    if (info) *info = result;
    return AMRNB_OK;
}
