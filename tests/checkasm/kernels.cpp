// The kernel checks: one block per kernel, each with the inputs that drive
// its sums to the rails (full-scale samples, arbitrary filters) beside
// ordinary ones, the lengths and delays at the edges of each vector path,
// and the ties that decide the searches.
#include <string>

#include "checkasm.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"
#include "vamrnb.h"

using namespace vamrnb;

namespace checkasm {
namespace {

// A stable-ish Q12 filter, or an arbitrary one that drives the sums to the rails.
void filter(Gen &g, int16_t a[11], int mode) {
    g.fill(a + 1, 10, mode);
    if (mode % 3 != 0)
        for (int i = 1; i <= 10; ++i) a[i] = static_cast<int16_t>(a[i] >> (3 + i / 3));
    a[0] = mode % 5 == 4 ? g.sample(0) : 4096;
}

void check_filters(Checker &c) {
    Gen &g = c.gen();
    int16_t a[11] = {}, x[50] = {}, mem[10] = {}, buf[50] = {};
    Word32 ovf = 0;
    const auto inputs = [&](int t) {
        filter(g, a, t);
        if (t % 7 == 0) g.fill(a, 11, 1);   // all rails
        g.fill(x, 50, t / 4);
        g.fill(mem, 10, t / 8);
    };
    const auto typical = [&] { inputs(1); g.fill(x, 50, 2); g.fill(mem, 10, 2); };
    c.kernel<SynFiltFn>(
        "syn_filt", &DspKernels::syn_filt, 4000,
        [&](SynFiltFn fn, int t) {
            inputs(t);
            return same_output<int16_t>(g, 40, nullptr, 0, [&](int16_t *out, bool ref) {
                return (ref ? syn_filt_c : fn)(a, x, mem, out), 0;
            });
        },
        typical, [&](SynFiltFn fn) { fn(a, x, mem, buf); });
    // The overflow flag is an output too: it starts set or clear.
    c.kernel<SynFiltMFn>(
        "syn_filt_m", &DspKernels::syn_filt_m, 4000,
        [&](SynFiltMFn fn, int t) {
            inputs(t);
            return same_output<int16_t>(g, 50, mem, 10, [&](int16_t *out, bool ref) {
                Word32 flag = t & 1;
                (ref ? syn_filt_m_c : fn)(a, x, &flag, out);
                return flag;
            });
        },
        typical, [&](SynFiltMFn fn) { fn(a, x, &ovf, buf); });
    c.kernel<ResiduFn>(
        "residu", &DspKernels::residu, 4000,
        [&](ResiduFn fn, int t) {
            inputs(t);
            return same_output<int16_t>(g, 40, nullptr, 0, [&](int16_t *out, bool ref) {
                return (ref ? residu_c : fn)(a, x + 10, out), 0;
            });
        },
        typical, [&](ResiduFn fn) { fn(a, x + 10, buf); });
}

// Every delay from 1 (outputs reading outputs of the same step) to beyond
// the longest lag, with every fraction on both grids: nine per delay.
void check_pred_lt(Checker &c) {
    Gen &g = c.gen();
    int16_t hist[240] = {};
    c.kernel<PredLtFn>(
        "pred_lt_3or6", &DspKernels::pred_lt_3or6, 150 * 9,
        [&](PredLtFn fn, int t) {
            const int r = t % 9, T0 = 1 + t / 9 % 150, flag3 = r >= 6, frac = flag3 ? r - 7 : r - 2;
            g.fill(hist, 240, t);
            return same_output<int16_t>(g, 240, hist, 240, [&](int16_t *out, bool ref) {
                return (ref ? pred_lt_3or6_c : fn)(T0, frac, flag3, out + 200), 0;
            });
        },
        [&] { g.fill(hist, 240, 2); }, [&](PredLtFn fn) { fn(60, 1, 1, hist + 200); });
}

// Lengths around the eight-sample steps, none, negative; init on the rails.
void check_sums(Checker &c) {
    Gen &g = c.gen();
    const int lengths[] = {40, 160, 8, 1, 0, -3, 5, 39, 41, 159};
    int16_t x[168] = {}, y[168] = {};
    int n = 0;
    int32_t init = 0;
    const auto inputs = [&](int t) {
        g.fill(x, 168, t);
        g.fill(y, 168, t / 4 + 1);
        n = lengths[t % 10];
        init = g.word(t / 10);
    };
    const auto typical = [&] { g.fill(x, 168, 2); g.fill(y, 168, 2); };
    c.kernel<EnergyFn>(
        "energy", &DspKernels::energy, 6000,
        [&](EnergyFn fn, int t) { return inputs(t), fn(x, n, init) == energy_c(x, n, init); }, typical,
        [&](EnergyFn fn) { (void)fn(x, 40, 0); });
    c.kernel<InnerProductFn>(
        "inner_product", &DspKernels::inner_product, 6000,
        [&](InnerProductFn fn, int t) { return inputs(t), fn(x, y, n, init) == inner_product_c(x, y, n, init); },
        typical, [&](InnerProductFn fn) { (void)fn(x, y, 40, 0); });
}

// Encoder correlations.  Open loop: both frame lengths and several shortest
// lags, on full-scale (saturating) and scaled-down (exact-path) signals.
void check_correlations(Checker &c) {
    Gen &g = c.gen();
    int16_t sig[143 + 160] = {}, x[40] = {}, h[40] = {}, y[40];
    int32_t corr[144];
    c.kernel<CompCorrFn>(
        "comp_corr", &DspKernels::comp_corr, 300,
        [&](CompCorrFn fn, int t) {
            g.fill(sig, 303, t % 4 == 1 ? 2 : t);
            if (t % 3 == 0)
                for (auto &v : sig) v = static_cast<int16_t>(v >> 4);
            const int32_t len = t % 2 ? 160 : 80, lag_min = 18 + t % 5;
            return same_output<int32_t>(g, 144, nullptr, 0, [&](int32_t *out, bool ref) {
                return (ref ? comp_corr_c : fn)(sig + 143, len, 143, lag_min, out + 143), 0;
            });
        },
        [&] { g.fill(sig, 303, 2); }, [&](CompCorrFn fn) { fn(sig + 143, 160, 143, 20, corr + 143); });
    const auto inputs = [&](int t) {
        g.fill(x, 40, t);
        g.fill(h, 40, t / 4 + 2);
        if (t % 5 == 0) h[0] = 4096;
    };
    const auto typical = [&] { g.fill(x, 40, 2); g.fill(h, 40, 2); h[0] = 4096; };
    c.kernel<ConvolveFn>(
        "convolve", &DspKernels::convolve, 3000,
        [&](ConvolveFn fn, int t) {
            inputs(t);
            return same_output<int16_t>(g, 40, nullptr, 0, [&](int16_t *out, bool ref) {
                return (ref ? convolve_c : fn)(x, h, out), 0;
            });
        },
        typical, [&](ConvolveFn fn) { fn(x, h, y); });
    c.kernel<CorHxFn>(
        "cor_h_x", &DspKernels::cor_h_x, 3000,
        [&](CorHxFn fn, int t) {
            inputs(t);
            return same_output<int16_t>(g, 40, nullptr, 0, [&](int16_t *out, bool ref) {
                return (ref ? cor_h_x_c : fn)(h, x, out, 1 + t % 2), 0;
            });
        },
        typical, [&](CorHxFn fn) { fn(h, x, y, 2); });

    // Normalised-correlation lag loop: every lag count up to the widest
    // range, both scalings; rail-filled excitations and responses drive the
    // products past the clamp, the next excitation past 16 bits and the
    // correlation past the bound that allows summing in any order.
    int16_t excf[40] = {}, hist[80] = {};
    const auto ncf_inputs = [&](int t) {
        g.fill(excf, 40, t);
        g.fill(x, 40, t / 3 + 1);
        g.fill(h, 40, t / 5);
        g.fill(hist, 80, t / 7);
        if (t % 4 == 1) h[0] = 4096;
    };
    c.kernel<NormCorrSumsFn>(
        "norm_corr_sums", &DspKernels::norm_corr_sums, 4000,
        [&](NormCorrSumsFn fn, int t) {
            ncf_inputs(t);
            const int32_t n_lags = 1 + t % 40, scaling = t / 40 % 2 * 2;
            return same_output<int32_t>(g, 80, nullptr, 0, [&](int32_t *out, bool ref) {
                return (ref ? norm_corr_sums_c : fn)(excf, x, h, hist + 79, n_lags, scaling, out,
                                                     out + 40),
                       0;
            });
        },
        [&] { g.fill(excf, 40, 2); g.fill(x, 40, 2); g.fill(h, 40, 2); g.fill(hist, 80, 2); },
        [&](NormCorrSumsFn fn) { fn(excf, x, h, hist + 79, 20, 0, corr, corr + 40); });
}

// Split-VQ searches: a real codebook, small-valued ones full of ties (equal
// distances in different lanes, a row and its negation), rails where every
// distance saturates, and sizes that leave a scalar tail.
struct VqCase {
    const int16_t *dico;
    int size;
    int16_t r[4], w[4];
};

VqCase vq_case(Gen &g, std::vector<int16_t> &small, int t) {
    const int kind = t % 4;
    const int sizes[] = {64, 128, 256, 512};
    VqCase v{kind == 0 ? vamrnb_tbl_dico2_lsf : small.data(), kind == 0 ? 256 : kind == 3 ? 4 + 4 * (t % 7) : sizes[t % 4], {}, {}};
    if (kind != 0)
        for (auto &s : small) s = kind == 2 ? g.sample(1) : static_cast<int16_t>(static_cast<int>(g.below(5)) - 2);
    for (int k = 0; k < 4; ++k) {
        v.r[k] = kind == 2   ? g.sample(1)
                 : kind == 0 ? static_cast<int16_t>(static_cast<int>(g.below(4001)) - 2000)
                             : static_cast<int16_t>(static_cast<int>(g.below(7)) - 3);
        v.w[k] = kind == 2 ? g.sample(t / 4) : static_cast<int16_t>(g.below(9000));
    }
    return v;
}

template <class Fn, class Call>
void check_vq(Checker &c, const char *name, Fn DspKernels::*member, Fn ref_fn, Call call) {
    std::vector<int16_t> small(512 * 4);
    int16_t r[4];
    const int16_t w[4] = {4000, 3000, 2000, 1000};
    c.kernel<Fn>(
        name, member, 1500,
        [&](Fn fn, int t) {
            const VqCase v = vq_case(c.gen(), small, t);
            return same_output<int16_t>(c.gen(), 4, v.r, 4, [&](int16_t *rv, bool ref) {
                return call(ref ? ref_fn : fn, rv, v.dico, v.w, v.size);
            });
        },
        [] {},
        [&](Fn fn) {
            std::memcpy(r, vamrnb_tbl_dico2_lsf + 40, sizeof r);
            (void)call(fn, r, vamrnb_tbl_dico2_lsf, w, 256);
        });
}

void check_vq_searches(Checker &c) {
    const auto pair = [](VqSubvecFn f, int16_t *r, const int16_t *d, const int16_t *w, int n) {
        return f(r, r + 2, d, w, w + 2, n);
    };
    check_vq<VqSubvecFn>(c, "vq_subvec", &DspKernels::vq_subvec, vq_subvec_c, pair);
    check_vq<VqSubvecFn>(c, "vq_subvec_s", &DspKernels::vq_subvec_s, vq_subvec_s_c, pair);
    check_vq<VqSubvec4Fn>(c, "vq_subvec4", &DspKernels::vq_subvec4, vq_subvec4_c,
                          [](VqSubvec4Fn f, int16_t *r, const int16_t *d, const int16_t *w, int n) {
                              return f(r, d, w, n);
                          });
}

// The allowed-feature mask selects the table of its level for the exported
// entry points, and every table has every entry.
void check_dispatch(Checker &c) {
    if (!c.selected("dispatch")) return;
    bool ok = true;
    const uint32_t before = vamrnb_set_cpu_flags(0);
    for (uint32_t mask = 0; mask < 8; ++mask) {
        vamrnb_set_cpu_flags(mask);
        const DspKernels &k = dsp();
        const bool full = k.syn_filt && k.syn_filt_m && k.residu && k.pred_lt_3or6 && k.energy &&
                          k.inner_product && k.comp_corr && k.convolve && k.vq_subvec && k.vq_subvec_s &&
                          k.vq_subvec4 && k.cor_h_x && k.norm_corr_sums;
        if (&k != &dsp_for(mask) || !full) ok = c.fail("mask " + std::to_string(mask));
    }
    vamrnb_set_cpu_flags(before);
    c.report("dispatch", "all", ok);
}

}  // namespace

void check_kernels(Checker &c) {
    if (c.runs() > 0) check_dispatch(c);
    check_filters(c);
    check_pred_lt(c);
    check_sums(c);
    check_correlations(c);
    check_vq_searches(c);
}

}  // namespace checkasm
