// Helpers for the end-to-end tests (tool and GStreamer): whole files as bytes,
// and the library's own storage-format encoding of a signal to compare with.
#pragma once

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <vector>

#include "vamrnb.h"

namespace amr_file {

using Bytes = std::vector<uint8_t>;

inline Bytes read_bytes(const std::filesystem::path &p) {
    std::ifstream f(p, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(f), {});
}

// The library's storage file for pcm (a partial last frame padded with zeros);
// mode_at gives the mode of each frame, vad 2 selects the second detector.
inline Bytes encode(std::vector<int16_t> pcm, const std::function<int(size_t)> &mode_at,
                    bool dtx = false, int vad = 1) {
    codec_config cfg{};
    cfg.enc.dtx = dtx;
    cfg.enc.vad_option = vad == 2;
    cfg.enc.mode = mode_at(0);
    vamrnb_encoder *enc = vamrnbe_create(&cfg, nullptr);
    pcm.resize((pcm.size() + 159) / 160 * 160);
    Bytes out{'#', '!', 'A', 'M', 'R', '\n'};
    frame_info info{};
    for (size_t f = 0; f * 160 < pcm.size(); ++f) {
        uint8_t frame[32];
        pcm_buffer in{};
        in.data[0] = &pcm[f * 160];
        bitstream_buffer bs{frame, 0, sizeof frame};
        vamrnbe_set_mode(enc, mode_at(f));
        vamrnbe_encode(enc, &in, &bs, &info);
        out.insert(out.end(), frame, frame + info.bytes);
    }
    vamrnbe_delete(enc);
    return out;
}

inline Bytes encode(const std::vector<int16_t> &pcm, int mode, bool dtx = false, int vad = 1) {
    return encode(pcm, [mode](size_t) { return mode; }, dtx, vad);
}

}  // namespace amr_file
