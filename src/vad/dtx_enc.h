// Encoder side of discontinuous transmission: the eight-frame history of LSP
// vectors and frame energies from which SID parameters are averaged, and the
// SID parameter computation itself.
#pragma once

#include <cstdint>

#include "vamrnb.h"
#include "basic_op/basic_op.h"
#include "common/dtx_enc_state.h"

namespace vamrnb {


// Initial state: every history slot holds the initial LSP vector, energies
// and indices 0, hangover 7, elapsed count 32767.
void dtx_enc_init(dtx_enc_state *st);

// Stores the frame's unquantised LSP vector and its log energy (from the 160
// samples at `speech`) in the next history slot.  Runs every frame.
void dtx_buffer(const Word16 lsp_new[10], const Word16 *speech, dtx_enc_state *st);

// Log energy of one frame as kept in the history: log2 of the doubled sum of
// squares, Q10, minus log2(160), halved.
Word16 dtx_frame_log_en(const Word16 *speech);

// Quantised SID energy index (0..63) from the history.
Word16 dtx_log_en_index(const dtx_enc_state *st);

// Code-gain predictor energy (Q10, modes other than MR122) that matches a SID
// energy index.
Word16 dtx_gain_seed(Word16 log_en_index);

}  // namespace vamrnb

struct vamrnb_encoder;
namespace vamrnb { struct enc_frame; }

extern "C" {
// SID encoder for an MRDTX frame: recomputes (compute_sid) or repeats the SID
// parameters, writes them as bits into the frame's prm, seeds the code-gain
// predictor and resets the speech-coding memories.
VAMRNB_API void vamrnbe_dtx(vamrnb_encoder *st, vamrnb::enc_frame *fr);
}
