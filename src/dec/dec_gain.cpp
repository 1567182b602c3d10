// Gain decoding of the decoder: pitch and code gains of a subframe from the
// gain parameters (scalar tables for MR795/MR122, joint tables otherwise) with
// the moving-average code-gain predictor, and their concealment in bad frames
// from the median of the recent gains.  Also sets the pitch-sharpening factor
// of the subframe.
#include "dec/dec_gain.h"

#include "basic_op/ext_op.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {
constexpr Word16 SHARPMAX = 13017;
constexpr Word16 MIN_ENERGY = -14336;
constexpr Word16 MIN_ENERGY_MR122 = -2381;
}  // namespace

extern "C" int16_t vamrnbd_d_gain_pitch(int32_t mode, int16_t index) {
    const Word16 g = vamrnb_tbl_qua_gain_pitch[index];
    return mode == MR122 ? static_cast<Word16>(g & 0xFFFC) : g;
}

extern "C" void vamrnbd_ec_gain_pitch(int16_t past_gain_pit, int16_t state,
                                      const int16_t pbuf[5], int16_t *gain_pitch) {
    Word16 g = vamrnb_gmed_n(pbuf, 5);
    if (g > past_gain_pit) g = past_gain_pit;
    *gain_pitch = mult(g, tab::pdown[state]);
}

extern "C" void vamrnbd_ec_gain_pitch_update(dec_state *st, int16_t bfi, int16_t prev_bf,
                                             int16_t *gain_pitch) {
    if (bfi == 0) {
        if (prev_bf != 0 && *gain_pitch > st->prev_gp) *gain_pitch = st->prev_gp;
        st->prev_gp = *gain_pitch;
    }
    Word16 g = *gain_pitch;
    if (g > 16384) g = 16384;
    st->past_gain_pit = g;
    for (int i = 0; i < 4; ++i) st->pbuf[i] = st->pbuf[i + 1];
    st->pbuf[4] = g;
}

namespace vamrnb {

void d_gain_code(int32_t mode, Word16 index, const Word16 code[40], Word16 past_qua_en[4],
                 Word16 past_qua_en_MR122[4], Word16 *gain_code) {
    Word16 exp, frac, exp_en, frac_en;
    vamrnb_gc_pred(past_qua_en, past_qua_en_MR122, mode, code, &exp, &frac, &exp_en, &frac_en);
    const Word16 *p = &vamrnb_tbl_qua_gain_code[3 * index];
    if (mode == MR122) {
        const Word16 gcode0 = shl(extract_l(vamrnb_pow2(exp, frac)), 4);
        *gain_code = shl(mult(gcode0, p[0]), 1);
    } else {
        const Word16 gcode0 = extract_l(vamrnb_pow2(14, frac));
        const Word32 L = l_shr(l_mult(p[0], gcode0), sub(9, exp));
        *gain_code = extract_h(L);
    }
    vamrnb_gc_pred_update(p[1], p[2], past_qua_en, past_qua_en_MR122);
}

void d_gain(int32_t mode, Word16 index, const Word16 code[40], Word16 even_subfr,
            Word16 past_qua_en[4], Word16 past_qua_en_MR122[4], Word16 *gain_pit,
            Word16 *gain_code) {
    Word16 g_code, qua_ener_MR122, qua_ener;
    index = shl(index, 2);
    if (mode == MR102 || mode == MR74 || mode == MR67) {
        const Word16 *p = &vamrnb_tbl_gain_highrates[index];
        *gain_pit = p[0];
        g_code = p[1];
        qua_ener_MR122 = p[2];
        qua_ener = p[3];
    } else if (mode == MR475) {
        // the pair table holds two subframes' gains per row; the energies
        // for the predictor are derived from the code gain
        index = add(index, shl(sub(1, even_subfr), 1));
        const Word16 *p = &vamrnb_tb1_gain_mr475[index];
        *gain_pit = p[0];
        g_code = p[1];
        Word16 exp, frac;
        vamrnb_log2(l_deposit_l(g_code), &exp, &frac);
        exp = sub(exp, 12);
        qua_ener_MR122 = add(shr_r(frac, 5), shl(exp, 10));
        const Word32 L = mpy_32_16(exp, frac, 24660);
        qua_ener = round16(l_shl(L, 13));
    } else {
        const Word16 *p = &vamrnb_tbl_gain_lowrates[index];
        *gain_pit = p[0];
        g_code = p[1];
        qua_ener_MR122 = p[2];
        qua_ener = p[3];
    }
    Word16 exp, frac;
    vamrnb_gc_pred(past_qua_en, past_qua_en_MR122, mode, code, &exp, &frac, nullptr, nullptr);
    const Word16 gcode0 = extract_l(vamrnb_pow2(14, frac));
    const Word32 L = l_shr(l_mult(g_code, gcode0), sub(10, exp));
    *gain_code = extract_h(L);
    vamrnb_gc_pred_update(qua_ener_MR122, qua_ener, past_qua_en, past_qua_en_MR122);
}

void ec_gain_code(dec_state *st, Word16 *gain_code) {
    Word16 g = vamrnb_gmed_n(st->gbuf, 5);
    if (g > st->past_gain_code) g = st->past_gain_code;
    *gain_code = mult(g, tab::cdown[st->conceal_state]);

    // age the predictor with the average of its recent energies
    Word16 av = 0;
    for (int i = 0; i < 4; ++i) av = add(av, st->past_qua_en_MR122[i]);
    av = mult(av, 8192);
    if (av < MIN_ENERGY_MR122) av = MIN_ENERGY_MR122;
    const Word16 av_MR122 = av;
    av = 0;
    for (int i = 0; i < 4; ++i) av = add(av, st->past_qua_en[i]);
    av = mult(av, 8192);
    if (av < MIN_ENERGY) av = MIN_ENERGY;
    vamrnb_gc_pred_update(av_MR122, av, st->past_qua_en, st->past_qua_en_MR122);
}

void ec_gain_code_update(dec_state *st, Word16 bfi, Word16 prev_bf, Word16 *gain_code) {
    if (bfi == 0) {
        if (prev_bf != 0 && *gain_code > st->prev_gc) *gain_code = st->prev_gc;
        st->prev_gc = *gain_code;
    }
    st->past_gain_code = *gain_code;
    for (int i = 0; i < 4; ++i) st->gbuf[i] = st->gbuf[i + 1];
    st->gbuf[4] = *gain_code;
}

}  // namespace vamrnb

extern "C" void vamrnbd_dec_gain(dec_state *st, dec_work *w, int32_t i_subfr,
                                 const int16_t **cursor) {
    (void)i_subfr;
    const int32_t mode = w->rx.frame_mode;
    const Word16 bfi = w->bfi;
    Word16 gain_pit = w->gain_pit;  // MR122: already decoded with the pulses
    Word16 gain_code;
    Word16 pit_sharp;

    if (mode == MR795 || mode == MR122) {
        if (mode == MR795) {
            const Word16 index = *(*cursor)++;
            if (bfi != 0)
                vamrnbd_ec_gain_pitch(st->past_gain_pit, st->conceal_state, st->pbuf, &gain_pit);
            else
                gain_pit = vamrnbd_d_gain_pitch(mode, index);
            vamrnbd_ec_gain_pitch_update(st, bfi, st->prev_bf, &gain_pit);
        }
        const Word16 index = *(*cursor)++;
        if (bfi == 0)
            d_gain_code(mode, index, w->code, st->past_qua_en, st->past_qua_en_MR122, &gain_code);
        else
            ec_gain_code(st, &gain_code);
        ec_gain_code_update(st, bfi, st->prev_bf, &gain_code);
        pit_sharp = gain_pit;
        if (mode == MR795 && pit_sharp > SHARPMAX) pit_sharp = SHARPMAX;
    } else {
        // joint index; MR475 sends one index per subframe pair
        Word16 index;
        if (mode == MR475) {
            if (w->even_subfr != 0) w->index_mr475 = *(*cursor)++;
            index = w->index_mr475;
        } else {
            index = *(*cursor)++;
        }
        if (bfi == 0) {
            d_gain(mode, index, w->code, w->even_subfr, st->past_qua_en, st->past_qua_en_MR122,
                   &gain_pit, &gain_code);
        } else {
            vamrnbd_ec_gain_pitch(st->past_gain_pit, st->conceal_state, st->pbuf, &gain_pit);
            ec_gain_code(st, &gain_code);
        }
        vamrnbd_ec_gain_pitch_update(st, bfi, st->prev_bf, &gain_pit);
        ec_gain_code_update(st, bfi, st->prev_bf, &gain_code);
        pit_sharp = gain_pit > SHARPMAX ? SHARPMAX : gain_pit;
        if (mode == MR102 && st->old_T0 > L_SUBFR + 5) pit_sharp = shr(pit_sharp, 2);
    }

    // the sharpening for the next subframe follows the decoded pitch gain;
    // MR475 keeps it over each subframe pair
    if (mode != MR475 || w->even_subfr == 0) st->sharp = gain_pit > SHARPMAX ? SHARPMAX : gain_pit;

    w->gain_pit = gain_pit;
    w->gain_code = gain_code;
    w->pit_sharp = shl(pit_sharp, 1);
}
