#include "renderer/raster/image_span.h"

#include <algorithm>

#include "pf_bit_depth.h"
#include "renderer/dof/dof_buffer.h"
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

// The pixels of the layer's image along the span, as they are.
template <class P>
struct ImagePixels {
    static constexpr bool kBlurred = false;
    const P* row;  // the image's row, from the span's first pixel on
    P At(int32_t i, double) const { return row[i]; }
};

// The pixels of a depth-of-field buffer along the span, each blurred by the radius that the
// plane's depth at the pixel calls for. They are sampled up to kAhead neighbours at a time,
// which the buffer reads faster than one by one: as far as the span goes on drawing.
template <class P>
struct BlurredPixels {
    static constexpr bool kBlurred = true;
    static constexpr int32_t kAhead = SY_DOFBufferX<P>::kSpanPixels;
    const SY_DOFBufferX<P>* buffer;
    float x;  // centre of the span's first pixel
    float y;
    const ImageSpan* span;
    const P* matte;             // the matte's row from the span's first pixel on, or null
    mutable int32_t first = 0;  // pixels [first, first + sampledCount) are sampled
    mutable int32_t sampledCount = 0;
    mutable P sampled[kAhead] = {};

    P At(int32_t i, double w) const {
        if (i < first || i >= first + sampledCount) {
            // The pixels from i on that the span draws, with W as it computes it: those the
            // matte shows and the plane lies in front of.
            const SY_SpanMapping& m = span->depth;
            float radius[kAhead];
            int32_t count = 0;
            for (; count < kAhead && i + count < span->count; ++count) {
                const int32_t j = i + count;
                const double wj = count ? m.w + j * static_cast<double>(m.dwdx) : w;
                if (count && ((matte && matte[j].alpha == 0) || (span->perspective && wj <= 0)))
                    break;
                radius[count] = buffer->RadiusAtW(wj);
            }
            buffer->SampleSpan(x, y, i, count, radius, sampled);
            first = i;
            sampledCount = count;
        }
        return sampled[i - first];
    }
};

// Hands every pixel the matte shows and the plane lies in front of to the delivery, with the
// plane's W at the pixel centre as the layer's textured spans give it.
template <class P, class Source, class Delivery>
void DrawFromImage(const SY_SpanBlend& blend, const SY_ScreenGeometry& layer, const ImageSpan& span,
                   const Source& source, const P* matte, int32_t y, Delivery& delivery,
                   int32_t thread) {
    using namespace sy_span;
    const bool changed = blend.colorOnly || blend.shadows;
    const SY_SpanMapping& m = span.depth;
    const SY_Coverage<P> layerCoverage = LayerCoverage<P>(blend.opacity);
    SY_FragmentDepth depth{0, m.dwdx, m.dwdy, 0};
    for (int32_t i = 0; i < span.count; ++i) {
        if (matte && matte[i].alpha == 0) continue;
        double w = m.w + i * static_cast<double>(m.dwdx);
        if (span.perspective && w <= 0) continue;
        const P pixel = source.At(i, w);
        // Most of a blurred layer's rectangle lies beyond its edges, where nothing is left.
        if constexpr (Source::kBlurred) {
            if (pixel.alpha == 0) continue;
        }
        if constexpr (Delivery::kUsesDepth) depth.center = w + blend.depthOffset;
        SY_Coverage<P> coverage =
            matte ? MatteCoverage<P>(matte[i].alpha, layerCoverage) : layerCoverage;
        if (changed) {
            delivery.Deliver(span.x + i, Shown(blend, layer, pixel, span.x + i, y, w), coverage,
                             depth, thread);
        } else {
            delivery.Deliver(span.x + i, pixel, coverage, depth, thread);
        }
    }
}

template <class P, class Source>
void DrawAtDepth(const SY_SpanBlend& blend, const SY_ScreenGeometry& layer,
                 const PF_World* matteWorld, const ImageSpan& span, const Source& source, int32_t y,
                 const PF_LinearBlendingTables* tables, const SY_RenderTarget& target,
                 int32_t thread) {
    const P* matte = matteWorld ? matteWorld->PixelAt<P>(span.x, y) : nullptr;
    auto draw = [&](auto delivery) {
        DrawFromImage(blend, layer, span, source, matte, y, delivery, thread);
    };
    target.Visit(
        [&](PF_World* world) {
            draw(SY_CompositeDelivery<P>(world->Row<P>(y), blend.mode, tables));
        },
        [&](SY_MBuffer* buffer) {
            SY_WithFragmentDelivery<P>(buffer, span.x, y, blend.mode, draw);
        },
        [&](const SY_SpanImageRecord& record) {
            draw(SY_StoreDelivery<P>{record.image->Row<P>(y - record.y0) - record.x0});
        },
        [](SY_ShadowFragmentArray*) {});
}

// The span cut to the columns [left, right) and rows [top, bottom) that hold pixels, with the
// plane's depth at its first pixel; false when nothing is left.
bool CutSpan(const SY_ScreenGeometry& layer, int32_t x, int32_t count, int32_t y, int32_t left,
             int32_t top, int32_t right, int32_t bottom, ImageSpan* span) {
    if (y < top || y >= bottom) return false;
    span->x = std::max(x, left);
    span->count = std::min(x + count, right) - span->x;
    if (span->count <= 0) return false;
    span->perspective = layer.perspective;
    span->depth.Start(layer.screenToTexture[layer.firstValid], span->x + 0.5, y + 0.5,
                      layer.perspective, 1.0f);
    return true;
}

// Kinds 1 and 2 take the layer's pixels, kind 3 stores them; the depth of the target and of
// the pixels must agree.
bool ServedKind(const SY_RenderTarget& target) {
    return target.mode() != kSY_TargetShadowArray;
}

}  // namespace

void SY_RenderLayerSpanFromImage_SwitchDepth(const SY_SpanBlend& blend,
                                             const SY_ScreenGeometry& layer, const PF_World* matte,
                                             int32_t x, int32_t count, int32_t y,
                                             const PF_LinearBlendingTables* tables,
                                             const SY_RenderTarget& target, int32_t thread) {
    if (count <= 0 || !ServedKind(target)) return;
    // An image of another depth than the target's is refused as an unknown depth is.
    int16_t depth = SY_TargetBitDepth(target);
    if (layer.texture->GetBitDepth() != depth) depth = 0;
    PF_DispatchBitDepth(
        depth,
        [&]<class P>() {
            const PF_World& image = *layer.texture;
            // A store reaches no further than the pixels it stores into.
            int32_t left = 0, top = 0, right = image.width, bottom = image.height;
            target.Visit([](const auto&) {},
                         [&](const SY_SpanImageRecord& record) {
                             left = std::max(left, record.x0);
                             top = std::max(top, record.y0);
                             right = std::min(right, record.x0 + record.image->width);
                             bottom = std::min(bottom, record.y0 + record.image->height);
                         });
            ImageSpan span;
            if (!CutSpan(layer, x, count, y, left, top, right, bottom, &span)) return;
            DrawAtDepth<P>(blend, layer, matte, span, ImagePixels<P>{image.PixelAt<P>(span.x, y)},
                           y, tables, target, thread);
        },
        U_BitDepthVerification("Unexpected bitdepth in SY_RenderLayerSpanFromImage_SwitchDepth()"));
}

void SY_RenderLayerSpanFromDOFBuffer_SwitchDepth(const SY_SpanBlend& blend,
                                                 const SY_ScreenGeometry& layer,
                                                 const SY_DOFBuffer& buffer, const PF_World* matte,
                                                 int32_t x, int32_t count, int32_t y,
                                                 const PF_LinearBlendingTables* tables,
                                                 const SY_RenderTarget& target, int32_t thread) {
    if (count <= 0 || target.mode() == kSY_TargetDepthOfField || !ServedKind(target)) return;
    int16_t depth = SY_TargetBitDepth(target);
    if (buffer.GetBitDepth() != depth) depth = 0;
    PF_DispatchBitDepth(
        depth,
        [&]<class P>() {
            ImageSpan span;
            if (!CutSpan(layer, x, count, y, buffer.originX, buffer.originY,
                         buffer.originX + buffer.width, buffer.originY + buffer.height, &span)) {
                return;
            }
            BlurredPixels<P> source{static_cast<const SY_DOFBufferX<P>*>(&buffer),
                                    static_cast<float>(span.x) + 0.5f, static_cast<float>(y) + 0.5f,
                                    &span, matte ? matte->PixelAt<P>(span.x, y) : nullptr};
            DrawAtDepth<P>(blend, layer, matte, span, source, y, tables, target, thread);
        },
        U_BitDepthVerification(
            "Unexpected bitdepth in SY_RenderLayerSpanFromDOFBuffer_SwitchDepth()"));
}
