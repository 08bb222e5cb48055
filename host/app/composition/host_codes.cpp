#include "composition/host_codes.h"

namespace ostrel {

int32_t CompFlags(const Composition& comp) {
    return (comp.motionBlur.enabled ? kQNGP_CompFlagMotionBlur : 0) |
           (comp.lightsAndDepthOfField ? 0 : kQNGP_CompFlagNoLightsOrDepthOfField);
}

int32_t LayerFlags(const Layer& layer) {
    // A light's adjustment switch is what limits it to the layers below it.
    bool lightsBelow = layer.kind == LayerKind::kLight && layer.light.lightsOnlyLayersBelow;
    return (layer.motionBlur ? kQNGP_LayerFlagMotionBlur : 0) |
           (layer.collapse ? kQNGP_LayerFlagCollapse : 0) |
           (lightsBelow ? kQNGP_LayerFlagAdjustment : 0);
}

int32_t TransferFlags(const Layer& layer) {
    return layer.preserveTransparency ? kQNGP_TransferPreserveAlpha : 0;
}

int32_t ObjectType(const Layer& layer) {
    switch (layer.kind) {
        case LayerKind::kLight:
            return kQNGP_ObjectTypeLight;
        case LayerKind::kCamera:
            return kQNGP_ObjectTypeCamera;
        default:
            return kQNGP_ObjectTypeVisual;
    }
}

int32_t CameraType(const Layer& camera) {
    return camera.camera.orthographic ? kQNGP_CameraOrthographic : kQNGP_CameraPerspective;
}

}  // namespace ostrel
