// The encoder's two records: the instance record that carries everything
// from one frame to the next (speech and excitation histories, filter and
// quantiser memories, detector and DTX state), and the per-frame work record
// that the frame driver clears at the start of every frame.
//
// The public opaque handle `vamrnb_encoder` is the instance record itself;
// inside the library it is spelt `vamrnb::enc_state`.
//
// The records live below both src/vad and src/enc: the detectors, the DTX
// stage and the encoder stages all take them, and include them from above.
#pragma once

#include <cstdint>

#include "vamrnb.h"
#include "vamrnb_dsp.h"
#include "basic_op/basic_op.h"
#include "format/frame_format.h"
#include "lpc/lpc.h"
#include "common/subframe_state.h"
#include "common/vad_state.h"
#include "common/dtx_enc_state.h"

namespace vamrnb {

// Geometry of the encoder's history buffers.
inline constexpr int ENC_SPEECH_LEN = 320;     // speech history
inline constexpr int ENC_NEW_SPEECH = 160;     // newest frame: old_speech[160..319]
inline constexpr int ENC_SPEECH = 120;         // frame being coded: old_speech[120..279]
                                               // (40 samples of look-ahead follow it)
inline constexpr int ENC_WINDOW = 80;          // LP analysis window, all modes but MR122
inline constexpr int ENC_WINDOW_MR122 = 40;    // LP analysis window, MR122
inline constexpr int ENC_WSP = PIT_MAX;        // current frame in old_wsp
inline constexpr int ENC_WSP_LEN = PIT_MAX + L_FRAME;               // 303
inline constexpr int ENC_EXC = PIT_MAX + L_INTERPOL;                // 154: current frame in old_exc
inline constexpr int ENC_EXC_LEN = L_FRAME + PIT_MAX + L_INTERPOL;  // 314
inline constexpr int ENC_PRM_LEN = 244;        // parameters, then one bit per word
inline constexpr int ENC_WORK_BYTES = 500;     // scratch handed to the stages per frame

struct enc_frame;

}  // namespace vamrnb

// Instance record (the public handle).  Cleared at creation, then set to
// its initial values by vamrnbe_create.
struct vamrnb_encoder {
    // Speech after the high-pass filter.  [0..159] previous frame,
    // [160..319] newest frame; shifted down by 160 after every frame.
    vamrnb::Word16 old_speech[vamrnb::ENC_SPEECH_LEN];

    vcmn_bsw writer;                   // bound to the caller's output each frame
    vamrnb_encoder *self;              // own address once creation succeeded
    codec_config config;               // copy of the caller's four words;
                                       // config.enc.mode is the requested mode
    vamrnb::enc_frame *frame;          // work record, allocated with the instance

    vamrnb::dtx_enc_state dtx;         // DTX history and SID indices
    vamrnb::vad_area vad;              // whichever detector is configured
    sid_sync_state sid;                // SID scheduling; sid.tx_type = this frame's TX type
    int32_t prev_tx_type;              // TX type of the previous frame (0..3)

    // High-pass pre-filter: last two outputs in double precision (hi, lo)
    // and last two inputs.
    vamrnb::Word16 y2_hi, y2_lo, y1_hi, y1_lo, x0, x1;

    // LP analysis.
    vamrnb::Word16 old_A[vamrnb::MP1];      // last stable filter, Q12 (fall-back)
    vamrnb::Word16 lsp_old[vamrnb::M];      // previous unquantised LSPs, Q15
    vamrnb::Word16 lsp_old_q[vamrnb::M];    // previous quantised LSPs, Q15
    vamrnb::Word16 past_rq[vamrnb::M];      // previous quantised LSF residual
    int32_t ton_count;                      // tone-stability counter, 0..12

    // Open-loop pitch.
    vamrnb::Word16 mem_w[vamrnb::M];        // weighted-speech synthesis memory
    vamrnb::Word16 old_wsp[vamrnb::ENC_WSP_LEN];  // [0..142] history, [143..302] frame
    vamrnb::Word16 old_lags[5];             // open-loop lags, newest first
    vamrnb::Word16 ol_gain_flg[2];          // per half frame, > 0: high gain
    vamrnb::Word16 old_T0_med;              // MR102 median lag
    vamrnb::Word16 ada_w;                   // MR102 adaptive weight, Q15
    vamrnb::Word16 wght_flg;                // MR102 weighting on (1) / off (0)

    // Excitation: [0..153] history, [154..313] current frame.
    vamrnb::Word16 old_exc[vamrnb::ENC_EXC_LEN];

    // Closed-loop pitch, codebook and gain stages.
    vamrnb::subfr_state sub;
};

namespace vamrnb {

using enc_state = ::vamrnb_encoder;

// Per-frame work record.  Cleared by the driver at the start of every frame;
// nothing in it survives to the next frame.
struct enc_frame {
    int32_t mode;              // requested mode (config word 3); also the SID
                               // mode indication.  The analysis stages use it.
    int32_t used_mode;         // mode coded: `mode`, 8 (MRDTX) after the DTX
                               // decision, 15 after packing a no-data frame
    int32_t compute_sid;       // 1: SID parameters are recomputed this frame
    int32_t vad_flag;          // the detector's decision (0 with DTX off)
    Word16 *work_area;         // ENC_WORK_BYTES of scratch on the driver's stack

    // Parameters in coding order, then (after the last subframe or the SID
    // encoder) one bit per word.  prm_pos is the next parameter to write.
    Word16 prm[ENC_PRM_LEN];
    int32_t prm_pos;

    // LP analysis.
    Word16 A_t[4 * MP1];       // unquantised filters of the 4 subframes, Q12
    Word16 Aq_t[4 * MP1];      // quantised filters, Q12
    Word16 lsp_new[M];         // unquantised LSPs of subframe 4, Q15
    Word16 lsp_mid[M];         // MR122: unquantised LSPs of subframe 2, Q15
    Word16 lsp_flag;           // tone-stability result, 0 or 1

    // Open-loop pitch lags of the two half frames (equal in MR475/MR515).
    Word16 T_op[2];

    subfr_frame sub;
};

// Start of the frame being coded, of its excitation and of its weighted speech.
inline Word16 *enc_speech(enc_state *st) { return st->old_speech + ENC_SPEECH; }
inline Word16 *enc_exc(enc_state *st) { return st->old_exc + ENC_EXC; }
inline Word16 *enc_wsp(enc_state *st) { return st->old_wsp + ENC_WSP; }

}  // namespace vamrnb

// Frame-level stages (instance, work record).
extern "C" {
VAMRNB_API void vamrnbe_preproc(vamrnb::enc_state *st, vamrnb::enc_frame *fr, int16_t *in);
VAMRNB_API void vamrnbe_lpc(vamrnb::enc_state *st, vamrnb::enc_frame *fr);
VAMRNB_API void vamrnbe_olp(vamrnb::enc_state *st, vamrnb::enc_frame *fr, vamrnb::vad_area *vad);

// LP analysis building blocks (240-sample window, order 10).
VAMRNB_API void    vamrnbe_windowing(const int16_t *x, const int16_t *window, int16_t *y);
VAMRNB_API int32_t vamrnbe_auto_corr(int16_t *y, int16_t r_h[11], int16_t r_l[11]);
VAMRNB_API void    vamrnbe_lag_window(int16_t r_h[11], int16_t r_l[11]);
VAMRNB_API void    vamrnbe_levinson(int16_t old_A[11], const int16_t r_h[11], const int16_t r_l[11],
                                    int16_t A[11], int16_t rc[4]);

// LSF quantisation.  `past_rq` is the predictor memory; `pred_init_i` is
// written only in MRDTX.
VAMRNB_API void    vamrnbe_q_plsf_3(int32_t mode, const int16_t lsp[10], int16_t lsp_q[10],
                                    int16_t past_rq[10], int16_t indices[3], int16_t *pred_init_i);
VAMRNB_API int16_t vamrnbe_vq_subvec(int16_t *r1, int16_t *r2, const int16_t *dico,
                                     const int16_t *w1, const int16_t *w2, int32_t size);
VAMRNB_API int16_t vamrnbe_vq_subvec_s(int16_t *r1, int16_t *r2, const int16_t *dico,
                                       const int16_t *w1, const int16_t *w2, int32_t size);
VAMRNB_API int16_t vamrnbe_vq_subvec4(int16_t *r, const int16_t *dico, const int16_t *w, int32_t size);

// Open-loop pitch: correlation of x[0..len-1] with x[-lag..] for lag_max
// down to lag_min, stored at corr[-lag].
VAMRNB_API void    vamrnbe_comp_corr(const int16_t *x, int32_t len, int32_t lag_max, int32_t lag_min,
                                     int32_t *corr);
}

namespace vamrnb {
// LSF weighting factors of the split quantisers (Q13).
void lsf_wt(const Word16 lsf[M], Word16 wf[M]);
// LPC to LSP root search; keeps old_lsp when fewer than 10 roots are found.
Word16 chebps(Word16 x, const Word16 *f, int n);
void az_lsp(const Word16 a[MP1], Word16 lsp[M], const Word16 old_lsp[M]);
// Tone-stability check on the new unquantised LSPs; updates the counter.
Word16 check_lsp(int32_t *count, const Word16 lsp[M]);
}  // namespace vamrnb
