// Exported faces of the fixed-point operators.  Each forwards to the inline
// definition in basic_op.h, so the library has exactly one definition of every
// operator.  Also holds the one piece of text the library prints: the division
// diagnostics.
#include <cstdio>

#include "basic_op/basic_op.h"

namespace vamrnb {

void div_s_report(Word32 num, Word32 den) {
    if (num > den || num < 0 || den < 0)
        std::printf("Division Error var1=%d  var2=%d\n", static_cast<int>(num), static_cast<int>(den));
    if (den == 0) std::puts("Division by 0, Fatal error ");
}

}  // namespace vamrnb
