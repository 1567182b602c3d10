// Encoder input stage: reduces the caller's samples to 13 bits (in the
// caller's own buffer) and runs the 80 Hz second-order high-pass filter with
// its built-in halving of the signal, writing the filtered frame into the
// newest part of the speech history.
#include "common/enc_state.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

// Filter step for one sample.  The recursive part uses the previous two
// outputs in double precision; the result is scaled by 8 and rounded.
inline Word16 hp_step(enc_state *st, Word16 x) {
    const Word16 x2 = st->x1;
    st->x1 = st->x0;
    st->x0 = x;

    Word32 acc = mpy_32_16(st->y1_hi, st->y1_lo, tab::pre_proc_a[1]);
    acc = l_add(acc, mpy_32_16(st->y2_hi, st->y2_lo, tab::pre_proc_a[2]));
    acc = l_mac(acc, st->x0, tab::pre_proc_b[0]);
    acc = l_mac(acc, st->x1, tab::pre_proc_b[1]);
    acc = l_mac(acc, x2, tab::pre_proc_b[2]);
    acc = l_shl(acc, 3);

    st->y2_hi = st->y1_hi;
    st->y2_lo = st->y1_lo;
    l_extract(acc, &st->y1_hi, &st->y1_lo);
    return round16(acc);
}

}  // namespace

extern "C" void vamrnbe_preproc(enc_state *st, enc_frame * /*fr*/, int16_t *in) {
    Word16 *out = st->old_speech + ENC_NEW_SPEECH;

    // Keep the 13 most significant bits; the caller sees the masked values.
    for (int i = 0; i < L_FRAME; ++i)
        in[i] = static_cast<Word16>(in[i] & ~7);

    for (int i = 0; i < L_FRAME; ++i)
        out[i] = hp_step(st, in[i]);
}
