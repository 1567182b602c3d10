// SSE4.1 versions of the subframe kernels.  Four 32-bit lanes carry four
// output samples; the saturating 32-bit steps of the portable versions are
// rebuilt lane by lane (simd_x86.h), so every result is bit for bit the
// portable one.  Compiled for any x86 target: the functions carry their own
// target attribute and are only called when the processor reports SSE4.1.
#include "lpc/x86/dsp_x86.h"

#if defined(VAMRNB_DSP_X86)

#include "lpc/kernel_common.h"
#include "lpc/lpc.h"
#include "lpc/syn_core.h"
#include "lpc/tables.h"
#include "lpc/x86/simd_x86.h"

namespace vamrnb {
using namespace x86;
namespace {

// Synthesis, four outputs per step: the part of each lane's sum that uses
// outputs of earlier steps is formed in the vector (coefficients masked to
// zero where a lane would need an output of its own step), the rest is
// completed lane by lane in order.
template <class Rule>
VAMRNB_SSE41 inline void syn_run(const Word16 *a, const Word16 *x, Word16 *buf, Word32 *overflow) {
    // Taps in pairs (i, i+1) for the 16-bit pair products: lane k holds
    // (a[i], a[i+1]) with each coefficient zeroed where the lane's tap would
    // reach an output of the current step (tap index <= k).
    __m128i pair[6];
    for (int p = 0; p < 6; ++p) {
        alignas(16) Word16 c[8];
        for (int k = 0; k < 4; ++k) {
            const int i0 = 2 * p, i1 = 2 * p + 1;   // tap 0 is x's coefficient
            c[2 * k] = i0 == 0 ? 0 : (i0 > k ? a[i0] : 0);
            c[2 * k + 1] = i1 > M ? 0 : (i1 > k ? a[i1] : 0);
        }
        pair[p] = _mm_load_si128(reinterpret_cast<const __m128i *>(c));
    }
    const __m128i a0 = _mm_set1_epi32(a[0] & 0xffff);
    for (int n = 0; n < L_SUBFR; n += 4) {
        Word16 *y = buf + M + n;
        // a[0]·x as a pair product with a zero partner.
        __m128i xs = _mm_unpacklo_epi16(_mm_loadl_epi64(reinterpret_cast<const __m128i *>(x + n)),
                                        _mm_setzero_si128());
        __m128i s = _mm_madd_epi16(xs, a0);
        __m128i acc = _mm_setzero_si128();
        __m128i prev = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(y));   // y[n..n+3], tap 0
        for (int p = 0; p < 6; ++p) {
            const int i0 = 2 * p;
            const __m128i lo = p == 0 ? prev
                                      : _mm_loadl_epi64(reinterpret_cast<const __m128i *>(y - i0));
            const __m128i hi = i0 + 1 > M ? _mm_setzero_si128()
                                          : _mm_loadl_epi64(reinterpret_cast<const __m128i *>(y - i0 - 1));
            acc = _mm_add_epi32(acc, _mm_madd_epi16(_mm_unpacklo_epi16(lo, hi), pair[p]));
        }
        s = _mm_sub_epi32(s, acc);
        alignas(16) Word32 p[4];
        _mm_store_si128(reinterpret_cast<__m128i *>(p), s);
        syn::finish4<Rule>(a, p, y, overflow);
    }
}

}  // namespace

// Both synthesis kernels share the vector step.  Its critical path is the
// same output-to-output chain as the portable loop's, but it takes about
// half the instructions.
VAMRNB_SSE41 void syn_filt_sse41(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y) {
    alignas(16) Word16 buf[M + L_SUBFR + 6] = {};
    for (int i = 0; i < M; ++i) buf[i] = mem[i];
    syn_run<syn::Plain>(a, x, buf, nullptr);
    for (int n = 0; n < L_SUBFR; ++n) y[n] = buf[M + n];
}

VAMRNB_SSE41 void syn_filt_m_sse41(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *out) {
    // Work buffer with the not yet written outputs zeroed: the masked taps
    // read them, multiplied by zero.
    alignas(16) Word16 buf[M + L_SUBFR + 6] = {};
    for (int i = 0; i < M; ++i) buf[i] = out[i];
    syn_run<syn::Flagged>(a, x, buf, overflow);
    for (int n = 0; n < L_SUBFR; ++n) out[M + n] = buf[M + n];
}

VAMRNB_SSE41 void residu_sse41(const Word16 *a, const Word16 *x, Word16 *y) {
    __m128i coef[M + 1];
    for (int i = 0; i <= M; ++i) coef[i] = _mm_set1_epi32(a[i]);
    for (int n = 0; n < L_SUBFR; n += 4) {
        __m128i s = dmul(load4(x + n), coef[0]);
        for (int i = 1; i <= M; ++i) s = sat_add(s, dmul(coef[i], load4(x + n - i)));
        store_round(y + n, sat_shl3(s));
    }
}

VAMRNB_SSE41 void pred_lt_3or6_sse41(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Four outputs at a time read nothing of their own step only when the
    // delay leaves at least four samples between the newest read and the
    // first output of the step.
    if (T0 < 14) {
        pred_lt_3or6_c(T0, frac, flag3, exc);
        return;
    }
    Word16 t1[10], t2[10];
    const Word16 *x0 = enc_kernel::pred_lt_taps(T0, frac, flag3, exc, t1, t2);
    __m128i c1[10], c2[10];
    for (int i = 0; i < 10; ++i) {
        c1[i] = _mm_set1_epi32(t1[i]);
        c2[i] = _mm_set1_epi32(t2[i]);
    }
    for (int j = 0; j < L_SUBFR; j += 4) {
        __m128i s = _mm_setzero_si128();
        for (int i = 0; i < 10; ++i) {
            s = sat_add(s, dmul(load4(x0 + j - i), c1[i]));
            s = sat_add(s, dmul(load4(x0 + j + 1 + i), c2[i]));
        }
        store_round(exc + j, s);
    }
}

// From a start value of 0 or more every term is 0 or more, so the lanes and
// their joins can only saturate upwards and stay at the top once there: the
// result is the exact sum, capped.  The exact sum is formed from the pair
// squares (each below 2^31 + 1, taken unsigned) in 64-bit lanes.  A negative
// start value takes the saturating lanes.
VAMRNB_SSE41 Word32 energy_sse41(const Word16 *x, Word32 n, Word32 init) {
    const Word32 steps = n <= 0 ? 1 : (n + 7) / 8;
    if (init >= 0) {
        const __m128i zero = _mm_setzero_si128();
        __m128i acc = zero;
        const Word16 *p = x;
        for (Word32 s = 0; s < steps; ++s, p += 8) {
            const __m128i v = _mm_loadu_si128(reinterpret_cast<const __m128i *>(p));
            const __m128i sq = _mm_madd_epi16(v, v);
            acc = _mm_add_epi64(acc, _mm_add_epi64(_mm_unpacklo_epi32(sq, zero), _mm_unpackhi_epi32(sq, zero)));
        }
        acc = _mm_add_epi64(acc, _mm_unpackhi_epi64(acc, acc));
        const int64_t total = int64_t{init} + 2 * _mm_cvtsi128_si64(acc);
        return total > MAX_32 ? MAX_32 : static_cast<Word32>(total);
    }
    __m128i lo = _mm_setr_epi32(init, 0, 0, 0), hi = _mm_setzero_si128();
    for (Word32 s = 0; s < steps; ++s, x += 8) {
        const __m128i a = load4(x), b = load4(x + 4);
        lo = sat_add(lo, dmul(a, a));
        hi = sat_add(hi, dmul(b, b));
    }
    const __m128i c = sat_add(lo, hi);                                  // lanes k + k+4
    const __m128i d = sat_add(c, _mm_shuffle_epi32(c, _MM_SHUFFLE(1, 0, 3, 2)));   // 0+2, 1+3
    const __m128i e = sat_add(d, _mm_shuffle_epi32(d, _MM_SHUFFLE(2, 3, 0, 1)));
    return _mm_cvtsi128_si32(e);
}

// The exact sum with 16-bit pair products where the bound allows it
// (kernel_common.h), otherwise the portable sequential version.
VAMRNB_SSE41 Word32 inner_product_sse41(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    if (n <= 0) return init;
    const Word32 n8 = n & ~7;
    __m128i mx = _mm_setzero_si128(), my = _mm_setzero_si128(), acc = _mm_setzero_si128();
    for (Word32 i = 0; i < n8; i += 8) {
        const __m128i a = _mm_loadu_si128(reinterpret_cast<const __m128i *>(x + i));
        const __m128i b = _mm_loadu_si128(reinterpret_cast<const __m128i *>(y + i));
        mx = _mm_max_epu16(mx, _mm_abs_epi16(a));
        my = _mm_max_epu16(my, _mm_abs_epi16(b));
        acc = _mm_add_epi32(acc, _mm_madd_epi16(a, b));
    }
    alignas(16) uint16_t ax[8], ay[8];
    alignas(16) int32_t sums[4];
    _mm_store_si128(reinterpret_cast<__m128i *>(ax), mx);
    _mm_store_si128(reinterpret_cast<__m128i *>(ay), my);
    _mm_store_si128(reinterpret_cast<__m128i *>(sums), acc);
    return enc_kernel::inner_product_finish(x, y, n, n8, init, ax, ay, sums, inner_product_c);
}

// Normalised-correlation lag loop with the 40-sample filtered excitation in
// five registers.  Squares are summed in 64-bit lanes (a pair of squares
// fits in 32 unsigned bits); the correlation in 32-bit lanes when the
// energies rule out saturation (kernel_common.h), else sequentially.  The
// next excitation is formed in place: all five blocks are computed from
// the current one before any is stored.
VAMRNB_SSE41 void norm_corr_sums_sse41(const Word16 *excf, const Word16 *xn, const Word16 *h,
                                       const Word16 *x_new, Word32 n_lags, Word32 scaling,
                                       Word32 *energy, Word32 *dot) {
    alignas(16) Word16 buf[8 + L_SUBFR] = {};
    Word16 *cur = buf + 8;
    for (int j = 0; j < L_SUBFR; ++j) cur[j] = excf[j];
    const auto at = [](const Word16 *p) { return _mm_loadu_si128(reinterpret_cast<const __m128i *>(p)); };

    __m128i xv[5], hl[5], hh[5];
    for (int k = 0; k < 5; ++k) {
        xv[k] = at(xn + 8 * k);
        hl[k] = _mm_cvtepi16_epi32(at(h + 8 * k));
        hh[k] = _mm_cvtepi16_epi32(_mm_srli_si128(at(h + 8 * k), 8));
    }
    const int s = 4 - scaling;   // see norm_corr_sums_c
    const __m128i lo = _mm_set1_epi32(MIN_32 >> s), hi = _mm_set1_epi32(MAX_32 >> s);
    const __m128i sh = _mm_cvtsi32_si128(16 - s), zero = _mm_setzero_si128();
    const int64_t xn_sq = enc_kernel::sum_sq(xn, L_SUBFR);

    for (Word32 i = 0;; ++i) {
        __m128i sq = zero, acc = zero;
        for (int k = 0; k < 5; ++k) {
            const __m128i v = _mm_load_si128(reinterpret_cast<const __m128i *>(cur + 8 * k));
            const __m128i m = _mm_madd_epi16(v, v);
            sq = _mm_add_epi64(sq, _mm_unpacklo_epi32(m, zero));
            sq = _mm_add_epi64(sq, _mm_unpackhi_epi32(m, zero));
            acc = _mm_add_epi32(acc, _mm_madd_epi16(xv[k], v));
        }
        const int64_t cur_sq = _mm_cvtsi128_si64(sq) + _mm_extract_epi64(sq, 1);
        energy[i] = cur_sq > (MAX_32 >> 1) ? MAX_32 : static_cast<Word32>(2 * cur_sq);
        dot[i] = enc_kernel::no_saturation(xn_sq, cur_sq) ? 2 * hsum(acc)
                                                           : enc_kernel::dot_sat(xn, cur, L_SUBFR);
        if (i + 1 >= n_lags) break;

        const __m128i e = _mm_set1_epi32(x_new[-i]);
        __m128i out[5];
        for (int k = 0; k < 5; ++k) {
            const __m128i prev = at(cur + 8 * k - 1);
            __m128i p0 = _mm_mullo_epi32(e, hl[k]), p1 = _mm_mullo_epi32(e, hh[k]);
            p0 = _mm_sra_epi32(_mm_min_epi32(_mm_max_epi32(p0, lo), hi), sh);
            p1 = _mm_sra_epi32(_mm_min_epi32(_mm_max_epi32(p1, lo), hi), sh);
            p0 = _mm_add_epi32(p0, _mm_cvtepi16_epi32(prev));
            p1 = _mm_add_epi32(p1, _mm_cvtepi16_epi32(_mm_srli_si128(prev, 8)));
            out[k] = _mm_packs_epi32(p0, p1);
        }
        for (int k = 0; k < 5; ++k) _mm_store_si128(reinterpret_cast<__m128i *>(cur + 8 * k), out[k]);
        cur[0] = shr(x_new[-i], scaling);
    }
}

VAMRNB_SSE41 void comp_corr_sse41(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min,
                                  Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact_sse41);
}

// Four outputs per step; h is read through a copy with 40 zeros in front so
// that terms past the causal limit vanish.
VAMRNB_SSE41 void convolve_sse41(const Word16 *x, const Word16 *h, Word16 *y) {
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::convolve_sat(x, h, y);
        return;
    }
    alignas(16) Word16 hp[2 * L_SUBFR + 8] = {};
    for (int i = 0; i < L_SUBFR; ++i) hp[L_SUBFR + i] = h[i];
    for (int n = 0; n < L_SUBFR; n += 4) {
        __m128i acc = _mm_setzero_si128();
        for (int i = 0; i <= n + 3 && i < L_SUBFR; i += 2) {
            const __m128i h0 = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(hp + L_SUBFR + n - i));
            const __m128i h1 = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(hp + L_SUBFR + n - i - 1));
            acc = _mm_add_epi32(acc, _mm_madd_epi16(_mm_unpacklo_epi16(h0, h1), _mm_set1_epi32(pair16(x[i], x[i + 1]))));
        }
        alignas(16) Word32 s[4];
        _mm_store_si128(reinterpret_cast<__m128i *>(s), acc);
        for (int k = 0; k < 4; ++k) y[n + k] = enc_kernel::convolve_out(wrap_shl(s[k], 1));
    }
}

VAMRNB_SSE41 void cor_h_x_sse41(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    Word32 y[L_SUBFR];
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::cor_h_x_sat(h, x, y);
    } else {
        alignas(16) Word16 q[2 * L_SUBFR + 8];
        enc_kernel::cor_h_x_reverse(h, q, 2 * L_SUBFR + 8);
        for (int i = 0; i < L_SUBFR; i += 4) {
            __m128i acc = _mm_setzero_si128();
            for (int j = i & ~1; j < L_SUBFR; j += 2) {
                const __m128i q0 = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(q + 39 + i - j));
                const __m128i q1 = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(q + 38 + i - j));
                acc = _mm_add_epi32(acc, _mm_madd_epi16(_mm_unpacklo_epi16(q0, q1), _mm_set1_epi32(pair16(x[j], x[j + 1]))));
            }
            _mm_storeu_si128(reinterpret_cast<__m128i *>(y + i), _mm_slli_epi32(acc, 1));
        }
    }
    enc_kernel::cor_h_x_scale(y, dn, sf);
}

namespace {

// mult(w, d) on eight lanes: the high 17 bits of the 32-bit product; the
// one product that leaves 16 bits (-32768·-32768) saturates to 32767.
VAMRNB_SSE41 inline __m128i mult16(__m128i w, __m128i d) {
    const __m128i t = _mm_or_si128(_mm_slli_epi16(_mm_mulhi_epi16(w, d), 1),
                                   _mm_srli_epi16(_mm_mullo_epi16(w, d), 15));
    return _mm_xor_si128(t, _mm_cmpeq_epi16(t, _mm_set1_epi16(static_cast<int16_t>(0x8000))));
}

// Distances of four rows (two per register), saturated like the running sum.
template <bool Negated>
VAMRNB_SSE41 inline __m128i vq_dist4(__m128i rv, __m128i wv, __m128i a, __m128i b) {
    const __m128i da = Negated ? _mm_adds_epi16(rv, a) : _mm_subs_epi16(rv, a);
    const __m128i db = Negated ? _mm_adds_epi16(rv, b) : _mm_subs_epi16(rv, b);
    const __m128i ta = mult16(wv, da), tb = mult16(wv, db);
    // Per row the sum of four squares, below 2^32 as an unsigned value.
    const __m128i sum = _mm_hadd_epi32(_mm_madd_epi16(ta, ta), _mm_madd_epi16(tb, tb));
    const __m128i big = _mm_cmpgt_epi32(_mm_srli_epi32(sum, 30), _mm_setzero_si128());
    return _mm_blendv_epi8(_mm_slli_epi32(sum, 1), _mm_set1_epi32(0x7fffffff), big);
}

template <bool Signed>
VAMRNB_SSE41 enc_kernel::VqPick vq_search(const Word16 r[4], const Word16 w[4], const Word16 *dico,
                                          int size) {
    const __m128i rv = _mm_setr_epi16(r[0], r[1], r[2], r[3], r[0], r[1], r[2], r[3]);
    const __m128i wv = _mm_setr_epi16(w[0], w[1], w[2], w[3], w[0], w[1], w[2], w[3]);
    __m128i best = _mm_set1_epi32(0x7fffffff), bidx = _mm_set1_epi32(-1), bsign = _mm_setzero_si128();
    __m128i cur = _mm_setr_epi32(0, 1, 2, 3);
    const int n4 = size & ~3;
    for (int i = 0; i < n4; i += 4) {
        const __m128i a = _mm_loadu_si128(reinterpret_cast<const __m128i *>(dico + 4 * i));
        const __m128i b = _mm_loadu_si128(reinterpret_cast<const __m128i *>(dico + 4 * i + 8));
        const __m128i d = vq_dist4<false>(rv, wv, a, b);
        __m128i m = _mm_cmplt_epi32(d, best);
        best = _mm_blendv_epi8(best, d, m);
        bidx = _mm_blendv_epi8(bidx, cur, m);
        bsign = _mm_andnot_si128(m, bsign);
        if (Signed) {
            const __m128i dn = vq_dist4<true>(rv, wv, a, b);
            m = _mm_cmplt_epi32(dn, best);
            best = _mm_blendv_epi8(best, dn, m);
            bidx = _mm_blendv_epi8(bidx, cur, m);
            bsign = _mm_blendv_epi8(bsign, _mm_set1_epi32(1), m);
        }
        cur = _mm_add_epi32(cur, _mm_set1_epi32(4));
    }
    alignas(16) Word32 dist[4];
    alignas(16) int32_t index[4], sign[4];
    _mm_store_si128(reinterpret_cast<__m128i *>(dist), best);
    _mm_store_si128(reinterpret_cast<__m128i *>(index), bidx);
    _mm_store_si128(reinterpret_cast<__m128i *>(sign), bsign);
    return enc_kernel::vq_tail(r, w, dico, n4, size, Signed, enc_kernel::vq_join(dist, index, sign));
}

}  // namespace

VAMRNB_SSE41 int16_t vq_subvec_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                                     const Word16 *w2, Word32 size) {
    const Word16 r[4] = {r1[0], r1[1], r2[0], r2[1]}, w[4] = {w1[0], w1[1], w2[0], w2[1]};
    return enc_kernel::vq_finish(r1, r2, dico, vq_search<false>(r, w, dico, size), false);
}

VAMRNB_SSE41 int16_t vq_subvec_s_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                                       const Word16 *w2, Word32 size) {
    const Word16 r[4] = {r1[0], r1[1], r2[0], r2[1]}, w[4] = {w1[0], w1[1], w2[0], w2[1]};
    return enc_kernel::vq_finish(r1, r2, dico, vq_search<true>(r, w, dico, size), true);
}

VAMRNB_SSE41 int16_t vq_subvec4_sse41(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size) {
    const Word16 rv[4] = {r[0], r[1], r[2], r[3]};
    return enc_kernel::vq_finish(r, r + 2, dico, vq_search<false>(rv, w, dico, size), false);
}

}  // namespace vamrnb

#endif  // VAMRNB_DSP_X86
