/* The public header must compile on its own as strict C11. */
#include "vamrnb.h"

int vamrnb_header_c11_probe(void);
int vamrnb_header_c11_probe(void)
{
    codec_config config = {{0, 1, 1, 0}};
    frame_info info = {0};
    info.frame_type = (uint32_t)MR122;
    return config.dec.layout + (int)info.channels + (int)sizeof(pcm_buffer) +
           (int)sizeof(bitstream_buffer) + AMRNB_ERR_BAD_FRAME_TYPE;
}
