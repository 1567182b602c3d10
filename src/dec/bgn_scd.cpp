// Background-noise detection of the decoder: classifies each decoded speech
// frame as stationary background noise from its energy relative to the
// recent frame energies, and tracks how long ago the signal was voiced from
// the median of the recent pitch gains.
#include "dec/dec_state.h"

#include "lpc/lpc.h"

using namespace vamrnb;

namespace {
constexpr int HIST = 60;
constexpr Word16 FRAME_ENERGY_LIMIT = 17578;
constexpr Word16 LOWER_NOISE_LIMIT = 20;
constexpr Word16 UPPER_NOISE_LIMIT = 1953;
}  // namespace

extern "C" int16_t vamrnbd_bgn_scd(dec_state *st, const int16_t ltpGainHistory[9],
                                   const int16_t speech[160], int16_t *voicedHangover) {
    bgn_scd_state *b = &st->bgn;
    const Word16 curr = extract_h(l_shl(vamrnb_energy(speech, L_FRAME, 0), 2));

    Word16 min_e = 32767;
    for (int i = 0; i < HIST; ++i)
        if (b->frameEnergyHist[i] < min_e) min_e = b->frameEnergyHist[i];
    const Word16 noise_floor = shl(min_e, 4);
    Word16 max_e = b->frameEnergyHist[0];
    for (int i = 1; i < HIST - 4; ++i)
        if (max_e < b->frameEnergyHist[i]) max_e = b->frameEnergyHist[i];
    Word16 max_last = b->frameEnergyHist[2 * HIST / 3];
    for (int i = 2 * HIST / 3 + 1; i < HIST; ++i)
        if (max_last < b->frameEnergyHist[i]) max_last = b->frameEnergyHist[i];

    if (max_e > LOWER_NOISE_LIMIT && curr < FRAME_ENERGY_LIMIT && curr > LOWER_NOISE_LIMIT &&
        (curr < noise_floor || max_last < UPPER_NOISE_LIMIT)) {
        b->bgHangover = b->bgHangover + 1 > 30 ? 30 : add(b->bgHangover, 1);
    } else {
        b->bgHangover = 0;
    }
    const Word16 in_noise = b->bgHangover > 1 ? 1 : 0;

    for (int i = 0; i < HIST - 1; ++i) b->frameEnergyHist[i] = b->frameEnergyHist[i + 1];
    b->frameEnergyHist[HIST - 1] = curr;

    // voicing: tighter threshold after some time in noise
    Word16 ltp_limit = 13926;
    if (b->bgHangover > 8) ltp_limit = 15565;
    if (b->bgHangover > 15) ltp_limit = 16383;
    bool voiced = vamrnb_gmed_n(ltpGainHistory + 4, 5) > ltp_limit;
    if (b->bgHangover > 20) voiced = vamrnb_gmed_n(ltpGainHistory, 9) > ltp_limit;
    if (voiced) {
        *voicedHangover = 0;
    } else {
        const Word16 t = add(*voicedHangover, 1);
        *voicedHangover = t > 10 ? 10 : t;
    }
    return in_noise;
}
