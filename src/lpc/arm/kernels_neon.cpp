// NEON versions of the subframe kernels.  The saturating doubling
// multiply-accumulate (vqdmlal), saturating shift (vqshl) and rounding
// saturating narrow (vqrshrn) are exactly the fixed-point steps of the
// portable versions, lane by lane; four lanes carry four output samples.
// Built only for ARM targets with NEON (the 32-bit ARM build requires it;
// AArch64 always has it).
#include "lpc/arm/dsp_arm.h"

#if defined(VAMRNB_DSP_NEON)

#include "lpc/arm/simd_arm.h"
#include "lpc/kernel_common.h"
#include "lpc/lpc.h"
#include "lpc/syn_core.h"
#include "lpc/tables.h"

namespace vamrnb {
using namespace arm;
namespace {

// Synthesis, four outputs per step (see the SSE4.1 version): the vector
// forms each lane's sum over outputs of earlier steps, the remaining taps
// are added lane by lane in order.
template <class Rule>
inline void syn_run(const Word16 *a, const Word16 *x, Word16 *buf, Word32 *overflow) {
    int32x4_t coef[M + 1];
    for (int i = 1; i <= M; ++i) {
        const int32_t c[4] = {a[i], i > 1 ? a[i] : 0, i > 2 ? a[i] : 0, i > 3 ? a[i] : 0};
        coef[i] = vld1q_s32(c);
    }
    const int32x4_t a0 = vdupq_n_s32(a[0]);
    for (int n = 0; n < L_SUBFR; n += 4) {
        Word16 *y = buf + M + n;
        int32x4_t s = vmulq_s32(a0, vmovl_s16(vld1_s16(x + n)));
        for (int i = 1; i <= M; ++i) s = vmlsq_s32(s, coef[i], vmovl_s16(vld1_s16(y - i)));
        int32_t p[4];
        vst1q_s32(p, s);
        syn::finish4<Rule>(a, p, y, overflow);
    }
}

}  // namespace

void syn_filt_neon(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y) {
    Word16 buf[M + L_SUBFR + 6] = {};
    for (int i = 0; i < M; ++i) buf[i] = mem[i];
    syn_run<syn::Plain>(a, x, buf, nullptr);
    for (int n = 0; n < L_SUBFR; ++n) y[n] = buf[M + n];
}

void syn_filt_m_neon(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *out) {
    Word16 buf[M + L_SUBFR + 6] = {};
    for (int i = 0; i < M; ++i) buf[i] = out[i];
    syn_run<syn::Flagged>(a, x, buf, overflow);
    for (int n = 0; n < L_SUBFR; ++n) out[M + n] = buf[M + n];
}

void residu_neon(const Word16 *a, const Word16 *x, Word16 *y) {
    for (int n = 0; n < L_SUBFR; n += 8) {
        int32x4_t lo = vqdmull_n_s16(vld1_s16(x + n), a[0]);
        int32x4_t hi = vqdmull_n_s16(vld1_s16(x + n + 4), a[0]);
        for (int i = 1; i <= M; ++i) {
            lo = vqdmlal_n_s16(lo, vld1_s16(x + n - i), a[i]);
            hi = vqdmlal_n_s16(hi, vld1_s16(x + n + 4 - i), a[i]);
        }
        lo = vqshlq_n_s32(lo, 3);
        hi = vqshlq_n_s32(hi, 3);
        vst1q_s16(y + n, vcombine_s16(vqrshrn_n_s32(lo, 16), vqrshrn_n_s32(hi, 16)));
    }
}

void pred_lt_3or6_neon(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Eight outputs per step need a delay of at least 18, four need 14.
    if (T0 < 14) {
        pred_lt_3or6_c(T0, frac, flag3, exc);
        return;
    }
    Word16 c1[10], c2[10];
    const Word16 *x0 = enc_kernel::pred_lt_taps(T0, frac, flag3, exc, c1, c2);
    const int step = T0 >= 18 ? 8 : 4;
    for (int j = 0; j < L_SUBFR; j += step) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i < 10; ++i) {
            lo = vqdmlal_n_s16(lo, vld1_s16(x0 + j - i), c1[i]);
            lo = vqdmlal_n_s16(lo, vld1_s16(x0 + j + 1 + i), c2[i]);
            if (step == 8) {
                hi = vqdmlal_n_s16(hi, vld1_s16(x0 + j + 4 - i), c1[i]);
                hi = vqdmlal_n_s16(hi, vld1_s16(x0 + j + 5 + i), c2[i]);
            }
        }
        vst1_s16(exc + j, vqrshrn_n_s32(lo, 16));
        if (step == 8) vst1_s16(exc + j + 4, vqrshrn_n_s32(hi, 16));
    }
}

Word32 energy_neon(const Word16 *x, Word32 n, Word32 init) {
    int32x4_t lo = vsetq_lane_s32(init, vdupq_n_s32(0), 0), hi = vdupq_n_s32(0);
    const Word32 steps = n <= 0 ? 1 : (n + 7) / 8;
    for (Word32 s = 0; s < steps; ++s, x += 8) {
        const int16x4_t a = vld1_s16(x), b = vld1_s16(x + 4);
        lo = vqdmlal_s16(lo, a, a);
        hi = vqdmlal_s16(hi, b, b);
    }
    const int32x4_t c = vqaddq_s32(lo, hi);                          // lanes k + k+4
    const int32x2_t d = vqadd_s32(vget_low_s32(c), vget_high_s32(c));  // 0+2, 1+3
    return vget_lane_s32(vqadd_s32(d, vrev64_s32(d)), 0);
}

// The exact sum where the bound allows it (kernel_common.h), otherwise the
// portable sequential version.
Word32 inner_product_neon(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    if (n <= 0) return init;
    const Word32 n8 = n & ~7;
    uint16x8_t mx = vdupq_n_u16(0), my = vdupq_n_u16(0);
    int32x4_t acc = vdupq_n_s32(0);
    for (Word32 i = 0; i < n8; i += 8) {
        const int16x8_t a = vld1q_s16(x + i), b = vld1q_s16(y + i);
        mx = vmaxq_u16(mx, vreinterpretq_u16_s16(vabsq_s16(a)));
        my = vmaxq_u16(my, vreinterpretq_u16_s16(vabsq_s16(b)));
        acc = mla8(acc, a, b);
    }
#if defined(__aarch64__)
    // The lanes' sum and maxima leave the registers as three scalars.
    return enc_kernel::inner_product_finish(x, y, n, n8, init, vaddlvq_s32(acc), vmaxvq_u16(mx),
                                            vmaxvq_u16(my), inner_product_c);
#else
    uint16_t ax[8], ay[8];
    int32_t sums[4];
    vst1q_u16(ax, mx);
    vst1q_u16(ay, my);
    vst1q_s32(sums, acc);
    return enc_kernel::inner_product_finish(x, y, n, n8, init, ax, ay, sums, inner_product_c);
#endif
}

// Normalised-correlation lag loop with the 40-sample filtered excitation in
// five registers (see the SSE4.1 version): squares are summed pairwise into
// 64-bit lanes, the correlation in 32-bit lanes when the energies rule out
// saturation, and the next excitation is formed before any block is stored;
// the saturating narrow is sat16_32 of the portable version.
void norm_corr_sums_neon(const Word16 *excf, const Word16 *xn, const Word16 *h, const Word16 *x_new,
                         Word32 n_lags, Word32 scaling, Word32 *energy, Word32 *dot) {
    Word16 buf[8 + L_SUBFR] = {};
    Word16 *cur = buf + 8;
    for (int j = 0; j < L_SUBFR; ++j) cur[j] = excf[j];

    int16x8_t xv[5], hv[5];
    for (int k = 0; k < 5; ++k) {
        xv[k] = vld1q_s16(xn + 8 * k);
        hv[k] = vld1q_s16(h + 8 * k);
    }
    const int s = 4 - scaling;   // see norm_corr_sums_c
    const int32x4_t lo = vdupq_n_s32(MIN_32 >> s), hi = vdupq_n_s32(MAX_32 >> s);
    const int32x4_t sh = vdupq_n_s32(-(16 - s));
    const int64_t xn_sq = enc_kernel::sum_sq(xn, L_SUBFR);

    for (Word32 i = 0;; ++i) {
        uint64x2_t sq = vdupq_n_u64(0);
        int32x4_t acc = vdupq_n_s32(0);
        for (int k = 0; k < 5; ++k) {
            const int16x8_t v = vld1q_s16(cur + 8 * k);
            sq = vpadalq_u32(sq, vreinterpretq_u32_s32(vmull_s16(vget_low_s16(v), vget_low_s16(v))));
            sq = vpadalq_u32(sq, vreinterpretq_u32_s32(vmull_s16(vget_high_s16(v), vget_high_s16(v))));
            acc = mla8(acc, xv[k], v);
        }
        const int64_t cur_sq = static_cast<int64_t>(vgetq_lane_u64(sq, 0) + vgetq_lane_u64(sq, 1));
        energy[i] = cur_sq > (MAX_32 >> 1) ? MAX_32 : static_cast<Word32>(2 * cur_sq);
        dot[i] = enc_kernel::no_saturation(xn_sq, cur_sq) ? 2 * hsum(acc)
                                                           : enc_kernel::dot_sat(xn, cur, L_SUBFR);
        if (i + 1 >= n_lags) break;

        const int16_t e = x_new[-i];
        int16x8_t out[5];
        for (int k = 0; k < 5; ++k) {
            const int16x8_t prev = vld1q_s16(cur + 8 * k - 1);
            int32x4_t p0 = vmull_n_s16(vget_low_s16(hv[k]), e);
            int32x4_t p1 = vmull_n_s16(vget_high_s16(hv[k]), e);
            p0 = vshlq_s32(vminq_s32(vmaxq_s32(p0, lo), hi), sh);
            p1 = vshlq_s32(vminq_s32(vmaxq_s32(p1, lo), hi), sh);
            p0 = vaddw_s16(p0, vget_low_s16(prev));
            p1 = vaddw_s16(p1, vget_high_s16(prev));
            out[k] = vcombine_s16(vqmovn_s32(p0), vqmovn_s32(p1));
        }
        for (int k = 0; k < 5; ++k) vst1q_s16(cur + 8 * k, out[k]);
        cur[0] = shr(x_new[-i], scaling);
    }
}

void comp_corr_neon(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact);
}

// Eight outputs per step; h is read through a copy with 40 zeros in front so
// that terms past the causal limit vanish.
void convolve_neon(const Word16 *x, const Word16 *h, Word16 *y) {
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::convolve_sat(x, h, y);
        return;
    }
    Word16 hp[2 * L_SUBFR] = {};
    for (int i = 0; i < L_SUBFR; ++i) hp[L_SUBFR + i] = h[i];
    for (int n = 0; n < L_SUBFR; n += 8) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i <= n + 7 && i < L_SUBFR; ++i) mla8_n(lo, hi, hp + L_SUBFR + n - i, x[i]);
#if defined(__aarch64__)
        // The output steps on all eight lanes: the wrapping doubling, the
        // saturating shift by 3 and the high half.
        lo = vqshlq_n_s32(vshlq_n_s32(lo, 1), 3);
        hi = vqshlq_n_s32(vshlq_n_s32(hi, 1), 3);
        vst1q_s16(y + n, vshrn_high_n_s32(vshrn_n_s32(lo, 16), hi, 16));
#else
        Word32 s[8];
        vst1q_s32(s, lo);
        vst1q_s32(s + 4, hi);
        for (int k = 0; k < 8; ++k) y[n + k] = enc_kernel::convolve_out(wrap_shl(s[k], 1));
#endif
    }
}

void cor_h_x_neon(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
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

namespace {

// Distances of four rows (two per register), saturated like the running sum;
// vqdmulh is exactly mult().
template <bool Negated>
inline uint32x4_t vq_dist4(int16x8_t rv, int16x8_t wv, int16x8_t a, int16x8_t b) {
    const int16x8_t da = Negated ? vqaddq_s16(rv, a) : vqsubq_s16(rv, a);
    const int16x8_t db = Negated ? vqaddq_s16(rv, b) : vqsubq_s16(rv, b);
    const uint32x4_t sum = vcombine_u32(row_sums(vqdmulhq_s16(wv, da)), row_sums(vqdmulhq_s16(wv, db)));
    const uint32x4_t big = vcgeq_u32(sum, vdupq_n_u32(0x40000000u));
    return vbslq_u32(big, vdupq_n_u32(0x7fffffffu), vshlq_n_u32(sum, 1));
}

template <bool Signed>
enc_kernel::VqPick vq_search(const Word16 r[4], const Word16 w[4], const Word16 *dico, int size) {
    const Word16 r8[8] = {r[0], r[1], r[2], r[3], r[0], r[1], r[2], r[3]};
    const Word16 w8[8] = {w[0], w[1], w[2], w[3], w[0], w[1], w[2], w[3]};
    const int16x8_t rv = vld1q_s16(r8), wv = vld1q_s16(w8);
    const int32_t start[4] = {0, 1, 2, 3};
    uint32x4_t best = vdupq_n_u32(0x7fffffffu);
    int32x4_t bidx = vdupq_n_s32(-1), bsign = vdupq_n_s32(0), cur = vld1q_s32(start);
    const int n4 = size & ~3;
    for (int i = 0; i < n4; i += 4) {
        const int16x8_t a = vld1q_s16(dico + 4 * i), b = vld1q_s16(dico + 4 * i + 8);
        const uint32x4_t d = vq_dist4<false>(rv, wv, a, b);
        uint32x4_t m = vcltq_u32(d, best);
        best = vbslq_u32(m, d, best);
        bidx = vbslq_s32(m, cur, bidx);
        bsign = vbslq_s32(m, vdupq_n_s32(0), bsign);
        if (Signed) {
            const uint32x4_t dn = vq_dist4<true>(rv, wv, a, b);
            m = vcltq_u32(dn, best);
            best = vbslq_u32(m, dn, best);
            bidx = vbslq_s32(m, cur, bidx);
            bsign = vbslq_s32(m, vdupq_n_s32(1), bsign);
        }
        cur = vaddq_s32(cur, vdupq_n_s32(4));
    }
    Word32 dist[4];
    int32_t index[4], sign[4];
    vst1q_s32(dist, vreinterpretq_s32_u32(best));
    vst1q_s32(index, bidx);
    vst1q_s32(sign, bsign);
    return enc_kernel::vq_tail(r, w, dico, n4, size, Signed, enc_kernel::vq_join(dist, index, sign));
}

}  // namespace

int16_t vq_subvec_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1, const Word16 *w2,
                       Word32 size) {
    const Word16 r[4] = {r1[0], r1[1], r2[0], r2[1]}, w[4] = {w1[0], w1[1], w2[0], w2[1]};
    return enc_kernel::vq_finish(r1, r2, dico, vq_search<false>(r, w, dico, size), false);
}

int16_t vq_subvec_s_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                         const Word16 *w2, Word32 size) {
    const Word16 r[4] = {r1[0], r1[1], r2[0], r2[1]}, w[4] = {w1[0], w1[1], w2[0], w2[1]};
    return enc_kernel::vq_finish(r1, r2, dico, vq_search<true>(r, w, dico, size), true);
}

int16_t vq_subvec4_neon(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size) {
    const Word16 rv[4] = {r[0], r[1], r[2], r[3]};
    return enc_kernel::vq_finish(r, r + 2, dico, vq_search<false>(rv, w, dico, size), false);
}

}  // namespace vamrnb

#endif  // VAMRNB_DSP_NEON
