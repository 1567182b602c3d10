// Library-wide entry points: the initialisation flag and the platform hooks.
// None of them allocates anything; instances work whether or not the library
// was initialised.
#include "vamrnb.h"
#include "vamrnb_dsp.h"

extern "C" {

VAMRNB_API int32_t vamrnb_inited = 0;

VAMRNB_API int32_t vamrnb_platform_init(int32_t *out) {
    if (out) *out = 0;
    return 0;
}

// Nothing to undo: the identity, like vamrnb_l_deposit_l.
VAMRNB_API int32_t vamrnb_platform_deinit(int32_t value) { return vamrnb_l_deposit_l(value); }

VAMRNB_API int32_t vamrnb_init(void) {
    if (vamrnb_inited == 0) vamrnb_inited = 1;
    return 0;
}

VAMRNB_API void vamrnb_deinit(void) {
    if (vamrnb_inited != 0) vamrnb_inited = 0;
}

}  // extern "C"
