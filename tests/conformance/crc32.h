// CRC-32 of the zlib / ISO-HDLC kind (reflected polynomial 0xEDB88320,
// initial value and final XOR 0xFFFFFFFF), used to compare decoded frames
// with the expected per-frame checksums.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace conformance {

constexpr std::array<uint32_t, 256> make_crc32_table() {
    std::array<uint32_t, 256> table{};
    for (uint32_t n = 0; n < 256; ++n) {
        uint32_t c = n;
        for (int k = 0; k < 8; ++k) c = (c & 1) ? 0xEDB88320u ^ (c >> 1) : c >> 1;
        table[n] = c;
    }
    return table;
}

inline uint32_t crc32(const uint8_t *data, std::size_t len, uint32_t crc = 0) {
    static constexpr std::array<uint32_t, 256> table = make_crc32_table();
    crc = ~crc;
    for (std::size_t i = 0; i < len; ++i) crc = table[(crc ^ data[i]) & 0xFFu] ^ (crc >> 8);
    return ~crc;
}

// Checksum of one 160-sample frame as 320 little-endian bytes, whatever the
// host byte order.
inline uint32_t frame_crc32(const int16_t *samples, std::size_t count = 160) {
    uint8_t bytes[2 * 160 * 2];
    if (count > 2 * 160) count = 2 * 160;
    for (std::size_t i = 0; i < count; ++i) {
        const auto v = static_cast<uint16_t>(samples[i]);
        bytes[2 * i] = static_cast<uint8_t>(v & 0xFFu);
        bytes[2 * i + 1] = static_cast<uint8_t>(v >> 8);
    }
    return crc32(bytes, 2 * count);
}

}  // namespace conformance
