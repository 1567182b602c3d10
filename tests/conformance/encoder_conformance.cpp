// Encoder conformance: every corpus item is encoded in every mode, without
// DTX and with DTX under both voice activity detectors, and each frame is
// compared byte for byte with the reference encoder's storage-format output.
// The installation vectors also switch mode every frame and are decoded back.
#include <gtest/gtest.h>

#include <cstring>
#include <fstream>
#include <sstream>

#include "crc32.h"
#include "harness.h"
#include "vamrnb.h"

namespace conformance {
namespace {

struct EncodeJob {
    std::string name;
    std::string row;
    fs::path pcm, amr;
    int32_t mode = 0, dtx = 0, vad_option = 0;
    std::vector<int32_t> modes;  // mode per frame, when switching
    fs::path decoded_crc;        // installation vectors: decode our output too
};

void decode_our_output(const EncodeJob &job, const std::vector<uint8_t> &stream, Report &report) {
    const auto crcs = read_crcs(job.decoded_crc);
    if (!crcs) {
        report.fail(job.name + ": cannot read " + job.decoded_crc.string());
        return;
    }
    const codec_config config = {{0, 1, 1, 0}};
    int32_t status = 1;
    vamrnb_decoder *dec = vamrnbd_create(&config, &status);
    if (dec == nullptr) {
        report.fail(job.name + ": vamrnbd_create failed");
        return;
    }
    int16_t out[2 * 160];
    pcm_buffer buffers{};
    buffers.data[0] = out;
    frame_info info{};
    uint64_t exact = 0, k = 0;
    long first = -1;
    for (std::size_t pos = 0; pos < stream.size(); ++k) {
        bitstream_buffer in{const_cast<uint8_t *>(stream.data() + pos), 0,
                            static_cast<uint32_t>(stream.size() - pos)};
        pos += vamrnb_stream_frame_size((stream[pos] >> 3) & 0x0F);
        if (vamrnbd_decode(dec, &in, &buffers, &info) == AMRNB_OK && k < crcs->size() &&
            frame_crc32(out) == (*crcs)[k])
            ++exact;
        else if (first < 0)
            first = static_cast<long>(k);
    }
    vamrnbd_delete(dec);
    if (first >= 0 || k != crcs->size())
        report.fail(job.name + " decoded back: " + std::to_string(crcs->size() - exact) +
                    " frames differ from the reference decoder output, first at frame " +
                    std::to_string(first));
    report.add(job.row + " decoded back", exact, crcs->size());
}

void encode_item(const EncodeJob &job, Report &report) {
    const auto pcm = read_pcm(job.pcm);
    const auto file = read_bytes(job.amr);
    if (!pcm || !file) {
        report.fail(job.name + ": cannot read " + (pcm ? job.amr : job.pcm).string());
        return;
    }
    std::string error;
    const auto expected = split_frames(*file, error);
    if (!error.empty()) report.fail(job.name + ": " + error);

    const codec_config config = {{job.dtx, 0, job.vad_option, job.modes.empty() ? job.mode : job.modes[0]}};
    int32_t status = 1;
    vamrnb_encoder *enc = vamrnbe_create(&config, &status);
    if (enc == nullptr || status != AMRNB_OK) {
        report.fail(job.name + ": vamrnbe_create failed with " + std::to_string(status));
        report.add(job.row, 0, expected.size());
        return;
    }

    const std::size_t frames = pcm->size() / 160;
    int16_t samples[160];
    uint8_t out[64];
    pcm_buffer in{};
    in.data[0] = samples;
    frame_info info{};
    std::vector<uint8_t> stream;
    uint64_t exact = 0, differing = 0;
    std::string first_difference;

    for (std::size_t f = 0; f < frames; ++f) {
        if (!job.modes.empty() && f < job.modes.size()) vamrnbe_set_mode(enc, job.modes[f]);
        std::memcpy(samples, pcm->data() + f * 160, sizeof samples);
        std::memset(out, 0xA5, sizeof out);
        bitstream_buffer bits{out, 0, sizeof out};
        const int32_t rc = vamrnbe_encode(enc, &in, &bits, &info);
        const std::size_t n = rc == AMRNB_OK ? std::min<std::size_t>(info.bytes, sizeof out) : 0;
        stream.insert(stream.end(), out, out + n);
        if (f >= expected.size()) continue;
        const Frame &e = expected[f];
        const uint8_t *want = file->data() + e.offset;
        const bool same = n == e.size && std::memcmp(out, want, n) == 0;
        if (same && info.frame_type == static_cast<uint32_t>(e.type)) {
            ++exact;
            continue;
        }
        if (differing++ > 0) continue;
        std::ostringstream d;
        d << job.name << " frame " << f;
        if (!job.modes.empty()) d << " (mode " << mode_name(job.modes[f]) << ")";
        d << ": ";
        if (rc != AMRNB_OK)
            d << "encode returned " << rc;
        else if (same)
            d << "frame correct but reported frame type " << info.frame_type << ", expected " << e.type;
        else
            d << describe_frame_difference(out, n, want, e.size);
        first_difference = d.str();
    }
    vamrnbe_delete(enc);

    if (frames != expected.size())
        report.fail(job.name + ": " + std::to_string(frames) + " frames encoded, expected " +
                    std::to_string(expected.size()));
    if (differing > 0)
        report.fail(first_difference + " [" + std::to_string(differing) + " of " +
                    std::to_string(expected.size()) + " frames differ]");
    report.add(job.row, exact, expected.size());
    if (!job.decoded_crc.empty()) decode_our_output(job, stream, report);
}

void run(const std::string &title, const std::vector<EncodeJob> &jobs) {
    if (jobs.empty()) GTEST_SKIP() << "no items for " << title << " in " << roots().vectors;
    Report report;
    run_parallel(jobs.size(), [&](std::size_t i) { encode_item(jobs[i], report); });
    const std::string failures = report.finish(title);
    EXPECT_TRUE(report.clean()) << failures;
}

// The corpus file of an item: <corpus>/<item>.pcm, or anywhere below it.
fs::path corpus_file(const std::string &item) {
    const fs::path &corpus = roots().corpus;
    const fs::path direct = corpus / (item + ".pcm");
    std::error_code ec;
    if (fs::exists(direct, ec)) return direct;
    for (const auto &e : fs::recursive_directory_iterator(corpus, ec))
        if (e.path().filename() == item + ".pcm") return e.path();
    return direct;
}

// enc/<item>/<MODE>_<cfg>.amr for every item and mode.
void run_enc(const std::string &cfg, int32_t dtx, int32_t vad_option) {
    std::vector<EncodeJob> jobs;
    for (const auto &item : sorted_entries(roots().vectors / "enc", true)) {
        const std::string name = item.filename().string();
        const fs::path pcm = corpus_file(name);
        for (int32_t mode = 0; mode < 8; ++mode) {
            const fs::path amr = item / (std::string(mode_name(mode)) + "_" + cfg + ".amr");
            if (!fs::exists(amr)) continue;
            EncodeJob job;
            job.name = "enc/" + name + "/" + amr.stem().string();
            job.row = std::string(cfg) + " " + mode_name(mode);
            job.pcm = pcm;
            job.amr = amr;
            job.mode = mode;
            job.dtx = dtx;
            job.vad_option = vad_option;
            jobs.push_back(std::move(job));
        }
    }
    run("encoder, " + cfg, jobs);
}

TEST(Encoder, Nodtx) { run_enc("nodtx", 0, 0); }
TEST(Encoder, Vad1) { run_enc("vad1", 1, 0); }
TEST(Encoder, Vad2) { run_enc("vad2", 1, 1); }

// The installation vectors: DTX on, mode switched every frame as listed in
// modes.txt; the result is also decoded and compared with the reference
// decoder's output.
TEST(Encoder, Installation) {
    const fs::path dir = roots().vectors / "3gpp";
    std::vector<int32_t> modes;
    std::ifstream list(dir / "modes.txt");
    for (std::string line; std::getline(list, line);) {
        while (!line.empty() && (line.back() == '\r' || line.back() == ' ')) line.pop_back();
        if (line.empty()) continue;
        const int m = mode_from_name(line);
        ASSERT_GE(m, 0) << "unknown mode '" << line << "' in modes.txt";
        modes.push_back(m);
    }
    std::vector<EncodeJob> jobs;
    if (!modes.empty()) {
        for (int32_t vad = 0; vad < 2; ++vad) {
            const std::string name = vad == 0 ? "spch_dos" : "spch_do2";
            EncodeJob job;
            job.name = "3gpp/" + name;
            job.row = vad == 0 ? "3gpp vad1" : "3gpp vad2";
            job.pcm = dir / "spch_dos_input.pcm";
            job.amr = dir / (name + ".amr");
            job.dtx = 1;
            job.vad_option = vad;
            job.modes = modes;
            job.decoded_crc = dir / (name + ".crc");
            jobs.push_back(std::move(job));
        }
    }
    run("encoder, 3gpp/ installation vectors", jobs);
}

}  // namespace
}  // namespace conformance
