// Voice activity detector, option 1: a nine-band filter bank measures the
// signal level per band; the levels are compared with an adaptive background
// noise estimate, the estimate only follows the input while it looks
// stationary and free of pitch, tones and highly correlated (complex)
// content, and a burst/hangover rule smooths the per-frame decisions.
#include "vad/vad.h"

namespace vamrnb {
namespace {

constexpr int FRAME = 160;
constexpr int LOOK_BACK = 40;        // power is measured from 40 samples back

// Filter bank coefficients.
constexpr Word16 C5_A = 21955;       // 5th-order sections
constexpr Word16 C5_B = 6390;
constexpr Word16 C3 = 13363;         // 3rd-order sections

// Power thresholds (sum of squares, doubled).
constexpr Word32 POW_LOW = 15000;     // below: low-power frame
constexpr Word32 POW_PITCH = 343040;  // below: no pitch flag for this frame
constexpr Word32 POW_COMPLEX = 15000; // below: no complex-low flag for this frame

// Decision threshold over the noise level.
constexpr Word16 THR_HIGH = 1260;
constexpr Word16 THR_LOW = 720;
constexpr Word16 THR_SLOPE = -2808;
constexpr Word16 INV_BANDS = 3641;   // 1/9 in Q15
constexpr int SNR_SHIFT = 5;          // quotients are scaled by 2^(e - 5)

// Stationarity.
constexpr Word16 STAT_COUNT = 20;
constexpr Word16 STAT_COUNT_COMPLEX = 5;
constexpr Word16 STAT_LEVEL_FLOOR = 184;
constexpr Word16 STAT_THR = 1000;
constexpr Word16 AVE_RATE_SLOW = 3276;
constexpr Word16 AVE_RATE_HALF = 16383;

// Background noise estimate.
constexpr Word16 NOISE_MIN = 40;
constexpr Word16 NOISE_MAX = 16000;
constexpr Word16 NOISE_INIT = 150;
constexpr Word16 UP_NORMAL = 1638, DOWN_NORMAL = 2097;
constexpr Word16 UP_FORCED = 491, DOWN_FORCED = 1867;
constexpr Word16 DOWN_ONLY = 1638;

// Hangover.
constexpr Word16 HANG_NOISE_LEVEL = 100;
constexpr Word16 BURST_NOISY = 4, HANG_NOISY = 7;
constexpr Word16 BURST_QUIET = 5, HANG_QUIET = 4;

// Complex-signal detector, Q15.
constexpr Word16 CX_HIGH = 19660;      // 0.6
constexpr Word16 CX_LOW = 16383;       // 0.5
constexpr Word16 CX_IN_NOISE = 21298;  // 0.65
constexpr Word16 CX_HANG = 22936;      // 0.7
constexpr Word16 CX_MIN = 13106;       // 0.4
constexpr Word16 CX_RATE_SLOW = 655;
constexpr Word16 CX_RATE_FAST = 2621;
constexpr Word16 CX_RATE_FASTEST = 6553;
constexpr Word16 CX_HANG_LIMIT = 100;
constexpr Word16 CX_HANG_LENGTH = 250;

// Sum of |data[step*i + start]| over first <= i < last, doubled and
// saturated on the way.
Word32 abs_sum(Word32 acc, const Word16 *data, int first, int last, int step, int start) {
    for (int i = first; i < last; ++i) acc = l_mac(acc, 1, abs_s(data[step * i + start]));
    return acc;
}

// Low and high half-band outputs of one split.  Each split filters its two
// inputs through all-pass sections; their sum and difference are the halves.
struct allpass_pair_out { Word16 lo, hi; };

// 5th-order split of x0 (through section a) and x1 (through section b) with
// memories m[0], m[1]; outputs halved.
allpass_pair_out split5(Word16 x0, Word16 x1, Word16 m[2]) {
    Word16 w = sub(x0, mult(C5_A, m[0]));
    const Word16 p = add(m[0], mult(C5_A, w));
    m[0] = w;
    w = sub(x1, mult(C5_B, m[1]));
    const Word16 q = add(m[1], mult(C5_B, w));
    m[1] = w;
    return {shr(add(p, q), 1), shr(sub(p, q), 1)};
}

// 3rd-order split: x0 passes straight, x1 through one all-pass section with
// memory *m; outputs halved.
allpass_pair_out split3(Word16 x0, Word16 x1, Word16 *m) {
    const Word16 w = sub(x1, mult(C3, *m));
    const Word16 q = add(*m, mult(C3, w));
    *m = w;
    return {shr(add(x0, q), 1), shr(sub(x0, q), 1)};
}

void split5_at(Word16 *buf, int a, int b, Word16 m[2]) {
    const allpass_pair_out o = split5(buf[a], buf[b], m);
    buf[a] = o.lo;
    buf[b] = o.hi;
}

void split3_at(Word16 *buf, int a, int b, Word16 *m) {
    const allpass_pair_out o = split3(buf[a], buf[b], m);
    buf[a] = o.lo;
    buf[b] = o.hi;
}

// First stage on the full-rate input (scaled down by 2 bits): every group of
// four samples yields two low/high pairs.
void first_stage(const Word16 *in, Word16 *out, Word16 m[2]) {
    Word16 d0 = m[0];
    Word16 d1 = m[1];
    for (int i = 0; i < FRAME; i += 4) {
        const Word16 u0 = sub(shr(in[i], 2), mult(C5_A, d0));
        Word16 p = add(d0, mult(C5_A, u0));
        const Word16 u1 = sub(shr(in[i + 1], 2), mult(C5_B, d1));
        Word16 q = add(d1, mult(C5_B, u1));
        out[i] = add(p, q);
        out[i + 1] = sub(p, q);

        d0 = sub(shr(in[i + 2], 2), mult(C5_A, u0));
        p = add(u0, mult(C5_A, d0));
        d1 = sub(shr(in[i + 3], 2), mult(C5_B, u1));
        q = add(u1, mult(C5_B, d1));
        out[i + 2] = add(p, q);
        out[i + 3] = sub(p, q);
    }
    m[0] = d0;
    m[1] = d1;
}

// Band layout of the bank's output buffer: the samples of band b sit at
// step*i + start.  Index 0 is the lowest band.  The last `count2 - count1`
// samples of each band belong to the look-ahead and are carried over.
struct band_def { int count1, count2, step, start, scale; };
constexpr band_def BANDS[VAD_BANDS] = {
    {FRAME / 16 - 2, FRAME / 16, 16, 0, 16},   //    0 ..  250 Hz
    {FRAME / 16 - 2, FRAME / 16, 16, 8, 16},   //  250 ..  500 Hz
    {FRAME / 16 - 2, FRAME / 16, 16, 12, 16},  //  500 ..  750 Hz
    {FRAME / 16 - 2, FRAME / 16, 16, 4, 16},   //  750 .. 1000 Hz
    {FRAME / 8 - 4, FRAME / 8, 8, 6, 16},      // 1000 .. 1500 Hz
    {FRAME / 8 - 4, FRAME / 8, 8, 2, 16},      // 1500 .. 2000 Hz
    {FRAME / 8 - 4, FRAME / 8, 8, 3, 16},      // 2000 .. 2500 Hz
    {FRAME / 8 - 4, FRAME / 8, 8, 7, 16},      // 2500 .. 3000 Hz
    {FRAME / 4 - 8, FRAME / 4, 4, 1, 15},      // 3000 .. 4000 Hz
};

Word16 band_level(const Word16 *data, int count1, int count2, int step, int start,
                  int scale, Word16 *sub_level) {
    const Word32 tail = abs_sum(0, data, count1, count2, step, start);
    Word32 total = l_add(tail, l_shl(*sub_level, 16 - scale));
    *sub_level = extract_h(l_shl(tail, scale));
    total = abs_sum(total, data, 0, count1, step, start);
    return extract_h(l_shl(total, scale));
}

void filter_bank(vad1_state *st, const Word16 *in, Word16 level[VAD_BANDS]) {
    Word16 buf[FRAME];

    first_stage(in, buf, st->a_data5[0]);

    for (int i = 0; i < FRAME; i += 4) {
        split5_at(buf, i, i + 2, st->a_data5[1]);
        split5_at(buf, i + 1, i + 3, st->a_data5[2]);
    }
    for (int i = 0; i < FRAME; i += 8) {
        split3_at(buf, i, i + 4, &st->a_data3[0]);
        split3_at(buf, i + 2, i + 6, &st->a_data3[1]);
        split3_at(buf, i + 3, i + 7, &st->a_data3[4]);
    }
    for (int i = 0; i < FRAME; i += 16) {
        split3_at(buf, i, i + 8, &st->a_data3[2]);
        split3_at(buf, i + 4, i + 12, &st->a_data3[3]);
    }

    for (int b = 0; b < VAD_BANDS; ++b) {
        const band_def &d = BANDS[b];
        level[b] = band_level(buf, d.count1, d.count2, d.step, d.start, d.scale,
                              &st->sub_level[b]);
    }
}

// Controls how fast the stationarity average follows, and the stationarity
// counter that gates the noise update.
void update_control(vad1_state *st, const Word16 level[VAD_BANDS]) {
    if (st->complex_warning != 0 && st->stat_count < STAT_COUNT_COMPLEX)
        st->stat_count = STAT_COUNT_COMPLEX;

    const bool pitch_run = (st->pitch & 0x6000) == 0x6000;
    const bool tone_run = (st->tone & 0x7c00) == 0x7c00;
    if (pitch_run || tone_run) {
        st->stat_count = STAT_COUNT;
    } else if ((st->vadreg & 0x7f80) == 0) {
        st->stat_count = STAT_COUNT;   // eight silent decisions in a row
    } else {
        Word16 ratio = 0;
        for (int i = 0; i < VAD_BANDS; ++i) {
            Word16 num = level[i];
            Word16 den = st->ave_level[i];
            if (level[i] <= st->ave_level[i]) {
                num = st->ave_level[i];
                den = level[i];
            }
            if (num < STAT_LEVEL_FLOOR) num = STAT_LEVEL_FLOOR;
            if (den < STAT_LEVEL_FLOOR) den = STAT_LEVEL_FLOOR;
            const Word16 e = norm_s(den);
            const Word16 q = div_s(shr(num, 1), shl(den, e));
            ratio = add(ratio, shr(q, sub(8, e)));
        }
        if (ratio > STAT_THR) {
            st->stat_count = STAT_COUNT;
        } else if ((st->vadreg & 0x4000) != 0 && st->stat_count != 0) {
            st->stat_count = sub(st->stat_count, 1);
        }
    }

    Word16 rate = AVE_RATE_SLOW;
    if (st->stat_count == STAT_COUNT)
        rate = 32767;
    else if ((st->vadreg & 0x4000) == 0)
        rate = AVE_RATE_HALF;
    for (int i = 0; i < VAD_BANDS; ++i)
        st->ave_level[i] = add(st->ave_level[i], mult_r(rate, sub(level[i], st->ave_level[i])));
}

void noise_update(vad1_state *st, const Word16 level[VAD_BANDS]) {
    update_control(st, level);

    Word16 up, down, step;
    if ((st->vadreg & 0x7800) == 0 && (st->pitch & 0x7800) == 0 && st->complex_hang_count == 0) {
        up = UP_NORMAL;
        down = DOWN_NORMAL;
        step = 2;
    } else if (st->stat_count == 0 && st->complex_hang_count == 0) {
        up = UP_FORCED;
        down = DOWN_FORCED;
        step = 2;
    } else {
        up = 0;
        down = DOWN_ONLY;
        step = 0;
    }

    for (int i = 0; i < VAD_BANDS; ++i) {
        const Word16 d = sub(st->old_level[i], st->bckr_est[i]);
        Word16 e;
        if (d < 0) {
            e = add(-2, add(st->bckr_est[i], mult_r(down, d)));
            if (e < NOISE_MIN) e = NOISE_MIN;
        } else {
            e = add(step, add(st->bckr_est[i], mult_r(up, d)));
            if (e > NOISE_MAX) e = NOISE_MAX;
        }
        st->bckr_est[i] = e;
    }
    for (int i = 0; i < VAD_BANDS; ++i) st->old_level[i] = level[i];
}

// Smooths the frame's high-pass correlation into corr_hp_fast.
void complex_adapt(vad1_state *st, bool low_power) {
    Word16 rate;
    if (st->corr_hp_fast < CX_HIGH)
        rate = CX_RATE_FAST;
    else if (st->best_corr_hp < st->corr_hp_fast)
        rate = CX_RATE_FASTEST;
    else
        rate = CX_RATE_SLOW;

    Word32 acc = l_deposit_h(st->corr_hp_fast);
    acc = l_msu(acc, rate, st->corr_hp_fast);
    acc = l_mac(acc, rate, st->best_corr_hp);
    Word16 v = round16(acc);
    if (v < CX_MIN || low_power) v = CX_MIN;
    st->corr_hp_fast = v;
}

// Shifts the complex flag registers and reports a long run of high
// correlation.
Word16 complex_detect(vad1_state *st, bool low_power) {
    st->complex_high = shr(st->complex_high, 1);
    st->complex_low = shr(st->complex_low, 1);
    if (!low_power) {
        if (st->corr_hp_fast > CX_HIGH) st->complex_high |= 0x4000;
        if (st->corr_hp_fast > CX_LOW) st->complex_low |= 0x4000;
    }
    if (st->corr_hp_fast > CX_HANG)
        st->complex_hang_timer = add(st->complex_hang_timer, 1);
    else
        st->complex_hang_timer = 0;
    return ((st->complex_high & 0x7f80) == 0x7f80 || (st->complex_low & 0x7fff) == 0x7fff) ? 1
                                                                                             : 0;
}

Word16 hangover(vad1_state *st, Word16 noise_level, bool low_power) {
    const bool noisy = noise_level > HANG_NOISE_LEVEL;
    const Word16 burst_len = noisy ? BURST_NOISY : BURST_QUIET;
    const Word16 hang_len = noisy ? HANG_NOISY : HANG_QUIET;

    if (low_power) {
        st->burst_count = 0;
        st->hang_count = 0;
        st->complex_hang_count = 0;
        st->complex_hang_timer = 0;
        return 0;
    }

    if (st->complex_hang_timer > CX_HANG_LIMIT && st->complex_hang_count < CX_HANG_LENGTH)
        st->complex_hang_count = CX_HANG_LENGTH;

    if (st->complex_hang_count != 0) {
        st->burst_count = BURST_NOISY;
        st->complex_hang_count = sub(st->complex_hang_count, 1);
        return 1;
    }
    if ((st->vadreg & 0x3ff0) == 0 && st->corr_hp_fast > CX_IN_NOISE) return 1;

    if ((st->vadreg & 0x4000) != 0) {
        st->burst_count = add(st->burst_count, 1);
        if (st->burst_count >= burst_len) st->hang_count = hang_len;
        return 1;
    }
    st->burst_count = 0;
    if (st->hang_count > 0) {
        st->hang_count = sub(st->hang_count, 1);
        return 1;
    }
    return 0;
}

Word16 decide(vad1_state *st, const Word16 level[VAD_BANDS], Word32 power) {
    // Mean squared band SNR.
    Word32 acc = 0;
    for (int i = 0; i < VAD_BANDS; ++i) {
        const Word16 e = norm_s(st->bckr_est[i]);
        Word16 q = div_s(shr(level[i], 1), shl(st->bckr_est[i], e));
        q = shl(q, sub(e, SNR_SHIFT));
        acc = l_mac(acc, q, q);
    }
    const Word16 snr_sum = mult(extract_h(l_shl(acc, 6)), INV_BANDS);

    acc = 0;
    for (int i = 0; i < VAD_BANDS; ++i) acc = l_add(acc, st->bckr_est[i]);
    const Word16 noise_level = extract_h(l_shl(acc, 13));

    Word16 thr = add(mult(THR_SLOPE, noise_level), THR_HIGH);
    if (thr < THR_LOW) thr = THR_LOW;

    st->vadreg = shr(st->vadreg, 1);
    if (snr_sum > thr) st->vadreg |= 0x4000;

    const bool low_power = power < POW_LOW;

    complex_adapt(st, low_power);
    st->complex_warning = complex_detect(st, low_power);
    noise_update(st, level);
    st->speech_vad_decision = hangover(st, noise_level, low_power);
    return st->speech_vad_decision;
}

}  // namespace

void vad1_init(vad1_state *st) {
    *st = vad1_state{};
    for (int i = 0; i < VAD_BANDS; ++i) {
        st->bckr_est[i] = NOISE_INIT;
        st->ave_level[i] = NOISE_INIT;
        st->old_level[i] = NOISE_INIT;
    }
    st->best_corr_hp = CX_MIN;
    st->corr_hp_fast = CX_MIN;
}

Word16 vad1(vad1_state *st, const Word16 *in_buf) {
    Word32 power = 0;
    for (int i = -LOOK_BACK; i < FRAME - LOOK_BACK; ++i) power = l_mac(power, in_buf[i], in_buf[i]);

    if (power < POW_PITCH) st->pitch &= 0x3fff;
    if (power < POW_COMPLEX) st->complex_low &= 0x3fff;

    Word16 level[VAD_BANDS];
    filter_bank(st, in_buf, level);
    return decide(st, level, power);
}

}  // namespace vamrnb

extern "C" int16_t vamrnbe_lev_calculation(const int16_t *data, int32_t count1, int32_t count2,
                                           int32_t step, int32_t start, int32_t scale,
                                           int16_t *sub_level) {
    return vamrnb::band_level(data, count1, count2, step, start, scale, sub_level);
}
