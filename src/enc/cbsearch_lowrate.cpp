// Algebraic codebooks of the six lower modes: two pulses (9 and 11 bits),
// three pulses (14 bits) and four pulses (17 bits) on interleaved tracks of
// step 5.  Each search fixes the pulse signs from the backward-filtered
// target, then tries the pulse positions track by track, keeping the
// combination with the largest (correlation^2 / energy); the winning code
// vector is filtered and turned into a position index and a sign word.

#include "enc/cbsearch_lowrate.h"

#include "lpc/tables.h"

#include <cstdlib>

namespace vamrnb {
namespace {

constexpr Word16 Q15_HALF = 16384;      // 1/2
constexpr Word16 Q15_QUARTER = 8192;    // 1/4
constexpr Word16 Q15_EIGHTH = 4096;     // 1/8
constexpr Word16 Q15_SIXTEENTH = 2048;  // 1/16
constexpr int STEP = 5;


// Signs of dn (dn becomes |dn|); dn2 keeps, per track, the n largest
// magnitudes and marks the 8 - n smallest with -1.
void set_sign(Word16 *dn, Word16 *sign, Word16 *dn2, int n) {
    for (int i = 0; i < L_CODE; ++i) {
        Word16 v = dn[i];
        if (v >= 0) {
            sign[i] = 32767;
        } else {
            sign[i] = -32767;
            v = negate(v);
        }
        dn[i] = v;
        dn2[i] = v;
    }
    for (int t = 0; t < 5; ++t) {
        for (int k = 0; k < 8 - n; ++k) {
            Word16 min = 0x7fff;
            int pos = 0;
            for (int j = t; j < L_CODE; j += STEP) {
                if (dn2[j] >= 0 && dn2[j] < min) {
                    min = dn2[j];
                    pos = j;
                }
            }
            dn2[pos] = -1;
        }
    }
}

constexpr int N_POS = L_CODE / STEP;  // positions per track

// Candidates of one track (positions t, t + 5, ...): their dn values and,
// for the energy, the diagonal of rr scaled by 2·w.
struct track_terms {
    Word16 dn[N_POS];
    Word32 diag[N_POS];
    Word32 dn_max;
};

void gather_track(const Word16 *dn, const Word16 rr[L_CODE][L_CODE], int t, Word16 w, track_terms &out) {
    for (int j = 0, i = t; j < N_POS; ++j, i += STEP) {
        out.dn[j] = dn[i];
        out.diag[j] = Word32{rr[i][i]} * (2 * w);
    }
    out.dn_max = max_mag(out.dn, N_POS);
}

// e[j] += 2·w·rr[row][t + 5j]
void add_row(Word32 *e, const Word16 rr[L_CODE][L_CODE], int row, int t, Word16 w) {
    const Word16 *r = rr[row] + t;
    for (int j = 0; j < N_POS; ++j) e[j] += r[j * STEP] * (2 * w);
}

// Two pulses: first on the track starting at p0, second at p1.  The energy
// of a pair is rr00/4 + rr11/4 + rr01/2 in Q31 (|.| <= 2^28 + 2^28 + 2^30,
// plus the rounding term, below 2^31), so it is a plain sum.
void search_pair(const Word16 *dn, const Word16 rr[L_CODE][L_CODE], int p0, int p1, Word16 &psk,
                 Word16 &alpk, Word16 *codvec) {
    track_terms t1;
    gather_track(dn, rr, p1, Q15_QUARTER, t1);
    for (int i0 = p0; i0 < L_CODE; i0 += STEP) {
        Word32 e[N_POS];
        for (int j = 0; j < N_POS; ++j) e[j] = t1.diag[j];
        add_row(e, rr, i0, p1, Q15_HALF);
        search_best best;
        pick_best<N_POS>(dn[i0], l_mult(rr[i0][i0], Q15_QUARTER), t1.dn, e, t1.dn_max, 0, best);
        if (better(best.sq, best.alp, psk, alpk)) {
            psk = best.sq;
            alpk = best.alp;
            codvec[0] = static_cast<Word16>(i0);
            codvec[1] = static_cast<Word16>(p1 + STEP * best.idx);
        }
    }
}

// Three or four pulses, the later pulses chosen one track at a time.  The
// energies of the second pulse (|.| <= 2^28 + 2^28 + 2^30) and of the third
// (2^28 + 2^27 + 2 * 2^28) are plain sums with room for the rounding; the
// fourth starts from the third's energy in the high half and is a plain sum
// only while that energy leaves room (checked per first pulse).
void search_multi(int n_pulse, const Word16 *dn, const Word16 *dn2, const Word16 rr[L_CODE][L_CODE],
                  const int *ipos, Word16 &psk, Word16 &alpk, Word16 *codvec) {
    track_terms t1, t2, t3;
    gather_track(dn, rr, ipos[1], Q15_QUARTER, t1);
    gather_track(dn, rr, ipos[2], Q15_SIXTEENTH, t2);
    if (n_pulse == 4) gather_track(dn, rr, ipos[3], Q15_SIXTEENTH, t3);
    // Largest fourth-pulse energy terms: the diagonal plus three rows.
    constexpr Word32 ROOM4 = MAX_32 - 0x8000 - 32768 * 2 * Q15_SIXTEENTH
                             - 3 * (32768 * 2 * Q15_EIGHTH);

    for (int i0 = ipos[0]; i0 < L_CODE; i0 += STEP) {
        if (dn2[i0] < 0) continue;
        Word32 e[N_POS];

        // Second pulse.
        for (int j = 0; j < N_POS; ++j) e[j] = t1.diag[j];
        add_row(e, rr, i0, ipos[1], Q15_HALF);
        search_best best;
        pick_best<N_POS>(dn[i0], l_mult(rr[i0][i0], Q15_QUARTER), t1.dn, e, t1.dn_max, 0, best);
        const int i1 = ipos[1] + STEP * best.idx;

        // Third pulse.
        for (int j = 0; j < N_POS; ++j) e[j] = t2.diag[j];
        add_row(e, rr, i1, ipos[2], Q15_EIGHTH);
        add_row(e, rr, i0, ipos[2], Q15_EIGHTH);
        Word16 ps0 = best.ps;
        Word32 alp0 = l_mult(best.alp, Q15_QUARTER);
        best = search_best{};
        pick_best<N_POS>(ps0, alp0, t2.dn, e, t2.dn_max, 0, best);
        const int i2 = ipos[2] + STEP * best.idx;

        int i3 = 0;
        if (n_pulse == 4) {
            // Fourth pulse.
            ps0 = best.ps;
            alp0 = l_deposit_h(best.alp);
            if (std::abs(int64_t{alp0}) <= ROOM4) {
                for (int j = 0; j < N_POS; ++j) e[j] = t3.diag[j];
                add_row(e, rr, i2, ipos[3], Q15_EIGHTH);
                add_row(e, rr, i1, ipos[3], Q15_EIGHTH);
                add_row(e, rr, i0, ipos[3], Q15_EIGHTH);
                best = search_best{};
                pick_best<N_POS>(ps0, alp0, t3.dn, e, t3.dn_max, 0, best);
                i3 = ipos[3] + STEP * best.idx;
            } else {
                best = search_best{};
                i3 = ipos[3];
                for (int k = ipos[3]; k < L_CODE; k += STEP) {
                    const Word16 ps1 = add(ps0, dn[k]);
                    Word32 alp1 = l_mac(alp0, rr[k][k], Q15_SIXTEENTH);
                    alp1 = l_mac(alp1, rr[i2][k], Q15_EIGHTH);
                    alp1 = l_mac(alp1, rr[i1][k], Q15_EIGHTH);
                    alp1 = l_mac(alp1, rr[i0][k], Q15_EIGHTH);
                    const Word16 sq1 = mult(ps1, ps1);
                    const Word16 alp_16 = round16(alp1);
                    if (better(sq1, alp_16, best.sq, best.alp)) {
                        best.sq = sq1;
                        best.alp = alp_16;
                        i3 = k;
                    }
                }
            }
        }

        if (better(best.sq, best.alp, psk, alpk)) {
            psk = best.sq;
            alpk = best.alp;
            codvec[0] = static_cast<Word16>(i0);
            codvec[1] = static_cast<Word16>(i1);
            codvec[2] = static_cast<Word16>(i2);
            if (n_pulse == 4) codvec[3] = static_cast<Word16>(i3);
        }
    }
}

// Position index of a pulse in its track (pos / 5) and the track (pos % 5).
inline void split_pos(Word16 pos, Word16 *index, Word16 *track) {
    *index = mult(pos, 6554);
    *track = sub(pos, extract_l(l_shr(l_mult(*index, 5), 1)));
}

}  // namespace

void filter_pulses(const Word16 *h, const Word16 *codvec, const Word16 *signs, int n,
                   Word16 *y) {
    const Word16 *hp[10];
    for (int k = 0; k < n; ++k) hp[k] = h - codvec[k];
    for (int i = 0; i < L_CODE; ++i) {
        Word32 s = 0;
        for (int k = 0; k < n; ++k) s = l_mac(s, hp[k][i], signs[k]);
        y[i] = round16(s);
    }
}

void search_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *dn, const Word16 *dn2,
                    const Word16 rr[L_CODE][L_CODE], Word16 *codvec) {
    for (int k = 0; k < 4; ++k) codvec[k] = static_cast<Word16>(k);
    Word16 psk = -1, alpk = 1;
    if (mode == MR475 || mode == MR515) {
        for (int t = 0; t < 2; ++t) {
            search_pair(dn, rr, tab::startPos[subfr_nr * 2 + 8 * t],
                        tab::startPos[subfr_nr * 2 + 1 + 8 * t], psk, alpk, codvec);
        }
        return;
    }
    if (mode == MR59) {
        for (int t1 = 0; t1 < 2; ++t1) {
            for (int t2 = 0; t2 < 4; ++t2) {
                search_pair(dn, rr, tab::startPos1[t1], tab::startPos2[t2], psk, alpk, codvec);
            }
        }
        return;
    }
    // Each start of the track order is searched with the order rotated
    // through all pulses.
    const auto rotations = [&](int n, int *ipos) {
        for (int r = 0; r < n; ++r) {
            search_multi(n, dn, dn2, rr, ipos, psk, alpk, codvec);
            const int last = ipos[n - 1];
            for (int q = n - 1; q > 0; --q) ipos[q] = ipos[q - 1];
            ipos[0] = last;
        }
    };
    if (mode == MR67) {
        for (int t1 = 1; t1 < 4; t1 += 2) {
            for (int t2 = 2; t2 < 5; t2 += 2) {
                int ipos[3] = {0, t1, t2};
                rotations(3, ipos);
            }
        }
    } else {
        for (int t = 3; t < 5; ++t) {
            int ipos[4] = {0, 1, 2, t};
            rotations(4, ipos);
        }
    }
}

Word16 code_lowrate(int32_t mode, int32_t subfr_nr, const Word16 *x, Word16 *h, Word16 T0,
                    Word16 pitch_sharp, Word16 *code, Word16 *y, Word16 *sign_word) {
    const Word16 sharp = shl(pitch_sharp, 1);
    if (T0 < L_CODE) {
        for (int i = T0; i < L_CODE; ++i) h[i] = add(h[i], mult(h[i - T0], sharp));
    }

    Word16 dn[L_CODE], dn2[L_CODE], dn_sign[L_CODE];
    alignas(16) Word16 rr[L_CODE][L_CODE];
    vamrnbe_cor_h_x(h, x, dn, 1);

    int n_pulse;
    if (mode <= MR59) {
        n_pulse = 2;
    } else if (mode == MR67) {
        n_pulse = 3;
    } else {
        n_pulse = 4;
    }
    set_sign(dn, dn_sign, dn2, n_pulse == 2 ? 8 : (n_pulse == 3 ? 6 : 4));
    cor_h(h, dn_sign, rr);

    Word16 codvec[4];
    search_lowrate(mode, subfr_nr, dn, dn2, rr, codvec);

    // Code vector, signs and the position index.
    for (int i = 0; i < L_CODE; ++i) code[i] = 0;
    Word16 signs[4];
    Word16 indx = 0, rsign = 0;
    for (int k = 0; k < n_pulse; ++k) {
        const Word16 pos = codvec[k];
        Word16 index, track;
        split_pos(pos, &index, &track);
        if (mode == MR475 || mode == MR515) {
            // Which track pair was used is coded in the first pulse's index.
            const Word16 first = tab::trackTable[subfr_nr * 5 + track];
            if (k == 0) {
                track = 0;
                if (first != 0) index = add(index, 64);
            } else {
                track = 1;
                index = shl(index, 3);
            }
        } else if (mode == MR59) {
            switch (track) {
            case 0: track = 1; index = shl(index, 6); break;
            case 1:
                if (k == 0) {
                    track = 0;
                    index = shl(index, 1);
                } else {
                    track = 1;
                    index = add(shl(index, 6), 16);
                }
                break;
            case 2: track = 1; index = add(shl(index, 6), 32); break;
            case 3: track = 0; index = add(shl(index, 1), 1); break;
            default: track = 1; index = add(shl(index, 6), 48); break;
            }
        } else if (mode == MR67) {
            switch (track) {
            case 0: break;
            case 1: index = shl(index, 4); break;
            case 2: index = shl(index, 8); break;
            case 3: track = 1; index = add(shl(index, 4), 8); break;
            default: track = 2; index = add(shl(index, 8), 128); break;
            }
        } else {
            index = tab::gray[index];
            switch (track) {
            case 0: break;
            case 1: index = shl(index, 3); break;
            case 2: index = shl(index, 6); break;
            case 3: index = shl(index, 10); break;
            default: track = 3; index = add(shl(index, 10), 512); break;
            }
        }
        if (dn_sign[pos] > 0) {
            code[pos] = 8191;
            signs[k] = 32767;
            rsign = add(rsign, shl(1, track));
        } else {
            code[pos] = -8192;
            signs[k] = MIN_16;
        }
        indx = add(indx, index);
    }
    *sign_word = rsign;
    filter_pulses(h, codvec, signs, n_pulse, y);

    if (T0 < L_CODE) {
        for (int i = T0; i < L_CODE; ++i) code[i] = add(code[i], mult(code[i - T0], sharp));
    }
    return indx;
}

}  // namespace vamrnb
