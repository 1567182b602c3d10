// Extended fixed-point functions: 32-bit division in double precision, base-2
// logarithm and power, inverse square root and square root.  Exported with C
// linkage; codec stages call them under these names.
#pragma once

#include "basic_op/basic_op.h"

extern "C" {
int32_t vamrnb_mpy_32(int16_t hi1, int16_t lo1, int16_t hi2, int16_t lo2);
int32_t vamrnb_mpy_32_16(int16_t hi, int16_t lo, int16_t n);
int32_t vamrnb_div_32(int32_t L_num, int16_t denom_hi, int16_t denom_lo);
void    vamrnb_log2_norm(int32_t L_x, int16_t exp, int16_t *exponent, int16_t *fraction);
void    vamrnb_log2(int32_t L_x, int16_t *exponent, int16_t *fraction);
int32_t vamrnb_pow2(int16_t exponent, int16_t fraction);
int32_t vamrnb_inv_sqrt(int32_t L_x);
void    vamrnb_isqrt_n(int32_t *frac, int16_t *exp);
int32_t amrnb_l_shr(int32_t L_var1, int16_t var2, int32_t *overflow);
}
