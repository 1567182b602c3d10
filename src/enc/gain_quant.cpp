// Gain quantisation and filter-memory update, the last stage of a subframe.
//
// The pitch and code gains are quantised per mode: MR475 jointly for a pair
// of subframes with a 256-entry table, MR122 scalar for the code gain (its
// pitch gain was quantised with the lag), MR795 scalar with a gain adaptor
// balancing pitch and code contributions, the other modes jointly with one
// table row.  The code gain is always relative to a moving-average
// prediction from past quantised energies.  Then the excitation is built,
// the synthesis, error and weighting filter memories, the sharpening gain and
// the pitch-gain history are updated, and after the last subframe the
// parameters are turned into bits.

#include "enc/gain_vq.h"
#include "enc/subframe.h"

#include "basic_op/ext_op.h"
#include "lpc/tables.h"
#include "vamrnb_dsp.h"

namespace vamrnb {
namespace {

using namespace gain_vq;

constexpr Word16 SHARP_MAX = 13017;   // sharpening ceiling, Q14
constexpr int NB_QUA_CODE = 32;
constexpr int VQ_ROWS_MR475 = 256;

// Bounds of the MR475 unquantised predictor's error energies.
constexpr Word16 MIN_QUA_ENER = -5443;
constexpr Word16 MIN_QUA_ENER_MR122 = -32768;
constexpr Word16 MAX_QUA_ENER = 3037;
constexpr Word16 MAX_QUA_ENER_MR122 = 18284;

// Gain adaptor thresholds on the LTP coding gain (Q13).
constexpr Word16 LTP_GAIN_THR1 = 2721;
constexpr Word16 LTP_GAIN_THR2 = 5443;

inline Word32 mac_32_16(Word32 L, Word16 hi, Word16 lo, Word16 n) {
    L = l_mac(L, hi, n);
    return l_mac(L, mult(lo, n), 1);
}

inline Word32 mac_32(Word32 L, Word16 hi1, Word16 lo1, Word16 hi2, Word16 lo2) {
    L = l_mac(L, hi1, hi2);
    L = l_mac(L, mult(hi1, lo2), 1);
    return l_mac(L, mult(lo1, hi2), 1);
}

inline Word32 dot(const Word16 *x, const Word16 *y, Word32 init = 0) {
    return vamrnb_inner_product(x, y, L_SUBFR, init);
}

void predict(const gain_pred_mem &p, int32_t mode, const Word16 *code, Word16 *exp_gcode0,
             Word16 *frac_gcode0, Word16 *exp_en = nullptr, Word16 *frac_en = nullptr) {
    vamrnb_gc_pred(p.past_qua_en, p.past_qua_en_MR122, mode, code, exp_gcode0, frac_gcode0,
                   exp_en, frac_en);
}

void pred_update(gain_pred_mem &p, Word16 qua_ener_MR122, Word16 qua_ener) {
    vamrnb_gc_pred_update(qua_ener_MR122, qua_ener, p.past_qua_en, p.past_qua_en_MR122);
}

// Predicted code gain as a normalised Q14 mantissa.
inline Word16 gcode0_q14(Word16 frac_gcode0) {
    return extract_l(vamrnb_pow2(14, frac_gcode0));
}

// <xn, xn> as fraction and exponent.
void calc_target_energy(const Word16 *xn, Word16 *en_exp, Word16 *en_frac) {
    const Word32 s = vamrnb_energy(xn, L_SUBFR, 0);
    const Word16 exp = norm_l(s);
    *en_frac = extract_h(l_shl(s, exp));
    *en_exp = sub(16, exp);
}

// Energies of the unfiltered signals (LP residual, adaptive vector, their
// products with the code vector and the LTP residual) and the LTP coding
// gain log2(residual energy / LTP residual energy) in Q13.
void calc_unfilt_energies(const Word16 *res, const Word16 *exc, const Word16 *code,
                          Word16 gain_pit, Word16 *frac_en, Word16 *exp_en, Word16 *ltpg) {
    Word32 s = dot(res, res);
    if (s < 400) {
        frac_en[0] = 0;
        exp_en[0] = -15;
    } else {
        const Word16 e = norm_l(s);
        frac_en[0] = extract_h(l_shl(s, e));
        exp_en[0] = sub(15, e);
    }

    s = dot(exc, exc);
    Word16 e = norm_l(s);
    frac_en[1] = extract_h(l_shl(s, e));
    exp_en[1] = sub(15, e);

    s = dot(exc, code);
    e = norm_l(s);
    frac_en[2] = extract_h(l_shl(s, e));
    exp_en[2] = sub(16 - 14, e);

    s = 0;
    for (int i = 0; i < L_SUBFR; ++i) {
        const Word16 t = sub(res[i], round16(l_shl(l_mult(exc[i], gain_pit), 1)));
        s = l_mac(s, t, t);
    }
    e = norm_l(s);
    const Word16 ltp_res_en = extract_h(l_shl(s, e));
    e = sub(15, e);
    frac_en[3] = ltp_res_en;
    exp_en[3] = e;

    if (ltp_res_en > 0 && frac_en[0] != 0) {
        const Word16 pred_gain = div_s(shr(frac_en[0], 1), ltp_res_en);
        e = sub(e, exp_en[0]);
        Word32 L = l_shr(l_deposit_h(pred_gain), add(e, 3));
        Word16 ltpg_exp, ltpg_frac;
        vamrnb_log2(L, &ltpg_exp, &ltpg_frac);
        L = l_comp(sub(ltpg_exp, 27), ltpg_frac);
        *ltpg = round16(l_shl(L, 13));
    } else {
        *ltpg = 0;
    }
}

// MR122 code gain <xn2, y2> / <y2, y2> in Q1.
Word16 g_code(const Word16 *xn2, const Word16 *y2) {
    Word16 y2_half[L_SUBFR];
    for (int i = 0; i < L_SUBFR; ++i) y2_half[i] = shr(y2[i], 1);
    Word32 s = dot(xn2, y2_half, 1);
    const Word16 exp_xy = norm_l(s);
    Word16 xy = extract_h(l_shl(s, exp_xy));
    if (xy <= 0) return 0;

    s = dot(y2_half, y2_half);
    const Word16 exp_yy = norm_l(s);
    const Word16 yy = extract_h(l_shl(s, exp_yy));

    xy = shr(xy, 1);
    const Word16 gain = div_s(xy, yy);
    const Word16 i = sub(add(exp_xy, 5), exp_yy);
    return shl(shr(gain, i), 1);
}

// Scalar code-gain quantiser (MR122 and the first pass of MR795).
Word16 q_gain_code(int32_t mode, Word16 exp_gcode0, Word16 frac_gcode0, Word16 *gain,
                   Word16 *qua_ener_MR122, Word16 *qua_ener) {
    const int16_t *tbl = vamrnb_tbl_qua_gain_code;
    const bool mr122 = mode == MR122;
    Word16 gcode0 = extract_l(vamrnb_pow2(exp_gcode0, frac_gcode0));
    gcode0 = shl(gcode0, mr122 ? 4 : 5);
    const Word16 target = mr122 ? shr(*gain, 1) : *gain;

    Word16 err_min = abs_s(sub(target, mult(gcode0, tbl[0])));
    Word16 index = 0;
    for (int i = 1; i < NB_QUA_CODE; ++i) {
        const Word16 err = abs_s(sub(target, mult(gcode0, tbl[3 * i])));
        if (err < err_min) {
            err_min = err;
            index = static_cast<Word16>(i);
        }
    }
    const int16_t *row = tbl + 3 * index;
    *gain = mr122 ? shl(mult(gcode0, row[0]), 1) : mult(gcode0, row[0]);
    *qua_ener_MR122 = row[1];
    *qua_ener = row[2];
    return index;
}

// Scales the five error-energy coefficients to a common exponent (the
// largest of exp_max, plus one) in double precision.
void scale_coeffs(const Word16 *frac, const Word16 *exp_max, Word16 e_max, int n, Word16 *hi,
                  Word16 *lo) {
    for (int i = 0; i < n; ++i) {
        const Word32 L = l_shr(l_deposit_h(frac[i]), sub(e_max, exp_max[i]));
        l_extract(L, &hi[i], &lo[i]);
    }
}

// Exponents of the five error terms of one subframe for a code-gain
// scaling exponent exp_code.
void term_exponents(const Word16 *exp_coeff, Word16 exp_code, Word16 *exp_max) {
    exp_max[0] = sub(exp_coeff[0], 13);
    exp_max[1] = sub(exp_coeff[1], 14);
    exp_max[2] = add(exp_coeff[2], add(15, shl(exp_code, 1)));
    exp_max[3] = add(exp_coeff[3], exp_code);
    exp_max[4] = add(exp_coeff[4], add(1, exp_code));
}

Word16 max_plus_one(const Word16 *v, int n) {
    Word16 m = v[0];
    for (int i = 1; i < n; ++i) {
        if (v[i] > m) m = v[i];
    }
    return add(m, 1);
}

// Joint pitch/code gain VQ of MR515, MR59, MR67, MR74 and MR102.
Word16 qua_gain(int32_t mode, Word16 exp_gcode0, Word16 frac_gcode0, const Word16 *frac_coeff,
                const Word16 *exp_coeff, Word16 gp_limit, Word16 *gain_pit, Word16 *gain_cod,
                Word16 *qua_ener_MR122, Word16 *qua_ener) {
    static const int16_t *const tables[4] = {vamrnb_tbl_gain_highrates, vamrnb_tbl_gain_highrates,
                                             vamrnb_tbl_gain_lowrates, vamrnb_tbl_gain_highrates};
    static constexpr int rows[4] = {128, 128, 64, 128};
    const int32_t sel = mode - MR67;
    const int16_t *tbl = (sel >= 0 && sel < 4) ? tables[sel] : vamrnb_tbl_gain_lowrates;
    const int n_rows = (sel >= 0 && sel < 4) ? rows[sel] : 64;

    const Word16 gcode0 = gcode0_q14(frac_gcode0);
    Word16 exp_max[5], coeff[5], coeff_lo[5];
    term_exponents(exp_coeff, sub(exp_gcode0, 11), exp_max);
    scale_coeffs(frac_coeff, exp_max, max_plus_one(exp_max, 5), 5, coeff, coeff_lo);

    Word32 dist_min = MAX_32;
    Word16 index = 0;
    static const gain_bounds bounds[2] = {table_bounds(vamrnb_tbl_gain_highrates, 128, 0, 1),
                                          table_bounds(vamrnb_tbl_gain_lowrates, 64, 0, 1)};
    int64_t g_max[5];
    gain_product_bounds(bounds[n_rows == 128 ? 0 : 1], gcode0, g_max);
    const bool plain = terms_fit(coeff, g_max, 5);
    if (plain) {
        // As in the MR475 search: all scores, then the first smallest.
        int32_t score[128];
        for (int i = 0; i < n_rows; ++i) {
            const int16_t *row = tbl + 4 * i;
            const int32_t L = row_score(coeff, coeff_lo, row[0], (row[1] * gcode0) >> 15);
            score[i] = row[0] > gp_limit ? MAX_32 : L;
        }
        for (int i = 0; i < n_rows; ++i) {
            if (score[i] < dist_min) {
                dist_min = score[i];
                index = static_cast<Word16>(i);
            }
        }
    }
    for (int i = 0; !plain && i < n_rows; ++i) {
        const int16_t *row = tbl + 4 * i;
        const Word16 g_pitch = row[0];
        if (g_pitch > gp_limit) continue;
        const Word16 g_code = mult(row[1], gcode0);
        const Word16 g2_pitch = mult(g_pitch, g_pitch);
        const Word16 g2_code = mult(g_code, g_code);
        const Word16 g_pit_cod = mult(g_code, g_pitch);
        Word32 L = mpy_32_16(coeff[0], coeff_lo[0], g2_pitch);
        L = l_add(L, mpy_32_16(coeff[1], coeff_lo[1], g_pitch));
        L = l_add(L, mpy_32_16(coeff[2], coeff_lo[2], g2_code));
        L = l_add(L, mpy_32_16(coeff[3], coeff_lo[3], g_code));
        L = l_add(L, mpy_32_16(coeff[4], coeff_lo[4], g_pit_cod));
        if (L < dist_min) {
            dist_min = L;
            index = static_cast<Word16>(i);
        }
    }

    const int16_t *row = tbl + 4 * index;
    *gain_pit = row[0];
    *qua_ener_MR122 = row[2];
    *qua_ener = row[3];
    *gain_cod = extract_h(l_shr(l_mult(row[1], gcode0), sub(10, exp_gcode0)));
    return index;
}

// MR475, even subframe: feeds the optimum (unquantised) code gain into the
// auxiliary predictor, bounded to the quantiser's range.
void mr475_update_unq_pred(gain_pred_mem &pred, Word16 exp_gcode0, Word16 frac_gcode0,
                           Word16 cod_gain_exp, Word16 cod_gain_frac) {
    Word16 qua_ener, qua_ener_MR122;
    if (cod_gain_frac <= 0) {
        qua_ener = MIN_QUA_ENER;
        qua_ener_MR122 = MIN_QUA_ENER_MR122;
    } else {
        frac_gcode0 = gcode0_q14(frac_gcode0);
        if (cod_gain_frac >= frac_gcode0) {
            cod_gain_frac = shr(cod_gain_frac, 1);
            cod_gain_exp = add(cod_gain_exp, 1);
        }
        Word16 frac = div_s(cod_gain_frac, frac_gcode0);
        const Word16 tmp = sub(sub(cod_gain_exp, exp_gcode0), 1);
        Word16 exp;
        vamrnb_log2(l_deposit_l(frac), &exp, &frac);
        exp = add(exp, tmp);

        qua_ener_MR122 = add(shr_r(frac, 5), shl(exp, 10));
        if (qua_ener_MR122 < MIN_QUA_ENER_MR122) {
            qua_ener = MIN_QUA_ENER;
            qua_ener_MR122 = MIN_QUA_ENER_MR122;
        } else if (qua_ener_MR122 > MAX_QUA_ENER_MR122) {
            qua_ener = MAX_QUA_ENER;
            qua_ener_MR122 = MAX_QUA_ENER_MR122;
        } else {
            qua_ener = round16(l_shl(mpy_32_16(exp, frac, 24660), 13));
        }
    }
    pred_update(pred, qua_ener_MR122, qua_ener);
}

// MR475, odd subframe: joint search of both subframes' gains.
Word16 mr475_gain_quant(subfr_state &ss, const Word16 *sf1_code, Word16 sf1_exp_gcode0,
                        Word16 sf1_frac_gcode0, const Word16 *sf1_exp_coeff,
                        const Word16 *sf1_frac_coeff, Word16 sf1_exp_target_en,
                        Word16 sf1_frac_target_en, Word16 gp_limit, Word16 *sf0_gain_pit,
                        Word16 *sf0_gain_cod, Word16 *sf1_gain_pit, Word16 *sf1_gain_cod) {
    Word16 sf0_gcode0 = gcode0_q14(ss.sf0_frac_gcode0);
    Word16 sf1_gcode0 = gcode0_q14(sf1_frac_gcode0);

    Word16 exp_max[10], coeff[10], coeff_lo[10];
    term_exponents(ss.sf0_exp_coeff, sub(ss.sf0_exp_gcode0, 11), exp_max);
    term_exponents(sf1_exp_coeff, sub(sf1_exp_gcode0, 11), exp_max + 5);

    // Weight the first subframe's error up or down when the target energies
    // differ a lot.
    Word16 sf0_frac_target_en = ss.sf0_frac_target_en;
    const Word16 d = static_cast<Word16>(ss.sf0_exp_target_en - sf1_exp_target_en);
    if (d > 0) {
        sf1_frac_target_en = shr(sf1_frac_target_en, d);
    } else {
        sf0_frac_target_en = shl(sf0_frac_target_en, d);
    }
    Word16 adj = 0;
    if (shr_r(sf1_frac_target_en, 1) > sf0_frac_target_en) {
        adj = 1;
    } else if (shr(add(sf0_frac_target_en, 3), 2) > sf1_frac_target_en) {
        adj = -1;
    }
    for (int i = 0; i < 5; ++i) exp_max[i] = add(exp_max[i], adj);

    const Word16 e = max_plus_one(exp_max, 10);
    scale_coeffs(ss.sf0_frac_coeff, exp_max, e, 5, coeff, coeff_lo);
    scale_coeffs(sf1_frac_coeff, exp_max + 5, e, 5, coeff + 5, coeff_lo + 5);

    Word32 dist_min = MAX_32;
    Word16 index = 0;
    const int16_t *tbl = vamrnb_tb1_gain_mr475;
    static const gain_bounds b0 = table_bounds(tbl, VQ_ROWS_MR475, 0, 1);
    static const gain_bounds b1 = table_bounds(tbl, VQ_ROWS_MR475, 2, 3);
    int64_t g_max[10];
    gain_product_bounds(b0, sf0_gcode0, g_max);
    gain_product_bounds(b1, sf1_gcode0, g_max + 5);
    const bool plain = terms_fit(coeff, g_max, 10);
    if (plain) {
        // Every row's score first (a loop the compiler vectorises); rows
        // over the limit score MAX_32, which never wins.
        int32_t score[VQ_ROWS_MR475];
        for (int i = 0; i < VQ_ROWS_MR475; ++i) {
            const int16_t *row = tbl + 4 * i;
            const int32_t L =
                row_score(coeff, coeff_lo, row[0], (row[1] * sf0_gcode0) >> 15) +
                row_score(coeff + 5, coeff_lo + 5, row[2], (row[3] * sf1_gcode0) >> 15);
            score[i] = (row[0] > gp_limit || row[2] > gp_limit) ? MAX_32 : L;
        }
        for (int i = 0; i < VQ_ROWS_MR475; ++i) {
            if (score[i] < dist_min) {
                dist_min = score[i];
                index = static_cast<Word16>(i);
            }
        }
    }
    for (int i = 0; !plain && i < VQ_ROWS_MR475; ++i) {
        const int16_t *row = tbl + 4 * i;
        // Rows whose pitch gain exceeds the limit in either subframe are out.
        if (row[0] > gp_limit || row[2] > gp_limit) continue;
        Word16 g_pitch = row[0];
        Word16 g_code = mult(row[1], sf0_gcode0);
        Word16 g2_pitch = mult(g_pitch, g_pitch);
        Word16 g2_code = mult(g_code, g_code);
        Word16 g_pit_cod = mult(g_code, g_pitch);
        Word32 L = mpy_32_16(coeff[0], coeff_lo[0], g2_pitch);
        L = mac_32_16(L, coeff[1], coeff_lo[1], g_pitch);
        L = mac_32_16(L, coeff[2], coeff_lo[2], g2_code);
        L = mac_32_16(L, coeff[3], coeff_lo[3], g_code);
        L = mac_32_16(L, coeff[4], coeff_lo[4], g_pit_cod);

        g_pitch = row[2];
        g_code = mult(row[3], sf1_gcode0);
        g2_pitch = mult(g_pitch, g_pitch);
        g2_code = mult(g_code, g_code);
        g_pit_cod = mult(g_code, g_pitch);
        L = mac_32_16(L, coeff[5], coeff_lo[5], g2_pitch);
        L = mac_32_16(L, coeff[6], coeff_lo[6], g_pitch);
        L = mac_32_16(L, coeff[7], coeff_lo[7], g2_code);
        L = mac_32_16(L, coeff[8], coeff_lo[8], g_code);
        L = mac_32_16(L, coeff[9], coeff_lo[9], g_pit_cod);
        if (L < dist_min) {
            dist_min = L;
            index = static_cast<Word16>(i);
        }
    }

    // The first half of the row with the stored prediction, then the second
    // half with a prediction from the now quantised first subframe.
    const int16_t *row = tbl + 4 * index;
    mr475_quant_store_results(&ss.pred, row, sf0_gcode0, ss.sf0_exp_gcode0, sf0_gain_pit,
                              sf0_gain_cod);
    predict(ss.pred, MR475, sf1_code, &sf1_exp_gcode0, &sf1_frac_gcode0);
    sf1_gcode0 = gcode0_q14(sf1_frac_gcode0);
    mr475_quant_store_results(&ss.pred, row + 2, sf1_gcode0, sf1_exp_gcode0, sf1_gain_pit,
                              sf1_gain_cod);
    return index;
}

// MR795 first pass: code gain for each of the three pitch gain candidates,
// minimising the weighted error.
void mr795_gain_code_quant3(Word16 exp_gcode0, Word16 gcode0, const Word16 *g_pitch_cand,
                            const Word16 *g_pitch_cind, const Word16 *frac_coeff,
                            const Word16 *exp_coeff, Word16 *gain_pit, Word16 *gain_pit_ind,
                            Word16 *gain_cod, Word16 *gain_cod_ind, Word16 *qua_ener_MR122,
                            Word16 *qua_ener) {
    Word16 exp_max[5], coeff[5], coeff_lo[5];
    term_exponents(exp_coeff, sub(exp_gcode0, 10), exp_max);
    scale_coeffs(frac_coeff, exp_max, max_plus_one(exp_max, 5), 5, coeff, coeff_lo);

    const int16_t *tbl = vamrnb_tbl_qua_gain_code;
    Word32 dist_min = MAX_32;
    int cod_ind = 0, pit_ind = 0;
    for (int j = 0; j < 3; ++j) {
        const Word16 g_pitch = g_pitch_cand[j];
        const Word16 g2_pitch = mult(g_pitch, g_pitch);
        Word32 L0 = mpy_32_16(coeff[0], coeff_lo[0], g2_pitch);
        L0 = mac_32_16(L0, coeff[1], coeff_lo[1], g_pitch);
        for (int i = 0; i < NB_QUA_CODE; ++i) {
            const Word16 g_code = mult(tbl[3 * i], gcode0);
            Word16 g2_code_h, g2_code_l, g_pit_cod_h, g_pit_cod_l;
            l_extract(l_mult(g_code, g_code), &g2_code_h, &g2_code_l);
            l_extract(l_mult(g_code, g_pitch), &g_pit_cod_h, &g_pit_cod_l);
            Word32 L = mac_32(L0, coeff[2], coeff_lo[2], g2_code_h, g2_code_l);
            L = mac_32_16(L, coeff[3], coeff_lo[3], g_code);
            L = mac_32(L, coeff[4], coeff_lo[4], g_pit_cod_h, g_pit_cod_l);
            if (L < dist_min) {
                dist_min = L;
                cod_ind = i;
                pit_ind = j;
            }
        }
    }

    const int16_t *row = tbl + 3 * cod_ind;
    *qua_ener_MR122 = row[1];
    *qua_ener = row[2];
    *gain_cod = extract_h(l_shr(l_mult(row[0], gcode0), sub(9, exp_gcode0)));
    *gain_cod_ind = static_cast<Word16>(cod_ind);
    *gain_pit = g_pitch_cand[pit_ind];
    *gain_pit_ind = g_pitch_cind[pit_ind];
}

// MR795 second pass: code gain minimising a mix of the waveform error and
// the error of the excitation energy, weighted by the adaptor's alpha.
Word16 mr795_gain_code_quant_mod(Word16 gain_pit, Word16 exp_gcode0, Word16 gcode0,
                                 const Word16 *frac_en, const Word16 *exp_en, Word16 alpha,
                                 Word16 gain_cod_unq, Word16 *gain_cod,
                                 Word16 *qua_ener_MR122, Word16 *qua_ener) {
    Word16 coeff[5], coeff_lo[5], exp_coeff[5];

    const Word16 gain_code = shl(*gain_cod, sub(10, exp_gcode0));
    const Word16 g2_pitch = mult(gain_pit, gain_pit);
    const Word16 one_alpha = add(sub(32767, alpha), 1);

    Word16 tmp = extract_h(l_shl(l_mult(alpha, frac_en[1]), 1));
    Word32 L_t1 = l_mult(tmp, g2_pitch);
    exp_coeff[1] = sub(exp_en[1], 15);

    tmp = extract_h(l_shl(l_mult(alpha, frac_en[2]), 1));
    coeff[2] = mult(tmp, gain_pit);
    exp_coeff[2] = add(exp_en[2], sub(exp_gcode0, 10));

    coeff[3] = extract_h(l_shl(l_mult(alpha, frac_en[3]), 1));
    exp_coeff[3] = add(exp_en[3], sub(shl(exp_gcode0, 1), 7));

    coeff[4] = mult(one_alpha, frac_en[3]);
    exp_coeff[4] = add(exp_coeff[3], 1);

    Word32 L_t0 = l_mult(alpha, frac_en[0]);
    Word16 exp;
    vamrnb_isqrt_n(&L_t0, &exp);
    exp = add(exp, 47);
    exp_coeff[0] = sub(exp_en[0], exp);

    Word16 e_max = add(exp_coeff[0], 31);
    for (int i = 1; i <= 4; ++i) {
        if (exp_coeff[i] > e_max) e_max = exp_coeff[i];
    }

    L_t1 = l_shr(L_t1, sub(e_max, exp_coeff[1]));
    for (int i = 2; i <= 4; ++i) {
        const Word32 L = l_shr(l_deposit_h(coeff[i]), sub(e_max, exp_coeff[i]));
        l_extract(L, &coeff[i], &coeff_lo[i]);
    }
    tmp = sub(sub(e_max, 31), exp_coeff[0]);
    L_t0 = l_shr(L_t0, shr(tmp, 1));
    if ((tmp & 1) != 0) {
        // Odd exponent difference: one more factor 1/sqrt(2).
        l_extract(L_t0, &coeff[0], &coeff_lo[0]);
        L_t0 = mpy_32_16(coeff[0], coeff_lo[0], 23170);
    }

    const int16_t *tbl = vamrnb_tbl_qua_gain_code;
    Word32 dist_min = MAX_32;
    Word16 index = 0;
    for (int i = 0; i < NB_QUA_CODE; ++i) {
        const Word16 g_code = mult(tbl[3 * i], gcode0);
        // Only gains below twice the first-pass gain are considered.
        if (g_code >= gain_code) break;

        Word16 g2_code_h, g2_code_l, d2_code_h, d2_code_l;
        l_extract(l_mult(g_code, g_code), &g2_code_h, &g2_code_l);
        tmp = sub(g_code, gain_cod_unq);
        l_extract(l_mult(tmp, tmp), &d2_code_h, &d2_code_l);

        Word32 L = mac_32_16(L_t1, coeff[2], coeff_lo[2], g_code);
        L = mac_32(L, coeff[3], coeff_lo[3], g2_code_h, g2_code_l);
        vamrnb_isqrt_n(&L, &exp);
        L = l_shr(L, shr(exp, 1));

        tmp = round16(l_sub(L, L_t0));
        L = l_mult(tmp, tmp);
        L = mac_32(L, coeff[4], coeff_lo[4], d2_code_h, d2_code_l);
        if (L < dist_min) {
            dist_min = L;
            index = static_cast<Word16>(i);
        }
    }

    const int16_t *row = tbl + 3 * index;
    *qua_ener_MR122 = row[1];
    *qua_ener = row[2];
    *gain_cod = extract_h(l_shr(l_mult(row[0], gcode0), sub(9, exp_gcode0)));
    return index;
}

// MR795 adaptation factor alpha (Q15) from the LTP coding gain and onsets;
// updates the adaptor memory.
Word16 gain_adapt(subfr_state &ss, Word16 ltpg, Word16 gain_cod) {
    Word16 adapt;
    if (ltpg <= LTP_GAIN_THR1) {
        adapt = 0;
    } else if (ltpg <= LTP_GAIN_THR2) {
        adapt = 1;
    } else {
        adapt = 2;
    }

    // Onset: the code gain more than doubled and is above 100.
    const Word16 half = shr_r(gain_cod, 1);
    if (half > ss.prev_gc && gain_cod > 200) {
        ss.onset = 8;
    } else if (ss.onset != 0) {
        ss.onset = sub(ss.onset, 1);
    }
    if (ss.onset != 0 && adapt < 2) adapt = add(adapt, 1);

    ss.ltpg_mem[0] = ltpg;
    Word16 filt = vamrnb_gmed_n(ss.ltpg_mem, 5);

    Word16 result;
    if (adapt == 0) {
        if (filt > 5443) {
            result = 0;
        } else if (filt < 0) {
            result = 16384;
        } else {
            filt = shl(filt, 2);
            result = sub(16384, mult(24660, filt));
        }
    } else {
        result = 0;
    }
    if (ss.prev_alpha == 0) result = shr(result, 1);

    ss.prev_alpha = result;
    ss.prev_gc = gain_cod;
    for (int i = LTPG_MEM - 1; i > 0; --i) ss.ltpg_mem[i] = ss.ltpg_mem[i - 1];
    return result;
}

// Excitation of the subframe, local synthesis and the filter memories of
// the next subframe; the sharpening gain follows the pitch gain.
void subframe_post_proc(enc_state *st, int32_t mode, int32_t i_subfr, Word16 gain_pit,
                        Word16 gain_code, const Word16 *Aq, const Word16 *xn,
                        const Word16 *code, const Word16 *y1, const Word16 *y2,
                        Word16 *mem_syn, Word16 *mem_w0, Word16 *sharp) {
    Word16 temp_shift, k_shift, pitch_fac;
    if (mode != MR122) {
        temp_shift = 1;
        k_shift = 2;
        pitch_fac = gain_pit;
    } else {
        temp_shift = 2;
        k_shift = 4;
        pitch_fac = shr(gain_pit, 1);
    }
    *sharp = gain_pit > SHARP_MAX ? SHARP_MAX : gain_pit;

    Word16 *exc = enc_exc(st) + i_subfr;
    for (int i = 0; i < L_SUBFR; ++i) {
        Word32 L = l_mult(exc[i], pitch_fac);
        L = l_mac(L, code[i], gain_code);
        exc[i] = round16(l_shl(L, temp_shift));
    }

    Word16 synth[L_SUBFR];
    vamrnb_syn_filt(Aq, exc, mem_syn, synth);
    for (int i = 0; i < M; ++i) mem_syn[i] = synth[L_SUBFR - M + i];

    const Word16 *speech = enc_speech(st) + i_subfr;
    Word16 *mem_err = st->sub.mem_err;
    for (int i = L_SUBFR - M, j = 0; i < L_SUBFR; ++i, ++j) {
        mem_err[j] = sub(speech[i], synth[i]);
        const Word16 t = extract_h(l_shl(l_mult(y1[i], gain_pit), 1));
        const Word16 k = extract_h(l_shl(l_mult(y2[i], gain_code), k_shift));
        mem_w0[j] = sub(xn[i], add(t, k));
    }
}

}  // namespace

void calc_filt_energies(int32_t mode, const Word16 *xn, const Word16 *xn2, const Word16 *y1,
                        const Word16 *Y2, const Word16 *g_coeff, Word16 *frac_coeff,
                        Word16 *exp_coeff, Word16 *cod_gain_frac, Word16 *cod_gain_exp) {
    const bool opt_gain = mode == MR795 || mode == MR475;
    const Word32 init = opt_gain ? 0 : 1;
    Word16 y2[L_SUBFR];
    for (int i = 0; i < L_SUBFR; ++i) y2[i] = shr(Y2[i], 3);

    frac_coeff[0] = g_coeff[0];
    exp_coeff[0] = g_coeff[1];
    frac_coeff[1] = negate(g_coeff[2]);
    exp_coeff[1] = add(g_coeff[3], 1);

    Word32 s = vamrnb_energy(y2, L_SUBFR, init);
    Word16 e = norm_l(s);
    frac_coeff[2] = extract_h(l_shl(s, e));
    exp_coeff[2] = sub(15 - 18, e);

    s = vamrnb_inner_product(xn, y2, L_SUBFR, init);
    e = norm_l(s);
    frac_coeff[3] = negate(extract_h(l_shl(s, e)));
    exp_coeff[3] = sub(15 - 9 + 1, e);

    s = vamrnb_inner_product(y1, y2, L_SUBFR, init);
    e = norm_l(s);
    frac_coeff[4] = extract_h(l_shl(s, e));
    exp_coeff[4] = sub(15 - 9 + 1, e);

    if (opt_gain) {
        // Optimum code gain <xn2, y2> / <y2, y2>.
        s = vamrnb_inner_product(xn2, y2, L_SUBFR, init);
        e = norm_l(s);
        const Word16 frac = extract_h(l_shl(s, e));
        e = sub(15 - 9, e);
        if (frac <= 0) {
            *cod_gain_frac = 0;
            *cod_gain_exp = 0;
        } else {
            *cod_gain_frac = div_s(shr(frac, 1), frac_coeff[2]);
            *cod_gain_exp = sub(sub(e, exp_coeff[2]), 14);
        }
    }
}

void mr475_quant_store_results(gain_pred_mem *pred, const Word16 *row, Word16 gcode0,
                               Word16 exp_gcode0, Word16 *gain_pit, Word16 *gain_cod) {
    *gain_pit = row[0];
    const Word16 g_code = row[1];
    *gain_cod = extract_h(l_shr(l_mult(g_code, gcode0), sub(10, exp_gcode0)));

    Word16 exp, frac;
    vamrnb_log2(l_deposit_l(g_code), &exp, &frac);
    exp = sub(exp, 12);
    const Word16 qua_ener_MR122 = add(shr_r(frac, 5), shl(exp, 10));
    const Word16 qua_ener = round16(l_shl(mpy_32_16(exp, frac, 24660), 13));
    pred_update(*pred, qua_ener_MR122, qua_ener);
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnbe_filt_update(enc_state *st, enc_frame *fr, int32_t i_subfr) {
    subfr_state &ss = st->sub;
    subfr_frame &sf = fr->sub;
    const int32_t mode = fr->used_mode;
    const int32_t subfr_nr = i_subfr / L_SUBFR;
    const bool even = (subfr_nr & 1) == 0;
    Word16 *exc = enc_exc(st) + i_subfr;
    const Word16 *Aq = fr->Aq_t + subfr_nr * MP1;

    Word16 gain_pit = sf.gain_pit;
    Word16 gain_code = 0;
    Word16 exp_gcode0 = 0, frac_gcode0 = 0, exp_en = 0, frac_en = 0;
    Word16 frac_coeff[5], exp_coeff[5], cod_gain_frac, cod_gain_exp;

    if (mode == MR475) {
        if (even) {
            // Keep a parameter slot for the pair's index, predict with the
            // auxiliary predictor and store this subframe's energies.
            sf.gain_idx_pos = fr->prm_pos++;
            ss.pred_unq = ss.pred;
            predict(ss.pred_unq, MR475, sf.code, &ss.sf0_exp_gcode0, &ss.sf0_frac_gcode0);
            calc_filt_energies(MR475, sf.xn, sf.xn2, sf.y1, sf.y2, sf.g_coeff, ss.sf0_frac_coeff,
                               ss.sf0_exp_coeff, &cod_gain_frac, &cod_gain_exp);
            gain_code = shl(cod_gain_frac, add(cod_gain_exp, 1));
            calc_target_energy(sf.xn, &ss.sf0_exp_target_en, &ss.sf0_frac_target_en);
            mr475_update_unq_pred(ss.pred_unq, ss.sf0_exp_gcode0, ss.sf0_frac_gcode0,
                                  cod_gain_exp, cod_gain_frac);
        } else {
            predict(ss.pred_unq, MR475, sf.code, &exp_gcode0, &frac_gcode0);
            calc_filt_energies(MR475, sf.xn, sf.xn2, sf.y1, sf.y2, sf.g_coeff, frac_coeff,
                               exp_coeff, &cod_gain_frac, &cod_gain_exp);
            calc_target_energy(sf.xn, &exp_en, &frac_en);
            fr->prm[sf.gain_idx_pos] = mr475_gain_quant(
                ss, sf.code, exp_gcode0, frac_gcode0, exp_coeff, frac_coeff, exp_en, frac_en,
                sf.gp_limit, &sf.gain_pit_sf0, &sf.gain_code_sf0, &gain_pit, &gain_code);
        }
    } else {
        Word16 qua_ener_MR122, qua_ener;
        predict(ss.pred, mode, sf.code, &exp_gcode0, &frac_gcode0, &exp_en, &frac_en);
        if (mode == MR122) {
            gain_code = g_code(sf.xn2, sf.y2);
            fr->prm[fr->prm_pos++] =
                q_gain_code(mode, exp_gcode0, frac_gcode0, &gain_code, &qua_ener_MR122, &qua_ener);
        } else {
            calc_filt_energies(mode, sf.xn, sf.xn2, sf.y1, sf.y2, sf.g_coeff, frac_coeff,
                               exp_coeff, &cod_gain_frac, &cod_gain_exp);
            if (mode == MR795) {
                Word16 cand[3], cind[3];
                Word16 pit_index = vamrnbe_qgain_pitch(MR795, sf.gp_limit, &gain_pit, cand, cind);
                const Word16 gcode0 = gcode0_q14(frac_gcode0);
                Word16 cod_index;
                mr795_gain_code_quant3(exp_gcode0, gcode0, cand, cind, frac_coeff, exp_coeff,
                                       &gain_pit, &pit_index, &gain_code, &cod_index,
                                       &qua_ener_MR122, &qua_ener);
                Word16 u_frac[4], u_exp[4], ltpg;
                calc_unfilt_energies(sf.res, exc, sf.code, gain_pit, u_frac, u_exp, &ltpg);
                const Word16 alpha = gain_adapt(ss, ltpg, gain_code);
                if (u_frac[0] != 0 && alpha > 0) {
                    // Code-vector energy as computed by the predictor.
                    u_frac[3] = frac_en;
                    u_exp[3] = exp_en;
                    const Word16 gain_cod_unq =
                        shl(cod_gain_frac, add(sub(cod_gain_exp, exp_gcode0), 10));
                    cod_index = mr795_gain_code_quant_mod(gain_pit, exp_gcode0, gcode0, u_frac,
                                                          u_exp, alpha, gain_cod_unq, &gain_code,
                                                          &qua_ener_MR122, &qua_ener);
                }
                fr->prm[fr->prm_pos++] = pit_index;
                fr->prm[fr->prm_pos++] = cod_index;
            } else {
                fr->prm[fr->prm_pos++] =
                    qua_gain(mode, exp_gcode0, frac_gcode0, frac_coeff, exp_coeff, sf.gp_limit,
                             &gain_pit, &gain_code, &qua_ener_MR122, &qua_ener);
            }
        }
        pred_update(ss.pred, qua_ener_MR122, qua_ener);
    }

    // Pitch-gain history of the clipping test.
    for (int i = 0; i < GP_HIST - 1; ++i) ss.gp[i] = ss.gp[i + 1];
    ss.gp[GP_HIST - 1] = shr(gain_pit, 3);

    if (mode != MR475) {
        subframe_post_proc(st, mode, i_subfr, gain_pit, gain_code, Aq, sf.xn, sf.code, sf.y1,
                           sf.y2, ss.mem_syn, ss.mem_w0, &ss.sharp);
    } else if (even) {
        // Provisional update with unquantised gains on the saved copies; the
        // odd subframe redoes this subframe once the pair is quantised.
        sf.i_subfr_sf0 = static_cast<Word16>(i_subfr);
        for (int i = 0; i < L_SUBFR; ++i) {
            sf.xn_sf0[i] = sf.xn[i];
            sf.y2_sf0[i] = sf.y2[i];
            sf.code_sf0[i] = sf.code[i];
        }
        sf.T0_sf0 = sf.T0;
        sf.T0_frac_sf0 = sf.T0_frac;
        subframe_post_proc(st, mode, i_subfr, gain_pit, gain_code, Aq, sf.xn, sf.code, sf.y1,
                           sf.y2, sf.mem_syn_save, sf.mem_w0_save, &ss.sharp);
        ss.sharp = sf.sharp_save;
    } else {
        // Redo the even subframe with its quantised gains from the saved
        // state, then this one.
        for (int i = 0; i < M; ++i) ss.mem_err[i] = sf.mem_err_save[i];
        Word16 *exc0 = enc_exc(st) + sf.i_subfr_sf0;
        vamrnb_pred_lt_3or6(sf.T0_sf0, sf.T0_frac_sf0, 1, exc0);
        vamrnbe_convolve(exc0, sf.h1_sf0, sf.y1);
        subframe_post_proc(st, mode, sf.i_subfr_sf0, sf.gain_pit_sf0, sf.gain_code_sf0,
                           Aq - MP1, sf.xn_sf0, sf.code_sf0, sf.y1, sf.y2_sf0, ss.mem_syn,
                           ss.mem_w0, &sf.sharp_save);

        // Recompute this subframe's target (and unsharpened h1) from the
        // corrected memories, rebuild its adaptive vector and update.
        vamrnbe_subfr_pre_proc(st, fr, subfr_nr, 0);
        vamrnb_pred_lt_3or6(sf.T0, sf.T0_frac, 1, exc);
        vamrnbe_convolve(exc, ss.hvec + L_SUBFR, sf.y1);
        subframe_post_proc(st, mode, i_subfr, gain_pit, gain_code, Aq, sf.xn, sf.code, sf.y1,
                           sf.y2, ss.mem_syn, ss.mem_w0, &ss.sharp);
    }

    if (i_subfr == L_FRAME - L_SUBFR) vamrnbe_prm2bits(fr->used_mode, fr->prm);
}
