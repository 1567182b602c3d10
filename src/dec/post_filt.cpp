// Post-filter of the decoder: per subframe a formant post-filter
// A(z/g1)/A(z/g2) on the synthesised speech with tilt compensation and
// adaptive gain control, then for the whole frame a 60 Hz high-pass filter
// that also doubles the signal.
#include <cstring>

#include "dec/dec_state.h"

#include "basic_op/ext_op.h"
#include "lpc/lpc.h"
#include "lpc/syn_core.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

constexpr Word16 MU = 26214;       // tilt compensation factor, 0.8
constexpr Word16 AGC_FAC = 29491;  // gain control smoothing, 0.9
constexpr int L_H = 22;            // truncated impulse response length

// First L_H samples of the impulse response of num(z) / den(z), with the
// synthesis filter's arithmetic (plain 32-bit sums, its range rule).
void impulse_response(const Word16 *num, const Word16 *den, Word16 *h) {
    Word16 buf[M + L_H] = {};  // zero memory ahead of the response
    Word16 *y = buf + M;
    for (int n = 0; n < L_H; ++n) {
        Word32 s = n <= M ? wrap_mul(den[0], num[n]) : 0;
        for (int i = 1; i <= M; ++i) s = wrap_sub(s, wrap_mul(den[i], y[n - i]));
        y[n] = syn::Plain::out(s, nullptr);
    }
    std::memcpy(h, y, L_H * sizeof(Word16));
}

// Scales the post-filtered subframe so that its energy follows the input's,
// with a smoothed gain.
void agc(post_filter_state *st, const Word16 *in, Word16 *out) {
    Word32 s = vamrnbd_energy_new(out);
    if (s == 0) {
        st->past_gain = 0;
        return;
    }
    // The gain factor is never negative, so g0 <= 3275; a smoothed gain in
    // 0 .. 32767 then stays there (at most 29490 + 3275), and the smoothing
    // needs no saturation.
    const int32_t g0 = mult(agc_gain(s, in), sub(32767, AGC_FAC));
    // smoothed gain per sample, then the scaling:
    // extract_h(l_shl(l_mult(x, g), 3)) is x g shifted down by 12, saturated
    int32_t gain = st->past_gain;
    for (int i = 0; i < L_SUBFR; ++i) {
        gain = ((gain * AGC_FAC) >> 15) + g0;
        const int32_t v = (int32_t{out[i]} * gain) >> 12;
        out[i] = static_cast<Word16>(v > 32767 ? 32767 : (v < -32768 ? -32768 : v));
    }
    st->past_gain = static_cast<Word16>(gain);
}

}  // namespace

namespace vamrnb {

// Output high-pass filter (second order, 60 Hz) with doubling of the signal.
// The recursive part keeps its past outputs as (hi, lo) pairs.  With these
// coefficients the feedback products and their sum cannot saturate, so they
// are formed directly.
//
// The feed-forward terms are then added with 32-bit wrap-around.  The true
// sum lies within +-3.56e9 (feedback at most 1.54e9 in size, feed-forward at
// most 2 * 32768 * (7699 + 15398 + 7699) = 2.02e9), so a wrapped sum s with
// |s| < 2^28 - 2^12 is the true sum.  Then no partial sum left 32 bits (the
// last two terms are below 2^29 and 2^30 in size), s * 4 and s * 8 stay in
// range and s * 8 + 0x8000 cannot overflow: the saturating chain gives s
// itself.  Larger sums take the saturating chain.
void post_process(post_filter_state *st, Word16 *sig) {
    const int32_t a1 = tab::post_pro_a[1], a2 = tab::post_pro_a[2];
    const int32_t b0 = tab::post_pro_b[0], b1 = tab::post_pro_b[1], b2 = tab::post_pro_b[2];
    constexpr uint32_t SAFE = (1u << 28) - (1u << 12);
    // the input with its two past samples in front, and the feed-forward
    // sums, which do not depend on the recursion (formed in one pass)
    Word16 in[L_FRAME + 2];
    in[0] = st->x1;
    in[1] = st->x0;
    std::memcpy(in + 2, sig, L_FRAME * sizeof(Word16));
    uint32_t ff[L_FRAME];
    for (int i = 0; i < L_FRAME; ++i)
        ff[i] = static_cast<uint32_t>(2 * in[i + 2] * b0) + static_cast<uint32_t>(2 * in[i + 1] * b1) +
                static_cast<uint32_t>(2 * in[i] * b2);
    int32_t y1_hi = st->y1_hi, y1_lo = st->y1_lo, y2_hi = st->y2_hi, y2_lo = st->y2_lo;
    for (int i = 0; i < L_FRAME; ++i) {
        const int32_t fb = 2 * (y1_hi * a1 + ((y1_lo * a1) >> 15)) +
                           2 * (y2_hi * a2 + ((y2_lo * a2) >> 15));
        const uint32_t wrapped = static_cast<uint32_t>(fb) + ff[i];
        Word32 L;
        if (wrapped + SAFE < 2 * SAFE) {
            L = static_cast<Word32>(wrapped);
            sig[i] = static_cast<Word16>((L * 8 + 0x8000) >> 16);
            L *= 4;
        } else {
            L = l_mac(l_mac(l_mac(fb, in[i + 2], static_cast<Word16>(b0)), in[i + 1], static_cast<Word16>(b1)),
                      in[i], static_cast<Word16>(b2));
            L = sat32(int64_t{L} * 4);
            sig[i] = round16(sat32(int64_t{L} * 2));
        }
        y2_hi = y1_hi;
        y2_lo = y1_lo;
        y1_hi = L >> 16;
        y1_lo = (L >> 1) & 0x7FFF;
    }
    st->y1_hi = static_cast<Word16>(y1_hi);
    st->y1_lo = static_cast<Word16>(y1_lo);
    st->y2_hi = static_cast<Word16>(y2_hi);
    st->y2_lo = static_cast<Word16>(y2_lo);
    st->x0 = in[L_FRAME + 1];
    st->x1 = in[L_FRAME];
}

}  // namespace vamrnb


extern "C" void vamrnbd_post_filt(dec_state *st, dec_work *w, int32_t mode) {
    post_filter_state *pf = &st->post;
    Word16 *syn = pf->synth_buf + M;  // input, with 10 past samples before it
    std::memcpy(syn, dec_synth(w), L_FRAME * sizeof(Word16));

    const bool high = (mode & ~1) == MR102;
    const Word16 *g_num = high ? tab::gamma3_MR122 : tab::gamma3;
    const Word16 *g_den = high ? tab::gamma4_MR122 : tab::gamma4;

    const Word16 *Az = w->Az;
    for (int i_subfr = 0; i_subfr < L_FRAME; i_subfr += L_SUBFR, Az += MP1) {
        Word16 Ap_num[MP1], Ap_den[MP1];
        vamrnb_weight_a(Az, g_num, M, Ap_num);
        vamrnb_weight_a(Az, g_den, M, Ap_den);

        vamrnb_residu(Ap_num, syn + i_subfr, pf->res2);

        // impulse response of the weighted filter pair, for the tilt
        Word16 h[L_H];
        impulse_response(Ap_num, Ap_den, h);
        Word32 L = l_mult(h[0], h[0]);
        for (int i = 1; i < L_H; ++i) L = l_mac(L, h[i], h[i]);
        const Word16 r0 = extract_h(L);
        L = l_mult(h[0], h[1]);
        for (int i = 1; i < L_H - 1; ++i) L = l_mac(L, h[i], h[i + 1]);
        Word16 r1 = extract_h(L);
        r1 = r1 <= 0 ? 0 : div_s(mult(r1, MU), r0);

        // tilt compensation 1 - r1 z^-1 on a copy with the memory in front;
        // r1 is never negative, so its products need no saturation
        Word16 *res = pf->res2;
        Word16 prev[L_SUBFR + 1];
        prev[0] = pf->mem_pre;
        std::memcpy(prev + 1, res, L_SUBFR * sizeof(Word16));
        pf->mem_pre = res[L_SUBFR - 1];
        for (int i = 0; i < L_SUBFR; ++i) {
            const int32_t v = prev[i + 1] - ((int32_t{r1} * prev[i]) >> 15);
            res[i] = static_cast<Word16>(v > 32767 ? 32767 : (v < -32768 ? -32768 : v));
        }

        Word16 *out = w->out + i_subfr;
        vamrnb_syn_filt(Ap_den, res, pf->mem_syn_pst, out);
        std::memcpy(pf->mem_syn_pst, out + L_SUBFR - M, M * sizeof(Word16));
        agc(pf, syn + i_subfr, out);
    }
    std::memcpy(pf->synth_buf, pf->synth_buf + L_FRAME, M * sizeof(Word16));
    post_process(pf, w->out);
}
