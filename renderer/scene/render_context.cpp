#include "renderer/scene/render_context.h"

#include <cmath>
#include <cstring>

#include "renderer/scene/messages.h"
#include "renderer/scene/threads.h"

namespace {

constexpr int32_t kCameraReportCode = 0x4B0003;

bool SameBytes(const M_Matrix4& a, const M_Matrix4& b) {
    return std::memcmp(&a, &b, sizeof a) == 0;
}

// Camera subsamples that are all alike are one subsample.
int32_t DistinctSubsampleCount(const SY_SceneDesc& scene) {
    int32_t n = scene.cameraPlacements.Count();
    for (int32_t i = 1; i < n; ++i) {
        if (!SameBytes(scene.cameraPlacements[i], scene.cameraPlacements[0]) ||
            !SameBytes(scene.cameraProjections[i], scene.cameraProjections[0])) {
            return n;
        }
    }
    return n == 0 ? 0 : 1;
}

M_Matrix4 WorldToScreen(const M_Matrix4& placement, const M_Matrix4& projection) {
    M_Matrix4 inverse;
    if (M_InverseMatrix4Quiet(&placement, &inverse) != 0 || !inverse.IsFinite()) {
        SY_ReportAndThrow(SY_Message::kCameraZeroScale, kCameraReportCode, kSY_ErrCameraScale);
    }
    M_Matrix4 result;
    if (int32_t error = M_ConcatMatrix4(&inverse, &projection, &result)) throw error;
    return result;
}

void ValidateCamera(SY_RenderContext* context, const SY_SceneDesc& scene) {
    if (scene.cameraPlacements.Count() != scene.cameraProjections.Count()) {
        SY_ReportAndThrow(SY_Message::kMatrixCountMismatch, kCameraReportCode, kSY_ErrGeometry);
    }
    int32_t n = DistinctSubsampleCount(scene);
    context->worldToScreen.Allocate(n);
    context->projectionW.Allocate(n);
    for (int32_t i = 0; i < n; ++i) {
        const M_Matrix4& projection = scene.cameraProjections[i];
        bool projects = projection.mat[2][3] != 0.0;
        if (projects != scene.perspective) {
            SY_ReportAndThrow(SY_Message::kProjectionMismatch, kCameraReportCode, kSY_ErrGeometry);
        }
        context->worldToScreen[i] = WorldToScreen(scene.cameraPlacements[i], projection);
        context->projectionW[i] = projection.mat[2][3];
    }
    context->frameWorldToScreen.Allocate(1);
    context->frameWorldToScreen[0] = WorldToScreen(scene.framePlacement, scene.frameProjection);

    const auto& frame = scene.framePlacement.mat;
    double lengthSquared = 0;
    for (int k = 0; k < 3; ++k) {
        context->cameraPosition[k] = frame[3][k];
        lengthSquared += frame[2][k] * frame[2][k];
    }
    if (lengthSquared < 1e-48) SY_ThrowZeroLengthVector();
    double length = std::sqrt(lengthSquared);
    for (int k = 0; k < 3; ++k)
        context->cameraAxis[k] = frame[2][k] / length;
}

}  // namespace

void SY_SetUpContext(SY_RenderContext* context, const SY_SceneDesc& scene,
                     SY_TTextureFetcher* fetcher, SY_ProgressAbort* progress,
                     const QNGP_IterateSuite1* iterateSuite, bool multiprocessing,
                     PF_World* destination) {
    context->scene = &scene;
    context->destination = destination;
    context->textureFetcher = fetcher;
    context->progress = progress;
    context->iterateSuite = iterateSuite;
    context->iterate = SY_PrepareThreads(multiprocessing, iterateSuite);
    context->perspective = scene.perspective;
    ValidateCamera(context, scene);
}

void SY_PrepareLights(SY_RenderContext* context) {
    const SY_SceneDesc& scene = *context->scene;
    context->lightStates.Allocate(scene.lights.Count());
    for (int32_t i = 0; i < scene.lights.Count(); ++i) {
        SY_PrepareLightState(scene.lights[i], &context->lightStates[i]);
    }
}
