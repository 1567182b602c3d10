// Run-time selection of the subframe kernels.  Every kernel has a portable
// version (the `_c` functions, the definition of its result) and may have
// vector versions for SSE4.1, AVX2 or NEON that produce identical bits.
//
// A kernel table is filled with the portable versions first; then the init
// function of the build's architecture (x86/dsp_x86.h, arm/dsp_arm.h)
// replaces entries level by level, stopping at the first level the allowed
// features lack.  So a new kernel is one entry here, one `_c` function and
// one line per level; a new level is one block in its architecture's init.
#pragma once

#include <cstdint>

#include "basic_op/basic_op.h"

namespace vamrnb {

// Feature bits; equal to the public VAMRNB_CPU_* values.  On x86 the levels
// build on each other: AVX2 versions are used only together with SSE4.1.
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
// Lag loop of the normalised correlation: the energy of each of n_lags
// filtered excitations and its correlation with xn (both as saturating
// sums from 0), the first being excf, each next one formed from the last by
// the sample x_new[-i] entering through h (the sums already scaled down by
// `scaling` bits, 0 or 2).
using NormCorrSumsFn = void (*)(const Word16 *excf, const Word16 *xn, const Word16 *h,
                                const Word16 *x_new, Word32 n_lags, Word32 scaling,
                                Word32 *energy, Word32 *dot);

// One entry per kernel; the exported function of the same name (vamrnb_*,
// vamrnbe_*) calls through the table in use.
struct DspKernels {
    SynFiltFn syn_filt;
    SynFiltMFn syn_filt_m;
    ResiduFn residu;
    PredLtFn pred_lt_3or6;
    EnergyFn energy;
    InnerProductFn inner_product;
    CompCorrFn comp_corr;
    ConvolveFn convolve;
    VqSubvecFn vq_subvec;
    VqSubvecFn vq_subvec_s;
    VqSubvec4Fn vq_subvec4;
    CorHxFn cor_h_x;
    NormCorrSumsFn norm_corr_sums;
};

// The kernel set in use (selected on first call).
const DspKernels &dsp();

// The kernel set for the given feature bits (bits the build or the processor
// lacks are ignored).  Used by checkasm to run every level side by side.
const DspKernels &dsp_for(uint32_t flags);

// Features of this processor that the build has vector code for.
uint32_t cpu_detect();

// Declares one version of every kernel, named <kernel>_<suffix>.  Each
// architecture header declares its levels with it and installs, in its init
// function, the versions it defines; the others are never referenced.
#define VAMRNB_DECL_KERNELS(sfx)                                                                   \
    void syn_filt_##sfx(const Word16 *a, const Word16 *x, const Word16 *mem, Word16 *y);           \
    void syn_filt_m_##sfx(const Word16 *a, const Word16 *x, Word32 *overflow, Word16 *buf);        \
    void residu_##sfx(const Word16 *a, const Word16 *x, Word16 *y);                                \
    void pred_lt_3or6_##sfx(Word32 T0, Word32 frac, Word32 flag3, Word16 *exc);                    \
    Word32 energy_##sfx(const Word16 *x, Word32 n, Word32 init);                                   \
    Word32 inner_product_##sfx(const Word16 *x, const Word16 *y, Word32 n, Word32 init);           \
    void comp_corr_##sfx(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr); \
    void convolve_##sfx(const Word16 *x, const Word16 *h, Word16 *y);                              \
    int16_t vq_subvec_##sfx(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,          \
                            const Word16 *w2, Word32 size);                                        \
    int16_t vq_subvec_s_##sfx(Word16 *r1, Word16 *r2, const Word16 *dico, const Word16 *w1,        \
                              const Word16 *w2, Word32 size);                                      \
    int16_t vq_subvec4_##sfx(Word16 *r, const Word16 *dico, const Word16 *w, Word32 size);         \
    void cor_h_x_##sfx(const Word16 *h, const Word16 *x, Word16 *dn, Word32 sf);                \
    void norm_corr_sums_##sfx(const Word16 *excf, const Word16 *xn, const Word16 *h,              \
                              const Word16 *x_new, Word32 n_lags, Word32 scaling, Word32 *energy, \
                              Word32 *dot);

// The portable versions, each defined beside the stage that owns it.
VAMRNB_DECL_KERNELS(c)

}  // namespace vamrnb
