// 32-byte-aligned instance memory and the strided block copy (the lifecycle
// flag is checked by the C program in tests/abi).
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "common/memory.h"

TEST(Lifecycle, AlignedBlocksKeepTheHeapAddressBelow) {
    std::vector<void *> blocks;
    for (uint32_t size : {0u, 1u, 31u, 32u, 33u, 4096u, 65537u}) {
        for (int rep = 0; rep < 8; ++rep) {
            void *p = rep & 1 ? vcmn_malloc_fast_align32(size) : vcmn_malloc_align32(size);
            ASSERT_NE(p, nullptr);
            ASSERT_EQ(reinterpret_cast<uintptr_t>(p) % 32, 0u) << size;
            void *raw;
            std::memcpy(&raw, static_cast<char *>(p) - sizeof raw, sizeof raw);
            const uintptr_t gap = reinterpret_cast<uintptr_t>(p) - reinterpret_cast<uintptr_t>(raw);
            ASSERT_GE(gap, sizeof raw);       // 4..35 with 4-byte pointers
            ASSERT_LE(gap, 31 + sizeof raw);
            std::memset(p, 0xAB, size);  // the whole size is usable
            blocks.push_back(p);
        }
    }
    for (size_t i = 0; i < blocks.size(); ++i) (i & 1 ? vcmn_mfree_fast_align32 : vcmn_mfree_align32)(blocks[i]);
    vcmn_mfree_align32(nullptr);
}

TEST(Lifecycle, StridedBlockCopy) {
    std::vector<uint8_t> src(13 * 24), dst(13 * 20, 0xEE);
    for (size_t i = 0; i < src.size(); ++i) src[i] = uint8_t(i * 7 + 3);
    vcmn_blk_mcpy(dst.data(), src.data(), 20, 24, 11, 0);
    vcmn_blk_mcpy(dst.data(), src.data(), 20, 24, 11, -4);
    for (uint8_t b : dst) ASSERT_EQ(b, 0xEE);

    vcmn_blk_mcpy(dst.data(), src.data(), 20, 24, 11, 13);  // a group of eight and five more
    for (int r = 0; r < 13; ++r)
        for (int c = 0; c < 20; ++c) ASSERT_EQ(dst[r * 20 + c], c < 11 ? src[r * 24 + c] : 0xEE) << r << " " << c;

    std::vector<uint8_t> up(9 * 8, 0);  // a negative stride walks upwards
    vcmn_blk_mcpy(up.data() + 8 * 8, src.data(), -8, 24, 8, 9);
    for (int r = 0; r < 9; ++r) ASSERT_EQ(std::memcmp(&up[(8 - r) * 8], &src[r * 24], 8), 0) << r;
}
