#include <gtest/gtest.h>

#include <algorithm>
#include <string>

#include "host/lib/pixel_test_support.h"
#include "pf_tables.h"
#include "u_memory.h"

namespace {

using pixel_test::BoxAverage;
using pixel_test::ExpectChannels;
using pixel_test::Step;
using pixel_test::Unit;

template <class P>
class SummedAreaTables : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(SummedAreaTables, PixelTypes);

TYPED_TEST(SummedAreaTables, BoxesEqualBruteForce) {
    using P = TypeParam;
    PF_WorldX<P> world(23, 17);
    pixel_test::FillRandom(world, 5);
    struct Box {
        float x0, y0, x1, y1;
    };
    const Box boxes[] = {{0, 0, 23, 17},
                         {3, 4, 9, 5},
                         {5, 5, 6, 6},
                         {-4, -2, 3, 8},
                         {20, 10, 30, 25},
                         {2.25f, 3.5f, 11.75f, 9.1f},
                         {7.3f, 7.3f, 7.6f, 7.9f},
                         {-1.5f, 15.5f, 4.5f, 18.25f}};
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-4 : 1.01 * Step<P>();
    for (bool doubleSums : {false, true}) {
        PF_SummedAreaTable table(world, doubleSums);
        ASSERT_EQ(table.HasDoubleSums(), doubleSums);
        // Both sampling entries on either kind of sums.
        auto sample = [&](auto&& entry, auto x0, auto y0, auto x1, auto y1) {
            P out;
            if (doubleSums) {
                entry(table.Width(), table.Height(), table.DoubleSums(), x0, y0, x1, y1, &out);
            } else {
                entry(table.Width(), table.Height(), table.FloatSums(), x0, y0, x1, y1, &out);
            }
            return out;
        };
        auto aa = [](auto... a) { PF_SummedAreaTable_SampleAA(a...); };
        auto draft = [](auto... a) { PF_SummedAreaTable_SampleDraft(a...); };
        for (const Box& b : boxes) {
            std::string what = std::string(doubleSums ? "double" : "float") + " box " +
                               std::to_string(b.x0) + "," + std::to_string(b.y0) + " to " +
                               std::to_string(b.x1) + "," + std::to_string(b.y1);
            ExpectChannels(sample(aa, b.x0, b.y0, b.x1, b.y1),
                           BoxAverage(world, b.x0, b.y0, b.x1, b.y1), tolerance, "AA " + what);
            // The draft box is the integer box around it.
            int32_t x0 = int32_t(std::floor(b.x0)), y0 = int32_t(std::floor(b.y0));
            int32_t x1 = int32_t(std::ceil(b.x1)), y1 = int32_t(std::ceil(b.y1));
            ExpectChannels(sample(draft, x0, y0, x1, y1), BoxAverage(world, x0, y0, x1, y1),
                           tolerance, "draft " + what);
        }
    }
}

TEST(SummedAreaTable, EmptyBoxesAreTransparent) {
    PF_WorldX<PF_Pixel8> world(4, 4);
    pixel_test::FillRandom(world, 1, false);
    PF_SummedAreaTable table(world, true);
    PF_Pixel8 out = {1, 2, 3, 4};
    PF_SummedAreaTable_SampleDraft(4, 4, table.DoubleSums(), 2, 2, 2, 3, &out);
    EXPECT_EQ(out.alpha + out.red + out.green + out.blue, 0);
    out = {1, 2, 3, 4};
    PF_SummedAreaTable_SampleAA(4, 4, table.DoubleSums(), 3.0f, 1.0f, 2.0f, 2.0f, &out);
    EXPECT_EQ(out.alpha + out.red + out.green + out.blue, 0);
}

TEST(SummedAreaTable, MemoryIsAccountedAndReturned) {
    PF_WorldX<PF_PixelFloat> world(10, 6);
    int64_t withWorld = U_AccountedBytes();
    {
        auto* table = new PF_SummedAreaTable(world, true);
        EXPECT_EQ(U_AccountedBytes() - withWorld,
                  int64_t(11 * 7 * sizeof(PF_PixelDouble) + sizeof(PF_SummedAreaTable)));
        delete table;
    }
    U_FailAllocationAfter(1);
    EXPECT_THROW(PF_SummedAreaTable(world, false), std::bad_alloc);
    U_FailAllocationAfter(1);
    EXPECT_THROW(PF_HorizontalSumTable<PF_PixelFloat>(world, 0, 0, 0.0, 0, 0, 0, 1, 0, false,
                                                      nullptr, false),
                 std::bad_alloc);
    EXPECT_EQ(U_AccountedBytes(), withWorld);
}

template <class P>
class HorizontalSumTables : public ::testing::Test {};
TYPED_TEST_SUITE(HorizontalSumTables, PixelTypes);

TYPED_TEST(HorizontalSumTables, SegmentsSumTheirPixels) {
    using P = TypeParam;
    PF_WorldX<P> world(19, 5);
    pixel_test::FillRandom(world, 9);
    // The world sits at (100, 50) in the caller's coordinates.
    PF_HorizontalSumTable<P> table(world, 100, 50, 0.0, 0, 0, 0, 1.5, 30, false, nullptr, false);
    // Premultiplied sums over [x0, x1) of the row, none outside the world.
    struct Segment {
        int32_t y, x0, x1;
    };
    for (Segment s :
         {Segment{50, 100, 119}, Segment{52, 103, 104}, Segment{54, 90, 105}, Segment{51, 115, 200},
          Segment{53, 110, 110}, Segment{49, 100, 119}, Segment{55, 100, 119}}) {
        double width = std::max(s.x1 - s.x0, 1);
        auto box = BoxAverage(world, s.x0 - 100, s.y - 50, s.x0 - 100 + width, s.y - 49);
        PF_PixelDouble got = table.SegmentSum(s.y, s.x0, s.x1);
        double alpha = box[0] * width * (s.x1 > s.x0);
        EXPECT_NEAR(got.alpha, alpha, 1e-5) << s.y << " " << s.x0;
        EXPECT_NEAR(got.red, alpha * box[1], 1e-5) << s.y << " " << s.x0;
        EXPECT_NEAR(got.blue, alpha * box[3], 1e-5) << s.y << " " << s.x0;
    }
}

// Pixels above the threshold gain up to highlightGain, ramping in between the threshold and
// full scale; saturation pushes channels away from the luminosity.
TEST(HorizontalSumTable, HighlightsAreBoosted) {
    PF_WorldX<PF_PixelFloat> world(3, 1);
    world.At(0, 0) = {1, 1, 1, 1};              // luminosity 1: full boost
    world.At(1, 0) = {1, 0.75f, 0.75f, 0.75f};  // halfway between 0.5 and 1: half boost
    world.At(2, 0) = {0.5f, 0.4f, 0.4f, 0.4f};  // below the threshold: as it is
    PF_HorizontalSumTable<PF_PixelFloat> table(world, 0, 0, 0.0, 1.0, 0.5, 0.0, 1, 0, false,
                                               nullptr, false);
    EXPECT_NEAR(table.SegmentSum(0, 0, 1).red, 2.0, 1e-6);
    EXPECT_NEAR(table.SegmentSum(0, 1, 2).red, 0.75 * 1.5, 1e-6);
    EXPECT_NEAR(table.SegmentSum(0, 2, 3).red, 0.5 * 0.4, 1e-6);
    EXPECT_NEAR(table.SegmentSum(0, 2, 3).alpha, 0.5, 1e-6);

    PF_WorldX<PF_PixelFloat> red(1, 1);
    red.At(0, 0) = {1, 1, 0.5f, 0.5f};  // luminosity 0.3 + 0.295 + 0.055 = 0.65
    PF_HorizontalSumTable<PF_PixelFloat> saturated(red, 0, 0, 0.0, 0.0, 0.0, 1.0, 1, 0, false,
                                                   nullptr, false);
    // Ramp 0.65: spread 1.65 about 0.65.
    EXPECT_NEAR(saturated.SegmentSum(0, 0, 1).red, 0.65 + 0.35 * 1.65, 1e-6);
    EXPECT_NEAR(saturated.SegmentSum(0, 0, 1).green, 0.65 - 0.15 * 1.65, 1e-6);

    // One stop of exposure doubles colour; float colour above 1 is clipped unless kept.
    PF_HorizontalSumTable<PF_PixelFloat> exposed(world, 0, 0, 1.0, 0, 0, 0, 1, 0, false, nullptr,
                                                 false);
    EXPECT_NEAR(exposed.SegmentSum(0, 2, 3).red, 0.5 * 0.8, 1e-6);
    world.At(2, 0).red = 3.0f;
    PF_HorizontalSumTable<PF_PixelFloat> clipped(world, 0, 0, 0.0, 0, 0, 0, 1, 0, false, nullptr,
                                                 false);
    PF_HorizontalSumTable<PF_PixelFloat> kept(world, 0, 0, 0.0, 0, 0, 0, 1, 0, false, nullptr,
                                              true);
    EXPECT_NEAR(clipped.SegmentSum(0, 2, 3).red, 0.5, 1e-6);
    EXPECT_NEAR(kept.SegmentSum(0, 2, 3).red, 1.5, 1e-6);
}

TEST(HorizontalSumTable, LinearLightUsesTheTablesExponent) {
    PF_LinearBlendingTables t;
    PF_BuildLinearBlendingTablesGamma(2.0f, &t);
    PF_WorldX<PF_Pixel8> world(1, 1);
    world.At(0, 0) = {255, 51, 0, 255};
    PF_HorizontalSumTable<PF_Pixel8> table(world, 0, 0, 0.0, 0, 0, 0, 1, 0, true, &t, false);
    EXPECT_NEAR(table.SegmentSum(0, 0, 1).red, 0.04, 1e-6);
    EXPECT_NEAR(table.SegmentSum(0, 0, 1).blue, 1.0, 1e-6);
}

}  // namespace
