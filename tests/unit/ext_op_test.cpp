// Extended functions: the edge values they are defined to return, the
// division's messages for an unnormalised denominator and the shift that
// reports overflow.  Their arithmetic inside the codec is pinned bit for bit
// by the encoder and decoder streams.
#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "basic_op/ext_op.h"

TEST(ExtOp, ListedEdgeCases) {
    int16_t e, f;
    for (int32_t x : {0, -5, 1, 0x40000000}) {
        vamrnb_log2(x, &e, &f);
        EXPECT_EQ(e, x == 0x40000000 ? 30 : 0) << x;
        EXPECT_EQ(f, 0) << x;
    }
    EXPECT_EQ(vamrnb_pow2(0, 0), 1);
    EXPECT_EQ(vamrnb_pow2(30, 0), 0x40000000);
    EXPECT_EQ(vamrnb_pow2(-1, 0), 1);  // 0.5 rounds up
    EXPECT_EQ(vamrnb_pow2(-2, 12345), 0);
    EXPECT_EQ(vamrnb_pow2(31, 20000), 0);  // no left shift: 0
    EXPECT_EQ(vamrnb_inv_sqrt(0), 0x3FFFFFFF);
    EXPECT_EQ(vamrnb_inv_sqrt(0x40000000), 32767);
    for (int32_t x : {0x40000000, 1}) {
        int32_t frac = x;
        int16_t exp = -1;
        vamrnb_isqrt_n(&frac, &exp);
        EXPECT_EQ(exp, x == 1 ? 30 : 0);
        EXPECT_EQ(frac, 23170 * 65536);
    }
}

TEST(ExtOp, DivisionMessagesForAnUnnormalisedDenominator) {
    struct Case {
        int16_t hi;
        const char *text;
    } const cases[] = {
        {16384, ""},
        {16383, ""},
        {16382, "Division Error var1=16383  var2=16382\n"},
        {100, "Division Error var1=16383  var2=100\n"},
        {0, "Division Error var1=16383  var2=0\nDivision by 0, Fatal error \n"},
        {-5, "Division Error var1=16383  var2=-5\n"},
    };
    for (const Case &c : cases) {
        testing::internal::CaptureStdout();
        vamrnb_div_32(1000, c.hi, 0);
        EXPECT_EQ(testing::internal::GetCapturedStdout(), c.text) << c.hi;
    }
}

TEST(ExtOp, ShiftWithOverflowFlag) {
    std::mt19937 rng(5);
    for (int i = 0; i < 5000; ++i) {  // same values as the saturating shift
        const int32_t L = int32_t(rng());
        const int16_t n = int16_t(int(rng() % 81) - 40);
        int32_t flag = 0;
        ASSERT_EQ(amrnb_l_shr(L, n, &flag), vamrnb::l_shr(L, n));
        ASSERT_EQ(flag, n < 0 && vamrnb::l_shr(L, n) != L * std::pow(2.0, -n)) << L << " " << n;
    }
    int32_t flag = 1;
    EXPECT_EQ(amrnb_l_shr(1, -3, &flag), 8);
    EXPECT_EQ(flag, 1);  // never cleared here
    flag = 0;
    EXPECT_EQ(amrnb_l_shr(-0x40000000, -1, &flag), INT32_MIN);  // fits exactly
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(amrnb_l_shr(5, -200, &flag), INT32_MAX);
    EXPECT_EQ(flag, 1);
}
