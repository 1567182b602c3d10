// Extended fixed-point functions: 32-bit division in double precision, base-2
// logarithm and power, inverse square root and square root.  Exported with C
// linkage (declared in the public vamrnb_dsp.h); codec stages call them under
// these names:
//
//   vamrnb_mpy_32, vamrnb_mpy_32_16, vamrnb_div_32, vamrnb_log2_norm,
//   vamrnb_log2, vamrnb_pow2, vamrnb_inv_sqrt, vamrnb_isqrt_n, amrnb_l_shr
#pragma once

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"
