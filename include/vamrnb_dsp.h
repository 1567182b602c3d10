/*
 * vamrnb — building blocks exported for other codec components.
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
 * exact 32-bit sum of their arguments and then saturate.
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
VAMRNB_API int32_t vamrnb_saturate(int32_t L);
VAMRNB_API int32_t vamrnb_add(int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_sub(int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_abs_s(int32_t a);
VAMRNB_API int32_t vamrnb_negate(int32_t a);
VAMRNB_API int32_t vamrnb_shl(int32_t a, int32_t n);
VAMRNB_API int32_t vamrnb_shr(int32_t a, int32_t n);
VAMRNB_API int32_t vamrnb_mult(int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_mult_r(int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_l_mult(int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_extract_h(int32_t L);
VAMRNB_API int32_t vamrnb_extract_l(int32_t L);
VAMRNB_API int32_t vamrnb_round(int32_t L);
VAMRNB_API int32_t vamrnb_l_deposit_h(int32_t a);
VAMRNB_API int32_t vamrnb_l_deposit_l(int32_t a);
VAMRNB_API int32_t vamrnb_l_add(int32_t L1, int32_t L2);
VAMRNB_API int32_t vamrnb_l_sub(int32_t L1, int32_t L2);
VAMRNB_API int32_t vamrnb_l_mac(int32_t L3, int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_l_msu(int32_t L3, int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_mac_r(int32_t L3, int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_msu_r(int32_t L3, int32_t a, int32_t b);
VAMRNB_API int32_t vamrnb_l_negate(int32_t L);
VAMRNB_API int32_t vamrnb_l_abs(int32_t L);
VAMRNB_API int32_t vamrnb_l_shl(int32_t L, int32_t n);
VAMRNB_API int32_t vamrnb_l_shr(int32_t L, int32_t n);
VAMRNB_API int32_t vamrnb_shr_r(int32_t a, int32_t n);
VAMRNB_API int32_t vamrnb_l_shr_r(int32_t L, int32_t n);
VAMRNB_API int32_t vamrnb_norm_s(int32_t a);
VAMRNB_API int32_t vamrnb_norm_l(int32_t L);
/* Prints a diagnostic line for invalid arguments and carries on. */
VAMRNB_API int32_t vamrnb_div_s(int32_t num, int32_t den);
VAMRNB_API void    vamrnb_l_extract(int32_t L, int16_t *hi, int16_t *lo);
VAMRNB_API int32_t vamrnb_l_comp(int32_t hi, int32_t lo);

/* ---- extended functions ------------------------------------------------- */
VAMRNB_API int32_t vamrnb_mpy_32(int16_t hi1, int16_t lo1, int16_t hi2, int16_t lo2);
VAMRNB_API int32_t vamrnb_mpy_32_16(int16_t hi, int16_t lo, int16_t n);
VAMRNB_API int32_t vamrnb_div_32(int32_t L_num, int16_t denom_hi, int16_t denom_lo);
VAMRNB_API void    vamrnb_log2_norm(int32_t L_x, int16_t exp, int16_t *exponent, int16_t *fraction);
VAMRNB_API void    vamrnb_log2(int32_t L_x, int16_t *exponent, int16_t *fraction);
VAMRNB_API int32_t vamrnb_pow2(int16_t exponent, int16_t fraction);
VAMRNB_API int32_t vamrnb_inv_sqrt(int32_t L_x);
VAMRNB_API void    vamrnb_isqrt_n(int32_t *frac, int16_t *exp);
VAMRNB_API int32_t amrnb_l_shr(int32_t L_var1, int16_t var2, int32_t *overflow);

/* ---- 32-byte-aligned memory and block copy ------------------------------ */
VAMRNB_API void *vcmn_malloc_align32(uint32_t size);
VAMRNB_API void *vcmn_malloc_fast_align32(uint32_t size);
VAMRNB_API void  vcmn_mfree_align32(void *p);
VAMRNB_API void  vcmn_mfree_fast_align32(void *p);
VAMRNB_API void  vcmn_blk_mcpy(void *dst, const void *src, int32_t dst_stride,
                               int32_t src_stride, uint32_t row_bytes, int32_t rows);

/* ---- bit-stream reader --------------------------------------------------- */
typedef struct vcmn_bsr vcmn_bsr;
/* Fetches up to max_bytes into the cache; 0, or -1 when no byte is left. */
typedef int32_t (*vcmn_bsr_refill_fn)(vcmn_bsr *bs, int32_t max_bytes);

struct vcmn_bsr {
    uint32_t cache;            /* bits fetched, not yet handed out */
    int32_t bits;              /* valid bits in cache, 0..32 */
    const uint8_t *ptr;        /* next byte to fetch */
    const uint8_t *end;        /* last byte of the buffer */
    const uint8_t *start;      /* first byte of the buffer */
    uint32_t size;             /* buffer size in bytes */
    vcmn_bsr_refill_fn refill; /* fetch function */
};

/* Bytes consumed so far: ptr - start - bits / 8. */
VAMRNB_API void     vcmn_bsr_init(vcmn_bsr *bs, const uint8_t *buf, uint32_t size,
                                  vcmn_bsr_refill_fn refill);
VAMRNB_API int32_t  vcmn_bsr_flush(vcmn_bsr *bs, int32_t max_bytes);
VAMRNB_API uint32_t vcmn_bsr_read(vcmn_bsr *bs, int32_t n);
VAMRNB_API uint32_t vcmn_bsr_read1(vcmn_bsr *bs);
VAMRNB_API int32_t  vcmn_bsr_read1_value(vcmn_bsr *bs, uint8_t *bit);
VAMRNB_API int32_t  vcmn_bsr_skip(vcmn_bsr *bs, int32_t n);
VAMRNB_API uint32_t vcmn_bsr_peek(vcmn_bsr *bs, int32_t n);
VAMRNB_API uint32_t vcmn_bsr_skip_peek(vcmn_bsr *bs, int32_t skip, int32_t n);
VAMRNB_API void     vcmn_bsr_skip_to_align8(vcmn_bsr *bs);
VAMRNB_API int32_t  vcmn_bsr_clz_in_code(uint32_t word);
/* Least-significant-bit-first reading: pass vcmn_bsr_le_flush to vcmn_bsr_init. */
VAMRNB_API int32_t  vcmn_bsr_le_flush(vcmn_bsr *bs, int32_t max_bytes);
VAMRNB_API uint32_t vcmn_bsr_le_read(vcmn_bsr *bs, int32_t n);
VAMRNB_API void     vcmn_bsr_le_skip(vcmn_bsr *bs, int32_t n);
VAMRNB_API void     vcmn_bsr_le_skip_to_align8(vcmn_bsr *bs);

/* ---- bit-stream writer --------------------------------------------------- */
typedef struct vcmn_bsw vcmn_bsw;
typedef void (*vcmn_bsw_byte_fn)(vcmn_bsw *bs);

struct vcmn_bsw {
    uint8_t *ptr;              /* byte being filled */
    int32_t free_bits;         /* free bit positions in it, 8..1 */
    uint8_t *end;              /* last byte of the buffer */
    uint8_t *start;            /* first byte of the buffer */
    uint32_t size;             /* buffer size in bytes */
    vcmn_bsw_byte_fn on_byte;  /* called for every completed byte, or null */
};

/* Bytes produced so far: ptr - start.  vcmn_bsw_write checks the end of the
 * buffer only on entry: a long write that starts inside the buffer may run
 * past its end, so size buffers for the largest item written. */
VAMRNB_API void     vcmn_bsw_init(vcmn_bsw *bs, uint8_t *buf, uint32_t size,
                                  vcmn_bsw_byte_fn on_byte);
VAMRNB_API uint32_t vcmn_bsw_write1(vcmn_bsw *bs, uint32_t bit);
VAMRNB_API uint32_t vcmn_bsw_write(vcmn_bsw *bs, uint32_t value, int32_t n);

/* ---- frame unpacking, homing tests and packing --------------------------- */
/* Classification of a received frame (Q bit, frame mode, reception type). */
struct rx_frame_class;
/* SID scheduling state of the encoder (only tx_type is read here). */
struct sid_sync_state;

VAMRNB_API void    vamrnbd_unpack_bits(vcmn_bsr *reader, struct rx_frame_class *cls,
                                       int32_t *mode, int16_t serial[250]);
VAMRNB_API void    vamrnbd_bits2prm(int32_t mode, const int16_t *serial, int16_t *prm);
VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test_first(const int16_t *serial, int32_t mode);
VAMRNB_API int32_t vamrnbd_decoder_homing_frm_test(const int16_t *serial, int32_t mode);
VAMRNB_API void    vamrnbe_prm2bits(int32_t mode, int16_t *prm);
VAMRNB_API void    vamrnbe_bs_pack(vcmn_bsw *writer, const int16_t *bits, int32_t mode,
                                   int32_t *used_mode, int32_t tx_type,
                                   const struct sid_sync_state *sid);

/* ---- LSP/LPC conversion, gain prediction, subframe kernels -------------- */
/* LSF <-> LSP (cosine table: vamrnb_tbl_cos_lsp_lsf), minimum LSF spacing,
 * LSP -> order-10 LPC (returns 0), interpolation to four subframe sets. */
VAMRNB_API void    vamrnb_sf_sp(const int16_t lsf[10], const int16_t *table, int16_t lsp[10]);
VAMRNB_API void    vamrnb_lsp_lsf(const int16_t lsp[10], int16_t lsf[10]);
VAMRNB_API void    vamrnb_reorder(int16_t lsf[10]);
VAMRNB_API int32_t vamrnb_lsp_az(const int16_t lsp[10], int16_t a[11]);
VAMRNB_API void    vamrnb_int_lpc_1to3(const int16_t lsp_old[10], const int16_t lsp_new[10], int16_t Az[44]);
VAMRNB_API void    vamrnb_int_lpc_1and3(const int16_t lsp_old[10], const int16_t lsp_mid[10],
                                        const int16_t lsp_new[10], int16_t Az[44]);
/* Code-gain prediction from the two histories (newest first), its update,
 * and the median of n <= 9 values. */
VAMRNB_API void    vamrnb_gc_pred(const int16_t past_qua_en[4], const int16_t past_qua_en_MR122[4],
                                  int32_t mode, const int16_t code[40],
                                  int16_t *exp_gcode0, int16_t *frac_gcode0,
                                  int16_t *exp_en, int16_t *frac_en);
VAMRNB_API void    vamrnb_gc_pred_update(int16_t qua_ener_MR122, int16_t qua_ener,
                                         int16_t past_qua_en[4], int16_t past_qua_en_MR122[4]);
VAMRNB_API int16_t vamrnb_gmed_n(const int16_t *ind, int16_t n);
/* Subframe kernels (40 samples, order 10). */
VAMRNB_API void    vamrnb_syn_filt(const int16_t a[11], const int16_t x[40], const int16_t mem[10],
                                   int16_t y[40]);
VAMRNB_API void    vamrnbd_syn_filt_m(const int16_t a[11], const int16_t x[40], int32_t *overflow,
                                      int16_t buf[50]);
VAMRNB_API void    vamrnb_residu(const int16_t a[11], const int16_t *x, int16_t y[40]);
VAMRNB_API void    vamrnb_weight_a(const int16_t *a, const int16_t *fac, int32_t m, int16_t *ap);
VAMRNB_API void    vamrnb_pred_lt_3or6(int32_t T0, int32_t frac, int32_t flag3, int16_t *exc);
VAMRNB_API int32_t vamrnb_energy(const int16_t *x, int32_t n, int32_t init);
VAMRNB_API int32_t vamrnb_inner_product(const int16_t *x, const int16_t *y, int32_t n, int32_t init);
/* Decoder three-split LSF dequantiser (mode 0..8, bfi nonzero: bad frame). */
VAMRNB_API void    vamrnbd_d_plsf_3(int32_t mode, int32_t bfi, const int16_t *indices,
                                    int16_t past_lsf_q[10], int16_t past_r_q[10], int16_t lsp_out[10]);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_DSP_H */
