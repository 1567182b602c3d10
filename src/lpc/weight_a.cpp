// Bandwidth expansion of an LPC set: every coefficient after the first is
// scaled by its factor (a power of the weighting constant) with rounding.
#include "lpc/lpc.h"

using namespace vamrnb;

extern "C" void vamrnb_weight_a(const int16_t *a, const int16_t *fac, int32_t m, int16_t *ap) {
    ap[0] = a[0];
    for (int i = 1; i <= m; ++i) {
        // Plain 32-bit product; only (-32768)^2 would leave 16 bits.
        const Word32 p = wrap_add(wrap_mul(a[i], fac[i - 1]), 0x4000);
        ap[i] = wrap16(p >> 15);
    }
}
