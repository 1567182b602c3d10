// Comfort-noise decoding.  While the far end sends SID and no-data frames the
// decoder does not decode speech: it keeps a comfort-noise description (an
// LSP vector and a log energy), interpolates it between SID updates, adds a
// little spectral jitter drawn from the LSF history of the last speech
// frames, and drives the synthesis filter with sparse pseudo-random pulses.
// During speech the same history is fed frame by frame so that a SID_FIRST
// after a hangover can be answered from the decoder's own analysis.
#include "dec/dtx_dec.h"

#include "basic_op/ext_op.h"
#include "dec/d_plsf.h"
#include "dec/dec_state.h"
#include "format/frame_format.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

#include <algorithm>

namespace vamrnb {
namespace {

constexpr int kHist = 8;                  // frames kept in the LSF / energy histories
constexpr Word16 kHangFrames = 7;         // encoder hangover length
constexpr Word16 kElapsedThresh = 30;     // hangover + 24 analysis frames - 1
constexpr Word16 kMaxEmpty = 50;          // frames without SID update before muting
constexpr Word32 kSeedInit = 0x70816958;  // pseudo-noise generator start value

void copy10(Word16 *dst, const Word16 *src) { std::copy_n(src, M, dst); }

// LSF (Q15 normalised frequency) to LSP (cosine domain).
void lsf_to_lsp(const Word16 lsf[M], Word16 lsp[M]) {
    vamrnb_sf_sp(lsf, vamrnb_tbl_cos_lsp_lsf, lsp);
}

// Deviation of each history entry from the history mean, scaled down (more
// for the upper coefficients) and limited: the spectral jitter of the noise.
void build_variability(dtx_dec_state *st) {
    std::copy_n(st->lsf_hist, M * kHist, st->lsf_hist_mean);
    for (int i = 0; i < M; ++i) {
        Word32 sum = 0;
        for (int j = 0; j < kHist; ++j) sum = l_add(sum, st->lsf_hist_mean[i + j * M]);
        const Word16 mean = extract_l(l_shr(sum, 3));
        for (int j = 0; j < kHist; ++j) {
            Word16 d = sub(st->lsf_hist_mean[i + j * M], mean);
            d = mult(d, tab::lsf_hist_mean_scale[i]);
            const bool negative = d < 0;
            d = abs_s(d);
            if (sub(d, 655) > 0) d = add(655, shr(sub(d, 655), 2));
            if (sub(d, 1310) > 0) d = 1310;
            st->lsf_hist_mean[i + j * M] = negative ? static_cast<Word16>(-d) : d;
        }
    }
}

// The encoder added a hangover before this SID: take the comfort-noise
// description from the decoder's own history of the last eight frames.
void take_from_history(dtx_dec_state *st, int32_t mode) {
    st->log_en_adjust = vamrnb_tbl_dtx_log_en_adjust[mode];

    // Repeat the newest entries once more in the slot after them (the
    // pointers themselves stay where they are).
    Word16 next = add(st->lsf_hist_ptr, M);
    if (next == M * kHist) next = 0;
    copy10(&st->lsf_hist[next], &st->lsf_hist[st->lsf_hist_ptr]);
    next = add(st->log_en_hist_ptr, 1);
    if (next == kHist) next = 0;
    st->log_en_hist[next] = st->log_en_hist[st->log_en_hist_ptr];

    Word16 log_en = 0;
    Word32 lsf_sum[M] = {};
    for (int j = 0; j < kHist; ++j) {
        log_en = add(log_en, shr(st->log_en_hist[j], 3));
        for (int i = 0; i < M; ++i) lsf_sum[i] = l_add(lsf_sum[i], st->lsf_hist[j * M + i]);
    }
    Word16 lsf[M];
    for (int i = 0; i < M; ++i) lsf[i] = extract_l(l_shr(lsf_sum[i], 3));
    lsf_to_lsp(lsf, st->lsp);

    // Stored without the mode's level offset; it is added back at synthesis.
    st->log_en = sub(log_en, st->log_en_adjust);
    build_variability(st);
}

// A SID frame arrived: shift the description, and with valid data decode
// the new one from its five parameters.
void take_sid(dtx_dec_state *st, const cn_links &io, dtx_global_state prev_state,
              const Word16 *prm) {
    copy10(io.lsp_old, st->lsp);
    st->old_log_en = st->log_en;

    if (st->valid_data != 0) {
        // The division below is only valid for periods up to 32 frames.
        Word16 period = std::min<Word16>(st->since_last_sid, 32);
        st->since_last_sid = 0;
        st->true_sid_period_inv = period >= 2 ? div_s(1 << 10, shl(period, 10)) : Word16{1 << 14};

        // The SID's LSF residual is coded against one of eight fixed
        // predictor states; the memory is cleared again for the next speech.
        copy10(io.past_r_q, &tab::past_rq_init[(prm[0] & 7) * M]);
        vamrnbd_d_plsf_3(MRDTX, 0, &prm[1], io.past_lsf_q, io.past_r_q, st->lsp);
        std::fill_n(io.past_r_q, M, Word16{0});

        const Word16 index = prm[4];
        st->log_en = sub(shl(index, 9), 5120);  // Q11: index / 4 - 2.5
        if (index == 0) st->log_en = MIN_16;    // reserved for silence

        // Nothing to interpolate from right after a reset or after speech.
        if (st->data_updated == 0 || prev_state == SPEECH) {
            copy10(io.lsp_old, st->lsp);
            st->old_log_en = st->log_en;
        }
    }

    // Seed the code-gain predictors with the noise level.
    Word16 pred = sub(shr(st->log_en, 1), 9000);
    pred = std::clamp<Word16>(pred, -14436, 0);
    std::fill_n(io.past_qua_en, 4, pred);
    std::fill_n(io.past_qua_en_MR122, 4, mult(5443, pred));
}

}  // namespace

void dtx_dec_reset(dtx_dec_state *st) {
    *st = dtx_dec_state{};
    st->true_sid_period_inv = 1 << 13;
    st->log_en = 3500;
    st->old_log_en = 3500;
    st->L_pn_seed_rx = kSeedInit;
    copy10(st->lsp, vamrnb_tbl_lsp_init_data);
    for (int j = 0; j < kHist; ++j) {
        copy10(&st->lsf_hist[j * M], vamrnb_tbl_mean_lsf);
        st->log_en_hist[j] = st->log_en;
    }
    st->dtxHangoverCount = kHangFrames;
    st->decAnaElapsedCount = 32767;
    st->dtxGlobalState = DTX;
}

dtx_global_state rx_dtx_handler(dtx_dec_state *st, int32_t rx) {
    const bool sid = rx == RX_SID_FIRST || rx == RX_SID_UPDATE || rx == RX_SID_BAD;
    const bool in_cn = st->dtxGlobalState == DTX || st->dtxGlobalState == DTX_MUTE;
    const bool no_speech = rx == RX_NO_DATA || rx == RX_SPEECH_BAD || rx == RX_ONSET;

    dtx_global_state next;
    if (sid || (in_cn && no_speech)) {
        next = DTX;
        // Once muted, only a SID update or good speech lifts the muting.
        if (st->dtxGlobalState == DTX_MUTE &&
            (rx == RX_SID_BAD || rx == RX_SID_FIRST || rx == RX_ONSET || rx == RX_NO_DATA))
            next = DTX_MUTE;
        // A late SID update must not be muted by the count it has not yet reset.
        st->since_last_sid = add(st->since_last_sid, 1);
        if (rx != RX_SID_UPDATE && st->since_last_sid > kMaxEmpty) next = DTX_MUTE;
    } else {
        next = SPEECH;
        st->since_last_sid = 0;
    }

    // First comfort-noise data ever: restart the analysis counter, which
    // keeps the encoder and decoder views aligned after a handover.
    if (st->data_updated == 0 && rx == RX_SID_UPDATE) st->decAnaElapsedCount = 0;
    st->decAnaElapsedCount = add(st->decAnaElapsedCount, 1);
    st->dtxHangoverAdded = 0;

    // What the far-end encoder was most likely doing.  A lost frame during
    // speech was most likely speech.
    bool enc_dtx = sid || rx == RX_ONSET || rx == RX_NO_DATA;
    if (rx == RX_NO_DATA && next == SPEECH) enc_dtx = false;

    if (!enc_dtx) {
        st->dtxHangoverCount = kHangFrames;
    } else if (st->decAnaElapsedCount > kElapsedThresh) {
        st->dtxHangoverAdded = 1;
        st->decAnaElapsedCount = 0;
        st->dtxHangoverCount = 0;
    } else if (st->dtxHangoverCount == 0) {
        st->decAnaElapsedCount = 0;
    } else {
        st->dtxHangoverCount = sub(st->dtxHangoverCount, 1);
    }

    if (next != SPEECH) {
        st->sid_frame = 0;
        st->valid_data = 0;
        if (rx == RX_SID_FIRST) {
            st->sid_frame = 1;
        } else if (rx == RX_SID_UPDATE) {
            st->sid_frame = 1;
            st->valid_data = 1;
        } else if (rx == RX_SID_BAD) {
            st->sid_frame = 1;
            st->dtxHangoverAdded = 0;  // keep the old description
        }
    }
    return next;
}

void a_refl(const Word16 a[M], Word16 refl[M]) {
    Word16 cur[M];
    Word16 nxt[M];
    std::copy_n(a, M, cur);

    // Step-down recursion from the highest order.
    for (int i = M - 1; i >= 0; --i) {
        if (abs_s(cur[i]) >= 4096) goto unstable;
        refl[i] = shl(cur[i], 3);

        Word32 acc = l_sub(MAX_32, l_mult(refl[i], refl[i]));
        const Word16 sh = norm_l(acc);
        const Word16 scale = sub(15, sh);
        acc = l_shl(acc, sh);
        const Word16 inv = div_s(16384, round16(acc));

        for (int j = 0; j < i; ++j) {
            acc = l_msu(l_deposit_h(cur[j]), refl[i], cur[i - j - 1]);
            const Word32 v = l_shr_r(l_mult(inv, round16(acc)), scale);
            if (l_abs(v) > 32767) goto unstable;
            nxt[j] = extract_l(v);
        }
        std::copy_n(nxt, i, cur);
    }
    return;

unstable:
    std::fill_n(refl, M, Word16{0});
}

void dtx_dec(dtx_dec_state *st, const cn_links &io, dtx_global_state prev_state,
             dtx_global_state new_state, int32_t mode, const Word16 *prm,
             Word16 synth[160], Word16 A_t[44]) {
    if (st->dtxHangoverAdded != 0 && st->sid_frame != 0) take_from_history(st, mode);
    if (st->sid_frame != 0) take_sid(st, io, prev_state, prm);

    // The mode's level offset follows the mode slowly (0.9 old + 0.1 new).
    st->log_en_adjust = add(mult(st->log_en_adjust, 29491),
                            shr(mult(shl(vamrnb_tbl_dtx_log_en_adjust[mode], 5), 3277), 5));

    // Interpolation weight of the newest description, Q10 limited to 1, then Q14.
    Word16 k_q14 = mult(shl(add(1, st->since_last_sid), 10), st->true_sid_period_inv);
    if (k_q14 > 1024) k_q14 = 1024;
    k_q14 = shl(k_q14, 4);

    Word32 log_en_q26 = l_mult(k_q14, st->log_en);
    Word16 lsp_int[M];
    for (int i = 0; i < M; ++i) lsp_int[i] = mult(k_q14, st->lsp[i]);
    const Word16 rest_q14 = sub(16384, k_q14);
    log_en_q26 = l_mac(log_en_q26, rest_q14, st->old_log_en);
    for (int i = 0; i < M; ++i)
        lsp_int[i] = shl(add(lsp_int[i], mult(rest_q14, io.lsp_old[i])), 1);

    // Jitter strength: less when the noise filter is strongly predictive.
    Word16 variab = sub(4096, mult(sub(st->log_pg_mean, 2457), 9830));
    variab = std::clamp<Word16>(variab, 0, 4096);
    variab = shl(variab, 3);
    const Word16 pick = vamrnbd_pseudonoise(3, &st->L_pn_seed_rx);

    Word16 lsf_int[M];
    Word16 lsf_var[M];
    vamrnb_lsp_lsf(lsp_int, lsf_int);
    for (int i = 0; i < M; ++i)
        lsf_var[i] = add(lsf_int[i], mult(variab, st->lsf_hist_mean[i + pick * M]));
    vamrnb_reorder(lsf_int);
    vamrnb_reorder(lsf_var);
    copy10(io.past_lsf_q, lsf_int);

    // The smooth filter sets the level and serves the post-filter; the
    // jittered one drives the synthesis.
    Word16 lsp_var[M];
    Word16 a_smooth[MP1];
    Word16 a_var[MP1];
    lsf_to_lsp(lsf_int, lsp_int);
    lsf_to_lsp(lsf_var, lsp_var);
    vamrnb_lsp_az(lsp_int, a_smooth);
    vamrnb_lsp_az(lsp_var, a_var);
    for (int s = 0; s < 4; ++s) std::copy_n(a_smooth, MP1, &A_t[s * MP1]);

    // Prediction gain of the smooth filter, log2 in Q12.
    Word16 refl[M];
    a_refl(&a_smooth[1], refl);
    Word16 pred_err = MAX_16;
    for (int i = 0; i < M; ++i) pred_err = mult(pred_err, sub(MAX_16, mult(refl[i], refl[i])));
    Word16 e;
    Word16 f;
    vamrnb_log2(l_deposit_l(pred_err), &e, &f);
    Word16 log_pg = shl(sub(e, 15), 12);
    log_pg = shr(sub(0, add(log_pg, shr(f, 3))), 1);
    st->log_pg_mean = add(mult(29491, st->log_pg_mean), mult(3277, log_pg));

    // Excitation level: interpolated energy + 4, less the prediction gain,
    // plus the mode offset, taken back to the linear domain.
    Word32 lvl = l_shr(log_en_q26, 10);
    lvl = l_add(lvl, 4 * 65536);
    lvl = l_sub(lvl, l_shl(l_deposit_l(log_pg), 4));
    lvl = l_add(lvl, l_shl(l_deposit_l(st->log_en_adjust), 5));
    const Word16 lvl_e = extract_h(lvl);
    const Word16 lvl_f = extract_l(l_shr(l_sub(lvl, l_deposit_h(lvl_e)), 1));
    const Word16 level = extract_l(vamrnb_pow2(lvl_e, lvl_f));

    for (int s = 0; s < 4; ++s) {
        Word16 ex[L_SUBFR];
        vamrnbd_build_cn_code(&st->L_pn_seed_rx, ex);
        for (Word16 &x : ex) x = mult(level, x);
        Word16 *out = &synth[s * L_SUBFR];
        vamrnb_syn_filt(a_var, ex, io.mem_syn, out);
        copy10(io.mem_syn, &out[L_SUBFR - M]);
    }

    *io.hang_var = 20;
    *io.hang_count = 0;

    if (new_state == DTX_MUTE) {
        // No update for a long time: fade out by 1/8 (Q11) per frame.
        Word16 period = std::min<Word16>(st->since_last_sid, 32);
        if (period <= 0) period = 8;
        st->true_sid_period_inv = div_s(1 << 10, shl(period, 10));
        st->since_last_sid = 0;
        copy10(io.lsp_old, st->lsp);
        st->old_log_en = st->log_en;
        st->log_en = sub(st->log_en, 256);
    }

    if (st->sid_frame != 0 && (st->valid_data != 0 || st->dtxHangoverAdded != 0)) {
        st->since_last_sid = 0;
        st->data_updated = 1;
    }
}

void dtx_dec_activity_update(dtx_dec_state *st, const Word16 lsf[M], const Word16 synth[160]) {
    st->lsf_hist_ptr = add(st->lsf_hist_ptr, M);
    if (st->lsf_hist_ptr == M * kHist) st->lsf_hist_ptr = 0;
    copy10(&st->lsf_hist[st->lsf_hist_ptr], lsf);

    Word16 e;
    Word16 f;
    vamrnb_log2(vamrnb_energy(synth, L_FRAME, 0), &e, &f);
    // Q10 log2 of the energy per sample (the sum above is doubled, so the
    // divisor is 2 * 160: 8521 in Q10); stored as is, which reads as Q11 of
    // half the log.
    const Word16 log_en = sub(add(shl(e, 10), shr(f, 5)), 8521);

    st->log_en_hist_ptr = add(st->log_en_hist_ptr, 1);
    if (st->log_en_hist_ptr == kHist) st->log_en_hist_ptr = 0;
    st->log_en_hist[st->log_en_hist_ptr] = log_en;
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnbd_dtx(dec_state *st, dec_work *w, const int16_t **cursor) {
    const int32_t rx = w->rx.rx_type;
    const int32_t mode = st->prev_mode;

    // SID parameters have their own layout; every other frame is read with
    // the tables of its codec mode (a lost frame with the last mode).
    const bool sid_params = rx == RX_SID_UPDATE || rx == RX_SID_BAD;
    vamrnbd_bits2prm(sid_params ? MRDTX : mode, w->serial, w->prm);
    *cursor = w->prm;

    const auto prev = static_cast<dtx_global_state>(st->cn.dtxGlobalState);
    const dtx_global_state next = rx_dtx_handler(&st->cn, rx);
    w->dtx_state_prev = prev;

    if (next != SPEECH) {
        // Comfort noise replaces speech decoding: restart the speech state
        // so that the next talk spurt begins from a clean excitation.
        reset_dec(st, MRDTX);
        const cn_links io{w->cn_lsp_old,  st->mem_syn,     st->past_r_q,
                          st->past_lsf_q, st->past_qua_en, st->past_qua_en_MR122,
                          &st->hangVar,   &st->hangCount};
        dtx_dec(&st->cn, io, prev, next, mode, w->prm, dec_synth(w), w->Az);
    }
    st->cn.dtxGlobalState = next;
}

extern "C" void vamrnbd_dtx_dec_activity_update(dec_state *st, dec_work *w) {
    dtx_dec_activity_update(&st->cn, st->past_lsf_q, dec_synth(w));
}

extern "C" int16_t vamrnbd_pseudonoise(int32_t n, int32_t *seed) {
    Word32 s = *seed;
    Word16 out = 0;
    for (int32_t i = 0; i < n; ++i) {
        // Taps at bit 0 and bit 28; the feedback re-enters at bit 30.
        const Word32 fb = (s ^ (s >> 28)) & 1;
        out = static_cast<Word16>(shl(out, 1) | (s & 1));
        s = s >> 1;
        if (fb != 0) s |= 0x40000000;
    }
    *seed = s;
    return out;
}

extern "C" void vamrnbd_build_cn_code(int32_t *seed, int16_t cod[L_SUBFR]) {
    std::fill_n(cod, L_SUBFR, int16_t{0});
    // Ten pulses of +-4096, one on each track k, k + 10, k + 20, k + 30.
    for (int k = 0; k < 10; ++k) {
        const Word16 pos = static_cast<Word16>(vamrnbd_pseudonoise(2, seed) * 10 + k);
        cod[pos] = vamrnbd_pseudonoise(1, seed) > 0 ? 4096 : -4096;
    }
}
