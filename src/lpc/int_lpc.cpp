// Interpolation of the frame's LSP vectors over its four subframes and
// conversion of each interpolated set to LPC coefficients: one transmitted
// set per frame (weights 3/4-1/4, 1/2-1/2, 1/4-3/4, 1) or two (MR122: the mid
// set on subframe 2 and the halfway points on subframes 1 and 3).
#include "lpc/lpc.h"

using namespace vamrnb;

extern "C" void vamrnb_int_lpc_1to3(const int16_t lsp_old[10], const int16_t lsp_new[10],
                                    int16_t Az[44]) {
    Word16 lsp[M];
    for (int i = 0; i < M; ++i)
        lsp[i] = add(shr(lsp_new[i], 2), sub(lsp_old[i], shr(lsp_old[i], 2)));
    vamrnb_lsp_az(lsp, Az);
    for (int i = 0; i < M; ++i) lsp[i] = add(shr(lsp_old[i], 1), shr(lsp_new[i], 1));
    vamrnb_lsp_az(lsp, Az + MP1);
    for (int i = 0; i < M; ++i)
        lsp[i] = add(shr(lsp_old[i], 2), sub(lsp_new[i], shr(lsp_new[i], 2)));
    vamrnb_lsp_az(lsp, Az + 2 * MP1);
    vamrnb_lsp_az(lsp_new, Az + 3 * MP1);
}

extern "C" void vamrnb_int_lpc_1and3(const int16_t lsp_old[10], const int16_t lsp_mid[10],
                                     const int16_t lsp_new[10], int16_t Az[44]) {
    Word16 lsp[M];
    for (int i = 0; i < M; ++i) lsp[i] = add(shr(lsp_mid[i], 1), shr(lsp_old[i], 1));
    vamrnb_lsp_az(lsp, Az);
    vamrnb_lsp_az(lsp_mid, Az + MP1);
    for (int i = 0; i < M; ++i) lsp[i] = add(shr(lsp_mid[i], 1), shr(lsp_new[i], 1));
    vamrnb_lsp_az(lsp, Az + 2 * MP1);
    vamrnb_lsp_az(lsp_new, Az + 3 * MP1);
}
