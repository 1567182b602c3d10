// Kernel table selection.  The tables are constant; the one in use is kept in
// an atomic pointer, chosen on the first kernel call from the detected
// features and re-chosen whenever the caller changes the allowed-feature mask.
#include "lpc/dsp.h"

#include <atomic>

#include "vamrnb.h"

namespace vamrnb {
namespace {

constexpr DspKernels kScalar = {
    syn_filt_c, syn_filt_m_c, residu_c, pred_lt_3or6_c, energy_c, inner_product_c,
    nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,
};

#if defined(VAMRNB_DSP_X86)
constexpr DspKernels kSse41 = {
    syn_filt_c, syn_filt_m_sse41, residu_sse41, pred_lt_3or6_sse41, energy_sse41,
    inner_product_sse41, comp_corr_sse41, convolve_sse41,
    vq_subvec_sse41, vq_subvec_s_sse41, vq_subvec4_sse41, cor_h_x_sse41,
};
constexpr DspKernels kSse41Avx2 = {
    syn_filt_c, syn_filt_m_sse41, residu_avx2, pred_lt_3or6_avx2, energy_sse41,
    inner_product_sse41, comp_corr_avx2, convolve_avx2,
    vq_subvec_sse41, vq_subvec_s_sse41, vq_subvec4_sse41, cor_h_x_avx2,
};
// AVX2 allowed while SSE4.1 is masked off: only the AVX2 kernels.
constexpr DspKernels kAvx2Only = {
    syn_filt_c, syn_filt_m_c, residu_avx2, pred_lt_3or6_avx2, energy_c, inner_product_c,
    comp_corr_avx2, convolve_avx2, nullptr, nullptr, nullptr, cor_h_x_avx2,
};
#endif

#if defined(VAMRNB_DSP_NEON) && !defined(VAMRNB_DSP_A64)
constexpr DspKernels kNeon = {
    syn_filt_neon, syn_filt_m_neon, residu_neon, pred_lt_3or6_neon, energy_neon,
    inner_product_neon, comp_corr_neon, convolve_neon,
    vq_subvec_neon, vq_subvec_s_neon, vq_subvec4_neon, cor_h_x_neon,
};
#endif

#if defined(VAMRNB_DSP_A64)
// 64-bit ARM: the NEON set with its A64 forms where they exist.
constexpr DspKernels kNeonA64 = {
    syn_filt_neon, syn_filt_m_neon, residu_a64, pred_lt_3or6_a64, energy_neon,
    inner_product_a64, comp_corr_a64, convolve_a64,
    vq_subvec_neon, vq_subvec_s_neon, vq_subvec4_neon, cor_h_x_a64,
};
#endif

std::atomic<uint32_t> g_mask{~0u};
std::atomic<const DspKernels *> g_active{nullptr};

const DspKernels *select(uint32_t flags) {
#if defined(VAMRNB_DSP_X86)
    const bool sse41 = flags & kCpuSse41, avx2 = flags & kCpuAvx2;
    if (sse41 && avx2) return &kSse41Avx2;
    if (sse41) return &kSse41;
    if (avx2) return &kAvx2Only;
#endif
#if defined(VAMRNB_DSP_A64)
    if (flags & kCpuNeon) return &kNeonA64;
#elif defined(VAMRNB_DSP_NEON)
    if (flags & kCpuNeon) return &kNeon;
#endif
    (void)flags;
    return &kScalar;
}

}  // namespace

uint32_t cpu_detect() {
    uint32_t f = 0;
#if defined(VAMRNB_DSP_X86)
    __builtin_cpu_init();
    if (__builtin_cpu_supports("sse4.1")) f |= kCpuSse41;
    if (__builtin_cpu_supports("avx2")) f |= kCpuAvx2;
#endif
#if defined(VAMRNB_DSP_NEON)
    f |= kCpuNeon;   // the build itself requires NEON (every AArch64 processor has it)
#endif
    return f;
}

const DspKernels &dsp_for(uint32_t flags) { return *select(flags & cpu_detect()); }

const DspKernels &dsp() {
    const DspKernels *k = g_active.load(std::memory_order_acquire);
    if (k != nullptr) return *k;
    k = select(cpu_detect() & g_mask.load(std::memory_order_relaxed));
    g_active.store(k, std::memory_order_release);
    return *k;
}

}  // namespace vamrnb

extern "C" uint32_t vamrnb_set_cpu_flags(uint32_t mask) {
    using namespace vamrnb;
    const uint32_t previous = g_mask.exchange(mask);
    g_active.store(select(cpu_detect() & mask), std::memory_order_release);
    return previous;
}
