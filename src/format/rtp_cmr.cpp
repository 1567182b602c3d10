// Codec mode requests: keeps the mode the peer asked for, mapped into the
// negotiated mode set, and moves the encoder there at the change
// opportunities the session allows (every frame, or every other frame), in
// one jump or one neighbouring mode of the set at a time.
#include "format/rtp_payload.h"

namespace {

// Highest mode of the set not above `mode`; the lowest of the set when the
// set has nothing that low.  The set is never empty here.
int32_t fit(uint32_t set, int32_t mode) {
    for (int32_t m = mode; m >= 0; --m)
        if (set & (1u << m)) return m;
    for (int32_t m = 0; m < 8; ++m)
        if (set & (1u << m)) return m;
    return 0;
}

// The next mode of the set from `from` in the direction of `to`.
int32_t step(uint32_t set, int32_t from, int32_t to) {
    const int32_t dir = to > from ? 1 : -1;
    for (int32_t m = from + dir; m != to; m += dir)
        if (set & (1u << m)) return m;
    return to;
}

}  // namespace

extern "C" {

VAMRNB_API int32_t vamrnb_rtp_cmr_init(vamrnb_rtp_cmr_state *state,
                                       const vamrnb_rtp_params *params, int32_t mode) {
    if (!state || !params || mode < MR475 || mode > MR122) return VAMRNB_RTP_ERR_ARGUMENT;
    const uint32_t set = params->mode_set & 0xFFu;
    if (set == 0) return VAMRNB_RTP_ERR_ARGUMENT;
    state->mode_set = set;
    state->period = params->mode_change_period > 1 ? params->mode_change_period : 1;
    state->neighbor = params->mode_change_neighbor ? 1 : 0;
    state->mode = fit(set, mode);
    state->target = state->mode;
    state->frame = 0;
    return AMRNB_OK;
}

VAMRNB_API void vamrnb_rtp_cmr_request(vamrnb_rtp_cmr_state *state, int32_t cmr) {
    if (!state || cmr < MR475 || cmr > MR122) return;
    state->target = fit(state->mode_set, cmr);
}

VAMRNB_API int32_t vamrnb_rtp_cmr_next(vamrnb_rtp_cmr_state *state, vamrnb_encoder *enc) {
    if (!state) return MR475;
    if (state->mode != state->target
        && state->frame % static_cast<uint32_t>(state->period) == 0)
        state->mode = state->neighbor ? step(state->mode_set, state->mode, state->target)
                                      : state->target;
    ++state->frame;
    if (enc) vamrnbe_set_mode(enc, state->mode);
    return state->mode;
}

}  // extern "C"
