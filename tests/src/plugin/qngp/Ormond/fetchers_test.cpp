// The fetchers and the progress object over a canvas that serves one layer with a matte layer,
// with a downsample of 2 × 3.
#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "plugin_test_support.h"
#include "progress_abort.h"
#include "render_context.h"
#include "texture_fetcher.h"
#include "track_matte_fetcher.h"
#include "u_memory.h"

namespace {

using ormond_test::FakeHost;

int gLayerContext, gMatteContext;

// What the canvas was asked, and how it answers.
struct Canvas {
    static Canvas& Get() {
        static Canvas canvas;
        return canvas;
    }
    bool hasMatte = true;
    int32_t renders = 0, renderMode = -1, textureHints = -1, disposed = 0, progressAnswer = 0;
    std::vector<std::vector<int32_t>> progress;  // which report, count, total
    PF_World texture{1, 1, 16, 32, nullptr};
};

QNGP_CanvasSuite10 MakeCanvas() {
    QNGP_CanvasSuite10 c{};
    c.GetCompToRender = [](QNGP_RenderContextH, QNGP_CompH*) { return int32_t{0}; };
    c.GetCompDestination = [](QNGP_RenderContextH, QNGP_CompH, PF_World**) { return int32_t{0}; };
    c.GetDownsample = [](QNGP_RenderContextH, int16_t* dx, int16_t* dy) {
        *dx = 2;
        *dy = 3;
        return int32_t{0};
    };
    c.GetNthLayerContext = [](QNGP_RenderContextH, int32_t, QNGP_LayerContextH* context) {
        *context = reinterpret_cast<QNGP_LayerContextH>(&gLayerContext);
        return int32_t{0};
    };
    c.GetLayerFromLayerContext = [](QNGP_RenderContextH, QNGP_LayerContextH, QNGP_LayerH*) {
        return int32_t{0};
    };
    c.GetTrackMatteContext = [](QNGP_RenderContextH, QNGP_LayerContextH,
                                QNGP_LayerContextH* matte) {
        *matte =
            Canvas::Get().hasMatte ? reinterpret_cast<QNGP_LayerContextH>(&gMatteContext) : nullptr;
        return int32_t{0};
    };
    c.RenderLayer = [](QNGP_RenderContextH, QNGP_LayerH, QNGP_LayerContextH, int32_t mode,
                       PF_World** world) {
        ++Canvas::Get().renders;
        Canvas::Get().renderMode = mode;
        *world = new PF_WorldX<PF_Pixel8>(2, 1);
        return int32_t{0};
    };
    c.RenderTexture = [](QNGP_RenderContextH, QNGP_LayerContextH, int32_t hints, const double*,
                         const M_LRect*, M_Matrix3* source, PF_World** world) {
        Canvas::Get().textureHints = hints;
        *source = M_Matrix3{{{0.5, 0, 0}, {0, 0.5, 0}, {3, 4, 1}}};
        *world = &Canvas::Get().texture;
        return int32_t{0};
    };
    c.DisposeTexture = [](QNGP_RenderContextH, QNGP_LayerContextH, PF_World* world) {
        Canvas::Get().disposed += world == &Canvas::Get().texture;
        return int32_t{0};
    };
    c.ReportRenderProgress = [](QNGP_RenderContextH, int32_t count, int32_t total) {
        Canvas::Get().progress.push_back({1, count, total});
        return Canvas::Get().progressAnswer;
    };
    c.ReportRowProgress = [](QNGP_RenderContextH, int32_t count, int32_t total) {
        Canvas::Get().progress.push_back({2, count, total});
        return Canvas::Get().progressAnswer;
    };
    return c;
}

const QNGP_CanvasSuite10 kCanvas = MakeCanvas();

class Fetchers : public ::testing::Test {
protected:
    Fetchers() {
        Canvas::Get() = Canvas{};
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
        EXPECT_EQ(Canvas::Get().renders, 1);
        EXPECT_EQ(Canvas::Get().renderMode, kQNGP_RenderMatte);
        fetcher.Release();
        ASSERT_NE(fetcher.Fetch(), nullptr);
        EXPECT_EQ(Canvas::Get().renders, 2);

        Canvas::Get().hasMatte = false;
        ORM_TTrackMatteFetcher none(context.get(), nullptr, nullptr, ORM_MatteType::kLuma);
        EXPECT_EQ(none.Fetch(), nullptr);
    }
    context.reset();
    EXPECT_EQ(U_AccountedBytes(), start);  // the held world went with the fetcher
    EXPECT_EQ(host.Held(), 0);
    EXPECT_EQ(FakeHost::Of(options).locks, 0);
}

TEST_F(Fetchers, TextureMatrixScalesTheSourceByTheDownsampleAndAWholeLayerIsItsOwnSize) {
    ORM_TTextureFetcher fetcher(context.get());
    M_Matrix3 matrix;
    PF_World* world = nullptr;
    EXPECT_EQ(fetcher.Fetch(0, false, nullptr, nullptr, &matrix, &world), 0);
    EXPECT_EQ(world, &Canvas::Get().texture);
    EXPECT_EQ(Canvas::Get().textureHints, 1);
    // source · diag(2, 3, 1)
    auto rows = [&] { return testing::PrintToString(matrix.mat); };
    EXPECT_EQ(rows(), "{ { 1, 0, 0 }, { 0, 1.5, 0 }, { 6, 12, 1 } }");
    fetcher.Release(0, world);
    EXPECT_EQ(Canvas::Get().disposed, 1);

    EXPECT_EQ(fetcher.Fetch(0, true, nullptr, nullptr, &matrix, &world), 0);
    std::unique_ptr<PF_World> owned(world);
    EXPECT_EQ(Canvas::Get().renderMode, kQNGP_RenderWholeLayer);
    EXPECT_EQ(rows(), "{ { 1, 0, 0 }, { 0, 1, 0 }, { 0, 0, 1 } }");
}

TEST_F(Fetchers, ProgressGoesToTheHostAndItsCancelIsThrown) {
    ORM_TProgressAbort progress(context.get());
    progress.ReportRenderables(1, 4);
    progress.ReportRows(8, 48);
    const std::vector<std::vector<int32_t>> expected{{1, 1, 4}, {2, 8, 48}};
    EXPECT_EQ(Canvas::Get().progress, expected);

    Canvas::Get().progressAnswer = 0x77;
    int32_t thrown = 0;
    try {
        progress.ReportRows(12, 48);
    } catch (int32_t code) {
        thrown = code;
    }
    EXPECT_EQ(thrown, 0x77);
}

}  // namespace
