// The plug-in's scene capture run against the host's suites: what a composition file turns into
// in the renderer's scene record.
#include <gtest/gtest.h>

#include <tuple>

#include "instance_options.h"
#include "qngp_suites.h"
#include "render_context.h"
#include "renderer/scene/messages.h"
#include "renderer/scene/scene_print.h"
#include "scene_assembly.h"
#include "served_frame.h"
#include "suites/suite_registry.h"

namespace ostrel {
namespace {

const QNGP_InData kInData{SuiteRegistry::BasicSuite(), 1};

// Scene assembly of the frame, with new instance options and the render context the render
// entry makes.
void Assemble(ServedFrame& frame, SY_SceneDesc* scene) {
    QNGP_MemHandle options = nullptr;
    ASSERT_EQ(ORM_InstanceSetUp(&kInData, nullptr, nullptr, nullptr, nullptr, nullptr, &options),
              0);
    {
        ORM_RenderContext context(&kInData,
                                  {nullptr, nullptr, frame.Render(), nullptr, options, nullptr});
        ORM_AssembleScene(context, scene);
    }
    EXPECT_EQ(ORM_InstanceSetDown(&kInData, nullptr, nullptr, nullptr, options), 0);
}

// The comp's sample count as a test sets it, for counts a composition file cannot hold.
int32_t gSamples = 0;

struct SampleCountOverride {
    explicit SampleCountOverride(int32_t samples) : suite(*CompSuite()) {
        gSamples = samples;
        suite.GetCompMotionBlurSamples = [](QNGP_CompH, int32_t* count) {
            *count = gSamples;
            return int32_t{0};
        };
    }
    QNGP_CompSuite14 suite;
    ScopedSuite served{kQNGP_CompSuite, 14, &suite};
};

// A 100-pixel card that moves right at 960 pixels a second from x = 0 at time 0.
const std::string kMovingCard = R"(
  {"name": "card", "kind": "solid", "threeD": true, "motionBlur": true,
   "source": {"color": "#ffffff", "width": 100, "height": 100},
   "transform": {"position": {"keyframes": [{"time": 0, "value": [0, 270, 0]},
                                            {"time": 1, "value": [960, 270, 0]}]}}},
  {"name": "still", "kind": "solid", "threeD": true,
   "source": {"color": "#ffffff", "width": 100, "height": 100}}
)";

TEST(Capture, SampleCountsClampedToTwoToSixtyFour) {
    // Frame 12 (0.5 s) with a 180° shutter opening 90° early: from 0.5 − 1/96 s for 1/48 s,
    // where the card's corner moves from x = 420 to 440.
    struct Case {
        int32_t samples;
        int32_t count;
    };
    const Case kCases[] = {{0, 2}, {1, 2}, {5, 5}, {100, 64}};
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.samples);
        ServedFrame frame(CompJson(R"("motionBlur": {"enabled": true})", kMovingCard), 12);
        SampleCountOverride samples(c.samples);
        SY_SceneDesc scene;
        Assemble(frame, &scene);
        EXPECT_EQ(scene.cameraPlacements.Count(), c.count);
        ASSERT_EQ(scene.layers[0].placements.Count(), c.count);
        for (int32_t i = 0; i < c.count; ++i)
            EXPECT_NEAR(scene.layers[0].placements[i].mat[3][0], 420 + 20.0 * i / c.count, 1e-9);
        // The card without its own motion-blur switch keeps one transform.
        EXPECT_EQ(scene.layers[1].placements.Count(), 1);
    }
}

const std::string kOrthographicCamera = R"(
  {"name": "cam", "kind": "camera", "transform": {"position": [480, 270, -1000]},
   "camera": {"type": "one-node", "orthographic": true, "depthOfField": {
     "enabled": true, "focusDistance": 900, "aperture": 40, "blurLevel": 120,
     "irisShape": "hexagon", "irisRoundness": 30, "highlightThreshold": 200}}},
)";

TEST(Capture, OrthographicCameraAndDownsampleReachTheDepthOfField) {
    RenderSettings settings;
    settings.downsampleX = 2;
    settings.downsampleY = 4;
    ServedFrame frame(CompJson("", kOrthographicCamera + kMovingCard), 0, settings);
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    EXPECT_EQ(std::tuple(scene.downsampleX, scene.dof.downsampleY), std::tuple(2, 4));
    // An orthographic camera has no zoom; the depth of field's percentages become fractions.
    EXPECT_FALSE(scene.perspective);
    ASSERT_TRUE(scene.dof.enabled);
    EXPECT_EQ(std::tuple(scene.dof.zoom, scene.dof.focusDistance, scene.dof.blurLevel,
                         scene.dof.irisShape, scene.dof.irisRoundness),
              std::tuple(0, 900, 1.2, 6, 0.3));
    // The comp's switch for lights and depth of field turns the camera's blur off.
    ServedFrame off(
        CompJson(R"("lightsAndDepthOfField": false)", kOrthographicCamera + kMovingCard));
    Assemble(off, &scene);
    EXPECT_FALSE(scene.dof.enabled);
}

// A card, a light and a light that is switched off.
const std::string kLitCard = R"(
  {"name": "a", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
  {"name": "lamp", "kind": "light", "light": {"type": "point"}},
  {"name": "dark", "kind": "light", "on": false, "light": {"type": "spot"}}
)";

TEST(Capture, LightsThatAreOnUnlessTheCompSwitchesLightsOff) {
    for (bool enabled : {true, false}) {
        SCOPED_TRACE(enabled ? "lights on" : "lights switched off in the comp");
        ServedFrame frame(CompJson(enabled ? "" : R"("lightsAndDepthOfField": false)", kLitCard));
        SY_SceneDesc scene;
        Assemble(frame, &scene);
        EXPECT_EQ(scene.lightsEnabled, enabled);
        // The light that is off is not captured.
        ASSERT_EQ(scene.lights.Count(), enabled ? 1 : 0);
        if (enabled) {
            EXPECT_EQ(std::tuple(scene.lights[0].id, scene.lights[0].type),
                      std::tuple(1, kSY_LightPoint));
        }
    }
}

TEST(Capture, QualityAndShadowSwitches) {
    const std::string layers = R"(
      {"name": "wire", "kind": "solid", "threeD": true, "quality": "wireframe",
       "source": {"color": "#ffffff"}, "material": {"castsShadows": "on"}},
      {"name": "caster", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"},
       "material": {"castsShadows": "only"}},
      {"name": "catcher", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"},
       "material": {"acceptsShadows": "only"}},
      {"name": "plain", "kind": "solid", "threeD": true, "preserveTransparency": true,
       "source": {"color": "#ffffff"}, "material": {"acceptsLights": false}})";
    ServedFrame frame(CompJson("", layers));
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    ASSERT_EQ(scene.layers.Count(), 4);
    // Renders, wireframe, casts shadows, accepts shadows, accepts lights, best quality, mode.
    using Switches = std::tuple<bool, bool, bool, int, bool, bool, int>;
    const Switches kExpected[] = {
        {false, true, false, 0, false, false, 2},        // wireframe: no light, no shadow
        {false, false, true, 1, true, true, 2},          // casts shadows only: not drawn
        {true, false, false, 2, false, true, 5},         // accepts shadows only: mode 5, no lights
        {true, false, false, 1, false, true, 2 | 0x80},  // keeps the alpha below
    };
    for (int32_t i = 0; i < 4; ++i) {
        const SY_LayerDesc& l = scene.layers[i];
        EXPECT_EQ(Switches(l.material.renders, l.material.wireframe, l.material.castsShadows,
                           l.material.acceptsShadows, l.material.acceptsLights,
                           l.material.bestQuality, l.material.mode),
                  kExpected[i])
            << "layer " << i << ": " << l;
    }
}

}  // namespace
}  // namespace ostrel
