// Many instances on many threads: 8 encoders and 8 decoders over different
// bundled items and settings, spread over 4 threads that advance their
// instances a frame at a time in turn, so that all 16 are live at once.
// Every output byte must equal that of the same job run alone on one thread.
// Built and run under ThreadSanitizer in CI, where any data shared between
// instances is reported as a race.
//
// Usage: vamrnb_threads DATA_DIR   (the bundled tests/data)
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "vamrnb.h"

namespace {

constexpr int kThreads = 4;
constexpr size_t kMaxFrames = 120;
constexpr uint32_t kFrameBytes[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 1, 1, 1, 1};

std::vector<uint8_t> read_file(const std::string &path) {
    std::ifstream f(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(f), std::istreambuf_iterator<char>()};
}

// One stream through one instance, a frame per step().
class Job {
public:
    virtual ~Job() = default;
    virtual bool step() = 0;  // false when the stream is done
    std::vector<uint8_t> output;
};

class EncodeJob : public Job {
public:
    EncodeJob(const std::vector<uint8_t> &pcm, codec_config c, bool cycle_modes)
        : pcm_(pcm), cycle_(cycle_modes) {
        enc_ = vamrnbe_create(&c, nullptr);
    }
    ~EncodeJob() override { vamrnbe_delete(enc_); }
    bool step() override {
        if (enc_ == nullptr || pos_ + 320 > pcm_.size() || info_.frame_count == kMaxFrames) return false;
        int16_t samples[160];
        std::memcpy(samples, pcm_.data() + pos_, sizeof samples);
        pos_ += 320;
        if (cycle_) vamrnbe_set_mode(enc_, static_cast<int32_t>(info_.frame_count * 3 % 8));
        pcm_buffer in{};
        in.data[0] = samples;
        uint8_t frame[32];
        bitstream_buffer out{frame, 0, sizeof frame};
        vamrnbe_encode(enc_, &in, &out, &info_);
        output.insert(output.end(), frame, frame + info_.bytes);
        return true;
    }

private:
    const std::vector<uint8_t> &pcm_;
    bool cycle_;
    vamrnb_encoder *enc_ = nullptr;
    size_t pos_ = 0;
    frame_info info_{};
};

class DecodeJob : public Job {
public:
    DecodeJob(const std::vector<uint8_t> &stream, codec_config c) : stream_(stream) {
        dec_ = vamrnbd_create(&c, nullptr);
        pos_ = stream_.size() >= 6 && std::memcmp(stream_.data(), "#!AMR\n", 6) == 0 ? 6 : 0;
        for (int i = 0; i < 3; ++i) pcm_.data[i] = buf_[i];
    }
    ~DecodeJob() override { vamrnbd_delete(dec_); }
    bool step() override {
        if (dec_ == nullptr || pos_ >= stream_.size() || info_.frame_count == kMaxFrames) return false;
        bitstream_buffer in{const_cast<uint8_t *>(stream_.data() + pos_), 0,
                            static_cast<uint32_t>(stream_.size() - pos_)};
        const int32_t st = vamrnbd_decode(dec_, &in, &pcm_, &info_);
        if (st != AMRNB_OK) {
            output.push_back(static_cast<uint8_t>(-st));
            pos_ += kFrameBytes[(stream_[pos_] >> 3) & 15];
            return true;
        }
        pos_ += info_.bytes;
        if (pcm_.layout == 1) {
            output.insert(output.end(), buf_[0], buf_[0] + pcm_.bytes[0]);
        } else {
            for (uint32_t ch = 0; ch < info_.channels; ++ch)
                output.insert(output.end(), buf_[1 + ch], buf_[1 + ch] + pcm_.bytes[1 + ch]);
        }
        return true;
    }

private:
    const std::vector<uint8_t> &stream_;
    vamrnb_decoder *dec_ = nullptr;
    size_t pos_ = 0;
    pcm_buffer pcm_{};
    frame_info info_{};
    uint8_t buf_[3][2 * 160 * 3] = {};
};

struct Inputs {
    std::vector<std::vector<uint8_t>> files;
    void add(const std::string &path) {
        files.push_back(read_file(path));
        if (files.back().empty()) std::fprintf(stderr, "missing or empty: %s\n", path.c_str());
    }
};

// The 16 jobs, encoders and decoders alternating.
std::vector<std::unique_ptr<Job>> make_jobs(const std::vector<std::vector<uint8_t>> &f) {
    std::vector<std::unique_ptr<Job>> jobs;
    // Encoders: {dtx, reserved, vad_option, mode}; decoders: {reserved,
    // layout, channels, sample format}.
    const codec_config enc[8] = {{{0, 0, 0, MR122}}, {{1, 0, 0, MR475}}, {{1, 0, 1, MR795}}, {{0, 0, 0, MR102}},
                                 {{1, 0, 0, MR59}},  {{1, 0, 1, MR67}},  {{1, 0, 1, MR74}},  {{0, 0, 0, MR515}}};
    const codec_config dec[8] = {{{0, 1, 1, 0}}, {{0, 1, 2, 0}}, {{0, 0, 1, 1}}, {{0, 0, 2, 3}},
                                 {{0, 1, 0, 0}}, {{0, 1, 2, 2}}, {{0, 0, 1, 0}}, {{0, 1, 1, 3}}};
    const int item[8] = {0, 1, 0, 1, 2, 1, 0, 1};  // the 7-frame noise item once
    for (int i = 0; i < 8; ++i) {
        jobs.push_back(std::make_unique<EncodeJob>(f[item[i]], enc[i], i == 5));
        jobs.push_back(std::make_unique<DecodeJob>(f[3 + i], dec[i]));
    }
    return jobs;
}

}  // namespace

int main(int argc, char **argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: %s DATA_DIR\n", argv[0]);
        return 2;
    }
    const std::string data = argv[1];
    Inputs in;
    for (const char *item : {"corpus/sig_dtmf_1-9_0_star_hash_ABCD_100ms.pcm", "vectors/3gpp/spch_dos_input.pcm",
                             "corpus/sig_white_-20dBov_odd-length.pcm"})
        in.add(data + "/" + item);
    for (const char *item : {"vectors/3gpp/spch_dos.amr", "vectors/3gpp/spch_do2.amr",
                             "vectors/enc/sig_dtmf_1-9_0_star_hash_ABCD_100ms/MR475_vad1.amr",
                             "vectors/enc/sig_dtmf_1-9_0_star_hash_ABCD_100ms/MR122_vad2.amr",
                             "vectors/err/speech_cs_m_fillets-bigfish/bfi05pct_MR475.amr",
                             "vectors/err/speech_cs_m_fillets-bigfish/homing_MR122.amr",
                             "vectors/err/speech_cs_m_fillets-bigfish/modecycle.amr",
                             "vectors/err/dtx_it-IT_m_carlo_talkspurts_noise-bed/vad1_MR795_ft9-14.amr"})
        in.add(data + "/" + item);
    for (const auto &file : in.files)
        if (file.empty()) return 2;

    // Alone, one job after the other.
    auto serial = make_jobs(in.files);
    for (auto &job : serial)
        while (job->step()) {
        }

    // Together: thread t owns jobs t, t + 4, ... and steps them in turn.
    auto parallel = make_jobs(in.files);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&parallel, t] {
            for (bool busy = true; busy;) {
                busy = false;
                for (size_t j = t; j < parallel.size(); j += kThreads) busy |= parallel[j]->step();
            }
        });
    }
    for (auto &th : threads) th.join();

    int failures = 0;
    for (size_t j = 0; j < serial.size(); ++j) {
        const bool same = serial[j]->output == parallel[j]->output;
        std::printf("job %2zu (%s): %zu bytes, %s\n", j, j % 2 ? "decoder" : "encoder", serial[j]->output.size(),
                    same ? "same as alone" : "DIFFERS from the single-threaded run");
        if (!same || serial[j]->output.empty()) ++failures;
    }
    return failures == 0 ? 0 : 1;
}
