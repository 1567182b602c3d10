/*
 * Decodes an .amr file to 24-bit stereo in two planar buffers, one per
 * channel, as an audio pipeline that mixes at 24 bits would take it.  Each
 * channel is written to its own raw file: 8 kHz, 3 bytes per sample, least
 * significant byte first (the decoded 16-bit sample in the upper 2 bytes).
 * Both channels carry the same signal.
 *
 *     decode_planar24 speech.amr left.raw right.raw
 */
#include <stdio.h>

#include "vamrnb.h"
#include "vamrnb_stream.h"

int main(int argc, char **argv)
{
    if (argc != 4) {
        fprintf(stderr, "usage: %s in.amr left.raw right.raw\n", argv[0]);
        return 1;
    }
    FILE *in = fopen(argv[1], "rb");
    FILE *left = fopen(argv[2], "wb");
    FILE *right = fopen(argv[3], "wb");
    if (in == NULL || left == NULL || right == NULL) {
        fprintf(stderr, "cannot open the files\n");
        return 1;
    }
    static uint8_t file[1 << 20];  /* whole files up to 1 MiB; decode_file.c reads in chunks */
    size_t size = fread(file, 1, sizeof file, in);

    /* reserved 0, layout 0 (one buffer per channel), two channels, 24-bit. */
    codec_config config = {{0, 0, 2, 3}};
    int32_t status;
    vamrnb_decoder *dec = vamrnbd_create(&config, &status);
    vamrnb_stream_reader *reader = vamrnb_stream_reader_create(&status);
    if (dec == NULL || reader == NULL) {
        fprintf(stderr, "create: %s\n", vamrnb_strerror(status));
        return 1;
    }
    uint8_t plane[2][VAMRNB_FRAME_SAMPLES * 3];
    pcm_buffer buffers = {0};
    buffers.data[1] = plane[0];  /* first channel */
    buffers.data[2] = plane[1];  /* second channel */
    frame_info info = {0};

    size_t pos = 0, used;
    vamrnb_stream_frame frame;
    while ((status = vamrnb_stream_read(reader, file + pos, size - pos, &used, &frame))
           == VAMRNB_STREAM_FRAME) {
        pos += used;
        bitstream_buffer bits = {(uint8_t *)frame.data, 0, frame.size};
        if (vamrnbd_decode(dec, &bits, &buffers, &info) != AMRNB_OK)
            continue;
        /* buffers.bytes[1] and [2]: 480 bytes each; info: 2 channels, 24 bits. */
        fwrite(plane[0], 1, buffers.bytes[1], left);
        fwrite(plane[1], 1, buffers.bytes[2], right);
    }
    if (status == AMRNB_OK)
        status = vamrnb_stream_finish(reader, NULL);
    if (status != AMRNB_OK)
        fprintf(stderr, "%s: %s\n", argv[1], vamrnb_strerror(status));
    printf("%u frames decoded, %u channels of %u bits\n", info.frame_count, info.channels,
           info.bits_per_sample);

    vamrnb_stream_reader_delete(reader);
    vamrnbd_delete(dec);
    fclose(in);
    int closed = fclose(left) == 0;
    closed = fclose(right) == 0 && closed;
    return closed && status == AMRNB_OK ? 0 : 1;
}
