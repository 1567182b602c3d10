// Shared pieces of the vamrnb command-line tool: options, exit codes,
// messages, the result of converting one file, and outputs that appear only
// when complete.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

#include "vamrnb_stream.h"

namespace tool {

// Exit codes (documented in --help and the man page).
enum Exit { EXIT_OK = 0, EXIT_USAGE = 1, EXIT_INPUT = 2, EXIT_OUTPUT = 3, EXIT_CODEC = 4 };

inline constexpr int kFrame = 160;         // samples per 20 ms frame
inline constexpr int kRate = 8000;         // the codec's sample rate
inline constexpr size_t kBlock = 4096;     // samples or bytes moved per I/O call

struct Options {
    std::string command;
    int mode = 7;             // MR122
    bool dtx = false;
    int vad = 1;
    bool raw = false;         // encode: raw input; decode: raw output
    int bits = 16;
    int channels = 1;
    int rate = kRate;         // decode: output sample rate
    std::string type;         // decode: output format name (-t), empty = by extension
    bool strict = false;
    bool json = false;
    bool quiet = false;
    bool progress = false;    // progress bar (standard error is a terminal)
    int jobs = 1;
    std::string outdir;
    std::vector<std::string> args;
};

// What converting one file gave: an exit code and the audio it covered.
struct Outcome {
    int code = EXIT_OK;
    double audio_seconds = 0;
};

// One line on standard error, "vamrnb: FILE: TEXT" (thread-safe).
void message(const std::string &file, const std::string &text);
// A path as messages show it ("-" is standard input or output).
std::string shown(const std::string &path, bool output = false);
std::string lower(std::string s);
// printf-style formatting into a string.
std::string format(const char *fmt, ...) __attribute__((format(printf, 1, 2)));
std::string extension(const std::string &path);

// An output file written to a temporary beside the target and renamed into
// place by commit(); destroyed uncommitted, the temporary is removed.  "-"
// writes standard output directly.
class OutputFile {
public:
    explicit OutputFile(std::string path) : path_(std::move(path)) {}
    ~OutputFile();
    OutputFile(const OutputFile &) = delete;
    OutputFile &operator=(const OutputFile &) = delete;

    bool open(std::string &err);
    int fd() const { return fd_; }
    bool is_stdout() const { return path_ == "-"; }
    bool seekable() const;
    bool write(const void *data, size_t size, std::string &err);
    bool commit(std::string &err);

private:
    std::string path_, temp_;
    int fd_ = -1;
};

// A one-line progress display on standard error; silent unless enabled.
class Progress {
public:
    Progress(bool on, std::string label, uint64_t total) : on_(on), label_(std::move(label)), total_(total) {}
    ~Progress() { finish(); }
    void update(uint64_t done, double audio_seconds);
    void finish();

private:
    bool on_;
    std::string label_;
    uint64_t total_;   // input bytes, 0 when unknown (a pipe)
    int last_ = -1;
    bool shown_ = false;
};

// Input size in bytes for the progress display, 0 when unknown.
uint64_t input_size(const std::string &path);

// One sentence saying what a file that is not AMR-NB storage format is and
// how to convert it, from its first bytes and the reader's status.
std::string explain_foreign(const uint8_t *head, size_t size, int32_t status);

// What walking an .amr input found.
struct StreamScan {
    int32_t status = 0;             // the reader's status at the end (AMRNB_OK: clean)
    uint64_t bytes = 0;             // input bytes read
    uint64_t offset = 0;            // the reader's offset at the end
    unsigned bad_byte = 0;          // the byte refused with VAMRNB_STREAM_ERR_TOC
    vamrnb_stream_frame partial{};  // the cut-off frame of VAMRNB_STREAM_ERR_TRUNCATED
    uint8_t head[16];               // the first bytes, to say what a foreign file is
    size_t head_size = 0;
    std::string read_error;         // why the input could not be read
};

// Reads path ("-": standard input) through the stream reader, calling on_frame
// for every frame (a non-zero result stops the walk and is returned) and
// on_block (may be empty) with the bytes read so far after every block.
// Returns EXIT_OK when the whole input was walked (see s.status), or an exit
// code with s.read_error set.
int scan_stream(const std::string &path, const std::function<int(const vamrnb_stream_frame &)> &on_frame,
                const std::function<void(uint64_t)> &on_block, StreamScan &s);

Outcome encode_file(const Options &o, const std::string &in, const std::string &out);
Outcome decode_file(const Options &o, const std::string &in, const std::string &out);
Outcome info_file(const Options &o, const std::string &in);

// Output formats the decoder writes: name -> libsndfile format, 0 if unknown.
int output_format(const std::string &name, int bits);
const char *output_format_names();

}  // namespace tool
