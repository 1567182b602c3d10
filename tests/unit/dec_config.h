// Decoder configuration words for the decoder tests: output layout (0:
// separate buffers, 1: interleaved), channel count and sample format.
#pragma once

#include "vamrnb.h"

inline codec_config dec_config(int32_t layout, int32_t channels, int32_t format) {
    codec_config c{};
    c.dec.layout = layout;
    c.dec.channels = channels;
    c.dec.sample_format = format;
    return c;
}
