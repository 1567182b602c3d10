// Exported faces of the fixed-point operators.  Each forwards to the inline
// definition in basic_op.h, so the library has exactly one definition of every
// operator.  Arguments arrive as plain 32-bit integers: the adders and the
// 32-bit operators take them whole, every Word16 operand is cut to its low 16
// bits (sign-extended), and Word16 results go back sign-extended.  Also holds
// the one piece of text the library prints: the division diagnostics.
#include <cstdio>

#include "basic_op/basic_op.h"
#include "vamrnb_dsp.h"

namespace vamrnb {

void div_s_report(Word32 num, Word32 den) {
    if (num > den || num < 0 || den < 0)
        std::printf("Division Error var1=%d  var2=%d\n", static_cast<int>(num), static_cast<int>(den));
    if (den == 0) std::puts("Division by 0, Fatal error ");
}

}  // namespace vamrnb

using namespace vamrnb;

namespace {
// Low 16 bits of a passed Word16, sign-extended.
constexpr Word16 w16(int32_t v) { return wrap16(v); }
}  // namespace

extern "C" {

VAMRNB_API int32_t vamrnb_saturate(int32_t L) { return saturate(L); }
VAMRNB_API int32_t vamrnb_add(int32_t a, int32_t b) { return add(a, b); }
VAMRNB_API int32_t vamrnb_sub(int32_t a, int32_t b) { return sub(a, b); }
VAMRNB_API int32_t vamrnb_abs_s(int32_t a) { return abs_s(w16(a)); }
VAMRNB_API int32_t vamrnb_negate(int32_t a) { return negate(w16(a)); }
VAMRNB_API int32_t vamrnb_shl(int32_t a, int32_t n) { return shl(w16(a), w16(n)); }
VAMRNB_API int32_t vamrnb_shr(int32_t a, int32_t n) { return shr(w16(a), w16(n)); }
VAMRNB_API int32_t vamrnb_mult(int32_t a, int32_t b) { return mult(w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_mult_r(int32_t a, int32_t b) { return mult_r(w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_l_mult(int32_t a, int32_t b) { return l_mult(w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_extract_h(int32_t L) { return extract_h(L); }
VAMRNB_API int32_t vamrnb_extract_l(int32_t L) { return extract_l(L); }
VAMRNB_API int32_t vamrnb_round(int32_t L) { return round16(L); }
VAMRNB_API int32_t vamrnb_l_deposit_h(int32_t a) { return l_deposit_h(w16(a)); }
VAMRNB_API int32_t vamrnb_l_deposit_l(int32_t a) { return a; }
VAMRNB_API int32_t vamrnb_l_add(int32_t L1, int32_t L2) { return l_add(L1, L2); }
VAMRNB_API int32_t vamrnb_l_sub(int32_t L1, int32_t L2) { return l_sub(L1, L2); }
VAMRNB_API int32_t vamrnb_l_mac(int32_t L3, int32_t a, int32_t b) { return l_mac(L3, w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_l_msu(int32_t L3, int32_t a, int32_t b) { return l_msu(L3, w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_mac_r(int32_t L3, int32_t a, int32_t b) { return mac_r(L3, w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_msu_r(int32_t L3, int32_t a, int32_t b) { return msu_r(L3, w16(a), w16(b)); }
VAMRNB_API int32_t vamrnb_l_negate(int32_t L) { return l_negate(L); }
VAMRNB_API int32_t vamrnb_l_abs(int32_t L) { return l_abs(L); }
VAMRNB_API int32_t vamrnb_l_shl(int32_t L, int32_t n) { return l_shl(L, w16(n)); }
VAMRNB_API int32_t vamrnb_l_shr(int32_t L, int32_t n) { return l_shr(L, w16(n)); }
VAMRNB_API int32_t vamrnb_shr_r(int32_t a, int32_t n) { return shr_r(w16(a), w16(n)); }
VAMRNB_API int32_t vamrnb_l_shr_r(int32_t L, int32_t n) { return l_shr_r(L, w16(n)); }
VAMRNB_API int32_t vamrnb_norm_s(int32_t a) { return norm_s(w16(a)); }
VAMRNB_API int32_t vamrnb_norm_l(int32_t L) { return norm_l(L); }
VAMRNB_API int32_t vamrnb_div_s(int32_t num, int32_t den) { return div_s(w16(num), w16(den)); }
VAMRNB_API void vamrnb_l_extract(int32_t L, int16_t *hi, int16_t *lo) { l_extract(L, hi, lo); }
VAMRNB_API int32_t vamrnb_l_comp(int32_t hi, int32_t lo) { return l_comp(w16(hi), w16(lo)); }

}  // extern "C"
