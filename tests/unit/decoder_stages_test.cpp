// Decoder stages in isolation: pitch-lag decoding and its concealment, and
// the gain concealment histories.
#include <gtest/gtest.h>

#include <cstring>
#include <memory>

#include "dec/dec_gain.h"
#include "dec/dec_state.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

struct Decoder {
    std::unique_ptr<dec_state> st = std::make_unique<dec_state>();
    std::unique_ptr<dec_work> w = std::make_unique<dec_work>();
    Decoder() {
        std::memset(st.get(), 0, sizeof *st);
        std::memset(w.get(), 0, sizeof *w);
        st->work = w.get();
        reset_dec(st.get(), 0);
    }
    // Runs the adaptive codebook on one lag index; returns (T0, frac).
    std::pair<int, int> lag(int32_t mode, int32_t i_subfr, int16_t index) {
        const int16_t *cursor = &index;
        vamrnbd_acb(st.get(), w.get(), mode, i_subfr, &cursor);
        EXPECT_EQ(cursor, &index + 1);
        return {w->T0, w->T0_frac};
    }
};

TEST(DecoderLag, Mr122RelativeCodeAndInvalidIndices) {
    Decoder d;
    d.st->old_T0 = 100;  // window starts at 95
    EXPECT_EQ(d.lag(MR122, 40, 0), std::make_pair(94, 3));   // 95 - 3/6
    EXPECT_EQ(d.lag(MR122, 40, 3), std::make_pair(95, 0));
    EXPECT_EQ(d.lag(MR122, 40, 60), std::make_pair(104, 3));
    const int16_t keep = d.st->T0_lagBuff;
    EXPECT_EQ(d.lag(MR122, 40, 59), std::make_pair(104, 2));
    EXPECT_EQ(d.st->T0_lagBuff, keep);  // good lags leave the buffer alone
    // 61..63 are not valid relative codes: previous lag, decoded one buffered
    EXPECT_EQ(d.lag(MR122, 120, 61), std::make_pair(100, 0));
    EXPECT_EQ(d.st->T0_lagBuff, 105);
    // at the top the window is pinned to 134..143
    d.st->old_T0 = 143;
    EXPECT_EQ(d.lag(MR122, 40, 3), std::make_pair(134, 0));
    d.st->old_T0 = 18;  // and at the bottom to 18..27
    EXPECT_EQ(d.lag(MR122, 40, 3), std::make_pair(18, 0));
}

TEST(DecoderLag, BadFramesGrowOldLagUpToMaximum) {
    Decoder d;
    d.w->bfi = 1;
    d.st->old_T0 = 141;
    for (int expect : {142, 143, 143, 143}) {
        auto [T0, frac] = d.lag(MR475, 40, 5);
        EXPECT_EQ(T0, expect);
        EXPECT_EQ(frac, 0);
        EXPECT_EQ(d.st->old_T0, expect);
        d.st->old_T0 = static_cast<Word16>(T0);  // as the synthesis step does
    }
    // the received lag is still buffered, good frame or bad
    EXPECT_NE(d.st->T0_lagBuff, 143);
}

TEST(DecoderLag, BadFrameInBackgroundNoiseUsesReceivedLagInLowModes) {
    Decoder d;
    d.w->bfi = 1;
    d.st->inBackgroundNoise = 1;
    d.st->voicedHangover = 5;
    d.st->old_T0 = 60;
    EXPECT_EQ(d.lag(MR59, 0, 100).first, 53);  // decoded lag of index 100
    d.st->old_T0 = 60;
    EXPECT_EQ(d.lag(MR67, 0, 100).first, 61);  // MR67 grows the old lag
    d.st->old_T0 = 60;
    d.st->voicedHangover = 4;
    EXPECT_EQ(d.lag(MR475, 0, 100).first, 61);
}

TEST(DecoderGain, PitchHistoryIsClampedAndLimitedAfterBadFrame) {
    Decoder d;
    int16_t g = 19661;
    vamrnbd_ec_gain_pitch_update(d.st.get(), 0, 0, &g);
    EXPECT_EQ(g, 19661);  // the gain itself is not clamped
    EXPECT_EQ(d.st->prev_gp, 19661);
    EXPECT_EQ(d.st->past_gain_pit, 16384);
    EXPECT_EQ(d.st->pbuf[4], 16384);
    EXPECT_EQ(d.st->pbuf[3], 1640);

    // a bad frame does not change the last good gain
    g = 100;
    vamrnbd_ec_gain_pitch_update(d.st.get(), 1, 0, &g);
    EXPECT_EQ(d.st->prev_gp, 19661);
    EXPECT_EQ(d.st->past_gain_pit, 100);
    // the first good frame after a bad one is held to the last good gain
    d.st->prev_gp = 8000;
    g = 9000;
    vamrnbd_ec_gain_pitch_update(d.st.get(), 0, 1, &g);
    EXPECT_EQ(g, 8000);
    g = 7000;
    vamrnbd_ec_gain_pitch_update(d.st.get(), 0, 1, &g);
    EXPECT_EQ(g, 7000);
}

}  // namespace
