// Pieces shared by every version of the synthesis kernels: the output rule
// for a filter sum under each kernel's range window.
#pragma once

#include "basic_op/basic_op.h"

namespace vamrnb::syn {

// Rounded Q0 sample of a sum that passed the range test (32-bit wrap-around).
inline Word16 round_wrap(Word32 s) { return wrap16(wrap_add(wrap_shl(s, 4), 0x8000) >> 16); }

// vamrnb_syn_filt: clip outside (-0x08000000 .. 0x07FFFFFF], no report.
struct Plain {
    static Word16 out(Word32 s, Word32 *) {
        if (s > 0x07FFFFFF) return MAX_16;
        if (s < -0x08000000) return MIN_16;
        return round_wrap(s);
    }
};

// vamrnbd_syn_filt_m: clip at |s| >= 0x07FFFFFF and raise the flag.
struct Flagged {
    static Word16 out(Word32 s, Word32 *overflow) {
        if (s >= 0x07FFFFFF) {
            *overflow = 1;
            return MAX_16;
        }
        if (s <= -0x07FFFFFF) {
            *overflow = 1;
            return MIN_16;
        }
        return round_wrap(s);
    }
};

// The four outputs of one vector step: p[k] holds lane k's sum over the
// outputs of earlier steps; the taps that reach outputs of this step
// (y[0..2] for the later lanes) are added here in order, as the portable
// filter would.
template <class Rule>
inline void finish4(const Word16 *a, const Word32 p[4], Word16 *y, Word32 *overflow) {
    y[0] = Rule::out(p[0], overflow);
    y[1] = Rule::out(wrap_sub(p[1], wrap_mul(a[1], y[0])), overflow);
    y[2] = Rule::out(wrap_sub(p[2], wrap_add(wrap_mul(a[1], y[1]), wrap_mul(a[2], y[0]))), overflow);
    y[3] = Rule::out(wrap_sub(p[3], wrap_add(wrap_add(wrap_mul(a[1], y[2]), wrap_mul(a[2], y[1])),
                                             wrap_mul(a[3], y[0]))),
                     overflow);
}

}  // namespace vamrnb::syn
