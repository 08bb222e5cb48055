#include "renderer/scene/screen_geometry.h"

#include <gtest/gtest.h>

#include "renderer/scene/layer_projection.h"
#include "renderer/scene/render_context.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

constexpr int32_t kWidth = 200, kHeight = 100;

// A frame's context under an orthographic camera 400 pixels from the plane z = 0, and the
// geometry of a 64 × 32 layer built in it.
struct Fixture {
    explicit Fixture(const M_Matrix4& placement) {
        renderer_test::SetDefaultCamera(&scene, kWidth, kHeight, 400, 1, false);
        SY_SetUpContext(&context, scene, &fetcher, nullptr, nullptr, false, nullptr);
        fetcher.Add(0, &texture);
        renderer_test::SetPlacements(&layer, {placement});
        renderer_test::SetRect(&layer, 0, 0, 64, 32);
        SY_SetUpOptions options;
        options.output = {0, 0, kWidth, kHeight};
        SY_CameraView camera{context.frameWorldToScreen.Data(), 1, false};
        EXPECT_TRUE(SY_SetUpRenderable(layer, camera, options, &renderable));
        SY_GeometryFlags flags;
        flags.perspective = false;
        geometry.Build(context, renderable, context.frameWorldToScreen.Data(), 1, flags);
    }

    // The third texture coordinate at the screen point (x, y), before any division.
    double WAt(double x, double y) const {
        const auto& m = geometry.screenToTexture[0].mat;
        return m[0][2] * x + m[1][2] * y + m[2][2];
    }

    SY_SceneDesc scene;
    renderer_test::MemoryTextureFetcher fetcher;
    SY_RenderContext context;
    PF_WorldX<PF_Pixel8> texture{64, 32};
    SY_LayerDesc layer;
    SY_TRLayer renderable{layer};
    SY_ScreenGeometry geometry;
};

// Without a perspective divide, w carries the plane's eye depth for lighting and depth tests.
TEST(ScreenGeometry, OrthographicWFollowsThePlaneDepth) {
    Fixture f(renderer_test::Turned(32, 16, 0, 0.5, 100, 50, 30));
    const SY_Subsample& subsample = f.renderable.subsamples[0];
    EXPECT_NEAR(f.WAt(101, 50) - f.WAt(100, 50), subsample.plane[0] / subsample.plane[2], 1e-12);
    EXPECT_NEAR(f.WAt(100, 50), -subsample.DepthAt(100, 50), 1e-9);
    EXPECT_EQ(f.geometry.projectionW, -1.0);
}

}  // namespace
