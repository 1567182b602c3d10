// Outputs that appear only when complete (a temporary beside the target,
// renamed into place), the progress display, and the tool's messages.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdarg>
#include <cstring>
#include <mutex>

#include "tool.h"

namespace tool {

namespace {
std::mutex g_err;
}

void message(const std::string &file, const std::string &text) {
    std::lock_guard<std::mutex> lock(g_err);
    if (file.empty())
        std::fprintf(stderr, "vamrnb: %s\n", text.c_str());
    else
        std::fprintf(stderr, "vamrnb: %s: %s\n", file.c_str(), text.c_str());
}

std::string shown(const std::string &path, bool output) {
    if (path == "-") return output ? "<stdout>" : "<stdin>";
    return path;
}

std::string format(const char *fmt, ...) {
    char buf[1024];
    va_list ap;
    va_start(ap, fmt);
    std::vsnprintf(buf, sizeof buf, fmt, ap);
    va_end(ap);
    return buf;
}

std::string lower(std::string s) {
    for (char &c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return s;
}

std::string extension(const std::string &path) {
    const size_t slash = path.find_last_of('/');
    const size_t dot = path.find_last_of('.');
    if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return "";
    return lower(path.substr(dot + 1));
}

uint64_t input_size(const std::string &path) {
    struct stat st{};
    if (path == "-" ? fstat(0, &st) != 0 : stat(path.c_str(), &st) != 0) return 0;
    return S_ISREG(st.st_mode) ? static_cast<uint64_t>(st.st_size) : 0;
}

OutputFile::~OutputFile() {
    if (!temp_.empty()) {
        if (fd_ >= 0) close(fd_);
        unlink(temp_.c_str());
    }
}

bool OutputFile::open(std::string &err) {
    if (is_stdout()) {
        fd_ = 1;
        return true;
    }
    const size_t slash = path_.find_last_of('/');
    const std::string dir = slash == std::string::npos ? "." : path_.substr(0, slash == 0 ? 1 : slash);
    const std::string name = slash == std::string::npos ? path_ : path_.substr(slash + 1);
    std::string tmpl = dir + "/." + name + ".tmp-XXXXXX";
    fd_ = mkstemp(tmpl.data());
    if (fd_ < 0) {
        err = std::strerror(errno);
        return false;
    }
    temp_ = tmpl;
    // mkstemp makes the file private; give it the mode a plain create would.
    const mode_t mask = umask(0);
    umask(mask);
    fchmod(fd_, 0666 & ~mask);
    return true;
}

bool OutputFile::seekable() const { return fd_ >= 0 && lseek(fd_, 0, SEEK_CUR) >= 0; }

bool OutputFile::write(const void *data, size_t size, std::string &err) {
    const auto *p = static_cast<const uint8_t *>(data);
    while (size > 0) {
        const ssize_t w = ::write(fd_, p, size);
        if (w < 0) {
            if (errno == EINTR) continue;
            err = std::strerror(errno);
            return false;
        }
        p += w;
        size -= static_cast<size_t>(w);
    }
    return true;
}

bool OutputFile::commit(std::string &err) {
    if (is_stdout()) return true;
    const int fd = fd_;
    fd_ = -1;
    if (close(fd) != 0 || std::rename(temp_.c_str(), path_.c_str()) != 0) {
        err = std::strerror(errno);
        return false;
    }
    temp_.clear();
    return true;
}

void Progress::update(uint64_t done, double audio_seconds) {
    if (!on_) return;
    std::lock_guard<std::mutex> lock(g_err);
    if (total_ > 0) {
        const int pct = static_cast<int>(100 * std::min(done, total_) / total_);
        if (pct == last_) return;
        last_ = pct;
        const int bar = pct * 30 / 100;
        std::fprintf(stderr, "\r%s [%.*s%*s] %3d%%", label_.c_str(), bar, "##############################",
                     30 - bar, "", pct);
    } else {
        const int secs = static_cast<int>(audio_seconds);
        if (secs == last_) return;
        last_ = secs;
        std::fprintf(stderr, "\r%s %d s", label_.c_str(), secs);
    }
    shown_ = true;
    std::fflush(stderr);
}

void Progress::finish() {
    if (!shown_) return;
    shown_ = false;
    std::lock_guard<std::mutex> lock(g_err);
    std::fprintf(stderr, "\r\033[K");
    std::fflush(stderr);
}

}  // namespace tool
