#include "renderer/scene/frame_driver.h"

#include "renderer/scene/depth_grouping.h"
#include "renderer/scene/motion_thinning.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/render_target.h"

namespace {

SY_CameraView MotionCamera(const SY_RenderContext& context) {
    return {context.worldToScreen.Data(), context.worldToScreen.Count(), context.perspective};
}

SY_CameraView FrameCamera(const SY_RenderContext& context) {
    return {context.frameWorldToScreen.Data(), context.frameWorldToScreen.Count(),
            context.perspective};
}

void BuildRenderables(SY_RenderContext* context) {
    const SY_SceneDesc& scene = *context->scene;
    SY_RenderableSources sources;
    sources.layers = scene.layers.Data();
    sources.layerCount = scene.layers.Count();
    sources.motionCamera = MotionCamera(*context);
    sources.frameCamera = FrameCamera(*context);
    sources.dof = &scene.dof;
    sources.outputWidth = context->destination->width;
    sources.outputHeight = context->destination->height;
    sources.lightStates = context->lightStates.Data();
    sources.lightCount = context->lightStates.Count();
    SY_BuildRenderables(sources, &context->renderables);
    context->renderableCount = static_cast<int32_t>(context->renderables.size());
    context->renderablesDone = 0;
}

void DrawRenderable(SY_RenderContext* context, SY_TRLayer* renderable,
                    const SY_RenderTarget& target) {
    if (!renderable->material.renders) return;
    SY_CameraView camera =
        renderable->material.motionBlur ? MotionCamera(*context) : FrameCamera(*context);
    renderable->Render(context, camera, nullptr, context->scene->fieldMode, target);
}

// A group of one is drawn straight into the destination. Larger groups need the fragment
// buffer; until it takes them their members are drawn one by one in group order.
void DrawGroup(SY_RenderContext* context, const SY_RenderableGroup& group) {
    SY_RenderTarget target{kSY_TargetDestination, context->destination};
    for (SY_TRLayer* renderable : group)
        DrawRenderable(context, renderable, target);
}

}  // namespace

void SY_RenderFrame(const SY_SceneDesc& scene, SY_TTextureFetcher* fetcher,
                    SY_ProgressAbort* progress, const QNGP_IterateSuite1* iterateSuite,
                    bool multiprocessing, PF_World* destination, void* /*compHandle*/) {
    SY_RenderContext context;
    SY_SetUpContext(&context, scene, fetcher, progress, iterateSuite, multiprocessing, destination);
    SY_PrepareLights(&context);
    BuildRenderables(&context);

    // Pointers into the renderables are taken once the list has stopped growing.
    SY_AccountedVector<SY_TRLayer*> ordered;
    ordered.reserve(context.renderables.size());
    for (SY_TRLayer& renderable : context.renderables)
        ordered.push_back(&renderable);
    SY_RenderableGroups groups;
    SY_GroupByDepth(ordered.data(), static_cast<int32_t>(ordered.size()),
                    SY_DepthSenseOf(context.perspective), &groups);
    for (SY_TRLayer* renderable : ordered)
        SY_ThinDraftMotionBlur(renderable);

    for (const SY_RenderableGroup& group : groups)
        DrawGroup(&context, group);
}
