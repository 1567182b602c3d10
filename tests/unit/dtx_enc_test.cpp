// DTX on the encoder side: the hangover decision and SID scheduling that fix
// each frame's type, the LSP/energy history, and the SID energy and gain seed.
#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "enc/enc_state.h"
#include "format/frame_format.h"
#include "lpc/tables.h"
#include "vad/dtx_enc.h"
#include "vad/sid_sync.h"
#include "vad/vad.h"

using namespace vamrnb;

namespace {

// Hangover decision and frame-type choice of consecutive frames, as the
// encoder runs them.
struct scheduler {
    dtx_enc_state dtx;
    sid_sync_state sync;
    int32_t prev = 0;
    int32_t mode = 5;
    scheduler() {
        dtx_enc_init(&dtx);
        sid_sync_init(&sync);
    }
    // One frame: returns its letter, S speech, F SID_FIRST, U SID_UPDATE,
    // N no data, lower-case when the SID parameters are not recomputed.
    char frame(int vad) {
        int32_t used = mode;
        const Word16 compute = dtx_hangover(&dtx, static_cast<Word16>(vad), &used);
        const int32_t tx = tx_type_select(&sync, &prev, used);
        EXPECT_EQ(sync.tx_type, tx);
        EXPECT_EQ(prev, tx);
        EXPECT_EQ(tx == 0, used == mode);
        char c = "SFUN"[tx];
        if (used == 8 && compute == 0) c = static_cast<char>(c - 'A' + 'a');
        if (used != 8) {
            EXPECT_EQ(compute, 0);
        }
        return c;
    }
    std::string run(int vad, int n) {
        std::string s;
        for (int i = 0; i < n; ++i) s += frame(vad);
        return s;
    }
};

}  // namespace

// ---- hangover and scheduling -----------------------------------------------

// A new instance has never analysed noise: silence gets the full seven-frame
// hangover before the first SID.
TEST(DtxSchedule, FreshInstanceWaitsOutTheHangover) {
    scheduler s;
    EXPECT_EQ(s.run(0, 12), "SSSSSSSFNNUN");
    EXPECT_EQ(s.dtx.elapsed_count, 0);   // restarted at every analysed frame
}

// After a talk spurt: seven hangover frames, SID_FIRST, two no-data frames,
// SID_UPDATE, then a SID_UPDATE on every eighth frame; the SID parameters
// are recomputed in every one of those silent frames.
TEST(DtxSchedule, CadenceAfterSpeech) {
    scheduler s;
    s.run(1, 50);
    EXPECT_EQ(s.run(0, 30), "SSSSSSS" "F" "NN" "U" "NNNNNNN" "U" "NNNNNNN" "U" "NNN");
}

// A short spurt soon after a SID analysis returns to DTX at once, repeating
// the last SID parameters until the hangover has run out.
TEST(DtxSchedule, ShortSpurtSkipsTheHangover) {
    scheduler s;
    s.run(1, 50);
    s.run(0, 20);
    EXPECT_EQ(s.run(1, 3), "SSS");
    EXPECT_EQ(s.run(0, 10), "fnnunnnNNN");
}

// The extra hangover returns once the last analysis is 30 frames back:
// elapsed + remaining hangover of 29 still skips it, 30 does not.
TEST(DtxSchedule, ExtraHangoverThreshold) {
    for (int elapsed : {22, 23}) {
        scheduler s;
        s.frame(1);
        s.dtx.elapsed_count = static_cast<Word16>(elapsed);
        EXPECT_EQ(s.frame(0), elapsed == 22 ? 'f' : 'S') << elapsed;
    }
}

TEST(DtxSchedule, ElapsedCountSaturates) {
    scheduler s;
    s.run(1, 3);
    EXPECT_EQ(s.dtx.elapsed_count, 32767);
}

// Owed extra updates go out as SID_UPDATE while the counter is above 2.
TEST(DtxSchedule, HandoverDebtSendsExtraUpdates) {
    scheduler s;
    s.run(1, 5);
    EXPECT_EQ(s.run(0, 11), "SSSSSSSFNNU");
    s.sync.sid_handover_debt = 2;
    EXPECT_EQ(s.run(0, 9), "UUNNNNNUN");
    EXPECT_EQ(s.sync.sid_handover_debt, 0);
}

TEST(DtxSchedule, InitialSyncState) {
    sid_sync_state st{};
    sid_sync_init(&st);
    EXPECT_EQ(st.sid_update_rate, 8);
    EXPECT_EQ(st.sid_update_counter, 3);
    EXPECT_EQ(st.sid_handover_debt, 0);
    EXPECT_EQ(st.tx_type, 0);
}

// ---- history --------------------------------------------------------------------

TEST(DtxHistory, InitialState) {
    dtx_enc_state st;
    dtx_enc_init(&st);
    for (int s = 0; s < DTX_HIST_SIZE; ++s) {
        for (int i = 0; i < 10; ++i) EXPECT_EQ(st.lsp_hist[10 * s + i], vamrnb_tbl_lsp_init_data[i]);
        EXPECT_EQ(st.log_en_hist[s], 0);
    }
    EXPECT_EQ(st.dtx_hangover_count, 7);
    EXPECT_EQ(st.elapsed_count, 32767);
    EXPECT_EQ(st.hist_ptr, 0);
}

// The first frame lands in slot 1; the pointer wraps after slot 7.
TEST(DtxHistory, SlotsAdvanceAndWrap) {
    dtx_enc_state st;
    dtx_enc_init(&st);
    Word16 speech[160] = {};
    for (int f = 1; f <= 9; ++f) {
        Word16 lsp[10];
        for (int i = 0; i < 10; ++i) lsp[i] = static_cast<Word16>(100 * f + i);
        dtx_buffer(lsp, speech, &st);
        const int slot = f % 8;
        EXPECT_EQ(st.hist_ptr, slot);
        EXPECT_EQ(st.lsp_hist[10 * slot], 100 * f);
        EXPECT_EQ(st.lsp_hist[10 * slot + 9], 100 * f + 9);
    }
}

// Frame log energy: log2 of the doubled sum of squares in Q10, less log2(160),
// halved.  Silence gives the value for log2(0) = 0.
TEST(DtxHistory, FrameLogEnergy) {
    Word16 zero[160] = {};
    EXPECT_EQ(dtx_frame_log_en(zero), (0 - 8521) >> 1);

    for (int amp : {1, 100, 3000, 32767}) {
        Word16 x[160];
        for (auto &v : x) v = static_cast<Word16>(amp);
        const double e = std::min(2.0 * 160 * amp * amp, 2147483647.0);
        const double expect = (std::log2(e) * 1024 - 8521) / 2;
        EXPECT_NEAR(dtx_frame_log_en(x), expect, 2) << amp;
    }
}

// ---- SID energy and predictor seed ----------------------------------------------

TEST(DtxSid, EnergyIndexAndSeed) {
    dtx_enc_state st;
    dtx_enc_init(&st);
    auto fill = [&](Word16 v) {
        for (auto &h : st.log_en_hist) h = v;
    };

    fill(1000);   // mean 1000: (1000 + 2688) >> 8
    EXPECT_EQ(dtx_log_en_index(&st), 14);

    fill(-4261);  // digital silence
    EXPECT_EQ(dtx_log_en_index(&st), 0);
    EXPECT_EQ(dtx_gain_seed(0), -11560);

    fill(14000);  // very loud: index saturates, seed clamps at 0
    EXPECT_EQ(dtx_log_en_index(&st), 63);
    EXPECT_EQ(dtx_gain_seed(63), 0);

    EXPECT_EQ(dtx_gain_seed(20), 20 * 256 - 11560);
    EXPECT_EQ(dtx_gain_seed(45), 11520 - 11560);
    EXPECT_EQ(dtx_gain_seed(46), 0);          // 46 * 256 - 11560 > 0

    // Each slot enters as a quarter (truncated) before the halving.
    st.log_en_hist[0] = 3;                    // 3 >> 2 = 0
    for (int s = 1; s < 8; ++s) st.log_en_hist[s] = 0;
    EXPECT_EQ(dtx_log_en_index(&st), 2688 >> 8);
}

// ---- the SID encoder ------------------------------------------------------------

namespace {

struct sid_fixture {
    vamrnb_encoder enc{};
    enc_frame fr{};
    sid_fixture() {
        dtx_enc_init(&enc.dtx);
        for (auto &v : enc.old_exc) v = 1;
        for (auto &v : enc.sub.mem_w0) v = 7;
        for (auto &v : enc.sub.mem_err) v = 7;
        for (auto &v : enc.sub.ai_zero) v = 7;
        for (auto &v : enc.sub.hvec) v = 7;
        for (auto &v : enc.past_rq) v = 9;
        for (int i = 0; i < 10; ++i) {
            enc.lsp_old[i] = enc.lsp_old_q[i] = 1;
            fr.lsp_new[i] = static_cast<Word16>(30000 - 3000 * i);
        }
        for (int i = 0; i < 4; ++i) {
            enc.sub.pred.past_qua_en[i] = enc.sub.pred_unq.past_qua_en[i] = 123;
            enc.sub.pred.past_qua_en_MR122[i] = enc.sub.pred_unq.past_qua_en_MR122[i] = 45;
        }
        enc.sub.sharp = 5000;
        enc.sub.T0_prev_subframe = 60;
        fr.mode = 3;
        fr.used_mode = 8;
    }
    // The five SID parameters read back from the frame's bits.
    std::vector<int> params() const {
        const int widths[5] = {3, 8, 9, 9, 6};
        std::vector<int> out;
        int pos = 0;
        for (int w : widths) {
            int v = 0;
            for (int b = 0; b < w; ++b) v = 2 * v + fr.prm[pos++];
            out.push_back(v);
        }
        for (int i = pos; i < 244; ++i) EXPECT_EQ(fr.prm[i], 0) << i;
        return out;
    }
};

}  // namespace

// Inside a shortened hangover the stored SID parameters are sent again, but
// the speech coder is still reset to restart from this frame's spectrum.
TEST(DtxSid, RepeatedParametersStillResetTheCoder) {
    sid_fixture f;
    f.enc.dtx.init_lsf_vq_index = 5;
    f.enc.dtx.lsp_index[0] = 200;
    f.enc.dtx.lsp_index[1] = 301;
    f.enc.dtx.lsp_index[2] = 402;
    f.enc.dtx.log_en_index = 37;
    f.fr.compute_sid = 0;
    vamrnbe_dtx(&f.enc, &f.fr);

    EXPECT_EQ(f.params(), (std::vector<int>{5, 200, 301, 402, 37}));
    EXPECT_EQ(f.enc.sub.pred.past_qua_en[0], 123);   // no new seed

    for (int i = 0; i < 314; ++i) EXPECT_EQ(f.enc.old_exc[i], i < 154 ? 0 : 1) << i;
    for (int i = 0; i < 10; ++i) {
        EXPECT_EQ(f.enc.sub.mem_w0[i], 0);
        EXPECT_EQ(f.enc.sub.mem_err[i], 0);
        EXPECT_EQ(f.enc.lsp_old[i], f.fr.lsp_new[i]);
        EXPECT_EQ(f.enc.lsp_old_q[i], f.fr.lsp_new[i]);
        EXPECT_EQ(f.enc.past_rq[i], 0);
    }
    for (int i = 0; i < 51; ++i) EXPECT_EQ(f.enc.sub.ai_zero[i], i < 11 ? 7 : 0) << i;
    for (int i = 0; i < 80; ++i) EXPECT_EQ(f.enc.sub.hvec[i], i < 40 ? 0 : 7) << i;
    EXPECT_EQ(f.enc.sub.sharp, 0);
    EXPECT_EQ(f.enc.sub.T0_prev_subframe, 0);
    EXPECT_EQ(f.fr.mode, 3);
    EXPECT_EQ(f.fr.used_mode, 8);
}

// A computed SID seeds both histories of the main code-gain predictor from
// the energy index and leaves the MR475 helper predictor alone.
TEST(DtxSid, ComputedParametersSeedThePredictor) {
    sid_fixture f;
    for (auto &h : f.enc.dtx.log_en_hist) h = 1000;   // index 14
    f.fr.compute_sid = 1;
    vamrnbe_dtx(&f.enc, &f.fr);

    const std::vector<int> p = f.params();
    EXPECT_EQ(p[4], 14);
    EXPECT_EQ(p[0], f.enc.dtx.init_lsf_vq_index);
    EXPECT_EQ(p[1], f.enc.dtx.lsp_index[0]);
    EXPECT_EQ(p[3], f.enc.dtx.lsp_index[2]);
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(f.enc.sub.pred.past_qua_en[i], 14 * 256 - 11560);
        EXPECT_EQ(f.enc.sub.pred.past_qua_en_MR122[i], (5443 * (14 * 256 - 11560)) >> 15);
        EXPECT_EQ(f.enc.sub.pred_unq.past_qua_en[i], 123);
        EXPECT_EQ(f.enc.sub.pred_unq.past_qua_en_MR122[i], 45);
    }
    // The quantiser's memory is cleared afterwards like every other memory.
    for (int i = 0; i < 10; ++i) EXPECT_EQ(f.enc.past_rq[i], 0);
}

// A stored energy index of 0 is refreshed even inside a shortened hangover.
TEST(DtxSid, ZeroEnergyIndexIsRefreshed) {
    sid_fixture f;
    for (auto &h : f.enc.dtx.log_en_hist) h = 1000;   // index 14
    f.enc.dtx.log_en_index = 0;
    f.fr.compute_sid = 0;
    vamrnbe_dtx(&f.enc, &f.fr);
    EXPECT_EQ(f.params()[4], 14);
    EXPECT_EQ(f.enc.sub.pred.past_qua_en[0], 14 * 256 - 11560);
}

