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
#include "../support/amr_file.h"

namespace fs = std::filesystem;
using amr_file::read_bytes;

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

    // Decoded samples of an .amr file as 16-bit values (8 kHz mono).
    std::vector<int> decoded(const std::string &amr, const std::string &wav) const;

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

void write_bytes(const std::string &path, const std::vector<uint8_t> &b) {
    std::ofstream f(path, std::ios::binary);
    f.write(reinterpret_cast<const char *>(b.data()), static_cast<std::streamsize>(b.size()));
}

std::vector<int16_t> to_s16(const std::vector<float> &x) {
    std::vector<int16_t> s;
    for (float v : x) s.push_back(static_cast<int16_t>(std::lrint(std::clamp(v, -1.0f, 0.99996f) * 32768)));
    return s;
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
        const auto amr = read_bytes(p("x.amr"));
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
        EXPECT_EQ(read_bytes(p("x.amr")), amr_file::encode(pcm, mode)) << "mode " << mode;
    }
    // The same samples in a WAV give the same stream as the raw file.
    write_bytes(p("same.raw"), raw);
    ASSERT_EQ(run("encode -q --raw " + p("same.raw") + " " + p("a.amr")).code, 0);
    ASSERT_EQ(run("decode -q --bits 24 --channels 2 " + p("a.amr") + " " + p("b.pcm")).code, 0);
    EXPECT_EQ(read_bytes(p("b.pcm")).size(), 69u * 160 * 3 * 2);
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
        {"decode --strict " + p("trunc.amr") + " " + p("o.wav"), "truncated last frame at byte 38", 2},
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
}

std::vector<int> ToolTest::decoded(const std::string &amr, const std::string &wav) const {
    EXPECT_EQ(run("decode -q " + amr + " " + wav).code, 0);
    std::vector<int> out;
    for (int v : read_audio(wav).samples) out.push_back(v >> 16);
    return out;
}

// Signal-to-difference ratio of y against the reference x, in dB.
double snr_db(const std::vector<int> &x, const std::vector<int> &y) {
    double sig = 0, diff = 0;
    for (size_t i = 0; i < std::min(x.size(), y.size()); ++i) {
        sig += static_cast<double>(x[i]) * x[i];
        diff += std::pow(static_cast<double>(x[i]) - y[i], 2);
    }
    return 10 * std::log10(sig / std::max(diff, 1.0));
}

// Every sample format libsndfile offers for WAV, at the codec's rate and at
// 48 kHz: the round trip must match the 16-bit integer file's.  Float and
// double at exactly 8 kHz used to be read unscaled, as silence.
TEST_F(ToolTest, EverySampleFormatMatchesTheSixteenBitPath) {
    // A one-LSB change of the input moves the encoder's choices, so even a
    // perfect read agrees only to about 18 dB; silence gives 0 dB, a wrongly
    // scaled read less.
    const double min_snr = 10;
    const struct {
        const char *name;
        int sub;
    } subs[] = {
        {"u8", SF_FORMAT_PCM_U8},       {"s24", SF_FORMAT_PCM_24},      {"s32", SF_FORMAT_PCM_32},
        {"float", SF_FORMAT_FLOAT},     {"double", SF_FORMAT_DOUBLE},   {"alaw", SF_FORMAT_ALAW},
        {"ulaw", SF_FORMAT_ULAW},
    };
    for (int rate : {8000, 48000}) {
        const auto x = voice(rate, 1.0);
        const std::string ref_wav = p("ref" + std::to_string(rate) + ".wav");
        write_audio(ref_wav, SF_FORMAT_WAV | SF_FORMAT_PCM_16, rate, 1, x);
        ASSERT_EQ(run("encode -q " + ref_wav + " " + p("ref.amr")).code, 0);
        const std::vector<int> ref = decoded(p("ref.amr"), p("ref_out.wav"));
        ASSERT_EQ(ref.size(), 8000u);
        for (const auto &f : subs) {
            SCOPED_TRACE(std::string(f.name) + " at " + std::to_string(rate));
            const std::string in = p(std::string(f.name) + ".wav");
            write_audio(in, SF_FORMAT_WAV | f.sub, rate, 1, x);
            const Result r = run("encode -q " + in + " " + p("x.amr"));
            ASSERT_EQ(r.code, 0) << r.err;
            const std::vector<int> y = decoded(p("x.amr"), p("x.wav"));
            ASSERT_EQ(y.size(), ref.size());
            EXPECT_GT(snr_db(ref, y), min_snr);
        }
    }
}

// Standard input and output in both commands, WAV through a pipe, other
// output formats and rates.
TEST_F(ToolTest, PipesFormatsAndRates) {
    write_audio(p("in.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 16000, 1, voice(16000, 1.0));
    ASSERT_EQ(run("encode -q " + p("in.wav") + " " + p("ref.amr")).code, 0);
    const std::string tool = VAMRNB_TOOL_PATH;
    // Through pipes (nothing seekable anywhere).
    ASSERT_EQ(std::system(("cat " + p("in.wav") + " | " + tool + " encode -q - - | cat > " + p("piped.amr")).c_str()), 0);
    EXPECT_EQ(read_bytes(p("piped.amr")), read_bytes(p("ref.amr")));
    ASSERT_EQ(std::system(("cat " + p("ref.amr") + " | " + tool + " decode -q - -t wav - | cat > " + p("pipe.wav")).c_str()), 0);
    ASSERT_EQ(run("decode -q " + p("ref.amr") + " " + p("file.wav")).code, 0);
    const auto piped = read_bytes(p("pipe.wav")), whole = read_bytes(p("file.wav"));
    ASSERT_EQ(piped.size(), whole.size());
    EXPECT_EQ(std::string(piped.begin(), piped.begin() + 4), "RIFF");
    EXPECT_TRUE(std::equal(piped.begin() + 44, piped.end(), whole.begin() + 44)) << "same samples after the header";
    // Standard output redirected to a file gets a complete WAV header.
    ASSERT_EQ(run("decode -q -t wav " + p("ref.amr") + " -").code, 0);
    EXPECT_EQ(read_bytes(p("stdout.txt")), whole);

    const struct {
        const char *args, *name;
        int major, rate;
    } outs[] = {
        {"", "a.flac", SF_FORMAT_FLAC, 8000},      {"", "a.ogg", SF_FORMAT_OGG, 8000},
        {"", "a.opus", SF_FORMAT_OGG, 8000},       {"", "a.mp3", SF_FORMAT_MPEG, 8000},
        {"", "a.aiff", SF_FORMAT_AIFF, 8000},      {"-t wav", "a.out", SF_FORMAT_WAV, 8000},
        {"--rate 48000", "b.wav", SF_FORMAT_WAV, 48000}, {"--rate 11025 -t flac", "c", SF_FORMAT_FLAC, 11025},
    };
    for (const auto &c : outs) {
        SCOPED_TRACE(c.name);
        const Result r = run(std::string("decode -q ") + c.args + " " + p("ref.amr") + " " + p(c.name));
        ASSERT_EQ(r.code, 0) << r.err;
        const Audio a = read_audio(p(c.name));
        EXPECT_EQ(a.info.format & SF_FORMAT_TYPEMASK, c.major);
        EXPECT_EQ(a.info.samplerate, c.rate);
        if (c.major != SF_FORMAT_OGG && c.major != SF_FORMAT_MPEG) {
            EXPECT_EQ(a.info.frames, c.rate);
        }
    }
}

// A phone that died mid-recording, stray padding bits, a frame type the
// decoder refuses: the audio is kept, the damage is named with its offset.
TEST_F(ToolTest, DamagedFilesDecodeWithWarnings) {
    write_audio(p("in.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 1.0));
    ASSERT_EQ(run("encode -q -m 5.9 " + p("in.wav") + " " + p("ok.amr")).code, 0);
    const auto amr = read_bytes(p("ok.amr"));  // magic + 50 frames of 16 bytes
    ASSERT_EQ(amr.size(), 6u + 50 * 16);
    const std::vector<int> ref = decoded(p("ok.amr"), p("ok.wav"));

    auto cut = amr;
    cut.resize(6 + 40 * 16 + 7);
    write_bytes(p("cut.amr"), cut);
    Result r = run("decode " + p("cut.amr") + " " + p("cut.wav"));
    EXPECT_EQ(r.code, 0) << r.err;
    EXPECT_NE(r.err.find("truncated last frame at byte 646"), std::string::npos) << r.err;
    const std::vector<int> got = decoded(p("cut.amr"), p("cut.wav"));
    EXPECT_EQ(got, std::vector<int>(ref.begin(), ref.begin() + 40 * 160));
    r = run("decode -q --strict " + p("cut.amr") + " " + p("strict.wav"));
    EXPECT_EQ(r.code, 2);
    EXPECT_FALSE(fs::exists(dir / "strict.wav"));

    auto padded = amr;
    for (size_t f = 0; f < 50; f += 7) padded[6 + f * 16] |= 3;
    write_bytes(p("padded.amr"), padded);
    r = run("decode -q " + p("padded.amr") + " " + p("padded.wav"));
    EXPECT_EQ(r.code, 0) << r.err;
    EXPECT_EQ(std::count(r.err.begin(), r.err.end(), '\n'), 1) << "one warning: " << r.err;
    EXPECT_NE(r.err.find("padding bits"), std::string::npos) << r.err;
    EXPECT_EQ(decoded(p("padded.amr"), p("padded.wav")), ref);

    // A type-10 frame (6 bytes) in place of frame 20 still stands for 20 ms.
    std::vector<uint8_t> odd(amr.begin(), amr.begin() + 6 + 20 * 16);
    odd.insert(odd.end(), {0x54, 0, 0, 0, 0, 0});
    odd.insert(odd.end(), amr.begin() + 6 + 21 * 16, amr.end());
    write_bytes(p("odd.amr"), odd);
    EXPECT_EQ(decoded(p("odd.amr"), p("odd.wav")).size(), ref.size());
}

// -o DIR: created when missing; colliding or self-overwriting outputs are
// refused before any work; a batch ends with a summary and a failure status.
TEST_F(ToolTest, OutputDirectoryRulesAndBatchSummary) {
    fs::create_directories(dir / "a");
    fs::create_directories(dir / "b");
    write_audio(p("a/x.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 0.5));
    write_audio(p("b/x.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 0.3));
    write_audio(p("a/y.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 0.7));

    Result r = run("encode -o " + p("out") + " " + p("a/x.wav") + " " + p("b/x.wav"));
    EXPECT_EQ(r.code, 1);
    EXPECT_NE(r.err.find(p("a/x.wav")), std::string::npos) << r.err;
    EXPECT_NE(r.err.find(p("b/x.wav")), std::string::npos) << r.err;
    EXPECT_FALSE(fs::exists(dir / "out")) << "nothing is done before the plan is checked";

    r = run("encode " + p("a/x.wav") + " " + p("a/x.wav"));
    EXPECT_EQ(r.code, 1);
    EXPECT_NE(r.err.find("also an input"), std::string::npos) << r.err;
    ASSERT_EQ(run("encode -q " + p("a/x.wav") + " " + p("a/x.amr")).code, 0);
    r = run("decode -t raw -o " + p("a") + " " + p("a/x.amr") + " " + p("a/../a/x.raw"));
    EXPECT_EQ(r.code, 1);

    write_bytes(p("a/bad.wav"), {'n', 'o', 'p', 'e'});
    r = run("encode -o " + p("out/deep") + " " + p("a/x.wav") + " " + p("a/y.wav") + " " + p("a/bad.wav"));
    EXPECT_EQ(r.code, 2);
    EXPECT_TRUE(fs::exists(dir / "out/deep/x.amr"));
    EXPECT_TRUE(fs::exists(dir / "out/deep/y.amr"));
    EXPECT_FALSE(fs::exists(dir / "out/deep/bad.amr"));
    EXPECT_NE(r.err.find("2 files converted, 1 failed, 1.20 s of audio"), std::string::npos) << r.err;
}

// info: JSON per file with damage and offsets; files that are something
// else get a sentence that names them.
TEST_F(ToolTest, InfoJsonAndForeignFiles) {
    write_audio(p("in.wav"), SF_FORMAT_WAV | SF_FORMAT_PCM_16, 8000, 1, voice(8000, 1.0));
    ASSERT_EQ(run("encode -q --dtx -m 12.2 " + p("in.wav") + " " + p("x.amr")).code, 0);
    auto amr = read_bytes(p("x.amr"));
    amr.resize(amr.size() - 3);
    write_bytes(p("cut.amr"), amr);
    write_bytes(p("wb.amr"), {'#', '!', 'A', 'M', 'R', '-', 'W', 'B', '\n', 0x44});
    write_bytes(p("v.3gp"), {0, 0, 0, 0x18, 'f', 't', 'y', 'p', '3', 'g', 'p', '4', 0, 0, 0, 0});

    Result r = run("info --json " + p("cut.amr"));
    EXPECT_EQ(r.code, 0) << r.err;
    std::ifstream f(p("stdout.txt"));
    const std::string out((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
    for (const char *key : {"\"format\":\"AMR-NB\"", "\"duration_s\":", "\"codec_bitrate_bps\":12200",
                            "\"file_bitrate_bps\":", "\"kind\":\"truncated\",\"offset\":"})
        EXPECT_NE(out.find(key), std::string::npos) << key << " in " << out;
    ASSERT_GT(out.size(), 3u);
    EXPECT_EQ(out.front(), '{');
    EXPECT_EQ(out.substr(out.size() - 3), "]}\n");

    r = run("info " + p("wb.amr"));
    EXPECT_EQ(r.code, 2);
    EXPECT_NE(r.err.find("AMR-WB"), std::string::npos) << r.err;
    r = run("decode " + p("v.3gp") + " " + p("o.wav"));
    EXPECT_EQ(r.code, 2);
    EXPECT_NE(r.err.find("MP4/3GPP container (brand '3gp4')"), std::string::npos) << r.err;
    EXPECT_FALSE(fs::exists(dir / "o.wav"));
}

}  // namespace
