// 64-bit ARM: scalar forms of the saturating doubling multiplies.  SQDMULL is
// l_mult, SQDMLAL and SQDMLSL are l_mac and l_msu (the saturated product,
// then the saturated sum), bit for bit, so a multiply-accumulate chain keeps
// its sum in one register with one instruction per step.  The saturating
// adds stay in the portable forms: on A64 they would cost moves between the
// general and the vector registers.
#pragma once

#include <arm_neon.h>
#include <cstdint>

#define VAMRNB_ARCH_OPS 0
#define VAMRNB_ARCH_MAC 1

namespace vamrnb::arch {

inline int32_t l_mult(int16_t a, int16_t b) { return vqdmullh_s16(a, b); }
inline int32_t l_mac(int32_t acc, int16_t a, int16_t b) { return vqdmlalh_s16(acc, a, b); }
inline int32_t l_msu(int32_t acc, int16_t a, int16_t b) { return vqdmlslh_s16(acc, a, b); }

}  // namespace vamrnb::arch
