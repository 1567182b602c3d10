// LSF/LSP/LPC conversions, interpolation and the decoder's LSF dequantisers.
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

// Direct-form predictor of an LSP set in double precision: the even and odd
// LSPs give the product polynomials F1, F2; A = ((1+z^-1)F1 + (1-z^-1)F2)/2.
void lsp_to_a_model(const Word16 lsp[10], double a[11]) {
    double f[2][6];
    for (int p = 0; p < 2; ++p) {
        double *c = f[p];
        c[0] = 1.0;
        for (int k = 1; k < 6; ++k) c[k] = 0.0;
        for (int k = 0; k < 5; ++k) {
            const double q = lsp[2 * k + p] / 32768.0;
            double n[6] = {0};
            for (int j = 0; j < 6; ++j) {
                n[j] += c[j];
                if (j >= 1) n[j] += -2.0 * q * c[j - 1];
                if (j >= 2) n[j] += c[j - 2];
            }
            std::memcpy(c, n, sizeof n);
        }
    }
    a[0] = 1.0;
    for (int i = 1; i <= 5; ++i) {
        const double g1 = f[0][i] + f[0][i - 1];
        const double g2 = f[1][i] - f[1][i - 1];
        a[i] = (g1 + g2) / 2.0;
        a[11 - i] = (g1 - g2) / 2.0;
    }
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

TEST(LspAz, MatchesDoublePrecisionExpansion) {
    std::mt19937 rng(11);
    for (int t = 0; t < 300; ++t) {
        Word16 lsf[10], lsp[10], a[11];
        random_lsf(rng, lsf);
        vamrnb_sf_sp(lsf, vamrnb_tbl_cos_lsp_lsf, lsp);
        std::fill(a, a + 11, Word16{0x5555});
        EXPECT_EQ(vamrnb_lsp_az(lsp, a), 0);
        EXPECT_EQ(a[0], 4096);
        double m[11];
        lsp_to_a_model(lsp, m);
        for (int i = 1; i <= 10; ++i) EXPECT_NEAR(a[i], m[i] * 4096.0, 2.0) << "t=" << t << " i=" << i;
    }
}

TEST(IntLpc, SubframeSets) {
    std::mt19937 rng(3);
    Word16 f_old[10], f_mid[10], f_new[10], old_[10], mid[10], nw[10];
    random_lsf(rng, f_old);
    random_lsf(rng, f_mid);
    random_lsf(rng, f_new);
    vamrnb_sf_sp(f_old, vamrnb_tbl_cos_lsp_lsf, old_);
    vamrnb_sf_sp(f_mid, vamrnb_tbl_cos_lsp_lsf, mid);
    vamrnb_sf_sp(f_new, vamrnb_tbl_cos_lsp_lsf, nw);

    Word16 az[44], one[11];
    // Unchanged LSPs: the 3/4-1/4 sets are exact; the halves lose the odd LSB.
    vamrnb_int_lpc_1to3(nw, nw, az);
    vamrnb_lsp_az(nw, one);
    for (int k : {0, 2, 3}) EXPECT_EQ(0, std::memcmp(az + 11 * k, one, sizeof one)) << k;
    Word16 even[10], even_a[11];
    for (int i = 0; i < 10; ++i) even[i] = static_cast<Word16>((nw[i] >> 1) * 2);
    vamrnb_lsp_az(even, even_a);
    EXPECT_EQ(0, std::memcmp(az + 11, even_a, sizeof even_a));

    // Changing LSPs: subframe 4 is the new set, 2 the midpoint, and 1 and 3
    // lie between their neighbours.
    vamrnb_int_lpc_1to3(old_, nw, az);
    EXPECT_EQ(0, std::memcmp(az + 33, one, sizeof one));
    Word16 half[10], want[11];
    for (int i = 0; i < 10; ++i) half[i] = static_cast<Word16>((old_[i] >> 1) + (nw[i] >> 1));
    vamrnb_lsp_az(half, want);
    EXPECT_EQ(0, std::memcmp(az + 11, want, sizeof want));

    vamrnb_int_lpc_1and3(old_, mid, nw, az);
    vamrnb_lsp_az(mid, want);
    EXPECT_EQ(0, std::memcmp(az + 11, want, sizeof want));
    EXPECT_EQ(0, std::memcmp(az + 33, one, sizeof one));
    for (int i = 0; i < 10; ++i) half[i] = static_cast<Word16>((mid[i] >> 1) + (nw[i] >> 1));
    vamrnb_lsp_az(half, want);
    EXPECT_EQ(0, std::memcmp(az + 22, want, sizeof want));
    for (int i = 0; i < 10; ++i) half[i] = static_cast<Word16>((mid[i] >> 1) + (old_[i] >> 1));
    vamrnb_lsp_az(half, want);
    EXPECT_EQ(0, std::memcmp(az, want, sizeof want));
}

// ---- decoder dequantisers ---------------------------------------------------

TEST(DPlsf3, CodebookChoiceByMode) {
    const Word16 idx[3] = {5, 255, 100};
    Word16 past_lsf[10], past_r[10] = {}, lsp[10];
    std::memcpy(past_lsf, vamrnb_tbl_mean_lsf, sizeof past_lsf);

    // MR475: second index doubled (row 510), third codebook the 128-row one.
    vamrnbd_d_plsf_3(0, 0, idx, past_lsf, past_r, lsp);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(past_r[i], tab::q_plsf_3_dico1_lsf[5 * 3 + i]);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(past_r[3 + i], tab::q_plsf_3_dico2_lsf[510 * 3 + i]);
    for (int i = 0; i < 4; ++i) EXPECT_EQ(past_r[6 + i], tab::mr515_3_lsf[100 * 4 + i]);

    // MR795: its own first codebook, full second and third codebooks.
    const Word16 idx795[3] = {400, 255, 500};
    vamrnbd_d_plsf_3(5, 0, idx795, past_lsf, past_r, lsp);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(past_r[i], tab::mr795_1_lsf[400 * 3 + i]);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(past_r[3 + i], tab::q_plsf_3_dico2_lsf[255 * 3 + i]);
    for (int i = 0; i < 4; ++i) EXPECT_EQ(past_r[6 + i], tab::q_plsf_3_dico3_lsf[500 * 4 + i]);
}

TEST(DPlsf3, DtxWithoutHistoryIsMeanPlusResidual) {
    const Word16 idx[3] = {17, 300, 42};
    Word16 past_lsf[10] = {}, past_r[10] = {}, lsp[10];
    vamrnbd_d_plsf_3(8, 0, idx, past_lsf, past_r, lsp);
    Word16 want[10];
    for (int i = 0; i < 3; ++i) want[i] = tab::q_plsf_3_dico1_lsf[17 * 3 + i];
    for (int i = 0; i < 3; ++i) want[3 + i] = tab::q_plsf_3_dico2_lsf[300 * 3 + i];
    for (int i = 0; i < 4; ++i) want[6 + i] = tab::q_plsf_3_dico3_lsf[42 * 4 + i];
    for (int i = 0; i < 10; ++i) want[i] = static_cast<Word16>(want[i] + tab::q_plsf_3_mean_lsf[i]);
    vamrnb_reorder(want);
    EXPECT_EQ(0, std::memcmp(past_lsf, want, sizeof want));
    Word16 want_lsp[10];
    vamrnb_sf_sp(want, vamrnb_tbl_cos_lsp_lsf, want_lsp);
    EXPECT_EQ(0, std::memcmp(lsp, want_lsp, sizeof lsp));
}

// Bad frames pull the LSFs geometrically to the mean, and the residual memory
// follows so that a good frame right after predicts from the concealed LSFs.
TEST(DPlsf, BadFramesConvergeToTheMean) {
    const Word16 idx3[3] = {200, 10, 300};
    Word16 past_lsf[10], past_r[10] = {}, lsp[10];
    std::memcpy(past_lsf, vamrnb_tbl_mean_lsf, sizeof past_lsf);
    for (int f = 0; f < 3; ++f) vamrnbd_d_plsf_3(2, 0, idx3, past_lsf, past_r, lsp);

    const Word16 *mean3 = tab::q_plsf_3_mean_lsf;
    double prev_dev = 0;
    for (int i = 0; i < 10; ++i) prev_dev += std::abs(past_lsf[i] - mean3[i]);
    ASSERT_GT(prev_dev, 500);
    for (int f = 0; f < 80; ++f) {
        Word16 before[10];
        std::memcpy(before, past_lsf, sizeof before);
        vamrnbd_d_plsf_3(2, 1, idx3, past_lsf, past_r, lsp);
        double dev = 0;
        for (int i = 0; i < 10; ++i) dev += std::abs(past_lsf[i] - mean3[i]);
        if (f < 10) {
            EXPECT_NEAR(dev, 0.9 * prev_dev, 0.02 * prev_dev + 20) << f;
        }
        prev_dev = dev;
    }
    for (int i = 0; i < 10; ++i) EXPECT_NEAR(past_lsf[i], mean3[i], 25) << i;

    // The memory was back-computed: a good frame whose residual equals the
    // memory-driven prediction error reproduces continuity (residual row 0 of
    // each codebook added to the predicted LSFs).
    Word16 pr[10];
    std::memcpy(pr, past_r, sizeof pr);
    const Word16 idx0[3] = {0, 0, 0};
    vamrnbd_d_plsf_3(2, 0, idx0, past_lsf, past_r, lsp);
    Word16 r0[10];
    for (int i = 0; i < 3; ++i) r0[i] = tab::q_plsf_3_dico1_lsf[i];
    for (int i = 0; i < 3; ++i) r0[3 + i] = tab::q_plsf_3_dico2_lsf[i];
    for (int i = 0; i < 4; ++i) r0[6 + i] = tab::q_plsf_3_dico3_lsf[i];
    Word16 want[10];
    for (int i = 0; i < 10; ++i)
        want[i] = static_cast<Word16>(r0[i] + mean3[i] + ((pr[i] * tab::pred_fac[i]) >> 15));
    vamrnb_reorder(want);
    EXPECT_EQ(0, std::memcmp(past_lsf, want, sizeof want));

    // Five-split: factor 0.95 towards its own mean.
    const Word16 idx5[5] = {100, 200, 301, 50, 60};
    Word16 lsp1[10], lsp2[10];
    std::memset(past_r, 0, sizeof past_r);
    std::memcpy(past_lsf, vamrnb_tbl_mean_lsf, sizeof past_lsf);
    for (int f = 0; f < 3; ++f) d_plsf_5(0, idx5, past_lsf, past_r, lsp1, lsp2);
    const Word16 *mean5 = vamrnb_tbl_mean_lsf;
    prev_dev = 0;
    for (int i = 0; i < 10; ++i) prev_dev += std::abs(past_lsf[i] - mean5[i]);
    ASSERT_GT(prev_dev, 300);
    for (int f = 0; f < 200; ++f) {
        d_plsf_5(1, idx5, past_lsf, past_r, lsp1, lsp2);
        EXPECT_EQ(0, std::memcmp(lsp1, lsp2, sizeof lsp1));
        double dev = 0;
        for (int i = 0; i < 10; ++i) dev += std::abs(past_lsf[i] - mean5[i]);
        if (f < 10) {
            EXPECT_NEAR(dev, 0.95 * prev_dev, 0.02 * prev_dev + 20) << f;
        }
        prev_dev = dev;
    }
    for (int i = 0; i < 10; ++i) EXPECT_NEAR(past_lsf[i], mean5[i], 60) << i;
}

TEST(DPlsf5, RowsSignAndTwoSets) {
    Word16 past_lsf[10], past_r[10] = {}, lsp1[10], lsp2[10];
    std::memcpy(past_lsf, vamrnb_tbl_mean_lsf, sizeof past_lsf);
    const Word16 idx[5] = {3, 4, 1, 6, 7};   // split 3: row 0, negated
    d_plsf_5(0, idx, past_lsf, past_r, lsp1, lsp2);
    EXPECT_EQ(past_r[0], vamrnb_tbl_dico1_lsf[3 * 4 + 2]);
    EXPECT_EQ(past_r[1], vamrnb_tbl_dico1_lsf[3 * 4 + 3]);
    EXPECT_EQ(past_r[2], vamrnb_tbl_dico2_lsf[4 * 4 + 2]);
    EXPECT_EQ(past_r[4], -vamrnb_tbl_dico3_lsf[2]);
    EXPECT_EQ(past_r[5], -vamrnb_tbl_dico3_lsf[3]);
    EXPECT_EQ(past_r[7], vamrnb_tbl_dico4_lsf[6 * 4 + 3]);
    EXPECT_EQ(past_r[9], vamrnb_tbl_dico5_lsf[7 * 4 + 3]);

    // With zero memory: set 1 = mean + first-set residuals, set 2 likewise.
    Word16 f1[10], f2[10];
    const Word16 *rows[5] = {&vamrnb_tbl_dico1_lsf[12], &vamrnb_tbl_dico2_lsf[16],
                             &vamrnb_tbl_dico3_lsf[0], &vamrnb_tbl_dico4_lsf[24],
                             &vamrnb_tbl_dico5_lsf[28]};
    for (int k = 0; k < 5; ++k) {
        const int s = k == 2 ? -1 : 1;
        for (int j = 0; j < 2; ++j) {
            f1[2 * k + j] = static_cast<Word16>(vamrnb_tbl_mean_lsf[2 * k + j] + s * rows[k][j]);
            f2[2 * k + j] = static_cast<Word16>(vamrnb_tbl_mean_lsf[2 * k + j] + s * rows[k][2 + j]);
        }
    }
    vamrnb_reorder(f1);
    vamrnb_reorder(f2);
    EXPECT_EQ(0, std::memcmp(past_lsf, f2, sizeof f2));
    Word16 w1[10], w2[10];
    vamrnb_sf_sp(f1, vamrnb_tbl_cos_lsp_lsf, w1);
    vamrnb_sf_sp(f2, vamrnb_tbl_cos_lsp_lsf, w2);
    EXPECT_EQ(0, std::memcmp(lsp1, w1, sizeof w1));
    EXPECT_EQ(0, std::memcmp(lsp2, w2, sizeof w2));
}
