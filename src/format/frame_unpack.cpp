// Frame unpacking on the decoder side: reads one storage-format frame (the
// table-of-contents byte, then the class bits in order of importance) from
// the bit-stream reader, scatters the bits into `serial` in codec order and
// classifies the frame; and converts `serial` into the parameter vector.
#include "common/checks.h"
#include "format/frame_format.h"

using namespace vamrnb;

extern "C" {

VAMRNB_API void vamrnbd_unpack_bits(vcmn_bsr *reader, rx_frame_class *cls, int32_t *mode,
                                    int16_t serial[250]) {
    VAMRNB_REQUIRE(reader);
    VAMRNB_REQUIRE(cls);
    VAMRNB_REQUIRE(mode);
    VAMRNB_REQUIRE(serial);
    const uint32_t toc = vcmn_bsr_read(reader, 8);
    const int ft = static_cast<int>((toc >> 3) & 15);
    cls->quality = static_cast<int32_t>((toc >> 2) & 1);
    cls->frame_mode = ft;

    if (ft > FT_SID) {
        // Nothing this decoder can use follows: only the byte above is read.
        cls->rx_type = RX_NO_DATA;
        return;
    }

    // The loop reads one bit ahead, so it ends holding the bit after the
    // class bits: the first padding bit, or a SID frame's type indicator.
    // A missing bit (input too short) reads as 1.
    const int16_t *order = vamrnb_tbl_sort_ptr[ft];
    const int nbits = vamrnb_tbl_unpacked_size[ft];
    uint32_t x = vcmn_bsr_read1(reader);
    for (int i = 0; i < nbits; ++i) {
        serial[order[i]] = static_cast<int16_t>(x & 1);
        x = vcmn_bsr_read1(reader);
    }

    if (ft < FT_SID) {
        cls->rx_type = cls->quality ? RX_SPEECH_GOOD : RX_SPEECH_BAD;
        *mode = ft;
        return;
    }

    cls->rx_type = cls->quality ? static_cast<int32_t>(RX_SID_FIRST + (x & 1)) : RX_SID_BAD;
    // The mode indication travels least significant bit first: the caller's
    // word gets the bits as read, frame_mode the codec mode they stand for.
    const uint32_t m = vcmn_bsr_read(reader, 3) & 7;
    *mode = static_cast<int32_t>(m);
    cls->frame_mode = static_cast<int32_t>(((m & 1) << 2) | (m & 2) | (m >> 2));
}

VAMRNB_API void vamrnbd_bits2prm(int32_t mode, const int16_t *serial, int16_t *prm) {
    VAMRNB_REQUIRE(serial);
    VAMRNB_REQUIRE(prm);
    if (mode < 0 || mode > 9) return;
    const int count = vamrnb_tbl_prmno[mode];
    if (count < 1) return;
    const int16_t *width = vamrnb_tbl_bitno[mode];
    for (int j = 0; j < count; ++j) {
        uint32_t v = 0;
        for (int b = 0; b < width[j]; ++b) v = (v << 1) | (*serial++ == 1 ? 1u : 0u);
        prm[j] = static_cast<int16_t>(v);
    }
}

}  // extern "C"
