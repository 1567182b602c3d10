// The public header must compile on its own as strict C++17.
#include "vamrnb.h"

int vamrnb_header_cxx17_probe();
int vamrnb_header_cxx17_probe()
{
    codec_config config{};
    config.enc.mode = MR475;
    frame_info info{};
    info.channels = 1;
    vamrnb_decoder *(*create)(const codec_config *, int32_t *) = &vamrnbd_create;
    return config.enc.mode + static_cast<int>(info.frame_type) + (create != nullptr);
}
