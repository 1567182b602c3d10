// LSP vector to direct-form LPC coefficients: the two order-5 polynomials of
// the even and odd LSPs are expanded, multiplied by (1 + z^-1) and
// (1 - z^-1), and averaged into the order-10 predictor in Q12.
#include "lpc/lpc.h"

namespace vamrnb {

void get_sp_pol(const Word16 *lsp, Word32 f[6]) {
    f[0] = 0x01000000;                       // 1.0 in Q24
    f[1] = l_msu(0, lsp[0], 512);            // -2 * lsp[0] in Q24
    for (int i = 2; i <= 5; ++i) {
        const Word16 c = lsp[2 * i - 2];
        f[i] = f[i - 2];
        for (int j = i; j >= 2; --j) {
            Word16 hi, lo;
            l_extract(f[j - 1], &hi, &lo);
            const Word32 t = wrap_shl(mpy_32_16(hi, lo, c), 1);
            f[j] = wrap_sub(wrap_add(f[j], f[j - 2]), t);
        }
        f[1] = l_msu(f[1], c, 512);
    }
}

}  // namespace vamrnb

using namespace vamrnb;

extern "C" int32_t vamrnb_lsp_az(const int16_t lsp[10], int16_t a[11]) {
    Word32 f1[6], f2[6];
    get_sp_pol(&lsp[0], f1);
    get_sp_pol(&lsp[1], f2);
    for (int i = 5; i > 0; --i) {
        f1[i] = l_add(f1[i], f1[i - 1]);
        f2[i] = l_sub(f2[i], f2[i - 1]);
    }
    a[0] = 4096;
    for (int i = 1, j = 10; i <= 5; ++i, --j) {
        a[i] = extract_l(l_shr_r(l_add(f1[i], f2[i]), 13));
        a[j] = extract_l(l_shr_r(l_sub(f1[i], f2[i]), 13));
    }
    return 0;
}
