// Extended functions: their listed edge cases, and agreement with the real
// functions they approximate, which catches wrong table indexing,
// interpolation or shifts.
#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "basic_op/ext_op.h"

using namespace vamrnb;

namespace {
// Random positive values spread over all magnitudes.
int32_t any_positive(std::mt19937 &rng) { return std::max<int32_t>(1, int32_t(rng() >> (1 + rng() % 31))); }
}  // namespace

TEST(ExtOp, Log2AndPow2) {
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

    std::mt19937 rng(1);
    for (int i = 0; i < 20000; ++i) {
        const int32_t x = any_positive(rng);
        vamrnb_log2(x, &e, &f);
        ASSERT_NEAR(e + f / 32768.0, std::log2(double(x)), 2.5e-4) << x;
        int16_t e2, f2;
        vamrnb_log2_norm(l_shl(x, norm_l(x)), norm_l(x), &e2, &f2);
        ASSERT_TRUE(e == e2 && f == f2) << x;
        if (x >= 0x100000) {
            ASSERT_NEAR(vamrnb_pow2(e, f) / double(x), 1.0, 4e-4) << x;
        }

        const int16_t pe = int16_t(rng() % 31), pf = int16_t(rng() % 32768);
        const double want = std::exp2(pe + pf / 32768.0);
        ASSERT_NEAR(vamrnb_pow2(pe, pf), want, 1.5e-4 * want + 1.0) << pe << " " << pf;
    }
}

TEST(ExtOp, InverseSquareRootAndSquareRoot) {
    EXPECT_EQ(vamrnb_inv_sqrt(0), 0x3FFFFFFF);
    EXPECT_EQ(vamrnb_inv_sqrt(-7), 0x3FFFFFFF);
    EXPECT_EQ(vamrnb_inv_sqrt(0x40000000), 32767);
    int32_t prev = MAX_32;
    for (int64_t x = 1; x <= MAX_32; x += 1 + x / 997) {
        const int32_t y = vamrnb_inv_sqrt(int32_t(x));
        ASSERT_LE(y, prev) << x;  // never increases
        prev = y;
        ASSERT_NEAR(y * std::sqrt(double(x)) / 0x40000000, 1.0, 1e-3) << x;
    }

    // Bit 9 of the input does not take part in the interpolation (even factor).
    for (int32_t x : {0x40000000, 1, 0, -3, 0x40000200}) {
        int32_t frac = x;
        int16_t exp = -1;
        vamrnb_isqrt_n(&frac, &exp);
        EXPECT_EQ(exp, x == 1 ? 30 : 0) << x;
        EXPECT_EQ(frac, x > 0 ? 23170 * 65536 : 0) << x;
    }
    std::mt19937 rng(3);
    for (int i = 0; i < 20000; ++i) {
        const int32_t x = any_positive(rng);
        int32_t frac = x;
        int16_t exp;
        vamrnb_isqrt_n(&frac, &exp);
        ASSERT_EQ(exp % 2, 0);
        // frac is the square root of the normalised input, in Q31.
        ASSERT_NEAR(frac / std::sqrt(std::ldexp(double(x), exp + 31)), 1.0, 2e-4) << x;
    }
}

TEST(ExtOp, DoublePrecisionProductsAndDivision) {
    std::mt19937 rng(4);
    for (int i = 0; i < 20000; ++i) {
        const int32_t a = int32_t(rng()), b = int32_t(rng());
        const int16_t n = int16_t(rng());
        int16_t ahi, alo, bhi, blo;
        l_extract(a, &ahi, &alo);
        l_extract(b, &bhi, &blo);
        ASSERT_NEAR(vamrnb_mpy_32(ahi, alo, bhi, blo), std::ldexp(double(a) * b, -31), 8.0);
        ASSERT_NEAR(vamrnb_mpy_32_16(ahi, alo, n), std::ldexp(double(a) * n, -15), 4.0);

        // 0 <= num < denom, denom normalised (hi >= 16384): num/denom in Q31.
        const int32_t denom = int32_t((rng() >> 1) | 0x40000000u);
        const int32_t num = int32_t(rng() % uint32_t(denom));
        int16_t dhi, dlo;
        l_extract(denom, &dhi, &dlo);
        const double q = std::ldexp(double(num) / (denom & ~1), 31);
        ASSERT_NEAR(vamrnb_div_32(num, dhi, dlo), q, 2e-4 * q + 16) << num << " / " << denom;
    }
}

TEST(ExtOp, ShiftWithOverflowFlag) {
    std::mt19937 rng(5);
    for (int i = 0; i < 5000; ++i) {  // same values as the saturating shift
        const int32_t L = int32_t(rng());
        const int16_t n = int16_t(int(rng() % 81) - 40);
        int32_t flag = 0;
        ASSERT_EQ(amrnb_l_shr(L, n, &flag), l_shr(L, n));
        ASSERT_EQ(flag, n < 0 && l_shr(L, n) != L * std::pow(2.0, -n)) << L << " " << n;
    }
    int32_t flag = 1;
    EXPECT_EQ(amrnb_l_shr(1, -3, &flag), 8);
    EXPECT_EQ(flag, 1);  // never cleared here
    flag = 0;
    EXPECT_EQ(amrnb_l_shr(-0x40000000, -1, &flag), MIN_32);  // fits exactly
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(amrnb_l_shr(5, -200, &flag), MAX_32);
    EXPECT_EQ(flag, 1);
}
