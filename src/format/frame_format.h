// Storage-format frames: classification of a received frame, the encoder's
// SID scheduling state that the packer reads, and the sizes of the vectors
// that carry a frame as single bits (`serial`) and as parameters (`prm`).
// The functions themselves (vamrnbd_unpack_bits, vamrnbd_bits2prm, the two
// homing tests, vamrnbe_prm2bits, vamrnbe_bs_pack) are declared in the public
// vamrnb_dsp.h with C linkage.
#pragma once

#include <cstdint>

#include "vamrnb.h"
#include "vamrnb_dsp.h"
#include "format/frame_tables.h"
#include "basic_op/basic_op.h"

// What the unpacker learns about a received frame.  The decoder embeds this
// in its working record.
struct rx_frame_class {
    int32_t quality;     // Q bit of the table-of-contents byte: 1 good, 0 bad
    int32_t frame_mode;  // speech: FT (= mode); SID: the mode indication;
                         // other frames: the raw FT (9..15)
    int32_t rx_type;     // RX_SPEECH_GOOD, RX_SPEECH_BAD, RX_SID_*, RX_NO_DATA
};

// SID scheduling state of the encoder; the packer reads only tx_type.
struct sid_sync_state {
    int16_t sid_update_rate;
    int16_t sid_update_counter;
    int16_t sid_handover_debt;
    int32_t tx_type;
};

namespace vamrnb {

inline constexpr int FT_SID = 8;          // payload frame type of a SID frame
inline constexpr int FT_NO_DATA = 15;     // payload frame type of a no-data frame
inline constexpr int SERIAL_SIZE = 250;   // decoder's serial vector, one bit per entry
inline constexpr int MAX_FRAME_BITS = 244;  // bits of the largest frame (MR122)
inline constexpr int MAX_PRM = 71;        // room for the parameters of any mode
inline constexpr int MAX_PACKED_BYTES = 32;  // largest storage-format frame

}  // namespace vamrnb
