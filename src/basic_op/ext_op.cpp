// Extended fixed-point functions built on the basic operators: products and
// division of 32-bit values held as (hi, lo) pairs, table-interpolated base-2
// logarithm and power, inverse square root and square root, and a right shift
// that reports saturation through a flag word.
//
// Each interpolation reads two neighbouring table entries: the integer part
// of the normalised input selects the entry, the next 15 (or 16) bits give
// the linear interpolation factor.
#include "basic_op/ext_op.h"

#include "basic_op/op_tables.h"

using namespace vamrnb;

extern "C" {

VAMRNB_API int32_t vamrnb_mpy_32(int16_t hi1, int16_t lo1, int16_t hi2, int16_t lo2) {
    return mpy_32(hi1, lo1, hi2, lo2);
}

VAMRNB_API int32_t vamrnb_mpy_32_16(int16_t hi, int16_t lo, int16_t n) {
    return mpy_32_16(hi, lo, n);
}

// L_num / denom in Q31 by one Newton step on the reciprocal of denom:
// approx ~ 1/denom_hi, then 1/denom ~ approx * (2 - denom * approx).
VAMRNB_API int32_t vamrnb_div_32(int32_t L_num, int16_t denom_hi, int16_t denom_lo) {
    const Word16 approx = div_s(0x3fff, denom_hi);

    Word16 hi, lo;
    Word32 L = l_sub(MAX_32, mpy_32_16(denom_hi, denom_lo, approx));
    l_extract(L, &hi, &lo);
    L = mpy_32_16(hi, lo, approx);
    l_extract(L, &hi, &lo);

    Word16 n_hi, n_lo;
    l_extract(L_num, &n_hi, &n_lo);
    L = mpy_32(n_hi, n_lo, hi, lo);
    return l_shl(L, 2);
}

VAMRNB_API void vamrnb_log2_norm(int32_t L_x, int16_t exp, int16_t *exponent, int16_t *fraction) {
    if (L_x <= 0) {
        *exponent = 0;
        *fraction = 0;
        return;
    }
    *exponent = sub(30, exp);

    // Bits 30..25 select the segment (a normalised input has bit 30 set, so
    // the index is 0..31); bits 24..10 are the interpolation factor.  The
    // mask keeps an unnormalised input inside the table.
    const int i = ((L_x >> 25) - 32) & 31;
    const Word16 a_q15 = static_cast<Word16>((L_x >> 10) & 0x7fff);
    const Word16 step = sub(tab::log2_table[i], tab::log2_table[i + 1]);
    const Word32 L_y = l_msu(l_deposit_h(tab::log2_table[i]), step, a_q15);
    *fraction = extract_h(L_y);
}

VAMRNB_API void vamrnb_log2(int32_t L_x, int16_t *exponent, int16_t *fraction) {
    const Word16 n = norm_l(L_x);
    vamrnb_log2_norm(l_shl(L_x, n), n, exponent, fraction);
}

// 2^(exponent + fraction/32768).  The table holds 2^(i/32) in Q14; the
// interpolated value is a Q30 mantissa scaled down by 30 - exponent with
// rounding.  An exponent above 30 would need a left shift: it yields 0.
VAMRNB_API int32_t vamrnb_pow2(int16_t exponent, int16_t fraction) {
    if (exponent < -1 || exponent > 30) return 0;

    // Bits 14..10 of the fraction select the segment, bits 9..0 (doubled
    // and moved up by 6) interpolate.  A negative fraction is outside the
    // domain; the mask only keeps it inside the table.
    const int i = (fraction >> 10) & 31;
    const Word32 a2 = (Word32{fraction} * 64) & 0xffff;
    const Word32 step = Word32{tab::pow2_table[i]} - tab::pow2_table[i + 1];
    const Word32 L = wrap_sub(wrap_mul(tab::pow2_table[i], 65536), wrap_mul(step, a2));

    const int s = 30 - exponent;
    if (s == 0) return L;
    Word32 r = L >> s;  // s is 1..31
    if ((static_cast<uint32_t>(L) >> (s - 1)) & 1u) r = wrap_add(r, 1);
    return r;
}

// 1/sqrt(L_x): normalise to an even exponent, interpolate the table of
// 1/sqrt(1 + i/16) and shift back by half the exponent.
VAMRNB_API int32_t vamrnb_inv_sqrt(int32_t L_x) {
    if (L_x <= 0) return 0x3fffffff;

    const Word16 n = norm_l(L_x);
    Word32 x = l_shl(L_x, n);
    Word16 e = sub(30, n);
    if ((e & 1) == 0) x = l_shr(x, 1);
    e = add(shr(e, 1), 1);

    const int i = (x >> 25) - 16;  // 0..47 for the normalised x
    const Word16 a_q15 = static_cast<Word16>((x >> 10) & 0x7fff);
    const Word16 step = sub(tab::inv_sqrt_table[i], tab::inv_sqrt_table[i + 1]);
    const Word32 L_y = l_msu(l_deposit_h(tab::inv_sqrt_table[i]), step, a_q15);
    return l_shr(L_y, e);
}

// Square root in normalised form: on return sqrt(input) = frac >> (exp / 2).
// The input is normalised by an even shift into [0.25, 1), then the table of
// sqrt((i + 16) / 64) is interpolated with a 16-bit factor.
VAMRNB_API void vamrnb_isqrt_n(int32_t *frac, int16_t *exp) {
    Word32 x = *frac;
    if (x <= 0) {
        *frac = 0;
        *exp = 0;
        return;
    }
    const Word16 s = static_cast<Word16>(norm_l(x) & ~1);
    x = wrap_shl(x, s);
    *exp = s;

    const int i = (x >> 25) - 16;  // 0..47
    const Word32 a2 = (x >> 9) & 0xfffe;
    const Word32 step = Word32{tab::sqrt_l_table[i]} - tab::sqrt_l_table[i + 1];
    *frac = wrap_sub(wrap_mul(tab::sqrt_l_table[i], 65536), wrap_mul(step, a2));
}

// l_shr whose left shifts (negative counts) report saturation by setting
// *overflow to 1.  The flag is never cleared here.
VAMRNB_API int32_t amrnb_l_shr(int32_t L_var1, int16_t var2, int32_t *overflow) {
    if (var2 >= 0) return L_var1 >> (var2 > 31 ? 31 : var2);

    int n = var2 < -32 ? 32 : -var2;
    Word32 L = L_var1;
    for (; n > 0; --n) {
        if (L > 0x3fffffff) {
            *overflow = 1;
            return MAX_32;
        }
        if (L < -0x40000000) {
            *overflow = 1;
            return MIN_32;
        }
        L *= 2;
    }
    return L;
}

}  // extern "C"
