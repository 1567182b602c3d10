// The decoder as the caller sees it: creation, reset and deletion of an
// instance, and the per-frame driver that unpacks a storage-format frame,
// answers decoder homing frames, runs comfort noise or the LSF stage and the
// four speech subframes, post-filters and hands the samples to the output
// stage.  Also the per-frame LSP step with its bad-frame classification and
// the running LSF average.
#include <cstring>

#include "common/checks.h"
#include "dec/dec_state.h"
#include "dec/dtx_dec.h"

#include "common/bitstream.h"
#include "dec/d_plsf.h"
#include "format/frame_format.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr Word16 HOMING_SAMPLE = 0x0008;

dec_state *as_state(vamrnb_decoder *dec) { return reinterpret_cast<dec_state *>(dec); }

// Initial values of the comfort-noise state.
void reset_cn(dec_state *st) {
    dtx_dec_reset(&st->cn);
    std::memcpy(st->work->cn_lsp_old, vamrnb_tbl_lsp_init_data, sizeof st->work->cn_lsp_old);
}

void reset_post(dec_state *st) {
    post_filter_state *pf = &st->post;
    std::memset(pf, 0, sizeof *pf);
    pf->past_gain = 4096;
}

// Substitute parameters of a lost frame from a linear congruential generator
// and a window-shaped table, each limited to its width.
void substitute_params(Word16 *seed, int32_t mode, Word16 *prm) {
    *seed = extract_l(l_add(l_shr(l_mult(*seed, 31821), 1), 13849));
    const Word16 *p = &tab::window_200_40[*seed & 0x7F];
    const int16_t *width = vamrnb_tbl_bitno[mode];
    for (int i = 0; i < vamrnb_tbl_prmno[mode]; ++i)
        prm[i] = static_cast<Word16>(p[i] & ((1 << width[i]) - 1));
}

}  // namespace

namespace vamrnb {

void reset_dec(dec_state *st, int32_t mode) {
    const bool full = mode != MRDTX;
    st->exc = st->old_exc + DEC_EXC_OFFSET;
    std::memset(st->old_exc, 0, DEC_EXC_OFFSET * sizeof(Word16));
    if (full) std::memset(st->mem_syn, 0, sizeof st->mem_syn);
    st->sharp = 0;
    st->old_T0 = 40;
    if (full) std::memcpy(st->lsp_old, vamrnb_tbl_lsp_init_data, sizeof st->lsp_old);
    st->prev_bf = 0;
    st->prev_pdf = 0;
    st->conceal_state = 0;
    st->T0_lagBuff = 40;
    st->inBackgroundNoise = 0;
    st->voicedHangover = 0;
    if (full) std::memset(st->excEnergyHist, 0, sizeof st->excEnergyHist);
    std::memset(st->ltpGainHistory, 0, sizeof st->ltpGainHistory);

    std::memset(st->cbGainHistory, 0, sizeof st->cbGainHistory);
    st->hangVar = 0;
    st->hangCount = 0;
    if (full) std::memcpy(st->lsp_meanSave, vamrnb_tbl_mean_lsf, sizeof st->lsp_meanSave);
    std::memset(st->past_r_q, 0, sizeof st->past_r_q);
    std::memcpy(st->past_lsf_q, vamrnb_tbl_mean_lsf, sizeof st->past_lsf_q);
    for (auto &g : st->pbuf) g = 1640;
    st->past_gain_pit = 0;
    st->prev_gp = 16384;
    for (auto &g : st->gbuf) g = 1;
    st->past_gain_code = 0;
    st->prev_gc = 1;
    if (full) {
        for (auto &e : st->past_qua_en) e = -14336;
        for (auto &e : st->past_qua_en_MR122) e = -2381;
    }
    std::memset(&st->bgn, 0, sizeof st->bgn);
    st->nodataSeed = 21845;
    std::memset(st->gainMem, 0, sizeof st->gainMem);
    st->prevState = 0;
    st->prevCbGain = 0;
    st->lockFull = 0;
    st->onset = 0;
    if (full) {
        reset_cn(st);
        reset_post(st);
    }
}

}  // namespace vamrnb

extern "C" void vamrnbd_lsp_avg(const int16_t past_lsf_q[10], int16_t lsp_meanSave[10]) {
    constexpr Word16 WEIGHT = 5243;  // 0.16 in Q15
    for (int i = 0; i < M; ++i) {
        Word32 L = l_deposit_h(lsp_meanSave[i]);
        L = l_msu(L, WEIGHT, lsp_meanSave[i]);
        L = l_mac(L, WEIGHT, past_lsf_q[i]);
        lsp_meanSave[i] = round16(L);
    }
}

extern "C" int32_t vamrnbd_lsp(dec_state *st, dec_work *w, const int16_t **cursor) {
    if (st->cn.dtxGlobalState != SPEECH) {
        // comfort noise was generated: keep the LSP start point and the
        // average in step with the comfort-noise LSFs
        vamrnb_sf_sp(st->past_lsf_q, vamrnb_tbl_cos_lsp_lsf, st->lsp_old);
        vamrnbd_lsp_avg(st->past_lsf_q, st->lsp_meanSave);
        return 2;
    }
    const int32_t mode = w->rx.frame_mode;
    const int32_t rx = w->rx.rx_type;

    // bad-frame classification; lost frames get substitute parameters
    w->bfi = 0;
    w->pdfi = 0;
    if (rx == RX_SPEECH_BAD || rx == RX_NO_DATA || rx == RX_ONSET) {
        w->bfi = 1;
        if (rx != RX_SPEECH_BAD) substitute_params(&st->nodataSeed, mode, w->prm);
    } else if (rx == RX_SPEECH_DEGRADED) {
        w->pdfi = 1;
    }

    // concealment state: counts bad frames up to 6, drops back on good ones
    if (w->bfi != 0)
        st->conceal_state = add(st->conceal_state, 1);
    else
        st->conceal_state = st->conceal_state == 6 ? 5 : 0;
    if (st->conceal_state > 6) st->conceal_state = 6;

    // first speech frame after comfort noise: muted if the noise was muted
    if (w->dtx_state_prev == DTX) {
        st->conceal_state = 5;
        st->prev_bf = 0;
    } else if (w->dtx_state_prev == DTX_MUTE) {
        st->conceal_state = 5;
        st->prev_bf = 1;
    }

    std::memcpy(w->prev_lsf, st->past_lsf_q, sizeof w->prev_lsf);
    Word16 lsp_new[M];
    if (mode != MR122) {
        vamrnbd_d_plsf_3(mode, w->bfi, *cursor, st->past_lsf_q, st->past_r_q, lsp_new);
        *cursor += 3;
        vamrnb_int_lpc_1to3(st->lsp_old, lsp_new, w->Az);
    } else {
        Word16 lsp_mid[M];
        d_plsf_5(w->bfi, *cursor, st->past_lsf_q, st->past_r_q, lsp_mid, lsp_new);
        *cursor += 5;
        vamrnb_int_lpc_1and3(st->lsp_old, lsp_mid, lsp_new, w->Az);
    }
    std::memcpy(st->lsp_old, lsp_new, sizeof lsp_new);
    return 0;
}

extern "C" vamrnb_decoder *vamrnbd_create(const codec_config *config, int32_t *error) {
    VAMRNB_REQUIRE(config);
    auto *st = static_cast<dec_state *>(vcmn_malloc_align32(sizeof(dec_state)));
    if (st == nullptr) {
        if (error != nullptr) *error = AMRNB_ERR_NO_MEMORY;
        return nullptr;
    }
    std::memset(st, 0, sizeof *st);
    st->prev_mode = 0;
    st->prev_homing = 1;
    std::memcpy(&st->config, config, sizeof st->config);
    if (st->config.word[0] != 0) {
        vcmn_mfree_align32(st->work);
        vcmn_mfree_align32(st);
        if (error != nullptr) *error = AMRNB_ERR_UNSUPPORTED;
        return nullptr;
    }
    st->work = static_cast<dec_work *>(vcmn_malloc_align32(sizeof(dec_work)));
    if (st->work == nullptr) {
        // Without its working record the instance could never decode a frame.
        vcmn_mfree_align32(st);
        if (error != nullptr) *error = AMRNB_ERR_NO_MEMORY;
        return nullptr;
    }
    std::memset(st->work, 0, sizeof *st->work);
    std::memset(&st->cn, 0, sizeof st->cn);
    reset_dec(st, 0);
    if (error != nullptr) *error = AMRNB_OK;
    st->self = st;
    return reinterpret_cast<vamrnb_decoder *>(st);
}

extern "C" void vamrnbd_reset(vamrnb_decoder *dec) {
    VAMRNB_REQUIRE(dec);
    dec_state *st = as_state(dec);
    reset_dec(st, 0);   // resets the comfort-noise state through its owner
}

extern "C" void vamrnbd_delete(vamrnb_decoder *dec) {
    if (dec == nullptr) return;
    dec_state *st = as_state(dec);
    vcmn_mfree_align32(st->work);
    vcmn_mfree_align32(st);
}

extern "C" int32_t vamrnbd_decode(vamrnb_decoder *dec, const bitstream_buffer *in, pcm_buffer *out,
                                  frame_info *info) {
    VAMRNB_REQUIRE(dec);
    VAMRNB_REQUIRE(in);
    VAMRNB_REQUIRE(in->data);
    VAMRNB_REQUIRE(out);
    VAMRNB_REQUIRE(info);
    dec_state *st = as_state(dec);
    dec_work *w = st->work;

    vcmn_bsr_init(&st->reader, in->data, in->size, nullptr);
    int16_t serial[SERIAL_SIZE] = {};
    int32_t mode = st->prev_mode;
    vamrnbd_unpack_bits(&st->reader, &w->rx, &mode, serial);

    const int32_t rx = w->rx.rx_type;
    if (rx == RX_NO_DATA && (w->rx.frame_mode == 10 || w->rx.frame_mode == 11 || w->rx.frame_mode > 15)) {
        info->produced = 0;
        return AMRNB_ERR_BAD_FRAME_TYPE;
    }
    st->rx_type_last = rx;

    Word16 *const pcm = w->out;
    int32_t homing = 0;
    if (rx == RX_NO_DATA) {
        w->rx.frame_mode = st->prev_mode;
    } else {
        st->prev_mode = w->rx.frame_mode;
        if (st->prev_homing == 1) homing = vamrnbd_decoder_homing_frm_test_first(serial, w->rx.frame_mode);
    }
    const int32_t frame_mode = w->rx.frame_mode;

    if (homing != 0) {
        // a further homing frame: answer with the encoder homing pattern
        for (int i = 0; i < L_FRAME; ++i) pcm[i] = HOMING_SAMPLE;
    } else {
        w->serial = serial;
        const int16_t *cursor = w->prm;
        vamrnbd_dtx(st, w, &cursor);
        if (vamrnbd_lsp(st, w, &cursor) != 2) {
            std::memcpy(w->synth_buf, st->mem_syn, sizeof st->mem_syn);
            w->Az_cur = w->Az;
            w->subfr_nr = 0;
            w->even_subfr = 1;
            for (int i_subfr = 0; i_subfr < L_FRAME; i_subfr += L_SUBFR) {
                vamrnbd_acb(st, w, frame_mode, i_subfr, &cursor);
                vamrnbd_icb(st, w, frame_mode, &cursor);
                vamrnbd_dec_gain(st, w, i_subfr, &cursor);
                vamrnbd_excit(st, w, i_subfr);
                vamrnbd_syn(st, w, i_subfr);
                w->subfr_nr = static_cast<Word16>(w->subfr_nr + 1);
                w->even_subfr = static_cast<Word16>(1 - w->even_subfr);
            }
            std::memcpy(st->mem_syn, w->synth_buf + L_FRAME, sizeof st->mem_syn);
            st->inBackgroundNoise =
                vamrnbd_bgn_scd(st, st->ltpGainHistory, dec_synth(w), &st->voicedHangover);
            vamrnbd_dtx_dec_activity_update(st, w);
            st->prev_bf = w->bfi;
            st->prev_pdf = w->pdfi;
            vamrnbd_lsp_avg(st->past_lsf_q, st->lsp_meanSave);
        }
        vamrnbd_post_filt(st, w, frame_mode);
        for (int i = 0; i < L_FRAME; ++i) pcm[i] = static_cast<Word16>(pcm[i] & 0xFFF8);
        if (st->prev_homing == 0) homing = vamrnbd_decoder_homing_frm_test(serial, frame_mode);
    }

    w->syn_overflow = 0;
    if (homing != 0) reset_dec(st, 0);
    st->prev_homing = homing;

    const int32_t status = vamrnbd_recon(pcm, &st->config, out);
    if (status != AMRNB_OK) return status;
    info->produced = 1;
    info->bytes = bsr_bytes_consumed(&st->reader);
    info->frame_count += 1;
    info->channels = out->channels;
    info->bits_per_sample = out->bits_per_sample;
    return AMRNB_OK;
}
