/*
 * Encodes raw PCM (8 kHz, mono, signed 16-bit in the machine's byte order)
 * to an .amr file: the first half at 12.2 kbit/s, the rest at 4.75 kbit/s.
 * A last partial frame is not encoded.
 *
 *     encode_file speech.pcm speech.amr
 */
#include <stdio.h>

#include "vamrnb.h"
#include "vamrnb_stream.h"

int main(int argc, char **argv)
{
    if (argc != 3) {
        fprintf(stderr, "usage: %s in.pcm out.amr\n", argv[0]);
        return 1;
    }
    FILE *in = fopen(argv[1], "rb");
    FILE *out = fopen(argv[2], "wb");
    if (in == NULL || out == NULL) {
        fprintf(stderr, "cannot open %s\n", in == NULL ? argv[1] : argv[2]);
        return 1;
    }
    fseek(in, 0, SEEK_END);
    long frames = ftell(in) / (long)(VAMRNB_FRAME_SAMPLES * sizeof(int16_t));
    rewind(in);

    /* Encoder configuration: DTX off, reserved 0, detector option (unused
     * without DTX), mode. */
    codec_config config = {{0, 0, 0, MR122}};
    int32_t status;
    vamrnb_encoder *enc = vamrnbe_create(&config, &status);
    if (enc == NULL) {
        fprintf(stderr, "create: %s\n", vamrnb_strerror(status));
        return 1;
    }

    uint8_t stream[VAMRNB_STREAM_MAX_FRAME];
    size_t written;
    vamrnb_stream_write_magic(stream, sizeof stream, &written);
    fwrite(stream, 1, written, out);

    int16_t pcm[VAMRNB_FRAME_SAMPLES];
    pcm_buffer samples = {0};
    samples.data[0] = pcm;
    uint8_t frame[VAMRNB_MAX_FRAME_BYTES];
    bitstream_buffer bits = {frame, 0, sizeof frame};
    frame_info info = {0};

    for (long i = 0; i < frames && fread(pcm, sizeof pcm, 1, in) == 1; ++i) {
        if (i == frames / 2)
            vamrnbe_set_mode(enc, MR475);  /* takes effect with this frame */
        vamrnbe_encode(enc, &samples, &bits, &info);
        status = vamrnb_stream_write_frame(frame, info.bytes, stream, sizeof stream, &written);
        if (status != AMRNB_OK) {
            fprintf(stderr, "frame %ld: %s\n", i, vamrnb_strerror(status));
            break;
        }
        fwrite(stream, 1, written, out);
    }
    printf("%u frames encoded\n", info.frame_count);

    vamrnbe_delete(enc);
    fclose(in);
    return fclose(out) == 0 && status == AMRNB_OK ? 0 : 1;
}
