// Encoder throughput: one minute of speech per mode, DTX off and on.
// The input is the first minute of a corpus item (directory in the
// environment variable VAMRNB_CORPUS, default ../shared/corpus) or, when it
// cannot be read, a synthetic voiced signal of the same length.
// Reported: frames per second and the real-time factor (audio seconds coded
// per second of processing).
#include <benchmark/benchmark.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "vamrnb.h"

namespace {

constexpr int kFrames = 3000;   // 60 s at 20 ms per frame

const std::vector<int16_t> &minute_of_speech() {
    static const std::vector<int16_t> pcm = [] {
        std::vector<int16_t> v(kFrames * 160);
        const char *dir = std::getenv("VAMRNB_CORPUS");
        const std::string path = std::string(dir ? dir : "../shared/corpus") +
                                 "/speech_en-US_f_allison_demo-instruct_long.pcm";
        if (FILE *f = std::fopen(path.c_str(), "rb")) {
            const size_t got = std::fread(v.data(), sizeof(int16_t), v.size(), f);
            std::fclose(f);
            if (got == v.size()) return v;
        }
        for (size_t i = 0; i < v.size(); ++i) {
            const double t = i / 8000.0;
            const double env = 0.5 + 0.5 * std::sin(2 * M_PI * 0.7 * t);
            v[i] = static_cast<int16_t>(env * (5000 * std::sin(2 * M_PI * 140 * t) +
                                               2000 * std::sin(2 * M_PI * 900 * t)));
        }
        return v;
    }();
    return pcm;
}

void encode_minute(benchmark::State &state) {
    const int mode = static_cast<int>(state.range(0));
    const int dtx = static_cast<int>(state.range(1));
    const std::vector<int16_t> &pcm = minute_of_speech();
    std::vector<int16_t> frame(160);
    uint8_t out[32];

    for (auto _ : state) {
        codec_config cfg{};
        cfg.enc.dtx = dtx;
        cfg.enc.mode = mode;
        vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
        pcm_buffer in{};
        in.data[0] = frame.data();
        bitstream_buffer bs{out, 0, sizeof out};
        frame_info info{};
        for (int f = 0; f < kFrames; ++f) {
            // The encoder masks its input in place: hand it a copy.
            std::copy_n(pcm.begin() + f * 160, 160, frame.begin());
            vamrnbe_encode(enc, &in, &bs, &info);
        }
        benchmark::DoNotOptimize(out[0]);
        vamrnbe_delete(enc);
    }
    state.counters["frames/s"] =
        benchmark::Counter(double(kFrames) * state.iterations(), benchmark::Counter::kIsRate);
    state.counters["x_realtime"] =
        benchmark::Counter(60.0 * state.iterations(), benchmark::Counter::kIsRate);
}

}  // namespace

BENCHMARK(encode_minute)
    ->ArgsProduct({{0, 1, 2, 3, 4, 5, 6, 7}, {0, 1}})
    ->ArgNames({"mode", "dtx"})
    ->Unit(benchmark::kMillisecond);
