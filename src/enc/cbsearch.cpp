// Algebraic codebook stage of the encoder.
//
// vamrnbe_icb picks the mode's codebook: the two-, three- and four-pulse
// codebooks of the lower modes (cbsearch_lowrate.cpp), the 8-pulse 31-bit
// codebook of MR102 and the 10-pulse 35-bit codebook of MR122.  The two
// large codebooks fix the pulse signs from a mix of the backward-filtered
// target and the pitch-free residual, then search pulse pairs depth-first
// starting from the strongest track.  The kernels shared by all searches
// (backward filtering, the signed correlation matrix of the impulse
// response) are here too.

#include "enc/subframe.h"

#include "basic_op/ext_op.h"
#include "enc/cbsearch_lowrate.h"
#include "lpc/dsp.h"
#include "lpc/kernel_common.h"
#include "lpc/tables.h"

#include <algorithm>
#include <cstdlib>

namespace vamrnb {
namespace {

constexpr Word16 Q15_HALF = 16384;
constexpr Word16 Q15_QUARTER = 8192;
constexpr Word16 Q15_8TH = 4096;
constexpr Word16 Q15_16TH = 2048;
constexpr Word16 Q15_32ND = 1024;
constexpr Word16 Q15_64TH = 512;
constexpr Word16 Q15_128TH = 256;

constexpr int TRACKS_MR102 = 4;
constexpr int TRACKS_MR122 = 5;

using matrix = Word16[L_CODE][L_CODE];

// MR102: code vector, filtered code vector, and per track the sign of the
// first pulse and the (ordered) positions of both pulses.
void build_code_mr102(const Word16 *codvec, const Word16 *sign, Word16 *cod, const Word16 *h,
                      Word16 *y, Word16 *sign_indx, Word16 *pos_indx) {
    Word16 signs[8];
    for (int i = 0; i < L_CODE; ++i) cod[i] = 0;
    for (int i = 0; i < TRACKS_MR102; ++i) {
        pos_indx[i] = -1;
        sign_indx[i] = -1;
    }
    for (int k = 0; k < 8; ++k) {
        const Word16 i = codvec[k];
        const Word16 pos_index = shr(i, 2);
        const int track = i & 3;
        Word16 sign_index;
        if (sign[i] > 0) {
            cod[i] = add(cod[i], 8191);
            signs[k] = 32767;
            sign_index = 0;
        } else {
            cod[i] = sub(cod[i], 8191);
            signs[k] = MIN_16;
            sign_index = 1;
        }
        if (pos_indx[track] < 0) {
            pos_indx[track] = pos_index;
            sign_indx[track] = sign_index;
        } else {
            // The order of the two positions carries whether the signs agree.
            const bool same_sign = ((sign_index ^ sign_indx[track]) & 1) == 0;
            const bool ordered = pos_indx[track] <= pos_index;
            if (same_sign == ordered) {
                pos_indx[track + TRACKS_MR102] = pos_index;
            } else {
                pos_indx[track + TRACKS_MR102] = pos_indx[track];
                pos_indx[track] = pos_index;
                sign_indx[track] = sign_index;
            }
        }
    }
    filter_pulses(h, codvec, signs, 8, y);
}

// Three position indices 0..9 packed into 10 bits.
Word16 compress10(Word16 a, Word16 b, Word16 c) {
    const Word16 ia = shr(a, 1);
    const Word16 ib = extract_l(l_shr(l_mult(shr(b, 1), 5), 1));
    const Word16 ic = extract_l(l_shr(l_mult(shr(c, 1), 25), 1));
    Word16 indx = shl(add(ia, add(ib, ic)), 3);
    const Word16 la = static_cast<Word16>(a & 1);
    const Word16 lb = shl(static_cast<Word16>(b & 1), 1);
    const Word16 lc = shl(static_cast<Word16>(c & 1), 2);
    return add(indx, add(la, add(lb, lc)));
}

// MR102 parameters: 4 signs, then positions packed 10 + 10 + 7 bits.
void compress_code_mr102(const Word16 *sign_indx, const Word16 *pos_indx, Word16 *indx) {
    for (int i = 0; i < TRACKS_MR102; ++i) indx[i] = sign_indx[i];
    indx[TRACKS_MR102] = compress10(pos_indx[0], pos_indx[4], pos_indx[1]);
    indx[TRACKS_MR102 + 1] = compress10(pos_indx[2], pos_indx[6], pos_indx[5]);

    Word16 ia;
    if ((shr(pos_indx[7], 1) & 1) == 1) {
        ia = sub(4, shr(pos_indx[3], 1));
    } else {
        ia = shr(pos_indx[3], 1);
    }
    Word16 ib = extract_l(l_shr(l_mult(shr(pos_indx[7], 1), 5), 1));
    ib = add(shl(add(ia, ib), 5), 12);
    const Word16 ic = shl(mult(ib, 1311), 2);
    ia = static_cast<Word16>(pos_indx[3] & 1);
    ib = shl(static_cast<Word16>(pos_indx[7] & 1), 1);
    indx[TRACKS_MR102 + 2] = add(ia, add(ib, ic));
}

// MR122: code vector, filtered code vector and one index per pulse
// (position in track, sign in bit 3 of the first pulse of each track).
void build_code_mr122(const Word16 *codvec, const Word16 *sign, Word16 *cod, const Word16 *h,
                      Word16 *y, Word16 *indx) {
    Word16 signs[10];
    for (int i = 0; i < L_CODE; ++i) cod[i] = 0;
    for (int i = 0; i < TRACKS_MR122; ++i) indx[i] = -1;
    for (int k = 0; k < 10; ++k) {
        const Word16 i = codvec[k];
        Word16 index = mult(i, 6554);
        const Word16 track = sub(i, extract_l(l_shr(l_mult(index, 5), 1)));
        if (sign[i] > 0) {
            cod[i] = add(cod[i], 4096);
            signs[k] = 8192;
        } else {
            cod[i] = sub(cod[i], 4096);
            signs[k] = -8192;
            index = add(index, 8);
        }
        if (indx[track] < 0) {
            indx[track] = index;
        } else if (((index ^ indx[track]) & 8) == 0) {
            if (indx[track] <= index) {
                indx[track + 5] = index;
            } else {
                indx[track + 5] = indx[track];
                indx[track] = index;
            }
        } else {
            if ((indx[track] & 7) <= (index & 7)) {
                indx[track + 5] = indx[track];
                indx[track] = index;
            } else {
                indx[track + 5] = index;
            }
        }
    }
    filter_pulses(h, codvec, signs, 10, y);

    // Gray-code the 3-bit positions; the first five keep their sign bit.
    for (int n = 0; n < 10; ++n) {
        const Word16 t = indx[n];
        if (n < 5) {
            indx[n] = static_cast<Word16>((t & 0x8) | tab::gray[t & 0x7]);
        } else {
            indx[n] = tab::gray[t & 0x7];
        }
    }
}

// Pitch sharpening of a vector: v[i] += v[i - T0] * fac for i >= T0.
void sharpen(Word16 *v, Word16 T0, Word16 fac) {
    for (int i = T0; i < L_CODE; ++i) v[i] = add(v[i], mult(v[i - T0], fac));
}

}  // namespace

namespace {

// Signed correlation matrix of h2 when no sum can saturate (see
// vamrnbe_cor_h_sign).  Row j = L_CODE-1-k holds, at column i <= j, the sum
// of 2·h2[m]·h2[m+j-i] over m <= k.  The running sum of lag d sits in
// acc[L_CODE-1-d], so row j reads acc[k + i] for i = 0..j: each row is one
// forward pass over contiguous arrays that also fills column j.  Products
// |h2·h2| stay below 2^30 (a -32768 would break the energy bound), and mult
// of two 16-bit values is never below -32767, so the product of the rounded
// sum and the sign product is exact.
void cor_h_sign_plain(const Word16 *h2, const Word16 *sign, Word16 *rr) {
    Word16 h2_rev[L_CODE];
    for (int m = 0; m < L_CODE; ++m) h2_rev[m] = h2[L_CODE - 1 - m];
    Word32 acc[L_CODE] = {};
    for (int k = 0; k < L_CODE; ++k) {
        const int j = L_CODE - 1 - k;
        const Word32 hk2 = 2 * h2[k];
        const Word16 sj = sign[j];
        Word32 *a = acc + k;
        Word16 *rr_row = rr + j * L_CODE;
        for (int i = 0; i < j; ++i) {
            a[i] += hk2 * h2_rev[i];
            const Word32 r = (a[i] + 0x8000) >> 16;
            const Word16 v = static_cast<Word16>((r * mult(sign[i], sj)) >> 15);
            rr_row[i] = v;
            rr[i * L_CODE + j] = v;
        }
        a[j] += hk2 * h2_rev[j];
        rr_row[j] = static_cast<Word16>((a[j] + 0x8000) >> 16);
    }
}

}  // namespace

void cor_h_x2(const Word16 *h, const Word16 *x, Word16 *dn, Word16 sf, Word16 nb_track,
              Word16 step) {
    Word32 y32[L_CODE];
    // With energies that rule out saturation the correlations are plain
    // integer sums (order free, so the compiler may vectorise them).
    const bool plain = enc_kernel::no_saturation(enc_kernel::sum_sq(x, L_CODE),
                                                 enc_kernel::sum_sq(h, L_CODE));
    Word32 tot = 5;
    for (int k = 0; k < nb_track; ++k) {
        Word32 max = 0;
        for (int i = k; i < L_CODE; i += step) {
            Word32 s = 0;
            if (plain) {
                for (int j = i; j < L_CODE; ++j) s += int32_t{x[j]} * h[j - i];
                s *= 2;
            } else {
                for (int j = i; j < L_CODE; ++j) s = l_mac(s, x[j], h[j - i]);
            }
            y32[i] = s;
            s = l_abs(s);
            if (s > max) max = s;
        }
        tot = l_add(tot, l_shr(max, 1));
    }
    const Word16 j = sub(norm_l(tot), sf);
    for (int i = 0; i < L_CODE; ++i) dn[i] = round16(l_shl(y32[i], j));
}

void cor_h(const Word16 *h, const Word16 *sign, Word16 rr[L_CODE][L_CODE]) {
    alignas(16) Word16 h2[L_CODE];
    Word32 s = 2;
    for (int i = 0; i < L_CODE; ++i) s = l_mac(s, h[i], h[i]);
    if (extract_h(s) == 32767) {
        for (int i = 0; i < L_CODE; ++i) h2[i] = shr(h[i], 1);
    } else {
        // Scale h to (nearly) unit energy.
        s = l_shr(s, 1);
        Word16 k = extract_h(l_shl(vamrnb_inv_sqrt(s), 7));
        k = mult(k, 32440);
        for (int i = 0; i < L_CODE; ++i) h2[i] = round16(l_shl(l_mult(h[i], k), 9));
    }
    vamrnbe_cor_h_sign(h2, sign, &rr[0][0]);
}

void set_sign12k2(Word16 *dn, const Word16 *cn, Word16 *sign, Word16 *pos_max,
                  Word16 nb_track, Word16 *ipos, Word16 step) {
    // Normalisation factors of cn and dn.
    Word32 s = 256;
    for (int i = 0; i < L_CODE; ++i) s = l_mac(s, cn[i], cn[i]);
    const Word16 k_cn = extract_h(l_shl(vamrnb_inv_sqrt(s), 5));
    s = 256;
    for (int i = 0; i < L_CODE; ++i) s = l_mac(s, dn[i], dn[i]);
    const Word16 k_dn = extract_h(l_shl(vamrnb_inv_sqrt(s), 5));

    Word16 en[L_CODE];
    for (int i = 0; i < L_CODE; ++i) {
        Word16 val = dn[i];
        Word16 cor = round16(l_shl(l_mac(l_mult(k_cn, cn[i]), k_dn, val), 10));
        if (cor >= 0) {
            sign[i] = 32767;
        } else {
            sign[i] = -32767;
            cor = negate(cor);
            val = negate(val);
        }
        dn[i] = val;
        en[i] = cor;
    }

    // Strongest position of each track; the strongest track starts.
    Word16 max_of_all = -1;
    Word16 pos = 0;
    for (int i = 0; i < nb_track; ++i) {
        Word16 max = -1;
        for (int j = i; j < L_CODE; j += step) {
            if (sub(en[j], max) > 0) {
                max = en[j];
                pos = static_cast<Word16>(j);
            }
        }
        pos_max[i] = pos;
        if (sub(max, max_of_all) > 0) {
            max_of_all = max;
            ipos[0] = static_cast<Word16>(i);
        }
    }

    // Tracks of the following pulses, in rotating order.
    pos = ipos[0];
    ipos[nb_track] = pos;
    for (int i = 1; i < nb_track; ++i) {
        pos = add(pos, 1);
        if (pos >= nb_track) pos = 0;
        ipos[i] = pos;
        ipos[i + nb_track] = pos;
    }
}

namespace {

// Energy terms of the candidates of one track (positions t + step·j):
// out[j] = init + rr[i][i]·2·w_self + sum over the fixed pulses p[q] of
// rr[p[q]][i]·2·w_cross, as the saturating multiply-accumulate chain gives
// it.  When |init| plus the largest possible terms (|rr| <= 32768) fits 32
// bits, no partial sum of the chain can saturate and the plain sum is the
// result.  Otherwise the magnitudes of the actual terms are summed too
// (while they cannot wrap 32 unsigned bits) and only the candidates whose
// magnitudes do not fit run the chain as written.
template <int N>
void energy_terms(Word32 init, Word16 w_self, Word16 w_cross, const Word16 rr[L_CODE][L_CODE],
                  const int *p, int na, int t, int step, Word32 *out) {
    const uint32_t init_mag = init < 0 ? 0u - static_cast<uint32_t>(init) : init;
    const int64_t worst = init_mag + int64_t{65536} * (w_self + na * w_cross);
    if (worst <= MAX_32) {
        for (int j = 0; j < N; ++j) {
            const int i = t + step * j;
            out[j] = init + rr[i][i] * (2 * w_self);
        }
        for (int q = 0; q < na; ++q) {
            const Word16 *row = rr[p[q]] + t;
            for (int j = 0; j < N; ++j) out[j] += row[step * j] * (2 * w_cross);
        }
        return;
    }
    for (int j = 0; j < N; ++j) {
        const int i = t + step * j;
        const Word32 d = rr[i][i] * (2 * w_self);
        uint32_t s = static_cast<uint32_t>(init) + static_cast<uint32_t>(d);
        uint32_t mag = init_mag + static_cast<uint32_t>(d < 0 ? -d : d);
        for (int q = 0; q < na; ++q) {
            const Word32 v = rr[p[q]][i] * (2 * w_cross);
            s += static_cast<uint32_t>(v);
            mag += static_cast<uint32_t>(v < 0 ? -v : v);
        }
        if (worst <= UINT32_MAX && mag <= static_cast<uint32_t>(MAX_32)) {
            out[j] = static_cast<Word32>(s);
        } else {
            Word32 c = l_mac(init, rr[i][i], w_self);
            for (int q = 0; q < na; ++q) c = l_mac(c, rr[p[q]][i], w_cross);
            out[j] = c;
        }
    }
}

// Weights of the energy terms per pair level (pulses 2-3, 4-5, 6-7, 8-9):
// new second pulse with itself and the fixed pulses (folded into rrv),
// first pulse with itself and the fixed pulses, rrv, and the pair itself.
constexpr Word16 rrv_self[4] = {Q15_8TH, Q15_8TH, Q15_16TH, Q15_16TH};
constexpr Word16 rrv_cross[4] = {Q15_QUARTER, Q15_QUARTER, Q15_8TH, Q15_8TH};
constexpr Word16 a_self[4] = {Q15_16TH, Q15_32ND, Q15_64TH, Q15_128TH};
constexpr Word16 a_cross[4] = {Q15_8TH, Q15_16TH, Q15_32ND, Q15_64TH};
constexpr Word16 b_vec[4] = {Q15_HALF, Q15_QUARTER, Q15_QUARTER, Q15_8TH};
constexpr Word16 ab_cross[4] = {Q15_8TH, Q15_16TH, Q15_32ND, Q15_64TH};

// One pair level: the best pair of positions on tracks ta and tb (N
// positions each, stride step) added to the na pulses fixed in p, starting
// from the pulse sum ps0 and energy alp0 of those.  Writes the pair to
// p[na], p[na + 1] and returns the level's criterion in best.
template <int N>
void pair_level(int lv, int step, const Word16 *dn, const Word16 rr[L_CODE][L_CODE], int *p,
                int na, int ta, int tb, Word16 ps0, Word32 alp0, search_best &best) {
    // Second pulse with itself and the fixed pulses, rounded.
    Word32 rrv32[N], alp1[N], rrv2[N];
    energy_terms<N>(0, rrv_self[lv], rrv_cross[lv], rr, p, na, tb, step, rrv32);
    for (int j = 0; j < N; ++j) rrv2[j] = Word32{round16(rrv32[j])} * (2 * b_vec[lv]);
    // First pulse with itself and the fixed pulses.
    energy_terms<N>(alp0, a_self[lv], a_cross[lv], rr, p, na, ta, step, alp1);

    // The pair energy alp1 + rrv2 + 2·ab·rr[ia][ib] is a plain sum when
    // the largest magnitudes of its terms and the rounding fit 32 bits.
    int64_t max_alp1 = 0, max_rrv2 = 0;
    for (int j = 0; j < N; ++j) {
        max_alp1 = std::max(max_alp1, std::abs(int64_t{alp1[j]}));
        max_rrv2 = std::max(max_rrv2, std::abs(int64_t{rrv2[j]}));
    }
    const Word32 ab2 = 2 * ab_cross[lv];
    const bool plain = max_alp1 + max_rrv2 + int64_t{32768} * ab2 + 0x8000 <= MAX_32;

    Word16 dnb[N];
    for (int j = 0; j < N; ++j) dnb[j] = dn[tb + step * j];
    const Word32 dnb_max = max_mag(dnb, N);
    best = search_best{};
    int best_a = 0, best_b = 0;
    for (int a = 0; a < N; ++a) {
        const int ia = ta + step * a;
        const Word16 ps1 = add(ps0, dn[ia]);
        const Word16 *row = rr[ia] + tb;
        if (plain) {
            Word32 e[N];
            for (int j = 0; j < N; ++j) e[j] = rrv2[j] + row[j * step] * ab2;
            pick_best<N>(ps1, alp1[a], dnb, e, dnb_max, N * a, best);
            best_a = best.idx / N;
            best_b = best.idx % N;
            continue;
        }
        for (int j = 0; j < N; ++j) {
            const Word16 ps2 = add(ps1, dnb[j]);
            Word32 alp2 = l_add(alp1[a], rrv2[j]);
            alp2 = l_mac(alp2, row[j * step], ab_cross[lv]);
            const Word16 sq2 = mult(ps2, ps2);
            const Word16 alp_16 = round16(alp2);
            if (better(sq2, alp_16, best.sq, best.alp)) {
                best.sq = sq2;
                best.ps = ps2;
                best.alp = alp_16;
                best_a = a;
                best_b = j;
            }
        }
    }
    p[na] = ta + step * best_a;
    p[na + 1] = tb + step * best_b;
}

}  // namespace

void search_10and8i40(Word16 nb_pulse, Word16 step, Word16 nb_tracks, const Word16 *dn,
                      const Word16 rr[L_CODE][L_CODE], Word16 *ipos, const Word16 *pos_max,
                      Word16 *codvec) {
    const int i0 = pos_max[ipos[0]];
    Word16 psk = -1, alpk = 1;
    for (int i = 0; i < nb_pulse; ++i) codvec[i] = static_cast<Word16>(i);

    for (int t = 1; t < nb_tracks; ++t) {
        int p[10];
        p[0] = i0;
        p[1] = pos_max[ipos[1]];
        Word16 ps0 = add(dn[p[0]], dn[p[1]]);
        Word32 alp0 = l_mult(rr[p[0]][p[0]], Q15_16TH);
        alp0 = l_mac(alp0, rr[p[1]][p[1]], Q15_16TH);
        alp0 = l_mac(alp0, rr[p[0]][p[1]], Q15_8TH);

        search_best best;
        const int levels = nb_pulse == 10 ? 4 : 3;
        for (int lv = 0; lv < levels; ++lv) {
            const int na = 2 + 2 * lv;  // pulses fixed before this pair
            if (lv > 0) {
                ps0 = best.ps;
                alp0 = l_mult(best.alp, Q15_HALF);
            }
            if (step == 5) {
                pair_level<L_CODE / 5>(lv, step, dn, rr, p, na, ipos[na], ipos[na + 1], ps0,
                                       alp0, best);
            } else {
                pair_level<L_CODE / 4>(lv, step, dn, rr, p, na, ipos[na], ipos[na + 1], ps0,
                                       alp0, best);
            }
        }

        if (better(best.sq, best.alp, psk, alpk)) {
            psk = best.sq;
            alpk = best.alp;
            for (int k = 0; k < nb_pulse; ++k) codvec[k] = static_cast<Word16>(p[k]);
        }

        // Rotate the tracks of pulses 1 .. nb_pulse-1.
        const Word16 first = ipos[1];
        for (int j = 1; j < nb_pulse - 1; ++j) ipos[j] = ipos[j + 1];
        ipos[nb_pulse - 1] = first;
    }
}

void cor_h_x_c(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf) {
    cor_h_x2(h, x, dn, static_cast<Word16>(sf), 5, 5);
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" {

void vamrnbe_cor_h_x(const int16_t *h, const int16_t *x, int16_t *dn, int32_t sf) {
    dsp().cor_h_x(h, x, dn, sf);
}

void vamrnbe_cor_h_sign(const int16_t *h2, const int16_t *sign, int16_t *rr) {
    // Every running sum below is bounded by twice the energy of h2 (diagonal,
    // or by Cauchy-Schwarz off-diagonal).  When that bound plus the rounding
    // term stays below the 32-bit maximum, nothing saturates and the matrix
    // is built row by row in plain integers.
    int64_t energy = 0;
    for (int k = 0; k < L_CODE; ++k) energy += int32_t{h2[k]} * h2[k];
    if (2 * energy <= MAX_32 - 0x8000) {
        cor_h_sign_plain(h2, sign, rr);
        return;
    }

    // Diagonal: energies of the tails of h2, without signs.
    Word32 s = 0;
    for (int k = 0, i = L_CODE - 1; k < L_CODE; ++k, --i) {
        s = l_mac(s, h2[k], h2[k]);
        rr[i * L_CODE + i] = round16(s);
    }
    // Off-diagonals, built from the end of the subframe backwards.
    for (int dec = 1; dec < L_CODE; ++dec) {
        s = 0;
        int j = L_CODE - 1;
        int i = j - dec;
        for (int k = 0; k < L_CODE - dec; ++k, --i, --j) {
            s = l_mac(s, h2[k], h2[k + dec]);
            const Word16 v = mult(round16(s), mult(sign[i], sign[j]));
            rr[j * L_CODE + i] = v;
            rr[i * L_CODE + j] = v;
        }
    }
}

void vamrnbe_icb(enc_state *st, enc_frame *fr, int32_t i_subfr) {
    subfr_state &ss = st->sub;
    subfr_frame &sf = fr->sub;
    const int32_t mode = fr->used_mode;
    Word16 *h = ss.hvec + L_SUBFR;
    Word16 *prm = fr->prm + fr->prm_pos;
    const Word16 T0 = sf.T0;

    switch (mode) {
    case MR475:
    case MR515:
    case MR59:
    case MR67:
    case MR74:
    case MR795: {
        Word16 sign_word;
        prm[0] = code_lowrate(mode, i_subfr / L_SUBFR, sf.xn2, h, T0, ss.sharp, sf.code, sf.y2,
                              &sign_word);
        prm[1] = sign_word;
        fr->prm_pos += 2;
        break;
    }
    case MR102:
    case MR122:
    default: {
        // The sharpening gain is the previous quantised pitch gain in MR102
        // and this subframe's quantised pitch gain in MR122.
        const Word16 fac = shl(mode == MR102 ? ss.sharp : sf.gain_pit, 1);
        sharpen(h, T0, fac);

        Word16 dn[L_CODE], sign[L_CODE], pos_max[TRACKS_MR122] = {}, ipos[10] = {}, codvec[10];
        alignas(16) Word16 rr[L_CODE][L_CODE];
        if (mode == MR102) {
            cor_h_x2(h, sf.xn2, dn, 2, TRACKS_MR102, TRACKS_MR102);
            set_sign12k2(dn, sf.res2, sign, pos_max, TRACKS_MR102, ipos, TRACKS_MR102);
            cor_h(h, sign, rr);
            search_10and8i40(8, TRACKS_MR102, TRACKS_MR102, dn, rr, ipos, pos_max, codvec);
            Word16 sign_indx[TRACKS_MR102], pos_indx[8];
            build_code_mr102(codvec, sign, sf.code, h, sf.y2, sign_indx, pos_indx);
            compress_code_mr102(sign_indx, pos_indx, prm);
            fr->prm_pos += 7;
        } else {
            vamrnbe_cor_h_x(h, sf.xn2, dn, 2);
            set_sign12k2(dn, sf.res2, sign, pos_max, TRACKS_MR122, ipos, TRACKS_MR122);
            cor_h(h, sign, rr);
            search_10and8i40(10, TRACKS_MR122, TRACKS_MR122, dn, rr, ipos, pos_max, codvec);
            build_code_mr122(codvec, sign, sf.code, h, sf.y2, prm);
            fr->prm_pos += 10;
        }
        sharpen(sf.code, T0, fac);
        break;
    }
    }
}

}  // extern "C"
