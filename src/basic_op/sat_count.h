// The saturation-counting build (CMake option VAMRNB_COUNT_SATURATION): every
// saturating operator takes its call site as a defaulted last argument and
// records each call whose exact result left the operator's range.  The
// counts show where the codec really meets the rails, and so where a plain
// integer fast path is safe; tools/satcount prints them for a corpus run.
// In ordinary builds the site argument and the records compile to nothing.
#pragma once

#if defined(VAMRNB_COUNT_SATURATION)
#include <cstdio>
#include <source_location>
#include <type_traits>

namespace vamrnb {

// Adds one saturation of operator `op` at `site`.
void count_saturation(const char *op, const std::source_location &site);
// Prints the counts per function and operator (per line with by_site),
// largest first, and returns the total.
unsigned long long report_saturations(std::FILE *out, bool by_site);
void clear_saturations();

}  // namespace vamrnb

#define VAMRNB_SITE , const std::source_location site = std::source_location::current()
#define VAMRNB_SITE_PARAM , const std::source_location site
#define VAMRNB_SITE_ARG , site
#define VAMRNB_SATURATED(cond, op)                                              \
    do {                                                                        \
        if (!std::is_constant_evaluated() && (cond)) count_saturation(op, site); \
    } while (0)
#else
#define VAMRNB_SITE
#define VAMRNB_SITE_PARAM
#define VAMRNB_SITE_ARG
#define VAMRNB_SATURATED(cond, op) ((void)0)
#endif
