// LSF quantisation of the encoder.  The three-split quantiser codes one LSP
// vector per frame (all modes but MR122, and the SID parameters): the LSFs
// are predicted from the previous frame's quantised residual, and the
// weighted residual is matched against three codebooks.  The search kernels
// here also serve the two-vector split-matrix quantiser that the LP analysis
// runs inline for MR122.
#include "common/enc_state.h"
#include "lpc/dsp.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr int PAST_RQ_INIT_ROWS = 8;

// Weighted squared distance of one component, doubled.
inline Word32 wdist(Word32 acc, Word16 w, Word16 diff) {
    const Word16 t = mult(w, diff);
    return l_mac(acc, t, t);
}

// Weighted square of one component, not yet doubled: t = mult(w, r - c)
// with the difference saturated to 16 bits.  |t| <= 32768 (mult saturates
// only the product of two -32768s, to 32767), so t*t <= 2^30 and three of
// them fit in 32 unsigned bits.
inline uint32_t wsq(int32_t w, int32_t r, int32_t c) {
    int32_t d = r - c;
    d = d > MAX_16 ? MAX_16 : d < MIN_16 ? MIN_16 : d;
    int32_t t = (w * d) >> 15;
    t = t > MAX_16 ? MAX_16 : t;
    return static_cast<uint32_t>(t * t);
}

// Three-component search over `rows` rows of `dico` taken `stride` rows
// apart.  Returns the position among the rows tried and writes the chosen
// row over r.
//
// The distance is defined as the saturating sum of the doubled squares,
// compared strictly against a best that starts at MAX_32.  The terms are
// non-negative, so that sum is min(2s, MAX_32) for the exact sum s of the
// squares: a row whose 2s reaches MAX_32 can never win, and between winners
// the comparison is s < best.  Hence the search on s with the first best
// below 2^30 (2s <= MAX_32 - 1).
Word16 vq_subvec3(Word16 *r, const Word16 *dico, const Word16 *w, int rows, int stride) {
    uint32_t best = uint32_t{1} << 30;
    int index = 0;
    const Word16 r0 = r[0], r1 = r[1], r2 = r[2];
    const Word16 w0 = w[0], w1 = w[1], w2 = w[2];
    const Word16 *row = dico;
    for (int i = 0; i < rows; ++i, row += 3 * stride) {
        const uint32_t d = wsq(w0, r0, row[0]) + wsq(w1, r1, row[1]) + wsq(w2, r2, row[2]);
        if (d < best) {
            best = d;
            index = i;
        }
    }
    const Word16 *pick = dico + 3 * stride * index;
    r[0] = pick[0];
    r[1] = pick[1];
    r[2] = pick[2];
    return static_cast<Word16>(index);
}

}  // namespace

namespace vamrnb {

void lsf_wt(const Word16 lsf[M], Word16 wf[M]) {
    wf[0] = lsf[1];
    for (int i = 1; i < 9; ++i) wf[i] = sub(lsf[i + 1], lsf[i - 1]);
    wf[9] = sub(16384, lsf[8]);
    for (int i = 0; i < M; ++i) {
        const Word16 d = sub(wf[i], 1843);
        wf[i] = d < 0 ? sub(3427, mult(wf[i], 28160)) : sub(1843, mult(d, 6242));
        wf[i] = shl(wf[i], 3);
    }
}

// The portable split-VQ searches (kernel table entries).

int16_t vq_subvec4_c(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size) {
    Word32 best = MAX_32;
    int index = 0;
    const Word16 *row = dico;
    for (int i = 0; i < size; ++i, row += 4) {
        Word32 d = wdist(0, w[0], sub(r[0], row[0]));
        d = wdist(d, w[1], sub(r[1], row[1]));
        d = wdist(d, w[2], sub(r[2], row[2]));
        d = wdist(d, w[3], sub(r[3], row[3]));
        if (d < best) {
            best = d;
            index = i;
        }
    }
    const Word16 *pick = dico + 4 * index;
    for (int k = 0; k < 4; ++k) r[k] = pick[k];
    return static_cast<Word16>(index);
}

int16_t vq_subvec_c(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1, const Word16 *w2,
                    Word32 size) {
    Word32 best = MAX_32;
    int index = 0;
    const Word16 *row = dico;
    for (int i = 0; i < size; ++i, row += 4) {
        Word32 d = wdist(0, w1[0], sub(r1[0], row[0]));
        d = wdist(d, w1[1], sub(r1[1], row[1]));
        d = wdist(d, w2[0], sub(r2[0], row[2]));
        d = wdist(d, w2[1], sub(r2[1], row[3]));
        if (d < best) {
            best = d;
            index = i;
        }
    }
    const Word16 *pick = dico + 4 * index;
    r1[0] = pick[0];
    r1[1] = pick[1];
    r2[0] = pick[2];
    r2[1] = pick[3];
    return static_cast<Word16>(index);
}

int16_t vq_subvec_s_c(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                      const Word16 *w2, Word32 size) {
    Word32 best = MAX_32;
    int index = 0;
    int sign = 0;
    const Word16 *row = dico;
    for (int i = 0; i < size; ++i, row += 4) {
        // The row itself ...
        Word32 d = wdist(0, w1[0], sub(r1[0], row[0]));
        d = wdist(d, w1[1], sub(r1[1], row[1]));
        d = wdist(d, w2[0], sub(r2[0], row[2]));
        d = wdist(d, w2[1], sub(r2[1], row[3]));
        if (d < best) {
            best = d;
            index = i;
            sign = 0;
        }
        // ... and its negation.
        d = wdist(0, w1[0], add(r1[0], row[0]));
        d = wdist(d, w1[1], add(r1[1], row[1]));
        d = wdist(d, w2[0], add(r2[0], row[2]));
        d = wdist(d, w2[1], add(r2[1], row[3]));
        if (d < best) {
            best = d;
            index = i;
            sign = 1;
        }
    }
    const Word16 *pick = dico + 4 * index;
    if (sign == 0) {
        r1[0] = pick[0];
        r1[1] = pick[1];
        r2[0] = pick[2];
        r2[1] = pick[3];
    } else {
        r1[0] = negate(pick[0]);
        r1[1] = negate(pick[1]);
        r2[0] = negate(pick[2]);
        r2[1] = negate(pick[3]);
    }
    return add(shl(static_cast<Word16>(index), 1), sign);
}

}  // namespace vamrnb

extern "C" int16_t vamrnbe_vq_subvec4(int16_t *r, const int16_t *dico, const int16_t *w,
                                      int32_t size) {
    return dsp().vq_subvec4(r, dico, w, size);
}

extern "C" int16_t vamrnbe_vq_subvec(int16_t *r1, int16_t *r2, const int16_t *dico,
                                     const int16_t *w1, const int16_t *w2, int32_t size) {
    return dsp().vq_subvec(r1, r2, dico, w1, w2, size);
}

extern "C" int16_t vamrnbe_vq_subvec_s(int16_t *r1, int16_t *r2, const int16_t *dico,
                                       const int16_t *w1, const int16_t *w2, int32_t size) {
    return dsp().vq_subvec_s(r1, r2, dico, w1, w2, size);
}

extern "C" void vamrnbe_q_plsf_3(int32_t mode, const int16_t lsp[10], int16_t lsp_q[10],
                                 int16_t past_rq[10], int16_t indices[3],
                                 int16_t *pred_init_i) {
    Word16 lsf[M], wf[M], lsf_p[M] = {}, lsf_r[M] = {};

    vamrnb_lsp_lsf(lsp, lsf);
    lsf_wt(lsf, wf);

    if (mode != MRDTX) {
        for (int i = 0; i < M; ++i) {
            lsf_p[i] = add(tab::q_plsf_3_mean_lsf[i], mult(past_rq[i], tab::pred_fac[i]));
            lsf_r[i] = sub(lsf[i], lsf_p[i]);
        }
    } else {
        // SID: choose the predictor memory, among the fixed start vectors,
        // that leaves the smallest residual energy.
        Word32 best = MAX_32;
        for (int j = 0; j < PAST_RQ_INIT_ROWS; ++j) {
            const Word16 *init = tab::past_rq_init + j * M;
            Word16 p[M], r[M];
            Word32 err = 0;
            for (int i = 0; i < M; ++i) {
                p[i] = add(tab::q_plsf_3_mean_lsf[i], init[i]);
                r[i] = sub(lsf[i], p[i]);
                err = l_mac(err, r[i], r[i]);
            }
            if (err < best) {
                best = err;
                for (int i = 0; i < M; ++i) {
                    lsf_r[i] = r[i];
                    lsf_p[i] = p[i];
                    past_rq[i] = init[i];
                }
                *pred_init_i = static_cast<Word16>(j);
            }
        }
    }

    if (mode == MR475 || mode == MR515) {
        indices[0] = vq_subvec3(&lsf_r[0], tab::q_plsf_3_dico1_lsf, &wf[0], 256, 1);
        indices[1] = vq_subvec3(&lsf_r[3], tab::q_plsf_3_dico2_lsf, &wf[3], 256, 2);
        indices[2] = vamrnbe_vq_subvec4(&lsf_r[6], tab::mr515_3_lsf, &wf[6], 128);
    } else if (mode == MR795) {
        indices[0] = vq_subvec3(&lsf_r[0], tab::mr795_1_lsf, &wf[0], 512, 1);
        indices[1] = vq_subvec3(&lsf_r[3], tab::q_plsf_3_dico2_lsf, &wf[3], 512, 1);
        indices[2] = vamrnbe_vq_subvec4(&lsf_r[6], tab::q_plsf_3_dico3_lsf, &wf[6], 512);
    } else {
        indices[0] = vq_subvec3(&lsf_r[0], tab::q_plsf_3_dico1_lsf, &wf[0], 256, 1);
        indices[1] = vq_subvec3(&lsf_r[3], tab::q_plsf_3_dico2_lsf, &wf[3], 512, 1);
        indices[2] = vamrnbe_vq_subvec4(&lsf_r[6], tab::q_plsf_3_dico3_lsf, &wf[6], 512);
    }

    Word16 lsf_q[M];
    for (int i = 0; i < M; ++i) {
        lsf_q[i] = add(lsf_r[i], lsf_p[i]);
        past_rq[i] = lsf_r[i];
    }
    vamrnb_reorder(lsf_q);
    vamrnb_sf_sp(lsf_q, vamrnb_tbl_cos_lsp_lsf, lsp_q);
}
