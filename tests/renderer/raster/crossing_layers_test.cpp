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

// A title card lying on a background card (one plane, 300 nearer than the plane seen 1:1, the
// title first in render order) and a third card crossing both along the column x = 32: in the
// columns from 34 on, where the third card is behind, the title shows as it does without it
// (2 × 4 of its 8 × 4 texels, each 1 pixel, or 4 × 4 pixels under perspective), at either
// quality and camera, although the stack's keys are equal in a float.
TEST(CrossingLayers, TitleOnItsCardStaysOnTopWhereAThirdCardCrosses) {
    using P = PF_Pixel8;
    auto title = FilledWorld<P>(8, 4, Opaque<P>(240, 192, 64));
    auto card = FilledWorld<P>(16, 12, Opaque<P>(40, 40, 40));
    auto third = FilledWorld<P>(10, 12, Opaque<P>(0, 0, 255));
    for (bool perspective : {true, false}) {
        for (bool best : {false, true}) {
            int32_t shown[2] = {};
            for (int32_t layers : {2, 3}) {
                Frame frame(kWidth, kHeight, layers);
                renderer_test::SetDefaultCamera(&frame.scene, kWidth, kHeight,
                                                raster_test::kDistance, 1, perspective);
                frame.Layer(0, title.get(), Translation(28, 22, -300));
                frame.Layer(1, card.get(), Translation(24, 18, -300));
                if (layers == 3) frame.Layer(2, third.get(), Turned(5, 6, 0, -0.6, 32, 24, -300));
                for (int32_t i = 0; i < layers; ++i)
                    frame.scene.layers[i].material.bestQuality = best;
                PF_WorldX<P> world(kWidth, kHeight);
                frame.Render(&world);
                for (int32_t y = 0; y < kHeight; ++y) {
                    for (int32_t x = 34; x < kWidth; ++x)
                        shown[layers - 2] += raster_test::Equal(world.At(x, y), title->At(0, 0));
                }
            }
            EXPECT_EQ(shown[1], shown[0]) << "perspective " << perspective << " best " << best;
            EXPECT_EQ(shown[0], perspective ? 14 * 16 : 2 * 4);
        }
    }
}

}  // namespace
