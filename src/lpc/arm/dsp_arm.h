// The ARM kernel levels: declarations of the NEON versions (32-bit ARM with
// NEON and AArch64 alike) and the init function that installs them over the
// portable table.  Included by dsp.cpp and checkasm only.
#pragma once

#include "lpc/dsp.h"

#if defined(__ARM_NEON) || defined(__ARM_NEON__)
#define VAMRNB_DSP_NEON 1

namespace vamrnb {

void syn_filt_neon(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y);
void syn_filt_m_neon(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
void residu_neon(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_neon(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 energy_neon(const Word16 *x, Word32 n, Word32 init);
Word32 inner_product_neon(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
void comp_corr_neon(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_neon(const Word16 *x, const Word16 *h, Word16 *y);
int16_t vq_subvec_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                       const Word16 *w2, Word32 size);
int16_t vq_subvec_s_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                         const Word16 *w2, Word32 size);
int16_t vq_subvec4_neon(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);
void cor_h_x_neon(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);

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
}

}  // namespace vamrnb

#endif
