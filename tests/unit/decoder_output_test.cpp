// Output stage: the sample conversions at their edges (rounding and
// saturation to 8 bits, the 24-bit byte order), on values a decoded frame
// seldom reaches.  Every setting end to end is in decoder_api_test.
#include <gtest/gtest.h>

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

}  // namespace
