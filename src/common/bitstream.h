// Bit-stream reader (vcmn_bsr: most significant bit first, with a least
// significant bit first twin) and writer (vcmn_bsw).  The records and
// functions are declared in the public vamrnb_dsp.h; this header adds the
// byte counts that the frame drivers report.
#pragma once

#include <cstdint>

#include "vamrnb_dsp.h"

namespace vamrnb {

// Whole bytes the reader has consumed: the bytes fetched minus the whole
// bytes still waiting in the cache.
inline uint32_t bsr_bytes_consumed(const vcmn_bsr *bs) {
    return static_cast<uint32_t>(bs->ptr - bs->start) - static_cast<uint32_t>(bs->bits / 8);
}

// Bytes the writer has completed.
inline uint32_t bsw_bytes_written(const vcmn_bsw *bs) {
    return static_cast<uint32_t>(bs->ptr - bs->start);
}

}  // namespace vamrnb
