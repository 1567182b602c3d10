// encode: any audio file libsndfile reads, or raw 8 kHz PCM, streamed in
// blocks through a mono down-mix and (other rates) libsoxr to 8 kHz, then
// 20 ms at a time through the encoder and the library's stream writer.
// Memory stays a few blocks whatever the input length.
#include <sndfile.h>
#include <soxr.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstring>
#include <memory>

#include "tool.h"
#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace tool {

namespace {

const char *const kModeName[8] = {"MR475", "MR515", "MR59", "MR67", "MR74", "MR795", "MR102", "MR122"};

// Collects samples into frames, encodes them and writes the stream out in
// blocks.
class FrameSink {
public:
    FrameSink(vamrnb_encoder *enc, OutputFile &out) : enc_(enc), out_(out) {
        size_t n = 0;
        vamrnb_stream_write_magic(buf_, sizeof buf_, &n);
        used_ = n;
    }

    bool push(const int16_t *s, size_t n, std::string &err) {
        while (n > 0) {
            const size_t take = std::min(n, static_cast<size_t>(kFrame) - fill_);
            std::memcpy(frame_ + fill_, s, take * sizeof *s);
            fill_ += take;
            s += take;
            n -= take;
            if (fill_ == kFrame && !encode(err)) return false;
        }
        return true;
    }

    // Pads a last partial frame with silence and writes what is left.
    bool finish(std::string &err) {
        if (fill_ > 0) {
            std::fill(frame_ + fill_, frame_ + kFrame, int16_t{0});
            fill_ = kFrame;
            if (!encode(err)) return false;
        }
        return flush(err);
    }

    uint64_t frames() const { return frames_; }
    uint64_t bytes() const { return bytes_; }

private:
    bool encode(std::string &err) {
        pcm_buffer in{};
        in.data[0] = frame_;
        uint8_t coded[VAMRNB_STREAM_MAX_FRAME];
        bitstream_buffer bs{coded, 0, sizeof coded};
        frame_info info{};
        vamrnbe_encode(enc_, &in, &bs, &info);
        fill_ = 0;
        if (sizeof buf_ - used_ < VAMRNB_STREAM_MAX_FRAME && !flush(err)) return false;
        size_t n = 0;
        const int32_t st = vamrnb_stream_write_frame(coded, info.bytes, buf_ + used_, sizeof buf_ - used_, &n);
        if (st != AMRNB_OK) {
            err = std::string("encoder produced an unusable frame: ") + vamrnb_strerror(st);
            return false;
        }
        used_ += n;
        ++frames_;
        return true;
    }

    bool flush(std::string &err) {
        if (!out_.write(buf_, used_, err)) return false;
        bytes_ += used_;
        used_ = 0;
        return true;
    }

    vamrnb_encoder *enc_;
    OutputFile &out_;
    int16_t frame_[kFrame];
    size_t fill_ = 0;
    uint8_t buf_[16384];
    size_t used_ = 0;
    uint64_t frames_ = 0, bytes_ = 0;
};

int16_t to_s16(float v) {
    return static_cast<int16_t>(std::clamp(std::lrint(static_cast<double>(v) * 32768.0), -32768L, 32767L));
}

struct SfCloser {
    void operator()(SNDFILE *s) const { sf_close(s); }
};
struct SoxrCloser {
    void operator()(soxr *s) const { soxr_delete(s); }
};
struct EncoderCloser {
    void operator()(vamrnb_encoder *e) const { vamrnbe_delete(e); }
};

}  // namespace

Outcome encode_file(const Options &o, const std::string &in, const std::string &out) {
    const auto t0 = std::chrono::steady_clock::now();
    const std::string name = shown(in);
    const bool raw = o.raw || extension(in) == "pcm" || extension(in) == "raw";
    const uint64_t in_bytes = input_size(in);
    if (in != "-" && access(in.c_str(), R_OK) != 0) {
        message(name, std::strerror(errno));
        return {EXIT_INPUT};
    }
    SF_INFO info{};
    if (raw) {
        info.samplerate = kRate;
        info.channels = 1;
        info.format = SF_FORMAT_RAW | SF_FORMAT_PCM_16 | SF_ENDIAN_LITTLE;
    }
    if (in != "-" && in_bytes == 0) {
        message(name, "empty file");
        return {EXIT_INPUT};
    }
    std::unique_ptr<SNDFILE, SfCloser> sf(in == "-" ? sf_open_fd(0, SFM_READ, &info, SF_FALSE)
                                                    : sf_open(in.c_str(), SFM_READ, &info));
    if (!sf) {
        message(name, std::string("unrecognised audio file (") + sf_strerror(nullptr) +
                          "); raw PCM needs --raw or a .pcm/.raw name");
        return {EXIT_INPUT};
    }
    const int ch = info.channels;
    if (ch <= 0 || info.samplerate <= 0) {
        message(name, "no audio in file");
        return {EXIT_INPUT};
    }

    codec_config cfg{};
    cfg.enc.dtx = o.dtx ? 1 : 0;
    cfg.enc.vad_option = o.vad == 2 ? 1 : 0;
    cfg.enc.mode = o.mode;
    int32_t status = 0;
    std::unique_ptr<vamrnb_encoder, EncoderCloser> enc(vamrnbe_create(&cfg, &status));
    if (!enc) {
        message(name, std::string("cannot create encoder: ") + vamrnb_strerror(status));
        return {EXIT_CODEC};
    }

    std::unique_ptr<soxr, SoxrCloser> resampler;
    if (info.samplerate != kRate) {
        soxr_error_t e = nullptr;
        const soxr_io_spec_t io = soxr_io_spec(SOXR_FLOAT32_I, SOXR_FLOAT32_I);
        const soxr_quality_spec_t q = soxr_quality_spec(SOXR_HQ, 0);
        resampler.reset(soxr_create(info.samplerate, kRate, 1, &e, &io, &q, nullptr));
        if (e) {
            message(name, std::string("cannot resample: ") + e);
            return {EXIT_CODEC};
        }
    }

    std::string err;
    OutputFile file(out);
    if (!file.open(err)) {
        message(shown(out, true), "cannot create: " + err);
        return {EXIT_OUTPUT};
    }
    FrameSink sink(enc.get(), file);
    Progress progress(o.progress, "encoding " + name, info.frames > 0 && info.frames < SF_COUNT_MAX
                                                          ? static_cast<uint64_t>(info.frames) : 0);

    const size_t block = kBlock / static_cast<size_t>(std::min(ch, 64)) + 1;
    std::vector<int16_t> mono16(block);
    std::vector<float> fbuf(block * static_cast<size_t>(ch)), mono(block);
    const double ratio = static_cast<double>(kRate) / info.samplerate;
    std::vector<float> resampled(static_cast<size_t>(static_cast<double>(block) * ratio) + 64);
    std::vector<int16_t> out16(resampled.size());
    bool failed = false;
    int fail_code = EXIT_OUTPUT;
    uint64_t read_frames = 0;

    // Resampler output as 16-bit samples into the encoder.
    auto drain = [&](const float *x, size_t n) {
        for (size_t off = 0; !failed;) {
            size_t idone = 0, odone = 0;
            const soxr_error_t e = soxr_process(resampler.get(), x ? x + off : nullptr, x ? n - off : 0,
                                                &idone, resampled.data(), resampled.size(), &odone);
            if (e) {
                err = std::string("resampling failed: ") + e;
                fail_code = EXIT_CODEC;
                failed = true;
                break;
            }
            off += idone;
            for (size_t i = 0; i < odone; ++i) out16[i] = to_s16(resampled[i]);
            if (!sink.push(out16.data(), odone, err)) failed = true;
            if (x ? off >= n && odone < resampled.size() : odone == 0) break;
        }
    };

    // Everything is read as float: libsndfile scales every sample format
    // (integer, float, double, A-law, u-law) to the same full range, and a
    // 16-bit sample comes back exact.
    for (sf_count_t got; !failed && (got = sf_readf_float(sf.get(), fbuf.data(), block)) > 0;) {
        const size_t n = static_cast<size_t>(got);
        for (size_t i = 0; i < n; ++i) {
            float sum = 0;
            for (int c = 0; c < ch; ++c) sum += fbuf[i * static_cast<size_t>(ch) + static_cast<size_t>(c)];
            mono[i] = sum / static_cast<float>(ch);
        }
        if (resampler) {
            drain(mono.data(), n);
        } else {
            for (size_t i = 0; i < n; ++i) mono16[i] = to_s16(mono[i]);
            if (!sink.push(mono16.data(), n, err)) failed = true;
        }
        read_frames += n;
        progress.update(read_frames, static_cast<double>(sink.frames()) * 0.02);
    }
    if (!failed && resampler) drain(nullptr, 0);
    if (!failed && sf_error(sf.get()) != SF_ERR_NO_ERROR) {
        message(name, std::string("read error: ") + sf_strerror(sf.get()));
        return {EXIT_INPUT};
    }
    progress.finish();
    if (failed) {
        message(fail_code == EXIT_OUTPUT ? shown(out, true) : name,
                fail_code == EXIT_OUTPUT ? "cannot write: " + err : err);
        return {fail_code};
    }
    if (read_frames == 0) {
        message(name, "no audio in file");
        return {EXIT_INPUT};
    }
    if (!sink.finish(err) || !file.commit(err)) {
        message(shown(out, true), "cannot write: " + err);
        return {EXIT_OUTPUT};
    }
    const double audio = static_cast<double>(sink.frames()) * 0.02;
    if (!o.quiet) {
        const double secs = std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
        message(name, format("-> %s: %llu frames, %.2f s, %s%s, %llu bytes, %.0fx real time",
                             shown(out, true).c_str(), static_cast<unsigned long long>(sink.frames()), audio,
                             kModeName[o.mode], o.dtx ? (o.vad == 2 ? " DTX/VAD2" : " DTX/VAD1") : "",
                             static_cast<unsigned long long>(sink.bytes()), secs > 0 ? audio / secs : 0.0));
    }
    return {EXIT_OK, audio};
}

}  // namespace tool
