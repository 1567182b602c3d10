// Decoder LSF dequantisation: the three-split quantiser (one LSF set per
// frame, every mode but MR122, and the comfort-noise SID parameters) and the
// five-split quantiser of MR122 (two sets per frame).  Both conceal bad
// frames by pulling the previous LSFs towards the mean and keep the
// prediction memory consistent with what they output.
#pragma once

#include "basic_op/basic_op.h"
#include "vamrnb.h"

extern "C" {
// mode 0..8 (MRDTX = 8: no prediction factor), bfi nonzero for a bad frame,
// indices: the frame's three LSF parameters.  past_lsf_q and past_r_q (10
// each) are updated; lsp_out receives the 10 LSPs.
VAMRNB_API void vamrnbd_d_plsf_3(int32_t mode, int32_t bfi, const int16_t *indices,
                                 int16_t past_lsf_q[10], int16_t past_r_q[10],
                                 int16_t lsp_out[10]);
}

namespace vamrnb {
// MR122: indices are the frame's five LSF parameters; lsp1 is the set of
// subframe 2, lsp2 the set of subframe 4.
void d_plsf_5(Word16 bfi, const Word16 *indices, Word16 past_lsf_q[10], Word16 past_r_q[10],
              Word16 lsp1[10], Word16 lsp2[10]);
}  // namespace vamrnb
