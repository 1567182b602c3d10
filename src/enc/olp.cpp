// Open-loop pitch analysis: builds the perceptually weighted speech of the
// frame and estimates the pitch lag once per half frame (once per frame in
// MR475 and MR515) from its normalised autocorrelation, preferring shorter
// lags.  MR102 uses a weighted search that favours lags near the recent
// median.  With DTX on, the analysis also feeds the voice activity detector:
// tone, pitch and high-pass correlation flags for the sub-band detector,
// summed correlation and energy with the long-term-prediction flag for the
// spectral detector.
#include "common/enc_state.h"
#include "basic_op/ext_op.h"
#include "lpc/dsp.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr int PIT_MIN = 20;
constexpr int PIT_MIN_MR122 = 18;
constexpr Word16 SHORT_LAG_PREF = 27853;   // 0.85, Q15
constexpr Word16 TONE_THR = 21298;         // 0.65, Q15
constexpr int SCALED_LEN = PIT_MAX + L_FRAME;

// What the current analysis feeds back to the detector.
struct vad_link {
    bool dtx;          // DTX on: the detector fields are written at all
    bool option2;      // spectral detector selected
    vad_area *vad;
};

inline Word16 set_bit14(Word16 reg) { return static_cast<Word16>(reg | 0x4000); }

// A strong correlation at the best lag relative to the delayed energy marks
// the half frame as tonal.
void tone_detection(vad1_state *v, Word32 corr, Word32 energy) {
    const Word16 e = round16(energy);
    if (e > 0 && l_msu(corr, e, TONE_THR) > 0) v->tone = set_bit14(v->tone);
}

// Scales x[-PIT_MAX .. len-1] into out (same layout) so that the
// correlations neither overflow nor lose precision; returns the scale
// exponent (3: down, -3: up, 0: unchanged).
Word16 scale_signal(const Word16 *x, int len, Word16 *out) {
    Word32 e = 0;
    for (int i = -PIT_MAX; i < len; ++i) e = l_mac(e, x[i], x[i]);
    if (e == MAX_32) {
        for (int i = -PIT_MAX; i < len; ++i) out[i] = shr(x[i], 3);
        return 3;
    }
    if (e < 1048576) {
        for (int i = -PIT_MAX; i < len; ++i) out[i] = shl(x[i], 3);
        return -3;
    }
    for (int i = -PIT_MAX; i < len; ++i) out[i] = x[i];
    return 0;
}

// Best lag of one section and its normalised correlation; `rmax`/`r0`
// receive the raw correlation and delayed energy at that lag.
struct lag_result {
    Word16 lag;
    Word16 cor;
    Word32 rmax;
    Word32 r0;
};

lag_result lag_max_common(const Word32 *corr, const Word16 *sig, Word16 scal_fac,
                          bool scal_flag, int len, int lag_max, int lag_min,
                          vad1_state *tone_vad) {
    Word32 max = MIN_32;
    int p_max = lag_max;
    for (int i = lag_max; i >= lag_min; --i) {
        if (corr[-i] >= max) {
            max = corr[-i];
            p_max = i;
        }
    }
    Word32 t0 = 0;
    const Word16 *p = sig - p_max;
    for (int i = 0; i < len; ++i) t0 = l_mac(t0, p[i], p[i]);

    lag_result r{static_cast<Word16>(p_max), 0, max, t0};
    if (tone_vad) tone_detection(tone_vad, max, t0);

    t0 = vamrnb_inv_sqrt(t0);
    if (scal_flag) t0 = l_shl(t0, 1);
    Word16 max_h, max_l, en_h, en_l;
    l_extract(max, &max_h, &max_l);
    l_extract(t0, &en_h, &en_l);
    t0 = mpy_32(max_h, max_l, en_h, en_l);
    if (scal_flag) {
        t0 = l_shr(t0, scal_fac);
        r.cor = extract_h(l_shl(t0, 15));
    } else {
        r.cor = extract_l(t0);
    }
    return r;
}

}  // namespace

namespace vamrnb {

// Lag search of one section for the sub-band detector (tone detection when
// v is not null).
lag_result lag_max_vad1(vad1_state *v, const Word32 *corr, const Word16 *sig, Word16 scal_fac,
                        bool scal_flag, int len, int lag_max, int lag_min) {
    return lag_max_common(corr, sig, scal_fac, scal_flag, len, lag_max, lag_min, v);
}

// Lag search of one section for the spectral detector: the correlation and
// energy at the chosen lag are returned for summing.
lag_result lag_max_vad2(const Word32 *corr, const Word16 *sig, Word16 scal_fac, bool scal_flag,
                        int len, int lag_max, int lag_min) {
    return lag_max_common(corr, sig, scal_fac, scal_flag, len, lag_max, lag_min, nullptr);
}

// Largest high-pass filtered correlation over the lags, relative to the
// high-pass filtered energy, stored as the detector's best_corr_hp (Q15).
void hp_max_vad_update(const Word32 *corr, const Word16 *sig, int len, int lag_min,
                       vad1_state *v) {
    Word32 max = MIN_32;
    for (int i = PIT_MAX - 1; i > lag_min; --i) {
        Word32 t = l_sub(l_sub(l_shl(corr[-i], 1), corr[-i - 1]), corr[-i + 1]);
        t = l_abs(t);
        if (t >= max) max = t;
    }
    Word32 t0 = 0, t1 = 0;
    for (int i = 0; i < len; ++i) t0 = l_mac(t0, sig[i], sig[i]);
    for (int i = 0; i < len; ++i) t1 = l_mac(t1, sig[i], sig[i - 1]);
    t0 = l_abs(l_sub(l_shl(t0, 1), l_shl(t1, 1)));

    const Word16 shift1 = sub(norm_l(max), 1);
    const Word16 max16 = extract_h(l_shl(max, shift1));
    const Word16 shift2 = norm_l(t0);
    const Word16 t016 = extract_h(l_shl(t0, shift2));
    const Word16 cor_max = t016 != 0 ? div_s(max16, t016) : 0;
    const Word16 shift = sub(shift1, shift2);
    v->best_corr_hp = shift >= 0 ? shr(cor_max, shift) : shl(cor_max, negate(shift));
}

// Open-loop lag of one analysis span (all modes but MR102).
Word16 pitch_ol(int32_t mode, const Word16 *signal, int pit_min, int len, int idx,
                const vad_link &link) {
    const bool opt1 = link.dtx && !link.option2;
    const bool opt2 = link.dtx && link.option2;
    vad1_state *v1 = opt1 ? &link.vad->v1 : nullptr;

    if (v1) {
        // One shift per search; with one search per frame the missing half
        // frame counts as tonal.
        v1->tone = shr(v1->tone, 1);
        if (mode == MR475 || mode == MR515)
            v1->tone = static_cast<Word16>(shr(v1->tone, 1) | 0x2000);
    }

    Word16 scaled[SCALED_LEN];
    Word16 *sig = scaled + PIT_MAX;
    const Word16 scal_fac = scale_signal(signal, len, sig);

    Word32 corr_buf[PIT_MAX + 1];
    Word32 *corr = corr_buf + PIT_MAX;
    vamrnbe_comp_corr(sig, len, PIT_MAX, pit_min, corr);

    const bool scal_flag = mode == MR122;
    const int j4 = 4 * pit_min, j2 = 2 * pit_min;
    lag_result s1, s2, s3;
    if (opt2) {
        s1 = lag_max_vad2(corr, sig, scal_fac, scal_flag, len, PIT_MAX, j4);
        s2 = lag_max_vad2(corr, sig, scal_fac, scal_flag, len, j4 - 1, j2);
        s3 = lag_max_vad2(corr, sig, scal_fac, scal_flag, len, j2 - 1, pit_min);
    } else {
        s1 = lag_max_vad1(v1, corr, sig, scal_fac, scal_flag, len, PIT_MAX, j4);
        s2 = lag_max_vad1(v1, corr, sig, scal_fac, scal_flag, len, j4 - 1, j2);
        s3 = lag_max_vad1(v1, corr, sig, scal_fac, scal_flag, len, j2 - 1, pit_min);
        if (v1 && idx == 1) hp_max_vad_update(corr, sig, len, pit_min, v1);
    }

    // Prefer the shorter lags unless clearly worse.
    if (mult(s1.cor, SHORT_LAG_PREF) < s2.cor) s1 = s2;
    if (mult(s1.cor, SHORT_LAG_PREF) < s3.cor) {
        s1.lag = s3.lag;
        s1.rmax = s3.rmax;
        s1.r0 = s3.r0;
    }
    if (opt2) {
        link.vad->v2.L_Rmax = l_add(link.vad->v2.L_Rmax, s1.rmax);
        link.vad->v2.L_R0 = l_add(link.vad->v2.L_R0, s1.r0);
    }
    return s1.lag;
}

// MR102: open-loop lag with the correlation weighted towards short lags and,
// while recent half frames were voiced, towards the median of recent lags.
Word16 pitch_ol_wgh(enc_state *st, const Word16 *signal, int len, int idx,
                    const vad_link &link) {
    const bool opt1 = link.dtx && !link.option2;
    const bool opt2 = link.dtx && link.option2;

    Word16 scaled[SCALED_LEN];
    Word16 *sig = scaled + PIT_MAX;
    scale_signal(signal, len, sig);

    Word32 corr_buf[PIT_MAX + 1];
    Word32 *corr = corr_buf + PIT_MAX;
    vamrnbe_comp_corr(sig, len, PIT_MAX, PIT_MIN, corr);

    // Weighted search; ties go to the shorter lag.
    int ww = 250;
    int we = 123 + PIT_MAX - st->old_T0_med;
    Word32 max = MIN_32;
    int p_max = PIT_MAX;
    for (int i = PIT_MAX; i >= PIT_MIN; --i) {
        Word16 h, l;
        l_extract(corr[-i], &h, &l);
        Word32 t = mpy_32_16(h, l, tab::corrweight[ww--]);
        if (st->wght_flg > 0) {
            l_extract(t, &h, &l);
            t = mpy_32_16(h, l, tab::corrweight[we--]);
        }
        if (t >= max) {
            max = t;
            p_max = i;
        }
    }

    Word32 t0 = 0, t1 = 0;
    const Word16 *p1 = sig - p_max;
    for (int j = 0; j < len; ++j) {
        t0 = l_mac(t0, sig[j], p1[j]);
        t1 = l_mac(t1, p1[j], p1[j]);
    }
    if (opt2) {
        link.vad->v2.L_Rmax = l_add(link.vad->v2.L_Rmax, t0);
        link.vad->v2.L_R0 = l_add(link.vad->v2.L_R0, t1);
    } else if (opt1) {
        link.vad->v1.tone = shr(link.vad->v1.tone, 1);
        tone_detection(&link.vad->v1, t0, t1);
    }

    // Open-loop gain above 0.4?
    Word16 &gain_flg = st->ol_gain_flg[idx];
    gain_flg = round16(l_msu(t0, round16(t1), 13107));

    if (gain_flg > 0) {
        for (int i = 4; i > 0; --i) st->old_lags[i] = st->old_lags[i - 1];
        st->old_lags[0] = static_cast<Word16>(p_max);
        st->old_T0_med = vamrnb_gmed_n(st->old_lags, 5);
        st->ada_w = 32767;
    } else {
        st->old_T0_med = static_cast<Word16>(p_max);
        st->ada_w = mult(st->ada_w, 29491);
    }
    st->wght_flg = st->ada_w < 9830 ? 0 : 1;

    if (opt1 && idx == 1) hp_max_vad_update(corr, sig, len, PIT_MIN, &link.vad->v1);
    return static_cast<Word16>(p_max);
}

// One open-loop estimate on `len` samples of weighted speech.
Word16 ol_ltp(enc_state *st, int32_t mode, const Word16 *wsp, int len, int idx,
              const vad_link &link) {
    if (mode == MR102) return pitch_ol_wgh(st, wsp, len, idx, link);
    const int pit_min = mode == MR122 ? PIT_MIN_MR122 : PIT_MIN;
    return pitch_ol(mode, wsp, pit_min, len, idx, link);
}

}  // namespace vamrnb

namespace vamrnb {

void comp_corr_c(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr) {
    // Every partial sum of 2 x[j] x[j-lag] is bounded by the doubled energy of
    // the whole span x[-lag_max .. len-1].  When that fits in 32 bits no
    // step of the saturating sum can clip, and plain products give the same
    // result (the scaled open-loop signal nearly always qualifies).
    int64_t energy = 0;
    for (int32_t j = -lag_max; j < len; ++j) energy += 2 * int64_t{x[j]} * x[j];
    if (energy <= MAX_32) {
        for (int32_t lag = lag_max; lag >= lag_min; --lag) {
            const Word16 *d = x - lag;
            int32_t t = 0;
            for (int32_t j = 0; j < len; ++j) t += int32_t{x[j]} * d[j];
            corr[-lag] = 2 * t;
        }
        return;
    }
    for (int32_t lag = lag_max; lag >= lag_min; --lag) {
        const Word16 *d = x - lag;
        Word32 t = 0;
        for (int32_t j = 0; j < len; ++j) t = l_mac(t, x[j], d[j]);
        corr[-lag] = t;
    }
}

}  // namespace vamrnb

extern "C" void vamrnbe_comp_corr(const int16_t *x, int32_t len, int32_t lag_max,
                                  int32_t lag_min, int32_t *corr) {
    dsp().comp_corr(x, len, lag_max, lag_min, corr);
}

extern "C" void vamrnbe_olp(enc_state *st, enc_frame *fr, vad_area *vad) {
    const int32_t mode = fr->mode;
    const vad_link link{st->config.enc.dtx == 1, st->config.enc.vad_option == 1, vad};
    const bool one_lag = mode == MR475 || mode == MR515;
    const Word16 *g1 = mode <= MR795 ? vamrnbe_tbl_gamma1 : vamrnbe_tbl_f_gamma1;
    const Word16 *speech = enc_speech(st);
    Word16 *wsp = enc_wsp(st);

    if (link.dtx && link.option2) {
        vad->v2.L_R0 = 0;
        vad->v2.L_Rmax = 0;
    }
    if (mode != MR102) {
        st->ol_gain_flg[0] = 0;
        st->ol_gain_flg[1] = 0;
    }

    for (int half = 0; half < 2; ++half) {
        // Weighted speech of two subframes: A(z/g1) inverse filter, then
        // 1/A(z/g2) synthesis carrying its memory across subframes.
        for (int k = 0; k < 2; ++k) {
            const int sf = 2 * half + k;
            const Word16 *a = &fr->A_t[sf * MP1];
            Word16 ap1[MP1], ap2[MP1];
            vamrnb_weight_a(a, g1, M, ap1);
            vamrnb_weight_a(a, vamrnbe_tbl_gamma2, M, ap2);
            Word16 *w = wsp + sf * L_SUBFR;
            vamrnb_residu(ap1, speech + sf * L_SUBFR, w);
            vamrnb_syn_filt(ap2, w, st->mem_w, w);
            for (int i = 0; i < M; ++i) st->mem_w[i] = w[L_SUBFR - M + i];
        }
        if (!one_lag)
            fr->T_op[half] = ol_ltp(st, mode, wsp + half * (L_FRAME / 2), L_FRAME / 2, half, link);
    }
    if (one_lag) {
        fr->T_op[0] = ol_ltp(st, mode, wsp, L_FRAME, 1, link);
        fr->T_op[1] = fr->T_op[0];
    }

    if (!link.dtx) return;
    if (link.option2) {
        // Long-term prediction flag: summed correlation against a share of
        // the summed energy.
        const Word16 thresh = one_lag ? 18022 : mode == MR102 ? 19660 : 21299;
        Word16 hi, lo;
        l_extract(vad->v2.L_R0, &hi, &lo);
        vad->v2.LTP_flag = vad->v2.L_Rmax > mpy_32_16(hi, lo, thresh) ? 1 : 0;
    } else {
        // Pitch flag: both lags close to their predecessors.
        vad1_state *v = &vad->v1;
        Word16 count = 0;
        for (int i = 0; i < 2; ++i) {
            if (abs_s(sub(v->oldlag, fr->T_op[i])) < 4) count = add(count, 1);
            v->oldlag = fr->T_op[i];
        }
        v->pitch = shr(v->pitch, 1);
        if (add(v->oldlag_count, count) >= 4) v->pitch = set_bit14(v->pitch);
        v->oldlag_count = count;
    }
}
