// Median of up to nine Word16 values, found by repeatedly extracting the
// largest remaining value (ties: the last occurrence is taken first).
#include "lpc/lpc.h"

using namespace vamrnb;

extern "C" int16_t vamrnb_gmed_n(const int16_t *ind, int16_t n) {
    constexpr int kMax = 9;
    if (n > kMax) n = kMax;
    if (n < 1) return 0;
    Word16 work[kMax];
    int order[kMax];
    for (int i = 0; i < n; ++i) work[i] = ind[i];
    // The index carries over between rounds: a round that finds nothing at
    // or above -32767 (only -32768 left) records the previous round's index.
    int ix = 0;
    for (int i = 0; i < n; ++i) {
        Word16 best = -32767;
        for (int j = 0; j < n; ++j) {
            if (work[j] >= best) {
                best = work[j];
                ix = j;
            }
        }
        work[ix] = MIN_16;
        order[i] = ix;
    }
    return ind[order[n >> 1]];
}
