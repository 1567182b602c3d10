// Extended functions: their listed edge cases and their agreement with the
// real functions they approximate (log2, 2^x, 1/sqrt, sqrt, division,
// products), which catches wrong table indexing, interpolation or shifts.
#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "basic_op/ext_op.h"

using namespace vamrnb;

namespace {
double log2_of(int32_t x) {
    int16_t e, f;
    vamrnb_log2(x, &e, &f);
    return e + f / 32768.0;
}
}  // namespace

TEST(ExtOp, Log2EdgesAndAccuracy) {
    int16_t e = 9, f = 9;
    vamrnb_log2(0, &e, &f);
    EXPECT_EQ(e, 0);
    EXPECT_EQ(f, 0);
    vamrnb_log2(-5, &e, &f);
    EXPECT_EQ(e, 0);
    EXPECT_EQ(f, 0);
    vamrnb_log2(0x40000000, &e, &f);
    EXPECT_EQ(e, 30);
    EXPECT_EQ(f, 0);
    vamrnb_log2(1, &e, &f);
    EXPECT_EQ(e, 0);
    EXPECT_EQ(f, 0);

    std::mt19937 rng(1);
    for (int i = 0; i < 20000; ++i) {
        const int32_t x = static_cast<int32_t>(rng() >> (1 + rng() % 31));
        if (x <= 0) continue;
        ASSERT_NEAR(log2_of(x), std::log2(static_cast<double>(x)), 2.5e-4) << x;
        // The normalised entry point gives the same answer.
        const int16_t n = norm_l(x);
        int16_t e2, f2;
        vamrnb_log2_norm(l_shl(x, n), n, &e2, &f2);
        vamrnb_log2(x, &e, &f);
        ASSERT_EQ(e, e2);
        ASSERT_EQ(f, f2);
    }
}

TEST(ExtOp, Pow2EdgesAndAccuracy) {
    EXPECT_EQ(vamrnb_pow2(0, 0), 1);
    EXPECT_EQ(vamrnb_pow2(30, 0), 0x40000000);
    EXPECT_EQ(vamrnb_pow2(-1, 0), 1);
    EXPECT_EQ(vamrnb_pow2(-2, 12345), 0);
    EXPECT_EQ(vamrnb_pow2(31, 0), 0);
    EXPECT_EQ(vamrnb_pow2(31, 20000), 0);
    EXPECT_EQ(vamrnb_pow2(100, 0), 0);

    for (int exponent = 10; exponent <= 30; exponent += 5) {
        for (int frac = 0; frac < 32768; frac += 17) {
            const double want = std::exp2(exponent + frac / 32768.0);
            const double got = vamrnb_pow2(static_cast<int16_t>(exponent), static_cast<int16_t>(frac));
            ASSERT_NEAR(got, want, 1.5e-4 * want + 1.0) << exponent << " " << frac;
        }
    }
    // Round trip through the logarithm.
    std::mt19937 rng(2);
    for (int i = 0; i < 5000; ++i) {
        const int32_t x = static_cast<int32_t>((rng() >> 1) | 0x100000u);
        int16_t e, f;
        vamrnb_log2(x, &e, &f);
        const double back = vamrnb_pow2(e, f);
        ASSERT_NEAR(back / x, 1.0, 4e-4) << x;
    }
}

TEST(ExtOp, InvSqrtEdgesMonotonicAndAccurate) {
    EXPECT_EQ(vamrnb_inv_sqrt(0), 0x3FFFFFFF);
    EXPECT_EQ(vamrnb_inv_sqrt(-7), 0x3FFFFFFF);
    EXPECT_EQ(vamrnb_inv_sqrt(0x40000000), 32767);

    int32_t prev = MAX_32;
    for (int64_t x = 1; x <= MAX_32; x += 1 + x / 997) {
        const int32_t y = vamrnb_inv_sqrt(static_cast<int32_t>(x));
        ASSERT_LE(y, prev) << x;
        prev = y;
        const double want = std::ldexp(1.0, 30) / std::sqrt(static_cast<double>(x));
        ASSERT_NEAR(y / want, 1.0, 1e-3) << x;
    }
}

TEST(ExtOp, IsqrtNormalisedForm) {
    int32_t frac = 0x40000000;
    int16_t exp = -1;
    vamrnb_isqrt_n(&frac, &exp);
    EXPECT_EQ(exp, 0);
    EXPECT_EQ(frac, 23170 * 65536);
    frac = 1;
    vamrnb_isqrt_n(&frac, &exp);
    EXPECT_EQ(exp, 30);
    EXPECT_EQ(frac, 23170 * 65536);
    frac = -3;
    exp = 5;
    vamrnb_isqrt_n(&frac, &exp);
    EXPECT_EQ(frac, 0);
    EXPECT_EQ(exp, 0);

    std::mt19937 rng(3);
    for (int i = 0; i < 20000; ++i) {
        const int32_t x = static_cast<int32_t>(rng() >> (1 + rng() % 31));
        if (x <= 0) continue;
        int32_t f = x;
        int16_t e;
        vamrnb_isqrt_n(&f, &e);
        ASSERT_EQ(e % 2, 0);
        // frac is sqrt of the normalised input in Q31.
        const double want = std::sqrt(std::ldexp(static_cast<double>(x), e + 31));
        ASSERT_NEAR(f / want, 1.0, 2e-4) << x;
        ASSERT_GE(f, 0x40000000 - 65536) << x;
    }
}

TEST(ExtOp, ProductsAndDivisionInDoublePrecision) {
    std::mt19937 rng(4);
    for (int i = 0; i < 20000; ++i) {
        const int32_t a = static_cast<int32_t>(rng()), b = static_cast<int32_t>(rng());
        int16_t ahi, alo, bhi, blo;
        l_extract(a, &ahi, &alo);
        l_extract(b, &bhi, &blo);
        const double prod = std::ldexp(static_cast<double>(a) * b, -31);
        ASSERT_NEAR(vamrnb_mpy_32(ahi, alo, bhi, blo), prod, 8.0) << a << " " << b;
        const int16_t n = static_cast<int16_t>(rng());
        ASSERT_NEAR(vamrnb_mpy_32_16(ahi, alo, n), std::ldexp(static_cast<double>(a) * n, -15), 4.0);

        // Division: 0 <= num < denom, denom normalised (hi >= 16384).
        const int32_t denom = static_cast<int32_t>((rng() >> 1) | 0x40000000u);
        const int32_t num = static_cast<int32_t>(rng() % static_cast<uint32_t>(denom));
        int16_t dhi, dlo;
        l_extract(denom, &dhi, &dlo);
        const double q = std::ldexp(static_cast<double>(num) / (denom & ~1), 31);
        ASSERT_NEAR(vamrnb_div_32(num, dhi, dlo), q, 2e-4 * q + 16) << num << " / " << denom;
    }
    EXPECT_EQ(vamrnb_mpy_32(-32768, 0, -32768, 0), MAX_32);
}

TEST(ExtOp, ShiftWithOverflowFlag) {
    int32_t flag = 0;
    EXPECT_EQ(amrnb_l_shr(-256, 4, &flag), -16);
    EXPECT_EQ(amrnb_l_shr(-256, 100, &flag), -1);
    EXPECT_EQ(amrnb_l_shr(0x1000, -4, &flag), 0x10000);
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(amrnb_l_shr(0x40000000, -1, &flag), MAX_32);
    EXPECT_EQ(flag, 1);
    flag = 0;
    EXPECT_EQ(amrnb_l_shr(-3, -32, &flag), MIN_32);
    EXPECT_EQ(flag, 1);
    // Never cleared by a later shift that fits.
    EXPECT_EQ(amrnb_l_shr(1, -3, &flag), 8);
    EXPECT_EQ(flag, 1);
    flag = 0;
    EXPECT_EQ(amrnb_l_shr(-0x40000000, -1, &flag), MIN_32);
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(amrnb_l_shr(5, -200, &flag), MAX_32);  // count limited to 32
    EXPECT_EQ(flag, 1);
    // Same values as the saturating shift.
    std::mt19937 rng(5);
    for (int i = 0; i < 5000; ++i) {
        const int32_t L = static_cast<int32_t>(rng());
        const int16_t n = static_cast<int16_t>(static_cast<int>(rng() % 81) - 40);
        int32_t f = 0;
        ASSERT_EQ(amrnb_l_shr(L, n, &f), l_shr(L, n));
    }
}
