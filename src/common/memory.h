// Instance memory: 32-byte-aligned blocks from the platform heap
// (vcmn_malloc_align32 / vcmn_mfree_align32) and the strided block copy
// vcmn_blk_mcpy.  The declarations live in the public vamrnb_dsp.h.
#pragma once

#include "vamrnb_dsp.h"
