// Encoder instance and frame driver through the public interface.
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <vector>

#include "vamrnb.h"

namespace {

constexpr int kFrameBytes[8] = {13, 14, 16, 18, 20, 21, 27, 32};

codec_config config(int32_t dtx, int32_t mode, int32_t vad_option = 0) {
    codec_config c{};
    c.enc.dtx = dtx;
    c.enc.vad_option = vad_option;
    c.enc.mode = mode;
    return c;
}

// A voiced-like test signal: a 150 Hz pulse train through a decaying tone.
void speech_like(std::vector<int16_t> &pcm, int frame) {
    for (int i = 0; i < 160; ++i) {
        const double t = (frame * 160 + i) / 8000.0;
        pcm[i] = static_cast<int16_t>(6000 * std::sin(2 * M_PI * 150 * t) +
                                      2500 * std::sin(2 * M_PI * 1130 * t));
    }
}

struct Encoder {
    vamrnb_encoder *enc = nullptr;
    std::vector<int16_t> pcm = std::vector<int16_t>(160);
    std::vector<uint8_t> out = std::vector<uint8_t>(64, 0xAA);
    pcm_buffer in{};
    bitstream_buffer bs{};
    frame_info info{};

    explicit Encoder(codec_config c) {
        int32_t err = 1;
        enc = vamrnbe_create(&c, &err);
        EXPECT_EQ(err, AMRNB_OK);
        in.data[0] = pcm.data();
        bs.data = out.data();
        bs.size = 32;
    }
    ~Encoder() {
        if (enc) vamrnbe_delete(enc);
    }
    frame_info encode() {
        EXPECT_EQ(vamrnbe_encode(enc, &in, &bs, &info), AMRNB_OK);
        return info;
    }
};

}  // namespace

TEST(EncApi, CreateRefusesReservedWordAndModesOutsideRange) {
    codec_config c = config(0, MR122);
    c.enc.reserved = 5;
    int32_t err = 0;
    EXPECT_EQ(vamrnbe_create(&c, &err), nullptr);
    EXPECT_EQ(err, AMRNB_ERR_UNSUPPORTED);
    // The error pointer is optional.
    EXPECT_EQ(vamrnbe_create(&c, nullptr), nullptr);

    // A mode with no frame layout is refused at creation, as by
    // vamrnbe_set_mode, with DTX on or off.
    for (int32_t mode : {-1, 8, 9, 15, 16, INT32_MIN, INT32_MAX}) {
        for (int32_t dtx : {0, 1}) {
            err = 0;
            c = config(dtx, mode);
            EXPECT_EQ(vamrnbe_create(&c, &err), nullptr) << mode;
            EXPECT_EQ(err, AMRNB_ERR_UNSUPPORTED) << mode;
        }
    }

    codec_config ok = config(0, MR122);
    vamrnb_encoder *enc = vamrnbe_create(&ok, nullptr);
    ASSERT_NE(enc, nullptr);
    EXPECT_EQ(reinterpret_cast<uintptr_t>(enc) % 32, 0u);
    vamrnbe_delete(enc);
}

TEST(EncApi, EveryModeGivesItsFrameSizeAndInfo) {
    for (int mode = MR475; mode <= MR122; ++mode) {
        Encoder e(config(0, mode));
        e.info.frame_count = 100;
        for (int f = 0; f < 5; ++f) {
            speech_like(e.pcm, f);
            const frame_info info = e.encode();
            EXPECT_EQ(info.produced, 1u);
            EXPECT_EQ(info.bytes, static_cast<uint32_t>(kFrameBytes[mode])) << mode;
            EXPECT_EQ(info.frame_count, 101u + f) << "the caller's counter goes up by one";
            EXPECT_EQ(info.frame_type, static_cast<uint32_t>(mode));
            EXPECT_EQ(e.out[0], (mode << 3) | 4) << "table-of-contents byte";
        }
        EXPECT_EQ(e.out[32], 0xAA) << "nothing written past the frame";
    }
}

TEST(EncApi, InputIsMaskedInPlace) {
    Encoder e(config(0, MR795));
    for (int i = 0; i < 160; ++i) e.pcm[i] = static_cast<int16_t>(i * 397 - 30000);
    std::vector<int16_t> before = e.pcm;
    e.encode();
    for (int i = 0; i < 160; ++i) EXPECT_EQ(e.pcm[i], static_cast<int16_t>(before[i] & ~7)) << i;
}

TEST(EncApi, SmallOutputBufferGivesShortFrameWithoutOverrun) {
    Encoder e(config(0, MR122));
    speech_like(e.pcm, 0);
    e.bs.size = 5;
    const frame_info info = e.encode();
    EXPECT_LE(info.bytes, 5u);
    EXPECT_EQ(e.out[0], 0x3C);
    for (size_t i = 5; i < e.out.size(); ++i) EXPECT_EQ(e.out[i], 0xAA) << i;

    // The instance keeps working with a proper buffer afterwards.
    e.bs.size = 32;
    speech_like(e.pcm, 1);
    EXPECT_EQ(e.encode().bytes, 32u);
}

TEST(EncApi, SetModeValidatesAndAppliesFromNextFrame) {
    Encoder e(config(0, MR475));
    EXPECT_EQ(vamrnbe_set_mode(e.enc, -1), AMRNB_ERR_UNSUPPORTED);
    EXPECT_EQ(vamrnbe_set_mode(e.enc, 8), AMRNB_ERR_UNSUPPORTED);
    speech_like(e.pcm, 0);
    EXPECT_EQ(e.encode().bytes, 13u) << "a refused mode changes nothing";

    // Switching every frame through all modes, twice.
    for (int f = 0; f < 16; ++f) {
        const int mode = (f * 5) % 8;
        ASSERT_EQ(vamrnbe_set_mode(e.enc, mode), AMRNB_OK);
        speech_like(e.pcm, f + 1);
        const frame_info info = e.encode();
        EXPECT_EQ(info.bytes, static_cast<uint32_t>(kFrameBytes[mode])) << f;
        EXPECT_EQ(info.frame_type, static_cast<uint32_t>(mode));
    }
}
