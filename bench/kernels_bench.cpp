// Subframe kernels, portable version against each vector version this
// processor runs.  Arguments: the kernel set (0 = portable, then the
// VAMRNB_CPU_* bits); sets the processor lacks are skipped.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <random>

#include "enc/enc_state.h"
#include "enc/subframe.h"
#include "lpc/dsp.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

struct Data {
    int16_t a[11];
    int16_t x[200];
    int16_t y[200];
    int16_t mem[10];
    Data() {
        std::mt19937 rng(1);
        std::uniform_int_distribution<int> d(-4000, 4000);
        const int16_t filt[11] = {4096, -5000, 3000, -1500, 800, -400, 200, -100, 50, -25, 12};
        for (int i = 0; i < 11; ++i) a[i] = filt[i];
        for (auto &v : x) v = static_cast<int16_t>(d(rng));
        for (auto &v : y) v = static_cast<int16_t>(d(rng));
        for (auto &v : mem) v = static_cast<int16_t>(d(rng));
    }
};

const Data &data() {
    static const Data d;
    return d;
}

// The kernel set for the benchmark's argument, or null to skip.
const DspKernels *kernels(benchmark::State &state) {
    const auto flags = static_cast<uint32_t>(state.range(0));
    if ((cpu_detect() & flags) != flags) {
        state.SkipWithError("not supported by this processor");
        return nullptr;
    }
    return &dsp_for(flags);
}

void BM_syn_filt(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    int16_t y[40];
    for (auto _ : state) {
        k->syn_filt(d.a, d.x, d.mem, y);
        benchmark::DoNotOptimize(y);
    }
}

void BM_syn_filt_m(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    int16_t buf[50] = {};
    int32_t ovf = 0;
    for (auto _ : state) {
        k->syn_filt_m(d.a, d.x, &ovf, buf);
        benchmark::DoNotOptimize(buf);
    }
}

void BM_residu(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    int16_t y[40];
    for (auto _ : state) {
        k->residu(d.a, d.x + 10, y);
        benchmark::DoNotOptimize(y);
    }
}

void BM_pred_lt_3or6(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    int16_t exc[200];
    for (auto _ : state) {
        state.PauseTiming();
        for (int i = 0; i < 200; ++i) exc[i] = data().x[i];
        state.ResumeTiming();
        k->pred_lt_3or6(57, 1, 1, exc + 150);
        benchmark::DoNotOptimize(exc);
    }
}

void BM_energy(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    for (auto _ : state) benchmark::DoNotOptimize(k->energy(d.x, 160, 0));
}

void BM_inner_product(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    for (auto _ : state) benchmark::DoNotOptimize(k->inner_product(d.x, d.y, 40, 0));
}

// Encoder kernels: the portable set has no entry (the encoder's own loop
// runs); it is reached through the exported function with vector code off.
void BM_comp_corr(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    int16_t sig[143 + 160];
    for (int i = 0; i < 303; ++i) sig[i] = static_cast<int16_t>(data().x[i % 200] >> 2);
    int32_t corr[144];
    const uint32_t before = vamrnb_set_cpu_flags(static_cast<uint32_t>(state.range(0)));
    for (auto _ : state) {
        if (k->comp_corr) k->comp_corr(sig + 143, 160, 143, 20, corr + 143);
        else vamrnbe_comp_corr(sig + 143, 160, 143, 20, corr + 143);
        benchmark::DoNotOptimize(corr);
    }
    vamrnb_set_cpu_flags(before);
}

void BM_convolve(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    int16_t y[40];
    const uint32_t before = vamrnb_set_cpu_flags(static_cast<uint32_t>(state.range(0)));
    for (auto _ : state) {
        if (k->convolve) k->convolve(d.x, d.y, y);
        else vamrnbe_convolve(d.x, d.y, y);
        benchmark::DoNotOptimize(y);
    }
    vamrnb_set_cpu_flags(before);
}

void BM_cor_h_x(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const Data &d = data();
    int16_t dn[40];
    const uint32_t before = vamrnb_set_cpu_flags(static_cast<uint32_t>(state.range(0)));
    for (auto _ : state) {
        if (k->cor_h_x) k->cor_h_x(d.y, d.x, dn, 1);
        else vamrnbe_cor_h_x(d.y, d.x, dn, 1);
        benchmark::DoNotOptimize(dn);
    }
    vamrnb_set_cpu_flags(before);
}

void BM_vq_subvec4_512(benchmark::State &state) {
    const DspKernels *k = kernels(state);
    if (!k) return;
    const int16_t w[4] = {3000, 2800, 2500, 2000};
    const uint32_t before = vamrnb_set_cpu_flags(static_cast<uint32_t>(state.range(0)));
    for (auto _ : state) {
        int16_t r[4] = {120, -340, 55, 17};
        benchmark::DoNotOptimize(k->vq_subvec4 ? k->vq_subvec4(r, tab::q_plsf_3_dico3_lsf, w, 512)
                                               : vamrnbe_vq_subvec4(r, tab::q_plsf_3_dico3_lsf, w, 512));
    }
    vamrnb_set_cpu_flags(before);
}

void sets(benchmark::internal::Benchmark *b) {
    b->ArgName("cpu");
    for (int64_t flags : {int64_t{0}, int64_t{kCpuSse41}, int64_t{kCpuAvx2 | kCpuSse41}, int64_t{kCpuNeon}})
        b->Arg(flags);
}

}  // namespace

BENCHMARK(BM_syn_filt)->Apply(sets);
BENCHMARK(BM_syn_filt_m)->Apply(sets);
BENCHMARK(BM_residu)->Apply(sets);
BENCHMARK(BM_pred_lt_3or6)->Apply(sets);
BENCHMARK(BM_energy)->Apply(sets);
BENCHMARK(BM_inner_product)->Apply(sets);
BENCHMARK(BM_comp_corr)->Apply(sets);
BENCHMARK(BM_convolve)->Apply(sets);
BENCHMARK(BM_cor_h_x)->Apply(sets);
BENCHMARK(BM_vq_subvec4_512)->Apply(sets);
