// Checks of the conformance harness itself, run with the unit tests: a wrong
// checksum or a wrong frame walker would make every conformance figure
// meaningless.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "crc32.h"
#include "harness.h"

namespace conformance {
namespace {

TEST(HarnessSelfTest, Crc32KnownValues) {
    const uint8_t digits[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
    EXPECT_EQ(crc32(digits, sizeof digits), 0xCBF43926u);
    int16_t frame[160] = {};
    EXPECT_EQ(frame_crc32(frame), 0xADC7574Du);
    for (auto &s : frame) s = 0x0008;
    EXPECT_EQ(frame_crc32(frame), 0x8D7150CCu);
}

TEST(HarnessSelfTest, WalksEveryFrameTypeBySize) {
    std::vector<uint8_t> file = {'#', '!', 'A', 'M', 'R', '\n'};
    const int types[] = {7, 0, 8, 9, 10, 11, 12, 15, 5};
    for (int t : types) {
        file.push_back(static_cast<uint8_t>(t << 3 | 4));
        file.resize(file.size() + vamrnb_stream_frame_size(t) - 1, 0);
    }
    std::string error;
    const auto frames = split_frames(file, error);
    EXPECT_TRUE(error.empty()) << error;
    ASSERT_EQ(frames.size(), std::size(types));
    for (std::size_t i = 0; i < frames.size(); ++i) EXPECT_EQ(frames[i].type, types[i]);
    EXPECT_EQ(frames[3].size, 7u);  // FT 9 occupies 7 bytes in a file
    EXPECT_EQ(stream_mode_label(frames), "mixed");

    file.pop_back();  // the last MR795 frame is now one byte short
    EXPECT_EQ(split_frames(file, error).size(), frames.size() - 1);
    EXPECT_FALSE(error.empty());
}

TEST(HarnessSelfTest, SidParametersAndModeIndication) {
    // SID_UPDATE of MR59: 35 comfort-noise bits, STI 1, mode 2 written least
    // significant bit first (0, 1, 0), one padding bit.
    uint8_t sid[6] = {0x44, 0, 0, 0, 0, 0};
    sid[1] = 0xA0;                      // first parameter (3 bits) = 5
    sid[5] = 0b0001'0100;  // bit 35 = STI, bits 36..38 = 0, 1, 0
    const auto p = frame_parameters(sid, sizeof sid);
    ASSERT_EQ(p.size(), 7u);
    EXPECT_EQ(p[0], 5);
    EXPECT_EQ(p[5], 1);
    EXPECT_EQ(p[6], 2);

    uint8_t other[6];
    std::memcpy(other, sid, sizeof sid);
    other[5] ^= 0b0000'1000;  // mode indication becomes 3
    EXPECT_NE(describe_frame_difference(other, 6, sid, 6).find("mode indication"), std::string::npos);
    other[0] = 0x7C;
    EXPECT_NE(describe_frame_difference(other, 1, sid, 6).find("frame type NO_DATA"),
              std::string::npos);
}

TEST(HarnessSelfTest, NamesFirstDifferingSpeechParameter) {
    // MR475: the first travelling bits are parameter 0 most significant first.
    uint8_t a[13] = {0x04};
    uint8_t b[13] = {0x04};
    b[1] = 0x01;  // bit 7 of the payload: least significant bit of parameter 0
    EXPECT_EQ(frame_parameters(b, sizeof b)[0], 1);
    const std::string d = describe_frame_difference(a, sizeof a, b, sizeof b);
    EXPECT_NE(d.find("parameter 0 (8 bits): ours 0, expected 1"), std::string::npos) << d;
    b[1] = 0;
    b[12] = 0x01;  // padding bit only
    EXPECT_NE(describe_frame_difference(a, sizeof a, b, sizeof b).find("padding"), std::string::npos);
}

}  // namespace
}  // namespace conformance
