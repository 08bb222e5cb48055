#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "composition/composition_loader.h"
#include "composition/render_order.h"

namespace ostrel {
namespace {

Composition Parse(const std::string& layers) {
    return ParseComposition(
        R"({"width": 100, "height": 100, "duration": 3, "layers": [)" + layers + "]}",
        "render_order_test.json");
}

TEST(RenderOrder, ActiveThreeDLayersWithPixelsFromTopToBottom) {
    Composition comp = Parse(R"(
        {"name": "camera", "kind": "camera"},
        {"name": "top", "kind": "solid", "threeD": true, "source": {"color": [1, 1, 1]}},
        {"name": "flat", "kind": "solid", "source": {"color": [1, 1, 1]}},
        {"name": "off", "kind": "solid", "threeD": true, "on": false, "source": {"color": [1, 1, 1]}},
        {"name": "later", "kind": "solid", "threeD": true, "in": 1, "out": 2, "source": {"color": [1, 1, 1]}},
        {"name": "null", "kind": "null", "threeD": true},
        {"name": "matte", "kind": "solid", "threeD": true, "source": {"color": [1, 1, 1]}},
        {"name": "matted", "kind": "solid", "threeD": true, "trackMatte": "luma", "source": {"color": [1, 1, 1]}},
        {"name": "light", "kind": "light"})");
    EXPECT_EQ(RenderOrder(comp, 0.0), (std::vector<int32_t>{1, 7}));
    EXPECT_EQ(RenderOrder(comp, 1.0), (std::vector<int32_t>{1, 4, 7}));
    // The out time is the first moment the layer no longer shows.
    EXPECT_EQ(RenderOrder(comp, 2.0), (std::vector<int32_t>{1, 7}));
    EXPECT_EQ(comp.layers[7].matteLayer, 6);
}

TEST(RenderOrder, SourceBoundsAreTheLayerPixels) {
    Composition comp = Parse(R"(
        {"kind": "solid", "source": {"color": [1, 1, 1], "width": 40, "height": 30}},
        {"kind": "solid", "source": {"color": [1, 1, 1]}},
        {"kind": "null"})");
    struct Case {
        size_t layer;
        M_LRect expected;
    };
    const Case cases[] = {{0, {0, 0, 40, 30}}, {1, {0, 0, 100, 100}}, {2, {0, 0, 0, 0}}};
    for (const Case& c : cases) {
        M_LRect bounds = SourceBounds(comp.layers[c.layer]);
        EXPECT_EQ(bounds.left, c.expected.left);
        EXPECT_EQ(bounds.top, c.expected.top);
        EXPECT_EQ(bounds.right, c.expected.right);
        EXPECT_EQ(bounds.bottom, c.expected.bottom);
    }
}

}  // namespace
}  // namespace ostrel
