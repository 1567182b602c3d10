// Helpers shared by the NEON kernels (32-bit ARM and AArch64, where they take
// their A64 forms).  NEON has the codec's fixed-point steps as instructions
// (vqdmlal: saturating doubling multiply-accumulate, vqdmulh: mult, vqrshrn:
// round16 and narrow), so what is shared here are the reductions and the
// plain sums that range bounds allow.
#pragma once

#include <arm_neon.h>

#include "basic_op/basic_op.h"

namespace vamrnb::arm {

// Plain (wrapping) sum of the lanes.
inline int32_t hsum(int32x4_t v) {
#if defined(__aarch64__)
    return vaddvq_s32(v);   // one across-vector add
#else
    const int32x2_t p = vadd_s32(vget_low_s32(v), vget_high_s32(v));
    return vget_lane_s32(vpadd_s32(p, p), 0);
#endif
}

// Exact products of eight sample pairs added into four lanes.
inline int32x4_t mla8(int32x4_t acc, int16x8_t a, int16x8_t b) {
    acc = vmlal_s16(acc, vget_low_s16(a), vget_low_s16(b));
#if defined(__aarch64__)
    return vmlal_high_s16(acc, a, b);   // the high halves in place
#else
    return vmlal_s16(acc, vget_high_s16(a), vget_high_s16(b));
#endif
}

// Eight exact products p[0..7]·c added to (lo, hi).
inline void mla8_n(int32x4_t &lo, int32x4_t &hi, const Word16 *p, Word16 c) {
#if defined(__aarch64__)
    const int16x8_t v = vld1q_s16(p);   // one load, the high half in place
    lo = vmlal_n_s16(lo, vget_low_s16(v), c);
    hi = vmlal_high_n_s16(hi, v, c);
#else
    lo = vmlal_n_s16(lo, vld1_s16(p), c);
    hi = vmlal_n_s16(hi, vld1_s16(p + 4), c);
#endif
}

// 2·sum x·y in any order; only for sums known not to saturate.
inline Word32 dot_exact(const Word16 *x, const Word16 *y, Word32 n) {
    int32x4_t acc = vdupq_n_s32(0);
    Word32 j = 0;
    for (; j + 8 <= n; j += 8) acc = mla8(acc, vld1q_s16(x + j), vld1q_s16(y + j));
    int64_t s = hsum(acc);
    for (; j < n; ++j) s += int64_t{x[j]} * y[j];
    return static_cast<Word32>(2 * s);
}

// Sums of four squares for the two 4-sample rows held in one register,
// exact as unsigned values (each below 2^32).
inline uint32x2_t row_sums(int16x8_t t) {
    const uint32x4_t lo = vreinterpretq_u32_s32(vmull_s16(vget_low_s16(t), vget_low_s16(t)));
    const uint32x4_t hi = vreinterpretq_u32_s32(vmull_s16(vget_high_s16(t), vget_high_s16(t)));
    return vpadd_u32(vpadd_u32(vget_low_u32(lo), vget_high_u32(lo)),
                     vpadd_u32(vget_low_u32(hi), vget_high_u32(hi)));
}

}  // namespace vamrnb::arm
