// Persistent and per-frame records of the encoder's subframe loop: closed-loop
// pitch, algebraic codebook and gain quantisation with the filter memories.
// (Fields are filled in as the subframe stages are written.)
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

// Carried from subframe to subframe and frame to frame.
struct subfr_state {
    Word16 placeholder;
};

// Lives one frame (part of the per-frame work record).
struct subfr_frame {
    Word16 placeholder;
};

}  // namespace vamrnb
