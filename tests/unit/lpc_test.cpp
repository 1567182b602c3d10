// LSF spacing, LSF/LSP conversion and the LSF dequantisers' bad-frame
// concealment.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <random>

#include "dec/d_plsf.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr double kPi = 3.14159265358979323846;

// A plausible ordered LSF vector (0..16384 scale): evenly spread with jitter.
void random_lsf(std::mt19937 &rng, Word16 lsf[10]) {
    std::uniform_int_distribution<int> d(-500, 500);
    for (int i = 0; i < 10; ++i) lsf[i] = static_cast<Word16>((i + 1) * 1489 + d(rng));
    vamrnb_reorder(lsf);
}

}  // namespace

TEST(Reorder, SpacesAndLeavesSpacedVectorsAlone) {
    Word16 z[10] = {};
    vamrnb_reorder(z);
    for (int i = 0; i < 10; ++i) EXPECT_EQ(z[i], 205 * (i + 1));

    Word16 ok[10] = {300, 600, 1000, 2000, 4000, 6000, 8000, 10000, 12000, 14000};
    Word16 copy[10];
    std::memcpy(copy, ok, sizeof ok);
    vamrnb_reorder(ok);
    EXPECT_EQ(0, std::memcmp(ok, copy, sizeof ok));

    // A raised value pushes every later one that sits too close.
    Word16 v[10] = {1000, 900, 1100, 5000, 5100, 5200, 9000, 9100, 16000, 16100};
    vamrnb_reorder(v);
    const Word16 want[10] = {1000, 1205, 1410, 5000, 5205, 5410, 9000, 9205, 16000, 16205};
    EXPECT_EQ(0, std::memcmp(v, want, sizeof v));
}

TEST(LsfLsp, EndpointsAndRoundTrip) {
    Word16 lsf[10] = {0, 256, 4096, 8192, 8192, 12288, 16000, 16128, 16383, 16384};
    Word16 lsp[10];
    vamrnb_sf_sp(lsf, vamrnb_tbl_cos_lsp_lsf, lsp);
    EXPECT_EQ(lsp[0], 32767);
    EXPECT_EQ(lsp[1], vamrnb_tbl_cos_lsp_lsf[1]);
    EXPECT_EQ(lsp[9], -32768);
    EXPECT_NEAR(lsp[3], 0, 1);

    // In place gives the same as out of place.
    Word16 same[10];
    std::memcpy(same, lsf, sizeof lsf);
    vamrnb_sf_sp(same, vamrnb_tbl_cos_lsp_lsf, same);
    EXPECT_EQ(0, std::memcmp(same, lsp, sizeof lsp));

    // Against the cosine itself, and back: LSF -> LSP -> LSF within a few LSB.
    std::mt19937 rng(7);
    for (int t = 0; t < 200; ++t) {
        Word16 f[10], p[10], back[10];
        random_lsf(rng, f);
        vamrnb_sf_sp(f, vamrnb_tbl_cos_lsp_lsf, p);
        vamrnb_lsp_lsf(p, back);
        for (int i = 0; i < 10; ++i) {
            EXPECT_NEAR(p[i], 32768.0 * std::cos(kPi * f[i] / 16384.0), 24.0) << f[i];
            EXPECT_NEAR(back[i], f[i], 4) << "i=" << i;
        }
    }
}

namespace {

double deviation(const Word16 *a, const Word16 *b) {
    double d = 0;
    for (int i = 0; i < 10; ++i) d += std::abs(a[i] - b[i]);
    return d;
}

}  // namespace

// Bad frames pull the LSFs geometrically to the mean (0.9 per frame for the
// three-split quantiser, 0.95 for the five-split one) until the truncating
// products stall them a few LSB short.
TEST(DPlsf, BadFramesConvergeToTheMean) {
    Word16 past_lsf[10], past_r[10] = {}, lsp[10], lsp2[10];
    const Word16 idx3[3] = {200, 10, 300}, idx5[5] = {100, 200, 301, 50, 60};
    for (int q = 0; q < 2; ++q) {
        const Word16 *mean = q == 0 ? tab::q_plsf_3_mean_lsf : vamrnb_tbl_mean_lsf;
        const double factor = q == 0 ? 0.9 : 0.95;
        auto frame = [&](int bfi) {
            if (q == 0) vamrnbd_d_plsf_3(2, bfi, idx3, past_lsf, past_r, lsp);
            else d_plsf_5(static_cast<Word16>(bfi), idx5, past_lsf, past_r, lsp, lsp2);
        };
        std::memcpy(past_lsf, vamrnb_tbl_mean_lsf, sizeof past_lsf);
        std::memset(past_r, 0, sizeof past_r);
        for (int f = 0; f < 3; ++f) frame(0);
        double prev = deviation(past_lsf, mean);
        ASSERT_GT(prev, 300);
        for (int f = 0; f < 200; ++f) {
            frame(1);
            const double dev = deviation(past_lsf, mean);
            if (f < 10) {
                EXPECT_NEAR(dev, factor * prev, 0.02 * prev + 20) << q << " " << f;
            }
            prev = dev;
        }
        for (int i = 0; i < 10; ++i) EXPECT_NEAR(past_lsf[i], mean[i], q == 0 ? 25 : 60) << q << " " << i;
        if (q == 1) {
            EXPECT_EQ(0, std::memcmp(lsp, lsp2, sizeof lsp));   // both sets concealed alike
        }
    }
}
