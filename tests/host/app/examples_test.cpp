#include <gtest/gtest.h>

#include <filesystem>
#include <tuple>
#include <vector>

#include "composition/composition_loader.h"
#include "composition/image_cache.h"
#include "composition/render_order.h"
#include "composition/transform.h"

namespace ostrel {
namespace {

const std::filesystem::path kExamples =
    std::filesystem::path(__FILE__).parent_path() / ".." / ".." / ".." / "examples";

TEST(Examples, CardsInPerspectiveLoadAndDeliverTheirImages) {
    Composition comp = LoadComposition(kExamples / "cards" / "cards.json");
    EXPECT_EQ(comp.width, 960);
    EXPECT_EQ(ActiveCamera(comp, 0.0), 0);
    // Disc, grid and floor, top to bottom; the lights and the camera are not rendered.
    EXPECT_EQ(RenderOrder(comp, 1.0), (std::vector<int32_t>{3, 4, 5}));
    ImageCache cache;
    for (int32_t index : RenderOrder(comp, 0.0)) {
        auto world =
            LayerSource(cache, comp.layers[static_cast<size_t>(index)], comp.bitDepth, 1, 1);
        M_LRect bounds = SourceBounds(comp.layers[static_cast<size_t>(index)]);
        EXPECT_EQ(std::tuple(world->width, world->height), std::tuple(bounds.right, bounds.bottom));
    }
    EXPECT_EQ(cache.Count(), 2u);
}

TEST(Examples, EveryExampleLoadsAndHandsTheRendererItsLayers) {
    struct Case {
        const char* file;
        size_t layers;  // rendered at the first frame
    };
    for (const Case& c :
         {Case{"cards/cards.json", 3}, Case{"intersecting/intersecting.json", 3},
          Case{"camera-move/camera-move.json", 3}, Case{"backdrop/backdrop.json", 3}}) {
        SCOPED_TRACE(c.file);
        Composition comp = LoadComposition(kExamples / c.file);
        EXPECT_EQ(RenderOrder(comp, 0.0).size(), c.layers);
        EXPECT_GE(ActiveCamera(comp, 0.0), 0);
    }
}

}  // namespace
}  // namespace ostrel
