#include <gtest/gtest.h>

#include "raster_test_support.h"

namespace {

using raster_test::FilledWorld;
using raster_test::Opaque;
using renderer_test::Translation;

template <class P>
class CrossingLayers : public ::testing::Test {};
TYPED_TEST_SUITE(CrossingLayers, renderer_test::PixelTypes);

// A title card at 50 % lying on a background card (one plane 300 nearer than the plane seen
// 1:1, the title first in render order, keys equal in a float) and a third card, flat far
// behind them on one frame and on the next crossing both along the column x = 32. In the
// columns from 34 on, where the third card stays behind, nothing changes from one frame to the
// next: the title stays on top, and at best quality blends in linear light in the fragment
// buffer as it did drawn straight. The title covers 2 × 4 pixels there, 14 × 16 under
// perspective.
TYPED_TEST(CrossingLayers, NothingChangesBesideAnIntersectionThatStarts) {
    using P = TypeParam;
    constexpr int32_t kWidth = 64, kHeight = 48, kFrom = 34;
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    auto title = FilledWorld<P>(8, 4, Opaque<P>(255, 0, 0));
    auto card = FilledWorld<P>(16, 12, Opaque<P>(255, 255, 255));
    auto third = FilledWorld<P>(10, 12, Opaque<P>(0, 0, 255));
    for (bool perspective : {true, false}) {
        for (bool best : {false, true}) {
            PF_WorldX<P> before(kWidth, kHeight), during(kWidth, kHeight);
            for (PF_WorldX<P>* world : {&before, &during}) {
                raster_test::Frame frame(kWidth, kHeight, 3);
                renderer_test::SetDefaultCamera(&frame.scene, kWidth, kHeight,
                                                raster_test::kDistance, 1, perspective);
                frame.scene.colorSettings = best ? &gamma : nullptr;
                frame.Layer(0, title.get(), Translation(28, 22, -300)).material.opacity = 0.5;
                frame.Layer(1, card.get(), Translation(24, 18, -300));
                const bool crossing = world == &during;
                frame.Layer(2, third.get(),
                            renderer_test::Turned(5, 6, 0, crossing ? -0.6 : 0, 32, 24,
                                                  crossing ? -300 : -280));
                for (int32_t i = 0; i < 3; ++i)
                    frame.scene.layers[i].material.bestQuality = best;
                frame.Render(world);
            }
            int32_t titled = 0, changed = 0;
            for (int32_t y = 0; y < kHeight; ++y) {
                for (int32_t x = kFrom; x < kWidth; ++x) {
                    const P& p = before.At(x, y);
                    changed += !raster_test::Equal(p, during.At(x, y));
                    titled += p.alpha != 0 && p.green != card->At(0, 0).green;
                }
            }
            EXPECT_EQ(changed, 0) << "perspective " << perspective << " best " << best;
            EXPECT_EQ(titled, perspective ? 14 * 16 : 2 * 4);
        }
    }
}

}  // namespace
