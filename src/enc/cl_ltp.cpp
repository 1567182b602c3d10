// Subframe preparation and closed-loop pitch search of the encoder.
//
// vamrnbe_syn builds the subframe's weighted filters, the impulse response of
// the weighted synthesis filter, the LP residual and the target signal.
// vamrnbe_acb then searches the adaptive codebook: the integer lag with the
// largest normalised correlation in a small range around the open-loop lag
// (or around the previous subframe's lag), refined to 1/3 or 1/6 sample by
// interpolating the correlation, coded as an absolute or relative index.  It
// builds the adaptive vector, computes its gain, limits the gain when the LP
// filter is resonant and updates the targets for the codebook search.

#include "enc/subframe.h"

#include <utility>

#include "basic_op/ext_op.h"
#include "lpc/dsp.h"
#include "lpc/kernel_common.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr Word16 GP_CLIP = 15565;          // gain ceiling under resonance, Q14 (0.95)
constexpr Word16 GAIN_PIT_CEIL = 19661;    // pitch gain ceiling, Q14 (1.2)
constexpr Word16 GAIN_PIT_LOWRATE = 13926; // MR475/MR515 ceiling, Q14 (0.85)
constexpr int INTER_TAPS = 4;              // half-length of the correlation interpolator
constexpr int UP_SAMP = 6;                 // interpolator phases per sample
constexpr int NB_QUA_PITCH = 16;
constexpr int CORR_MAX = 40;               // lags searched incl. interpolation margin

// Per-mode search parameters, one row of nine per mode.
struct lag_search {
    Word16 max_frac_lag, flag3, first_frac, last_frac;
    Word16 delta_int_low, delta_int_range, delta_frc_low, delta_frc_range, pit_min;
};

lag_search search_params(int32_t mode) {
    const int16_t *r = tab::mode_dep_parm + 9 * mode;
    return {r[0], r[1], r[2], r[3], r[4], r[5], r[6], r[7], r[8]};
}

// Correlation interpolated at `frac` (1/3 units when flag3, else 1/6)
// around x[0].
Word16 interpol_3or6(const Word16 *x, Word16 frac, Word16 flag3) {
    if (flag3 != 0) frac = shl(frac, 1);
    int base = 0;
    if (frac < 0) {
        frac = add(frac, UP_SAMP);
        base = -1;
    }
    const int16_t *c1 = tab::inter_36_inter_6 + frac;
    const int16_t *c2 = tab::inter_36_inter_6 + (UP_SAMP - frac);
    Word32 s = 0;
    for (int i = 0, k = 0; i < INTER_TAPS; ++i, k += UP_SAMP) {
        s = l_mac(s, x[base - i], c1[k]);
        s = l_mac(s, x[base + 1 + i], c2[k]);
    }
    return round16(s);
}

// Fraction search from *frac to last_frac around *lag; corr_at_lag points at
// the lag's correlation.  The first strictly larger value wins; the result is
// folded back into the coded fraction range.
void search_frac(Word16 *lag, Word16 *frac, Word16 last_frac, const Word16 *corr_at_lag,
                 Word16 flag3) {
    Word16 best = interpol_3or6(corr_at_lag, *frac, flag3);
    for (Word16 i = add(*frac, 1); i <= last_frac; ++i) {
        const Word16 c = interpol_3or6(corr_at_lag, i, flag3);
        if (c > best) {
            best = c;
            *frac = i;
        }
    }
    if (flag3 == 0) {
        if (*frac == -3) {
            *frac = 3;
            *lag = sub(*lag, 1);
        }
    } else {
        if (*frac == -2) {
            *frac = 1;
            *lag = sub(*lag, 1);
        }
        if (*frac == 2) {
            *frac = -1;
            *lag = add(*lag, 1);
        }
    }
}

// Centre of the short relative range (4-bit lag coding): the previous lag
// pulled inside [t0_min + 5 ... t0_max - 4].
Word16 short_range_centre(Word16 T0_prev, Word16 t0_min, Word16 t0_max) {
    Word16 c = T0_prev;
    if (sub(sub(c, t0_min), 5) > 0) c = add(t0_min, 5);
    if (sub(sub(t0_max, c), 4) > 0) c = sub(t0_max, 4);
    return c;
}

// Closed-loop lag search of one subframe.  Returns the integer lag and
// writes the fraction, the resolution flag and the lag index.
Word16 pitch_fr(subfr_state *ss, int32_t mode, const Word16 T_op[2], const Word16 *exc,
                const Word16 *xn, const Word16 *h, int32_t i_subfr, Word16 *pit_frac,
                Word16 *resu3, Word16 *index) {
    const lag_search p = search_params(mode);
    Word16 frac = p.first_frac;
    Word16 last_frac = p.last_frac;
    Word16 t0_min, t0_max;

    // Subframes 0 and 2 search around the open-loop lag, except subframe 2
    // of MR475/MR515, which like 1 and 3 searches around the previous lag.
    Word16 relative = 1;
    const bool low_rate = mode == MR475 || mode == MR515;
    if (i_subfr == 0 || (i_subfr == 80 && !low_rate)) {
        relative = 0;
        get_range(T_op[i_subfr == 0 ? 0 : 1], p.delta_int_low, p.delta_int_range,
                  p.pit_min, PIT_MAX, &t0_min, &t0_max);
    } else {
        get_range(ss->T0_prev_subframe, p.delta_frc_low, p.delta_frc_range,
                  p.pit_min, PIT_MAX, &t0_min, &t0_max);
    }

    // Normalised correlation over the range widened by the interpolator.
    const Word16 t_min = sub(t0_min, INTER_TAPS);
    const Word16 t_max = add(t0_max, INTER_TAPS);
    Word16 corr[CORR_MAX];
    vamrnbe_norm_corr_filt(exc, xn, h, t_min, t_max, corr);
    const auto at = [&](Word16 lag) { return corr + (lag - t_min); };

    Word16 best = *at(t0_min);
    Word16 lag = t0_min;
    for (Word16 i = t0_min + 1; i <= t0_max; ++i) {
        if (*at(i) >= best) {
            best = *at(i);
            lag = i;
        }
    }

    const bool short_code = mode == MR475 || mode == MR515 || mode == MR59 || mode == MR67;
    if (relative == 0 && lag > p.max_frac_lag) {
        frac = 0;
    } else if (relative != 0 && short_code) {
        // 4-bit relative coding: fractions only next to the range centre.
        const Word16 c = short_range_centre(ss->T0_prev_subframe, t0_min, t0_max);
        if (lag == c || lag == sub(c, 1)) {
            search_frac(&lag, &frac, last_frac, at(lag), p.flag3);
        } else if (lag == sub(c, 2)) {
            frac = 0;
            search_frac(&lag, &frac, last_frac, at(lag), p.flag3);
        } else if (lag == add(c, 1)) {
            last_frac = 0;
            search_frac(&lag, &frac, last_frac, at(lag), p.flag3);
        } else {
            frac = 0;
        }
    } else {
        search_frac(&lag, &frac, last_frac, at(lag), p.flag3);
    }

    if (p.flag3 != 0) {
        *index = enc_lag3(lag, frac, ss->T0_prev_subframe, t0_min, t0_max, relative,
                          short_code ? 1 : 0);
    } else {
        *index = enc_lag6(lag, frac, t0_min, relative);
    }
    ss->T0_prev_subframe = lag;
    *resu3 = p.flag3;
    *pit_frac = frac;
    return lag;
}

// Sum of squares of one subframe, exact.
inline int64_t sum_squares(const Word16 *x) {
    int64_t e = 0;
    for (int j = 0; j < L_SUBFR; ++j) e += int32_t{x[j]} * x[j];
    return e;
}

// The saturating accumulation of 2*x[j]^2 from 0: every term is
// non-negative, so it is the exact sum clamped to the 32-bit maximum.
inline Word32 energy_from(int64_t sum_sq) {
    return sum_sq > (MAX_32 >> 1) ? MAX_32 : static_cast<Word32>(2 * sum_sq);
}

// One saturating multiply-accumulate that also reports saturation.
inline Word32 mac_flag(Word32 acc, Word16 a, Word16 b, bool &sat) {
    int64_t prod;
    if (a == MIN_16 && b == MIN_16) {
        sat = true;
        prod = MAX_32;
    } else {
        prod = 2 * int64_t{a} * b;
    }
    const int64_t r = int64_t{acc} + prod;
    if (r > MAX_32 || r < MIN_32) sat = true;
    return sat32(r);
}

// 1 + <a,b> normalised: rounded mantissa and exponent.  When the sum
// saturates it is formed again from the scaled-down operands (a_q, b_q) and
// the exponent is lowered by the q_bits they lost together.
void norm_dot(const Word16 *a, const Word16 *b, const Word16 *a_q, const Word16 *b_q, Word16 q_bits,
              Word16 *mant, Word16 *exp) {
    bool sat = false;
    Word32 s = 1;
    for (int i = 0; i < L_SUBFR; ++i) s = mac_flag(s, a[i], b[i], sat);
    if (sat) {
        s = 1;
        for (int i = 0; i < L_SUBFR; ++i) s = l_mac(s, a_q[i], b_q[i]);
    }
    *exp = norm_l(s);
    *mant = round16(l_shl(s, *exp));
    if (sat) *exp = sub(*exp, q_bits);
}

// Pitch gain <xn,y1>/<y1,y1> in Q14, limited to 0..1.2; g_coeff receives the
// normalised correlation terms for the gain quantisers.
Word16 g_pitch(int32_t mode, const Word16 *xn, const Word16 *y1, Word16 *g_coeff) {
    Word16 y1_q[L_SUBFR];
    for (int i = 0; i < L_SUBFR; ++i) y1_q[i] = shr(y1[i], 2);

    Word16 exp_yy, yy, exp_xy, xy;
    norm_dot(y1, y1, y1_q, y1_q, 4, &yy, &exp_yy);
    norm_dot(xn, y1, xn, y1_q, 2, &xy, &exp_xy);

    g_coeff[0] = yy;
    g_coeff[1] = sub(15, exp_yy);
    g_coeff[2] = xy;
    g_coeff[3] = sub(15, exp_xy);

    if (xy < 4) return 0;
    Word16 gain = div_s(shr(xy, 1), yy);
    gain = shr(gain, sub(exp_xy, exp_yy));
    if (gain > GAIN_PIT_CEIL) gain = GAIN_PIT_CEIL;
    if (mode == MR122) gain = static_cast<Word16>(gain & 0xfffc);
    return gain;
}

}  // namespace

// Search range [t0_min, t0_max] of width `range` starting `low` below T0,
// kept inside [pit_min, pit_max] without losing width.
void get_range(Word16 T0, Word16 low, Word16 range, Word16 pit_min, Word16 pit_max,
               Word16 *t0_min, Word16 *t0_max) {
    *t0_min = sub(T0, low);
    if (*t0_min < pit_min) *t0_min = pit_min;
    *t0_max = add(*t0_min, range);
    if (*t0_max > pit_max) {
        *t0_max = pit_max;
        *t0_min = sub(*t0_max, range);
    }
}

// Lag index at 1/3 resolution: 8 bits absolute, 5 (or 4 with flag4) relative.
Word16 enc_lag3(Word16 T0, Word16 T0_frac, Word16 T0_prev, Word16 t0_min, Word16 t0_max,
                Word16 relative, Word16 flag4) {
    if (relative == 0) {
        if (T0 <= 85) return add(sub(add(add(T0, T0), T0), 58), T0_frac);
        return add(T0, 112);
    }
    if (flag4 == 0) {
        Word16 i = sub(T0, t0_min);
        i = add(add(i, i), i);
        return add(add(i, 2), T0_frac);
    }
    const Word16 c = short_range_centre(T0_prev, t0_min, t0_max);
    const Word16 uplag = add(add(add(T0, T0), T0), T0_frac);
    Word16 i = sub(c, 2);
    const Word16 low3 = add(add(i, i), i);
    if (low3 >= uplag) return add(sub(T0, c), 5);
    i = add(c, 1);
    i = add(add(i, i), i);
    if (i > uplag) return add(sub(uplag, low3), 3);
    return add(sub(T0, c), 11);
}

// Lag index at 1/6 resolution: 9 bits absolute, 6 bits relative.
Word16 enc_lag6(Word16 T0, Word16 T0_frac, Word16 t0_min, Word16 relative) {
    if (relative == 0) {
        if (T0 <= 94) {
            const Word16 i = add(add(T0, T0), T0);
            return add(sub(add(i, i), 105), T0_frac);
        }
        return add(T0, 368);
    }
    Word16 i = sub(T0, t0_min);
    i = add(add(i, i), i);
    return add(add(add(i, i), 3), T0_frac);
}

// True when the gain together with the recent history would exceed the
// resonance ceiling.
bool check_gp_clipping(const Word16 gp[GP_HIST], Word16 gain) {
    Word16 sum = shr(gain, 3);
    for (int i = 0; i < GP_HIST; ++i) sum = add(sum, gp[i]);
    return sum > GP_CLIP;
}

// Pitch gain limits of one subframe: MR475/MR515 never above 0.85; a
// resonant LP filter (lsp_flag) with a history of high gains caps the gain
// at 0.95, in MR475/MR515 only through the quantiser's limit.
void limit_pitch_gain(int32_t mode, Word16 lsp_flag, const Word16 gp[GP_HIST], Word16 *gain,
                      Word16 *gp_limit) {
    bool clip = false;
    *gp_limit = MAX_16;
    if (lsp_flag != 0 && *gain > GP_CLIP) clip = check_gp_clipping(gp, *gain);

    if (mode == MR475 || mode == MR515) {
        if (*gain > GAIN_PIT_LOWRATE) *gain = GAIN_PIT_LOWRATE;
        if (clip) *gp_limit = GP_CLIP;
    } else if (clip) {
        *gp_limit = GP_CLIP;
        *gain = GP_CLIP;
    }
}

void convolve_c(const Word16 *x, const Word16 *h, Word16 *y) {
    for (int n = 0; n < L_SUBFR; ++n) {
        Word32 s = 0;
        for (int i = 0; i <= n; ++i) s = l_mac(s, x[i], h[n - i]);
        y[n] = extract_h(l_shl(s, 3));
    }
}

void norm_corr_sums_c(const Word16 *excf, const Word16 *xn, const Word16 *h, const Word16 *x_new,
                      Word32 n_lags, Word32 scaling, Word32 *energy, Word32 *dot) {
    Word16 buf_a[L_SUBFR], buf_b[L_SUBFR];
    Word16 *cur = buf_a, *next = buf_b;
    for (int j = 0; j < L_SUBFR; ++j) cur[j] = excf[j];

    // extract_h(l_shl(l_mult(e, h), h_fac)) with s = h_fac + 1 = 4 - scaling
    // doublings in all: e·h (exact, |e·h| <= 2^30) saturates after them
    // exactly when it leaves [MIN_32 >> s, MAX_32 >> s], and the high half
    // of the clamped value is then (e·h) >> (16 - s).
    const int s = 4 - scaling;
    const Word32 lo = MIN_32 >> s, hi = MAX_32 >> s;

    const int64_t xn_sq = sum_squares(xn);
    for (Word32 i = 0;; ++i) {
        const int64_t cur_sq = sum_squares(cur);
        energy[i] = energy_from(cur_sq);
        if (enc_kernel::no_saturation(xn_sq, cur_sq)) {
            Word32 d = 0;
            for (int j = 0; j < L_SUBFR; ++j) d += 2 * (int32_t{xn[j]} * cur[j]);
            dot[i] = d;
        } else {
            dot[i] = enc_kernel::dot_sat(xn, cur, L_SUBFR);
        }
        if (i + 1 >= n_lags) break;

        // Filtered excitation of the next lag: shift by one sample and add
        // the contribution of the newly included excitation sample.
        const Word32 e = x_new[-i];
        for (int j = 1; j < L_SUBFR; ++j) {
            Word32 p = e * h[j];
            p = p < lo ? lo : p > hi ? hi : p;
            next[j] = sat16_32((p >> (16 - s)) + cur[j - 1]);
        }
        next[0] = shr(x_new[-i], scaling);
        std::swap(cur, next);
    }
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" {

void vamrnbe_convolve(const int16_t *x, const int16_t *h, int16_t *y) { dsp().convolve(x, h, y); }

void vamrnbe_norm_corr_filt(const int16_t *exc, const int16_t *xn, const int16_t *h,
                            int32_t t_min, int32_t t_max, int16_t *corr) {
    Word16 excf[L_SUBFR];
    vamrnbe_convolve(exc - t_min, h, excf);

    // Work on excf/4 when its energy is large, to keep the sums in range.
    Word16 scaling = 0;
    if (energy_from(sum_squares(excf)) > 67108864L) {
        for (int j = 0; j < L_SUBFR; ++j) excf[j] = shr(excf[j], 2);
        scaling = 2;
    }

    // Any range within the excitation history (lags up to PIT_MAX plus the
    // interpolator's margin) fits; the searches use at most CORR_MAX lags.
    constexpr int kMaxLags = PIT_MAX + 2 * INTER_TAPS + 1;
    Word32 energy[kMaxLags], dot[kMaxLags];
    const Word32 n_lags = t_max - t_min + 1;
    if (n_lags <= 0 || n_lags > kMaxLags) return;
    dsp().norm_corr_sums(excf, xn, h, exc - t_min - 1, n_lags, scaling, energy, dot);
    for (Word32 i = 0; i < n_lags; ++i) {
        Word16 norm_h, norm_l_, corr_h, corr_l;
        l_extract(vamrnb_inv_sqrt(energy[i]), &norm_h, &norm_l_);
        l_extract(dot[i], &corr_h, &corr_l);
        corr[i] = extract_h(l_shl(mpy_32(corr_h, corr_l, norm_h, norm_l_), 16));
    }
}

int16_t vamrnbe_qgain_pitch(int32_t mode, int16_t gp_limit, int16_t *gain,
                            int16_t gain_cand[3], int16_t gain_cind[3]) {
    const int16_t *tbl = vamrnb_tbl_qua_gain_pitch;
    Word16 err_min = abs_s(sub(*gain, tbl[0]));
    Word16 index = 0;
    for (Word16 i = 1; i < NB_QUA_PITCH; ++i) {
        if (tbl[i] <= gp_limit) {
            const Word16 err = abs_s(sub(*gain, tbl[i]));
            if (err < err_min) {
                err_min = err;
                index = i;
            }
        }
    }

    if (mode == MR795) {
        // Three neighbouring candidates, shifted inwards at the ends of the
        // table or of the allowed range.
        Word16 first;
        if (index == 0) {
            first = 0;
        } else if (index == NB_QUA_PITCH - 1 || tbl[index + 1] > gp_limit) {
            first = sub(index, 2);
        } else {
            first = sub(index, 1);
        }
        for (int i = 0; i < 3; ++i) {
            gain_cind[i] = static_cast<Word16>(first + i);
            gain_cand[i] = tbl[first + i];
        }
        *gain = tbl[index];
    } else if (mode == MR122) {
        *gain = static_cast<Word16>(tbl[index] & 0xfffc);
    } else {
        *gain = tbl[index];
    }
    return index;
}

void vamrnbe_subfr_pre_proc(enc_state *st, enc_frame *fr, int32_t subfr_nr,
                            int32_t use_saved_w0) {
    subfr_state &ss = st->sub;
    subfr_frame &sf = fr->sub;
    const int32_t mode = fr->used_mode;
    const int32_t i_subfr = subfr_nr * L_SUBFR;
    const Word16 *A = fr->A_t + subfr_nr * MP1;
    const Word16 *Aq = fr->Aq_t + subfr_nr * MP1;

    const int16_t *g1 = (mode == MR122 || mode == MR102) ? vamrnbe_tbl_f_gamma1
                                                         : vamrnbe_tbl_gamma1;
    vamrnb_weight_a(A, g1, M, sf.Ap1);
    vamrnb_weight_a(A, vamrnbe_tbl_gamma2, M, sf.Ap2);

    // Impulse response of the weighted synthesis filter: the weighting
    // numerator (as an impulse followed by zeros) through 1/Aq and 1/Ap2.
    Word16 *zero = ss.ai_zero + MP1;
    for (int i = 0; i < MP1; ++i) ss.ai_zero[i] = sf.Ap1[i];
    Word16 *h1 = ss.hvec + L_SUBFR;
    vamrnb_syn_filt(Aq, ss.ai_zero, zero, h1);
    vamrnb_syn_filt(sf.Ap2, h1, zero, h1);

    // LP residual, also the excitation until the subframe is coded.
    const Word16 *speech = enc_speech(st) + i_subfr;
    Word16 *exc = enc_exc(st) + i_subfr;
    vamrnb_residu(Aq, speech, sf.res);
    for (int i = 0; i < L_SUBFR; ++i) exc[i] = sf.res[i];

    // Target: the synthesis error weighted by Ap1/Ap2.
    Word16 *error = ss.mem_err + M;
    vamrnb_syn_filt(Aq, exc, ss.mem_err, error);
    vamrnb_residu(sf.Ap1, error, sf.xn);
    vamrnb_syn_filt(sf.Ap2, sf.xn, use_saved_w0 ? sf.mem_w0_save : ss.mem_w0, sf.xn);
}

void vamrnbe_syn(enc_state *st, enc_frame *fr, int32_t i_subfr) {
    subfr_state &ss = st->sub;
    subfr_frame &sf = fr->sub;
    const int32_t mode = fr->used_mode;
    const int32_t subfr_nr = i_subfr / L_SUBFR;
    const bool pair_start = mode == MR475 && (subfr_nr & 1) == 0;

    if (pair_start) {
        for (int i = 0; i < M; ++i) {
            sf.mem_syn_save[i] = ss.mem_syn[i];
            sf.mem_w0_save[i] = ss.mem_w0[i];
            sf.mem_err_save[i] = ss.mem_err[i];
        }
        sf.sharp_save = ss.sharp;
    }

    vamrnbe_subfr_pre_proc(st, fr, subfr_nr, mode == MR475 ? 1 : 0);

    if (pair_start) {
        for (int i = 0; i < L_SUBFR; ++i) sf.h1_sf0[i] = ss.hvec[L_SUBFR + i];
    }
    for (int i = 0; i < L_SUBFR; ++i) sf.res2[i] = sf.res[i];
}

void vamrnbe_acb(enc_state *st, enc_frame *fr, int32_t i_subfr) {
    subfr_state &ss = st->sub;
    subfr_frame &sf = fr->sub;
    const int32_t mode = fr->used_mode;
    Word16 *exc = enc_exc(st) + i_subfr;
    const Word16 *h1 = ss.hvec + L_SUBFR;

    Word16 frac, resu3, index;
    const Word16 T0 = pitch_fr(&ss, mode, fr->T_op, exc, sf.xn, h1, i_subfr, &frac, &resu3,
                               &index);
    fr->prm[fr->prm_pos++] = index;

    // Adaptive vector, its filtered version and its gain.
    vamrnb_pred_lt_3or6(T0, frac, resu3, exc);
    vamrnbe_convolve(exc, h1, sf.y1);
    Word16 gain = g_pitch(mode, sf.xn, sf.y1, sf.g_coeff);

    Word16 gp_limit;
    limit_pitch_gain(mode, fr->lsp_flag, ss.gp, &gain, &gp_limit);
    if (mode == MR122) {
        fr->prm[fr->prm_pos++] = vamrnbe_qgain_pitch(MR122, gp_limit, &gain, nullptr, nullptr);
    }

    // Targets without the pitch contribution.
    for (int i = 0; i < L_SUBFR; ++i) {
        sf.xn2[i] = sub(sf.xn[i], extract_h(l_shl(l_mult(sf.y1[i], gain), 1)));
        sf.res2[i] = sub(sf.res2[i], extract_h(l_shl(l_mult(exc[i], gain), 1)));
    }

    sf.T0 = T0;
    sf.T0_frac = frac;
    sf.gain_pit = gain;
    sf.gp_limit = gp_limit;

    // The closed-loop lag replaces the open-loop history entry of a half
    // frame whose open-loop gain was high.
    const int32_t subfr_nr = i_subfr / L_SUBFR;
    if (subfr_nr == 0 && st->ol_gain_flg[0] > 0) st->old_lags[1] = T0;
    if (subfr_nr == 3 && st->ol_gain_flg[1] > 0) st->old_lags[0] = T0;
}

}  // extern "C"
