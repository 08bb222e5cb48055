#include "renderer/scene/layer_projection.h"

#include <gtest/gtest.h>

#include <cmath>
#include <optional>
#include <vector>

#include "renderer/scene/messages.h"
#include "tests/renderer/scene/frame_test_support.h"
#include "tests/renderer/scene/scene_fixtures.h"
#include "u_memory.h"

namespace {

using namespace scene_test;

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

void ExpectPolygon(const SY_Polygon& polygon, const std::vector<Corner>& expected) {
    ASSERT_EQ(polygon.size(), expected.size());
    for (size_t i = 0; i < expected.size(); ++i) {
        EXPECT_NEAR(polygon[i].x, expected[i].x, kTolerance) << "vertex " << i;
        EXPECT_NEAR(polygon[i].y, expected[i].y, kTolerance) << "vertex " << i;
        EXPECT_NEAR(polygon[i].z, expected[i].z, kTolerance) << "vertex " << i;
        EXPECT_EQ(polygon[i].w, 1.0) << "vertex " << i;
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

TEST(LayerProjection, FacingLayerAtZoomDistanceMapsOneToOne) {
    // Perspective: screen depth is zoom / eye depth, 1 at the zoom distance. Orthographic: the
    // eye depth itself.
    struct Case {
        bool perspective;
        double depth;
    };
    for (const Case& c : {Case{true, 1.0}, Case{false, kDistance}}) {
        SCOPED_TRACE(c.perspective ? "perspective" : "orthographic");
        Projection p(100, 50, {Translation(50, 40, 0)});
        ASSERT_TRUE(p.SetUp(c.perspective));
        ASSERT_EQ(p.renderable->subsamples.Count(), 1);
        const SY_Subsample& s = p.First();
        ExpectPolygon(
            s.vertices,
            {{50, 40, c.depth}, {150, 40, c.depth}, {150, 90, c.depth}, {50, 90, c.depth}});
        // The plane z = depth: (0, 0, −1, depth).
        const double plane[4] = {0, 0, -1, c.depth};
        for (int i = 0; i < 4; ++i)
            EXPECT_NEAR(s.plane[i], plane[i], kTolerance * c.depth);
        const double bounds[6] = {50, 40, 150, 90, c.depth, c.depth};
        for (int i = 0; i < 6; ++i)
            EXPECT_NEAR(p.renderable->bounds[i], bounds[i], kTolerance);
        EXPECT_EQ(p.renderable->firstValid, 0);
        EXPECT_EQ(p.renderable->lastValid, 0);
        EXPECT_FALSE(p.renderable->multiSample);
        EXPECT_EQ(s.cameraIndex, 0);
    }
}

TEST(LayerProjection, NearerLayersHaveLargerDepthUnderPerspectiveAndSmallerUnderOrthographic) {
    // 100 pixels in front of the zoom plane: eye depth 300. A depth offset of 1e-7 (a later
    // layer of a coplanar stack) moves a layer on the zoom plane that far away.
    struct Case {
        bool perspective;
        double z, offset;
        double depth;
    };
    const Case cases[] = {
        {true, -100, 0, 400.0 / 300.0},
        {false, -100, 0, 300.0},
        {true, 0, 1e-7, 1 - 1e-7},
        {false, 0, 1e-7, kDistance + 1e-7},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << c.perspective << " at " << c.z << " + " << c.offset);
        Projection p(10, 10, {Translation(195, 145, c.z)});
        SY_SetUpOptions options = OutputOptions();
        options.depthOffset = c.offset;
        ASSERT_TRUE(p.SetUp(c.perspective, options));
        for (const SY_Vertex& v : p.First().vertices)
            EXPECT_NEAR(v.z, c.depth, 1e-11);
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
    EXPECT_NEAR(std::hypot(s.plane[0], s.plane[1], s.plane[2]), 1.0, kTolerance);
    EXPECT_LT(s.plane[2], 0);
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
        {"edge-on about x", Turned(50, 50, M_PI / 2, 0, 200, 150, 0), true, true},
        // Scaled to nothing in x: its layer-to-screen matrix has no inverse.
        {"singular", flattened, true, true},
        // The camera stands at z = −400; the layer 400 pixels behind it.
        {"behind the camera", Translation(150, 100, -800), true, false},
        {"behind the orthographic camera", Translation(150, 100, -800), false, false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        Projection p(100, 100, {c.placement});
        EXPECT_FALSE(p.SetUp(c.perspective));
        EXPECT_TRUE(p.First().vertices.empty());
        EXPECT_TRUE(p.renderable->HasEmptyBounds());
        if (!c.planeless) continue;
        EXPECT_EQ(p.renderable->firstValid, -1);
        EXPECT_EQ(p.renderable->lastValid, -1);
        EXPECT_FALSE(p.First().IsValid());
        for (double v : p.First().plane)
            EXPECT_EQ(v, 0.0);
    }
}

TEST(LayerProjection, LayerThroughTheCameraPlaneKeepsTheVisiblePart) {
    // A 1400-pixel-long layer tilted about x (cosine 0.6, sine 0.8) through the output's centre
    // on the zoom plane: its ends lie at eye depths −160 (behind the camera) and 960. Only the
    // part in front of the camera and within the output remains.
    Projection p(100, 1400, {Turned(50, 700, std::atan2(0.8, 0.6), 0, 200, 150, 0)});
    ASSERT_TRUE(p.SetUp());
    const SY_Subsample& s = p.First();
    ASSERT_GE(s.vertices.size(), 3u);
    for (const SY_Vertex& v : s.vertices) {
        EXPECT_GT(v.x, 0);
        EXPECT_LT(v.x, kWidth);
        EXPECT_GT(v.y, 0);
        EXPECT_LT(v.y, kHeight);
        EXPECT_GT(v.z, 0);  // in front of the camera
        EXPECT_NEAR(s.DepthAt(v.x, v.y), v.z, 1e-9);
    }
    // The rows above and below the output are cut away.
    EXPECT_NEAR(p.renderable->bounds[1], 0, kTolerance);
    EXPECT_NEAR(p.renderable->bounds[3], kHeight, kTolerance);
}

TEST(LayerProjection, BestQualityQuadIsHalfAPixelLarger) {
    struct Case {
        bool bestQuality;
        double grow;
    };
    for (const Case& c : {Case{false, 0.0}, Case{true, 0.5}}) {
        Projection p(100, 50, {Translation(50, 40, 0)});
        p.layer.material.bestQuality = c.bestQuality;
        ASSERT_TRUE(p.SetUp());
        double g = c.grow;
        ExpectPolygon(
            p.First().vertices,
            {{50 - g, 40 - g, 1}, {150 + g, 40 - g, 1}, {150 + g, 90 + g, 1}, {50 - g, 90 + g, 1}});
    }
}

TEST(LayerProjection, MarginGrowsTheQuadInOutputPixels) {
    // A margin of 4 output pixels on a layer scaled by 2 (scale 2 in x, 4 in y) is 2 layer
    // pixels: the placement's scale turns it back into 4 output pixels in x and 8 in y.
    M_Matrix4 placement = Identity();
    M_ScaleMatrix4(2, 4, 1, &placement);
    M_TranslateMatrix4(100, 100, 0, &placement);
    Projection p(10, 10, {placement});
    p.layer.scaleX = 2;
    p.layer.scaleY = 4;
    SY_SetUpOptions options = OutputOptions();
    options.margin = 4;
    ASSERT_TRUE(p.SetUp(true, options));
    ExpectPolygon(p.First().vertices, {{96, 92, 1}, {124, 92, 1}, {124, 148, 1}, {96, 148, 1}});
}

TEST(LayerProjection, ClipsToTheOutputUnlessAskedNotTo) {
    struct Case {
        bool noClip;
        std::vector<Corner> expected;
    };
    const Case cases[] = {
        {false, {{0, 0, 1}, {400, 0, 1}, {400, 300, 1}, {0, 300, 1}}},
        {true, {{-100, -50, 1}, {500, -50, 1}, {500, 350, 1}, {-100, 350, 1}}},
    };
    for (const Case& c : cases) {
        Projection p(600, 400, {Translation(-100, -50, 0)});
        SY_SetUpOptions options = OutputOptions();
        options.noClip = c.noClip;
        ASSERT_TRUE(p.SetUp(true, options));
        const SY_Polygon& polygon = p.First().vertices;
        // Clipped vertices lie 1e-12 inside the output; compare as a set of corners.
        ASSERT_EQ(polygon.size(), 4u);
        for (const Corner& e : c.expected) {
            bool found = false;
            for (const SY_Vertex& v : polygon) {
                found = found ||
                        (std::fabs(v.x - e.x) < kTolerance && std::fabs(v.y - e.y) < kTolerance &&
                         std::fabs(v.z - e.z) < kTolerance);
            }
            EXPECT_TRUE(found) << e.x << ", " << e.y;
        }
    }
}

TEST(LayerProjection, UnboundedLayerCoversTheOutputAtItsPlaneDepth) {
    // Tilted about x by the angle with cosine 0.8 and sine 0.6 through the output's centre on
    // the zoom plane: world depth = 0.75 × (world y − 150). The ray through screen row Y meets
    // it at screen depth 1 − (Y − 150) × 0.75 / 400.
    Projection p(400, 300, {Turned(200, 150, std::atan2(0.6, 0.8), 0, 200, 150, 0)});
    p.layer.unbounded = true;
    ASSERT_TRUE(p.SetUp());
    double top = 1 + 150 * 0.75 / 400, bottom = 1 - 150 * 0.75 / 400;
    ExpectPolygon(p.First().vertices,
                  {{0, 0, top}, {400, 0, top}, {400, 300, bottom}, {0, 300, bottom}});
    EXPECT_NEAR(p.renderable->bounds[4], bottom, kTolerance);
    EXPECT_NEAR(p.renderable->bounds[5], top, kTolerance);
}

TEST(LayerProjection, SubsamplesPairLayerPlacementsWithCameraMatrices) {
    M_Matrix4 still = DefaultCamera(kWidth, kHeight, kDistance, true);
    M_Matrix4 cameras[2] = {still, still};
    M_TranslateMatrix4(10, 0, 0, &cameras[1]);  // the second camera sample sees everything moved
    struct Case {
        const char* name;
        std::vector<double> layerX;  // x of each placement
        int32_t cameraCount;
        std::vector<double> expectedLeft;  // left edge per subsample
        std::vector<int32_t> cameraIndex;
    };
    const Case cases[] = {
        {"two placements, one camera matrix", {50, 60}, 1, {50, 60}, {0, 0}},
        {"one placement, two camera matrices", {50}, 2, {50, 60}, {0, 1}},
        {"identical placements count as one", {50, 50, 50}, 2, {50, 60}, {0, 1}},
        {"equal counts pair up", {50, 70}, 2, {50, 80}, {0, 1}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        SY_LayerDesc layer;
        SetRect(&layer, 0, 0, 20, 20);
        layer.placements.Allocate(static_cast<int32_t>(c.layerX.size()));
        for (size_t i = 0; i < c.layerX.size(); ++i) {
            layer.placements[static_cast<int32_t>(i)] = Translation(c.layerX[i], 40, 0);
        }
        SY_TRLayer renderable(layer);
        ASSERT_TRUE(SY_SetUpRenderable(layer, {cameras, c.cameraCount, true}, OutputOptions(),
                                       &renderable));
        ASSERT_EQ(renderable.subsamples.Count(), static_cast<int32_t>(c.expectedLeft.size()));
        EXPECT_TRUE(renderable.multiSample);
        EXPECT_EQ(renderable.firstValid, 0);
        EXPECT_EQ(renderable.lastValid, renderable.subsamples.Count() - 1);
        for (int32_t i = 0; i < renderable.subsamples.Count(); ++i) {
            const SY_Subsample& s = renderable.subsamples[i];
            EXPECT_EQ(s.cameraIndex, c.cameraIndex[i]);
            EXPECT_NEAR(s.vertices[0].x, c.expectedLeft[i], kTolerance);
        }
    }
}

TEST(LayerProjection, MismatchedSubsampleCountsReportMessageOne) {
    int64_t start = U_AccountedBytes();
    M_Matrix4 still = DefaultCamera(kWidth, kHeight, kDistance, true);
    M_Matrix4 cameras[3] = {still, still, still};
    {
        Projection p(20, 20, {Translation(50, 40, 0), Translation(60, 40, 0)});
        SY_TRLayer renderable(p.layer);
        ostrel_test::ReportCapture capture;
        int32_t thrown = 0;
        try {
            SY_SetUpRenderable(p.layer, {cameras, 3, true}, OutputOptions(), &renderable);
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, 0x4B01);
        ASSERT_EQ(capture.reports().size(), 1u);
        EXPECT_EQ(capture.reports()[0].text,
                  "Tessary 3D: Layer and camera geometry subsamples do not match.");
        EXPECT_EQ(capture.reports()[0].code, 0x4B0002);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

TEST(LayerProjection, MemoryFailureLeavesNothingAllocated) {
    M_Matrix4 cameras[2] = {DefaultCamera(kWidth, kHeight, kDistance, true),
                            DefaultCamera(kWidth, kHeight, kDistance, true)};
    SY_LayerDesc layer;
    layer.material.bestQuality = true;
    SetRect(&layer, 0, 0, 600, 400);
    SetPlacements(&layer, {Translation(-100, -50, 0), Translation(-90, -50, 0)});
    int32_t failures = FailEachAllocationInTurn([&](auto fail) {
        SY_TRLayer renderable(layer);
        auto failing = fail();
        SY_SetUpRenderable(layer, {cameras, 2, true}, OutputOptions(), &renderable);
    });
    EXPECT_GT(failures, 1);
}

}  // namespace
