// Storage-format file walking and whole-file reading for the command-line tool.
#include "amr_file.h"

#include <cerrno>
#include <cstdio>
#include <cstring>

namespace amrfile {

Parse parse(const std::vector<uint8_t> &data) {
    Parse p;
    size_t pos = kMagicSize;
    while (pos < data.size()) {
        const uint8_t toc = data[pos];
        if ((toc & 0x83) != 0) {
            p.error = "invalid frame header byte 0x" + [&] {
                char b[8];
                std::snprintf(b, sizeof b, "%02X", toc);
                return std::string(b);
            }() + " (not AMR-NB storage format, or corrupt data)";
            p.error_offset = pos;
            return p;
        }
        Frame f{pos, (toc >> 3) & 15, ((toc >> 2) & 1) != 0, 0};
        f.size = kFrameBytes[f.type];
        if (pos + static_cast<size_t>(f.size) > data.size()) {
            p.truncated = true;
            p.error = "truncated last frame (frame type " + std::to_string(f.type) + " needs " +
                      std::to_string(f.size) + " bytes, " + std::to_string(data.size() - pos) +
                      " left)";
            p.error_offset = pos;
            return p;
        }
        p.frames.push_back(f);
        pos += static_cast<size_t>(f.size);
    }
    return p;
}

bool read_all(const std::string &path, std::vector<uint8_t> &out, std::string &err) {
    FILE *f = path == "-" ? stdin : std::fopen(path.c_str(), "rb");
    if (!f) {
        err = std::strerror(errno);
        return false;
    }
    out.clear();
    uint8_t buf[65536];
    size_t n;
    while ((n = std::fread(buf, 1, sizeof buf, f)) > 0) out.insert(out.end(), buf, buf + n);
    const bool bad = std::ferror(f) != 0;
    if (bad) err = std::strerror(errno);
    if (f != stdin) std::fclose(f);
    return !bad;
}

}  // namespace amrfile
