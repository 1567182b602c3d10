// Comfort-noise decoding: the noise generator, the random code vector, the
// reception state machine and the history kept during speech.
#include <gtest/gtest.h>

#include <cstdlib>

#include "dec/dtx_dec.h"
#include "vamrnb.h"

using namespace vamrnb;

namespace {

constexpr int32_t kSeed = 0x70816958;

dtx_dec_state fresh() {
    dtx_dec_state st;
    dtx_dec_reset(&st);
    return st;
}

}  // namespace

TEST(CnNoise, GeneratorTapsAndBitOrder) {
    int32_t s = kSeed;
    EXPECT_EQ(vamrnbd_pseudonoise(0, &s), 0);
    EXPECT_EQ(s, kSeed);

    // Bit 0 of the seed is 0 and bit 28 is 1: output 0, feedback 1 into bit 30.
    EXPECT_EQ(vamrnbd_pseudonoise(1, &s), 0);
    EXPECT_EQ(s, 0x7840B4AC);

    // An n-bit draw is n one-bit draws, the first one most significant.
    for (int n = 2; n <= 15; ++n) {
        int32_t a = 0x12345677 + n;
        int32_t b = a;
        int expect = 0;
        for (int i = 0; i < n; ++i) expect = (expect << 1) | vamrnbd_pseudonoise(1, &b);
        EXPECT_EQ(vamrnbd_pseudonoise(n, &a), expect) << n;
        EXPECT_EQ(a, b) << n;
    }
}

TEST(CnNoise, CodeVectorHasOnePulsePerTrack) {
    int32_t s = kSeed;
    int positives = 0;
    for (int frame = 0; frame < 200; ++frame) {
        int32_t before = s;
        int16_t cod[40];
        vamrnbd_build_cn_code(&s, cod);
        for (int k = 0; k < 10; ++k) {
            int pulses = 0;
            for (int p = k; p < 40; p += 10) {
                if (cod[p] == 0) continue;
                ASSERT_EQ(std::abs(cod[p]), 4096);
                positives += cod[p] > 0;
                ++pulses;
            }
            EXPECT_EQ(pulses, 1) << "track " << k;
        }
        // Three generator bits per pulse.
        vamrnbd_pseudonoise(30, &before);
        EXPECT_EQ(before, s);
    }
    EXPECT_GT(positives, 800);  // signs are not stuck
    EXPECT_LT(positives, 1200);
}

TEST(CnStateMachine, StartsInNoiseAndLeavesOnGoodSpeech) {
    dtx_dec_state st = fresh();
    EXPECT_EQ(st.dtxGlobalState, DTX);
    EXPECT_EQ(rx_dtx_handler(&st, RX_NO_DATA), DTX);  // lost frame before any speech
    EXPECT_EQ(rx_dtx_handler(&st, RX_SPEECH_GOOD), SPEECH);
    EXPECT_EQ(st.dtxHangoverCount, 7);
    EXPECT_EQ(st.since_last_sid, 0);

    // In speech a lost or bad frame is concealed speech, counted as speech.
    st.dtxGlobalState = SPEECH;
    st.dtxHangoverCount = 3;
    EXPECT_EQ(rx_dtx_handler(&st, RX_NO_DATA), SPEECH);
    EXPECT_EQ(st.dtxHangoverCount, 7);
    EXPECT_EQ(rx_dtx_handler(&st, RX_SPEECH_BAD), SPEECH);
    EXPECT_EQ(rx_dtx_handler(&st, RX_SID_FIRST), DTX);
    EXPECT_EQ(st.sid_frame, 1);
    EXPECT_EQ(st.valid_data, 0);
}

TEST(CnStateMachine, MutingAfterFiftyFramesWithoutUpdate) {
    dtx_dec_state st = fresh();
    st.dtxGlobalState = DTX;
    st.since_last_sid = 49;
    EXPECT_EQ(rx_dtx_handler(&st, RX_NO_DATA), DTX);  // 50th frame
    EXPECT_EQ(rx_dtx_handler(&st, RX_NO_DATA), DTX_MUTE);
    st.dtxGlobalState = DTX_MUTE;
    for (int rx : {RX_NO_DATA, RX_SID_FIRST, RX_SID_BAD, RX_ONSET, RX_SPEECH_BAD})
        EXPECT_EQ(rx_dtx_handler(&st, rx), DTX_MUTE) << rx;

    // A SID update is never muted by the count, even a very late one.
    st.since_last_sid = 200;
    EXPECT_EQ(rx_dtx_handler(&st, RX_SID_UPDATE), DTX);
    EXPECT_EQ(st.valid_data, 1);
    st.since_last_sid = 0;
    EXPECT_EQ(rx_dtx_handler(&st, RX_SPEECH_GOOD), SPEECH);
}

TEST(CnStateMachine, HangoverDetectedAfterLongSpeech) {
    dtx_dec_state st = fresh();
    st.data_updated = 1;
    st.decAnaElapsedCount = 0;
    for (int i = 0; i < 30; ++i) rx_dtx_handler(&st, RX_SPEECH_GOOD);
    st.dtxGlobalState = SPEECH;
    // 31st frame since the last analysis: the encoder must have added its
    // hangover, so the SID_FIRST is answered from the decoder's own history.
    EXPECT_EQ(rx_dtx_handler(&st, RX_SID_FIRST), DTX);
    EXPECT_EQ(st.dtxHangoverAdded, 1);
    EXPECT_EQ(st.decAnaElapsedCount, 0);
    EXPECT_EQ(st.dtxHangoverCount, 0);

    // Shortly after, no hangover: the elapsed count restarts instead.
    st.dtxGlobalState = DTX;
    EXPECT_EQ(rx_dtx_handler(&st, RX_NO_DATA), DTX);
    EXPECT_EQ(st.dtxHangoverAdded, 0);
    EXPECT_EQ(st.decAnaElapsedCount, 0);

    // A bad SID never claims a hangover.
    st.decAnaElapsedCount = 40;
    EXPECT_EQ(rx_dtx_handler(&st, RX_SID_BAD), DTX);
    EXPECT_EQ(st.dtxHangoverAdded, 0);
    EXPECT_EQ(st.sid_frame, 1);
}

TEST(CnStateMachine, FirstSidUpdateRestartsAnalysisCount) {
    dtx_dec_state st = fresh();  // elapsed count starts saturated at 32767
    rx_dtx_handler(&st, RX_SID_UPDATE);
    EXPECT_EQ(st.dtxHangoverAdded, 0);
    EXPECT_EQ(st.decAnaElapsedCount, 1);
    st.decAnaElapsedCount = 32767;
    rx_dtx_handler(&st, RX_NO_DATA);  // saturates instead of wrapping
    EXPECT_EQ(st.dtxHangoverAdded, 1);
}

TEST(CnReflection, RecoversSecondOrderLatticeAndRejectsUnstable) {
    // Step-up of k1 = 0.5, k2 = -0.25 (Q15): a1 = k1 (1 + k2), a2 = k2, in Q12.
    int16_t a[10] = {static_cast<int16_t>(0.5 * 0.75 * 4096), static_cast<int16_t>(-0.25 * 4096)};
    int16_t refl[10];
    a_refl(a, refl);
    EXPECT_NEAR(refl[0], 16384, 8);
    EXPECT_NEAR(refl[1], -8192, 8);
    for (int i = 2; i < 10; ++i) EXPECT_EQ(refl[i], 0);

    a[1] = 4096;  // |k| = 1 at the top order
    a_refl(a, refl);
    for (int16_t r : refl) EXPECT_EQ(r, 0);
}

TEST(CnHistory, ActivityUpdateRingsAndMeasuresLevel) {
    dtx_dec_state st = fresh();
    int16_t lsf[10];
    int16_t synth[160];
    for (int f = 0; f < 9; ++f) {
        for (int i = 0; i < 10; ++i) lsf[i] = static_cast<int16_t>(1000 * f + i);
        for (int16_t &x : synth) x = f == 8 ? 1024 : 0;
        dtx_dec_activity_update(&st, lsf, synth);
    }
    // Nine updates wrap both rings once: slot 1 of eight holds the newest.
    EXPECT_EQ(st.lsf_hist_ptr, 10);
    EXPECT_EQ(st.lsf_hist[10], 8000);
    EXPECT_EQ(st.lsf_hist[0], 7000);
    EXPECT_EQ(st.log_en_hist_ptr, 1);
    // Samples of 2^10: log2 of the power per sample is 20, Q10.
    EXPECT_NEAR(st.log_en_hist[1], 20 * 1024, 2);
    EXPECT_EQ(st.log_en_hist[0], -8521);  // silence
}
