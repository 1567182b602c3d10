// vamrnb: command-line front end of the library.  Parses the command line,
// plans the conversions (output names, collisions, the output directory)
// before any work starts, runs them one file per worker, and ends a batch
// with one summary line.  All coding goes through the library's public C
// interface; encode.cpp, decode.cpp and info.cpp hold the three commands.
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <thread>

#include "tool.h"
#include "vamrnb.h"

namespace fs = std::filesystem;
using namespace tool;

namespace {

const char *const kUsage =
    "Usage: vamrnb encode [OPTION]... IN OUT\n"
    "  or:  vamrnb encode [OPTION]... -o DIR IN...\n"
    "  or:  vamrnb decode [OPTION]... IN OUT\n"
    "  or:  vamrnb decode [OPTION]... -o DIR IN...\n"
    "  or:  vamrnb info [--json] IN...\n";

const char *const kHelp =
    "Encode audio to AMR narrowband (AMR-NB) speech, decode it back, and\n"
    "describe .amr files.  \"-\" as IN or OUT is standard input or output.\n"
    "Both directions stream: memory stays small whatever the length.\n"
    "\n"
    "Encode options (IN: any file libsndfile reads, any rate and channels;\n"
    "it is mixed to mono and resampled to 8 kHz; OUT: an .amr file):\n"
    "  -m, --mode MODE      codec mode 4.75 5.15 5.9 6.7 7.4 7.95 10.2 12.2\n"
    "                       (also MR475..MR122 or 0..7); default 12.2\n"
    "      --dtx            discontinuous transmission (comfort noise in pauses)\n"
    "      --vad 1|2        voice activity detector used with --dtx (default 1)\n"
    "      --raw            IN is raw signed 16-bit little-endian 8 kHz mono PCM\n"
    "                       (the default for .pcm and .raw names)\n"
    "\n"
    "Decode options (IN: an .amr file; OUT: format by extension or -t):\n"
    "  -t, --type TYPE      output format: wav flac ogg opus mp3 aiff au caf raw\n"
    "                       (default: by OUT's extension; raw for \"-\"; wav with -o)\n"
    "      --rate HZ        resample the 8 kHz output to HZ (libsoxr)\n"
    "      --bits 8|16|24   sample size of PCM formats (default 16)\n"
    "      --channels 1|2   1 = mono, 2 = the signal on both channels\n"
    "      --raw            same as -t raw (signed little-endian PCM)\n"
    "      --strict         a truncated last frame is an error, not a warning\n"
    "\n"
    "Damaged input: every complete frame of a truncated file is decoded and the\n"
    "cut is reported with its byte offset; padding bits in a frame header are\n"
    "ignored with one warning; bad and lost frames are concealed, never dropped.\n"
    "\n"
    "Info options:\n"
    "      --json           one JSON object per file (frames by type and mode,\n"
    "                       duration, codec and file bit rates, damage found)\n"
    "      --strict         damage makes the exit code non-zero\n"
    "\n"
    "Common options:\n"
    "  -o, --output-dir DIR write outputs into DIR (created when missing), named\n"
    "                       after the inputs; several inputs need this form\n"
    "  -j, --jobs N         files converted in parallel (default 1; 0 = all cores)\n"
    "  -q, --quiet          no per-file lines, summary or progress bar\n"
    "  -h, --help           display this help and exit\n"
    "  -V, --version        output version information and exit\n"
    "\n"
    "Outputs are written to a temporary file beside the target and renamed into\n"
    "place only when complete, so a failure never leaves a partial file.  Two\n"
    "inputs that would give the same output name, or an output that is also an\n"
    "input, are refused before any work starts.  Batch runs end with one summary\n"
    "line; a progress bar is shown only when standard error is a terminal.\n"
    "\n"
    "Exit status:\n"
    "  0  success (warnings about damaged input included)\n"
    "  1  usage error\n"
    "  2  unreadable, unsupported or invalid input\n"
    "  3  output could not be written\n"
    "  4  codec failure\n"
    "With several files, the highest status of any file.\n"
    "\n"
    "Examples:\n"
    "  vamrnb encode -m 12.2 speech.wav speech.amr\n"
    "  arecord -f S16_LE -r 8000 | vamrnb encode - - > call.amr\n"
    "  vamrnb decode call.amr - -t wav | aplay\n"
    "  vamrnb decode --rate 48000 -o out/ *.amr\n"
    "  vamrnb info --json call.amr\n";

int usage_error(const std::string &text) {
    message("", text);
    std::fprintf(stderr, "%sTry 'vamrnb --help' for more information.\n", kUsage);
    return EXIT_USAGE;
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

// 0: run; -1: done (help, version); >0: exit code.
int parse_args(int argc, char **argv, Options &o) {
    if (argc < 2) return usage_error("missing command");
    const std::string first = argv[1];
    if (first == "-h" || first == "--help" || first == "help") {
        std::printf("%s\n%s", kUsage, kHelp);
        return -1;
    }
    if (first == "-V" || first == "--version" || first == "version") {
        std::printf("vamrnb %s\n", vamrnb_version());
        return -1;
    }
    o.command = first;
    if (o.command != "encode" && o.command != "decode" && o.command != "info")
        return usage_error("unknown command '" + first + "'");
    const bool enc = o.command == "encode", dec = o.command == "decode", info = o.command == "info";
    bool vad_given = false;
    for (int i = 2; i < argc; ++i) {
        const std::string a = argv[i];
        auto value = [&]() -> const char * { return i + 1 < argc ? argv[++i] : nullptr; };
        const char *v = nullptr;
        if (a == "--") {
            for (++i; i < argc; ++i) o.args.push_back(argv[i]);
            break;
        }
        if (a == "-h" || a == "--help") {
            std::printf("%s\n%s", kUsage, kHelp);
            return -1;
        } else if (a == "-q" || a == "--quiet") {
            o.quiet = true;
        } else if (!info && (a == "-o" || a == "--output-dir")) {
            if (!(v = value())) return usage_error("option " + a + " needs a directory");
            o.outdir = v;
        } else if (a == "-j" || a == "--jobs") {
            if (!(v = value()) || !parse_int(v, 0, 1024, o.jobs)) return usage_error("option " + a + " needs a number");
            if (o.jobs == 0) o.jobs = static_cast<int>(std::max(1u, std::thread::hardware_concurrency()));
        } else if (enc && (a == "-m" || a == "--mode")) {
            if (!(v = value())) return usage_error("option " + a + " needs a mode");
            o.mode = parse_mode(v);
            if (o.mode < 0)
                return usage_error(std::string("unknown mode '") + v +
                                   "' (use 4.75 5.15 5.9 6.7 7.4 7.95 10.2 12.2, MR475..MR122 or 0..7)");
        } else if (enc && a == "--dtx") {
            o.dtx = true;
        } else if (enc && a == "--vad") {
            if (!(v = value()) || !parse_int(v, 1, 2, o.vad)) return usage_error("option --vad needs 1 or 2");
            vad_given = true;
        } else if ((enc || dec) && a == "--raw") {
            o.raw = true;
        } else if (dec && (a == "-t" || a == "--type")) {
            if (!(v = value())) return usage_error("option " + a + " needs a format");
            o.type = lower(v);
            if (!output_format(o.type, 16))
                return usage_error("unknown output format '" + o.type + "' (use " + output_format_names() + ")");
        } else if (dec && a == "--rate") {
            if (!(v = value()) || !parse_int(v, 1000, 768000, o.rate))
                return usage_error("option --rate needs a sample rate in Hz (1000 to 768000)");
        } else if (dec && a == "--bits") {
            if (!(v = value()) || !parse_int(v, 8, 24, o.bits) || (o.bits != 8 && o.bits != 16 && o.bits != 24))
                return usage_error("option --bits needs 8, 16 or 24");
        } else if (dec && a == "--channels") {
            if (!(v = value()) || !parse_int(v, 1, 2, o.channels)) return usage_error("option --channels needs 1 or 2");
        } else if ((dec || info) && a == "--strict") {
            o.strict = true;
        } else if (info && a == "--json") {
            o.json = true;
        } else if (a.size() > 1 && a[0] == '-') {
            return usage_error("unknown option '" + a + "' for " + o.command);
        } else {
            o.args.push_back(a);
        }
    }
    if (vad_given && !o.dtx) return usage_error("--vad only applies with --dtx");
    if (o.args.empty()) return usage_error("missing input file");
    if (!info && o.outdir.empty() && o.args.size() != 2)
        return usage_error(o.args.size() == 1 ? "missing output file (or use -o DIR)"
                                              : "several inputs need an output directory (-o DIR)");
    return 0;
}

std::string stem(const std::string &path) {
    std::string base = fs::path(path).filename().string();
    const size_t dot = base.find_last_of('.');
    if (dot != std::string::npos && dot > 0) base.resize(dot);
    return base;
}

// The same file under two names, as far as can be told before it exists.
bool same_file(const std::string &a, const std::string &b) {
    if (a == "-" || b == "-") return false;
    std::error_code ec;
    if (fs::exists(a, ec) && fs::exists(b, ec)) return fs::equivalent(a, b, ec);
    return fs::weakly_canonical(a, ec) == fs::weakly_canonical(b, ec);
}

struct Job {
    std::string in, out;
};

// Output names for every input, refused as a whole before anything runs.
int plan(const Options &o, std::vector<Job> &jobs) {
    if (o.command == "info") {
        for (const auto &a : o.args) jobs.push_back({a, ""});
        return EXIT_OK;
    }
    if (o.outdir.empty()) {
        jobs.push_back({o.args[0], o.args[1]});
    } else {
        const std::string ext =
            o.command == "encode" ? "amr" : !o.type.empty() ? o.type : o.raw ? "raw" : "wav";
        std::map<std::string, std::string> taken;  // canonical output -> input
        for (const auto &a : o.args) {
            if (a == "-") return usage_error("\"-\" is only accepted in the single-file form");
            const std::string out = (fs::path(o.outdir) / (stem(a) + "." + ext)).string();
            std::error_code ec;
            const std::string key = fs::weakly_canonical(out, ec).string();
            const auto [it, fresh] = taken.emplace(key, a);
            if (!fresh)
                return usage_error("inputs '" + it->second + "' and '" + a + "' would both be written to '" + out +
                                   "'");
            jobs.push_back({a, out});
        }
    }
    for (const Job &j : jobs)
        for (const Job &k : jobs)
            if (same_file(j.out, k.in))
                return usage_error("output '" + j.out + "' is also an input; choose another name or directory");
    if (!o.outdir.empty()) {
        std::error_code ec;
        fs::create_directories(o.outdir, ec);
        if (ec || !fs::is_directory(o.outdir)) {
            message(o.outdir, "cannot create output directory: " + (ec ? ec.message() : "not a directory"));
            return EXIT_OUTPUT;
        }
    }
    return EXIT_OK;
}

}  // namespace

int main(int argc, char **argv) {
    Options o;
    const int prc = parse_args(argc, argv, o);
    if (prc < 0) return EXIT_OK;
    if (prc > 0) return prc;

    std::vector<Job> jobs;
    if (const int rc = plan(o, jobs)) return rc;
    const int threads = std::max(1, std::min<int>(o.jobs, static_cast<int>(jobs.size())));
    o.progress = !o.quiet && threads == 1 && o.command != "info" && isatty(2);

    const auto t0 = std::chrono::steady_clock::now();
    std::vector<Outcome> results(jobs.size());
    std::atomic<size_t> next{0};
    auto worker = [&] {
        for (size_t k; (k = next.fetch_add(1)) < jobs.size();) {
            const Job &j = jobs[k];
            if (o.command == "info") results[k] = info_file(o, j.in);
            else if (o.command == "encode") results[k] = encode_file(o, j.in, j.out);
            else results[k] = decode_file(o, j.in, j.out);
        }
    };
    if (o.command == "info" || threads == 1) {
        worker();
    } else {
        std::vector<std::thread> pool;
        for (int t = 0; t < threads; ++t) pool.emplace_back(worker);
        for (auto &t : pool) t.join();
    }

    int worst = EXIT_OK;
    size_t failed = 0;
    double audio = 0;
    for (const Outcome &r : results) {
        worst = std::max(worst, r.code);
        failed += r.code != EXIT_OK;
        audio += r.audio_seconds;
    }
    if (!o.quiet && o.command != "info" && (jobs.size() > 1 || !o.outdir.empty())) {
        const double secs = std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
        message("", format("%zu files converted, %zu failed, %.2f s of audio in %.2f s (%.0fx real time)",
                           jobs.size() - failed, failed, audio, secs, secs > 0 ? audio / secs : 0.0));
    }
    return worst;
}
