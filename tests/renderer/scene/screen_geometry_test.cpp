#include <gtest/gtest.h>

#include <cmath>
#include <numbers>

#include "frame_test_support.h"
#include "memory_texture_fetcher.h"
#include "renderer/scene/layer_projection.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/scene_print.h"
#include "renderer/scene/screen_geometry.h"
#include "scene_fixtures.h"

namespace {

using ostrel_test::MemoryTextureFetcher;

constexpr int32_t kWidth = 200, kHeight = 100;
constexpr double kDistance = 400;

// A frame's context under the default camera, and one layer's renderable built in it.
struct Fixture {
    explicit Fixture(bool perspective = true) {
        ostrel_test::SetDefaultCamera(&scene, kWidth, kHeight, kDistance);
        if (!perspective) {
            M_IdentityMatrix4(&scene.frameProjection);
            M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, 0, &scene.frameProjection);
            scene.cameraProjections[0] = scene.frameProjection;
            scene.perspective = false;
        }
        SY_SetUpContext(&context, scene, &fetcher, nullptr, nullptr, false, nullptr);
        fetcher.Add(0, &texture);
    }

    // Builds the renderable of a 64×32 layer placed by `placement`, then its geometry.
    void Build(const M_Matrix4& placement, SY_GeometryFlags flags) {
        scene_test::SetPlacements(&layer, {placement});
        scene_test::SetRect(&layer, 0, 0, 64, 32);
        SY_SetUpOptions options;
        options.output = {0, 0, kWidth, kHeight};
        SY_CameraView camera{context.frameWorldToScreen.Data(), 1, scene.perspective};
        ASSERT_TRUE(SY_SetUpRenderable(layer, camera, options, &renderable));
        flags.perspective = scene.perspective;
        geometry.Build(context, renderable, context.frameWorldToScreen.Data(), 1, flags);
    }

    // Texture position of the screen point (x, y).
    void TextureAt(double x, double y, double* u, double* v, double* w = nullptr) const {
        const auto& m = geometry.screenToTexture[0].mat;
        double U = m[0][0] * x + m[1][0] * y + m[2][0];
        double V = m[0][1] * x + m[1][1] * y + m[2][1];
        double W = m[0][2] * x + m[1][2] * y + m[2][2];
        *u = scene.perspective ? U / W : U;
        *v = scene.perspective ? V / W : V;
        if (w) *w = W;
    }

    SY_SceneDesc scene;
    MemoryTextureFetcher fetcher;
    SY_RenderContext context;
    PF_WorldX<PF_Pixel8> texture{64, 32};
    SY_LayerDesc layer;
    SY_TRLayer renderable{layer};
    SY_ScreenGeometry geometry;
};

TEST(ScreenGeometry, TheZoomPlaneMapsPixelCentresOneToOne) {
    struct Case {
        SY_SamplingFilter filter;
        double shift;  // filtered samplers read half a texel up and to the left
    };
    for (const Case& c :
         {Case{SY_SamplingFilter::kNearest, 0.0}, Case{SY_SamplingFilter::kBilinear, -0.5},
          Case{SY_SamplingFilter::kBicubic, -0.5}}) {
        Fixture f;
        SY_GeometryFlags flags;
        flags.samplingFilter = c.filter;
        f.Build(scene_test::Translation(30, 20, 0), flags);
        ASSERT_FALSE(f.geometry.Empty());
        for (auto [x, y] : {std::pair{30.5, 20.5}, std::pair{93.5, 51.5}}) {
            double u, v;
            f.TextureAt(x, y, &u, &v);
            EXPECT_NEAR(u, x - 30 + c.shift, 1e-9) << c.filter;
            EXPECT_NEAR(v, y - 20 + c.shift, 1e-9) << c.filter;
        }
        EXPECT_NEAR(f.geometry.projectionW, 1 / kDistance, 1e-15);
    }
}

TEST(ScreenGeometry, NormalTurnsTowardTheCamera) {
    for (double turn : {0.0, std::numbers::pi}) {
        Fixture f;
        f.Build(scene_test::Turned(32, 16, 0, turn, 100, 50, 0), {});
        EXPECT_NEAR(f.geometry.normal[0], 0, 1e-12);
        EXPECT_NEAR(f.geometry.normal[2], -1, 1e-12) << "turned by " << turn;
    }
}

TEST(ScreenGeometry, EyeRayGivesTheSurfacePoint) {
    Fixture f;
    SY_GeometryFlags flags;
    flags.needsSurfacePoint = true;
    f.Build(scene_test::Turned(32, 16, 0.3, 0.4, 100, 50, 60), flags);
    // The surface point of a screen pixel, projected back, lands on that pixel.
    double x = 101.5, y = 47.5, u, v, w;
    f.TextureAt(x, y, &u, &v, &w);
    const auto& e = f.geometry.eyeRay.mat;
    double p[4] = {(e[0][0] * x + e[1][0] * y + e[2][0]) / w,
                   (e[0][1] * x + e[1][1] * y + e[2][1]) / w,
                   (e[0][2] * x + e[1][2] * y + e[2][2]) / w, 1};
    double s[4];
    M_TransformVector4NoDivide(&f.context.frameWorldToScreen[0], p, s);
    EXPECT_NEAR(s[0] / s[3], x, 1e-9);
    EXPECT_NEAR(s[1] / s[3], y, 1e-9);
}

TEST(ScreenGeometry, OrthographicWFollowsThePlaneDepth) {
    Fixture f(false);
    f.Build(scene_test::Turned(32, 16, 0, 0.5, 100, 50, 30), {});
    const SY_Subsample& subsample = f.renderable.subsamples[0];
    double u0, v0, w0, u1, v1, w1;
    f.TextureAt(100, 50, &u0, &v0, &w0);
    f.TextureAt(101, 50, &u1, &v1, &w1);
    EXPECT_NEAR(w1 - w0, subsample.plane[0] / subsample.plane[2], 1e-12);
    EXPECT_NEAR(w0, -subsample.DepthAt(100, 50), 1e-9);
    EXPECT_EQ(f.geometry.projectionW, -1.0);
}

TEST(ScreenGeometry, TexturesAreHeldWhileAnyGeometryHoldsThem) {
    MemoryTextureFetcher fetcher;
    PF_WorldX<PF_Pixel8> world(4, 4);
    fetcher.Add(3, &world);
    EXPECT_EQ(fetcher.Acquire(3, true, nullptr, nullptr).world, &world);
    EXPECT_EQ(fetcher.Acquire(3, true, nullptr, nullptr).world, &world);
    EXPECT_EQ(fetcher.fetches, 1);
    fetcher.ReleaseTexture(3);
    EXPECT_EQ(fetcher.UseCount(3), 1);
    EXPECT_EQ(fetcher.releases, 0);
    fetcher.ReleaseTexture(3);
    EXPECT_EQ(fetcher.releases, 1);
    fetcher.ReleaseTexture(3);  // no longer held: ignored
    EXPECT_EQ(fetcher.releases, 1);
    fetcher.Acquire(3, true, nullptr, nullptr);
    EXPECT_EQ(fetcher.fetches, 2);
    fetcher.ReleaseTexture(3);

    // A layer the host delivers nothing for leaves the geometry empty and holds nothing.
    EXPECT_EQ(fetcher.Acquire(9, true, nullptr, nullptr).world, nullptr);
    EXPECT_EQ(fetcher.UseCount(9), 0);
}

TEST(ScreenGeometry, DestructionHandsTheTextureBack) {
    int64_t start = U_AccountedBytes();
    {
        Fixture f;
        f.Build(scene_test::Translation(0, 0, 0), {});
        {
            SY_ScreenGeometry second;
            second.Build(f.context, f.renderable, f.context.frameWorldToScreen.Data(), 1, {});
            EXPECT_EQ(f.fetcher.UseCount(0), 2);
        }
        EXPECT_EQ(f.fetcher.UseCount(0), 1);
        EXPECT_EQ(f.fetcher.releases, 0);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
