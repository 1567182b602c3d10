// State records of the two voice activity detectors.  Both live in one storage
// area of the encoder instance (only the configured detector uses it); the
// open-loop pitch analysis writes the pitch, tone, correlation and long-term
// prediction fields of these same records.
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb {

inline constexpr int VAD_BANDS = 9;

// Nine-band sub-band energy detector.
struct vad1_state {
    Word16 bckr_est[VAD_BANDS];   // background noise estimate per band
    Word16 ave_level[VAD_BANDS];  // averaged band levels (stationarity)
    Word16 old_level[VAD_BANDS];  // band levels of the previous frame
    Word16 sub_level[VAD_BANDS];  // look-ahead part of the band levels
    Word16 a_data5[3][2];         // 5th-order filter stage memories
    Word16 a_data3[5];            // 3rd-order filter stage memories
    Word16 burst_count;
    Word16 hang_count;
    Word16 stat_count;
    Word16 vadreg;                // intermediate decisions, newest in bit 14
    Word16 pitch;                 // pitch flags, newest in bit 14 (open-loop pitch)
    Word16 tone;                  // tone flags, newest in bit 14 (open-loop pitch)
    Word16 complex_high;
    Word16 complex_low;
    Word16 oldlag_count;
    Word16 oldlag;
    Word16 complex_hang_count;
    Word16 complex_hang_timer;
    Word16 best_corr_hp;          // Q15, written by open-loop pitch
    Word16 speech_vad_decision;
    Word16 complex_warning;
    Word16 sp_burst_count;
    Word16 corr_hp_fast;          // Q15
};

// FFT channel detector working on half frames.
struct vad2_state {
    Word16 pre_emp_mem;
    Word16 update_cnt;
    Word16 hyster_cnt;
    Word16 last_update_cnt;
    Word16 ch_enrg_long_db[16];   // Q7.8
    Word32 Lframe_cnt;
    Word32 Lch_enrg[16];
    Word32 Lch_noise[16];
    Word16 last_normb_shift;
    Word16 tsnr;                  // Q7.8
    Word16 hangover;
    Word16 burstcount;
    Word16 fupdate_flag;
    Word16 negSNRvar;             // Q7.8
    Word16 negSNRbias;
    Word16 shift_state;
    Word32 L_R0;                  // written by open-loop pitch
    Word32 L_Rmax;                // written by open-loop pitch
    Word32 LTP_flag;              // written by open-loop pitch
};

// The encoder's single detector storage area.
union vad_area {
    vad1_state v1;
    vad2_state v2;
};

}  // namespace vamrnb
