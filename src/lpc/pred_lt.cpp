// Adaptive-codebook vector: the past excitation at an integer delay plus a
// fraction (1/3 or 1/6 resolution), interpolated with the 1/6-resolution
// FIR of 2 × 10 taps.  Outputs overwrite exc[0..39] in order, so with a delay
// shorter than the subframe later outputs read earlier ones.
#include "lpc/dsp.h"
#include "lpc/kernel_common.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {

void pred_lt_3or6_c(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc) {
    Word16 c1[10], c2[10];
    const Word16 *x0 = enc_kernel::pred_lt_taps(T0, frac, flag3, exc, c1, c2);
    for (int j = 0; j < L_SUBFR; ++j) {
        const Word16 *x1 = x0 + j;
        const Word16 *x2 = x0 + j + 1;
        Word32 s = 0;
        for (int i = 0; i < L_INTERPOL - 1; ++i) {
            s = l_mac(s, x1[-i], c1[i]);
            s = l_mac(s, x2[i], c2[i]);
        }
        exc[j] = round16(s);
    }
}

}  // namespace vamrnb

extern "C" void vamrnb_pred_lt_3or6(int32_t T0, int32_t frac, int32_t flag3, int16_t *exc) {
    vamrnb::dsp().pred_lt_3or6(T0, frac, flag3, exc);
}
