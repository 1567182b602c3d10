/*
 * Decodes an .amr file as a receiver that loses and damages frames on the
 * way: in every 25 frames, frames 10 to 12 never arrive and frame 20 arrives
 * marked bad.  The decoder conceals both; the output is raw PCM (8 kHz,
 * mono, signed 16-bit in the machine's byte order).
 *
 *     decode_lost_frames speech.amr concealed.pcm
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
    static uint8_t file[1 << 20];  /* whole files up to 1 MiB; decode_file.c reads in chunks */
    size_t size = fread(file, 1, sizeof file, in);

    codec_config config = {{0, 1, 1, 0}};  /* interleaved, mono, 16-bit */
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

    size_t pos = 0, used;
    vamrnb_stream_frame frame;
    while ((status = vamrnb_stream_read(reader, file + pos, size - pos, &used, &frame))
           == VAMRNB_STREAM_FRAME) {
        pos += used;
        uint8_t bytes[VAMRNB_MAX_FRAME_BYTES];
        bitstream_buffer bits = {bytes, 0, frame.size};
        for (uint32_t i = 0; i < frame.size; ++i)
            bytes[i] = frame.data[i];
        unsigned k = info.frame_count % 25;
        if (k >= 10 && k <= 12) {
            bytes[0] = 0x7C;         /* lost: a no-data frame stands in */
            bits.size = 1;
        } else if (k == 20) {
            bytes[0] &= ~0x04;       /* damaged: quality bit Q cleared */
        }
        if (vamrnbd_decode(dec, &bits, &buffers, &info) == AMRNB_OK)
            fwrite(pcm, sizeof pcm[0], buffers.samples[0], out);
    }
    if (status == AMRNB_OK)
        status = vamrnb_stream_finish(reader, NULL);
    if (status != AMRNB_OK)
        fprintf(stderr, "%s: %s\n", argv[1], vamrnb_strerror(status));
    printf("%u frames decoded\n", info.frame_count);

    vamrnb_stream_reader_delete(reader);
    vamrnbd_delete(dec);
    fclose(in);
    return fclose(out) == 0 && status == AMRNB_OK ? 0 : 1;
}
