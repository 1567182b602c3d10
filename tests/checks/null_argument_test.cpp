// Built with the debug checks on: every null pointer the public headers
// forbid stops with a message naming the function and the argument, and
// the pointers documented as optional still pass.
#include <gtest/gtest.h>

#include <cstring>

#include "vamrnb.h"
#include "vamrnb_dsp.h"

namespace {

std::string message(const char *function, const char *argument) {
    std::string arg = argument;
    std::string escaped;
    for (char c : arg) {
        if (c == '[' || c == ']') escaped += '\\';
        escaped += c;
    }
    return std::string("vamrnb: ") + function + ": argument '" + escaped + "' must not be null";
}

struct Decoding {
    codec_config config;
    vamrnb_decoder *dec = nullptr;
    uint8_t frame[1] = {0x7C};  // no data: decoded as a lost frame
    bitstream_buffer in{frame, 0, sizeof frame};
    int16_t left[160], right[160];
    pcm_buffer out{};
    frame_info info{};

    Decoding(int32_t layout, int32_t channels, int32_t format) : config{{0, layout, channels, format}} {
        dec = vamrnbd_create(&config, nullptr);
        out.data[0] = out.data[1] = left;
        out.data[2] = right;
    }
    ~Decoding() { vamrnbd_delete(dec); }
    int32_t decode() { return vamrnbd_decode(dec, &in, &out, &info); }
};

struct Encoding {
    codec_config config{{0, 0, 0, MR122}};
    vamrnb_encoder *enc = vamrnbe_create(&config, nullptr);
    int16_t samples[160] = {};
    uint8_t bytes[VAMRNB_MAX_FRAME_BYTES];
    pcm_buffer in{};
    bitstream_buffer out{bytes, 0, sizeof bytes};
    frame_info info{};

    Encoding() { in.data[0] = samples; }
    ~Encoding() { vamrnbe_delete(enc); }
    int32_t encode() { return vamrnbe_encode(enc, &in, &out, &info); }
};

}  // namespace

TEST(DebugChecksDeathTest, DecoderNamesTheNullArgument) {
    EXPECT_DEATH(vamrnbd_create(nullptr, nullptr), message("vamrnbd_create", "config"));
    EXPECT_DEATH(vamrnbd_reset(nullptr), message("vamrnbd_reset", "dec"));
    EXPECT_DEATH({ Decoding d(1, 1, 0); d.dec = nullptr; d.decode(); }, message("vamrnbd_decode", "dec"));
    EXPECT_DEATH({ Decoding d(1, 1, 0); vamrnbd_decode(d.dec, nullptr, &d.out, &d.info); },
                 message("vamrnbd_decode", "in"));
    EXPECT_DEATH({ Decoding d(1, 1, 0); d.in.data = nullptr; d.decode(); },
                 message("vamrnbd_decode", "in->data"));
    EXPECT_DEATH({ Decoding d(1, 1, 0); vamrnbd_decode(d.dec, &d.in, &d.out, nullptr); },
                 message("vamrnbd_decode", "info"));
    // The buffer addresses the configured layout writes to.
    EXPECT_DEATH({ Decoding d(1, 2, 0); d.out.data[0] = nullptr; d.decode(); },
                 message("vamrnbd_decode", "out->data[0]"));
    EXPECT_DEATH({ Decoding d(0, 2, 3); d.out.data[2] = nullptr; d.decode(); },
                 message("vamrnbd_decode", "out->data[2]"));
}

TEST(DebugChecksDeathTest, EncoderNamesTheNullArgument) {
    EXPECT_DEATH(vamrnbe_create(nullptr, nullptr), message("vamrnbe_create", "config"));
    EXPECT_DEATH(vamrnbe_set_mode(nullptr, MR59), message("vamrnbe_set_mode", "enc"));
    EXPECT_DEATH({ Encoding e; e.enc = nullptr; e.encode(); }, message("vamrnbe_encode", "enc"));
    EXPECT_DEATH({ Encoding e; e.in.data[0] = nullptr; e.encode(); },
                 message("vamrnbe_encode", "in->data[0]"));
    EXPECT_DEATH({ Encoding e; e.out.data = nullptr; e.encode(); },
                 message("vamrnbe_encode", "out->data"));
    EXPECT_DEATH({ Encoding e; vamrnbe_encode(e.enc, &e.in, nullptr, &e.info); },
                 message("vamrnbe_encode", "out"));
}

TEST(DebugChecksDeathTest, StreamServicesNameTheNullArgument) {
    uint8_t buf[4] = {};
    EXPECT_DEATH(vcmn_bsr_init(nullptr, buf, 4, nullptr), message("vcmn_bsr_init", "bs"));
    vcmn_bsw writer;
    EXPECT_DEATH(vcmn_bsw_init(&writer, nullptr, 4, nullptr), message("vcmn_bsw_init", "buf"));
    int16_t prm[57] = {};
    EXPECT_DEATH(vamrnbd_bits2prm(MR122, nullptr, prm), message("vamrnbd_bits2prm", "serial"));
    vcmn_bsw_init(&writer, buf, sizeof buf, nullptr);
    EXPECT_DEATH(vamrnbe_bs_pack(&writer, prm, MR122, nullptr, TX_SPEECH_GOOD, nullptr),
                 message("vamrnbe_bs_pack", "used_mode"));
}

// The optional pointers pass, and a decoder buffer is needed only where
// samples are written.
TEST(DebugChecks, OptionalPointersAndUnusedBuffersPass) {
    EXPECT_EQ(vamrnb_platform_init(nullptr), 0);
    vamrnbd_delete(nullptr);
    vamrnbe_delete(nullptr);

    vcmn_bsr reader;
    vcmn_bsr_init(&reader, nullptr, 0, nullptr);
    EXPECT_EQ(vcmn_bsr_read(&reader, 8), 0xFFFFFFFFu);

    Decoding mono(0, 1, 0);  // one buffer per channel: data[1] only
    mono.out.data[0] = mono.out.data[2] = nullptr;
    EXPECT_EQ(mono.decode(), AMRNB_OK);

    Decoding refused(1, 1, 4);  // format 4 is refused before anything is written
    refused.out.data[0] = nullptr;
    EXPECT_EQ(refused.decode(), AMRNB_ERR_UNSUPPORTED);

    Encoding e;
    e.out.size = 0;  // no room: nothing written, no stop
    EXPECT_EQ(e.encode(), AMRNB_OK);
    EXPECT_EQ(e.info.bytes, 0u);
}
