// State of the decoder's output-side stages: post-filter memories, adaptive
// gain control and background-noise detection.
// (Fields are filled in as those stages are written.)
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

struct post_filter_state {
    Word16 placeholder;
};

struct bgn_scd_state {
    Word16 placeholder;
};

}  // namespace vamrnb
