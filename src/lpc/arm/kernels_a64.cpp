// A64 versions of the hottest subframe kernels, for AArch64 only.  They use
// what the 64-bit instruction set adds to the vector unit: the "high half"
// multiply-accumulates and narrows, which work on all eight lanes of one
// register with one load, and the across-vector sums and maxima.  Each gives
// the same bits as its NEON and portable versions.
#include "lpc/arm/dsp_arm.h"

#if defined(VAMRNB_DSP_NEON) && defined(__aarch64__)

#include "lpc/arm/simd_arm.h"
#include "lpc/kernel_common.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
void residu_a64(const Word16 *a, const Word16 *x, Word16 *y) {
    for (int n = 0; n < L_SUBFR; n += 8) {
        int16x8_t v = vld1q_s16(x + n);
        int32x4_t lo = vqdmull_n_s16(vget_low_s16(v), a[0]);
        int32x4_t hi = vqdmull_high_n_s16(v, a[0]);
        for (int i = 1; i <= M; ++i) {
            v = vld1q_s16(x + n - i);
            lo = vqdmlal_n_s16(lo, vget_low_s16(v), a[i]);
            hi = vqdmlal_high_n_s16(hi, v, a[i]);
        }
        lo = vqshlq_n_s32(lo, 3);
        hi = vqshlq_n_s32(hi, 3);
        vst1q_s16(y + n, vqrshrn_high_n_s32(vqrshrn_n_s32(lo, 16), hi, 16));
    }
}

void pred_lt_3or6_a64(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Eight outputs per step read at most 17 samples ahead of the first.
    if (T0 < 18) {
        pred_lt_3or6_neon(T0, frac, flag3, exc);
        return;
    }
    Word16 c1[10], c2[10];
    const Word16 *x0 = enc_kernel::pred_lt_taps(T0, frac, flag3, exc, c1, c2);
    for (int j = 0; j < L_SUBFR; j += 8) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i < 10; ++i) {
            const int16x8_t p = vld1q_s16(x0 + j - i), q = vld1q_s16(x0 + j + 1 + i);
            lo = vqdmlal_n_s16(lo, vget_low_s16(p), c1[i]);
            lo = vqdmlal_n_s16(lo, vget_low_s16(q), c2[i]);
            hi = vqdmlal_high_n_s16(hi, p, c1[i]);
            hi = vqdmlal_high_n_s16(hi, q, c2[i]);
        }
        vst1q_s16(exc + j, vqrshrn_high_n_s32(vqrshrn_n_s32(lo, 16), hi, 16));
    }
}

}  // namespace vamrnb

#endif
