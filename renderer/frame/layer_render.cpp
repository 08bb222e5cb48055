// The render operation of a layer renderable: screen geometry, track matte, span table, and
// one row work item per covered row.
#include <algorithm>
#include <cmath>

#include "renderer/dof/dof_buffer.h"
#include "renderer/frame/layer_render.h"
#include "renderer/raster/image_span.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_deliveries.h"
#include "renderer/raster/span_render.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/render_target.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/row_work.h"
#include "renderer/scene/screen_geometry.h"
#include "renderer/scene/span_table.h"

namespace {

// Holds a fetched track matte and hands it back on every way out.
class MatteHold {
public:
    MatteHold() = default;
    ~MatteHold() {
        if (fetcher_) fetcher_->Release();
    }
    MatteHold(const MatteHold&) = delete;
    MatteHold& operator=(const MatteHold&) = delete;

    PF_World* Fetch(SY_TImageFetcher* fetcher) {
        PF_World* world = fetcher->Fetch();
        fetcher_ = fetcher;
        return world;
    }

private:
    SY_TImageFetcher* fetcher_ = nullptr;
};

struct RowClosure {
    const SY_ScreenGeometry* geometry;
    const SY_Shader* shader;
    const PF_World* matte;
    bool matteOutsideClear;  // beyond the matte's pixels the layer is hidden
    const SY_SpanTable* table;
    const SY_RenderTarget* target;
    const PF_LinearBlendingTables* blending;  // the frame's colour settings: linear light, or null
    SY_SpanBlend blend;                       // the simple path's mode, opacity and depth offset
    int32_t width;                            // the simple path's row length: the destination's
};

// The host may deliver a matte that does not cover the whole output. The span is cut where the
// matte ends, so that nothing reads past it; beyond it the layer is hidden when the matte's
// outside is clear and drawn unmatted otherwise.
template <class DrawSpan>
void DrawMatted(const RowClosure& c, int32_t x, int32_t count, int32_t row, DrawSpan draw) {
    if (!c.matte) {
        draw(x, count, nullptr);
        return;
    }
    int32_t end = x + count;
    int32_t covered = row < c.matte->height ? std::clamp(c.matte->width, x, end) : x;
    if (covered > x) draw(x, covered - x, c.matte);
    if (!c.matteOutsideClear && covered < end) draw(covered, end - covered, nullptr);
}

void DrawRow(const void* closure, int32_t row, int32_t item, int32_t thread) {
    const auto& c = *static_cast<const RowClosure*>(closure);
    const SY_Span& span = c.table->rows[item];
    DrawMatted(c, span.start, span.end - span.start, row,
               [&](int32_t x, int32_t count, const PF_World* matte) {
                   SY_RenderLayerSpan_SwitchDepth(*c.geometry, c.shader, matte, x, count, row,
                                                  c.blending, *c.target, thread);
               });
}

void DrawImageRow(const void* closure, int32_t row, int32_t, int32_t thread) {
    const auto& c = *static_cast<const RowClosure*>(closure);
    DrawMatted(c, 0, c.width, row, [&](int32_t x, int32_t count, const PF_World* matte) {
        SY_RenderLayerSpanFromImage_SwitchDepth(c.blend, *c.geometry, matte, x, count, row,
                                                c.blending, *c.target, thread);
    });
}

void CountDone(SY_RenderContext* context) {
    ++context->renderablesDone;
    context->progress->ReportRenderables(context->renderablesDone, context->renderableCount);
}

void RunRows(SY_RenderContext* context, int32_t firstRow, int32_t rows, int32_t fieldMode,
             SY_RowDrawer draw, const void* closure) {
    SY_RowWork work;
    work.iterate = context->iterate;
    work.progress = context->progress;
    work.firstRow = firstRow;
    work.itemCount = rows;
    work.fieldMode = fieldMode;
    work.draw = draw;
    work.closure = closure;
    SY_RunRowWork(work);
}

// The rows the layer's covered polygon touches, each drawn through the projection.
void DrawGeneralPath(SY_RenderContext* context, const SY_TRLayer& renderable,
                     const RowClosure& closure, SY_SpanTable* table, int32_t fieldMode) {
    SY_AccountedVector<M_Point2> polygon;
    SY_CoveredPolygon(renderable, &polygon);
    if (polygon.empty()) return;
    SY_BuildSpanTable(polygon.data(), static_cast<int32_t>(polygon.size()), table);
    if (table->rows.empty()) return;
    RunRows(context, table->firstRow, static_cast<int32_t>(table->rows.size()), fieldMode, &DrawRow,
            &closure);
}

// Every row of the destination, drawn whole from the layer's image in output coordinates.
void DrawSimplePath(SY_RenderContext* context, const RowClosure& closure, int32_t fieldMode) {
    RunRows(context, 0, context->destination->height, fieldMode, &DrawImageRow, &closure);
}

// The simple path's blend record, from the material as the layer's shader takes it.
SY_SpanBlend ImageBlend(const SY_Material& material, const SY_Shader* shader) {
    SY_SpanBlend blend{SY_DeliveredMode(material), material.opacity, SY_DepthOffset(material)};
    blend.colorOnly = material.acceptsShadows == kSY_AcceptsShadowsOnly;
    // Layers drawn from an image are not lit, but the shadows on them show.
    const auto* layerShader =
        shader && shader->IsFrameShader() ? static_cast<const SY_LayerShader*>(shader) : nullptr;
    if (layerShader && material.acceptsShadows != kSY_AcceptsShadowsOff &&
        std::any_of(layerShader->lights.begin(), layerShader->lights.end(),
                    [](const SY_LightState* light) { return light->shadowMap != nullptr; })) {
        blend.shadows = layerShader;
    }
    return blend;
}

// The simple path draws an unbounded layer from its image, unless a shadow map is being made.
bool TakesSimplePath(const SY_TRLayer& renderable, const SY_Shader* shader) {
    return renderable.unbounded && (!shader || shader->IsFrameShader());
}

SY_GeometryFlags GeometryFlagsFor(const SY_TRLayer& renderable, const SY_CameraView& camera,
                                  const SY_Shader* shader) {
    bool simplePath = TakesSimplePath(renderable, shader);
    SY_GeometryFlags flags;
    flags.perspective = camera.perspective;
    flags.screenSizedTexture = renderable.collapsed && !simplePath;
    flags.needsSurfacePoint = shader && shader->NeedsSurfacePoint();
    flags.blurred = shader && shader->ShadowBlurRadius() != 0;
    flags.alphaOnly = flags.blurred && shader->ReadsAlphaOnly();
    flags.wholeLayer = simplePath;
    flags.samplingFilter = SY_SamplingFilterOf(renderable.material);
    return flags;
}

// A layer drawn through depth of field, taken blurred from its buffer. The buffer already
// holds the layer lit and shadowed, so only the mode, opacity and depth remain to apply.
struct BlurredRowClosure {
    RowClosure rows;
    const SY_DOFBuffer* buffer;
    int32_t left;  // the first column drawn; rows.width columns from it
};

void DrawBlurredRow(const void* closure, int32_t row, int32_t, int32_t thread) {
    const auto& c = *static_cast<const BlurredRowClosure*>(closure);
    DrawMatted(
        c.rows, c.left, c.rows.width, row, [&](int32_t x, int32_t count, const PF_World* matte) {
            SY_RenderLayerSpanFromDOFBuffer_SwitchDepth(c.rows.blend, *c.rows.geometry, *c.buffer,
                                                        matte, x, count, row, c.rows.blending,
                                                        *c.rows.target, thread);
        });
}

// At least the largest blur radius the pixels of columns [left, right) and rows [top, bottom)
// ask for. The plane's W is affine across the screen and the radius grows with W's distance
// from the focus, so the corners bound it; W near or behind the eye (or not a number), where
// the model may blur as much as it can, is bounded by that.
float LargestRadius(const SY_ScreenGeometry& geometry, const SY_DOFBuffer& buffer, int32_t left,
                    int32_t top, int32_t right, int32_t bottom) {
    if (!buffer.model.Blurs()) return 0;
    const double* e = &geometry.screenToTexture[geometry.firstValid].mat[0][0];
    float largest = 0;
    for (double x : {left + 0.5, right - 0.5}) {
        for (double y : {top + 0.5, bottom - 0.5}) {
            const double w = e[2] * x + e[5] * y + e[8];
            if (!(w >= 1e-9)) return buffer.model.maxRadius;
            largest = std::max(largest, buffer.RadiusAtW(w));
        }
    }
    // A row's W steps by a float from its first pixel: a margin well beyond what that rounds.
    return largest * 1.001f + 0.01f;
}

}  // namespace

void SY_CombineDepthOfField(SY_RenderContext* context, const SY_TRLayer& renderable,
                            const SY_CameraView& camera, const SY_Shader* shader,
                            SY_DOFBuffer* buffer, const SY_RenderTarget& target) {
    SY_ScreenGeometry geometry;
    geometry.Build(*context, renderable, camera.worldToScreen, camera.count,
                   GeometryFlagsFor(renderable, camera, shader));
    if (geometry.Empty()) return;
    MatteHold matteHold;
    PF_World* matte = renderable.trackMatte ? matteHold.Fetch(renderable.trackMatte) : nullptr;
    bool outsideClear = renderable.trackMatte && renderable.trackMatte->OutsideIsClear();
    if (renderable.trackMatte && !matte && outsideClear) return;
    const PF_World& destination = *context->destination;
    int32_t left = std::max(buffer->originX, 0), top = std::max(buffer->originY, 0);
    int32_t right = std::min(buffer->originX + buffer->width, destination.width);
    int32_t bottom = std::min(buffer->originY + buffer->height, destination.height);
    if (right <= left || bottom <= top) return;
    // Kernels for every radius the layer asks for, kept for the frame's later layers.
    const SY_CameraDOFDesc& dof = context->scene->dof;
    context->dofKernels = BuildShapeKernels(
        dof, LargestRadius(geometry, *buffer, left, top, right, bottom), context->dofKernels);
    buffer->UseKernels(context->dofKernels);
    const SY_Material& material = renderable.material;
    BlurredRowClosure closure{
        {&geometry, shader, matte, matte && outsideClear, nullptr, &target,
         context->scene->colorSettings,
         SY_SpanBlend{SY_DeliveredMode(material), material.opacity, SY_DepthOffset(material)},
         right - left},
        buffer,
        left};
    RunRows(context, top, bottom - top, context->scene->fieldMode, &DrawBlurredRow, &closure);
}

void SY_TRLayer::Render(SY_RenderContext* context, const SY_CameraView& camera, SY_Shader* shader,
                        int32_t fieldMode, const SY_RenderTarget& target) {
    bool simplePath = TakesSimplePath(*this, shader);
    SY_ScreenGeometry geometry;
    geometry.Build(*context, *this, camera.worldToScreen, camera.count,
                   GeometryFlagsFor(*this, camera, shader));
    if (!geometry.Empty()) {
        MatteHold matteHold;
        PF_World* matte = nullptr;
        bool matteApplies = target.mode() != kSY_TargetDepthOfField &&
                            target.mode() != kSY_TargetShadowArray && trackMatte;
        if (matteApplies) matte = matteHold.Fetch(trackMatte);
        if (!matteApplies || matte || !trackMatte->OutsideIsClear()) {
            SY_SpanTable table;
            RowClosure closure{&geometry,
                               shader,
                               matte,
                               matte && trackMatte->OutsideIsClear(),
                               &table,
                               &target,
                               context->scene->colorSettings,
                               ImageBlend(material, shader),
                               context->destination->width};
            if (simplePath)
                DrawSimplePath(context, closure, fieldMode);
            else
                DrawGeneralPath(context, *this, closure, &table, fieldMode);
        }
    }
    CountDone(context);
}
