// RTP payload speed: packing storage-format frames into payloads and parsing
// them back, per payload mode (bandwidth-efficient, octet-aligned,
// octet-aligned with CRCs) and frames per packet (1, 3, 10).  The frames are
// 12.2 kbit/s frames with pseudo-random bits: the work depends on the frame
// sizes, not on the bits.  Reports the time per frame ("per_frame").
#include <benchmark/benchmark.h>

#include <cstdint>
#include <vector>

#include "vamrnb_rtp.h"

namespace {

std::vector<uint8_t> frames(int count) {
    std::vector<uint8_t> out;
    uint32_t x = 0x12345678u;
    for (int i = 0; i < count; ++i) {
        out.push_back(0x3C);
        for (int k = 0; k < 31; ++k) {
            x = x * 1664525u + 1013904223u;
            out.push_back(static_cast<uint8_t>(x >> 24));
        }
        out.back() &= 0xF0;  // 244 bits: four padding bits
    }
    return out;
}

vamrnb_rtp_params params(int64_t mode) {
    vamrnb_rtp_params p;
    vamrnb_rtp_params_default(&p);
    p.octet_align = mode != 0;
    p.crc = mode == 2;
    return p;
}

void per_frame(benchmark::State &state, int count) {
    state.counters["per_frame"] = benchmark::Counter(
        static_cast<double>(count),
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void BM_pack(benchmark::State &state) {
    const vamrnb_rtp_params p = params(state.range(0));
    const int count = static_cast<int>(state.range(1));
    const std::vector<uint8_t> in = frames(count);
    std::vector<uint8_t> out(2048);
    vamrnb_rtp_info info{};
    for (auto _ : state) {
        vamrnb_rtp_pack(&p, 15, in.data(), in.size(), out.data(), out.size(), &info);
        benchmark::DoNotOptimize(out.data());
    }
    per_frame(state, count);
}

void BM_parse(benchmark::State &state) {
    const vamrnb_rtp_params p = params(state.range(0));
    const int count = static_cast<int>(state.range(1));
    const std::vector<uint8_t> in = frames(count);
    std::vector<uint8_t> payload(2048), out(2048);
    vamrnb_rtp_info info{};
    vamrnb_rtp_pack(&p, 15, in.data(), in.size(), payload.data(), payload.size(), &info);
    const size_t size = info.bytes;
    for (auto _ : state) {
        vamrnb_rtp_parse(&p, payload.data(), size, out.data(), out.size(), &info);
        benchmark::DoNotOptimize(out.data());
    }
    per_frame(state, count);
}

// Arguments: payload mode (0 bandwidth-efficient, 1 octet-aligned, 2 with
// CRCs), frames per packet.
void args(benchmark::internal::Benchmark *b) {
    b->ArgNames({"mode", "frames"});
    for (int64_t mode : {0, 1, 2})
        for (int64_t n : {1, 3, 10}) b->Args({mode, n});
}

BENCHMARK(BM_pack)->Apply(args);
BENCHMARK(BM_parse)->Apply(args);

}  // namespace
