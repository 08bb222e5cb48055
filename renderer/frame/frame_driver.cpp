#include "renderer/frame/frame_driver.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <memory>

#include "pf_draw.h"
#include "renderer/dof/dof_buffer.h"
#include "renderer/frame/layer_render.h"
#include "renderer/frame/shadow_maps.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/raster/shader.h"
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

// Edges along the output's border are left out: they would outline the frame, not the layer.
bool OnBorder(const SY_Vertex& a, const SY_Vertex& b, double width, double height) {
    constexpr double kEdge = 1e-11;
    return (a.x == 0 && b.x == 0) || (a.y == 0 && b.y == 0) ||
           (a.x >= width - kEdge && b.x >= width - kEdge) ||
           (a.y >= height - kEdge && b.y >= height - kEdge);
}

// The outline of the layer's first drawn subsample, in opaque white over the destination.
void DrawOutline(const PF_World& destination, const SY_TRLayer& renderable) {
    const SY_Polygon& polygon = renderable.subsamples[renderable.firstValid].vertices;
    if (polygon.empty()) return;
    const PF_PixelFloat white{1, 1, 1, 1};
    const SY_Vertex* previous = &polygon.back();
    for (const SY_Vertex& vertex : polygon) {
        if (!OnBorder(*previous, vertex, destination.width, destination.height))
            PF_DrawLine(destination, previous->x, previous->y, vertex.x, vertex.y, white);
        previous = &vertex;
    }
}

// A layer goes through depth of field when the blur widens it, or when the iris boosts
// highlights and the camera blurs at all.
bool NeedsDepthOfField(const SY_RenderContext& context, const SY_TRLayer& renderable) {
    const int32_t* m = renderable.dofMargin;
    if (m[0] != m[2] && m[1] != m[3]) return true;
    const SY_CameraDOFDesc& dof = context.scene->dof;
    return dof.enabled && dof.highlightGain != 0 && dof.irisShape >= 3 && SY_DOFModel(dof).Blurs();
}

// The layer's pixel rectangle within the output, widened on the sides where it meets the
// output's edge by the blur margin, so that what lies beyond the edge blurs into the frame.
// An unbounded layer's image ends with the output: its rectangle does too.
M_LRect DepthOfFieldRect(const SY_TRLayer& renderable, const PF_World& destination) {
    const double* b = renderable.bounds;
    const int32_t* m = renderable.dofMargin;
    M_LRect rect{std::max(static_cast<int32_t>(std::floor(b[0])), 0),
                 std::max(static_cast<int32_t>(std::floor(b[1])), 0),
                 std::min(static_cast<int32_t>(std::ceil(b[2])), destination.width),
                 std::min(static_cast<int32_t>(std::ceil(b[3])), destination.height)};
    if (renderable.unbounded) return rect;
    if (rect.left == 0) rect.left += m[0];
    if (rect.top == 0) rect.top += m[1];
    if (rect.right == destination.width) rect.right += m[2];
    if (rect.bottom == destination.height) rect.bottom += m[3];
    return rect;
}

// Drawn flat into a depth-of-field buffer, then combined into the target blurred by depth.
void DrawThroughDepthOfField(SY_RenderContext* context, SY_TRLayer* renderable,
                             const SY_CameraView& camera, SY_Shader* shader,
                             const SY_RenderTarget& target) {
    const M_LRect rect = DepthOfFieldRect(*renderable, *context->destination);
    if (rect.right <= rect.left || rect.bottom <= rect.top) {
        // Nothing on screen to blur; the render still counts the layer as done.
        renderable->Render(context, camera, shader, context->scene->fieldMode, target);
        return;
    }
    // The combine hands the buffer the kernels, once it knows how far the layer's blur goes.
    std::unique_ptr<SY_DOFBuffer> buffer =
        SY_DOFBuffer::New(rect, context->destination->GetBitDepth(), context->scene->dof, nullptr);
    buffer->averagesWithin = renderable->unbounded;
    renderable->Render(context, camera, shader, 0, SY_RenderTarget(buffer->Target()));
    buffer->PrepareTables();
    SY_CombineDepthOfField(context, *renderable, camera, shader, buffer.get(), target);
}

void DrawRenderable(SY_RenderContext* context, SY_TRLayer* renderable,
                    const SY_RenderTarget& target) {
    if (renderable->material.renders) {
        std::unique_ptr<SY_LayerShader> shader = SY_MakeLayerShader(context, *renderable);
        SY_CameraView camera =
            renderable->material.motionBlur ? MotionCamera(*context) : FrameCamera(*context);
        if (NeedsDepthOfField(*context, *renderable)) {
            DrawThroughDepthOfField(context, renderable, camera, shader.get(), target);
        } else {
            renderable->Render(context, camera, shader.get(), context->scene->fieldMode, target);
        }
    }
    if (renderable->material.wireframe) DrawOutline(*context->destination, *renderable);
}

// The pixels the members may touch: the union of their pixel rectangles, within the output.
M_LRect GroupRect(const SY_RenderableGroup& group, const PF_World& destination) {
    M_LRect rect{INT32_MAX, INT32_MAX, INT32_MIN, INT32_MIN};
    for (const SY_TRLayer* renderable : group) {
        if (renderable->HasEmptyBounds()) continue;
        rect.left = std::min(rect.left, static_cast<int32_t>(std::floor(renderable->bounds[0])));
        rect.top = std::min(rect.top, static_cast<int32_t>(std::floor(renderable->bounds[1])));
        rect.right = std::max(rect.right, static_cast<int32_t>(std::ceil(renderable->bounds[2])));
        rect.bottom = std::max(rect.bottom, static_cast<int32_t>(std::ceil(renderable->bounds[3])));
    }
    rect.left = std::clamp(rect.left, 0, destination.width);
    rect.top = std::clamp(rect.top, 0, destination.height);
    rect.right = std::clamp(rect.right, rect.left, destination.width);
    rect.bottom = std::clamp(rect.bottom, rect.top, destination.height);
    return rect;
}

// Layers that cross or occlude each other in a cycle go through a fragment buffer, whose
// resolve blends each pixel's fragments farthest first.
void DrawThroughFragmentBuffer(SY_RenderContext* context, const SY_RenderableGroup& group) {
    bool anyBest = false, anyMotion = false;
    for (const SY_TRLayer* renderable : group) {
        anyBest = anyBest || renderable->material.bestQuality;
        anyMotion = anyMotion || renderable->multiSample;
    }
    std::unique_ptr<SY_MBuffer> buffer =
        SY_MBuffer::New(GroupRect(group, *context->destination),
                        context->destination->GetBitDepth(), anyBest, anyMotion);
    const SY_RenderTarget target(*buffer);
    // Layers of a stack lie 1e-7 apart per place in the render order, less than a float key
    // can tell at most depths, and records of equal key are blended in the order they were
    // added. Adding the bottom of a stack first keeps the top layer on top.
    SY_RenderableGroup bottomFirst(group);
    std::stable_sort(bottomFirst.begin(), bottomFirst.end(),
                     [](const SY_TRLayer* a, const SY_TRLayer* b) {
                         return a->material.depthIndex > b->material.depthIndex;
                     });
    for (SY_TRLayer* renderable : bottomFirst)
        DrawRenderable(context, renderable, target);
    buffer->Resolve(context->progress, context->scene->colorSettings, *context->destination);
}

void DrawGroup(SY_RenderContext* context, const SY_RenderableGroup& group) {
    if (group.size() > 1) {
        DrawThroughFragmentBuffer(context, group);
        return;
    }
    DrawRenderable(context, group.front(), SY_RenderTarget(*context->destination));
}

}  // namespace

void SY_RenderFrame(const SY_SceneDesc& scene, SY_TTextureFetcher* fetcher,
                    SY_ProgressAbort* progress, const QNGP_IterateSuite1* iterateSuite,
                    bool multiprocessing, PF_World* destination, void* /*compHandle*/) {
    SY_RenderContext context;
    SY_SetUpContext(&context, scene, fetcher, progress, iterateSuite, multiprocessing, destination);
    SY_PrepareLights(&context);
    SY_BuildShadowMaps(&context);
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
