// Fixed-point operators at their rails and shift-count limits, the division
// diagnostics, and the exported C faces, which use only the low 16 bits of a
// Word16 operand.  Their arithmetic in ordinary use is pinned bit for bit by
// the encoder and decoder streams.
#include <gtest/gtest.h>

#include <string>

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"

using namespace vamrnb;

// The rails and shift counts the codec's streams seldom reach.
TEST(BasicOp, SaturationAndShiftEdges) {
    EXPECT_EQ(abs_s(-32768), 32767);
    EXPECT_EQ(negate(-32768), 32767);
    EXPECT_EQ(norm_s(0), 0);
    EXPECT_EQ(norm_s(-1), 15);
    EXPECT_EQ(norm_l(INT32_MIN), 0);
    EXPECT_EQ(add(32767, 1), 32767);
    EXPECT_EQ(sub(-32768, 1), -32768);
    EXPECT_EQ(mult(-32768, -32768), 32767);
    EXPECT_EQ(mult_r(-32768, -32768), 32767);
    EXPECT_EQ(l_mult(-32768, -32768), INT32_MAX);
    EXPECT_EQ(l_negate(INT32_MIN), INT32_MAX);
    EXPECT_EQ(l_abs(INT32_MIN), INT32_MAX);
    EXPECT_EQ(round16(INT32_MAX), 32767);
    EXPECT_EQ(mac_r(INT32_MAX, 32767, 32767), 32767);
    EXPECT_EQ(msu_r(INT32_MIN, 32767, 32767), -32768);
    // A negative count shifts the other way; large counts saturate or clear.
    EXPECT_EQ(shl(1, 40), 32767);
    EXPECT_EQ(shl(-1, 40), -32768);
    EXPECT_EQ(shl(-32768, -40), -1);
    EXPECT_EQ(shr(12345, 40), 0);
    EXPECT_EQ(shr(-12345, 40), -1);
    EXPECT_EQ(shr(1, -40), 32767);
    EXPECT_EQ(shr_r(3, 1), 2);
    EXPECT_EQ(shr_r(-3, 1), -1);
    EXPECT_EQ(shr_r(-32768, 16), 0);
    EXPECT_EQ(l_shl(1, 40), INT32_MAX);
    EXPECT_EQ(l_shl(-1, 40), INT32_MIN);
    EXPECT_EQ(l_shl(0, 30000), 0);  // returns without running the count down
    EXPECT_EQ(l_shr(INT32_MIN, 40), -1);
    EXPECT_EQ(l_shr(1, -40), INT32_MAX);
    EXPECT_EQ(l_shr_r(3, 1), 2);
    EXPECT_EQ(l_shr_r(INT32_MIN, 32), 0);
    EXPECT_EQ(div_s(1, 3), 10922);
    EXPECT_EQ(div_s(7, 7), 32767);
    Word16 h, l;  // the pair stands for L without its bit 0
    l_extract(0x12345678, &h, &l);
    EXPECT_TRUE(h == 0x1234 && l == 0x2B3C);
    l_extract(-3, &h, &l);
    EXPECT_EQ(l_comp(h, l), -4);
}

TEST(BasicOp, DivisionDiagnosticsGoToStdout) {
    struct Case {
        int32_t num, den, result;
        const char *text;
    } const cases[] = {
        {1, 2, 16384, ""},
        {5, 5, 32767, ""},
        {0, 0, 0, "Division by 0, Fatal error \n"},
        {3, 0, 32767, "Division Error var1=3  var2=0\nDivision by 0, Fatal error \n"},
        {7, 5, 32767, "Division Error var1=7  var2=5\n"},
        {-1, 5, 0, "Division Error var1=-1  var2=5\n"},
    };
    for (const Case &c : cases) {
        testing::internal::CaptureStdout();
        const int32_t r = vamrnb_div_s(c.num, c.den);
        EXPECT_EQ(testing::internal::GetCapturedStdout(), c.text) << c.num << "/" << c.den;
        EXPECT_EQ(r, c.result) << c.num << "/" << c.den;
    }
}

TEST(BasicOp, ExportedFacesTakePlainIntegers) {
    // A Word16 operand counts by its low 16 bits; the adders take the exact
    // 32-bit sum before saturating; Word16 results come back sign-extended.
    const int32_t junk = 0x12340000;
    EXPECT_EQ(vamrnb_mult(-32768 + junk, -32768 - junk), 32767);
    EXPECT_EQ(vamrnb_shl(-1 + junk, 15 + junk), -32768);
    EXPECT_EQ(vamrnb_l_mac(5, 3 + junk, -2 + junk), -7);
    EXPECT_EQ(vamrnb_norm_s(0xFFFF), 15);
    EXPECT_EQ(vamrnb_add(junk, -junk + 5), 5);
    EXPECT_EQ(vamrnb_sub(junk, 0), 32767);
    EXPECT_EQ(vamrnb_extract_l(0x0001ABCD), int16_t(0xABCD));
    EXPECT_EQ(vamrnb_l_shr_r(3, 1 + junk), 2);
    EXPECT_EQ(vamrnb_l_deposit_l(-123456789), -123456789);
    EXPECT_EQ(vamrnb_platform_deinit(-123456789), -123456789);
}
