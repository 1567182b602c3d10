// Shared LPC, gain and filter routines used by both the encoder and the
// decoder: LSP/LSF/LPC conversions and interpolation, the code-gain predictor
// and median, and the subframe kernels (synthesis, residual, weighting,
// fractional pitch prediction, energy, dot product).  Exported with C linkage.
#pragma once

#include "basic_op/basic_op.h"
#include "vamrnb.h"

namespace vamrnb {
inline constexpr int M = 10;          // LPC order
inline constexpr int MP1 = M + 1;     // coefficients per LPC set
inline constexpr int L_SUBFR = 40;    // samples per subframe
inline constexpr int L_FRAME = 160;   // samples per frame
inline constexpr int PIT_MAX = 143;
inline constexpr int L_INTERPOL = 11; // 10 + 1
}  // namespace vamrnb

extern "C" {
// LSP / LSF / LPC conversion and interpolation
VAMRNB_API void    vamrnb_sf_sp(const int16_t lsf[10], const int16_t *table, int16_t lsp[10]);
VAMRNB_API void    vamrnb_lsp_lsf(const int16_t lsp[10], int16_t lsf[10]);
VAMRNB_API void    vamrnb_reorder(int16_t lsf[10]);
VAMRNB_API int32_t vamrnb_lsp_az(const int16_t lsp[10], int16_t a[11]);
VAMRNB_API void    vamrnb_int_lpc_1to3(const int16_t lsp_old[10], const int16_t lsp_new[10], int16_t Az[44]);
VAMRNB_API void    vamrnb_int_lpc_1and3(const int16_t lsp_old[10], const int16_t lsp_mid[10],
                                        const int16_t lsp_new[10], int16_t Az[44]);

// Code-gain prediction and median
VAMRNB_API void    vamrnb_gc_pred(const int16_t past_qua_en[4], const int16_t past_qua_en_MR122[4],
                                  int32_t mode, const int16_t code[40],
                                  int16_t *exp_gcode0, int16_t *frac_gcode0,
                                  int16_t *exp_en, int16_t *frac_en);
VAMRNB_API void    vamrnb_gc_pred_update(int16_t qua_ener_MR122, int16_t qua_ener,
                                         int16_t past_qua_en[4], int16_t past_qua_en_MR122[4]);
VAMRNB_API int16_t vamrnb_gmed_n(const int16_t *ind, int16_t n);

// Subframe kernels (L = 40, M = 10)
VAMRNB_API void    vamrnb_syn_filt(const int16_t a[11], const int16_t x[40], const int16_t mem[10], int16_t y[40]);
VAMRNB_API void    vamrnbd_syn_filt_m(const int16_t a[11], const int16_t x[40], int32_t *overflow, int16_t buf[50]);
VAMRNB_API void    vamrnb_residu(const int16_t a[11], const int16_t *x, int16_t y[40]);
VAMRNB_API void    vamrnb_weight_a(const int16_t *a, const int16_t *fac, int32_t m, int16_t *ap);
VAMRNB_API void    vamrnb_pred_lt_3or6(int32_t T0, int32_t frac, int32_t flag3, int16_t *exc);
VAMRNB_API int32_t vamrnb_energy(const int16_t *x, int32_t n, int32_t init);
VAMRNB_API int32_t vamrnb_inner_product(const int16_t *x, const int16_t *y, int32_t n, int32_t init);
}

namespace vamrnb {
// Sum/difference polynomial of an LSP set (reads lsp[0], lsp[2], ..., lsp[8]).
void get_sp_pol(const Word16 *lsp, Word32 f[6]);
}  // namespace vamrnb
