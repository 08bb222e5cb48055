#include "renderer/raster/span_render.h"

#include "pf_bit_depth.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/raster/shadow_span.h"
#include "renderer/raster/span_deliveries.h"
#include "renderer/raster/span_routine.h"
#include "renderer/raster/span_start.h"
#include "renderer/scene/screen_geometry.h"
#include "u_report.h"

namespace {

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

template <class P, class State>
void Deliver(const SY_LayerShader& shader, State& state, SY_SpanRayState& ray, const P* matte,
             int32_t x, int32_t count, int32_t y, const PF_LinearBlendingTables* tables,
             const SY_RenderTarget& target, int32_t thread) {
    static const SY_LightingLanes lanes = SY_WidestLightingLanes();
    auto draw = [&](auto delivery) {
        SY_DrawSpan(shader, lanes, state, ray, matte, x, count, delivery, thread);
    };
    target.Visit(
        [&](PF_World* world) {
            draw(SY_CompositeDelivery<P>(world->Row<P>(y), SY_DeliveredMode(shader.material),
                                         tables));
        },
        [&](SY_MBuffer* buffer) {
            SY_WithFragmentDelivery<P>(buffer, x, y, SY_DeliveredMode(shader.material), draw);
        },
        [&](const SY_SpanImageRecord& record) {
            draw(SY_StoreDelivery<P>{record.image->Row<P>(y - record.y0) - record.x0});
        },
        [](SY_ShadowFragmentArray*) {});
}

template <class P>
void RenderAtDepth(const SY_ScreenGeometry& geometry, const SY_LayerShader& shader,
                   const PF_World* matteWorld, int32_t x, int32_t count, int32_t y,
                   const PF_LinearBlendingTables* tables, const SY_RenderTarget& target,
                   int32_t thread) {
    SY_SpanRayState ray = RayAt(geometry, x + 0.5, y + 0.5);
    const P* matte = matteWorld ? matteWorld->PixelAt<P>(x, y) : nullptr;
    SY_WithSpanState<P>(geometry, x, y, [&](auto& state) {
        Deliver(shader, state, ray, matte, x, count, y, tables, target, thread);
    });
}

}  // namespace

void SY_RenderLayerSpan_SwitchDepth(const SY_ScreenGeometry& geometry, const SY_Shader* shader,
                                    const PF_World* matte, int32_t x, int32_t count, int32_t y,
                                    const PF_LinearBlendingTables* tables,
                                    const SY_RenderTarget& target, int32_t thread) {
    if (count <= 0) return;
    if (target.mode() == kSY_TargetShadowArray) {
        // Occluders take the texture at whatever depth it comes; the map has none of its own.
        SY_ShadowFragmentArray* occluders = target.Visit(
            [](PF_World*) -> SY_ShadowFragmentArray* { return nullptr; },
            [](SY_MBuffer*) -> SY_ShadowFragmentArray* { return nullptr; },
            [](const SY_SpanImageRecord&) -> SY_ShadowFragmentArray* { return nullptr; },
            [](SY_ShadowFragmentArray* array) { return array; });
        // Only the shadow shader draws occluders; a frame's layer shader has none to give.
        if (!shader->IsFrameShader()) {
            SY_RenderShadowSpan(geometry, static_cast<const SY_ShadowShader&>(*shader), x, count, y,
                                occluders, thread);
        }
        return;
    }
    // A texture of another depth than the target's is refused as an unknown depth is.
    int16_t depth = SY_TargetBitDepth(target);
    if (geometry.texture->GetBitDepth() != depth) depth = 0;
    const auto& layerShader = static_cast<const SY_LayerShader&>(*shader);
    PF_DispatchBitDepth(
        depth,
        [&]<class P>() {
            RenderAtDepth<P>(geometry, layerShader, matte, x, count, y, tables, target, thread);
        },
        U_BitDepthVerification("Unexpected bitdepth in SY_RenderLayerSpan_SwitchDepth()"));
}
