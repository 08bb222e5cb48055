#include "renderer/scene/renderable_list.h"

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "tests/renderer/renderer_test_support.h"

namespace {

using namespace renderer_test;

TEST(RenderableList, KeepsTheLayersThatAreDrawnInRenderOrder) {
    struct Case {
        double opacity;
        bool renders, wireframe;
        M_Matrix4 placement;
        bool kept;
    };
    // 20 × 20 layers on the zoom plane of the default camera of a 400 × 300 output; one seen
    // edge-on and one behind the camera are dropped by their set-up.
    const Case kCases[] = {
        {1, true, false, Translation(50, 40, 0), true},
        {0, true, false, Translation(50, 40, 0), false},
        {1, false, false, Translation(50, 40, 0), false},
        {0.5, false, true, Translation(50, 40, 0), true},  // outlined only
        {1, true, false, Turned(10, 10, 0, M_PI / 2, 200, 150, 0), false},
        {1, true, false, Translation(50, 40, -800), false},
    };
    std::vector<SY_LayerDesc> layers(std::size(kCases));
    std::vector<int32_t> expected;
    for (int32_t i = 0; i < static_cast<int32_t>(layers.size()); ++i) {
        const Case& c = kCases[i];
        SY_LayerDesc& layer = layers[static_cast<size_t>(i)];
        layer.material.renderIndex = layer.material.depthIndex = i;
        layer.material.opacity = c.opacity;
        layer.material.renders = c.renders;
        layer.material.wireframe = c.wireframe;
        SetRect(&layer, 0, 0, 20, 20);
        SetPlacements(&layer, {c.placement});
        if (c.kept) expected.push_back(i);
    }
    M_Matrix4 camera = DefaultCamera(400, 300, 400, true);
    SY_RenderableSources sources;
    sources.layers = layers.data();
    sources.layerCount = static_cast<int32_t>(layers.size());
    sources.motionCamera = sources.frameCamera = {&camera, 1, true};
    sources.outputWidth = 400;
    sources.outputHeight = 300;

    SY_Renderables renderables;
    SY_BuildRenderables(sources, &renderables);
    std::vector<int32_t> kept;
    for (const SY_TRLayer& r : renderables) {
        kept.push_back(r.material.renderIndex);
        // Coplanar layers step 1e-7 farther per depth index, so that the stack keeps its order.
        EXPECT_NEAR(r.subsamples[0].vertices[0].z, 1 - 1e-7 * r.material.renderIndex, 1e-12);
    }
    EXPECT_EQ(kept, expected);
}

}  // namespace
