// Choice of the transmitted frame type during DTX: after the last speech
// frame a SID_FIRST, then no-data frames with a SID_UPDATE on the third frame
// and on every eighth frame after it.
#pragma once

#include <cstdint>

struct sid_sync_state;

namespace vamrnb {

// Initial schedule: update rate 8, counter 3, no extra updates owed, last
// type speech.
void sid_sync_init(sid_sync_state *st);

// TX type (0 speech, 1 SID_FIRST, 2 SID_UPDATE, 3 no data) of a frame coded in
// `used_mode` (8 for MRDTX).  Updates the schedule, stores the type in
// st->tx_type and in *prev_tx_type, and returns it.
int32_t tx_type_select(sid_sync_state *st, int32_t *prev_tx_type, int32_t used_mode);

}  // namespace vamrnb
