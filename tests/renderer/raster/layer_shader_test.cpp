#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "lighting_fixtures.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/renderable.h"
#include "u_memory.h"

namespace {

using namespace lighting_test;

SY_TRLayer Renderable(const SY_LayerDesc& layer,
                      std::initializer_list<const SY_LightState*> lights) {
    SY_TRLayer renderable(layer);
    renderable.lights.Allocate(static_cast<int32_t>(lights.size()));
    int32_t i = 0;
    for (const SY_LightState* light : lights)
        renderable.lights[i++] = light;
    return renderable;
}

TEST(LayerShader, FieldsFromTheMaterialAndTheFrame) {
    SY_RenderContext context;
    context.cameraPosition[0] = 1, context.cameraPosition[1] = 2, context.cameraPosition[2] = -3;
    SY_LayerDesc layer;
    layer.material.renderIndex = 4;
    layer.material.depthIndex = 4;
    layer.material.mode = 0x85;
    layer.material.opacity = 0.5;
    layer.material.ambient = 0.1, layer.material.diffuse = 0.2, layer.material.specular = 0.3;
    layer.material.lightTransmission = 0.4, layer.material.metal = 0.6;
    layer.material.acceptsShadows = 1;
    layer.material.bestQuality = true;
    SY_LightState point = Point(0, 0, -100);
    auto shader = SY_MakeLayerShader(&context, Renderable(layer, {&point}));
    EXPECT_EQ(shader->layerId, 4);
    EXPECT_EQ(shader->material.mode, 0x85);
    EXPECT_EQ(shader->material.opacity, 0.5);
    EXPECT_EQ(shader->material.ambient, 0.1);
    EXPECT_EQ(shader->material.diffuse, 0.2);
    EXPECT_EQ(shader->material.specular, 0.3);
    EXPECT_EQ(shader->material.lightTransmission, 0.4);
    EXPECT_EQ(shader->material.metal, 0.6);
    EXPECT_EQ(shader->eye[0], 1);
    EXPECT_EQ(shader->eye[2], -3);
    EXPECT_FLOAT_EQ(shader->depthOffset, -4e-7f);  // later layers lie behind
    EXPECT_EQ(shader->material.acceptsShadows, 1);
    EXPECT_EQ(shader->material.acceptsLights, 1);
    EXPECT_EQ(shader->softShadowLookup, 1);  // best quality filters its shadow edges
    ASSERT_EQ(shader->lights.Count(), 1);
    EXPECT_EQ(shader->lights[0], &point);
    EXPECT_TRUE(shader->NeedsSurfacePoint());
    ASSERT_NE(shader->specularTable, nullptr);
    EXPECT_FLOAT_EQ(shader->specularTable->exponent, 0.5 * SY_SpecularExponent(5));
}

TEST(LayerShader, WhichWorkThePixelsNeed) {
    SY_LightState ambient = Ambient(1, 1, 1);
    SY_LightState parallel = Parallel(0, 0, -1);
    SY_LightState parallelFalloff = Parallel(0, 0, -1);
    SetFalloff(&parallelFalloff, 1, 100, 10);
    SY_LightState point = Point(0, 0, -100);
    SY_LightState shadowing = Parallel(0, 0, -1);
    shadowing.shadowMap = std::make_unique<FixedShadow>(0, 0, 0);
    struct Case {
        const char* what;
        bool acceptsLights;
        uint8_t acceptsShadows;
        double specular;
        std::vector<const SY_LightState*> lights;
        bool shaded, needsPoint, table;
    };
    const Case cases[] = {
        {"no lights", true, 1, 0.5, {}, false, false, false},
        {"lights disabled", false, 0, 0.5, {&point}, false, false, false},
        {"lights disabled, shadows off", false, 0, 0.5, {&shadowing}, false, false, false},
        {"shadow-only without maps", false, 2, 0.5, {&point}, false, false, false},
        {"shadow-only with a map", false, 2, 0.5, {&point, &shadowing}, true, true, false},
        {"ambient only", true, 0, 0.5, {&ambient}, true, false, false},
        {"parallel, no highlight", true, 0, 0, {&ambient, &parallel}, true, false, false},
        {"parallel with a highlight", true, 0, 0.5, {&parallel}, true, true, true},
        {"parallel with falloff", true, 0, 0, {&parallelFalloff}, true, true, false},
        {"parallel with a shadow", true, 1, 0, {&shadowing}, true, true, false},
        {"parallel, shadows not taken", true, 0, 0, {&shadowing}, true, false, false},
        {"point", true, 0, 0, {&point}, true, true, false},
    };
    for (const Case& c : cases) {
        int64_t start = U_AccountedBytes();
        {
            SY_RenderContext context;
            SY_LayerDesc layer;
            layer.material.acceptsLights = c.acceptsLights;
            layer.material.acceptsShadows = c.acceptsShadows;
            layer.material.specular = c.specular;
            SY_TRLayer renderable(layer);
            renderable.lights.Allocate(static_cast<int32_t>(c.lights.size()));
            for (size_t i = 0; i < c.lights.size(); ++i)
                renderable.lights[static_cast<int32_t>(i)] = c.lights[i];
            auto shader = SY_MakeLayerShader(&context, renderable);
            EXPECT_EQ(shader->shaded, c.shaded) << c.what;
            EXPECT_EQ(shader->needsPoint, c.needsPoint) << c.what;
            EXPECT_EQ(shader->NeedsSurfacePoint(), c.needsPoint) << c.what;
            EXPECT_EQ(shader->specularTable != nullptr, c.table) << c.what;
            EXPECT_EQ(context.specularTables.Count(), c.table ? 1u : 0u) << c.what;
        }
        EXPECT_EQ(U_AccountedBytes(), start) << c.what;
    }
}

TEST(LayerShader, EqualShininessSharesATable) {
    SY_RenderContext context;
    SY_LightState point = Point(0, 0, -100);
    SY_LayerDesc a, b, c;
    a.material.shininess = b.material.shininess = 30;
    c.material.shininess = 60;
    auto first = SY_MakeLayerShader(&context, Renderable(a, {&point}));
    auto second = SY_MakeLayerShader(&context, Renderable(b, {&point}));
    auto third = SY_MakeLayerShader(&context, Renderable(c, {&point}));
    EXPECT_EQ(first->specularTable, second->specularTable);
    EXPECT_NE(first->specularTable, third->specularTable);
    EXPECT_EQ(context.specularTables.Count(), 2u);
}

TEST(LayerShader, ShadersAreFreed) {
    int64_t start = U_AccountedBytes();
    {
        SY_RenderContext context;
        SY_LightState point = Point(0, 0, -100);
        SY_LayerDesc layer;
        auto shader = SY_MakeLayerShader(&context, Renderable(layer, {&point, &point}));
        EXPECT_GT(U_AccountedBytes(), start);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
