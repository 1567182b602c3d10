// Pieces shared by the RTP payload packer and parser: the size of every
// frame type in the payload, the part of a frame a CRC protects, the CRC
// itself, and bit access at any offset into a byte buffer.  Callers check
// every length before they touch a byte, so these helpers do no bounds
// checks of their own.
#pragma once

#include <cstddef>
#include <cstdint>

#include "vamrnb_rtp.h"
#include "format/frame_tables.h"

namespace vamrnb::rtp {

inline constexpr int FT_SID = 8;
inline constexpr int FT_NO_DATA = 15;
inline constexpr int MAX_CMR = 15;

// Frame types 12 to 14 are reserved: a payload naming one is refused whole.
constexpr bool reserved_type(int ft) { return ft >= 12 && ft <= 14; }

// Bits a frame of type ft carries in a payload: its class bits, and for an
// AMR SID frame the type indicator and the 3-bit mode indication after them.
inline int frame_bits(int ft) {
    return vamrnb_tbl_unpacked_size[ft] + (ft == FT_SID ? 4 : 0);
}

// Bytes of the frame in storage format, table-of-contents byte included.
// The table has no size for the reserved types, which never get this far.
inline int storage_bytes(int ft) { return vamrnb_tbl_packed_size[ft]; }

// Bits covered by a frame's CRC: the class A bits, which lead every frame.
// SID frames are class A throughout.
inline int crc_bits(int ft) {
    static constexpr int16_t kClassA[16] = {42, 49, 55, 58, 61, 75, 65, 81, 39, 43, 38, 37,
                                            0,  0,  0,  0};
    return kClassA[ft];
}

// 8-bit CRC, generator x^8 + x^4 + x^3 + x^2 + 1, register starting at 0,
// over the first `bits` bits of `data`, most significant bit of each byte
// first: whole bytes through a table, the rest of the bits one by one.
struct crc8_table {
    uint8_t t[256];
    constexpr crc8_table() : t{} {
        for (int b = 0; b < 256; ++b) {
            uint32_t reg = static_cast<uint32_t>(b);
            for (int i = 0; i < 8; ++i) reg = ((reg << 1) ^ ((reg & 0x80u) ? 0x1Du : 0u)) & 0xFFu;
            t[b] = static_cast<uint8_t>(reg);
        }
    }
};
inline constexpr crc8_table kCrc8{};

inline uint8_t crc8(const uint8_t *data, int bits) {
    uint32_t reg = 0;
    int i = 0;
    for (; i + 8 <= bits; i += 8) reg = kCrc8.t[reg ^ data[i >> 3]];
    for (; i < bits; ++i) {
        const uint32_t in = (data[i >> 3] >> (7 - (i & 7))) & 1u;
        const uint32_t top = ((reg >> 7) & 1u) ^ in;
        reg = (reg << 1) & 0xFFu;
        if (top) reg ^= 0x1Du;
    }
    return static_cast<uint8_t>(reg);
}

// Writes the low n bits of v (n <= 8) at bit position pos, most significant
// first.  The byte holding pos must be zero from pos on; every byte the call
// enters afresh is overwritten, so the output needs no clearing beforehand.
inline void put_bits(uint8_t *out, size_t pos, uint32_t v, int n) {
    const size_t byte = pos >> 3;
    const int used = static_cast<int>(pos & 7);
    const uint32_t x = (v & ((1u << n) - 1u)) << (16 - used - n);
    if (used == 0) out[byte] = static_cast<uint8_t>(x >> 8);
    else out[byte] = static_cast<uint8_t>(out[byte] | (x >> 8));
    if (used + n > 8) out[byte + 1] = static_cast<uint8_t>(x);
}

// Reads n bits (n <= 8) at bit position pos, most significant first.
inline uint32_t get_bits(const uint8_t *in, size_t pos, int n) {
    const size_t byte = pos >> 3;
    const int used = static_cast<int>(pos & 7);
    uint32_t x = static_cast<uint32_t>(in[byte]) << 8;
    if (used + n > 8) x |= in[byte + 1];
    return (x >> (16 - used - n)) & ((1u << n) - 1u);
}

// The payload features this library does not carry, and mode combinations
// that cannot be: both directions refuse them before looking at any data.
inline int32_t check_params(const vamrnb_rtp_params *p) {
    if (p->channels != 1 || p->interleaving != 0 || p->robust_sorting != 0)
        return VAMRNB_RTP_ERR_UNSUPPORTED;
    if ((p->octet_align != 0 && p->octet_align != 1) || (p->crc != 0 && p->crc != 1)
        || (p->crc && !p->octet_align))
        return VAMRNB_RTP_ERR_ARGUMENT;
    return AMRNB_OK;
}

}  // namespace vamrnb::rtp
