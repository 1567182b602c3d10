// Voice activity detectors: the low-power and hangover rules of option 1 and
// the per-frame entry point's option dispatch.  (Bit-exactness is shown by
// the encoder streams.)
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "common/enc_state.h"
#include "vad/vad.h"

using namespace vamrnb;

namespace {

// A frame buffer with 40 samples of history in front of the 160 new ones, as
// the detector reads them.
struct frame_buf {
    Word16 s[200] = {};
    Word16 *fresh() { return s + 40; }
    // Shifts the last 40 new samples to the front and fills 160 new ones.
    template <class F> void next(F gen) {
        std::memmove(s, s + 160, 40 * sizeof(Word16));
        for (int i = 0; i < 160; ++i) s[40 + i] = gen();
    }
};

struct noise_gen {
    std::mt19937 rng;
    std::uniform_int_distribution<int> d;
    noise_gen(int amp, unsigned seed) : rng(seed), d(-amp, amp) {}
    Word16 operator()() { return static_cast<Word16>(d(rng)); }
};

}  // namespace

// ---- option 1 -------------------------------------------------------------------

// Frames below the power floor decide 0 and drop every pending hangover,
// whatever the band SNRs say.
TEST(Vad1, LowPowerForcesSilence) {
    vad1_state st;
    vad1_init(&st);
    st.hang_count = 6;
    st.burst_count = 3;
    st.complex_hang_count = 200;
    st.complex_hang_timer = 150;
    st.vadreg = 0x7fff;
    st.best_corr_hp = 32000;
    frame_buf buf;
    int k = 0;
    buf.next([&] { return static_cast<Word16>((k++ & 1) ? 6 : -6); });  // power 11520
    EXPECT_EQ(vad1(&st, buf.fresh()), 0);
    EXPECT_EQ(st.hang_count | st.burst_count | st.complex_hang_count | st.complex_hang_timer, 0);
    EXPECT_EQ(st.corr_hp_fast, 13106);
}

// After a burst of intermediate speech decisions, the decision stays 1 for
// the hangover length (4 in quiet, 7 in noisy backgrounds) and then drops.
TEST(Vad1, HangoverFollowsABurst) {
    for (int bg_amp : {20, 1500}) {
        vad1_state st;
        vad1_init(&st);
        frame_buf buf;
        noise_gen bg(bg_amp, 1), loud(12000, 2);
        for (int f = 0; f < 200; ++f) {
            buf.next(bg);
            vad1(&st, buf.fresh());
        }
        ASSERT_EQ(st.speech_vad_decision, 0) << bg_amp;
        for (int f = 0; f < 8; ++f) {
            buf.next(loud);
            EXPECT_EQ(vad1(&st, buf.fresh()), 1);
        }
        // Background again: the first frames may still see the burst through
        // the look-ahead; count the decisions after the last intermediate 1.
        int noise_level = 0;
        int after_last = 0;
        for (int f = 0; f < 30; ++f) {
            int sum = 0;
            for (int i = 0; i < VAD_BANDS; ++i) sum += st.bckr_est[i];
            buf.next(bg);
            const Word16 d = vad1(&st, buf.fresh());
            if (st.vadreg & 0x4000) {
                after_last = 0;
                noise_level = sum >> 3;
                EXPECT_EQ(d, 1);
            } else if (d) {
                ++after_last;
            } else {
                break;
            }
        }
        EXPECT_EQ(after_last, noise_level > 100 ? 7 : 4) << "background " << bg_amp;
    }
}

// More than 100 frames of high high-pass correlation start a complex hangover
// of 250 frames during which every frame is speech.
TEST(Vad1, LongCorrelatedBackgroundForcesSpeech) {
    vad1_state st;
    vad1_init(&st);
    frame_buf buf;
    noise_gen bg(300, 3);
    int frames_to_hang = -1;
    for (int f = 0; f < 400 && frames_to_hang < 0; ++f) {
        st.best_corr_hp = 32000;   // what open-loop pitch reports
        buf.next(bg);
        vad1(&st, buf.fresh());
        if (st.complex_hang_count != 0) frames_to_hang = f;
    }
    ASSERT_GT(frames_to_hang, 100);
    EXPECT_EQ(st.complex_hang_count, 249);   // set to 250, one frame used
    // Correlation gone: the hangover still runs out frame by frame.
    int ones = 0;
    for (int f = 0; f < 300; ++f) {
        st.best_corr_hp = 0;
        buf.next(bg);
        if (vad1(&st, buf.fresh()) == 0) break;
        ++ones;
    }
    EXPECT_GE(ones, 249);
}

// ---- the per-frame entry point ----------------------------------------------------

namespace {

struct encoder_fixture {
    vamrnb_encoder enc{};
    enc_frame fr{};
    explicit encoder_fixture(int vad_option) {
        enc.config.enc.dtx = 1;
        enc.config.enc.vad_option = vad_option;
        dtx_enc_init(&enc.dtx);
    }
    void frame(Word16 amp, unsigned seed) {
        noise_gen g(amp, seed);
        std::memmove(enc.old_speech, enc.old_speech + 160, 160 * sizeof(Word16));
        for (int i = 160; i < 320; ++i) enc.old_speech[i] = g();
        fr = enc_frame{};
        fr.mode = fr.used_mode = 7;
        vamrnbe_vad(&enc, &fr);
    }
};

}  // namespace

// Option 2 (configuration word 1) processes both halves of every frame; any
// other value runs option 1, on whatever state creation left (all zero for
// values other than 0).
TEST(VadEntry, OptionDispatch) {
    encoder_fixture two(1);
    for (int f = 0; f < 3; ++f) two.frame(0, 0);
    EXPECT_EQ(two.enc.vad.v2.Lframe_cnt, 6);

    encoder_fixture other(2);
    vad1_state ref{};
    frame_buf shadow;
    for (int f = 0; f < 5; ++f) {
        other.frame(2000, 10 + f);
        std::memcpy(shadow.s, other.enc.old_speech + 120, 200 * sizeof(Word16));
        EXPECT_EQ(other.fr.vad_flag, vad1(&ref, shadow.fresh()));
    }
    EXPECT_EQ(std::memcmp(&other.enc.vad.v1, &ref, sizeof ref), 0);
}
