// Decoder fast paths that skip saturation against the saturating arithmetic
// they replace, driven at, just inside and past the bounds that allow them.
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "dec/post_state.h"
#include "lpc/tables.h"

using namespace vamrnb;

namespace {

// The output high-pass filter with every sum saturated.
void post_process_model(post_filter_state *st, Word16 *sig) {
    for (int i = 0; i < 160; ++i) {
        const Word16 x2 = st->x1;
        st->x1 = st->x0;
        st->x0 = sig[i];
        Word32 L = l_mult(st->y1_hi, tab::post_pro_a[1]);
        L = l_mac(L, mult(st->y1_lo, tab::post_pro_a[1]), 1);
        L = l_mac(L, st->y2_hi, tab::post_pro_a[2]);
        L = l_mac(L, mult(st->y2_lo, tab::post_pro_a[2]), 1);
        L = l_mac(L, st->x0, tab::post_pro_b[0]);
        L = l_mac(L, st->x1, tab::post_pro_b[1]);
        L = l_mac(L, x2, tab::post_pro_b[2]);
        L = l_shl(L, 2);
        sig[i] = round16(l_shl(L, 1));
        st->y2_hi = st->y1_hi;
        st->y2_lo = st->y1_lo;
        st->y1_hi = extract_h(L);
        st->y1_lo = extract_l(l_msu(l_shr(L, 1), st->y1_hi, 16384));
    }
}

}  // namespace

TEST(DecFastPaths, OutputHighPassMatchesSaturatingFilterFromQuietToRails) {
    std::mt19937 rng(12);
    // amplitudes around the fast path's bound (a doubled output near 2^14)
    // and far past it, then square waves on the rails that saturate
    for (int amp : {0, 100, 8000, 16000, 16500, 20000, 32767}) {
        post_filter_state fast{}, model{};
        for (int frame = 0; frame < 20; ++frame) {
            Word16 a[160], b[160];
            for (int i = 0; i < 160; ++i) {
                const int v = amp == 32767 ? ((i / (1 + frame % 7)) % 2 ? 32767 : -32768)
                                           : static_cast<int>(rng() % (2u * amp + 1)) - amp;
                a[i] = b[i] = static_cast<Word16>(v);
            }
            post_process(&fast, a);
            post_process_model(&model, b);
            ASSERT_EQ(0, std::memcmp(a, b, sizeof a)) << "amplitude " << amp << " frame " << frame;
            ASSERT_EQ(0, std::memcmp(&fast, &model, sizeof fast)) << "amplitude " << amp;
        }
    }
}
