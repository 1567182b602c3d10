// Encoder subframe stages: pitch-gain quantiser and limits, and the gain
// quantisers' pitch limit.

#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <random>
#include <vector>

#include "enc/subframe.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

std::vector<Word16> noise(std::mt19937 &rng, int n, int amp) {
    std::uniform_int_distribution<int> d(-amp, amp);
    std::vector<Word16> v(n);
    for (auto &x : v) x = static_cast<Word16>(d(rng));
    return v;
}

const int16_t *pitch_tbl = vamrnb_tbl_qua_gain_pitch;

}  // namespace

// ---- scalar pitch-gain quantiser -------------------------------------------

TEST(PitchGainQuantiser, NeverPicksAnEntryAboveTheLimit) {
    for (Word16 limit : {Word16{0}, Word16{3276}, Word16{15565}, Word16{16384}, MAX_16}) {
        for (int g = 0; g <= 19661; g += 97) {
            for (int32_t mode : {MR122, MR795, MR74}) {
                Word16 gain = static_cast<Word16>(g);
                Word16 cand[3], cind[3];
                const Word16 idx = vamrnbe_qgain_pitch(mode, limit, &gain, cand, cind);
                ASSERT_GE(idx, 0);
                ASSERT_LT(idx, 16);
                if (idx != 0) {
                    ASSERT_LE(pitch_tbl[idx], limit) << "gain " << g;
                }
                if (mode != MR122) {
                    ASSERT_EQ(gain, pitch_tbl[idx]);
                }
            }
        }
    }
    // Index 0 is allowed whatever the limit.
    Word16 gain = 19661;
    EXPECT_EQ(vamrnbe_qgain_pitch(MR74, 0, &gain, nullptr, nullptr), 0);
    EXPECT_EQ(gain, 0);
}

TEST(PitchGainQuantiser, NearestEntryAndTieKeepsLowerIndex) {
    Word16 gain = 9011;  // exactly between 8192 (index 3) and 9830 (index 4)
    EXPECT_EQ(vamrnbe_qgain_pitch(MR74, MAX_16, &gain, nullptr, nullptr), 3);
    gain = 9012;
    EXPECT_EQ(vamrnbe_qgain_pitch(MR74, MAX_16, &gain, nullptr, nullptr), 4);
    // MR122 returns the gain with its two lowest bits cleared.
    gain = 3277;
    EXPECT_EQ(vamrnbe_qgain_pitch(MR122, MAX_16, &gain, nullptr, nullptr), 1);
    EXPECT_EQ(gain, 3276);
}

// ---- pitch-gain limits -----------------------------------------------------

TEST(PitchGainLimits, ClippingNeedsASumStrictlyAbove15565) {
    Word16 gp[GP_HIST];
    for (auto &g : gp) g = 2000;                 // history sums to 14000
    EXPECT_FALSE(check_gp_clipping(gp, 12520));  // 14000 + 1565 = 15565
    EXPECT_TRUE(check_gp_clipping(gp, 12528));   // 14000 + 1566

    // A gain of exactly 15565 is not even tested against the history.
    for (auto &g : gp) g = 4000;
    Word16 gain = 15565, limit;
    limit_pitch_gain(MR74, 1, gp, &gain, &limit);
    EXPECT_EQ(gain, 15565);
    EXPECT_EQ(limit, MAX_16);

    gain = 15566;
    limit_pitch_gain(MR74, 1, gp, &gain, &limit);
    EXPECT_EQ(gain, 15565);
    EXPECT_EQ(limit, 15565);

    // Without resonance nothing is limited.
    gain = 19000;
    limit_pitch_gain(MR122, 0, gp, &gain, &limit);
    EXPECT_EQ(gain, 19000);
    EXPECT_EQ(limit, MAX_16);
}

TEST(PitchGainLimits, LowRateModesCapAt13926AndClipOnlyTheQuantiser) {
    Word16 quiet[GP_HIST] = {}, loud[GP_HIST];
    for (auto &g : loud) g = 4000;
    for (int32_t mode : {MR475, MR515}) {
        Word16 gain = 13927, limit;
        limit_pitch_gain(mode, 0, quiet, &gain, &limit);
        EXPECT_EQ(gain, 13926);
        EXPECT_EQ(limit, MAX_16);

        gain = 19000;
        limit_pitch_gain(mode, 1, loud, &gain, &limit);
        EXPECT_EQ(gain, 13926);
        EXPECT_EQ(limit, 15565);
    }
    Word16 gain = 13927, limit;
    limit_pitch_gain(MR59, 0, quiet, &gain, &limit);
    EXPECT_EQ(gain, 13927);
}

// ---- gain quantisers -----------------------------------------------------------

namespace {

// A subframe whose target is 1.5 times the filtered adaptive vector, so that
// an unlimited quantiser would pick a pitch gain above 1.
void fill_high_gain_subframe(std::mt19937 &rng, subfr_frame &sf) {
    const auto y1 = noise(rng, L_SUBFR, 2000);
    const auto r = noise(rng, L_SUBFR, 300);
    for (int i = 0; i < L_SUBFR; ++i) {
        sf.y1[i] = y1[i];
        sf.xn[i] = static_cast<Word16>(y1[i] + y1[i] / 2);
        sf.code[i] = 0;
        sf.y2[i] = r[i];
        sf.xn2[i] = static_cast<Word16>(sf.xn[i] - y1[i]);
        sf.res[i] = r[i];
    }
    sf.code[3] = 8191;
    sf.code[21] = -8192;
    // Normalised <y1,y1> and <xn,y1> with their exponents.
    Word32 yy = 1, xy = 1;
    for (int i = 0; i < L_SUBFR; ++i) {
        yy = l_mac(yy, sf.y1[i], sf.y1[i]);
        xy = l_mac(xy, sf.xn[i], sf.y1[i]);
    }
    sf.g_coeff[0] = round16(l_shl(yy, norm_l(yy)));
    sf.g_coeff[1] = static_cast<Word16>(15 - norm_l(yy));
    sf.g_coeff[2] = round16(l_shl(xy, norm_l(xy)));
    sf.g_coeff[3] = static_cast<Word16>(15 - norm_l(xy));
    sf.gain_pit = 19661;
    sf.T0 = 60;
}

void reset_predictor(subfr_state &ss) {
    for (int i = 0; i < 4; ++i) {
        ss.pred.past_qua_en[i] = -14336;
        ss.pred.past_qua_en_MR122[i] = -2381;
    }
}

}  // namespace

TEST(GainQuantisers, PitchGainNeverAboveTheLimit) {
    auto st = std::make_unique<enc_state>();
    auto fr = std::make_unique<enc_frame>();
    std::mt19937 rng(795);
    for (int32_t mode : {MR475, MR515, MR59, MR67, MR74, MR795, MR102}) {
        for (Word16 limit : {Word16{15565}, Word16{9830}}) {
            int at_limit = 0;
            for (int trial = 0; trial < 20; ++trial) {
                *st = enc_state{};
                *fr = enc_frame{};
                reset_predictor(st->sub);
                fr->used_mode = mode;
                fill_high_gain_subframe(rng, fr->sub);
                fr->sub.gp_limit = limit;
                vamrnbe_filt_update(st.get(), fr.get(), 0);
                if (mode == MR475) {
                    // The pair is quantised in the odd subframe.
                    fill_high_gain_subframe(rng, fr->sub);
                    fr->sub.gp_limit = limit;
                    vamrnbe_filt_update(st.get(), fr.get(), 40);
                }
                const Word16 idx = fr->prm[0];
                Word16 chosen[2];
                int n = 1;
                switch (mode) {
                case MR475:
                    chosen[0] = vamrnb_tb1_gain_mr475[4 * idx];
                    chosen[1] = vamrnb_tb1_gain_mr475[4 * idx + 2];
                    n = 2;
                    break;
                case MR795: chosen[0] = pitch_tbl[idx]; break;
                case MR515:
                case MR59: chosen[0] = vamrnb_tbl_gain_lowrates[4 * idx]; break;
                default: chosen[0] = vamrnb_tbl_gain_highrates[4 * idx]; break;
                }
                for (int k = 0; k < n; ++k) {
                    ASSERT_LE(chosen[k], limit) << "mode " << mode << " trial " << trial;
                    at_limit += chosen[k] > limit - 2000;
                }
            }
            EXPECT_GT(at_limit, 0) << "mode " << mode << ": gains never reached the limit";
        }
    }
}
