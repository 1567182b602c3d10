// Excitation of the decoder: the total excitation of a subframe from the
// adaptive and fixed codebook vectors and their gains (fed back into the
// excitation history), its rework for synthesis -- code-gain smoothing and
// anti-sparseness in the low modes, energy control in background noise and
// bad frames, pitch enhancement -- and the first synthesis of the subframe,
// which reports overflow.
#include "dec/dec_state.h"

#include "basic_op/ext_op.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr Word16 PHD_THR1 = 9830;   // 0.6 in Q14
constexpr Word16 PHD_THR2 = 14746;  // 0.9 in Q14

inline bool low_mode(int32_t mode) { return mode == MR475 || mode == MR515 || mode == MR59; }

// Q15 quotient num / den; for 0 <= num < den it is floor(num * 2^15 / den),
// which is what the bit-serial division produces.
inline Word16 div_q15(Word16 num, Word16 den) {
    if (num >= 0 && num < den) return static_cast<Word16>((static_cast<int32_t>(num) << 15) / den);
    return div_s(num, den);
}

// One sample of total excitation: round(sat(2 x pf + 2 c g) << shift) with
// the saturation of each step; pf and g are never negative, so the two
// products fit in 32 bits.
inline Word16 mix_sample(Word16 x, Word16 pf, Word16 c, Word16 g, Word16 shift) {
    int64_t L = sat32(2 * (int64_t{x} * pf) + 2 * (int64_t{c} * g));
    L = sat32(L << shift);
    return static_cast<Word16>(sat32(L + 0x8000) >> 16);
}

// dst[k] = add(dst[k], mult(amp, r[k])) for k < n.
inline void add_scaled(Word16 *dst, const Word16 *r, int n, Word16 amp) {
    for (int k = 0; k < n; ++k) {
        int32_t m = (int32_t{amp} * r[k]) >> 15;
        m = m > 32767 ? 32767 : m;
        const int32_t v = dst[k] + m;
        dst[k] = static_cast<Word16>(v > 32767 ? 32767 : (v < -32768 ? -32768 : v));
    }
}

// sig[i] = extract_h(l_shl(l_mult(sig[i], g), 3)) for a gain g >= 0, that is
// the product shifted down by 12 and saturated.
inline Word16 scale_q12(Word16 x, int32_t g) {
    const int32_t v = (int32_t{x} * g) >> 12;
    return static_cast<Word16>(v > 32767 ? 32767 : (v < -32768 ? -32768 : v));
}

// Energy of a 40-sample vector with the input scaled down by 4.
Word32 energy_scaled(const Word16 *x) {
    Word16 t = shr(x[0], 2);
    Word32 s = l_mult(t, t);
    for (int i = 1; i < L_SUBFR; ++i) {
        t = shr(x[i], 2);
        s = l_mac(s, t, t);
    }
    return s;
}

}  // namespace

// Code-gain smoothing in background noise: mixes the decoded code gain with
// the mean of the recent ones when the spectrum is stationary.
Word16 cb_gain_average(dec_state *st, int32_t mode, Word16 gain_code, const Word16 *lsf,
                       Word16 bfi, Word16 pdfi) {
    for (int i = 0; i < 6; ++i) st->cbGainHistory[i] = st->cbGainHistory[i + 1];
    st->cbGainHistory[6] = gain_code;

    // spectral distance of the subframe's LSFs from their long-term mean
    Word16 diff = 0;
    for (int i = 0; i < M; ++i) {
        const Word16 mean = st->lsp_meanSave[i];
        Word16 d = abs_s(sub(mean, lsf[i]));
        const Word16 s1 = sub(norm_s(d), 1);
        d = shl(d, s1);
        const Word16 s2 = norm_s(mean);
        Word16 q = div_q15(d, shl(mean, s2));
        const Word16 s = sub(add(2, s1), s2);
        q = s >= 0 ? shr(q, s) : shl(q, negate(s));
        diff = i == 0 ? q : add(diff, q);
    }

    st->hangVar = diff > 5325 ? add(st->hangVar, 1) : 0;
    if (st->hangVar > 10) st->hangCount = 0;

    Word16 mix = gain_code;
    if (mode <= MR67 || mode == MR102) {
        const bool bad = (pdfi != 0 && st->prev_pdf != 0) || bfi != 0 || st->prev_bf != 0;
        const Word16 thr =
            bad && st->voicedHangover > 1 && st->inBackgroundNoise != 0 && low_mode(mode) ? 4506
                                                                                           : 3277;
        Word16 t = sub(diff, thr);
        if (t < 0) t = 0;
        Word16 bg_mix = t > 2048 ? 8192 : shl(t, 2);
        if (st->hangCount < 40 || diff > 5325) bg_mix = 8192;

        Word32 L = l_mult(6554, st->cbGainHistory[2]);
        for (int i = 3; i < 7; ++i) L = l_mac(L, 6554, st->cbGainHistory[i]);
        Word16 mean = round16(L);
        if ((bfi != 0 || st->prev_bf != 0) && st->inBackgroundNoise != 0 && low_mode(mode)) {
            L = l_mult(4681, st->cbGainHistory[0]);
            for (int i = 1; i < 7; ++i) L = l_mac(L, 4681, st->cbGainHistory[i]);
            mean = round16(L);
        }
        L = l_mult(bg_mix, gain_code);
        L = l_mac(L, 8192, mean);
        L = l_msu(L, bg_mix, mean);
        mix = round16(l_shl(L, 2));
    }
    st->hangCount = add(st->hangCount, 1);
    return mix;
}

// Anti-sparseness: spreads the pulses of the fixed-codebook vector with one
// of two dispersion responses chosen from the recent pitch gains, then forms
// the total excitation for synthesis in x.
void ph_disp(dec_state *st, int32_t mode, Word16 *x, Word16 cb_gain, Word16 ltp_gain,
             Word16 *inno, Word16 pitch_fac, Word16 tmp_shift) {
    for (int i = 4; i > 0; --i) st->gainMem[i] = st->gainMem[i - 1];
    st->gainMem[0] = ltp_gain;

    Word16 imp = ltp_gain < PHD_THR2 ? (ltp_gain > PHD_THR1 ? 1 : 0) : 2;

    const Word16 onset_thr = round16(l_shl(l_mult(st->prevCbGain, 16384), 2));
    if (cb_gain > onset_thr) {
        st->onset = 2;
    } else if (st->onset > 0) {
        st->onset = sub(st->onset, 1);
    }
    if (st->onset == 0) {
        int low = 0;
        for (int i = 0; i < 5; ++i) low += st->gainMem[i] < PHD_THR1;
        if (low > 2) imp = 0;
    }
    if (imp > st->prevState + 1 && st->onset == 0) imp = sub(imp, 1);
    if (imp < 2 && st->onset > 0) imp = add(imp, 1);
    if (cb_gain < 10) imp = 2;
    if (st->lockFull == 1) imp = 0;
    st->prevState = imp;
    st->prevCbGain = cb_gain;

    if (mode != MR122 && mode != MR102 && mode != MR74 && imp < 2) {
        Word16 saved[L_SUBFR];
        Word16 where[L_SUBFR];
        int nze = 0;
        for (int i = 0; i < L_SUBFR; ++i) {
            if (inno[i] != 0) where[nze++] = static_cast<Word16>(i);
            saved[i] = inno[i];
            inno[i] = 0;
        }
        const Word16 *resp = mode == MR795 ? (imp == 0 ? tab::ph_imp_low_MR795 : tab::ph_imp_mid_MR795)
                                           : (imp == 0 ? tab::ph_imp_low : tab::ph_imp_mid);
        for (int k = 0; k < nze; ++k) {
            const int pos = where[k];
            const Word16 amp = saved[pos];
            add_scaled(inno + pos, resp, L_SUBFR - pos, amp);
            add_scaled(inno, resp + L_SUBFR - pos, pos, amp);
        }
    }

    for (int i = 0; i < L_SUBFR; ++i) x[i] = mix_sample(x[i], pitch_fac, inno[i], cb_gain, tmp_shift);
}

// Excitation energy control: scales the excitation down to the median of the
// recent subframe energies when it rises above them.
void ex_ctrl(Word16 *exc, Word16 exc_energy, const Word16 hist[9], Word16 voiced_hangover,
             Word16 prev_bfi, Word16 careful) {
    Word16 avg = vamrnb_gmed_n(hist, 9);
    Word16 prev = shr(add(hist[7], hist[8]), 1);
    if (hist[8] < prev) prev = hist[8];

    if (exc_energy < avg && exc_energy > 5) {
        Word16 test = shl(prev, 2);
        if (voiced_hangover < 7 || prev_bfi != 0) test = sub(test, prev);
        if (avg > test) avg = test;

        const Word16 e = norm_s(exc_energy);
        const Word16 inv = div_s(16383, shl(exc_energy, e));
        Word32 t = l_shr(l_mult(avg, inv), sub(20, e));
        if (t > 32767) t = 32767;
        Word16 scale = extract_l(t);
        if (careful != 0 && scale > 3072) scale = 3072;
        for (int i = 0; i < L_SUBFR; ++i) exc[i] = extract_l(l_shr(l_mult(scale, exc[i]), 11));
    }
}

// Scales the enhanced excitation to the energy of the unenhanced one.
void agc2(const Word16 *ref, Word16 *sig) {
    const Word32 s = vamrnbd_energy_new(sig);
    if (s == 0) return;
    const Word16 g0 = agc_gain(s, ref);
    for (int i = 0; i < L_SUBFR; ++i) sig[i] = scale_q12(sig[i], g0);
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" int32_t vamrnbd_energy_old(const int16_t in[40]) { return energy_scaled(in); }

extern "C" int32_t vamrnbd_energy_new(const int16_t in[40]) {
    const Word32 s = vamrnb_energy(in, L_SUBFR, 0);
    if (s == MAX_32) return energy_scaled(in);
    return l_shr(s, 4);
}

namespace vamrnb {

Word16 agc_gain(Word32 sig_energy, const Word16 *ref) {
    Word16 exp = sub(norm_l(sig_energy), 1);
    const Word16 gain_out = round16(l_shl(sig_energy, exp));
    Word32 s = vamrnbd_energy_new(ref);
    if (s == 0) return 0;
    const Word16 i = norm_l(s);
    const Word16 gain_in = round16(l_shl(s, i));
    exp = sub(exp, i);
    s = l_deposit_l(div_s(gain_out, gain_in));
    s = l_shr(l_shl(s, 7), exp);
    s = vamrnb_inv_sqrt(s);
    return round16(l_shl(s, 9));
}

}  // namespace vamrnb

extern "C" void vamrnbd_excit(dec_state *st, dec_work *w, int32_t i_subfr) {
    const int32_t mode = w->rx.frame_mode;
    const Word16 bfi = w->bfi;
    Word16 *exc = st->exc;
    Word16 *enh = w->exc_enhanced;
    Word16 gain_pit = w->gain_pit;
    const Word16 pit_sharp = w->pit_sharp;
    const bool enhance = pit_sharp > 16384;

    // pitch-enhanced excitation, scaled back to the plain one's energy below
    if (enhance) {
        for (int i = 0; i < L_SUBFR; ++i) {
            Word32 L = l_mult(mult(exc[i], pit_sharp), gain_pit);
            if (mode == MR122) L = l_shr(L, 1);
            w->excp[i] = round16(L);
        }
    }

    if (bfi == 0) {
        for (int i = 0; i < 8; ++i) st->ltpGainHistory[i] = st->ltpGainHistory[i + 1];
        st->ltpGainHistory[8] = gain_pit;
    }

    // limit the pitch gain in background noise after errors
    if ((st->prev_bf != 0 || bfi != 0) && st->inBackgroundNoise != 0 && low_mode(mode)) {
        if (gain_pit > 12288) gain_pit = add(shr(sub(gain_pit, 12288), 1), 12288);
        if (gain_pit > 14745) gain_pit = 14745;
    }

    // code gain smoothed in background noise (used by MR475 .. MR67, MR102)
    Word16 lsf_i[M];
    const Word16 *old = w->prev_lsf;
    const Word16 *cur = st->past_lsf_q;
    for (int i = 0; i < M; ++i) {
        switch (i_subfr) {
        case 0: lsf_i[i] = add(sub(old[i], shr(old[i], 2)), shr(cur[i], 2)); break;
        case 40: lsf_i[i] = add(shr(old[i], 1), shr(cur[i], 1)); break;
        case 80: lsf_i[i] = add(shr(old[i], 2), sub(cur[i], shr(cur[i], 2))); break;
        default: lsf_i[i] = cur[i]; break;
        }
    }
    Word16 gain_code_mix = cb_gain_average(st, mode, w->gain_code, lsf_i, bfi, w->pdfi);
    if (mode > MR67 && mode != MR102) gain_code_mix = w->gain_code;

    Word16 pitch_fac, tmp_shift;
    if (mode <= MR102) {
        pitch_fac = gain_pit;
        tmp_shift = 1;
    } else {
        pitch_fac = shr(gain_pit, 1);
        tmp_shift = 2;
    }

    // total excitation, fed back into the history; the adaptive part is
    // kept for the synthesis excitation
    for (int i = 0; i < L_SUBFR; ++i) {
        enh[i] = exc[i];
        exc[i] = mix_sample(exc[i], pitch_fac, w->code[i], w->gain_code, tmp_shift);
    }

    st->lockFull = (low_mode(mode) && st->voicedHangover > 3 && st->inBackgroundNoise != 0 && bfi != 0)
                       ? 1
                       : 0;
    ph_disp(st, mode, enh, gain_code_mix, gain_pit, w->code, pitch_fac, tmp_shift);

    // energy control in background noise
    Word32 L = l_shr(vamrnb_energy(enh, L_SUBFR, 0), 1);
    Word32 root = L;
    Word16 e;
    vamrnb_isqrt_n(&root, &e);
    root = l_shr(root, add(shr(e, 1), 15));
    const Word16 exc_energy = extract_l(l_shr(root, 2));

    if (low_mode(mode) && st->voicedHangover > 5 && st->inBackgroundNoise != 0 &&
        st->conceal_state < 4 && ((w->pdfi != 0 && st->prev_pdf != 0) || bfi != 0 || st->prev_bf != 0)) {
        const Word16 careful = (w->pdfi != 0 && bfi == 0) ? 1 : 0;
        ex_ctrl(enh, exc_energy, st->excEnergyHist, st->voicedHangover, st->prev_bf, careful);
    }
    if (!(st->inBackgroundNoise != 0 && (bfi != 0 || st->prev_bf != 0) && st->conceal_state < 4)) {
        for (int i = 0; i < 8; ++i) st->excEnergyHist[i] = st->excEnergyHist[i + 1];
        st->excEnergyHist[8] = exc_energy;
    }

    // first synthesis of the subframe, in place after the previous output
    Word16 *buf = w->synth_buf + i_subfr;
    if (enhance) {
        for (int i = 0; i < L_SUBFR; ++i) w->excp[i] = add(w->excp[i], enh[i]);
        agc2(enh, w->excp);
        vamrnbd_syn_filt_m(w->Az_cur, w->excp, &w->syn_overflow, buf);
    } else {
        vamrnbd_syn_filt_m(w->Az_cur, enh, &w->syn_overflow, buf);
    }
    w->gain_pit = gain_pit;
}
