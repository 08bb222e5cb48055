#include <gtest/gtest.h>

#include <algorithm>

#include "host/lib/pixel_test_support.h"
#include "pf_tables.h"
#include "u_memory.h"

namespace {

using pixel_test::BoxAverage;
using pixel_test::ExpectChannels;
using pixel_test::Step;

template <class P>
class SummedAreaTables : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(SummedAreaTables, PixelTypes);

TYPED_TEST(SummedAreaTables, BoxesEqualBruteForce) {
    using P = TypeParam;
    PF_WorldX<P> world(23, 17);
    pixel_test::FillRandom(world, 5);
    // The last two are empty, and clear.
    const float boxes[][4] = {{0, 0, 23, 17},
                              {3, 4, 9, 5},
                              {5, 5, 6, 6},
                              {-4, -2, 3, 8},
                              {20, 10, 30, 25},
                              {2.25f, 3.5f, 11.75f, 9.1f},
                              {7.3f, 7.3f, 7.6f, 7.9f},
                              {-1.5f, 15.5f, 4.5f, 18.25f},
                              {3, 1, 2, 2},
                              {2, 2, 2, 3}};
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-4 : 1.01 * Step<P>();
    for (bool doubleSums : {false, true}) {
        PF_SummedAreaTable table(world, doubleSums);
        ASSERT_EQ(table.HasDoubleSums(), doubleSums);
        // Both sampling entries on either kind of sums.
        auto check = [&](const auto* sums) {
            for (const auto& [x0, y0, x1, y1] : boxes) {
                SCOPED_TRACE(testing::Message() << (doubleSums ? "double" : "float") << " box "
                                                << x0 << "," << y0 << " to " << x1 << "," << y1);
                P aa, draft;
                PF_SummedAreaTable_SampleAA(table.Width(), table.Height(), sums, x0, y0, x1, y1,
                                            &aa);
                ExpectChannels(aa, BoxAverage(world, x0, y0, x1, y1), tolerance, "AA");
                // The draft box is the integer box around it.
                int32_t ix0 = int32_t(std::floor(x0)), iy0 = int32_t(std::floor(y0));
                int32_t ix1 = int32_t(std::ceil(x1)), iy1 = int32_t(std::ceil(y1));
                PF_SummedAreaTable_SampleDraft(table.Width(), table.Height(), sums, ix0, iy0, ix1,
                                               iy1, &draft);
                ExpectChannels(draft, BoxAverage(world, ix0, iy0, ix1, iy1), tolerance, "draft");
            }
        };
        if (doubleSums)
            check(table.DoubleSums());
        else
            check(table.FloatSums());
    }
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
// full scale; saturation pushes channels away from the luminosity; exposure comes first, in
// stops; float colour above 1 is clipped unless kept. Sums are premultiplied.
TEST(HorizontalSumTable, ExposureHighlightsAndRange) {
    struct Case {
        const char* what;
        PF_PixelFloat pixel;
        double exposure, gain, threshold, saturation;
        bool keep;
        double red, green;
    };
    // Saturation: luminosity 0.3 + 0.295 + 0.055 = 0.65, ramp 0.65, spread 1.65 about 0.65: red
    // 0.65 + 0.35 × 1.65 = 1.2275, green 0.65 − 0.15 × 1.65 = 0.4025.
    const Case kCases[] = {
        {"luminosity 1: full boost", {1, 1, 1, 1}, 0, 1, 0.5, 0, false, 2.0, 2.0},
        {"halfway: half boost", {1, 0.75f, 0.75f, 0.75f}, 0, 1, 0.5, 0, false, 1.125, 1.125},
        {"below the threshold", {0.5f, 0.4f, 0.4f, 0.4f}, 0, 1, 0.5, 0, false, 0.2, 0.2},
        {"saturation", {1, 1, 0.5f, 0.5f}, 0, 0, 0, 1, false, 1.2275, 0.4025},
        {"one stop", {0.5f, 0.4f, 0.4f, 0.4f}, 1, 0, 0, 0, false, 0.4, 0.4},
        {"clipped", {0.5f, 3, 0.4f, 0.4f}, 0, 0, 0, 0, false, 0.5, 0.2},
        {"kept", {0.5f, 3, 0.4f, 0.4f}, 0, 0, 0, 0, true, 1.5, 0.2},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.what);
        PF_WorldX<PF_PixelFloat> world(1, 1);
        world.At(0, 0) = c.pixel;
        PF_HorizontalSumTable<PF_PixelFloat> table(world, 0, 0, c.exposure, c.gain, c.threshold,
                                                   c.saturation, 1, 0, false, nullptr, c.keep);
        EXPECT_NEAR(table.SegmentSum(0, 0, 1).red, c.red, 1e-6);
        EXPECT_NEAR(table.SegmentSum(0, 0, 1).green, c.green, 1e-6);
    }
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
