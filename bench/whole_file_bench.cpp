// Whole-file coding through the C API, the baseline of bench/python_bench.py:
// a stream held in memory is split into frames and decoded into one sample
// buffer, and a signal is encoded into one stream with its header, as the
// Python package's decode() and encode() do.  The inputs come from
// VAMRNB_BENCH_AMR (a storage-format file) and VAMRNB_BENCH_PCM (16-bit
// little-endian 8 kHz mono); without them the benchmarks are skipped.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_tables.h"

namespace {

std::vector<uint8_t> slurp(const char *env) {
    std::vector<uint8_t> all;
    const char *path = std::getenv(env);
    FILE *f = path ? std::fopen(path, "rb") : nullptr;
    if (f == nullptr) return all;
    uint8_t chunk[65536];
    for (size_t n; (n = std::fread(chunk, 1, sizeof chunk, f)) > 0;) all.insert(all.end(), chunk, chunk + n);
    std::fclose(f);
    return all;
}

void BM_DecodeFile(benchmark::State &state) {
    const std::vector<uint8_t> file = slurp("VAMRNB_BENCH_AMR");
    if (file.size() < 6) {
        state.SkipWithError("set VAMRNB_BENCH_AMR");
        return;
    }
    size_t frames = 0;
    for (auto _ : state) {
        std::vector<size_t> offsets;
        for (size_t pos = 6; pos < file.size();) {
            const size_t len = std::max<int16_t>(1, vamrnb_tbl_packed_size[(file[pos] >> 3) & 15]);
            if ((file[pos] & 0x83) || pos + len > file.size()) break;
            offsets.push_back(pos);
            pos += len;
        }
        const codec_config cfg = {{0, 1, 1, 0}};
        vamrnb_decoder *dec = vamrnbd_create(&cfg, nullptr);
        std::vector<int16_t> out(offsets.size() * 160);
        frame_info info{};
        size_t k = 0;
        for (size_t off : offsets) {
            bitstream_buffer in{const_cast<uint8_t *>(file.data() + off), 0,
                                static_cast<uint32_t>(file.size() - off)};
            pcm_buffer pcm{};
            pcm.data[0] = out.data() + k * 160;
            k += vamrnbd_decode(dec, &in, &pcm, &info) == AMRNB_OK;
        }
        vamrnbd_delete(dec);
        benchmark::DoNotOptimize(out.data());
        frames = k;
    }
    state.counters["frames/s"] = benchmark::Counter(static_cast<double>(frames), benchmark::Counter::kIsIterationInvariantRate);
}

void BM_EncodeFile(benchmark::State &state) {
    const std::vector<uint8_t> bytes = slurp("VAMRNB_BENCH_PCM");
    if (bytes.size() < 320) {
        state.SkipWithError("set VAMRNB_BENCH_PCM");
        return;
    }
    std::vector<int16_t> pcm(bytes.size() / 2);
    for (size_t i = 0; i < pcm.size(); ++i)
        pcm[i] = static_cast<int16_t>(bytes[2 * i] | (bytes[2 * i + 1] << 8));
    const size_t frames = (pcm.size() + 159) / 160;
    for (auto _ : state) {
        codec_config cfg{};
        cfg.enc.mode = MR122;
        vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
        std::string out("#!AMR\n");
        out.reserve(6 + frames * 32);
        frame_info info{};
        for (size_t f = 0; f < frames; ++f) {
            int16_t frame[160] = {};
            std::memcpy(frame, pcm.data() + f * 160, std::min<size_t>(160, pcm.size() - f * 160) * 2);
            pcm_buffer in{};
            in.data[0] = frame;
            uint8_t bits[32];
            bitstream_buffer b{bits, 0, sizeof bits};
            vamrnbe_encode(enc, &in, &b, &info);
            out.append(reinterpret_cast<const char *>(bits), info.bytes);
        }
        vamrnbe_delete(enc);
        benchmark::DoNotOptimize(out.data());
    }
    state.counters["frames/s"] = benchmark::Counter(static_cast<double>(frames), benchmark::Counter::kIsIterationInvariantRate);
}

}  // namespace

BENCHMARK(BM_DecodeFile)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_EncodeFile)->Unit(benchmark::kMillisecond);
