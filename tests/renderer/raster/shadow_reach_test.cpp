#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <vector>

#include "renderer/raster/shadow_reach.h"

namespace {

using Box = SY_ShadowReach::Box;

// Runs as (row, begin, end). A texel counts where its centre (i + ½, j + ½) lies in a box and
// in the disc.
struct Case {
    const char* name;
    M_LRect rows;
    std::vector<Box> boxes;
    SY_ShadowReach::Disc disc;
    std::vector<std::array<int32_t, 3>> runs;
};

TEST(ShadowReach, RunsOfEachRow) {
    const Case cases[] = {
        // Centres 2.5, 3.5, 4.5 lie in [2, 5]; rows 0 and 1 only.
        {"box", {0, 0, 10, 3}, {{2, 0, 5, 2}}, {}, {{0, 2, 5}, {1, 2, 5}}},
        {"touching boxes join", {0, 0, 10, 1}, {{1, 0, 3, 1}, {3, 0, 6, 1}}, {}, {{0, 1, 6}}},
        {"apart", {0, 0, 10, 1}, {{6, 0, 8, 1}, {0, 0, 2, 1}}, {}, {{0, 0, 2}, {0, 6, 8}}},
        {"cut to the rows", {4, 0, 8, 1}, {{-50, -50, 50, 50}}, {}, {{0, 4, 8}}},
        // Radius 2 about (5, 5): row 3 reaches ±1.32 (centres 4.5, 5.5), row 5 ±1.94.
        {"disc",
         {0, 2, 10, 8},
         {{0, 0, 10, 10}},
         {5, 5, 2},
         {{3, 4, 6}, {4, 3, 7}, {5, 3, 7}, {6, 4, 6}}},
    };
    for (const Case& c : cases) {
        SY_AccountedVector<Box> boxes(c.boxes.begin(), c.boxes.end());
        SY_ShadowReach reach(c.rows, boxes, c.disc);
        std::vector<std::array<int32_t, 3>> runs;
        for (int32_t y = c.rows.top; y < c.rows.bottom; ++y) {
            for (const auto* r = reach.RowBegin(y); r < reach.RowEnd(y); ++r)
                runs.push_back({y, r->begin, r->end});
        }
        EXPECT_EQ(runs, c.runs) << c.name;
        // The bounds are the runs' smallest rectangle.
        M_LRect expected{c.runs[0][1], c.runs[0][0], c.runs[0][2], c.runs.back()[0] + 1};
        for (const auto& r : c.runs) {
            expected.left = std::min(expected.left, r[1]);
            expected.right = std::max(expected.right, r[2]);
        }
        const M_LRect& b = reach.Bounds();
        EXPECT_TRUE(b.left == expected.left && b.top == expected.top && b.right == expected.right &&
                    b.bottom == expected.bottom)
            << c.name;
    }
}

}  // namespace
