// Decoder LSF dequantisation.  A good frame adds the codebook residuals to
// the mean LSFs plus the scaled residual of the previous frame (first-order
// moving-average prediction); a bad frame reuses the previous LSFs moved a
// little towards the mean and back-computes the residual memory from them.
// Every result is spaced with the minimum gap and converted to LSPs.
#include "dec/d_plsf.h"

#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr int kMR475 = 0, kMR515 = 1, kMR795 = 5, kMRDTX = 8;

// Three-split concealment weights (Q15): 0.9 of the past, 0.1 of the mean.
constexpr Word16 kAlpha3 = 29491, kOneAlpha3 = 3277;
// Five-split: 0.95 and 0.05; prediction factor 0.65.
constexpr Word16 kAlpha5 = 31128, kOneAlpha5 = 1639, kPredFac5 = 21299;

// Codebook rows are addressed with the index masked to the codebook size, so
// that no index can reach outside a table.
inline const Word16 *row(const Word16 *cb, int rows, int width, Word32 index) {
    return cb + (static_cast<uint32_t>(index) & static_cast<uint32_t>(rows - 1)) * width;
}

}  // namespace

void d_plsf_5(Word16 bfi, const Word16 *indices, Word16 past_lsf_q[10], Word16 past_r_q[10],
              Word16 lsp1[10], Word16 lsp2[10]) {
    const Word16 *mean = vamrnb_tbl_mean_lsf;
    Word16 lsf1[M], lsf2[M];
    if (bfi != 0) {
        for (int i = 0; i < M; ++i) {
            lsf1[i] = add(mult(past_lsf_q[i], kAlpha5), mult(mean[i], kOneAlpha5));
            lsf2[i] = lsf1[i];
        }
        for (int i = 0; i < M; ++i)
            past_r_q[i] = sub(lsf2[i], add(mean[i], mult(past_r_q[i], kPredFac5)));
    } else {
        // Each split row holds (set 1: 2k, 2k+1, set 2: 2k, 2k+1).
        Word16 r1[M], r2[M];
        const Word16 *p[5] = {
            row(vamrnb_tbl_dico1_lsf, 128, 4, indices[0]),
            row(vamrnb_tbl_dico2_lsf, 256, 4, indices[1]),
            row(vamrnb_tbl_dico3_lsf, 256, 4, indices[2] >> 1),
            row(vamrnb_tbl_dico4_lsf, 256, 4, indices[3]),
            row(vamrnb_tbl_dico5_lsf, 64, 4, indices[4]),
        };
        for (int k = 0; k < 5; ++k) {
            r1[2 * k] = p[k][0];
            r1[2 * k + 1] = p[k][1];
            r2[2 * k] = p[k][2];
            r2[2 * k + 1] = p[k][3];
        }
        if (indices[2] & 1) {          // split 3 carries a sign bit
            r1[4] = negate(r1[4]);
            r1[5] = negate(r1[5]);
            r2[4] = negate(r2[4]);
            r2[5] = negate(r2[5]);
        }
        for (int i = 0; i < M; ++i) {
            const Word16 temp = add(mean[i], mult(past_r_q[i], kPredFac5));
            lsf1[i] = add(r1[i], temp);
            lsf2[i] = add(r2[i], temp);
            past_r_q[i] = r2[i];
        }
    }
    vamrnb_reorder(lsf1);
    vamrnb_reorder(lsf2);
    for (int i = 0; i < M; ++i) past_lsf_q[i] = lsf2[i];
    vamrnb_sf_sp(lsf1, vamrnb_tbl_cos_lsp_lsf, lsp1);
    vamrnb_sf_sp(lsf2, vamrnb_tbl_cos_lsp_lsf, lsp2);
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnbd_d_plsf_3(int32_t mode, int32_t bfi, const int16_t *indices,
                                 int16_t past_lsf_q[10], int16_t past_r_q[10],
                                 int16_t lsp_out[10]) {
    const Word16 *mean = tab::q_plsf_3_mean_lsf;
    const Word16 *pred_fac = tab::pred_fac;
    Word16 lsf[M];

    // Sums below are 16-bit without saturation.
    if (bfi != 0) {
        for (int i = 0; i < M; ++i)
            lsf[i] = wrap16(mult(mean[i], kOneAlpha3) + mult(past_lsf_q[i], kAlpha3));
        for (int i = 0; i < M; ++i) {
            const Word32 pred = mode != kMRDTX ? mult(past_r_q[i], pred_fac[i]) : past_r_q[i];
            past_r_q[i] = wrap16(Word32{lsf[i]} - mean[i] - pred);
        }
    } else {
        const Word16 *cb1 = tab::q_plsf_3_dico1_lsf;
        int rows1 = 256;
        const Word16 *cb3 = tab::q_plsf_3_dico3_lsf;
        int rows3 = 512;
        Word32 index2 = indices[1];
        if (mode == kMR475 || mode == kMR515) {
            cb3 = tab::mr515_3_lsf;
            rows3 = 128;
            index2 *= 2;               // only the even rows of the second codebook
        } else if (mode == kMR795) {
            cb1 = tab::mr795_1_lsf;
            rows1 = 512;
        }
        Word16 r[M];
        const Word16 *p1 = row(cb1, rows1, 3, indices[0]);
        const Word16 *p2 = row(tab::q_plsf_3_dico2_lsf, 512, 3, index2);
        const Word16 *p3 = row(cb3, rows3, 4, indices[2]);
        for (int i = 0; i < 3; ++i) r[i] = p1[i];
        for (int i = 0; i < 3; ++i) r[3 + i] = p2[i];
        for (int i = 0; i < 4; ++i) r[6 + i] = p3[i];
        for (int i = 0; i < M; ++i) {
            const Word32 pred = mode != kMRDTX ? mult(past_r_q[i], pred_fac[i]) : past_r_q[i];
            lsf[i] = wrap16(Word32{r[i]} + mean[i] + pred);
            past_r_q[i] = r[i];
        }
    }
    vamrnb_reorder(lsf);
    for (int i = 0; i < M; ++i) past_lsf_q[i] = lsf[i];
    vamrnb_sf_sp(lsf, vamrnb_tbl_cos_lsp_lsf, lsp_out);
}
