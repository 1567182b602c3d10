// The exported frame tables against the values the storage format fixes,
// written out here as literals: a wrong entry cannot pass by being compared
// with itself.  Callers walk streams with these tables, so a zero where a
// size belongs turns into an endless loop in someone else's reader.
#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <vector>

#include "format/frame_tables.h"
#include "vamrnb_tables.h"

namespace {

template <class T, size_t N>
std::vector<int> row(const T (&table)[N]) {
    return std::vector<int>(table, table + N);
}

std::vector<int> row(const int16_t *p, size_t n) { return std::vector<int>(p, p + n); }

}  // namespace

TEST(FrameTables, SizesByFrameType) {
    EXPECT_EQ(row(vamrnb_tbl_toc_byte),
              (std::vector<int>{0x04, 0x0C, 0x14, 0x1C, 0x24, 0x2C, 0x34, 0x3C, 0x44, 0x4C, 0x54, 0x5C, 0x64,
                                0x6C, 0x74, 0x7C}));
    EXPECT_EQ(row(vamrnb_tbl_unpacked_size),
              (std::vector<int>{95, 103, 118, 134, 148, 159, 204, 244, 35, 43, 38, 37, 0, 0, 0, 0}));
    EXPECT_EQ(row(vamrnb_tbl_packed_size),
              (std::vector<int>{13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 0, 0, 0, 1}));
    EXPECT_EQ(row(vamrnb_tbl_unused_size), (std::vector<int>{1, 1, 2, 2, 4, 1, 4, 4, 1, 5, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(row(vamrnb_tbl_packed_size_IF2),
              (std::vector<int>{12, 13, 15, 17, 18, 20, 25, 30, 5, 0, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(row(vamrnb_tbl_unused_size_IF2), (std::vector<int>{5, 5, 6, 6, 0, 5, 0, 0, 5, 1, 6, 7, 0, 0, 0, 4}));

    // For the AMR types the three storage-format tables agree with each
    // other: one table-of-contents byte, the class bits (plus STI and mode
    // indication for SID), then the padding.  (Types 10 and 11 keep their
    // listed values, which do not add up this way; the decoder refuses them.)
    for (int ft = 0; ft <= 9; ++ft) {
        const int bits = vamrnb_tbl_unpacked_size[ft] + (ft == 8 ? 4 : 0);
        EXPECT_EQ(8 * (vamrnb_tbl_packed_size[ft] - 1), bits + vamrnb_tbl_unused_size[ft]) << ft;
    }
}

TEST(FrameTables, ParameterCountsAndWidths) {
    EXPECT_EQ(row(vamrnb_tbl_prmno), (std::vector<int>{17, 19, 19, 19, 19, 23, 39, 57, 5, 0}));
    EXPECT_EQ(row(vamrnb_tbl_prmnofsf), (std::vector<int>{7, 7, 7, 7, 7, 8, 12, 18, 0}));

    const std::vector<std::vector<int>> widths = {
        {8, 8, 7, 8, 7, 2, 8, 4, 7, 2, 4, 7, 2, 8, 4, 7, 2},
        {8, 8, 7, 8, 7, 2, 6, 4, 7, 2, 6, 4, 7, 2, 6, 4, 7, 2, 6},
        {8, 9, 9, 8, 9, 2, 6, 4, 9, 2, 6, 8, 9, 2, 6, 4, 9, 2, 6},
        {8, 9, 9, 8, 11, 3, 7, 4, 11, 3, 7, 8, 11, 3, 7, 4, 11, 3, 7},
        {8, 9, 9, 8, 13, 4, 7, 5, 13, 4, 7, 8, 13, 4, 7, 5, 13, 4, 7},
        {9, 9, 9, 8, 13, 4, 4, 5, 6, 13, 4, 4, 5, 8, 13, 4, 4, 5, 6, 13, 4, 4, 5},
        {8, 9, 9, 8, 1, 1, 1, 1, 10, 10, 7, 7, 5, 1, 1, 1, 1, 10, 10, 7, 7, 8, 1, 1, 1, 1, 10, 10, 7, 7, 5, 1, 1,
         1, 1, 10, 10, 7, 7},
        {7, 8, 9, 8, 6, 9, 4, 4, 4, 4, 4, 4, 3, 3, 3, 3, 3, 5, 6, 4, 4, 4, 4, 4, 4, 3, 3, 3, 3, 3, 5, 9, 4, 4, 4,
         4, 4, 4, 3, 3, 3, 3, 3, 5, 6, 4, 4, 4, 4, 4, 4, 3, 3, 3, 3, 3, 5},
        {3, 8, 9, 9, 6},
    };
    const int bits[9] = {95, 103, 118, 134, 148, 159, 204, 244, 35};
    for (int m = 0; m < 9; ++m) {
        EXPECT_EQ(row(vamrnb_tbl_bitno[m], widths[m].size()), widths[m]) << "mode " << m;
        EXPECT_EQ(std::accumulate(widths[m].begin(), widths[m].end(), 0), bits[m]) << m;
    }
    EXPECT_EQ(vamrnb_tbl_bitno[9], nullptr);
}

TEST(FrameTables, BitOrderCheckRowsAndPermutations) {
    auto starts_with = [](int ft, std::vector<int> want) {
        EXPECT_EQ(row(vamrnb_tbl_sort_ptr[ft], want.size()), want) << "frame type " << ft;
    };
    starts_with(0, {0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 23, 24, 25, 26, 27, 28, 48, 49});
    starts_with(1, {7, 6, 5, 4, 3, 2, 1, 0, 15, 14, 13, 12, 11, 10, 9, 8, 23, 24, 25, 26, 27, 46, 65, 84});
    starts_with(7, {0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 23, 15, 16, 17, 18, 19, 20, 21, 22});

    // Every table sends each bit of the frame exactly once; SID is in order.
    const int bits[9] = {95, 103, 118, 134, 148, 159, 204, 244, 35};
    for (int ft = 0; ft < 9; ++ft) {
        std::vector<int> sorted = row(vamrnb_tbl_sort_ptr[ft], bits[ft]);
        if (ft == 8) {
            EXPECT_TRUE(std::is_sorted(sorted.begin(), sorted.end()));
        }
        std::sort(sorted.begin(), sorted.end());
        std::vector<int> all(bits[ft]);
        std::iota(all.begin(), all.end(), 0);
        EXPECT_EQ(sorted, all) << "frame type " << ft;
    }
    for (int ft = 9; ft < 16; ++ft) EXPECT_EQ(vamrnb_tbl_sort_ptr[ft], nullptr) << ft;
}

TEST(FrameTables, HomingFrames) {
    using vamrnb::tab::homing_frame_params;
    EXPECT_EQ(row(homing_frame_params[MR475], 17),
              (std::vector<int>{0x00F8, 0x009D, 0x001C, 0x0066, 0x0000, 0x0003, 0x0028, 0x000F, 0x0038, 0x0001,
                                0x000F, 0x0031, 0x0002, 0x0008, 0x000F, 0x0026, 0x0003}));
    std::vector<int> mr122(18, 0);
    const int head[7] = {0x0004, 0x002A, 0x00DB, 0x0096, 0x002A, 0x0156, 0x000B};
    std::copy(head, head + 7, mr122.begin());
    EXPECT_EQ(row(homing_frame_params[MR122], 18), mr122);

    // Every parameter fits its width, as a frame on the wire must.
    for (int m = 0; m < 8; ++m)
        for (int i = 0; i < vamrnb_tbl_prmno[m]; ++i)
            EXPECT_LT(homing_frame_params[m][i], 1 << vamrnb_tbl_bitno[m][i]) << m << ' ' << i;
}
