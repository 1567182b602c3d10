// Decoder conformance: every stream of the reference vectors is decoded frame
// by frame through the public interface and each output frame's CRC-32 is
// compared with the reference decoder's.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <sstream>

#include "crc32.h"
#include "harness.h"
#include "vamrnb.h"

namespace conformance {
namespace {

struct DecodeJob {
    std::string name;  // shown in messages
    std::string row;   // report row prefix, the mode is appended
    std::string mode;  // empty: taken from the stream's frames
    fs::path amr, crc, pcm;
};

// Bytes the decoder reports as consumed for a frame of each type: the whole
// frame, except FT 9 whose payload is not read.
std::size_t consumed_bytes(int type) { return type == 9 ? 1 : vamrnb_stream_frame_size(type); }

void decode_stream(const DecodeJob &job, Report &report) {
    const auto file = read_bytes(job.amr);
    const auto crcs = read_crcs(job.crc);
    if (!file || !crcs) {
        report.fail(job.name + ": cannot read " + (file ? job.crc : job.amr).string());
        return;
    }
    std::optional<std::vector<int16_t>> pcm;
    if (!job.pcm.empty() && fs::exists(job.pcm)) pcm = read_pcm(job.pcm);

    std::string error;
    const auto frames = split_frames(*file, error);
    if (!error.empty()) report.fail(job.name + ": " + error);
    const std::string row = job.row + " " + (job.mode.empty() ? stream_mode_label(frames) : job.mode);

    const codec_config config = {{0, 1, 1, 0}};  // interleaved, one channel, 16-bit
    int32_t status = 1;
    vamrnb_decoder *dec = vamrnbd_create(&config, &status);
    if (dec == nullptr || status != AMRNB_OK) {
        report.fail(job.name + ": vamrnbd_create failed with " + std::to_string(status));
        report.add(row, 0, crcs->size());
        return;
    }

    int16_t out[2 * 160];
    pcm_buffer buffers{};
    buffers.data[0] = out;
    frame_info info{};
    uint64_t exact = 0, produced = 0, differing = 0;
    std::string first_difference;

    for (std::size_t i = 0; i < frames.size(); ++i) {
        const Frame &f = frames[i];
        bitstream_buffer in{const_cast<uint8_t *>(file->data() + f.offset), 0,
                            static_cast<uint32_t>(file->size() - f.offset)};
        std::fill(std::begin(out), std::end(out), int16_t{0x5555});
        const uint32_t count_before = info.frame_count;
        const int32_t rc = vamrnbd_decode(dec, &in, &buffers, &info);
        std::ostringstream where;
        where << job.name << " frame " << i << " (" << mode_name(f.type) << (f.quality ? "" : ", Q=0")
              << ")";

        if (f.type == 10 || f.type == 11) {
            if (rc != AMRNB_ERR_BAD_FRAME_TYPE || info.produced != 0 || info.frame_count != count_before)
                report.fail(where.str() + ": expected refusal -5 without output, got " +
                            std::to_string(rc));
            continue;
        }
        const uint64_t k = produced++;
        if (rc != AMRNB_OK || info.produced != 1) {
            report.fail(where.str() + ": decode returned " + std::to_string(rc));
            continue;
        }
        if (info.bytes != consumed_bytes(f.type))
            report.fail(where.str() + ": reported " + std::to_string(info.bytes) +
                        " bytes consumed, expected " + std::to_string(consumed_bytes(f.type)));
        if (k >= crcs->size()) continue;
        if (frame_crc32(out) == (*crcs)[k]) {
            ++exact;
            continue;
        }
        if (differing++ > 0) continue;
        std::ostringstream d;
        d << where.str() << ", output frame " << k << ": CRC differs";
        if (pcm && pcm->size() >= (k + 1) * 160) {
            for (int s = 0; s < 160; ++s) {
                const int16_t want = (*pcm)[k * 160 + s];
                if (out[s] == want) continue;
                d << "; first differing sample " << k * 160 + s << " (sample " << s
                  << " of the frame): ours " << out[s] << ", expected " << want;
                break;
            }
        }
        first_difference = d.str();
    }
    vamrnbd_delete(dec);

    if (produced != crcs->size())
        report.fail(job.name + ": " + std::to_string(produced) + " output frames, expected " +
                    std::to_string(crcs->size()));
    if (differing > 0)
        report.fail(first_difference + " [" + std::to_string(differing) + " of " +
                    std::to_string(crcs->size()) + " frames differ]");
    report.add(row, exact, crcs->size());
}

void run(const std::string &title, const std::vector<DecodeJob> &jobs) {
    if (jobs.empty()) GTEST_SKIP() << "no streams for " << title << " in " << roots().vectors;
    Report report;
    run_parallel(jobs.size(), [&](std::size_t i) { decode_stream(jobs[i], report); });
    const std::string failures = report.finish(title);
    EXPECT_TRUE(report.clean()) << failures;
}

// dec/<item>/<MODE>_<cfg>.crc: the decoder's answer to enc/<item>/<MODE>_<cfg>.amr.
void run_dec(const std::string &cfg) {
    std::vector<DecodeJob> jobs;
    const fs::path &v = roots().vectors;
    for (const auto &item : sorted_entries(v / "dec", true)) {
        for (const auto &crc : sorted_entries(item, false, ".crc")) {
            const std::string stem = crc.stem().string();
            const auto cut = stem.rfind('_');
            if (cut == std::string::npos || stem.substr(cut + 1) != cfg) continue;
            const std::string name = item.filename().string() + "/" + stem;
            jobs.push_back({"dec/" + name, "dec/" + cfg, stem.substr(0, cut),
                            v / "enc" / item.filename() / (stem + ".amr"), crc,
                            crc.parent_path() / (stem + ".pcm")});
        }
    }
    run("decoder, dec/ " + cfg, jobs);
}

TEST(Decoder, DecNodtx) { run_dec("nodtx"); }
TEST(Decoder, DecVad1) { run_dec("vad1"); }
TEST(Decoder, DecVad2) { run_dec("vad2"); }

TEST(Decoder, Err) {
    std::vector<DecodeJob> jobs;
    const fs::path &v = roots().vectors;
    for (const auto &item : sorted_entries(v / "err", true))
        for (const auto &amr : sorted_entries(item, false, ".amr")) {
            const fs::path base = amr.parent_path() / amr.stem();
            jobs.push_back({"err/" + item.filename().string() + "/" + amr.stem().string(), "err", "",
                            amr, base.string() + ".crc", base.string() + ".pcm"});
        }
    run("decoder, err/", jobs);
}

TEST(Decoder, Real) {
    std::vector<DecodeJob> jobs;
    const Roots &r = roots();
    for (const auto &crc : sorted_entries(r.vectors / "real", false, ".crc")) {
        const std::string name = crc.stem().string();
        jobs.push_back({"real/" + name, "real", "", r.corpus / "amr" / (name + ".amr"), crc,
                        crc.parent_path() / (name + ".pcm")});
    }
    run("decoder, real/", jobs);
}

TEST(Decoder, Installation) {
    std::vector<DecodeJob> jobs;
    const fs::path dir = roots().vectors / "3gpp";
    for (const char *name : {"spch_dos", "spch_do2"}) {
        if (!fs::exists(dir / (std::string(name) + ".amr"))) continue;
        jobs.push_back({std::string("3gpp/") + name, "3gpp", "mixed", dir / (std::string(name) + ".amr"),
                        dir / (std::string(name) + ".crc"), dir / (std::string(name) + ".pcm")});
    }
    run("decoder, 3gpp/ installation vectors", jobs);
}

}  // namespace
}  // namespace conformance
