// AVX2 versions of the residual, fractional-delay and encoder correlation
// kernels: eight 32-bit lanes carry eight output samples, with the same
// lane-wise rebuilt saturation as the SSE4.1 versions (simd_x86.h).  Called
// only when the processor reports AVX2 and SSE4.1 is allowed.
#include "lpc/x86/dsp_x86.h"

#if defined(VAMRNB_DSP_X86)

#include "lpc/kernel_common.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"
#include "lpc/x86/simd_x86.h"

namespace vamrnb {
using namespace x86;

VAMRNB_AVX2 void residu_avx2(const Word16 *a, const Word16 *x, Word16 *y) {
    __m256i coef[M + 1];
    for (int i = 0; i <= M; ++i) coef[i] = _mm256_set1_epi32(a[i]);
    for (int n = 0; n < L_SUBFR; n += 8) {
        __m256i s = dmul(load8(x + n), coef[0]);
        for (int i = 1; i <= M; ++i) s = sat_add(s, dmul(coef[i], load8(x + n - i)));
        store_round(y + n, sat_shl3(s));
    }
}

VAMRNB_AVX2 void pred_lt_3or6_avx2(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Eight outputs per step need a delay of at least 18 (the shortest lag
    // the codec transmits); shorter ones take the portable path.
    if (T0 < 18) {
        pred_lt_3or6_c(T0, frac, flag3, exc);
        return;
    }
    Word16 t1[10], t2[10];
    const Word16 *x0 = enc_kernel::pred_lt_taps(T0, frac, flag3, exc, t1, t2);
    __m256i c1[10], c2[10];
    for (int i = 0; i < 10; ++i) {
        c1[i] = _mm256_set1_epi32(t1[i]);
        c2[i] = _mm256_set1_epi32(t2[i]);
    }
    for (int j = 0; j < L_SUBFR; j += 8) {
        __m256i s = _mm256_setzero_si256();
        for (int i = 0; i < 10; ++i) {
            s = sat_add(s, dmul(load8(x0 + j - i), c1[i]));
            s = sat_add(s, dmul(load8(x0 + j + 1 + i), c2[i]));
        }
        store_round(exc + j, s);
    }
}

VAMRNB_AVX2 void comp_corr_avx2(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min,
                                Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact_avx2);
}

// Eight outputs per step (see the SSE4.1 version).
VAMRNB_AVX2 void convolve_avx2(const Word16 *x, const Word16 *h, Word16 *y) {
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::convolve_sat(x, h, y);
        return;
    }
    alignas(32) Word16 hp[2 * L_SUBFR + 8] = {};
    for (int i = 0; i < L_SUBFR; ++i) hp[L_SUBFR + i] = h[i];
    for (int n = 0; n < L_SUBFR; n += 8) {
        __m256i acc = _mm256_setzero_si256();
        for (int i = 0; i <= n + 7 && i < L_SUBFR; i += 2) {
            const __m128i h0 = _mm_loadu_si128(reinterpret_cast<const __m128i *>(hp + L_SUBFR + n - i));
            const __m128i h1 = _mm_loadu_si128(reinterpret_cast<const __m128i *>(hp + L_SUBFR + n - i - 1));
            const __m256i hh = _mm256_set_m128i(_mm_unpackhi_epi16(h0, h1), _mm_unpacklo_epi16(h0, h1));
            acc = _mm256_add_epi32(acc, _mm256_madd_epi16(hh, _mm256_set1_epi32(pair16(x[i], x[i + 1]))));
        }
        alignas(32) Word32 s[8];
        _mm256_store_si256(reinterpret_cast<__m256i *>(s), acc);
        for (int k = 0; k < 8; ++k) y[n + k] = enc_kernel::convolve_out(wrap_shl(s[k], 1));
    }
}

VAMRNB_AVX2 void cor_h_x_avx2(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    Word32 y[L_SUBFR];
    if (!enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_SUBFR), enc_kernel::sum_sq(h, L_SUBFR))) {
        enc_kernel::cor_h_x_sat(h, x, y);
    } else {
        alignas(32) Word16 q[2 * L_SUBFR + 16];
        enc_kernel::cor_h_x_reverse(h, q, 2 * L_SUBFR + 16);
        for (int i = 0; i < L_SUBFR; i += 8) {
            __m256i acc = _mm256_setzero_si256();
            for (int j = i; j < L_SUBFR; j += 2) {
                const __m128i q0 = _mm_loadu_si128(reinterpret_cast<const __m128i *>(q + 39 + i - j));
                const __m128i q1 = _mm_loadu_si128(reinterpret_cast<const __m128i *>(q + 38 + i - j));
                const __m256i qq = _mm256_set_m128i(_mm_unpackhi_epi16(q0, q1), _mm_unpacklo_epi16(q0, q1));
                acc = _mm256_add_epi32(acc, _mm256_madd_epi16(qq, _mm256_set1_epi32(pair16(x[j], x[j + 1]))));
            }
            _mm256_storeu_si256(reinterpret_cast<__m256i *>(y + i), _mm256_slli_epi32(acc, 1));
        }
    }
    enc_kernel::cor_h_x_scale(y, dn, sf);
}

}  // namespace vamrnb

#endif  // VAMRNB_DSP_X86
