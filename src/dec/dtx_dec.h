// Decoder side of discontinuous transmission: the reception state machine
// that chooses between speech and comfort noise, the bit-to-parameter step of
// every accepted frame, the comfort-noise synthesis itself, and the histories
// of spectrum and level kept while speech is being decoded.
//
// This stage owns the reception DTX state (dec_state::cn, and
// dec_work::dtx_state_prev for the frame): only the functions here write it;
// the decoder driver and the speech stages read it.  When comfort noise
// takes over, the stage restarts the speech state through reset_dec.
#pragma once

#include "basic_op/basic_op.h"
#include "vamrnb.h"
#include "dec/cn_state.h"

namespace vamrnb {

struct dec_state;
struct dec_work;

// Sets every comfort-noise field to its value after a decoder reset.
void dtx_dec_reset(dtx_dec_state *st);

// Reception state machine: classifies the frame as speech, comfort noise or
// muted comfort noise, and books the SID bookkeeping counters.  Leaves
// dtxGlobalState (the previous frame's state) untouched.
dtx_global_state rx_dtx_handler(dtx_dec_state *st, int32_t rx_type);

// Decoder memories that comfort-noise synthesis reads or re-initialises.
struct cn_links {
    Word16 *lsp_old;            // previous comfort-noise LSP vector (10)
    Word16 *mem_syn;            // synthesis filter memory (10)
    Word16 *past_r_q;           // LSF prediction residual memory (10)
    Word16 *past_lsf_q;         // last quantised LSFs (10)
    Word16 *past_qua_en;        // code-gain predictor memory (4)
    Word16 *past_qua_en_MR122;  // the same for 12.2 kbit/s (4)
    Word16 *hang_var;           // codebook-gain averaging hangover variable
    Word16 *hang_count;         // codebook-gain averaging hangover counter
};

// One frame of comfort noise: updates the SID parameters when the frame
// carries them, writes 160 synthesised samples and the four (identical)
// post-filter LPC sets.  `prev_state` is the reception state of the previous
// frame, `new_state` the one rx_dtx_handler chose for this frame.
void dtx_dec(dtx_dec_state *st, const cn_links &io, dtx_global_state prev_state,
             dtx_global_state new_state, int32_t mode, const Word16 *prm,
             Word16 synth[160], Word16 A_t[44]);

// History update after a frame of decoded speech (lsf: its quantised LSFs,
// synth: its 160 synthesised samples before post-filtering).
void dtx_dec_activity_update(dtx_dec_state *st, const Word16 lsf[10], const Word16 synth[160]);

// Reflection coefficients of a direct-form filter a[1..10] (0 everywhere
// when the filter is unstable or the recursion would overflow).
void a_refl(const Word16 a[10], Word16 refl[10]);

}  // namespace vamrnb

extern "C" {
void    vamrnbd_dtx(vamrnb::dec_state *st, vamrnb::dec_work *w, const int16_t **cursor);
void    vamrnbd_dtx_dec_activity_update(vamrnb::dec_state *st, vamrnb::dec_work *w);
VAMRNB_API int16_t vamrnbd_pseudonoise(int32_t n, int32_t *seed);
VAMRNB_API void    vamrnbd_build_cn_code(int32_t *seed, int16_t cod[40]);
}
