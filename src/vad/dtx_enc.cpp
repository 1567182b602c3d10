// SID encoding during discontinuous transmission.  Every frame leaves its
// unquantised LSP vector and log energy in an eight-frame history; a silent
// frame past the hangover averages that history into a SID description (LSF
// indices from the ordinary three-split quantiser and a 6-bit energy index),
// seeds the code-gain predictor with the noise level, and clears the speech
// coder's memories so that speech restarts from a clean state.
#include "vad/dtx_enc.h"

#include "vamrnb_dsp.h"
#include "basic_op/ext_op.h"
#include "common/enc_state.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr int32_t MODE_DTX = 8;
constexpr Word16 LOG2_FRAME_Q10 = 8521;   // log2(160) in Q10
constexpr Word16 SEED_MIN = -14436;
constexpr Word16 MR122_SCALE = 5443;      // 20·log10(2) scaling, Q15

}  // namespace

void dtx_enc_init(dtx_enc_state *st) {
    *st = dtx_enc_state{};
    for (int s = 0; s < DTX_HIST_SIZE; ++s)
        for (int i = 0; i < M; ++i) st->lsp_hist[s * M + i] = vamrnb_tbl_lsp_init_data[i];
    st->dtx_hangover_count = DTX_HANG_FRAMES;
    st->elapsed_count = 32767;
}

Word16 dtx_frame_log_en(const Word16 *speech) {
    Word32 energy = 0;
    for (int i = 0; i < L_FRAME; ++i) energy = l_mac(energy, speech[i], speech[i]);
    Word16 e, f;
    vamrnb_log2(energy, &e, &f);
    Word16 log_en = add(shl(e, 10), shr(f, 15 - 10));
    log_en = sub(log_en, LOG2_FRAME_Q10);
    return shr(log_en, 1);
}

void dtx_buffer(const Word16 lsp_new[10], const Word16 *speech, dtx_enc_state *st) {
    Word16 slot = add(st->hist_ptr, 1);
    if (slot == DTX_HIST_SIZE) slot = 0;
    st->hist_ptr = slot;
    for (int i = 0; i < M; ++i) st->lsp_hist[slot * M + i] = lsp_new[i];
    st->log_en_hist[slot] = dtx_frame_log_en(speech);
}

Word16 dtx_log_en_index(const dtx_enc_state *st) {
    Word16 mean = 0;
    for (int s = 0; s < DTX_HIST_SIZE; ++s) mean = add(mean, shr(st->log_en_hist[s], 2));
    mean = shr(mean, 1);
    // +2.5 in Q10 and half a step (0.125), then steps of 0.25 in Q10.
    Word16 idx = shr(add(add(mean, 2560), 128), 8);
    if (idx > 63) idx = 63;
    if (idx < 0) idx = 0;
    return idx;
}

Word16 dtx_gain_seed(Word16 log_en_index) {
    Word16 g = shl(log_en_index, 8);   // Q11 / 4
    g = sub(g, 2560);
    g = sub(g, 9000);
    if (g > 0) g = 0;
    if (g < SEED_MIN) g = SEED_MIN;
    return g;
}

}  // namespace vamrnb

extern "C" void vamrnbe_dtx(vamrnb_encoder *st, vamrnb::enc_frame *fr) {
    using namespace vamrnb;
    dtx_enc_state *d = &st->dtx;

    // An MRDTX frame inside a shortened hangover repeats the stored SID
    // parameters, except while the stored energy index is 0 (nothing useful
    // stored yet, or digital silence): then they are refreshed as well.
    if (fr->compute_sid != 0 || d->log_en_index == 0) {
        // Averaged LSP vector of the history.
        Word32 sum[M] = {};
        for (int s = 0; s < DTX_HIST_SIZE; ++s)
            for (int i = 0; i < M; ++i) sum[i] = l_add(sum[i], d->lsp_hist[s * M + i]);
        Word16 lsp[M];
        for (int i = 0; i < M; ++i) lsp[i] = extract_l(l_shr(sum[i], 3));

        d->log_en_index = dtx_log_en_index(d);

        // Speech resumes from the noise level.
        const Word16 seed = dtx_gain_seed(d->log_en_index);
        const Word16 seed_mr122 = mult(MR122_SCALE, seed);
        for (int i = 0; i < 4; ++i) {
            st->sub.pred.past_qua_en[i] = seed;
            st->sub.pred.past_qua_en_MR122[i] = seed_mr122;
        }

        // Keep the averaged vector well ordered before quantising it.
        Word16 lsf[M];
        vamrnb_lsp_lsf(lsp, lsf);
        vamrnb_reorder(lsf);
        vamrnb_sf_sp(lsf, vamrnb_tbl_cos_lsp_lsf, lsp);

        Word16 lsp_q[M];
        vamrnbe_q_plsf_3(MODE_DTX, lsp, lsp_q, st->past_rq, d->lsp_index, &d->init_lsf_vq_index);
    }

    Word16 *prm = fr->prm;
    prm[0] = d->init_lsf_vq_index;
    prm[1] = d->lsp_index[0];
    prm[2] = d->lsp_index[1];
    prm[3] = d->lsp_index[2];
    prm[4] = d->log_en_index;
    fr->prm_pos = 5;

    // Clear the speech coder's memories.
    for (int i = 0; i < ENC_EXC; ++i) st->old_exc[i] = 0;
    for (int i = 0; i < M; ++i) {
        st->sub.mem_w0[i] = 0;
        st->sub.mem_err[i] = 0;
    }
    for (int i = 0; i < L_SUBFR; ++i) {
        st->sub.ai_zero[MP1 + i] = 0;
        st->sub.hvec[i] = 0;
    }
    for (int i = 0; i < M; ++i) {
        st->lsp_old[i] = fr->lsp_new[i];
        st->lsp_old_q[i] = fr->lsp_new[i];
        st->past_rq[i] = 0;
    }
    st->sub.T0_prev_subframe = 0;
    st->sub.sharp = 0;

    vamrnbe_prm2bits(MODE_DTX, prm);
}
