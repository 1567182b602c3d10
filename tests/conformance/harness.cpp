// Conformance harness support: vector locations, file readers, the storage
// format walker, frame comparison in terms of codec parameters, the report
// table and the parallel runner.
#include "harness.h"

#include "vamrnb.h"

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <set>
#include <sstream>
#include <thread>

#include "format/frame_tables.h"

#ifndef VAMRNB_SOURCE_DIR
#define VAMRNB_SOURCE_DIR "."
#endif

namespace conformance {

namespace {

bool env_flag(const char *name) {
    const char *v = std::getenv(name);
    return v != nullptr && *v != '\0' && std::strcmp(v, "0") != 0;
}

Roots find_roots() {
    Roots r;
    const fs::path source = VAMRNB_SOURCE_DIR;
    fs::path shared = source / ".." / "shared";
    if (const char *env = std::getenv("VAMRNB_SHARED"); env != nullptr && *env != '\0')
        shared = env;
    std::error_code ec;
    r.subset = env_flag("VAMRNB_CONFORMANCE_SUBSET") || !fs::is_directory(shared / "vectors", ec);
    const fs::path base = r.subset ? source / "tests" / "data" : shared;
    r.vectors = base / "vectors";
    r.corpus = base / "corpus";
    std::printf("conformance: %s vectors in %s\n", r.subset ? "bundled subset of the" : "full set of",
                r.vectors.string().c_str());
    // VAMRNB_CPU_FLAGS restricts the kernels to the listed vector features
    // (0 = portable code only), so every level can be checked against the vectors.
    if (const char *env = std::getenv("VAMRNB_CPU_FLAGS"); env != nullptr && *env != '\0') {
        const auto mask = static_cast<uint32_t>(std::strtoul(env, nullptr, 0));
        vamrnb_set_cpu_flags(mask);
        std::printf("conformance: kernels restricted to CPU feature mask 0x%x\n", static_cast<unsigned>(mask));
    }
    return r;
}

}  // namespace

const Roots &roots() {
    static const Roots r = find_roots();
    return r;
}

std::optional<std::vector<uint8_t>> read_bytes(const fs::path &path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) return std::nullopt;
    return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), {});
}

std::optional<std::vector<uint32_t>> read_crcs(const fs::path &path) {
    auto bytes = read_bytes(path);
    if (!bytes) return std::nullopt;
    std::vector<uint32_t> crcs(bytes->size() / 4);
    for (std::size_t i = 0; i < crcs.size(); ++i) {
        const uint8_t *b = bytes->data() + 4 * i;
        crcs[i] = uint32_t{b[0]} | uint32_t{b[1]} << 8 | uint32_t{b[2]} << 16 | uint32_t{b[3]} << 24;
    }
    return crcs;
}

std::optional<std::vector<int16_t>> read_pcm(const fs::path &path) {
    auto bytes = read_bytes(path);
    if (!bytes) return std::nullopt;
    std::vector<int16_t> pcm(bytes->size() / 2);
    for (std::size_t i = 0; i < pcm.size(); ++i)
        pcm[i] = static_cast<int16_t>(uint16_t{(*bytes)[2 * i]} | uint16_t((*bytes)[2 * i + 1]) << 8);
    return pcm;
}

std::vector<fs::path> sorted_entries(const fs::path &dir, bool directories,
                                     const std::string &extension) {
    std::vector<fs::path> out;
    std::error_code ec;
    if (!fs::is_directory(dir, ec)) return out;
    for (const auto &e : fs::directory_iterator(dir, ec)) {
        if (directories ? !e.is_directory() : !e.is_regular_file()) continue;
        if (!extension.empty() && e.path().extension() != extension) continue;
        out.push_back(e.path());
    }
    std::sort(out.begin(), out.end());
    return out;
}

std::vector<Frame> split_frames(const std::vector<uint8_t> &file, std::string &error) {
    std::vector<Frame> frames;
    vamrnb_stream_reader *reader = vamrnb_stream_reader_create(nullptr);
    int32_t st = AMRNB_OK;
    for (std::size_t pos = 0; st >= 0 && pos < file.size();) {
        std::size_t used = 0;
        vamrnb_stream_frame f{};
        st = vamrnb_stream_read(reader, file.data() + pos, file.size() - pos, &used, &f);
        pos += used;
        if (st == VAMRNB_STREAM_FRAME) frames.push_back({static_cast<std::size_t>(f.offset), f.type, f.quality != 0, f.size});
    }
    vamrnb_stream_frame partial{};
    if (st >= 0) st = vamrnb_stream_finish(reader, &partial);
    if (st == VAMRNB_STREAM_ERR_TRUNCATED) error = "truncated frame at byte " + std::to_string(partial.offset);
    else if (st != AMRNB_OK) error = vamrnb_strerror(st);
    vamrnb_stream_reader_delete(reader);
    return frames;
}

const char *mode_name(int mode) {
    static const char *const names[16] = {"MR475", "MR515", "MR59", "MR67", "MR74", "MR795",
                                          "MR102", "MR122", "SID", "FT9", "FT10", "FT11",
                                          "FT12", "FT13", "FT14", "NO_DATA"};
    return mode >= 0 && mode < 16 ? names[mode] : "?";
}

int mode_from_name(const std::string &name) {
    for (int m = 0; m < 8; ++m)
        if (name == mode_name(m)) return m;
    return -1;
}

std::string stream_mode_label(const std::vector<Frame> &frames) {
    std::set<int> modes;
    for (const auto &f : frames)
        if (f.type < 8) modes.insert(f.type);
    if (modes.empty()) return "none";
    return modes.size() == 1 ? mode_name(*modes.begin()) : "mixed";
}

std::vector<int> frame_parameters(const uint8_t *frame, std::size_t size) {
    std::vector<int> params;
    if (size == 0) return params;
    const int type = (frame[0] >> 3) & 0x0F;
    if (type > 8) return params;
    auto bit = [&](int i) -> int {
        const std::size_t byte = 1 + static_cast<std::size_t>(i) / 8;
        return byte < size ? (frame[byte] >> (7 - i % 8)) & 1 : 0;
    };
    const int class_bits = vamrnb_tbl_unpacked_size[type];
    const int16_t *order = vamrnb_tbl_sort_ptr[type];
    int serial[250] = {};
    for (int i = 0; i < class_bits; ++i) serial[order[i]] = bit(i);
    const int16_t *widths = vamrnb_tbl_bitno[type];
    for (int p = 0, pos = 0; p < vamrnb_tbl_prmno[type]; ++p) {
        int value = 0;
        for (int w = 0; w < widths[p]; ++w) value = (value << 1) | serial[pos++];
        params.push_back(value);
    }
    if (type == 8) {
        params.push_back(bit(35));                                 // STI
        params.push_back(bit(36) | bit(37) << 1 | bit(38) << 2);  // mode indication
    }
    return params;
}

std::string describe_frame_difference(const uint8_t *ours, std::size_t ours_size,
                                      const uint8_t *expected, std::size_t expected_size) {
    std::ostringstream s;
    if (ours_size == 0) return "no frame written";
    if (expected_size == 0) return "frame written where none was expected";
    const int ft_o = (ours[0] >> 3) & 0x0F, ft_e = (expected[0] >> 3) & 0x0F;
    if (ours[0] != expected[0]) {
        s << "frame type " << mode_name(ft_o) << " (TOC 0x" << std::hex << int{ours[0]}
          << "), expected " << mode_name(ft_e) << " (TOC 0x" << int{expected[0]} << ")";
        return s.str();
    }
    const auto po = frame_parameters(ours, ours_size);
    const auto pe = frame_parameters(expected, expected_size);
    for (std::size_t i = 0; i < po.size() && i < pe.size(); ++i) {
        if (po[i] == pe[i]) continue;
        const int n_codec = vamrnb_tbl_prmno[ft_o];
        s << mode_name(ft_o) << " ";
        if (static_cast<int>(i) < n_codec)
            s << "parameter " << i << " (" << vamrnb_tbl_bitno[ft_o][i] << " bits)";
        else
            s << (static_cast<int>(i) == n_codec ? "STI bit" : "mode indication");
        s << ": ours " << po[i] << ", expected " << pe[i];
        return s.str();
    }
    if (ours_size != expected_size) {
        s << mode_name(ft_o) << " frame of " << ours_size << " bytes, expected " << expected_size;
        return s.str();
    }
    return std::string(mode_name(ft_o)) + " parameters equal, padding bits differ";
}

void Report::add(const std::string &row, uint64_t exact, uint64_t checked) {
    std::lock_guard<std::mutex> lock(mutex_);
    Tally &t = rows_[row];
    t.exact += exact;
    t.checked += checked;
    ++t.streams;
}

void Report::fail(const std::string &message) {
    std::lock_guard<std::mutex> lock(mutex_);
    failures_.push_back(message);
}

bool Report::clean() const {
    std::lock_guard<std::mutex> lock(mutex_);
    if (!failures_.empty()) return false;
    for (const auto &[row, t] : rows_)
        if (t.exact != t.checked) return false;
    return true;
}

uint64_t Report::checked() const {
    std::lock_guard<std::mutex> lock(mutex_);
    uint64_t n = 0;
    for (const auto &[row, t] : rows_) n += t.checked;
    return n;
}

std::string Report::finish(const std::string &title, std::size_t max_messages) const {
    std::lock_guard<std::mutex> lock(mutex_);
    Tally total;
    std::printf("\n%s\n  %-28s %8s %12s %12s\n", title.c_str(), "row", "streams", "frames exact",
                "checked");
    for (const auto &[row, t] : rows_) {
        std::printf("  %-28s %8llu %12llu %12llu%s\n", row.c_str(),
                    static_cast<unsigned long long>(t.streams),
                    static_cast<unsigned long long>(t.exact),
                    static_cast<unsigned long long>(t.checked), t.exact == t.checked ? "" : "  <--");
        total.exact += t.exact;
        total.checked += t.checked;
        total.streams += t.streams;
    }
    std::printf("  %-28s %8llu %12llu %12llu\n", "total",
                static_cast<unsigned long long>(total.streams),
                static_cast<unsigned long long>(total.exact),
                static_cast<unsigned long long>(total.checked));
    std::fflush(stdout);
    std::vector<std::string> sorted = failures_;
    std::sort(sorted.begin(), sorted.end());
    std::string out;
    for (std::size_t i = 0; i < sorted.size() && i < max_messages; ++i) out += sorted[i] + "\n";
    if (sorted.size() > max_messages)
        out += "... and " + std::to_string(sorted.size() - max_messages) + " more\n";
    return out;
}

void run_parallel(std::size_t count, const std::function<void(std::size_t)> &job) {
    unsigned threads = 2;
    if (const char *env = std::getenv("VAMRNB_CONFORMANCE_THREADS"); env != nullptr)
        threads = static_cast<unsigned>(std::max(1, std::atoi(env)));
    std::atomic<std::size_t> next{0};
    auto worker = [&] {
        for (std::size_t i; (i = next.fetch_add(1)) < count;) job(i);
    };
    std::vector<std::thread> pool;
    for (unsigned t = 1; t < threads && t < count; ++t) pool.emplace_back(worker);
    worker();
    for (auto &t : pool) t.join();
}

}  // namespace conformance
