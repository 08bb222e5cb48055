// The plug-in's scene capture run against the host's suites: what a composition file turns into
// in the renderer's scene record.
#include <gtest/gtest.h>

#include <cmath>
#include <tuple>

#include "instance_options.h"
#include "qngp_suites.h"
#include "render_context.h"
#include "render_entry.h"
#include "renderer/scene/messages.h"
#include "renderer/scene/scene_print.h"
#include "resources/ormond_strings.h"
#include "scene_assembly.h"
#include "served_frame.h"
#include "suites/memory_suite.h"
#include "suites/suite_registry.h"
#include "u_memory.h"
#include "world_pixels.h"

namespace ostrel {
namespace {

// The instance options as the plug-in keeps them, in a memory handle freed with the object.
class Options {
public:
    explicit Options(int32_t shadowMapSizeChoice) {
        MemorySuite()->NewHandle(1, "options", sizeof(ORM_InstanceOptions), 1, &handle_);
        void* bytes = nullptr;
        MemorySuite()->LockHandle(handle_, &bytes);
        *static_cast<ORM_InstanceOptions*>(bytes) = {1, 0, shadowMapSizeChoice, 0};
        MemorySuite()->UnlockHandle(handle_);
    }
    ~Options() { MemorySuite()->FreeHandle(handle_); }
    Options(const Options&) = delete;
    Options& operator=(const Options&) = delete;

    QNGP_MemHandle Get() const { return handle_; }

private:
    QNGP_MemHandle handle_ = nullptr;
};

const QNGP_InData kInData{SuiteRegistry::BasicSuite(), 1};

class Capture : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(ORM_RegisterStrings(), 0);
        ASSERT_EQ(SY_RegisterStrings(), 0);
    }
    void TearDown() override {
        SY_UnregisterStrings();
        ORM_UnregisterStrings();
    }

    // Scene assembly of the frame, as the render entry runs it.
    static void Assemble(ServedFrame& frame, SY_SceneDesc* scene, int32_t shadowChoice = 0) {
        Frame(frame, shadowChoice).Assemble(scene);
    }

    // The whole frame as the host calls the plug-in for it.
    static int32_t RenderThroughTheEntry(ServedFrame& frame) {
        Options options(0);
        return ORM_Render(&kInData, nullptr, nullptr, frame.Render(), nullptr, options.Get(),
                          nullptr);
    }

    // The render context of a frame for as long as a test needs it, as the render entry makes it.
    class Frame {
    public:
        explicit Frame(ServedFrame& frame, int32_t shadowChoice = 0)
            : options_(shadowChoice),
              context_(&kInData,
                       {nullptr, nullptr, frame.Render(), nullptr, options_.Get(), nullptr}) {}
        void Assemble(SY_SceneDesc* scene) { ORM_AssembleScene(context_, scene); }

    private:
        Options options_;
        ORM_RenderContext context_;
    };
};

// The comp's sample count as a test sets it, for counts a composition file cannot hold.
int32_t gSamples = 0;

int32_t TestSamples(QNGP_CompH, int32_t* samples) {
    *samples = gSamples;
    return 0;
}

class SampleCountOverride {
public:
    explicit SampleCountOverride(int32_t samples)
        : suite_(*CompSuite()), served_(kQNGP_CompSuite, 14, &suite_) {
        gSamples = samples;
        suite_.GetCompMotionBlurSamples = &TestSamples;
    }

private:
    QNGP_CompSuite14 suite_;
    ScopedSuite served_;
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
const std::string kBlur = R"("motionBlur": {"enabled": true})";

TEST_F(Capture, OneSampleTimeWithoutMotionBlur) {
    ServedFrame frame(CompJson("", kMovingCard), 12);
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    EXPECT_EQ(scene.cameraPlacements.Count(), 1);
    ASSERT_EQ(scene.layers.Count(), 2);
    ASSERT_EQ(scene.layers[0].placements.Count(), 1);
    // At 0.5 s the card's centre is at x = 480, its corner at 430.
    EXPECT_DOUBLE_EQ(scene.layers[0].placements[0].mat[3][0], 430);
}

TEST_F(Capture, SampleCountsClampedToTwoToSixtyFour) {
    // Frame 12 (0.5 s) with a 180° shutter opening 90° early: from 0.5 − 1/96 s for 1/48 s,
    // where the card's corner moves from x = 420 to 440.
    struct Case {
        int32_t samples;
        int32_t count;
    };
    const Case kCases[] = {{0, 2}, {1, 2}, {2, 2}, {5, 5}, {64, 64}, {100, 64}};
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.samples);
        ServedFrame frame(CompJson(kBlur, kMovingCard), 12);
        SampleCountOverride samples(c.samples);
        SY_SceneDesc scene;
        Assemble(frame, &scene);
        EXPECT_EQ(scene.cameraPlacements.Count(), c.count);
        EXPECT_EQ(scene.cameraProjections.Count(), c.count);
        ASSERT_EQ(scene.layers[0].placements.Count(), c.count);
        for (int32_t i = 0; i < c.count; ++i)
            EXPECT_NEAR(scene.layers[0].placements[i].mat[3][0], 420 + 20.0 * i / c.count, 1e-9);
        // The card without its own motion-blur switch keeps one transform.
        EXPECT_EQ(scene.layers[1].placements.Count(), 1);
    }
}

TEST_F(Capture, DefaultCameraWithoutACameraLayer) {
    ServedFrame frame(CompJson("", kMovingCard));
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    EXPECT_TRUE(scene.perspective);
    EXPECT_FALSE(scene.dof.enabled);
    // The eye at the comp's centre, the default distance 960 × 50 / 36 in front of it.
    EXPECT_DOUBLE_EQ(scene.framePlacement.mat[3][0], 480);
    EXPECT_DOUBLE_EQ(scene.framePlacement.mat[3][1], 270);
    EXPECT_DOUBLE_EQ(scene.framePlacement.mat[3][2], -960 * 50.0 / 36);
    EXPECT_NE(scene.frameProjection.mat[2][3], 0);
}

const std::string kOrthographicCamera = R"(
  {"name": "cam", "kind": "camera", "transform": {"position": [480, 270, -1000]},
   "camera": {"type": "one-node", "orthographic": true, "depthOfField": {
     "enabled": true, "focusDistance": 900, "aperture": 40, "blurLevel": 120,
     "irisShape": "hexagon", "irisRoundness": 30, "highlightThreshold": 200}}},
)";

TEST_F(Capture, OrthographicCameraHasNoProjectionAndZoomZero) {
    ServedFrame frame(CompJson("", kOrthographicCamera + kMovingCard));
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    EXPECT_FALSE(scene.perspective);
    EXPECT_EQ(scene.frameProjection.mat[2][3], 0);
    EXPECT_DOUBLE_EQ(scene.frameProjection.mat[0][0], 1);
    ASSERT_TRUE(scene.dof.enabled);
    EXPECT_EQ(scene.dof.zoom, 0);
    EXPECT_DOUBLE_EQ(scene.dof.focusDistance, 900);
    EXPECT_DOUBLE_EQ(scene.dof.aperture, 40);
    EXPECT_DOUBLE_EQ(scene.dof.blurLevel, 1.2);
    EXPECT_DOUBLE_EQ(scene.dof.irisShape, 6);
    EXPECT_DOUBLE_EQ(scene.dof.irisRoundness, 0.3);
    EXPECT_DOUBLE_EQ(scene.dof.highlightThreshold, 200);
}

TEST_F(Capture, RegionAndDownsampleMoveAndShrinkTheScreen) {
    RenderSettings settings;
    settings.downsampleX = 2;
    settings.downsampleY = 4;
    settings.region = M_LRect{100, 50, 500, 450};
    ServedFrame frame(CompJson("", kOrthographicCamera + kMovingCard), 0, settings);
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    // The comp's centre (480, 270) is the eye's axis: on screen it lands at
    // ((480 − 100) / 2, (270 − 50) / 4).
    EXPECT_DOUBLE_EQ(scene.frameProjection.mat[3][0], 190);
    EXPECT_DOUBLE_EQ(scene.frameProjection.mat[3][1], 55);
    EXPECT_DOUBLE_EQ(scene.frameProjection.mat[0][0], 0.5);
    EXPECT_DOUBLE_EQ(scene.frameProjection.mat[1][1], 0.25);
    EXPECT_EQ(std::tuple(scene.downsampleX, scene.downsampleY), std::tuple(2, 4));
    EXPECT_EQ(std::tuple(scene.dof.downsampleX, scene.dof.downsampleY), std::tuple(2, 4));
}

// Top to bottom: two cards, a null, a light of the layers below, two more cards, a light that
// is switched off.
const std::string kLitCards = R"(
  {"name": "a", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
  {"name": "b", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
  {"name": "n", "kind": "null"},
  {"name": "lamp", "kind": "light", "light": {"type": "point", "lightsOnlyLayersBelow": true,
   "intensity": {"keyframes": [{"time": 0, "value": 0}, {"time": 1, "value": 100}]}}},
  {"name": "c", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
  {"name": "d", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
  {"name": "dark", "kind": "light", "on": false, "light": {"type": "spot"}}
)";

TEST_F(Capture, LightsReachOnlyTheLayersBelowWhenTheyAskForIt) {
    for (bool enabled : {true, false}) {
        SCOPED_TRACE(enabled ? "lights on" : "lights switched off in the comp");
        ServedFrame frame(CompJson(enabled ? "" : R"("lightsAndDepthOfField": false)", kLitCards));
        SY_SceneDesc scene;
        Assemble(frame, &scene);
        EXPECT_EQ(scene.lightsEnabled, enabled);
        // The light that is off is not captured.
        ASSERT_EQ(scene.lights.Count(), enabled ? 1 : 0);
        if (enabled) {
            EXPECT_EQ(scene.lights[0].id, 3);
            EXPECT_EQ(scene.lights[0].type, kSY_LightPoint);
        }
        ASSERT_EQ(scene.layers.Count(), 4);
        const int32_t kCompIndex[] = {0, 1, 4, 5};
        for (int32_t i = 0; i < 4; ++i) {
            SCOPED_TRACE(i);
            EXPECT_EQ(scene.layers[i].compIndex, kCompIndex[i]);
            EXPECT_EQ(scene.layers[i].material.renderIndex, i);
            EXPECT_EQ(scene.layers[i].lightIds, enabled && kCompIndex[i] > 3
                                                    ? std::vector<int32_t>{3}
                                                    : std::vector<int32_t>{});
        }
    }
}

TEST_F(Capture, LightValuesComeFromTheMiddleSample) {
    // Five samples from 0.5 − 1/96 s, 1/240 s apart: the third is at 0.5 − 1/96 + 1/120 s, where
    // the intensity ramp reads that many hundred percent.
    ServedFrame frame(CompJson(kBlur, kLitCards), 12);
    SampleCountOverride samples(5);
    SY_SceneDesc scene;
    Assemble(frame, &scene);
    ASSERT_EQ(scene.lights.Count(), 1);
    const SY_LightDesc& light = scene.lights[0];
    double middle = 0.5 - 1.0 / 96 + 1.0 / 120;
    EXPECT_DOUBLE_EQ(light.color[0], 1);
    for (int c = 1; c < 4; ++c)
        EXPECT_NEAR(light.color[c], middle, 1e-12);
    EXPECT_EQ(light.placements.Count(), 5);
}

TEST_F(Capture, ShadowMapSizeFromTheOptions) {
    struct Case {
        int32_t choice;
        int32_t size;
    };
    for (const Case& c : {Case{0, 0}, Case{1, 250}, Case{8, 4000}}) {
        SCOPED_TRACE(c.choice);
        ServedFrame frame(CompJson("", kLitCards));
        SY_SceneDesc scene;
        Assemble(frame, &scene, c.choice);
        ASSERT_EQ(scene.lights.Count(), 1);
        EXPECT_EQ(scene.lights[0].shadowMapSize, c.size);
    }
}

TEST_F(Capture, QualityAndShadowSwitches) {
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

TEST_F(Capture, TrackMatteFetchedFromTheMatteLayer) {
    const std::string layers = R"(
      {"name": "stencil", "kind": "solid", "threeD": true,
       "source": {"color": "#ffffff", "width": 64, "height": 32}},
      {"name": "card", "kind": "solid", "threeD": true, "trackMatte": "luma",
       "source": {"color": "#ff0000"}},
      {"name": "free", "kind": "solid", "threeD": true, "source": {"color": "#ff0000"}})";
    int64_t startBytes = U_AccountedBytes();
    {
        ServedFrame frame(CompJson("", layers));
        Frame capture(frame);
        SY_SceneDesc scene;
        capture.Assemble(&scene);
        ASSERT_EQ(scene.layers.Count(), 2);
        EXPECT_EQ(scene.layers[1].trackMatte, nullptr);
        ASSERT_NE(scene.layers[0].trackMatte, nullptr);
        PF_World* matte = scene.layers[0].trackMatte->Fetch();
        ASSERT_NE(matte, nullptr);
        EXPECT_EQ(std::tuple(matte->width, matte->height), std::tuple(64, 32));
        // White under a luma matte is fully opaque.
        EXPECT_EQ(matte->Row<PF_Pixel8>(0)[0].alpha, 255);
        EXPECT_TRUE(scene.layers[0].trackMatte->OutsideIsClear());
        scene.layers[0].trackMatte->Release();
    }
    EXPECT_EQ(U_AccountedBytes(), startBytes);
}

// The default camera of a 360-pixel comp is 500 pixels in front of it, so a card half way
// there is seen at twice its size: the 40 × 20 card covers x 140 to 220 and y 70 to 110 of the
// frame. The unbounded wall lies in the comp's plane behind it and faces the camera.
TEST_F(Capture, AnUnboundedWallFillsEveryPixelTheCardLeaves) {
    const std::string comp = R"({"width": 360, "height": 180, "duration": 1, "layers": [
      {"name": "card", "kind": "solid", "threeD": true, "quality": "draft",
       "source": {"color": "#ff0000", "width": 40, "height": 20},
       "transform": {"position": [180, 90, -250]}},
      {"name": "wall", "kind": "solid", "threeD": true,
       "source": {"color": "#336699", "unbounded": true}}]})";
    struct Case {
        int16_t bitDepth;
        Channels card, wall;
    };
    const Case kCases[] = {
        {8, {255, 255, 0, 0}, {255, 51, 102, 153}},
        {16, {32768, 32768, 0, 0}, {32768, 6554, 13107, 19661}},
        {32, {1, 1, 0, 0}, {1, 0.2f, 0.4f, 0.6f}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.bitDepth);
        int64_t startBytes = U_AccountedBytes();
        {
            RenderSettings settings;
            settings.bitDepth = c.bitDepth;
            ServedFrame frame(comp, 0, settings);
            SY_SceneDesc scene;
            Assemble(frame, &scene);
            ASSERT_EQ(scene.layers.Count(), 2);
            EXPECT_FALSE(scene.layers[0].unbounded);
            EXPECT_TRUE(scene.layers[1].unbounded);

            ASSERT_EQ(RenderThroughTheEntry(frame), 0);
            const PF_World& out = frame.Session().Destination();
            int64_t wrong = 0;
            for (int32_t y = 0; y < out.height; ++y) {
                for (int32_t x = 0; x < out.width; ++x) {
                    bool onCard = x >= 140 && x < 220 && y >= 70 && y < 110;
                    wrong += ChannelsAt(out, x, y) != (onCard ? c.card : c.wall);
                }
            }
            EXPECT_EQ(wrong, 0);
        }
        EXPECT_EQ(U_AccountedBytes(), startBytes);
    }
}

TEST_F(Capture, FramesThroughTheEntryLeaveNothingBehind) {
    const std::string kOdd = R"(
      {"name": "fine", "kind": "solid", "threeD": true, "source": {"color": "#ffffff"}},
      {"name": "odd", "kind": "solid", "threeD": true, "transferMode": "sparkle",
       "source": {"color": "#ffffff"}})";
    struct Case {
        const char* name;
        std::string layers;
        int32_t frame, result;
    };
    const Case kCases[] = {
        {"a frame that renders", kLitCards + "," + kMovingCard, 12, 0},
        {"a frame that fails in capture", kOdd, 3, kQNGP_ErrHostFailure},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        int64_t startBytes = U_AccountedBytes();
        int64_t startHandles = LiveMemoryHandles();
        {
            ServedFrame frame(CompJson(kBlur, c.layers), c.frame);
            EXPECT_EQ(RenderThroughTheEntry(frame), c.result);
            EXPECT_EQ(LockedMemoryHandles(), 0);
            EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 0);
        }
        EXPECT_EQ(LiveMemoryHandles(), startHandles);
        EXPECT_EQ(U_AccountedBytes(), startBytes);
    }
}

}  // namespace
}  // namespace ostrel
