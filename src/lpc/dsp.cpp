// Kernel table selection.  One table per combination of the three feature
// bits is built once (portable entries first, then the architecture's
// levels); the one in use is kept in an atomic pointer, chosen on the first
// kernel call from the detected features and re-chosen whenever the caller
// changes the allowed-feature mask.
#include "lpc/dsp.h"

#include <array>
#include <atomic>

#include "lpc/arm/dsp_arm.h"
#include "lpc/x86/dsp_x86.h"
#include "vamrnb.h"

namespace vamrnb {
namespace {

constexpr uint32_t kAllFlags = kCpuSse41 | kCpuAvx2 | kCpuNeon;

DspKernels build(uint32_t flags) {
    DspKernels c{};
    c.syn_filt = syn_filt_c;
    c.syn_filt_m = syn_filt_m_c;
    c.residu = residu_c;
    c.pred_lt_3or6 = pred_lt_3or6_c;
    c.energy = energy_c;
    c.inner_product = inner_product_c;
    c.comp_corr = comp_corr_c;
    c.convolve = convolve_c;
    c.vq_subvec = vq_subvec_c;
    c.vq_subvec_s = vq_subvec_s_c;
    c.vq_subvec4 = vq_subvec4_c;
    c.cor_h_x = cor_h_x_c;
    c.norm_corr_sums = norm_corr_sums_c;
#if defined(VAMRNB_DSP_X86)
    dsp_init_x86(c, flags);
#endif
#if defined(VAMRNB_DSP_NEON)
    dsp_init_arm(c, flags);
#endif
    (void)flags;
    return c;
}

const DspKernels *select(uint32_t flags) {
    static const std::array<DspKernels, kAllFlags + 1> tables = [] {
        std::array<DspKernels, kAllFlags + 1> t{};
        for (uint32_t f = 0; f <= kAllFlags; ++f) t[f] = build(f);
        return t;
    }();
    return &tables[flags & kAllFlags];
}

std::atomic<uint32_t> g_mask{~0u};
std::atomic<const DspKernels *> g_active{nullptr};

}  // namespace

uint32_t cpu_detect() {
    uint32_t f = 0;
#if defined(VAMRNB_DSP_X86)
    __builtin_cpu_init();
    if (__builtin_cpu_supports("sse4.1")) f |= kCpuSse41;
    if (__builtin_cpu_supports("avx2")) f |= kCpuAvx2;
#endif
#if defined(VAMRNB_DSP_NEON)
    f |= kCpuNeon;   // the build itself requires NEON
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
