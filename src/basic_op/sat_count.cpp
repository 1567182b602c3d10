// Saturation counters of the counting build: one per (operator, call site),
// kept in a map under a lock; reports sum them per function or per line.
#include "basic_op/sat_count.h"

#if defined(VAMRNB_COUNT_SATURATION)

#include <algorithm>
#include <map>
#include <mutex>
#include <string>
#include <tuple>
#include <vector>

namespace vamrnb {
namespace {

using Key = std::tuple<std::string, std::string, std::string, unsigned>;   // function, op, file, line

std::mutex g_lock;
std::map<Key, unsigned long long> g_counts;

// Source path from the repository's src/ on.
std::string short_file(const char *path) {
    const std::string p = path;
    const auto at = p.rfind("/src/");
    return at == std::string::npos ? p : p.substr(at + 1);
}

// The bare name of a function from its full signature.
std::string short_function(const char *signature) {
    std::string s = signature;
    const auto paren = s.find('(');
    if (paren != std::string::npos) s.resize(paren);
    const auto space = s.rfind(' ');
    return space == std::string::npos ? s : s.substr(space + 1);
}

}  // namespace

void count_saturation(const char *op, const std::source_location &site) {
    const std::lock_guard<std::mutex> hold(g_lock);
    ++g_counts[Key{short_function(site.function_name()), op, short_file(site.file_name()), site.line()}];
}

void clear_saturations() {
    const std::lock_guard<std::mutex> hold(g_lock);
    g_counts.clear();
}

unsigned long long report_saturations(std::FILE *out, bool by_site) {
    const std::lock_guard<std::mutex> hold(g_lock);
    std::map<std::string, unsigned long long> rows;
    std::map<std::string, unsigned long long> per_op;
    unsigned long long total = 0;
    for (const auto &[key, n] : g_counts) {
        const auto &[function, op, file, line] = key;
        std::string row = function + "  " + op;
        if (by_site) row += "  " + file + ":" + std::to_string(line);
        rows[row] += n;
        per_op[op] += n;
        total += n;
    }
    std::vector<std::pair<unsigned long long, std::string>> sorted;
    for (const auto &[row, n] : rows) sorted.emplace_back(n, row);
    std::sort(sorted.begin(), sorted.end(), [](const auto &a, const auto &b) { return a.first > b.first; });
    std::fprintf(out, "%14s  %s\n", "saturations", by_site ? "function  operator  site" : "function  operator");
    for (const auto &[n, row] : sorted) std::fprintf(out, "%14llu  %s\n", n, row.c_str());
    std::fprintf(out, "\n%14s  operator\n", "saturations");
    for (const auto &[op, n] : per_op) std::fprintf(out, "%14llu  %s\n", n, op.c_str());
    std::fprintf(out, "%14llu  in all\n", total);
    return total;
}

}  // namespace vamrnb

#endif
