// RTP payloads: hand-computed packets in both payload modes, refusal of
// malformed payloads, round trips of every bundled stream through packets of
// 1, 2, 3 and 10 frames, mode-request following on a live encoder, and the
// SDP parameters.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_rtp.h"
#include "vamrnb_tables.h"

namespace {

using bytes = std::vector<uint8_t>;

vamrnb_rtp_params mode_params(int octet_align, int crc = 0) {
    vamrnb_rtp_params p;
    vamrnb_rtp_params_default(&p);
    p.octet_align = octet_align;
    p.crc = crc;
    return p;
}

bytes pack(const vamrnb_rtp_params &p, int cmr, const bytes &frames, int32_t *status = nullptr) {
    bytes out(2048);
    vamrnb_rtp_info info{};
    const int32_t st = vamrnb_rtp_pack(&p, cmr, frames.data(), frames.size(), out.data(),
                                       out.size(), &info);
    if (status) *status = st;
    else EXPECT_EQ(st, AMRNB_OK);
    out.resize(st == AMRNB_OK ? info.bytes : 0);
    return out;
}

// Parses from a buffer of exactly the payload's size, so that any read past
// the end shows up under the sanitizers.
int32_t parse(const vamrnb_rtp_params &p, const bytes &payload, bytes *frames = nullptr,
              vamrnb_rtp_info *info = nullptr, size_t capacity = 4096) {
    std::vector<uint8_t> in(payload);
    bytes out(capacity);
    vamrnb_rtp_info local{};
    const int32_t st = vamrnb_rtp_parse(&p, in.data(), in.size(), out.data(), out.size(), &local);
    out.resize(local.bytes);
    if (frames) *frames = out;
    if (info) *info = local;
    return st;
}

// A 7.4 kbit/s frame whose bits alternate 1, 0, 1, ...: 148 bits, 4 padding bits.
bytes mr74_frame() {
    bytes f(20, 0xAA);
    f.front() = 0x24;
    f.back() = 0xA0;
    return f;
}

// A SID_UPDATE frame of zero comfort-noise bits with mode indication MR59,
// and a NO_DATA frame.
const bytes kSidUpdate = {0x44, 0x00, 0x00, 0x00, 0x00, 0x14};
const bytes kNoData = {0x7C};

bytes cat(std::initializer_list<bytes> parts) {
    bytes out;
    for (const bytes &b : parts) out.insert(out.end(), b.begin(), b.end());
    return out;
}

}  // namespace

TEST(Rtp, GoldenPackets) {
    // One 7.4 kbit/s frame, no mode request: the bandwidth-efficient layout
    // CMR 1111, F 0, FT 0100, Q 1, 148 speech bits, two padding bits.
    bytes be = {0xF2, 0x6A};
    be.insert(be.end(), 17, 0xAA);
    be.push_back(0xA8);
    EXPECT_EQ(pack(mode_params(0), 15, mr74_frame()), be);
    const bytes mr74 = mr74_frame();
    bytes oa = {0xF0, 0x24};
    oa.insert(oa.end(), mr74.begin() + 1, mr74.end());
    EXPECT_EQ(pack(mode_params(1), 15, mr74_frame()), oa);

    // SID then NO_DATA with a request for 12.2 kbit/s: F chains the two
    // entries, the SID's 39 bits follow the entries without a gap.
    const bytes two = cat({kSidUpdate, kNoData});
    EXPECT_EQ(pack(mode_params(0), 7, two), (bytes{0x7C, 0x5F, 0x00, 0x00, 0x00, 0x00, 0x14}));
    EXPECT_EQ(pack(mode_params(1), 7, two),
              (bytes{0x70, 0xC4, 0x7C, 0x00, 0x00, 0x00, 0x00, 0x14}));

    // A bad frame keeps Q = 0 in the table of contents and back.
    bytes bad = mr74_frame();
    bad[0] = 0x20;
    const bytes be_bad = pack(mode_params(0), 15, bad);
    EXPECT_EQ(be_bad[1], 0x2A);
    bytes back;
    ASSERT_EQ(parse(mode_params(0), be_bad, &back), AMRNB_OK);
    EXPECT_EQ(back, bad);

    // With CRCs one byte per frame that has bits sits between the table of
    // contents and the frames; a NO_DATA frame has none.
    const bytes crc = pack(mode_params(1, 1), 15, cat({mr74_frame(), kNoData, kSidUpdate}));
    ASSERT_EQ(crc.size(), 1u + 3u + 2u + 19u + 5u);
    EXPECT_EQ(crc[2], 0xFC);
    EXPECT_EQ(crc[6], 0xAA);
    // The SID's CRC covers all its 39 bits, of which only STI and the mode
    // indication's middle bit are set: x^8 (x^3 + x) mod the generator is
    // x^7 + x^6 + x^4 + x.
    EXPECT_EQ(crc[5], 0xD2);
    // The 7.4 kbit/s frame's 61 class A bits 1, 0, 1, ..., 1 by long division.
    EXPECT_EQ(crc[4], 0x46);
}

TEST(Rtp, CrcMarksDamagedFramesBad) {
    const vamrnb_rtp_params p = mode_params(1, 1);
    const bytes frames = cat({mr74_frame(), kSidUpdate});
    const bytes good = pack(p, 15, frames);
    bytes out;
    vamrnb_rtp_info info{};
    ASSERT_EQ(parse(p, good, &out, &info), AMRNB_OK);
    EXPECT_EQ(info.crc_errors, 0u);
    EXPECT_EQ(out, frames);

    // Bit 60 is the last class A bit of a 7.4 kbit/s frame, bit 61 the first
    // of class B, which the CRC does not cover.
    const size_t data = 1 + 2 + 2;
    for (const auto &[bit, errors] : {std::pair{60, 1u}, std::pair{61, 0u}, std::pair{0, 1u}}) {
        bytes hit = good;
        hit[data + bit / 8] ^= static_cast<uint8_t>(0x80 >> (bit % 8));
        ASSERT_EQ(parse(p, hit, &out, &info), AMRNB_OK);
        EXPECT_EQ(info.crc_errors, errors) << "bit " << bit;
        EXPECT_EQ(out[0], errors ? 0x20 : 0x24) << "bit " << bit;
        EXPECT_EQ(out[20], 0x44);  // the SID frame keeps its good quality
    }
}

TEST(Rtp, MalformedPayloadsAreRefused) {
    for (int oa = 0; oa <= 1; ++oa) {
        const vamrnb_rtp_params p = mode_params(oa);
        const bytes good = pack(p, 15, cat({mr74_frame(), kSidUpdate, kNoData}));
        ASSERT_EQ(parse(p, good), AMRNB_OK);

        // Any shortening either cuts the frames or the table of contents.
        for (size_t n = 0; n < good.size(); ++n)
            EXPECT_EQ(parse(p, bytes(good.begin(), good.begin() + n)), VAMRNB_RTP_ERR_TRUNCATED)
                << "mode " << oa << ", " << n << " bytes";
        bytes longer = good;
        longer.push_back(0);
        EXPECT_EQ(parse(p, longer), VAMRNB_RTP_ERR_TRAILING) << oa;
        // Two NO_DATA entries fill the first two bytes exactly: no padding
        // at all, so one more byte is trailing.
        const bytes exact = oa ? bytes{0xF0, 0xFC, 0x7C} : bytes{0xFF, 0xDF};
        EXPECT_EQ(parse(p, exact), AMRNB_OK) << oa;
        EXPECT_EQ(parse(p, cat({exact, {0}})), VAMRNB_RTP_ERR_TRAILING) << oa;

        // The F bit of the last entry set: the chain runs on into the frames
        // and past the end of the payload.
        bytes chained = oa ? bytes{0xF0, 0xBC, 0xBC, 0xBC} : bytes{0xFF, 0xFF, 0xFF};
        EXPECT_EQ(parse(p, chained), VAMRNB_RTP_ERR_TRUNCATED) << oa;

        // Reserved frame types 12 to 14.
        for (int ft = 12; ft <= 14; ++ft) {
            const bytes reserved = oa ? bytes{0xF0, static_cast<uint8_t>(ft << 3 | 4)}
                                      : bytes{static_cast<uint8_t>(0xF0 | ft >> 1),
                                               static_cast<uint8_t>((ft & 1) << 7 | 0x40)};
            EXPECT_EQ(parse(p, reserved), VAMRNB_RTP_ERR_FRAME_TYPE) << oa << " ft " << ft;
            bytes frame = {static_cast<uint8_t>(ft << 3 | 4)};
            int32_t st = 0;
            pack(p, 15, frame, &st);
            EXPECT_EQ(st, VAMRNB_RTP_ERR_FRAME_TYPE);
        }

        // Output too small: refused, not cut.
        EXPECT_EQ(parse(p, good, nullptr, nullptr, 20 + 6), VAMRNB_RTP_ERR_NO_ROOM);
        EXPECT_EQ(parse(p, good, nullptr, nullptr, 20 + 6 + 1), AMRNB_OK);
    }

    // What the library does not carry is refused before the data is read.
    vamrnb_rtp_params p = mode_params(1);
    p.interleaving = 4;
    EXPECT_EQ(parse(p, bytes{0xF0, 0x7C}), VAMRNB_RTP_ERR_UNSUPPORTED);
    p = mode_params(1);
    p.robust_sorting = 1;
    EXPECT_EQ(parse(p, bytes{0xF0, 0x7C}), VAMRNB_RTP_ERR_UNSUPPORTED);

    // Packing: a frame cut short, more frames than maxptime, a reserved CMR,
    // a payload buffer one byte short.
    int32_t st = 0;
    const bytes mr74 = mr74_frame();
    pack(mode_params(0), 15, bytes(mr74.begin(), mr74.end() - 1), &st);
    EXPECT_EQ(st, VAMRNB_RTP_ERR_TRUNCATED);
    p = mode_params(0);
    p.maxptime = 40;
    pack(p, 15, cat({kNoData, kNoData}), &st);
    EXPECT_EQ(st, AMRNB_OK);
    pack(p, 15, cat({kNoData, kNoData, kNoData}), &st);
    EXPECT_EQ(st, VAMRNB_RTP_ERR_TOO_MANY);
    pack(mode_params(0), 9, kNoData, &st);
    EXPECT_EQ(st, VAMRNB_RTP_ERR_ARGUMENT);
    uint8_t room[19];
    EXPECT_EQ(vamrnb_rtp_pack(&p, 15, mr74.data(), mr74.size(), room, sizeof room, nullptr),
              VAMRNB_RTP_ERR_NO_ROOM);
}

TEST(Rtp, EveryBundledStreamRoundTrips) {
    namespace fs = std::filesystem;
    std::vector<fs::path> streams;
    for (const auto &e : fs::recursive_directory_iterator(VAMRNB_SOURCE_DIR "/tests/data/vectors"))
        if (e.path().extension() == ".amr") streams.push_back(e.path());
    ASSERT_FALSE(streams.empty());

    const vamrnb_rtp_params modes[] = {mode_params(0), mode_params(1), mode_params(1, 1)};
    size_t packets = 0, frames_total = 0, reserved = 0;
    for (const fs::path &path : streams) {
        std::ifstream f(path, std::ios::binary);
        const bytes file{std::istreambuf_iterator<char>(f), {}};
        ASSERT_GT(file.size(), 6u);
        // Frame boundaries by the storage-format sizes.  The reserved frame
        // types (one byte in a file) cannot travel in a payload: packing
        // refuses them, and a sender puts NO_DATA in their place.
        bytes stream(file.begin() + 6, file.end());
        std::vector<size_t> at;
        size_t pos = 0;
        while (pos < stream.size()) {
            at.push_back(pos);
            const int ft = (stream[pos] >> 3) & 15;
            if (ft >= 12 && ft <= 14) {
                int32_t st = 0;
                pack(modes[0], 15, bytes{stream[pos]}, &st);
                ASSERT_EQ(st, VAMRNB_RTP_ERR_FRAME_TYPE);
                stream[pos] = 0x7C;
                ++reserved;
            }
            pos += std::max<size_t>(1, static_cast<size_t>(vamrnb_tbl_packed_size[ft]));
        }
        ASSERT_EQ(pos, stream.size()) << path;
        at.push_back(pos);
        frames_total += at.size() - 1;

        for (const vamrnb_rtp_params &p : modes)
            for (size_t per : {1, 2, 3, 10}) {
                bytes joined;
                for (size_t i = 0; i + 1 < at.size(); i += per) {
                    const size_t j = std::min(i + per, at.size() - 1);
                    const bytes frames(stream.begin() + static_cast<long>(at[i]),
                                       stream.begin() + static_cast<long>(at[j]));
                    const int cmr = static_cast<int>(i % 9 == 8 ? 15 : i % 8);
                    const bytes payload = pack(p, cmr, frames);
                    bytes back;
                    vamrnb_rtp_info info{};
                    ASSERT_EQ(parse(p, payload, &back, &info), AMRNB_OK) << path;
                    ASSERT_EQ(info.frames, j - i);
                    ASSERT_EQ(info.cmr, cmr);
                    ASSERT_EQ(back, frames) << path << " frame " << i << " per " << per;
                    joined.insert(joined.end(), back.begin(), back.end());
                    ++packets;
                }
                ASSERT_EQ(joined, stream);
            }
    }
    std::printf("rtp round trips: %zu streams, %zu frames, %zu packets over 3 payload modes x "
                "1/2/3/10 frames per packet (%zu reserved frames sent as NO_DATA)\n",
                streams.size(), frames_total, packets, reserved);
}

TEST(Rtp, ModeRequestsDriveTheEncoder) {
    vamrnb_rtp_params p;
    vamrnb_rtp_params_default(&p);
    ASSERT_EQ(vamrnb_rtp_fmtp_parse("mode-set=0,2,5,7; mode-change-period=2; "
                                    "mode-change-neighbor=1", &p), AMRNB_OK);
    codec_config cfg{};
    cfg.enc.mode = MR122;
    vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
    ASSERT_NE(enc, nullptr);
    vamrnb_rtp_cmr_state st;
    ASSERT_EQ(vamrnb_rtp_cmr_init(&st, &p, MR122), AMRNB_OK);

    // A request for 6.7 kbit/s (not in the set) means 5.9; with the
    // neighbour rule the encoder passes 7.95 on the way down, and with
    // period 2 it changes only on even frames.
    vamrnb_rtp_cmr_request(&st, MR67);
    const int expect[] = {MR795, MR795, MR59, MR59, MR59};
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(vamrnb_rtp_cmr_next(&st, enc), expect[i]) << i;
        int16_t pcm[160] = {};
        for (int k = 0; k < 160; ++k) pcm[k] = static_cast<int16_t>((k * 331) % 2000 - 1000);
        uint8_t out[32];
        pcm_buffer in{};
        in.data[0] = pcm;
        bitstream_buffer bs{out, 0, sizeof out};
        frame_info info{};
        ASSERT_EQ(vamrnbe_encode(enc, &in, &bs, &info), AMRNB_OK);
        EXPECT_EQ((out[0] >> 3) & 15, expect[i]) << i;
    }
    // No request and the reserved values change nothing; a request below
    // the whole set asks for its lowest mode.
    vamrnb_rtp_cmr_request(&st, 15);
    vamrnb_rtp_cmr_request(&st, 9);
    EXPECT_EQ(vamrnb_rtp_cmr_next(&st, nullptr), MR59);
    p.mode_set = 0xF0;
    p.mode_change_neighbor = 0;
    p.mode_change_period = 1;
    ASSERT_EQ(vamrnb_rtp_cmr_init(&st, &p, MR59), AMRNB_OK);
    EXPECT_EQ(vamrnb_rtp_cmr_next(&st, nullptr), MR74);
    vamrnb_rtp_cmr_request(&st, MR122);
    EXPECT_EQ(vamrnb_rtp_cmr_next(&st, nullptr), MR122);
    vamrnbe_delete(enc);
}

TEST(Rtp, SdpParameters) {
    vamrnb_rtp_params p;
    ASSERT_EQ(vamrnb_rtp_fmtp_parse("a=fmtp:97 Octet-Align=1 ;mode-set= 0, 2,5,7; x-vendor=abc;"
                                    " maxptime=60; crc=1;max-red=0; bare",
                                    &p),
              AMRNB_OK);
    EXPECT_EQ(p.octet_align, 1);
    EXPECT_EQ(p.mode_set, 0xA5u);
    EXPECT_EQ(p.maxptime, 60);
    EXPECT_EQ(p.crc, 1);
    EXPECT_EQ(p.max_red, 0);
    EXPECT_EQ(p.mode_change_period, 1);
    {
        // Every parameter at its default formats as an empty line.
        vamrnb_rtp_params d;
        vamrnb_rtp_params_default(&d);
        char empty[8];
        std::memset(empty, 'x', sizeof empty);
        size_t len = 99;
        ASSERT_EQ(vamrnb_rtp_fmtp_format(&d, empty, sizeof empty, &len), AMRNB_OK);
        EXPECT_EQ(len, 0u);
        EXPECT_EQ(empty[0], '\0');
    }
    char text[128];
    size_t len = 0;
    ASSERT_EQ(vamrnb_rtp_fmtp_format(&p, text, sizeof text, &len), AMRNB_OK);
    EXPECT_STREQ(text, "octet-align=1; mode-set=0,2,5,7; maxptime=60; crc=1; max-red=0");
    EXPECT_EQ(len, std::strlen(text));
    vamrnb_rtp_params again;
    ASSERT_EQ(vamrnb_rtp_fmtp_parse(text, &again), AMRNB_OK);
    EXPECT_EQ(std::memcmp(&p, &again, sizeof p), 0);
    EXPECT_EQ(vamrnb_rtp_fmtp_format(&p, text, len, nullptr), VAMRNB_RTP_ERR_NO_ROOM);

    // Defaults write nothing; CRC alone implies the octet-aligned mode.
    vamrnb_rtp_params_default(&p);
    ASSERT_EQ(vamrnb_rtp_fmtp_format(&p, text, sizeof text, &len), AMRNB_OK);
    EXPECT_EQ(len, 0u);
    ASSERT_EQ(vamrnb_rtp_fmtp_parse("crc=1", &p), AMRNB_OK);
    EXPECT_EQ(p.octet_align, 1);

    for (const char *bad : {"octet-align=2", "mode-set=8", "mode-set=", "mode-set=1,,2",
                            "mode-change-period=3", "maxptime=0", "maxptime=-20",
                            "max-red=1e3", "interleaving=0"})
        EXPECT_EQ(vamrnb_rtp_fmtp_parse(bad, &p), VAMRNB_RTP_ERR_SDP) << bad;
    EXPECT_EQ(vamrnb_rtp_fmtp_parse("channels=2", &p), VAMRNB_RTP_ERR_UNSUPPORTED);
}
