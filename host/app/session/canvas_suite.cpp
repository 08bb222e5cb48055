#include <chrono>

#include "composition/render_order.h"
#include "composition/streams.h"
#include "composition/timing.h"
#include "composition/transform.h"
#include "session/frame_suites.h"
#include "session/suite_guard.h"

namespace ostrel {
namespace {

bool Owns(FrameSession& session, QNGP_LayerContextH context) {
    return context && context->layer && context->layer->session == &session;
}

int32_t GetCompToRender(QNGP_RenderContextH context, QNGP_CompH* comp) {
    return Serve(context, [&](FrameSession& session) {
        if (!comp) return kQNGP_ErrBadArgument;
        *comp = session.CompHandle();
        return 0;
    });
}

int32_t GetRenderTime(QNGP_RenderContextH context, T_Time* time, T_Time* timeStep) {
    return Serve(context, [&](FrameSession& session) {
        if (!time || !timeStep) return kQNGP_ErrBadArgument;
        *time = session.RenderTime();
        *timeStep = session.TimeStep();
        return 0;
    });
}

int32_t GetCompDestination(QNGP_RenderContextH context, QNGP_CompH comp, PF_World** world) {
    return Serve(context, [&](FrameSession& session) {
        if (!world) return kQNGP_ErrBadArgument;
        if (comp != session.CompHandle()) return kQNGP_ErrBadHandle;
        *world = &session.Destination();
        return 0;
    });
}

int32_t GetDownsample(QNGP_RenderContextH context, int16_t* dx, int16_t* dy) {
    return Serve(context, [&](FrameSession& session) {
        if (!dx || !dy) return kQNGP_ErrBadArgument;
        *dx = session.DownsampleX();
        *dy = session.DownsampleY();
        return 0;
    });
}

int32_t GetRegionOfInterest(QNGP_RenderContextH context, QNGP_ShortRect* region) {
    return Serve(context, [&](FrameSession& session) {
        if (!region) return kQNGP_ErrBadArgument;
        *region = session.Region();
        return 0;
    });
}

int32_t GetFieldRender(QNGP_RenderContextH context, int32_t* fieldMode) {
    return Serve(context, [&](FrameSession& session) {
        if (!fieldMode) return kQNGP_ErrBadArgument;
        *fieldMode = session.FieldMode();
        return 0;
    });
}

int32_t GetNumLayersToRender(QNGP_RenderContextH context, int32_t* count) {
    return Serve(context, [&](FrameSession& session) {
        if (!count) return kQNGP_ErrBadArgument;
        *count = session.LayerContextCount();
        return 0;
    });
}

int32_t GetNthLayerContext(QNGP_RenderContextH context, int32_t index,
                           QNGP_LayerContextH* layerContext) {
    return Serve(context, [&](FrameSession& session) {
        if (!layerContext) return kQNGP_ErrBadArgument;
        if (index < 0 || index >= session.LayerContextCount()) return kQNGP_ErrBadIndex;
        *layerContext = session.LayerContext(index);
        return 0;
    });
}

int32_t GetLayerFromLayerContext(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                 QNGP_LayerH* layer) {
    return Serve(context, [&](FrameSession& session) {
        if (!layer) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        *layer = layerContext->layer;
        return 0;
    });
}

// Compositions have no nested comps: every layer is its own top-level layer.
int32_t GetTopLevelLayer(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                         QNGP_LayerH* layer) {
    return GetLayerFromLayerContext(context, layerContext, layer);
}

int32_t GetRenderLayerToWorldXform(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                                   const T_Time* time, M_Matrix4* transform) {
    return Serve(context, [&](FrameSession& session) {
        if (!time || !transform) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        *transform = LayerToWorld(session.Comp(), layerContext->layer->index, T_Seconds(*time));
        return 0;
    });
}

int32_t GetRenderLayerBounds(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                             const T_Time* time, QNGP_ShortRect* bounds) {
    return Serve(context, [&](FrameSession& session) {
        if (!time || !bounds) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        M_LRect r = SourceBounds(session.LayerAt(layerContext->layer->index));
        *bounds = {static_cast<int16_t>(r.top), static_cast<int16_t>(r.left),
                   static_cast<int16_t>(r.bottom), static_cast<int16_t>(r.right)};
        return 0;
    });
}

int32_t GetRenderOpacity(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                         const T_Time* time, double* opacity) {
    return Serve(context, [&](FrameSession& session) {
        if (!time || !opacity) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        const Layer& layer = session.LayerAt(layerContext->layer->index);
        *opacity = StreamValue(layer, kQNGP_StreamOpacity, T_Seconds(*time)) / 100;
        return 0;
    });
}

// Only a solid that says so is unbounded; images always have their size.
int32_t IsLayerUnbounded(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                         bool* unbounded) {
    return Serve(context, [&](FrameSession& session) {
        if (!unbounded) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        *unbounded = session.LayerAt(layerContext->layer->index).source.unbounded;
        return 0;
    });
}

// Where delivered pixels lie: in the layer's own pixels at the downsample, or in output pixels.
enum class Placement { kLayer, kOutput };

// Host work that makes layer pixels, timed as such.
template <class Make>
auto Timed(FrameSession& session, Make make) {
    auto start = std::chrono::steady_clock::now();
    auto world = make();
    session.AddPixelDeliveryNanoseconds(std::chrono::duration_cast<std::chrono::nanoseconds>(
                                            std::chrono::steady_clock::now() - start)
                                            .count());
    return world;
}

// The layer's pixels at the frame's depth, in a world the caller owns.
std::unique_ptr<PF_World> OwnedPixels(FrameSession& session, int32_t layerIndex,
                                      Placement placement) {
    return Timed(session, [&] {
        return placement == Placement::kOutput ? session.OutputPixels(layerIndex)
                                               : session.LayerPixels(layerIndex);
    });
}

// The same, handed to the artisan until it disposes of it; layer pixels are shared across
// frames.
PF_World* HandedOutPixels(FrameSession& session, int32_t layerIndex, Placement placement) {
    return session.HandOut(Timed(session, [&]() -> std::shared_ptr<PF_World> {
        if (placement == Placement::kOutput) return session.OutputPixels(layerIndex);
        return session.SharedLayerPixels(layerIndex);
    }));
}

// A matte (mode 0) becomes the caller's to delete; a whole layer (mode 2) is handed back
// through DisposeTexture like a texture. An unbounded layer has no size of its own to deliver:
// both come in output coordinates, which is also where the renderer reads a matte.
int32_t RenderLayer(QNGP_RenderContextH context, QNGP_LayerH layer, QNGP_LayerContextH layerContext,
                    int32_t mode, PF_World** world) {
    return Serve(context, [&](FrameSession& session) {
        if (!world) return kQNGP_ErrBadArgument;
        *world = nullptr;
        if (!Owns(session, layerContext) || layer != layerContext->layer) return kQNGP_ErrBadHandle;
        Placement placement =
            session.LayerAt(layer->index).source.unbounded ? Placement::kOutput : Placement::kLayer;
        if (mode == kQNGP_RenderMatte) {
            *world = OwnedPixels(session, layer->index, placement).release();
        } else if (mode == kQNGP_RenderWholeLayer) {
            *world = HandedOutPixels(session, layer->index, placement);
        } else {
            return kQNGP_ErrBadArgument;
        }
        return 0;
    });
}

// Textures are whole layers at the downsample whatever the hints ask: the source matrix stays
// identity and the plug-in scales texture pixels up by the downsample factors. An unbounded
// solid's texture is its source rectangle, the comp's size; frames draw such a layer from the
// whole layer instead.
int32_t RenderTexture(QNGP_RenderContextH context, QNGP_LayerContextH layerContext, int32_t,
                      const double*, const M_LRect*, M_Matrix3* sourceMatrix, PF_World** world) {
    return Serve(context, [&](FrameSession& session) {
        if (!sourceMatrix || !world) return kQNGP_ErrBadArgument;
        *world = nullptr;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        M_SetIdentityMatrix(sourceMatrix);
        *world = HandedOutPixels(session, layerContext->layer->index, Placement::kLayer);
        return 0;
    });
}

int32_t DisposeTexture(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                       PF_World* world) {
    return Serve(context, [&](FrameSession& session) {
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        return session.TakeBack(world) ? 0 : kQNGP_ErrBadHandle;
    });
}

int32_t GetTrackMatteContext(QNGP_RenderContextH context, QNGP_LayerContextH layerContext,
                             QNGP_LayerContextH* matteContext) {
    return Serve(context, [&](FrameSession& session) {
        if (!matteContext) return kQNGP_ErrBadArgument;
        if (!Owns(session, layerContext)) return kQNGP_ErrBadHandle;
        *matteContext = layerContext->matte;
        return 0;
    });
}

int32_t ReportRenderProgress(QNGP_RenderContextH context, int32_t count, int32_t total) {
    return Serve(context, [&](FrameSession& session) {
        FrameProgress* progress = session.Progress();
        return !progress || progress->Renderables(count, total) ? 0 : kQNGP_ErrUserCancel;
    });
}

int32_t ReportRowProgress(QNGP_RenderContextH context, int32_t count, int32_t total) {
    return Serve(context, [&](FrameSession& session) {
        FrameProgress* progress = session.Progress();
        return !progress || progress->Rows(count, total) ? 0 : kQNGP_ErrUserCancel;
    });
}

int32_t GetShutterInterval(QNGP_RenderContextH context, T_Time* start, T_Time* duration) {
    return Serve(context, [&](FrameSession& session) {
        if (!start || !duration) return kQNGP_ErrBadArgument;
        ShutterInterval shutter = ShutterIntervalAt(session.Comp(), session.RenderTime());
        *start = shutter.start;
        *duration = shutter.duration;
        return 0;
    });
}

}  // namespace

const QNGP_CanvasSuite13* CanvasSuite() {
    static const QNGP_CanvasSuite13 suite{{&GetCompToRender,
                                           &GetRenderTime,
                                           &GetCompDestination,
                                           &GetDownsample,
                                           &GetRegionOfInterest,
                                           &GetFieldRender,
                                           &GetNumLayersToRender,
                                           &GetNthLayerContext,
                                           &GetLayerFromLayerContext,
                                           &GetTopLevelLayer,
                                           &GetRenderLayerToWorldXform,
                                           &GetRenderLayerBounds,
                                           &GetRenderOpacity,
                                           &IsLayerUnbounded,
                                           &RenderLayer,
                                           &RenderTexture,
                                           &DisposeTexture,
                                           &GetTrackMatteContext,
                                           &ReportRenderProgress,
                                           &ReportRowProgress},
                                          &GetShutterInterval};
    return &suite;
}

}  // namespace ostrel
