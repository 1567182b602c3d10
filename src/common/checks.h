// Argument checks of the exported entry points.  In a build with debug
// checks (VAMRNB_DEBUG_CHECKS defined, or NDEBUG not defined) a null pointer
// where the public headers forbid one stops the program with a message that
// names the function and the argument; otherwise the checks compile to
// nothing, so release builds run the same instructions as without them.
#pragma once

#if defined(VAMRNB_DEBUG_CHECKS) || !defined(NDEBUG)

#include <cstdio>
#include <cstdlib>

namespace vamrnb {

[[noreturn]] inline void null_argument(const char *function, const char *argument) {
    std::fprintf(stderr, "vamrnb: %s: argument '%s' must not be null\n", function, argument);
    std::abort();
}

}  // namespace vamrnb

// Checks one pointer argument of the enclosing exported function.
#define VAMRNB_REQUIRE(arg) \
    ((arg) != nullptr ? static_cast<void>(0) : ::vamrnb::null_argument(__func__, #arg))
// The same for a pointer that is needed only when cond holds, on behalf of
// the named exported function.
#define VAMRNB_REQUIRE_WHEN(cond, arg, function) \
    (!(cond) || (arg) != nullptr ? static_cast<void>(0) : ::vamrnb::null_argument(function, #arg))

#else

#define VAMRNB_REQUIRE(arg) static_cast<void>(0)
#define VAMRNB_REQUIRE_WHEN(cond, arg, function) static_cast<void>(0)

#endif
