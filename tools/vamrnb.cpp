// vamrnb: command-line front end of the library.  Encodes audio files of any
// format libsndfile reads into AMR-NB storage-format files, decodes such files
// back to audio, and describes what a file contains.  All coding goes through
// the library's public C interface.
#include <sndfile.h>
#include <soxr.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cctype>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "amr_file.h"
#include "vamrnb.h"

namespace {

// ---- exit codes (documented in --help) --------------------------------------
enum Exit { EXIT_OK = 0, EXIT_USAGE = 1, EXIT_INPUT = 2, EXIT_OUTPUT = 3, EXIT_CODEC = 4 };

constexpr int kFrame = 160;

const char *const kUsage =
    "usage: vamrnb encode [options] IN OUT\n"
    "       vamrnb encode [options] -o DIR IN...\n"
    "       vamrnb decode [options] IN OUT\n"
    "       vamrnb decode [options] -o DIR IN...\n"
    "       vamrnb info IN...\n"
    "       vamrnb --help | --version\n";

const char *const kHelp =
    "vamrnb - AMR narrowband (AMR-NB) speech encoder and decoder\n"
    "\n"
    "%s"
    "\n"
    "encode: IN is any audio file libsndfile reads (WAV, FLAC, AIFF, OGG, ...)\n"
    "  at any sample rate and channel count; it is mixed down to mono and\n"
    "  resampled to 8 kHz (libsoxr, high quality). Raw input (signed 16-bit\n"
    "  little-endian, 8 kHz, mono) is read when IN ends in .pcm or .raw, or with\n"
    "  --raw. OUT is an AMR storage-format file (\"#!AMR\\n\" then the frames).\n"
    "  A last partial 20 ms frame is padded with silence.\n"
    "  -m, --mode MODE   codec mode: 4.75 5.15 5.9 6.7 7.4 7.95 10.2 12.2\n"
    "                    (also MR475..MR122, 475..122, or the index 0..7);\n"
    "                    default 12.2\n"
    "      --dtx         discontinuous transmission: silence is sent as\n"
    "                    comfort-noise (SID) and no-data frames\n"
    "      --vad 1|2     voice activity detector used with --dtx (default 1)\n"
    "      --raw         read IN as raw PCM whatever its name\n"
    "\n"
    "decode: IN is an AMR storage-format file. OUT's extension chooses the\n"
    "  format: .wav .flac .aiff .ogg .au .caf, or raw PCM for .pcm, .raw and\n"
    "  \"-\" (little-endian, signed; 8-bit raw is signed too).\n"
    "  Output is 8 kHz. Frames of types 9 to 15 decode as lost/no-data frames;\n"
    "  types 10 and 11 are skipped and produce no audio.\n"
    "      --bits 8|16|24      sample size of OUT (default 16)\n"
    "      --channels 1|2      1 = mono, 2 = the signal on both channels\n"
    "      --raw               write raw PCM whatever OUT's name\n"
    "      --lenient           conceal a truncated last frame instead of failing\n"
    "\n"
    "info: prints duration, frames by type and mode, bit rate, the share of\n"
    "  SID and no-data frames, and bad (quality bit 0) frames.\n"
    "\n"
    "common options:\n"
    "  -o, --output-dir DIR  several inputs at once; outputs go to DIR, named\n"
    "                        after the inputs (.amr for encode, .wav or .pcm\n"
    "                        for decode)\n"
    "  -j, --jobs N          files coded in parallel (default 1; 0 = all cores)\n"
    "  -q, --quiet           no summary lines and no progress\n"
    "  -h, --help            this text\n"
    "\n"
    "\"-\" stands for standard input or output in the single-file form.\n"
    "Outputs are written to a temporary file and renamed into place only when\n"
    "the whole file succeeded, so a failure never leaves a partial file.\n"
    "\n"
    "exit codes: 0 success, 1 usage error, 2 unreadable or invalid input,\n"
    "  3 output could not be written, 4 codec failure.\n";

struct Options {
    std::string command;
    int mode = MR122;
    bool dtx = false;
    int vad = 1;
    bool raw = false;
    int bits = 16;
    int channels = 1;
    bool lenient = false;
    bool quiet = false;
    int jobs = 1;
    std::string outdir;
    std::vector<std::string> args;
};

std::mutex g_io;

void message(const std::string &file, const std::string &text) {
    std::lock_guard<std::mutex> lock(g_io);
    if (file.empty())
        std::fprintf(stderr, "vamrnb: %s\n", text.c_str());
    else
        std::fprintf(stderr, "vamrnb: %s: %s\n", file == "-" ? "<stdin>" : file.c_str(), text.c_str());
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

std::string basename_stem(const std::string &path) {
    const size_t slash = path.find_last_of('/');
    std::string base = slash == std::string::npos ? path : path.substr(slash + 1);
    const size_t dot = base.find_last_of('.');
    if (dot != std::string::npos && dot > 0) base.resize(dot);
    return base;
}

// Accepts 12.2, 12.2k, 12.2kbps, MR122, mr122, 122, and the index 0..7.
int parse_mode(const std::string &text) {
    std::string s = lower(text);
    for (const char *suffix : {"kbit/s", "kbps", "k"}) {
        const size_t n = std::strlen(suffix);
        if (s.size() > n && s.compare(s.size() - n, n, suffix) == 0) {
            s.resize(s.size() - n);
            break;
        }
    }
    if (s.size() == 1 && s[0] >= '0' && s[0] <= '7') return s[0] - '0';
    if (s.rfind("mr", 0) == 0) s = s.substr(2);
    static const char *const names[8][3] = {
        {"475", "4.75", ""}, {"515", "5.15", ""}, {"59", "5.9", "5.90"}, {"67", "6.7", "6.70"},
        {"74", "7.4", "7.40"}, {"795", "7.95", ""}, {"102", "10.2", "10.20"}, {"122", "12.2", "12.20"}};
    for (int m = 0; m < 8; ++m)
        for (const char *n : names[m])
            if (*n && s == n) return m;
    return -1;
}

bool parse_int(const char *text, int lo, int hi, int &out) {
    char *end = nullptr;
    errno = 0;
    const long v = std::strtol(text, &end, 10);
    if (errno || !end || *end || end == text || v < lo || v > hi) return false;
    out = static_cast<int>(v);
    return true;
}

// ---- in-memory file I/O through libsndfile's virtual interface ---------------

struct MemFile {
    std::vector<uint8_t> data;
    sf_count_t pos = 0;
};

sf_count_t mem_len(void *u) { return static_cast<sf_count_t>(static_cast<MemFile *>(u)->data.size()); }
sf_count_t mem_seek(sf_count_t off, int whence, void *u) {
    auto *m = static_cast<MemFile *>(u);
    sf_count_t base = whence == SEEK_SET ? 0 : whence == SEEK_CUR ? m->pos : mem_len(u);
    m->pos = std::max<sf_count_t>(0, base + off);
    return m->pos;
}
sf_count_t mem_read(void *ptr, sf_count_t n, void *u) {
    auto *m = static_cast<MemFile *>(u);
    const sf_count_t avail = std::max<sf_count_t>(0, mem_len(u) - m->pos);
    n = std::min(n, avail);
    if (n > 0) std::memcpy(ptr, m->data.data() + m->pos, static_cast<size_t>(n));
    m->pos += n;
    return n;
}
sf_count_t mem_write(const void *ptr, sf_count_t n, void *u) {
    auto *m = static_cast<MemFile *>(u);
    const size_t end = static_cast<size_t>(m->pos + n);
    if (end > m->data.size()) m->data.resize(end);
    std::memcpy(m->data.data() + m->pos, ptr, static_cast<size_t>(n));
    m->pos += n;
    return n;
}
sf_count_t mem_tell(void *u) { return static_cast<MemFile *>(u)->pos; }
SF_VIRTUAL_IO g_memio = {mem_len, mem_seek, mem_read, mem_write, mem_tell};

// ---- output committed atomically ---------------------------------------------

// Writes bytes to path through a temporary file renamed into place; "-" writes
// to standard output.
bool commit_output(const std::string &path, const std::vector<uint8_t> &bytes, std::string &err) {
    if (path == "-") {
        std::lock_guard<std::mutex> lock(g_io);
        if (std::fwrite(bytes.data(), 1, bytes.size(), stdout) != bytes.size() || std::fflush(stdout)) {
            err = std::strerror(errno);
            return false;
        }
        return true;
    }
    const size_t slash = path.find_last_of('/');
    const std::string dir = slash == std::string::npos ? "." : path.substr(0, slash == 0 ? 1 : slash);
    const std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
    std::string tmpl = dir + "/." + name + ".tmp-XXXXXX";
    std::vector<char> buf(tmpl.begin(), tmpl.end());
    buf.push_back('\0');
    const int fd = mkstemp(buf.data());
    if (fd < 0) {
        err = std::strerror(errno);
        return false;
    }
    size_t done = 0;
    while (done < bytes.size()) {
        const ssize_t w = write(fd, bytes.data() + done, bytes.size() - done);
        if (w < 0) {
            if (errno == EINTR) continue;
            err = std::strerror(errno);
            close(fd);
            unlink(buf.data());
            return false;
        }
        done += static_cast<size_t>(w);
    }
    fchmod(fd, 0644);
    if (close(fd) != 0 || std::rename(buf.data(), path.c_str()) != 0) {
        err = std::strerror(errno);
        unlink(buf.data());
        return false;
    }
    return true;
}

// ---- progress on a terminal ------------------------------------------------------

struct Progress {
    bool on;
    std::string label;
    int last = -1;
    void update(size_t done, size_t total) {
        if (!on || total == 0) return;
        const int pct = static_cast<int>(100 * done / total);
        if (pct == last) return;
        last = pct;
        std::lock_guard<std::mutex> lock(g_io);
        std::fprintf(stderr, "\r%s: %3d%%", label.c_str(), pct);
        std::fflush(stderr);
    }
    void finish() {
        if (on && last >= 0) {
            std::lock_guard<std::mutex> lock(g_io);
            std::fprintf(stderr, "\r%*s\r", static_cast<int>(label.size()) + 6, "");
        }
    }
};

double seconds_since(std::chrono::steady_clock::time_point t0) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
}

// ---- encode -----------------------------------------------------------------------

// Loads IN as 8 kHz mono 16-bit samples.  Returns an exit code.
int load_audio(const std::string &path, bool raw, std::vector<int16_t> &pcm, std::string &err) {
    MemFile mem;
    if (!amrfile::read_all(path, mem.data, err)) return EXIT_INPUT;
    if (mem.data.empty()) {
        err = "empty file";
        return EXIT_INPUT;
    }
    if (raw) {
        if (mem.data.size() % 2) message(path, "warning: odd byte count, last byte ignored");
        pcm.resize(mem.data.size() / 2);
        for (size_t i = 0; i < pcm.size(); ++i)
            pcm[i] = static_cast<int16_t>(mem.data[2 * i] | (mem.data[2 * i + 1] << 8));
        return EXIT_OK;
    }
    SF_INFO info{};
    SNDFILE *sf = sf_open_virtual(&g_memio, SFM_READ, &info, &mem);
    if (!sf) {
        err = std::string("unrecognised audio file (") + sf_strerror(nullptr) +
              "); raw PCM needs --raw or a .pcm/.raw name";
        return EXIT_INPUT;
    }
    const int ch = info.channels;
    if (info.frames <= 0 || ch <= 0) {
        sf_close(sf);
        err = "no audio in file";
        return EXIT_INPUT;
    }
    const size_t n = static_cast<size_t>(info.frames);
    if (info.samplerate == 8000) {
        // Already at the codec's rate: keep the samples exactly.
        std::vector<int16_t> inter(n * static_cast<size_t>(ch));
        const sf_count_t got = sf_readf_short(sf, inter.data(), info.frames);
        sf_close(sf);
        pcm.resize(static_cast<size_t>(std::max<sf_count_t>(got, 0)));
        for (size_t i = 0; i < pcm.size(); ++i) {
            long sum = 0;
            for (int c = 0; c < ch; ++c) sum += inter[i * static_cast<size_t>(ch) + static_cast<size_t>(c)];
            pcm[i] = static_cast<int16_t>(std::lround(static_cast<double>(sum) / ch));
        }
        return EXIT_OK;
    }
    std::vector<float> inter(n * static_cast<size_t>(ch));
    const sf_count_t got = sf_readf_float(sf, inter.data(), info.frames);
    sf_close(sf);
    const size_t frames = static_cast<size_t>(std::max<sf_count_t>(got, 0));
    std::vector<float> mono(frames);
    for (size_t i = 0; i < frames; ++i) {
        float sum = 0;
        for (int c = 0; c < ch; ++c) sum += inter[i * static_cast<size_t>(ch) + static_cast<size_t>(c)];
        mono[i] = sum / static_cast<float>(ch);
    }
    const size_t out_len = static_cast<size_t>(std::ceil(static_cast<double>(frames) * 8000.0 / info.samplerate)) + 16;
    std::vector<float> res(out_len);
    size_t odone = 0;
    const soxr_quality_spec_t q = soxr_quality_spec(SOXR_HQ, 0);
    const soxr_error_t e = soxr_oneshot(info.samplerate, 8000, 1, mono.data(), frames, nullptr,
                                        res.data(), out_len, &odone, nullptr, &q, nullptr);
    if (e) {
        err = std::string("resampling failed: ") + e;
        return EXIT_CODEC;
    }
    pcm.resize(odone);
    for (size_t i = 0; i < odone; ++i) {
        const long v = std::lrint(static_cast<double>(res[i]) * 32768.0);
        pcm[i] = static_cast<int16_t>(std::clamp<long>(v, -32768, 32767));
    }
    return EXIT_OK;
}

int encode_file(const Options &o, const std::string &in, const std::string &out) {
    std::string err;
    std::vector<int16_t> pcm;
    const auto t0 = std::chrono::steady_clock::now();
    int rc = load_audio(in, o.raw || extension(in) == "pcm" || extension(in) == "raw", pcm, err);
    if (rc != EXIT_OK) {
        message(in, err);
        return rc;
    }
    if (pcm.empty()) {
        message(in, "no audio in file");
        return EXIT_INPUT;
    }
    codec_config cfg{};
    cfg.enc.dtx = o.dtx ? 1 : 0;
    cfg.enc.reserved = 0;
    cfg.enc.vad_option = o.vad == 2 ? 1 : 0;
    cfg.enc.mode = o.mode;
    int32_t status = 0;
    vamrnb_encoder *enc = vamrnbe_create(&cfg, &status);
    if (!enc) {
        message(in, "cannot create encoder (status " + std::to_string(status) + ")");
        return EXIT_CODEC;
    }
    const size_t frames = (pcm.size() + kFrame - 1) / kFrame;
    std::vector<uint8_t> bytes(amrfile::kMagic, amrfile::kMagic + amrfile::kMagicSize);
    bytes.reserve(bytes.size() + frames * 32);
    Progress prog{!o.quiet && o.jobs == 1 && frames > 500 && isatty(2), "encoding " + in};
    frame_info info{};
    for (size_t f = 0; f < frames; ++f) {
        int16_t samples[kFrame] = {};
        const size_t take = std::min<size_t>(kFrame, pcm.size() - f * kFrame);
        std::memcpy(samples, pcm.data() + f * kFrame, take * sizeof(int16_t));
        pcm_buffer pin{};
        pin.data[0] = samples;
        uint8_t frame[32];
        bitstream_buffer bout{frame, 0, sizeof frame};
        vamrnbe_encode(enc, &pin, &bout, &info);
        bytes.insert(bytes.end(), frame, frame + info.bytes);
        if ((f & 63) == 0) prog.update(f, frames);
    }
    vamrnbe_delete(enc);
    prog.finish();
    const double secs = seconds_since(t0);
    if (!commit_output(out, bytes, err)) {
        message(out, "cannot write: " + err);
        return EXIT_OUTPUT;
    }
    if (!o.quiet) {
        const double dur = static_cast<double>(frames) * 0.02;
        std::lock_guard<std::mutex> lock(g_io);
        std::fprintf(stderr, "%s -> %s: %zu frames, %.2f s, %s%s, %zu bytes, %.0fx real time\n",
                     in == "-" ? "<stdin>" : in.c_str(), out == "-" ? "<stdout>" : out.c_str(), frames,
                     dur, amrfile::kModeName[o.mode], o.dtx ? (o.vad == 2 ? " DTX/VAD2" : " DTX/VAD1") : "",
                     bytes.size(), secs > 0 ? dur / secs : 0.0);
    }
    return EXIT_OK;
}

// ---- decode ---------------------------------------------------------------------

int sf_format_for(const std::string &ext, int bits) {
    int major = 0;
    if (ext == "wav") major = SF_FORMAT_WAV;
    else if (ext == "flac") major = SF_FORMAT_FLAC;
    else if (ext == "aif" || ext == "aiff") major = SF_FORMAT_AIFF;
    else if (ext == "ogg" || ext == "oga") return SF_FORMAT_OGG | SF_FORMAT_VORBIS;
    else if (ext == "au" || ext == "snd") major = SF_FORMAT_AU;
    else if (ext == "caf") major = SF_FORMAT_CAF;
    else return 0;
    int sub = bits == 8 ? SF_FORMAT_PCM_S8 : bits == 24 ? SF_FORMAT_PCM_24 : SF_FORMAT_PCM_16;
    if (bits == 8 && major == SF_FORMAT_WAV) sub = SF_FORMAT_PCM_U8;
    return major | sub;
}

int decode_file(const Options &o, const std::string &in, const std::string &out) {
    std::string err;
    std::vector<uint8_t> data;
    const auto t0 = std::chrono::steady_clock::now();
    if (!amrfile::read_all(in, data, err)) {
        message(in, err);
        return EXIT_INPUT;
    }
    if (data.empty()) {
        message(in, "empty file");
        return EXIT_INPUT;
    }
    if (data.size() >= 9 && std::memcmp(data.data(), "#!AMR-WB\n", 9) == 0) {
        message(in, "AMR-WB (wideband) file: only AMR-NB is supported");
        return EXIT_INPUT;
    }
    if (data.size() >= 12 && std::memcmp(data.data(), "#!AMR_MC1.0\n", 12) == 0) {
        message(in, "multi-channel AMR file: not supported");
        return EXIT_INPUT;
    }
    if (data.size() < amrfile::kMagicSize || std::memcmp(data.data(), amrfile::kMagic, amrfile::kMagicSize) != 0) {
        message(in, "not an AMR file (missing \"#!AMR\\n\" header)");
        return EXIT_INPUT;
    }
    amrfile::Parse p = amrfile::parse(data);
    if (!p.error.empty()) {
        if (!(p.truncated && o.lenient)) {
            message(in, p.error + " at byte " + std::to_string(p.error_offset) +
                            (p.truncated ? " (use --lenient to conceal it)" : ""));
            return EXIT_INPUT;
        }
        message(in, "warning: " + p.error + "; concealed as a lost frame");
    }
    codec_config cfg{};
    cfg.dec.reserved = 0;
    cfg.dec.layout = 1;
    cfg.dec.channels = o.channels;
    cfg.dec.sample_format = o.bits == 8 ? 1 : o.bits == 24 ? 3 : 0;
    int32_t status = 0;
    vamrnb_decoder *dec = vamrnbd_create(&cfg, &status);
    if (!dec) {
        message(in, "cannot create decoder (status " + std::to_string(status) + ")");
        return EXIT_CODEC;
    }
    const size_t bps = static_cast<size_t>(o.bits / 8);
    const size_t frame_bytes = kFrame * bps * static_cast<size_t>(o.channels);
    std::vector<uint8_t> pcm;
    pcm.reserve((p.frames.size() + 1) * frame_bytes);
    const size_t total = p.frames.size() + (p.truncated ? 1 : 0);
    Progress prog{!o.quiet && o.jobs == 1 && total > 500 && isatty(2), "decoding " + in};
    frame_info info{};
    size_t skipped = 0;
    for (size_t i = 0; i < total; ++i) {
        uint8_t lost = 0x7C;  // a no-data frame stands in for a truncated one
        uint8_t *src = i < p.frames.size() ? data.data() + p.frames[i].offset : &lost;
        const uint32_t size = i < p.frames.size() ? static_cast<uint32_t>(p.frames[i].size) : 1u;
        bitstream_buffer bin{src, 0, size};
        uint8_t samples[kFrame * 2 * 3];
        pcm_buffer pout{};
        pout.data[0] = samples;
        const int32_t rc = vamrnbd_decode(dec, &bin, &pout, &info);
        if (rc == AMRNB_ERR_BAD_FRAME_TYPE) {
            ++skipped;
            continue;
        }
        if (rc != AMRNB_OK) {
            vamrnbd_delete(dec);
            message(in, "decoder failed at frame " + std::to_string(i) + " (status " + std::to_string(rc) + ")");
            return EXIT_CODEC;
        }
        pcm.insert(pcm.end(), samples, samples + pout.bytes[0]);
        if ((i & 63) == 0) prog.update(i, total);
    }
    vamrnbd_delete(dec);
    prog.finish();
    const double secs = seconds_since(t0);

    std::vector<uint8_t> bytes;
    const std::string ext = extension(out);
    const bool raw = o.raw || out == "-" || ext == "pcm" || ext == "raw" || ext.empty();
    if (raw) {
        bytes = std::move(pcm);
    } else {
        const int fmt = sf_format_for(ext, o.bits);
        if (!fmt) {
            message(out, "unknown output format \"." + ext + "\" (use .wav .flac .aiff .ogg .au .caf or .pcm)");
            return EXIT_USAGE;
        }
        SF_INFO info_out{};
        info_out.samplerate = 8000;
        info_out.channels = o.channels;
        info_out.format = fmt;
        MemFile mem;
        SNDFILE *sf = sf_open_virtual(&g_memio, SFM_WRITE, &info_out, &mem);
        if (!sf) {
            message(out, std::string("cannot create output: ") + sf_strerror(nullptr));
            return EXIT_OUTPUT;
        }
        // Widen the library's samples to 32-bit full scale; libsndfile narrows
        // them to the file's sample size without changing their values.
        const size_t n = pcm.size() / bps;
        std::vector<int> wide(n);
        for (size_t i = 0; i < n; ++i) {
            const uint8_t *b = pcm.data() + i * bps;
            uint32_t v = bps == 1 ? uint32_t{b[0]} << 24
                         : bps == 2 ? (uint32_t{b[0]} << 16) | (uint32_t{b[1]} << 24)
                                    : (uint32_t{b[0]} << 8) | (uint32_t{b[1]} << 16) | (uint32_t{b[2]} << 24);
            wide[i] = static_cast<int>(v);
        }
        const sf_count_t wrote = sf_write_int(sf, wide.data(), static_cast<sf_count_t>(n));
        sf_close(sf);
        if (wrote != static_cast<sf_count_t>(n)) {
            message(out, "cannot encode output audio");
            return EXIT_OUTPUT;
        }
        bytes = std::move(mem.data);
    }
    if (!commit_output(out, bytes, err)) {
        message(out, "cannot write: " + err);
        return EXIT_OUTPUT;
    }
    if (!o.quiet) {
        const double dur = static_cast<double>(total - skipped) * 0.02;
        std::lock_guard<std::mutex> lock(g_io);
        std::fprintf(stderr, "%s -> %s: %zu frames, %.2f s%s, %.0fx real time\n",
                     in == "-" ? "<stdin>" : in.c_str(), out == "-" ? "<stdout>" : out.c_str(), total - skipped,
                     dur, skipped ? (", " + std::to_string(skipped) + " frames of type 10/11 skipped").c_str() : "",
                     secs > 0 ? dur / secs : 0.0);
    }
    return EXIT_OK;
}

// ---- info ------------------------------------------------------------------------

int info_file(const std::string &in) {
    std::string err;
    std::vector<uint8_t> data;
    if (!amrfile::read_all(in, data, err)) {
        message(in, err);
        return EXIT_INPUT;
    }
    if (data.size() < amrfile::kMagicSize || std::memcmp(data.data(), amrfile::kMagic, amrfile::kMagicSize) != 0) {
        message(in, data.empty() ? "empty file" : "not an AMR file (missing \"#!AMR\\n\" header)");
        return EXIT_INPUT;
    }
    const amrfile::Parse p = amrfile::parse(data);
    size_t by_type[16] = {}, bad = 0, sid_by_mode[8] = {}, bytes = amrfile::kMagicSize;
    for (const auto &f : p.frames) {
        ++by_type[f.type];
        if (!f.good) ++bad;
        bytes += static_cast<size_t>(f.size);
        if (f.type == 8) {
            // Mode indication: the three bits after the 35 SID bits and the
            // STI bit, least significant first.
            const uint8_t last = data[f.offset + 5];
            const int mode = ((last >> 3) & 1) | (((last >> 2) & 1) << 1) | (((last >> 1) & 1) << 2);
            ++sid_by_mode[mode];
        }
    }
    const size_t frames = p.frames.size() - by_type[10] - by_type[11];
    const double dur = static_cast<double>(frames) * 0.02;
    std::lock_guard<std::mutex> lock(g_io);
    std::printf("%s\n", in == "-" ? "<stdin>" : in.c_str());
    std::printf("  duration     %.2f s (%zu frames of 20 ms)\n", dur, frames);
    std::printf("  bit rate     %.2f kbit/s average (file size %zu bytes)\n",
                dur > 0 ? static_cast<double>(bytes - amrfile::kMagicSize) * 8 / dur / 1000 : 0.0, data.size());
    for (int m = 0; m < 8; ++m)
        if (by_type[m])
            std::printf("  speech       %-6s %6zu frames (%5.1f%%)\n", amrfile::kModeName[m], by_type[m],
                        100.0 * static_cast<double>(by_type[m]) / static_cast<double>(p.frames.size()));
    const size_t sid = by_type[8], nodata = by_type[15];
    if (sid) {
        std::printf("  SID          %6zu frames (%5.1f%%), mode indication:", sid,
                    100.0 * static_cast<double>(sid) / static_cast<double>(p.frames.size()));
        for (int m = 0; m < 8; ++m)
            if (sid_by_mode[m]) std::printf(" %s x%zu", amrfile::kModeName[m], sid_by_mode[m]);
        std::printf("\n");
    }
    if (nodata)
        std::printf("  no data      %6zu frames (%5.1f%%)\n", nodata,
                    100.0 * static_cast<double>(nodata) / static_cast<double>(p.frames.size()));
    for (int t = 9; t < 15; ++t)
        if (by_type[t]) std::printf("  type %-2d      %6zu frames (no speech)\n", t, by_type[t]);
    std::printf("  bad frames   %6zu (quality bit 0)\n", bad);
    if (!p.error.empty()) {
        std::printf("  problem      %s at byte %zu\n", p.error.c_str(), p.error_offset);
        return EXIT_INPUT;
    }
    return EXIT_OK;
}

// ---- command line -----------------------------------------------------------------

int usage_error(const std::string &text) {
    message("", text);
    std::fprintf(stderr, "%sTry 'vamrnb --help' for more information.\n", kUsage);
    return EXIT_USAGE;
}

int parse_args(int argc, char **argv, Options &o) {
    if (argc < 2) return usage_error("missing command");
    int i = 1;
    const std::string first = argv[1];
    if (first == "-h" || first == "--help" || first == "help") {
        std::printf(kHelp, kUsage);
        return -1;
    }
    if (first == "--version" || first == "version") {
        std::printf("vamrnb %d.%d.%d\n", VAMRNB_VERSION_MAJOR, VAMRNB_VERSION_MINOR, VAMRNB_VERSION_PATCH);
        return -1;
    }
    o.command = first;
    if (o.command != "encode" && o.command != "decode" && o.command != "info")
        return usage_error("unknown command '" + first + "'");
    ++i;
    const bool enc = o.command == "encode", dec = o.command == "decode";
    bool vad_given = false;
    for (; i < argc; ++i) {
        const std::string a = argv[i];
        auto value = [&](const char *) -> const char * {
            if (i + 1 >= argc) return nullptr;
            return argv[++i];
        };
        if (a == "--") {
            for (++i; i < argc; ++i) o.args.push_back(argv[i]);
            break;
        }
        if (a == "-h" || a == "--help") {
            std::printf(kHelp, kUsage);
            return -1;
        } else if (a == "-q" || a == "--quiet") {
            o.quiet = true;
        } else if (a == "-o" || a == "--output-dir") {
            const char *v = value("-o");
            if (!v) return usage_error("option " + a + " needs a directory");
            o.outdir = v;
        } else if (a == "-j" || a == "--jobs") {
            const char *v = value("-j");
            if (!v || !parse_int(v, 0, 1024, o.jobs)) return usage_error("option " + a + " needs a number");
            if (o.jobs == 0) o.jobs = static_cast<int>(std::max(1u, std::thread::hardware_concurrency()));
        } else if (enc && (a == "-m" || a == "--mode")) {
            const char *v = value("-m");
            if (!v) return usage_error("option " + a + " needs a mode");
            o.mode = parse_mode(v);
            if (o.mode < 0)
                return usage_error(std::string("unknown mode '") + v +
                                   "' (use 4.75 5.15 5.9 6.7 7.4 7.95 10.2 12.2, MR475..MR122 or 0..7)");
        } else if (enc && a == "--dtx") {
            o.dtx = true;
        } else if (enc && a == "--vad") {
            const char *v = value("--vad");
            if (!v || !parse_int(v, 1, 2, o.vad)) return usage_error("option --vad needs 1 or 2");
            vad_given = true;
        } else if ((enc || dec) && a == "--raw") {
            o.raw = true;
        } else if (dec && a == "--bits") {
            const char *v = value("--bits");
            if (!v || !parse_int(v, 8, 24, o.bits) || (o.bits != 8 && o.bits != 16 && o.bits != 24))
                return usage_error("option --bits needs 8, 16 or 24");
        } else if (dec && a == "--channels") {
            const char *v = value("--channels");
            if (!v || !parse_int(v, 1, 2, o.channels)) return usage_error("option --channels needs 1 or 2");
        } else if (dec && a == "--lenient") {
            o.lenient = true;
        } else if (a.size() > 1 && a[0] == '-') {
            return usage_error("unknown option '" + a + "' for " + o.command);
        } else {
            o.args.push_back(a);
        }
    }
    if (vad_given && !o.dtx) return usage_error("--vad only applies with --dtx");
    if (o.args.empty()) return usage_error("missing input file");
    if (o.command != "info" && o.outdir.empty() && o.args.size() != 2)
        return usage_error(o.args.size() == 1 ? "missing output file (or use -o DIR)"
                                              : "several inputs need an output directory (-o DIR)");
    return 0;
}

}  // namespace

int main(int argc, char **argv) {
    Options o;
    const int prc = parse_args(argc, argv, o);
    if (prc < 0) return EXIT_OK;
    if (prc > 0) return prc;

    struct Job {
        std::string in, out;
    };
    std::vector<Job> jobs;
    if (o.command == "info") {
        for (const auto &a : o.args) jobs.push_back({a, ""});
    } else if (o.outdir.empty()) {
        jobs.push_back({o.args[0], o.args[1]});
    } else {
        const std::string ext = o.command == "encode" ? ".amr" : (o.raw ? ".pcm" : ".wav");
        for (const auto &a : o.args) {
            if (a == "-") return usage_error("\"-\" is only accepted in the single-file form");
            jobs.push_back({a, o.outdir + "/" + basename_stem(a) + ext});
        }
    }

    std::atomic<size_t> next{0};
    std::atomic<int> worst{0};
    auto worker = [&] {
        for (size_t k; (k = next.fetch_add(1)) < jobs.size();) {
            const Job &j = jobs[k];
            int rc;
            if (o.command == "info") rc = info_file(j.in);
            else if (o.command == "encode") rc = encode_file(o, j.in, j.out);
            else rc = decode_file(o, j.in, j.out);
            int prev = worst.load();
            while (rc > prev && !worst.compare_exchange_weak(prev, rc)) {
            }
        }
    };
    const int threads = std::max(1, std::min<int>(o.jobs, static_cast<int>(jobs.size())));
    if (o.command == "info" || threads == 1) {
        worker();
    } else {
        std::vector<std::thread> pool;
        for (int t = 0; t < threads; ++t) pool.emplace_back(worker);
        for (auto &t : pool) t.join();
    }
    return worst.load();
}
