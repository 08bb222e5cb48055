#include "renderer/raster/image_span.h"

#include <algorithm>

#include "pf_bit_depth.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_deliveries.h"
#include "renderer/raster/span_routine.h"
#include "renderer/raster/span_state.h"
#include "renderer/scene/screen_geometry.h"
#include "u_report.h"

namespace {

// The span's pixels, clipped to the image, and the plane's depth at the first of them.
struct ImageSpan {
    int32_t x;
    int32_t count;
    SY_SpanMapping depth;
    bool perspective;
};

// The pixel of the image as the layer shows it: white for a layer that shows only shadows,
// darkened by the shadows on its plane at output pixel (x, y) whose plane W is w.
template <class P>
P Shown(const SY_SpanBlend& blend, const SY_ScreenGeometry& layer, P pixel, int32_t x, int32_t y,
        double w) {
    if (blend.colorOnly) {
        constexpr auto kMax =
            static_cast<typename PF_PixelTraits<P>::Channel>(PF_PixelTraits<P>::kMax);
        pixel.red = pixel.green = pixel.blue = kMax;
    }
    if (blend.shadows) {
        const auto& e = layer.eyeRay.mat;
        double invW = layer.perspective ? 1.0 / w : 1.0;
        double point[3];
        for (int k = 0; k < 3; ++k)
            point[k] = (e[0][k] * (x + 0.5) + e[1][k] * (y + 0.5) + e[2][k]) * invW;
        SY_Lighting light;
        blend.shadows->ShadowOnePixel(point, layer.normal, &light);
        sy_span::ApplyLighting(light, &pixel);
    }
    return pixel;
}

// Hands every pixel the matte shows and the plane lies in front of to the delivery, with the
// plane's W at the pixel centre as the layer's textured spans give it.
template <class P, class Delivery>
void DrawFromImage(const SY_SpanBlend& blend, const SY_ScreenGeometry& layer, const ImageSpan& span,
                   const P* matte, int32_t y, Delivery& delivery, int32_t thread) {
    using namespace sy_span;
    const PF_World& image = *layer.texture;
    const P* source = image.PixelAt<P>(span.x, y);
    const bool changed = blend.colorOnly || blend.shadows;
    const SY_SpanMapping& m = span.depth;
    const SY_Coverage<P> layerCoverage = LayerCoverage<P>(blend.opacity);
    SY_FragmentDepth depth{0, m.dwdx, m.dwdy, 0};
    for (int32_t i = 0; i < span.count; ++i) {
        if (matte && matte[i].alpha == 0) continue;
        double w = m.w + i * static_cast<double>(m.dwdx);
        if (span.perspective && w <= 0) continue;
        if constexpr (Delivery::kUsesDepth) depth.center = w + blend.depthOffset;
        SY_Coverage<P> coverage =
            matte ? MatteCoverage<P>(matte[i].alpha, layerCoverage) : layerCoverage;
        if (changed) {
            delivery.Deliver(span.x + i, Shown(blend, layer, source[i], span.x + i, y, w), coverage,
                             depth, thread);
        } else {
            delivery.Deliver(span.x + i, source[i], coverage, depth, thread);
        }
    }
}

template <class P>
void DrawAtDepth(const SY_SpanBlend& blend, const SY_ScreenGeometry& layer,
                 const PF_World* matteWorld, const ImageSpan& span, int32_t y,
                 const PF_LinearBlendingTables* tables, const SY_RenderTarget& target,
                 int32_t thread) {
    const P* matte = matteWorld ? matteWorld->PixelAt<P>(span.x, y) : nullptr;
    auto draw = [&](auto delivery) {
        DrawFromImage(blend, layer, span, matte, y, delivery, thread);
    };
    target.Visit(
        [&](PF_World* world) {
            draw(SY_CompositeDelivery<P>(world->Row<P>(y), blend.mode, tables));
        },
        [&](SY_MBuffer* buffer) {
            SY_WithFragmentDelivery<P>(buffer, span.x, y, blend.mode, draw);
        },
        [](const auto&) {});  // the other kinds are turned away before the depth is chosen
}

}  // namespace

void SY_RenderLayerSpanFromImage_SwitchDepth(const SY_SpanBlend& blend,
                                             const SY_ScreenGeometry& layer, const PF_World* matte,
                                             int32_t x, int32_t count, int32_t y,
                                             const PF_LinearBlendingTables* tables,
                                             const SY_RenderTarget& target, int32_t thread) {
    if (count <= 0) return;
    if (target.mode() != kSY_TargetDestination && target.mode() != kSY_TargetFragmentBuffer) return;
    // An image of another depth than the target's is refused as an unknown depth is.
    int16_t depth = SY_TargetBitDepth(target);
    if (layer.texture->GetBitDepth() != depth) depth = 0;
    PF_DispatchBitDepth(
        depth,
        [&]<class P>() {
            const PF_World& image = *layer.texture;
            if (y < 0 || y >= image.height) return;
            ImageSpan span;
            span.x = std::max(x, 0);
            span.count = std::min(x + count, image.width) - span.x;
            if (span.count <= 0) return;
            span.perspective = layer.perspective;
            span.depth.Start(layer.screenToTexture[layer.firstValid], span.x + 0.5, y + 0.5,
                             layer.perspective, 1.0f);
            DrawAtDepth<P>(blend, layer, matte, span, y, tables, target, thread);
        },
        U_BitDepthVerification("Unexpected bitdepth in SY_RenderLayerSpanFromImage_SwitchDepth()"));
}
