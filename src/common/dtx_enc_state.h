// State record of the encoder's discontinuous transmission: the history of
// LSP vectors and frame energies from which SID parameters are averaged.
// Part of the encoder instance record, so it sits below the detectors and
// the encoder stages that both use it.
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

inline constexpr int DTX_HIST_SIZE = 8;
inline constexpr Word16 DTX_HANG_FRAMES = 7;   // hangover after the last active frame

struct dtx_enc_state {
    Word16 lsp_hist[DTX_HIST_SIZE * 10];   // LSP vectors (Q15), circular
    Word16 log_en_hist[DTX_HIST_SIZE];     // frame log energies, log2 Q10 halved
    Word16 init_lsf_vq_index;              // 3-bit SID LSF predictor index
    Word16 hist_ptr;                       // slot of the newest entry, 0..7
    Word16 log_en_index;                   // 6-bit SID energy index
    Word16 lsp_index[3];                   // SID LSF split indices
    Word16 dtx_hangover_count;             // starts at 7
    Word16 elapsed_count;                  // frames since the last SID analysis
};

}  // namespace vamrnb
