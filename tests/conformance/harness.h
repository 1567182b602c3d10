// Shared pieces of the conformance harness: where the vectors are, reading
// them, walking storage-format streams, explaining differing frames, and a
// small parallel runner with a per-row tally of exact frames.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "vamrnb_stream.h"

namespace conformance {

namespace fs = std::filesystem;

// Vector and corpus directories of one run.  The full set lives in
// $VAMRNB_SHARED or <source>/../shared; the bundled subset in tests/data.
struct Roots {
    fs::path vectors;
    fs::path corpus;
    bool subset = false;
};
const Roots &roots();

std::optional<std::vector<uint8_t>> read_bytes(const fs::path &path);
std::optional<std::vector<uint32_t>> read_crcs(const fs::path &path);
std::optional<std::vector<int16_t>> read_pcm(const fs::path &path);
std::vector<fs::path> sorted_entries(const fs::path &dir, bool directories,
                                     const std::string &extension = "");

// Storage format: "#!AMR\n", then per frame a table-of-contents byte and its
// class bits; the size of a frame in the file depends only on its type
// (vamrnb_stream_frame_size).
constexpr std::size_t kMagicSize = 6;

struct Frame {
    std::size_t offset;  // of the table-of-contents byte in the file
    int type;            // FT, 0..15
    bool quality;        // Q bit
    std::size_t size;    // bytes in the file, TOC included
};
// Splits a whole file; on a bad header or a truncated last frame returns the
// frames read so far and sets error.
std::vector<Frame> split_frames(const std::vector<uint8_t> &file, std::string &error);

const char *mode_name(int mode);  // "MR475" .. "MR122", "SID", "NO_DATA", ...
int mode_from_name(const std::string &name);  // -1 when unknown
// The single speech mode of a stream, or "mixed" / "none".
std::string stream_mode_label(const std::vector<Frame> &frames);

// Codec parameters carried by one frame (FT 0..8); for SID frames followed by
// STI and the mode indication.  Missing bytes read as zero.
std::vector<int> frame_parameters(const uint8_t *frame, std::size_t size);
// Human-readable first difference between our frame and the expected one.
std::string describe_frame_difference(const uint8_t *ours, std::size_t ours_size,
                                      const uint8_t *expected, std::size_t expected_size);

// Tally of frames per report row, plus failure messages.
class Report {
public:
    void add(const std::string &row, uint64_t exact, uint64_t checked);
    void fail(const std::string &message);
    // Prints the table; returns the failure messages (at most max_messages).
    std::string finish(const std::string &title, std::size_t max_messages = 40) const;
    bool clean() const;
    uint64_t checked() const;

private:
    struct Tally {
        uint64_t exact = 0, checked = 0, streams = 0;
    };
    mutable std::mutex mutex_;
    std::map<std::string, Tally> rows_;
    std::vector<std::string> failures_;
};

// Runs job(0) .. job(count - 1) on a few threads (VAMRNB_CONFORMANCE_THREADS,
// default 2); instances are independent, so jobs are too.
void run_parallel(std::size_t count, const std::function<void(std::size_t)> &job);

}  // namespace conformance
