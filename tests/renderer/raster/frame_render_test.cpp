#include <gtest/gtest.h>

#include <cstring>

#include "raster_test_support.h"
#include "u_memory.h"

namespace {

using raster_test::Code;
using raster_test::Equal;
using raster_test::Frame;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;
using raster_test::PatternTexture;
using scene_test::Translation;

constexpr int32_t kWidth = 64, kHeight = 48;

TEST(FrameRender, FieldModesDrawEveryOtherRow) {
    struct Case {
        int32_t fieldMode;
        int32_t skippedParity;  // −1: no row skipped
    };
    for (const Case& c : {Case{0, -1}, Case{1, 1}, Case{2, 0}}) {
        SCOPED_TRACE(c.fieldMode);
        auto texture = PatternTexture<PF_Pixel8>(8, 8);
        Frame frame(kWidth, kHeight, 1);
        frame.Layer(0, texture.get(), Translation(4, 4, 0));
        frame.scene.fieldMode = c.fieldMode;
        PF_WorldX<PF_Pixel8> destination(kWidth, kHeight);
        frame.Render(&destination);
        for (int32_t y = 4; y < 12; ++y) {
            bool skipped = (y & 1) == c.skippedParity;
            EXPECT_EQ(IsClear(destination.At(6, y)), skipped) << y;
        }
    }
}

// A layer reaching over the right and bottom borders: its top and left edges are outlined,
// the edges that the output's border cut are not.
TEST(FrameRender, WireframeOutlinesTheLayerButNotTheOutputBorder) {
    auto texture = PatternTexture<PF_Pixel8>(40, 40);
    Frame frame(kWidth, kHeight, 1);
    SY_LayerDesc& layer = frame.Layer(0, texture.get(), Translation(40, 30, 0));
    layer.material.renders = false;
    layer.material.wireframe = true;
    PF_WorldX<PF_Pixel8> destination(kWidth, kHeight);
    frame.Render(&destination);
    auto white = [](const PF_Pixel8& p) {
        return p.alpha > 0 && p.red == 255 && p.green == 255 && p.blue == 255;
    };
    EXPECT_TRUE(white(destination.At(50, 29)) || white(destination.At(50, 30)));
    EXPECT_TRUE(white(destination.At(39, 40)) || white(destination.At(40, 40)));
    for (int32_t y = 32; y < kHeight; ++y)
        EXPECT_TRUE(IsClear(destination.At(kWidth - 1, y))) << y;
    for (int32_t x = 42; x < kWidth; ++x)
        EXPECT_TRUE(IsClear(destination.At(x, kHeight - 1))) << x;
    EXPECT_TRUE(IsClear(destination.At(50, 40)));  // inside: nothing rendered
    EXPECT_EQ(frame.fetcher.fetches, 0);
}

// A best-quality layer sampled at the nearest texel at two instants 4 pixels apart: where both
// instants cover a pixel it is opaque, where one does alpha is halved, colour unchanged.
TEST(FrameRender, MotionSubsamplesAverageCoverageAndKeepColor) {
    const PF_Pixel8 color = Opaque<PF_Pixel8>(200, 100, 50);
    auto texture = raster_test::FilledWorld<PF_Pixel8>(8, 8, color);
    Frame frame(kWidth, kHeight, 1);
    SY_LayerDesc& layer = frame.Layer(0, texture.get(), Translation(10, 10, 0));
    scene_test::SetPlacements(&layer, {Translation(10, 10, 0), Translation(14, 10, 0)});
    layer.material.motionBlur = true;
    layer.material.bestQuality = true;
    PF_WorldX<PF_Pixel8> destination(kWidth, kHeight);
    frame.Render(&destination);
    for (int32_t x = 8; x < 24; ++x) {
        const PF_Pixel8& got = destination.At(x, 12);
        int32_t instants = (x >= 10 && x < 18) + (x >= 14 && x < 22);
        if (instants == 0) {
            EXPECT_TRUE(IsClear(got)) << x;
            continue;
        }
        EXPECT_EQ(got.alpha, instants == 2 ? 255 : 128) << x;
        EXPECT_EQ(got.red, 200) << x;
        EXPECT_EQ(got.green, 100) << x;
        EXPECT_EQ(got.blue, 50) << x;
    }
}

class FailingFetcher : public ostrel_test::MemoryTextureFetcher {
public:
    int32_t Fetch(int32_t, bool, const double*, const M_LRect*, M_Matrix3*, PF_World**) override {
        return 7;
    }
};

class CancellingProgress : public ostrel_test::RecordingProgress {
public:
    void ReportRows(int32_t, int32_t) override { throw int32_t{9}; }
};

// Every way out of a frame hands the textures back and leaves the accounted bytes as they were.
TEST(FrameRender, FailuresFreeWhatTheFrameTook) {
    auto texture = PatternTexture<PF_Pixel16>(20, 20);
    int64_t start = U_AccountedBytes();
    {
        SY_SceneDesc scene;
        ostrel_test::SetDefaultCamera(&scene, kWidth, kHeight, raster_test::kDistance);
        scene.layers.Allocate(1);
        scene_test::SetPlacements(&scene.layers[0], {Translation(3, 3, 0)});
        scene_test::SetRect(&scene.layers[0], 0, 0, 20, 20);
        PF_WorldX<PF_Pixel16> destination(kWidth, kHeight);

        FailingFetcher failing;
        ostrel_test::RecordingProgress progress;
        int32_t thrown = 0;
        try {
            SY_RenderFrame(scene, &failing, &progress, nullptr, false, &destination, nullptr);
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, 7);

        ostrel_test::MemoryTextureFetcher fetcher;
        fetcher.Add(0, texture.get());
        CancellingProgress cancelling;
        thrown = 0;
        try {
            SY_RenderFrame(scene, &fetcher, &cancelling, nullptr, false, &destination, nullptr);
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, 9);
        EXPECT_EQ(fetcher.fetches, 1);
        EXPECT_EQ(fetcher.releases, 1);
        EXPECT_EQ(fetcher.UseCount(0), 0);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

// Several layers of every kind the span routines know, drawn over three threads and over one:
// the frames are equal byte for byte.
void RenderMixedFrame(PF_World* plain, PF_World* large, PF_World* destination,
                      const QNGP_IterateSuite1* iterate) {
    Frame frame(kWidth, kHeight, 4);
    frame.Layer(0, plain, Translation(2, 3, 0));
    SY_LayerDesc& turned = frame.Layer(
        1, large, scene_test::Turned(32, 32, 0.3, 0.6, kWidth / 2.0, kHeight / 2.0, 80));
    turned.material.bestQuality = true;
    turned.material.engineFlag = SY_SamplingFilter::kBilinear;
    SY_LayerDesc& bicubic = frame.Layer(2, plain, scene_test::Turned(15, 10, 0, 0.4, 40, 30, 20));
    bicubic.material.bestQuality = true;
    bicubic.material.engineFlag = SY_SamplingFilter::kBicubic;
    bicubic.material.opacity = 0.7;
    bicubic.material.mode = kPF_XferMultiply;
    SY_LayerDesc& moving = frame.Layer(3, plain, Translation(30, 5, 0));
    scene_test::SetPlacements(&moving, {Translation(30, 5, 0), Translation(34, 9, -30)});
    moving.material.motionBlur = true;
    moving.material.bestQuality = true;
    moving.material.engineFlag = SY_SamplingFilter::kBilinear;
    frame.Render(destination, iterate);
}

template <class P>
class FrameRenderThreads : public ::testing::Test {};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(FrameRenderThreads, PixelTypes);

TYPED_TEST(FrameRenderThreads, ThreadedFrameEqualsSingleThreadedFrame) {
    using P = TypeParam;
    auto plain = PatternTexture<P>(30, 20);
    auto large = PatternTexture<P>(64, 64);
    PF_WorldX<P> single(kWidth, kHeight), threaded(kWidth, kHeight);
    RenderMixedFrame(plain.get(), large.get(), &single, nullptr);
    RenderMixedFrame(plain.get(), large.get(), &threaded,
                     ostrel_test::ThreadedIterateSuite<3>::Suite());
    int32_t drawn = 0;
    for (int32_t y = 0; y < kHeight; ++y) {
        ASSERT_EQ(std::memcmp(single.Row(y), threaded.Row(y), sizeof(P) * kWidth), 0) << y;
        for (int32_t x = 0; x < kWidth; ++x)
            drawn += !IsClear(single.At(x, y));
    }
    EXPECT_GT(drawn, kWidth * kHeight / 3);
}

}  // namespace
