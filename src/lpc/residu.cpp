// LPC inverse filtering (residual) over one 40-sample subframe: each output
// is the saturating Q12 dot product of the 11 coefficients with the current
// and ten past input samples, scaled by 8 with saturation and rounded.
#include "lpc/dsp.h"
#include "lpc/lpc.h"

namespace vamrnb {

void residu_c(const Word16 *a, const Word16 *x, Word16 *y) {
    for (int n = 0; n < L_SUBFR; ++n) {
        Word32 s = l_mult(x[n], a[0]);
        for (int i = 1; i <= M; ++i) s = l_mac(s, a[i], x[n - i]);
        y[n] = round16(l_shl(s, 3));
    }
}

}  // namespace vamrnb

extern "C" void vamrnb_residu(const int16_t a[11], const int16_t *x, int16_t y[40]) {
    vamrnb::dsp().residu(a, x, y);
}
