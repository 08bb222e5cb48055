#include "matte_conversion.h"

#include <gtest/gtest.h>

#include "entry_guard.h"
#include "pf_world.h"
#include "plugin_test_support.h"
#include "track_matte_fetcher.h"

namespace {

using ormond_test::FakeHost;

// One pixel converted in a 1×1 world of its depth; returns the new alpha.
template <class P>
auto ConvertOne(P pixel, ORM_MatteType type) {
    PF_WorldX<P> world(1, 1);
    world.At(0, 0) = pixel;
    ORM_ConvertMatteWorld(world, type);
    EXPECT_EQ(world.At(0, 0).red, pixel.red);  // colour is left as it was
    return world.At(0, 0).alpha;
}

TEST(MatteConversion, WhiteOpaqueAtEachDepth) {
    struct Case {
        ORM_MatteType type;
        bool shows;  // full alpha, or none
    };
    for (const Case& c : {Case{ORM_MatteType::kAlpha, true},
                          {ORM_MatteType::kInvertedAlpha, false},
                          {ORM_MatteType::kLuma, true},
                          {ORM_MatteType::kInvertedLuma, false}}) {
        SCOPED_TRACE(static_cast<int>(c.type));
        EXPECT_EQ(ConvertOne(PF_Pixel8{255, 255, 255, 255}, c.type), c.shows ? 255 : 0);
        EXPECT_EQ(ConvertOne(PF_Pixel16{32768, 32768, 32768, 32768}, c.type), c.shows ? 32768 : 0);
        EXPECT_FLOAT_EQ(ConvertOne(PF_PixelFloat{1, 1, 1, 1}, c.type), c.shows ? 1 : 0);
    }
}

// The channel weights show in the luma matte of the examples' references; the rounding of a
// partly clear pixel and the float clamps do not.
TEST(MatteConversion, LumaTruncatesAndFloatClampsToTheUnitRange) {
    // Half alpha: (16384 × 19235 + 16383) / 32768 = 9617.99…, truncated.
    EXPECT_EQ(ConvertOne(PF_Pixel16{16384, 0, 32768, 0}, ORM_MatteType::kLuma), 9617);
    EXPECT_FLOAT_EQ(ConvertOne(PF_PixelFloat{0.5f, 0, 0, 1}, ORM_MatteType::kLuma), 0.057f);
    // A float product below 1e-16 is exactly no matte; above 1 it is full.
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1e-9f, 1e-9f, 1e-9f, 1e-9f}, ORM_MatteType::kLuma), 0.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1e-9f, 1e-9f, 1e-9f, 1e-9f}, ORM_MatteType::kInvertedLuma),
              1.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, -1, -1, -1}, ORM_MatteType::kLuma), 0.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, 2, 2, 2}, ORM_MatteType::kLuma), 1.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, 2, 2, 2}, ORM_MatteType::kInvertedLuma), 0.0f);
}

TEST(MatteConversion, UnexpectedDepthIsReportedAndThrowsThree) {
    uint8_t pixels[8] = {};
    PF_World world(1, 1, 8, 64, pixels);
    FakeHost host;
    EXPECT_EQ(ORM_Guard([&] { ORM_ConvertMatteWorld(world, ORM_MatteType::kLuma); }), 3);
    EXPECT_EQ(host.Reports().size(), 1u);
}

}  // namespace
