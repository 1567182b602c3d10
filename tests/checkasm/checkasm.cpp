// The checkasm driver: levels, seed, function selection, reports, timing.
#include "checkasm.h"

#include <fnmatch.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>

#include "vamrnb.h"

namespace checkasm {

int16_t Gen::sample(int mode) {
    std::uniform_int_distribution<int> d(-32768, 32767);
    switch (mode % 4) {
        case 0: return static_cast<int16_t>(d(rng));
        case 1: return d(rng) & 1 ? 32767 : -32768;
        case 2: return static_cast<int16_t>(d(rng) >> 6);
        default: {
            const int r = d(rng) & 7;
            return r == 0 ? -32768 : r == 1 ? 32767 : static_cast<int16_t>(d(rng) >> 3);
        }
    }
}

int32_t Gen::word(int mode) {
    std::uniform_int_distribution<int32_t> d(INT32_MIN, INT32_MAX);
    const int32_t rails[] = {INT32_MIN, INT32_MAX, 0, -1, 1, INT32_MAX - 1, INT32_MIN + 1};
    return mode % 3 == 0 ? rails[d(rng) & 3 ? (d(rng) & 0x7fffffff) % 7 : 2] : d(rng) >> (mode % 5 * 6);
}

namespace {

struct Level {
    const char *name;
    uint32_t flags;
    int below;   // index of the level this one builds on
};

// Each architecture's levels in the order its init function walks them.
constexpr Level kLevels[] = {
    {"c", 0, 0},
    {"sse4.1", vamrnb::kCpuSse41, 0},
    {"avx2", vamrnb::kCpuSse41 | vamrnb::kCpuAvx2, 1},
#if defined(__aarch64__)
    {"neon+a64", vamrnb::kCpuNeon, 0},   // the A64 forms replace some NEON ones
#else
    {"neon", vamrnb::kCpuNeon, 0},
#endif
};

}  // namespace

Checker::Checker(uint32_t seed, std::string pattern, bool bench, int runs)
    : gen_(seed), pattern_(std::move(pattern)), bench_(bench), runs_(runs) {}

bool Checker::selected(const char *name) const {
    return pattern_.empty() || fnmatch(pattern_.c_str(), name, 0) == 0;
}

bool Checker::fail(const std::string &what) {
    if (notes_.size() < 3) notes_.push_back(what);
    return false;
}

void Checker::for_each_version(
    const char *name, const std::function<void(const DspKernels &, const DspKernels &, const char *)> &each) {
    if (!selected(name)) return;
    const uint32_t have = vamrnb::cpu_detect();
    for (const Level &l : kLevels) {
        if (l.flags == 0 || (have & l.flags) != l.flags) continue;
        each(vamrnb::dsp_for(l.flags), vamrnb::dsp_for(kLevels[l.below].flags), l.name);
    }
}

void Checker::report(const char *name, const char *level, bool ok) {
    std::printf(" - %-14s %-8s %s\n", name, level, ok ? "ok" : "FAILED");
    for (const auto &n : notes_) std::printf("     %s\n", n.c_str());
    notes_.clear();
    if (!ok) ++failures_;
}

namespace {

// Nanoseconds per call: the best of five rounds of enough calls to take
// about 2 ms each.
double time_per_call(const std::function<void()> &fn) {
    using clock = std::chrono::steady_clock;
    long n = 1;
    for (;;) {
        const auto t0 = clock::now();
        for (long i = 0; i < n; ++i) fn();
        if (clock::now() - t0 > std::chrono::milliseconds(2) || n > (1l << 24)) break;
        n *= 2;
    }
    double best = 1e300;
    for (int round = 0; round < 5; ++round) {
        const auto t0 = clock::now();
        for (long i = 0; i < n; ++i) fn();
        const double ns = std::chrono::duration<double, std::nano>(clock::now() - t0).count() / n;
        best = ns < best ? ns : best;
    }
    return best;
}

}  // namespace

void Checker::bench(const char *name, const char *level, const std::function<void()> &ref,
                    const std::function<void()> &fn) {
    const double c = time_per_call(ref), v = time_per_call(fn);
    std::printf("   bench %-14s c %9.1f ns   %-8s %9.1f ns   x%.2f\n", name, c, level, v, c / v);
}

}  // namespace checkasm

int main(int argc, char **argv) {
    uint32_t seed = static_cast<uint32_t>(std::chrono::steady_clock::now().time_since_epoch().count());
    std::string pattern;
    bool bench = false;
    int runs = 1;
    long calls = -1;
    bool version_new = false;
    for (int i = 1; i < argc; ++i) {
        const std::string a = argv[i];
        if (a.rfind("--seed=", 0) == 0) {
            seed = static_cast<uint32_t>(std::strtoul(a.c_str() + 7, nullptr, 0));
        } else if (a.rfind("--function=", 0) == 0) {
            pattern = a.substr(11);
        } else if (a == "--bench") {
            bench = true;
        } else if (a.rfind("--calls=", 0) == 0) {
            calls = std::atol(a.c_str() + 8);
        } else if (a == "--version=c" || a == "--version=new") {
            version_new = a == "--version=new";
        } else if (a.rfind("--runs=", 0) == 0) {
            runs = std::atoi(a.c_str() + 7);
        } else {
            std::fprintf(stderr,
                         "usage: %s [--seed=N] [--function=GLOB] [--bench] [--runs=N]\n"
                         "  --seed=N        random inputs from seed N (default: from the clock)\n"
                         "  --function=GLOB only the kernels whose names match (e.g. 'vq_*')\n"
                         "  --bench         time each version against the portable one\n"
                         "  --runs=N        N times the default number of random inputs\n"
                         "  --calls=N       no checks: N calls of one version of each kernel\n"
                         "  --version=c|new the version --calls makes (default: c)\n",
                         argv[0]);
            return 2;
        }
    }
    if (runs < 1) runs = 1;
    std::printf("checkasm: seed %u, processor features 0x%x\n", seed, vamrnb::cpu_detect());
    checkasm::Checker c(seed, pattern, bench, runs);
    if (calls >= 0) {
        c.count_calls(calls, version_new);
        checkasm::check_kernels(c);
        return 0;
    }
    checkasm::check_kernels(c);
    if (c.failures() != 0) {
        std::printf("checkasm: %d FAILED (seed %u)\n", c.failures(), seed);
        return 1;
    }
    std::printf("checkasm: all versions match\n");
    return 0;
}
