// Code-gain prediction and the gain median.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>
#include <vector>

#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

double log2_gain(int16_t e, int16_t f) { return e + f / 32768.0; }

}  // namespace

// MR122 works in log2 units: doubling the code vector quadruples its energy
// and lowers the predicted gain by exactly one octave; one step of history
// (1024 = 1.0) weighs 44/64.
TEST(GcPred, MR122LogDomain) {
    int16_t code[40] = {};
    for (int k = 0; k < 10; ++k) code[4 * k + 1] = static_cast<int16_t>(k % 2 ? 2048 : -2048);
    int16_t big[40];
    for (int i = 0; i < 40; ++i) big[i] = static_cast<int16_t>(code[i] * 2);
    int16_t q[4] = {-14336, -14336, -14336, -14336};
    int16_t q122[4] = {-2381, -2381, -2381, -2381};
    int16_t e1, f1, e2, f2;
    vamrnb_gc_pred(q, q122, 7, code, &e1, &f1, nullptr, nullptr);
    vamrnb_gc_pred(q, q122, 7, big, &e2, &f2, nullptr, nullptr);
    EXPECT_EQ(e1 - 1, e2);
    EXPECT_EQ(f1, f2);

    int16_t q122b[4] = {-2381 + 1024, -2381, -2381, -2381};
    int16_t e3, f3;
    vamrnb_gc_pred(q, q122b, 7, code, &e3, &f3, nullptr, nullptr);
    EXPECT_NEAR(log2_gain(e3, f3) - log2_gain(e1, f1), 44.0 / 64.0, 1e-4);
}

// A zero code vector: the log of zero is taken as 0, so mean energy and
// history alone set the result.  The Q24 sum is formed at plain 32-bit width
// (2134784·1024 would not fit, 2·(2134784·512 + history) does).
TEST(GcPred, ZeroCodeVector) {
    const int16_t code[40] = {};
    int16_t q[4] = {-14336, -14336, -14336, -14336};
    int16_t q122[4] = {-2381, -2381, -2381, -2381};
    int16_t e, f;
    vamrnb_gc_pred(q, q122, 0, code, &e, &f, nullptr, nullptr);
    int64_t l = 2134784LL * 512;
    for (int i = 0; i < 4; ++i) l += tab::pred[i] * q[i];
    l *= 2;
    const int32_t p = static_cast<int32_t>(l >> 16) * 10886;
    EXPECT_EQ(e, p >> 24);
    EXPECT_EQ(f, (p >> 9) - (p >> 24) * 32768);

    vamrnb_gc_pred(q, q122, 7, code, &e, &f, nullptr, nullptr);
    int32_t ener = 783741 + 30 * 65536;
    for (int i = 0; i < 4; ++i) ener += 2 * tab::pred_MR122[i] * q122[i];
    EXPECT_EQ(e, ener >> 17);
    EXPECT_EQ(f, (ener >> 2) - (ener >> 17) * 32768);
}

TEST(GmedN, MedianOfOddCounts) {
    const int16_t a[3] = {5, 5, 1}, b[3] = {3, 1, 2}, c[1] = {-42};
    EXPECT_EQ(vamrnb_gmed_n(a, 3), 5);
    EXPECT_EQ(vamrnb_gmed_n(b, 3), 2);
    EXPECT_EQ(vamrnb_gmed_n(c, 1), -42);

    std::mt19937 rng(10);
    std::uniform_int_distribution<int> d(-32767, 32767), small(0, 4);
    for (int t = 0; t < 500; ++t) {
        const int n = (t % 2) ? 5 : 9;
        int16_t v[9];
        for (int i = 0; i < n; ++i) v[i] = static_cast<int16_t>(t % 3 ? d(rng) : small(rng));
        std::vector<int16_t> s(v, v + n);
        std::sort(s.begin(), s.end());
        EXPECT_EQ(vamrnb_gmed_n(v, static_cast<int16_t>(n)), s[n / 2]) << t;
    }
}

// -32768 is below the search's starting maximum and is never picked; a round
// that finds nothing repeats the previous round's index.
TEST(GmedN, MinimumValuesRepeatThePreviousPick) {
    const int16_t v[3] = {-32768, 5, -32768};
    EXPECT_EQ(vamrnb_gmed_n(v, 3), 5);
    const int16_t w[5] = {-32768, 7, -32768, 3, -32768};
    EXPECT_EQ(vamrnb_gmed_n(w, 5), 3);
}
