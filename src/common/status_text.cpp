// Run-time identification: the text of every status code the library
// returns, and the version string the library was built as.
#include "vamrnb.h"
#include "vamrnb_stream.h"

#define VAMRNB_STR2(x) #x
#define VAMRNB_STR(x) VAMRNB_STR2(x)

extern "C" {

VAMRNB_API const char *vamrnb_strerror(int32_t status) {
    switch (status) {
    case AMRNB_OK: return "success";
    case VAMRNB_STREAM_FRAME: return "frame ready";
    case AMRNB_ERR_NO_MEMORY: return "out of memory";
    case AMRNB_ERR_UNSUPPORTED: return "unsupported configuration or output format";
    case AMRNB_ERR_BAD_FRAME_TYPE: return "frame type not decodable (10, 11 or above 15)";
    case AMRNB_ERR_BAD_LAYOUT: return "unsupported output channel setting";
    case VAMRNB_STREAM_ERR_MAGIC: return "not an AMR-NB file (no \"#!AMR\\n\" magic)";
    case VAMRNB_STREAM_ERR_WIDEBAND: return "AMR-WB (wideband) stream: not supported";
    case VAMRNB_STREAM_ERR_MULTICHANNEL: return "multi-channel AMR stream: not supported";
    case VAMRNB_STREAM_ERR_TOC: return "invalid table-of-contents byte (F bit set)";
    case VAMRNB_STREAM_ERR_TRUNCATED: return "stream ends inside a frame";
    case VAMRNB_STREAM_ERR_NO_ROOM: return "output buffer too small";
    case VAMRNB_STREAM_ERR_FRAME_SIZE: return "frame size does not match its frame type";
    case VAMRNB_STREAM_ERR_ARGUMENT: return "invalid argument";
    default: return "unknown status";
    }
}

VAMRNB_API const char *vamrnb_version(void) {
    return VAMRNB_STR(VAMRNB_VERSION_MAJOR) "." VAMRNB_STR(VAMRNB_VERSION_MINOR) "." VAMRNB_STR(VAMRNB_VERSION_PATCH);
}

}  // extern "C"
