// Voice activity detection: the two detectors, their initial states, and the
// per-frame entry point that runs the configured detector and then decides
// whether the frame is coded as speech or handed to the DTX encoder.
#pragma once

#include <cstdint>

#include "vamrnb.h"
#include "basic_op/basic_op.h"
#include "vad/dtx_enc.h"
#include "common/vad_state.h"

namespace vamrnb {

// Option 1: initial state (levels 150, correlation trackers 13106, rest 0).
void vad1_init(vad1_state *st);

// Option 1 on one frame.  `in_buf` points at the first of the 160 new samples;
// the 40 samples before it (the previous frame's tail) enter the power measure.
// Returns the frame's decision, 0 or 1.
Word16 vad1(vad1_state *st, const Word16 *in_buf);

// Option 2: the initial state is all zero.
void vad2_init(vad2_state *st);

// Option 2 on one half frame of 80 samples; returns 0 or 1.
Word16 vad2(const Word16 *samples80, vad2_state *st);

// In-place 128-point FFT of a real sequence (option 2): on return element 0
// holds the DC term, element 1 the Nyquist term, then (re, im) pairs of bins
// 1..63, all scaled down by 64.
void r_fft(Word16 data[128]);

// DTX hangover decision for a frame with the given VAD flag.  May set
// *used_mode to 8 (MRDTX).  Returns 1 when the SID parameters are to be
// recomputed in this frame (hangover over and the frame silent), else 0.
Word16 dtx_hangover(dtx_enc_state *st, Word16 vad_flag, int32_t *used_mode);

}  // namespace vamrnb

struct vamrnb_encoder;
namespace vamrnb { struct enc_frame; }

extern "C" {
// Runs the configured detector on the frame's new samples and then the DTX
// hangover decision; writes compute_sid and possibly used_mode of the frame.
VAMRNB_API void vamrnbe_vad(vamrnb_encoder *st, vamrnb::enc_frame *fr);

// Band level of the option-1 filter bank: sums |data[step*i + start]| over
// i = count1..count2-1 (kept in *sub_level for the next frame, scaled) and
// over i = 0..count1-1, adds the carried part and returns the upper half.
VAMRNB_API int16_t vamrnbe_lev_calculation(const int16_t *data, int32_t count1,
                                           int32_t count2, int32_t step, int32_t start,
                                           int32_t scale, int16_t *sub_level);
}
