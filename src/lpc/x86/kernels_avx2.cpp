// AVX2 versions of the residual and fractional-delay kernels: eight 32-bit
// lanes carry eight output samples, with the same lane-wise rebuilt
// saturation as the SSE4.1 versions.  Called only when the processor
// reports AVX2.
#include "lpc/dsp.h"

#if defined(VAMRNB_DSP_X86)

#include <immintrin.h>

#include "lpc/enc_kernels.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

#define VAMRNB_AVX2 __attribute__((target("avx2")))

namespace vamrnb {
namespace {

VAMRNB_AVX2 inline __m256i sat_add(__m256i a, __m256i b) {
    const __m256i s = _mm256_add_epi32(a, b);
    const __m256i ovf = _mm256_and_si256(_mm256_xor_si256(s, a), _mm256_xor_si256(s, b));
    const __m256i rail = _mm256_xor_si256(_mm256_srai_epi32(a, 31), _mm256_set1_epi32(0x7fffffff));
    return _mm256_castps_si256(_mm256_blendv_ps(_mm256_castsi256_ps(s), _mm256_castsi256_ps(rail),
                                                _mm256_castsi256_ps(ovf)));
}

VAMRNB_AVX2 inline __m256i dmul(__m256i a32, __m256i b32) {
    const __m256i p = _mm256_mullo_epi32(a32, b32);
    const __m256i sat = _mm256_cmpeq_epi32(p, _mm256_set1_epi32(0x40000000));
    return _mm256_xor_si256(_mm256_add_epi32(p, p), sat);
}

VAMRNB_AVX2 inline __m256i load8(const Word16 *p) {
    return _mm256_cvtepi16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i *>(p)));
}

VAMRNB_AVX2 inline void store_round8(Word16 *p, __m256i s) {
    const __m256i r = _mm256_srai_epi32(sat_add(s, _mm256_set1_epi32(0x8000)), 16);
    const __m128i packed = _mm_packs_epi32(_mm256_castsi256_si128(r), _mm256_extracti128_si256(r, 1));
    _mm_storeu_si128(reinterpret_cast<__m128i *>(p), packed);
}

}  // namespace

VAMRNB_AVX2 void residu_avx2(const Word16 *a, const Word16 *x, Word16 *y) {
    __m256i coef[M + 1];
    for (int i = 0; i <= M; ++i) coef[i] = _mm256_set1_epi32(a[i]);
    const __m256i hi = _mm256_set1_epi32(0x0FFFFFFF), lo = _mm256_set1_epi32(-0x10000000);
    for (int n = 0; n < L_SUBFR; n += 8) {
        __m256i s = dmul(load8(x + n), coef[0]);
        for (int i = 1; i <= M; ++i) s = sat_add(s, dmul(coef[i], load8(x + n - i)));
        __m256i r = _mm256_slli_epi32(s, 3);
        r = _mm256_blendv_epi8(r, _mm256_set1_epi32(0x7fffffff), _mm256_cmpgt_epi32(s, hi));
        r = _mm256_blendv_epi8(r, _mm256_set1_epi32(static_cast<int>(0x80000000u)),
                               _mm256_cmpgt_epi32(lo, s));
        store_round8(y + n, r);
    }
}

VAMRNB_AVX2 void pred_lt_3or6_avx2(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    // Eight outputs per step need a delay of at least 18 (the shortest lag
    // the codec transmits); shorter ones take the portable path.
    if (T0 < 18) {
        pred_lt_3or6_c(T0, frac, flag3, exc);
        return;
    }
    Word32 f = -frac;
    if (flag3 != 0) f *= 2;
    const Word16 *x0 = exc - T0;
    if (f < 0) {
        f += 6;
        --x0;
    }
    __m256i c1[10], c2[10];
    for (int i = 0; i < 10; ++i) {
        c1[i] = _mm256_set1_epi32(vamrnb_tbl_pred_inter_6[f + 6 * i]);
        c2[i] = _mm256_set1_epi32(vamrnb_tbl_pred_inter_6[6 - f + 6 * i]);
    }
    for (int j = 0; j < L_SUBFR; j += 8) {
        __m256i s = _mm256_setzero_si256();
        for (int i = 0; i < 10; ++i) {
            s = sat_add(s, dmul(load8(x0 + j - i), c1[i]));
            s = sat_add(s, dmul(load8(x0 + j + 1 + i), c2[i]));
        }
        store_round8(exc + j, s);
    }
}

namespace {

VAMRNB_AVX2 Word32 dot_exact(const Word16 *x, const Word16 *y, Word32 n) {
    __m256i acc = _mm256_setzero_si256();
    Word32 j = 0;
    for (; j + 16 <= n; j += 16)
        acc = _mm256_add_epi32(
            acc, _mm256_madd_epi16(_mm256_loadu_si256(reinterpret_cast<const __m256i *>(x + j)),
                                   _mm256_loadu_si256(reinterpret_cast<const __m256i *>(y + j))));
    __m128i v = _mm_add_epi32(_mm256_castsi256_si128(acc), _mm256_extracti128_si256(acc, 1));
    v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(1, 0, 3, 2)));
    v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(2, 3, 0, 1)));
    int64_t s = _mm_cvtsi128_si32(v);
    for (; j < n; ++j) s += int64_t{x[j]} * y[j];
    return static_cast<Word32>(2 * s);
}

}  // namespace

VAMRNB_AVX2 void comp_corr_avx2(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min,
                                Word32 *corr) {
    enc_kernel::comp_corr(x, len, lag_max, lag_min, corr, dot_exact);
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
            const int32_t xp = static_cast<int32_t>(static_cast<uint16_t>(x[i]) |
                                                    (static_cast<uint32_t>(static_cast<uint16_t>(x[i + 1])) << 16));
            acc = _mm256_add_epi32(acc, _mm256_madd_epi16(hh, _mm256_set1_epi32(xp)));
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
                const int32_t xp = static_cast<int32_t>(static_cast<uint16_t>(x[j]) |
                                                        (static_cast<uint32_t>(static_cast<uint16_t>(x[j + 1])) << 16));
                acc = _mm256_add_epi32(acc, _mm256_madd_epi16(qq, _mm256_set1_epi32(xp)));
            }
            _mm256_storeu_si256(reinterpret_cast<__m256i *>(y + i), _mm256_slli_epi32(acc, 1));
        }
    }
    enc_kernel::cor_h_x_scale(y, dn, sf);
}

}  // namespace vamrnb

#endif  // VAMRNB_DSP_X86
