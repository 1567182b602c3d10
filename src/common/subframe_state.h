// Persistent and per-frame records of the encoder's subframe loop: closed-loop
// pitch, algebraic codebook and gain quantisation with the filter memories.
#pragma once

#include "basic_op/basic_op.h"
#include "lpc/lpc.h"

namespace vamrnb {

inline constexpr int GP_HIST = 7;       // pitch gains kept for the clipping test
inline constexpr int LTPG_MEM = 5;      // LTP coding gains kept by the adaptor

// Memory of one moving-average code-gain predictor (past quantised energies).
struct gain_pred_mem {
    Word16 past_qua_en[4];          // 20*log10 domain, Q10 (modes other than MR122)
    Word16 past_qua_en_MR122[4];    // log2 domain, Q10 (MR122)
};

// Carried from subframe to subframe and frame to frame.
struct subfr_state {
    // Filter memories.  Part of these is cleared in MRDTX frames.
    Word16 mem_syn[M];              // synthesis filter
    Word16 mem_w0[M];               // weighting filter of the target
    Word16 mem_err[M + L_SUBFR];    // error filter; the subframe's error signal
                                    // is written at mem_err + M
    Word16 ai_zero[L_SUBFR + MP1];  // impulse (MP1 coefficients) followed by the
                                    // all-zero vector used as filter memory
    Word16 hvec[2 * L_SUBFR];       // zero half, then the impulse response h1
    Word16 sharp;                   // pitch sharpening gain, Q14 (0 after reset)
    Word16 T0_prev_subframe;        // integer lag of the previous subframe

    // Pitch-gain history of the clipping test (gains >> 3, Q11).
    Word16 gp[GP_HIST];

    // Code-gain predictors: `pred` is the real one (seeded in MRDTX frames),
    // `pred_unq` the one MR475 runs with unquantised gains in even subframes.
    gain_pred_mem pred;
    gain_pred_mem pred_unq;

    // MR475: energies of the even subframe, used when the pair is quantised.
    Word16 sf0_exp_gcode0;
    Word16 sf0_frac_gcode0;
    Word16 sf0_exp_target_en;
    Word16 sf0_frac_target_en;
    Word16 sf0_exp_coeff[5];
    Word16 sf0_frac_coeff[5];

    // MR795 code-gain adaptation.
    Word16 onset;                   // onset counter, Q0
    Word16 prev_alpha;              // previous adaptation factor, Q15
    Word16 prev_gc;                 // previous code gain, Q1
    Word16 ltpg_mem[LTPG_MEM];      // LTP coding gains, Q13: [1..4] the last four,
                                    // [0] takes the current one for the median
};

// Lives one frame (part of the per-frame work record).
struct subfr_frame {
    Word16 Ap1[MP1];                // weighted filters of the subframe
    Word16 Ap2[MP1];
    Word16 xn[L_SUBFR];             // target for the pitch search
    Word16 xn2[L_SUBFR];            // target for the codebook search
    Word16 res[L_SUBFR];            // LP residual
    Word16 res2[L_SUBFR];           // LP residual minus the pitch contribution
    Word16 y1[L_SUBFR];             // filtered adaptive vector
    Word16 y2[L_SUBFR];             // filtered code vector
    Word16 code[L_SUBFR];           // code vector, Q13
    Word16 g_coeff[6];              // <y1,y1>, <xn,y1> and exponents
    Word16 T0;                      // integer lag
    Word16 T0_frac;                 // fraction of the lag
    Word16 gain_pit;                // pitch gain, Q14
    Word16 gain_code;               // code gain, Q1
    Word16 gp_limit;                // pitch gain limit, Q14 (32767: none)

    // MR475 subframe pair: the even subframe's copies until the odd one has
    // quantised both gains.
    Word16 mem_syn_save[M];
    Word16 mem_w0_save[M];
    Word16 mem_err_save[M];
    Word16 sharp_save;
    Word16 h1_sf0[L_SUBFR];
    Word16 xn_sf0[L_SUBFR];
    Word16 y2_sf0[L_SUBFR];
    Word16 code_sf0[L_SUBFR];
    Word16 T0_sf0;
    Word16 T0_frac_sf0;
    Word16 i_subfr_sf0;
    Word16 gain_pit_sf0;
    Word16 gain_code_sf0;
    int32_t gain_idx_pos;           // prm slot kept for the pair's gain index
};

}  // namespace vamrnb
