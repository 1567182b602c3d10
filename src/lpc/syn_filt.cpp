// Order-10 all-pole synthesis over one 40-sample subframe.  The filter sum is
// formed in 32-bit wrap-around arithmetic; each output is the sum scaled to
// Q0 and rounded, unless it falls outside the kernel's range window, where
// the output is clipped.  Two kernels differ in their window and in whether
// they report the clipping:
//   vamrnb_syn_filt      s > 0x07FFFFFF -> 32767, s < -0x08000000 -> -32768
//   vamrnbd_syn_filt_m   |s| >= 0x07FFFFFF -> +-32767/-32768 and flag = 1
// Positive sums just under the window (0x07FFF800 .. 0x07FFFFFF) pass the
// test and wrap to -32768 in the rounding; that is intended.
#include "lpc/dsp.h"
#include "lpc/lpc.h"
#include "lpc/syn_core.h"

namespace vamrnb {
namespace {

// s = a[0]·x - sum a[i]·y[n-i], plain 32-bit products and sums.
inline Word32 syn_sum(const Word16 *a, Word16 x, const Word16 *yn) {
    Word32 s = wrap_mul(a[0], x);
    for (int i = 1; i <= M; ++i) s = wrap_sub(s, wrap_mul(a[i], yn[-i]));
    return s;
}

}  // namespace

void syn_filt_c(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y) {
    Word16 buf[M + L_SUBFR];
    for (int i = 0; i < M; ++i) buf[i] = mem[i];
    for (int n = 0; n < L_SUBFR; ++n) buf[M + n] = syn::Plain::out(syn_sum(a, x[n], &buf[M + n]), nullptr);
    for (int n = 0; n < L_SUBFR; ++n) y[n] = buf[M + n];
}

void syn_filt_m_c(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf) {
    for (int n = 0; n < L_SUBFR; ++n)
        buf[M + n] = syn::Flagged::out(syn_sum(a, x[n], &buf[M + n]), overflow);
}

}  // namespace vamrnb

extern "C" void vamrnb_syn_filt(const int16_t a[11], const int16_t x[40], const int16_t mem[10],
                                int16_t y[40]) {
    vamrnb::dsp().syn_filt(a, x, mem, y);
}

extern "C" void vamrnbd_syn_filt_m(const int16_t a[11], const int16_t x[40], int32_t *overflow,
                                   int16_t buf[50]) {
    vamrnb::dsp().syn_filt_m(a, x, overflow, buf);
}
