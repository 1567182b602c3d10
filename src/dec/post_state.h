// State of the decoder's output-side stages: formant post-filter with tilt
// compensation and adaptive gain control, the output high-pass filter, and
// the background-noise detector.
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

struct post_filter_state {
    Word16 res2[40];            // residual of the current subframe
    Word16 mem_syn_pst[10];     // memory of the weighted synthesis filter
    Word16 mem_pre;             // tilt-compensation (pre-emphasis) memory
    Word16 past_gain;           // smoothed gain of the adaptive gain control
    Word16 synth_buf[10 + 160]; // 10 past samples followed by the frame
    // second-order output high-pass filter (doubles the signal on output)
    Word16 y2_hi, y2_lo, y1_hi, y1_lo;
    Word16 x0, x1;
};

struct bgn_scd_state {
    Word16 frameEnergyHist[60]; // frame energies of the last 60 frames
    Word16 bgHangover;          // frames since the last speech-like frame
};

// Output high-pass filter with doubling, in place on one frame (160 samples).
void post_process(post_filter_state *st, Word16 *sig);

}  // namespace vamrnb
