/*
 * Decodes an .amr file (AMR-NB storage format) to raw PCM: 8 kHz, mono,
 * signed 16-bit samples in the machine's byte order.
 *
 *     decode_file speech.amr speech.pcm
 */
#include <stdio.h>

#include "vamrnb.h"
#include "vamrnb_stream.h"

int main(int argc, char **argv)
{
    if (argc != 3) {
        fprintf(stderr, "usage: %s in.amr out.pcm\n", argv[0]);
        return 1;
    }
    FILE *in = fopen(argv[1], "rb");
    FILE *out = fopen(argv[2], "wb");
    if (in == NULL || out == NULL) {
        fprintf(stderr, "cannot open %s\n", in == NULL ? argv[1] : argv[2]);
        return 1;
    }

    /* Decoder configuration: reserved 0, interleaved, one channel, 16-bit. */
    codec_config config = {{0, 1, 1, 0}};
    int32_t status;
    vamrnb_decoder *dec = vamrnbd_create(&config, &status);
    vamrnb_stream_reader *reader = vamrnb_stream_reader_create(&status);
    if (dec == NULL || reader == NULL) {
        fprintf(stderr, "create: %s\n", vamrnb_strerror(status));
        return 1;
    }

    int16_t pcm[VAMRNB_FRAME_SAMPLES];
    pcm_buffer buffers = {0};
    buffers.data[0] = pcm;
    frame_info info = {0};

    /* The reader accepts the file in chunks of any size and hands out one
     * whole frame at a time. */
    uint8_t chunk[4096];
    size_t n;
    status = AMRNB_OK;
    while (status >= 0 && (n = fread(chunk, 1, sizeof chunk, in)) > 0) {
        for (size_t pos = 0, used; pos < n && status >= 0; pos += used) {
            vamrnb_stream_frame frame;
            status = vamrnb_stream_read(reader, chunk + pos, n - pos, &used, &frame);
            if (status != VAMRNB_STREAM_FRAME)
                continue;
            bitstream_buffer bits = {(uint8_t *)frame.data, 0, frame.size};
            status = vamrnbd_decode(dec, &bits, &buffers, &info);
            if (status == AMRNB_ERR_BAD_FRAME_TYPE) {
                /* Frame types 10 and 11 carry nothing for AMR-NB: decode a
                 * lost frame in their place so that the timing holds. */
                uint8_t no_data = 0x7C;
                bitstream_buffer lost = {&no_data, 0, 1};
                status = vamrnbd_decode(dec, &lost, &buffers, &info);
            }
            if (status == AMRNB_OK)
                fwrite(pcm, sizeof pcm[0], buffers.samples[0], out);
        }
    }
    if (status >= 0)
        status = vamrnb_stream_finish(reader, NULL);
    if (status < 0)
        fprintf(stderr, "%s: %s\n", argv[1], vamrnb_strerror(status));
    else
        printf("%u frames decoded\n", info.frame_count);

    vamrnb_stream_reader_delete(reader);
    vamrnbd_delete(dec);
    fclose(in);
    return fclose(out) == 0 && status >= 0 ? 0 : 1;
}
