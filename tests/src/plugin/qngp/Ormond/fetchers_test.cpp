// What the renderer calls back: the track matte fetcher, which has the host render the matte
// layer and converts it in place, and the progress object, over a canvas that serves one layer
// with a matte layer. Layer textures are fetched in every render of the examples.
#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "entry_guard.h"
#include "matte_conversion.h"
#include "pf_world.h"
#include "plugin_test_support.h"
#include "progress_abort.h"
#include "render_context.h"
#include "track_matte_fetcher.h"
#include "u_memory.h"

namespace {

using ormond_test::FakeHost;

// What the canvas was asked, and how it answers.
struct Canvas {
    bool hasMatte = true;
    int32_t renders = 0, renderMode = -1, progressAnswer = 0;
    std::vector<std::vector<int32_t>> progress;  // which report, count, total
} gCanvas;

QNGP_CanvasSuite10 MakeCanvas() {
    QNGP_CanvasSuite10 c{};
    c.GetCompToRender = [](QNGP_RenderContextH, QNGP_CompH*) { return int32_t{0}; };
    c.GetCompDestination = [](QNGP_RenderContextH, QNGP_CompH, PF_World**) { return int32_t{0}; };
    c.GetLayerFromLayerContext = [](QNGP_RenderContextH, QNGP_LayerContextH, QNGP_LayerH*) {
        return int32_t{0};
    };
    c.GetTrackMatteContext = [](QNGP_RenderContextH, QNGP_LayerContextH,
                                QNGP_LayerContextH* matte) {
        *matte = gCanvas.hasMatte ? reinterpret_cast<QNGP_LayerContextH>(&gCanvas) : nullptr;
        return int32_t{0};
    };
    c.RenderLayer = [](QNGP_RenderContextH, QNGP_LayerH, QNGP_LayerContextH, int32_t mode,
                       PF_World** world) {
        ++gCanvas.renders;
        gCanvas.renderMode = mode;
        *world = new PF_WorldX<PF_Pixel8>(2, 1);
        return int32_t{0};
    };
    c.ReportRenderProgress = [](QNGP_RenderContextH, int32_t count, int32_t total) {
        gCanvas.progress.push_back({1, count, total});
        return gCanvas.progressAnswer;
    };
    c.ReportRowProgress = [](QNGP_RenderContextH, int32_t count, int32_t total) {
        gCanvas.progress.push_back({2, count, total});
        return gCanvas.progressAnswer;
    };
    return c;
}

const QNGP_CanvasSuite10 kCanvas = MakeCanvas();

class Fetchers : public ::testing::Test {
protected:
    Fetchers() {
        gCanvas = Canvas{};
        host.Serve(kQNGP_CanvasSuite, 10, &kCanvas);
        options = host.Make(std::vector<uint8_t>(sizeof(ORM_InstanceOptions)));
        in = {host.Basic(), 1};
        context = std::make_unique<ORM_RenderContext>(
            &in, ORM_RenderHandles{nullptr, nullptr, nullptr, nullptr, options, nullptr});
    }

    int64_t start = U_AccountedBytes();
    FakeHost host;
    QNGP_MemHandle options = nullptr;
    QNGP_InData in{};
    std::unique_ptr<ORM_RenderContext> context;
};

TEST_F(Fetchers, MatteIsRenderedOnceUntilReleased) {
    {
        ORM_TTrackMatteFetcher fetcher(context.get(), nullptr, nullptr, ORM_MatteType::kLuma);
        PF_World* first = fetcher.Fetch();
        ASSERT_NE(first, nullptr);
        EXPECT_EQ(fetcher.Fetch(), first);
        EXPECT_EQ(gCanvas.renders, 1);
        EXPECT_EQ(gCanvas.renderMode, kQNGP_RenderMatte);
        fetcher.Release();
        ASSERT_NE(fetcher.Fetch(), nullptr);
        EXPECT_EQ(gCanvas.renders, 2);

        gCanvas.hasMatte = false;
        ORM_TTrackMatteFetcher none(context.get(), nullptr, nullptr, ORM_MatteType::kLuma);
        EXPECT_EQ(none.Fetch(), nullptr);
    }
    context.reset();
    EXPECT_EQ(U_AccountedBytes(), start);  // the held world went with the fetcher
    EXPECT_EQ(host.Held(), 0);
    EXPECT_EQ(FakeHost::Of(options).locks, 0);
}

TEST_F(Fetchers, ProgressGoesToTheHostAndItsCancelIsThrown) {
    ORM_TProgressAbort progress(context.get());
    progress.ReportRenderables(1, 4);
    progress.ReportRows(8, 48);
    const std::vector<std::vector<int32_t>> expected{{1, 1, 4}, {2, 8, 48}};
    EXPECT_EQ(gCanvas.progress, expected);

    gCanvas.progressAnswer = 0x77;
    EXPECT_EQ(ORM_Guard([&] { progress.ReportRows(12, 48); }), 0x77);
}

// One pixel converted in a 1×1 world of its depth; returns the new alpha.
template <class P>
auto ConvertOne(P pixel, ORM_MatteType type) {
    PF_WorldX<P> world(1, 1);
    world.At(0, 0) = pixel;
    ORM_ConvertMatteWorld(world, type);
    EXPECT_EQ(world.At(0, 0).red, pixel.red);  // colour is left as it was
    return world.At(0, 0).alpha;
}

TEST(MatteConversion, WhiteOpaqueAtEachDepth) {
    struct Case {
        ORM_MatteType type;
        bool shows;  // full alpha, or none
    };
    for (const Case& c : {Case{ORM_MatteType::kAlpha, true},
                          {ORM_MatteType::kInvertedAlpha, false},
                          {ORM_MatteType::kLuma, true},
                          {ORM_MatteType::kInvertedLuma, false}}) {
        SCOPED_TRACE(static_cast<int>(c.type));
        EXPECT_EQ(ConvertOne(PF_Pixel8{255, 255, 255, 255}, c.type), c.shows ? 255 : 0);
        EXPECT_EQ(ConvertOne(PF_Pixel16{32768, 32768, 32768, 32768}, c.type), c.shows ? 32768 : 0);
        EXPECT_FLOAT_EQ(ConvertOne(PF_PixelFloat{1, 1, 1, 1}, c.type), c.shows ? 1 : 0);
    }
}

// The channel weights show in the luma matte of the examples' references; the rounding of a
// partly clear pixel and the float clamps do not.
TEST(MatteConversion, LumaTruncatesAndFloatClampsToTheUnitRange) {
    // Half alpha: (16384 × 19235 + 16383) / 32768 = 9617.99…, truncated.
    EXPECT_EQ(ConvertOne(PF_Pixel16{16384, 0, 32768, 0}, ORM_MatteType::kLuma), 9617);
    EXPECT_FLOAT_EQ(ConvertOne(PF_PixelFloat{0.5f, 0, 0, 1}, ORM_MatteType::kLuma), 0.057f);
    // A float product below 1e-16 is exactly no matte; above 1 it is full.
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1e-9f, 1e-9f, 1e-9f, 1e-9f}, ORM_MatteType::kLuma), 0.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1e-9f, 1e-9f, 1e-9f, 1e-9f}, ORM_MatteType::kInvertedLuma),
              1.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, -1, -1, -1}, ORM_MatteType::kLuma), 0.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, 2, 2, 2}, ORM_MatteType::kLuma), 1.0f);
    EXPECT_EQ(ConvertOne(PF_PixelFloat{1, 2, 2, 2}, ORM_MatteType::kInvertedLuma), 0.0f);
}

TEST(MatteConversion, UnexpectedDepthIsReportedAndThrowsThree) {
    uint8_t pixels[8] = {};
    PF_World world(1, 1, 8, 64, pixels);
    FakeHost host;
    EXPECT_EQ(ORM_Guard([&] { ORM_ConvertMatteWorld(world, ORM_MatteType::kLuma); }), 3);
    EXPECT_EQ(host.Reports().size(), 1u);
}

}  // namespace
