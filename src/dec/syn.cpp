// Synthesis bookkeeping of a decoded subframe: when the first synthesis
// overflowed, the excitation history is scaled down by 4 and the subframe is
// synthesised again; then the excitation history moves on by one subframe and
// the next subframe's LPC set and pitch lag are taken up.
#include <cstring>

#include "dec/dec_state.h"
#include "lpc/lpc.h"

using namespace vamrnb;

extern "C" void vamrnbd_syn(dec_state *st, dec_work *w, int32_t i_subfr) {
    if (w->syn_overflow != 0) {
        for (int i = 0; i < DEC_EXC_OFFSET + L_SUBFR; ++i) st->old_exc[i] = shr(st->old_exc[i], 2);
        for (int i = 0; i < L_SUBFR; ++i) w->exc_enhanced[i] = shr(w->exc_enhanced[i], 2);
        Word16 *buf = w->synth_buf + i_subfr;
        vamrnb_syn_filt(w->Az_cur, w->exc_enhanced, buf, buf + M);
    }
    // (otherwise the filter memory is simply the last 10 outputs in synth_buf)
    std::memmove(st->old_exc, st->old_exc + L_SUBFR, DEC_EXC_OFFSET * sizeof(Word16));
    w->Az_cur += MP1;
    st->old_T0 = w->T0;
}
