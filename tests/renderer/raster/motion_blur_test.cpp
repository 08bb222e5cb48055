#include <gtest/gtest.h>

#include "raster_test_support.h"

namespace {

using raster_test::Frame;
using raster_test::Opaque;
using renderer_test::Translation;

template <class P>
class MotionBlur : public ::testing::Test {};
TYPED_TEST_SUITE(MotionBlur, renderer_test::PixelTypes);

// A still red card at z = 0 and a green one, larger than the frame, that moves from 20 behind
// it to 20 in front over the shutter, whatever the number of samples. The depth key, the
// reciprocal of the distance 400 + z, is taken to move evenly between its values at shutter
// open and close, so the cards are seen to meet where it passes 1 / 400: at t = 0.475.
TYPED_TEST(MotionBlur, ACardPassingThroughAnotherShowsForTheTimeItIsInFront) {
    using P = TypeParam;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    auto red = raster_test::FilledWorld<P>(16, 8, Opaque<P>(255, 0, 0));
    auto green = raster_test::FilledWorld<P>(64, 48, Opaque<P>(0, 255, 0));
    const double greenShare = 1 - (1 / 400.0 - 1 / 420.0) / (1 / 380.0 - 1 / 420.0);
    for (int32_t samples : {2, 16, 64}) {
        Frame frame(16, 8, 2);
        frame.Layer(0, red.get(), Translation(0, 0, 0)).material.bestQuality = true;
        SY_LayerDesc& moving = frame.Layer(1, green.get(), Translation(-24, -20, 20));
        moving.placements.Allocate(samples);
        for (int32_t i = 0; i < samples; ++i)
            moving.placements[i] = Translation(-24, -20, 20 - 40.0 * i / (samples - 1));
        moving.material.motionBlur = moving.material.bestQuality = true;
        PF_WorldX<P> destination(16, 8);
        frame.Render(&destination);
        EXPECT_NEAR(destination.At(8, 4).red, (1 - greenShare) * kMax, 0.01 * kMax) << samples;
        EXPECT_NEAR(destination.At(8, 4).green, greenShare * kMax, 0.01 * kMax) << samples;
    }
}

}  // namespace
