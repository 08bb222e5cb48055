// The Comp, Item, Camera, Light, Color Settings and ZEL suites: the comp-wide answers.
#include <cmath>
#include <numeric>

#include "composition/host_codes.h"
#include "composition/timing.h"
#include "composition/transform.h"
#include "session/frame_suites.h"
#include "session/suite_guard.h"

namespace ostrel {
namespace {

int32_t GetCompFlags(QNGP_CompH comp, int32_t* flags) {
    return Serve(comp, [&](FrameSession& session) {
        if (!flags) return kQNGP_ErrBadArgument;
        *flags = CompFlags(session.Comp());
        return 0;
    });
}

int32_t GetItemFromComp(QNGP_CompH comp, QNGP_ItemH* item) {
    return Serve(comp, [&](FrameSession& session) {
        if (!item) return kQNGP_ErrBadArgument;
        *item = session.ItemHandle();
        return 0;
    });
}

int32_t GetCompMotionBlurSamples(QNGP_CompH comp, int32_t* samples) {
    return Serve(comp, [&](FrameSession& session) {
        if (!samples) return kQNGP_ErrBadArgument;
        *samples = MotionBlurSamples(session.Comp());
        return 0;
    });
}

// The aspect as a ratio of whole numbers, exact to five decimals (1.0926 → 5463/5000).
int32_t GetItemPixelAspectRatio(QNGP_ItemH item, QNGP_Ratio* ratio) {
    return Serve(item, [&](FrameSession& session) {
        if (!ratio) return kQNGP_ErrBadArgument;
        constexpr int32_t kDenominator = 100000;
        auto num = static_cast<int32_t>(std::lround(session.Comp().pixelAspect * kDenominator));
        int32_t divisor = std::gcd(num, kDenominator);
        *ratio = {num / divisor, kDenominator / divisor};
        return 0;
    });
}

int32_t GetItemDimensions(QNGP_ItemH item, int32_t* width, int32_t* height) {
    return Serve(item, [&](FrameSession& session) {
        if (!width || !height) return kQNGP_ErrBadArgument;
        *width = session.Comp().width;
        *height = session.Comp().height;
        return 0;
    });
}

int32_t GetCamera(QNGP_RenderContextH context, const T_Time* time, QNGP_LayerH* camera) {
    return Serve(context, [&](FrameSession& session) {
        if (!time || !camera) return kQNGP_ErrBadArgument;
        int32_t index = ActiveCamera(session.Comp(), T_Seconds(*time));
        *camera = index < 0 ? nullptr : session.LayerHandle(index);
        return 0;
    });
}

int32_t GetCameraType(QNGP_LayerH camera, int32_t* type) {
    return Serve(camera, [&](FrameSession& session) {
        if (!type) return kQNGP_ErrBadArgument;
        const Layer& layer = session.LayerAt(camera->index);
        if (layer.kind != LayerKind::kCamera) return kQNGP_ErrWrongLayerKind;
        *type = CameraType(layer);
        return 0;
    });
}

int32_t GetDefaultCameraDistanceToImagePlane(QNGP_CompH comp, double* distance) {
    return Serve(comp, [&](FrameSession& session) {
        if (!distance) return kQNGP_ErrBadArgument;
        *distance = DefaultCameraDistance(session.Comp());
        return 0;
    });
}

int32_t GetLightType(QNGP_LayerH light, int32_t* type) {
    return Serve(light, [&](FrameSession& session) {
        if (!type) return kQNGP_ErrBadArgument;
        const Layer& layer = session.LayerAt(light->index);
        if (layer.kind != LayerKind::kLight) return kQNGP_ErrWrongLayerKind;
        *type = static_cast<int32_t>(layer.light.type);
        return 0;
    });
}

int32_t GetColorSettings(QNGP_RenderContextH context, const PF_LinearBlendingTables** settings) {
    return Serve(context, [&](FrameSession& session) {
        if (!settings) return kQNGP_ErrBadArgument;
        *settings = session.ColorSettings();
        return 0;
    });
}

// The stand-in host draws its notes on the terminal: no drawing supplier, no parent window.
int32_t GetDrawingSupplier(UI_DrawingSupplier** supplier) {
    if (!supplier) return kQNGP_ErrBadArgument;
    *supplier = nullptr;
    return 0;
}

int32_t GetParentNode(UI_Node** node) {
    if (!node) return kQNGP_ErrBadArgument;
    *node = nullptr;
    return 0;
}

}  // namespace

const QNGP_CompSuite14* CompSuite() {
    static const QNGP_CompSuite14 suite{{&GetCompFlags, &GetItemFromComp},
                                        &GetCompMotionBlurSamples};
    return &suite;
}

const QNGP_ItemSuite7* ItemSuite() {
    static const QNGP_ItemSuite7 suite{&GetItemPixelAspectRatio, &GetItemDimensions};
    return &suite;
}

const QNGP_CameraSuite2* CameraSuite() {
    static const QNGP_CameraSuite2 suite{&GetCamera, &GetCameraType,
                                         &GetDefaultCameraDistanceToImagePlane};
    return &suite;
}

const QNGP_LightSuite1* LightSuite() {
    static const QNGP_LightSuite1 suite{&GetLightType};
    return &suite;
}

const PF_ColorSettingsSuite1* ColorSettingsSuite() {
    static const PF_ColorSettingsSuite1 suite{&GetColorSettings};
    return &suite;
}

const QN_ZELSuite1* ZELSuite() {
    static const QN_ZELSuite1 suite{&GetDrawingSupplier, &GetParentNode};
    return &suite;
}

}  // namespace ostrel
