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

}  // namespace
}  // namespace ostrel
