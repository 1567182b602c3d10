// Binary layout of the records exchanged with callers.  Callers address the
// fields by 32-bit word number (word n = byte 4n on a 32-bit target); on a
// 64-bit target the words up to the first pointer keep their places and the
// all-32-bit records keep theirs entirely.
#include <gtest/gtest.h>

#include <cstddef>

#include "vamrnb.h"

namespace {

constexpr bool k32 = sizeof(void *) == 4;

#define EXPECT_WORD(type, field, word) \
    EXPECT_EQ(offsetof(type, field), std::size_t{4} * (word)) << #type "." #field

TEST(AbiLayout, CodecConfigWords) {
    EXPECT_EQ(sizeof(codec_config), 16u);
    EXPECT_WORD(codec_config, word[0], 0);
    EXPECT_WORD(codec_config, word[3], 3);
    EXPECT_WORD(codec_config, dec.reserved, 0);
    EXPECT_WORD(codec_config, dec.layout, 1);
    EXPECT_WORD(codec_config, dec.channels, 2);
    EXPECT_WORD(codec_config, dec.sample_format, 3);
    EXPECT_WORD(codec_config, enc.dtx, 0);
    EXPECT_WORD(codec_config, enc.reserved, 1);
    EXPECT_WORD(codec_config, enc.vad_option, 2);
    EXPECT_WORD(codec_config, enc.mode, 3);
}

TEST(AbiLayout, FrameInfoWords) {
    EXPECT_EQ(sizeof(frame_info), 20u);
    EXPECT_WORD(frame_info, produced, 0);
    EXPECT_WORD(frame_info, bytes, 1);
    EXPECT_WORD(frame_info, frame_count, 2);
    EXPECT_WORD(frame_info, channels, 3);
    EXPECT_WORD(frame_info, frame_type, 3);
    EXPECT_WORD(frame_info, bits_per_sample, 4);
}

TEST(AbiLayout, BitstreamBufferWords) {
    EXPECT_WORD(bitstream_buffer, data, 0);
    if (!k32) GTEST_SKIP() << "words after the data pointer move on a 64-bit target";
    EXPECT_EQ(sizeof(bitstream_buffer), 12u);
    EXPECT_WORD(bitstream_buffer, reserved, 1);
    EXPECT_WORD(bitstream_buffer, size, 2);
}

TEST(AbiLayout, PcmBufferWords) {
    // Counts, byte sizes and the first buffer address precede any pointer, so
    // they hold on every target; the encoder reads its samples through word 16.
    EXPECT_WORD(pcm_buffer, samples[0], 0);
    EXPECT_WORD(pcm_buffer, samples[1], 1);
    EXPECT_WORD(pcm_buffer, samples[2], 2);
    EXPECT_WORD(pcm_buffer, bytes[0], 8);
    EXPECT_WORD(pcm_buffer, bytes[1], 9);
    EXPECT_WORD(pcm_buffer, bytes[2], 10);
    EXPECT_WORD(pcm_buffer, data[0], 16);
    if (!k32) GTEST_SKIP() << "words after the buffer addresses move on a 64-bit target";
    EXPECT_EQ(sizeof(pcm_buffer), 36u * 4);
    EXPECT_WORD(pcm_buffer, data[1], 17);
    EXPECT_WORD(pcm_buffer, data[2], 18);
    EXPECT_WORD(pcm_buffer, channels, 32);
    EXPECT_WORD(pcm_buffer, bits_per_sample, 33);
    EXPECT_WORD(pcm_buffer, reserved, 34);
    EXPECT_WORD(pcm_buffer, layout, 35);
}

// Status codes, modes and frame types are part of the binary interface too:
// callers compare against the numbers.
TEST(AbiLayout, NumericConstants) {
    EXPECT_EQ(AMRNB_OK, 0);
    EXPECT_EQ(AMRNB_ERR_NO_MEMORY, -2);
    EXPECT_EQ(AMRNB_ERR_UNSUPPORTED, -3);
    EXPECT_EQ(AMRNB_ERR_BAD_FRAME_TYPE, -5);
    EXPECT_EQ(AMRNB_ERR_BAD_LAYOUT, -8);
    EXPECT_EQ(MR475, 0);
    EXPECT_EQ(MR122, 7);
    EXPECT_EQ(MRDTX, 8);
    EXPECT_EQ(TX_NO_DATA, 3);
    EXPECT_EQ(RX_SID_BAD, 6);
    EXPECT_EQ(RX_NO_DATA, 7);
    EXPECT_EQ(sizeof(vamrnb_mode), 4u);
}

}  // namespace
