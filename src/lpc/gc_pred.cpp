// Moving-average prediction of the fixed-codebook gain.  The energy of the
// code vector and the last four quantised prediction errors give the
// predicted gain as an exponent/fraction pair for pow2; MR122 works in the
// log2 domain with its own coefficients, every other mode in the 20·log10
// domain with a per-mode mean energy.
#include "basic_op/ext_op.h"
#include "lpc/lpc.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr int kModeMR67 = 3, kModeMR74 = 4, kModeMR795 = 5, kModeMR122 = 7;

// Mean innovation energy of MR122, Q17 (36 dB on the log2 scale).
constexpr Word32 kMeanEnerMR122 = 783741;
// Per-mode mean energy (with the subframe-length and log-offset terms folded
// in), Q14 scaled by 2.
constexpr Word32 kMeanEner33dB = 2134784;    // MR475, MR515, MR59, MR102
constexpr Word32 kMeanEnerMR67 = 2065152;    // 28.75 dB
constexpr Word32 kMeanEnerMR74 = 2085632;    // 30 dB
constexpr Word32 kMeanEnerMR795 = 2183936;   // 36 dB
constexpr Word16 kLogScale = -24660;         // -10/log2(10) in Q13

}  // namespace
}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnb_gc_pred(const int16_t past_qua_en[4], const int16_t past_qua_en_MR122[4],
                               int32_t mode, const int16_t code[40],
                               int16_t *exp_gcode0, int16_t *frac_gcode0,
                               int16_t *exp_en, int16_t *frac_en) {
    Word32 ener_code = vamrnb_energy(code, L_SUBFR, 0);

    if (mode == kModeMR122) {
        // Mean over the subframe (1/40 in Q20, doubled by the product).
        ener_code = l_mult(round16(ener_code), 26214);
        Word16 exp, frac;
        vamrnb_log2(ener_code, &exp, &frac);
        ener_code = l_comp(sub(exp, 30), frac);

        Word32 ener = kMeanEnerMR122;
        for (int i = 0; i < 4; ++i) ener = l_mac(ener, past_qua_en_MR122[i], tab::pred_MR122[i]);
        ener = l_shr(l_sub(ener, ener_code), 1);
        l_extract(ener, exp_gcode0, frac_gcode0);
        return;
    }

    const Word16 exp_code = norm_l(ener_code);
    ener_code = l_shl(ener_code, exp_code);
    Word16 exp, frac;
    vamrnb_log2_norm(ener_code, exp_code, &exp, &frac);
    Word32 l_tmp = mpy_32_16(exp, frac, kLogScale);

    Word32 mean;
    switch (mode) {
        case kModeMR795:
            *frac_en = extract_h(ener_code);
            *exp_en = sub(-11, exp_code);
            mean = kMeanEnerMR795;
            break;
        case kModeMR74: mean = kMeanEnerMR74; break;
        case kModeMR67: mean = kMeanEnerMR67; break;
        default: mean = kMeanEner33dB; break;
    }
    l_tmp = l_add(l_tmp, mean);

    // Prediction in Q24, taken at plain 32-bit width.
    l_tmp = wrap_shl(l_tmp, 9);
    for (int i = 0; i < 4; ++i) l_tmp = wrap_add(l_tmp, Word32{tab::pred[i]} * past_qua_en[i]);
    l_tmp = wrap_shl(l_tmp, 1);

    // gcode0 in Q8 to the exponent of 2: times 1/(20·log10(2)) in Q15
    // (MR74 keeps the slightly smaller constant of its origin codec).
    const Word16 gcode0 = extract_h(l_tmp);
    l_tmp = l_mult(gcode0, mode == kModeMR74 ? 5439 : 5443);
    l_extract(l_shr(l_tmp, 8), exp_gcode0, frac_gcode0);
}

extern "C" void vamrnb_gc_pred_update(int16_t qua_ener_MR122, int16_t qua_ener,
                                      int16_t past_qua_en[4], int16_t past_qua_en_MR122[4]) {
    for (int i = 3; i > 0; --i) {
        past_qua_en[i] = past_qua_en[i - 1];
        past_qua_en_MR122[i] = past_qua_en_MR122[i - 1];
    }
    past_qua_en_MR122[0] = qua_ener_MR122;
    past_qua_en[0] = qua_ener;
}
