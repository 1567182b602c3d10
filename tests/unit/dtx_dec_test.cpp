// Comfort-noise decoding: muting after lost updates, the
// reflection-coefficient check and the comfort-noise level.  The ordinary
// transitions of the reception state machine run in the DTX streams.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>

#include "dec/dtx_dec.h"
#include "lpc/tables.h"
#include "vamrnb.h"

using namespace vamrnb;

namespace {

dtx_dec_state fresh() {
    dtx_dec_state st;
    dtx_dec_reset(&st);
    return st;
}

}  // namespace

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

namespace {

// Decoder memories that comfort noise touches, at their reset values.
struct CnMemories {
    int16_t lsp_old[10], mem_syn[10] = {}, past_r_q[10] = {}, past_lsf_q[10];
    int16_t past_qua_en[4] = {-14336, -14336, -14336, -14336};
    int16_t past_qua_en_MR122[4] = {-2381, -2381, -2381, -2381};
    int16_t hang_var = 0, hang_count = 5;
    int16_t synth[160], A_t[44];

    CnMemories() {
        std::copy_n(vamrnb_tbl_lsp_init_data, 10, lsp_old);
        std::copy_n(vamrnb_tbl_mean_lsf, 10, past_lsf_q);
    }
    cn_links links() {
        return {lsp_old, mem_syn, past_r_q, past_lsf_q,
                past_qua_en, past_qua_en_MR122, &hang_var, &hang_count};
    }
    double power() const {
        double p = 0;
        for (int16_t x : synth) p += double(x) * x;
        return p / 160;
    }
};

// One comfort-noise frame through the state machine and the generator.
dtx_global_state cn_frame(dtx_dec_state &st, CnMemories &m, int rx, const int16_t *prm) {
    const auto prev = static_cast<dtx_global_state>(st.dtxGlobalState);
    const dtx_global_state next = rx_dtx_handler(&st, rx);
    if (next != SPEECH) dtx_dec(&st, m.links(), prev, next, MR122, prm, m.synth, m.A_t);
    st.dtxGlobalState = next;
    return next;
}

}  // namespace

TEST(CnSynthesis, LevelFollowsEnergyIndexAndMutingFades) {
    double power[3];
    const int16_t index[3] = {0, 20, 50};
    for (int k = 0; k < 3; ++k) {
        const int16_t sid[5] = {0, 50, 60, 70, index[k]};
        dtx_dec_state st = fresh();
        CnMemories m;
        cn_frame(st, m, RX_SID_UPDATE, sid);
        if (k == 1) {
            // The SID level also seeds the code-gain predictors.
            EXPECT_EQ(st.log_en, 20 * 512 - 5120);
            EXPECT_EQ(m.past_qua_en[3], 2560 - 9000);
            EXPECT_EQ(m.past_qua_en_MR122[3], (5443 * (2560 - 9000)) >> 15);
            EXPECT_EQ(m.past_r_q[0], 0);  // cleared for the next speech frame
            EXPECT_EQ(m.hang_var, 20);
        }
        for (int f = 0; f < 4; ++f) cn_frame(st, m, RX_NO_DATA, sid);
        power[k] = m.power();
    }
    EXPECT_LT(power[0], 1.0);  // index 0 is silence
    EXPECT_GT(power[1], 1.0);
    // 30 index steps of 1.5 dB each: a quarter of log2 in amplitude.
    EXPECT_NEAR(power[2] / power[1], 32768.0, 0.1 * 32768.0);

    // Without updates the noise is muted after 50 frames and fades 1/8 of
    // log2 per frame.
    const int16_t sid[5] = {0, 50, 60, 70, 50};
    dtx_dec_state st = fresh();
    CnMemories m;
    cn_frame(st, m, RX_SID_UPDATE, sid);
    int f = 0;
    while (cn_frame(st, m, RX_NO_DATA, sid) == DTX) ++f;
    EXPECT_EQ(f, 50);
    const int16_t before = st.old_log_en;
    EXPECT_EQ(st.log_en, before - 256);
    EXPECT_EQ(cn_frame(st, m, RX_NO_DATA, sid), DTX_MUTE);
    EXPECT_EQ(st.log_en, before - 512);
    EXPECT_EQ(cn_frame(st, m, RX_SID_UPDATE, sid), DTX);  // a fresh update lifts it
    EXPECT_EQ(st.log_en, 50 * 512 - 5120);
}
