// Fixed-point operators against plain wide-integer models (every 16-bit input
// for the unary ones, rails and a grid for the binary ones, rails and random
// values for the 32-bit ones), the division diagnostics, and the exported C
// faces, which use only the low 16 bits of a Word16 operand.
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <random>
#include <string>
#include <vector>

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"

using namespace vamrnb;

namespace {
int64_t c16(int64_t v) { return v > 32767 ? 32767 : v < -32768 ? -32768 : v; }
int64_t c32(int64_t v) { return v > INT32_MAX ? INT32_MAX : v < INT32_MIN ? INT32_MIN : v; }
int64_t fl(int64_t v, int64_t k) { return v >> (k > 62 ? 62 : k); }  // floor(v / 2^k)
int64_t up(int64_t v, int64_t k) { return v * (int64_t{1} << k); }
// Shifts: a negative count shifts the other way, limited to 16 (32 for L).
int64_t m_shl(int64_t a, int64_t n) { return n < 0 ? fl(a, std::min<int64_t>(-n, 16)) : c16(up(a, std::min<int64_t>(n, 40))); }
int64_t m_shr(int64_t a, int64_t n) { return n < 0 ? m_shl(a, std::max<int64_t>(n, -16) * -1) : fl(a, std::min<int64_t>(n, 15)); }
int64_t m_lshl(int64_t L, int64_t n) { return n <= 0 ? fl(L, -n) : c32(up(L, std::min<int64_t>(n, 32))); }
int64_t m_lshr(int64_t L, int64_t n) { return n < 0 ? m_lshl(L, std::min<int64_t>(-n, 32)) : fl(L, std::min<int64_t>(n, 31)); }
int64_t m_round_shift(int64_t v, int64_t n) { return fl(v + (int64_t{1} << (n - 1)), n); }
int m_norm(int64_t v, int width) { return v == 0 ? 0 : width - 1 - std::bit_width(static_cast<uint64_t>(v < 0 ? ~v : v)); }

std::vector<int32_t> grid16() {
    std::vector<int32_t> v = {-32768, -32767, -1, 0, 1, 32767};
    for (int32_t a = -32768; a <= 32767; a += 331) v.push_back(a);
    return v;
}
std::vector<int32_t> sample32() {
    std::vector<int32_t> v = {INT32_MIN, INT32_MIN + 1, -0x40000001, -0x40000000, -32768, -1, 0, 1,
                              0x8000, 0x3fffffff, 0x40000000, INT32_MAX};
    std::mt19937 rng(12345);
    for (int i = 0; i < 300; ++i) v.push_back(static_cast<int32_t>(rng()) >> (rng() % 31));
    return v;
}
}  // namespace

TEST(BasicOp, SixteenBitOperatorsMatchWideModel) {
    for (int32_t a = -32768; a <= 32767; ++a) {
        const Word16 w = static_cast<Word16>(a);
        ASSERT_EQ(abs_s(w), c16(a < 0 ? -int64_t{a} : a));
        ASSERT_EQ(negate(w), c16(-int64_t{a}));
        ASSERT_EQ(norm_s(w), m_norm(a, 16)) << a;
        ASSERT_EQ(saturate(a * 3), c16(int64_t{a} * 3));
    }
    const auto g = grid16();
    for (int32_t a : g) {
        for (int32_t b : g) {
            const int64_t p = int64_t{a} * b;
            ASSERT_EQ(add(a, b), c16(int64_t{a} + b));
            ASSERT_EQ(sub(a, b), c16(int64_t{a} - b));
            ASSERT_EQ(mult(Word16(a), Word16(b)), c16(fl(p, 15))) << a << " " << b;
            ASSERT_EQ(mult_r(Word16(a), Word16(b)), c16(fl(p + 0x4000, 15))) << a << " " << b;
            ASSERT_EQ(l_mult(Word16(a), Word16(b)), c32(2 * p));
            if (a >= 0 && b > 0 && a <= b) {
                ASSERT_EQ(div_s(a, b), a == b ? 32767 : up(a, 15) / b);
            }
        }
        for (int32_t n = -40; n <= 40; ++n) {
            ASSERT_EQ(shl(Word16(a), n), m_shl(a, n)) << a << " " << n;
            ASSERT_EQ(shr(Word16(a), n), m_shr(a, n)) << a << " " << n;
            ASSERT_EQ(shr_r(Word16(a), n), n > 15 ? 0 : n <= 0 ? m_shr(a, n) : m_round_shift(a, n)) << a << " " << n;
        }
    }
}

TEST(BasicOp, ThirtyTwoBitOperatorsMatchWideModel) {
    const auto v = sample32();
    const auto g = grid16();
    EXPECT_EQ(l_shl(0, 30000), 0);  // returns without running the count down
    Word16 h, l;
    l_extract(0x12345678, &h, &l);
    EXPECT_TRUE(h == 0x1234 && l == 0x2B3C);
    for (int32_t L : v) {
        ASSERT_EQ(l_negate(L), c32(-int64_t{L}));
        ASSERT_EQ(l_abs(L), c32(L < 0 ? -int64_t{L} : L));
        ASSERT_EQ(norm_l(L), m_norm(L, 32)) << L;
        ASSERT_EQ(round16(L), fl(c32(int64_t{L} + 0x8000), 16));
        for (int32_t M : v) {
            ASSERT_EQ(l_add(L, M), c32(int64_t{L} + M));
            ASSERT_EQ(l_sub(L, M), c32(int64_t{L} - M));
        }
        for (int32_t n = -40; n <= 40; ++n) {
            ASSERT_EQ(l_shl(L, n), m_lshl(L, n)) << L << " " << n;
            ASSERT_EQ(l_shr(L, n), m_lshr(L, n)) << L << " " << n;
            ASSERT_EQ(l_shr_r(L, n), n > 31 ? 0 : n <= 0 ? m_lshr(L, n) : m_round_shift(L, n)) << L << " " << n;
        }
        for (size_t i = 0; i < g.size(); i += 5) {
            const Word16 a = Word16(g[i]), b = Word16(g[g.size() - 1 - i]);
            const int64_t prod = c32(2 * int64_t{a} * b);
            ASSERT_EQ(l_mac(L, a, b), c32(L + prod));
            ASSERT_EQ(l_msu(L, a, b), c32(L - prod));
            ASSERT_EQ(mac_r(L, a, b), fl(c32(c32(L + prod) + 0x8000), 16));
            ASSERT_EQ(msu_r(L, a, b), fl(c32(c32(L - prod) + 0x8000), 16));
        }
        Word16 hi, lo;  // the pair stands for L without its bit 0
        l_extract(L, &hi, &lo);
        ASSERT_TRUE(hi == fl(L, 16) && lo >= 0 && l_comp(hi, lo) == (L & ~1)) << L;
    }
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
