// Decoder homing through the frame driver, in the cases whole streams do not
// show: only the first subframe's parameters count while homed, and a lost
// frame while homed.  Every output sample is 13-bit.
#include <gtest/gtest.h>

#include <array>
#include <cstring>
#include <random>
#include <vector>

#include "format/frame_tables.h"
#include "vamrnb.h"

namespace {

using Frame = std::vector<uint8_t>;
using Pcm = std::array<int16_t, 160>;

// Storage-format frame of speech mode `mode` carrying the parameters prm.
Frame pack(int mode, const int16_t *prm) {
    int16_t serial[250] = {};
    int n = 0;
    for (int j = 0; j < vamrnb_tbl_prmno[mode]; ++j)
        for (int b = vamrnb_tbl_bitno[mode][j] - 1; b >= 0; --b) serial[n++] = (prm[j] >> b) & 1;
    Frame f(vamrnb_tbl_packed_size[mode], 0);
    f[0] = static_cast<uint8_t>(mode << 3 | 4);
    for (int i = 0; i < vamrnb_tbl_unpacked_size[mode]; ++i)
        if (serial[vamrnb_tbl_sort_ptr[mode][i]]) f[1 + i / 8] |= static_cast<uint8_t>(0x80 >> (i % 8));
    return f;
}

Frame homing(int mode) { return pack(mode, vamrnb::tab::homing_frame_params[mode]); }

Frame random_speech(int mode, std::mt19937 &rng) {
    Frame f(vamrnb_tbl_packed_size[mode]);
    for (auto &b : f) b = static_cast<uint8_t>(rng());
    f[0] = static_cast<uint8_t>(mode << 3 | 4);
    return f;
}

struct Decoder {
    vamrnb_decoder *d;
    Decoder() {
        codec_config c{};
        c.dec.layout = 1;
        c.dec.channels = 1;
        d = vamrnbd_create(&c, nullptr);
    }
    ~Decoder() { vamrnbd_delete(d); }
    Pcm run(Frame f) {
        Pcm pcm;
        pcm_buffer out{};
        out.data[0] = pcm.data();
        frame_info info{};
        bitstream_buffer in{};
        in.data = f.data();
        in.size = static_cast<uint32_t>(f.size());
        EXPECT_EQ(vamrnbd_decode(d, &in, &out, &info), 0);
        EXPECT_EQ(info.bytes, f.size());
        for (int16_t s : pcm) EXPECT_EQ(s & 7, 0);
        return pcm;
    }
};

bool is_homing_answer(const Pcm &p) {
    for (int16_t s : p)
        if (s != 0x0008) return false;
    return true;
}

TEST(DecoderHoming, OnlyFirstSubframeCountsWhileHomed) {
    // MR122: parameters up to the first subframe (18 of them) match, the rest
    // not.  While homed this is answered; otherwise it is ordinary speech
    // that does not reset the decoder.
    int16_t prm[57];
    std::memcpy(prm, vamrnb::tab::homing_frame_params[MR122], sizeof prm);
    prm[18] ^= 1;
    const Frame partial = pack(MR122, prm);

    Decoder homed;
    EXPECT_TRUE(is_homing_answer(homed.run(partial)));

    std::mt19937 rng(3);
    Decoder a, b;
    const Frame s = random_speech(MR122, rng);
    a.run(s);
    b.run(s);
    EXPECT_FALSE(is_homing_answer(a.run(partial)));
    b.run(partial);
    const Frame t = random_speech(MR122, rng);
    const Pcm pa = a.run(t);
    EXPECT_EQ(pa, b.run(t));
    Decoder fresh;
    EXPECT_NE(pa, fresh.run(t));  // no reset happened
}

TEST(DecoderHoming, LostFrameWhileHomedIsDecoded) {
    // a no-data frame carries no parameters to test: it is decoded, and the
    // decoder is no longer homed afterwards
    Decoder a;
    const Pcm lost = a.run(Frame{0x7C});
    EXPECT_FALSE(is_homing_answer(lost));
    const Pcm h = a.run(homing(MR475));
    EXPECT_FALSE(is_homing_answer(h));
    EXPECT_TRUE(is_homing_answer(a.run(homing(MR475))));
}

TEST(DecoderHoming, ResetKeepsTheHomingHistory) {
    // A reset restores the signal state, not whether the last frame homed:
    // a decoder that had left the homed state decodes the next homing frame
    // as speech, and one still homed answers it.
    std::mt19937 rng(5);
    Decoder left;
    left.run(random_speech(MR475, rng));
    vamrnbd_reset(left.d);
    EXPECT_FALSE(is_homing_answer(left.run(homing(MR475))));
    EXPECT_TRUE(is_homing_answer(left.run(homing(MR475))));  // that frame homed it

    Decoder homed;
    EXPECT_TRUE(is_homing_answer(homed.run(homing(MR122))));
    vamrnbd_reset(homed.d);
    EXPECT_TRUE(is_homing_answer(homed.run(homing(MR122))));
}

TEST(DecoderHoming, QualityBitDoesNotMatter) {
    // The homing pattern is recognised in a frame marked bad as well.
    Frame bad = homing(MR795);
    bad[0] &= static_cast<uint8_t>(~4);
    Decoder homed;
    EXPECT_TRUE(is_homing_answer(homed.run(bad)));

    std::mt19937 rng(6);
    Decoder running;
    running.run(random_speech(MR795, rng));
    EXPECT_FALSE(is_homing_answer(running.run(bad)));
    EXPECT_TRUE(is_homing_answer(running.run(homing(MR795))));  // the bad one reset it
}

}  // namespace
