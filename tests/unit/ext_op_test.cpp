// Extended functions, bit for bit: each is compared with a model written
// here in plain 64-bit integers, straight from the arithmetic each function
// is defined by, with its own tables (the log2 table as listed, the others
// computed from their defining formulas).  Dense sweeps and the edges of
// every domain; no floating-point tolerance that a wrong rounding or table
// entry could slip through.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>

#include "basic_op/ext_op.h"

namespace {

// ---- the model -------------------------------------------------------------
using i64 = int64_t;

i64 sat32(i64 v) { return std::clamp<i64>(v, INT32_MIN, INT32_MAX); }
i64 sat16(i64 v) { return std::clamp<i64>(v, INT16_MIN, INT16_MAX); }
// Q15 product, floored, saturated (only -1 * -1 overflows).
i64 mul15(i64 a, i64 b) { return sat16((a * b) >> 15); }

struct Tables {
    int log2[33] = {0,     1455,  2866,  4236,  5568,  6863,  8124,  9352,  10549, 11716, 12855,
                    13967, 15054, 16117, 17156, 18172, 19167, 20142, 21097, 22033, 22951, 23852,
                    24735, 25603, 26455, 27291, 28113, 28922, 29716, 30497, 31266, 32023, 32767};
    int pow2[33], inv_sqrt[49], sqrt[49];
    Tables() {
        for (int i = 0; i <= 32; ++i) pow2[i] = std::min(32767, int(std::lround(16384 * std::exp2(i / 32.0))));
        for (int i = 0; i <= 48; ++i) {
            inv_sqrt[i] = std::min(32767, int(std::lround(32768 / std::sqrt(1 + i / 16.0))));
            sqrt[i] = std::min(32767, int(std::lround(32768 * std::sqrt((i + 16) / 64.0))));
        }
    }
} const T;

// Shift that brings a positive value to 0x40000000..0x7FFFFFFF.
int norm(i64 x) {
    int n = 0;
    while (x < 0x40000000) x <<= 1, ++n;
    return n;
}

void split(i64 L, i64 &hi, i64 &lo) {
    hi = L >> 16;
    lo = (L >> 1) - hi * 32768;
}

i64 mpy_32(i64 h1, i64 l1, i64 h2, i64 l2) {
    i64 L = sat32(2 * h1 * h2);
    L = sat32(L + 2 * mul15(h1, l2));
    return sat32(L + 2 * mul15(l1, h2));
}

i64 mpy_32_16(i64 hi, i64 lo, i64 n) { return sat32(sat32(2 * hi * n) + 2 * mul15(lo, n)); }

i64 div_32(i64 num, i64 dhi, i64 dlo) {
    const i64 approx = dhi == 16383 ? 32767 : 16383 * 32768 / dhi;  // normalised: dhi >= 16384
    i64 hi, lo, nhi, nlo;
    split(sat32(INT32_MAX - mpy_32_16(dhi, dlo, approx)), hi, lo);
    split(mpy_32_16(hi, lo, approx), hi, lo);
    split(num, nhi, nlo);
    return sat32(mpy_32(nhi, nlo, hi, lo) * 4);
}

void log2_norm(i64 x, int exp, int &e, int &f) {
    if (x <= 0) {
        e = f = 0;
        return;
    }
    e = int(sat16(30 - exp));
    const i64 i = (x >> 25) - 32, a = (x >> 10) & 0x7FFF;
    f = int(sat32((i64{T.log2[i]} << 16) - 2 * a * (T.log2[i] - T.log2[i + 1])) >> 16);
}

i64 pow2(int e, int f) {
    if (e < -1) return 0;
    const int i = f >> 10;
    const i64 a2 = (i64{f} * 64) & 0xFFFF;
    const i64 L = (i64{T.pow2[i]} << 16) - (T.pow2[i] - T.pow2[i + 1]) * a2;
    const int s = 30 - e;
    if (s < 0) return 0;
    if (s == 0) return L;
    return (L >> s) + ((L >> (s - 1)) & 1);
}

i64 inv_sqrt(i64 x) {
    if (x <= 0) return 0x3FFFFFFF;
    const int n = norm(x);
    x <<= n;
    int e = 30 - n;
    if (e % 2 == 0) x >>= 1;
    e = (e >> 1) + 1;
    const i64 i = (x >> 25) - 16, a = (x >> 10) & 0x7FFF;
    return sat32((i64{T.inv_sqrt[i]} << 16) - 2 * a * (T.inv_sqrt[i] - T.inv_sqrt[i + 1])) >> e;
}

void isqrt_n(i64 &frac, int &exp) {
    if (frac <= 0) {
        frac = exp = 0;
        return;
    }
    exp = norm(frac) & ~1;
    frac <<= exp;
    const i64 i = (frac >> 25) - 16, a2 = (frac >> 9) & 0xFFFE;
    frac = (i64{T.sqrt[i]} << 16) - a2 * (T.sqrt[i] - T.sqrt[i + 1]);
}

// ---- arguments -----------------------------------------------------------------

// Every positive 32-bit magnitude densely, every power of two and its
// neighbours, and the rails.
std::vector<int32_t> positive_sweep() {
    std::vector<int32_t> v;
    for (i64 x = 1; x <= INT32_MAX; x += 1 + x / 3001) v.push_back(int32_t(x));
    for (int k = 0; k < 31; ++k)
        for (i64 d : {-1, 0, 1}) v.push_back(int32_t(std::clamp<i64>((i64{1} << k) + d, 1, INT32_MAX)));
    v.push_back(INT32_MAX);
    return v;
}

std::vector<int16_t> rails16(std::mt19937 &rng, int n) {
    std::vector<int16_t> v = {INT16_MIN, INT16_MIN + 1, -1, 0, 1, 16383, 16384, INT16_MAX - 1, INT16_MAX};
    while (int(v.size()) < n) v.push_back(int16_t(rng()));
    return v;
}

}  // namespace

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

TEST(ExtOp, LogarithmsMatchModel) {
    for (int32_t x : positive_sweep()) {
        int16_t e, f;
        int me, mf;
        vamrnb_log2(x, &e, &f);
        log2_norm(i64{x} << norm(x), norm(x), me, mf);
        ASSERT_TRUE(e == me && f == mf) << x << ": " << e << ' ' << f << " want " << me << ' ' << mf;
        // An already normalised input with any shift count.
        const int32_t xn = int32_t(i64{x} << norm(x));
        for (int16_t s : {int16_t(-32768), int16_t(-5), int16_t(0), int16_t(31), int16_t(32767)}) {
            vamrnb_log2_norm(xn, s, &e, &f);
            log2_norm(xn, s, me, mf);
            ASSERT_TRUE(e == me && f == mf) << xn << " shift " << s;
        }
    }
    int16_t e = 1, f = 1;
    vamrnb_log2(INT32_MIN, &e, &f);
    EXPECT_TRUE(e == 0 && f == 0);
}

TEST(ExtOp, PowerMatchesModelForEveryFraction) {
    for (int e = -3; e <= 33; ++e)
        for (int f = 0; f < 32768; ++f)
            ASSERT_EQ(vamrnb_pow2(int16_t(e), int16_t(f)), pow2(e, f)) << e << ' ' << f;
    EXPECT_EQ(vamrnb_pow2(INT16_MIN, 0), 0);
    EXPECT_EQ(vamrnb_pow2(INT16_MAX, 32767), 0);
}

TEST(ExtOp, SquareRootsMatchModel) {
    for (int32_t x : positive_sweep()) {
        ASSERT_EQ(vamrnb_inv_sqrt(x), inv_sqrt(x)) << x;
        int32_t frac = x;
        int16_t exp = -1;
        i64 mfrac = x;
        int mexp = -1;
        vamrnb_isqrt_n(&frac, &exp);
        isqrt_n(mfrac, mexp);
        ASSERT_TRUE(frac == mfrac && exp == mexp) << x;
    }
    for (int32_t x : {0, -1, -7, INT32_MIN}) {
        EXPECT_EQ(vamrnb_inv_sqrt(x), 0x3FFFFFFF) << x;
        int32_t frac = x;
        int16_t exp = 5;
        vamrnb_isqrt_n(&frac, &exp);
        EXPECT_TRUE(frac == 0 && exp == 0) << x;
    }
}

TEST(ExtOp, DoublePrecisionProductsAndDivisionMatchModel) {
    std::mt19937 rng(4);
    const auto h = rails16(rng, 60);
    std::vector<int16_t> l = {0, 1, 16383, 16384, 32767};  // lo of a split is 0..32767
    while (l.size() < 40) l.push_back(int16_t(rng() & 0x7FFF));
    // lo outside 0..32767 is not a split but is still defined arithmetic.
    l.push_back(-1);
    l.push_back(INT16_MIN);
    for (int16_t h1 : h)
        for (int16_t l1 : l) {
            for (int16_t n : h) ASSERT_EQ(vamrnb_mpy_32_16(h1, l1, n), mpy_32_16(h1, l1, n)) << h1 << ' ' << l1 << ' ' << n;
            for (int k = 0; k < 20; ++k) {
                const int16_t h2 = h[rng() % h.size()], l2 = l[rng() % l.size()];
                ASSERT_EQ(vamrnb_mpy_32(h1, l1, h2, l2), mpy_32(h1, l1, h2, l2))
                    << h1 << ' ' << l1 << ' ' << h2 << ' ' << l2;
            }
        }

    // Division over its domain: 0 <= num < denom, denom_hi >= 16384.
    for (int i = 0; i < 200000; ++i) {
        int32_t denom = int32_t((rng() >> 1) | 0x40000000u);
        if (i % 7 == 0) denom = i % 2 ? INT32_MAX : 0x40000000;
        int32_t num = int32_t(rng() % uint32_t(denom));
        if (i % 5 == 0) num = i % 3 == 0 ? 0 : denom - 1;
        int16_t dhi, dlo;
        vamrnb::l_extract(denom, &dhi, &dlo);
        ASSERT_EQ(vamrnb_div_32(num, dhi, dlo), div_32(num, dhi, dlo)) << num << " / " << denom;
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
