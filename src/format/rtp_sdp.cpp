// SDP format parameters of AMR/8000: reads an `a=fmtp` line (or its
// parameter list) into the session parameters and writes them back,
// naming only what differs from the defaults.  Parameter names compare
// without regard to case; parameters this library does not know are
// skipped, as a receiver of the offer must do.
#include <cstdio>
#include <cstring>

#include "format/rtp_payload.h"

namespace {

bool is_space(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

char lower(char c) { return (c >= 'A' && c <= 'Z') ? static_cast<char>(c - 'A' + 'a') : c; }

// A view of part of the input.
struct span {
    const char *p;
    size_t n;
};

span trim(span s) {
    while (s.n && is_space(*s.p)) ++s.p, --s.n;
    while (s.n && is_space(s.p[s.n - 1])) --s.n;
    return s;
}

bool same_name(span s, const char *name) {
    const size_t len = std::strlen(name);
    if (s.n != len) return false;
    for (size_t i = 0; i < len; ++i)
        if (lower(s.p[i]) != name[i]) return false;
    return true;
}

// A decimal number of at most six digits, nothing else.
bool number(span s, int32_t &out) {
    if (s.n == 0 || s.n > 6) return false;
    int32_t v = 0;
    for (size_t i = 0; i < s.n; ++i) {
        if (s.p[i] < '0' || s.p[i] > '9') return false;
        v = v * 10 + (s.p[i] - '0');
    }
    out = v;
    return true;
}

bool number_in(span s, int32_t lo, int32_t hi, int32_t &out) {
    int32_t v = 0;
    if (!number(s, v) || v < lo || v > hi) return false;
    out = v;
    return true;
}

// "0,2,5,7": modes 0 to 7, separated by commas, spaces allowed around them.
bool mode_list(span s, uint32_t &out) {
    uint32_t set = 0;
    while (true) {
        size_t i = 0;
        while (i < s.n && s.p[i] != ',') ++i;
        int32_t m = 0;
        if (!number_in(trim(span{s.p, i}), 0, 7, m)) return false;
        set |= 1u << m;
        if (i == s.n) break;
        s = span{s.p + i + 1, s.n - i - 1};
    }
    out = set;
    return true;
}

// One "name=value" pair; false when a known name has an unusable value.
bool apply(span name, span value, vamrnb_rtp_params *p) {
    if (same_name(name, "octet-align")) return number_in(value, 0, 1, p->octet_align);
    if (same_name(name, "mode-set")) return mode_list(value, p->mode_set);
    if (same_name(name, "mode-change-period")) return number_in(value, 1, 2, p->mode_change_period);
    if (same_name(name, "mode-change-capability"))
        return number_in(value, 1, 2, p->mode_change_capability);
    if (same_name(name, "mode-change-neighbor"))
        return number_in(value, 0, 1, p->mode_change_neighbor);
    if (same_name(name, "maxptime")) return number_in(value, 1, 999999, p->maxptime);
    if (same_name(name, "crc")) return number_in(value, 0, 1, p->crc);
    if (same_name(name, "robust-sorting")) return number_in(value, 0, 1, p->robust_sorting);
    if (same_name(name, "interleaving")) return number_in(value, 1, 999999, p->interleaving);
    if (same_name(name, "channels")) return number_in(value, 1, 999999, p->channels);
    if (same_name(name, "max-red")) return number_in(value, 0, 999999, p->max_red);
    return true;
}

}  // namespace

extern "C" {

VAMRNB_API void vamrnb_rtp_params_default(vamrnb_rtp_params *params) {
    if (!params) return;
    *params = vamrnb_rtp_params{};
    params->mode_set = 0xFFu;
    params->mode_change_period = 1;
    params->mode_change_capability = 1;
    params->channels = 1;
    params->max_red = -1;
}

VAMRNB_API int32_t vamrnb_rtp_fmtp_parse(const char *text, vamrnb_rtp_params *params) {
    if (!text || !params) return VAMRNB_RTP_ERR_ARGUMENT;
    vamrnb_rtp_params p;
    vamrnb_rtp_params_default(&p);

    span rest = trim(span{text, std::strlen(text)});
    // The attribute name and payload type, when the whole line is given.
    if (rest.n >= 7 && same_name(span{rest.p, 7}, "a=fmtp:")) {
        rest = span{rest.p + 7, rest.n - 7};
        while (rest.n && !is_space(*rest.p)) ++rest.p, --rest.n;
        rest = trim(rest);
    }

    while (rest.n) {
        size_t i = 0;
        while (i < rest.n && rest.p[i] != ';') ++i;
        const span item = trim(span{rest.p, i});
        rest = i < rest.n ? span{rest.p + i + 1, rest.n - i - 1} : span{rest.p + i, 0};
        if (item.n == 0) continue;
        size_t eq = 0;
        while (eq < item.n && item.p[eq] != '=') ++eq;
        if (eq == item.n) continue;  // a bare word: nothing this library knows
        if (!apply(trim(span{item.p, eq}), trim(span{item.p + eq + 1, item.n - eq - 1}), &p))
            return VAMRNB_RTP_ERR_SDP;
    }
    // CRCs, robust sorting and interleaving exist only in the octet-aligned mode.
    if (p.crc || p.robust_sorting || p.interleaving) p.octet_align = 1;
    *params = p;
    return p.channels == 1 ? AMRNB_OK : VAMRNB_RTP_ERR_UNSUPPORTED;
}

VAMRNB_API int32_t vamrnb_rtp_fmtp_format(const vamrnb_rtp_params *params, char *text,
                                          size_t capacity, size_t *length) {
    if (length) *length = 0;
    if (!params || !text) return VAMRNB_RTP_ERR_ARGUMENT;
    if (capacity) text[0] = '\0';
    const vamrnb_rtp_params &p = *params;
    const auto flag = [](int32_t v) { return v == 0 || v == 1; };
    if (!flag(p.octet_align) || !flag(p.crc) || !flag(p.robust_sorting)
        || !flag(p.mode_change_neighbor) || (p.mode_set & 0xFFu) == 0 || p.mode_set > 0xFFu
        || p.mode_change_period < 1 || p.mode_change_period > 2
        || p.mode_change_capability < 1 || p.mode_change_capability > 2 || p.maxptime < 0
        || p.interleaving < 0 || p.max_red < -1 || p.channels != 1)
        return VAMRNB_RTP_ERR_SDP;

    // Long enough for every parameter at its widest.
    char buf[256];
    buf[0] = '\0';  // all parameters at their defaults: an empty line
    size_t n = 0;
    const auto add = [&](const char *name, int32_t value) {
        n += static_cast<size_t>(std::snprintf(buf + n, sizeof buf - n, "%s%s=%d",
                                               n ? "; " : "", name, static_cast<int>(value)));
    };
    if (p.octet_align) add("octet-align", 1);
    if (p.mode_set != 0xFFu) {
        n += static_cast<size_t>(std::snprintf(buf + n, sizeof buf - n, "%smode-set=",
                                               n ? "; " : ""));
        bool first = true;
        for (int m = 0; m < 8; ++m)
            if (p.mode_set & (1u << m)) {
                if (!first) buf[n++] = ',';
                buf[n++] = static_cast<char>('0' + m);
                first = false;
            }
        buf[n] = '\0';
    }
    if (p.mode_change_period != 1) add("mode-change-period", p.mode_change_period);
    if (p.mode_change_capability != 1) add("mode-change-capability", p.mode_change_capability);
    if (p.mode_change_neighbor) add("mode-change-neighbor", 1);
    if (p.maxptime) add("maxptime", p.maxptime);
    if (p.crc) add("crc", 1);
    if (p.robust_sorting) add("robust-sorting", 1);
    if (p.interleaving) add("interleaving", p.interleaving);
    if (p.max_red >= 0) add("max-red", p.max_red);

    if (n + 1 > capacity) return VAMRNB_RTP_ERR_NO_ROOM;
    std::memcpy(text, buf, n + 1);
    if (length) *length = n;
    return AMRNB_OK;
}

}  // extern "C"
