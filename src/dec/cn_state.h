// State of the decoder's comfort-noise generation and reception DTX handling.
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

enum dtx_global_state : int32_t { SPEECH = 0, DTX = 1, DTX_MUTE = 2 };

struct dtx_dec_state {
    Word16 since_last_sid;
    Word16 old_log_en;
    Word16 true_sid_period_inv;
    Word16 log_en;
    Word32 L_pn_seed_rx;
    Word16 lsp[10];
    Word16 lsf_hist[80];
    Word16 lsf_hist_ptr;
    Word16 lsf_hist_mean[80];
    Word16 log_pg_mean;
    Word16 log_en_hist[8];
    Word16 log_en_hist_ptr;
    Word16 log_en_adjust;
    Word16 dtxHangoverCount;
    Word16 decAnaElapsedCount;
    Word16 sid_frame;
    Word16 valid_data;
    Word16 dtxHangoverAdded;
    Word32 dtxGlobalState;
    Word16 data_updated;
};

}  // namespace vamrnb
