#include "renderer/scene/scene_print.h"

#include <gtest/gtest.h>

namespace {

TEST(ScenePrint, RecordsReadAsTheirFields) {
    SY_SceneDesc scene;
    scene.layers.Allocate(1);
    SY_LayerDesc& layer = scene.layers[0];
    layer.right = 64, layer.bottom = 32;
    layer.material.mode = 0x85;
    layer.material.bestQuality = true;
    layer.material.engineFlag = SY_SamplingFilter::kBicubic;
    layer.lightIds = {1, 3};
    scene.lights.Allocate(1);
    scene.lights[0].type = kSY_LightSpot;
    struct Case {
        std::string text;
        const char* part;
    };
    const Case cases[] = {
        {SY_ToString(SY_SamplingFilter::kBilinear), "bilinear"},
        {SY_ToString(static_cast<SY_SamplingFilter>(7)), "filter 7"},
        {SY_ToString(layer.material), "mode=0x85 "},
        {SY_ToString(layer.material), "engineFlag=bicubic renders acceptsLights bestQuality}"},
        {SY_ToString(layer), "source=[0,0 64,32]"},
        {SY_ToString(layer), "lightIds=[1,3]}"},
        {SY_ToString(scene.lights[0]), "type=spot"},
        {SY_ToString(scene.dof), "dof{off}"},
        {SY_ToString(scene), "layers=1 lights=1}\n  layer{"},
        {SY_ToString(scene), "\n  light{"},
    };
    for (const Case& c : cases)
        EXPECT_NE(c.text.find(c.part), std::string::npos) << c.text;
}

}  // namespace
