// The WebAssembly side of the JavaScript package: stream-level decoder and
// encoder handles over the C interface, with plain integer and pointer
// arguments so that the JavaScript wrapper (web/src/index.js) needs nothing
// but the module's exports and its memory.
//
// A decoder handle turns bytes of a storage-format stream, in any chunking,
// into 8 kHz samples and counts the frame types it met; an encoder handle
// turns samples, in any chunking, into stream bytes.  Output accumulates in a
// buffer owned by the handle until the wrapper has copied it out and called
// *_consume.  Nothing here prints or aborts; every failure is a status value.
#include <malloc.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"

#define JS_EXPORT extern "C" __attribute__((used, visibility("default")))

namespace {

constexpr int kFrameSamples = 160;

// Status values of this layer, beside the library's and the stream layer's.
constexpr int32_t kErrNotAmr = -100;  // headerless input that is not a frame sequence

struct Decoder {
    vamrnb_decoder *codec = nullptr;
    vamrnb_stream_reader *reader = nullptr;
    std::vector<int16_t> out;
    // Frames met, by frame type 0..15, and frames with the quality bit clear.
    uint32_t frames_by_type[16] = {};
    uint32_t bad_frames = 0;
    uint32_t refused_frames = 0;  // types 10 and 11: no output
    uint32_t truncated = 0;       // 1 when the input ended inside a frame
    frame_info info{};
};

struct Encoder {
    vamrnb_encoder *codec = nullptr;
    int16_t pending[kFrameSamples] = {};
    int pending_count = 0;
    std::vector<uint8_t> out;
    uint32_t frames_by_type[16] = {};
    frame_info info{};
};

// Decodes one frame into the output; frame types 10 and 11 are refused by
// the codec and leave no output, as they leave no trace in its state.
int32_t decode_frame(Decoder &d, const uint8_t *data, uint32_t size, int type) {
    int16_t samples[kFrameSamples];
    pcm_buffer pcm{};
    pcm.data[0] = samples;
    bitstream_buffer in{const_cast<uint8_t *>(data), 0, size};
    const int32_t rc = vamrnbd_decode(d.codec, &in, &pcm, &d.info);
    if (rc == AMRNB_ERR_BAD_FRAME_TYPE && (type == 10 || type == 11)) {
        ++d.refused_frames;
        return AMRNB_OK;
    }
    if (rc != AMRNB_OK) return rc;
    d.out.insert(d.out.end(), samples, samples + kFrameSamples);
    return AMRNB_OK;
}

}  // namespace

// ---- decoder ------------------------------------------------------------------

JS_EXPORT Decoder *vamrnb_js_decoder_create() {
    auto *d = new (std::nothrow) Decoder;
    if (d == nullptr) return nullptr;
    const codec_config config = {{0, 1, 1, 0}};  // one interleaved 16-bit channel
    d->codec = vamrnbd_create(&config, nullptr);
    d->reader = vamrnb_stream_reader_create(nullptr);
    if (d->codec == nullptr || d->reader == nullptr) {
        vamrnbd_delete(d->codec);
        vamrnb_stream_reader_delete(d->reader);
        delete d;
        return nullptr;
    }
    return d;
}

JS_EXPORT void vamrnb_js_decoder_delete(Decoder *d) {
    if (d == nullptr) return;
    vamrnbd_delete(d->codec);
    vamrnb_stream_reader_delete(d->reader);
    delete d;
}

// Feeds size bytes of the stream.  When check_padding is set, a frame whose
// table-of-contents padding bits are not zero fails the call with kErrNotAmr:
// the wrapper uses this for input that came without the magic, where
// well-formed frame headers are the only sign that it is a stream at all.
// Returns 0 or a negative status; decoded samples wait in the output.
JS_EXPORT int32_t vamrnb_js_decoder_push(Decoder *d, const uint8_t *data, uint32_t size,
                                         int32_t check_padding) {
    std::size_t pos = 0;
    while (true) {
        std::size_t consumed = 0;
        vamrnb_stream_frame frame{};
        const int32_t rc = vamrnb_stream_read(d->reader, data + pos, size - pos, &consumed, &frame);
        pos += consumed;
        if (rc == AMRNB_OK) return AMRNB_OK;
        if (rc != VAMRNB_STREAM_FRAME) return rc;
        if (check_padding && frame.padding != 0) return kErrNotAmr;
        ++d->frames_by_type[frame.type & 15];
        if (!frame.quality) ++d->bad_frames;
        const int32_t status = decode_frame(*d, frame.data, frame.size, frame.type);
        if (status != AMRNB_OK) return status;
    }
}

// Ends the stream.  A frame cut off by the end of the input is counted and
// concealed as a lost frame; its bits never arrived.  With strict set (input
// without the magic) the cut is an error instead: there, frames that fit the
// input exactly are the only sign that it is a stream.
JS_EXPORT int32_t vamrnb_js_decoder_finish(Decoder *d, int32_t strict) {
    vamrnb_stream_frame partial{};
    const int32_t rc = vamrnb_stream_finish(d->reader, &partial);
    if (rc == VAMRNB_STREAM_ERR_TRUNCATED) {
        if (strict) return kErrNotAmr;
        d->truncated = 1;
        static const uint8_t no_data = 0x7C;
        return decode_frame(*d, &no_data, 1, 15);
    }
    return rc;
}

// Back to the state after creation, ready for a new stream.
JS_EXPORT void vamrnb_js_decoder_reset(Decoder *d) {
    vamrnbd_reset(d->codec);
    vamrnb_stream_reader_reset(d->reader);
    const auto codec = d->codec;
    const auto reader = d->reader;
    d->out.clear();
    *d = Decoder{};
    d->codec = codec;
    d->reader = reader;
}

JS_EXPORT const int16_t *vamrnb_js_decoder_output(const Decoder *d) { return d->out.data(); }
JS_EXPORT uint32_t vamrnb_js_decoder_output_samples(const Decoder *d) {
    return static_cast<uint32_t>(d->out.size());
}
JS_EXPORT void vamrnb_js_decoder_consume(Decoder *d) { d->out.clear(); }

// Statistics: index 0..15 frames of that type, 16 bad frames, 17 refused
// frames, 18 truncated (0 or 1), 19 output frames.
JS_EXPORT uint32_t vamrnb_js_decoder_stat(const Decoder *d, int32_t index) {
    if (index >= 0 && index < 16) return d->frames_by_type[index];
    switch (index) {
    case 16: return d->bad_frames;
    case 17: return d->refused_frames;
    case 18: return d->truncated;
    case 19: return d->info.frame_count;
    default: return 0;
    }
}

// ---- encoder ------------------------------------------------------------------

// mode 0..7; dtx 0/1; vad_option 0 selects the first detector, 1 the second.
// Returns null with *error set on a bad configuration or without memory.
JS_EXPORT Encoder *vamrnb_js_encoder_create(int32_t mode, int32_t dtx, int32_t vad_option,
                                            int32_t *error) {
    auto *e = new (std::nothrow) Encoder;
    if (e == nullptr) {
        if (error) *error = AMRNB_ERR_NO_MEMORY;
        return nullptr;
    }
    const codec_config config = {{dtx, 0, vad_option, mode}};
    e->codec = vamrnbe_create(&config, error);
    if (e->codec == nullptr) {
        delete e;
        return nullptr;
    }
    uint8_t magic[VAMRNB_STREAM_MAGIC_SIZE];
    std::size_t written = 0;
    vamrnb_stream_write_magic(magic, sizeof magic, &written);
    e->out.assign(magic, magic + written);
    return e;
}

JS_EXPORT void vamrnb_js_encoder_delete(Encoder *e) {
    if (e == nullptr) return;
    vamrnbe_delete(e->codec);
    delete e;
}

JS_EXPORT int32_t vamrnb_js_encoder_set_mode(Encoder *e, int32_t mode) {
    return vamrnbe_set_mode(e->codec, mode);
}

namespace {

int32_t encode_frame(Encoder &e, const int16_t *samples) {
    int16_t frame[kFrameSamples];
    std::memcpy(frame, samples, sizeof frame);  // the encoder masks its input in place
    pcm_buffer in{};
    in.data[0] = frame;
    uint8_t bits[VAMRNB_STREAM_MAX_FRAME + 8];
    bitstream_buffer out{bits, 0, sizeof bits};
    const int32_t rc = vamrnbe_encode(e.codec, &in, &out, &e.info);
    if (rc != AMRNB_OK) return rc;
    uint8_t framed[VAMRNB_STREAM_MAX_FRAME];
    std::size_t written = 0;
    const int32_t wrc = vamrnb_stream_write_frame(bits, e.info.bytes, framed, sizeof framed, &written);
    if (wrc != AMRNB_OK) return wrc;
    ++e.frames_by_type[(framed[0] >> 3) & 15];
    e.out.insert(e.out.end(), framed, framed + written);
    return AMRNB_OK;
}

}  // namespace

// Encodes every whole frame of the samples seen so far; a remainder waits for
// the next call.
JS_EXPORT int32_t vamrnb_js_encoder_push(Encoder *e, const int16_t *samples, uint32_t count) {
    uint32_t i = 0;
    while (i < count) {
        const uint32_t take = std::min<uint32_t>(count - i, kFrameSamples - e->pending_count);
        std::memcpy(e->pending + e->pending_count, samples + i, take * sizeof(int16_t));
        e->pending_count += static_cast<int>(take);
        i += take;
        if (e->pending_count < kFrameSamples) break;
        e->pending_count = 0;
        const int32_t rc = encode_frame(*e, e->pending);
        if (rc != AMRNB_OK) return rc;
    }
    return AMRNB_OK;
}

// Ends the input: a last partial frame is completed with silence and coded.
JS_EXPORT int32_t vamrnb_js_encoder_finish(Encoder *e) {
    if (e->pending_count == 0) return AMRNB_OK;
    std::memset(e->pending + e->pending_count, 0,
                (kFrameSamples - e->pending_count) * sizeof(int16_t));
    e->pending_count = 0;
    return encode_frame(*e, e->pending);
}

JS_EXPORT const uint8_t *vamrnb_js_encoder_output(const Encoder *e) { return e->out.data(); }
JS_EXPORT uint32_t vamrnb_js_encoder_output_bytes(const Encoder *e) {
    return static_cast<uint32_t>(e->out.size());
}
JS_EXPORT void vamrnb_js_encoder_consume(Encoder *e) { e->out.clear(); }
JS_EXPORT uint32_t vamrnb_js_encoder_stat(const Encoder *e, int32_t index) {
    return index >= 0 && index < 16 ? e->frames_by_type[index] : 0;
}

// ---- shared -------------------------------------------------------------------

JS_EXPORT const char *vamrnb_js_strerror(int32_t status) {
    if (status == kErrNotAmr) return "not an AMR-NB file (no \"#!AMR\\n\" magic, and not a sequence of AMR-NB frames)";
    return vamrnb_strerror(status);
}

// Bytes of heap in use, for the leak checks of the tests.
JS_EXPORT uint32_t vamrnb_js_heap_in_use() { return static_cast<uint32_t>(mallinfo().uordblks); }

JS_EXPORT void *vamrnb_js_alloc(uint32_t size) { return std::malloc(size); }
JS_EXPORT void vamrnb_js_free(void *p) { std::free(p); }
