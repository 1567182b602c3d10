// Conversions between line spectral frequencies and their cosine-domain line
// spectral pairs by table interpolation, and the minimum-gap ordering that
// every newly formed LSF vector goes through before it is converted.
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr Word16 kLsfGap = 205;        // 50 Hz in the 0..16384 LSF scale
constexpr int kCosLast = 64;           // last entry of the 65-entry cosine table

}  // namespace
}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnb_sf_sp(const int16_t lsf[10], const int16_t *table, int16_t lsp[10]) {
    // Copy first so that lsf and lsp may be the same array.
    Word16 v[M];
    for (int i = 0; i < M; ++i) v[i] = lsf[i];
    for (int i = 0; i < M; ++i) {
        const int ind = v[i] >> 8;
        const Word32 offset = v[i] & 0xff;
        if (ind >= kCosLast) {
            // The top of the scale (16384) sits exactly on the last entry; the
            // slope beyond it is taken as flat so nothing past the table is read.
            lsp[i] = table[kCosLast];
            continue;
        }
        const Word32 diff = Word32{table[ind + 1]} - table[ind];
        lsp[i] = add(table[ind], wrap16((diff * offset) >> 8));
    }
}

extern "C" void vamrnb_lsp_lsf(const int16_t lsp[10], int16_t lsf[10]) {
    const Word16 *cos_tab = vamrnb_tbl_cos_lsp_lsf;
    int ind = 63;
    for (int i = M - 1; i >= 0; --i) {
        // The first entry is the largest Word16, so the walk stops at 0.
        while (ind > 0 && lsp[i] > cos_tab[ind]) --ind;
        const Word32 d = sub(lsp[i], cos_tab[ind]);
        const Word32 t = l_mult(static_cast<Word16>(d), tab::slope[ind]);
        const Word16 frac = round16(l_shl(t, 3));
        lsf[i] = add(frac, shl(static_cast<Word16>(ind), 8));
    }
}

extern "C" void vamrnb_reorder(int16_t lsf[10]) {
    Word16 lsf_min = kLsfGap;
    for (int i = 0; i < M; ++i) {
        if (lsf[i] < lsf_min) lsf[i] = lsf_min;
        lsf_min = add(lsf[i], kLsfGap);
    }
}
