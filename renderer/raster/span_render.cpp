#include "renderer/raster/span_render.h"

#include "renderer/mbuffer/mbuffer.h"
#include "renderer/raster/span_deliveries.h"
#include "renderer/raster/span_routine.h"
#include "renderer/scene/screen_geometry.h"
#include "u_cpu.h"
#include "u_report.h"

namespace {

constexpr int32_t kErrUnexpectedBitDepth = 3;

SY_SpanRayState RayAt(const SY_ScreenGeometry& geometry, double x, double y) {
    SY_SpanRayState ray;
    const auto& e = geometry.eyeRay.mat;
    for (int k = 0; k < 3; ++k) {
        ray.sx[k] = static_cast<float>(e[0][k]);
        ray.d[k] = static_cast<float>(e[0][k] * x + e[1][k] * y + e[2][k]);
        ray.normal[k] = geometry.normal[k];
    }
    return ray;
}

void StartTexture(const SY_ScreenGeometry& geometry, SY_SpanTexture* texture) {
    texture->world = geometry.texture;
    texture->samplingFilter = geometry.samplingFilter;
    texture->sampling.src = geometry.texture;
    texture->perspective = geometry.perspective;
}

template <class P, class State>
void Deliver(const SY_LayerShader& shader, State& state, SY_SpanRayState& ray, const P* matte,
             int32_t x, int32_t count, int32_t y, const PF_LinearBlendingTables* tables,
             const SY_RenderTarget& target, int32_t thread) {
    bool pairLighting = U_G_CPU_DataP()->hasVectorUnits != 0;
    switch (target.mode) {
        case kSY_TargetDestination: {
            auto* world = static_cast<PF_World*>(target.object);
            SY_CompositeDelivery<P> delivery(world->Row<P>(y), shader.material.mode, tables);
            SY_DrawSpan(shader, pairLighting, state, ray, matte, x, count, delivery, thread);
            break;
        }
        case kSY_TargetFragmentBuffer: {
            auto* buffer = static_cast<SY_MBuffer*>(target.object);
            if (buffer->IsAntialiased() || buffer->HasMotionBlur()) break;
            SY_DraftFragmentDelivery<P> delivery(static_cast<SY_MBufferDraftX<P>*>(buffer), x, y,
                                                 shader.material.mode);
            SY_DrawSpan(shader, pairLighting, state, ray, matte, x, count, delivery, thread);
            break;
        }
        case kSY_TargetDepthOfField: {
            auto* record = static_cast<SY_SpanImageRecord*>(target.object);
            SY_StoreDelivery<P> delivery{record->image->Row<P>(y - record->y0) - record->x0};
            SY_DrawSpan(shader, pairLighting, state, ray, matte, x, count, delivery, thread);
            break;
        }
        default:
            break;
    }
}

template <class P>
void RenderAtDepth(const SY_ScreenGeometry& geometry, const SY_LayerShader& shader,
                   const PF_World* matteWorld, int32_t x, int32_t count, int32_t y,
                   const PF_LinearBlendingTables* tables, const SY_RenderTarget& target,
                   int32_t thread) {
    double cx = x + 0.5, cy = y + 0.5;
    SY_SpanRayState ray = RayAt(geometry, cx, cy);
    const P* matte = matteWorld ? matteWorld->PixelAt<P>(x, y) : nullptr;
    int32_t matrices = geometry.screenToTexture.Count();
    if (matrices == 1) {
        SY_SpanSampleState<P> state;
        StartTexture(geometry, &state.texture);
        state.mapping.Start(geometry.screenToTexture[0], cx, cy, geometry.perspective, 1.0f);
        Deliver(shader, state, ray, matte, x, count, y, tables, target, thread);
        return;
    }
    SY_SpanSubsampleState<P> state;
    StartTexture(geometry, &state.texture);
    state.count = matrices;
    state.first = geometry.firstValid;
    state.last = geometry.lastValid;
    for (int32_t i = state.first; i <= state.last; ++i) {
        const M_Matrix3& m = geometry.screenToTexture[i];
        if (m.IsZeroWithinEpsilon(0.0))
            state.mappings[i].StartAbsent();
        else
            state.mappings[i].Start(m, cx, cy, geometry.perspective, 0.5f);
    }
    Deliver(shader, state, ray, matte, x, count, y, tables, target, thread);
}

}  // namespace

void SY_RenderLayerSpan_SwitchDepth(const SY_ScreenGeometry& geometry, const SY_Shader* shader,
                                    const PF_World* matte, int32_t x, int32_t count, int32_t y,
                                    const PF_LinearBlendingTables* tables,
                                    const SY_RenderTarget& target, int32_t thread) {
    if (count <= 0) return;
    if (target.mode != kSY_TargetDestination && target.mode != kSY_TargetFragmentBuffer &&
        target.mode != kSY_TargetDepthOfField) {
        return;
    }
    int16_t depth = SY_TargetBitDepth(target);
    if (geometry.texture->GetBitDepth() != depth) depth = 0;
    const auto& layerShader = static_cast<const SY_LayerShader&>(*shader);
    switch (depth) {
        case 8:
            RenderAtDepth<PF_Pixel8>(geometry, layerShader, matte, x, count, y, tables, target,
                                     thread);
            break;
        case 16:
            RenderAtDepth<PF_Pixel16>(geometry, layerShader, matte, x, count, y, tables, target,
                                      thread);
            break;
        case 32:
            RenderAtDepth<PF_PixelFloat>(geometry, layerShader, matte, x, count, y, tables, target,
                                         thread);
            break;
        default:
            U_ReportFailedVerification(0, __LINE__, 0,
                                       "Unexpected bitdepth in SY_RenderLayerSpan_SwitchDepth()");
            throw kErrUnexpectedBitDepth;
    }
}
