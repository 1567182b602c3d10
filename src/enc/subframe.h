// The encoder's subframe stages: subframe preparation and closed-loop pitch,
// algebraic codebook search, gain quantisation with the filter-memory update,
// and the kernels they share.  The frame driver calls the four stages in the
// order syn, acb, icb, filt_update for the subframe starts 0, 40, 80 and 120.
#pragma once

#include <cstdint>

#include "common/enc_state.h"

extern "C" {
// Stages (instance, work record, subframe start 0/40/80/120).
VAMRNB_API void vamrnbe_syn(vamrnb::enc_state *st, vamrnb::enc_frame *fr, int32_t i_subfr);
VAMRNB_API void vamrnbe_acb(vamrnb::enc_state *st, vamrnb::enc_frame *fr, int32_t i_subfr);
VAMRNB_API void vamrnbe_icb(vamrnb::enc_state *st, vamrnb::enc_frame *fr, int32_t i_subfr);
VAMRNB_API void vamrnbe_filt_update(vamrnb::enc_state *st, vamrnb::enc_frame *fr, int32_t i_subfr);

// Weighted filters, impulse response, LP residual and pitch target of
// subframe `subfr_nr` (0..3).  `use_saved_w0` runs the target filter from
// the MR475 pair's saved weighting memory instead of the live one.
VAMRNB_API void vamrnbe_subfr_pre_proc(vamrnb::enc_state *st, vamrnb::enc_frame *fr,
                            int32_t subfr_nr, int32_t use_saved_w0);

// Scalar pitch-gain quantiser: returns the index and replaces *gain by the
// quantised gain.  MR795 also lists three candidates (values and indices).
VAMRNB_API int16_t vamrnbe_qgain_pitch(int32_t mode, int16_t gp_limit, int16_t *gain,
                            int16_t gain_cand[3], int16_t gain_cind[3]);

// y[n] = sum_{i<=n} x[i] h[n-i], n = 0..39, scaled by 8 and rounded down.
VAMRNB_API void vamrnbe_convolve(const int16_t *x, const int16_t *h, int16_t *y);

// Normalised correlation of the target with the filtered past excitation for
// every lag t_min..t_max; corr[k] belongs to lag t_min + k.  exc points at
// the subframe's excitation; exc[-t_max .. 39 - t_min] is read.
VAMRNB_API void vamrnbe_norm_corr_filt(const int16_t *exc, const int16_t *xn, const int16_t *h,
                            int32_t t_min, int32_t t_max, int16_t *corr);

// Backward filtering of the target through h, normalised so that the sum of
// the per-track maxima (5 tracks of step 5) cannot overflow; sf is 1 or 2.
VAMRNB_API void vamrnbe_cor_h_x(const int16_t *h, const int16_t *x, int16_t *dn, int32_t sf);

// Signed correlation matrix of a scaled impulse response h2:
// rr[i][j] = sum h2[n-i] h2[n-j] with sign[i]*sign[j] folded in off the diagonal.
VAMRNB_API void vamrnbe_cor_h_sign(const int16_t *h2, const int16_t *sign, int16_t *rr);
}

namespace vamrnb {

inline constexpr int L_CODE = 40;

// Closed-loop lag search range: `range` wide, starting `low` below T0, kept
// inside [pit_min, pit_max] with its full width.
void get_range(Word16 T0, Word16 low, Word16 range, Word16 pit_min, Word16 pit_max,
               Word16 *t0_min, Word16 *t0_max);

// Lag index at 1/3 resolution: absolute (8 bits) or relative to the search
// range (5 bits, or 4 bits with flag4 around the previous lag T0_prev).
Word16 enc_lag3(Word16 T0, Word16 T0_frac, Word16 T0_prev, Word16 t0_min, Word16 t0_max,
                Word16 relative, Word16 flag4);

// Lag index at 1/6 resolution: absolute (9 bits) or relative (6 bits).
Word16 enc_lag6(Word16 T0, Word16 T0_frac, Word16 t0_min, Word16 relative);

// True when gain/8 plus the recent pitch-gain history exceeds 15565.
bool check_gp_clipping(const Word16 gp[GP_HIST], Word16 gain);

// Limits the subframe's pitch gain for the mode and the resonance guard
// and sets the quantiser's pitch gain limit (32767 when unlimited).
void limit_pitch_gain(int32_t mode, Word16 lsp_flag, const Word16 gp[GP_HIST], Word16 *gain,
                      Word16 *gp_limit);

// Backward filtering for nb_track interleaved tracks of the given step.
void cor_h_x2(const Word16 *h, const Word16 *x, Word16 *dn, Word16 sf,
              Word16 nb_track, Word16 step);

// Correlation matrix of h (energy-normalised) with the signs folded in.
void cor_h(const Word16 *h, const Word16 *sign, Word16 rr[L_CODE][L_CODE]);

// Signs from the normalised mix of dn and the residual cn; per-track maxima
// and the rotating start positions of the pulses.
void set_sign12k2(Word16 *dn, const Word16 *cn, Word16 *sign, Word16 *pos_max,
                  Word16 nb_track, Word16 *ipos, Word16 step);

// Depth-first search of pulse pairs for the 8- and 10-pulse codebooks.
void search_10and8i40(Word16 nb_pulse, Word16 step, Word16 nb_tracks,
                      const Word16 *dn, const Word16 rr[L_CODE][L_CODE],
                      Word16 *ipos, const Word16 *pos_max, Word16 *codvec);

// Energy terms of the gain quantisers from the filtered vectors.
void calc_filt_energies(int32_t mode, const Word16 *xn, const Word16 *xn2,
                        const Word16 *y1, const Word16 *y2, const Word16 *g_coeff,
                        Word16 *frac_coeff, Word16 *exp_coeff,
                        Word16 *cod_gain_frac, Word16 *cod_gain_exp);

// Reads one half of a chosen MR475 table row, computes the code gain and
// updates the predictor with the row's quantised energies.
void mr475_quant_store_results(gain_pred_mem *pred, const Word16 *row,
                               Word16 gcode0, Word16 exp_gcode0,
                               Word16 *gain_pit, Word16 *gain_cod);

}  // namespace vamrnb
