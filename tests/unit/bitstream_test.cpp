// Bit-stream reader and writer at their ends: exhaustion, the partial cache
// and the byte accounting of a full frame, and the writer's buffer-end rules.
#include <gtest/gtest.h>

#include <vector>

#include "common/bitstream.h"

using namespace vamrnb;

namespace {
// The n bits at bit position pos of a byte string, most significant first.
uint32_t msb_bits(const std::vector<uint8_t> &b, int pos, int n) {
    uint32_t v = 0;
    for (int k = pos; k < pos + n; ++k) v = (v << 1) | ((b[k / 8] >> (7 - k % 8)) & 1u);
    return v;
}
}  // namespace

TEST(Bitstream, ReaderEndsAndPartialCache) {
    const std::vector<uint8_t> one = {0xC3};
    vcmn_bsr r;
    vcmn_bsr_init(&r, one.data(), 1, nullptr);
    EXPECT_EQ(vcmn_bsr_read(&r, 8), 0xC3u);
    EXPECT_EQ(vcmn_bsr_read1(&r), 0xFFFFFFFFu);
    EXPECT_EQ(bsr_bytes_consumed(&r), 1u);
    EXPECT_EQ(vcmn_bsr_read(&r, 3), 0xFFFFFFFFu);  // exhaustion sticks
    EXPECT_TRUE(r.bits == 0 && r.cache == 0);

    // 8 + 244 + 1 bits of a 32-byte frame consume exactly 32 bytes.
    std::vector<uint8_t> frame(32);
    for (int i = 0; i < 32; ++i) frame[i] = uint8_t(i * 37 + 1);
    vcmn_bsr_init(&r, frame.data(), 32, nullptr);
    EXPECT_EQ(vcmn_bsr_read(&r, 8), frame[0]);
    for (int k = 8; k < 253; ++k) ASSERT_EQ(vcmn_bsr_read1(&r), msb_bits(frame, k, 1)) << k;
    EXPECT_EQ(bsr_bytes_consumed(&r), 32u);

    // Three bits with two cached: the two old bits, then the next byte's first.
    const std::vector<uint8_t> five = {0, 0, 0, 0x02, 0x80};
    vcmn_bsr_init(&r, five.data(), 5, nullptr);
    EXPECT_EQ(vcmn_bsr_read(&r, 30), 0u);
    EXPECT_EQ(vcmn_bsr_read(&r, 3), 0x5u);
    // More than the buffer still holds fails, cached bits or not.
    EXPECT_EQ(vcmn_bsr_read(&r, 8), 0xFFFFFFFFu);
}

TEST(Bitstream, WriterBufferEnd) {
    uint8_t buf[4] = {0xFF, 0xFF, 0xFF, 0xFF};
    vcmn_bsw w;
    vcmn_bsw_init(&w, buf, 2, nullptr);
    EXPECT_EQ(vcmn_bsw_write(&w, 0x5, 3), 0u);
    EXPECT_EQ(vcmn_bsw_write(&w, 0, 0), 0u);
    EXPECT_EQ(vcmn_bsw_write(&w, 0, 5), 0u);
    EXPECT_EQ(buf[0], 0xA0);
    vcmn_bsw_write(&w, 2, 2);
    EXPECT_EQ(buf[1], 0xFE);  // partly filled: stale bits above the new ones
    EXPECT_EQ(vcmn_bsw_write(&w, 0x3F, 6), 0u);
    EXPECT_EQ(buf[1], 0xBF);
    // Past the end everything is refused and nothing changes.
    EXPECT_EQ(vcmn_bsw_write1(&w, 1), 0xFFFFFFFFu);
    EXPECT_EQ(vcmn_bsw_write(&w, 1, 0), 0xFFFFFFFFu);
    EXPECT_EQ(bsw_bytes_written(&w), 2u);
    EXPECT_EQ(buf[2], 0xFF);

    // The end is checked on entry only: a write that starts in the last byte
    // completes into the next one.  The byte callback sees each byte.
    static std::vector<uint8_t> seen;
    seen.clear();
    uint8_t big[4] = {};
    vcmn_bsw_init(&w, big, 1, [](vcmn_bsw *bs) { seen.push_back(*bs->ptr); });
    EXPECT_EQ(vcmn_bsw_write(&w, 0xBEEF, 16), 0u);
    EXPECT_EQ(seen, (std::vector<uint8_t>{0xBE, 0xEF}));
    EXPECT_EQ(bsw_bytes_written(&w), 2u);

    vcmn_bsw_init(&w, nullptr, 0, nullptr);
    EXPECT_EQ(vcmn_bsw_write(&w, 1, 8), 0xFFFFFFFFu);
}
