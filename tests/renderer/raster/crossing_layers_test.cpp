#include <gtest/gtest.h>

#include "raster_test_support.h"

namespace {

using raster_test::FilledWorld;
using raster_test::Frame;
using raster_test::Opaque;
using renderer_test::Translation;
using renderer_test::Turned;

constexpr int32_t kWidth = 64, kHeight = 48;

template <class P>
class CrossingLayers : public ::testing::Test {};
TYPED_TEST_SUITE(CrossingLayers, renderer_test::PixelTypes);

// A 50 % red card over white, blended in linear light, with a second card behind it (drawn
// straight, one after the other) and, a frame later, turned to pass through it (drawn through
// a fragment buffer): where the second card is not, the red card's pixels stay as they were.
TYPED_TEST(CrossingLayers, ColorHoldsWhenAnIntersectionStarts) {
    using P = TypeParam;
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    auto red = FilledWorld<P>(40, 40, Opaque<P>(255, 0, 0));
    auto blue = FilledWorld<P>(8, 40, Opaque<P>(0, 0, 255));
    PF_WorldX<P> before(kWidth, kHeight), during(kWidth, kHeight);
    for (PF_WorldX<P>* world : {&before, &during}) {
        Frame frame(kWidth, kHeight, 2);
        frame.scene.colorSettings = &gamma;
        SY_LayerDesc& card = frame.Layer(0, red.get(), Translation(4, 4, 0));
        card.material.opacity = 0.5;
        card.material.bestQuality = true;
        const bool crossing = world == &during;
        frame.Layer(1, blue.get(), Turned(4, 20, 0, crossing ? 1.2 : 0, 24, 24, crossing ? 2 : 10))
            .material.bestQuality = true;
        for (int32_t y = 0; y < kHeight; ++y)
            std::fill_n(world->Row(y), kWidth, Opaque<P>(255, 255, 255));
        frame.Render(world);
    }
    const P& alone = before.At(8, 24);
    EXPECT_GT(alone.green, 0.7f * PF_PixelTraits<P>::kMax) << "half the light, not half the code";
    EXPECT_EQ(renderer_test::Channels(during.At(8, 24)), renderer_test::Channels(alone));
}

}  // namespace
