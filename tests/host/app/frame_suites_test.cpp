#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <tuple>

#include "qngp_suites.h"
#include "served_frame.h"
#include "suites/suite_registry.h"
#include "u_memory.h"
#include "world_pixels.h"

namespace ostrel {
namespace {

// Top to bottom: a camera, a light that reaches only the layers below it, a null, two 3-D
// solids (the second matted by the first), a 2-D solid, and a switched-off 3-D solid.
const std::string kLayers = R"(
  {"name": "cam", "kind": "camera", "transform": {"position": [480, 270, -1000]},
   "camera": {"orthographic": true}},
  {"name": "sun", "kind": "light", "light": {"type": "spot", "intensity": 50,
   "color": [1, 0.5, 0.25], "lightsOnlyLayersBelow": true}},
  {"name": "rig", "kind": "null", "threeD": true, "transform": {"position": [100, 0, 0]}},
  {"name": "stencil", "kind": "solid", "threeD": true,
   "source": {"color": "#ffffff", "width": 101, "height": 51}},
  {"name": "card", "kind": "solid", "threeD": true, "parent": "rig", "motionBlur": true,
   "collapse": true, "preserveTransparency": true, "trackMatte": "luma-inverted",
   "quality": "draft", "sampling": "bicubic",
   "source": {"color": "#ff0000", "width": 200, "height": 100},
   "transform": {"anchorPoint": [0, 0, 0], "position": [10, 20, 30],
                 "scale": [50, 25, 100], "opacity": 40}},
  {"name": "flat", "kind": "solid", "source": {"color": "#00ff00"}},
  {"name": "off", "kind": "solid", "threeD": true, "on": false, "source": {"color": "#0000ff"}}
)";

const std::string kSettings =
    R"("pixelAspect": 0.9, "lightsAndDepthOfField": false,
       "motionBlur": {"enabled": true, "samplesPerFrame": 12})";

TEST(HostSuites, UnknownNamesAndVersionsFail) {
    HostSuites suites;
    const QNGP_BasicSuite* basic = SuiteRegistry::BasicSuite();
    struct Case {
        const char* name;
        int32_t version;
        bool served;
    };
    const Case kCases[] = {
        {kQNGP_CanvasSuite, 10, true},     {kQNGP_CanvasSuite, 13, true},
        {kQNGP_CanvasSuite, 11, false},    {kQNGP_CompSuite, 9, true},
        {kQNGP_CompSuite, 14, true},       {kQNGP_CompSuite, 15, false},
        {kQNGP_ItemSuite, 7, true},        {kQNGP_CameraSuite, 2, true},
        {kQNGP_LightSuite, 1, true},       {kQNGP_LayerSuite, 10, true},
        {kQNGP_LayerSuite, 9, false},      {kQNGP_StreamSuite, 7, true},
        {kPF_ColorSettingsSuite, 1, true}, {kQN_ZELSuite, 1, true},
        {kQNGP_MemorySuite, 1, true},      {kQNGP_PersistentDataSuite, 3, true},
        {kQNGP_IterateSuite, 1, true},     {"QNGP Canvas Suit", 10, false},
        {"QNGP Teleport Suite", 1, false},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(std::string(c.name) + " " + std::to_string(c.version));
        const void* suite = nullptr;
        EXPECT_EQ(basic->AcquireSuite(c.name, c.version, &suite),
                  c.served ? 0 : kQNGP_ErrMissingSuite);
        EXPECT_EQ(suite != nullptr, c.served);
        if (!c.served) continue;
        EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 1);
        EXPECT_EQ(basic->ReleaseSuite(c.name, c.version), 0);
        // Only what is held can be released.
        EXPECT_EQ(basic->ReleaseSuite(c.name, c.version), kQNGP_ErrMissingSuite);
    }
    // Both versions of the Canvas and Comp suites are one table.
    const void* older = nullptr;
    const void* newer = nullptr;
    basic->AcquireSuite(kQNGP_CanvasSuite, 10, &older);
    basic->AcquireSuite(kQNGP_CanvasSuite, 13, &newer);
    EXPECT_EQ(older, newer);
    basic->ReleaseSuite(kQNGP_CanvasSuite, 10);
    basic->ReleaseSuite(kQNGP_CanvasSuite, 13);
    EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 0);
}

TEST(CanvasSuite, RenderOrderLayerContextsAndTheirValues) {
    // Frame 12 is 0.5 s.
    ServedFrame frame(CompJson(kSettings, kLayers), 12);
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    QNGP_RenderContextH render = frame.Render();

    QNGP_CompH comp = nullptr;
    ASSERT_EQ(canvas.GetCompToRender(render, &comp), 0);
    EXPECT_EQ(comp, frame.Comp());
    T_Time time{}, step{};
    ASSERT_EQ(canvas.GetRenderTime(render, &time, &step), 0);
    EXPECT_DOUBLE_EQ(T_Seconds(time), 0.5);
    EXPECT_DOUBLE_EQ(T_Seconds(step), 1.0 / 24);

    // The two 3-D solids that are on; the stencil serves as the card's matte, so only the card.
    int32_t count = 0;
    ASSERT_EQ(canvas.GetNumLayersToRender(render, &count), 0);
    ASSERT_EQ(count, 1);
    QNGP_LayerContextH context = nullptr;
    ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &context), 0);
    EXPECT_EQ(canvas.GetNthLayerContext(render, 1, &context), kQNGP_ErrBadIndex);
    ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &context), 0);
    QNGP_LayerH layer = nullptr, topLevel = nullptr;
    ASSERT_EQ(canvas.GetLayerFromLayerContext(render, context, &layer), 0);
    EXPECT_EQ(layer, frame.Layer(4));
    ASSERT_EQ(canvas.GetTopLevelLayer(render, context, &topLevel), 0);
    EXPECT_EQ(topLevel, frame.Layer(4));

    // Anchor point at the origin, scale 50 % × 25 %, then the card's position (10, 20, 30) in
    // the rig's space, which sits at (100, 0, 0): layer pixel (0, 0) lands on (110, 20, 30).
    M_Matrix4 placement{};
    ASSERT_EQ(canvas.GetRenderLayerToWorldXform(render, context, &time, &placement), 0);
    EXPECT_DOUBLE_EQ(placement.mat[0][0], 0.5);
    EXPECT_DOUBLE_EQ(placement.mat[1][1], 0.25);
    EXPECT_DOUBLE_EQ(placement.mat[3][0], 110);
    EXPECT_DOUBLE_EQ(placement.mat[3][1], 20);
    EXPECT_DOUBLE_EQ(placement.mat[3][2], 30);

    QNGP_ShortRect bounds{};
    ASSERT_EQ(canvas.GetRenderLayerBounds(render, context, &time, &bounds), 0);
    EXPECT_EQ(std::tuple(bounds.left, bounds.top, bounds.right, bounds.bottom),
              std::tuple(0, 0, 200, 100));
    double opacity = 0;
    ASSERT_EQ(canvas.GetRenderOpacity(render, context, &time, &opacity), 0);
    EXPECT_DOUBLE_EQ(opacity, 0.4);
    bool unbounded = true;
    ASSERT_EQ(canvas.IsLayerUnbounded(render, context, &unbounded), 0);
    EXPECT_FALSE(unbounded);

    // 180° opening 90° before the frame: 0.5 − 1/96 s for 1/48 s.
    T_Time start{}, duration{};
    ASSERT_EQ(canvas.GetShutterInterval(render, &start, &duration), 0);
    EXPECT_DOUBLE_EQ(T_Seconds(start), 0.5 - 1.0 / 96);
    EXPECT_DOUBLE_EQ(T_Seconds(duration), 1.0 / 48);

    int16_t dx = 0, dy = 0;
    ASSERT_EQ(canvas.GetDownsample(render, &dx, &dy), 0);
    EXPECT_EQ(std::tuple(dx, dy), std::tuple(1, 1));
    int32_t fieldMode = -1;
    ASSERT_EQ(canvas.GetFieldRender(render, &fieldMode), 0);
    EXPECT_EQ(fieldMode, 0);
}

TEST(CanvasSuite, MattesTexturesAndWholeLayersComeFromTheLayerSources) {
    int64_t startBytes = U_AccountedBytes();
    {
        RenderSettings settings;
        settings.downsampleX = 2;
        settings.downsampleY = 3;
        ServedFrame frame(CompJson(kSettings, kLayers), 0, settings);
        const QNGP_CanvasSuite13& canvas = *CanvasSuite();
        QNGP_RenderContextH render = frame.Render();
        QNGP_LayerContextH card = nullptr, matte = nullptr, none = nullptr;
        ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &card), 0);
        ASSERT_EQ(canvas.GetTrackMatteContext(render, card, &matte), 0);
        ASSERT_NE(matte, nullptr);
        ASSERT_EQ(canvas.GetTrackMatteContext(render, matte, &none), 0);
        EXPECT_EQ(none, nullptr);
        QNGP_LayerH matteLayer = nullptr;
        ASSERT_EQ(canvas.GetLayerFromLayerContext(render, matte, &matteLayer), 0);
        EXPECT_EQ(matteLayer, frame.Layer(3));

        // The 101 × 51 stencil at a downsample of 2 × 3: ceil(101 / 2) × ceil(51 / 3).
        PF_World* world = nullptr;
        ASSERT_EQ(canvas.RenderLayer(render, matteLayer, matte, kQNGP_RenderMatte, &world), 0);
        std::unique_ptr<PF_World> owned(world);
        EXPECT_EQ(std::tuple(world->width, world->height), std::tuple(51, 17));
        EXPECT_EQ(world->bitDepth, 8);
        EXPECT_EQ(canvas.RenderLayer(render, matteLayer, matte, 7, &world), kQNGP_ErrBadArgument);

        M_Matrix3 source{};
        ASSERT_EQ(canvas.RenderTexture(render, card, 1, nullptr, nullptr, &source, &world), 0);
        EXPECT_EQ(std::tuple(world->width, world->height), std::tuple(100, 34));
        for (int r = 0; r < 3; ++r) {
            for (int c = 0; c < 3; ++c)
                EXPECT_EQ(source.mat[r][c], r == c ? 1.0 : 0.0);
        }
        EXPECT_EQ(canvas.DisposeTexture(render, card, world), 0);
        EXPECT_EQ(canvas.DisposeTexture(render, card, owned.get()), kQNGP_ErrBadHandle);

        QNGP_LayerH cardLayer = frame.Layer(4);
        ASSERT_EQ(canvas.RenderLayer(render, cardLayer, card, kQNGP_RenderWholeLayer, &world), 0);
        EXPECT_EQ(canvas.DisposeTexture(render, card, world), 0);
        // One left out: the session takes it back when it ends.
        ASSERT_EQ(canvas.RenderTexture(render, card, 1, nullptr, nullptr, &source, &world), 0);
    }
    EXPECT_EQ(U_AccountedBytes(), startBytes);
}

// Frames of one run share each layer's texture, made once.
TEST(CanvasSuite, TexturesAreSharedAcrossTheFramesOfARun) {
    int64_t startBytes = U_AccountedBytes();
    {
        HostSuites suites;
        Composition comp = ParseComposition(CompJson(kSettings, kLayers), "test.json");
        ImageCache images;
        const QNGP_CanvasSuite13& canvas = *CanvasSuite();
        // Both frames hold the texture at once: without sharing they would hold two worlds.
        FrameSession first(comp, images, {}, 0), second(comp, images, {}, 1);
        PF_World* textures[2] = {};
        FrameSession* sessions[2] = {&first, &second};
        for (int32_t frame = 0; frame < 2; ++frame) {
            QNGP_RenderContextH render = sessions[frame]->RenderContext();
            QNGP_LayerContextH card = nullptr;
            ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &card), 0);
            M_Matrix3 source{};
            ASSERT_EQ(
                canvas.RenderTexture(render, card, 1, nullptr, nullptr, &source, &textures[frame]),
                0);
        }
        EXPECT_EQ(textures[1], textures[0]);
    }
    EXPECT_EQ(U_AccountedBytes(), startBytes);
}

// Top to bottom: an unbounded white veil that serves as the card's matte, the card, and an
// unbounded wall behind it.
const std::string kBackdrop = R"(
  {"name": "veil", "kind": "solid", "threeD": true,
   "source": {"color": "#ffffff", "unbounded": true}},
  {"name": "card", "kind": "solid", "threeD": true, "trackMatte": "alpha",
   "source": {"color": "#ff0000", "width": 64, "height": 32}},
  {"name": "wall", "kind": "solid", "threeD": true,
   "source": {"color": "#336699", "unbounded": true}}
)";

TEST(CanvasSuite, OnlyUnboundedSolidsSayTheyAreUnbounded) {
    ServedFrame frame(CompJson("", kBackdrop));
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    QNGP_RenderContextH render = frame.Render();
    struct Case {
        int32_t renderIndex;
        bool unbounded;
        int16_t right, bottom;  // of the source rectangle
    };
    // The wall's source rectangle is the comp's.
    for (const Case& c : {Case{0, false, 64, 32}, Case{1, true, 960, 540}}) {
        SCOPED_TRACE(c.renderIndex);
        QNGP_LayerContextH context = nullptr;
        ASSERT_EQ(canvas.GetNthLayerContext(render, c.renderIndex, &context), 0);
        bool unbounded = !c.unbounded;
        ASSERT_EQ(canvas.IsLayerUnbounded(render, context, &unbounded), 0);
        EXPECT_EQ(unbounded, c.unbounded);
        T_Time now{0, 1};
        QNGP_ShortRect bounds{};
        ASSERT_EQ(canvas.GetRenderLayerBounds(render, context, &now, &bounds), 0);
        EXPECT_EQ(bounds.right, c.right);
        EXPECT_EQ(bounds.bottom, c.bottom);
    }
    bool unbounded = false;
    EXPECT_EQ(canvas.IsLayerUnbounded(render, nullptr, &unbounded), kQNGP_ErrBadHandle);
}

TEST(CanvasSuite, UnboundedLayersComeInOutputCoordinates) {
    struct Case {
        const char* name;
        int16_t bitDepth;
        int16_t dx, dy;
        std::optional<M_LRect> region;
        int32_t width, height;                // the output
        int32_t textureWidth, textureHeight;  // the comp at the downsample
        Channels wall;                        // #336699, opaque
    };
    const M_LRect kRegion{100, 50, 401, 250};
    const Case kCases[] = {
        {"8 bits", 8, 1, 1, std::nullopt, 960, 540, 960, 540, {255, 51, 102, 153}},
        // trunc(c × 32768 + 0.5) of 0.2, 0.4 and 0.6.
        {"16 bits, 2 × 3", 16, 2, 3, std::nullopt, 480, 180, 480, 180, {32768, 6554, 13107, 19661}},
        // The 301 × 200 region at half size: ceil(301 / 2) × 100.
        {"float, region, 2 × 2", 32, 2, 2, kRegion, 151, 100, 480, 270, {1, 0.2f, 0.4f, 0.6f}},
    };
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        int64_t startBytes = U_AccountedBytes();
        {
            RenderSettings settings;
            settings.bitDepth = c.bitDepth;
            settings.downsampleX = c.dx;
            settings.downsampleY = c.dy;
            settings.region = c.region;
            ServedFrame frame(CompJson("", kBackdrop), 0, settings);
            QNGP_RenderContextH render = frame.Render();
            ASSERT_EQ(frame.Session().Destination().width, c.width);
            ASSERT_EQ(frame.Session().Destination().height, c.height);

            QNGP_LayerContextH wall = nullptr;
            ASSERT_EQ(canvas.GetNthLayerContext(render, 1, &wall), 0);
            PF_World* world = nullptr;
            ASSERT_EQ(
                canvas.RenderLayer(render, frame.Layer(2), wall, kQNGP_RenderWholeLayer, &world),
                0);
            EXPECT_EQ(std::tuple(world->width, world->height), std::tuple(c.width, c.height));
            EXPECT_EQ(world->bitDepth, c.bitDepth);
            EXPECT_EQ(PixelsOtherThan(*world, c.wall), 0);
            EXPECT_EQ(canvas.DisposeTexture(render, wall, world), 0);

            // Textures (which frames do not ask for) cover the source rectangle.
            M_Matrix3 source{};
            ASSERT_EQ(canvas.RenderTexture(render, wall, 1, nullptr, nullptr, &source, &world), 0);
            EXPECT_EQ(std::tuple(world->width, world->height),
                      std::tuple(c.textureWidth, c.textureHeight));
            EXPECT_EQ(PixelsOtherThan(*world, c.wall), 0);
            EXPECT_EQ(canvas.DisposeTexture(render, wall, world), 0);

            // The veil as the card's matte: output-sized, white and opaque everywhere.
            QNGP_LayerContextH card = nullptr, veil = nullptr;
            ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &card), 0);
            ASSERT_EQ(canvas.GetTrackMatteContext(render, card, &veil), 0);
            ASSERT_EQ(canvas.RenderLayer(render, frame.Layer(0), veil, kQNGP_RenderMatte, &world),
                      0);
            std::unique_ptr<PF_World> matte(world);
            EXPECT_EQ(std::tuple(matte->width, matte->height), std::tuple(c.width, c.height));
            double max = c.wall[0];
            EXPECT_EQ(PixelsOtherThan(*matte, {max, max, max, max}), 0);
        }
        EXPECT_EQ(U_AccountedBytes(), startBytes);
    }
}

TEST(CanvasSuite, RegionDownsampleAndFieldsShapeTheFrame) {
    RenderSettings settings;
    settings.downsampleX = 2;
    settings.downsampleY = 2;
    settings.region = M_LRect{100, 50, 401, 250};
    settings.fields = RenderSettings::Fields::kLowerFirst;
    ServedFrame frame(CompJson("", kLayers), 24, settings);
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    QNGP_RenderContextH render = frame.Render();

    PF_World* destination = nullptr;
    EXPECT_EQ(canvas.GetCompDestination(render, nullptr, &destination), kQNGP_ErrBadHandle);
    ASSERT_EQ(canvas.GetCompDestination(render, frame.Comp(), &destination), 0);
    EXPECT_EQ(std::tuple(destination->width, destination->height),
              std::tuple(151, 100));  // ceil(301 / 2)
    QNGP_ShortRect region{};
    ASSERT_EQ(canvas.GetRegionOfInterest(render, &region), 0);
    EXPECT_EQ(std::tuple(region.left, region.top, region.right, region.bottom),
              std::tuple(100, 50, 401, 250));

    // Lower field first: odd rows at the frame's time, then even rows half a frame later.
    ASSERT_EQ(frame.Session().PassCount(), 2);
    struct Pass {
        int32_t fieldMode;
        double seconds;
    };
    const Pass kPasses[] = {{2, 1.0}, {1, 1.0 + 1.0 / 48}};
    for (int32_t pass = 0; pass < 2; ++pass) {
        frame.Session().BeginPass(pass);
        int32_t fieldMode = 0;
        T_Time time{}, step{};
        ASSERT_EQ(canvas.GetFieldRender(render, &fieldMode), 0);
        ASSERT_EQ(canvas.GetRenderTime(render, &time, &step), 0);
        EXPECT_EQ(fieldMode, kPasses[pass].fieldMode);
        EXPECT_DOUBLE_EQ(T_Seconds(time), kPasses[pass].seconds);
    }
}

TEST(CanvasSuite, ProgressAnswersTheUsersCancel) {
    struct Cancelling : FrameProgress {
        bool Renderables(int32_t done, int32_t) override { return done < 2; }
        bool Rows(int32_t, int32_t) override { return true; }
    } progress;
    ServedFrame frame(CompJson("", kLayers));
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    EXPECT_EQ(canvas.ReportRenderProgress(frame.Render(), 1, 3), 0);
    frame.Session().SetProgress(&progress);
    EXPECT_EQ(canvas.ReportRenderProgress(frame.Render(), 1, 3), 0);
    EXPECT_EQ(canvas.ReportRenderProgress(frame.Render(), 2, 3), kQNGP_ErrUserCancel);
    EXPECT_EQ(canvas.ReportRowProgress(frame.Render(), 2, 3), 0);
}

TEST(CompSuites, CompItemCameraAndLight) {
    ServedFrame frame(CompJson(kSettings, kLayers));
    int32_t flags = 0;
    ASSERT_EQ(CompSuite()->GetCompFlags(frame.Comp(), &flags), 0);
    EXPECT_EQ(flags, 0x8 | 0x100);
    int32_t samples = 0;
    ASSERT_EQ(CompSuite()->GetCompMotionBlurSamples(frame.Comp(), &samples), 0);
    EXPECT_EQ(samples, 12);

    QNGP_ItemH item = nullptr;
    ASSERT_EQ(CompSuite()->GetItemFromComp(frame.Comp(), &item), 0);
    QNGP_Ratio aspect{};
    ASSERT_EQ(ItemSuite()->GetItemPixelAspectRatio(item, &aspect), 0);
    EXPECT_EQ(std::tuple(aspect.num, aspect.den), std::tuple(9, 10));
    int32_t width = 0, height = 0;
    ASSERT_EQ(ItemSuite()->GetItemDimensions(item, &width, &height), 0);
    EXPECT_EQ(std::tuple(width, height), std::tuple(960, 540));

    T_Time now{0, 1};
    QNGP_LayerH camera = nullptr;
    ASSERT_EQ(CameraSuite()->GetCamera(frame.Render(), &now, &camera), 0);
    EXPECT_EQ(camera, frame.Layer(0));
    int32_t type = -1;
    ASSERT_EQ(CameraSuite()->GetCameraType(camera, &type), 0);
    EXPECT_EQ(type, kQNGP_CameraOrthographic);
    EXPECT_EQ(CameraSuite()->GetCameraType(frame.Layer(1), &type), kQNGP_ErrWrongLayerKind);
    double distance = 0;
    ASSERT_EQ(CameraSuite()->GetDefaultCameraDistanceToImagePlane(frame.Comp(), &distance), 0);
    EXPECT_DOUBLE_EQ(distance, 960 * 50.0 / 36);

    ASSERT_EQ(LightSuite()->GetLightType(frame.Layer(1), &type), 0);
    EXPECT_EQ(type, 1);  // spot
    EXPECT_EQ(LightSuite()->GetLightType(frame.Layer(0), &type), kQNGP_ErrWrongLayerKind);

    PF_LinearBlendingTables unused;
    const PF_LinearBlendingTables* colorSettings = &unused;
    ASSERT_EQ(ColorSettingsSuite()->GetColorSettings(frame.Render(), &colorSettings), 0);
    EXPECT_EQ(colorSettings, nullptr);
}

TEST(CompSuites, NoCameraMeansNone) {
    ServedFrame frame(CompJson("", R"({"name": "a", "kind": "null"})"));
    T_Time now{0, 1};
    QNGP_LayerH camera = frame.Layer(0);
    ASSERT_EQ(CameraSuite()->GetCamera(frame.Render(), &now, &camera), 0);
    EXPECT_EQ(camera, nullptr);
}

TEST(LayerSuite, EveryLayerOfTheComp) {
    ServedFrame frame(CompJson(kSettings, kLayers));
    const QNGP_LayerSuite10& layers = *LayerSuite();
    int32_t count = 0;
    ASSERT_EQ(layers.GetCompNumLayers(frame.Comp(), &count), 0);
    ASSERT_EQ(count, 7);
    QNGP_LayerH layer = nullptr;
    EXPECT_EQ(layers.GetCompLayerByIndex(frame.Comp(), 7, &layer), kQNGP_ErrBadIndex);

    struct Case {
        int32_t index;
        int32_t flags;
        int32_t objectType;
        bool active;
        bool hasMatte;
    };
    const Case kCases[] = {
        {0, 0, 2, true, false},          // camera
        {1, 0x200, 1, true, false},      // light of the layers below
        {2, 0, 0, true, false},          // null
        {3, 0, 0, true, false},          // stencil
        {4, 0x8 | 0x80, 0, true, true},  // card: motion blur, collapse
        {6, 0, 0, false, false},         // switched off
    };
    T_Time now{0, 1};
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.index);
        ASSERT_EQ(layers.GetCompLayerByIndex(frame.Comp(), c.index, &layer), 0);
        int32_t index = -1, flags = -1, type = -1;
        bool active = !c.active, hasMatte = !c.hasMatte;
        ASSERT_EQ(layers.GetLayerIndex(layer, &index), 0);
        EXPECT_EQ(index, c.index);
        ASSERT_EQ(layers.GetLayerFlags(layer, &flags), 0);
        EXPECT_EQ(flags, c.flags);
        ASSERT_EQ(layers.GetLayerObjectType(layer, &type), 0);
        EXPECT_EQ(type, c.objectType);
        ASSERT_EQ(layers.IsLayerActive(layer, &now, &active), 0);
        EXPECT_EQ(active, c.active);
        ASSERT_EQ(layers.LayerHasTrackMatte(layer, &hasMatte), 0);
        EXPECT_EQ(hasMatte, c.hasMatte);
    }

    QNGP_LayerH card = frame.Layer(4);
    int16_t quality = -1;
    ASSERT_EQ(layers.GetLayerQuality(card, &quality), 0);
    EXPECT_EQ(quality, 1);
    QNGP_LayerTransferMode mode{};
    ASSERT_EQ(layers.GetLayerTransferMode(card, &mode), 0);
    EXPECT_EQ(std::tuple(mode.mode, mode.flags, mode.trackMatte),
              std::tuple(2, kQNGP_TransferPreserveAlpha, 4));
    QNGP_EngineLayer engine{};
    ASSERT_EQ(layers.GetEngineLayer(card, &engine), 0);
    EXPECT_TRUE(engine.isAVLayer);
    EXPECT_FALSE(engine.ignoresPreserveAlpha);
    EXPECT_EQ(engine.samplingQuality, 2);
    ASSERT_EQ(layers.GetEngineLayer(frame.Layer(2), &engine), 0);
    EXPECT_FALSE(engine.isAVLayer);

    M_Matrix4 camera{};
    ASSERT_EQ(layers.GetLayerToWorldXform(frame.Layer(0), &now, &camera), 0);
    EXPECT_DOUBLE_EQ(camera.mat[3][0], 480);
    EXPECT_DOUBLE_EQ(camera.mat[3][1], 270);
    EXPECT_DOUBLE_EQ(camera.mat[3][2], -1000);
    EXPECT_EQ(layers.GetLayerFlags(nullptr, &count), kQNGP_ErrBadHandle);
}

TEST(LayerSuite, UnknownTransferModeFailsWithAPlacedMessage) {
    ServedFrame frame(
        CompJson("", R"({"name": "a", "kind": "solid", "threeD": true, "transferMode": "sparkle",
                "source": {"color": "#ffffff"}})"));
    QNGP_LayerTransferMode mode{};
    EXPECT_EQ(LayerSuite()->GetLayerTransferMode(frame.Layer(0), &mode), kQNGP_ErrHostFailure);
    EXPECT_EQ(frame.Session().Failure(),
              "test.json: layers[0].transferMode: no transfer mode is named \"sparkle\"");
}

TEST(StreamSuite, ValuesByStreamNumber) {
    ServedFrame frame(CompJson(kSettings, kLayers));
    struct Case {
        int32_t layer;
        int32_t stream;
        QNGP_StreamValue value;
    };
    const Case kCases[] = {
        {4, 1, {{10, 20, 30, 0}}},     // position
        {4, 2, {{50, 25, 100, 0}}},    // scale
        {4, 7, {{40, 0, 0, 0}}},       // opacity
        {4, 24, {{100, 0, 0, 0}}},     // ambient
        {1, 16, {{50, 0, 0, 0}}},      // intensity
        {1, 17, {{1, 1, 0.5, 0.25}}},  // colour: alpha, red, green, blue
        {1, 40, {{1, 0, 0, 0}}},       // falloff "none"
    };
    T_Time now{0, 1};
    for (const Case& c : kCases) {
        SCOPED_TRACE(std::to_string(c.layer) + ", stream " + std::to_string(c.stream));
        QNGP_StreamValue value{{-1, -1, -1, -1}};
        ASSERT_EQ(StreamSuite()->GetLayerStreamValue(frame.Layer(c.layer), c.stream,
                                                     kQNGP_TimeModeLayer, &now, 0, &value),
                  0);
        for (int i = 0; i < 4; ++i)
            EXPECT_DOUBLE_EQ(value.v[i], c.value.v[i]);
    }
    QNGP_StreamValue value{};
    EXPECT_EQ(StreamSuite()->GetLayerStreamValue(frame.Layer(0), 24, kQNGP_TimeModeLayer, &now, 0,
                                                 &value),
              kQNGP_ErrNoSuchStream);
    EXPECT_EQ(StreamSuite()->GetLayerStreamValue(frame.Layer(4), 1, 0, &now, 0, &value),
              kQNGP_ErrBadArgument);
}

}  // namespace
}  // namespace ostrel
