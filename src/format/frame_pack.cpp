// Frame packing on the encoder side: turns the parameter vector into one bit
// per word in codec order, then writes the storage-format frame (the
// table-of-contents byte, the bits in order of importance, a SID frame's
// type indicator and mode indication, zero padding to the byte boundary)
// through the bit-stream writer.
#include <cstring>

#include "common/checks.h"
#include "format/frame_format.h"

using namespace vamrnb;

extern "C" {

// In place: on entry `prm` holds the parameters of `mode` (0..8), on return
// its first 244 entries hold their bits, each parameter most significant bit
// first, and zeros after the last bit.
VAMRNB_API void vamrnbe_prm2bits(int32_t mode, int16_t *prm) {
    VAMRNB_REQUIRE(prm);
    Word16 bits[SERIAL_SIZE] = {};
    if (mode >= 0 && mode <= 9) {
        const int count = vamrnb_tbl_prmno[mode];
        const int16_t *width = vamrnb_tbl_bitno[mode];
        int pos = 0;
        for (int i = 0; i < count; ++i) {
            const uint32_t value = static_cast<uint16_t>(prm[i]);
            for (int b = width[i] - 1; b >= 0 && pos < SERIAL_SIZE; --b)
                bits[pos++] = static_cast<Word16>((value >> b) & 1u);
        }
    }
    std::memcpy(prm, bits, MAX_FRAME_BITS * sizeof(Word16));
}

VAMRNB_API void vamrnbe_bs_pack(vcmn_bsw *writer, const int16_t *bits, int32_t mode,
                                int32_t *used_mode, int32_t tx_type, const sid_sync_state *sid) {
    VAMRNB_REQUIRE(writer);
    VAMRNB_REQUIRE(bits);
    VAMRNB_REQUIRE(used_mode);
    int32_t ft = *used_mode;
    if (ft < 0 || ft > FT_NO_DATA || (ft > FT_SID && ft < FT_NO_DATA)
        || (tx_type == TX_NO_DATA && ft == FT_SID)) {
        ft = FT_NO_DATA;
        *used_mode = FT_NO_DATA;
    }

    vcmn_bsw_write(writer, vamrnb_tbl_toc_byte[ft], 8);
    if (ft == FT_NO_DATA) return;

    const int16_t *order = vamrnb_tbl_sort_ptr[ft];
    const int nbits = vamrnb_tbl_unpacked_size[ft];
    for (int j = 0; j < nbits; ++j) vcmn_bsw_write1(writer, bits[order[j]] == 1 ? 1u : 0u);

    if (ft == FT_SID) {
        // Type indicator (1: update) from the SID scheduling state (the
        // frame's TX type stands in when there is none), then the requested
        // mode, least significant bit first.
        const int32_t sid_type = sid ? sid->tx_type : tx_type;
        vcmn_bsw_write1(writer, sid_type == TX_SID_UPDATE ? 1u : 0u);
        for (int b = 0; b < 3; ++b) vcmn_bsw_write1(writer, static_cast<uint32_t>(mode >> b) & 1u);
    }

    // Padding one bit at a time: with a buffer that is too small the writer
    // then refuses each bit instead of running past the end.
    for (int j = 0; j < vamrnb_tbl_unused_size[ft]; ++j) vcmn_bsw_write1(writer, 0);
}

}  // extern "C"
