// The ARM kernel levels: declarations of the NEON versions (32-bit ARM with
// NEON and AArch64 alike), of the A64 versions (AArch64 only), and the init
// function that installs them over the portable table.  Included by dsp.cpp
// and the ARM kernel files.
#pragma once

#include "lpc/dsp.h"

#if defined(__ARM_NEON) || defined(__ARM_NEON__)
#define VAMRNB_DSP_NEON 1

namespace vamrnb {

VAMRNB_DECL_KERNELS(neon)
#if defined(__aarch64__)
VAMRNB_DECL_KERNELS(a64)
#endif

inline void dsp_init_arm(DspKernels &c, uint32_t flags) {
    if (!(flags & kCpuNeon)) return;
    c.syn_filt = syn_filt_neon;
    c.syn_filt_m = syn_filt_m_neon;
    c.residu = residu_neon;
    c.pred_lt_3or6 = pred_lt_3or6_neon;
    c.energy = energy_neon;
    c.inner_product = inner_product_neon;
    c.comp_corr = comp_corr_neon;
    c.convolve = convolve_neon;
    c.vq_subvec = vq_subvec_neon;
    c.vq_subvec_s = vq_subvec_s_neon;
    c.vq_subvec4 = vq_subvec4_neon;
    c.cor_h_x = cor_h_x_neon;
    c.norm_corr_sums = norm_corr_sums_neon;
#if defined(__aarch64__)
    // Every AArch64 processor has the vector unit, so the A64 forms belong
    // to the same level.  The other kernels have no A64 versions of their
    // own: their shared helpers (simd_arm.h) and a few #if blocks take the
    // A64 forms there.
    c.residu = residu_a64;
    c.pred_lt_3or6 = pred_lt_3or6_a64;
#endif
}

}  // namespace vamrnb

#endif
