/*
 * Driver for bench/insn_count.sh: runs one codec mode over the first FRAMES
 * frames of a 16-bit mono 8 kHz WAV file through the public C interface.
 *
 *   insn_loop enc|dtx|dec MODE FILE.wav FRAMES [dry]
 *
 * enc encodes without DTX, dtx with DTX and voice activity detector 1, dec
 * decodes the frames that the encoder (no DTX) produced from the same input.
 * "dry" does every step except the measured calls (vamrnbe_encode for
 * enc/dtx, vamrnbd_decode for dec), so the difference between a full and a
 * dry run, in any instruction counter, is the cost of those calls alone.
 * VAMRNB_CPU_FLAGS (a number) restricts the kernels through
 * vamrnb_set_cpu_flags.  Prints the frame count and a checksum of the output.
 */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "vamrnb.h"

enum { FRAME = 160, MAX_BYTES = 32 };

static unsigned read_le(const unsigned char *p, int n)
{
    unsigned v = 0;
    for (int i = n - 1; i >= 0; --i)
        v = v << 8 | p[i];
    return v;
}

/* The samples of a PCM WAV file (16-bit, mono, 8 kHz), or NULL. */
static int16_t *read_wav(const char *path, long *samples)
{
    FILE *f = fopen(path, "rb");
    if (f == NULL) {
        perror(path);
        return NULL;
    }
    unsigned char head[12], chunk[8], fmt[16];
    int16_t *pcm = NULL;
    int fmt_ok = 0;
    if (fread(head, 1, 12, f) != 12 || memcmp(head, "RIFF", 4) || memcmp(head + 8, "WAVE", 4))
        goto bad;
    while (fread(chunk, 1, 8, f) == 8) {
        const unsigned size = read_le(chunk + 4, 4);
        if (!memcmp(chunk, "fmt ", 4) && size >= 16) {
            if (fread(fmt, 1, 16, f) != 16)
                goto bad;
            fmt_ok = read_le(fmt, 2) == 1 && read_le(fmt + 2, 2) == 1 &&
                     read_le(fmt + 4, 4) == 8000 && read_le(fmt + 14, 2) == 16;
            if (fseek(f, (long)(size - 16 + (size & 1)), SEEK_CUR))
                goto bad;
        } else if (!memcmp(chunk, "data", 4) && fmt_ok) {
            *samples = size / 2;
            pcm = malloc(size + 1);
            if (pcm == NULL || fread(pcm, 2, *samples, f) != (size_t)*samples)
                goto bad;
            for (long i = 0; i < *samples; ++i) {  /* file order is little-endian */
                const unsigned char *b = (const unsigned char *)&pcm[i];
                pcm[i] = (int16_t)(b[0] | b[1] << 8);
            }
            fclose(f);
            return pcm;
        } else if (fseek(f, (long)(size + (size & 1)), SEEK_CUR)) {
            goto bad;
        }
    }
bad:
    fprintf(stderr, "%s: not a 16-bit mono 8 kHz PCM WAV file\n", path);
    free(pcm);
    fclose(f);
    return NULL;
}

int main(int argc, char **argv)
{
    if (argc < 5 || (strcmp(argv[1], "enc") && strcmp(argv[1], "dtx") && strcmp(argv[1], "dec"))) {
        fprintf(stderr, "usage: insn_loop enc|dtx|dec MODE FILE.wav FRAMES [dry]\n");
        return 2;
    }
    const int decode = !strcmp(argv[1], "dec"), dtx = !strcmp(argv[1], "dtx");
    const int mode = atoi(argv[2]);
    const int dry = argc > 5 && !strcmp(argv[5], "dry");
    long samples = 0;
    int16_t *pcm = read_wav(argv[3], &samples);
    if (pcm == NULL)
        return 1;
    long frames = samples / FRAME;
    if (atol(argv[4]) > 0 && atol(argv[4]) < frames)
        frames = atol(argv[4]);
    if (getenv("VAMRNB_CPU_FLAGS"))
        vamrnb_set_cpu_flags((uint32_t)strtoul(getenv("VAMRNB_CPU_FLAGS"), NULL, 0));

    int32_t err = 0;
    codec_config ec = {{dtx, 0, 0, mode}};
    vamrnb_encoder *enc = vamrnbe_create(&ec, &err);
    codec_config dc = {{0, 1, 1, 0}};
    vamrnb_decoder *dec = decode ? vamrnbd_create(&dc, &err) : NULL;
    unsigned char *stream = calloc((size_t)frames, MAX_BYTES);
    uint32_t *sizes = calloc((size_t)frames, sizeof *sizes);
    if (enc == NULL || (decode && dec == NULL) || stream == NULL || sizes == NULL) {
        fprintf(stderr, "insn_loop: set-up failed (%d)\n", (int)err);
        return 1;
    }

    unsigned long sum = 5381;
    int16_t in[FRAME], out[2 * FRAME];
    for (long i = 0; i < frames; ++i) {
        memcpy(in, pcm + i * FRAME, sizeof in);
        pcm_buffer pb;
        memset(&pb, 0, sizeof pb);
        pb.data[0] = in;
        bitstream_buffer bb = {stream + i * MAX_BYTES, 0, MAX_BYTES};
        frame_info fi;
        memset(&fi, 0, sizeof fi);
        if (!(dry && !decode) && vamrnbe_encode(enc, &pb, &bb, &fi) != AMRNB_OK) {
            fprintf(stderr, "insn_loop: encoding failed at frame %ld\n", i);
            return 1;
        }
        sizes[i] = fi.bytes;
    }
    for (long i = 0; decode && i < frames; ++i) {
        bitstream_buffer bb = {stream + i * MAX_BYTES, 0, sizes[i]};
        pcm_buffer pb;
        memset(&pb, 0, sizeof pb);
        pb.data[0] = out;
        frame_info fi;
        memset(&fi, 0, sizeof fi);
        memset(out, 0, sizeof out);
        if (!dry && vamrnbd_decode(dec, &bb, &pb, &fi) != AMRNB_OK) {
            fprintf(stderr, "insn_loop: decoding failed at frame %ld\n", i);
            return 1;
        }
        for (int k = 0; k < FRAME; ++k)
            sum = sum * 33 + (uint16_t)out[k];
    }
    /* A fixed amount of work, so that full and dry runs differ only in the
     * codec calls. */
    for (long i = 0; !decode && i < frames; ++i)
        for (int k = 0; k < MAX_BYTES; ++k)
            sum = sum * 33 + stream[i * MAX_BYTES + k];
    printf("frames %ld checksum %08lx\n", frames, sum & 0xffffffffUL);

    vamrnbe_delete(enc);
    if (dec != NULL)
        vamrnbd_delete(dec);
    free(stream);
    free(sizes);
    free(pcm);
    return 0;
}
