// Encoder front end at its edges: pre-filter and LP analysis under overflow,
// root-search failure, ties in the LSF search kernels and open-loop
// correlation at full scale.
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <vector>

#include "common/enc_state.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

std::unique_ptr<enc_state> fresh_state() {
    auto st = std::make_unique<enc_state>();
    std::memset(static_cast<void *>(st.get()), 0, sizeof(enc_state));
    st->old_A[0] = 4096;
    return st;
}

}  // namespace

// ---- pre-processing ----------------------------------------------------------

TEST(EncPreproc, FullScaleOutputSaturatesInTheScaling) {
    auto st = fresh_state();
    enc_frame fr{};
    // Two large previous outputs and a full-scale input push the sum past
    // what the final scaling by 8 can hold.
    st->y1_hi = 30000;
    st->y2_hi = 30000;
    std::vector<int16_t> in(L_FRAME, 32767);
    vamrnbe_preproc(st.get(), &fr, in.data());
    EXPECT_EQ(in[0], 32760);
    EXPECT_EQ(st->old_speech[ENC_NEW_SPEECH], 32767);
    EXPECT_EQ(st->x0, 32760);
    EXPECT_EQ(st->x1, 32760);
}

// ---- autocorrelation and Levinson ---------------------------------------------

TEST(EncLpc, AutocorrScalesDownOnOverflow) {
    std::vector<int16_t> y(240, 32767);
    int16_t r_h[11], r_l[11];
    const int32_t norm = vamrnbe_auto_corr(y.data(), r_h, r_l);
    EXPECT_EQ(y[0], 2047) << "the window is divided by 4 until its energy fits";
    EXPECT_LT(norm, 0);
    EXPECT_GE(r_h[0], 16384);
    for (int k = 1; k <= 10; ++k) EXPECT_LE(r_h[k], r_h[0]);

    std::vector<int16_t> z(240, 0);
    vamrnbe_auto_corr(z.data(), r_h, r_l);
    EXPECT_EQ(r_h[0], 16384) << "an all-zero window still gives a usable r[0]";
    EXPECT_EQ(r_h[5], 0);
}

TEST(EncLpc, LevinsonFallsBackToLastStableFilter) {
    int16_t old_A[11] = {4096, -100, 50, 0, 0, 0, 0, 0, 0, 0, 7};
    int16_t A[11], rc[4] = {1, 1, 1, 1};
    // r = (1, 0, 1, ...) is not positive definite: the second reflection
    // coefficient reaches -1.
    int16_t r_h[11] = {16384, 0, 16384}, r_l[11] = {};
    vamrnbe_levinson(old_A, r_h, r_l, A, rc);
    EXPECT_EQ(std::memcmp(A, old_A, sizeof A), 0);
    for (int i = 0; i < 4; ++i) EXPECT_EQ(rc[i], 0);
    EXPECT_EQ(old_A[1], -100) << "the fall-back leaves the stored filter alone";

    // A first-order process r[k] = 0.5^k gives A(z) = 1 - 0.5 z^-1.
    for (int i = 0; i < 11; ++i) r_h[i] = static_cast<int16_t>(16384 >> i), r_l[i] = 0;
    vamrnbe_levinson(old_A, r_h, r_l, A, rc);
    EXPECT_EQ(A[0], 4096);
    EXPECT_NEAR(A[1], -2048, 2);
    for (int i = 2; i <= 10; ++i) EXPECT_NEAR(A[i], 0, 2);
    EXPECT_NEAR(rc[0], -16384, 4);
    EXPECT_EQ(std::memcmp(A, old_A, sizeof A), 0) << "a stable result becomes the fall-back";
}

// ---- LSP root search ------------------------------------------------------------

TEST(EncLpc, RootSearchFailureKeepsOldLsps) {
    // A filter with a pole outside the unit circle does not interlace its
    // roots; the search finds fewer than ten and returns the old vector.
    const int16_t a[11] = {4096, 32767, 32767, 32767, 32767, 32767,
                           32767, 32767, 32767, 32767, 32767};
    const int16_t old[10] = {30000, 26000, 21000, 15000, 9000, 3000,
                             -3000, -9000, -15000, -21000};
    int16_t lsp[10];
    az_lsp(a, lsp, old);
    EXPECT_EQ(std::memcmp(lsp, old, sizeof lsp), 0);
}

// ---- LSF search kernels -----------------------------------------------------------

TEST(EncQuant, EqualDistancesPickTheLowestRow) {
    // Rows 1 and 6 are identical and exact; rows in other lanes are worse.
    std::vector<int16_t> dico(8 * 4, 1000);
    const int16_t want[4] = {10, 20, 30, 40};
    std::memcpy(&dico[1 * 4], want, sizeof want);
    std::memcpy(&dico[6 * 4], want, sizeof want);
    const int16_t w[4] = {8000, 8000, 8000, 8000};

    int16_t r[4] = {10, 20, 30, 40};
    EXPECT_EQ(vamrnbe_vq_subvec4(r, dico.data(), w, 8), 1);

    int16_t r1[2] = {10, 20}, r2[2] = {30, 40};
    EXPECT_EQ(vamrnbe_vq_subvec(r1, r2, dico.data(), w, w + 2, 8), 1);
    EXPECT_EQ(r1[0], 10);
    EXPECT_EQ(r2[1], 40);
}

TEST(EncQuant, SignedSearchSignAndNegation) {
    // Weights and values chosen so that the weighted differences are exact
    // for both signs.
    std::vector<int16_t> dico = {512, 512, 512, 512, -32768, 128, 256, 384};
    const int16_t w[2] = {8192, 8192};
    // Zero residual: + and - distances are equal for every row; sign 0 wins.
    int16_t r1[2] = {0, 0}, r2[2] = {0, 0};
    int16_t idx = vamrnbe_vq_subvec_s(r1, r2, dico.data(), w, w, 2);
    EXPECT_EQ(idx & 1, 0);

    // Residual equal to the negated second row: index 1, sign 1, and the
    // negation of -32768 saturates to 32767.
    int16_t s1[2] = {32767, -128}, s2[2] = {-256, -384};
    idx = vamrnbe_vq_subvec_s(s1, s2, dico.data(), w, w, 2);
    EXPECT_EQ(idx, 2 * 1 + 1);
    EXPECT_EQ(s1[0], 32767);
    EXPECT_EQ(s1[1], -128);
    EXPECT_EQ(s2[1], -384);
}

// ---- open-loop pitch ----------------------------------------------------------------

TEST(EncOlp, LoudSignalCorrelationSaturates) {
    // Full-scale period-2 signal: even lags correlate fully, odd lags fully
    // negatively; both sums run past 32 bits and must clip, not wrap.
    std::vector<int16_t> buf(PIT_MAX + 80);
    for (size_t i = 0; i < buf.size(); ++i) buf[i] = i % 2 ? int16_t(-32768) : int16_t(32767);
    std::vector<int32_t> corr(PIT_MAX + 1);
    vamrnbe_comp_corr(buf.data() + PIT_MAX, 80, PIT_MAX, 20, corr.data() + PIT_MAX);
    EXPECT_EQ(corr[PIT_MAX - 20], MAX_32);
    EXPECT_EQ(corr[PIT_MAX - 21], MIN_32);
    EXPECT_EQ(corr[PIT_MAX - 143], MIN_32);
}
