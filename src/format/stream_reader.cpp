// Storage-format stream reader: recognises the magic, then splits the bytes
// that follow into frames by their table-of-contents bytes, whatever the
// chunking of the input.  A frame that arrives whole in one call is handed out
// where it lies; only a frame split across calls is gathered in the reader's
// own buffer, so the reader holds at most one frame.
#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "vamrnb_stream.h"
#include "format/frame_tables.h"

struct vamrnb_stream_reader {
    uint64_t offset;        // bytes consumed so far
    uint64_t frame_offset;  // where the frame being gathered starts
    int32_t error;          // sticky status, 0 while the stream is sound
    bool magic_done;
    uint32_t have;          // bytes gathered in buf (magic or frame)
    uint32_t need;          // size of the frame being gathered
    uint8_t buf[VAMRNB_STREAM_MAX_FRAME];
};

namespace {

// The magics a stream may open with.  The wideband ones and the
// multi-channel one are recognised so that callers can say what the file is.
struct Magic {
    const char *text;
    int32_t status;
};
constexpr Magic kMagics[] = {
    {VAMRNB_STREAM_MAGIC, AMRNB_OK},
    {"#!AMR_MC1.0\n", VAMRNB_STREAM_ERR_MULTICHANNEL},
    {"#!AMR-WB\n", VAMRNB_STREAM_ERR_WIDEBAND},
    {"#!AMR-WB_MC1.0\n", VAMRNB_STREAM_ERR_WIDEBAND},
};
constexpr uint32_t kLongestMagic = 15;
static_assert(kLongestMagic <= VAMRNB_STREAM_MAX_FRAME);

// 1: the gathered bytes may still become a magic; otherwise the status of the
// magic they complete, or VAMRNB_STREAM_ERR_MAGIC when none can match.
int32_t match_magic(const uint8_t *got, uint32_t n) {
    bool prefix = false;
    for (const Magic &m : kMagics) {
        const size_t len = std::strlen(m.text);
        if (n > len || std::memcmp(got, m.text, n) != 0) continue;
        if (n == len) return m.status;
        prefix = true;
    }
    return prefix ? 1 : VAMRNB_STREAM_ERR_MAGIC;
}

void describe(vamrnb_stream_frame *f, const uint8_t *bytes, uint32_t size, uint64_t offset) {
    const uint8_t toc = bytes[0];
    f->data = bytes;
    f->size = size;
    f->type = static_cast<uint8_t>((toc >> 3) & 15);
    f->quality = static_cast<uint8_t>((toc >> 2) & 1);
    f->padding = static_cast<uint8_t>(toc & 3);
    f->reserved = 0;
    f->offset = offset;
}

}  // namespace

extern "C" {

VAMRNB_API uint32_t vamrnb_stream_frame_size(int32_t type) {
    if (type < 0 || type > 15) return 0;
    // Types 12 to 14 carry no bits, but their table-of-contents byte is there.
    const int16_t bytes = vamrnb_tbl_packed_size[type];
    return bytes > 0 ? static_cast<uint32_t>(bytes) : 1u;
}

VAMRNB_API vamrnb_stream_reader *vamrnb_stream_reader_create(int32_t *error) {
    // Plain zeroed memory is the reset state.
    auto *r = static_cast<vamrnb_stream_reader *>(std::calloc(1, sizeof(vamrnb_stream_reader)));
    if (error) *error = r ? AMRNB_OK : AMRNB_ERR_NO_MEMORY;
    return r;
}

VAMRNB_API void vamrnb_stream_reader_reset(vamrnb_stream_reader *r) {
    if (r) std::memset(r, 0, sizeof *r);
}

VAMRNB_API void vamrnb_stream_reader_delete(vamrnb_stream_reader *r) { std::free(r); }

VAMRNB_API uint64_t vamrnb_stream_reader_offset(const vamrnb_stream_reader *r) { return r ? r->offset : 0; }

VAMRNB_API int32_t vamrnb_stream_read(vamrnb_stream_reader *r, const uint8_t *data, size_t size,
                                      size_t *consumed, vamrnb_stream_frame *frame) {
    if (consumed) *consumed = 0;
    if (!r || !consumed || !frame || (!data && size)) return VAMRNB_STREAM_ERR_ARGUMENT;
    if (r->error) return r->error;

    size_t used = 0;
    auto done = [&](int32_t status) {
        *consumed = used;
        r->offset += used;
        if (status < 0) r->error = status;
        return status;
    };

    while (!r->magic_done) {
        if (used == size) return done(AMRNB_OK);
        r->buf[r->have++] = data[used++];
        const int32_t m = match_magic(r->buf, r->have);
        if (m < 0) return done(m);
        if (m == AMRNB_OK) {
            r->magic_done = true;
            r->have = 0;
        }
    }

    if (r->have > 0) {
        // Completing a frame begun in an earlier call.
        const size_t take = std::min<size_t>(r->need - r->have, size - used);
        std::memcpy(r->buf + r->have, data + used, take);
        r->have += static_cast<uint32_t>(take);
        used += take;
        if (r->have < r->need) return done(AMRNB_OK);
        describe(frame, r->buf, r->need, r->frame_offset);
        r->have = 0;
        return done(VAMRNB_STREAM_FRAME);
    }
    if (used == size) return done(AMRNB_OK);

    const uint8_t toc = data[used];
    if (toc & 0x80) return done(VAMRNB_STREAM_ERR_TOC);  // offset stays on the byte
    const uint32_t need = vamrnb_stream_frame_size((toc >> 3) & 15);
    if (size - used >= need) {
        describe(frame, data + used, need, r->offset + used);
        used += need;
        return done(VAMRNB_STREAM_FRAME);
    }
    r->frame_offset = r->offset + used;
    r->need = need;
    r->have = static_cast<uint32_t>(size - used);
    std::memcpy(r->buf, data + used, r->have);
    used = size;
    return done(AMRNB_OK);
}

VAMRNB_API int32_t vamrnb_stream_finish(vamrnb_stream_reader *r, vamrnb_stream_frame *partial) {
    if (!r) return VAMRNB_STREAM_ERR_ARGUMENT;
    if (r->error) return r->error;
    if (!r->magic_done) return VAMRNB_STREAM_ERR_MAGIC;
    if (r->have == 0) return AMRNB_OK;
    if (partial) describe(partial, r->buf, r->have, r->frame_offset);
    return VAMRNB_STREAM_ERR_TRUNCATED;
}

}  // extern "C"
