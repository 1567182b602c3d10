// The codebook searches sum their energies in plain integers where a bound
// rules out saturation and fall back to the saturating chains elsewhere.
// These tests run them on ordinary and on full-scale correlation matrices
// (where the chains do saturate) and compare the chosen pulses with the
// candidate-by-candidate saturating search they replace.
#include <gtest/gtest.h>

#include <random>

#include "enc/cbsearch_lowrate.h"
#include "enc/subframe.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

using Matrix = Word16[L_CODE][L_CODE];

// ---- the saturating searches, candidate by candidate ------------------------

struct Best {
    Word16 sq = -1, alp = 1, ps = 0;
    int pos = 0;
};

// One track: candidate i has the pulse sum add(ps0, dn[i]) and the energy
// alp0 plus w_self·rr[i][i] plus w·rr[f][i] for every fixed pulse f.
Best track_ref(Word16 ps0, Word32 alp0, const Word16 *dn, const Matrix &rr, int t, int step,
               Word16 w_self, Word16 w, const int *fixed, int nf) {
    Best b;
    b.pos = t;
    for (int i = t; i < L_CODE; i += step) {
        const Word16 ps = add(ps0, dn[i]);
        Word32 alp = l_mac(alp0, rr[i][i], w_self);
        for (int q = nf - 1; q >= 0; --q) alp = l_mac(alp, rr[fixed[q]][i], w);
        const Word16 sq = mult(ps, ps), a16 = round16(alp);
        if (better(sq, a16, b.sq, b.alp)) b = {sq, a16, ps, i};
    }
    return b;
}

void lowrate_ref(int mode, int subfr, const Word16 *dn, const Word16 *dn2, const Matrix &rr,
                 Word16 *codvec) {
    for (int k = 0; k < 4; ++k) codvec[k] = static_cast<Word16>(k);
    Word16 psk = -1, alpk = 1;
    const auto keep = [&](const Best &b, const int *pos, int n) {
        if (!better(b.sq, b.alp, psk, alpk)) return;
        psk = b.sq;
        alpk = b.alp;
        for (int k = 0; k < n; ++k) codvec[k] = static_cast<Word16>(pos[k]);
    };
    const auto pair = [&](int p0, int p1) {
        for (int i0 = p0; i0 < L_CODE; i0 += 5) {
            const Best b = track_ref(dn[i0], l_mult(rr[i0][i0], 8192), dn, rr, p1, 5, 8192,
                                     16384, &i0, 1);
            const int pos[2] = {i0, b.pos};
            keep(b, pos, 2);
        }
    };
    const auto multi = [&](int n, const int *ip) {
        for (int i0 = ip[0]; i0 < L_CODE; i0 += 5) {
            if (dn2[i0] < 0) continue;
            int pos[4] = {i0};
            Best b = track_ref(dn[i0], l_mult(rr[i0][i0], 8192), dn, rr, ip[1], 5, 8192, 16384,
                               pos, 1);
            pos[1] = b.pos;
            b = track_ref(b.ps, l_mult(b.alp, 8192), dn, rr, ip[2], 5, 2048, 4096, pos, 2);
            pos[2] = b.pos;
            if (n == 4) {
                b = track_ref(b.ps, l_deposit_h(b.alp), dn, rr, ip[3], 5, 2048, 4096, pos, 3);
                pos[3] = b.pos;
            }
            keep(b, pos, n);
        }
    };
    if (mode == MR475 || mode == MR515) {
        for (int t = 0; t < 2; ++t)
            pair(tab::startPos[subfr * 2 + 8 * t], tab::startPos[subfr * 2 + 1 + 8 * t]);
    } else if (mode == MR59) {
        for (int t1 = 0; t1 < 2; ++t1)
            for (int t2 = 0; t2 < 4; ++t2) pair(tab::startPos1[t1], tab::startPos2[t2]);
    } else {
        const int n = mode == MR67 ? 3 : 4;
        const int starts[2][4] = {{0, 1, 2, 3}, {0, 1, 2, 4}};
        for (int s = 0; s < (n == 3 ? 4 : 2); ++s) {
            int ip[4];
            if (n == 3) {
                ip[0] = 0, ip[1] = s < 2 ? 1 : 3, ip[2] = s % 2 ? 4 : 2;
            } else {
                for (int q = 0; q < 4; ++q) ip[q] = starts[s][q];
            }
            for (int r = 0; r < n; ++r) {
                multi(n, ip);
                const int last = ip[n - 1];
                for (int q = n - 1; q > 0; --q) ip[q] = ip[q - 1];
                ip[0] = last;
            }
        }
    }
}

void pairs_ref(int nb_pulse, int step, const Word16 *dn, const Matrix &rr, Word16 *ipos,
               const Word16 *pos_max, Word16 *codvec) {
    static constexpr Word16 rrv_self[4] = {4096, 4096, 2048, 2048};
    static constexpr Word16 rrv_cross[4] = {8192, 8192, 4096, 4096};
    static constexpr Word16 a_self[4] = {2048, 1024, 512, 256};
    static constexpr Word16 a_cross[4] = {4096, 2048, 1024, 512};
    static constexpr Word16 b_w[4] = {16384, 8192, 8192, 4096};
    static constexpr Word16 ab_w[4] = {4096, 2048, 1024, 512};
    const int tracks = step;
    Word16 psk = -1, alpk = 1;
    for (int i = 0; i < nb_pulse; ++i) codvec[i] = static_cast<Word16>(i);
    for (int t = 1; t < tracks; ++t) {
        int p[10] = {pos_max[ipos[0]], pos_max[ipos[1]]};
        Word16 ps = add(dn[p[0]], dn[p[1]]), sq = -1, alp = 1;
        Word32 alp0 = l_mult(rr[p[0]][p[0]], 2048);
        alp0 = l_mac(alp0, rr[p[1]][p[1]], 2048);
        alp0 = l_mac(alp0, rr[p[0]][p[1]], 4096);
        for (int lv = 0; lv < (nb_pulse == 10 ? 4 : 3); ++lv) {
            const int na = 2 + 2 * lv, ta = ipos[na], tb = ipos[na + 1];
            if (lv > 0) alp0 = l_mult(alp, 16384);
            Word16 rrv[L_CODE];
            for (int ib = tb; ib < L_CODE; ib += step) {
                Word32 s = l_mult(rr[ib][ib], rrv_self[lv]);
                for (int q = 0; q < na; ++q) s = l_mac(s, rr[p[q]][ib], rrv_cross[lv]);
                rrv[ib] = round16(s);
            }
            const Word16 ps0 = ps;
            sq = -1, alp = 1, ps = 0;
            int ba = ta, bb = tb;
            for (int ia = ta; ia < L_CODE; ia += step) {
                const Word16 ps1 = add(ps0, dn[ia]);
                Word32 alp1 = l_mac(alp0, rr[ia][ia], a_self[lv]);
                for (int q = 0; q < na; ++q) alp1 = l_mac(alp1, rr[p[q]][ia], a_cross[lv]);
                for (int ib = tb; ib < L_CODE; ib += step) {
                    const Word16 ps2 = add(ps1, dn[ib]);
                    Word32 alp2 = l_mac(alp1, rrv[ib], b_w[lv]);
                    alp2 = l_mac(alp2, rr[ia][ib], ab_w[lv]);
                    const Word16 sq2 = mult(ps2, ps2), a16 = round16(alp2);
                    if (better(sq2, a16, sq, alp)) sq = sq2, ps = ps2, alp = a16, ba = ia, bb = ib;
                }
            }
            p[na] = ba;
            p[na + 1] = bb;
        }
        if (better(sq, alp, psk, alpk)) {
            psk = sq, alpk = alp;
            for (int k = 0; k < nb_pulse; ++k) codvec[k] = static_cast<Word16>(p[k]);
        }
        const Word16 first = ipos[1];
        for (int j = 1; j < nb_pulse - 1; ++j) ipos[j] = ipos[j + 1];
        ipos[nb_pulse - 1] = first;
    }
}

// ---- inputs ----------------------------------------------------------------

// Kinds: 0 ordinary (a real signed correlation matrix), 1 random full
// range, 2 every entry at +32767 or -32768, 3 a positive rail diagonal with
// random off-diagonals, 4 large positive entries only, 5 mostly -32768 and
// otherwise large negative entries (the energies of both reach beyond 32
// bits and the first pulses' energies leave the later ones no room); dn
// likewise from small values to the rails.
struct Inputs {
    Matrix rr;
    Word16 dn[L_CODE], dn2[L_CODE];
};

void make_inputs(std::mt19937 &rng, int kind, bool non_negative_dn, Inputs &in) {
    std::uniform_int_distribution<int> full(-32768, 32767), coin(0, 1), small(-3000, 3000),
        large(16384, 32767);
    if (kind == 0) {
        Word16 h2[L_CODE], sign[L_CODE];
        for (int i = 0; i < L_CODE; ++i) {
            h2[i] = static_cast<Word16>(small(rng) * (L_CODE - i) / L_CODE * 3);
            sign[i] = coin(rng) ? 32767 : -32767;
        }
        vamrnbe_cor_h_sign(h2, sign, &in.rr[0][0]);
    } else {
        for (int i = 0; i < L_CODE; ++i) {
            for (int j = 0; j <= i; ++j) {
                Word16 v = static_cast<Word16>(full(rng));
                if (kind == 2) v = coin(rng) ? 32767 : -32768;
                if (kind == 3 && i == j) v = 32767;
                if (kind == 4) v = static_cast<Word16>(large(rng));
                if (kind == 5) v = static_cast<Word16>(rng() % 16 ? -32768 : -large(rng));
                in.rr[i][j] = in.rr[j][i] = v;
            }
        }
    }
    for (int i = 0; i < L_CODE; ++i) {
        int v = kind == 0 ? small(rng) * 4 : full(rng);
        if (kind == 2) v = coin(rng) ? 32767 : -32768;
        if (kind == 4) v = large(rng);
        if (non_negative_dn) v = v < 0 ? (v == -32768 ? 32767 : -v) : v;
        in.dn[i] = static_cast<Word16>(v);
        in.dn2[i] = coin(rng) && i % 3 ? -1 : in.dn[i];
    }
}

TEST(CodebookSearch, LowRateModesPickTheSaturatingSearchsPulses) {
    std::mt19937 rng(9);
    Inputs in;
    for (int run = 0; run < 400; ++run) {
        const int kind = run % 6;
        make_inputs(rng, kind, true, in);
        for (int mode = MR475; mode <= MR795; ++mode) {
            const int subfr = run % 4;
            Word16 got[4], want[4];
            search_lowrate(mode, subfr, in.dn, in.dn2, in.rr, got);
            lowrate_ref(mode, subfr, in.dn, in.dn2, in.rr, want);
            for (int k = 0; k < 4; ++k)
                ASSERT_EQ(got[k], want[k]) << "mode " << mode << " kind " << kind << " run " << run;
        }
    }
}

// Signed dn (the large codebooks take signs from another source), so pulse
// sums cross both rails; both track layouts and every first track.
TEST(CodebookSearch, PulsePairSearchesPickTheSaturatingSearchsPulses) {
    std::mt19937 rng(10);
    Inputs in;
    for (int run = 0; run < 300; ++run) {
        const int kind = run % 6;
        make_inputs(rng, kind, false, in);
        for (const int step : {4, 5}) {
            const int n_pulse = step == 5 ? 10 : 8;
            Word16 pos_max[5], ipos_a[10], ipos_b[10];
            for (int t = 0; t < step; ++t) pos_max[t] = static_cast<Word16>(t + step * (rng() % (L_CODE / step)));
            const int first = static_cast<int>(rng() % step);
            for (int i = 0; i < n_pulse; ++i) ipos_a[i] = ipos_b[i] = static_cast<Word16>((first + i) % step);
            Word16 got[10], want[10];
            search_10and8i40(static_cast<Word16>(n_pulse), static_cast<Word16>(step),
                             static_cast<Word16>(step), in.dn, in.rr, ipos_a, pos_max, got);
            pairs_ref(n_pulse, step, in.dn, in.rr, ipos_b, pos_max, want);
            for (int k = 0; k < n_pulse; ++k)
                ASSERT_EQ(got[k], want[k]) << "step " << step << " kind " << kind << " run " << run;
        }
    }
}

}  // namespace
