// Every vector version of every kernel against the portable version, on the
// same random and rail inputs, compared bit for bit.  Versions the processor
// lacks are skipped (on the ARM build the NEON versions run under emulation).
#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "enc/enc_state.h"
#include "enc/subframe.h"
#include "lpc/dsp.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"
#include "vamrnb.h"

using namespace vamrnb;

namespace {

struct Version {
    std::string name;
    const DspKernels *k;
};

// Each distinct kernel set this processor can run, besides the portable one.
std::vector<Version> versions() {
    std::vector<Version> v;
    const DspKernels *scalar = &dsp_for(0);
    const std::pair<const char *, uint32_t> sets[] = {
        {"sse4.1", kCpuSse41}, {"avx2", kCpuAvx2}, {"sse4.1+avx2", kCpuSse41 | kCpuAvx2}, {"neon", kCpuNeon}};
    for (const auto &[name, flags] : sets) {
        if ((cpu_detect() & flags) != flags) continue;
        const DspKernels *k = &dsp_for(flags);
        if (k != scalar) v.push_back({name, k});
    }
    return v;
}

// Inputs mixing plain random values, full-scale rails and small values.
struct Gen {
    std::mt19937 rng;
    explicit Gen(unsigned seed) : rng(seed) {}
    int16_t sample(int mode) {
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
    void fill(int16_t *p, int n, int mode) {
        for (int i = 0; i < n; ++i) p[i] = sample(mode);
    }
    int32_t word(int mode) {
        std::uniform_int_distribution<int32_t> d(INT32_MIN, INT32_MAX);
        const int32_t rails[] = {INT32_MIN, INT32_MAX, 0, -1, 1, INT32_MAX - 1, INT32_MIN + 1};
        return mode % 3 == 0 ? rails[d(rng) & 3 ? (d(rng) & 0x7fffffff) % 7 : 2] : d(rng) >> (mode % 5 * 6);
    }
};

// A stable-ish Q12 filter, or an arbitrary one that drives the sums to the rails.
void filter(Gen &g, int16_t a[11], int mode) {
    g.fill(a + 1, 10, mode);
    if (mode % 3 != 0)
        for (int i = 1; i <= 10; ++i) a[i] = static_cast<int16_t>(a[i] >> (3 + i / 3));
    a[0] = mode % 5 == 4 ? g.sample(0) : 4096;
}

}  // namespace

TEST(Checkasm, SynFilt) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    Gen g(101);
    for (int t = 0; t < 4000; ++t) {
        int16_t a[11], x[40], mem[10], ref[40];
        filter(g, a, t);
        g.fill(x, 40, t / 4);
        g.fill(mem, 10, t / 8);
        syn_filt_c(a, x, mem, ref);
        int16_t buf_ref[50];
        std::memcpy(buf_ref, mem, sizeof mem);
        int32_t ovf_ref = t & 1;
        syn_filt_m_c(a, x, &ovf_ref, buf_ref);
        for (const auto &v : vs) {
            int16_t out[40];
            v.k->syn_filt(a, x, mem, out);
            ASSERT_EQ(0, std::memcmp(out, ref, sizeof out)) << v.name << " t=" << t;
            int16_t buf[50];
            std::memcpy(buf, mem, sizeof mem);
            int32_t ovf = t & 1;
            v.k->syn_filt_m(a, x, &ovf, buf);
            ASSERT_EQ(0, std::memcmp(buf, buf_ref, sizeof buf)) << v.name << " t=" << t;
            ASSERT_EQ(ovf, ovf_ref) << v.name << " t=" << t;
        }
    }
}

TEST(Checkasm, Residu) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    Gen g(102);
    for (int t = 0; t < 4000; ++t) {
        int16_t a[11], xb[50], ref[40];
        filter(g, a, t);
        if (t % 7 == 0) g.fill(a, 11, 1);   // all rails
        g.fill(xb, 50, t / 4);
        residu_c(a, xb + 10, ref);
        for (const auto &v : vs) {
            int16_t out[40];
            v.k->residu(a, xb + 10, out);
            ASSERT_EQ(0, std::memcmp(out, ref, sizeof out)) << v.name << " t=" << t;
        }
    }
}

TEST(Checkasm, PredLt) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    Gen g(103);
    int t = 0;
    for (int T0 = 1; T0 <= 150; ++T0) {
        for (int flag3 = 0; flag3 <= 1; ++flag3) {
            for (int frac = flag3 ? -1 : -2; frac <= (flag3 ? 1 : 3); ++frac, ++t) {
                int16_t hist[200 + 40];
                g.fill(hist, 240, t);
                int16_t ref[240];
                std::memcpy(ref, hist, sizeof hist);
                pred_lt_3or6_c(T0, frac, flag3, ref + 160);
                for (const auto &v : vs) {
                    int16_t buf[240];
                    std::memcpy(buf, hist, sizeof hist);
                    v.k->pred_lt_3or6(T0, frac, flag3, buf + 160);
                    ASSERT_EQ(0, std::memcmp(buf, ref, sizeof buf))
                        << v.name << " T0=" << T0 << " frac=" << frac << " flag3=" << flag3;
                }
            }
        }
    }
}

TEST(Checkasm, EnergyAndInnerProduct) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    Gen g(104);
    const int lengths[] = {40, 160, 8, 1, 0, -3, 5, 39, 41, 159};
    for (int t = 0; t < 6000; ++t) {
        int16_t x[168], y[168];
        g.fill(x, 168, t);
        g.fill(y, 168, t / 4 + 1);
        const int n = lengths[t % 10];
        const int32_t init = g.word(t / 10);
        const int32_t e_ref = energy_c(x, n, init);
        const int32_t d_ref = inner_product_c(x, y, n, init);
        for (const auto &v : vs) {
            ASSERT_EQ(v.k->energy(x, n, init), e_ref) << v.name << " t=" << t << " n=" << n;
            ASSERT_EQ(v.k->inner_product(x, y, n, init), d_ref) << v.name << " t=" << t << " n=" << n;
        }
    }
}

// The exported entry points follow the allowed-feature mask; every mask gives
// the same output.
TEST(Checkasm, CpuMaskSwitchesVersions) {
    const uint32_t before = vamrnb_set_cpu_flags(0);
    EXPECT_EQ(&dsp(), &dsp_for(0));
    int16_t a[11] = {4096, -3000, 1500, -700, 300, -100, 50, -20, 10, -5, 2};
    int16_t x[40], mem[10] = {}, y0[40], y1[40];
    Gen g(105);
    g.fill(x, 40, 2);
    vamrnb_syn_filt(a, x, mem, y0);
    EXPECT_EQ(vamrnb_set_cpu_flags(~0u), 0u);
    EXPECT_EQ(&dsp(), &dsp_for(~0u));
    vamrnb_syn_filt(a, x, mem, y1);
    EXPECT_EQ(0, std::memcmp(y0, y1, sizeof y0));
    vamrnb_set_cpu_flags(before);
}

// Encoder kernels: the vector hooks against the encoder's own portable
// functions (called with vector code switched off).
TEST(Checkasm, EncoderCorrelations) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    const uint32_t before = vamrnb_set_cpu_flags(0);
    Gen g(106);
    for (int t = 0; t < 300; ++t) {
        int16_t sig[143 + 160];
        g.fill(sig, 303, t % 4 == 1 ? 2 : t);
        if (t % 3 == 0)
            for (auto &v : sig) v = static_cast<int16_t>(v >> 4);
        const int32_t len = t % 2 ? 160 : 80;
        const int32_t lag_min = 18 + t % 5;
        int32_t ref[144] = {}, out[144] = {};
        const int16_t *x = sig + 143;
        vamrnbe_comp_corr(x, len, 143, lag_min, ref + 143);
        for (const auto &v : vs) {
            if (!v.k->comp_corr) continue;
            v.k->comp_corr(x, len, 143, lag_min, out + 143);
            ASSERT_EQ(0, std::memcmp(out, ref, sizeof out)) << v.name << " t=" << t;
        }
    }
    for (int t = 0; t < 3000; ++t) {
        int16_t x[40], h[40], ref[40];
        g.fill(x, 40, t);
        g.fill(h, 40, t / 4 + 2);
        if (t % 5 == 0) h[0] = 4096;
        int16_t dn_ref[40];
        const int32_t sf = 1 + t % 2;
        vamrnbe_convolve(x, h, ref);
        vamrnbe_cor_h_x(h, x, dn_ref, sf);
        for (const auto &v : vs) {
            int16_t out[40];
            if (v.k->convolve) {
                v.k->convolve(x, h, out);
                ASSERT_EQ(0, std::memcmp(out, ref, sizeof out)) << v.name << " t=" << t;
            }
            if (v.k->cor_h_x) {
                v.k->cor_h_x(h, x, out, sf);
                ASSERT_EQ(0, std::memcmp(out, dn_ref, sizeof out)) << v.name << " cor_h_x t=" << t;
            }
        }
    }
    vamrnb_set_cpu_flags(before);
}

// Split-VQ searches: real codebooks and small-valued ones full of ties
// (equal distances in different lanes, a row and its negation), plus rails
// where every distance saturates.
TEST(Checkasm, VqSearches) {
    const auto vs = versions();
    if (vs.empty()) GTEST_SKIP() << "no vector versions on this processor";
    const uint32_t before = vamrnb_set_cpu_flags(0);
    Gen g(107);
    std::vector<int16_t> small(512 * 4);
    for (int t = 0; t < 1500; ++t) {
        const int kind = t % 4;
        const int sizes[] = {64, 128, 256, 512};
        const int size = kind == 3 ? 4 + 4 * (t % 7) : sizes[t % 4];
        const int16_t *dico = kind == 0 ? vamrnb_tbl_dico2_lsf : small.data();
        if (kind != 0) {
            for (auto &v : small) v = static_cast<int16_t>(static_cast<int>(g.rng() % 5) - 2);
            if (kind == 2) {
                for (auto &v : small) v = g.sample(1);
            }
        }
        int16_t r[4], w[4];
        for (int k = 0; k < 4; ++k) {
            r[k] = kind == 2 ? g.sample(1) : static_cast<int16_t>(static_cast<int>(g.rng() % 7) - 3);
            w[k] = kind == 2 ? g.sample(t / 4) : static_cast<int16_t>(g.rng() % 9000);
        }
        if (kind == 0)
            for (int k = 0; k < 4; ++k) r[k] = static_cast<int16_t>(static_cast<int>(g.rng() % 4001) - 2000);
        const int n = kind == 0 ? 256 : size;
        for (int fn = 0; fn < 3; ++fn) {
            int16_t rr[4], rv[4];
            std::memcpy(rr, r, sizeof r);
            int16_t want;
            if (fn == 0) want = vamrnbe_vq_subvec(rr, rr + 2, dico, w, w + 2, n);
            else if (fn == 1) want = vamrnbe_vq_subvec_s(rr, rr + 2, dico, w, w + 2, n);
            else want = vamrnbe_vq_subvec4(rr, dico, w, n);
            for (const auto &v : vs) {
                if (!v.k->vq_subvec) continue;
                std::memcpy(rv, r, sizeof r);
                int16_t got;
                if (fn == 0) got = v.k->vq_subvec(rv, rv + 2, dico, w, w + 2, n);
                else if (fn == 1) got = v.k->vq_subvec_s(rv, rv + 2, dico, w, w + 2, n);
                else got = v.k->vq_subvec4(rv, dico, w, n);
                ASSERT_EQ(got, want) << v.name << " fn=" << fn << " t=" << t;
                ASSERT_EQ(0, std::memcmp(rv, rr, sizeof rr)) << v.name << " fn=" << fn << " t=" << t;
            }
        }
    }
    vamrnb_set_cpu_flags(before);
}
