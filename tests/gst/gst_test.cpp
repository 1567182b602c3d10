// The GStreamer elements in real pipelines, each result compared byte for byte
// with the library's own encoding or decoding of the same input: amrparse,
// 3GP through qtdemux, RTP with and without lost packets, the library's
// octet-aligned RTP payloads through the stock depayloader, lost frames in every
// form upstream reports them, the encoder in every mode, a mode change while
// playing, the padded last frame, and an arbitrary source through decodebin.
#include <gst/gst.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <set>
#include <string>
#include <vector>

#include "vamrnb.h"
#include "vamrnb_rtp.h"

namespace fs = std::filesystem;
using Bytes = std::vector<uint8_t>;

namespace {

const fs::path kSource = VAMRNB_SOURCE_DIR;
const fs::path kDemo = kSource / "tools/demo/allison-congrats.wav";
const char kMagic[] = "#!AMR\n";
constexpr size_t kMagicSize = 6;
constexpr GstClockTime kFrameNs = 20 * GST_MSECOND;

Bytes read_bytes(const fs::path &p) {
    std::ifstream f(p, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(f), {});
}

// The samples of a 16-bit WAV file's data chunk.
std::vector<int16_t> wav_samples(const fs::path &p) {
    Bytes b = read_bytes(p);
    for (size_t pos = 12; pos + 8 <= b.size();) {
        uint32_t len;
        std::memcpy(&len, &b[pos + 4], 4);
        if (std::memcmp(&b[pos], "data", 4) == 0) {
            std::vector<int16_t> s(std::min<size_t>(len, b.size() - pos - 8) / 2);
            std::memcpy(s.data(), &b[pos + 8], s.size() * 2);
            return s;
        }
        pos += 8 + len + (len & 1);
    }
    return {};
}

// The library's storage file for pcm (a partial last frame padded with zeros);
// mode_at gives the mode of each frame.
Bytes lib_encode(std::vector<int16_t> pcm, std::function<int(size_t)> mode_at, bool dtx,
                 int vad) {
    codec_config cfg{};
    cfg.enc.dtx = dtx;
    cfg.enc.vad_option = vad == 2;
    cfg.enc.mode = mode_at(0);
    vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
    pcm.resize((pcm.size() + 159) / 160 * 160);
    Bytes out(kMagic, kMagic + kMagicSize);
    frame_info info{};
    for (size_t f = 0; f * 160 < pcm.size(); ++f) {
        uint8_t frame[32];
        pcm_buffer in{};
        in.data[0] = &pcm[f * 160];
        bitstream_buffer bs{frame, 0, sizeof frame};
        vamrnbe_set_mode(enc, mode_at(f));
        vamrnbe_encode(enc, &in, &bs, &info);
        out.insert(out.end(), frame, frame + info.bytes);
    }
    vamrnbe_delete(enc);
    return out;
}

Bytes lib_encode(const std::vector<int16_t> &pcm, int mode, bool dtx = false, int vad = 1) {
    return lib_encode(pcm, [mode](size_t) { return mode; }, dtx, vad);
}

int frame_size(uint8_t toc) {
    static const int size[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 1, 1, 1, 1};
    return size[(toc >> 3) & 15];
}

// The library's decoding of a storage file (magic included); the frames whose
// indices are in `lost` are decoded as no-data frames instead.
Bytes lib_decode(const Bytes &file, int format = 0, int channels = 1,
                 const std::set<size_t> &lost = {}) {
    codec_config cfg{};
    cfg.dec.layout = 1;
    cfg.dec.channels = channels;
    cfg.dec.sample_format = format;
    vamrnb_decoder *dec = vamrnbd_create(&cfg, nullptr);
    Bytes out;
    frame_info info{};
    uint8_t no_data = 0x7C;
    for (size_t pos = kMagicSize, f = 0; pos < file.size(); ++f) {
        const int size = frame_size(file[pos]);
        uint8_t pcm[160 * 2 * 3];
        pcm_buffer o{};
        o.data[0] = pcm;
        bitstream_buffer in{lost.count(f) ? &no_data : const_cast<uint8_t *>(&file[pos]), 0,
                            static_cast<uint32_t>(lost.count(f) ? 1 : size)};
        if (vamrnbd_decode(dec, &in, &o, &info) == AMRNB_OK)
            out.insert(out.end(), pcm, pcm + o.bytes[0]);
        pos += static_cast<size_t>(size);
    }
    vamrnbd_delete(dec);
    return out;
}

bool element_exists(const char *name) {
    GstElementFactory *f = gst_element_factory_find(name);
    if (f) gst_object_unref(f);
    return f != nullptr;
}

// A pad probe given as a function of the buffer's index on that pad.
using Probe = std::function<GstPadProbeReturn(GstPad *, GstPadProbeInfo *, unsigned)>;

struct ProbeData {
    Probe fn;
    unsigned count = 0;
};

class GstTest : public ::testing::Test {
protected:
    fs::path dir;
    std::vector<ProbeData *> probes;

    void SetUp() override {
        dir = fs::temp_directory_path() /
              ("vamrnb_gst_" + std::to_string(::getpid()) + "_" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(dir);
        fs::create_directories(dir);
        for (const char *e : {"vamrnbdec", "vamrnbenc"})
            ASSERT_TRUE(element_exists(e))
                << e << " not found: is GST_PLUGIN_PATH the build's gst/ folder?";
    }
    void TearDown() override {
        for (ProbeData *p : probes) delete p;
        fs::remove_all(dir);
    }

    // Skips the test when a stock element it needs is not installed.
    bool have(std::initializer_list<const char *> elements) {
        for (const char *e : elements) {
            if (!element_exists(e)) {
                missing = e;
                return false;
            }
        }
        return true;
    }
    std::string missing;

    // Runs a gst-launch style pipeline to its end; probes attach to the named
    // element's pad ("name.sink" or "name.src") before it starts, and an
    // appsrc named "src" is handed the buffers of `feed` with their times.
    void run(const std::string &desc, const std::vector<std::pair<std::string, Probe>> &at = {},
             const std::vector<std::pair<GstClockTime, Bytes>> &feed = {}) {
        GError *error = nullptr;
        GstElement *pipe = gst_parse_launch(desc.c_str(), &error);
        ASSERT_TRUE(pipe && !error) << desc << ": " << (error ? error->message : "");
        for (const auto &[where, fn] : at) {
            const auto dot = where.find('.');
            GstElement *el = gst_bin_get_by_name(GST_BIN(pipe), where.substr(0, dot).c_str());
            ASSERT_NE(el, nullptr) << where;
            GstPad *pad = gst_element_get_static_pad(el, where.substr(dot + 1).c_str());
            auto *data = probes.emplace_back(new ProbeData{fn});
            gst_pad_add_probe(pad, GST_PAD_PROBE_TYPE_BUFFER,
                              [](GstPad *p, GstPadProbeInfo *info, gpointer d) {
                                  auto *pd = static_cast<ProbeData *>(d);
                                  return pd->fn(p, info, pd->count++);
                              },
                              data, nullptr);
            gst_object_unref(pad);
            gst_object_unref(el);
        }
        if (GstElement *src = gst_bin_get_by_name(GST_BIN(pipe), "src")) {
            GstFlowReturn ret;
            for (const auto &[pts, bytes] : feed) {
                GstBuffer *buf = gst_buffer_new_memdup(bytes.data(), bytes.size());
                GST_BUFFER_PTS(buf) = pts;
                g_signal_emit_by_name(src, "push-buffer", buf, &ret);
                gst_buffer_unref(buf);
            }
            g_signal_emit_by_name(src, "end-of-stream", &ret);
            gst_object_unref(src);
        }
        gst_element_set_state(pipe, GST_STATE_PLAYING);
        GstBus *bus = gst_element_get_bus(pipe);
        GstMessage *msg = gst_bus_timed_pop_filtered(
            bus, 120 * GST_SECOND, GstMessageType(GST_MESSAGE_EOS | GST_MESSAGE_ERROR));
        std::string err = msg ? "" : "timed out";
        if (msg && GST_MESSAGE_TYPE(msg) == GST_MESSAGE_ERROR) {
            GError *e = nullptr;
            gst_message_parse_error(msg, &e, nullptr);
            err = e->message;
            g_error_free(e);
        }
        if (msg) gst_message_unref(msg);
        gst_object_unref(bus);
        gst_element_set_state(pipe, GST_STATE_NULL);
        gst_object_unref(pipe);
        ASSERT_EQ(err, "") << desc;
    }

    std::string path(const char *name) const { return (dir / name).string(); }
};

#define NEEDS(...)                                                        \
    do {                                                                  \
        if (!have({__VA_ARGS__}))                                         \
            GTEST_SKIP() << missing << " is not installed (gstreamer1.0-plugins-base/good)"; \
    } while (0)

TEST_F(GstTest, InspectListsCapsAndProperties) {
    const struct { const char *element; std::vector<const char *> shown; } cases[] = {
        {"vamrnbdec", {"audio/AMR", "S16LE", "S24LE", "S8", "channels: [ 1, 2 ]"}},
        {"vamrnbenc", {"audio/AMR", "S16LE", "band-mode", "MR475", "dtx", "vad", "file-header",
                       "send-no-data"}}};
    for (const auto &c : cases) {
        FILE *p = ::popen((std::string("gst-inspect-1.0 ") + c.element + " 2>&1").c_str(), "r");
        ASSERT_NE(p, nullptr);
        std::string text;
        char chunk[4096];
        for (size_t n; (n = std::fread(chunk, 1, sizeof chunk, p)) > 0;) text.append(chunk, n);
        const int status = ::pclose(p);
        if (WIFEXITED(status) && WEXITSTATUS(status) == 127)  // the shell found no program
            GTEST_SKIP() << "gst-inspect-1.0 is not installed (gstreamer1.0-tools)";
        for (const char *s : c.shown)
            EXPECT_NE(text.find(s), std::string::npos) << c.element << " does not show " << s;
    }
}

TEST_F(GstTest, AmrparseDecodingEqualsLibraryInEveryOutputFormat) {
    NEEDS("amrparse", "filesrc", "filesink");
    // Every mode, DTX with both detectors, bad and lost frames, homing and a
    // mode change on every frame; frame types 9 to 14 are left out because
    // amrparse itself loses the framing on them (they are covered below).
    int files = 0;
    for (const auto &e : fs::recursive_directory_iterator(kSource / "tests/data/vectors")) {
        if (e.path().extension() != ".amr" || e.path().string().find("ft9-14") != std::string::npos)
            continue;
        ++files;
        run("filesrc location=" + e.path().string() +
            " ! amrparse ! vamrnbdec ! filesink location=" + path("out.pcm"));
        ASSERT_EQ(read_bytes(path("out.pcm")), lib_decode(read_bytes(e.path()))) << e.path();
    }
    EXPECT_GT(files, 50);
    // Other sample formats and two channels through caps negotiation.
    const fs::path amr = kSource / "tests/data/vectors/3gpp/spch_dos.amr";
    const struct { const char *caps; int format, channels; } outs[] = {
        {"format=S24LE,channels=2", 3, 2}, {"format=S8,channels=1", 1, 1},
        {"format=S16LE,channels=2", 0, 2}};
    for (const auto &o : outs) {
        run("filesrc location=" + amr.string() + " ! amrparse ! vamrnbdec ! audio/x-raw," +
            o.caps + " ! filesink location=" + path("out.pcm"));
        EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(read_bytes(amr), o.format, o.channels))
            << o.caps;
    }
}

TEST_F(GstTest, WholeFileInOneBufferIncludingRefusedFrameTypes) {
    NEEDS("appsrc", "filesink");
    // Frames of types 9 to 14 in one buffer: 9 and 12 to 15 conceal, 10 and 11
    // give no audio, exactly as the library's file decoding.
    for (const char *name : {"speech_cs_m_fillets-bigfish/ft9-14_MR122.amr",
                             "dtx_it-IT_m_carlo_talkspurts_noise-bed/vad1_MR795_ft9-14.amr"}) {
        const Bytes file = read_bytes(kSource / "tests/data/vectors/err" / name);
        run("appsrc name=src format=time caps=audio/AMR,rate=8000,channels=1 ! vamrnbdec ! "
            "filesink location=" + path("out.pcm"), {}, {{0, Bytes(file.begin() + kMagicSize, file.end())}});
        EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(file)) << name;
    }
}

TEST_F(GstTest, LostFramesAreConcealedInEveryFormUpstreamReportsThem) {
    NEEDS("amrparse", "filesrc", "filesink");
    const fs::path amr = kSource / "tests/data/vectors/3gpp/spch_dos.amr";
    // Frame 30 vanishes (a hole in the timestamps), 31-32 become a GAP event,
    // 200 a buffer flagged GAP, 250 vanishes inside the DTX part.
    Probe lose = [](GstPad *pad, GstPadProbeInfo *info, unsigned i) {
        GstBuffer *buf = GST_PAD_PROBE_INFO_BUFFER(info);
        if (i == 30 || i == 250) return GST_PAD_PROBE_DROP;
        if (i == 31) {
            gst_pad_send_event(pad, gst_event_new_gap(GST_BUFFER_PTS(buf), 2 * kFrameNs));
            return GST_PAD_PROBE_DROP;
        }
        if (i == 32) return GST_PAD_PROBE_DROP;
        if (i == 200) {
            GstBuffer *gap = gst_buffer_new();
            GST_BUFFER_PTS(gap) = GST_BUFFER_PTS(buf);
            GST_BUFFER_DURATION(gap) = kFrameNs;
            GST_BUFFER_FLAG_SET(gap, GST_BUFFER_FLAG_GAP);
            gst_buffer_unref(buf);
            GST_PAD_PROBE_INFO_DATA(info) = gap;
        }
        return GST_PAD_PROBE_OK;
    };
    // The concealed audio sits where the lost audio was: no jumps or overlaps.
    GstClockTime next = 0;
    Probe continuous = [&next](GstPad *, GstPadProbeInfo *info, unsigned i) {
        const GstBuffer *buf = GST_PAD_PROBE_INFO_BUFFER(info);
        EXPECT_EQ(GST_BUFFER_PTS(buf), next) << "output buffer " << i;
        next = GST_BUFFER_PTS(buf) + gst_buffer_get_size(const_cast<GstBuffer *>(buf)) / 2 * 125000;
        return GST_PAD_PROBE_OK;
    };
    run("filesrc location=" + amr.string() + " ! amrparse ! vamrnbdec name=dec ! filesink "
        "location=" + path("out.pcm"), {{"dec.sink", lose}, {"dec.src", continuous}});
    EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(read_bytes(amr), 0, 1, {30, 31, 32, 200, 250}));
    EXPECT_EQ(next, 425 * kFrameNs);
}

TEST_F(GstTest, ThreeGppFileDecodesLikeTheAmrFile) {
    NEEDS("wavparse", "3gppmux", "qtdemux", "filesrc", "filesink");
    run("filesrc location=" + kDemo.string() + " ! wavparse ! vamrnbenc band-mode=MR795 dtx=true"
        " ! 3gppmux ! filesink location=" + path("out.3gp"));
    run("filesrc location=" + path("out.3gp") + " ! qtdemux ! vamrnbdec ! filesink location=" +
        path("out.pcm"));
    EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(lib_encode(wav_samples(kDemo), MR795, true)));
}

TEST_F(GstTest, RtpRoundTripWithAndWithoutLostPackets) {
    NEEDS("wavparse", "rtpamrpay", "rtpamrdepay", "identity", "filesrc", "filesink");
    const auto pcm = wav_samples(kDemo);
    const std::string head = "filesrc location=" + kDemo.string() + " ! wavparse ! ";
    // DTX: no-data frames are left out for the payloader and concealed back.
    run(head + "vamrnbenc band-mode=MR475 dtx=true send-no-data=false ! rtpamrpay ! "
        "rtpamrdepay name=depay ! vamrnbdec ! filesink location=" + path("out.pcm"));
    EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(lib_encode(pcm, MR475, true)));

    // Every 7th packet lost: the decoder conceals exactly those frames.
    std::set<size_t> lost;
    Probe drop = [&lost](GstPad *, GstPadProbeInfo *info, unsigned i) {
        if (i % 7 != 3) return GST_PAD_PROBE_OK;
        const GstBuffer *buf = GST_PAD_PROBE_INFO_BUFFER(info);
        const GstClockTime d =
            GST_BUFFER_DURATION_IS_VALID(buf) ? GST_BUFFER_DURATION(buf) : kFrameNs;
        for (GstClockTime t = 0; t < d; t += kFrameNs)
            lost.insert((GST_BUFFER_PTS(buf) + t) / kFrameNs);
        return GST_PAD_PROBE_DROP;
    };
    run(head + "vamrnbenc band-mode=MR122 ! rtpamrpay ! rtpamrdepay name=depay ! vamrnbdec ! "
        "filesink location=" + path("out.pcm"), {{"depay.sink", drop}});
    ASSERT_GT(lost.size(), 100u);
    EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(lib_encode(pcm, MR122), 0, 1, lost));

    // Random losses as a network makes them: the stream runs to its end.
    run(head + "vamrnbenc ! rtpamrpay ! identity drop-probability=0.2 ! rtpamrdepay ! "
        "vamrnbdec ! filesink location=" + path("out.pcm"));
    const size_t whole = (pcm.size() + 159) / 160 * 320;
    EXPECT_NEAR(double(read_bytes(path("out.pcm")).size()), double(whole), 20 * 320.0);
}

TEST_F(GstTest, LibraryOctetAlignedPacketsThroughRtpamrdepayDecodeLikeTheFrames) {
    NEEDS("appsrc", "rtpamrdepay", "filesink");
    // A mode change every half second with DTX, so that every speech mode,
    // SID and NO_DATA entries travel; packed by the library, 1, 3 and 10
    // frames a packet.  (Frame CRCs are left out: with crc=1 the stock
    // depayloader hands each frame on with its CRC byte still inside.)
    const Bytes file =
        lib_encode(wav_samples(kDemo), [](size_t f) { return int(f / 25 % 8); }, true, 1);
    std::set<int> types;
    for (size_t pos = kMagicSize; pos < file.size(); pos += size_t(frame_size(file[pos])))
        types.insert((file[pos] >> 3) & 15);
    ASSERT_EQ(types, (std::set<int>{0, 1, 2, 3, 4, 5, 6, 7, 8, 15}));
    vamrnb_rtp_params params;
    vamrnb_rtp_params_default(&params);
    params.octet_align = 1;
    for (const unsigned per_packet : {1u, 3u, 10u}) {
        std::vector<std::pair<GstClockTime, Bytes>> packets;
        uint32_t ts = 0;
        for (size_t pos = kMagicSize; pos < file.size();) {
            size_t end = pos;
            for (unsigned n = 0; n < per_packet && end < file.size(); ++n)
                end += static_cast<size_t>(frame_size(file[end]));
            Bytes pkt(12 + 1500);
            const uint16_t seq = static_cast<uint16_t>(packets.size());
            const uint8_t head[12] = {0x80, uint8_t((packets.empty() ? 0x80 : 0) | 97),
                                      uint8_t(seq >> 8), uint8_t(seq), uint8_t(ts >> 24),
                                      uint8_t(ts >> 16), uint8_t(ts >> 8), uint8_t(ts),
                                      0x5A, 0xFE, 0x0A, 0x3B};
            std::memcpy(pkt.data(), head, 12);
            vamrnb_rtp_info info{};
            ASSERT_EQ(vamrnb_rtp_pack(&params, VAMRNB_RTP_CMR_NONE, &file[pos], end - pos,
                                      &pkt[12], pkt.size() - 12, &info),
                      AMRNB_OK);
            pkt.resize(12 + info.bytes);
            packets.emplace_back(GstClockTime(ts) * GST_SECOND / 8000, std::move(pkt));
            ts += 160 * info.frames;
            pos = end;
        }
        run("appsrc name=src format=time caps=application/x-rtp,media=audio,clock-rate=8000,"
            "encoding-name=AMR,encoding-params=1,payload=97,octet-align=(string)1 ! "
            "rtpamrdepay ! vamrnbdec ! filesink location=" + path("out.pcm"),
            {}, packets);
        EXPECT_EQ(read_bytes(path("out.pcm")), lib_decode(file)) << per_packet << " frames a packet";
    }
}

TEST_F(GstTest, EncoderEqualsLibraryInEveryModeWithAndWithoutDtx) {
    NEEDS("wavparse", "filesrc", "filesink");
    const auto pcm = wav_samples(kDemo);
    for (int mode = MR475; mode <= MR122; ++mode) {
        for (const char *dtx : {"", "dtx=true vad=1", "dtx=true vad=2"}) {
            run("filesrc location=" + kDemo.string() + " ! wavparse ! vamrnbenc file-header=true "
                "band-mode=" + std::to_string(mode) + " " + dtx + " ! filesink location=" +
                path("out.amr"));
            EXPECT_EQ(read_bytes(path("out.amr")),
                      lib_encode(pcm, mode, *dtx != 0, std::strstr(dtx, "vad=2") ? 2 : 1))
                << "mode " << mode << " " << dtx;
        }
    }
}

TEST_F(GstTest, ModeChangeWhilePlayingAppliesFromTheNextFrame) {
    NEEDS("wavparse", "filesrc", "filesink");
    Probe switch_mode = [](GstPad *pad, GstPadProbeInfo *, unsigned i) {
        if (i == 99 || i == 400) {
            GstElement *enc = gst_pad_get_parent_element(pad);
            g_object_set(enc, "band-mode", i == 99 ? MR475 : MR102, nullptr);
            gst_object_unref(enc);
        }
        return GST_PAD_PROBE_OK;
    };
    run("filesrc location=" + kDemo.string() + " ! wavparse ! vamrnbenc name=enc file-header=true"
        " dtx=true ! filesink location=" + path("out.amr"), {{"enc.src", switch_mode}});
    EXPECT_EQ(read_bytes(path("out.amr")),
              lib_encode(wav_samples(kDemo),
                         [](size_t f) { return f < 100 ? MR122 : f < 401 ? MR475 : MR102; },
                         true, 1));
}

TEST_F(GstTest, LastPartialFrameIsPaddedAndEveryFrameLasts20ms) {
    NEEDS("rawaudioparse", "filesrc", "filesink");
    // 1237 samples: seven frames and 117 samples of an eighth.
    const fs::path raw = kSource / "tests/data/corpus/sig_white_-20dBov_odd-length.pcm";
    std::vector<GstClockTime> pts, dur;
    Probe stamps = [&](GstPad *, GstPadProbeInfo *info, unsigned) {
        pts.push_back(GST_BUFFER_PTS(GST_PAD_PROBE_INFO_BUFFER(info)));
        dur.push_back(GST_BUFFER_DURATION(GST_PAD_PROBE_INFO_BUFFER(info)));
        return GST_PAD_PROBE_OK;
    };
    run("filesrc location=" + raw.string() + " ! rawaudioparse use-sink-caps=false "
        "pcm-format=s16le sample-rate=8000 num-channels=1 ! vamrnbenc name=enc file-header=true "
        "band-mode=MR67 ! filesink location=" + path("out.amr"), {{"enc.src", stamps}});
    const Bytes in = read_bytes(raw);
    std::vector<int16_t> pcm(in.size() / 2);
    std::memcpy(pcm.data(), in.data(), pcm.size() * 2);
    EXPECT_EQ(read_bytes(path("out.amr")), lib_encode(pcm, MR67));
    ASSERT_EQ(pts.size(), 8u);
    for (size_t i = 0; i < pts.size(); ++i) {
        EXPECT_EQ(pts[i], i * kFrameNs) << i;
        EXPECT_EQ(dur[i], kFrameNs) << i;
    }
}

TEST_F(GstTest, AnySourceThroughDecodebinGivesAValidAmrFile) {
    NEEDS("audiotestsrc", "wavenc", "decodebin", "audioconvert", "audioresample", "filesrc",
          "filesink");
    // Two seconds of a 44.1 kHz stereo WAV.
    run("audiotestsrc num-buffers=20 samplesperbuffer=4410 freq=440 volume=0.5 ! "
        "audio/x-raw,format=S16LE,rate=44100,channels=2 ! wavenc ! filesink location=" +
        path("in.wav"));
    run("filesrc location=" + path("in.wav") + " ! decodebin ! audioconvert ! audioresample ! "
        "vamrnbenc band-mode=MR59 file-header=true ! filesink location=" + path("out.amr"));
    const Bytes amr = read_bytes(path("out.amr"));
    ASSERT_GT(amr.size(), kMagicSize);
    ASSERT_EQ(std::string(amr.begin(), amr.begin() + kMagicSize), kMagic);
    size_t frames = 0, pos = kMagicSize;
    for (; pos < amr.size(); pos += 16, ++frames) ASSERT_EQ(amr[pos], 0x14) << "frame " << frames;
    EXPECT_EQ(pos, amr.size());
    EXPECT_NEAR(double(frames), 100.0, 1.0);
    // The tone comes through: its RMS level is about 11600.
    const Bytes dec = lib_decode(amr);
    std::vector<int16_t> s(dec.size() / 2);
    std::memcpy(s.data(), dec.data(), dec.size());
    double energy = 0;
    for (size_t i = 800; i < s.size(); ++i) energy += double(s[i]) * s[i];
    EXPECT_GT(std::sqrt(energy / double(s.size() - 800)), 5000.0);
}

}  // namespace

int main(int argc, char **argv) {
    gst_init(&argc, &argv);
    ::testing::InitGoogleTest(&argc, argv);
    return RUN_ALL_TESTS();
}
