// Helpers shared by the x86 kernels: the fixed-point steps of the portable
// versions rebuilt on 32-bit lanes (x86 has no saturating 32-bit add or
// doubling multiply), at 128 and 256 bits.  Every function carries its own
// target attribute, so the file compiles for any x86 target; callers run
// only when the processor reports the level.
#pragma once

#include <immintrin.h>

#include "basic_op/basic_op.h"

#define VAMRNB_SSE41 __attribute__((target("sse4.1")))
#define VAMRNB_AVX2 __attribute__((target("avx2")))

namespace vamrnb::x86 {

// Saturating 32-bit add per lane: on overflow (both operands' signs differ
// from the sum's) the rail on the side of a's sign.
VAMRNB_SSE41 inline __m128i sat_add(__m128i a, __m128i b) {
    const __m128i s = _mm_add_epi32(a, b);
    const __m128i ovf = _mm_and_si128(_mm_xor_si128(s, a), _mm_xor_si128(s, b));
    const __m128i rail = _mm_xor_si128(_mm_srai_epi32(a, 31), _mm_set1_epi32(0x7fffffff));
    return _mm_castps_si128(_mm_blendv_ps(_mm_castsi128_ps(s), _mm_castsi128_ps(rail),
                                          _mm_castsi128_ps(ovf)));
}
VAMRNB_AVX2 inline __m256i sat_add(__m256i a, __m256i b) {
    const __m256i s = _mm256_add_epi32(a, b);
    const __m256i ovf = _mm256_and_si256(_mm256_xor_si256(s, a), _mm256_xor_si256(s, b));
    const __m256i rail = _mm256_xor_si256(_mm256_srai_epi32(a, 31), _mm256_set1_epi32(0x7fffffff));
    return _mm256_castps_si256(_mm256_blendv_ps(_mm256_castsi256_ps(s), _mm256_castsi256_ps(rail),
                                                _mm256_castsi256_ps(ovf)));
}

// 2·a·b with the one saturating case (-32768·-32768 gives 0x40000000, whose
// double wraps to MIN_32 and is flipped to MAX_32), from 16-bit values
// already widened to 32-bit lanes.
VAMRNB_SSE41 inline __m128i dmul(__m128i a32, __m128i b32) {
    const __m128i p = _mm_mullo_epi32(a32, b32);
    const __m128i sat = _mm_cmpeq_epi32(p, _mm_set1_epi32(0x40000000));
    return _mm_xor_si128(_mm_add_epi32(p, p), sat);
}
VAMRNB_AVX2 inline __m256i dmul(__m256i a32, __m256i b32) {
    const __m256i p = _mm256_mullo_epi32(a32, b32);
    const __m256i sat = _mm256_cmpeq_epi32(p, _mm256_set1_epi32(0x40000000));
    return _mm256_xor_si256(_mm256_add_epi32(p, p), sat);
}

// Saturating left shift by 3: lanes outside [-2^28, 2^28) go to the rails.
VAMRNB_SSE41 inline __m128i sat_shl3(__m128i s) {
    __m128i r = _mm_slli_epi32(s, 3);
    r = _mm_blendv_epi8(r, _mm_set1_epi32(0x7fffffff), _mm_cmpgt_epi32(s, _mm_set1_epi32(0x0FFFFFFF)));
    return _mm_blendv_epi8(r, _mm_set1_epi32(static_cast<int>(0x80000000u)),
                           _mm_cmplt_epi32(s, _mm_set1_epi32(-0x10000000)));
}
VAMRNB_AVX2 inline __m256i sat_shl3(__m256i s) {
    __m256i r = _mm256_slli_epi32(s, 3);
    r = _mm256_blendv_epi8(r, _mm256_set1_epi32(0x7fffffff),
                           _mm256_cmpgt_epi32(s, _mm256_set1_epi32(0x0FFFFFFF)));
    return _mm256_blendv_epi8(r, _mm256_set1_epi32(static_cast<int>(0x80000000u)),
                              _mm256_cmpgt_epi32(_mm256_set1_epi32(-0x10000000), s));
}

// Four or eight Word16 widened to 32-bit lanes.
VAMRNB_SSE41 inline __m128i load4(const Word16 *p) {
    return _mm_cvtepi16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i *>(p)));
}
VAMRNB_AVX2 inline __m256i load8(const Word16 *p) {
    return _mm256_cvtepi16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i *>(p)));
}

// round16 of each lane, stored as Word16.
VAMRNB_SSE41 inline void store_round(Word16 *p, __m128i s) {
    const __m128i r = _mm_srai_epi32(sat_add(s, _mm_set1_epi32(0x8000)), 16);
    _mm_storel_epi64(reinterpret_cast<__m128i *>(p), _mm_packs_epi32(r, r));
}
VAMRNB_AVX2 inline void store_round(Word16 *p, __m256i s) {
    const __m256i r = _mm256_srai_epi32(sat_add(s, _mm256_set1_epi32(0x8000)), 16);
    const __m128i packed = _mm_packs_epi32(_mm256_castsi256_si128(r), _mm256_extracti128_si256(r, 1));
    _mm_storeu_si128(reinterpret_cast<__m128i *>(p), packed);
}

// Plain (wrapping) sum of the lanes.
VAMRNB_SSE41 inline int32_t hsum(__m128i v) {
    v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(1, 0, 3, 2)));
    v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(2, 3, 0, 1)));
    return _mm_cvtsi128_si32(v);
}
VAMRNB_AVX2 inline int32_t hsum(__m256i v) {
    return hsum(_mm_add_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1)));
}

// The pair (lo, hi) of 16-bit values as one 32-bit word, the operand of the
// pair products (_mm_madd_epi16) when broadcast to every lane.
inline int32_t pair16(Word16 lo, Word16 hi) {
    return static_cast<int32_t>(static_cast<uint16_t>(lo) |
                                (static_cast<uint32_t>(static_cast<uint16_t>(hi)) << 16));
}

// 2·sum x·y in any order with 16-bit pair products; only for sums known not
// to saturate (kernel_common.h decides).
VAMRNB_SSE41 inline Word32 dot_exact_sse41(const Word16 *x, const Word16 *y, Word32 n) {
    __m128i acc = _mm_setzero_si128();
    Word32 j = 0;
    for (; j + 8 <= n; j += 8)
        acc = _mm_add_epi32(acc, _mm_madd_epi16(_mm_loadu_si128(reinterpret_cast<const __m128i *>(x + j)),
                                                _mm_loadu_si128(reinterpret_cast<const __m128i *>(y + j))));
    int64_t s = hsum(acc);
    for (; j < n; ++j) s += int64_t{x[j]} * y[j];
    return static_cast<Word32>(2 * s);
}

VAMRNB_AVX2 inline Word32 dot_exact_avx2(const Word16 *x, const Word16 *y, Word32 n) {
    __m256i acc = _mm256_setzero_si256();
    Word32 j = 0;
    for (; j + 16 <= n; j += 16)
        acc = _mm256_add_epi32(
            acc, _mm256_madd_epi16(_mm256_loadu_si256(reinterpret_cast<const __m256i *>(x + j)),
                                   _mm256_loadu_si256(reinterpret_cast<const __m256i *>(y + j))));
    int64_t s = hsum(acc);
    for (; j < n; ++j) s += int64_t{x[j]} * y[j];
    return static_cast<Word32>(2 * s);
}

}  // namespace vamrnb::x86
