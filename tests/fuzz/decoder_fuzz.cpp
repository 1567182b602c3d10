// libFuzzer target: arbitrary bytes as a frame sequence for one decoder.
//
// Byte 0 chooses the output configuration (bits 0-2 sample format 0..7,
// bits 3-5 channel setting 0..7, bit 6 layout), so refused settings are
// exercised too.  The remaining bytes are walked as frames: each call sees
// all bytes left and the walk advances by the bytes consumed, at least one.
// Suggested options: -max_len=1024.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace {

void check(bool ok) {
    if (!ok) std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size < 1) return 0;
    codec_config cfg{};
    cfg.dec.sample_format = data[0] & 7;
    cfg.dec.channels = (data[0] >> 3) & 7;
    cfg.dec.layout = (data[0] >> 6) & 1;
    ++data;
    --size;

    int32_t err = 1;
    vamrnb_decoder *dec = vamrnbd_create(&cfg, &err);
    check(dec != nullptr && err == AMRNB_OK);

    // Exact-size output buffers so that any overrun is caught by ASan.
    static uint8_t *bufs[3];
    const size_t cap[3] = {2 * 160 * 3, 160 * 3, 160 * 3};
    for (int i = 0; i < 3; ++i)
        if (bufs[i] == nullptr) bufs[i] = static_cast<uint8_t *>(std::malloc(cap[i]));

    // The input is copied to a block of its own size for the same reason.
    uint8_t *in = static_cast<uint8_t *>(std::malloc(size ? size : 1));
    if (size) std::memcpy(in, data, size);

    frame_info info{};
    uint32_t frames = 0;
    for (size_t pos = 0; pos < size;) {
        pcm_buffer pcm{};
        for (int i = 0; i < 3; ++i) pcm.data[i] = bufs[i];
        bitstream_buffer bs{in + pos, 0, static_cast<uint32_t>(size - pos)};
        const int32_t st = vamrnbd_decode(dec, &bs, &pcm, &info);
        check(st == AMRNB_OK || st == AMRNB_ERR_UNSUPPORTED || st == AMRNB_ERR_BAD_FRAME_TYPE);
        if (st == AMRNB_OK) {
            check(info.produced == 1 && info.frame_count == ++frames);
            check(info.bytes <= size - pos);
            check(info.channels == 1 || info.channels == 2);
            if (cfg.dec.sample_format == 0 && cfg.dec.layout == 1) {
                // 13-bit output in every sample.
                for (uint32_t i = 0; i < 160 * info.channels; ++i)
                    check((bufs[0][2 * i] & 7) == 0);
            }
        } else if (st == AMRNB_ERR_BAD_FRAME_TYPE) {
            check(info.produced == 0 && info.frame_count == frames);
        }
        // A refused output setting still decodes the frame but reports no
        // size: step over the frame as its type says.
        uint32_t step = 1;
        if (st == AMRNB_OK) step = info.bytes;
        else if (st == AMRNB_ERR_UNSUPPORTED) step = vamrnb_stream_frame_size((in[pos] >> 3) & 15);
        pos += step > 0 ? step : 1;
    }
    if (size >= 2) vamrnbd_reset(dec);
    std::free(in);
    vamrnbd_delete(dec);
    return 0;
}
