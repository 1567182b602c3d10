// The x86 kernel levels: declarations of the SSE4.1 and AVX2 versions and the
// init function that installs them over the portable table, one level after
// the other.  Included by dsp.cpp and the x86 kernel files.
#pragma once

#include "lpc/dsp.h"

#if defined(__x86_64__) || defined(__i386__)
#define VAMRNB_DSP_X86 1

namespace vamrnb {

VAMRNB_DECL_KERNELS(sse41)
VAMRNB_DECL_KERNELS(avx2)

inline void dsp_init_x86(DspKernels &c, uint32_t flags) {
    if (!(flags & kCpuSse41)) return;
    c.syn_filt = syn_filt_sse41;
    c.syn_filt_m = syn_filt_m_sse41;
    c.residu = residu_sse41;
    c.pred_lt_3or6 = pred_lt_3or6_sse41;
    c.energy = energy_sse41;
    c.inner_product = inner_product_sse41;
    c.comp_corr = comp_corr_sse41;
    c.convolve = convolve_sse41;
    c.vq_subvec = vq_subvec_sse41;
    c.vq_subvec_s = vq_subvec_s_sse41;
    c.vq_subvec4 = vq_subvec4_sse41;
    c.cor_h_x = cor_h_x_sse41;
    c.norm_corr_sums = norm_corr_sums_sse41;

    if (!(flags & kCpuAvx2)) return;
    c.residu = residu_avx2;
    c.pred_lt_3or6 = pred_lt_3or6_avx2;
    c.comp_corr = comp_corr_avx2;
    c.convolve = convolve_avx2;
    c.cor_h_x = cor_h_x_avx2;
}

}  // namespace vamrnb

#endif
