#include "composition/host_codes.h"

namespace ostrel {

int32_t CompFlags(const Composition& comp) {
    return (comp.motionBlur.enabled ? kCompFlagMotionBlur : 0) |
           (comp.lightsAndDepthOfField ? 0 : kCompFlagNoLightsNoDepthOfField);
}

int32_t LayerFlags(const Layer& layer) {
    bool lightsBelow = layer.kind == LayerKind::kLight && layer.light.lightsOnlyLayersBelow;
    return (layer.motionBlur ? kLayerFlagMotionBlur : 0) |
           (layer.collapse ? kLayerFlagCollapse : 0) |
           (lightsBelow ? kLayerFlagLightsOnlyLayersBelow : 0);
}

int32_t TransferFlags(const Layer& layer) {
    return layer.preserveTransparency ? kTransferFlagPreserveTransparency : 0;
}

int32_t ObjectType(const Layer& layer) {
    switch (layer.kind) {
        case LayerKind::kLight:
            return kObjectTypeLight;
        case LayerKind::kCamera:
            return kObjectTypeCamera;
        default:
            return kObjectTypeVisual;
    }
}

int32_t CameraType(const Layer& camera) {
    return camera.camera.orthographic ? kCameraTypeOrthographic : kCameraTypePerspective;
}

}  // namespace ostrel
