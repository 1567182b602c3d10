// 32-bit ARM with the DSP extension: single-instruction saturating add and
// subtract (QADD, QSUB), saturating doubling (QDADD's doubling half, through
// __qdbl) and saturate-to-width (SSAT).  basic_op.h uses these at run time
// and its portable forms in constant evaluation; both give the same values.
#pragma once

#include <arm_acle.h>
#include <cstdint>

#define VAMRNB_ARCH_OPS 1

namespace vamrnb::arch {

inline int16_t sat16_32(int32_t v) { return static_cast<int16_t>(__ssat(v, 16)); }
inline int32_t l_mult(int16_t a, int16_t b) { return __qdbl(int32_t{a} * b); }
inline int32_t l_add(int32_t a, int32_t b) { return __qadd(a, b); }
inline int32_t l_sub(int32_t a, int32_t b) { return __qsub(a, b); }

}  // namespace vamrnb::arch
