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

}  // namespace vamrnb::syn
