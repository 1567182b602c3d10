// Run-time selection of the subframe kernels.  Every kernel has a portable
// scalar version (the definition of its result) and may have vector versions
// for SSE4.1, AVX2 or NEON (with A64 forms on 64-bit ARM) that produce
// identical bits.  A table of function
// pointers per feature set is chosen once from the processor's features,
// restricted by the mask set with vamrnb_set_cpu_flags.
#pragma once

#include <cstdint>

#include "basic_op/basic_op.h"

namespace vamrnb {

// Feature bits; equal to the public VAMRNB_CPU_* values.
inline constexpr uint32_t kCpuSse41 = 1u << 0;
inline constexpr uint32_t kCpuAvx2 = 1u << 1;
inline constexpr uint32_t kCpuNeon = 1u << 2;

using SynFiltFn = void (*)(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y);
using SynFiltMFn = void (*)(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
using ResiduFn = void (*)(const Word16 *a, const Word16 *x, Word16 *y);
using PredLtFn = void (*)(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
using EnergyFn = Word32 (*)(const Word16 *x, Word32 n, Word32 init);
using InnerProductFn = Word32 (*)(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
using CompCorrFn = void (*)(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
using ConvolveFn = void (*)(const Word16 *x, const Word16 *h, Word16 *y);
using VqSubvecFn = int16_t (*)(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                               const Word16 *w2, Word32 size);
using CorHxFn = void (*)(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);
using VqSubvec4Fn = int16_t (*)(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);

struct DspKernels {
    SynFiltFn syn_filt;
    SynFiltMFn syn_filt_m;
    ResiduFn residu;
    PredLtFn pred_lt_3or6;
    EnergyFn energy;
    InnerProductFn inner_product;
    // Encoder kernels whose portable versions live with the encoder stages:
    // null in the portable set, so that the owner's exported function runs
    // its own loop; otherwise a vector version with identical results that
    // the exported function hands the call to.
    CompCorrFn comp_corr;   // as vamrnbe_comp_corr
    ConvolveFn convolve;    // as vamrnbe_convolve
    VqSubvecFn vq_subvec;   // as vamrnbe_vq_subvec
    VqSubvecFn vq_subvec_s; // as vamrnbe_vq_subvec_s
    VqSubvec4Fn vq_subvec4; // as vamrnbe_vq_subvec4
    CorHxFn cor_h_x;        // as vamrnbe_cor_h_x
};

// The kernel set in use (selected on first call).
const DspKernels &dsp();

// The kernel set for the given feature bits (bits the build or the processor
// lacks are ignored).  Used by the tests to run every version side by side.
const DspKernels &dsp_for(uint32_t flags);

// Features of this processor that the build has vector code for.
uint32_t cpu_detect();

// ---- portable versions ------------------------------------------------------
void syn_filt_c(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y);
void syn_filt_m_c(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
void residu_c(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_c(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 energy_c(const Word16 *x, Word32 n, Word32 init);
Word32 inner_product_c(const Word16 *x, const Word16 *y, Word32 n, Word32 init);

// ---- vector versions (defined only where the build targets them) -----------
#if defined(__x86_64__) || defined(__i386__)
#define VAMRNB_DSP_X86 1
void syn_filt_m_sse41(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
void residu_sse41(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_sse41(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 energy_sse41(const Word16 *x, Word32 n, Word32 init);
Word32 inner_product_sse41(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
void comp_corr_sse41(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_sse41(const Word16 *x, const Word16 *h, Word16 *y);
void cor_h_x_sse41(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);
void cor_h_x_avx2(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);
int16_t vq_subvec_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                        const Word16 *w2, Word32 size);
int16_t vq_subvec_s_sse41(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                          const Word16 *w2, Word32 size);
int16_t vq_subvec4_sse41(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);
void residu_avx2(const Word16 *a, const Word16 *x, Word16 *y);
void comp_corr_avx2(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_avx2(const Word16 *x, const Word16 *h, Word16 *y);
void pred_lt_3or6_avx2(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
#endif

#if defined(__ARM_NEON) || defined(__ARM_NEON__)
#define VAMRNB_DSP_NEON 1
void syn_filt_neon(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y);
void syn_filt_m_neon(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);
void residu_neon(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_neon(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 energy_neon(const Word16 *x, Word32 n, Word32 init);
Word32 inner_product_neon(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
void comp_corr_neon(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_neon(const Word16 *x, const Word16 *h, Word16 *y);
void cor_h_x_neon(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);
int16_t vq_subvec_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                       const Word16 *w2, Word32 size);
int16_t vq_subvec_s_neon(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,
                         const Word16 *w2, Word32 size);
int16_t vq_subvec4_neon(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);

// 64-bit ARM: versions that use A64-only instructions.
#if defined(__aarch64__)
#define VAMRNB_DSP_A64 1
void residu_a64(const Word16 *a, const Word16 *x, Word16 *y);
void pred_lt_3or6_a64(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);
Word32 inner_product_a64(const Word16 *x, const Word16 *y, Word32 n, Word32 init);
void comp_corr_a64(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr);
void convolve_a64(const Word16 *x, const Word16 *h, Word16 *y);
void cor_h_x_a64(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);
#endif
#endif

}  // namespace vamrnb
