// The fetchers and the progress object over a canvas that serves one layer with a white, opaque
// matte layer.
#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "instance_options.h"
#include "plugin_test_support.h"
#include "progress_abort.h"
#include "render_context.h"
#include "texture_fetcher.h"
#include "track_matte_fetcher.h"
#include "u_memory.h"

namespace {

using ormond_test::MemoryHost;
using ormond_test::SuiteServer;

int gComp, gLayerContext, gMatteContext, gLayer, gMatteLayer;

// What the canvas was asked, and how it answers.
struct Canvas {
    static Canvas& Get() {
        static Canvas canvas;
        return canvas;
    }
    bool hasMatte = true;
    int32_t renders = 0;
    int32_t renderMode = -1;
    int32_t textureHints = -1;
    int32_t disposed = 0;
    int32_t progressAnswer = 0;
    std::vector<std::vector<int32_t>> progress;  // which report, count, total
    PF_World texture{1, 1, 16, 32, nullptr};
};

QNGP_CanvasSuite10 MakeCanvas() {
    QNGP_CanvasSuite10 c{};
    c.GetCompToRender = [](QNGP_RenderContextH, QNGP_CompH* comp) {
        *comp = reinterpret_cast<QNGP_CompH>(&gComp);
        return int32_t{0};
    };
    c.GetCompDestination = [](QNGP_RenderContextH, QNGP_CompH, PF_World** world) {
        *world = nullptr;
        return int32_t{0};
    };
    c.GetDownsample = [](QNGP_RenderContextH, int16_t* dx, int16_t* dy) {
        *dx = 2;
        *dy = 3;
        return int32_t{0};
    };
    c.GetNthLayerContext = [](QNGP_RenderContextH, int32_t, QNGP_LayerContextH* context) {
        *context = reinterpret_cast<QNGP_LayerContextH>(&gLayerContext);
        return int32_t{0};
    };
    c.GetLayerFromLayerContext = [](QNGP_RenderContextH, QNGP_LayerContextH context,
                                    QNGP_LayerH* layer) {
        bool matte = context == reinterpret_cast<QNGP_LayerContextH>(&gMatteContext);
        *layer = reinterpret_cast<QNGP_LayerH>(matte ? &gMatteLayer : &gLayer);
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
        auto* white = new PF_WorldX<PF_Pixel8>(2, 1);
        white->At(0, 0) = white->At(1, 0) = PF_Pixel8{255, 255, 255, 255};
        *world = white;
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
        server.Serve(kQNGP_CanvasSuite, 10, &kCanvas);
        server.Serve(kQNGP_MemorySuite, 1, MemoryHost::Suite());
        options = memory.Make(std::vector<uint8_t>(sizeof(ORM_InstanceOptions)));
        in = {server.Basic(), 1};
    }

    std::unique_ptr<ORM_RenderContext> MakeContext() {
        return std::make_unique<ORM_RenderContext>(
            &in, ORM_RenderHandles{nullptr, nullptr, nullptr, nullptr, options, nullptr});
    }

    int64_t start = U_AccountedBytes();
    SuiteServer server;
    MemoryHost memory;
    QNGP_MemHandle options = nullptr;
    QNGP_InData in{};
};

TEST_F(Fetchers, MatteFetchedTwiceIsRenderedOnceAndConverted) {
    {
        auto context = MakeContext();
        ORM_TTrackMatteFetcher fetcher(context.get(), nullptr, nullptr,
                                       ORM_MatteType::kInvertedLuma);
        PF_World* first = fetcher.Fetch();
        ASSERT_NE(first, nullptr);
        EXPECT_EQ(fetcher.Fetch(), first);
        EXPECT_EQ(Canvas::Get().renders, 1);
        EXPECT_EQ(Canvas::Get().renderMode, 0);
        EXPECT_EQ(first->PixelAt<PF_Pixel8>(1, 0)->alpha, 0);  // white inverted
        EXPECT_EQ(first->PixelAt<PF_Pixel8>(1, 0)->red, 255);

        fetcher.Release();
        ASSERT_NE(fetcher.Fetch(), nullptr);
        EXPECT_EQ(Canvas::Get().renders, 2);
    }
    EXPECT_EQ(U_AccountedBytes(), start);  // the held world went with the fetcher
    EXPECT_EQ(server.Held(), 0);
    EXPECT_EQ(MemoryHost::Of(options).locks, 0);
}

TEST_F(Fetchers, LayerWithoutMatteContextFetchesNone) {
    Canvas::Get().hasMatte = false;
    auto context = MakeContext();
    ORM_TTrackMatteFetcher fetcher(context.get(), nullptr, nullptr, ORM_MatteType::kLuma);
    EXPECT_EQ(fetcher.Fetch(), nullptr);
    EXPECT_EQ(Canvas::Get().renders, 0);
}

TEST_F(Fetchers, OutsideOfAPlainMatteIsClear) {
    auto context = MakeContext();
    const bool kClear[] = {true, false, true, false};
    for (int32_t type = 1; type <= 4; ++type) {
        ORM_TTrackMatteFetcher fetcher(context.get(), nullptr, nullptr,
                                       static_cast<ORM_MatteType>(type));
        EXPECT_EQ(fetcher.OutsideIsClear(), kClear[type - 1]) << "type " << type;
    }
}

TEST_F(Fetchers, TextureMatrixScalesTheSourceMatrixByTheDownsample) {
    auto context = MakeContext();
    ORM_TTextureFetcher fetcher(context.get());
    M_Matrix3 matrix;
    PF_World* world = nullptr;
    EXPECT_EQ(fetcher.Fetch(0, false, nullptr, nullptr, &matrix, &world), 0);
    EXPECT_EQ(world, &Canvas::Get().texture);
    EXPECT_EQ(Canvas::Get().textureHints, 1);
    // source · diag(2, 3, 1)
    const M_Matrix3 expected{{{1, 0, 0}, {0, 1.5, 0}, {6, 12, 1}}};
    for (int r = 0; r < 3; ++r) {
        for (int c = 0; c < 3; ++c)
            EXPECT_DOUBLE_EQ(matrix.mat[r][c], expected.mat[r][c]) << r << "," << c;
    }
    fetcher.Release(0, world);
    EXPECT_EQ(Canvas::Get().disposed, 1);
}

TEST_F(Fetchers, WholeLayerComesAtItsOwnSizeWithIdentityMatrix) {
    auto context = MakeContext();
    ORM_TTextureFetcher fetcher(context.get());
    M_Matrix3 matrix;
    PF_World* world = nullptr;
    EXPECT_EQ(fetcher.Fetch(0, true, nullptr, nullptr, &matrix, &world), 0);
    std::unique_ptr<PF_World> owned(world);
    EXPECT_EQ(Canvas::Get().renderMode, 2);
    for (int r = 0; r < 3; ++r) {
        for (int c = 0; c < 3; ++c)
            EXPECT_EQ(matrix.mat[r][c], r == c ? 1 : 0);
    }
}

TEST_F(Fetchers, ProgressGoesToTheHostAndItsCancelIsThrown) {
    auto context = MakeContext();
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
