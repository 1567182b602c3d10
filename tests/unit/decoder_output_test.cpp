// Output stage: sample formats, channel settings and buffer layouts, the
// descriptor words it fills in, and the settings it refuses.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "dec/dec_state.h"
#include "dec_config.h"

namespace {

struct Out {
    pcm_buffer pcm{};
    std::vector<uint8_t> inter = std::vector<uint8_t>(2 * 160 * 3, 0xAA);
    std::vector<uint8_t> ch1 = std::vector<uint8_t>(160 * 3, 0xAA);
    std::vector<uint8_t> ch2 = std::vector<uint8_t>(160 * 3, 0xAA);
    Out() {
        pcm.data[0] = inter.data();
        pcm.data[1] = ch1.data();
        pcm.data[2] = ch2.data();
    }
};

std::vector<int16_t> ramp() {
    std::vector<int16_t> s(160);
    for (int i = 0; i < 160; ++i) s[i] = static_cast<int16_t>(i * 409 - 32768);
    return s;
}

TEST(DecoderOutput, SixteenBitOneChannelInterleaved) {
    Out o;
    auto s = ramp();
    const codec_config c = dec_config(1, 1, 0);
    ASSERT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), 0);
    EXPECT_EQ(o.pcm.samples[0], 160u);
    EXPECT_EQ(o.pcm.bytes[0], 320u);
    EXPECT_EQ(o.pcm.channels, 1u);
    EXPECT_EQ(o.pcm.bits_per_sample, 16u);
    EXPECT_EQ(o.pcm.layout, 1u);
    EXPECT_EQ(std::memcmp(o.inter.data(), s.data(), 320), 0);
    EXPECT_EQ(o.inter[320], 0xAA);  // nothing beyond the frame
    EXPECT_EQ(o.ch1[0], 0xAA);      // channel buffers untouched
}

TEST(DecoderOutput, TwoChannelsInterleavedRepeatEachSample) {
    Out o;
    auto s = ramp();
    for (int32_t format : {0, 2}) {
        const codec_config c = dec_config(1, 2, format);
        ASSERT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), 0);
        EXPECT_EQ(o.pcm.samples[0], 320u);
        EXPECT_EQ(o.pcm.bytes[0], 640u);
        EXPECT_EQ(o.pcm.channels, 2u);
        const auto *d = reinterpret_cast<const int16_t *>(o.inter.data());
        for (int i = 0; i < 160; ++i) {
            ASSERT_EQ(d[2 * i], s[i]);
            ASSERT_EQ(d[2 * i + 1], s[i]);
        }
    }
}

TEST(DecoderOutput, SeparateBuffers) {
    Out o;
    auto s = ramp();
    const codec_config one = dec_config(0, 1, 0);
    ASSERT_EQ(vamrnbd_recon(s.data(), &one, &o.pcm), 0);
    EXPECT_EQ(o.pcm.samples[1], 160u);
    EXPECT_EQ(o.pcm.samples[2], 160u);
    EXPECT_EQ(o.pcm.bytes[1], 320u);
    EXPECT_EQ(o.pcm.layout, 0u);
    EXPECT_EQ(std::memcmp(o.ch1.data(), s.data(), 320), 0);
    EXPECT_EQ(o.ch2[0], 0xAA);  // second buffer only with two channels
    EXPECT_EQ(o.inter[0], 0xAA);

    const codec_config two = dec_config(7, 2, 0);  // any layout but 1 is separate
    ASSERT_EQ(vamrnbd_recon(s.data(), &two, &o.pcm), 0);
    EXPECT_EQ(o.pcm.channels, 2u);
    EXPECT_EQ(o.pcm.layout, 7u);
    EXPECT_EQ(std::memcmp(o.ch2.data(), s.data(), 320), 0);
}

TEST(DecoderOutput, EightBitSamplesRoundDownAndSaturate) {
    Out o;
    std::vector<int16_t> s(160, 0);
    s[0] = 0x7FF8;
    s[1] = -32768;
    s[2] = 200;
    s[3] = -129;
    s[4] = 127;
    const codec_config c = dec_config(1, 1, 1);
    ASSERT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), 0);
    EXPECT_EQ(o.pcm.bits_per_sample, 8u);
    EXPECT_EQ(o.pcm.bytes[0], 160u);
    const auto *d = reinterpret_cast<const int8_t *>(o.inter.data());
    EXPECT_EQ(d[0], 127);
    EXPECT_EQ(d[1], -128);
    EXPECT_EQ(d[2], 1);
    EXPECT_EQ(d[3], -1);
    EXPECT_EQ(d[4], 0);
    EXPECT_EQ(o.inter[160], 0xAA);
}

TEST(DecoderOutput, TwentyFourBitSamples) {
    Out o;
    std::vector<int16_t> s(160, 0);
    s[0] = 0x1234;
    s[1] = -1;
    const codec_config c = dec_config(1, 2, 3);
    ASSERT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), 0);
    EXPECT_EQ(o.pcm.bits_per_sample, 24u);
    EXPECT_EQ(o.pcm.bytes[0], 960u);
    const std::vector<uint8_t> head(o.inter.begin(), o.inter.begin() + 12);
    EXPECT_EQ(head, (std::vector<uint8_t>{0, 0x34, 0x12, 0, 0x34, 0x12, 0, 0xFF, 0xFF, 0, 0xFF, 0xFF}));
}

TEST(DecoderOutput, RefusedSettings) {
    auto s = ramp();
    for (auto c : {dec_config(1, 1, 4), dec_config(1, 1, -1), dec_config(1, 3, 0), dec_config(1, -1, 0), dec_config(1, 0, 1),
                   dec_config(1, 0, 3)}) {
        Out o;
        EXPECT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), AMRNB_ERR_UNSUPPORTED)
            << c.dec.channels << " " << c.dec.sample_format;
        EXPECT_EQ(o.inter[0], 0xAA);
    }
    // channel setting 0 is one channel for 16-bit output
    Out o;
    const codec_config c = dec_config(1, 0, 0);
    EXPECT_EQ(vamrnbd_recon(s.data(), &c, &o.pcm), 0);
    EXPECT_EQ(o.pcm.channels, 1u);
}

}  // namespace
