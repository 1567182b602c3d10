// Plain-integer scoring of the joint gain-table searches, and the bound
// that decides when it equals the saturating score.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstdlib>

#include "basic_op/basic_op.h"

namespace vamrnb::gain_vq {

// The gain searches score every table row by terms mpy_32_16(hi, lo, g)
// summed with saturation, where g is a gain product and lo (the low half of
// l_extract) lies in [0, 32767].  Such a term is 2*(hi*g + (lo*g >> 15))
// with |term| <= 2*(|hi| + 1)*|g|, and the pitch and code gains are
// non-negative, so mult() of them is (a*b) >> 15.  When these bounds, with g
// at its largest over the table, show that no partial sum can leave 32 bits
// the score is the plain integer sum, formed in any order.
struct gain_bounds {
    int32_t pitch, code;   // largest pitch gain and code factor of a table
};

inline gain_bounds table_bounds(const int16_t *tbl, int rows, int col_pitch, int col_code) {
    gain_bounds b{0, 0};
    for (int i = 0; i < rows; ++i) {
        const int16_t *row = tbl + 4 * i;
        b.pitch = std::max(b.pitch, std::abs(int32_t{row[col_pitch]}));
        b.code = std::max(b.code, std::abs(int32_t{row[col_code]}));
    }
    return b;
}

// Largest magnitudes of the five gain products of one subframe, in the
// order of the coefficients: g_pitch^2, g_pitch, g_code^2, g_code, g_pitch*g_code.
inline void gain_product_bounds(gain_bounds b, Word16 gcode0, int64_t *g) {
    const int64_t gc = ((b.code * int64_t{gcode0}) >> 15) + 1;
    g[0] = ((int64_t{b.pitch} * b.pitch) >> 15) + 1;
    g[1] = b.pitch;
    g[2] = ((gc * gc) >> 15) + 1;
    g[3] = gc;
    g[4] = ((gc * b.pitch) >> 15) + 1;
}

// With g >= 0 a term has the sign of hi (for hi < 0, lo*g >> 15 < g <= -hi*g),
// so every partial sum, also halfway through a term, lies between the sum
// of the negative terms' bounds and that of the positive ones.
inline bool terms_fit(const Word16 *hi, const int64_t *g, int n) {
    int64_t pos = 0, neg = 0;
    for (int k = 0; k < n; ++k) {
        if (hi[k] >= 0) {
            pos += 2 * (int64_t{hi[k]} + 1) * g[k];
        } else {
            neg -= 2 * int64_t{hi[k]} * g[k];
        }
    }
    return pos <= MAX_32 && -neg >= MIN_32;
}

// One subframe's share of a row's score in plain arithmetic (see above).
inline int32_t row_score(const Word16 *hi, const Word16 *lo, int32_t g_pitch, int32_t g_code) {
    const int32_t g[5] = {(g_pitch * g_pitch) >> 15, g_pitch, (g_code * g_code) >> 15, g_code,
                          (g_code * g_pitch) >> 15};
    int32_t s = 0;
    for (int k = 0; k < 5; ++k) s += hi[k] * g[k] + ((lo[k] * g[k]) >> 15);
    return 2 * s;
}

}  // namespace vamrnb::gain_vq
