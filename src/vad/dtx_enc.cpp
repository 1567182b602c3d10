// SID encoding during discontinuous transmission.  Every frame leaves its
// unquantised LSP vector and log energy in an eight-frame history; a silent
// frame past the hangover averages that history into a SID description (LSF
// indices from the ordinary three-split quantiser and a 6-bit energy index),
// seeds the code-gain predictor with the noise level, and clears the speech
// coder's memories so that speech restarts from a clean state.
#include "vad/dtx_enc.h"

#include "basic_op/ext_op.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr Word16 LOG2_FRAME_Q10 = 8521;   // log2(160) in Q10
constexpr Word16 SEED_MIN = -14436;

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
