#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "raster_test_support.h"
#include "renderer/shadow/shadow_map.h"

namespace {

using raster_test::FilledWorld;
using renderer_test::PixelOf;
using renderer_test::Translation;

// A white floor of 64 × 48 at z = 0 seen 1:1 by an orthographic camera, lit by an ambient
// light of 0.1 and a light of diffuse share 0.5; a 16 × 16 card at z = −20 over (20, 10) casts
// and is not drawn. The parallel light falls with tan 0.5 along +x, so the card's shadow lies
// 20 × 0.5 = 10 to its right: x in [30, 46), y in [10, 26).
constexpr int32_t kWidth = 64, kHeight = 48;
constexpr double kAmbient = 0.1;
const double kTilt = std::atan(0.5);
const double kLit = kAmbient + 0.5 * std::cos(kTilt);

template <class P>
struct ShadowScene {
    explicit ShadowScene(const P& cardColor) : frame(kWidth, kHeight, 2) {
        renderer_test::SetDefaultCamera(&frame.scene, kWidth, kHeight, raster_test::kDistance, 1,
                                        false);
        card = FilledWorld<P>(16, 16, cardColor);
        floor = FilledWorld<P>(kWidth, kHeight, PixelOf<P>(1, 1, 1, 1));
        SY_Material& c = frame.Layer(0, card.get(), Translation(20, 10, -20)).material;
        c.castsShadows = true;
        c.renders = false;
        SY_Material& f = frame.Layer(1, floor.get(), Translation(0, 0, 0)).material;
        f.acceptsShadows = kSY_AcceptsShadowsOn;
        f.ambient = 1;
        f.diffuse = 0.5;
        f.specular = 0;
        for (SY_LayerDesc& layer : frame.scene.layers)
            layer.lightIds = {0, 1};
        frame.scene.lights.Allocate(2);
        SY_LightDesc& light = frame.scene.lights[0];
        light.id = 0;
        light.color[1] = light.color[2] = light.color[3] = 1;
        light.castsShadows = true;
        light.shadowDarkness = 1;
        M_Matrix4 placement = renderer_test::Identity();
        M_RotateMatrix4XYZ(0, kTilt, 0, &placement);
        M_TranslateMatrix4(-60, 24, -200, &placement);  // its axis meets the floor at x = 40
        renderer_test::SetPlacements(&frame.scene.lights[0], {placement});
        SY_LightDesc& ambient = frame.scene.lights[1];
        ambient.type = kSY_LightAmbient;
        ambient.id = 1;
        ambient.color[1] = ambient.color[2] = ambient.color[3] = kAmbient;
    }

    SY_LightDesc& Light() { return frame.scene.lights[0]; }

    // Red, green and blue of every pixel, as fractions of the channel maximum.
    std::vector<std::array<double, 3>> Render(const QNGP_IterateSuite1* iterate = nullptr) {
        PF_WorldX<P> out(kWidth, kHeight);
        frame.Render(&out, iterate);
        std::vector<std::array<double, 3>> pixels;
        for (int32_t k = 0; k < kWidth * kHeight; ++k) {
            const P& p = out.At(k % kWidth, k / kWidth);
            constexpr double kMax = PF_PixelTraits<P>::kMax;
            pixels.push_back({p.red / kMax, p.green / kMax, p.blue / kMax});
        }
        return pixels;
    }

    raster_test::Frame frame;
    std::unique_ptr<PF_WorldX<P>> card, floor;
};

template <class P>
class Shadows : public ::testing::Test {};
TYPED_TEST_SUITE(Shadows, renderer_test::PixelTypes);

// The shadow covers the card's projection to within a pixel. Darkness 1 leaves the ambient
// term, 0.5 half the light; a half-transparent red card passing all light keeps red and half of
// green and blue (1 − (1 − c)·0.5), while one passing none casts a grey half shadow. An
// unbounded floor, drawn from its image, is not lit, yet a half-dark shadow halves it.
TYPED_TEST(Shadows, FallWhereTheLightPutsThemColouredByTheCard) {
    using P = TypeParam;
    renderer_test::AccountedBytesCheck bytes;
    const double half = 0.5 * std::cos(kTilt);
    const struct {
        P card;
        double darkness, transmission;
        std::array<double, 3> shadow;
        bool unboundedFloor = false;  // drawn from its image, unlit but shadowed
    } cases[] = {
        {PixelOf<P>(1, 1, 1, 1), 1, 0, {kAmbient, kAmbient, kAmbient}},
        {PixelOf<P>(1, 1, 1, 1),
         0.5,
         0,
         {kAmbient + half / 2, kAmbient + half / 2, kAmbient + half / 2}},
        {PixelOf<P>(0.5, 1, 0, 0), 1, 1, {kLit, kAmbient + half / 2, kAmbient + half / 2}},
        {PixelOf<P>(0.5, 1, 0, 0),
         1,
         0,
         {kAmbient + half / 2, kAmbient + half / 2, kAmbient + half / 2}},
        {PixelOf<P>(1, 1, 1, 1), 0.5, 0, {0.5, 0.5, 0.5}, true},
    };
    for (const auto& c : cases) {
        ShadowScene<P> scene(c.card);
        scene.Light().shadowDarkness = c.darkness;
        scene.frame.scene.layers[0].material.lightTransmission = c.transmission;
        scene.frame.scene.layers[1].unbounded = c.unboundedFloor;
        const double lit = c.unboundedFloor ? 1.0 : kLit;
        auto pixels = scene.Render();
        for (int32_t y = 0; y < kHeight; ++y) {
            for (int32_t x = 0; x < kWidth; ++x) {
                // Pixels whose centre lies within a pixel of the footprint's border may go either
                // way.
                double inside =
                    std::min({x + 0.5 - 30, 46 - (x + 0.5), y + 0.5 - 10, 26 - (y + 0.5)});
                if (std::fabs(inside) < 1) continue;
                for (int k = 0; k < 3; ++k) {
                    ASSERT_NEAR(pixels[y * kWidth + x][k], inside > 0 ? c.shadow[k] : lit, 0.01)
                        << "case " << &c - cases << " at " << x << "," << y << " channel " << k;
                }
            }
        }
    }
}

// A layer that shows only shadows darkens what lies beneath by them and adds nothing else,
// even over half-transparent pixels: in the shadow of an opaque card at darkness 1 they turn
// black and the shadow's darkness fills their transparent half; elsewhere they stay as they
// were.
TYPED_TEST(Shadows, OnlyDarkenWhatLiesBeneathWhenALayerShowsNothingElse) {
    using P = TypeParam;
    ShadowScene<P> scene(PixelOf<P>(1, 1, 1, 1));
    SY_Material& floor = scene.frame.scene.layers[1].material;
    floor.acceptsShadows = kSY_AcceptsShadowsOnly;
    floor.acceptsLights = false;
    floor.mode = kPF_XferMultiply;
    const P beneath = PixelOf<P>(0.5, 0.5, 0.5, 0.5);
    auto out = FilledWorld<P>(kWidth, kHeight, beneath);
    scene.frame.Render(out.get());
    for (int32_t y = 1; y < kHeight; y += 2) {
        for (int32_t x = 1; x < kWidth; x += 2) {
            bool shadowed = x >= 31 && x < 45 && y >= 11 && y < 25;
            bool lit = x < 29 || x >= 47 || y < 9 || y >= 27;
            const P expected = PixelOf<P>(1, 0, 0, 0);
            if (!shadowed && !lit) continue;  // within a pixel of the footprint's border
            EXPECT_EQ(renderer_test::Channels(out->At(x, y)),
                      renderer_test::Channels(lit ? beneath : expected))
                << x << "," << y;
        }
    }
}

// A card that casts and accepts is lit the same with and without shadows: it never shadows
// itself, though its own occluders lie in the map at its surface.
TYPED_TEST(Shadows, NeverFallOnTheLayerThatCastsThem) {
    using P = TypeParam;
    renderer_test::AccountedBytesCheck bytes;
    std::vector<std::array<double, 3>> renders[2];
    for (bool casts : {false, true}) {
        ShadowScene<P> scene(PixelOf<P>(1, 1, 1, 1));
        SY_Material& card = scene.frame.scene.layers[0].material;
        card.renders = true;
        card.acceptsShadows = kSY_AcceptsShadowsOn;
        card.ambient = 1;
        card.diffuse = 0.5;
        card.specular = 0;
        scene.Light().castsShadows = casts;
        renders[casts] = scene.Render();
    }
    for (int32_t y = 10; y < 26; ++y) {
        for (int32_t x = 20; x < 36; ++x)
            EXPECT_EQ(renders[0][y * kWidth + x], renders[1][y * kWidth + x]) << x << "," << y;
    }
}

// Across the shadow's left edge, the count of pixels between full shadow and full light grows
// with the light's diffusion.
TYPED_TEST(Shadows, WidenTheirPenumbraWithDiffusion) {
    using P = TypeParam;
    renderer_test::AccountedBytesCheck bytes;
    int32_t previous = -1;
    for (double diffusion : {0.0, 3.0, 6.0, 12.0}) {
        ShadowScene<P> scene(PixelOf<P>(1, 1, 1, 1));
        scene.Light().shadowDiffusion = diffusion;
        scene.Light().shadowMapSize = 400;
        scene.frame.scene.layers[1].material.bestQuality = true;  // no third of the map size
        auto pixels = scene.Render();
        int32_t penumbra = 0;
        for (int32_t x = 0; x < kWidth; ++x) {
            double v = pixels[18 * kWidth + x][0];
            penumbra += v > kAmbient + 0.01 && v < kLit - 0.01;
        }
        EXPECT_GT(penumbra, previous) << "diffusion " << diffusion;
        previous = penumbra;
    }
}

// A point light 20 above the floor and a half-opaque grey strip 10 above it across the whole
// width: the shadow band crosses the light's face seams (45° off its axis, at x = 12 and 52)
// and lets exactly half of the light's diffuse term through everywhere along its middle row.
TYPED_TEST(Shadows, CrossCubeFaceSeamsEvenly) {
    using P = TypeParam;
    renderer_test::AccountedBytesCheck bytes;
    std::vector<std::array<double, 3>> renders[2];
    for (bool casts : {false, true}) {
        ShadowScene<P> scene(PixelOf<P>(0.5, 0.5, 0.5, 0.5));
        renderer_test::SetPlacements(&scene.frame.scene.layers[0], {Translation(-40, 20, -10)});
        renderer_test::SetRect(&scene.frame.scene.layers[0], 0, 0, 144, 8);
        scene.card = FilledWorld<P>(144, 8, PixelOf<P>(0.5, 0.5, 0.5, 0.5));
        scene.frame.fetcher.Add(0, scene.card.get());
        scene.Light().type = kSY_LightPoint;
        scene.Light().castsShadows = casts;
        renderer_test::SetPlacements(&scene.Light(), {Translation(32, 24, -20)});
        renders[casts] = scene.Render();
    }
    for (int32_t x = 0; x < kWidth; ++x) {
        double lit = renders[0][24 * kWidth + x][0];
        EXPECT_NEAR(renders[1][24 * kWidth + x][0], kAmbient + (lit - kAmbient) / 2, 0.01) << x;
    }
}

template <class P>
class ShadowsThreads : public ::testing::Test {};
TYPED_TEST_SUITE(ShadowsThreads, renderer_test::PixelTypes);

// Maps built and looked up on three threads give the frame one thread gives: occluder lists
// filled row by row from per-thread pools, lookups that share the maps without writing them.
TYPED_TEST(ShadowsThreads, ThreadedFrameEqualsSingleThreadedFrame) {
    using P = TypeParam;
    std::vector<std::array<double, 3>> renders[2];
    for (bool threaded : {false, true}) {
        renderer_test::ThreadedFrame<3> threads;
        ShadowScene<P> scene(PixelOf<P>(0.7, 1, 0.5, 0));
        scene.Light().shadowDiffusion = 5;
        scene.frame.scene.layers[0].material.lightTransmission = 0.5;
        scene.frame.scene.layers[1].material.bestQuality = true;
        renders[threaded] =
            scene.Render(threaded ? renderer_test::ThreadedIterateSuite<3>::Suite() : nullptr);
    }
    EXPECT_EQ(renders[0], renders[1]);
}

// Memory running out anywhere in a frame with shadow maps ends it with error 4 (or the
// standard exception of a tracked object) and leaves nothing accounted.
TEST(Shadows, OutOfMemoryReleasesEverything) {
    int32_t failures = renderer_test::FailEachAllocationInTurn(
        [](auto fail) {
            ShadowScene<PF_Pixel8> scene(PixelOf<PF_Pixel8>(1, 1, 1, 1));
            scene.Light().shadowDiffusion = 4;
            PF_WorldX<PF_Pixel8> out(kWidth, kHeight);
            auto failing = fail();
            scene.frame.Render(&out);
        },
        true);
    EXPECT_GT(failures, 10);
}

// A 12 × 12 texel map seen straight along z from a parallel light (texel (i, j) under x, y in
// [i, i + 1) × [j, j + 1); depth −z), every texel holding `list`, or all empty but texel
// (6, 6), which holds an opaque entry. Hard and soft lookups at (x, y, z) by a receiver.
struct MapCase {
    const char* what;
    std::vector<SY_ShadowEntry> list;
    double x, z;
    uint16_t receiver;
    float hard, soft;
};

TEST(Shadows, PlanarMapLookupsSeeTheLightLeftBehindOtherLayers) {
    constexpr uint16_t kOwn = 3, kOther = 5;
    const SY_ShadowEntry own{-10, kOwn | kSY_ShadowStep, 0, 0, 0}, far{-20, kOther, 0, 0, 0},
        half{-10, kOther, 16384, 16384, 16384},
        halfFront{-5, kOther | kSY_ShadowStep, 16384, 16384, 16384};
    // On the centre of texel (7, 6) the filter weighs it by 1 and its four edge neighbours by
    // exp(−1), one of them the dark texel (6, 6).
    const float e = std::exp(-1.0f), edge = (1 + 3 * e) / (1 + 4 * e);
    const MapCase cases[] = {
        {"in front of another layer", {far}, 3.5, 15, kOwn, 1, 1},
        {"behind another layer", {far}, 3.5, 25, kOwn, 0, 0},
        {"behind only its own layer", {own, far}, 3.5, 15, kOwn, 1, 1},
        {"another receiver there", {own, far}, 3.5, 15, 7, 0, 0},
        {"behind half a layer", {half}, 3.5, 15, kOwn, 0.5f, 0.5f},
        // Its own opaque entry starts the dark run, yet it sees the half light in front of it.
        {"behind its own layer under another", {halfFront, own, far}, 3.5, 15, kOwn, 0.5f, 0.5f},
        {"beside one dark texel", {}, 7.5, 25, kOwn, 1, edge},
    };
    for (const MapCase& c : cases) {
        SY_ShadowBlock<uint32_t> starts("starts", 145);
        SY_ShadowBlock<SY_ShadowEntry> entries("entries", 144 * 3);
        uint32_t written = 0;
        for (int32_t t = 0; t < 144; ++t) {
            starts[t] = written;
            for (const SY_ShadowEntry& entry : c.list)
                entries[written++] = entry;
            if (c.list.empty() && t == 6 * 12 + 6) entries[written++] = far;
        }
        starts[144] = written;
        const double rect[4] = {0, 0, 12, 12}, p[3] = {c.x, 6.5, c.z};
        SY_PlanarShadowMap map(renderer_test::Identity(), false, rect, {0, 0, 12, 12},
                               std::move(starts), std::move(entries));
        float hard[4], soft[4];
        map.HardLookup(p, c.receiver, hard);
        map.SoftLookup(p, c.receiver, soft);
        EXPECT_FLOAT_EQ(hard[1], c.hard) << c.what;
        EXPECT_NEAR(soft[1], c.soft, 1e-6) << c.what;
    }
}

}  // namespace
