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
#include "enc/subframe.h"

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
