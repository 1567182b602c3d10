// Encoder instance and frame driver through the public interface.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <cstring>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace {

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
            EXPECT_EQ(info.bytes, vamrnb_stream_frame_size(mode)) << mode;
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

// Speech for ten frames, then silence: with DTX on this gives SID_FIRST,
// NO_DATA and SID_UPDATE frames after the hangover.
void talk_then_silence(std::vector<int16_t> &pcm, int frame) {
    if (frame < 10)
        speech_like(pcm, frame);
    else
        std::fill(pcm.begin(), pcm.end(), 0);
}

TEST(EncApi, SmallOutputBufferTakesWhatFits) {
    // One encoder per room size, all fed the same input: each frame's bytes
    // are the first min(room, frame size) bytes of the whole frame, and
    // nothing is written past the room.
    Encoder whole(config(1, MR74));
    std::vector<std::unique_ptr<Encoder>> small;
    for (uint32_t room = 0; room <= 40; ++room) {
        small.push_back(std::make_unique<Encoder>(config(1, MR74)));
        small.back()->bs.size = room;
    }
    bool sid = false, nodata = false;
    for (int f = 0; f < 30; ++f) {
        talk_then_silence(whole.pcm, f);
        const frame_info info = whole.encode();
        sid |= info.frame_type == 8;
        nodata |= info.frame_type == 15;
        for (uint32_t room = 0; room <= 40; ++room) {
            Encoder &e = *small[room];
            talk_then_silence(e.pcm, f);
            std::fill(e.out.begin(), e.out.end(), 0xAA);
            const frame_info got = e.encode();
            const uint32_t n = std::min(room, info.bytes);
            ASSERT_EQ(got.bytes, n) << "room " << room << ", frame " << f;
            ASSERT_EQ(got.frame_type, info.frame_type);
            ASSERT_TRUE(std::equal(e.out.begin(), e.out.begin() + n, whole.out.begin())) << room;
            ASSERT_TRUE(std::all_of(e.out.begin() + room, e.out.end(), [](uint8_t b) { return b == 0xAA; }));
        }
    }
    EXPECT_TRUE(sid && nodata) << "the stream must reach SID and no-data frames";
}

TEST(EncApi, DtxWordsOtherThanOneSwitchDtxOff) {
    auto encode_stream = [](codec_config c) {
        Encoder e(c);
        std::vector<uint8_t> bytes;
        for (int f = 0; f < 30; ++f) {
            talk_then_silence(e.pcm, f);
            const frame_info info = e.encode();
            bytes.insert(bytes.end(), e.out.begin(), e.out.begin() + info.bytes);
        }
        return bytes;
    };
    const auto off = encode_stream(config(0, MR59));
    EXPECT_NE(encode_stream(config(1, MR59)), off);
    for (int32_t dtx : {2, -1, INT32_MIN, INT32_MAX})
        for (int32_t vad : {0, 1}) EXPECT_EQ(encode_stream(config(dtx, MR59, vad)), off) << dtx << ' ' << vad;
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
        EXPECT_EQ(info.bytes, vamrnb_stream_frame_size(mode)) << f;
        EXPECT_EQ(info.frame_type, static_cast<uint32_t>(mode));
    }
}
