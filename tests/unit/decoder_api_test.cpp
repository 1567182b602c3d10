// The decoder as a caller sees it, through the public header only: creation
// and its status codes, refused output settings and frame types, bytes
// consumed, truncated frames, every output setting end to end, the frame
// counter, reset and independence of instances.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"
#include "dec_config.h"

namespace {

// Bytes the decoder reports as consumed, by frame type.
constexpr uint32_t kConsumed[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 1, 0, 0, 1, 1, 1, 1};

using Frame = std::vector<uint8_t>;

// A storage-format frame of type ft with pseudo-random payload bits: every
// bit pattern is a valid frame for the decoder.
Frame make_frame(int ft, uint32_t &seed, bool good = true) {
    Frame f(vamrnb_stream_frame_size(ft));
    f[0] = static_cast<uint8_t>(ft << 3 | (good ? 4 : 0));
    for (size_t i = 1; i < f.size(); ++i) {
        seed = seed * 1664525u + 1013904223u;
        f[i] = static_cast<uint8_t>(seed >> 24);
    }
    return f;
}

// Speech of every mode, bad speech, lost frames, SIDs and reserved types.
std::vector<Frame> mixed_stream(uint32_t seed, int n = 60) {
    static const int kTypes[] = {7, 7, 0, 3, 5, 15, 6, 1, 2, 4, 8, 15, 15, 9, 12, 7, 14, 13};
    std::vector<Frame> s;
    for (int i = 0; i < n; ++i) {
        const int ft = kTypes[i % (sizeof kTypes / sizeof kTypes[0])];
        s.push_back(make_frame(ft, seed, i % 11 != 4));
    }
    return s;
}

struct Decoder {
    vamrnb_decoder *d = nullptr;
    uint8_t buf[3][2 * 160 * 3 + 16] = {};
    pcm_buffer pcm{};
    frame_info info{};

    explicit Decoder(const codec_config &c) {
        int32_t err = 1;
        d = vamrnbd_create(&c, &err);
        EXPECT_EQ(err, AMRNB_OK);
        for (int i = 0; i < 3; ++i) pcm.data[i] = buf[i];
    }
    ~Decoder() { vamrnbd_delete(d); }
    Decoder(const Decoder &) = delete;
    Decoder &operator=(const Decoder &) = delete;

    int32_t decode(const uint8_t *p, uint32_t size) {
        bitstream_buffer in{const_cast<uint8_t *>(p), 0, size};
        return vamrnbd_decode(d, &in, &pcm, &info);
    }
    int32_t decode(const Frame &f) { return decode(f.data(), static_cast<uint32_t>(f.size())); }

    // 16-bit mono output of one frame (format 0, interleaved).
    std::vector<int16_t> pcm16() const {
        std::vector<int16_t> v(160);
        std::memcpy(v.data(), buf[0], 320);
        return v;
    }
};

// Decodes a stream with format 0 mono; refused frames give no output.
std::vector<std::vector<int16_t>> decode_all(Decoder &d, const std::vector<Frame> &s) {
    std::vector<std::vector<int16_t>> out;
    for (const Frame &f : s)
        if (d.decode(f) == AMRNB_OK) out.push_back(d.pcm16());
    return out;
}

}  // namespace

TEST(DecoderApi, CreateChecksReservedWord) {
    codec_config c = dec_config(1, 1, 0);
    c.word[0] = 1;
    int32_t err = 0;
    EXPECT_EQ(vamrnbd_create(&c, &err), nullptr);
    EXPECT_EQ(err, AMRNB_ERR_UNSUPPORTED);
    EXPECT_EQ(vamrnbd_create(&c, nullptr), nullptr);  // no error word to write

    c.word[0] = 0;
    vamrnb_decoder *d = vamrnbd_create(&c, nullptr);
    ASSERT_NE(d, nullptr);
    vamrnbd_delete(d);
    vamrnbd_delete(nullptr);
}

TEST(DecoderApi, RefusedFrameTypesLeaveNoTrace) {
    uint32_t seed = 99;
    const auto stream = mixed_stream(21, 40);
    std::vector<Frame> with_refused;
    for (size_t i = 0; i < stream.size(); ++i) {
        with_refused.push_back(stream[i]);
        if (i % 5 == 2) with_refused.push_back(make_frame(10 + (i % 2), seed));
    }

    Decoder plain(dec_config(1, 1, 0)), other(dec_config(1, 1, 0));
    const auto expect = decode_all(plain, stream);
    std::vector<std::vector<int16_t>> got;
    uint32_t count = 0;
    for (const Frame &f : with_refused) {
        const int ft = (f[0] >> 3) & 15;
        other.info.produced = 77;
        const int32_t st = other.decode(f);
        if (ft == 10 || ft == 11) {
            EXPECT_EQ(st, AMRNB_ERR_BAD_FRAME_TYPE);
            EXPECT_EQ(other.info.produced, 0u);
            EXPECT_EQ(other.info.frame_count, count);
            continue;
        }
        ASSERT_EQ(st, AMRNB_OK);
        EXPECT_EQ(other.info.produced, 1u);
        EXPECT_EQ(other.info.frame_count, ++count);
        got.push_back(other.pcm16());
    }
    EXPECT_EQ(got, expect);
}

TEST(DecoderApi, BytesConsumedPerFrameType) {
    Decoder d(dec_config(1, 1, 0));
    uint32_t seed = 1;
    for (int ft = 0; ft < 16; ++ft) {
        if (ft == 10 || ft == 11) continue;
        // Frames back to back: only the first one is read.
        Frame f = make_frame(ft, seed);
        const Frame g = make_frame(7, seed);
        f.insert(f.end(), g.begin(), g.end());
        ASSERT_EQ(d.decode(f), AMRNB_OK) << ft;
        EXPECT_EQ(d.info.bytes, kConsumed[ft]) << ft;
    }

    // A truncated frame never reports more than it was given.
    const Frame f = make_frame(7, seed);
    for (uint32_t n : {1u, 5u, 31u}) {
        ASSERT_EQ(d.decode(f.data(), n), AMRNB_OK);
        EXPECT_LE(d.info.bytes, n);
    }
}

TEST(DecoderApi, ResetMatchesFreshInstanceAndInstancesAreIndependent) {
    const auto warmup = mixed_stream(31, 25);
    const auto stream = mixed_stream(32, 50);

    Decoder fresh(dec_config(1, 1, 0));
    const auto expect = decode_all(fresh, stream);

    Decoder used(dec_config(1, 1, 0));
    decode_all(used, warmup);
    vamrnbd_reset(used.d);
    EXPECT_EQ(decode_all(used, stream), expect);

    // Two instances fed alternately give what each gives alone.
    Decoder a(dec_config(1, 1, 0)), b(dec_config(1, 1, 0)), b_alone(dec_config(1, 1, 0));
    const auto expect_b = decode_all(b_alone, warmup);
    std::vector<std::vector<int16_t>> got_a, got_b;
    for (size_t i = 0; i < std::max(stream.size(), warmup.size()); ++i) {
        if (i < stream.size() && a.decode(stream[i]) == AMRNB_OK) got_a.push_back(a.pcm16());
        if (i < warmup.size() && b.decode(warmup[i]) == AMRNB_OK) got_b.push_back(b.pcm16());
    }
    EXPECT_EQ(got_a, expect);
    EXPECT_EQ(got_b, expect_b);
}

TEST(DecoderApi, RefusedFrameTypeTouchesNoBuffer) {
    Decoder d(dec_config(1, 2, 3));
    std::memset(d.buf, 0xAA, sizeof d.buf);
    std::memset(d.pcm.samples, 0x5A, sizeof d.pcm.samples);
    std::memset(d.pcm.bytes, 0x5A, sizeof d.pcm.bytes);
    d.pcm.channels = d.pcm.bits_per_sample = d.pcm.reserved = d.pcm.layout = 0x5A5A5A5A;
    const pcm_buffer before = d.pcm;
    d.info = {9, 8, 7, {6}, 5};
    uint32_t seed = 4;
    for (int ft : {10, 11})
        for (bool good : {true, false}) {
            ASSERT_EQ(d.decode(make_frame(ft, seed, good)), AMRNB_ERR_BAD_FRAME_TYPE);
            EXPECT_EQ(std::memcmp(&d.pcm, &before, sizeof before), 0) << ft;
            for (const auto &b : d.buf)
                for (uint8_t x : b) ASSERT_EQ(x, 0xAA) << ft;
            EXPECT_EQ(d.info.produced, 0u);
            EXPECT_TRUE(d.info.bytes == 8 && d.info.frame_count == 7 && d.info.channels == 6 &&
                        d.info.bits_per_sample == 5);
        }
}

TEST(DecoderApi, TruncatedFrameDecodesAsIfPaddedWithOnes) {
    // Two decoders in step: one is given each frame cut short, the other the
    // same bytes followed by 0xFF up to the frame's full size.
    uint32_t seed = 12;
    Decoder cut(dec_config(1, 1, 0)), padded(dec_config(1, 1, 0));
    for (int ft : {7, 0, 5, 8, 8, 2}) {
        const Frame f = make_frame(ft, seed);
        for (uint32_t n = 0; n < f.size(); ++n) {
            Frame g(f.begin(), f.begin() + n);
            g.resize(n == 0 ? 1 : f.size(), 0xFF);
            ASSERT_EQ(cut.decode(f.data(), n), AMRNB_OK);
            ASSERT_EQ(padded.decode(g), AMRNB_OK);
            ASSERT_EQ(cut.pcm16(), padded.pcm16()) << "frame type " << ft << ", " << n << " bytes";
            EXPECT_LE(cut.info.bytes, n);
        }
    }
}

TEST(DecoderApi, EveryOutputSettingEndToEnd) {
    uint32_t seed = 8;
    const std::vector<Frame> frames = {make_frame(7, seed), make_frame(0, seed), make_frame(15, seed)};
    Decoder ref(dec_config(1, 1, 0));
    const auto expect = decode_all(ref, frames);

    constexpr uint32_t kMark = 0x5A5A5A5A;
    for (int32_t layout : {1, 0, 2})
        for (int32_t channels = -1; channels <= 3; ++channels)
            for (int32_t format = -1; format <= 4; ++format) {
                SCOPED_TRACE(testing::Message() << "layout " << layout << " channels " << channels << " format "
                                                << format);
                Decoder d(dec_config(layout, channels, format));
                const bool refused = format < 0 || format > 3 || channels < 0 || channels > 2 ||
                                     (channels == 0 && format != 0);
                const int nch = channels == 2 ? 2 : 1;
                const int bps = format == 1 ? 8 : format == 3 ? 24 : 16;
                for (size_t k = 0; k < frames.size(); ++k) {
                    std::memset(d.buf, 0xAA, sizeof d.buf);
                    pcm_buffer &p = d.pcm;
                    std::fill(std::begin(p.samples), std::end(p.samples), kMark);
                    std::fill(std::begin(p.bytes), std::end(p.bytes), kMark);
                    p.channels = p.bits_per_sample = p.reserved = p.layout = kMark;
                    const int32_t st = d.decode(frames[k]);
                    if (refused) {
                        ASSERT_EQ(st, AMRNB_ERR_UNSUPPORTED);
                        EXPECT_EQ(d.info.frame_count, 0u);
                        for (const auto &b : d.buf)
                            for (uint8_t x : b) ASSERT_EQ(x, 0xAA);
                        continue;
                    }
                    ASSERT_EQ(st, AMRNB_OK);
                    EXPECT_TRUE(d.info.channels == uint32_t(nch) && d.info.bits_per_sample == uint32_t(bps));
                    EXPECT_TRUE(p.channels == uint32_t(nch) && p.bits_per_sample == uint32_t(bps));
                    EXPECT_EQ(p.layout, uint32_t(layout));
                    EXPECT_EQ(p.reserved, kMark);

                    // The bytes each channel should carry.
                    std::vector<uint8_t> one;
                    for (int16_t s : expect[k]) {
                        if (format == 1) {
                            one.push_back(uint8_t(std::clamp((s + 128) >> 8, -128, 127)));
                        } else {
                            if (format == 3) one.push_back(0);
                            one.push_back(uint8_t(s & 0xFF));
                            one.push_back(uint8_t((s >> 8) & 0xFF));
                        }
                    }
                    const size_t w = bps / 8;
                    for (size_t i = 0; i < 8; ++i) {
                        const bool used = layout == 1 ? i == 0 : i == 1 || i == 2;
                        EXPECT_TRUE(used || (p.samples[i] == kMark && p.bytes[i] == kMark)) << i;
                    }
                    if (layout == 1) {
                        EXPECT_TRUE(p.samples[0] == 160u * nch && p.bytes[0] == 160u * nch * w);
                        for (size_t i = 0; i < 160; ++i)
                            for (int ch = 0; ch < nch; ++ch)
                                ASSERT_EQ(std::memcmp(d.buf[0] + (i * nch + ch) * w, &one[i * w], w), 0) << i;
                        EXPECT_EQ(d.buf[0][160 * nch * w], 0xAA);
                        EXPECT_TRUE(d.buf[1][0] == 0xAA && d.buf[2][0] == 0xAA);
                    } else {
                        EXPECT_TRUE(p.samples[1] == 160u && p.samples[2] == 160u);
                        EXPECT_TRUE(p.bytes[1] == 160u * w && p.bytes[2] == 160u * w);
                        for (int ch = 0; ch < nch; ++ch) {
                            ASSERT_EQ(std::memcmp(d.buf[1 + ch], one.data(), one.size()), 0) << ch;
                            EXPECT_EQ(d.buf[1 + ch][one.size()], 0xAA);
                        }
                        EXPECT_EQ(d.buf[0][0], 0xAA);
                        if (nch == 1) {
                            EXPECT_EQ(d.buf[2][0], 0xAA);
                        }
                    }
                }
            }
}
