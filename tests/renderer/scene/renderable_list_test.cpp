#include "renderer/scene/renderable_list.h"

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "renderer/scene/light_state.h"
#include "renderer/scene/scene_print.h"
#include "tests/renderer/scene/scene_fixtures.h"
#include "u_memory.h"

namespace {

using namespace scene_test;

constexpr double kWidth = 400, kHeight = 300, kDistance = 400;

// A scene of layers with one frame camera and a two-sample motion camera whose second sample
// sees everything 10 pixels further right.
class RenderableList : public ::testing::Test {
protected:
    RenderableList() {
        frame_ = DefaultCamera(kWidth, kHeight, kDistance, true);
        motion_[0] = frame_;
        motion_[1] = frame_;
        M_TranslateMatrix4(10, 0, 0, &motion_[1]);
    }

    // A 20 × 20 layer at (x, 40) on the zoom plane.
    SY_LayerDesc& AddLayer(double x) {
        layers_.emplace_back();
        SY_LayerDesc& layer = layers_.back();
        layer.material.renderIndex = layer.material.depthIndex =
            static_cast<int32_t>(layers_.size()) - 1;
        SetRect(&layer, 0, 0, 20, 20);
        SetPlacements(&layer, {Translation(x, 40, 0)});
        return layer;
    }

    SY_RenderableSources Sources() const {
        SY_RenderableSources sources;
        sources.layers = layers_.data();
        sources.layerCount = static_cast<int32_t>(layers_.size());
        sources.motionCamera = {motion_, 2, true};
        sources.frameCamera = {&frame_, 1, true};
        sources.outputWidth = static_cast<int32_t>(kWidth);
        sources.outputHeight = static_cast<int32_t>(kHeight);
        sources.lightStates = lights_.data();
        sources.lightCount = static_cast<int32_t>(lights_.size());
        return sources;
    }

    M_Matrix4 frame_;
    M_Matrix4 motion_[2];
    std::vector<SY_LayerDesc> layers_;
    std::vector<SY_LightState> lights_;
};

TEST_F(RenderableList, KeepsTheLayersThatAreDrawnInRenderOrder) {
    struct Case {
        const char* name;
        double opacity;
        bool renders, wireframe;
        bool kept;
    };
    const Case cases[] = {
        {"drawn", 1, true, false, true},
        {"opacity 0", 0, true, false, false},
        {"neither drawn nor outlined", 1, false, false, false},
        {"wireframe only", 0.5, false, true, true},
    };
    std::vector<int32_t> expected;
    for (const Case& c : cases) {
        SY_LayerDesc& layer = AddLayer(50);
        layer.material.opacity = c.opacity;
        layer.material.renders = c.renders;
        layer.material.wireframe = c.wireframe;
        if (c.kept) expected.push_back(layer.material.renderIndex);
    }
    // A layer seen edge-on and one behind the camera are dropped by their set-up.
    SetPlacements(&AddLayer(0), {Turned(10, 10, 0, M_PI / 2, 200, 150, 0)});
    SetPlacements(&AddLayer(0), {Translation(50, 40, -800)});

    SY_Renderables renderables;
    SY_BuildRenderables(Sources(), &renderables);
    std::vector<int32_t> kept;
    for (const SY_TRLayer& r : renderables)
        kept.push_back(r.material.renderIndex);
    EXPECT_EQ(kept, expected);
}

TEST_F(RenderableList, MotionBlurredLayersFollowTheCameraSubsamples) {
    AddLayer(50).material.motionBlur = true;
    AddLayer(100);
    SY_Renderables renderables;
    SY_BuildRenderables(Sources(), &renderables);
    ASSERT_EQ(renderables.size(), 2u);
    const SY_TRLayer& blurred = renderables[0];
    ASSERT_EQ(blurred.subsamples.Count(), 2);
    EXPECT_TRUE(blurred.multiSample);
    EXPECT_NEAR(blurred.subsamples[0].vertices[0].x, 50, 1e-9);
    EXPECT_NEAR(blurred.subsamples[1].vertices[0].x, 60, 1e-9);
    EXPECT_NEAR(blurred.bounds[0], 50, 1e-9);
    EXPECT_NEAR(blurred.bounds[2], 80, 1e-9);
    const SY_TRLayer& still = renderables[1];
    ASSERT_EQ(still.subsamples.Count(), 1);
    EXPECT_FALSE(still.multiSample);
    EXPECT_NEAR(still.subsamples[0].vertices[0].x, 100, 1e-9);
}

TEST_F(RenderableList, DepthIndexSeparatesACoplanarStack) {
    AddLayer(50);
    AddLayer(50).material.depthIndex = 3;
    SY_Renderables renderables;
    SY_BuildRenderables(Sources(), &renderables);
    ASSERT_EQ(renderables.size(), 2u);
    EXPECT_NEAR(renderables[0].subsamples[0].vertices[0].z, 1.0, 1e-12);
    EXPECT_NEAR(renderables[1].subsamples[0].vertices[0].z, 1.0 - 3e-7, 1e-12);
}

TEST_F(RenderableList, LightListHoldsOnlyMatchedLightsInIdOrder) {
    lights_.resize(3);
    lights_[0].id = 3;
    lights_[1].id = 7;
    lights_[2].id = 9;
    struct Case {
        const char* name;
        std::vector<int32_t> lightIds;
        std::vector<int32_t> expectedIds;
        bool acceptsLights;
    };
    const std::vector<Case> cases = {
        {"matched in id order, unmatched left out", {9, 5, 3}, {9, 3}, true},
        {"all matched", {3, 7, 9}, {3, 7, 9}, true},
        {"no ids", {}, {}, false},
        {"no id matches", {5}, {}, false},
    };
    for (const Case& c : cases)
        AddLayer(50).lightIds = c.lightIds;
    SY_Renderables renderables;
    SY_BuildRenderables(Sources(), &renderables);
    ASSERT_EQ(renderables.size(), cases.size());
    for (size_t i = 0; i < cases.size(); ++i) {
        SCOPED_TRACE(cases[i].name);
        const SY_TRLayer& r = renderables[i];
        std::vector<int32_t> ids;
        for (const SY_LightState* light : r.lights) {
            ASSERT_NE(light, nullptr);
            ASSERT_GE(light, lights_.data());
            ASSERT_LT(light, lights_.data() + lights_.size());
            ids.push_back(light->id);
        }
        EXPECT_EQ(ids, cases[i].expectedIds);
        EXPECT_EQ(r.material.acceptsLights, cases[i].acceptsLights);
    }
}

TEST_F(RenderableList, CopiesMaterialFlagsAndBorrowsTheTrackMatte) {
    class Matte : public SY_TImageFetcher {
    public:
        PF_World* Fetch() override { return nullptr; }
        void Release() override {}
        bool OutsideIsClear() const override { return false; }
    };
    SY_LayerDesc& layer = AddLayer(50);
    layer.material.mode = 5;
    layer.material.opacity = 0.25;
    layer.material.shininess = 40;
    layer.material.castsShadows = true;
    layer.material.acceptsShadows = 2;
    layer.material.engineFlag = SY_SamplingFilter::kBicubic;
    layer.collapsed = true;
    layer.trackMatte = std::make_unique<Matte>();
    layer.lightIds = {1};
    lights_.resize(1);
    lights_[0].id = 1;
    SY_Renderables renderables;
    SY_BuildRenderables(Sources(), &renderables);
    ASSERT_EQ(renderables.size(), 1u);
    const SY_TRLayer& r = renderables[0];
    EXPECT_EQ(r.material.mode, 5);
    EXPECT_EQ(r.material.opacity, 0.25);
    EXPECT_EQ(r.material.shininess, 40);
    EXPECT_TRUE(r.material.castsShadows);
    EXPECT_EQ(r.material.acceptsShadows, 2);
    EXPECT_EQ(r.material.engineFlag, SY_SamplingFilter::kBicubic);
    EXPECT_TRUE(r.collapsed);
    EXPECT_FALSE(r.unbounded);
    EXPECT_EQ(r.trackMatte, layer.trackMatte.get());
    for (int32_t m : r.dofMargin)
        EXPECT_EQ(m, 0);
}

TEST_F(RenderableList, MemoryFailureLeavesNothingAllocated) {
    lights_.resize(1);
    for (int i = 0; i < 4; ++i) {
        SY_LayerDesc& layer = AddLayer(30 + 40 * i);
        layer.material.motionBlur = i % 2 == 1;
        layer.lightIds = {0};
    }
    int32_t failures = FailEachAllocationInTurn([&](auto fail) {
        SY_Renderables renderables;
        auto failing = fail();
        SY_BuildRenderables(Sources(), &renderables);
    });
    EXPECT_GT(failures, 4);
}

}  // namespace
