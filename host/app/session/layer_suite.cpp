// The Layer and Stream suites: a comp's layers one by one, and their properties over time.
#include <algorithm>

#include "composition/host_codes.h"
#include "composition/streams.h"
#include "composition/transform.h"
#include "pf_xfer.h"
#include "session/frame_suites.h"
#include "session/suite_guard.h"

namespace ostrel {
namespace {

int32_t GetCompNumLayers(QNGP_CompH comp, int32_t* count) {
    return Serve(comp, [&](FrameSession& session) {
        if (!count) return kQNGP_ErrBadArgument;
        *count = session.LayerCount();
        return 0;
    });
}

int32_t GetCompLayerByIndex(QNGP_CompH comp, int32_t index, QNGP_LayerH* layer) {
    return Serve(comp, [&](FrameSession& session) {
        if (!layer) return kQNGP_ErrBadArgument;
        if (index < 0 || index >= session.LayerCount()) return kQNGP_ErrBadIndex;
        *layer = session.LayerHandle(index);
        return 0;
    });
}

int32_t GetLayerIndex(QNGP_LayerH layer, int32_t* index) {
    return Serve(layer, [&](FrameSession&) {
        if (!index) return kQNGP_ErrBadArgument;
        *index = layer->index;
        return 0;
    });
}

int32_t GetLayerFlags(QNGP_LayerH layer, int32_t* flags) {
    return Serve(layer, [&](FrameSession& session) {
        if (!flags) return kQNGP_ErrBadArgument;
        *flags = LayerFlags(session.LayerAt(layer->index));
        return 0;
    });
}

int32_t GetLayerObjectType(QNGP_LayerH layer, int32_t* type) {
    return Serve(layer, [&](FrameSession& session) {
        if (!type) return kQNGP_ErrBadArgument;
        *type = ObjectType(session.LayerAt(layer->index));
        return 0;
    });
}

int32_t IsLayerActive(QNGP_LayerH layer, const T_Time* time, bool* active) {
    return Serve(layer, [&](FrameSession& session) {
        if (!time || !active) return kQNGP_ErrBadArgument;
        *active = session.LayerAt(layer->index).IsActiveAt(T_Seconds(*time));
        return 0;
    });
}

int32_t GetLayerQuality(QNGP_LayerH layer, int16_t* quality) {
    return Serve(layer, [&](FrameSession& session) {
        if (!quality) return kQNGP_ErrBadArgument;
        *quality = static_cast<int16_t>(session.LayerAt(layer->index).quality);
        return 0;
    });
}

int32_t GetLayerTransferMode(QNGP_LayerH layer, QNGP_LayerTransferMode* mode) {
    return Serve(layer, [&](FrameSession& session) {
        if (!mode) return kQNGP_ErrBadArgument;
        const Layer& l = session.LayerAt(layer->index);
        int32_t number = l.HasPixels() ? PF_XferModeFromName(l.transferMode) : kPF_XferNormal;
        if (number < 0) {
            session.NoteFailure(
                session.Comp().file.string() + ": layers[" + std::to_string(layer->index) +
                "].transferMode: no transfer mode is named \"" + l.transferMode + "\"");
            return kQNGP_ErrHostFailure;
        }
        *mode = {number, TransferFlags(l), static_cast<int32_t>(l.trackMatte)};
        return 0;
    });
}

int32_t LayerHasTrackMatte(QNGP_LayerH layer, bool* hasMatte) {
    return Serve(layer, [&](FrameSession& session) {
        if (!hasMatte) return kQNGP_ErrBadArgument;
        *hasMatte = session.LayerAt(layer->index).trackMatte != TrackMatte::kNone;
        return 0;
    });
}

int32_t GetLayerToWorldXform(QNGP_LayerH layer, const T_Time* time, M_Matrix4* transform) {
    return Serve(layer, [&](FrameSession& session) {
        if (!time || !transform) return kQNGP_ErrBadArgument;
        *transform = LayerToWorld(session.Comp(), layer->index, T_Seconds(*time));
        return 0;
    });
}

// Image and solid layers are the engine's audio/visual layers. None ignores the keep-alpha
// flag; their sampling is the one the composition chose for best quality.
int32_t GetEngineLayer(QNGP_LayerH layer, QNGP_EngineLayer* engine) {
    return Serve(layer, [&](FrameSession& session) {
        if (!engine) return kQNGP_ErrBadArgument;
        const Layer& l = session.LayerAt(layer->index);
        *engine = {
            l.HasPixels(), false,
            l.sampling == Sampling::kBicubic ? kQNGP_SamplingBicubic : kQNGP_SamplingBilinear};
        return 0;
    });
}

int32_t GetLayerStreamValue(QNGP_LayerH layer, int32_t stream, int32_t timeMode, const T_Time* time,
                            int32_t, QNGP_StreamValue* value) {
    return Serve(layer, [&](FrameSession& session) {
        if (!time || !value || timeMode != kQNGP_TimeModeLayer) return kQNGP_ErrBadArgument;
        const Layer& l = session.LayerAt(layer->index);
        if (!HasStream(l, stream)) return kQNGP_ErrNoSuchStream;
        // Layers start at comp time 0 and are not time-remapped: layer time is comp time.
        StreamVector values = StreamValues(l, stream, T_Seconds(*time));
        *value = {};
        std::copy_n(values.values.begin(), values.count, value->v);
        return 0;
    });
}

}  // namespace

const QNGP_LayerSuite10* LayerSuite() {
    static const QNGP_LayerSuite10 suite{
        &GetCompNumLayers,   &GetCompLayerByIndex,  &GetLayerIndex,   &GetLayerFlags,
        &GetLayerObjectType, &IsLayerActive,        &GetLayerQuality, &GetLayerTransferMode,
        &LayerHasTrackMatte, &GetLayerToWorldXform, &GetEngineLayer};
    return &suite;
}

const QNGP_StreamSuite7* StreamSuite() {
    static const QNGP_StreamSuite7 suite{&GetLayerStreamValue};
    return &suite;
}

}  // namespace ostrel
