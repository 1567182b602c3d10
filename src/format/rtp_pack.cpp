// RTP payload packing: storage-format frames, as the encoder writes them
// back to back, become one payload with the codec mode request, a
// table-of-contents entry per frame (frame type, quality, the F bit that
// says another entry follows), in octet-aligned mode optional frame CRCs,
// and the frames' bits: whole bytes per frame in octet-aligned mode, one
// unbroken bit string padded once at the end in bandwidth-efficient mode.
#include "format/rtp_payload.h"

using namespace vamrnb::rtp;

namespace {

struct frame_walk {
    uint32_t frames = 0;
    size_t data_bits = 0;      // sum of the frames' payload bits
    size_t data_bytes = 0;     // sum of the frames' bytes after their ToC byte
    uint32_t crc_frames = 0;   // frames that carry bits, hence a CRC
};

// Checks that `frames` is a whole number of storage-format frames of known
// types and adds up what the payload will need for them.
int32_t walk(const uint8_t *frames, size_t size, frame_walk &w) {
    for (size_t pos = 0; pos < size;) {
        const int ft = (frames[pos] >> 3) & 15;
        if (reserved_type(ft)) return VAMRNB_RTP_ERR_FRAME_TYPE;
        const size_t bytes = static_cast<size_t>(storage_bytes(ft));
        if (bytes > size - pos) return VAMRNB_RTP_ERR_TRUNCATED;
        ++w.frames;
        w.data_bits += static_cast<size_t>(frame_bits(ft));
        w.data_bytes += bytes - 1;
        if (frame_bits(ft) > 0) ++w.crc_frames;
        pos += bytes;
    }
    return AMRNB_OK;
}

void pack_octet_aligned(const vamrnb_rtp_params *p, int32_t cmr, const uint8_t *frames,
                        uint32_t count, uint8_t *out) {
    out[0] = static_cast<uint8_t>(cmr << 4);
    uint8_t *toc = out + 1;
    uint8_t *crc = toc + count;
    uint8_t *data = crc;
    if (p->crc)
        for (uint32_t i = 0, pos = 0; i < count; ++i) {
            const int ft = (frames[pos] >> 3) & 15;
            if (frame_bits(ft) > 0) ++data;
            pos += static_cast<uint32_t>(storage_bytes(ft));
        }
    for (uint32_t i = 0, pos = 0; i < count; ++i) {
        const uint8_t head = frames[pos];
        const int ft = (head >> 3) & 15;
        const uint32_t follow = i + 1 < count ? 0x80u : 0u;
        toc[i] = static_cast<uint8_t>(follow | (head & 0x7Cu));
        // After the ToC byte a storage-format frame is already laid out as
        // the payload wants it: the bits in order, zero padding to a byte.
        const int bytes = storage_bytes(ft) - 1;
        for (int k = 0; k < bytes; ++k) data[k] = frames[pos + 1 + k];
        if (p->crc && frame_bits(ft) > 0) *crc++ = crc8(frames + pos + 1, crc_bits(ft));
        data += bytes;
        pos += static_cast<uint32_t>(bytes + 1);
    }
}

void pack_bandwidth_efficient(int32_t cmr, const uint8_t *frames, uint32_t count, uint8_t *out) {
    size_t bit = 0;
    put_bits(out, bit, static_cast<uint32_t>(cmr), 4);
    bit += 4;
    for (uint32_t i = 0, pos = 0; i < count; ++i) {
        const uint8_t head = frames[pos];
        const uint32_t follow = i + 1 < count ? 1u : 0u;
        // F, FT and Q: the top six bits of the storage ToC byte with F set.
        put_bits(out, bit, (follow << 5) | ((head >> 2) & 0x1Fu), 6);
        bit += 6;
        pos += static_cast<uint32_t>(storage_bytes((head >> 3) & 15));
    }
    for (uint32_t i = 0, pos = 0; i < count; ++i) {
        const int ft = (frames[pos] >> 3) & 15;
        const uint8_t *src = frames + pos + 1;
        int left = frame_bits(ft);
        for (; left >= 8; left -= 8, bit += 8) put_bits(out, bit, *src++, 8);
        if (left > 0) {
            put_bits(out, bit, static_cast<uint32_t>(*src) >> (8 - left), left);
            bit += static_cast<size_t>(left);
        }
        pos += static_cast<uint32_t>(storage_bytes(ft));
    }
    // Zero padding to the byte boundary.
    if (bit & 7) put_bits(out, bit, 0, static_cast<int>(8 - (bit & 7)));
}

}  // namespace

extern "C" VAMRNB_API int32_t vamrnb_rtp_pack(const vamrnb_rtp_params *params, int32_t cmr,
                                              const uint8_t *frames, size_t size,
                                              uint8_t *payload, size_t capacity,
                                              vamrnb_rtp_info *info) {
    if (info) *info = vamrnb_rtp_info{0, 0, cmr, 0};
    if (!params || !frames || !payload || size == 0) return VAMRNB_RTP_ERR_ARGUMENT;
    // Modes 0 to 7 may be requested, or nothing; 8 to 14 have no meaning here.
    if (!((cmr >= 0 && cmr <= 7) || cmr == VAMRNB_RTP_CMR_NONE)) return VAMRNB_RTP_ERR_ARGUMENT;
    if (const int32_t st = check_params(params)) return st;

    frame_walk w;
    if (const int32_t st = walk(frames, size, w)) return st;
    if (params->maxptime > 0 && static_cast<int64_t>(w.frames) * 20 > params->maxptime)
        return VAMRNB_RTP_ERR_TOO_MANY;

    const size_t need = params->octet_align
        ? 1 + w.frames + (params->crc ? w.crc_frames : 0) + w.data_bytes
        : (4 + 6 * static_cast<size_t>(w.frames) + w.data_bits + 7) / 8;
    if (need > capacity) return VAMRNB_RTP_ERR_NO_ROOM;

    if (params->octet_align) pack_octet_aligned(params, cmr, frames, w.frames, payload);
    else pack_bandwidth_efficient(cmr, frames, w.frames, payload);

    if (info) {
        info->frames = w.frames;
        info->bytes = static_cast<uint32_t>(need);
    }
    return AMRNB_OK;
}
