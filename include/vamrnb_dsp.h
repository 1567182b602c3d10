/**
 * @file vamrnb_dsp.h
 * @brief vamrnb: building blocks exported for other codec components.
 *
 * The fixed-point operators and extended functions, the library lifecycle
 * and aligned-memory services, the bit-stream reader and writer, and the
 * frame packing/unpacking functions; the exported constant tables come with
 * vamrnb_tables.h, included here.  Everything has C linkage; the header
 * compiles as C11 and as C++17 on its own.
 *
 * Fixed-point values travel as plain integers: a Word16 argument is passed
 * in an int32_t (or int16_t) and only its low 16 bits count, sign-extended;
 * a Word16 result is returned sign-extended.  The 16-bit adders form the
 * exact 32-bit sum of their arguments and then saturate.  A Word32 is an
 * int32_t; "saturating" means a result outside the type's range is replaced
 * by the nearest end of the range.  A double-precision pair (hi, lo) stands
 * for hi * 2^16 + lo * 2.
 *
 * Pointer arguments must not be null unless their description says so;
 * the debug checks described in vamrnb.h cover the reader and writer set-up
 * and the frame packing and unpacking functions.  None of these functions allocates memory or
 * keeps state between calls, apart from the records passed to them: calls
 * on different records may run on different threads at once.
 */
#ifndef VAMRNB_DSP_H
#define VAMRNB_DSP_H

#include <stddef.h>
#include <stdint.h>

#include "vamrnb.h"
#include "vamrnb_tables.h" /* the exported constant tables */

#ifdef __cplusplus
extern "C" {
#endif

/* ---- basic fixed-point operators ---------------------------------------- */
/**
 * Clamps a 32-bit value to the 16-bit range.
 * @param L the value.
 * @return L limited to -32768..32767.
 */
VAMRNB_API int32_t vamrnb_saturate(int32_t L);
/**
 * Saturating 16-bit addition.
 * @param a first term (Word16).
 * @param b second term (Word16).
 * @return a + b limited to -32768..32767.
 */
VAMRNB_API int32_t vamrnb_add(int32_t a, int32_t b);
/**
 * Saturating 16-bit subtraction.
 * @param a minuend (Word16).
 * @param b subtrahend (Word16).
 * @return a - b limited to -32768..32767.
 */
VAMRNB_API int32_t vamrnb_sub(int32_t a, int32_t b);
/**
 * Saturating 16-bit magnitude.
 * @param a the value (Word16).
 * @return |a|; -32768 gives 32767.
 */
VAMRNB_API int32_t vamrnb_abs_s(int32_t a);
/**
 * Saturating 16-bit negation.
 * @param a the value (Word16).
 * @return -a; -32768 gives 32767.
 */
VAMRNB_API int32_t vamrnb_negate(int32_t a);
/**
 * Saturating 16-bit left shift.
 * @param a the value (Word16).
 * @param n shift count (Word16); negative counts shift right by -n, at most 16.
 * @return a << n, saturated to the 16-bit range when it does not fit.
 */
VAMRNB_API int32_t vamrnb_shl(int32_t a, int32_t n);
/**
 * Arithmetic 16-bit right shift.
 * @param a the value (Word16).
 * @param n shift count (Word16); 15 or more gives the sign; negative counts shift
 *   left (saturating) by -n, at most 16.
 * @return a >> n.
 */
VAMRNB_API int32_t vamrnb_shr(int32_t a, int32_t n);
/**
 * Fractional Q15 product.
 * @param a first factor (Word16, Q15).
 * @param b second factor (Word16, Q15).
 * @return (a * b) >> 15, saturated (only -32768 * -32768 saturates).
 */
VAMRNB_API int32_t vamrnb_mult(int32_t a, int32_t b);
/**
 * Fractional Q15 product, rounded.
 * @param a first factor (Word16, Q15).
 * @param b second factor (Word16, Q15).
 * @return (a * b + 0x4000) >> 15, saturated.
 */
VAMRNB_API int32_t vamrnb_mult_r(int32_t a, int32_t b);
/**
 * Fractional product to 32 bits.
 * @param a first factor (Word16).
 * @param b second factor (Word16).
 * @return 2 * a * b as a Word32; -32768 * -32768 gives 0x7FFFFFFF.
 */
VAMRNB_API int32_t vamrnb_l_mult(int32_t a, int32_t b);
/**
 * Upper half of a 32-bit value.
 * @param L the value (Word32).
 * @return L >> 16.
 */
VAMRNB_API int32_t vamrnb_extract_h(int32_t L);
/**
 * Lower half of a 32-bit value.
 * @param L the value (Word32).
 * @return the low 16 bits of L, sign-extended.
 */
VAMRNB_API int32_t vamrnb_extract_l(int32_t L);
/**
 * Rounds a 32-bit value to its upper half.
 * @param L the value (Word32).
 * @return (L + 0x8000) >> 16 with a saturating addition.
 */
VAMRNB_API int32_t vamrnb_round(int32_t L);
/**
 * Places a 16-bit value in the upper half of a 32-bit one.
 * @param a the value (Word16).
 * @return a << 16.
 */
VAMRNB_API int32_t vamrnb_l_deposit_h(int32_t a);
/**
 * Widens a 16-bit value to 32 bits.
 * @param a the value (Word16).
 * @return a, sign-extended.
 */
VAMRNB_API int32_t vamrnb_l_deposit_l(int32_t a);
/**
 * Saturating 32-bit addition.
 * @param L1 first term (Word32).
 * @param L2 second term (Word32).
 * @return L1 + L2 limited to the 32-bit range.
 */
VAMRNB_API int32_t vamrnb_l_add(int32_t L1, int32_t L2);
/**
 * Saturating 32-bit subtraction.
 * @param L1 minuend (Word32).
 * @param L2 subtrahend (Word32).
 * @return L1 - L2 limited to the 32-bit range.
 */
VAMRNB_API int32_t vamrnb_l_sub(int32_t L1, int32_t L2);
/**
 * Multiply-accumulate.
 * @param L3 accumulator (Word32).
 * @param a first factor (Word16).
 * @param b second factor (Word16).
 * @return vamrnb_l_add(L3, vamrnb_l_mult(a, b)).
 */
VAMRNB_API int32_t vamrnb_l_mac(int32_t L3, int32_t a, int32_t b);
/**
 * Multiply-subtract.
 * @param L3 accumulator (Word32).
 * @param a first factor (Word16).
 * @param b second factor (Word16).
 * @return vamrnb_l_sub(L3, vamrnb_l_mult(a, b)).
 */
VAMRNB_API int32_t vamrnb_l_msu(int32_t L3, int32_t a, int32_t b);
/**
 * Multiply-accumulate, rounded to 16 bits.
 * @param L3 accumulator (Word32).
 * @param a first factor (Word16).
 * @param b second factor (Word16).
 * @return vamrnb_round(vamrnb_l_mac(L3, a, b)).
 */
VAMRNB_API int32_t vamrnb_mac_r(int32_t L3, int32_t a, int32_t b);
/**
 * Multiply-subtract, rounded to 16 bits.
 * @param L3 accumulator (Word32).
 * @param a first factor (Word16).
 * @param b second factor (Word16).
 * @return vamrnb_round(vamrnb_l_msu(L3, a, b)).
 */
VAMRNB_API int32_t vamrnb_msu_r(int32_t L3, int32_t a, int32_t b);
/**
 * Saturating 32-bit negation.
 * @param L the value (Word32).
 * @return -L; 0x80000000 gives 0x7FFFFFFF.
 */
VAMRNB_API int32_t vamrnb_l_negate(int32_t L);
/**
 * Saturating 32-bit magnitude.
 * @param L the value (Word32).
 * @return |L|; 0x80000000 gives 0x7FFFFFFF.
 */
VAMRNB_API int32_t vamrnb_l_abs(int32_t L);
/**
 * Saturating 32-bit left shift.
 * @param L the value (Word32).
 * @param n shift count; zero or negative counts shift right by -n.
 * @return L << n, saturated when it does not fit.
 */
VAMRNB_API int32_t vamrnb_l_shl(int32_t L, int32_t n);
/**
 * Arithmetic 32-bit right shift.
 * @param L the value (Word32).
 * @param n shift count, limited to 31; negative counts shift left (saturating) by -n,
 *   at most 32.
 * @return L >> n.
 */
VAMRNB_API int32_t vamrnb_l_shr(int32_t L, int32_t n);
/**
 * Rounding 16-bit right shift.
 * @param a the value (Word16).
 * @param n shift count (Word16); above 15 gives 0.
 * @return vamrnb_shr(a, n), plus 1 when n > 0 and bit n - 1 of a is set.
 */
VAMRNB_API int32_t vamrnb_shr_r(int32_t a, int32_t n);
/**
 * Rounding 32-bit right shift.
 * @param L the value (Word32).
 * @param n shift count; above 31 gives 0.
 * @return vamrnb_l_shr(L, n), plus 1 when n > 0 and bit n - 1 of L is set.
 */
VAMRNB_API int32_t vamrnb_l_shr_r(int32_t L, int32_t n);
/**
 * Normalisation count of a 16-bit value.
 * @param a the value (Word16).
 * @return left shifts that bring a (its complement when negative) into
 *   0x4000..0x7FFF; 0 for 0, 15 for -1.
 */
VAMRNB_API int32_t vamrnb_norm_s(int32_t a);
/**
 * Normalisation count of a 32-bit value.
 * @param L the value (Word32).
 * @return left shifts that bring L (its complement when negative) into
 *   0x40000000..0x7FFFFFFF; 0 for 0, 31 for -1.
 */
VAMRNB_API int32_t vamrnb_norm_l(int32_t L);
/**
 * Fractional division in Q15.  Expects 0 <= num <= den and den > 0; other arguments
 * print a diagnostic line to standard output (see vamrnb.h) and the computation
 * carries on.
 * @param num dividend (Word16).
 * @param den divisor (Word16).
 * @return num / den in Q15 (32767 when num equals den).
 */
VAMRNB_API int32_t vamrnb_div_s(int32_t num, int32_t den);
/**
 * Splits a 32-bit value into a double-precision pair: hi = L >> 16, lo = (L >> 1) -
 * hi * 32768.
 * @param L the value (Word32).
 * @param hi receives the upper part; must not be null.
 * @param lo receives the lower part; must not be null.
 */
VAMRNB_API void    vamrnb_l_extract(int32_t L, int16_t *hi, int16_t *lo);
/**
 * Builds a 32-bit value from a double-precision pair.
 * @param hi upper part (Word16).
 * @param lo lower part (Word16).
 * @return (hi << 16) + 2 * lo, saturating.
 */
VAMRNB_API int32_t vamrnb_l_comp(int32_t hi, int32_t lo);

/* ---- extended functions ------------------------------------------------- */
/**
 * Product of two double-precision pairs (each hi * 2^16 + lo * 2).
 * @param hi1 upper part of the first factor.
 * @param lo1 lower part of the first factor.
 * @param hi2 upper part of the second factor.
 * @param lo2 lower part of the second factor.
 * @return the fractional product as a Word32.
 */
VAMRNB_API int32_t vamrnb_mpy_32(int16_t hi1, int16_t lo1, int16_t hi2, int16_t lo2);
/**
 * Product of a double-precision pair and a 16-bit value.
 * @param hi upper part of the pair.
 * @param lo lower part of the pair.
 * @param n the 16-bit factor.
 * @return the fractional product as a Word32.
 */
VAMRNB_API int32_t vamrnb_mpy_32_16(int16_t hi, int16_t lo, int16_t n);
/**
 * 32-bit fractional division by a normalised double-precision pair.
 * @param L_num dividend, 0 <= L_num < the divisor.
 * @param denom_hi upper part of the divisor, at least 16384.
 * @param denom_lo lower part of the divisor.
 * @return L_num / divisor in Q31.
 */
VAMRNB_API int32_t vamrnb_div_32(int32_t L_num, int16_t denom_hi, int16_t denom_lo);
/**
 * Base-2 logarithm of a normalised value.
 * @param L_x the value, already normalised (shifted left by @p exp).
 * @param exp the left shift that normalised it (vamrnb_norm_l()).
 * @param exponent receives the integer part; must not be null.
 * @param fraction receives the fractional part, Q15; must not be null.
 */
VAMRNB_API void    vamrnb_log2_norm(int32_t L_x, int16_t exp, int16_t *exponent, int16_t *fraction);
/**
 * Base-2 logarithm.
 * @param L_x the value (positive Word32; 0 or less gives 0 and 0).
 * @param exponent receives the integer part; must not be null.
 * @param fraction receives the fractional part, Q15; must not be null.
 */
VAMRNB_API void    vamrnb_log2(int32_t L_x, int16_t *exponent, int16_t *fraction);
/**
 * Power of two of a fractional exponent.
 * @param exponent integer part, -1..30 (other values give 0).
 * @param fraction fractional part, Q15 (0..32767).
 * @return 2^(exponent + fraction / 32768), as a Word32.
 */
VAMRNB_API int32_t vamrnb_pow2(int16_t exponent, int16_t fraction);
/**
 * Inverse square root.
 * @param L_x positive Word32 argument.
 * @return 1 / sqrt(L_x) as a normalised Word32 (Q30 style of the fixed-point
 *   reference); 0x3FFFFFFF for L_x <= 0.
 */
VAMRNB_API int32_t vamrnb_inv_sqrt(int32_t L_x);
/**
 * Square root in normalised form, in place: the input is normalised by an
 * even left shift, and on return sqrt(input) = frac >> (exp / 2).
 * @param frac in: a positive Word32 (0 or less gives 0 and 0); out: the root's
 *   mantissa; must not be null.
 * @param exp receives the even normalising shift; must not be null.
 */
VAMRNB_API void    vamrnb_isqrt_n(int32_t *frac, int16_t *exp);
/**
 * 32-bit right shift that reports saturation (a negative count shifts left).
 * @param L_var1 the value (Word32).
 * @param var2 shift count (Word16).
 * @param overflow flag word set to 1 when a left shift saturated, left alone
 *   otherwise; must not be null.
 * @return L_var1 >> var2.
 */
VAMRNB_API int32_t amrnb_l_shr(int32_t L_var1, int16_t var2, int32_t *overflow);

/* ---- 32-byte-aligned memory and block copy ------------------------------ */
/**
 * Allocates a block that starts on a 32-byte boundary (not cleared).
 * @param size bytes wanted; 0 is allowed.
 * @return the block, or null when the platform allocator fails.  Release it with
 *   vcmn_mfree_align32() only.
 */
VAMRNB_API void *vcmn_malloc_align32(uint32_t size);
/**
 * The same as vcmn_malloc_align32(), under a second name.
 * @param size bytes wanted.
 * @return the block, or null.
 */
VAMRNB_API void *vcmn_malloc_fast_align32(uint32_t size);
/**
 * Releases a block from vcmn_malloc_align32().
 * @param p the block; may be null (nothing happens).
 */
VAMRNB_API void  vcmn_mfree_align32(void *p);
/**
 * The same as vcmn_mfree_align32(), under a second name.
 * @param p the block; may be null.
 */
VAMRNB_API void  vcmn_mfree_fast_align32(void *p);
/**
 * Copies a two-dimensional block row by row (rows must not overlap).
 * @param dst first destination row; must not be null when @p rows > 0.
 * @param src first source row; must not be null when @p rows > 0.
 * @param dst_stride bytes from one destination row to the next.
 * @param src_stride bytes from one source row to the next.
 * @param row_bytes bytes copied per row.
 * @param rows number of rows; 0 or less copies nothing.
 */
VAMRNB_API void  vcmn_blk_mcpy(void *dst, const void *src, int32_t dst_stride,
                               int32_t src_stride, uint32_t row_bytes, int32_t rows);

/* ---- bit-stream reader --------------------------------------------------- */
/** Bit-stream reader (see struct vcmn_bsr). */
typedef struct vcmn_bsr vcmn_bsr;
/** Fetch function of a reader: loads up to max_bytes (1..4) bytes into the
 *  cache and returns 0, or -1 when no byte is left. */
typedef int32_t (*vcmn_bsr_refill_fn)(vcmn_bsr *bs, int32_t max_bytes);

/** Reader over a caller's byte buffer.  Set it up with vcmn_bsr_init(); the
 *  caller owns the record and the buffer.  Bytes consumed so far:
 *  ptr - start - bits / 8.  Once the buffer is exhausted reads report
 *  0xFFFFFFFF. */
struct vcmn_bsr {
    uint32_t cache;            /**< Bits fetched and not yet handed out. */
    int32_t bits;              /**< Valid bits in @c cache, 0..32. */
    const uint8_t *ptr;        /**< Next byte to fetch. */
    const uint8_t *end;        /**< Last byte of the buffer. */
    const uint8_t *start;      /**< First byte of the buffer. */
    uint32_t size;             /**< Buffer size in bytes. */
    vcmn_bsr_refill_fn refill; /**< Fetch function. */
};

/**
 * Sets a reader on a byte buffer.
 * @param bs the reader; must not be null.
 * @param buf first byte; must not be null when @p size > 0.
 * @param size bytes readable from @p buf.
 * @param refill fetch function: null or vcmn_bsr_flush() reads most significant bit
 *   first, vcmn_bsr_le_flush() least significant first.
 */
VAMRNB_API void     vcmn_bsr_init(vcmn_bsr *bs, const uint8_t *buf, uint32_t size,
                                  vcmn_bsr_refill_fn refill);
/**
 * Default fetch function: loads up to @p max_bytes bytes into the cache, first byte
 * in the top bits.
 * @param bs the reader; must not be null.
 * @param max_bytes bytes wanted, 1..4.
 * @return 0, or -1 when no byte is left (the cache is then cleared).
 */
VAMRNB_API int32_t  vcmn_bsr_flush(vcmn_bsr *bs, int32_t max_bytes);
/**
 * Reads @p n bits, most significant first.
 * @param bs the reader; must not be null.
 * @param n bits wanted, 1..32.
 * @return the bits right-aligned, or 0xFFFFFFFF when the buffer ran out.
 */
VAMRNB_API uint32_t vcmn_bsr_read(vcmn_bsr *bs, int32_t n);
/**
 * Reads one bit.
 * @param bs the reader; must not be null.
 * @return 0 or 1, or 0xFFFFFFFF when the buffer ran out.
 */
VAMRNB_API uint32_t vcmn_bsr_read1(vcmn_bsr *bs);
/**
 * Reads one bit into @p bit.
 * @param bs the reader; must not be null.
 * @param bit receives the bit; must not be null.
 * @return 0, or -1 when the buffer ran out (@p bit is then left alone).
 */
VAMRNB_API int32_t  vcmn_bsr_read1_value(vcmn_bsr *bs, uint8_t *bit);
/**
 * Skips @p n bits.
 * @param bs the reader; must not be null.
 * @param n bits to skip, 0..32.
 * @return the bits left in the cache, or -1 when the buffer ran out.
 */
VAMRNB_API int32_t  vcmn_bsr_skip(vcmn_bsr *bs, int32_t n);
/**
 * Looks at the next @p n bits without consuming them.
 * @param bs the reader; must not be null.
 * @param n bits wanted, 1..32.
 * @return the bits right-aligned; bits past the end of the buffer read as 0.
 */
VAMRNB_API uint32_t vcmn_bsr_peek(vcmn_bsr *bs, int32_t n);
/**
 * Skips @p skip bits, then looks at the next @p n.
 * @param bs the reader; must not be null.
 * @param skip bits to skip, 0..32.
 * @param n bits wanted, 1..32.
 * @return the bits right-aligned, or 0 when the skip ran out of buffer.
 */
VAMRNB_API uint32_t vcmn_bsr_skip_peek(vcmn_bsr *bs, int32_t skip, int32_t n);
/**
 * Drops the bits up to the next byte boundary.
 * @param bs the reader; must not be null.
 */
VAMRNB_API void     vcmn_bsr_skip_to_align8(vcmn_bsr *bs);
/**
 * Counts the leading zero bits of a word.
 * @param word the word.
 * @return 0..32.
 */
VAMRNB_API int32_t  vcmn_bsr_clz_in_code(uint32_t word);
/* Least-significant-bit-first reading: pass vcmn_bsr_le_flush to vcmn_bsr_init. */
/**
 * Fetch function for least-significant-bit-first reading: loads up to @p max_bytes
 * bytes, first byte in the low bits.
 * @param bs the reader; must not be null.
 * @param max_bytes bytes wanted, 1..4.
 * @return 0, or -1 when no byte is left.
 */
VAMRNB_API int32_t  vcmn_bsr_le_flush(vcmn_bsr *bs, int32_t max_bytes);
/**
 * Reads @p n bits, least significant first (reader set up with vcmn_bsr_le_flush()).
 * @param bs the reader; must not be null.
 * @param n bits wanted, 1..32.
 * @return the bits, first bit in bit 0, or 0xFFFFFFFF when the buffer ran out.
 */
VAMRNB_API uint32_t vcmn_bsr_le_read(vcmn_bsr *bs, int32_t n);
/**
 * Drops @p n bits from the cache of a least-significant-first reader (no fetch).
 * @param bs the reader; must not be null.
 * @param n bits to drop, at most the bits in the cache.
 */
VAMRNB_API void     vcmn_bsr_le_skip(vcmn_bsr *bs, int32_t n);
/**
 * Drops the bits up to the next byte boundary (least-significant-first reader).
 * @param bs the reader; must not be null.
 */
VAMRNB_API void     vcmn_bsr_le_skip_to_align8(vcmn_bsr *bs);

/* ---- bit-stream writer --------------------------------------------------- */
/** Bit-stream writer (see struct vcmn_bsw). */
typedef struct vcmn_bsw vcmn_bsw;
/** Callback of a writer, called with the writer for every completed byte
 *  before it moves on (vcmn_bsw::ptr still points at that byte). */
typedef void (*vcmn_bsw_byte_fn)(vcmn_bsw *bs);

/** Writer into a caller's byte buffer, most significant bit first.  Set it
 *  up with vcmn_bsw_init().  Bytes produced so far: ptr - start.
 *  vcmn_bsw_write() checks the end of the buffer only on entry: a long write
 *  that starts inside the buffer may run past its end, so size buffers for
 *  the largest item written (vcmn_bsw_write1() never runs past it). */
struct vcmn_bsw {
    uint8_t *ptr;              /**< Byte being filled. */
    int32_t free_bits;         /**< Free bit positions in it, 8..1. */
    uint8_t *end;              /**< Last byte of the buffer. */
    uint8_t *start;            /**< First byte of the buffer. */
    uint32_t size;             /**< Buffer size in bytes. */
    vcmn_bsw_byte_fn on_byte;  /**< Called for every completed byte, or null. */
};

/**
 * Sets a writer on a byte buffer.
 * @param bs the writer; must not be null.
 * @param buf first byte; must not be null when @p size > 0.
 * @param size bytes writable at @p buf.
 * @param on_byte called for every completed byte, or null.
 */
VAMRNB_API void     vcmn_bsw_init(vcmn_bsw *bs, uint8_t *buf, uint32_t size,
                                  vcmn_bsw_byte_fn on_byte);
/**
 * Appends one bit.
 * @param bs the writer; must not be null.
 * @param bit the bit (only bit 0 counts).
 * @return 0, or 0xFFFFFFFF when the buffer is full (nothing written).
 */
VAMRNB_API uint32_t vcmn_bsw_write1(vcmn_bsw *bs, uint32_t bit);
/**
 * Appends the @p n low bits of @p value, most significant first.
 * @param bs the writer; must not be null.
 * @param value the bits.
 * @param n bit count, 1..32 (less than 1 writes nothing, more than 32 writes 32).
 * @return 0, or 0xFFFFFFFF when the buffer was already full.
 */
VAMRNB_API uint32_t vcmn_bsw_write(vcmn_bsw *bs, uint32_t value, int32_t n);

/* ---- frame unpacking, homing tests and packing --------------------------- */
/** Classification of a received frame (quality bit, frame mode, reception
 *  type); the record is internal to the decoder. */
struct rx_frame_class;
/** SID scheduling state of the encoder (only its frame type is read here);
 *  the record is internal to the encoder. */
struct sid_sync_state;

/**
 * Reads one storage-format frame: its table-of-contents byte and class bits, into the
 * per-bit vector in transmission order, and classifies it.
 * @param reader a reader set on the frame; must not be null.
 * @param cls receives the quality bit, frame type or mode, and reception type
 *   (#vamrnb_rx_type); must not be null.
 * @param mode receives the mode of a speech frame; for a SID frame the three
 *   mode-indication bits in the order read, the first in bit 2 (@p cls gets the
 *   codec mode they stand for); left alone for other frames; must not be null.
 * @param serial the per-bit vector, 250 entries, cleared by the caller; bits missing
 *   from a short frame read as 1.
 */
VAMRNB_API void    vamrnbd_unpack_bits(vcmn_bsr *reader, struct rx_frame_class *cls,
                                       int32_t *mode, int16_t serial[250]);
/**
 * Converts a per-bit vector into codec parameters.
 * @param mode 0..7 for speech, 8 (#MRDTX) for SID parameters, 9 for none.
 * @param serial one entry per bit (an entry counts as 1 only when it equals 1); must
 *   not be null.
 * @param prm receives vamrnb_tbl_prmno[mode] parameters; must not be null.
 */
VAMRNB_API void    vamrnbd_bits2prm(int32_t mode, const int16_t *serial, int16_t *prm);
/**
 * Tests whether a frame's parameters up to and including the first subframe are those
 * of the decoder homing frame of @p mode.
 * @param serial the frame's per-bit vector; must not be null.
 * @param mode 0..7.
 * @return 1 on a match, else 0.
 */
VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test_first(const int16_t *serial, int32_t mode);
/**
 * Tests whether a frame is the decoder homing frame of @p mode.
 * @param serial the frame's per-bit vector; must not be null.
 * @param mode 0..7.
 * @return 1 on a match, else 0.
 */
VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test(const int16_t *serial, int32_t mode);
/**
 * Turns a frame's codec parameters into one entry per bit, in place.
 * @param mode 0..7, or 8 (#MRDTX) for SID parameters.
 * @param prm the parameters on entry, the bits (0 or 1, most significant first) on
 *   return; room for the mode's bit count; must not be null.
 */
VAMRNB_API void    vamrnbe_prm2bits(int32_t mode, int16_t *prm);
/**
 * Writes one storage-format frame: table-of-contents byte, class bits in transmission
 * order, SID type and mode indication, padding.
 * @param writer a writer on the output buffer; must not be null.
 * @param bits the per-bit vector (vamrnbe_prm2bits()); must not be null.
 * @param mode the requested mode, written as the mode indication of a SID frame.
 * @param used_mode in: the frame type to write (0..7, 8 SID, 15 no data); out: 15
 *   when the frame becomes a no-data frame; must not be null.
 * @param tx_type the transmit frame type (#vamrnb_tx_type).
 * @param sid SID scheduling state whose frame type gives the SID type bit, or null to
 *   take @p tx_type.
 */
VAMRNB_API void    vamrnbe_bs_pack(vcmn_bsw *writer, const int16_t *bits, int32_t mode,
                                   int32_t *used_mode, int32_t tx_type,
                                   const struct sid_sync_state *sid);

/* ---- LSP/LPC conversion, gain prediction, subframe kernels -------------- */
/**
 * Converts line spectral frequencies into line spectral pairs.
 * @param lsf 10 frequencies, Q15 normalised (16384 = half the sampling rate); must
 *   not be null.
 * @param table the cosine table vamrnb_tbl_cos_lsp_lsf; must not be null.
 * @param lsp receives 10 pairs, Q15 cosine domain; must not be null.
 */
VAMRNB_API void    vamrnb_sf_sp(const int16_t lsf[10], const int16_t *table, int16_t lsp[10]);
/**
 * Converts line spectral pairs into line spectral frequencies.
 * @param lsp 10 pairs, Q15 cosine domain; must not be null.
 * @param lsf receives 10 frequencies, Q15 normalised; must not be null.
 */
VAMRNB_API void    vamrnb_lsp_lsf(const int16_t lsp[10], int16_t lsf[10]);
/**
 * Enforces the minimum spacing (205, about 50 Hz) between successive frequencies.
 * @param lsf 10 frequencies, adjusted in place; must not be null.
 */
VAMRNB_API void    vamrnb_reorder(int16_t lsf[10]);
/**
 * Converts line spectral pairs into order-10 predictor coefficients.
 * @param lsp 10 pairs, Q15; must not be null.
 * @param a receives 11 coefficients, Q12, a[0] = 4096; must not be null.
 * @return 0.
 */
VAMRNB_API int32_t vamrnb_lsp_az(const int16_t lsp[10], int16_t a[11]);
/**
 * Interpolates the predictor of four subframes from the previous and the current
 * frame's pairs (one pair set per frame).
 * @param lsp_old previous frame's 10 pairs; must not be null.
 * @param lsp_new current frame's 10 pairs; must not be null.
 * @param Az receives four sets of 11 coefficients, Q12; must not be null.
 */
VAMRNB_API void    vamrnb_int_lpc_1to3(const int16_t lsp_old[10], const int16_t lsp_new[10], int16_t Az[44]);
/**
 * Interpolates the predictor of four subframes when a frame carries two pair sets
 * (MR122).
 * @param lsp_old previous frame's 10 pairs; must not be null.
 * @param lsp_mid the frame's second-subframe pairs; must not be null.
 * @param lsp_new the frame's fourth-subframe pairs; must not be null.
 * @param Az receives four sets of 11 coefficients, Q12; must not be null.
 */
VAMRNB_API void    vamrnb_int_lpc_1and3(const int16_t lsp_old[10], const int16_t lsp_mid[10],
                                        const int16_t lsp_new[10], int16_t Az[44]);
/**
 * Predicts the code gain of a subframe from the past quantised energies.
 * @param past_qua_en the four past energies of the other modes' predictor, Q10,
 *   newest first; must not be null.
 * @param past_qua_en_MR122 the same for the MR122 predictor; must not be null.
 * @param mode the codec mode (0..7).
 * @param code the subframe's 40 fixed-codebook samples, Q13; must not be null.
 * @param exp_gcode0 receives the exponent of the predicted gain; must not be null.
 * @param frac_gcode0 receives its fraction; must not be null.
 * @param exp_en receives the exponent of the code energy (MR795 only; must not be
 *   null).
 * @param frac_en receives its fraction (MR795 only; must not be null).
 */
VAMRNB_API void    vamrnb_gc_pred(const int16_t past_qua_en[4], const int16_t past_qua_en_MR122[4],
                                  int32_t mode, const int16_t code[40],
                                  int16_t *exp_gcode0, int16_t *frac_gcode0,
                                  int16_t *exp_en, int16_t *frac_en);
/**
 * Shifts a new quantised energy into both predictor histories.
 * @param qua_ener_MR122 the new energy for the MR122 predictor, Q10.
 * @param qua_ener the new energy for the other modes, Q10.
 * @param past_qua_en the other modes' history, updated; must not be null.
 * @param past_qua_en_MR122 the MR122 history, updated; must not be null.
 */
VAMRNB_API void    vamrnb_gc_pred_update(int16_t qua_ener_MR122, int16_t qua_ener,
                                         int16_t past_qua_en[4], int16_t past_qua_en_MR122[4]);
/**
 * Median of a few values.
 * @param ind the values; must not be null.
 * @param n how many, 1..9 (odd counts give the middle value).
 * @return the median.
 */
VAMRNB_API int16_t vamrnb_gmed_n(const int16_t *ind, int16_t n);
/* Subframe kernels (40 samples, order 10). */
/**
 * Order-10 synthesis filter 1/A(z) over one 40-sample subframe.
 * @param a 11 coefficients, Q12; must not be null.
 * @param x 40 input samples; must not be null.
 * @param mem the 10 previous output samples (read only); must not be null.
 * @param y receives 40 output samples, saturated to 16 bits; must not be null.
 */
VAMRNB_API void    vamrnb_syn_filt(const int16_t a[11], const int16_t x[40], const int16_t mem[10],
                                   int16_t y[40]);
/**
 * The decoder's synthesis filter, in place behind its memory, reporting overflow.
 * @param a 11 coefficients, Q12; must not be null.
 * @param x 40 input samples; must not be null.
 * @param overflow set to 1 when an output sample saturated; must not be null.
 * @param buf 10 memory samples followed by room for the 40 outputs; must not be null.
 */
VAMRNB_API void    vamrnbd_syn_filt_m(const int16_t a[11], const int16_t x[40], int32_t *overflow,
                                      int16_t buf[50]);
/**
 * Order-10 residual filter A(z) over one 40-sample subframe.
 * @param a 11 coefficients, Q12; must not be null.
 * @param x the input; x[-10]..x[39] must be readable; must not be null.
 * @param y receives the 40 residual samples; must not be null.
 */
VAMRNB_API void    vamrnb_residu(const int16_t a[11], const int16_t *x, int16_t y[40]);
/**
 * Bandwidth expansion: ap[i] = a[i] * fac[i - 1], ap[0] = a[0].
 * @param a m + 1 coefficients; must not be null.
 * @param fac m factors, Q15; must not be null.
 * @param m order (10, 16 or 20).
 * @param ap receives m + 1 coefficients; must not be null.
 */
VAMRNB_API void    vamrnb_weight_a(const int16_t *a, const int16_t *fac, int32_t m, int16_t *ap);
/**
 * Adaptive-codebook vector: the past excitation at a fractional delay, by
 * interpolation (vamrnb_tbl_pred_inter_6).
 * @param T0 integer part of the delay.
 * @param frac fractional part (in thirds or sixths; negative values allowed).
 * @param flag3 nonzero when @p frac is in thirds.
 * @param exc the excitation at the subframe start, at least T0 + 10 samples of
 *   history before it; 40 samples written; must not be null.
 */
VAMRNB_API void    vamrnb_pred_lt_3or6(int32_t T0, int32_t frac, int32_t flag3, int16_t *exc);
/**
 * Saturating energy sum.
 * @param x the samples; must not be null when @p n > 0.
 * @param n sample count.
 * @param init start value of the sum.
 * @return init plus the sum of 2 * x[i]^2, saturating.
 */
VAMRNB_API int32_t vamrnb_energy(const int16_t *x, int32_t n, int32_t init);
/**
 * Saturating correlation sum.
 * @param x first vector; must not be null when @p n > 0.
 * @param y second vector; must not be null when @p n > 0.
 * @param n sample count.
 * @param init start value of the sum.
 * @return init plus the sum of 2 * x[i] * y[i], saturating.
 */
VAMRNB_API int32_t vamrnb_inner_product(const int16_t *x, const int16_t *y, int32_t n, int32_t init);
/**
 * Decoder LSF dequantiser of the three-split modes (all but MR122), with concealment
 * of bad frames.
 * @param mode the codec mode (0..8).
 * @param bfi nonzero for a bad frame: the indices are ignored and the frequencies are
 *   extrapolated.
 * @param indices the three split indices; must not be null.
 * @param past_lsf_q past quantised frequencies, updated; must not be null.
 * @param past_r_q prediction residual memory, updated; must not be null.
 * @param lsp_out receives 10 pairs, Q15; must not be null.
 */
VAMRNB_API void    vamrnbd_d_plsf_3(int32_t mode, int32_t bfi, const int16_t *indices,
                                    int16_t past_lsf_q[10], int16_t past_r_q[10], int16_t lsp_out[10]);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_DSP_H */
