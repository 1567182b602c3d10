// vamrnb_satcount: runs raw 16-bit 8 kHz PCM files through the encoder in
// every mode (and, with --dtx, with each detector) and the decoder on the
// encoder's output, then prints how often each fixed-point operator
// saturated, per function (or per source line with --by-site).  Built only
// with -DVAMRNB_COUNT_SATURATION=ON; the vector kernels are switched off so
// that every sum goes through the counted operators.
#include <cstdio>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "basic_op/sat_count.h"
#include "vamrnb.h"

namespace {

std::vector<int16_t> read_pcm(const char *path) {
    std::ifstream f(path, std::ios::binary);
    std::vector<char> bytes((std::istreambuf_iterator<char>(f)), std::istreambuf_iterator<char>());
    std::vector<int16_t> pcm(bytes.size() / 2);
    for (size_t i = 0; i < pcm.size(); ++i)
        pcm[i] = static_cast<int16_t>(static_cast<uint8_t>(bytes[2 * i]) |
                                      (static_cast<uint8_t>(bytes[2 * i + 1]) << 8));
    return pcm;
}

// Encodes the whole signal in one configuration and decodes each frame.
bool run(const std::vector<int16_t> &pcm, int32_t mode, int32_t dtx, int32_t vad_option) {
    int32_t status = 1;
    const codec_config enc_config = {{dtx, 0, vad_option, mode}};
    const codec_config dec_config = {{0, 1, 1, 0}};
    vamrnb_encoder *enc = vamrnbe_create(&enc_config, &status);
    vamrnb_decoder *dec = vamrnbd_create(&dec_config, &status);
    if (enc == nullptr || dec == nullptr) {
        vamrnbe_delete(enc);
        vamrnbd_delete(dec);
        return false;
    }
    int16_t in[160], out[2 * 160];
    uint8_t bits[64];
    pcm_buffer pin{}, pout{};
    pin.data[0] = in;
    pout.data[0] = out;
    frame_info info{};
    for (size_t f = 0; f + 160 <= pcm.size(); f += 160) {
        std::memcpy(in, pcm.data() + f, sizeof in);
        bitstream_buffer b{bits, 0, sizeof bits};
        if (vamrnbe_encode(enc, &pin, &b, &info) != AMRNB_OK) continue;
        bitstream_buffer d{bits, 0, info.bytes};
        vamrnbd_decode(dec, &d, &pout, &info);
    }
    vamrnbe_delete(enc);
    vamrnbd_delete(dec);
    return true;
}

}  // namespace

int main(int argc, char **argv) {
    bool by_site = false, dtx = false;
    std::vector<const char *> files;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--by-site") == 0) by_site = true;
        else if (std::strcmp(argv[i], "--dtx") == 0) dtx = true;
        else files.push_back(argv[i]);
    }
    if (files.empty()) {
        std::fprintf(stderr, "usage: %s [--by-site] [--dtx] file.pcm...\n"
                             "  raw 16-bit little-endian mono PCM at 8 kHz\n", argv[0]);
        return 2;
    }
    vamrnb_set_cpu_flags(0);
    size_t frames = 0;
    for (const char *path : files) {
        const auto pcm = read_pcm(path);
        if (pcm.empty()) {
            std::fprintf(stderr, "%s: cannot read or empty\n", path);
            return 1;
        }
        for (int32_t mode = MR475; mode <= MR122; ++mode) {
            if (!run(pcm, mode, 0, 0)) return 1;
            frames += pcm.size() / 160;
            if (dtx) {
                for (int32_t vad = 1; vad <= 2; ++vad) run(pcm, mode, 1, vad);
                frames += 2 * (pcm.size() / 160);
            }
        }
    }
    std::printf("%zu frames encoded and decoded\n\n", frames);
    vamrnb::report_saturations(stdout, by_site);
    return 0;
}
