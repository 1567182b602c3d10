// Picks the architecture layer under the fixed-point operators: the ARM DSP
// instructions where the target has them, the A64 saturating multiplies on
// 64-bit ARM, nothing (the portable forms in basic_op.h) elsewhere.  The
// counting build always takes the portable forms, since it must see every
// saturating step.
#pragma once

#include "basic_op/sat_count.h"

#if defined(__arm__) && defined(__ARM_FEATURE_DSP) && defined(__ARM_FEATURE_SAT) && \
    !defined(VAMRNB_COUNT_SATURATION)
#include "basic_op/arm/basic_op_arm.h"
#define VAMRNB_ARCH_MAC 0
#elif defined(__aarch64__) && defined(__ARM_NEON) && !defined(VAMRNB_COUNT_SATURATION)
#include "basic_op/arm/basic_op_a64.h"
#else
#define VAMRNB_ARCH_OPS 0
#define VAMRNB_ARCH_MAC 0
#endif
