// SID scheduling: turns the mode that the DTX decision left for a frame into
// the transmitted frame type.  The first MRDTX frame after speech is a
// SID_FIRST; later MRDTX frames are sent as no data except every eighth one
// (the first of them three frames after SID_FIRST), which carries a
// SID_UPDATE.
#include "vad/sid_sync.h"

#include "format/frame_format.h"

namespace vamrnb {
namespace {

constexpr int32_t MODE_DTX = 8;
constexpr int32_t TX_SPEECH = 0, TX_FIRST = 1, TX_UPDATE = 2, TX_NONE = 3;
constexpr int16_t UPDATE_PERIOD = 8;
constexpr int16_t FIRST_UPDATE_DELAY = 3;

}  // namespace

void sid_sync_init(sid_sync_state *st) {
    st->sid_update_rate = UPDATE_PERIOD;
    st->sid_update_counter = FIRST_UPDATE_DELAY;
    st->sid_handover_debt = 0;
    st->tx_type = TX_SPEECH;
}

int32_t tx_type_select(sid_sync_state *st, int32_t *prev_tx_type, int32_t used_mode) {
    int32_t type;
    if (used_mode != MODE_DTX) {
        st->sid_update_counter = UPDATE_PERIOD;
        type = TX_SPEECH;
    } else {
        // The counter stays a 16-bit value; it only ever runs between 0 and 8.
        st->sid_update_counter = static_cast<int16_t>(st->sid_update_counter - 1);
        if (*prev_tx_type == TX_SPEECH) {
            type = TX_FIRST;
            st->sid_update_counter = FIRST_UPDATE_DELAY;
        } else if (st->sid_handover_debt > 0 && st->sid_update_counter > 2) {
            // Extra updates owed, kept clear of a preceding SID_FIRST.
            type = TX_UPDATE;
            st->sid_handover_debt = static_cast<int16_t>(st->sid_handover_debt - 1);
        } else if (st->sid_update_counter == 0) {
            type = TX_UPDATE;
            st->sid_update_counter = UPDATE_PERIOD;
        } else {
            type = TX_NONE;
        }
    }
    st->tx_type = type;
    *prev_tx_type = type;
    return type;
}

}  // namespace vamrnb
