// Subframe kernels against plain models of their documented arithmetic and
// at the edges where saturation, wrap-around or in-place reads decide the
// result.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <random>

#include "lpc/dsp.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

int32_t clamp32(int64_t v) { return static_cast<int32_t>(std::clamp<int64_t>(v, INT32_MIN, INT32_MAX)); }
int32_t wrap32(int64_t v) { return static_cast<int32_t>(static_cast<uint32_t>(v)); }

// Synthesis output for a filter sum s (both range windows).
int16_t syn_out(int64_t s_exact, bool flagged, bool *flag) {
    const int32_t s = wrap32(s_exact);
    if (!flagged) {
        if (s > 0x07FFFFFF) return 32767;
        if (s < -0x08000000) return -32768;
    } else if (s >= 0x07FFFFFF || s <= -0x07FFFFFF) {
        *flag = true;
        return s > 0 ? 32767 : -32768;
    }
    return static_cast<int16_t>(wrap32(int64_t{s} * 16 + 0x8000) >> 16);
}

void random_filter(std::mt19937 &rng, int16_t a[11], int spread) {
    std::uniform_int_distribution<int> d(-spread, spread);
    a[0] = 4096;
    for (int i = 1; i <= 10; ++i) a[i] = static_cast<int16_t>(d(rng) >> (i / 3));
}

}  // namespace

// Both synthesis kernels against a 64-bit evaluation of the filter sum with
// each kernel's range rule; half the runs drive the sums past the windows.
TEST(SynFilt, BothKernelsMatchWideModel) {
    std::mt19937 rng(1);
    int flagged_runs = 0;
    for (int t = 0; t < 1000; ++t) {
        const bool flagged = t % 2;
        int16_t a[11], x[40], mem[10], out[50], model[50];
        random_filter(rng, a, t % 4 < 2 ? 1500 : 9000);
        std::uniform_int_distribution<int> dx(-32768, 32767);
        for (auto &v : x) v = static_cast<int16_t>(dx(rng) >> (t % 3 ? 4 : 0));
        for (auto &v : mem) v = static_cast<int16_t>(dx(rng) >> 2);
        std::memcpy(model, mem, sizeof mem);
        bool flag = false;
        for (int n = 0; n < 40; ++n) {
            int64_t s = int64_t{a[0]} * x[n];
            for (int i = 1; i <= 10; ++i) s -= int64_t{a[i]} * model[10 + n - i];
            model[10 + n] = syn_out(s, flagged, &flag);
        }
        std::memcpy(out, mem, sizeof mem);
        if (flagged) {
            int32_t ovf = 0;
            vamrnbd_syn_filt_m(a, x, &ovf, out);
            ASSERT_EQ(ovf, flag ? 1 : 0) << t;
            flagged_runs += flag;
        } else {
            const int16_t mem_before[10] = {mem[0], mem[1], mem[2], mem[3], mem[4],
                                            mem[5], mem[6], mem[7], mem[8], mem[9]};
            vamrnb_syn_filt(a, x, mem, x);                        // in place, memory read only
            std::memcpy(out + 10, x, sizeof x);
            ASSERT_EQ(0, std::memcmp(mem, mem_before, sizeof mem));
        }
        ASSERT_EQ(0, std::memcmp(out, model, sizeof out)) << "t=" << t;
    }
    EXPECT_GT(flagged_runs, 10);
    EXPECT_LT(flagged_runs, 450);
}

// s = 4096·32767 + 4095 = 0x07FFFFFF: inside the plain kernel's window (wraps
// to -32768), on the edge of the flagging kernel's window (32767, flag).
TEST(SynFilt, RangeWindowEdges) {
    struct Case { int16_t x0, mem9, a1; int16_t plain, flagged; int32_t flag; };
    const Case cases[] = {
        {32767, 4095, -1, -32768, 32767, 1},    // s = 0x07FFFFFF
        {32767, 4094, -1, -32768, -32768, 0},   // s = 0x07FFFFFE: wraps in both
        {32767, 2047, -1, 32767, 32767, 0},     // s = 0x07FFF7FF: last clean value
        {32767, 4096, -1, 32767, 32767, 1},     // s = 0x08000000
        {-32768, 0, 0, -32768, -32768, 1},      // s = -0x08000000
        {-32767, 4095, 1, -32768, -32768, 1},   // s = -0x07FFFFFF
        {-32767, 2047, 1, -32767, -32767, 0},   // s = -0x07FFF7FF
    };
    for (const auto &c : cases) {
        int16_t a[11] = {4096, c.a1, 0, 0, 0, 0, 0, 0, 0, 0, 0};
        int16_t x[40] = {c.x0};
        int16_t mem[10] = {0, 0, 0, 0, 0, 0, 0, 0, 0, c.mem9};
        int16_t y[40];
        vamrnb_syn_filt(a, x, mem, y);
        EXPECT_EQ(y[0], c.plain) << c.x0 << " " << c.mem9;
        int16_t buf[50] = {0, 0, 0, 0, 0, 0, 0, 0, 0, c.mem9};
        int32_t ovf = 0;
        a[1] = c.a1;
        vamrnbd_syn_filt_m(a, x, &ovf, buf);
        EXPECT_EQ(buf[10], c.flagged) << c.x0 << " " << c.mem9;
        EXPECT_EQ(ovf, c.flag) << c.x0 << " " << c.mem9;
    }
    // The flag is never cleared by the kernel.
    int16_t a[11] = {4096};
    int16_t x[40] = {100};
    int16_t buf[50] = {};
    int32_t ovf = 1;
    vamrnbd_syn_filt_m(a, x, &ovf, buf);
    EXPECT_EQ(ovf, 1);
    EXPECT_EQ(buf[10], 100);
}

TEST(Residu, MatchesWideModelAndSaturates) {
    std::mt19937 rng(4);
    for (int t = 0; t < 400; ++t) {
        int16_t a[11], xb[50], y[40];
        random_filter(rng, a, 12000);
        std::uniform_int_distribution<int> dx(-32768, 32767);
        const int shift = t % 4 == 0 ? 0 : 4;
        for (auto &v : xb) v = static_cast<int16_t>(dx(rng) >> shift);
        const int16_t *x = xb + 10;
        vamrnb_residu(a, x, y);
        for (int n = 0; n < 40; ++n) {
            // Sequential saturation as the model; with shift 4 nothing saturates.
            int32_t s = clamp32(2 * int64_t{a[0]} * x[n]);
            for (int i = 1; i <= 10; ++i) s = clamp32(int64_t{s} + 2 * int64_t{a[i]} * x[n - i]);
            const int32_t s8 = clamp32(int64_t{s} * 8);
            const int16_t want = static_cast<int16_t>(clamp32(int64_t{s8} + 0x8000) >> 16);
            ASSERT_EQ(y[n], want) << "t=" << t << " n=" << n;
        }
    }
    // Full-scale input through a = 1.0 saturates at both rails.
    int16_t a[11] = {4096};
    int16_t xb[50] = {};
    xb[10] = 32767;
    xb[11] = -32768;
    xb[12] = 4096;
    int16_t y[40];
    vamrnb_residu(a, xb + 10, y);
    EXPECT_EQ(y[0], 32767);
    EXPECT_EQ(y[1], -32768);
    EXPECT_EQ(y[2], 4096);
}

// With a delay of 20 the second half of the subframe is interpolated from the
// first half just written.  The history before the subframe is a constant
// 1000 and the subframe itself starts out as zeros: reading those stale zeros
// instead of the new outputs would pull the second half far below 1000.
TEST(PredLt, ShortDelayReadsItsOwnOutput) {
    int16_t buf[200];
    std::fill(buf, buf + 155, int16_t{1000});
    std::fill(buf + 155, buf + 200, int16_t{0});
    vamrnb_pred_lt_3or6(20, 0, 1, buf + 155);
    const int16_t *e = buf + 155;
    const double g = e[0] / 1000.0;
    EXPECT_GT(g, 0.9);
    for (int j = 0; j < 10; ++j) EXPECT_EQ(e[j], e[0]) << j;
    for (int j = 20; j < 40; ++j) EXPECT_NEAR(e[j], g * g * 1000.0, 30.0) << j;
}

TEST(Energy, LanesSaturateIndependently) {
    int16_t c[40];
    std::fill(c, c + 40, int16_t{16384});
    EXPECT_EQ(vamrnb_energy(c, 40, 0), INT32_MAX);

    std::mt19937 rng(8);
    std::uniform_int_distribution<int> d(-32768, 32767);
    for (int t = 0; t < 200; ++t) {
        int16_t x[160];
        const int shift = t % 2 ? 6 : 0;
        for (auto &v : x) v = static_cast<int16_t>(d(rng) >> shift);
        const int n = t % 3 ? 40 : 160;
        const int32_t init = t % 4 ? 0 : static_cast<int32_t>(d(rng)) * 1000;
        int64_t exact = init;
        for (int i = 0; i < n; ++i) exact += 2 * int64_t{x[i]} * x[i];
        // Non-negative terms from a non-negative start: the lanes agree with
        // the saturated exact sum.
        if (init >= 0) {
            ASSERT_EQ(vamrnb_energy(x, n, init), clamp32(exact)) << t;
        }
    }

    // A negative start sits in lane 0 only; lane 1 saturates on its own, so
    // the lanes join to MIN + MAX = -1 where a running sum would reach MAX.
    int16_t s[40] = {};
    for (int k = 1; k < 40; k += 8) s[k] = -32768;
    EXPECT_EQ(vamrnb_energy(s, 40, INT32_MIN), -1);

    // The count is taken in steps of eight.
    int16_t p[16] = {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16};
    EXPECT_EQ(vamrnb_energy(p, 5, 0), 2 * (1 + 4 + 9 + 16 + 25 + 36 + 49 + 64));
    EXPECT_EQ(vamrnb_energy(p, 0, 7), 7 + 2 * (1 + 4 + 9 + 16 + 25 + 36 + 49 + 64));
}

TEST(InnerProduct, SequentialSaturation) {
    int16_t x[4] = {32767, -32767, 100, -32768};
    int16_t y[4] = {32767, 32767, 100, -32768};
    EXPECT_EQ(vamrnb_inner_product(x, y, 0, 12345), 12345);
    EXPECT_EQ(vamrnb_inner_product(x, y, -3, -5), -5);
    // MAX-10 saturates on the first step; the second step then comes down
    // from MAX, not from the exact sum.
    const int32_t sq = 2 * 32767 * 32767;
    EXPECT_EQ(vamrnb_inner_product(x, y, 2, INT32_MAX - 10), INT32_MAX - sq);
    EXPECT_EQ(vamrnb_inner_product(x, y, 3, INT32_MAX - 10), INT32_MAX - sq + 20000);
    // (-32768)^2 doubled saturates by itself.
    EXPECT_EQ(vamrnb_inner_product(x + 3, y + 3, 1, 0), INT32_MAX);
    EXPECT_EQ(vamrnb_inner_product(x + 3, y + 3, 1, -1), INT32_MAX - 1);
}
