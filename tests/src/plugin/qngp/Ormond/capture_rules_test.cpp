// The rules scene capture applies to what the host reports: camera matrices, light linking,
// shadow map sizes, transfer modes and quality.
#include <gtest/gtest.h>

#include <tuple>
#include <vector>

#include "camera_capture.h"
#include "layer_capture.h"
#include "light_capture.h"
#include "m_matrix.h"
#include "renderer/scene/scene_print.h"
#include "resources/shadow_map_sizes.h"
#include "u_memory.h"

namespace {

struct ScreenPoint {
    double x, y;
};

ScreenPoint Screen(const M_Matrix4& projection, double x, double y, double z) {
    const double eye[4] = {x, y, z, 1};
    double out[4];
    M_TransformVector4NoDivide(&projection, eye, out);
    return {out[0] / out[3], out[1] / out[3]};
}

// A 100 × 50 comp seen by the default camera 200 pixels away.
ORM_CameraView DefaultView() {
    ORM_CameraView view{};
    view.width = 100;
    view.height = 50;
    view.pixelAspect = 1;
    view.downsampleX = view.downsampleY = 1;
    view.defaultDistance = 200;
    view.perspective = true;
    return view;
}

TEST(CameraPair, DefaultCameraLooksAtTheCompCentreFromItsDistance) {
    ORM_CameraView view = DefaultView();
    view.pixelAspect = 2;
    M_Matrix4 placement, projection;
    EXPECT_EQ(ORM_CameraPair(view, nullptr, 0, &placement, &projection), 200);
    // Eye at (aspect × width / 2, height / 2, −distance), axes as the world's.
    EXPECT_EQ(std::tuple(placement.mat[3][0], placement.mat[3][1], placement.mat[3][2]),
              std::tuple(100, 25, -200));
    EXPECT_EQ(placement.mat[0][0], 1);
    EXPECT_NE(projection.mat[2][3], 0);
    // On the image plane one eye unit across is half a (wide) pixel.
    ScreenPoint p = Screen(projection, 10, -5, 200);
    EXPECT_DOUBLE_EQ(p.x, 55);
    EXPECT_DOUBLE_EQ(p.y, 20);
}

TEST(CameraPair, RegionOfInterestAndDownsampleMoveAndShrinkTheScreen) {
    struct Case {
        int16_t top, left, dx, dy;
        double eyeZ;
        ScreenPoint expected;
    };
    // Eye point (10, −5): at depth 200 it lands 10 right and 5 above the centre (50, 25); at
    // depth 400 half as far. The region's corner becomes the origin; downsampling divides.
    const Case kCases[] = {
        {0, 0, 1, 1, 200, {60, 20}},       {10, 20, 1, 1, 200, {40, 10}},
        {0, 0, 2, 2, 200, {30, 10}},       {10, 20, 2, 2, 200, {20, 5}},
        {10, 20, 2, 2, 400, {17.5, 6.25}}, {0, 0, 4, 1, 200, {15, 20}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "region " << c.top << "," << c.left << " downsample "
                                        << c.dx << "×" << c.dy << " depth " << c.eyeZ);
        ORM_CameraView view = DefaultView();
        view.regionTop = c.top;
        view.regionLeft = c.left;
        view.downsampleX = c.dx;
        view.downsampleY = c.dy;
        M_Matrix4 placement, projection;
        ORM_CameraPair(view, nullptr, 0, &placement, &projection);
        ScreenPoint p = Screen(projection, 10, -5, c.eyeZ);
        EXPECT_DOUBLE_EQ(p.x, c.expected.x);
        EXPECT_DOUBLE_EQ(p.y, c.expected.y);
    }
}

TEST(CameraPair, CameraLayerPlacesTheEyeAndItsZoomProjects) {
    M_Matrix4 cameraToWorld;
    M_IdentityMatrix4(&cameraToWorld);
    M_TranslateMatrix4(7, 8, -300, &cameraToWorld);
    ORM_CameraView view = DefaultView();
    view.pixelAspect = 2;
    M_Matrix4 placement, projection;
    EXPECT_EQ(ORM_CameraPair(view, &cameraToWorld, 400, &placement, &projection), 400);
    // The layer's transform, then stretched by the pixel aspect.
    EXPECT_EQ(placement.mat[0][0], 2);
    EXPECT_EQ(std::tuple(placement.mat[3][0], placement.mat[3][1], placement.mat[3][2]),
              std::tuple(14, 8, -300));
    ScreenPoint p = Screen(projection, 20, 10, 400);
    EXPECT_DOUBLE_EQ(p.x, 60);
    EXPECT_DOUBLE_EQ(p.y, 35);
}

TEST(CameraPair, OrthographicCameraHasNoProjectionAndZoomZero) {
    M_Matrix4 cameraToWorld;
    M_IdentityMatrix4(&cameraToWorld);
    ORM_CameraView view = DefaultView();
    view.perspective = false;
    M_Matrix4 placement, projection;
    EXPECT_EQ(ORM_CameraPair(view, &cameraToWorld, 400, &placement, &projection), 0);
    EXPECT_EQ(projection.mat[2][3], 0);
    // Depth does not shrink anything.
    ScreenPoint p = Screen(projection, 20, 10, 5000);
    EXPECT_DOUBLE_EQ(p.x, 70);
    EXPECT_DOUBLE_EQ(p.y, 35);
}

TEST(LightLinking, LightThatLightsBelowOnlyReachesLayersWithGreaterCompIndex) {
    int64_t start = U_AccountedBytes();
    {
        SY_OwnedArray<SY_LayerDesc> layers;
        layers.Allocate(5);
        const int32_t compIndexes[] = {0, 2, 3, 4, 6};
        for (int32_t i = 0; i < 5; ++i)
            layers[i].compIndex = compIndexes[i];

        ORM_LinkLight(3, true, &layers);
        ORM_LinkLight(5, false, &layers);
        const std::vector<std::vector<int32_t>> expected{{5}, {5}, {5}, {3, 5}, {3, 5}};
        for (int32_t i = 0; i < 5; ++i)
            EXPECT_EQ(layers[i].lightIds, expected[static_cast<size_t>(i)]) << "layer " << i;
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

TEST(ShadowMapSize, ChoiceReadsItsPopupLabel) {
    const int32_t kSizes[] = {0, 250, 500, 750, 1000, 1500, 2000, 3000, 4000};
    for (int32_t choice = 0; choice < 9; ++choice)
        EXPECT_EQ(ORM_ShadowMapSize(choice), kSizes[choice]) << "choice " << choice;
    EXPECT_EQ(ORM_ShadowMapSize(9), 0);
    EXPECT_EQ(ORM_ShadowMapSize(-1), 0);
}

TEST(TransferMode, NormalVariantsArriveAsTwoAndKeepAlphaIsBitSeven) {
    struct Case {
        int32_t mode, flags;
        QNGP_EngineLayer engine;
        uint8_t stored;
    };
    const QNGP_EngineLayer kPlain{false, false, 0};
    const QNGP_EngineLayer kAVIgnoring{true, true, 0};
    const QNGP_EngineLayer kAVKeeping{true, false, 0};
    const Case kCases[] = {
        {2, 0, kPlain, 2},      {3, 0, kPlain, 2},      {17, 0, kPlain, 2},
        {18, 0, kPlain, 2},     {5, 0, kPlain, 5},      {16, 0, kPlain, 16},
        {19, 0, kPlain, 19},    {3, 1, kPlain, 0x82},   {7, 1, kAVKeeping, 0x87},
        {7, 1, kAVIgnoring, 7}, {7, 0, kAVIgnoring, 7}, {7, 2, kPlain, 7},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "mode " << c.mode << " flags " << c.flags);
        EXPECT_EQ(ORM_StoredTransferMode({c.mode, c.flags, 0}, c.engine), c.stored);
    }
}

TEST(LayerQuality, QualityAndShadowStreamsSetTheSwitches) {
    // Renders, wireframe, casts shadows, accepts shadows, accepts lights, best quality, mode.
    using Switches = std::tuple<bool, bool, bool, int, bool, bool, int>;
    struct Case {
        const char* name;
        int16_t quality;
        ORM_ShadowStreams streams;
        Switches switches;
    };
    const Case kCases[] = {
        {"wireframe ignores the streams", 0, {1, 1, 1}, {false, true, false, 0, false, false, 2}},
        {"draft, casting and accepting", 1, {1, 1, 1}, {true, false, true, 1, true, false, 2}},
        {"best, neither", 2, {0, 0, 0}, {true, false, false, 0, false, true, 2}},
        {"casts shadows only", 1, {2, 0, 1}, {false, false, true, 0, true, false, 2}},
        {"accepts shadows only", 2, {0, 2, 1}, {true, false, false, 2, false, true, 5}},
        {"accepts shadows truncated", 1, {0, 1.7, 1}, {true, false, false, 1, true, false, 2}},
    };
    for (const Case& c : kCases) {
        SY_LayerDesc l;
        ORM_ApplyQuality(c.quality, c.streams, &l.material);
        EXPECT_EQ(Switches(l.material.renders, l.material.wireframe, l.material.castsShadows,
                           l.material.acceptsShadows, l.material.acceptsLights,
                           l.material.bestQuality, l.material.mode),
                  c.switches)
            << c.name << ": " << l.material;
    }
}

}  // namespace
