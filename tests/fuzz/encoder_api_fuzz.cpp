// libFuzzer target: the encoder and the rest of the public API driven by
// arbitrary bytes, every promise of the interface checked on the way.
//
// Layout of an input (missing bytes read as 0):
//   4 bytes   encoder configuration: dtx, reserved, vad_option, mode, each
//             picked from one byte (see config_word)
//   4 bytes   decoder configuration, the same way (reserved, layout,
//             channels, sample format)
//   then per frame one command byte c and its operands:
//     c & 3     PCM source: 0 = the next 320 input bytes as samples,
//               1 = a rail pattern chosen by the next byte, 2 = silence,
//               3 = the previous frame again
//     c & 4     call vamrnbe_set_mode first with a value from the next byte
//               (valid and invalid values alike)
//     c & 8     reset the decoder before it sees this frame
//     c >> 4    output room in bytes for the encoder: 0..15 from this field,
//               or, for 15, 16..40 from the next byte
// Each frame is encoded into a buffer of exactly the room given, so any
// write past it is caught by ASan, and whatever was written is decoded into
// output buffers of exactly the configured size, the unused buffer pointers
// left null.  Suggested options: -max_len=4096.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "vamrnb.h"

namespace {

// Whole storage-format frame sizes by frame type, table-of-contents byte
// included, for the types an encoder writes.
constexpr uint32_t kFrameBytes[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 0, 0, 0, 0, 0, 0, 1};

void check(bool ok) {
    if (!ok) std::abort();
}

class Input {
public:
    Input(const uint8_t *data, size_t size) : p_(data), end_(data + size) {}
    bool empty() const { return p_ == end_; }
    uint8_t byte() { return p_ < end_ ? *p_++ : 0; }
    int32_t word() {
        uint32_t v = 0;
        for (int i = 0; i < 4; ++i) v = v << 8 | byte();
        return static_cast<int32_t>(v);
    }

private:
    const uint8_t *p_;
    const uint8_t *end_;
};

// Small values -1..10 most of the time, so that valid configurations are
// common; 0xF0 and above draw an arbitrary 32-bit word from the following
// four bytes.
int32_t config_word(Input &in) {
    const uint8_t b = in.byte();
    if (b >= 0xF0) return in.word();
    return static_cast<int32_t>(b % 12) - 1;
}

void rail(int16_t *pcm, uint8_t kind) {
    for (int i = 0; i < 160; ++i) {
        switch (kind % 5) {
        case 0: pcm[i] = 32767; break;
        case 1: pcm[i] = -32768; break;
        case 2: pcm[i] = i & 1 ? -32768 : 32767; break;
        case 3: pcm[i] = (i / (1 + kind / 5 % 40)) & 1 ? -32768 : 32767; break;
        default: pcm[i] = static_cast<int16_t>(i & 1 ? 7 : -8); break;
        }
    }
}

struct DecOutput {
    std::vector<void *> blocks;
    pcm_buffer pcm{};
    ~DecOutput() {
        for (void *b : blocks) std::free(b);
    }
};

// Output buffers of exactly the size the configuration asks for; the
// pointers the configuration does not use stay null.  Returns false when the
// configuration is one the output stage refuses.
bool output_for(const codec_config &c, DecOutput &out) {
    const int32_t format = c.dec.sample_format, channels = c.dec.channels;
    if (format < 0 || format > 3 || channels < 0 || channels > 2) return false;
    if (channels == 0 && format != 0) return false;
    const uint32_t bytes = 160 * (format == 1 ? 1 : format == 3 ? 3 : 2);
    const int nch = channels == 2 ? 2 : 1;
    if (c.dec.layout == 1) {
        out.blocks.push_back(std::malloc(bytes * nch));
        out.pcm.data[0] = out.blocks.back();
    } else {
        for (int ch = 0; ch < nch; ++ch) {
            out.blocks.push_back(std::malloc(bytes));
            out.pcm.data[1 + ch] = out.blocks.back();
        }
    }
    return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    Input in(data, size);
    codec_config ecfg{}, dcfg{};
    for (int32_t &w : ecfg.word) w = config_word(in);
    for (int32_t &w : dcfg.word) w = config_word(in);

    // Creation refuses exactly the reserved word and the modes outside
    // MR475..MR122, and reports through the error word.
    int32_t err = 1;
    vamrnb_encoder *enc = vamrnbe_create(&ecfg, &err);
    const bool enc_ok = ecfg.enc.reserved == 0 && ecfg.enc.mode >= MR475 && ecfg.enc.mode <= MR122;
    check(enc_ok ? enc != nullptr && err == AMRNB_OK : enc == nullptr && err == AMRNB_ERR_UNSUPPORTED);
    err = 1;
    vamrnb_decoder *dec = vamrnbd_create(&dcfg, &err);
    check(dcfg.dec.reserved == 0 ? dec != nullptr && err == AMRNB_OK
                                 : dec == nullptr && err == AMRNB_ERR_UNSUPPORTED);
    if (enc == nullptr) {
        vamrnbd_delete(dec);
        return 0;
    }

    DecOutput out;
    const bool dec_accepts = output_for(dcfg, out);
    int32_t mode = ecfg.enc.mode;
    const bool dtx = ecfg.enc.dtx == 1;

    int16_t pcm[160] = {};
    frame_info einfo{}, dinfo{};
    uint32_t decoded = 0;
    for (int frame = 0; !in.empty() && frame < 64; ++frame) {
        const uint8_t c = in.byte();
        if (c & 4) {
            const int32_t m = static_cast<int8_t>(in.byte());
            const int32_t st = vamrnbe_set_mode(enc, m);
            check(st == (m >= MR475 && m <= MR122 ? AMRNB_OK : AMRNB_ERR_UNSUPPORTED));
            if (st == AMRNB_OK) mode = m;
        }
        switch (c & 3) {
        case 0:
            for (int16_t &s : pcm) s = static_cast<int16_t>(in.byte() | in.byte() << 8);
            break;
        case 1: rail(pcm, in.byte()); break;
        case 2: std::memset(pcm, 0, sizeof pcm); break;
        default: break;  // the previous (masked) frame again
        }
        uint32_t room = c >> 4;
        if (room == 15) room = 16 + in.byte() % 25;

        // The encoder reads its samples through the descriptor's first
        // buffer pointer; the sample buffer is a block of its own size.
        auto *samples = static_cast<int16_t *>(std::malloc(sizeof pcm));
        std::memcpy(samples, pcm, sizeof pcm);
        pcm_buffer ein{};
        ein.data[0] = samples;
        auto *bytes = static_cast<uint8_t *>(std::malloc(room));
        bitstream_buffer bs{bytes, 0, room};
        const uint32_t count = einfo.frame_count;
        check(vamrnbe_encode(enc, &ein, &bs, &einfo) == AMRNB_OK);
        for (int i = 0; i < 160; ++i) check(samples[i] == (pcm[i] & ~7));
        std::memcpy(pcm, samples, sizeof pcm);
        std::free(samples);

        const uint32_t ft = einfo.frame_type;
        check(einfo.produced == 1 && einfo.frame_count == count + 1);
        check(ft == 8 || ft == 15 || static_cast<int32_t>(ft) == mode);
        check(dtx || static_cast<int32_t>(ft) == mode);
        check(einfo.bytes == std::min(room, kFrameBytes[ft]));

        if (dec != nullptr) {
            if (c & 8) vamrnbd_reset(dec);
            bitstream_buffer din{bytes, 0, einfo.bytes};
            const int32_t st = vamrnbd_decode(dec, &din, &out.pcm, &dinfo);
            // An encoder never writes frame types 10 and 11; an empty input
            // reads as all ones, a no-data frame.
            check(st == (dec_accepts ? AMRNB_OK : AMRNB_ERR_UNSUPPORTED));
            if (st == AMRNB_OK) {
                check(dinfo.produced == 1 && dinfo.frame_count == ++decoded);
                check(dinfo.bytes <= einfo.bytes);
                if (einfo.bytes == kFrameBytes[ft]) check(dinfo.bytes == einfo.bytes);
            }
        }
        std::free(bytes);
    }
    vamrnbe_delete(enc);
    vamrnbd_delete(dec);
    return 0;
}
