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
namespace {

// Eight exact products p[0..7]·c added to (lo, hi).
inline void mla8_n(int32x4_t &lo, int32x4_t &hi, const Word16 *p, Word16 c) {
    const int16x8_t v = vld1q_s16(p);
    lo = vmlal_n_s16(lo, vget_low_s16(v), c);
    hi = vmlal_high_n_s16(hi, v, c);
}

}  // namespace

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

// The lanes' sum and maxima leave the registers as three scalars, not as
// stored vectors.
Word32 inner_product_a64(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    if (n <= 0) return init;
    const Word32 n8 = n & ~7;
    uint16x8_t mx = vdupq_n_u16(0), my = vdupq_n_u16(0);
    int32x4_t acc = vdupq_n_s32(0);
    for (Word32 i = 0; i < n8; i += 8) {
        const int16x8_t a = vld1q_s16(x + i), b = vld1q_s16(y + i);
        mx = vmaxq_u16(mx, vreinterpretq_u16_s16(vabsq_s16(a)));
        my = vmaxq_u16(my, vreinterpretq_u16_s16(vabsq_s16(b)));
        acc = arm::mla8(acc, a, b);
    }
    return enc_kernel::inner_product_finish(x, y, n, n8, init, vaddlvq_s32(acc), vmaxvq_u16(mx),
                                            vmaxvq_u16(my), inner_product_c);
}

// Eight outputs per step, as the NEON version; h is read through a copy with
// 40 zeros in front so that terms past the causal limit vanish.  The output
// steps run on all eight lanes: the wrapping doubling, the saturating shift
// by 3 and the high half.
void convolve_a64(const Word16 *x, const Word16 *h, Word16 *y) {
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::convolve_sat(x, h, y);
        return;
    }
    Word16 hp[2 * L_SUBFR] = {};
    for (int i = 0; i < L_SUBFR; ++i) hp[L_SUBFR + i] = h[i];
    for (int n = 0; n < L_SUBFR; n += 8) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i <= n + 7 && i < L_SUBFR; ++i) mla8_n(lo, hi, hp + L_SUBFR + n - i, x[i]);
        lo = vqshlq_n_s32(vshlq_n_s32(lo, 1), 3);
        hi = vqshlq_n_s32(vshlq_n_s32(hi, 1), 3);
        vst1q_s16(y + n, vshrn_high_n_s32(vshrn_n_s32(lo, 16), hi, 16));
    }
}

void cor_h_x_a64(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    Word32 y[L_SUBFR];
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::cor_h_x_sat(h, x, y);
    } else {
        Word16 q[2 * L_SUBFR + 8];
        enc_kernel::cor_h_x_reverse(h, q, 2 * L_SUBFR + 8);
        for (int i = 0; i < L_SUBFR; i += 8) {
            int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
            for (int j = i; j < L_SUBFR; ++j) mla8_n(lo, hi, q + 39 + i - j, x[j]);
            vst1q_s32(y + i, vshlq_n_s32(lo, 1));
            vst1q_s32(y + i + 4, vshlq_n_s32(hi, 1));
        }
    }
    enc_kernel::cor_h_x_scale(y, dn, sf);
}

}  // namespace vamrnb

#endif
