// Internal interface between the codebook stage and its lower-mode searches.
#pragma once

#include "enc/subframe.h"

#include <algorithm>

namespace vamrnb {

// The candidate (sq, alp) beats the best so far (sqk, alpk) when
// sq/alp > sqk/alpk.  The fixed-point criterion alpk*sq - sqk*alp > 0 only
// saturates towards its own sign, so an exact product comparison decides
// the same way; each product of two 16-bit values is at most 2^30 in size,
// so both products and their comparison fit 32 bits.
inline bool better(Word16 sq, Word16 alp, Word16 sqk, Word16 alpk) {
    return Word32{alpk} * sq > Word32{sqk} * alp;
}

// Running best of a codebook search: criterion sq/alp, the pulse sum ps
// behind it and the candidate's index.
struct search_best {
    Word16 sq = -1;
    Word16 alp = 1;
    Word16 ps = 0;
    int idx = 0;
};

// One pass over N candidates of a track: candidate j has the pulse sum
// add(ps0, dn[j]) and the energy alp0 + e[j], rounded to 16 bits.  Updates
// best in candidate order, so of equal candidates the first one wins, and
// idx becomes idx0 + j.  The energies are plain sums, so the caller must
// guarantee |alp0| + |e[j]| + 2^15 <= 2^31 - 1, where e[j] itself is the
// exact sum of the terms the saturating version would add one by one: then
// no partial sum of that chain, nor the rounding, can saturate.  While
// |ps0| + |dn[j]| <= 32767 the pulse sums cannot saturate either (nor can
// their squares, which need -32768).
template <int N>
inline void pick_best(Word16 ps0, Word32 alp0, const Word16 *dn, const Word32 *e, Word32 dn_max,
                      int idx0, search_best &best) {
    const Word32 round0 = alp0 + 0x8000;
    Word32 bs = best.sq, ba = best.alp;
    if ((ps0 < 0 ? -Word32{ps0} : Word32{ps0}) + dn_max <= MAX_16) {
        for (int j = 0; j < N; ++j) {
            const Word32 ps = Word32{ps0} + dn[j];
            const Word32 sq = (ps * ps) >> 15;
            const Word32 alp = (round0 + e[j]) >> 16;
            if (ba * sq > bs * alp) {
                bs = sq;
                ba = alp;
                best.ps = static_cast<Word16>(ps);
                best.idx = idx0 + j;
            }
        }
    } else {
        for (int j = 0; j < N; ++j) {
            const Word16 ps = add(ps0, dn[j]);
            const Word32 sq = mult(ps, ps);
            const Word32 alp = (round0 + e[j]) >> 16;
            if (ba * sq > bs * alp) {
                bs = sq;
                ba = alp;
                best.ps = ps;
                best.idx = idx0 + j;
            }
        }
    }
    best.sq = static_cast<Word16>(bs);
    best.alp = static_cast<Word16>(ba);
}

// Largest magnitude of n values (32768 for -32768).
inline Word32 max_mag(const Word16 *v, int n) {
    Word32 m = 0;
    for (int j = 0; j < n; ++j) m = std::max(m, v[j] < 0 ? -Word32{v[j]} : Word32{v[j]});
    return m;
}

// Filtered code vector: y[i] = round(sum_k h[i - codvec[k]] * signs[k]);
// h[-39..-1] must be readable and zero.
void filter_pulses(const Word16 *h, const Word16 *codvec, const Word16 *signs, int n,
                   Word16 *y);

// Pulse positions of the two-, three- and four-pulse codebooks from |dn|,
// the candidate marks dn2 (negative: not a first pulse) and the signed
// correlation matrix.
void search_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *dn, const Word16 *dn2,
                    const Word16 rr[L_CODE][L_CODE], Word16 *codvec);

// Two-, three- and four-pulse codebooks (modes MR475..MR795); h[-39..-1]
// must be readable and zero.  Sharpens h
// (in place) and the code vector when T0 < 40, writes the code vector and
// its filtered version, returns the position index and the sign word.
Word16 code_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *x, Word16 *h, Word16 T0,
                    Word16 pitch_sharp, Word16 *code, Word16 *y, Word16 *sign_word);

}  // namespace vamrnb
