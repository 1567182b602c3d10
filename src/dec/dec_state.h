// Decoder instance record (state that lives from frame to frame) and working
// record (the values the decoding stages hand each other within one frame).
#pragma once

#include <cstdint>

#include "vamrnb.h"
#include "basic_op/basic_op.h"
#include "dec/cn_state.h"
#include "dec/post_state.h"
#include "lpc/lpc.h"

#include "format/frame_format.h"

namespace vamrnb {

inline constexpr int DEC_OLD_EXC = 314;     // 143 + 11 history + 160
inline constexpr int DEC_EXC_OFFSET = 154;  // 143 + 11: start of the subframe

struct dec_work;

struct dec_state {
    // ---- output-side stages (reset by reset_dec) ----
    post_filter_state post;
    bgn_scd_state bgn;

    Word32 rx_type_last;        // reception type of the last accepted frame
    vcmn_bsr reader;            // bit-stream reader, set on the input each call
    dec_state *self;            // own address, set when creation succeeded
    codec_config config;        // copy of the caller's configuration
    dec_work *work;             // working record

    dtx_dec_state cn;           // comfort-noise state

    Word32 prev_mode;           // mode of the last frame that carried one
    Word32 prev_homing;         // 1 when the previous frame was a homing frame

    Word16 old_exc[DEC_OLD_EXC];// past excitation; exc = old_exc + 154

    // ---- bad-frame handling ----
    Word16 prev_bf;             // bad-frame indicator of the previous frame
    Word16 prev_pdf;            // degraded-frame indicator of the previous frame
    Word16 conceal_state;       // 0..6, indexes the pdown / cdown attenuation
    Word16 excEnergyHist[9];    // excitation energies for excitation control
    Word16 T0_lagBuff;          // last lag decoded from the bit stream
    Word16 inBackgroundNoise;   // background-noise flag
    Word16 voicedHangover;      // voiced hangover of the noise detector
    Word16 ltpGainHistory[9];   // pitch gains of good subframes
    Word16 nodataSeed;          // generator of substituted lost-frame parameters
    Word16 sharp;               // pitch sharpening, Q14
    Word16 old_T0;              // integer pitch lag of the previous subframe
    Word16 *exc;                // old_exc + DEC_EXC_OFFSET

    // pitch-gain concealment
    Word16 pbuf[5];             // last five pitch gains (each <= 16384)
    Word16 past_gain_pit;
    Word16 prev_gp;             // last good pitch gain
    // code-gain concealment
    Word16 gbuf[5];             // last five code gains
    Word16 past_gain_code;
    Word16 prev_gc;             // last good code gain
    // code-gain smoothing in background noise
    Word16 cbGainHistory[7];
    Word16 hangVar;
    Word16 hangCount;
    // anti-sparseness (phase dispersion)
    Word16 gainMem[5];
    Word16 prevState;
    Word16 prevCbGain;
    Word16 lockFull;
    Word16 onset;

    // ---- LSF and gain prediction ----
    Word16 lsp_old[10];         // LSPs of the previous frame's last subframe
    Word16 past_r_q[10];        // LSF prediction residual memory
    Word16 past_lsf_q[10];      // past quantised LSFs
    Word16 lsp_meanSave[10];    // averaged LSFs
    Word16 past_qua_en[4];      // code-gain predictor history
    Word16 past_qua_en_MR122[4];

    Word16 mem_syn[10];         // synthesis filter memory (end of last frame)
};

struct dec_work {
    rx_frame_class rx;          // quality, frame_mode, rx_type of this frame
    const Word16 *serial;       // this frame's serial bits (driver's stack)
    Word32 dtx_state_prev;      // cn.dtxGlobalState before this frame's update

    Word16 bfi;                 // bad frame (bad speech, lost, onset)
    Word16 pdfi;                // potentially degraded frame
    Word16 subfr_nr;            // subframe counter of the frame, 0..3
    Word16 even_subfr;          // 1 on subframes 0 and 2, flipped after each
    Word32 syn_overflow;        // set by the first synthesis of a subframe

    Word16 prm[57];             // codec parameters of the frame
    Word16 Az[44];              // LPC sets of the four subframes
    const Word16 *Az_cur;       // set of the current subframe
    Word16 cn_lsp_old[10];      // previous comfort-noise LSP vector
    Word16 prev_lsf[10];        // LSFs of the previous frame (gain smoothing)

    // subframe values passed between the stages
    Word16 T0, T0_frac;
    Word16 index_mr475;         // joint gain index of an MR475 subframe pair
    Word16 code[40];            // fixed-codebook vector
    Word16 gain_pit, gain_code;
    Word16 gain_code_mix;
    Word16 pit_sharp;
    Word16 pitch_fac, tmp_shift;
    Word16 excp[40];            // pitch-sharpened excitation for synthesis
    Word16 exc_enhanced[40];    // excitation after anti-sparseness / control

    // synthesis: [0..9] filter memory, [10..169] the frame's 160 samples
    Word16 synth_buf[10 + 160];
    Word16 out[160];            // post-filtered output of the frame
};

inline Word16 *dec_synth(dec_work *w) { return w->synth_buf + 10; }

// Returns the decoder to its initial state.  With mode MRDTX only the speech
// decoding state is reset as when comfort noise starts (synthesis memory,
// LSP vector, excitation-energy history, LSF average, gain predictors and the
// comfort-noise state are kept).
void reset_dec(dec_state *st, int32_t mode);

}  // namespace vamrnb

extern "C" {
VAMRNB_API int32_t vamrnbd_lsp(vamrnb::dec_state *st, vamrnb::dec_work *w, const int16_t **cursor);
VAMRNB_API void vamrnbd_lsp_avg(const int16_t past_lsf_q[10], int16_t lsp_meanSave[10]);
VAMRNB_API void vamrnbd_acb(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t mode,
                            int32_t i_subfr, const int16_t **cursor);
VAMRNB_API void vamrnbd_icb(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t mode,
                            const int16_t **cursor);
// The stages below take the frame mode from w->rx.frame_mode.
VAMRNB_API void vamrnbd_dec_gain(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t i_subfr,
                                 const int16_t **cursor);
VAMRNB_API void vamrnbd_excit(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t i_subfr);
VAMRNB_API void vamrnbd_syn(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t i_subfr);
VAMRNB_API int16_t vamrnbd_bgn_scd(vamrnb::dec_state *st, const int16_t ltpGainHistory[9],
                                   const int16_t speech[160], int16_t *voicedHangover);
VAMRNB_API void vamrnbd_post_filt(vamrnb::dec_state *st, vamrnb::dec_work *w, int32_t mode);
VAMRNB_API int32_t vamrnbd_energy_old(const int16_t in[40]);
VAMRNB_API int32_t vamrnbd_energy_new(const int16_t in[40]);
VAMRNB_API int32_t vamrnbd_recon(int16_t samples[160], const codec_config *config,
                                 pcm_buffer *out);

// Comfort noise: converts the frame's serial bits (w->serial) to w->prm and
// points *cursor at it, runs the reception DTX state machine (leaving the new
// state in st->cn.dtxGlobalState) and, in a comfort-noise state, writes the
// frame's synthesis to dec_synth(w) (updating st->mem_syn) and the four LPC
// sets for the post-filter to w->Az.
VAMRNB_API void vamrnbd_dtx(vamrnb::dec_state *st, vamrnb::dec_work *w, const int16_t **cursor);
// Comfort-noise histories after a frame of decoded speech (dec_synth(w)).
VAMRNB_API void vamrnbd_dtx_dec_activity_update(vamrnb::dec_state *st, vamrnb::dec_work *w);
}

namespace vamrnb {
// Gain (Q12-scaled square root of the energy ratio) that brings a signal of
// energy sig_energy (from vamrnbd_energy_new, not 0) to the energy of ref;
// 0 when ref is silent.  Shared by the post-filter's and the excitation's
// gain control.
Word16 agc_gain(Word32 sig_energy, const Word16 *ref);
}  // namespace vamrnb
