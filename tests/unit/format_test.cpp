// Frame formats: the packer's and the unpacker's special cases and the
// decoder homing tests (ordinary frames of every type are pinned by the
// encoder and decoder streams).
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <vector>

#include "common/bitstream.h"
#include "format/frame_format.h"

using namespace vamrnb;

namespace {

std::vector<int16_t> random_params(std::mt19937 &rng, int mode) {
    std::vector<int16_t> p(vamrnb_tbl_prmno[mode]);
    for (size_t i = 0; i < p.size(); ++i) p[i] = int16_t(rng() & ((1u << vamrnb_tbl_bitno[mode][i]) - 1u));
    return p;
}

// Packs the parameters (or, with as_bits, an already converted bit array)
// as frame type ft into `out`; returns the bytes written.
uint32_t pack(std::vector<int16_t> prm, int32_t ft, int32_t mode, int32_t tx_type,
              std::vector<uint8_t> &out, uint32_t room = 64, int32_t *used = nullptr, bool as_bits = false) {
    prm.resize(MAX_FRAME_BITS, 0);
    if (!as_bits) vamrnbe_prm2bits(ft, prm.data());
    out.assign(64, 0xEE);
    vcmn_bsw w;
    vcmn_bsw_init(&w, out.data(), room, nullptr);
    const sid_sync_state sid{8, 3, 0, tx_type};
    int32_t used_mode = ft;
    vamrnbe_bs_pack(&w, prm.data(), mode, &used_mode, tx_type, &sid);
    if (used) *used = used_mode;
    return bsw_bytes_written(&w);
}

struct Unpacked {
    rx_frame_class cls{-1, -1, -1};
    int32_t mode = -1;
    uint32_t consumed = 0;
    std::vector<int16_t> serial = std::vector<int16_t>(SERIAL_SIZE, 0);
};

Unpacked unpack(const std::vector<uint8_t> &data, uint32_t size) {
    Unpacked u;
    vcmn_bsr r;
    vcmn_bsr_init(&r, data.data(), size, nullptr);
    vamrnbd_unpack_bits(&r, &u.cls, &u.mode, u.serial.data());
    u.consumed = bsr_bytes_consumed(&r);
    return u;
}

}  // namespace

TEST(FrameFormat, PackerSpecialCases) {
    std::mt19937 rng(8);
    std::vector<uint8_t> out, upd;
    int32_t used = 0;
    // SID_FIRST in MR795: 35 bits, STI 0, mode 5 LSB first (1, 0, 1), one
    // zero; SID_UPDATE differs only in the STI bit.  MR515 sends 1, 0, 0.
    const auto sid = random_params(rng, 8);
    EXPECT_EQ(pack(sid, 8, 5, TX_SID_FIRST, out), 6u);
    EXPECT_EQ(out[0], 68);
    EXPECT_EQ(out[5] & 0x1F, 0x0A);
    pack(sid, 8, 5, TX_SID_UPDATE, upd);
    for (int i = 0; i < 6; ++i) EXPECT_EQ(upd[i] ^ out[i], i == 5 ? 0x10 : 0) << i;
    pack(sid, 8, 1, TX_SID_UPDATE, out);
    EXPECT_EQ(out[5] & 0x1F, 0x18);

    // SID with TX_NO_DATA, and frame types nobody writes, become no data.
    for (int32_t ft : {8, 9, 11, 14, 16, -1}) {
        EXPECT_EQ(pack(sid, ft, 5, ft == 8 ? TX_NO_DATA : TX_SPEECH_GOOD, out, 64, &used, true), 1u) << ft;
        EXPECT_EQ(out[0], 124);
        EXPECT_EQ(used, 15);
    }
    // Only an element equal to 1 is sent as a one.
    std::vector<int16_t> bits(MAX_FRAME_BITS, 0);
    for (int i = 0; i < 95; ++i) bits[i] = int16_t(i % 3 == 0 ? 1 : i % 3 == 1 ? 2 : -1);
    pack(bits, 0, 0, TX_SPEECH_GOOD, out, 64, nullptr, true);
    const Unpacked u = unpack(out, 13);
    for (int i = 0; i < 95; ++i) ASSERT_EQ(u.serial[i], i % 3 == 0) << i;
    // A buffer that is too small takes what fits and nothing beyond.
    EXPECT_EQ(pack(bits, 7, 7, TX_SPEECH_GOOD, out, 10, nullptr, true), 10u);
    for (int i = 10; i < 64; ++i) ASSERT_EQ(out[i], 0xEE) << i;

    // prm2bits keeps only the low bits of each parameter and clears the rest.
    std::vector<int16_t> a(MAX_FRAME_BITS, 7);
    a[0] = -1;
    a[1] = 0x180;
    vamrnbe_prm2bits(0, a.data());
    for (int i = 0; i < MAX_FRAME_BITS; ++i) ASSERT_EQ(a[i], i < 9 ? 1 : i < 16 ? 0 : a[i]) << i;
    for (int i = 95; i < MAX_FRAME_BITS; ++i) ASSERT_EQ(a[i], 0) << i;
}

TEST(FrameFormat, UnpackerClassification) {
    std::vector<uint8_t> f(32, 0);
    f[0] = 0x38;  // MR122, Q = 0
    Unpacked u = unpack(f, 32);
    EXPECT_TRUE(u.cls.quality == 0 && u.cls.rx_type == RX_SPEECH_BAD && u.mode == 7 && u.consumed == 32);

    // SID 0x44: STI is bit 35 after the TOC byte; mode bits read as 1, 0, 0
    // give MR515 while the caller's word keeps them as read.
    std::vector<uint8_t> sid = {0x44, 0, 0, 0, 0, 0x18};
    u = unpack(sid, 6);
    EXPECT_TRUE(u.cls.rx_type == RX_SID_UPDATE && u.cls.frame_mode == 1 && u.mode == 4 && u.consumed == 6);
    sid[5] = 0x08;
    EXPECT_EQ(unpack(sid, 6).cls.rx_type, RX_SID_FIRST);
    sid[0] = 0x40;
    EXPECT_EQ(unpack(sid, 6).cls.rx_type, RX_SID_BAD);

    // No data and unusable frame types: only the TOC byte is read.
    for (uint8_t toc : {0x7C, 0x4C, 0x54, 0x5C, 0x64, 0xCC}) {
        u = unpack({toc, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF}, 7);
        EXPECT_TRUE(u.cls.rx_type == RX_NO_DATA && u.cls.frame_mode == ((toc >> 3) & 15) && u.consumed == 1 &&
                    u.mode == -1 && std::count(u.serial.begin(), u.serial.end(), 0) == SERIAL_SIZE) << int(toc);
    }
    // Truncated: missing class bits read as 1, a missing mode indication as 7.
    u = unpack({0x04, 0, 0, 0, 0}, 5);
    for (int i = 0; i < 95; ++i) ASSERT_EQ(u.serial[vamrnb_tbl_sort_ptr[0][i]], i >= 32) << i;
    u = unpack({0x44, 0, 0, 0, 0}, 5);
    EXPECT_TRUE(u.cls.rx_type == RX_SID_UPDATE && u.cls.frame_mode == 7 && u.mode == 7);
    EXPECT_EQ(unpack({}, 0).cls.rx_type, RX_NO_DATA);
}

TEST(FrameFormat, DecoderHomingTests) {
    for (int m = 0; m < 8; ++m) {
        std::vector<int16_t> prm(tab::homing_frame_params[m], tab::homing_frame_params[m] + vamrnb_tbl_prmno[m]);
        std::vector<uint8_t> out;
        const Unpacked u = unpack(out, pack(prm, m, m, TX_SPEECH_GOOD, out));
        const auto &s = u.serial;
        EXPECT_EQ(vamrnbd_decoder_homing_frm_test(s.data(), m), 1) << m;
        EXPECT_EQ(vamrnbd_decoder_homing_frm_test_first(s.data(), m), 1) << m;
        EXPECT_EQ(vamrnbd_decoder_homing_frm_test(s.data(), (m + 1) % 8), 0) << m;

        // Changing any parameter fails the whole-frame test; only changes
        // after the first subframe leave the first-subframe test at 1.
        int bit = 0;
        for (int j = 0; j < vamrnb_tbl_prmno[m]; ++j) {
            bit += vamrnb_tbl_bitno[m][j];
            auto t = s;
            t[bit - 1] ^= 1;
            ASSERT_EQ(vamrnbd_decoder_homing_frm_test(t.data(), m), 0) << m << " " << j;
            ASSERT_EQ(vamrnbd_decoder_homing_frm_test_first(t.data(), m), j >= vamrnb_tbl_prmnofsf[m]) << m << " " << j;
        }
    }
    EXPECT_EQ(vamrnb_tbl_prmnofsf[7], 18);
}
