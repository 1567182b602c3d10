// Walks an .amr input (a file or standard input) through the library's
// stream reader in blocks, handing each frame to the caller and keeping what
// the end of the walk needs to describe the input: its first bytes, its
// size, and the reader's final status with the offsets that go with it.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include "tool.h"

namespace tool {

int scan_stream(const std::string &path, const std::function<int(const vamrnb_stream_frame &)> &on_frame,
                const std::function<void(uint64_t)> &on_block, StreamScan &s) {
    const int fd = path == "-" ? 0 : ::open(path.c_str(), O_RDONLY);
    if (fd < 0) {
        s.read_error = std::strerror(errno);
        return EXIT_INPUT;
    }
    struct Closer {
        int fd;
        ~Closer() {
            if (fd > 0) ::close(fd);
        }
    } closer{fd};
    std::unique_ptr<vamrnb_stream_reader, void (*)(vamrnb_stream_reader *)> reader(
        vamrnb_stream_reader_create(nullptr), vamrnb_stream_reader_delete);
    if (!reader) {
        s.read_error = vamrnb_strerror(AMRNB_ERR_NO_MEMORY);
        return EXIT_CODEC;
    }
    std::vector<uint8_t> buf(65536);
    s.status = AMRNB_OK;
    while (s.status >= 0) {
        const ssize_t n = ::read(fd, buf.data(), buf.size());
        if (n < 0 && errno == EINTR) continue;
        if (n < 0) {
            s.read_error = std::strerror(errno);
            return EXIT_INPUT;
        }
        if (n == 0) break;
        const size_t got = static_cast<size_t>(n);
        const size_t h = std::min(sizeof s.head - s.head_size, got);
        std::memcpy(s.head + s.head_size, buf.data(), h);
        s.head_size += h;
        s.bytes += got;
        for (size_t off = 0; off < got;) {
            size_t used = 0;
            vamrnb_stream_frame f{};
            s.status = vamrnb_stream_read(reader.get(), buf.data() + off, got - off, &used, &f);
            off += used;
            if (s.status == VAMRNB_STREAM_ERR_TOC) s.bad_byte = buf[off];  // the reader stops on it
            if (s.status < 0) break;
            if (s.status != VAMRNB_STREAM_FRAME) continue;
            if (const int rc = on_frame(f)) return rc;
        }
        if (on_block) on_block(s.bytes);
    }
    if (s.status >= 0) s.status = vamrnb_stream_finish(reader.get(), &s.partial);
    s.offset = vamrnb_stream_reader_offset(reader.get());
    return EXIT_OK;
}

}  // namespace tool
