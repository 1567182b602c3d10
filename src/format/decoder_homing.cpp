// Decoder homing tests: does a received frame carry the fixed parameter
// pattern that asks the decoder to return to its initial state?  One test
// looks only at the parameters up to the end of the first subframe (enough
// to decide early while the previous frame was already a homing frame), the
// other at the whole frame.
#include "common/checks.h"
#include "format/frame_format.h"

using namespace vamrnb;

namespace {

// 1 when the first `count` parameters of `serial` (mode 0..7) equal the
// homing pattern.  Each parameter is read only when all before it matched,
// so that a speech frame is usually rejected after its first one.
int32_t homing_prefix_matches(const int16_t *serial, int32_t mode, int count) {
    if (count < 1) return 1;
    if (mode < 0 || mode > 7) return 0;
    const int16_t *width = vamrnb_tbl_bitno[mode];
    const int16_t *pattern = tab::homing_frame_params[mode];
    for (int j = 0; j < count; ++j) {
        int32_t v = 0;
        for (int b = 0; b < width[j]; ++b) v = (v << 1) | (*serial++ == 1 ? 1 : 0);
        if (v != pattern[j]) return 0;
    }
    return 1;
}

}  // namespace

extern "C" {

VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test_first(const int16_t *serial, int32_t mode) {
    VAMRNB_REQUIRE(serial);
    if (mode < 0 || mode > 8) return 0;
    return homing_prefix_matches(serial, mode, vamrnb_tbl_prmnofsf[mode]);
}

VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test(const int16_t *serial, int32_t mode) {
    VAMRNB_REQUIRE(serial);
    if (mode < 0 || mode > 9) return 0;
    return homing_prefix_matches(serial, mode, vamrnb_tbl_prmno[mode]);
}

}  // extern "C"
