// The unpacker's whole-byte path and the packed parameter reader against a
// plain one-bit-at-a-time model: every frame type, every truncated length,
// readers that start mid-stream or use their own refill, and serial entries
// other than 0 and 1.
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "common/bitstream.h"
#include "format/frame_format.h"

using namespace vamrnb;

namespace {

struct Result {
    rx_frame_class cls{-1, -1, -1};
    int32_t mode = -1;
    int16_t serial[SERIAL_SIZE];
    uint32_t bytes = 0;
    uint32_t after = 0;  // the reader's next 13 bits
};

// The unpacker as a model: one bit per read, a missing bit read as 1.
void model_unpack(vcmn_bsr *r, Result *out) {
    const uint32_t toc = vcmn_bsr_read(r, 8);
    const int ft = static_cast<int>((toc >> 3) & 15);
    out->cls.quality = static_cast<int32_t>((toc >> 2) & 1);
    out->cls.frame_mode = ft;
    if (ft > FT_SID) {
        out->cls.rx_type = RX_NO_DATA;
        return;
    }
    uint32_t x = vcmn_bsr_read1(r);
    for (int i = 0; i < vamrnb_tbl_unpacked_size[ft]; ++i) {
        out->serial[vamrnb_tbl_sort_ptr[ft][i]] = static_cast<int16_t>(x & 1);
        x = vcmn_bsr_read1(r);
    }
    if (ft < FT_SID) {
        out->cls.rx_type = out->cls.quality ? RX_SPEECH_GOOD : RX_SPEECH_BAD;
        out->mode = ft;
        return;
    }
    out->cls.rx_type = out->cls.quality ? static_cast<int32_t>(RX_SID_FIRST + (x & 1)) : RX_SID_BAD;
    const uint32_t m = vcmn_bsr_read(r, 3) & 7;
    out->mode = static_cast<int32_t>(m);
    out->cls.frame_mode = static_cast<int32_t>(((m & 1) << 2) | (m & 2) | (m >> 2));
}

int32_t own_refill(vcmn_bsr *bs, int32_t max_bytes) { return vcmn_bsr_flush(bs, max_bytes < 2 ? max_bytes : 2); }

// Unpacks `buf` after skipping `lead` bits, with the library or the model.
Result run(const std::vector<uint8_t> &buf, int lead, bool model, vcmn_bsr_refill_fn refill = nullptr) {
    Result res;
    std::memset(res.serial, 0x55, sizeof res.serial);
    vcmn_bsr r;
    vcmn_bsr_init(&r, buf.data(), static_cast<uint32_t>(buf.size()), refill);
    if (lead > 0) vcmn_bsr_read(&r, lead);
    if (model)
        model_unpack(&r, &res);
    else
        vamrnbd_unpack_bits(&r, &res.cls, &res.mode, res.serial);
    res.bytes = bsr_bytes_consumed(&r);
    res.after = vcmn_bsr_read(&r, 13);
    return res;
}

void expect_same(const Result &a, const Result &b, const char *what) {
    EXPECT_EQ(a.cls.quality, b.cls.quality) << what;
    EXPECT_EQ(a.cls.frame_mode, b.cls.frame_mode) << what;
    EXPECT_EQ(a.cls.rx_type, b.cls.rx_type) << what;
    EXPECT_EQ(a.mode, b.mode) << what;
    EXPECT_EQ(0, std::memcmp(a.serial, b.serial, sizeof a.serial)) << what;
    EXPECT_EQ(a.bytes, b.bytes) << what;
    EXPECT_EQ(a.after, b.after) << what;
}

}  // namespace

TEST(UnpackFast, MatchesBitwiseModelOnWholeTruncatedAndOffsetFrames) {
    std::mt19937 rng(10);
    for (int ft = 0; ft < 16; ++ft) {
        for (int q = 0; q < 2; ++q) {
            for (int lead : {0, 3, 8, 29}) {
                // random payload, followed by spare bytes so that whole frames
                // and frames with trailing data are both covered
                std::vector<uint8_t> full(40 + 5);
                for (auto &b : full) b = static_cast<uint8_t>(rng());
                const int toc = (ft << 3) | (q << 2);
                // place the table-of-contents byte right after the lead bits
                const int byte = lead / 8, sh = lead % 8;
                full[byte] = static_cast<uint8_t>((full[byte] & ~(0xFF >> sh)) | (toc >> sh));
                if (sh) full[byte + 1] = static_cast<uint8_t>((full[byte + 1] & (0xFF >> sh)) | (toc << (8 - sh)));
                for (size_t len = 0; len <= full.size(); ++len) {
                    const std::vector<uint8_t> buf(full.begin(), full.begin() + static_cast<long>(len));
                    const std::string what = "ft " + std::to_string(ft) + " lead " + std::to_string(lead) +
                                             " len " + std::to_string(len);
                    expect_same(run(buf, lead, true), run(buf, lead, false), what.c_str());
                    expect_same(run(buf, lead, true, own_refill), run(buf, lead, false, own_refill), what.c_str());
                }
            }
        }
    }
}

TEST(UnpackFast, ParametersMatchBitwiseReadingForEveryModeAndAnySerialValue) {
    std::mt19937 rng(11);
    for (int mode = 0; mode <= 9; ++mode) {
        for (int trial = 0; trial < 50; ++trial) {
            int16_t serial[SERIAL_SIZE];
            // mostly 0/1; some entries neither, which count as 0
            for (auto &s : serial) {
                const uint32_t r = rng() % 8;
                s = static_cast<int16_t>(r < 3 ? 0 : r < 6 ? 1 : r == 6 ? -1 : 2);
            }
            int16_t got[MAX_PRM], want[MAX_PRM];
            std::memset(got, 0x55, sizeof got);
            std::memset(want, 0x55, sizeof want);
            vamrnbd_bits2prm(mode, serial, got);
            const int16_t *s = serial;
            for (int j = 0; j < vamrnb_tbl_prmno[mode]; ++j) {
                int v = 0;
                for (int b = 0; b < vamrnb_tbl_bitno[mode][j]; ++b) v = (v << 1) | (*s++ == 1);
                want[j] = static_cast<int16_t>(v);
            }
            ASSERT_EQ(0, std::memcmp(got, want, sizeof got)) << "mode " << mode;
        }
    }
}
