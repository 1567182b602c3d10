// info: what a storage-format file holds (frames by type and mode, duration,
// codec and file bit rates, damage with its offsets), as text or one JSON
// object per file; and one sentence for files that are something else.
#include <algorithm>
#include <cstring>
#include <mutex>

#include "tool.h"
#include "vamrnb.h"
#include "vamrnb_stream.h"

namespace tool {

namespace {

const char *const kTypeName[16] = {"MR475", "MR515", "MR59",   "MR67",   "MR74",   "MR795",  "MR102",   "MR122",
                                   "SID",   "type9", "type10", "type11", "type12", "type13", "type14", "NO_DATA"};
constexpr int kModeRate[8] = {4750, 5150, 5900, 6700, 7400, 7950, 10200, 12200};

std::string json_string(const std::string &s) {
    std::string out = "\"";
    for (const char c : s) {
        const auto u = static_cast<unsigned char>(c);
        if (c == '"' || c == '\\') out += std::string("\\") + c;
        else if (u < 0x20) out += format("\\u%04x", u);
        else out += c;
    }
    return out + "\"";
}

bool starts(const uint8_t *head, size_t size, const char *text, size_t at = 0) {
    const size_t n = std::strlen(text);
    return size >= at + n && std::memcmp(head + at, text, n) == 0;
}

std::mutex g_out;

}  // namespace

std::string explain_foreign(const uint8_t *head, size_t size, int32_t status) {
    if (status == VAMRNB_STREAM_ERR_WIDEBAND)
        return "an AMR-WB (wideband, 16 kHz) file; vamrnb handles AMR-NB only: decode it with an AMR-WB "
               "decoder (for example 'ffmpeg -i FILE out.wav') and run 'vamrnb encode' on the result";
    if (status == VAMRNB_STREAM_ERR_MULTICHANNEL)
        return "a multi-channel AMR-NB file; vamrnb reads single-channel files only: split the channels "
               "with another tool first";
    if (starts(head, size, "ftyp", 4)) {
        const std::string brand = size >= 12 ? std::string(reinterpret_cast<const char *>(head + 8), 4) : "?";
        return "an MP4/3GPP container (brand '" + brand + "'), not a bare .amr file: extract its AMR track "
               "first, for example 'ffmpeg -i FILE -c:a copy out.amr', then decode that";
    }
    if (starts(head, size, "RIFF") || starts(head, size, "fLaC") || starts(head, size, "OggS") ||
        starts(head, size, "FORM") || starts(head, size, ".snd") || starts(head, size, "ID3"))
        return "an audio file, not AMR-NB (missing \"#!AMR\\n\" header): 'vamrnb encode' converts it to AMR";
    return "not an AMR-NB file (missing \"#!AMR\\n\" header)";
}

Outcome info_file(const Options &o, const std::string &in) {
    const std::string name = shown(in);
    uint64_t by_type[16] = {}, bad = 0, padded = 0, first_padding = 0, frames = 0;
    StreamScan scan;
    const int rc = scan_stream(
        in,
        [&](const vamrnb_stream_frame &f) {
            ++frames;
            ++by_type[f.type];
            if (!f.quality) ++bad;
            if (f.padding && padded++ == 0) first_padding = f.offset;
            return 0;
        },
        {}, scan);
    if (rc != EXIT_OK) {
        message(name, scan.read_error);
        return {rc};
    }
    const int32_t st = scan.status;
    const vamrnb_stream_frame &partial = scan.partial;
    const uint64_t at = scan.offset;
    uint64_t total = scan.bytes;
    total = std::max(total, input_size(in));  // reading stops early on a foreign file
    std::lock_guard<std::mutex> lock(g_out);
    if (st != AMRNB_OK && st != VAMRNB_STREAM_ERR_TRUNCATED && st != VAMRNB_STREAM_ERR_TOC) {
        const std::string why = total == 0 ? "empty file" : explain_foreign(scan.head, scan.head_size, st);
        if (o.json) {
            const char *fmt = st == VAMRNB_STREAM_ERR_WIDEBAND ? "AMR-WB"
                              : st == VAMRNB_STREAM_ERR_MULTICHANNEL ? "AMR-NB multi-channel"
                              : starts(scan.head, scan.head_size, "ftyp", 4) ? "MP4/3GPP container"
                                                                   : "unknown";
            std::printf("{\"file\":%s,\"format\":%s,\"file_bytes\":%llu,\"error\":%s}\n", json_string(in).c_str(),
                        json_string(fmt).c_str(), static_cast<unsigned long long>(total), json_string(why).c_str());
        }
        message(name, why);
        return {EXIT_INPUT};
    }

    // Damage found, in file order.
    struct Damage {
        std::string kind, text;
        uint64_t offset;
    };
    std::vector<Damage> damage;
    if (padded)
        damage.push_back({"toc_padding",
                          format("%llu table-of-contents bytes with padding bits set (ignored)",
                                 static_cast<unsigned long long>(padded)),
                          first_padding});
    if (st == VAMRNB_STREAM_ERR_TRUNCATED)
        damage.push_back({"truncated",
                          format("truncated last frame (frame type %d needs %u bytes, %u present)", partial.type,
                                 vamrnb_stream_frame_size(partial.type), partial.size),
                          partial.offset});
    if (st == VAMRNB_STREAM_ERR_TOC)
        damage.push_back({"bad_toc", format("invalid frame header byte 0x%02X (F bit set); the rest is unread",
                                            scan.bad_byte), at});

    const double duration = static_cast<double>(frames) * 0.02;
    uint64_t speech = 0;
    double speech_bits = 0;
    for (int m = 0; m < 8; ++m) {
        speech += by_type[m];
        speech_bits += static_cast<double>(by_type[m]) * kModeRate[m];
    }
    const double codec_rate = speech ? speech_bits / static_cast<double>(speech) : 0.0;
    const double file_rate = duration > 0 ? static_cast<double>(total) * 8 / duration : 0.0;

    if (o.json) {
        std::string j = "{\"file\":" + json_string(in) + ",\"format\":\"AMR-NB\"";
        j += format(",\"frames\":%llu,\"duration_s\":%.2f,\"frames_by_type\":{", static_cast<unsigned long long>(frames),
                    duration);
        bool first = true;
        for (int t = 0; t < 16; ++t) {
            if (!by_type[t]) continue;
            j += format("%s\"%s\":%llu", first ? "" : ",", kTypeName[t], static_cast<unsigned long long>(by_type[t]));
            first = false;
        }
        j += format("},\"bad_frames\":%llu,\"codec_bitrate_bps\":%.0f,\"file_bitrate_bps\":%.0f,\"file_bytes\":%llu",
                    static_cast<unsigned long long>(bad), codec_rate, file_rate, static_cast<unsigned long long>(total));
        j += ",\"damage\":[";
        for (size_t k = 0; k < damage.size(); ++k)
            j += format("%s{\"kind\":\"%s\",\"offset\":%llu,\"text\":%s}", k ? "," : "", damage[k].kind.c_str(),
                        static_cast<unsigned long long>(damage[k].offset), json_string(damage[k].text).c_str());
        j += "]}";
        std::printf("%s\n", j.c_str());
    } else {
        std::printf("%s\n", name.c_str());
        std::printf("  duration     %.2f s (%llu frames of 20 ms)\n", duration, static_cast<unsigned long long>(frames));
        std::printf("  codec rate   %.2f kbit/s (average of the speech frames' modes)\n", codec_rate / 1000);
        std::printf("  file rate    %.2f kbit/s (%llu bytes)\n", file_rate / 1000, static_cast<unsigned long long>(total));
        for (int t = 0; t < 16; ++t)
            if (by_type[t])
                std::printf("  %-12s %8llu frames (%5.1f%%)\n", t < 8 ? kTypeName[t] : t == 8 ? "SID" : t == 15 ? "no data" : kTypeName[t],
                            static_cast<unsigned long long>(by_type[t]),
                            100.0 * static_cast<double>(by_type[t]) / static_cast<double>(frames));
        std::printf("  bad frames   %8llu (quality bit 0)\n", static_cast<unsigned long long>(bad));
        for (const Damage &d : damage)
            std::printf("  damage       %s at byte %llu\n", d.text.c_str(), static_cast<unsigned long long>(d.offset));
    }
    std::fflush(stdout);
    const bool broken = st == VAMRNB_STREAM_ERR_TOC || (o.strict && !damage.empty());
    return {broken ? EXIT_INPUT : EXIT_OK, duration};
}

}  // namespace tool
