#include <gtest/gtest.h>

#include "pf_world.h"
#include "renderer/frame/frame_driver.h"
#include "tests/renderer/renderer_test_support.h"
#include "u_memory.h"

namespace {

using renderer_test::RecordingProgress;
using renderer_test::ReportCapture;
using renderer_test::SetDefaultCamera;
using namespace renderer_test;

struct CameraFault {
    const char* name;
    void (*apply)(SY_SceneDesc*);
    const char* message;
    int32_t reportCode;
    int32_t thrown;
};

const CameraFault kCameraFaults[] = {
    {"unequal matrix counts", [](SY_SceneDesc* s) { s->cameraProjections.Allocate(2); },
     "Tessary 3D: Different number of world->eye and eye->screen matrices.", 0x4B0003, 0x4B01},
    {"orthographic projection on a perspective camera",
     [](SY_SceneDesc* s) { s->cameraProjections[0].mat[2][3] = 0; },
     "Tessary 3D: Camera projection matrix does not match camera type.", 0x4B0003, 0x4B01},
    {"parent with a zero scale",
     [](SY_SceneDesc* s) { M_ScaleMatrix4(0, 1, 1, &s->cameraPlacements[0]); },
     "Tessary 3D: Cannot render because camera#{rsquo}s parent has a zero scale.", 0x4B0003,
     0x4B02},
    {"camera axis too short to normalise",
     [](SY_SceneDesc* s) { M_ScaleMatrix4(1, 1, 1e-30, &s->framePlacement); },
     "Vector has zero length.", 0x110034, 0x110B},
};

TEST(FrameDriver, CameraFaultsAreReportedAndThrown) {
    for (const CameraFault& fault : kCameraFaults) {
        SCOPED_TRACE(fault.name);
        int64_t start = U_AccountedBytes();
        {
            SY_SceneDesc scene;
            SetDefaultCamera(&scene, 64, 48, 100);
            fault.apply(&scene);
            PF_WorldX<PF_Pixel8> destination(64, 48);
            RecordingProgress progress;
            ReportCapture capture;
            int32_t thrown = 0;
            try {
                SY_RenderFrame(scene, nullptr, &progress, nullptr, false, &destination, nullptr);
            } catch (int32_t code) {
                thrown = code;
            }
            EXPECT_EQ(thrown, fault.thrown);
            ASSERT_EQ(ReportCapture::reports().size(), 1u);
            EXPECT_EQ(ReportCapture::reports()[0].text, fault.message);
            EXPECT_EQ(ReportCapture::reports()[0].code, fault.reportCode);
        }
        EXPECT_EQ(U_AccountedBytes(), start);
    }
}

// Every allocation of a frame in turn fails for good: each failure is code 4 (or bad_alloc from
// the layer shaders, which are tracked objects) and leaves nothing behind.
TEST(FrameDriver, AnInjectedAllocationFailureFreesEverything) {
    FailEachAllocationInTurn(
        [](auto fail) {
            SY_SceneDesc scene;
            SetDefaultCamera(&scene, 64, 64, 100, 3);
            M_TranslateMatrix4(1, 0, 0, &scene.cameraPlacements[2]);
            scene.lights.Allocate(2);
            scene.lights[0].type = kSY_LightPoint;
            scene.lights[0].placements.Allocate(1);
            M_IdentityMatrix4(&scene.lights[0].placements[0]);
            scene.lights[1].type = kSY_LightAmbient;
            // Two cards crossing through the same vertical axis and a third one apart.
            scene.layers.Allocate(3);
            SetPlacements(&scene.layers[0], {Turned(16, 16, 0, 0.5, 32, 32, 0)});
            SetPlacements(&scene.layers[1], {Turned(16, 16, 0, -0.5, 32, 32, 0)});
            SetPlacements(&scene.layers[2], {Translation(0, 0, 10)});
            for (int32_t i = 0; i < 3; ++i) {
                SetRect(&scene.layers[i], 0, 0, 32, 32);
                scene.layers[i].material.renderIndex = scene.layers[i].material.depthIndex = i;
                scene.layers[i].lightIds = {0, 7};
            }
            PF_WorldX<PF_Pixel8> destination(64, 64);
            PF_WorldX<PF_Pixel8> texture(32, 32);
            renderer_test::MemoryTextureFetcher fetcher;
            for (int32_t i = 0; i < 3; ++i)
                fetcher.Add(i, &texture);
            RecordingProgress progress;
            auto failing = fail();
            SY_RenderFrame(scene, &fetcher, &progress, nullptr, false, &destination, nullptr);
        },
        true);
}

}  // namespace
