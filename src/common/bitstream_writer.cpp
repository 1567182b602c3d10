// Bit-stream writer: appends bits to a caller's byte buffer, most significant
// bit first.
//
// New bits enter the current byte at the bottom and push its earlier content
// up, so a byte that receives all eight of its bits holds exactly those bits
// whatever was in the buffer before; nothing is cleared in advance.  When a
// byte is complete the optional on_byte callback sees the record before the
// writer moves to the next byte.  The end of the buffer is checked when an
// operation starts: a multi-bit write that starts inside the buffer is
// carried out in full.
#include "common/checks.h"
#include "common/bitstream.h"

namespace {

// True when ptr has moved past the last byte (or the buffer is empty).
// Compared as addresses so that an empty buffer needs no pointer below it.
bool past_end(const vcmn_bsw *bs) {
    return reinterpret_cast<uintptr_t>(bs->ptr) > reinterpret_cast<uintptr_t>(bs->end)
           || bs->size == 0;
}

void byte_done(vcmn_bsw *bs) {
    if (bs->on_byte) bs->on_byte(bs);
    bs->ptr = reinterpret_cast<uint8_t *>(reinterpret_cast<uintptr_t>(bs->ptr) + 1u);
    bs->free_bits = 8;
}

}  // namespace

extern "C" {

VAMRNB_API void vcmn_bsw_init(vcmn_bsw *bs, uint8_t *buf, uint32_t size, vcmn_bsw_byte_fn on_byte) {
    VAMRNB_REQUIRE(bs);
    VAMRNB_REQUIRE_WHEN(size > 0, buf, __func__);
    bs->ptr = buf;
    bs->start = buf;
    bs->free_bits = 8;
    bs->end = reinterpret_cast<uint8_t *>(reinterpret_cast<uintptr_t>(buf) + size - 1u);
    bs->size = size;
    bs->on_byte = on_byte;
}

VAMRNB_API uint32_t vcmn_bsw_write1(vcmn_bsw *bs, uint32_t bit) {
    if (past_end(bs)) return 0xffffffffu;
    *bs->ptr = static_cast<uint8_t>((*bs->ptr << 1) | (bit & 1u));
    if (--bs->free_bits == 0) byte_done(bs);
    return 0;
}

// Writes the n low bits of value (n up to 32; larger counts write 32).
VAMRNB_API uint32_t vcmn_bsw_write(vcmn_bsw *bs, uint32_t value, int32_t n) {
    if (past_end(bs)) return 0xffffffffu;
    if (n < 1) return 0;
    if (n > 32) n = 32;
    uint32_t v = n == 32 ? value : value << (32 - n);  // left-aligned
    while (n > 0) {
        const int m = n < bs->free_bits ? n : bs->free_bits;
        *bs->ptr = static_cast<uint8_t>((*bs->ptr << m) | (v >> (32 - m)));
        n -= m;
        bs->free_bits -= m;
        if (bs->free_bits == 0) byte_done(bs);
        v = m == 32 ? 0 : v << m;
    }
    return 0;
}

}  // extern "C"
