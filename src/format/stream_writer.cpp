// Storage-format stream writer: the magic, then frames copied after a check
// that each is exactly as long as its table-of-contents byte says, so that a
// reader walking the file by frame sizes finds every frame again.
#include <cstring>

#include "vamrnb_stream.h"

extern "C" {

VAMRNB_API int32_t vamrnb_stream_write_magic(uint8_t *out, size_t room, size_t *written) {
    if (written) *written = 0;
    if (!out || !written) return VAMRNB_STREAM_ERR_ARGUMENT;
    if (room < VAMRNB_STREAM_MAGIC_SIZE) return VAMRNB_STREAM_ERR_NO_ROOM;
    std::memcpy(out, VAMRNB_STREAM_MAGIC, VAMRNB_STREAM_MAGIC_SIZE);
    *written = VAMRNB_STREAM_MAGIC_SIZE;
    return AMRNB_OK;
}

VAMRNB_API int32_t vamrnb_stream_write_frame(const uint8_t *frame, size_t size, uint8_t *out, size_t room,
                                             size_t *written) {
    if (written) *written = 0;
    if (!frame || !out || !written || size == 0) return VAMRNB_STREAM_ERR_ARGUMENT;
    const uint8_t toc = frame[0];
    if (toc & 0x80) return VAMRNB_STREAM_ERR_TOC;
    if (size != vamrnb_stream_frame_size((toc >> 3) & 15)) return VAMRNB_STREAM_ERR_FRAME_SIZE;
    if (room < size) return VAMRNB_STREAM_ERR_NO_ROOM;
    std::memmove(out, frame, size);
    out[0] = static_cast<uint8_t>(toc & 0x7C);
    *written = size;
    return AMRNB_OK;
}

}  // extern "C"
