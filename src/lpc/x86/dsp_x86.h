// The x86 kernel levels: declarations of the SSE4.1 and AVX2 versions and the
// init function that installs them over the portable table, one level after
// the other.  Included by dsp.cpp and checkasm only.
#pragma once

#include "lpc/dsp.h"

#if defined(__x86_64__) || defined(__i386__)
#define VAMRNB_DSP_X86 1

namespace vamrnb {

void syn_filt_m_sse41(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
void residu_sse41(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_sse41(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 energy_sse41(const Word16 *x, Word32 n, Word32 init);
Word32 inner_product_sse41(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
void comp_corr_sse41(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_sse41(const Word16 *x, const Word16 *h, Word16 *y);
int16_t vq_subvec_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                        const Word16 *w2, Word32 size);
int16_t vq_subvec_s_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                          const Word16 *w2, Word32 size);
int16_t vq_subvec4_sse41(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);
void cor_h_x_sse41(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);

void residu_avx2(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_avx2(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
void comp_corr_avx2(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_avx2(const Word16 *x, const Word16 *h, Word16 *y);
void cor_h_x_avx2(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);

// The plain synthesis keeps its portable version at every level: its
// critical path is the output-to-output chain, which vectors do not shorten.
inline void dsp_init_x86(DspKernels &c, uint32_t flags) {
    if (!(flags & kCpuSse41)) return;
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

    if (!(flags & kCpuAvx2)) return;
    c.residu = residu_avx2;
    c.pred_lt_3or6 = pred_lt_3or6_avx2;
    c.comp_corr = comp_corr_avx2;
    c.convolve = convolve_avx2;
    c.cor_h_x = cor_h_x_avx2;
}

}  // namespace vamrnb

#endif
