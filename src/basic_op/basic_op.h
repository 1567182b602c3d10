// Saturating 16/32-bit fixed-point operators: the arithmetic every codec stage
// is written in.  Each operator is a constexpr inline function here; the
// exported vamrnb_* functions (basic_op.cpp) are thin faces over these same
// definitions, so inline and called forms cannot drift apart.
//
// No operator relies on signed overflow.  Where a result is meant to wrap, it
// goes through wrap_add / wrap_sub / wrap_mul (two's-complement on uint32_t);
// where it saturates, through sat16 / sat32.
#pragma once

#include <bit>
#include <cstdint>
#include <type_traits>

// The architecture layer (arch.h) may supply single-instruction forms of a
// few operators; they are used at run time, the portable forms here in
// constant evaluation.  In the counting build (sat_count.h) every operator
// that can saturate takes its call site as a last, defaulted argument and
// records each saturation there.
#include "basic_op/arch.h"

namespace vamrnb {

using Word16 = int16_t;
using Word32 = int32_t;

inline constexpr Word32 MAX_32 = 0x7fffffff;
inline constexpr Word32 MIN_32 = static_cast<Word32>(0x80000000u);
inline constexpr Word16 MAX_16 = 0x7fff;
inline constexpr Word16 MIN_16 = -0x8000;

// ---- explicit wrap-around and saturation helpers --------------------------

constexpr Word32 wrap_add(Word32 a, Word32 b) {
    return static_cast<Word32>(static_cast<uint32_t>(a) + static_cast<uint32_t>(b));
}
constexpr Word32 wrap_sub(Word32 a, Word32 b) {
    return static_cast<Word32>(static_cast<uint32_t>(a) - static_cast<uint32_t>(b));
}
constexpr Word32 wrap_mul(Word32 a, Word32 b) {
    return static_cast<Word32>(static_cast<uint32_t>(a) * static_cast<uint32_t>(b));
}
// Left shift that keeps the low 32 bits (what "<<" does on hardware).
constexpr Word32 wrap_shl(Word32 a, int n) {
    return static_cast<Word32>(static_cast<uint32_t>(a) << n);
}
// Low 16 bits, sign-extended.
constexpr Word16 wrap16(Word32 a) { return static_cast<Word16>(a); }

constexpr Word16 sat16(int64_t v) {
    return v > MAX_16 ? MAX_16 : v < MIN_16 ? MIN_16 : static_cast<Word16>(v);
}
// Clamp of a value already known to fit 32 bits: the cheap common case.
constexpr Word16 sat16_32(Word32 v) {
#if VAMRNB_ARCH_OPS
    if (!std::is_constant_evaluated()) return arch::sat16_32(v);
#endif
    return v > MAX_16 ? MAX_16 : v < MIN_16 ? MIN_16 : static_cast<Word16>(v);
}
constexpr Word32 sat32(int64_t v) {
    return v > MAX_32 ? MAX_32 : v < MIN_32 ? MIN_32 : static_cast<Word32>(v);
}

// ---- 16-bit operators ------------------------------------------------------

constexpr Word16 saturate(Word32 L VAMRNB_SITE) {
    VAMRNB_SATURATED(L > MAX_16 || L < MIN_16, "saturate");
    return sat16_32(L);
}
// A 32-bit overflow of a ± b can only happen far outside 16 bits, on the side
// of a's sign; otherwise the 32-bit result s is clamped.
constexpr Word16 narrow16(Word32 a, Word32 s, bool wide, [[maybe_unused]] const char *op VAMRNB_SITE_PARAM) {
    VAMRNB_SATURATED(wide || s > MAX_16 || s < MIN_16, op);
    if (wide) return a < 0 ? MIN_16 : MAX_16;
    return sat16_32(s);
}
constexpr Word16 add(Word32 a, Word32 b VAMRNB_SITE) {
    Word32 s = 0;
    const bool wide = __builtin_add_overflow(a, b, &s);
    return narrow16(a, s, wide, "add" VAMRNB_SITE_ARG);
}
constexpr Word16 sub(Word32 a, Word32 b VAMRNB_SITE) {
    Word32 s = 0;
    const bool wide = __builtin_sub_overflow(a, b, &s);
    return narrow16(a, s, wide, "sub" VAMRNB_SITE_ARG);
}

constexpr Word16 abs_s(Word16 a VAMRNB_SITE) {
    VAMRNB_SATURATED(a == MIN_16, "abs_s");
    return a == MIN_16 ? MAX_16 : static_cast<Word16>(a < 0 ? -a : a);
}
constexpr Word16 negate(Word16 a VAMRNB_SITE) {
    VAMRNB_SATURATED(a == MIN_16, "negate");
    return a == MIN_16 ? MAX_16 : static_cast<Word16>(-a);
}

constexpr Word16 shr(Word16 a, Word32 n VAMRNB_SITE);

constexpr Word16 shl(Word16 a, Word32 n VAMRNB_SITE) {
    if (n < 0) return shr(a, n < -16 ? 16 : -n VAMRNB_SITE_ARG);
    if (a == 0) return 0;
    VAMRNB_SATURATED(n > 15, "shl");
    if (n > 15) return a > 0 ? MAX_16 : MIN_16;
    const Word32 r = static_cast<Word32>(a) * (Word32{1} << n);
    VAMRNB_SATURATED(r > MAX_16 || r < MIN_16, "shl");
    return sat16(r);
}

constexpr Word16 shr(Word16 a, Word32 n VAMRNB_SITE_PARAM) {
    if (n < 0) return shl(a, n < -16 ? 16 : -n VAMRNB_SITE_ARG);
    if (n >= 15) return a < 0 ? -1 : 0;
    return static_cast<Word16>(a >> n);
}

// |a·b| <= 2^30, so the products and the rounding term stay inside 32 bits.
constexpr Word16 mult(Word16 a, Word16 b VAMRNB_SITE) {
    VAMRNB_SATURATED(a == MIN_16 && b == MIN_16, "mult");
    return sat16_32((Word32{a} * b) >> 15);
}
constexpr Word16 mult_r(Word16 a, Word16 b VAMRNB_SITE) {
    VAMRNB_SATURATED(((Word32{a} * b + 0x4000) >> 15) > MAX_16, "mult_r");
    return sat16_32((Word32{a} * b + 0x4000) >> 15);
}

constexpr Word16 extract_h(Word32 L) { return static_cast<Word16>(L >> 16); }
constexpr Word16 extract_l(Word32 L) { return wrap16(L); }

// ---- 32-bit operators ------------------------------------------------------

constexpr Word32 l_mult(Word16 a, Word16 b VAMRNB_SITE) {
    VAMRNB_SATURATED(a == MIN_16 && b == MIN_16, "l_mult");
#if VAMRNB_ARCH_OPS || VAMRNB_ARCH_MAC
    if (!std::is_constant_evaluated()) return arch::l_mult(a, b);
#endif
    const Word32 p = Word32{a} * b;
    return p == 0x40000000 ? MAX_32 : p * 2;
}
// On overflow the true sum lies beyond the limit on the side of a's sign:
// (a >> 31) ^ MAX_32 is MAX_32 for a >= 0 and MIN_32 for a < 0.
constexpr Word32 rail32(Word32 a, Word32 s, bool over, [[maybe_unused]] const char *op VAMRNB_SITE_PARAM) {
    VAMRNB_SATURATED(over, op);
    return over ? (a >> 31) ^ MAX_32 : s;
}
constexpr Word32 l_add(Word32 a, Word32 b VAMRNB_SITE) {
#if VAMRNB_ARCH_OPS
    if (!std::is_constant_evaluated()) return arch::l_add(a, b);
#endif
    Word32 s = 0;
    const bool over = __builtin_add_overflow(a, b, &s);
    return rail32(a, s, over, "l_add" VAMRNB_SITE_ARG);
}
constexpr Word32 l_sub(Word32 a, Word32 b VAMRNB_SITE) {
#if VAMRNB_ARCH_OPS
    if (!std::is_constant_evaluated()) return arch::l_sub(a, b);
#endif
    Word32 s = 0;
    const bool over = __builtin_sub_overflow(a, b, &s);
    return rail32(a, s, over, "l_sub" VAMRNB_SITE_ARG);
}
constexpr Word32 l_mac(Word32 acc, Word16 a, Word16 b VAMRNB_SITE) {
#if VAMRNB_ARCH_MAC
    if (!std::is_constant_evaluated()) return arch::l_mac(acc, a, b);
#endif
    return l_add(acc, l_mult(a, b VAMRNB_SITE_ARG) VAMRNB_SITE_ARG);
}
constexpr Word32 l_msu(Word32 acc, Word16 a, Word16 b VAMRNB_SITE) {
#if VAMRNB_ARCH_MAC
    if (!std::is_constant_evaluated()) return arch::l_msu(acc, a, b);
#endif
    return l_sub(acc, l_mult(a, b VAMRNB_SITE_ARG) VAMRNB_SITE_ARG);
}
constexpr Word32 l_negate(Word32 L VAMRNB_SITE) {
    VAMRNB_SATURATED(L == MIN_32, "l_negate");
    return L == MIN_32 ? MAX_32 : -L;
}
constexpr Word32 l_abs(Word32 L VAMRNB_SITE) {
    VAMRNB_SATURATED(L == MIN_32, "l_abs");
    return L == MIN_32 ? MAX_32 : (L < 0 ? -L : L);
}
constexpr Word32 l_deposit_h(Word16 a) { return wrap_shl(a, 16); }
constexpr Word32 l_deposit_l(Word16 a) { return a; }

// Rounds a Word32 to its upper half (the standard's "round").
constexpr Word16 round16(Word32 L VAMRNB_SITE) { return extract_h(l_add(L, 0x8000 VAMRNB_SITE_ARG)); }
constexpr Word16 mac_r(Word32 acc, Word16 a, Word16 b VAMRNB_SITE) {
    return round16(l_mac(acc, a, b VAMRNB_SITE_ARG) VAMRNB_SITE_ARG);
}
constexpr Word16 msu_r(Word32 acc, Word16 a, Word16 b VAMRNB_SITE) {
    return round16(l_msu(acc, a, b VAMRNB_SITE_ARG) VAMRNB_SITE_ARG);
}

constexpr Word32 l_shl(Word32 L, Word32 n VAMRNB_SITE) {
    if (n <= 0) {
        const Word32 s = -static_cast<int64_t>(n) > 31 ? 31 : -n;
        return L >> s;
    }
    // L·2^n fits exactly when MIN_32 >> n <= L <= MAX_32 >> n; beyond 31
    // doublings every non-zero value has saturated, so n = 31 stands for
    // all larger counts (it still takes -1 exactly to MIN_32).
    if (n > 31) n = 31;
    VAMRNB_SATURATED(L > (MAX_32 >> n) || L < (MIN_32 >> n), "l_shl");
    if (L > (MAX_32 >> n)) return MAX_32;
    if (L < (MIN_32 >> n)) return MIN_32;
    return wrap_shl(L, n);
}

constexpr Word32 l_shr(Word32 L, Word32 n VAMRNB_SITE) {
    if (n < 0) return l_shl(L, n < -32 ? 32 : -n VAMRNB_SITE_ARG);
    return L >> (n > 31 ? 31 : n);
}

constexpr Word16 shr_r(Word16 a, Word32 n VAMRNB_SITE) {
    if (n > 15) return 0;
    Word16 r = shr(a, n VAMRNB_SITE_ARG);
    if (n > 0 && (a & (1 << (n - 1)))) ++r;
    return r;
}

constexpr Word32 l_shr_r(Word32 L, Word32 n VAMRNB_SITE) {
    if (n > 31) return 0;
    Word32 r = l_shr(L, n VAMRNB_SITE_ARG);
    if (n > 0 && ((static_cast<uint32_t>(L) >> (n - 1)) & 1u)) ++r;
    return r;
}

constexpr Word16 norm_s(Word16 a) {
    if (a == 0) return 0;
    if (a == -1) return 15;
    // Leading sign bits beyond the first, counted in 32 bits less 16.
    const uint32_t v = static_cast<uint32_t>(a < 0 ? ~Word32{a} : Word32{a});
    return static_cast<Word16>(std::countl_zero(v) - 17);
}

constexpr Word16 norm_l(Word32 L) {
    if (L == 0) return 0;
    if (L == -1) return 31;
    const uint32_t v = static_cast<uint32_t>(L < 0 ? ~L : L);
    return static_cast<Word16>(std::countl_zero(v) - 1);
}

// Prints the standard's diagnostics for invalid div_s arguments (never inline).
void div_s_report(Word32 num, Word32 den);

constexpr Word16 div_s(Word32 num, Word32 den) {
    if (num > den || num < 0 || den <= 0) {
        if (!std::is_constant_evaluated()) div_s_report(num, den);
    }
    if (num == 0) return 0;
    if (num == den) return MAX_16;
    Word32 r = num;
    Word32 q = 0;
    for (int i = 0; i < 15; ++i) {
        r = wrap_add(r, r);
        q = wrap_add(q, q);
        if (r >= den) {
            r = wrap_sub(r, den);
            q = wrap_add(q, 1);
        }
    }
    return wrap16(q);
}

// ---- double-precision pairs (hi, lo): value = hi·2^16 + lo·2 --------------

constexpr void l_extract(Word32 L, Word16 *hi, Word16 *lo VAMRNB_SITE) {
    *hi = extract_h(L);
    *lo = extract_l(l_msu(L >> 1, *hi, 16384 VAMRNB_SITE_ARG));
}
constexpr Word32 l_comp(Word16 hi, Word16 lo VAMRNB_SITE) {
    return l_mac(l_deposit_h(hi), lo, 1 VAMRNB_SITE_ARG);
}

constexpr Word32 mpy_32(Word16 hi1, Word16 lo1, Word16 hi2, Word16 lo2 VAMRNB_SITE) {
    Word32 L = l_mult(hi1, hi2 VAMRNB_SITE_ARG);
    L = l_mac(L, mult(hi1, lo2 VAMRNB_SITE_ARG), 1 VAMRNB_SITE_ARG);
    return l_mac(L, mult(lo1, hi2 VAMRNB_SITE_ARG), 1 VAMRNB_SITE_ARG);
}
constexpr Word32 mpy_32_16(Word16 hi, Word16 lo, Word16 n VAMRNB_SITE) {
    return l_mac(l_mult(hi, n VAMRNB_SITE_ARG), mult(lo, n VAMRNB_SITE_ARG), 1 VAMRNB_SITE_ARG);
}

}  // namespace vamrnb
