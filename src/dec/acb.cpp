// Adaptive codebook of the decoder: decodes the pitch lag of a subframe
// (sixth-sample resolution in MR122, third-sample resolution otherwise, with
// absolute and relative codes), conceals it in bad frames, and forms the
// adaptive-codebook vector in the excitation history by fractional delay.
#include "dec/dec_state.h"
#include "lpc/lpc.h"

namespace vamrnb {
namespace {

constexpr Word16 PIT_MIN = 20;
constexpr Word16 PIT_MIN_MR122 = 18;

// Third-sample resolution lag.  absolute: 8-bit (or 9-bit) index of the first
// and third subframes; otherwise relative to the window [t0_min, t0_max], with
// the short 4-bit code when short_code is set.
void lag3(Word16 index, Word16 t0_min, Word16 t0_max, bool absolute, Word16 T0_prev,
          bool short_code, Word16 *T0, Word16 *frac) {
    if (absolute) {
        if (index < 197) {
            *T0 = add(mult(add(index, 2), 10923), 19);
            *frac = add(sub(index, add(add(*T0, *T0), *T0)), 58);
        } else {
            *T0 = sub(index, 112);
            *frac = 0;
        }
        return;
    }
    if (!short_code) {
        Word16 i = sub(mult(add(index, 2), 10923), 1);
        *T0 = add(i, t0_min);
        *frac = sub(sub(index, 2), add(add(i, i), i));
        return;
    }
    // short code: lags around the previous one, the middle in thirds
    Word16 centre = T0_prev;
    if (sub(sub(centre, t0_min), 5) > 0) centre = add(t0_min, 5);
    if (sub(sub(t0_max, centre), 4) > 0) centre = sub(t0_max, 4);
    if (index < 4) {
        *T0 = add(sub(centre, 5), index);
        *frac = 0;
    } else if (index < 12) {
        Word16 i = sub(mult(sub(index, 5), 10923), 1);
        *T0 = add(i, centre);
        *frac = sub(sub(index, 9), add(add(i, i), i));
    } else {
        *T0 = add(add(sub(index, 12), centre), 1);
        *frac = 0;
    }
}

// Sixth-sample resolution lag of MR122; T0 holds the previous lag on entry
// for a relative index.
void lag6(Word16 index, bool absolute, Word16 *T0, Word16 *frac) {
    if (absolute) {
        if (index < 463) {
            *T0 = add(mult(add(index, 5), 5462), 17);
            Word16 t3 = add(add(*T0, *T0), *T0);
            *frac = add(sub(index, add(t3, t3)), 105);
        } else {
            *T0 = sub(index, 368);
            *frac = 0;
        }
        return;
    }
    Word16 t0_min = sub(*T0, 5);
    if (t0_min < PIT_MIN_MR122) t0_min = PIT_MIN_MR122;
    if (sub(add(t0_min, 9), PIT_MAX) > 0) t0_min = PIT_MAX - 9;
    Word16 i = sub(mult(add(index, 5), 5462), 1);
    *T0 = add(i, t0_min);
    Word16 i3 = add(add(i, i), i);
    *frac = sub(sub(index, 3), add(i3, i3));
}

}  // namespace
}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnbd_acb(dec_state *st, dec_work *w, int32_t mode, int32_t i_subfr,
                            const int16_t **cursor) {
    // The first subframe always carries an absolute lag, the third one too
    // except in the two lowest modes.
    const bool absolute = i_subfr == 0 || (i_subfr == 80 && mode != MR475 && mode != MR515);
    const Word16 index = *(*cursor)++;
    Word16 T0, frac;

    if (mode != MR122) {
        const Word16 low = mode == MR795 ? 10 : 5;
        const Word16 range = mode == MR795 ? 19 : 9;
        Word16 t0_min = sub(st->old_T0, low);
        if (t0_min < PIT_MIN) t0_min = PIT_MIN;
        Word16 t0_max = add(t0_min, range);
        if (t0_max > PIT_MAX) {
            t0_max = PIT_MAX;
            t0_min = sub(t0_max, range);
        }
        lag3(index, t0_min, t0_max, absolute, st->old_T0, mode <= MR67, &T0, &frac);
        st->T0_lagBuff = T0;
        if (w->bfi != 0) {
            // lost lag: grow the previous one slowly
            if (st->old_T0 < PIT_MAX) st->old_T0 = add(st->old_T0, 1);
            T0 = st->old_T0;
            frac = 0;
            if (st->inBackgroundNoise != 0 && st->voicedHangover > 4 && mode <= MR59)
                T0 = st->T0_lagBuff;
        }
        vamrnb_pred_lt_3or6(T0, frac, 1, st->exc);
    } else {
        T0 = st->old_T0;  // previous lag for a relative index
        lag6(index, absolute, &T0, &frac);
        if (!(w->bfi == 0 && (absolute || index < 61))) {
            st->T0_lagBuff = T0;
            T0 = st->old_T0;
            frac = 0;
        }
        vamrnb_pred_lt_3or6(T0, frac, 0, st->exc);
    }
    w->T0 = T0;
    w->T0_frac = frac;
}
