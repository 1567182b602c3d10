// Decoder speed: one minute of speech (3000 frames) per codec mode, decoded
// frame by frame through the public API into 16-bit mono output.  Reports
// the real-time factor (seconds of CPU per second of audio) and frames per
// second.
//
// The input is the encoded speech of the conformance set
// (<vectors>/enc/<item>/<MODE>_nodtx.amr); set VAMRNB_VECTORS to its
// directory if it is not found next to the source tree.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace {

constexpr const char *kItem = "speech_en-US_f_allison_demo-instruct_long";
constexpr int kFrames = 3000;  // 60 s
constexpr const char *kModes[8] = {"MR475", "MR515", "MR59", "MR67",
                                   "MR74",  "MR795", "MR102", "MR122"};

std::string vectors_dir() {
    if (const char *env = std::getenv("VAMRNB_VECTORS")) return env;
    std::string here = __FILE__;
    here = here.substr(0, here.rfind('/'));  // .../bench
    return here + "/../../shared/vectors";
}

// Frames of the item in one mode, each as its own byte vector.
std::vector<std::vector<uint8_t>> load(int mode) {
    std::vector<std::vector<uint8_t>> frames;
    const std::string path = vectors_dir() + "/enc/" + kItem + "/" + kModes[mode] + "_nodtx.amr";
    FILE *f = std::fopen(path.c_str(), "rb");
    if (f == nullptr) return frames;
    std::vector<uint8_t> all;
    uint8_t chunk[4096];
    for (size_t n; (n = std::fread(chunk, 1, sizeof chunk, f)) > 0;)
        all.insert(all.end(), chunk, chunk + n);
    std::fclose(f);
    for (size_t pos = 6; pos < all.size() && frames.size() < kFrames;) {  // skip "#!AMR\n"
        const size_t len = vamrnb_stream_frame_size((all[pos] >> 3) & 15);
        if (pos + len > all.size()) break;
        frames.emplace_back(all.begin() + pos, all.begin() + pos + len);
        pos += len;
    }
    return frames;
}

void BM_Decode(benchmark::State &state) {
    const int mode = static_cast<int>(state.range(0));
    const auto frames = load(mode);
    if (frames.size() < kFrames) {
        state.SkipWithError("vectors not found (set VAMRNB_VECTORS)");
        return;
    }
    codec_config cfg{};
    cfg.dec.layout = 1;
    cfg.dec.channels = 1;
    vamrnb_decoder *dec = vamrnbd_create(&cfg, nullptr);
    int16_t out[160];
    pcm_buffer pcm{};
    pcm.data[0] = out;
    frame_info info{};

    for (auto _ : state) {
        vamrnbd_reset(dec);
        for (const auto &fr : frames) {
            bitstream_buffer in{const_cast<uint8_t *>(fr.data()), 0,
                                static_cast<uint32_t>(fr.size())};
            vamrnbd_decode(dec, &in, &pcm, &info);
            benchmark::DoNotOptimize(out);
        }
        benchmark::ClobberMemory();
    }
    vamrnbd_delete(dec);

    const double audio_seconds = static_cast<double>(state.iterations()) * kFrames * 0.02;
    // Real-time factor: CPU time over audio time (lower is faster).
    state.counters["RTF"] = benchmark::Counter(
        audio_seconds, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
    state.counters["frames/s"] = benchmark::Counter(
        static_cast<double>(state.iterations()) * kFrames, benchmark::Counter::kIsRate);
    state.SetLabel(kModes[mode]);
}

}  // namespace

BENCHMARK(BM_Decode)->DenseRange(0, 7)->Unit(benchmark::kMillisecond);
