// Shared LPC, gain and filter routines used by both the encoder and the
// decoder: LSP/LSF/LPC conversions and interpolation, the code-gain predictor
// and median, and the subframe kernels (synthesis, residual, weighting,
// fractional pitch prediction, energy, dot product).  Exported with C linkage;
// their C declarations live in the public building-block header.
#pragma once

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"  // C declarations of the routines and kernels below

namespace vamrnb {
inline constexpr int M = 10;          // LPC order
inline constexpr int MP1 = M + 1;     // coefficients per LPC set
inline constexpr int L_SUBFR = 40;    // samples per subframe
inline constexpr int L_FRAME = 160;   // samples per frame
inline constexpr int PIT_MAX = 143;
inline constexpr int L_INTERPOL = 11; // 10 + 1
}  // namespace vamrnb

namespace vamrnb {
// Sum/difference polynomial of an LSP set (reads lsp[0], lsp[2], ..., lsp[8]).
void get_sp_pol(const Word16 *lsp, Word32 f[6]);
}  // namespace vamrnb
