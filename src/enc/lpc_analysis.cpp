// Short-term (LP) analysis of the encoder, once per frame: windowed
// autocorrelation, lag window, Levinson-Durbin recursion, conversion to line
// spectral pairs, interpolation of the unquantised filters over the four
// subframes, LSF quantisation with the quantised filters, and the
// tone-stability check on the new LSPs.  MR122 analyses two windows per frame
// and quantises both LSP vectors jointly (inline here); every other mode
// analyses one window and uses the three-split quantiser.
#include "common/enc_state.h"
#include "basic_op/ext_op.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr int L_WINDOW = 240;
constexpr int GRID_POINTS = 60;
constexpr Word16 MR122_PRED_FAC = 21299;   // 0.65, Q15

// LSPs of one interpolated subframe, turned into its filter.
void lsp_to_filter(const Word16 lsp[M], Word16 *a) { vamrnb_lsp_az(lsp, a); }

// One analysis window: windowing, autocorrelation, lag window, recursion.
void analyse_window(Word16 old_A[MP1], const Word16 *x, const Word16 *window, Word16 A[MP1]) {
    Word16 y[L_WINDOW];
    Word16 r_h[MP1], r_l[MP1], rc[4];
    vamrnbe_windowing(x, window, y);
    vamrnbe_auto_corr(y, r_h, r_l);
    vamrnbe_lag_window(r_h, r_l);
    vamrnbe_levinson(old_A, r_h, r_l, A, rc);
}

// Joint quantisation of the two MR122 LSP vectors: a split-matrix quantiser
// on the residual of a first-order prediction from the previous frame.
void q_plsf_5(Word16 past_rq[M], const Word16 lsp1[M], const Word16 lsp2[M],
              Word16 lsp1_q[M], Word16 lsp2_q[M], Word16 idx[5]) {
    Word16 lsf1[M], lsf2[M], wf1[M], wf2[M], lsf_p[M], r1[M], r2[M];
    vamrnb_lsp_lsf(lsp1, lsf1);
    vamrnb_lsp_lsf(lsp2, lsf2);
    lsf_wt(lsf1, wf1);
    lsf_wt(lsf2, wf2);
    for (int i = 0; i < M; ++i) {
        lsf_p[i] = add(vamrnb_tbl_mean_lsf[i], mult(past_rq[i], MR122_PRED_FAC));
        r1[i] = sub(lsf1[i], lsf_p[i]);
        r2[i] = sub(lsf2[i], lsf_p[i]);
    }
    idx[0] = vamrnbe_vq_subvec(&r1[0], &r2[0], vamrnb_tbl_dico1_lsf, &wf1[0], &wf2[0], 128);
    idx[1] = vamrnbe_vq_subvec(&r1[2], &r2[2], vamrnb_tbl_dico2_lsf, &wf1[2], &wf2[2], 256);
    idx[2] = vamrnbe_vq_subvec_s(&r1[4], &r2[4], vamrnb_tbl_dico3_lsf, &wf1[4], &wf2[4], 256);
    idx[3] = vamrnbe_vq_subvec(&r1[6], &r2[6], vamrnb_tbl_dico4_lsf, &wf1[6], &wf2[6], 256);
    idx[4] = vamrnbe_vq_subvec(&r1[8], &r2[8], vamrnb_tbl_dico5_lsf, &wf1[8], &wf2[8], 64);

    Word16 lsf1_q[M], lsf2_q[M];
    for (int i = 0; i < M; ++i) {
        lsf1_q[i] = add(r1[i], lsf_p[i]);
        lsf2_q[i] = add(r2[i], lsf_p[i]);
        past_rq[i] = r2[i];
    }
    vamrnb_reorder(lsf1_q);
    vamrnb_reorder(lsf2_q);
    vamrnb_sf_sp(lsf1_q, vamrnb_tbl_cos_lsp_lsf, lsp1_q);
    vamrnb_sf_sp(lsf2_q, vamrnb_tbl_cos_lsp_lsf, lsp2_q);
}

}  // namespace

// ---- stand-alone building blocks -------------------------------------------

extern "C" void vamrnbe_windowing(const int16_t *x, const int16_t *window, int16_t *y) {
    for (int i = 0; i < L_WINDOW; ++i) y[i] = mult_r(x[i], window[i]);
}

// Autocorrelation of the windowed signal y (240 samples), lags 0..10, in
// double precision and normalised so that r[0] fills the word.  When the
// energy saturates, y is divided by 4 in place and the energy recomputed.
// Returns the normalisation shift less the scaling applied.
extern "C" int32_t vamrnbe_auto_corr(int16_t *y, int16_t r_h[11], int16_t r_l[11]) {
    Word16 scaled = 0;
    Word32 sum;
    for (;;) {
        sum = 0;
        for (int i = 0; i < L_WINDOW; ++i) sum = l_mac(sum, y[i], y[i]);
        if (sum != MAX_32) break;
        scaled = add(scaled, 4);
        for (int i = 0; i < L_WINDOW; ++i) y[i] = shr(y[i], 2);
    }
    sum = l_add(sum, 1);   // keeps an all-zero window away from r[0] = 0
    const Word16 norm = norm_l(sum);
    l_extract(l_shl(sum, norm), &r_h[0], &r_l[0]);
    // The energy did not clip, so no lag sum can (|r[k]| <= r[0]): plain
    // products give the saturating sum exactly.
    for (int k = 1; k <= M; ++k) {
        int32_t s = 0;
        for (int j = 0; j < L_WINDOW - k; ++j) s += int32_t{y[j]} * y[j + k];
        l_extract(l_shl(2 * s, norm), &r_h[k], &r_l[k]);
    }
    return sub(norm, scaled);
}

extern "C" void vamrnbe_lag_window(int16_t r_h[11], int16_t r_l[11]) {
    for (int i = 1; i <= M; ++i) {
        const Word32 x = mpy_32(r_h[i], r_l[i], tab::lag_h[i - 1], tab::lag_l[i - 1]);
        l_extract(x, &r_h[i], &r_l[i]);
    }
}

// Levinson-Durbin recursion in double precision.  An unstable step (a
// reflection coefficient above 32750 in magnitude) returns the last stable
// filter old_A and zero reflection coefficients; otherwise the new filter
// becomes old_A.
extern "C" void vamrnbe_levinson(int16_t old_A[11], const int16_t r_h[11],
                                 const int16_t r_l[11], int16_t A[11], int16_t rc[4]) {
    Word16 Ah[MP1], Al[MP1], Anh[MP1], Anl[MP1];
    Word16 k_h, k_l, hi, lo, alp_h, alp_l;

    // First order: K = -R[1]/R[0].
    Word32 t1 = l_comp(r_h[1], r_l[1]);
    Word32 t0 = vamrnb_div_32(l_abs(t1), r_h[0], r_l[0]);
    if (t1 > 0) t0 = l_negate(t0);
    l_extract(t0, &k_h, &k_l);
    rc[0] = round16(t0);
    l_extract(l_shr(t0, 4), &Ah[1], &Al[1]);

    // Prediction error alpha = R[0] (1 - K^2), normalised.
    t0 = l_abs(mpy_32(k_h, k_l, k_h, k_l));
    l_extract(l_sub(MAX_32, t0), &hi, &lo);
    t0 = mpy_32(r_h[0], r_l[0], hi, lo);
    Word16 alp_exp = norm_l(t0);
    l_extract(l_shl(t0, alp_exp), &alp_h, &alp_l);

    for (int i = 2; i <= M; ++i) {
        t0 = 0;
        for (int j = 1; j < i; ++j) t0 = l_add(t0, mpy_32(r_h[j], r_l[j], Ah[i - j], Al[i - j]));
        t0 = l_add(l_shl(t0, 4), l_comp(r_h[i], r_l[i]));

        Word32 t2 = vamrnb_div_32(l_abs(t0), alp_h, alp_l);
        if (t0 > 0) t2 = l_negate(t2);
        t2 = l_shl(t2, alp_exp);
        l_extract(t2, &k_h, &k_l);
        if (i < 5) rc[i - 1] = round16(t2);

        if (abs_s(k_h) > 32750) {
            for (int j = 0; j <= M; ++j) A[j] = old_A[j];
            for (int j = 0; j < 4; ++j) rc[j] = 0;
            return;
        }

        for (int j = 1; j < i; ++j) {
            t0 = l_add(mpy_32(k_h, k_l, Ah[i - j], Al[i - j]), l_comp(Ah[j], Al[j]));
            l_extract(t0, &Anh[j], &Anl[j]);
        }
        l_extract(l_shr(t2, 4), &Anh[i], &Anl[i]);

        t0 = l_abs(mpy_32(k_h, k_l, k_h, k_l));
        l_extract(l_sub(MAX_32, t0), &hi, &lo);
        t0 = mpy_32(alp_h, alp_l, hi, lo);
        const Word16 n = norm_l(t0);
        l_extract(l_shl(t0, n), &alp_h, &alp_l);
        alp_exp = add(alp_exp, n);

        for (int j = 1; j <= i; ++j) {
            Ah[j] = Anh[j];
            Al[j] = Anl[j];
        }
    }

    A[0] = 4096;
    for (int i = 1; i <= M; ++i) {
        A[i] = round16(l_shl(l_comp(Ah[i], Al[i]), 1));
        old_A[i] = A[i];
    }
}

// ---- LSP root search ---------------------------------------------------------

namespace vamrnb {

// Evaluates the order-5 polynomial f (f[0] implied 1.0) at cos x by the
// Chebyshev recursion in double precision.
Word16 chebps(Word16 x, const Word16 *f, int n) {
    Word16 b2_h = 256, b2_l = 0;   // b2 = 1.0
    Word16 b1_h, b1_l, b0_h, b0_l;
    Word32 t0 = l_mac(l_mult(x, 512), f[1], 8192);
    l_extract(t0, &b1_h, &b1_l);   // b1 = 2x + f[1]
    int i = 2;
    for (; i < n; ++i) {
        t0 = l_shl(mpy_32_16(b1_h, b1_l, x), 1);
        t0 = l_mac(t0, b2_h, MIN_16);
        t0 = l_msu(t0, b2_l, 1);
        t0 = l_mac(t0, f[i], 8192);
        l_extract(t0, &b0_h, &b0_l);
        b2_h = b1_h;
        b2_l = b1_l;
        b1_h = b0_h;
        b1_l = b0_l;
    }
    t0 = mpy_32_16(b1_h, b1_l, x);
    t0 = l_mac(t0, b2_h, MIN_16);
    t0 = l_msu(t0, b2_l, 1);
    t0 = l_mac(t0, f[i], 4096);
    return extract_h(l_shl(t0, 6));
}

void az_lsp(const Word16 a[MP1], Word16 lsp[M], const Word16 old_lsp[M]) {
    constexpr int NC = M / 2;
    Word16 f1[NC + 1], f2[NC + 1];
    f1[0] = 1024;
    f2[0] = 1024;
    for (int i = 0; i < NC; ++i) {
        Word16 x = extract_h(l_mac(l_mult(a[i + 1], 8192), a[M - i], 8192));
        f1[i + 1] = sub(x, f1[i]);
        x = extract_h(l_msu(l_mult(a[i + 1], 8192), a[M - i], 8192));
        f2[i + 1] = add(x, f2[i]);
    }

    // Roots alternate between the sum and the difference polynomial; scan
    // the cosine grid for sign changes, bisect four times, interpolate.
    int nf = 0;
    bool on_f2 = false;
    const Word16 *coef = f1;
    Word16 xlow = tab::grid[0];
    Word16 ylow = chebps(xlow, coef, NC);
    int j = 0;
    while (nf < M && j < GRID_POINTS) {
        ++j;
        Word16 xhigh = xlow, yhigh = ylow;
        xlow = tab::grid[j];
        ylow = chebps(xlow, coef, NC);
        if (l_mult(ylow, yhigh) > 0) continue;

        for (int k = 0; k < 4; ++k) {
            const Word16 xmid = add(shr(xlow, 1), shr(xhigh, 1));
            const Word16 ymid = chebps(xmid, coef, NC);
            if (l_mult(ylow, ymid) <= 0) {
                yhigh = ymid;
                xhigh = xmid;
            } else {
                ylow = ymid;
                xlow = xmid;
            }
        }

        Word16 xint;
        const Word16 dx = sub(xhigh, xlow);
        Word16 dy = sub(yhigh, ylow);
        if (dy == 0) {
            xint = xlow;
        } else {
            const Word16 sign = dy;
            dy = abs_s(dy);
            const Word16 e = norm_s(dy);
            dy = shl(dy, e);
            dy = div_s(16383, dy);
            Word16 y = extract_l(l_shr(l_mult(dx, dy), sub(20, e)));
            if (sign < 0) y = negate(y);
            xint = sub(xlow, extract_l(l_shr(l_mult(ylow, y), 11)));
        }
        lsp[nf++] = xint;
        xlow = xint;
        on_f2 = !on_f2;
        coef = on_f2 ? f2 : f1;
        ylow = chebps(xlow, coef, NC);
    }

    if (nf < M)
        for (int i = 0; i < M; ++i) lsp[i] = old_lsp[i];
}

Word16 check_lsp(int32_t *count, const Word16 lsp[M]) {
    Word16 dist_min1 = MAX_16;
    for (int i = 3; i < M - 2; ++i) {
        const Word16 d = sub(lsp[i], lsp[i + 1]);
        if (d < dist_min1) dist_min1 = d;
    }
    Word16 dist_min2 = MAX_16;
    for (int i = 1; i < 3; ++i) {
        const Word16 d = sub(lsp[i], lsp[i + 1]);
        if (d < dist_min2) dist_min2 = d;
    }
    const Word16 dist_th = lsp[1] > 32000 ? 600 : lsp[1] > 30500 ? 800 : 1100;

    if (dist_min1 < 1500 || dist_min2 < dist_th)
        *count = add(static_cast<Word16>(*count), 1);
    else
        *count = 0;

    // Twelve resonant frames in a row raise the flag.
    if (*count >= 12) {
        *count = 12;
        return 1;
    }
    return 0;
}

}  // namespace vamrnb

// ---- the frame's LP analysis -------------------------------------------------

extern "C" void vamrnbe_lpc(enc_state *st, enc_frame *fr) {
    const int32_t mode = fr->mode;
    const bool sid_frame = fr->used_mode == MRDTX;
    Word16 *A_t = fr->A_t;
    Word16 lsp[M];
    Word16 lsp_new_q[M];

    if (mode == MR122) {
        const Word16 *x = st->old_speech + ENC_WINDOW_MR122;
        analyse_window(st->old_A, x, tab::window_160_80, &A_t[MP1]);
        analyse_window(st->old_A, x, tab::window_232_8, &A_t[3 * MP1]);

        az_lsp(&A_t[MP1], fr->lsp_mid, st->lsp_old);
        az_lsp(&A_t[3 * MP1], fr->lsp_new, fr->lsp_mid);

        // Subframes 1 and 3 halfway between their neighbours.
        for (int i = 0; i < M; ++i) lsp[i] = add(shr(fr->lsp_mid[i], 1), shr(st->lsp_old[i], 1));
        lsp_to_filter(lsp, &A_t[0]);
        for (int i = 0; i < M; ++i) lsp[i] = add(shr(fr->lsp_mid[i], 1), shr(fr->lsp_new[i], 1));
        lsp_to_filter(lsp, &A_t[2 * MP1]);

        if (!sid_frame) {
            Word16 lsp_mid_q[M];
            q_plsf_5(st->past_rq, fr->lsp_mid, fr->lsp_new, lsp_mid_q, lsp_new_q,
                     &fr->prm[fr->prm_pos]);
            vamrnb_int_lpc_1and3(st->lsp_old_q, lsp_mid_q, lsp_new_q, fr->Aq_t);
            fr->prm_pos += 5;
        }
    } else {
        analyse_window(st->old_A, st->old_speech + ENC_WINDOW, tab::window_200_40, &A_t[3 * MP1]);
        az_lsp(&A_t[3 * MP1], fr->lsp_new, st->lsp_old);

        // Subframes 1..3 at 1/4, 1/2 and 3/4 of the way to the new LSPs.
        const Word16 *o = st->lsp_old;
        const Word16 *n = fr->lsp_new;
        for (int i = 0; i < M; ++i) lsp[i] = add(shr(n[i], 2), sub(o[i], shr(o[i], 2)));
        lsp_to_filter(lsp, &A_t[0]);
        for (int i = 0; i < M; ++i) lsp[i] = add(shr(o[i], 1), shr(n[i], 1));
        lsp_to_filter(lsp, &A_t[MP1]);
        for (int i = 0; i < M; ++i) lsp[i] = add(shr(o[i], 2), sub(n[i], shr(n[i], 2)));
        lsp_to_filter(lsp, &A_t[2 * MP1]);

        if (!sid_frame) {
            Word16 unused;
            vamrnbe_q_plsf_3(mode, fr->lsp_new, lsp_new_q, st->past_rq,
                             &fr->prm[fr->prm_pos], &unused);
            vamrnb_int_lpc_1to3(st->lsp_old_q, lsp_new_q, fr->Aq_t);
            fr->prm_pos += 3;
        }
    }

    for (int i = 0; i < M; ++i) st->lsp_old[i] = fr->lsp_new[i];
    if (!sid_frame) {
        // In SID frames the DTX encoder sets the quantised history itself.
        for (int i = 0; i < M; ++i) st->lsp_old_q[i] = lsp_new_q[i];
        fr->lsp_flag = check_lsp(&st->ton_count, fr->lsp_new);
    }
}
