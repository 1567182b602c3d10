// vamrnb._vamrnb: the compiled half of the Python package.  It holds the
// codec loops (whole streams and single frames, with the interpreter lock
// released while the codec runs), the walk over a stream with the library's
// stream reader, and the libsoxr resampler.  Argument checking, mode names,
// sources and error messages are the pure-Python half's job
// (vamrnb/__init__.py), so every entry point here trusts the types and sizes
// it is given.
#include <pybind11/numpy.h>
#include <pybind11/pybind11.h>
#include <pybind11/stl.h>
#include <soxr.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <string>
#include <memory>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace py = pybind11;

namespace {

constexpr int kFrame = 160;

// The frames of a whole stream in memory, through the library's stream
// reader: where each whole frame starts, and how the stream ended (0, or the
// reader's status and the offset it names).
struct Walk {
    std::vector<vamrnb_stream_frame> frames;
    int32_t status = AMRNB_OK;
    uint64_t offset = 0;
};

Walk walk(const uint8_t *data, size_t size) {
    Walk w;
    int32_t status = AMRNB_OK;
    const std::unique_ptr<vamrnb_stream_reader, void (*)(vamrnb_stream_reader *)> owner(
        vamrnb_stream_reader_create(&status), vamrnb_stream_reader_delete);
    vamrnb_stream_reader *reader = owner.get();
    if (!reader) throw std::bad_alloc();
    size_t pos = 0, used = 0;
    vamrnb_stream_frame frame{};
    while ((status = vamrnb_stream_read(reader, data + pos, size - pos, &used, &frame)) ==
           VAMRNB_STREAM_FRAME) {
        w.frames.push_back(frame);
        pos += used;
    }
    if (status == AMRNB_OK) {
        vamrnb_stream_frame partial{};
        status = vamrnb_stream_finish(reader, &partial);
        w.offset = status == VAMRNB_STREAM_ERR_TRUNCATED ? partial.offset : size;
    } else {
        w.offset = vamrnb_stream_reader_offset(reader);
    }
    // A wrong or unsupported file header is the whole stream's fault.
    if (status == VAMRNB_STREAM_ERR_MAGIC || status == VAMRNB_STREAM_ERR_WIDEBAND ||
        status == VAMRNB_STREAM_ERR_MULTICHANNEL)
        w.offset = 0;
    w.status = status;
    return w;
}

// A byte view of any contiguous buffer; holding the request keeps a bytearray
// from being resized while the lock is released.
struct Bytes {
    py::buffer_info info;
    explicit Bytes(const py::buffer &b) : info(b.request()) {
        if (!PyBuffer_IsContiguous(info.view(), 'C')) throw py::value_error("buffer is not contiguous");
    }
    const uint8_t *data() const { return static_cast<const uint8_t *>(info.ptr); }
    size_t size() const { return static_cast<size_t>(info.size * info.itemsize); }
};

// One decoder instance; 16-bit samples, one channel, interleaved buffer.
class DecoderCore {
public:
    DecoderCore() {
        const codec_config cfg = {{0, 1, 1, 0}};
        int32_t status = 0;
        dec_ = vamrnbd_create(&cfg, &status);
        if (!dec_) throw std::bad_alloc();
    }
    ~DecoderCore() { vamrnbd_delete(dec_); }
    DecoderCore(const DecoderCore &) = delete;
    DecoderCore &operator=(const DecoderCore &) = delete;

    // Decodes one frame into out[160]; false for the refused types 10 and 11.
    bool decode(const uint8_t *frame, size_t size, int16_t *out) {
        bitstream_buffer in{const_cast<uint8_t *>(frame), 0, static_cast<uint32_t>(size)};
        pcm_buffer pcm{};
        pcm.data[0] = out;
        return vamrnbd_decode(dec_, &in, &pcm, &info_) == AMRNB_OK;
    }
    void reset() { vamrnbd_reset(dec_); }
    std::mutex lock;

private:
    vamrnb_decoder *dec_ = nullptr;
    frame_info info_{};
};

class EncoderCore {
public:
    EncoderCore(int mode, bool dtx, int vad_option) {
        check_mode(mode);
        codec_config cfg{};
        cfg.enc.dtx = dtx ? 1 : 0;
        cfg.enc.vad_option = vad_option;
        cfg.enc.mode = mode;
        int32_t status = 0;
        enc_ = vamrnbe_create(&cfg, &status);
        if (!enc_) throw std::bad_alloc();
        mode_ = mode;
    }
    ~EncoderCore() { vamrnbe_delete(enc_); }
    EncoderCore(const EncoderCore &) = delete;
    EncoderCore &operator=(const EncoderCore &) = delete;

    // Encodes 160 samples (the codec masks them in place, hence the copy);
    // returns the frame's size in out[32].
    size_t encode(const int16_t *samples, uint8_t *out) {
        int16_t frame[kFrame];
        std::memcpy(frame, samples, sizeof frame);
        pcm_buffer in{};
        in.data[0] = frame;
        bitstream_buffer bits{out, 0, 32};
        vamrnbe_encode(enc_, &in, &bits, &info_);
        return info_.bytes;
    }
    int mode() const { return mode_; }
    // The caller checks the mode first, while it holds the interpreter lock.
    void set_mode(int mode) {
        vamrnbe_set_mode(enc_, mode);
        mode_ = mode;
    }
    static void check_mode(int mode) {
        if (mode < MR475 || mode > MR122) throw py::value_error("mode out of range 0..7");
    }
    std::mutex lock;

private:
    vamrnb_encoder *enc_ = nullptr;
    frame_info info_{};
    int mode_ = MR122;
};

template <typename T>
py::array_t<T> frame_array(size_t samples) {
    return py::array_t<T>(static_cast<py::ssize_t>(samples));
}

void to_float(const int16_t *in, float *out, size_t n) {
    for (size_t i = 0; i < n; ++i) out[i] = static_cast<float>(in[i]) * (1.0f / 32768.0f);
}

// Whole stream: (samples, status, offset) with the walk's ending.  Refused
// frame types give no samples.
py::tuple decode_stream(const py::buffer &src, bool as_float) {
    const Bytes b(src);
    Walk w;
    size_t speech = 0;
    {
        py::gil_scoped_release unlocked;
        w = walk(b.data(), b.size());
        for (const auto &f : w.frames) speech += f.type != 10 && f.type != 11;
    }
    py::array out = as_float ? py::array(frame_array<float>(speech * kFrame))
                             : py::array(frame_array<int16_t>(speech * kFrame));
    void *dst = out.mutable_data();
    {
        py::gil_scoped_release unlocked;
        DecoderCore dec;
        int16_t pcm[kFrame];
        size_t k = 0;
        for (const auto &f : w.frames) {
            int16_t *frame_out = as_float ? pcm : static_cast<int16_t *>(dst) + k * kFrame;
            if (!dec.decode(f.data, f.size, frame_out)) continue;
            if (as_float) to_float(pcm, static_cast<float *>(dst) + k * kFrame, kFrame);
            ++k;
        }
    }
    return py::make_tuple(out, w.status, w.offset);
}

// Frames of a stream as (offset, type, quality) rows, with the walk's ending.
py::tuple walk_stream(const py::buffer &src) {
    const Bytes b(src);
    const Walk w = walk(b.data(), b.size());
    py::list rows(w.frames.size());
    for (size_t i = 0; i < w.frames.size(); ++i)
        rows[i] = py::make_tuple(w.frames[i].offset, w.frames[i].type, w.frames[i].quality != 0);
    return py::make_tuple(rows, w.status, w.offset);
}

// Whole signal, already 8 kHz mono 16-bit: the stream header and one frame
// per 160 samples, the last partial frame padded with zeros.
py::bytes encode_stream(EncoderCore &enc, const py::array_t<int16_t, py::array::c_style> &pcm) {
    const int16_t *s = pcm.data();
    const size_t n = static_cast<size_t>(pcm.size());
    std::string out;
    {
        py::gil_scoped_release unlocked;
        std::lock_guard<std::mutex> hold(enc.lock);
        const size_t frames = (n + kFrame - 1) / kFrame;
        out.reserve(VAMRNB_STREAM_MAGIC_SIZE + frames * VAMRNB_STREAM_MAX_FRAME);
        out.append(VAMRNB_STREAM_MAGIC, VAMRNB_STREAM_MAGIC_SIZE);
        uint8_t bits[32];
        for (size_t f = 0; f < frames; ++f) {
            int16_t frame[kFrame] = {};
            std::memcpy(frame, s + f * kFrame, std::min<size_t>(kFrame, n - f * kFrame) * sizeof(int16_t));
            const size_t got = enc.encode(frame, bits);
            out.append(reinterpret_cast<const char *>(bits), got);
        }
    }
    return py::bytes(out);
}

py::bytes encode_frame(EncoderCore &enc, const py::array_t<int16_t, py::array::c_style> &frame) {
    if (frame.size() != kFrame) throw py::value_error("a frame is 160 samples");
    uint8_t bits[32];
    size_t got;
    {
        py::gil_scoped_release unlocked;
        std::lock_guard<std::mutex> hold(enc.lock);
        got = enc.encode(frame.data(), bits);
    }
    return py::bytes(reinterpret_cast<const char *>(bits), got);
}

// One frame, already checked for a valid header byte and its exact size.
// Types 10 and 11 decode to no samples.
py::array decode_frame(DecoderCore &dec, const py::buffer &frame, bool as_float) {
    const Bytes b(frame);
    int16_t pcm[kFrame];
    bool produced;
    {
        py::gil_scoped_release unlocked;
        std::lock_guard<std::mutex> hold(dec.lock);
        produced = dec.decode(b.data(), b.size(), pcm);
    }
    const size_t n = produced ? kFrame : 0;
    if (as_float) {
        auto out = frame_array<float>(n);
        to_float(pcm, out.mutable_data(), n);
        return out;
    }
    auto out = frame_array<int16_t>(n);
    std::memcpy(out.mutable_data(), pcm, n * sizeof(int16_t));
    return out;
}

// Mono float signal at rate Hz to 8 kHz (libsoxr, high quality).
py::array_t<float> resample(const py::array_t<float, py::array::c_style> &in, double rate) {
    const size_t n = static_cast<size_t>(in.size());
    const size_t room = static_cast<size_t>(static_cast<double>(n) * 8000.0 / rate) + 16;
    std::vector<float> out(room);
    size_t done = 0;
    soxr_error_t e;
    {
        py::gil_scoped_release unlocked;
        const soxr_quality_spec_t q = soxr_quality_spec(SOXR_HQ, 0);
        e = soxr_oneshot(rate, 8000, 1, in.data(), n, nullptr, out.data(), room, &done, nullptr, &q,
                         nullptr);
    }
    if (e) throw py::value_error(std::string("resampling failed: ") + e);
    py::array_t<float> res(static_cast<py::ssize_t>(done));
    std::memcpy(res.mutable_data(), out.data(), done * sizeof(float));
    return res;
}

}  // namespace

PYBIND11_MODULE(_vamrnb, m) {
    m.doc() = "Codec loops of the vamrnb package; use the vamrnb module instead.";

    py::class_<DecoderCore>(m, "DecoderCore")
        .def(py::init<>())
        .def("decode", &decode_frame, py::arg("frame"), py::arg("as_float"))
        .def("reset", [](DecoderCore &d) {
            py::gil_scoped_release unlocked;
            std::lock_guard<std::mutex> hold(d.lock);
            d.reset();
        });
    py::class_<EncoderCore>(m, "EncoderCore")
        .def(py::init<int, bool, int>(), py::arg("mode"), py::arg("dtx"), py::arg("vad_option"))
        .def("encode", &encode_frame, py::arg("frame"))
        .def("encode_stream", &encode_stream, py::arg("pcm"))
        .def_property("mode", &EncoderCore::mode, [](EncoderCore &e, int mode) {
            EncoderCore::check_mode(mode);
            py::gil_scoped_release unlocked;
            std::lock_guard<std::mutex> hold(e.lock);
            e.set_mode(mode);
        });
    m.def("decode_stream", &decode_stream, py::arg("data"), py::arg("as_float"));
    m.def("walk_stream", &walk_stream, py::arg("data"));
    m.def("strerror", &vamrnb_strerror, py::arg("status"));
    m.attr("STREAM_ERR_TRUNCATED") = static_cast<int>(VAMRNB_STREAM_ERR_TRUNCATED);
    m.def("resample", &resample, py::arg("signal"), py::arg("rate"));
    m.attr("FRAME_BYTES") = [] {
        py::tuple t(16);
        for (int ft = 0; ft < 16; ++ft) t[static_cast<size_t>(ft)] = vamrnb_stream_frame_size(ft);
        return t;
    }();
    m.attr("VERSION") = vamrnb_version();
}
