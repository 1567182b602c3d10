// The encoder's public face and frame driver: creating an instance from the
// caller's configuration, running the analysis stages over one 20 ms frame in
// their fixed order, shifting the history buffers, choosing the transmitted
// frame type and packing the frame, and releasing the instance.
#include <cstring>

#include "common/checks.h"
#include "common/enc_state.h"
#include "enc/subframe.h"
#include "common/bitstream.h"
#include "format/frame_format.h"
#include "lpc/tables.h"
#include "vad/dtx_enc.h"
#include "vad/sid_sync.h"
#include "vad/vad.h"

using namespace vamrnb;

namespace {

constexpr Word16 OL_LAG_INIT = 40;
constexpr Word16 PAST_QUA_EN_INIT = -14336;        // -14 dB, Q10
constexpr Word16 PAST_QUA_EN_MR122_INIT = -2381;   // the same in the MR122 scale

void init_gain_pred(gain_pred_mem *p) {
    for (int i = 0; i < 4; ++i) {
        p->past_qua_en[i] = PAST_QUA_EN_INIT;
        p->past_qua_en_MR122[i] = PAST_QUA_EN_MR122_INIT;
    }
}

// Sets every field whose start value is not zero (the record is cleared).
void init_state(enc_state *st) {
    st->old_A[0] = 4096;
    for (int i = 0; i < M; ++i) {
        st->lsp_old[i] = vamrnb_tbl_lsp_init_data[i];
        st->lsp_old_q[i] = vamrnb_tbl_lsp_init_data[i];
    }
    for (int i = 0; i < 5; ++i) st->old_lags[i] = OL_LAG_INIT;
    st->old_T0_med = OL_LAG_INIT;

    init_gain_pred(&st->sub.pred);
    init_gain_pred(&st->sub.pred_unq);

    // The sub-band detector starts from its own levels; the spectral one
    // (and any other option value) from all zeros.
    if (st->config.enc.dtx == 1 && st->config.enc.vad_option == 0) vad1_init(&st->vad.v1);

    dtx_enc_init(&st->dtx);

    sid_sync_init(&st->sid);
    st->prev_tx_type = TX_SPEECH_GOOD;
}

}  // namespace

extern "C" vamrnb_encoder *vamrnbe_create(const codec_config *config, int32_t *error) {
    VAMRNB_REQUIRE(config);
    auto *st = static_cast<enc_state *>(vcmn_malloc_align32(sizeof(enc_state)));
    if (!st) {
        if (error) *error = AMRNB_ERR_NO_MEMORY;
        return nullptr;
    }
    std::memset(static_cast<void *>(st), 0, sizeof(enc_state));
    st->config = *config;
    // A mode outside MR475..MR122 has no frame layout to code into; refuse it
    // here as vamrnbe_set_mode does rather than fail in the first frame.
    const int32_t mode = st->config.enc.mode;
    if (st->config.enc.reserved != 0 || mode < MR475 || mode > MR122) {
        vcmn_mfree_align32(st);
        if (error) *error = AMRNB_ERR_UNSUPPORTED;
        return nullptr;
    }

    st->frame = static_cast<enc_frame *>(vcmn_malloc_align32(sizeof(enc_frame)));
    if (!st->frame) {
        // Without its work record the instance cannot encode.
        vcmn_mfree_align32(st);
        if (error) *error = AMRNB_ERR_NO_MEMORY;
        return nullptr;
    }
    std::memset(static_cast<void *>(st->frame), 0, sizeof(enc_frame));

    init_state(st);
    st->self = st;
    if (error) *error = AMRNB_OK;
    return st;
}

extern "C" int32_t vamrnbe_set_mode(vamrnb_encoder *enc, int32_t mode) {
    VAMRNB_REQUIRE(enc);
    if (mode < MR475 || mode > MR122) return AMRNB_ERR_UNSUPPORTED;
    enc->config.enc.mode = mode;
    return AMRNB_OK;
}

extern "C" int32_t vamrnbe_encode(vamrnb_encoder *enc, const pcm_buffer *in,
                                  bitstream_buffer *out, frame_info *info) {
    VAMRNB_REQUIRE(enc);
    VAMRNB_REQUIRE(in);
    VAMRNB_REQUIRE(in->data[0]);
    VAMRNB_REQUIRE(out);
    VAMRNB_REQUIRE(out->data);
    VAMRNB_REQUIRE(info);
    enc_state *st = enc;
    enc_frame *fr = st->frame;

    std::memset(static_cast<void *>(fr), 0, sizeof(enc_frame));
    alignas(32) Word16 work[ENC_WORK_BYTES / sizeof(Word16)];
    fr->work_area = work;

    vcmn_bsw_init(&st->writer, out->data, out->size, nullptr);

    fr->mode = st->config.enc.mode;
    fr->used_mode = fr->mode;

    vamrnbe_preproc(st, fr, static_cast<int16_t *>(in->data[0]));

    if (st->config.enc.dtx == 1)
        vamrnbe_vad(st, fr);   // may turn the frame into MRDTX
    else
        fr->compute_sid = 0;

    vamrnbe_lpc(st, fr);
    vamrnbe_olp(st, fr, &st->vad);
    dtx_buffer(fr->lsp_new, st->old_speech + ENC_NEW_SPEECH, &st->dtx);

    if (fr->used_mode == MRDTX) vamrnbe_dtx(st, fr);

    if (fr->used_mode != MRDTX) {
        for (int32_t i_subfr = 0; i_subfr < L_FRAME; i_subfr += L_SUBFR) {
            vamrnbe_syn(st, fr, i_subfr);
            vamrnbe_acb(st, fr, i_subfr);
            vamrnbe_icb(st, fr, i_subfr);
            vamrnbe_filt_update(st, fr, i_subfr);
        }
        std::memmove(st->old_exc, st->old_exc + L_FRAME, ENC_EXC * sizeof(Word16));
    }

    // Keep what the next frame looks back on.
    std::memmove(st->old_wsp, st->old_wsp + L_FRAME, ENC_WSP * sizeof(Word16));
    std::memmove(st->old_speech, st->old_speech + L_FRAME,
                 (ENC_SPEECH_LEN - L_FRAME) * sizeof(Word16));

    tx_type_select(&st->sid, &st->prev_tx_type, fr->used_mode);
    vamrnbe_bs_pack(&st->writer, fr->prm, fr->mode, &fr->used_mode, st->sid.tx_type, &st->sid);

    info->produced = 1;
    info->bytes = bsw_bytes_written(&st->writer);
    info->frame_count += 1;
    info->frame_type = static_cast<uint32_t>(fr->used_mode);
    fr->work_area = nullptr;
    return AMRNB_OK;
}

extern "C" void vamrnbe_delete(vamrnb_encoder *enc) {
    if (!enc) return;
    vcmn_mfree_align32(enc->frame);
    vcmn_mfree_align32(enc);
}
