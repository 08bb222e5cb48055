// Where the span routines hand their pixels: composited into a world, stored into an image, or
// added to a fragment buffer. Each delivery takes (x, pixel, coverage, depth, thread).
#pragma once

#include <cstdint>

#include "pf_pixel.h"
#include "pf_xfer.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/record_apply.h"
#include "renderer/raster/span_render.h"
#include "renderer/raster/span_routine.h"

// The mode byte a layer's pixels are delivered with: a layer that shows only the shadows on it
// catches them with kSY_ShadowCatchMode, whatever its own mode.
inline uint8_t SY_DeliveredMode(const SY_Material& material) {
    return material.acceptsShadows == kSY_AcceptsShadowsOnly ? kSY_ShadowCatchMode : material.mode;
}

// Kind 1: blended into the row of the world with the layer's transfer mode; with bit 7 of the
// mode byte the destination keeps its alpha. Normal mode without linear blending replaces the
// destination by an opaque pixel at full coverage, so such pixels (most of an opaque layer)
// are stored without a call.
template <class P>
struct SY_CompositeDelivery {
    static constexpr bool kUsesDepth = false;
    static constexpr auto kFull = static_cast<SY_Coverage<P>>(PF_PixelTraits<P>::kMax);

    SY_CompositeDelivery(P* destinationRow, uint8_t mode, const PF_LinearBlendingTables* blending)
        : row(destinationRow),
          // A layer that catches shadows blends by SY_CatchShadow; the host has no such mode.
          blend(PF_Get_Xfer1_Opacity<P>((mode & 127) == kSY_ShadowCatchMode ? kPF_XferMultiply
                                                                            : mode & 127)),
          tables(blending),
          keepAlpha((mode & 128) != 0),
          catchesShadows((mode & 127) == kSY_ShadowCatchMode),
          opaqueReplaces((mode & 127) == kPF_XferNormal && !blending && !keepAlpha) {}

    void Deliver(int32_t x, const P& pixel, SY_Coverage<P> coverage, const SY_FragmentDepth&,
                 int32_t) {
        P* destination = row + x;
        if (opaqueReplaces && coverage == kFull && pixel.alpha == kFull) {
            *destination = pixel;
        } else if (catchesShadows) {
            SY_CatchShadow(pixel, static_cast<float>(coverage) / PF_PixelTraits<P>::kMax,
                           destination);
        } else if (keepAlpha) {
            auto alpha = destination->alpha;
            blend(&pixel, tables, coverage, destination);
            destination->alpha = alpha;
        } else {
            blend(&pixel, tables, coverage, destination);
        }
    }

    P* row;
    PF_Xfer1OpacityFunc<P> blend;
    const PF_LinearBlendingTables* tables;
    bool keepAlpha;
    bool catchesShadows;  // kSY_ShadowCatchMode
    bool opaqueReplaces;
};

// Kind 3: written over the image's pixel; the image's owner applies the coverage later.
template <class P>
struct SY_StoreDelivery {
    static constexpr bool kUsesDepth = false;
    P* row;  // the image's row, moved so that frame x indexes it

    void Deliver(int32_t x, const P& pixel, SY_Coverage<P>, const SY_FragmentDepth&, int32_t) {
        row[x] = pixel;
    }
};

// Kind 2: a fragment in the pixel's list of a fragment buffer (SY_MBufferDraftX,
// SY_MBufferAAX or SY_MBufferMBX of the pixel type); the resolve blends the lists later.
template <class Buffer>
struct SY_FragmentDelivery {
    static constexpr bool kUsesDepth = true;
    using Record = typename Buffer::Record;
    using P = typename Record::Pixel;

    SY_FragmentDelivery(Buffer* target, int32_t x, int32_t y, uint8_t layerMode)
        : buffer(target), heads(target->HeadAt(x, y)), firstX(x), mode(layerMode) {}

    void Deliver(int32_t x, const P& pixel, SY_Coverage<P> coverage, const SY_FragmentDepth& d,
                 int32_t thread) {
        Record** head = heads + (x - firstX);
        const float key = Record::Key(d.center, d.dzdx, d.dzdy, d.dzdt);
        if constexpr (Record::kGradients == 0)
            buffer->AddFragment(&pixel, coverage, mode, key, head, thread);
        else if constexpr (Record::kGradients == 2)
            buffer->AddFragment(&pixel, coverage, mode, key, d.dzdx, d.dzdy, head, thread);
        else
            buffer->AddFragment(&pixel, coverage, mode, key, d.dzdx, d.dzdy, d.dzdt, head, thread);
    }

    Buffer* buffer;
    Record** heads;  // the heads of the span's row, from its first pixel on
    int32_t firstX;
    uint8_t mode;
};

// Calls draw(delivery) with the delivery into buffer's concrete class for pixels of P, from
// pixel (x, y) on.
template <class P, class Draw>
void SY_WithFragmentDelivery(SY_MBuffer* buffer, int32_t x, int32_t y, uint8_t mode, Draw&& draw) {
    if (buffer->HasMotionBlur()) {
        using Buffer = SY_MBufferMBX<P>;
        draw(SY_FragmentDelivery<Buffer>(static_cast<Buffer*>(buffer), x, y, mode));
    } else if (buffer->IsAntialiased()) {
        using Buffer = SY_MBufferAAX<P>;
        draw(SY_FragmentDelivery<Buffer>(static_cast<Buffer*>(buffer), x, y, mode));
    } else {
        using Buffer = SY_MBufferDraftX<P>;
        draw(SY_FragmentDelivery<Buffer>(static_cast<Buffer*>(buffer), x, y, mode));
    }
}

// The pixel depth of a target of kind 1, 2 or 3. Occluders (kind 4) are not pixels of the
// frame's depth: 0, which no dispatch takes.
inline int16_t SY_TargetBitDepth(const SY_RenderTarget& target) {
    return target.Visit(
        [](const PF_World* world) { return world->GetBitDepth(); },
        [](const SY_MBuffer* buffer) { return buffer->GetBitDepth(); },
        [](const SY_SpanImageRecord& record) { return record.image->GetBitDepth(); },
        [](const SY_ShadowFragmentArray*) { return int16_t{0}; });
}
