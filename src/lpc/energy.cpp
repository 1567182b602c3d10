// Energy and dot-product sums.
//
// Energy: init + sum 2·x[i]^2 accumulated in eight saturating lanes (lane k
// takes samples k, k+8, ...; lane 0 starts from init), eight samples per
// step, the lanes then joined with saturating adds: lane k with lane k+4,
// then the first two of those with the last two, then the final pair.  The
// count is taken in whole steps of eight (n <= 0 still makes one step).
//
// Dot product: init followed by n sequential saturating multiply-accumulates.
#include "lpc/dsp.h"
#include "lpc/lpc.h"

namespace vamrnb {

Word32 energy_c(const Word16 *x, Word32 n, Word32 init) {
    Word32 lane[8] = {init, 0, 0, 0, 0, 0, 0, 0};
    const Word32 steps = n <= 0 ? 1 : (n + 7) / 8;
    for (Word32 s = 0; s < steps; ++s, x += 8)
        for (int k = 0; k < 8; ++k) lane[k] = l_mac(lane[k], x[k], x[k]);
    Word32 c[4];
    for (int k = 0; k < 4; ++k) c[k] = l_add(lane[k], lane[k + 4]);
    return l_add(l_add(c[0], c[2]), l_add(c[1], c[3]));
}

Word32 inner_product_c(const Word16 *x, const Word16 *y, Word32 n, Word32 init) {
    Word32 acc = init;
    for (Word32 i = 0; i < n; ++i) acc = l_mac(acc, x[i], y[i]);
    return acc;
}

}  // namespace vamrnb

extern "C" int32_t vamrnb_energy(const int16_t *x, int32_t n, int32_t init) {
    return vamrnb::dsp().energy(x, n, init);
}

extern "C" int32_t vamrnb_inner_product(const int16_t *x, const int16_t *y, int32_t n, int32_t init) {
    return vamrnb::dsp().inner_product(x, y, n, init);
}
