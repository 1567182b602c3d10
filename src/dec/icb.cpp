// Fixed (algebraic) codebook of the decoder: rebuilds the subframe's pulse
// vector from its position and sign parameters for each mode (2, 3, 4, 8 or
// 10 pulses), decodes the MR122 pitch gain that travels ahead of its pulses,
// and applies pitch sharpening to the pulse vector.
#include <cstring>

#include "dec/dec_state.h"
#include "dec/dec_gain.h"
#include "lpc/tables.h"

namespace vamrnb {
namespace {

constexpr Word16 PULSE_POS = 8191;   // +1.0 in Q13
constexpr Word16 PULSE_NEG = -8192;  // -1.0 in Q13

inline void put_signed(Word16 *code, const Word16 *pos, int n, Word16 sign) {
    for (int j = 0; j < n; ++j) {
        code[pos[j]] = (sign & 1) ? PULSE_POS : PULSE_NEG;
        sign = static_cast<Word16>(sign >> 1);
    }
}

// Two pulses, 9 bits (MR475, MR515): start positions depend on the subframe.
void pulses_2_9(Word16 subfr, Word16 sign, Word16 index, Word16 *code) {
    const Word16 j = static_cast<Word16>((index & 64) >> 6);
    const Word16 *start = tab::startPos + 8 * j + 2 * subfr;
    Word16 pos[2];
    pos[0] = static_cast<Word16>(5 * (index & 7) + start[0]);
    pos[1] = static_cast<Word16>(5 * ((index >> 3) & 7) + start[1]);
    put_signed(code, pos, 2, sign);
}

// Two pulses, 11 bits (MR59).
void pulses_2_11(Word16 sign, Word16 index, Word16 *code) {
    Word16 pos[2];
    Word16 j = index & 1;
    index = static_cast<Word16>(index >> 1);
    pos[0] = static_cast<Word16>(5 * (index & 7) + 1 + 2 * j);
    index = static_cast<Word16>(index >> 3);
    j = index & 3;
    index = static_cast<Word16>(index >> 2);
    const Word16 i5 = static_cast<Word16>(5 * (index & 7));
    pos[1] = static_cast<Word16>(j == 3 ? i5 + 4 : i5 + j);
    put_signed(code, pos, 2, sign);
}

// Three pulses, 14 bits (MR67).
void pulses_3_14(Word16 sign, Word16 index, Word16 *code) {
    Word16 pos[3];
    pos[0] = static_cast<Word16>(5 * (index & 7));
    index = static_cast<Word16>(index >> 3);
    Word16 j = index & 1;
    index = static_cast<Word16>(index >> 1);
    pos[1] = static_cast<Word16>(5 * (index & 7) + 1 + 2 * j);
    index = static_cast<Word16>(index >> 3);
    j = index & 1;
    index = static_cast<Word16>(index >> 1);
    pos[2] = static_cast<Word16>(5 * (index & 7) + 2 + 2 * j);
    put_signed(code, pos, 3, sign);
}

// Four pulses, 17 bits (MR74, MR795), Gray-coded positions.
void pulses_4_17(Word16 sign, Word16 index, Word16 *code) {
    Word16 pos[4];
    pos[0] = static_cast<Word16>(5 * tab::dgray[index & 7]);
    index = static_cast<Word16>(index >> 3);
    pos[1] = static_cast<Word16>(5 * tab::dgray[index & 7] + 1);
    index = static_cast<Word16>(index >> 3);
    pos[2] = static_cast<Word16>(5 * tab::dgray[index & 7] + 2);
    index = static_cast<Word16>(index >> 3);
    const Word16 j = index & 1;
    index = static_cast<Word16>(index >> 1);
    pos[3] = static_cast<Word16>(5 * tab::dgray[index & 7] + 3 + j);
    put_signed(code, pos, 4, sign);
}

// Splits a 10-bit joint index of three pulse positions (7 bits for the
// 5x5x5 upper parts, 3 bits for the lowest bits) into positions 0..9.
void split_three(Word16 msbs, Word16 lsbs, int i1, int i2, int i3, Word16 *pos) {
    if (msbs > 124) msbs = 124;
    Word16 ia = mult(msbs, 1311);                                   // msbs / 25
    ia = sub(msbs, extract_l(l_shr(l_mult(ia, 25), 1)));            // msbs % 25
    Word16 ib = shl(sub(ia, extract_l(l_shr(l_mult(mult(ia, 6554), 5), 1))), 1);
    Word16 ic = sub(lsbs, shl(shr(lsbs, 2), 2));                    // lsbs % 4
    pos[i1] = add(ib, static_cast<Word16>(ic & 1));
    ib = shl(mult(ia, 6554), 1);
    pos[i2] = add(ib, shr(ic, 1));
    pos[i3] = add(shl(mult(msbs, 1311), 1), shr(lsbs, 2));
}

// Eight pulses, 31 bits (MR102): four signs and three joint position indices.
void pulses_8_31(const Word16 *prm, Word16 *code) {
    Word16 pos[8];
    split_three(shr(prm[4], 3), static_cast<Word16>(prm[4] & 7), 0, 4, 1, pos);
    split_three(shr(prm[5], 3), static_cast<Word16>(prm[5] & 7), 2, 6, 5, pos);
    const Word16 msbs = shr(prm[6], 2);
    const Word16 lsbs = static_cast<Word16>(prm[6] & 3);
    const Word16 m24 = shr(add(extract_l(l_shr(l_mult(msbs, 25), 1)), 12), 5);
    const Word16 odd = static_cast<Word16>(mult(m24, 6554) & 1);
    Word16 ib = sub(m24, extract_l(l_shr(l_mult(mult(m24, 6554), 5), 1)));
    if (odd == 1) ib = sub(4, ib);
    pos[3] = add(shl(ib, 1), static_cast<Word16>(lsbs & 1));
    pos[7] = add(shl(mult(m24, 6554), 1), shr(lsbs, 1));

    for (int j = 0; j < 4; ++j) {
        const Word16 p1 = static_cast<Word16>(4 * pos[j] + j);
        Word16 sign = prm[j] == 0 ? PULSE_POS : static_cast<Word16>(-PULSE_POS);
        code[p1] = sign;
        const Word16 p2 = static_cast<Word16>(4 * pos[j + 4] + j);
        if (p2 < p1) sign = negate(sign);
        code[p2] = add(code[p2], sign);
    }
}

// Ten pulses, 35 bits (MR122): per track a sign+position word and a second
// position whose sign follows from the order of the two positions.
void pulses_10_35(const Word16 *prm, Word16 *code) {
    for (int j = 0; j < 5; ++j) {
        const Word16 p1 = static_cast<Word16>(5 * tab::dgray[prm[j] & 7] + j);
        Word16 sign = ((prm[j] >> 3) & 1) == 0 ? 4096 : -4096;
        code[p1] = sign;
        const Word16 p2 = static_cast<Word16>(5 * tab::dgray[prm[j + 5] & 7] + j);
        if (p2 < p1) sign = negate(sign);
        code[p2] = add(code[p2], sign);
    }
}

}  // namespace
}  // namespace vamrnb

using namespace vamrnb;

extern "C" void vamrnbd_icb(dec_state *st, dec_work *w, int32_t mode, const int16_t **cursor) {
    Word16 *code = w->code;
    const int16_t *p = *cursor;
    std::memset(code, 0, sizeof w->code);
    Word16 sharp_q15;  // sharpening factor applied to the pulse vector

    switch (mode) {
    case MR475:
    case MR515:
        pulses_2_9(w->subfr_nr, p[1], p[0], code);
        p += 2;
        sharp_q15 = shl(st->sharp, 1);
        break;
    case MR59:
        pulses_2_11(p[1], p[0], code);
        p += 2;
        sharp_q15 = shl(st->sharp, 1);
        break;
    case MR67:
        pulses_3_14(p[1], p[0], code);
        p += 2;
        sharp_q15 = shl(st->sharp, 1);
        break;
    case MR74:
    case MR795:
        pulses_4_17(p[1], p[0], code);
        p += 2;
        sharp_q15 = shl(st->sharp, 1);
        break;
    case MR102:
        pulses_8_31(p, code);
        p += 7;
        sharp_q15 = shl(st->sharp, 1);
        break;
    default: {  // MR122: the pitch gain comes first and drives the sharpening
        const Word16 index = *p++;
        Word16 g;
        if (w->bfi != 0)
            vamrnbd_ec_gain_pitch(st->past_gain_pit, st->conceal_state, st->pbuf, &g);
        else
            g = vamrnbd_d_gain_pitch(MR122, index);
        vamrnbd_ec_gain_pitch_update(st, w->bfi, st->prev_bf, &g);
        w->gain_pit = g;
        pulses_10_35(p, code);
        p += 10;
        sharp_q15 = shl(g, 1);
        break;
    }
    }
    *cursor = p;

    // add the pitch contribution to the pulse vector
    for (int i = w->T0; i < L_SUBFR; ++i) code[i] = add(code[i], mult(code[i - w->T0], sharp_q15));
}
