// checkasm: every vector version of every kernel against its portable
// version.  For each kernel and each level the processor offers (x86:
// SSE4.1, then AVX2 on top; ARM: NEON, with its A64 forms on AArch64), the
// version that level newly installs is called on the same random and rail
// inputs as the portable one; outputs are compared including guard bands
// before and after every output buffer, so a version that writes past its buffer fails even when
// the samples it should write are right.
//
//   vamrnb_checkasm [--seed=N] [--function=GLOB] [--bench] [--runs=N]
//                   [--calls=N --version=c|new]
//
// --bench prints nanoseconds per call of each version beside the portable
// one.  Under an emulator the times are the emulator's; count instructions
// instead: --calls=N --version=c (or new) skips the checks and makes exactly
// N calls of that version of each selected kernel, so that the difference
// between the emulator's instruction counts for N and for 0 calls, divided
// by N, is the cost of one call (scripts/checkasm_count.sh).
#pragma once

#include <cstdint>
#include <cstring>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "lpc/dsp.h"

namespace checkasm {

using vamrnb::DspKernels;

// Inputs mixing plain random values, full-scale rails and small values.
struct Gen {
    std::mt19937 rng;
    explicit Gen(uint32_t seed) : rng(seed) {}
    int16_t sample(int mode);
    void fill(int16_t *p, int n, int mode) {
        for (int i = 0; i < n; ++i) p[i] = sample(mode);
    }
    int32_t word(int mode);
    uint32_t below(uint32_t n) { return rng() % n; }
};

// An output buffer with guard bands: `n` elements between kGuard elements on
// either side, all pre-filled with one random pattern.  Two buffers built
// from the same generator state compare equal as a whole only if the
// versions wrote the same values to the same places.
template <class T>
class Buf {
public:
    static constexpr int kGuard = 16;
    Buf(int n, uint32_t pattern) : v_(n + 2 * kGuard) {
        std::mt19937 r(pattern);
        for (auto &x : v_) x = static_cast<T>(r());
    }
    T *data() { return v_.data() + kGuard; }
    bool operator==(const Buf &o) const { return v_ == o.v_; }
    // Copies the first n elements of p into the buffer (inputs that are also
    // outputs: filter memories, excitation histories).
    void load(const T *p, int n) { std::memcpy(data(), p, n * sizeof(T)); }

private:
    std::vector<T> v_;
};

// Calls run(out) once for the portable version and once for the new one,
// each on a guarded buffer of n elements whose first n_in elements are
// copied from `in` (filter memories, excitation histories), and compares the
// two buffers as a whole.  `run(out, ref)` picks the version by `ref`.
template <class T, class Run>
bool same_output(Gen &g, int n, const T *in, int n_in, Run run) {
    const uint32_t pat = g.rng();
    Buf<T> ref(n, pat), out(n, pat);
    if (n_in > 0) {
        ref.load(in, n_in);
        out.load(in, n_in);
    }
    const auto want = run(ref.data(), true);
    const auto got = run(out.data(), false);
    return want == got && ref == out;
}

class Checker {
public:
    Checker(uint32_t seed, std::string pattern, bool bench, int runs);
    // Call-counting mode (see the file comment); version_new: the level's
    // version rather than the portable one.
    void count_calls(long calls, bool version_new) {
        calls_ = calls;
        version_new_ = version_new;
    }

    // Checks every version of the kernel stored in `member` that a level
    // newly installs: same(fn, t) compares it with the portable version on
    // input number t, for t below n (times --runs).  Then, with --bench, it
    // sets ordinary inputs (typical) and times call(portable) against
    // call(fn).
    template <class Fn>
    void kernel(const char *name, Fn DspKernels::*member, int n, const std::function<bool(Fn, int)> &same,
                const std::function<void()> &typical, const std::function<void(Fn)> &call) {
        for_each_version(name, [&](const DspKernels &k, const DspKernels &below, const char *level) {
            const Fn fn = k.*member, ref = vamrnb::dsp_for(0).*member;
            if (fn == below.*member) return;   // nothing new at this level
            bool ok = true;
            for (int t = 0; t < n * runs(); ++t)
                if (!same(fn, t)) ok = fail("input " + std::to_string(t));
            typical();
            if (calls_ >= 0) {
                for (long i = 0; i < calls_; ++i) call(version_new_ ? fn : ref);
                return;
            }
            report(name, level, ok);
            if (bench_) bench(name, level, [&] { call(ref); }, [&] { call(fn); });
        });
    }

    Gen &gen() { return gen_; }
    // How many rounds of random inputs each check makes (none when only
    // counting calls: the inputs then stay zero).
    int runs() const { return calls_ >= 0 ? 0 : runs_; }
    // Notes one failing input (printed with the kernel's result line).
    bool fail(const std::string &what);
    int failures() const { return failures_; }
    bool selected(const char *name) const;
    // Prints the result line of one kernel at one level (with the notes).
    void report(const char *name, const char *level, bool ok);

private:
    void for_each_version(const char *name,
                          const std::function<void(const DspKernels &, const DspKernels &, const char *)> &each);
    void bench(const char *name, const char *level, const std::function<void()> &ref,
               const std::function<void()> &fn);

    Gen gen_;
    std::string pattern_;
    bool bench_;
    int runs_;
    int failures_ = 0;
    long calls_ = -1;
    bool version_new_ = false;
    std::vector<std::string> notes_;
};

// The kernel checks (kernels.cpp).
void check_kernels(Checker &c);

}  // namespace checkasm
