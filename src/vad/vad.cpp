// Per-frame voice activity entry point: runs the configured detector on the
// newest frame and then the DTX hangover decision, which keeps a frame in
// speech mode for a few frames after activity ends (so the receiver can
// analyse the noise) or hands it to the SID encoder.
#include "vad/vad.h"

#include "common/enc_state.h"

namespace vamrnb {
namespace {

// Silent frames whose SID analysis is close enough to the previous one to
// skip the extra hangover: elapsed + remaining hangover must stay below this.
constexpr Word16 ELAPSED_LIMIT = 30;
constexpr int32_t MODE_DTX = 8;

}  // namespace

Word16 dtx_hangover(dtx_enc_state *st, Word16 vad_flag, int32_t *used_mode) {
    st->elapsed_count = add(st->elapsed_count, 1);   // saturates at 32767
    if (vad_flag != 0) {
        st->dtx_hangover_count = DTX_HANG_FRAMES;
        return 0;
    }
    if (st->dtx_hangover_count == 0) {
        st->elapsed_count = 0;
        *used_mode = MODE_DTX;
        return 1;
    }
    st->dtx_hangover_count = sub(st->dtx_hangover_count, 1);
    if (add(st->elapsed_count, st->dtx_hangover_count) < ELAPSED_LIMIT) *used_mode = MODE_DTX;
    return 0;
}

}  // namespace vamrnb

extern "C" void vamrnbe_vad(vamrnb_encoder *st, vamrnb::enc_frame *fr) {
    using namespace vamrnb;
    Word16 *fresh = st->old_speech + ENC_NEW_SPEECH;

    Word16 flag;
    if (st->config.enc.vad_option == 1) {
        // Both halves always run so the detector state advances twice.
        const Word16 first = vad2(fresh, &st->vad.v2);
        const Word16 second = vad2(fresh + L_FRAME / 2, &st->vad.v2);
        flag = (first != 0 || second != 0) ? 1 : 0;
    } else {
        flag = vad1(&st->vad.v1, fresh);
    }
    fr->vad_flag = flag;
    fr->compute_sid = dtx_hangover(&st->dtx, flag, &fr->used_mode);
}
