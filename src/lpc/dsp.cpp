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
};

std::atomic<uint32_t> g_mask{~0u};
std::atomic<const DspKernels *> g_active{nullptr};

const DspKernels *select(uint32_t flags) {
    (void)flags;
    return &kScalar;
}

}  // namespace

uint32_t cpu_detect() {
    uint32_t f = 0;
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
