// Internal interface between the codebook stage and its lower-mode searches.
#pragma once

#include "enc/subframe.h"

namespace vamrnb {

// Filtered code vector: y[i] = round(sum_k h[i - codvec[k]] * signs[k]).
void filter_pulses(const Word16 *h, const Word16 *codvec, const Word16 *signs, int n,
                   Word16 *y);

// Two-, three- and four-pulse codebooks (modes MR475..MR795).  Sharpens h
// (in place) and the code vector when T0 < 40, writes the code vector and
// its filtered version, returns the position index and the sign word.
Word16 code_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *x, Word16 *h, Word16 T0,
                    Word16 pitch_sharp, Word16 *code, Word16 *y, Word16 *sign_word);

}  // namespace vamrnb
