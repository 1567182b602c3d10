// libFuzzer target: RTP payloads, storage-format frames and fmtp text.
//
// Byte 0 chooses what the rest is: bits 0-1 the payload mode (0
// bandwidth-efficient, 1 octet-aligned, 2 octet-aligned with CRCs), bits 2-3
// the direction (0 a payload to parse, 1 frames to pack, 2 fmtp text).
// Oracles: whatever parses packs back to a payload of the same size that
// parses to the same frames; whatever packs parses back to the same frames
// (padding bits cleared); fmtp text that parses formats to text that parses
// to the same parameters.  Inputs are copied to blocks of their exact size
// so that any overrun is caught by ASan.  Suggested options: -max_len=512.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "vamrnb_rtp.h"
#include "vamrnb_tables.h"

namespace {

void check(bool ok) {
    if (!ok) std::abort();
}

// Sizes as a walker over storage frames sees them: the reserved types as one byte.
size_t frame_size(uint8_t toc) {
    const int n = vamrnb_tbl_packed_size[(toc >> 3) & 15];
    return n > 0 ? static_cast<size_t>(n) : 1;
}

int frame_bits(int ft) { return vamrnb_tbl_unpacked_size[ft] + (ft == 8 ? 4 : 0); }

void parse_direction(const vamrnb_rtp_params &p, const std::vector<uint8_t> &in) {
    std::vector<uint8_t> frames(in.size() * 8 + 32);
    vamrnb_rtp_info info{};
    if (vamrnb_rtp_parse(&p, in.data(), in.size(), frames.data(), frames.size(), &info) != AMRNB_OK)
        return;
    check(info.frames >= 1 && info.bytes <= frames.size());
    size_t walked = 0;
    for (uint32_t i = 0; i < info.frames; ++i) walked += frame_size(frames[walked]);
    check(walked == info.bytes);

    const int cmr = info.cmr <= 7 ? info.cmr : VAMRNB_RTP_CMR_NONE;
    std::vector<uint8_t> again(in.size() + 16);
    vamrnb_rtp_info packed{};
    check(vamrnb_rtp_pack(&p, cmr, frames.data(), info.bytes, again.data(), again.size(), &packed)
          == AMRNB_OK);
    check(packed.bytes == in.size() && packed.frames == info.frames);

    std::vector<uint8_t> back(info.bytes);
    vamrnb_rtp_info reparsed{};
    check(vamrnb_rtp_parse(&p, again.data(), packed.bytes, back.data(), back.size(), &reparsed)
          == AMRNB_OK);
    check(reparsed.bytes == info.bytes && reparsed.crc_errors == 0 && reparsed.cmr == cmr);
    check(std::memcmp(back.data(), frames.data(), info.bytes) == 0);
}

void pack_direction(const vamrnb_rtp_params &p, std::vector<uint8_t> in) {
    // The payload keeps only what a frame means: its type, quality and bits.
    for (size_t pos = 0; pos < in.size();) {
        const int ft = (in[pos] >> 3) & 15;
        in[pos] &= 0x7C;
        const size_t size = frame_size(in[pos]);
        if (size > in.size() - pos) break;
        const int bits = ft <= 11 ? frame_bits(ft) : 0;
        for (size_t b = static_cast<size_t>(bits); b < (size - 1) * 8; ++b)
            in[pos + 1 + b / 8] &= static_cast<uint8_t>(~(0x80u >> (b % 8)));
        pos += size;
    }
    std::vector<uint8_t> payload(in.size() * 2 + 16);
    vamrnb_rtp_info info{};
    if (vamrnb_rtp_pack(&p, VAMRNB_RTP_CMR_NONE, in.data(), in.size(), payload.data(),
                        payload.size(), &info) != AMRNB_OK)
        return;
    std::vector<uint8_t> back(in.size());
    vamrnb_rtp_info parsed{};
    check(vamrnb_rtp_parse(&p, payload.data(), info.bytes, back.data(), back.size(), &parsed)
          == AMRNB_OK);
    check(parsed.bytes == in.size() && parsed.frames == info.frames && parsed.crc_errors == 0);
    check(std::memcmp(back.data(), in.data(), in.size()) == 0);
}

void fmtp_direction(const uint8_t *data, size_t size) {
    std::vector<char> text(data, data + size);
    text.push_back('\0');
    vamrnb_rtp_params p;
    if (vamrnb_rtp_fmtp_parse(text.data(), &p) != AMRNB_OK) return;
    char out[256];
    size_t len = 0;
    check(vamrnb_rtp_fmtp_format(&p, out, sizeof out, &len) == AMRNB_OK);
    vamrnb_rtp_params again;
    check(vamrnb_rtp_fmtp_parse(out, &again) == AMRNB_OK);
    check(std::memcmp(&p, &again, sizeof p) == 0);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size < 1) return 0;
    const unsigned sel = data[0];
    vamrnb_rtp_params p;
    vamrnb_rtp_params_default(&p);
    p.octet_align = (sel & 3) != 0;
    p.crc = (sel & 3) >= 2;
    const std::vector<uint8_t> rest(data + 1, data + size);
    switch ((sel >> 2) & 3) {
    case 0: parse_direction(p, rest); break;
    case 1: if (!rest.empty()) pack_direction(p, rest); break;
    default: fmtp_direction(data + 1, size - 1); break;
    }
    return 0;
}
