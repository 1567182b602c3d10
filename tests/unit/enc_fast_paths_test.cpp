// The encoder's correlation kernels take plain-integer shortcuts when their
// inputs rule out saturation.  These tests drive them across the boundary,
// up to full-scale and extreme values, and compare every output with the
// step-by-step saturating accumulation.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <random>
#include <vector>

#include "basic_op/ext_op.h"
#include "enc/gain_vq.h"
#include "enc/subframe.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

std::vector<Word16> noise(std::mt19937 &rng, int n, int amp) {
    std::uniform_int_distribution<int> d(-amp, amp);
    std::vector<Word16> v(n);
    for (auto &x : v) {
        const int r = d(rng);
        x = static_cast<Word16>(r > 32767 ? 32767 : r);
    }
    return v;
}

// Normalised correlation of every lag, by the saturating recursion.
void norm_corr_model(const Word16 *exc, const Word16 *xn, const Word16 *h, int t_min, int t_max,
                     Word16 *corr) {
    Word16 excf[L_SUBFR];
    vamrnbe_convolve(exc - t_min, h, excf);
    Word32 e = 0;
    for (int j = 0; j < L_SUBFR; ++j) e = l_mac(e, excf[j], excf[j]);
    Word16 h_fac = 3, scaling = 0;
    if (e > 67108864L) {
        for (auto &v : excf) v = shr(v, 2);
        h_fac = 1;
        scaling = 2;
    }
    int k = -t_min;
    for (int lag = t_min; lag <= t_max; ++lag) {
        e = 0;
        Word32 c = 0;
        for (int j = 0; j < L_SUBFR; ++j) {
            e = l_mac(e, excf[j], excf[j]);
            c = l_mac(c, xn[j], excf[j]);
        }
        Word16 nh, nl, ch, cl;
        l_extract(vamrnb_inv_sqrt(e), &nh, &nl);
        l_extract(c, &ch, &cl);
        corr[lag - t_min] = extract_h(l_shl(mpy_32(ch, cl, nh, nl), 16));
        if (lag != t_max) {
            --k;
            for (int j = L_SUBFR - 1; j > 0; --j)
                excf[j] = add(extract_h(l_shl(l_mult(exc[k], h[j]), h_fac)), excf[j - 1]);
            excf[0] = shr(exc[k], scaling);
        }
    }
}

}  // namespace

TEST(EncoderFastPaths, NormCorrMatchesSaturatingRecursionOnEveryLag) {
    std::mt19937 rng(71);
    for (int amp : {20, 700, 6000, 20000, 32768}) {
        for (int trial = 0; trial < 12; ++trial) {
            auto buf = noise(rng, 240, amp);
            const auto xn = noise(rng, L_SUBFR, amp);
            auto h = noise(rng, L_SUBFR, amp);
            h[0] = 4096;
            if (trial % 3 == 0) {
                // Extreme samples: the one product that saturates l_mult.
                for (int i = 0; i < 240; i += 7) buf[i] = -32768;
                for (int i = 1; i < L_SUBFR; i += 5) h[i] = -32768;
            }
            const Word16 *exc = buf.data() + 200;
            Word16 got[40], want[40];
            vamrnbe_norm_corr_filt(exc, xn.data(), h.data(), 40, 79, got);
            norm_corr_model(exc, xn.data(), h.data(), 40, 79, want);
            for (int i = 0; i < 40; ++i)
                ASSERT_EQ(got[i], want[i]) << "amp " << amp << " trial " << trial << " lag " << 40 + i;
        }
    }
}

// Signed correlation matrix at energies right around the plain-sum limit,
// where the rounding of the largest sums is the first thing to saturate.
TEST(EncoderFastPaths, SignedCorrelationMatrixAroundTheRoundingLimit) {
    std::mt19937 rng(72);
    for (int trial = 0; trial < 60; ++trial) {
        // Twice the energy steps through the last 2^16 below 2^31 and a
        // little beyond: 39 samples carry 99 % of it, the last sample sets
        // the rest to within 2·|h2[39]| + 1.
        const int64_t target = (int64_t{MAX_32} - 0x10000 + trial * 0x800) / 2;
        auto h2 = noise(rng, L_CODE, 32767);
        int64_t en = 0;
        for (int i = 0; i < L_CODE - 1; ++i) en += int32_t{h2[i]} * h2[i];
        const double g = std::sqrt(0.99 * static_cast<double>(target) / static_cast<double>(en));
        en = 0;
        for (int i = 0; i < L_CODE - 1; ++i) {
            h2[i] = static_cast<Word16>(std::lround(h2[i] * g));
            en += int32_t{h2[i]} * h2[i];
        }
        h2[L_CODE - 1] = static_cast<Word16>(std::sqrt(static_cast<double>(target - en)));
        Word16 sign[L_CODE];
        for (int i = 0; i < L_CODE; ++i) sign[i] = (rng() & 1) ? 32767 : -32767;
        if (trial % 4 == 0) sign[trial % L_CODE] = -32768;
        Word16 rr[L_CODE * L_CODE];
        vamrnbe_cor_h_sign(h2.data(), sign, rr);
        for (int dec = 0; dec < L_CODE; ++dec) {
            Word32 s = 0;
            for (int k = 0; k < L_CODE - dec; ++k) {
                s = l_mac(s, h2[k], h2[k + dec]);
                const int j = L_CODE - 1 - k, i = j - dec;
                const Word16 want = dec == 0 ? round16(s) : mult(round16(s), mult(sign[i], sign[j]));
                ASSERT_EQ(rr[j * L_CODE + i], want) << "trial " << trial << " dec " << dec;
                ASSERT_EQ(rr[i * L_CODE + j], want);
            }
        }
    }
}

// ---- joint gain searches -----------------------------------------------------

namespace {

// One subframe's share of a row's score as the searches define it: five
// mpy_32_16 terms accumulated with saturation onto L.
Word32 saturating_score(Word32 L, const Word16 *hi, const Word16 *lo, Word16 gp, Word16 gc) {
    const Word16 g[5] = {mult(gp, gp), gp, mult(gc, gc), gc, mult(gc, gp)};
    for (int k = 0; k < 5; ++k) {
        L = l_mac(L, hi[k], g[k]);
        L = l_mac(L, mult(lo[k], g[k]), 1);
    }
    return L;
}

// Compares the plain score of every MR475 row with the saturating one;
// returns false on the first difference.
bool rows_agree(const Word16 *hi, const Word16 *lo, Word16 gc0, Word16 gc1) {
    const int16_t *tbl = vamrnb_tb1_gain_mr475;
    for (int i = 0; i < 256; ++i) {
        const int16_t *r = tbl + 4 * i;
        const Word16 g0 = mult(r[1], gc0), g1 = mult(r[3], gc1);
        const Word32 want = saturating_score(saturating_score(0, hi, lo, r[0], g0), hi + 5, lo + 5,
                                             r[2], g1);
        const int32_t got = gain_vq::row_score(hi, lo, r[0], (r[1] * gc0) >> 15) +
                            gain_vq::row_score(hi + 5, lo + 5, r[2], (r[3] * gc1) >> 15);
        if (want != got) return false;
    }
    return true;
}

}  // namespace

// Random coefficients of every magnitude, signs mixed as in real error terms
// (and not): whenever the bound admits the plain score it equals the
// saturating one for every row, and large coefficients do fail the bound.
TEST(GainSearchFastPath, PlainScoreMatchesWheneverTheBoundAdmitsIt) {
    std::mt19937 rng(9);
    const auto b0 = gain_vq::table_bounds(vamrnb_tb1_gain_mr475, 256, 0, 1);
    const auto b1 = gain_vq::table_bounds(vamrnb_tb1_gain_mr475, 256, 2, 3);
    int admitted = 0, refused = 0;
    for (int trial = 0; trial < 3000; ++trial) {
        Word16 hi[10], lo[10];
        const int amp = 1 << (trial % 16);
        for (int k = 0; k < 10; ++k) {
            hi[k] = noise(rng, 1, amp)[0];
            lo[k] = static_cast<Word16>(rng() % 32768);
        }
        const Word16 gc0 = static_cast<Word16>(16384 + rng() % 16384);
        const Word16 gc1 = static_cast<Word16>(16384 + rng() % 16384);
        int64_t g[10];
        gain_vq::gain_product_bounds(b0, gc0, g);
        gain_vq::gain_product_bounds(b1, gc1, g + 5);
        if (!gain_vq::terms_fit(hi, g, 10)) {
            ++refused;
            continue;
        }
        ++admitted;
        ASSERT_TRUE(rows_agree(hi, lo, gc0, gc1)) << "trial " << trial;
    }
    EXPECT_GT(admitted, 1000);
    EXPECT_GT(refused, 100);
}

// Equal coefficients of one sign, raised to the largest value the bound
// admits: the plain score still matches there; one step further the bound
// refuses, and at full scale the saturating score really departs from the
// exact one.
TEST(GainSearchFastPath, BoundIsTightEnoughAndNeeded) {
    const auto b0 = gain_vq::table_bounds(vamrnb_tb1_gain_mr475, 256, 0, 1);
    const auto b1 = gain_vq::table_bounds(vamrnb_tb1_gain_mr475, 256, 2, 3);
    const Word16 gc = MAX_16;
    int64_t g[10];
    gain_vq::gain_product_bounds(b0, gc, g);
    gain_vq::gain_product_bounds(b1, gc, g + 5);
    for (int sign : {1, -1}) {
        Word16 hi[10], lo[10];
        const auto set = [&](int v) {
            for (int k = 0; k < 10; ++k) {
                hi[k] = static_cast<Word16>(sign * v);
                lo[k] = 32767;
            }
        };
        int v = 0;
        while (v < 32767) {
            set(v + 1);
            if (!gain_vq::terms_fit(hi, g, 10)) break;
            ++v;
        }
        ASSERT_LT(v, 32767);
        set(v);
        EXPECT_TRUE(gain_vq::terms_fit(hi, g, 10));
        EXPECT_TRUE(rows_agree(hi, lo, gc, gc)) << "at the bound, sign " << sign;
        set(v + 1);
        EXPECT_FALSE(gain_vq::terms_fit(hi, g, 10));
        set(32767);
        bool clamped = false;
        for (int i = 0; i < 256; ++i) {
            const int16_t *r = vamrnb_tb1_gain_mr475 + 4 * i;
            const Word16 gp[2] = {r[0], r[2]}, gcode[2] = {mult(r[1], gc), mult(r[3], gc)};
            int64_t exact = 0;
            for (int half = 0; half < 2; ++half) {
                const int64_t p = gp[half], c = gcode[half];
                const int64_t terms[5] = {(p * p) >> 15, p, (c * c) >> 15, c, (c * p) >> 15};
                for (int k = 0; k < 5; ++k)
                    exact += 2 * (hi[5 * half + k] * terms[k] + ((lo[5 * half + k] * terms[k]) >> 15));
            }
            const Word32 full = saturating_score(saturating_score(0, hi, lo, gp[0], gcode[0]),
                                                 hi + 5, lo + 5, gp[1], gcode[1]);
            clamped = clamped || full != exact;
        }
        EXPECT_TRUE(clamped) << "sign " << sign;
    }
}
