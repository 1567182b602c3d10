// Storage-format stream reader and writer: any chunking of a stream gives the
// frames of a whole-buffer read (every bundled stream, and the full vector
// set when it sits beside the checkout), the magics and damage are told apart
// with their offsets, and the writer's output reads back frame for frame.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_stream.h"
#include "vamrnb_tables.h"

namespace fs = std::filesystem;

namespace {

using Bytes = std::vector<uint8_t>;

struct Frame {
    Bytes bytes;
    int type, quality, padding;
    uint64_t offset;
    bool operator==(const Frame &) const = default;
};

struct Walk {
    std::vector<Frame> frames;
    int32_t end = 0;        // status of vamrnb_stream_finish, or the read error
    uint64_t end_offset = 0;
    Frame partial{};
};

Bytes magic() { return Bytes(VAMRNB_STREAM_MAGIC, VAMRNB_STREAM_MAGIC + VAMRNB_STREAM_MAGIC_SIZE); }

// Feeds the stream in chunks whose sizes `next_chunk` picks.  Checks on the
// way that a frame handed out from the caller's bytes is the one at its
// offset, and that no call leaves bytes unused without a frame or an error.
template <class Chunker>
Walk walk(const Bytes &s, Chunker next_chunk) {
    Walk w;
    vamrnb_stream_reader *r = vamrnb_stream_reader_create(nullptr);
    size_t pos = 0;
    while (pos < s.size()) {
        const size_t n = std::min(next_chunk(), s.size() - pos);
        size_t off = 0;
        while (off < n) {
            size_t used = 0;
            vamrnb_stream_frame f{};
            const int32_t st = vamrnb_stream_read(r, s.data() + pos + off, n - off, &used, &f);
            off += used;
            if (st < 0) {
                w.end = st;
                w.end_offset = vamrnb_stream_reader_offset(r);
                vamrnb_stream_reader_delete(r);
                return w;
            }
            if (st == VAMRNB_STREAM_FRAME) {
                EXPECT_EQ(std::memcmp(f.data, s.data() + f.offset, f.size), 0);
                w.frames.push_back({Bytes(f.data, f.data + f.size), f.type, f.quality, f.padding, f.offset});
            } else {
                EXPECT_EQ(off, n);
            }
        }
        pos += n;
    }
    vamrnb_stream_frame p{};
    w.end = vamrnb_stream_finish(r, &p);
    w.end_offset = vamrnb_stream_reader_offset(r);
    if (w.end == VAMRNB_STREAM_ERR_TRUNCATED)
        w.partial = {Bytes(p.data, p.data + p.size), p.type, p.quality, p.padding, p.offset};
    vamrnb_stream_reader_delete(r);
    return w;
}

Walk whole(const Bytes &s) {
    return walk(s, [&] { return s.size(); });
}

Bytes slurp(const fs::path &path) {
    std::ifstream f(path, std::ios::binary);
    return Bytes((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
}

std::vector<fs::path> streams() {
    std::vector<fs::path> out;
    for (const fs::path &root : {fs::path(VAMRNB_TEST_DATA_DIR) / "vectors",
                                fs::path(VAMRNB_SOURCE_DIR) / ".." / "shared" / "vectors"}) {
        if (!fs::is_directory(root)) continue;
        for (const auto &e : fs::recursive_directory_iterator(root))
            if (e.is_regular_file() && e.path().extension() == ".amr") out.push_back(e.path());
    }
    return out;
}

TEST(StreamReader, AnyChunkingGivesTheWholeBufferFrames) {
    const auto paths = streams();
    ASSERT_FALSE(paths.empty());
    std::mt19937 rng(19);
    size_t frames = 0;
    for (const auto &path : paths) {
        SCOPED_TRACE(path.string());
        const Bytes s = slurp(path);
        const Walk ref = whole(s);
        ASSERT_EQ(ref.end, AMRNB_OK);
        ASSERT_EQ(ref.end_offset, s.size());
        frames += ref.frames.size();
        // Frames tile the stream: each starts where the one before ended.
        uint64_t at = VAMRNB_STREAM_MAGIC_SIZE;
        for (const Frame &f : ref.frames) {
            ASSERT_EQ(f.offset, at);
            ASSERT_EQ(f.bytes.size(), vamrnb_stream_frame_size(f.type));
            at += f.bytes.size();
        }
        const Walk bytewise = walk(s, [] { return size_t{1}; });
        EXPECT_EQ(bytewise.frames, ref.frames);
        EXPECT_EQ(bytewise.end, AMRNB_OK);
        std::uniform_int_distribution<size_t> chunk(1, 70);
        const Walk random = walk(s, [&] { return chunk(rng); });
        EXPECT_EQ(random.frames, ref.frames);
        EXPECT_EQ(random.end, AMRNB_OK);
    }
    EXPECT_GT(frames, 10000u);
}

TEST(StreamReader, TellsMagicsApartInAnyChunking) {
    const struct {
        std::string head;
        int32_t status;
    } cases[] = {
        {"#!AMR\n", AMRNB_OK},
        {"#!AMR-WB\n", VAMRNB_STREAM_ERR_WIDEBAND},
        {"#!AMR-WB_MC1.0\n", VAMRNB_STREAM_ERR_WIDEBAND},
        {"#!AMR_MC1.0\n", VAMRNB_STREAM_ERR_MULTICHANNEL},
        {"#!AMR\r\n", VAMRNB_STREAM_ERR_MAGIC},
        {"RIFF\x24\x00\x00\x00WAVE", VAMRNB_STREAM_ERR_MAGIC},
        {std::string("\0\0\0\x18" "ftyp3gp4", 12), VAMRNB_STREAM_ERR_MAGIC},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.head);
        Bytes s(c.head.begin(), c.head.end());
        s.push_back(0x7C);  // one no-data frame
        EXPECT_EQ(whole(s).end, c.status);
        EXPECT_EQ(walk(s, [] { return size_t{1}; }).end, c.status);
    }
    // Input that ends before the magic is complete, an empty one included.
    EXPECT_EQ(whole(Bytes{}).end, VAMRNB_STREAM_ERR_MAGIC);
    EXPECT_EQ(whole(Bytes{'#', '!', 'A'}).end, VAMRNB_STREAM_ERR_MAGIC);
    // The magic alone is a valid, empty stream.
    const Walk empty = whole(magic());
    EXPECT_EQ(empty.end, AMRNB_OK);
    EXPECT_TRUE(empty.frames.empty());
}

TEST(StreamReader, DamageIsReportedWithItsOffset) {
    // MR122 frame, then a SID frame whose ToC has both padding bits set, then
    // frame types 9..14 (7, 6, 6 and 1 byte), then a cut-off MR475 frame.
    Bytes s = magic();
    s.push_back(0x3C);
    s.resize(s.size() + 31, 0xA5);
    s.push_back(0x44 | 3);
    s.resize(s.size() + 5, 0x11);
    for (int ft = 9; ft <= 14; ++ft) {
        s.push_back(static_cast<uint8_t>(ft << 3 | 4));
        s.resize(s.size() + vamrnb_stream_frame_size(ft) - 1, 0);
    }
    const size_t cut = s.size();
    s.push_back(0x04);
    s.resize(s.size() + 6, 0x5A);  // 7 of the 13 bytes

    for (size_t chunk : {size_t{1}, size_t{5}, s.size()}) {
        SCOPED_TRACE(chunk);
        const Walk w = walk(s, [&] { return chunk; });
        ASSERT_EQ(w.frames.size(), 8u);
        EXPECT_EQ(w.frames[1].type, 8);
        EXPECT_EQ(w.frames[1].padding, 3);
        EXPECT_EQ(w.frames[1].quality, 1);
        const int sizes[] = {32, 6, 7, 6, 6, 1, 1, 1};
        for (size_t k = 0; k < 8; ++k) EXPECT_EQ(w.frames[k].bytes.size(), size_t(sizes[k]));
        EXPECT_EQ(w.end, VAMRNB_STREAM_ERR_TRUNCATED);
        EXPECT_EQ(w.partial.offset, cut);
        EXPECT_EQ(w.partial.type, 0);
        EXPECT_EQ(w.partial.bytes, Bytes(s.begin() + static_cast<long>(cut), s.end()));
    }

    // The F bit set: an error at that byte, and it stays an error.
    Bytes bad = magic();
    bad.push_back(0x7C);
    bad.push_back(0xBC);
    bad.push_back(0x7C);
    for (size_t chunk : {size_t{1}, bad.size()}) {
        const Walk w = walk(bad, [&] { return chunk; });
        EXPECT_EQ(w.end, VAMRNB_STREAM_ERR_TOC);
        EXPECT_EQ(w.end_offset, 7u);
        EXPECT_EQ(w.frames.size(), 1u);
    }
    vamrnb_stream_reader *r = vamrnb_stream_reader_create(nullptr);
    size_t used = 99;
    vamrnb_stream_frame f{};
    EXPECT_EQ(vamrnb_stream_read(r, bad.data(), 6, &used, &f), AMRNB_OK);
    EXPECT_EQ(vamrnb_stream_read(r, bad.data() + 7, 2, &used, &f), VAMRNB_STREAM_ERR_TOC);
    EXPECT_EQ(used, 0u);
    EXPECT_EQ(vamrnb_stream_read(r, bad.data() + 8, 1, &used, &f), VAMRNB_STREAM_ERR_TOC);
    EXPECT_EQ(vamrnb_stream_finish(r, nullptr), VAMRNB_STREAM_ERR_TOC);
    vamrnb_stream_reader_reset(r);
    EXPECT_EQ(vamrnb_stream_read(r, bad.data(), 7, &used, &f), VAMRNB_STREAM_FRAME);
    EXPECT_EQ(vamrnb_stream_read(nullptr, bad.data(), 7, &used, &f), VAMRNB_STREAM_ERR_ARGUMENT);
    EXPECT_EQ(vamrnb_stream_read(r, nullptr, 3, &used, &f), VAMRNB_STREAM_ERR_ARGUMENT);
    vamrnb_stream_reader_delete(r);
}

TEST(StreamWriter, EncoderFramesReadBackAndBadFramesAreRefused) {
    codec_config cfg{};
    cfg.enc.dtx = 1;
    cfg.enc.mode = MR795;
    vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
    ASSERT_NE(enc, nullptr);
    Bytes s(VAMRNB_STREAM_MAGIC_SIZE);
    size_t n = 0;
    ASSERT_EQ(vamrnb_stream_write_magic(s.data(), s.size(), &n), AMRNB_OK);
    std::vector<Bytes> sent;
    std::mt19937 rng(3);
    for (int k = 0; k < 200; ++k) {
        // Speech-like bursts, then silence so that SID and no-data frames come.
        int16_t pcm[160];
        for (int16_t &v : pcm) v = k < 80 ? static_cast<int16_t>(static_cast<int>(rng() % 8001) - 4000) : 0;
        pcm_buffer in{};
        in.data[0] = pcm;
        uint8_t out[32];
        bitstream_buffer bs{out, 0, sizeof out};
        frame_info info{};
        vamrnbe_encode(enc, &in, &bs, &info);
        sent.emplace_back(out, out + info.bytes);
        const size_t at = s.size();
        s.resize(at + VAMRNB_STREAM_MAX_FRAME);
        ASSERT_EQ(vamrnb_stream_write_frame(out, info.bytes, s.data() + at, VAMRNB_STREAM_MAX_FRAME, &n), AMRNB_OK);
        s.resize(at + n);
    }
    vamrnbe_delete(enc);
    const Walk w = whole(s);
    ASSERT_EQ(w.end, AMRNB_OK);
    ASSERT_EQ(w.frames.size(), sent.size());
    bool sid = false, nodata = false;
    for (size_t k = 0; k < sent.size(); ++k) {
        EXPECT_EQ(w.frames[k].bytes, sent[k]);
        sid |= w.frames[k].type == 8;
        nodata |= w.frames[k].type == 15;
    }
    EXPECT_TRUE(sid && nodata);

    uint8_t out[40];
    const uint8_t padded[6] = {0x44 | 3, 1, 2, 3, 4, 5};
    ASSERT_EQ(vamrnb_stream_write_frame(padded, 6, out, sizeof out, &n), AMRNB_OK);
    EXPECT_EQ(out[0], 0x44);  // padding bits cleared in the copy
    const uint8_t mr122[32] = {0x3C};
    EXPECT_EQ(vamrnb_stream_write_frame(mr122, 31, out, sizeof out, &n), VAMRNB_STREAM_ERR_FRAME_SIZE);
    EXPECT_EQ(vamrnb_stream_write_frame(mr122, 32, out, 31, &n), VAMRNB_STREAM_ERR_NO_ROOM);
    EXPECT_EQ(n, 0u);
    const uint8_t fbit[1] = {0xFC};
    EXPECT_EQ(vamrnb_stream_write_frame(fbit, 1, out, sizeof out, &n), VAMRNB_STREAM_ERR_TOC);
    EXPECT_EQ(vamrnb_stream_write_magic(out, 5, &n), VAMRNB_STREAM_ERR_NO_ROOM);
}

TEST(StatusText, EveryStatusHasItsOwnTextAndVersionMatchesHeader) {
    const int32_t codes[] = {AMRNB_OK, VAMRNB_STREAM_FRAME, AMRNB_ERR_NO_MEMORY, AMRNB_ERR_UNSUPPORTED,
                             AMRNB_ERR_BAD_FRAME_TYPE, AMRNB_ERR_BAD_LAYOUT, VAMRNB_STREAM_ERR_MAGIC,
                             VAMRNB_STREAM_ERR_WIDEBAND, VAMRNB_STREAM_ERR_MULTICHANNEL, VAMRNB_STREAM_ERR_TOC,
                             VAMRNB_STREAM_ERR_TRUNCATED, VAMRNB_STREAM_ERR_NO_ROOM,
                             VAMRNB_STREAM_ERR_FRAME_SIZE, VAMRNB_STREAM_ERR_ARGUMENT};
    const std::string unknown = vamrnb_strerror(-1000);
    std::vector<std::string> seen;
    for (int32_t c : codes) {
        const std::string t = vamrnb_strerror(c);
        EXPECT_NE(t, unknown) << c;
        EXPECT_EQ(std::count(seen.begin(), seen.end(), t), 0) << c;
        seen.push_back(t);
    }
    EXPECT_EQ(std::string(vamrnb_version()), std::to_string(VAMRNB_VERSION_MAJOR) + "." +
                                                 std::to_string(VAMRNB_VERSION_MINOR) + "." +
                                                 std::to_string(VAMRNB_VERSION_PATCH));
}

}  // namespace
