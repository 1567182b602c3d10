// 32-byte-aligned blocks for instance records, and a strided 2-D block copy.
//
// A block is taken from the platform heap with enough spare bytes to move the
// start up to the next multiple of 32 while leaving room just below it for
// the address the heap returned; freeing reads that address back.  With
// 4-byte pointers this is raw + 35 rounded down to 32 with 36 spare bytes;
// wider pointers get a correspondingly wider gap.
#include <cstdlib>
#include <cstring>

#include "common/memory.h"

namespace {

constexpr std::size_t kPtr = sizeof(void *);
constexpr std::size_t kExtra = 32 + kPtr;  // 36 bytes with 4-byte pointers

void *alloc_aligned(uint32_t size) {
    if (uint64_t{size} + kExtra > SIZE_MAX) return nullptr;  // only possible with a 32-bit size_t
    void *raw = std::malloc(std::size_t{size} + kExtra);
    if (!raw) return nullptr;
    const uintptr_t base = reinterpret_cast<uintptr_t>(raw);
    const uintptr_t aligned = (base + 31 + kPtr) & ~uintptr_t{31};
    unsigned char *p = static_cast<unsigned char *>(raw) + (aligned - base);
    std::memcpy(p - kPtr, &raw, kPtr);
    return p;
}

void free_aligned(void *p) {
    if (!p) return;
    void *raw;
    std::memcpy(&raw, static_cast<unsigned char *>(p) - kPtr, kPtr);
    std::free(raw);
}

}  // namespace

extern "C" {

VAMRNB_API void *vcmn_malloc_align32(uint32_t size) { return alloc_aligned(size); }
VAMRNB_API void *vcmn_malloc_fast_align32(uint32_t size) { return alloc_aligned(size); }
VAMRNB_API void vcmn_mfree_align32(void *p) { free_aligned(p); }
VAMRNB_API void vcmn_mfree_fast_align32(void *p) { free_aligned(p); }

// Copies `rows` rows of `row_bytes` bytes; row r starts at dst + r*dst_stride
// and src + r*src_stride.  Rows must not overlap.  Row addresses are formed
// as integers so that a negative stride or the step after the last row never
// forms an out-of-range pointer.
VAMRNB_API void vcmn_blk_mcpy(void *dst, const void *src, int32_t dst_stride,
                              int32_t src_stride, uint32_t row_bytes, int32_t rows) {
    uintptr_t d = reinterpret_cast<uintptr_t>(dst);
    uintptr_t s = reinterpret_cast<uintptr_t>(src);
    const uintptr_t dstep = static_cast<uintptr_t>(static_cast<intptr_t>(dst_stride));
    const uintptr_t sstep = static_cast<uintptr_t>(static_cast<intptr_t>(src_stride));
    for (int32_t r = 0; r < rows; ++r) {
        std::memcpy(reinterpret_cast<void *>(d), reinterpret_cast<const void *>(s), row_bytes);
        d += dstep;
        s += sstep;
    }
}

}  // extern "C"
