#include "renderer/scene/layer_projection.h"

#include <gtest/gtest.h>

#include <cmath>
#include <optional>
#include <vector>

#include "tests/renderer/renderer_test_support.h"

namespace {

using namespace renderer_test;

constexpr double kWidth = 400, kHeight = 300, kDistance = 400;
constexpr double kTolerance = 1e-9;

struct Corner {
    double x, y, z;
};

SY_SetUpOptions OutputOptions() {
    SY_SetUpOptions options;
    options.output = {0, 0, kWidth, kHeight};
    return options;
}

void ExpectPolygon(const SY_Polygon& polygon, const std::vector<Corner>& expected,
                   double tolerance = kTolerance) {
    ASSERT_EQ(polygon.size(), expected.size());
    for (size_t i = 0; i < expected.size(); ++i) {
        EXPECT_NEAR(polygon[i].x, expected[i].x, tolerance) << "vertex " << i;
        EXPECT_NEAR(polygon[i].y, expected[i].y, tolerance) << "vertex " << i;
        EXPECT_NEAR(polygon[i].z, expected[i].z, tolerance) << "vertex " << i;
    }
}

// A width × height layer and its renderable, set up under the default camera.
struct Projection {
    Projection(int32_t width, int32_t height, std::initializer_list<M_Matrix4> placements) {
        SetRect(&layer, 0, 0, width, height);
        SetPlacements(&layer, placements);
    }
    bool SetUp(bool perspective = true, const SY_SetUpOptions& options = OutputOptions()) {
        M_Matrix4 camera = DefaultCamera(kWidth, kHeight, kDistance, perspective);
        renderable.emplace(layer);
        return SY_SetUpRenderable(layer, {&camera, 1, perspective}, options, &*renderable);
    }
    const SY_Subsample& First() const { return renderable->subsamples[0]; }

    SY_LayerDesc layer;
    std::optional<SY_TRLayer> renderable;
};

TEST(LayerProjection, FacingLayerScalesAboutTheAxisWithItsDepth) {
    // A 100 × 50 layer at (50, 40). Under perspective the screen depth is zoom / eye depth and a
    // layer 100 pixels in front of the zoom plane (eye depth 300) is 4/3 as large about the
    // output's centre (200, 150); on the zoom plane it maps 1:1. Orthographic depth is the eye
    // depth and nothing scales. A depth offset of 1e-7 (a later layer of a coplanar stack) moves
    // a layer that far away; best quality grows the quad by half a pixel.
    struct Case {
        bool perspective;
        double z, offset;
        bool best;
        double scale, depth;
    };
    const Case kCases[] = {
        {true, 0, 0, false, 1, 1},
        {false, 0, 0, false, 1, kDistance},
        {true, -100, 0, false, 4.0 / 3, 4.0 / 3},
        {false, -100, 0, false, 1, 300},
        {true, 0, 1e-7, false, 1, 1 - 1e-7},
        {false, 0, 1e-7, false, 1, kDistance + 1e-7},
        {true, 0, 0, true, 1, 1},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "perspective " << c.perspective << " at z " << c.z
                                        << " + " << c.offset << " best " << c.best);
        Projection p(100, 50, {Translation(50, 40, c.z)});
        p.layer.material.bestQuality = c.best;
        SY_SetUpOptions options = OutputOptions();
        options.depthOffset = c.offset;
        ASSERT_TRUE(p.SetUp(c.perspective, options));
        double g = c.best ? 0.5 : 0;
        auto x = [&](double layerX) { return 200 + (layerX - 200) * c.scale; };
        auto y = [&](double layerY) { return 150 + (layerY - 150) * c.scale; };
        ExpectPolygon(p.First().vertices,
                      {{x(50) - g, y(40) - g, c.depth},
                       {x(150) + g, y(40) - g, c.depth},
                       {x(150) + g, y(90) + g, c.depth},
                       {x(50) - g, y(90) + g, c.depth}},
                      1e-11);
        EXPECT_EQ(p.renderable->firstValid, 0);
    }
}

TEST(LayerProjection, RotatedLayerMatchesAnalyticProjection) {
    // A 200 × 100 layer turned about its centre by the angle with cosine 0.6 and sine 0.8 about
    // the vertical axis, centred on the camera axis at the zoom plane. Its left edge goes to
    // world x offset −60 and depth +80 (eye depth 480, scale 5/6), its right edge to +60 and
    // −80 (eye depth 320, scale 5/4).
    Projection p(200, 100, {Turned(100, 50, 0, std::atan2(0.8, 0.6), 200, 150, 0)});
    ASSERT_TRUE(p.SetUp());
    const SY_Subsample& s = p.First();
    ExpectPolygon(s.vertices, {{200 - 60 * 5.0 / 6, 150 - 50 * 5.0 / 6, 5.0 / 6},
                               {200 + 60 * 1.25, 150 - 50 * 1.25, 1.25},
                               {200 + 60 * 1.25, 150 + 50 * 1.25, 1.25},
                               {200 - 60 * 5.0 / 6, 150 + 50 * 5.0 / 6, 5.0 / 6}});
    // The plane holds every vertex and the centre of the layer (screen (200, 150), depth 1).
    for (const SY_Vertex& v : s.vertices)
        EXPECT_NEAR(s.DepthAt(v.x, v.y), v.z, kTolerance);
    EXPECT_NEAR(s.DepthAt(200, 150), 1.0, kTolerance);
}

TEST(LayerProjection, LayersThatCannotBeSeenProjectToNothing) {
    M_Matrix4 flattened = Identity();
    M_ScaleMatrix4(0, 1, 1, &flattened);
    struct Case {
        const char* name;
        M_Matrix4 placement;
        bool perspective;
        bool planeless;  // no plane at all, rather than a plane seen nowhere
    };
    const Case cases[] = {
        // Turned a quarter turn about an axis through the camera's axis: the plane holds the eye.
        {"edge-on about y", Turned(50, 50, 0, M_PI / 2, 200, 150, 0), true, true},
        // Scaled to nothing in x: its layer-to-screen matrix has no inverse.
        {"singular", flattened, true, true},
        // The camera stands at z = −400; the layer 400 pixels behind it.
        {"behind the camera", Translation(150, 100, -800), true, false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        Projection p(100, 100, {c.placement});
        EXPECT_FALSE(p.SetUp(c.perspective));
        EXPECT_TRUE(p.First().vertices.empty());
        EXPECT_TRUE(p.renderable->HasEmptyBounds());
        EXPECT_EQ(p.First().IsValid(), !c.planeless);
    }
}

TEST(LayerProjection, MismatchedSubsampleCountsReportMessageOne) {
    M_Matrix4 cameras[3] = {DefaultCamera(kWidth, kHeight, kDistance, true), cameras[0],
                            cameras[0]};
    Projection p(20, 20, {Translation(50, 40, 0), Translation(60, 40, 0)});
    SY_TRLayer renderable(p.layer);
    renderer_test::ReportCapture capture;
    EXPECT_THROW(SY_SetUpRenderable(p.layer, {cameras, 3, true}, OutputOptions(), &renderable),
                 int32_t);
    ASSERT_EQ(capture.reports().size(), 1u);
    EXPECT_EQ(capture.reports()[0].text,
              "Tessary 3D: Layer and camera geometry subsamples do not match.");
}

}  // namespace
