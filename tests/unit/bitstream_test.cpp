// Bit-stream reader and writer: exhaustion and the partial cache, peeking and
// skipping, the little-endian reader (exported, though no codec stage uses
// them) and the writer's buffer-end rules.  Plain reads and writes run in
// every frame of the encoder and decoder streams.
#include <gtest/gtest.h>

#include <random>
#include <vector>

#include "common/bitstream.h"

using namespace vamrnb;

namespace {
// The n bits at bit position pos of a byte string, MSB-first or LSB-first.
uint32_t msb_bits(const std::vector<uint8_t> &b, int pos, int n) {
    uint32_t v = 0;
    for (int k = pos; k < pos + n; ++k) v = (v << 1) | ((b[k / 8] >> (7 - k % 8)) & 1u);
    return v;
}
uint32_t lsb_bits(const std::vector<uint8_t> &b, int pos, int n) {
    uint32_t v = 0;
    for (int k = pos + n - 1; k >= pos; --k) v = (v << 1) | ((b[k / 8] >> (k % 8)) & 1u);
    return v;
}
uint32_t consumed_bytes(int bit_pos) { return static_cast<uint32_t>((bit_pos + 7) / 8); }
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

TEST(Bitstream, PeekSkipAndAlign) {
    std::vector<uint8_t> data(12);
    for (int i = 0; i < 12; ++i) data[i] = uint8_t(0x5A ^ (i * 29));
    std::mt19937 rng(3);
    for (int trial = 0; trial < 200; ++trial) {
        vcmn_bsr r;
        vcmn_bsr_init(&r, data.data(), 12, nullptr);
        for (int pos = 0; pos < 60;) {
            const int n = 1 + int(rng() % 24), s = int(rng() % 9), op = int(rng() % 4);
            uint8_t bit = 7;
            if (op == 0) {  // peek, then read the same bits
                ASSERT_EQ(vcmn_bsr_peek(&r, n), msb_bits(data, pos, n)) << pos << " " << n;
                ASSERT_EQ(vcmn_bsr_read(&r, n), msb_bits(data, pos, n));
            } else if (op == 1) {
                ASSERT_EQ(vcmn_bsr_skip_peek(&r, s, n), msb_bits(data, pos + s, n)) << pos << " " << s;
            } else if (op == 2) {
                ASSERT_TRUE(vcmn_bsr_read1_value(&r, &bit) == 0 && bit == msb_bits(data, pos, 1));
            } else {
                vcmn_bsr_skip_to_align8(&r);
            }
            pos = op == 0 ? pos + n : op == 1 ? pos + s : op == 2 ? pos + 1 : (pos + 7) / 8 * 8;
            ASSERT_EQ(bsr_bytes_consumed(&r), consumed_bytes(pos)) << pos;
        }
    }
    // Peeking past the end fills with zeros; a failed read stores nothing.
    const std::vector<uint8_t> two = {0xAB, 0xCD};
    vcmn_bsr r;
    vcmn_bsr_init(&r, two.data(), 2, nullptr);
    EXPECT_EQ(vcmn_bsr_peek(&r, 20), 0xABCD0u);
    vcmn_bsr_init(&r, two.data(), 0, nullptr);
    uint8_t b = 9;
    EXPECT_TRUE(vcmn_bsr_read1_value(&r, &b) == -1 && b == 9);
    EXPECT_EQ(vcmn_bsr_skip_peek(&r, 3, 4), 0u);
    EXPECT_EQ(vcmn_bsr_clz_in_code(0), 32);
    EXPECT_EQ(vcmn_bsr_clz_in_code(0x00012345u), 15);
}

TEST(Bitstream, LittleEndianReader) {
    const std::vector<uint8_t> two = {0x34, 0x12};
    vcmn_bsr r;
    vcmn_bsr_init(&r, two.data(), 2, vcmn_bsr_le_flush);
    EXPECT_EQ(vcmn_bsr_le_read(&r, 12), 0x234u);
    EXPECT_EQ(vcmn_bsr_le_read(&r, 4), 0x1u);
    EXPECT_EQ(vcmn_bsr_le_read(&r, 1), 0xFFFFFFFFu);

    std::vector<uint8_t> data(40);
    std::mt19937 rng(5);
    for (auto &x : data) x = uint8_t(rng());
    vcmn_bsr_init(&r, data.data(), 40, vcmn_bsr_le_flush);
    for (int pos = 0; pos < 280;) {
        const int n = 1 + int(rng() % 32);
        ASSERT_EQ(vcmn_bsr_le_read(&r, n), lsb_bits(data, pos, n)) << pos << " " << n;
        pos += n;
        if (rng() % 4 == 0) {
            const int s = int(rng() % uint32_t(r.bits + 1));
            vcmn_bsr_le_skip(&r, s);
            pos += s;
        } else if (rng() % 5 == 0) {
            vcmn_bsr_le_skip_to_align8(&r);
            pos = (pos + 7) / 8 * 8;
        }
        ASSERT_EQ(bsr_bytes_consumed(&r), consumed_bytes(pos));
    }
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
