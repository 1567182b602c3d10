// Voice activity detector, option 2: works on half frames of 80 samples.
// Each half frame is block-normalised, pre-emphasised and transformed with a
// 128-point real FFT; sixteen channel energies are smoothed over time and
// compared with a channel noise estimate.  The quantised channel SNRs are
// mapped to a voice metric whose sum, against an SNR-dependent threshold,
// gives the decision, with SNR-dependent burst and hangover lengths.  The
// noise estimate is updated in clear pauses, or forcibly after a long run of
// spectrally stationary, non-voiced input.
#include "basic_op/ext_op.h"
#include "lpc/tables.h"
#include "vad/vad.h"

namespace vamrnb {
namespace {

constexpr int HALF = 80;             // samples per call
constexpr int FFT_N = 128;
constexpr int OFFSET = 24;           // first FFT input slot of the half frame
constexpr int CHANNELS = 16;
constexpr Word16 HEADROOM = 2;

constexpr Word16 PRE_EMP = -26214;   // -0.8
constexpr Word16 CEE_SM = 18022;     // channel energy smoothing 0.55
constexpr Word16 CEE_SM_REST = 14746;
constexpr Word16 CNE_SM = 3277;      // channel noise smoothing 0.1
constexpr Word16 CNE_SM_REST = 29491;
constexpr Word16 HIGH_ALPHA = 29491; // long-term spectrum smoothing 0.9 .. 0.7
constexpr Word16 LOW_ALPHA = 22938;
constexpr Word16 ALPHA_RANGE = HIGH_ALPHA - LOW_ALPHA;

constexpr Word16 UPDATE_THLD = 35;   // voice metric below: clear pause
constexpr Word16 DEV_THLD = 7168;    // spectral deviation limit, Q8
constexpr Word16 UPDATE_CNT_THLD = 50;
constexpr Word16 HYSTER_CNT_THLD = 6;
constexpr Word32 MIN_NOISE = 32;     // floor of the noise estimate (Q9)
constexpr Word32 INIT_NOISE = 8192;  // initial noise estimate (Q9)
constexpr int FRAC_BITS_NOISE = 9;   // the noise estimate is always Q9

// Block normalisation: shifts the samples so that the largest magnitude has
// `HEADROOM` spare bits; returns the shift (14 for an all-zero block).
Word16 block_norm(const Word16 *in, Word16 *out) {
    Word16 peak = abs_s(in[0]);
    for (int i = 1; i < HALF; ++i) {
        const Word16 a = abs_s(in[i]);
        if (a > peak) peak = a;
    }
    if (peak == 0) {
        for (int i = 0; i < HALF; ++i) out[i] = 0;
        return 16 - HEADROOM;
    }
    const Word16 s = sub(norm_s(peak), HEADROOM);
    for (int i = 0; i < HALF; ++i) out[i] = shl(in[i], s);
    return s;
}

// 10·log10(x / 2^fbits) / 128, i.e. dB in Q8.
Word16 db_q8(Word32 x, Word16 fbits) {
    Word16 e, f;
    vamrnb_log2(x, &e, &f);
    e = sub(e, fbits);
    const Word32 p = mpy_32_16(e, f, 24660);   // 10·log10(2)/4, Q15
    return extract_l(l_shr_r(p, 6));
}

// Complex 64-point FFT in place (interleaved re, im), decimation in time,
// each stage halving the values.
void complex_fft(Word16 *x) {
    // Bit-reversed order of the 64 complex points.
    for (int k = 0; k < 64; ++k) {
        int r = 0;
        for (int b = 0; b < 6; ++b) r |= ((k >> b) & 1) << (5 - b);
        if (r > k) {
            const Word16 re = x[2 * k], im = x[2 * k + 1];
            x[2 * k] = x[2 * r];
            x[2 * k + 1] = x[2 * r + 1];
            x[2 * r] = re;
            x[2 * r + 1] = im;
        }
    }

    for (int stage = 0; stage < 6; ++stage) {
        const int half = 2 << stage;            // butterfly span (Word16 units)
        const int twiddle_step = 2 * tab::ii_table[stage];
        int w = 0;
        for (int j = 0; j < half; j += 2, w += twiddle_step) {
            const Word16 c = tab::phs_tbl[w];
            const Word16 s = tab::phs_tbl[w + 1];
            for (int top = j; top < FFT_N; top += 2 * half) {
                const int bot = top + half;
                Word32 acc_re = l_msu(l_mult(x[bot], c), x[bot + 1], s);
                Word32 acc_im = l_mac(l_mult(x[bot + 1], c), x[bot], s);
                const Word16 t_re = round16(acc_re);
                const Word16 t_im = round16(acc_im);
                x[bot] = shr(sub(x[top], t_re), 1);
                x[bot + 1] = shr(sub(x[top + 1], t_im), 1);
                x[top] = shr(add(x[top], t_re), 1);
                x[top + 1] = shr(add(x[top + 1], t_im), 1);
            }
        }
    }
}

}  // namespace

void r_fft(Word16 x[128]) {
    complex_fft(x);

    const Word16 dc = x[0], ny = x[1];
    x[0] = add(dc, ny);
    x[1] = sub(dc, ny);

    // Split the 64-point transform into the 128-point real spectrum: bin m
    // is formed together with its mirror 64 - m.
    for (int i = 2; i <= 64; i += 2) {
        const int j = FFT_N - i;
        const Word16 a_re = add(x[i], x[j]);
        const Word16 a_im = sub(x[i + 1], x[j + 1]);
        const Word16 b_re = add(x[i + 1], x[j + 1]);
        const Word16 b_im = sub(x[j], x[i]);
        const Word32 a_re_h = l_deposit_h(a_re);
        const Word32 a_im_h = l_deposit_h(a_im);

        Word32 t = l_msu(l_mac(a_re_h, b_re, tab::phs_tbl[i]), b_im, tab::phs_tbl[i + 1]);
        x[i] = round16(l_shr(t, 1));
        t = l_mac(l_mac(a_im_h, b_im, tab::phs_tbl[i]), b_re, tab::phs_tbl[i + 1]);
        x[i + 1] = round16(l_shr(t, 1));
        t = l_mac(l_mac(a_re_h, b_re, tab::phs_tbl[j]), b_im, tab::phs_tbl[j + 1]);
        x[j] = round16(l_shr(t, 1));
        t = l_mac(l_msu(l_negate(a_im_h), b_im, tab::phs_tbl[j]), b_re, tab::phs_tbl[j + 1]);
        x[j + 1] = round16(l_shr(t, 1));
    }
}

void vad2_init(vad2_state *st) { *st = vad2_state{}; }

Word16 vad2(const Word16 *samples80, vad2_state *st) {
    st->Lframe_cnt = l_add(st->Lframe_cnt, 1);
    const bool first = st->Lframe_cnt == 1;
    const bool warm_up = st->Lframe_cnt <= 4;

    // ---- normalise, pre-emphasise, transform --------------------------------
    Word16 norm[HALF];
    const Word16 shift = block_norm(samples80, norm);

    Word16 buf[FFT_N];
    for (int i = 0; i < OFFSET; ++i) buf[i] = 0;
    st->pre_emp_mem = shr_r(st->pre_emp_mem, sub(st->last_normb_shift, shift));
    st->last_normb_shift = shift;
    buf[OFFSET] = add(norm[0], mult(PRE_EMP, st->pre_emp_mem));
    for (int j = 1; j < HALF; ++j) buf[OFFSET + j] = add(norm[j], mult(PRE_EMP, norm[j - 1]));
    st->pre_emp_mem = norm[HALF - 1];
    for (int i = OFFSET + HALF; i < FFT_N; ++i) buf[i] = 0;

    r_fft(buf);

    // ---- channel energies -----------------------------------------------------
    // Two scalings of the smoothed energies (Q9 and Q4) keep both loud and
    // quiet input in range; switch with hysteresis on the block shift.
    bool state_change = false;
    if (st->shift_state == 0) {
        if (shift <= -HEADROOM + 2) {
            state_change = true;
            st->shift_state = 1;
        }
    } else if (shift >= -HEADROOM + 5) {
        state_change = true;
        st->shift_state = 0;
    }
    const int ss = st->shift_state;
    if (state_change)
        for (int i = 0; i < CHANNELS; ++i)
            st->Lch_enrg[i] = l_shr(st->Lch_enrg[i], tab::state_change_shift_r[ss]);

    const Word16 alpha = first ? Word16{32767} : CEE_SM;
    const Word16 rest = first ? Word16{0} : CEE_SM_REST;
    for (int i = 0; i < CHANNELS; ++i) {
        Word32 e = 0;
        for (int b = tab::ch_tbl[2 * i]; b <= tab::ch_tbl[2 * i + 1]; ++b) {
            e = l_mac(e, buf[2 * b], buf[2 * b]);
            e = l_mac(e, buf[2 * b + 1], buf[2 * b + 1]);
        }
        e = l_shr_r(e, sub(shl(shift, 1), tab::enrg_norm_shift[ss]));

        Word16 hi, lo;
        l_extract(e, &hi, &lo);
        const Word32 fresh = mpy_32_16(hi, lo, mult(alpha, tab::ch_tbl_sh[i]));
        l_extract(st->Lch_enrg[i], &hi, &lo);
        Word32 v = l_add(fresh, mpy_32_16(hi, lo, rest));
        if (v < tab::min_chan_enrg[ss]) v = tab::min_chan_enrg[ss];
        st->Lch_enrg[i] = v;
    }

    Word32 total_enrg = 0;
    for (int i = 0; i < CHANNELS; ++i) total_enrg = l_add(total_enrg, st->Lch_enrg[i]);

    // Peak-to-average test (sine waves): peak channel above 10/16 of the total.
    Word32 peak = 0;
    for (int i = 2; i < CHANNELS; ++i)
        if (st->Lch_enrg[i] > peak) peak = st->Lch_enrg[i];
    bool p2a;
    {
        Word16 hi, lo;
        l_extract(total_enrg, &hi, &lo);
        p2a = peak > mpy_32_16(hi, lo, 20480);
    }

    // The first few half frames seed the noise estimate.
    if (warm_up) {
        for (int i = 0; i < CHANNELS; ++i) {
            if (p2a || st->Lch_enrg[i] < tab::ine_noise[ss])
                st->Lch_noise[i] = INIT_NOISE;
            else if (ss == 1)
                st->Lch_noise[i] = l_shr(st->Lch_enrg[i], tab::state_change_shift_r[0]);
            else
                st->Lch_noise[i] = st->Lch_enrg[i];
        }
    }

    // ---- channel SNRs and voice metric ---------------------------------------
    Word16 enrg_db[CHANNELS];
    Word16 snr[CHANNELS];
    Word16 vm_sum = 0;
    for (int i = 0; i < CHANNELS; ++i) {
        enrg_db[i] = db_q8(st->Lch_enrg[i], tab::fbits[ss]);
        snr[i] = sub(enrg_db[i], db_q8(st->Lch_noise[i], FRAC_BITS_NOISE));
        Word16 q = shr_r(mult(21845, snr[i]), 6);   // 3/8 dB steps
        if (q >= 89)
            q = 89;
        else if (q < 0)
            q = 0;
        vm_sum = add(vm_sum, tab::vm_tbl[q]);
    }

    // ---- frame SNR -------------------------------------------------------------
    Word16 xt;
    if (warm_up || st->fupdate_flag != 0) {
        constexpr Word16 NOMINAL_PEAK_DB = 14320;
        st->negSNRvar = 0;
        st->negSNRbias = 0;
        Word32 noise = 0;
        for (int i = 0; i < CHANNELS; ++i) noise = l_add(noise, st->Lch_noise[i]);
        xt = sub(NOMINAL_PEAK_DB, db_q8(noise, FRAC_BITS_NOISE));
        st->tsnr = xt;
    } else {
        // Mean of the channel SNRs in the power domain.
        Word32 sum = 0;
        for (int i = 0; i < CHANNELS; ++i) {
            const Word32 p = l_shr(l_mult(snr[i], 10885), 8);   // · log2(10)/10
            Word16 hi, lo;
            l_extract(p, &hi, &lo);
            sum = l_add(sum, vamrnb_pow2(add(hi, 3), lo));
        }
        xt = db_q8(sum, 4 + 3);
        if (xt > st->tsnr)
            st->tsnr = round16(l_add(l_mult(29491, st->tsnr), l_mult(3277, xt)));
        else if (xt > mult(20480, st->tsnr))
            st->tsnr = round16(l_add(l_mult(32702, st->tsnr), l_mult(66, xt)));
    }

    Word16 q_snr = shr(mult(st->tsnr, 10923), 8);   // 3 dB steps
    if (q_snr > 19)
        q_snr = 19;
    else if (q_snr < 0)
        q_snr = 0;

    if (xt < 0) {
        const Word16 sq = round16(l_shl(l_mult(xt, xt), 7));
        st->negSNRvar = round16(l_add(l_mult(32440, st->negSNRvar), l_mult(328, sq)));
        if (st->negSNRvar > 1024) st->negSNRvar = 1024;
        const Word16 b = mult_r(shl(sub(st->negSNRvar, 166), 4), 24576);
        st->negSNRbias = b < 0 ? Word16{0} : shr(b, 8);
    }

    // ---- decision --------------------------------------------------------------
    Word16 active;
    if (vm_sum > add(tab::vm_threshold_table[q_snr], st->negSNRbias)) {
        active = 1;
        st->burstcount = add(st->burstcount, 1);
        if (st->burstcount > tab::burstcount_table[q_snr])
            st->hangover = tab::hangover_table[q_snr];
    } else {
        st->burstcount = 0;
        st->hangover = sub(st->hangover, 1);
        if (st->hangover <= 0) {
            active = 0;
            st->hangover = 0;
        } else {
            active = 1;
        }
    }

    // ---- spectral deviation and long-term spectrum --------------------------
    Word16 deviation = 0;
    if (first) {
        for (int i = 0; i < CHANNELS; ++i) st->ch_enrg_long_db[i] = enrg_db[i];
    } else {
        for (int i = 0; i < CHANNELS; ++i)
            deviation = add(deviation, abs_s(sub(st->ch_enrg_long_db[i], enrg_db[i])));
    }

    Word16 a_long, a_rest;
    const Word16 gap = sub(st->tsnr, xt);
    if (gap <= 0 || st->tsnr <= 0) {
        a_long = HIGH_ALPHA;
        a_rest = 32768 - HIGH_ALPHA;
    } else if (gap > st->tsnr) {
        a_long = LOW_ALPHA;
        a_rest = 32768 - LOW_ALPHA;
    } else {
        a_long = sub(HIGH_ALPHA, mult(ALPHA_RANGE, div_s(gap, st->tsnr)));
        a_rest = sub(32767, a_long);
    }
    for (int i = 0; i < CHANNELS; ++i)
        st->ch_enrg_long_db[i] =
            round16(l_add(l_mult(a_rest, enrg_db[i]), l_mult(a_long, st->ch_enrg_long_db[i])));

    // ---- noise update decision ---------------------------------------------
    bool update = false;
    st->fupdate_flag = 0;
    if (vm_sum <= UPDATE_THLD) {
        if (st->burstcount == 0) {
            update = true;
            st->update_cnt = 0;
        }
    } else if (total_enrg > tab::noise_floor_chan[ss] && deviation < DEV_THLD && !p2a &&
               st->LTP_flag == 0) {
        st->update_cnt = add(st->update_cnt, 1);
        if (st->update_cnt >= UPDATE_CNT_THLD) {
            update = true;
            st->fupdate_flag = 1;
        }
    }

    if (st->update_cnt == st->last_update_cnt)
        st->hyster_cnt = add(st->hyster_cnt, 1);
    else
        st->hyster_cnt = 0;
    st->last_update_cnt = st->update_cnt;
    if (st->hyster_cnt > HYSTER_CNT_THLD) st->update_cnt = 0;

    if (update) {
        const Word16 to_q9 = ss == 1 ? tab::state_change_shift_r[0] : Word16{0};
        for (int i = 0; i < CHANNELS; ++i) {
            Word16 hi, lo;
            l_extract(l_shr(st->Lch_enrg[i], to_q9), &hi, &lo);
            const Word32 fresh = mpy_32_16(hi, lo, CNE_SM);
            l_extract(st->Lch_noise[i], &hi, &lo);
            Word32 v = l_add(fresh, mpy_32_16(hi, lo, CNE_SM_REST));
            if (v < MIN_NOISE) v = MIN_NOISE;
            st->Lch_noise[i] = v;
        }
    }
    return active;
}

}  // namespace vamrnb
