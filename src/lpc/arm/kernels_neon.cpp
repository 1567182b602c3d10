// NEON versions of the subframe kernels.  The saturating doubling
// multiply-accumulate (vqdmlal), saturating shift (vqshl) and rounding
// saturating narrow (vqrshrn) are exactly the fixed-point steps of the
// portable versions, lane by lane; four lanes carry four output samples.
// Built only for ARM targets with NEON (the 32-bit ARM build requires it).
// The *_a64 versions at the end use what only the 64-bit instruction set has:
// across-vector sums and maxima, and the "high half" multiply-accumulates and
// narrows that work on all eight lanes of one register.
#include "lpc/dsp.h"

#if defined(VAMRNB_DSP_NEON)

#include <arm_neon.h>

#include "lpc/enc_kernels.h"
#include "lpc/lpc.h"
#include "lpc/syn_core.h"
#include "lpc/tables.h"

namespace vamrnb {
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
        y[0] = Rule::out(p[0], overflow);
        y[1] = Rule::out(wrap_sub(p[1], wrap_mul(a[1], y[0])), overflow);
        y[2] = Rule::out(wrap_sub(p[2], wrap_add(wrap_mul(a[1], y[1]), wrap_mul(a[2], y[0]))), overflow);
        y[3] = Rule::out(wrap_sub(p[3], wrap_add(wrap_add(wrap_mul(a[1], y[2]), wrap_mul(a[2], y[1])),
                                                 wrap_mul(a[3], y[0]))),
                         overflow);
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

namespace {

// Interpolation set-up shared by the NEON versions of pred_lt_3or6: the first
// source sample and the two coefficient halves for the fraction.
struct PredLtTaps {
    const Word16 *x0;
    Word16 c1[10], c2[10];
    PredLtTaps(Word32 T0, Word32 frac, Word32 flag3, const Word16 *exc) {
        Word32 f = -frac;
        if (flag3 != 0) f *= 2;
        x0 = exc - T0;
        if (f < 0) {
            f += 6;
            --x0;
        }
        for (int i = 0; i < 10; ++i) {
            c1[i] = vamrnb_tbl_pred_inter_6[f + 6 * i];
            c2[i] = vamrnb_tbl_pred_inter_6[6 - f + 6 * i];
        }
    }
};

}  // namespace

void pred_lt_3or6_neon(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Eight outputs per step need a delay of at least 18, four need 14.
    if (T0 < 14) {
        pred_lt_3or6_c(T0, frac, flag3, exc);
        return;
    }
    const PredLtTaps t(T0, frac, flag3, exc);
    const Word16 *x0 = t.x0;
    const int step = T0 >= 18 ? 8 : 4;
    for (int j = 0; j < L_SUBFR; j += step) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i < 10; ++i) {
            lo = vqdmlal_n_s16(lo, vld1_s16(x0 + j - i), t.c1[i]);
            lo = vqdmlal_n_s16(lo, vld1_s16(x0 + j + 1 + i), t.c2[i]);
            if (step == 8) {
                hi = vqdmlal_n_s16(hi, vld1_s16(x0 + j + 4 - i), t.c1[i]);
                hi = vqdmlal_n_s16(hi, vld1_s16(x0 + j + 5 + i), t.c2[i]);
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

namespace {

// The end of an inner product whose first n8 terms were summed in lanes
// (exact sum `lanes`, largest magnitudes max_x, max_y): the remaining terms,
// then the exact result when no partial sum can saturate (see the SSE4.1
// version), otherwise the portable sequential version.
Word32 inner_product_finish(const Word16 *x, const Word16 *y, Word32 n, Word32 n8, Word32 init,
                            int64_t lanes, int64_t max_x, int64_t max_y) {
    int64_t tail = 0;
    for (Word32 i = n8; i < n; ++i) {
        const int64_t px = x[i] < 0 ? -int64_t{x[i]} : x[i];
        const int64_t py = y[i] < 0 ? -int64_t{y[i]} : y[i];
        max_x = px > max_x ? px : max_x;
        max_y = py > max_y ? py : max_y;
        tail += int64_t{x[i]} * y[i];
    }
    const int64_t abs_init = init < 0 ? -int64_t{init} : init;
    if (abs_init + 2 * int64_t{n} * max_x * max_y > MAX_32) return inner_product_c(x, y, n, init);
    return static_cast<Word32>(init + 2 * (lanes + tail));
}

}  // namespace

Word32 inner_product_neon(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    if (n <= 0) return init;
    const Word32 n8 = n & ~7;
    uint16x8_t mx = vdupq_n_u16(0), my = vdupq_n_u16(0);
    int32x4_t acc = vdupq_n_s32(0);
    for (Word32 i = 0; i < n8; i += 8) {
        const int16x8_t a = vld1q_s16(x + i), b = vld1q_s16(y + i);
        mx = vmaxq_u16(mx, vreinterpretq_u16_s16(vabsq_s16(a)));
        my = vmaxq_u16(my, vreinterpretq_u16_s16(vabsq_s16(b)));
        acc = vmlal_s16(acc, vget_low_s16(a), vget_low_s16(b));
        acc = vmlal_s16(acc, vget_high_s16(a), vget_high_s16(b));
    }
    uint16_t ax[8], ay[8];
    int32_t sums[4];
    vst1q_u16(ax, mx);
    vst1q_u16(ay, my);
    vst1q_s32(sums, acc);
    int64_t max_x = 0, max_y = 0;
    for (int k = 0; k < 8; ++k) {
        max_x = ax[k] > max_x ? ax[k] : max_x;
        max_y = ay[k] > max_y ? ay[k] : max_y;
    }
    const int64_t lanes = int64_t{sums[0]} + sums[1] + sums[2] + sums[3];
    return inner_product_finish(x, y, n, n8, init, lanes, max_x, max_y);
}

namespace {

// Eight exact products p[0..7]·c added to (lo, hi).
template <bool A64>
inline void mlal8(int32x4_t &lo, int32x4_t &hi, const Word16 *p, Word16 c) {
#if defined(VAMRNB_DSP_A64)
    if constexpr (A64) {
        const int16x8_t v = vld1q_s16(p);
        lo = vmlal_n_s16(lo, vget_low_s16(v), c);
        hi = vmlal_high_n_s16(hi, v, c);
        return;
    }
#endif
    lo = vmlal_n_s16(lo, vld1_s16(p), c);
    hi = vmlal_n_s16(hi, vld1_s16(p + 4), c);
}

template <bool A64>
Word32 dot_exact(const Word16 *x, const Word16 *y, Word32 n) {
    int32x4_t acc = vdupq_n_s32(0);
    Word32 j = 0;
    for (; j + 8 <= n; j += 8) {
        const int16x8_t a = vld1q_s16(x + j), b = vld1q_s16(y + j);
        acc = vmlal_s16(acc, vget_low_s16(a), vget_low_s16(b));
#if defined(VAMRNB_DSP_A64)
        if constexpr (A64) {
            acc = vmlal_high_s16(acc, a, b);
            continue;
        }
#endif
        acc = vmlal_s16(acc, vget_high_s16(a), vget_high_s16(b));
    }
    int64_t s;
#if defined(VAMRNB_DSP_A64)
    if constexpr (A64) {
        s = vaddlvq_s32(acc);
    } else
#endif
    {
        const int32x2_t p = vadd_s32(vget_low_s32(acc), vget_high_s32(acc));
        s = int64_t{vget_lane_s32(p, 0)} + vget_lane_s32(p, 1);
    }
    for (; j < n; ++j) s += int64_t{x[j]} * y[j];
    return static_cast<Word32>(2 * s);
}

// Eight convolution outputs from their exact sums.
template <bool A64>
inline void convolve_store8(Word16 *y, int32x4_t lo, int32x4_t hi) {
#if defined(VAMRNB_DSP_A64)
    if constexpr (A64) {
        // The wrapping doubling, the saturating shift by 3, the high half.
        lo = vqshlq_n_s32(vshlq_n_s32(lo, 1), 3);
        hi = vqshlq_n_s32(vshlq_n_s32(hi, 1), 3);
        vst1q_s16(y, vshrn_high_n_s32(vshrn_n_s32(lo, 16), hi, 16));
        return;
    }
#endif
    Word32 s[8];
    vst1q_s32(s, lo);
    vst1q_s32(s + 4, hi);
    for (int k = 0; k < 8; ++k) y[k] = enc_kernel::convolve_out(wrap_shl(s[k], 1));
}

// Eight outputs per step; h is read through a copy with 40 zeros in front so
// that terms past the causal limit vanish.
template <bool A64>
void convolve_run(const Word16 *x, const Word16 *h, Word16 *y) {
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::convolve_sat(x, h, y);
        return;
    }
    Word16 hp[2 * L_SUBFR] = {};
    for (int i = 0; i < L_SUBFR; ++i) hp[L_SUBFR + i] = h[i];
    for (int n = 0; n < L_SUBFR; n += 8) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i <= n + 7 && i < L_SUBFR; ++i) mlal8<A64>(lo, hi, hp + L_SUBFR + n - i, x[i]);
        convolve_store8<A64>(y + n, lo, hi);
    }
}

template <bool A64>
void cor_h_x_run(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    Word32 y[L_SUBFR];
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::cor_h_x_sat(h, x, y);
    } else {
        Word16 q[2 * L_SUBFR + 8];
        enc_kernel::cor_h_x_reverse(h, q, 2 * L_SUBFR + 8);
        for (int i = 0; i < L_SUBFR; i += 8) {
            int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
            for (int j = i; j < L_SUBFR; ++j) mlal8<A64>(lo, hi, q + 39 + i - j, x[j]);
            vst1q_s32(y + i, vshlq_n_s32(lo, 1));
            vst1q_s32(y + i + 4, vshlq_n_s32(hi, 1));
        }
    }
    enc_kernel::cor_h_x_scale(y, dn, sf);
}

}  // namespace

void comp_corr_neon(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact<false>);
}

void convolve_neon(const Word16 *x, const Word16 *h, Word16 *y) { convolve_run<false>(x, h, y); }

void cor_h_x_neon(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    cor_h_x_run<false>(h, x, dn, sf);
}

namespace {

// Row sums of four squares for two rows held in one register.
inline uint32x2_t row_sums(int16x8_t t) {
    const uint32x4_t lo = vreinterpretq_u32_s32(vmull_s16(vget_low_s16(t), vget_low_s16(t)));
    const uint32x4_t hi = vreinterpretq_u32_s32(vmull_s16(vget_high_s16(t), vget_high_s16(t)));
    return vpadd_u32(vpadd_u32(vget_low_u32(lo), vget_high_u32(lo)),
                     vpadd_u32(vget_low_u32(hi), vget_high_u32(hi)));
}

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

#if defined(VAMRNB_DSP_A64)

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
    const PredLtTaps t(T0, frac, flag3, exc);
    for (int j = 0; j < L_SUBFR; j += 8) {
        int32x4_t lo = vdupq_n_s32(0), hi = vdupq_n_s32(0);
        for (int i = 0; i < 10; ++i) {
            const int16x8_t p = vld1q_s16(t.x0 + j - i), q = vld1q_s16(t.x0 + j + 1 + i);
            lo = vqdmlal_n_s16(lo, vget_low_s16(p), t.c1[i]);
            lo = vqdmlal_n_s16(lo, vget_low_s16(q), t.c2[i]);
            hi = vqdmlal_high_n_s16(hi, p, t.c1[i]);
            hi = vqdmlal_high_n_s16(hi, q, t.c2[i]);
        }
        vst1q_s16(exc + j, vqrshrn_high_n_s32(vqrshrn_n_s32(lo, 16), hi, 16));
    }
}

Word32 inner_product_a64(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    if (n <= 0) return init;
    const Word32 n8 = n & ~7;
    uint16x8_t mx = vdupq_n_u16(0), my = vdupq_n_u16(0);
    int32x4_t acc = vdupq_n_s32(0);
    for (Word32 i = 0; i < n8; i += 8) {
        const int16x8_t a = vld1q_s16(x + i), b = vld1q_s16(y + i);
        mx = vmaxq_u16(mx, vreinterpretq_u16_s16(vabsq_s16(a)));
        my = vmaxq_u16(my, vreinterpretq_u16_s16(vabsq_s16(b)));
        acc = vmlal_s16(acc, vget_low_s16(a), vget_low_s16(b));
        acc = vmlal_high_s16(acc, a, b);
    }
    return inner_product_finish(x, y, n, n8, init, vaddlvq_s32(acc), vmaxvq_u16(mx), vmaxvq_u16(my));
}

void comp_corr_a64(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact<true>);
}

void convolve_a64(const Word16 *x, const Word16 *h, Word16 *y) { convolve_run<true>(x, h, y); }

void cor_h_x_a64(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    cor_h_x_run<true>(h, x, dn, sf);
}

#endif  // VAMRNB_DSP_A64

}  // namespace vamrnb

#endif  // VAMRNB_DSP_NEON
