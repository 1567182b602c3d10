// Output stage of the decoder: converts the 160 decoded samples into the
// sample format (16-bit, 8-bit, 16-bit saturated, 24-bit) and channel layout
// (one or two channels, interleaved or one buffer per channel) that the
// caller configured, and fills in the output descriptor.
#include <cstring>

#include "common/checks.h"
#include "dec/dec_state.h"

using namespace vamrnb;

namespace {

// Writes the frame into one buffer in the given format, each sample repeated
// `reps` times in a row (two interleaved channels carry the same signal).
void write_samples(const Word16 *s, uint32_t format, int reps, void *dst) {
    switch (format) {
    case 0:
    case 2: {  // 16-bit; format 2 saturates to 16 bits, which changes nothing
        auto *d = static_cast<int16_t *>(dst);
        if (reps == 1) {
            std::memcpy(d, s, L_FRAME * sizeof(int16_t));
        } else {
            for (int i = 0; i < L_FRAME; ++i) d[2 * i] = d[2 * i + 1] = s[i];
        }
        break;
    }
    case 1: {  // signed 8-bit, rounded down from the upper byte
        auto *d = static_cast<int8_t *>(dst);
        for (int i = 0; i < L_FRAME; ++i) {
            int32_t v = (static_cast<int32_t>(s[i]) + 128) >> 8;
            if (v > 127) v = 127;
            if (v < -128) v = -128;
            for (int r = 0; r < reps; ++r) *d++ = static_cast<int8_t>(v);
        }
        break;
    }
    default: {  // 24-bit little endian, the sample in the upper two bytes
        auto *d = static_cast<uint8_t *>(dst);
        for (int i = 0; i < L_FRAME; ++i) {
            const auto u = static_cast<uint16_t>(s[i]);
            for (int r = 0; r < reps; ++r) {
                *d++ = 0;
                *d++ = static_cast<uint8_t>(u & 0xFF);
                *d++ = static_cast<uint8_t>(u >> 8);
            }
        }
        break;
    }
    }
}

}  // namespace

extern "C" int32_t vamrnbd_recon(int16_t samples[160], const codec_config *config, pcm_buffer *out) {
    out->channels = 1;
    const auto format = static_cast<uint32_t>(config->dec.sample_format);
    const int32_t ch_setting = config->dec.channels;
    static constexpr uint32_t bits_of[4] = {16, 8, 16, 24};
    if (format > 3) return AMRNB_ERR_UNSUPPORTED;
    const uint32_t bps = bits_of[format];
    out->bits_per_sample = bps;
    if (format != 0 && ch_setting != 1 && ch_setting != 2) return AMRNB_ERR_UNSUPPORTED;

    if (ch_setting == 2)
        out->channels = 2;
    else if (ch_setting != 0 && ch_setting != 1)
        return AMRNB_ERR_UNSUPPORTED;
    const uint32_t channels = out->channels;

    out->layout = static_cast<uint32_t>(config->dec.layout);
    if (config->dec.layout == 1) {
        out->samples[0] = channels * L_FRAME;
        out->bytes[0] = bps / 8 * channels * L_FRAME;
        VAMRNB_REQUIRE_WHEN(true, out->data[0], "vamrnbd_decode");
        write_samples(samples, format, static_cast<int>(channels), out->data[0]);
    } else {
        out->samples[1] = out->samples[2] = L_FRAME;
        out->bytes[1] = out->bytes[2] = bps / 8 * L_FRAME;
        VAMRNB_REQUIRE_WHEN(true, out->data[1], "vamrnbd_decode");
        VAMRNB_REQUIRE_WHEN(channels == 2, out->data[2], "vamrnbd_decode");
        write_samples(samples, format, 1, out->data[1]);
        if (channels == 2) write_samples(samples, format, 1, out->data[2]);
    }
    return AMRNB_OK;
}
