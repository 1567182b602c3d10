// DTX on the encoder side: the hangover decision and SID scheduling that fix
// each frame's type, the LSP/energy history, and the SID encoder.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "common/enc_state.h"
#include "format/frame_format.h"
#include "vad/dtx_enc.h"
#include "vad/sid_sync.h"
#include "vad/vad.h"

using namespace vamrnb;

namespace {

// Hangover decision and frame-type choice of consecutive frames, as the
// encoder runs them.  Letters: S speech, F SID_FIRST, U SID_UPDATE, N no
// data; lower case when the SID parameters are not recomputed.
struct scheduler {
    dtx_enc_state dtx;
    sid_sync_state sync;
    int32_t prev = 0;
    scheduler() {
        dtx_enc_init(&dtx);
        sid_sync_init(&sync);
    }
    std::string run(int vad, int n) {
        std::string s;
        for (int i = 0; i < n; ++i) {
            int32_t used = 5;
            const Word16 compute = dtx_hangover(&dtx, static_cast<Word16>(vad), &used);
            const int32_t tx = tx_type_select(&sync, &prev, used);
            EXPECT_EQ(sync.tx_type, tx);
            EXPECT_EQ(tx == 0, used == 5);
            s += static_cast<char>("SFUN"[tx] + (used == 8 && compute == 0 ? 'a' - 'A' : 0));
        }
        return s;
    }
};

}  // namespace

TEST(DtxSchedule, Cadences) {
    // A new instance has never analysed noise: full hangover before the
    // first SID, then no data twice, SID_UPDATE, and every eighth frame.
    scheduler fresh;
    EXPECT_EQ(fresh.run(0, 20), "SSSSSSS" "F" "NN" "U" "NNNNNNN" "U" "N");

    // After a talk spurt the same cadence, all with fresh SID parameters.
    scheduler s;
    s.run(1, 50);
    EXPECT_EQ(s.run(0, 19), "SSSSSSS" "F" "NN" "U" "NNNNNNN" "U");
    // A short spurt soon after: straight back to DTX, repeating the stored
    // parameters until the hangover has run out.
    EXPECT_EQ(s.run(1, 3), "SSS");
    EXPECT_EQ(s.run(0, 10), "fnnunnnNNN");

    // Owed extra updates go out while the counter is above 2.
    s.sync.sid_handover_debt = 2;
    EXPECT_EQ(s.run(0, 9), "NUUUNNNNN");
    EXPECT_EQ(s.sync.sid_handover_debt, 0);
}

// The extra hangover returns once elapsed + remaining hangover reaches 30.
TEST(DtxSchedule, ExtraHangoverThreshold) {
    for (int elapsed : {22, 23}) {
        scheduler s;
        s.run(1, 1);
        s.dtx.elapsed_count = static_cast<Word16>(elapsed);
        EXPECT_EQ(s.run(0, 1), elapsed == 22 ? "f" : "S");
    }
}

TEST(DtxSid, EnergyIndexAndSeed) {
    dtx_enc_state st;
    dtx_enc_init(&st);
    const struct { Word16 hist; Word16 index; } cases[] = {
        {1000, 14}, {-4261, 0}, {14000, 63},   // typical, silence, saturated
    };
    for (const auto &c : cases) {
        for (auto &h : st.log_en_hist) h = c.hist;
        EXPECT_EQ(dtx_log_en_index(&st), c.index) << c.hist;
    }
    st.log_en_hist[0] = 3;   // each slot enters as a truncated quarter
    for (int s = 1; s < 8; ++s) st.log_en_hist[s] = 0;
    EXPECT_EQ(dtx_log_en_index(&st), 2688 >> 8);

    EXPECT_EQ(dtx_gain_seed(0), -11560);
    EXPECT_EQ(dtx_gain_seed(45), -40);
    EXPECT_EQ(dtx_gain_seed(46), 0);   // clamped
    EXPECT_EQ(dtx_gain_seed(63), 0);
}

namespace {

struct sid_fixture {
    vamrnb_encoder enc{};
    enc_frame fr{};
    sid_fixture() {
        dtx_enc_init(&enc.dtx);
        for (auto &v : enc.old_exc) v = 1;
        for (auto *a : {enc.sub.mem_w0, enc.sub.mem_err, enc.sub.ai_zero, enc.sub.hvec, enc.past_rq,
                        enc.lsp_old, enc.lsp_old_q})
            for (int i = 0; i < 10; ++i) a[i] = 7;
        for (auto &v : enc.sub.ai_zero) v = 7;
        for (auto &v : enc.sub.hvec) v = 7;
        for (int i = 0; i < 10; ++i) fr.lsp_new[i] = static_cast<Word16>(30000 - 3000 * i);
        for (int i = 0; i < 4; ++i) enc.sub.pred.past_qua_en[i] = enc.sub.pred_unq.past_qua_en[i] = 123;
        enc.sub.sharp = 5000;
        enc.sub.T0_prev_subframe = 60;
        fr.used_mode = 8;
    }
    // The five SID parameters read back from the frame's bits.
    std::vector<int> params() const {
        std::vector<int> out;
        int pos = 0;
        for (int w : {3, 8, 9, 9, 6}) {
            int v = 0;
            for (int b = 0; b < w; ++b) v = 2 * v + fr.prm[pos++];
            out.push_back(v);
        }
        for (int i = pos; i < 244; ++i) EXPECT_EQ(fr.prm[i], 0) << i;
        return out;
    }
};

}  // namespace

// Inside a shortened hangover the stored SID parameters are sent again, yet
// the speech coder is reset to restart from this frame's spectrum.
TEST(DtxSid, RepeatedParametersStillResetTheCoder) {
    sid_fixture f;
    dtx_enc_state &d = f.enc.dtx;
    d.init_lsf_vq_index = 5;
    d.lsp_index[0] = 200;
    d.lsp_index[1] = 301;
    d.lsp_index[2] = 402;
    d.log_en_index = 37;
    vamrnbe_dtx(&f.enc, &f.fr);

    EXPECT_EQ(f.params(), (std::vector<int>{5, 200, 301, 402, 37}));
    EXPECT_EQ(f.enc.sub.pred.past_qua_en[0], 123);   // no new seed
    for (int i = 0; i < 314; ++i) EXPECT_EQ(f.enc.old_exc[i], i < 154 ? 0 : 1) << i;
    for (int i = 0; i < 10; ++i) {
        EXPECT_EQ(f.enc.sub.mem_w0[i] | f.enc.sub.mem_err[i] | f.enc.past_rq[i], 0);
        EXPECT_EQ(f.enc.lsp_old[i], f.fr.lsp_new[i]);
        EXPECT_EQ(f.enc.lsp_old_q[i], f.fr.lsp_new[i]);
    }
    for (int i = 0; i < 51; ++i) EXPECT_EQ(f.enc.sub.ai_zero[i], i < 11 ? 7 : 0) << i;
    for (int i = 0; i < 80; ++i) EXPECT_EQ(f.enc.sub.hvec[i], i < 40 ? 0 : 7) << i;
    EXPECT_EQ(f.enc.sub.sharp | f.enc.sub.T0_prev_subframe, 0);
}

// A new SID (by compute_sid, or because the stored energy index is 0) seeds
// both histories of the main code-gain predictor, not the MR475 helper.
TEST(DtxSid, NewParametersSeedThePredictor) {
    for (int compute : {1, 0}) {
        sid_fixture f;
        for (auto &h : f.enc.dtx.log_en_hist) h = 1000;   // index 14
        f.fr.compute_sid = compute;
        vamrnbe_dtx(&f.enc, &f.fr);
        const std::vector<int> p = f.params();
        EXPECT_EQ(p[4], 14);
        EXPECT_EQ(p[0], f.enc.dtx.init_lsf_vq_index);
        EXPECT_EQ(p[3], f.enc.dtx.lsp_index[2]);
        for (int i = 0; i < 4; ++i) {
            EXPECT_EQ(f.enc.sub.pred.past_qua_en[i], 14 * 256 - 11560);
            EXPECT_EQ(f.enc.sub.pred.past_qua_en_MR122[i], (5443 * (14 * 256 - 11560)) >> 15);
            EXPECT_EQ(f.enc.sub.pred_unq.past_qua_en[i], 123);
        }
    }
}

// ---- through the public encoder ---------------------------------------------------

namespace {

struct api_encoder {
    vamrnb_encoder *enc;
    explicit api_encoder(int vad_option, int mode) {
        const codec_config c = {{1, 0, vad_option, mode}};
        int32_t status = -1;
        enc = vamrnbe_create(&c, &status);
        EXPECT_EQ(status, 0);
    }
    ~api_encoder() { vamrnbe_delete(enc); }
    std::vector<uint8_t> silent_frame() {
        int16_t pcm[160] = {};
        pcm_buffer in{};
        in.data[0] = pcm;
        uint8_t out[64];
        bitstream_buffer b{out, 0, sizeof out};
        frame_info info{};
        vamrnbe_encode(enc, &in, &b, &info);
        return std::vector<uint8_t>(out, out + info.bytes);
    }
};

}  // namespace

// Digital silence from the first frame on, with either detector: seven speech
// frames, then SID_FIRST, no data, no data, SID_UPDATE.  Every SID names the
// configured mode, also after a mode change during the silence.
TEST(DtxEncoder, SilenceFromTheStart) {
    for (int vad_option : {0, 1}) {
        api_encoder e(vad_option, 5);
        for (int f = 0; f < 7; ++f) EXPECT_EQ(e.silent_frame().size(), 21u) << f;
        auto sid = e.silent_frame();
        ASSERT_EQ(sid.size(), 6u);
        EXPECT_EQ(sid[0], 0x44);
        EXPECT_EQ(sid[5] & 0x1f, 0x0a);   // STI 0, mode 5 sent as 1, 0, 1, zero pad
        EXPECT_EQ(e.silent_frame(), std::vector<uint8_t>{0x7c});
        EXPECT_EQ(e.silent_frame(), std::vector<uint8_t>{0x7c});
        vamrnbe_set_mode(e.enc, 2);
        auto upd = e.silent_frame();
        ASSERT_EQ(upd.size(), 6u);
        EXPECT_EQ(upd[5] & 0x1f, 0x14);   // STI 1, mode 2 sent as 0, 1, 0
        EXPECT_TRUE(std::equal(sid.begin() + 1, sid.begin() + 5, upd.begin() + 1));
    }
}
