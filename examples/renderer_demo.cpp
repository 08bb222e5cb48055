// A first look at the renderer core: builds a small scene in memory (the default camera of a
// 640×360 composition with a spot, a point and an ambient light), runs one frame through the
// frame driver, and prints what the frame did.
#include <cstdio>

#include "m_matrix.h"
#include "pf_world.h"
#include "renderer/scene/frame_driver.h"
#include "renderer/scene/threads.h"
#include "u_cpu.h"
#include "u_memory.h"

namespace {

constexpr int32_t kWidth = 640, kHeight = 360;
constexpr double kCameraDistance = 889;  // a 50 mm lens on a 36 mm film back at this width

void SetCamera(SY_SceneDesc* scene) {
    M_Matrix4 placement, projection;
    M_IdentityMatrix4(&placement);
    M_TranslateMatrix4(kWidth * 0.5, kHeight * 0.5, -kCameraDistance, &placement);
    M_IdentityMatrix4(&projection);
    projection.Project(kCameraDistance);
    M_TranslateMatrix4(kWidth * 0.5, kHeight * 0.5, 0, &projection);
    scene->cameraPlacements.Allocate(1);
    scene->cameraProjections.Allocate(1);
    scene->cameraPlacements[0] = scene->framePlacement = placement;
    scene->cameraProjections[0] = scene->frameProjection = projection;
}

void AddLight(SY_LightDesc* light, int32_t type, double x, double y, double z) {
    light->type = type;
    light->color[1] = light->color[2] = light->color[3] = 1.0;
    if (type == kSY_LightAmbient) return;
    light->placements.Allocate(1);
    M_IdentityMatrix4(&light->placements[0]);
    M_TranslateMatrix4(x, y, z, &light->placements[0]);
}

}  // namespace

int main() {
    SY_SceneDesc scene;
    SetCamera(&scene);
    scene.lights.Allocate(3);
    AddLight(&scene.lights[0], kSY_LightSpot, 320, 0, -400);
    scene.lights[0].coneHalfAngle = 45 * 0.008726646259971648;
    scene.lights[0].coneFeather = 0.5;
    AddLight(&scene.lights[1], kSY_LightPoint, 100, 100, -200);
    AddLight(&scene.lights[2], kSY_LightAmbient, 0, 0, 0);
    scene.lightsEnabled = true;

    PF_WorldX<PF_Pixel8> destination(kWidth, kHeight);
    bool multiprocessing = U_G_CPU_DataP()->processorCount > 1;
    int64_t heldBefore = U_AccountedBytes();
    try {
        SY_RenderFrame(scene, nullptr, nullptr, nullptr, multiprocessing, &destination, nullptr);
    } catch (int32_t code) {
        std::fprintf(stderr, "renderer_demo: the frame failed with error %d\n", code);
        return 1;
    }
    std::printf(
        "Rendered one %dx%d 8-bit frame: camera validated, %d lights prepared, "
        "%d threads, %lld bytes left behind by the frame.\n",
        kWidth, kHeight, scene.lights.Count(), SY_ThreadCount(),
        static_cast<long long>(U_AccountedBytes() - heldBefore));
    return 0;
}
