// decode: a storage-format stream read in blocks through the library's stream
// reader, decoded frame by frame, and written in blocks to any format the
// installed libsndfile writes, optionally resampled with libsoxr.  A cut-off
// last frame and stray padding bits are warnings; bad, lost and no-data
// frames go through the decoder's concealment like any other frame.
#include <sndfile.h>
#include <soxr.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <memory>

#include "tool.h"
#include "vamrnb.h"
#include "vamrnb_stream.h"
#include "vamrnb_tables.h"

namespace tool {

namespace {

struct FormatName {
    const char *name;
    int major;
};
constexpr FormatName kFormats[] = {
    {"wav", SF_FORMAT_WAV},   {"flac", SF_FORMAT_FLAC}, {"ogg", SF_FORMAT_OGG | SF_FORMAT_VORBIS},
    {"oga", SF_FORMAT_OGG | SF_FORMAT_VORBIS},          {"opus", SF_FORMAT_OGG | SF_FORMAT_OPUS},
    {"mp3", SF_FORMAT_MPEG | SF_FORMAT_MPEG_LAYER_III}, {"aiff", SF_FORMAT_AIFF},
    {"aif", SF_FORMAT_AIFF},  {"au", SF_FORMAT_AU},     {"snd", SF_FORMAT_AU},
    {"caf", SF_FORMAT_CAF},   {"raw", SF_FORMAT_RAW},   {"pcm", SF_FORMAT_RAW},
};

// A canonical streaming WAV header for a pipe, where libsndfile cannot go
// back to fill in the sizes: both sizes say "unknown" (all ones), as players
// reading from a pipe expect.
void pipe_wav_header(uint8_t h[44], int rate, int channels, int bits) {
    auto put32 = [](uint8_t *p, uint32_t v) {
        for (int i = 0; i < 4; ++i) p[i] = static_cast<uint8_t>(v >> (8 * i));
    };
    auto put16 = [](uint8_t *p, uint32_t v) {
        p[0] = static_cast<uint8_t>(v);
        p[1] = static_cast<uint8_t>(v >> 8);
    };
    const uint32_t align = static_cast<uint32_t>(channels * bits / 8);
    std::memcpy(h, "RIFF", 4);
    put32(h + 4, 0xFFFFFFFFu);
    std::memcpy(h + 8, "WAVEfmt ", 8);
    put32(h + 16, 16);
    put16(h + 20, 1);  // integer PCM
    put16(h + 22, static_cast<uint32_t>(channels));
    put32(h + 24, static_cast<uint32_t>(rate));
    put32(h + 28, static_cast<uint32_t>(rate) * align);
    put16(h + 32, align);
    put16(h + 34, static_cast<uint32_t>(bits));
    std::memcpy(h + 36, "data", 4);
    put32(h + 40, 0xFFFFFFFFu);
}

// The audio side of decoding: libsndfile on the output file, libsoxr when
// another rate is asked for.  Samples arrive as 32-bit full-scale integers.
class AudioSink {
public:
    ~AudioSink() {
        if (sf_) sf_close(sf_);
        if (soxr_) soxr_delete(soxr_);
    }

    bool open(const Options &o, OutputFile &file, int sf_format, std::string &err) {
        channels_ = o.channels;
        SF_INFO info{};
        info.samplerate = o.rate;
        info.channels = o.channels;
        info.format = sf_format;
        if (!file.seekable() && (sf_format & SF_FORMAT_TYPEMASK) == SF_FORMAT_WAV) {
            uint8_t h[44];
            pipe_wav_header(h, o.rate, o.channels, o.bits);
            if (!file.write(h, sizeof h, err)) return false;
            info.format = SF_FORMAT_RAW | SF_ENDIAN_LITTLE | (o.bits == 8 ? SF_FORMAT_PCM_U8 : sf_format & SF_FORMAT_SUBMASK);
        }
        if (!sf_format_check(&info)) {
            err = format("the output format cannot hold %d-bit samples at %d Hz", o.bits, o.rate);
            return false;
        }
        sf_ = sf_open_fd(file.fd(), SFM_WRITE, &info, SF_FALSE);
        if (!sf_) {
            err = sf_strerror(nullptr);
            if (!file.seekable()) err += " (to a pipe, use -t wav or -t raw)";
            return false;
        }
        sf_command(sf_, SFC_SET_CLIPPING, nullptr, SF_TRUE);
        if (o.rate != kRate) {
            soxr_error_t e = nullptr;
            const soxr_io_spec_t io = soxr_io_spec(SOXR_FLOAT32_I, SOXR_FLOAT32_I);
            const soxr_quality_spec_t q = soxr_quality_spec(SOXR_HQ, 0);
            soxr_ = soxr_create(kRate, o.rate, static_cast<unsigned>(o.channels), &e, &io, &q, nullptr);
            if (e) {
                err = std::string("cannot resample: ") + e;
                return false;
            }
            const size_t room = kBlock * static_cast<size_t>(std::max(1, o.rate / kRate + 1)) + 256;
            fin_.resize(kBlock * static_cast<size_t>(channels_));
            fout_.resize(room * static_cast<size_t>(channels_));
        }
        return true;
    }

    // frames: interleaved sample frames of `channels` samples.
    bool write(const int32_t *x, size_t frames, std::string &err) {
        if (!soxr_) return check(sf_writef_int(sf_, x, static_cast<sf_count_t>(frames)), frames, err);
        const size_t ch = static_cast<size_t>(channels_);
        while (frames > 0) {
            const size_t n = std::min(frames, fin_.size() / ch);
            for (size_t i = 0; i < n * ch; ++i) fin_[i] = static_cast<float>(x[i] / 2147483648.0);
            if (!resample(fin_.data(), n, err)) return false;
            x += n * ch;
            frames -= n;
        }
        return true;
    }

    bool close(std::string &err) {
        if (soxr_ && !resample(nullptr, 0, err)) return false;
        const int rc = sf_close(sf_);
        sf_ = nullptr;
        if (rc != 0) {
            err = sf_error_number(rc);
            return false;
        }
        return true;
    }

private:
    bool check(sf_count_t wrote, size_t want, std::string &err) {
        if (wrote == static_cast<sf_count_t>(want)) return true;
        err = sf_strerror(sf_);
        return false;
    }

    // Feeds n frames (none: flush the resampler's tail) and writes its output.
    bool resample(const float *x, size_t n, std::string &err) {
        const size_t ch = static_cast<size_t>(channels_);
        for (size_t off = 0;;) {
            size_t idone = 0, odone = 0;
            const soxr_error_t e = soxr_process(soxr_, x ? x + off * ch : nullptr, x ? n - off : 0, &idone,
                                                fout_.data(), fout_.size() / ch, &odone);
            if (e) {
                err = std::string("resampling failed: ") + e;
                return false;
            }
            off += idone;
            if (odone && !check(sf_writef_float(sf_, fout_.data(), static_cast<sf_count_t>(odone)), odone, err))
                return false;
            if (x ? off >= n && odone < fout_.size() / ch : odone == 0) return true;
        }
    }

    SNDFILE *sf_ = nullptr;
    soxr_t soxr_ = nullptr;
    int channels_ = 1;
    std::vector<float> fin_, fout_;
};

struct DecoderCloser {
    void operator()(vamrnb_decoder *d) const { vamrnbd_delete(d); }
};

}  // namespace

int output_format(const std::string &name, int bits) {
    const std::string n = lower(name);
    for (const FormatName &f : kFormats) {
        if (n != f.name) continue;
        const int major = f.major & SF_FORMAT_TYPEMASK;
        if (f.major & SF_FORMAT_SUBMASK) return f.major;  // compressed: the codec chooses the sample size
        int sub = bits == 8 ? SF_FORMAT_PCM_S8 : bits == 24 ? SF_FORMAT_PCM_24 : SF_FORMAT_PCM_16;
        if (bits == 8 && major == SF_FORMAT_WAV) sub = SF_FORMAT_PCM_U8;
        return major | sub | (major == SF_FORMAT_RAW ? SF_ENDIAN_LITTLE : 0);
    }
    return 0;
}

const char *output_format_names() { return "wav flac ogg opus mp3 aiff au caf raw"; }

Outcome decode_file(const Options &o, const std::string &in, const std::string &out) {
    const auto t0 = std::chrono::steady_clock::now();
    const std::string name = shown(in);

    std::string type = o.type;
    if (type.empty()) type = o.raw || out == "-" ? "raw" : extension(out);
    const int fmt = output_format(type, o.bits);
    if (!fmt) {
        message(shown(out, true), "unknown output format \"" + type + "\" (use -t with one of: " +
                                      output_format_names() + ")");
        return {EXIT_USAGE};
    }

    codec_config cfg{};
    cfg.dec.layout = 1;
    cfg.dec.channels = o.channels;
    cfg.dec.sample_format = o.bits == 8 ? 1 : o.bits == 24 ? 3 : 0;
    int32_t status = 0;
    std::unique_ptr<vamrnb_decoder, DecoderCloser> dec(vamrnbd_create(&cfg, &status));
    if (!dec) {
        message(name, std::string("cannot create decoder: ") + vamrnb_strerror(status));
        return {EXIT_CODEC};
    }

    std::string err;
    OutputFile file(out);
    AudioSink sink;
    bool opened = false;
    Progress progress(o.progress, "decoding " + name, input_size(in));

    const size_t bps = static_cast<size_t>(o.bits / 8);
    const size_t ch = static_cast<size_t>(o.channels);
    std::vector<int32_t> pcm(kBlock / kFrame * kFrame * ch);
    size_t pcm_frames = 0;  // sample frames waiting in pcm
    uint64_t frames = 0, substituted = 0, padded = 0, first_padding = 0;

    auto flush = [&]() {
        if (pcm_frames && !sink.write(pcm.data(), pcm_frames, err)) return false;
        pcm_frames = 0;
        return true;
    };
    // One frame through the decoder.  Frame types the decoder refuses (10 and
    // 11) still stand for 20 ms: they are decoded as no-data frames.
    auto decode = [&](const vamrnb_stream_frame &f) -> int {
        uint8_t samples[kFrame * 2 * 3];
        pcm_buffer pout{};
        pout.data[0] = samples;
        frame_info info{};
        bitstream_buffer bin{const_cast<uint8_t *>(f.data), 0, f.size};
        int32_t rc = vamrnbd_decode(dec.get(), &bin, &pout, &info);
        if (rc == AMRNB_ERR_BAD_FRAME_TYPE) {
            uint8_t nodata = vamrnb_tbl_toc_byte[15];
            bin = {&nodata, 0, 1};
            rc = vamrnbd_decode(dec.get(), &bin, &pout, &info);
            ++substituted;
        }
        if (rc != AMRNB_OK) {
            message(name, format("decoder failed at byte %llu: %s", static_cast<unsigned long long>(f.offset),
                                 vamrnb_strerror(rc)));
            return EXIT_CODEC;
        }
        if (f.padding && padded++ == 0) first_padding = f.offset;
        // Widen to 32-bit full scale; libsndfile narrows without changing values.
        int32_t *dst = pcm.data() + pcm_frames * ch;
        for (size_t i = 0; i < kFrame * ch; ++i) {
            const uint8_t *b = samples + i * bps;
            const uint32_t v = bps == 1   ? uint32_t{b[0]} << 24
                               : bps == 2 ? (uint32_t{b[0]} << 16) | (uint32_t{b[1]} << 24)
                                          : (uint32_t{b[0]} << 8) | (uint32_t{b[1]} << 16) | (uint32_t{b[2]} << 24);
            dst[i] = static_cast<int32_t>(v);
        }
        pcm_frames += kFrame;
        ++frames;
        if (pcm_frames * ch == pcm.size() && !flush()) return EXIT_OUTPUT;
        return EXIT_OK;
    };

    StreamScan scan;
    const int rc = scan_stream(
        in,
        [&](const vamrnb_stream_frame &f) {
            if (!opened) {
                // The output is created only once the input is known to be AMR-NB.
                if (!file.open(err) || !sink.open(o, file, fmt, err)) {
                    message(shown(out, true), "cannot create: " + err);
                    return int{EXIT_OUTPUT};
                }
                opened = true;
            }
            const int code = decode(f);
            if (code == EXIT_OUTPUT) message(shown(out, true), "cannot write: " + err);
            return code;
        },
        [&](uint64_t bytes) { progress.update(bytes, static_cast<double>(frames) * 0.02); }, scan);
    progress.finish();
    if (rc != EXIT_OK) {
        if (!scan.read_error.empty()) message(name, scan.read_error);
        return {rc};
    }
    const int32_t st = scan.status;
    const vamrnb_stream_frame &partial = scan.partial;
    switch (st) {
    case AMRNB_OK:
        break;
    case VAMRNB_STREAM_ERR_TRUNCATED: {
        const std::string what = format("truncated last frame at byte %llu (frame type %d needs %u bytes, %u present)",
                                        static_cast<unsigned long long>(partial.offset), partial.type,
                                        vamrnb_stream_frame_size(partial.type), partial.size);
        if (o.strict) {
            message(name, what);
            return {EXIT_INPUT};
        }
        message(name, format("warning: %s; the %llu complete frames before it were decoded", what.c_str(),
                             static_cast<unsigned long long>(frames)));
        break;
    }
    case VAMRNB_STREAM_ERR_TOC:
        message(name, format("invalid frame header byte 0x%02X at byte %llu (F bit set): not AMR-NB "
                             "storage format from there on",
                             scan.bad_byte, static_cast<unsigned long long>(scan.offset)));
        return {EXIT_INPUT};
    default:
        message(name, scan.bytes == 0 ? "empty file" : explain_foreign(scan.head, scan.head_size, st));
        return {EXIT_INPUT};
    }
    if (padded)
        message(name, format("warning: %llu table-of-contents bytes have padding bits set (first at byte %llu); "
                             "ignored", static_cast<unsigned long long>(padded),
                             static_cast<unsigned long long>(first_padding)));
    if (substituted)
        message(name, format("warning: %llu frames of type 10 or 11 (not AMR-NB speech) decoded as lost frames",
                             static_cast<unsigned long long>(substituted)));
    if (!opened && (!file.open(err) || !sink.open(o, file, fmt, err))) {
        message(shown(out, true), "cannot create: " + err);
        return {EXIT_OUTPUT};
    }
    if (!flush() || !sink.close(err) || !file.commit(err)) {
        message(shown(out, true), "cannot write: " + err);
        return {EXIT_OUTPUT};
    }
    const double audio = static_cast<double>(frames) * 0.02;
    if (!o.quiet) {
        const double secs = std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
        message(name, format("-> %s: %llu frames, %.2f s, %.0fx real time", shown(out, true).c_str(),
                             static_cast<unsigned long long>(frames), audio, secs > 0 ? audio / secs : 0.0));
    }
    return {EXIT_OK, audio};
}

}  // namespace tool
