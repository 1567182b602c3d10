#include <gtest/gtest.h>

#include "basic_op/basic_op.h"

using namespace vamrnb;

TEST(BasicOpSmoke, Shifts) {
    EXPECT_EQ(shl(1, 15), 32767);
    EXPECT_EQ(shl(-1, 15), -32768);
    EXPECT_EQ(l_shl(0x40000000, 1), 0x7fffffff);
}
