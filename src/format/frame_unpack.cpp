// Frame unpacking on the decoder side: reads one storage-format frame (the
// table-of-contents byte, then the class bits in order of importance) from
// the bit-stream reader, scatters the bits into `serial` in codec order and
// classifies the frame; and converts `serial` into the parameter vector.
#include "common/checks.h"
#include "format/frame_format.h"

using namespace vamrnb;

namespace {

// Bit position of the reader from the start of its buffer.
uint32_t reader_pos(const vcmn_bsr *bs) {
    return static_cast<uint32_t>(bs->ptr - bs->start) * 8u - static_cast<uint32_t>(bs->bits);
}

// Leaves the reader as `n` calls of vcmn_bsr_read1 would, when its buffer
// holds all of those bits: the default refill fetches four bytes (fewer at
// the end of the buffer) whenever the cache is empty.
void advance_reader(vcmn_bsr *bs, uint32_t n) {
    if (n <= static_cast<uint32_t>(bs->bits)) {
        bs->cache = n >= 32 ? 0u : bs->cache << n;
        bs->bits -= static_cast<int32_t>(n);
        return;
    }
    const uint32_t rest = n - static_cast<uint32_t>(bs->bits);
    const uint32_t groups = (rest + 31u) / 32u;
    const uint8_t *q = bs->ptr + 4u * (groups - 1u);
    const uint32_t left = static_cast<uint32_t>(bs->start + bs->size - q);
    const uint32_t k = left < 4u ? left : 4u;
    uint32_t c = 0;
    for (uint32_t j = 0; j < k; ++j) c |= uint32_t{q[j]} << (24u - 8u * j);
    const uint32_t used = rest - 32u * (groups - 1u);
    bs->cache = used >= 32u ? 0u : c << used;
    bs->bits = static_cast<int32_t>(8u * k - used);
    bs->ptr = q + k;
}

// Scatters the next `nbits` bits into `serial` in the order given and puts
// the bit after them into *next, straight from the buffer a byte at a time.
// Only taken when the reader uses the default refill and its buffer holds
// every bit asked for; otherwise returns false and reads nothing, and the
// caller reads bit by bit (a short frame's missing bits read as 1).
bool scatter_whole(vcmn_bsr *bs, const int16_t *order, int nbits, int16_t *serial,
                   uint32_t *next) {
    if (bs->refill != vcmn_bsr_flush) return false;
    const uint32_t pos = reader_pos(bs);
    const uint32_t need = static_cast<uint32_t>(nbits) + 1u;
    if (pos + need > bs->size * 8u) return false;

    // the bytes that hold the bits, realigned to start at bit 7 of b[0]
    uint8_t b[MAX_PACKED_BYTES + 2] = {};
    const uint32_t first = pos / 8u, sh = pos % 8u;
    const uint32_t span = (sh + need + 7u) / 8u;
    for (uint32_t j = 0; j < span; ++j) b[j] = bs->start[first + j];
    if (sh != 0)
        for (uint32_t j = 0; j < span; ++j)
            b[j] = static_cast<uint8_t>((b[j] << sh) | (b[j + 1] >> (8u - sh)));

    int i = 0;
    for (; i + 8 <= nbits; i += 8) {
        const uint32_t v = b[i / 8];
        const int16_t *o = order + i;
        serial[o[0]] = static_cast<int16_t>(v >> 7);
        serial[o[1]] = static_cast<int16_t>((v >> 6) & 1);
        serial[o[2]] = static_cast<int16_t>((v >> 5) & 1);
        serial[o[3]] = static_cast<int16_t>((v >> 4) & 1);
        serial[o[4]] = static_cast<int16_t>((v >> 3) & 1);
        serial[o[5]] = static_cast<int16_t>((v >> 2) & 1);
        serial[o[6]] = static_cast<int16_t>((v >> 1) & 1);
        serial[o[7]] = static_cast<int16_t>(v & 1);
    }
    for (; i < nbits; ++i) serial[order[i]] = static_cast<int16_t>((b[i / 8] >> (7 - i % 8)) & 1);
    *next = (b[nbits / 8] >> (7 - nbits % 8)) & 1u;
    advance_reader(bs, need);
    return true;
}

}  // namespace

extern "C" {

VAMRNB_API void vamrnbd_unpack_bits(vcmn_bsr *reader, rx_frame_class *cls, int32_t *mode,
                                    int16_t serial[250]) {
    VAMRNB_REQUIRE(reader);
    VAMRNB_REQUIRE(cls);
    VAMRNB_REQUIRE(mode);
    VAMRNB_REQUIRE(serial);
    const uint32_t toc = vcmn_bsr_read(reader, 8);
    const int ft = static_cast<int>((toc >> 3) & 15);
    cls->quality = static_cast<int32_t>((toc >> 2) & 1);
    cls->frame_mode = ft;

    if (ft > FT_SID) {
        // Nothing this decoder can use follows: only the byte above is read.
        cls->rx_type = RX_NO_DATA;
        return;
    }

    // The bits are read one ahead, so reading ends holding the bit after the
    // class bits: the first padding bit, or a SID frame's type indicator.
    // A missing bit (input too short) reads as 1.
    const int16_t *order = vamrnb_tbl_sort_ptr[ft];
    const int nbits = vamrnb_tbl_unpacked_size[ft];
    uint32_t x;
    if (!scatter_whole(reader, order, nbits, serial, &x)) {
        x = vcmn_bsr_read1(reader);
        for (int i = 0; i < nbits; ++i) {
            serial[order[i]] = static_cast<int16_t>(x & 1);
            x = vcmn_bsr_read1(reader);
        }
    }

    if (ft < FT_SID) {
        cls->rx_type = cls->quality ? RX_SPEECH_GOOD : RX_SPEECH_BAD;
        *mode = ft;
        return;
    }

    cls->rx_type = cls->quality ? static_cast<int32_t>(RX_SID_FIRST + (x & 1)) : RX_SID_BAD;
    // The mode indication travels least significant bit first: the caller's
    // word gets the bits as read, frame_mode the codec mode they stand for.
    const uint32_t m = vcmn_bsr_read(reader, 3) & 7;
    *mode = static_cast<int32_t>(m);
    cls->frame_mode = static_cast<int32_t>(((m & 1) << 2) | (m & 2) | (m >> 2));
}

VAMRNB_API void vamrnbd_bits2prm(int32_t mode, const int16_t *serial, int16_t *prm) {
    VAMRNB_REQUIRE(serial);
    VAMRNB_REQUIRE(prm);
    if (mode < 0 || mode > 9) return;
    const int count = vamrnb_tbl_prmno[mode];
    if (count < 1) return;
    const int16_t *width = vamrnb_tbl_bitno[mode];
    for (int j = 0; j < count; ++j) {
        uint32_t v = 0;
        for (int b = 0; b < width[j]; ++b) v = (v << 1) | (*serial++ == 1 ? 1u : 0u);
        prm[j] = static_cast<int16_t>(v);
    }
}

}  // extern "C"
