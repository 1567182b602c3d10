// Fixed-point operators against plain wide-integer models: every 16-bit
// input for the unary operators, rail values and a dense grid for the binary
// ones, rails and random values for the 32-bit ones, plus the exported C
// faces (which take 32-bit arguments and use only the low 16 bits of a
// Word16 operand).
#include <gtest/gtest.h>

#include <bit>
#include <random>
#include <string>
#include <vector>

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"

using namespace vamrnb;

namespace {

int64_t clamp16(int64_t v) { return v > 32767 ? 32767 : v < -32768 ? -32768 : v; }
int64_t clamp32(int64_t v) {
    return v > INT32_MAX ? INT32_MAX : v < INT32_MIN ? INT32_MIN : v;
}
// floor(v / 2^k) for k >= 0 (C++20 >> on a negative value is arithmetic).
int64_t fdiv2(int64_t v, int k) { return k >= 63 ? (v < 0 ? -1 : 0) : v >> k; }

int64_t m_shl(int64_t a, int64_t n);
int64_t m_shr(int64_t a, int64_t n) {
    if (n < 0) return m_shl(a, -n > 16 ? 16 : -n);
    return fdiv2(a, n > 15 ? 15 : static_cast<int>(n));
}
int64_t m_shl(int64_t a, int64_t n) {
    if (n < 0) return m_shr(a, -n > 16 ? 16 : -n);
    return clamp16(a * (int64_t{1} << (n > 40 ? 40 : n)));
}
int64_t m_lshl(int64_t L, int64_t n) {
    if (n <= 0) return fdiv2(L, -n > 63 ? 63 : static_cast<int>(-n));
    return clamp32(L * (int64_t{1} << (n > 32 ? 32 : n)));
}
int64_t m_lshr(int64_t L, int64_t n) {
    if (n < 0) return m_lshl(L, -n > 32 ? 32 : -n);
    return fdiv2(L, n > 31 ? 31 : static_cast<int>(n));
}
int m_norm(int64_t v, int width) {  // width 16 or 32
    if (v == 0) return 0;
    const uint64_t mag = static_cast<uint64_t>(v < 0 ? ~v : v);
    return width - 1 - std::bit_width(mag);
}

const std::vector<int32_t> kRails16 = {-32768, -32767, -16384, -1, 0, 1, 16384, 32767};
const std::vector<int32_t> kRails32 = {INT32_MIN, INT32_MIN + 1, -0x40000001, -0x40000000, -65536,
                                       -32768, -1, 0, 1, 32767, 0x8000, 0x3fffffff,
                                       0x40000000, INT32_MAX - 1, INT32_MAX};

std::vector<int32_t> grid16() {
    std::vector<int32_t> v(kRails16);
    for (int32_t a = -32768; a <= 32767; a += 331) v.push_back(a);
    return v;
}
std::vector<int32_t> sample32() {
    std::vector<int32_t> v(kRails32);
    std::mt19937 rng(12345);
    for (int i = 0; i < 400; ++i) v.push_back(static_cast<int32_t>(rng()));
    for (int i = 0; i < 100; ++i) v.push_back(static_cast<int32_t>(rng()) >> (rng() % 31));
    return v;
}

}  // namespace

TEST(BasicOp, UnaryOperatorsOverEveryInput) {
    for (int32_t a = -32768; a <= 32767; ++a) {
        const Word16 w = static_cast<Word16>(a);
        ASSERT_EQ(abs_s(w), clamp16(a < 0 ? -int64_t{a} : a)) << a;
        ASSERT_EQ(negate(w), clamp16(-int64_t{a})) << a;
        ASSERT_EQ(norm_s(w), m_norm(a, 16)) << a;
        ASSERT_EQ(l_deposit_h(w), int64_t{a} * 65536) << a;
        ASSERT_EQ(l_deposit_l(w), a) << a;
        ASSERT_EQ(saturate(a * 3), clamp16(int64_t{a} * 3)) << a;
        // Normalising shift brings the value into the top quarter of the range.
        if (a != 0 && a != -1) {
            const int32_t s = a * (1 << norm_s(w));
            ASSERT_TRUE((s >= 0x4000 && s <= 0x7fff) || (s >= -0x8000 && s < -0x4000)) << a;
        }
    }
}

TEST(BasicOp, BinarySixteenBitOperatorsOnRailsAndGrid) {
    const auto g = grid16();
    for (int32_t a : g) {
        for (int32_t b : g) {
            const int64_t p = int64_t{a} * b;
            ASSERT_EQ(add(a, b), clamp16(int64_t{a} + b)) << a << " " << b;
            ASSERT_EQ(sub(a, b), clamp16(int64_t{a} - b)) << a << " " << b;
            ASSERT_EQ(mult(Word16(a), Word16(b)), clamp16(fdiv2(p, 15))) << a << " " << b;
            ASSERT_EQ(mult_r(Word16(a), Word16(b)), clamp16(fdiv2(p + 0x4000, 15))) << a << " " << b;
            ASSERT_EQ(l_mult(Word16(a), Word16(b)), clamp32(2 * p)) << a << " " << b;
            if (a >= 0 && b > 0 && a <= b) {
                // Quotient in Q15, truncated; 32767 when equal.
                const int64_t q = a == b ? 32767 : (int64_t{a} << 15) / b;
                ASSERT_EQ(div_s(a, b), q) << a << " " << b;
            }
        }
        for (int32_t n = -40; n <= 40; ++n) {
            const Word16 w = static_cast<Word16>(a);
            ASSERT_EQ(shl(w, n), m_shl(a, n)) << a << " " << n;
            ASSERT_EQ(shr(w, n), m_shr(a, n)) << a << " " << n;
            const int64_t rr = n > 15 ? 0 : n <= 0 ? m_shr(a, n) : fdiv2(int64_t{a} + (1 << (n - 1)), n);
            ASSERT_EQ(shr_r(w, n), rr) << a << " " << n;
        }
    }
}

TEST(BasicOp, ThirtyTwoBitOperatorsAgainstWideModel) {
    const auto v = sample32();
    const auto g = grid16();
    for (int32_t L : v) {
        ASSERT_EQ(l_negate(L), clamp32(-int64_t{L}));
        ASSERT_EQ(l_abs(L), clamp32(L < 0 ? -int64_t{L} : L));
        ASSERT_EQ(norm_l(L), m_norm(L, 32)) << L;
        ASSERT_EQ(extract_h(L), fdiv2(L, 16));
        ASSERT_EQ(extract_l(L), static_cast<int16_t>(static_cast<uint32_t>(L) & 0xffff));
        ASSERT_EQ(round16(L), fdiv2(clamp32(int64_t{L} + 0x8000), 16)) << L;
        for (int32_t M : v) {
            ASSERT_EQ(l_add(L, M), clamp32(int64_t{L} + M));
            ASSERT_EQ(l_sub(L, M), clamp32(int64_t{L} - M));
        }
        for (int32_t n = -40; n <= 40; ++n) {
            ASSERT_EQ(l_shl(L, n), m_lshl(L, n)) << L << " " << n;
            ASSERT_EQ(l_shr(L, n), m_lshr(L, n)) << L << " " << n;
            const int64_t rr = n > 31 ? 0 : n <= 0 ? m_lshr(L, n)
                                                   : fdiv2(int64_t{L} + (int64_t{1} << (n - 1)), n);
            ASSERT_EQ(l_shr_r(L, n), rr) << L << " " << n;
        }
        for (size_t i = 0; i < g.size(); i += 7) {
            const Word16 a = static_cast<Word16>(g[i]), b = static_cast<Word16>(g[g.size() - 1 - i]);
            const int64_t prod = clamp32(2 * int64_t{a} * b);
            ASSERT_EQ(l_mac(L, a, b), clamp32(L + prod));
            ASSERT_EQ(l_msu(L, a, b), clamp32(L - prod));
            ASSERT_EQ(mac_r(L, a, b), fdiv2(clamp32(clamp32(L + prod) + 0x8000), 16));
            ASSERT_EQ(msu_r(L, a, b), fdiv2(clamp32(clamp32(L - prod) + 0x8000), 16));
        }
    }
}

TEST(BasicOp, DoublePrecisionSplitRoundTrips) {
    for (int32_t L : sample32()) {
        Word16 hi, lo;
        l_extract(L, &hi, &lo);
        ASSERT_EQ(hi, fdiv2(L, 16));
        ASSERT_GE(lo, 0);
        // lo holds bits 1..15; the pair stands for L with bit 0 dropped.
        ASSERT_EQ(l_comp(hi, lo), L & ~1) << L;
    }
    Word16 hi, lo;
    l_extract(0x12345678, &hi, &lo);
    EXPECT_EQ(hi, 0x1234);
    EXPECT_EQ(lo, 0x2B3C);
    EXPECT_EQ(l_comp(0x1234, 0x2B3C), 0x12345678);
}

TEST(BasicOp, ListedEdgeCases) {
    EXPECT_EQ(shl(1, 15), 32767);
    EXPECT_EQ(shl(-1, 15), -32768);
    EXPECT_EQ(shl(0, 20), 0);
    EXPECT_EQ(shl(100, -20), 0);
    EXPECT_EQ(shl(-100, -20), -1);
    for (int32_t a : kRails16) EXPECT_EQ(shr(Word16(a), -20), shl(Word16(a), 16)) << a;
    EXPECT_EQ(mult(-32768, -32768), 32767);
    EXPECT_EQ(l_mult(-32768, -32768), MAX_32);
    EXPECT_EQ(mult_r(16384, 1), 1);
    EXPECT_EQ(round16(MAX_32), 32767);
    EXPECT_EQ(round16(0x7FFF7FFF), 32767);
    EXPECT_EQ(round16(-0x8000), 0);
    EXPECT_EQ(l_shl(0x20000000, 1), 0x40000000);
    EXPECT_EQ(l_shl(0x40000000, 1), MAX_32);
    EXPECT_EQ(l_shl(-0x40000000, 1), MIN_32);
    EXPECT_EQ(l_shl(-0x40000001, 1), MIN_32);
    EXPECT_EQ(l_shl(0, 30000), 0);
    EXPECT_EQ(l_shl(-5, -200), -1);
    EXPECT_EQ(l_shr(-12345, 40), -1);
    EXPECT_EQ(l_shr(12345, 40), 0);
    EXPECT_EQ(l_shr_r(MAX_32, 32), 0);
    EXPECT_EQ(l_shr_r(3, 1), 2);
    EXPECT_EQ(shr_r(-3, 1), -1);
    EXPECT_EQ(shr_r(32767, 16), 0);
    EXPECT_EQ(norm_s(0), 0);
    EXPECT_EQ(norm_s(-1), 15);
    EXPECT_EQ(norm_s(1), 14);
    EXPECT_EQ(norm_s(-32768), 0);
    EXPECT_EQ(norm_l(0), 0);
    EXPECT_EQ(norm_l(-1), 31);
    EXPECT_EQ(norm_l(1), 30);
    EXPECT_EQ(abs_s(-32768), 32767);
    EXPECT_EQ(negate(-32768), 32767);
    EXPECT_EQ(l_abs(MIN_32), MAX_32);
    EXPECT_EQ(l_negate(MIN_32), MAX_32);
}

TEST(BasicOp, DivisionDiagnosticsGoToStdout) {
    struct Case {
        int32_t num, den, result;
        const char *text;
    };
    const Case cases[] = {
        {1, 2, 16384, ""},
        {5, 5, 32767, ""},
        {0, 0, 0, "Division by 0, Fatal error \n"},
        {3, 0, 32767, "Division Error var1=3  var2=0\nDivision by 0, Fatal error \n"},
        {7, 5, 32767, "Division Error var1=7  var2=5\n"},
        {-1, 5, -1, "Division Error var1=-1  var2=5\n"},
    };
    for (const Case &c : cases) {
        testing::internal::CaptureStdout();
        const int32_t r = vamrnb_div_s(c.num, c.den);
        const std::string out = testing::internal::GetCapturedStdout();
        EXPECT_EQ(out, c.text) << c.num << "/" << c.den;
        if (c.num >= 0) {
            EXPECT_EQ(r, c.result) << c.num << "/" << c.den;
        }
    }
}

TEST(BasicOp, ExportedFacesUseLowHalfOfWord16Operands) {
    // A Word16 operand passed with garbage in its upper half behaves as its
    // low 16 bits; the adders see the whole 32-bit values.
    const int32_t junk = 0x12340000;
    std::mt19937 rng(7);
    for (int i = 0; i < 20000; ++i) {
        const Word16 a = static_cast<Word16>(rng()), b = static_cast<Word16>(rng());
        const int32_t L = static_cast<int32_t>(rng());
        const int32_t n = static_cast<int32_t>(rng() % 81) - 40;
        ASSERT_EQ(vamrnb_mult(a + junk, b - junk), mult(a, b));
        ASSERT_EQ(vamrnb_mult_r(a + junk, b), mult_r(a, b));
        ASSERT_EQ(vamrnb_l_mult(a, b + junk), l_mult(a, b));
        ASSERT_EQ(vamrnb_abs_s(a + junk), abs_s(a));
        ASSERT_EQ(vamrnb_negate(a + junk), negate(a));
        ASSERT_EQ(vamrnb_norm_s(a + junk), norm_s(a));
        ASSERT_EQ(vamrnb_shl(a + junk, n), shl(a, n));
        ASSERT_EQ(vamrnb_shr(a + junk, n), shr(a, n));
        ASSERT_EQ(vamrnb_shr_r(a + junk, n), shr_r(a, n));
        ASSERT_EQ(vamrnb_l_mac(L, a + junk, b), l_mac(L, a, b));
        ASSERT_EQ(vamrnb_l_msu(L, a, b + junk), l_msu(L, a, b));
        ASSERT_EQ(vamrnb_mac_r(L, a, b), mac_r(L, a, b));
        ASSERT_EQ(vamrnb_msu_r(L, a, b), msu_r(L, a, b));
        ASSERT_EQ(vamrnb_l_deposit_h(a + junk), l_deposit_h(a));
        ASSERT_EQ(vamrnb_l_comp(a, b + junk), l_comp(a, b));
        ASSERT_EQ(vamrnb_l_shl(L, n), l_shl(L, n));
        ASSERT_EQ(vamrnb_l_shr(L, n), l_shr(L, n));
        ASSERT_EQ(vamrnb_l_shr_r(L, n), l_shr_r(L, n));
        // Adders: exact 32-bit sum, then saturation.
        ASSERT_EQ(vamrnb_add(a + junk, b), clamp16(int64_t{a} + junk + b));
        ASSERT_EQ(vamrnb_sub(L, b), clamp16(int64_t{L} - b));
        ASSERT_EQ(vamrnb_saturate(L), clamp16(L));
        ASSERT_EQ(vamrnb_extract_h(L), extract_h(L));
        ASSERT_EQ(vamrnb_extract_l(L), extract_l(L));
        ASSERT_EQ(vamrnb_round(L), round16(L));
        ASSERT_EQ(vamrnb_l_add(L, a), l_add(L, a));
        ASSERT_EQ(vamrnb_l_sub(L, a), l_sub(L, a));
        ASSERT_EQ(vamrnb_l_negate(L), l_negate(L));
        ASSERT_EQ(vamrnb_l_abs(L), l_abs(L));
        ASSERT_EQ(vamrnb_norm_l(L), norm_l(L));
    }
    EXPECT_EQ(vamrnb_l_deposit_l(-123456789), -123456789);
    EXPECT_EQ(vamrnb_platform_deinit(-123456789), -123456789);
    int16_t hi, lo;
    vamrnb_l_extract(0x12345678, &hi, &lo);
    EXPECT_EQ(hi, 0x1234);
    EXPECT_EQ(lo, 0x2B3C);
}
