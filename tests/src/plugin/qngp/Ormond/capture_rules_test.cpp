// The rules scene capture applies to what the host reports: camera matrices, shadow map sizes
// and transfer modes.
#include <gtest/gtest.h>

#include "camera_capture.h"
#include "layer_capture.h"
#include "m_matrix.h"
#include "resources/shadow_map_sizes.h"

namespace {

// A 100 × 50 comp with the default camera 200 pixels away, or a camera layer at (7, 8, −300)
// with zoom 400: an eye point off the axis lands where similar triangles put it on screen.
TEST(CameraPair, EyeAndScreenFollowTheViewAndTheCameraLayer) {
    enum Camera { kDefault, kLayer, kOrthographic };
    struct View {
        double aspect;
        int16_t top, left, dx, dy;
    };
    struct Case {
        View view;
        Camera camera;
        double zoom, eye[3], point[3], screen[2];
    };
    // The default eye sits at (aspect × width / 2, height / 2, −distance); the layer's is
    // stretched by the aspect. At the zoom depth one eye unit is 1 / aspect pixels across; twice
    // as deep, half as far from the centre. The region's corner becomes the origin; downsampling
    // divides.
    const Case kCases[] = {
        {{2, 0, 0, 1, 1}, kDefault, 200, {100, 25, -200}, {10, -5, 200}, {55, 20}},
        {{1, 10, 20, 2, 2}, kDefault, 200, {50, 25, -200}, {10, -5, 400}, {17.5, 6.25}},
        {{1, 0, 0, 4, 1}, kDefault, 200, {50, 25, -200}, {10, -5, 200}, {15, 20}},
        {{2, 0, 0, 1, 1}, kLayer, 400, {14, 8, -300}, {20, 10, 400}, {60, 35}},
        {{1, 0, 0, 1, 1}, kOrthographic, 0, {7, 8, -300}, {20, 10, 5000}, {70, 35}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "camera " << c.camera << " aspect " << c.view.aspect
                                        << " region " << c.view.top << "," << c.view.left
                                        << " downsample " << c.view.dx << "×" << c.view.dy);
        const ORM_CameraView view{100,         50,        c.view.aspect,
                                  c.view.dx,   c.view.dy, c.view.top,
                                  c.view.left, 200,       c.camera != kOrthographic};
        M_Matrix4 cameraToWorld;
        M_IdentityMatrix4(&cameraToWorld);
        M_TranslateMatrix4(7, 8, -300, &cameraToWorld);
        M_Matrix4 placement, projection;
        EXPECT_EQ(ORM_CameraPair(view, c.camera == kDefault ? nullptr : &cameraToWorld, 400,
                                 &placement, &projection),
                  c.zoom);
        EXPECT_EQ(placement.mat[0][0], c.camera == kDefault ? 1 : c.view.aspect);
        for (int i = 0; i < 3; ++i)
            EXPECT_EQ(placement.mat[3][i], c.eye[i]) << "eye axis " << i;
        const double eye[4] = {c.point[0], c.point[1], c.point[2], 1};
        double out[4];
        M_TransformVector4NoDivide(&projection, eye, out);
        EXPECT_DOUBLE_EQ(out[0] / out[3], c.screen[0]);
        EXPECT_DOUBLE_EQ(out[1] / out[3], c.screen[1]);
    }
}

// The popup's labels read their sizes; a project saved by a later version may carry a choice
// the popup does not have, which is the comp size.
TEST(ShadowMapSize, ChoiceReadsItsPopupLabel) {
    const int32_t kSizes[] = {0, 0, 250, 500, 750, 1000, 1500, 2000, 3000, 4000, 0};
    for (int32_t choice = -1; choice <= 9; ++choice)
        EXPECT_EQ(ORM_ShadowMapSize(choice), kSizes[choice + 1]) << "choice " << choice;
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
        {3, 0, kPlain, 2},        {17, 0, kPlain, 2},     {18, 0, kPlain, 2},
        {16, 0, kPlain, 16},      {19, 0, kPlain, 19},    {3, 1, kPlain, 0x82},
        {7, 1, kAVKeeping, 0x87}, {7, 1, kAVIgnoring, 7}, {7, 2, kPlain, 7},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "mode " << c.mode << " flags " << c.flags);
        EXPECT_EQ(ORM_StoredTransferMode({c.mode, c.flags, 0}, c.engine), c.stored);
    }
}

}  // namespace
