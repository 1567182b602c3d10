// Runs the vamrnb command-line tool as a process: round trips through the
// common audio formats, equality with the library's own encoding, and the
// error paths a user meets (each a clear message, a documented exit code and
// no output file left behind).
#include <gtest/gtest.h>
#include <sndfile.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "vamrnb.h"

namespace fs = std::filesystem;

namespace {

struct Result {
    int code;
    std::string err;
};

class ToolTest : public ::testing::Test {
protected:
    fs::path dir;

    void SetUp() override {
        dir = fs::temp_directory_path() /
              ("vamrnb_tool_" + std::to_string(::getpid()) + "_" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(dir);
        fs::create_directories(dir);
    }
    void TearDown() override { fs::remove_all(dir); }

    std::string p(const std::string &name) const { return (dir / name).string(); }

    // Runs the tool with the given arguments; captures stderr and exit code.
    Result run(const std::string &args) const {
        const std::string errf = p("stderr.txt");
        const std::string cmd = std::string(VAMRNB_TOOL_PATH) + " " + args + " 2>" + errf + " >" + p("stdout.txt");
        const int st = std::system(cmd.c_str());
        std::ifstream f(errf);
        std::string err((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
        return {WIFEXITED(st) ? WEXITSTATUS(st) : -1, err};
    }

    // Leftover temporary or output files other than the named inputs.
    std::vector<std::string> files() const {
        std::vector<std::string> out;
        for (auto &e : fs::directory_iterator(dir)) {
            const std::string n = e.path().filename().string();
            if (n != "stderr.txt" && n != "stdout.txt") out.push_back(n);
        }
        return out;
    }
};

// A voiced, speech-like test signal: a few harmonics with a slow vibrato and
// an amplitude envelope, plus a little noise.
std::vector<float> voice(int rate, double seconds, double level = 0.3) {
    std::mt19937 rng(7);
    std::normal_distribution<double> noise(0.0, 0.01);
    const int n = static_cast<int>(rate * seconds);
    std::vector<float> x(static_cast<size_t>(n));
    double phase = 0;
    for (int i = 0; i < n; ++i) {
        const double t = static_cast<double>(i) / rate;
        const double f0 = 140 + 20 * std::sin(2 * M_PI * 3 * t);
        phase += 2 * M_PI * f0 / rate;
        double s = 0;
        for (int h = 1; h <= 6; ++h) s += std::sin(h * phase) / h;
        const double env = 0.5 + 0.5 * std::sin(2 * M_PI * 1.5 * t);
        x[static_cast<size_t>(i)] = static_cast<float>(level * env * s / 2.5 + noise(rng));
    }
    return x;
}

void write_audio(const std::string &path, int format, int rate, int channels, const std::vector<float> &mono) {
    SF_INFO info{};
    info.samplerate = rate;
    info.channels = channels;
    info.format = format;
    SNDFILE *sf = sf_open(path.c_str(), SFM_WRITE, &info);
    ASSERT_NE(sf, nullptr) << sf_strerror(nullptr);
    std::vector<float> inter;
    for (float v : mono)
        for (int c = 0; c < channels; ++c) inter.push_back(v);
    sf_writef_float(sf, inter.data(), static_cast<sf_count_t>(mono.size()));
    sf_close(sf);
}

struct Audio {
    SF_INFO info{};
    std::vector<int> samples;
};

Audio read_audio(const std::string &path) {
    Audio a;
    SNDFILE *sf = sf_open(path.c_str(), SFM_READ, &a.info);
    if (!sf) return a;
    a.samples.resize(static_cast<size_t>(a.info.frames * a.info.channels));
    sf_readf_int(sf, a.samples.data(), a.info.frames);
    sf_close(sf);
    return a;
}

std::vector<uint8_t> slurp(const std::string &path) {
    std::ifstream f(path, std::ios::binary);
    return std::vector<uint8_t>((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
}

void write_bytes(const std::string &path, const std::vector<uint8_t> &b) {
    std::ofstream f(path, std::ios::binary);
    f.write(reinterpret_cast<const char *>(b.data()), static_cast<std::streamsize>(b.size()));
}

std::vector<int16_t> to_s16(const std::vector<float> &x) {
    std::vector<int16_t> s;
    for (float v : x) s.push_back(static_cast<int16_t>(std::lrint(std::clamp(v, -1.0f, 0.99996f) * 32768)));
    return s;
}

// Encodes whole 160-sample frames (the last one zero-padded) with the library.
std::vector<uint8_t> library_encode(std::vector<int16_t> pcm, int mode) {
    codec_config cfg{};
    cfg.enc.mode = mode;
    vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
    std::vector<uint8_t> out{'#', '!', 'A', 'M', 'R', '\n'};
    pcm.resize((pcm.size() + 159) / 160 * 160);
    frame_info info{};
    for (size_t f = 0; f < pcm.size(); f += 160) {
        pcm_buffer in{};
        in.data[0] = pcm.data() + f;
        uint8_t buf[32];
        bitstream_buffer bs{buf, 0, 32};
        vamrnbe_encode(enc, &in, &bs, &info);
        out.insert(out.end(), buf, buf + info.bytes);
    }
    vamrnbe_delete(enc);
    return out;
}

TEST_F(ToolTest, RoundTripsCommonFormats) {
    struct Case {
        const char *name;
        int format, rate, channels;
    } cases[] = {
        {"mono8k.wav", SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1},
        {"mono16k.wav", SF_FORMAT_WAV | SF_FORMAT_PCM_16, 16000, 1},
        {"stereo44k.wav", SF_FORMAT_WAV | SF_FORMAT_PCM_16, 44100, 2},
        {"mono48k.flac", SF_FORMAT_FLAC | SF_FORMAT_PCM_16, 48000, 1},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        write_audio(p(c.name), c.format, c.rate, c.channels, voice(c.rate, 2.0));
        Result r = run("encode -q -m 7.4 " + p(c.name) + " " + p("x.amr"));
        ASSERT_EQ(r.code, 0) << r.err;
        const auto amr = slurp(p("x.amr"));
        ASSERT_GE(amr.size(), 6u);
        EXPECT_EQ(std::string(amr.begin(), amr.begin() + 6), "#!AMR\n");
        EXPECT_EQ(amr.size(), 6u + 100u * 20u);  // 2 s = 100 frames of 20 bytes in MR74
        r = run("decode -q " + p("x.amr") + " " + p("y.wav"));
        ASSERT_EQ(r.code, 0) << r.err;
        const Audio a = read_audio(p("y.wav"));
        EXPECT_EQ(a.info.samplerate, 8000);
        EXPECT_EQ(a.info.channels, 1);
        ASSERT_EQ(a.info.frames, 16000);
        double energy = 0;
        for (int v : a.samples) energy += std::pow(static_cast<double>(v) / 65536.0, 2);
        EXPECT_GT(energy / 16000, 1e3) << "decoded signal is nearly silent";
    }
}

TEST_F(ToolTest, RawEncodeEqualsLibraryAndRawDecodeWorks) {
    const auto pcm = to_s16(voice(8000, 1.37));  // not a whole number of frames
    std::vector<uint8_t> raw;
    for (int16_t s : pcm) {
        raw.push_back(static_cast<uint8_t>(s & 0xff));
        raw.push_back(static_cast<uint8_t>((s >> 8) & 0xff));
    }
    write_bytes(p("in.pcm"), raw);
    for (int mode = 0; mode < 8; ++mode) {
        Result r = run("encode -q -m " + std::to_string(mode) + " " + p("in.pcm") + " " + p("x.amr"));
        ASSERT_EQ(r.code, 0) << r.err;
        EXPECT_EQ(slurp(p("x.amr")), library_encode(pcm, mode)) << "mode " << mode;
    }
    // The same samples in a WAV give the same stream as the raw file.
    write_bytes(p("same.raw"), raw);
    ASSERT_EQ(run("encode -q --raw " + p("same.raw") + " " + p("a.amr")).code, 0);
    ASSERT_EQ(run("decode -q --bits 24 --channels 2 " + p("a.amr") + " " + p("b.pcm")).code, 0);
    EXPECT_EQ(slurp(p("b.pcm")).size(), 69u * 160 * 3 * 2);
}

TEST_F(ToolTest, OutputFormatsAndInfo) {
    write_audio(p("in.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 1.0));
    ASSERT_EQ(run("encode -q --dtx --vad 2 -m MR59 " + p("in.wav") + " " + p("x.amr")).code, 0);
    ASSERT_EQ(run("decode -q --bits 24 --channels 2 " + p("x.amr") + " " + p("y.flac")).code, 0);
    const Audio a = read_audio(p("y.flac"));
    EXPECT_EQ(a.info.channels, 2);
    EXPECT_EQ(a.info.format & SF_FORMAT_SUBMASK, SF_FORMAT_PCM_24);
    ASSERT_EQ(a.info.frames, 8000);
    for (size_t i = 0; i < a.samples.size(); i += 2) ASSERT_EQ(a.samples[i], a.samples[i + 1]);
    ASSERT_EQ(run("decode -q --bits 8 " + p("x.amr") + " " + p("y8.wav")).code, 0);
    EXPECT_EQ(read_audio(p("y8.wav")).info.format & SF_FORMAT_SUBMASK, SF_FORMAT_PCM_U8);

    Result r = run("info " + p("x.amr"));
    EXPECT_EQ(r.code, 0) << r.err;
    std::ifstream f(p("stdout.txt"));
    const std::string out((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
    EXPECT_NE(out.find("duration     1.00 s (50 frames"), std::string::npos) << out;
    EXPECT_NE(out.find("bad frames"), std::string::npos) << out;
}

TEST_F(ToolTest, ManyFilesToDirectoryInParallel) {
    std::string ins;
    for (int k = 0; k < 4; ++k) {
        const std::string name = "in" + std::to_string(k) + ".wav";
        write_audio(p(name), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 16000, 1, voice(16000, 0.5 + 0.1 * k));
        ins += " " + p(name);
    }
    fs::create_directories(dir / "out");
    ASSERT_EQ(run("encode -q -j 2 -o " + p("out") + ins).code, 0);
    std::string amrs;
    for (int k = 0; k < 4; ++k) {
        EXPECT_TRUE(fs::exists(dir / "out" / ("in" + std::to_string(k) + ".amr")));
        amrs += " " + p("out/in" + std::to_string(k) + ".amr");
    }
    ASSERT_EQ(run("decode -q -j 2 -o " + p("out") + amrs).code, 0);
    for (int k = 0; k < 4; ++k) EXPECT_TRUE(fs::exists(dir / "out" / ("in" + std::to_string(k) + ".wav")));
}

TEST_F(ToolTest, BadInputsFailCleanly) {
    write_bytes(p("text.wav"), std::vector<uint8_t>{'h', 'e', 'l', 'l', 'o', '\n'});
    write_bytes(p("empty.wav"), {});
    write_bytes(p("empty.amr"), {});
    std::vector<uint8_t> amr{'#', '!', 'A', 'M', 'R', '\n', 0x3C};
    amr.resize(6 + 32 + 10);  // one whole MR122 frame, then a cut-off one
    amr[6 + 32] = 0x3C;
    write_bytes(p("trunc.amr"), amr);
    write_bytes(p("nohead.amr"), std::vector<uint8_t>(amr.begin() + 6, amr.end()));
    std::vector<uint8_t> garbage{'#', '!', 'A', 'M', 'R', '\n'};
    for (int i = 0; i < 200; ++i) garbage.push_back(static_cast<uint8_t>(i * 37 + 11));
    write_bytes(p("garbage.amr"), garbage);

    struct Case {
        std::string args, expect;
        int code;
    } cases[] = {
        {"encode " + p("missing.wav") + " " + p("o.amr"), "No such file", 2},
        {"encode " + p("text.wav") + " " + p("o.amr"), "unrecognised audio file", 2},
        {"encode " + p("empty.wav") + " " + p("o.amr"), "empty file", 2},
        {"decode " + p("empty.amr") + " " + p("o.wav"), "empty file", 2},
        {"decode " + p("trunc.amr") + " " + p("o.wav"), "truncated last frame", 2},
        {"decode " + p("nohead.amr") + " " + p("o.wav"), "missing \"#!AMR\\n\" header", 2},
        {"decode " + p("garbage.amr") + " " + p("o.wav"), "invalid frame header", 2},
        {"encode --frobnicate " + p("text.wav") + " " + p("o.amr"), "unknown option", 1},
        {"encode -m 13.3 " + p("text.wav") + " " + p("o.amr"), "unknown mode", 1},
        {"transcode a b", "unknown command", 1},
    };
    const auto before = files();
    for (const auto &c : cases) {
        SCOPED_TRACE(c.args);
        Result r = run(c.args);
        EXPECT_EQ(r.code, c.code);
        EXPECT_NE(r.err.find(c.expect), std::string::npos) << r.err;
        EXPECT_EQ(files(), before) << "the failed run left a file behind";
    }
    // The truncated file still decodes when concealment is asked for.
    Result r = run("decode -q --lenient " + p("trunc.amr") + " " + p("o.wav"));
    EXPECT_EQ(r.code, 0) << r.err;
    EXPECT_EQ(read_audio(p("o.wav")).info.frames, 320);
}

}  // namespace
