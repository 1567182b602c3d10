/*
 * A small C program over the public interface only: library lifecycle, one
 * decoder and one encoder instance, a few frames through each.  It is built
 * against the build tree by ctest, against an installed tree through
 * pkg-config by scripts/check_install.sh, and run by scripts/demo.sh.
 */
#include <stdio.h>
#include <string.h>

#include "vamrnb.h"

static int failures = 0;

static void check(int ok, const char *what)
{
    if (!ok) {
        printf("FAIL: %s\n", what);
        ++failures;
    }
}

static void lifecycle(void)
{
    int32_t word = 7;
    check(vamrnb_platform_init(&word) == 0 && word == 0, "platform init clears its word");
    check(vamrnb_init() == 0 && vamrnb_inited == 1, "init sets the flag");
    check(vamrnb_init() == 0 && vamrnb_inited == 1, "second init is harmless");
    vamrnb_deinit();
    check(vamrnb_inited == 0, "deinit clears the flag");
    check(vamrnb_platform_init(NULL) == 0, "platform init accepts a null pointer");
    check(vamrnb_platform_deinit(5) == 5, "platform deinit returns its argument");
}

static void decoder(void)
{
    int32_t err = 1;
    codec_config bad = {{1, 1, 1, 0}};
    check(vamrnbd_create(&bad, &err) == NULL && err == AMRNB_ERR_UNSUPPORTED,
          "decoder refuses a non-zero reserved word");

    codec_config config = {{0, 1, 1, 0}};  /* interleaved, mono, 16-bit */
    vamrnb_decoder *dec = vamrnbd_create(&config, &err);
    check(dec != NULL && err == AMRNB_OK, "decoder created");
    if (dec == NULL)
        return;

    int16_t pcm[2 * 160];
    pcm_buffer out;
    memset(&out, 0, sizeof out);
    out.data[0] = pcm;
    frame_info info;
    memset(&info, 0, sizeof info);

    uint8_t no_data[1] = {0x7C};
    bitstream_buffer in = {no_data, 0, sizeof no_data};
    for (int i = 0; i < 3; ++i) {
        int32_t rc = vamrnbd_decode(dec, &in, &out, &info);
        check(rc == AMRNB_OK && info.produced == 1 && info.bytes == 1,
              "a no-data frame decodes and consumes one byte");
    }
    check(info.frame_count == 3, "frame counter counts decoded frames");

    uint8_t refused[6] = {0x54, 0, 0, 0, 0, 0};  /* frame type 10 */
    in.data = refused;
    in.size = sizeof refused;
    check(vamrnbd_decode(dec, &in, &out, &info) == AMRNB_ERR_BAD_FRAME_TYPE &&
          info.produced == 0 && info.frame_count == 3,
          "frame type 10 is refused without output");
    vamrnbd_delete(dec);
}

static void encoder(void)
{
    int32_t err = 1;
    codec_config bad = {{0, 1, 0, MR122}};
    check(vamrnbe_create(&bad, &err) == NULL && err == AMRNB_ERR_UNSUPPORTED,
          "encoder refuses a non-zero reserved word");

    codec_config config = {{0, 0, 0, MR122}};  /* no DTX, 12.2 kbit/s */
    vamrnb_encoder *enc = vamrnbe_create(&config, &err);
    check(enc != NULL && err == AMRNB_OK, "encoder created");
    if (enc == NULL)
        return;

    int16_t samples[160];
    for (int i = 0; i < 160; ++i)
        samples[i] = (int16_t)((i % 40 - 20) * 400);
    pcm_buffer in;
    memset(&in, 0, sizeof in);
    in.data[0] = samples;
    uint8_t frame[64];
    bitstream_buffer out = {frame, 0, sizeof frame};
    frame_info info;
    memset(&info, 0, sizeof info);
    for (int i = 0; i < 3; ++i) {
        check(vamrnbe_encode(enc, &in, &out, &info) == AMRNB_OK, "encode returns 0");
        check(info.bytes == 32 && info.frame_type == MR122 && frame[0] == 0x3C,
              "a 12.2 kbit/s frame is 32 bytes with table-of-contents byte 0x3C");
    }
    check(info.frame_count == 3, "frame counter counts encoded frames");
    vamrnbe_delete(enc);
}

int main(void)
{
    printf("vamrnb %d.%d.%d\n", VAMRNB_VERSION_MAJOR, VAMRNB_VERSION_MINOR,
           VAMRNB_VERSION_PATCH);
    lifecycle();
    decoder();
    encoder();
    printf("%s\n", failures ? "FAILED" : "ok");
    return failures ? 1 : 0;
}
