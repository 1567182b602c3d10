// libFuzzer target: arbitrary bytes through the storage-format stream reader.
//
// Byte 0 seeds the chunk sizes; the rest is the stream.  Oracle: reading in
// those chunks gives exactly the frames, final status and offset of one
// whole-buffer read, every frame lies inside the input or the reader, and
// frames tile the stream.  The input is copied to a block of its own size so
// that any read past it is caught by ASan.
// Suggested options: -max_len=512.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "vamrnb_stream.h"

namespace {

void check(bool ok) {
    if (!ok) std::abort();
}

struct Seen {
    uint64_t offset;
    uint32_t size;
    int type, quality, padding;
    uint8_t bytes[VAMRNB_STREAM_MAX_FRAME];
};

struct Result {
    std::vector<Seen> frames;
    int32_t end;
    uint64_t end_offset;
};

Result read_all(const uint8_t *in, size_t size, uint32_t seed) {
    Result out{};
    vamrnb_stream_reader *r = vamrnb_stream_reader_create(nullptr);
    check(r != nullptr);
    size_t pos = 0;
    out.end = AMRNB_OK;
    while (pos < size && out.end >= 0) {
        size_t n = size - pos;
        if (seed) {
            seed = seed * 1103515245u + 12345u;
            n = std::min<size_t>(n, 1 + (seed >> 16) % 40);
        }
        size_t used = 0;
        vamrnb_stream_frame f{};
        const int32_t st = vamrnb_stream_read(r, in + pos, n, &used, &f);
        check(used <= n);
        pos += used;
        if (st < 0) {
            check(used <= n);
            out.end = st;
            break;
        }
        if (st == VAMRNB_STREAM_FRAME) {
            check(f.size >= 1 && f.size <= VAMRNB_STREAM_MAX_FRAME);
            check(f.size == vamrnb_stream_frame_size(f.type));
            check(f.offset + f.size <= pos);
            check(std::memcmp(f.data, in + f.offset, f.size) == 0);
            Seen s{f.offset, f.size, f.type, f.quality, f.padding, {}};
            std::memcpy(s.bytes, f.data, f.size);
            if (!out.frames.empty()) {
                const Seen &prev = out.frames.back();
                check(prev.offset + prev.size == s.offset);
            }
            out.frames.push_back(s);
        } else {
            check(st == AMRNB_OK && used == n);
        }
    }
    if (out.end >= 0) {
        vamrnb_stream_frame p{};
        out.end = vamrnb_stream_finish(r, &p);
        if (out.end == VAMRNB_STREAM_ERR_TRUNCATED) {
            check(p.size >= 1 && p.size < vamrnb_stream_frame_size(p.type));
            check(p.offset + p.size == size);
            check(std::memcmp(p.data, in + p.offset, p.size) == 0);
        }
    }
    out.end_offset = vamrnb_stream_reader_offset(r);
    vamrnb_stream_reader_delete(r);
    return out;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size < 1) return 0;
    const uint32_t seed = data[0] | 1u;
    ++data;
    --size;
    uint8_t *in = static_cast<uint8_t *>(std::malloc(size ? size : 1));
    if (size) std::memcpy(in, data, size);

    const Result whole = read_all(in, size, 0);
    const Result chunked = read_all(in, size, seed);
    check(whole.end == chunked.end && whole.end_offset == chunked.end_offset);
    check(whole.frames.size() == chunked.frames.size());
    for (size_t k = 0; k < whole.frames.size(); ++k) {
        const Seen &a = whole.frames[k], &b = chunked.frames[k];
        check(a.offset == b.offset && a.size == b.size && a.type == b.type && a.quality == b.quality &&
              a.padding == b.padding && std::memcmp(a.bytes, b.bytes, a.size) == 0);
    }
    std::free(in);
    return 0;
}
