// Internal interface between the codebook stage and its lower-mode searches.
#pragma once

#include "enc/subframe.h"

namespace vamrnb {

// The candidate (sq, alp) beats the best so far (sqk, alpk) when
// sq/alp > sqk/alpk.  The fixed-point criterion alpk*sq - sqk*alp > 0 only
// saturates towards its own sign, so an exact product comparison decides
// the same way; each product of two 16-bit values is at most 2^30 in size,
// so both products and their comparison fit 32 bits.
inline bool better(Word16 sq, Word16 alp, Word16 sqk, Word16 alpk) {
    return Word32{alpk} * sq > Word32{sqk} * alp;
}

// Filtered code vector: y[i] = round(sum_k h[i - codvec[k]] * signs[k]);
// h[-39..-1] must be readable and zero.
void filter_pulses(const Word16 *h, const Word16 *codvec, const Word16 *signs, int n,
                   Word16 *y);

// Two-, three- and four-pulse codebooks (modes MR475..MR795); h[-39..-1]
// must be readable and zero.  Sharpens h
// (in place) and the code vector when T0 < 40, writes the code vector and
// its filtered version, returns the position index and the sign word.
Word16 code_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *x, Word16 *h, Word16 T0,
                    Word16 pitch_sharp, Word16 *code, Word16 *y, Word16 *sign_word);

}  // namespace vamrnb
