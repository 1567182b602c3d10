// Bit-stream reader over a caller's byte buffer.
//
// The reader keeps up to 32 fetched bits in `cache` and fetches whole bytes,
// four at a time, through its refill function.  The default refill hands
// bits out most significant first: the cache is left-aligned and the next bit
// is bit 31.  The little-endian refill right-aligns the cache so that the
// next bit is bit 0 and the vcmn_bsr_le_* operations read from the bottom.
// A fetch replaces the cache, so every operation saves the bits it still
// needs before fetching.  Once the buffer is exhausted a fetch clears the
// cache and reads report 0xFFFFFFFF.
#include <bit>

#include "common/checks.h"
#include "common/bitstream.h"

namespace {

// Shifts that give 0 for a count of 32 or more, as the algorithms expect.
constexpr uint32_t shr32(uint32_t x, int n) { return n >= 32 ? 0u : n <= 0 ? x : x >> n; }
constexpr uint32_t shl32(uint32_t x, int n) { return n >= 32 ? 0u : n <= 0 ? x : x << n; }
constexpr uint32_t low_mask(int n) { return n >= 32 ? 0xffffffffu : n <= 0 ? 0u : (1u << n) - 1u; }

// Bytes left between ptr and end (end + 1 - ptr), computed on addresses so
// that an empty buffer (end just below start) needs no out-of-range pointer.
intptr_t bytes_left(const vcmn_bsr *bs) {
    return static_cast<intptr_t>(reinterpret_cast<uintptr_t>(bs->end) + 1u
                                 - reinterpret_cast<uintptr_t>(bs->ptr));
}

// Takes up to max_bytes (at most 4) from ptr.  Returns the count taken, or
// 0 after clearing the cache when nothing is left.
int take_bytes(vcmn_bsr *bs, int32_t max_bytes, uint8_t out[4]) {
    intptr_t k = bytes_left(bs);
    if (max_bytes < k) k = max_bytes;
    if (k > 4) k = 4;
    if (k <= 0) {
        bs->cache = 0;
        bs->bits = 0;
        return 0;
    }
    for (intptr_t j = 0; j < k; ++j) out[j] = bs->ptr[j];
    bs->ptr += k;
    return static_cast<int>(k);
}

// After a fetch, `used` of the new bits went to the caller.  A short fetch
// near the end of the buffer can hold fewer bits than asked for; the count
// then stops at 0 (the missing bits have been read as zeros).
void drop_fetched(vcmn_bsr *bs, int used) {
    bs->bits = bs->bits > used ? bs->bits - used : 0;
}

}  // namespace

extern "C" {

VAMRNB_API void vcmn_bsr_init(vcmn_bsr *bs, const uint8_t *buf, uint32_t size,
                              vcmn_bsr_refill_fn refill) {
    VAMRNB_REQUIRE(bs);
    VAMRNB_REQUIRE_WHEN(size > 0, buf, __func__);
    bs->cache = 0;
    bs->bits = 0;
    bs->ptr = buf;
    bs->start = buf;
    bs->end = reinterpret_cast<const uint8_t *>(reinterpret_cast<uintptr_t>(buf) + size - 1u);
    bs->size = size;
    bs->refill = refill ? refill : vcmn_bsr_flush;
}

VAMRNB_API int32_t vcmn_bsr_flush(vcmn_bsr *bs, int32_t max_bytes) {
    uint8_t b[4];
    const int k = take_bytes(bs, max_bytes, b);
    if (k == 0) return -1;
    uint32_t c = 0;
    for (int j = 0; j < k; ++j) c |= uint32_t{b[j]} << (24 - 8 * j);
    bs->cache = c;
    bs->bits = 8 * k;
    return 0;
}

VAMRNB_API uint32_t vcmn_bsr_read(vcmn_bsr *bs, int32_t n) {
    if (bs->bits >= n) {
        const uint32_t v = shr32(bs->cache, 32 - n);
        bs->cache = shl32(bs->cache, n);
        bs->bits -= n;
        return v;
    }
    const uint32_t old_cache = bs->cache;
    const int m = n - bs->bits;
    if (bs->refill(bs, 4) != 0) return 0xffffffffu;
    const uint32_t v = shr32(old_cache, 32 - n) | shr32(bs->cache, 32 - m);
    bs->cache = shl32(bs->cache, m);
    drop_fetched(bs, m);
    return v;
}

VAMRNB_API uint32_t vcmn_bsr_read1(vcmn_bsr *bs) {
    if (bs->bits == 0 && bs->refill(bs, 4) != 0) return 0xffffffffu;
    const uint32_t v = bs->cache >> 31;
    bs->cache <<= 1;
    bs->bits -= 1;
    return v;
}

VAMRNB_API int32_t vcmn_bsr_read1_value(vcmn_bsr *bs, uint8_t *bit) {
    if (bs->bits == 0 && bs->refill(bs, 4) != 0) return -1;
    *bit = static_cast<uint8_t>(bs->cache >> 31);
    bs->cache <<= 1;
    bs->bits -= 1;
    return 0;
}

VAMRNB_API int32_t vcmn_bsr_skip(vcmn_bsr *bs, int32_t n) {
    if (bs->bits < n) {
        const int m = n - bs->bits;
        if (bs->refill(bs, 4) != 0) return -1;
        bs->cache = shl32(bs->cache, m);
        drop_fetched(bs, m);
    } else {
        bs->cache = shl32(bs->cache, n);
        bs->bits -= n;
    }
    return bs->bits;
}

VAMRNB_API uint32_t vcmn_bsr_peek(vcmn_bsr *bs, int32_t n) {
    const int room = (32 - bs->bits) / 8;
    if (bs->bits < n && room != 0) {
        // Top the cache up with whole bytes behind the bits it holds.  A
        // failed fetch leaves cache and count 0, so the old bits come back.
        const uint32_t old_cache = bs->cache;
        const int old_bits = bs->bits;
        bs->refill(bs, room);
        bs->cache = old_cache | shr32(bs->cache, old_bits);
        bs->bits += old_bits;
    }
    uint32_t v = shr32(bs->cache, 32 - n);
    if (bs->bits < n && bytes_left(bs) > 0) {
        // The rest comes from the next byte, which stays unconsumed.
        const int d = n - bs->bits;
        const uint32_t next = *bs->ptr;
        v |= d <= 8 ? next >> (8 - d) : shl32(next, d - 8);
    }
    return v;
}

VAMRNB_API uint32_t vcmn_bsr_skip_peek(vcmn_bsr *bs, int32_t skip, int32_t n) {
    if (vcmn_bsr_skip(bs, skip) < 0) return 0;
    if (bs->bits >= n) return shr32(bs->cache, 32 - n);
    return vcmn_bsr_peek(bs, n);
}

VAMRNB_API void vcmn_bsr_skip_to_align8(vcmn_bsr *bs) {
    const int r = bs->bits & 7;
    bs->cache = shl32(bs->cache, r);
    bs->bits -= r;
}

VAMRNB_API int32_t vcmn_bsr_clz_in_code(uint32_t word) { return std::countl_zero(word); }

// ---- least significant bit first -------------------------------------------

VAMRNB_API int32_t vcmn_bsr_le_flush(vcmn_bsr *bs, int32_t max_bytes) {
    uint8_t b[4];
    const int k = take_bytes(bs, max_bytes, b);
    if (k == 0) return -1;
    uint32_t c = 0;
    for (int j = 0; j < k; ++j) c |= uint32_t{b[j]} << (8 * j);
    bs->cache = c;
    bs->bits = 8 * k;
    return 0;
}

VAMRNB_API uint32_t vcmn_bsr_le_read(vcmn_bsr *bs, int32_t n) {
    if (bs->bits >= n) {
        const uint32_t v = bs->cache & low_mask(n);
        bs->cache = shr32(bs->cache, n);
        bs->bits -= n;
        return v;
    }
    const int old_bits = bs->bits;
    const uint32_t low = bs->cache & low_mask(old_bits);
    const int m = n - old_bits;
    if (bs->refill(bs, 4) != 0) return 0xffffffffu;
    const uint32_t high = shl32(bs->cache & low_mask(m), old_bits);
    bs->cache = shr32(bs->cache, m);
    drop_fetched(bs, m);
    return low | high;
}

VAMRNB_API void vcmn_bsr_le_skip(vcmn_bsr *bs, int32_t n) {
    bs->cache = shr32(bs->cache, n);
    bs->bits -= n;
}

VAMRNB_API void vcmn_bsr_le_skip_to_align8(vcmn_bsr *bs) {
    const int r = bs->bits & 7;
    bs->cache = shr32(bs->cache, r);
    bs->bits -= r;
}

}  // extern "C"
