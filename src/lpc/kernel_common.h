// Shared logic of the vector versions of the kernels, for every
// architecture: range bounds that let a vector sum in any order, the scalar
// fallbacks for inputs that fail them, and the scalar set-up and finishing
// steps around the vector loops.
//
// The correlation kernels accumulate with saturation in sequence; a vector version may
// sum in any order only when no partial sum can reach the 32-bit rails.  By
// Cauchy-Schwarz every partial sum of 2·x[j]·y[j] is bounded by
// 2·sqrt(sum x^2 · sum y^2), so when 4·Ex·Ey stays below 2^62 - 2^33 the
// exact sum is the saturating one.
#pragma once

#include <cstdint>

#include "basic_op/basic_op.h"
#include "lpc/tables.h"

namespace vamrnb::enc_kernel {

// True when a dot product of vectors with energies ex and ey (sums of
// squares, exact) cannot saturate at any step.  Decided in double with a
// margin far above its rounding error.
inline bool no_saturation(int64_t ex, int64_t ey) {
    constexpr double kLimit = 4.6e18;   // below (2^31 - 1)^2 = 4.6117e18
    return 4.0 * static_cast<double>(ex) * static_cast<double>(ey) < kLimit;
}

inline int64_t sum_sq(const Word16 *x, int n) {
    int64_t s = 0;
    for (int i = 0; i < n; ++i) s += int64_t{x[i]} * x[i];
    return s;
}

// The sequential saturating forms, for inputs that fail the test.
inline Word32 dot_sat(const Word16 *x, const Word16 *y, int n) {
    Word32 t = 0;
    for (int j = 0; j < n; ++j) t = l_mac(t, x[j], y[j]);
    return t;
}

// ---- dot products with any summation order --------------------------------
// inner_product's running sum saturates nowhere when |init| plus the sum of
// all |terms| fits in 32 bits; then it is the exact sum.  A vector version
// forms the exact sum of the first n8 samples (`lanes`) and the largest
// magnitudes of x and y among them (`max_x`, `max_y`); this completes the
// tail and the bound, and hands inputs that fail it to the sequential
// portable version.
inline Word32 inner_product_finish(const Word16 *x, const Word16 *y, Word32 n, Word32 n8, Word32 init,
                                   int64_t lanes, int64_t max_x, int64_t max_y,
                                   Word32 (*sequential)(const Word16 *, const Word16 *, Word32, Word32)) {
    int64_t tail = 0;
    for (Word32 i = n8; i < n; ++i) {
        const int64_t px = x[i] < 0 ? -int64_t{x[i]} : x[i];
        const int64_t py = y[i] < 0 ? -int64_t{y[i]} : y[i];
        max_x = px > max_x ? px : max_x;
        max_y = py > max_y ? py : max_y;
        tail += int64_t{x[i]} * y[i];
    }
    const int64_t abs_init = init < 0 ? -int64_t{init} : init;
    if (abs_init + 2 * int64_t{n} * max_x * max_y > MAX_32) return sequential(x, y, n, init);
    return static_cast<Word32>(init + 2 * (lanes + tail));
}

// The same from the lanes as stored: four partial sums, eight maxima each.
inline Word32 inner_product_finish(const Word16 *x, const Word16 *y, Word32 n, Word32 n8, Word32 init,
                                   const uint16_t ax[8], const uint16_t ay[8], const int32_t sums[4],
                                   Word32 (*sequential)(const Word16 *, const Word16 *, Word32, Word32)) {
    int64_t max_x = 0, max_y = 0;
    for (int k = 0; k < 8; ++k) {
        max_x = ax[k] > max_x ? ax[k] : max_x;
        max_y = ay[k] > max_y ? ay[k] : max_y;
    }
    const int64_t lanes = int64_t{sums[0]} + sums[1] + sums[2] + sums[3];
    return inner_product_finish(x, y, n, n8, init, lanes, max_x, max_y, sequential);
}

// Open-loop correlations: corr[-lag] for lag_max down to lag_min; exact_dot
// forms 2·sum x·y without saturation (only called when that is safe).
template <class ExactDot>
inline void comp_corr(const Word16 *x, Word32 len, Word32 lag_max, Word32 lag_min, Word32 *corr,
                      ExactDot exact_dot) {
    const int64_t ex = sum_sq(x, len);
    int64_t ed = sum_sq(x - lag_max, len);
    for (Word32 lag = lag_max; lag >= lag_min; --lag) {
        const Word16 *d = x - lag;
        corr[-lag] = no_saturation(ex, ed) ? exact_dot(x, d, len) : dot_sat(x, d, len);
        // Window of the next (shorter) lag: drop x[-lag], take in x[len-lag].
        ed += int64_t{x[len - lag]} * x[len - lag] - int64_t{x[-lag]} * x[-lag];
    }
}

// ---- fractional delay -------------------------------------------------------
// Start of the interpolation for delay T0 and fraction frac (1/3 grid when
// flag3 is set, 1/6 otherwise): returns the past sample the first output is
// centred on, and gives the ten taps applied backwards from it (c1) and the
// ten applied forwards from the sample after it (c2), Q15.
inline const Word16 *pred_lt_taps(Word32 T0, Word32 frac, Word32 flag3, const Word16 *exc, Word16 c1[10],
                                  Word16 c2[10]) {
    Word32 f = -frac;
    if (flag3 != 0) f *= 2;   // 1/3 grid onto the 1/6 grid
    const Word16 *x0 = exc - T0;
    if (f < 0) {
        f += 6;
        --x0;
    }
    for (int i = 0; i < 10; ++i) {
        c1[i] = vamrnb_tbl_pred_inter_6[f + 6 * i];
        c2[i] = vamrnb_tbl_pred_inter_6[6 - f + 6 * i];
    }
    return x0;
}

// Convolution output of an exact sum: saturating shift by 3, high half.
inline Word16 convolve_out(Word32 s) { return extract_h(l_shl(s, 3)); }

// Sequential form of the convolution (x, h, y: 40 samples).
inline void convolve_sat(const Word16 *x, const Word16 *h, Word16 *y) {
    for (int n = 0; n < 40; ++n) {
        Word32 s = 0;
        for (int i = 0; i <= n; ++i) s = l_mac(s, x[i], h[n - i]);
        y[n] = convolve_out(s);
    }
}

// ---- backward filtering of the target (codebook search) ---------------------
// y[i] = sum_{j >= i} 2·x[j]·h[j-i], i = 0..39, then scaled so that the sum of
// the five track maxima (tracks of step 5) is normalised, minus sf bits.

inline void cor_h_x_sat(const Word16 *h, const Word16 *x, Word32 y[40]) {
    for (int i = 0; i < 40; ++i) {
        Word32 s = 0;
        for (int j = i; j < 40; ++j) s = l_mac(s, x[j], h[j - i]);
        y[i] = s;
    }
}

inline void cor_h_x_scale(const Word32 y[40], Word16 *dn, Word32 sf) {
    Word32 tot = 5;
    for (int k = 0; k < 5; ++k) {
        Word32 max = 0;
        for (int i = k; i < 40; i += 5) {
            const Word32 a = l_abs(y[i]);
            if (a > max) max = a;
        }
        tot = l_add(tot, l_shr(max, 1));
    }
    const Word16 j = sub(norm_l(tot), static_cast<Word16>(sf));
    for (int i = 0; i < 40; ++i) dn[i] = round16(l_shl(y[i], j));
}

// h reversed and padded for lane-parallel backward filtering: q[39 - m] = h[m]
// for m = 0..39, zeros after, so that lane i+k of step j reads q[39 + i + k - j].
inline void cor_h_x_reverse(const Word16 *h, Word16 *q, int len) {
    for (int t = 0; t < len; ++t) q[t] = t < 40 ? h[39 - t] : 0;
}

// ---- split-VQ searches ------------------------------------------------------
// A 4-component row search: the weighted distance of (r - row) (or of
// (r + row) for the negated rows of the signed search) is
// sum 2·mult(w[k], diff[k])^2, saturating; the first row with the strictly
// smallest distance wins, the row before its negation.

struct VqPick {
    int index;
    int sign;   // 1: the negated row
    Word32 dist;
};

inline Word32 vq_dist(const Word16 r[4], const Word16 w[4], const Word16 *row, bool negated) {
    Word32 d = 0;
    for (int k = 0; k < 4; ++k) {
        const Word16 t = mult(w[k], negated ? add(r[k], row[k]) : sub(r[k], row[k]));
        d = l_mac(d, t, t);
    }
    return d;
}

// Continues a search over rows [from, size) after a vector part that ended
// with `best`.
inline VqPick vq_tail(const Word16 r[4], const Word16 w[4], const Word16 *dico, int from, int size,
                      bool is_signed, VqPick best) {
    for (int i = from; i < size; ++i) {
        const Word16 *row = dico + 4 * i;
        Word32 d = vq_dist(r, w, row, false);
        if (d < best.dist) best = {i, 0, d};
        if (is_signed) {
            d = vq_dist(r, w, row, true);
            if (d < best.dist) best = {i, 1, d};
        }
    }
    return best;
}

// Lane results to one pick: the smallest distance, the lowest row among
// equal distances.
inline VqPick vq_join(const Word32 dist[4], const int32_t index[4], const int32_t sign[4]) {
    VqPick p{0, 0, MAX_32};
    bool any = false;
    for (int k = 0; k < 4; ++k) {
        if (index[k] < 0) continue;   // lane never improved on the start value
        if (!any || dist[k] < p.dist || (dist[k] == p.dist && index[k] < p.index)) {
            p = {index[k], sign[k], dist[k]};
            any = true;
        }
    }
    return p;
}

// The chosen row (negated for sign 1) written back over the residuals; the
// returned code is the row index, doubled plus the sign for the signed search.
inline int16_t vq_finish(Word16 *r1, Word16 *r2, const Word16 *dico, VqPick p, bool is_signed) {
    const Word16 *pick = dico + 4 * p.index;
    Word16 v[4];
    for (int k = 0; k < 4; ++k) v[k] = p.sign ? negate(pick[k]) : pick[k];
    r1[0] = v[0];
    r1[1] = v[1];
    r2[0] = v[2];
    r2[1] = v[3];
    return is_signed ? add(shl(static_cast<Word16>(p.index), 1), static_cast<Word16>(p.sign))
                     : static_cast<Word16>(p.index);
}

}  // namespace vamrnb::enc_kernel
