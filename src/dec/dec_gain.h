// Gain decoding of the decoder and its concealment helpers.
#pragma once

#include "dec/dec_state.h"

extern "C" {
// Pitch gain of a separately coded mode (Q14).
VAMRNB_API int16_t vamrnbd_d_gain_pitch(int32_t mode, int16_t index);
// Concealed pitch gain: min(median of the history, last gain), attenuated
// according to the concealment state.
VAMRNB_API void vamrnbd_ec_gain_pitch(int16_t past_gain_pit, int16_t state, const int16_t pbuf[5],
                                      int16_t *gain_pitch);
// Limits a good frame's pitch gain after a bad frame and pushes it into the
// concealment history.
VAMRNB_API void vamrnbd_ec_gain_pitch_update(vamrnb::dec_state *st, int16_t bfi, int16_t prev_bf,
                                             int16_t *gain_pitch);
}

namespace vamrnb {
// Code gain of MR795 and MR122 from its index and the predictor (Q1).
void d_gain_code(int32_t mode, Word16 index, const Word16 code[40], Word16 past_qua_en[4],
                 Word16 past_qua_en_MR122[4], Word16 *gain_code);
// Joint pitch and code gain of the vector-quantised modes.
void d_gain(int32_t mode, Word16 index, const Word16 code[40], Word16 even_subfr,
            Word16 past_qua_en[4], Word16 past_qua_en_MR122[4], Word16 *gain_pit,
            Word16 *gain_code);
// Concealed code gain; ages the predictor histories.
void ec_gain_code(dec_state *st, Word16 *gain_code);
// Limits a good frame's code gain after a bad frame and pushes it into the
// concealment history.
void ec_gain_code_update(dec_state *st, Word16 bfi, Word16 prev_bf, Word16 *gain_code);
}  // namespace vamrnb
