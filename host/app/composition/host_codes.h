// The numbers by which the host's suites describe a comp and its layers.
#pragma once

#include <cstdint>

#include "composition/composition.h"

namespace ostrel {

// Comp flags.
inline constexpr int32_t kCompFlagMotionBlur = 0x8;
inline constexpr int32_t kCompFlagNoLightsNoDepthOfField = 0x100;

// Layer flags.
inline constexpr int32_t kLayerFlagMotionBlur = 0x8;
inline constexpr int32_t kLayerFlagCollapse = 0x80;
inline constexpr int32_t kLayerFlagLightsOnlyLayersBelow = 0x200;

// Flags of a layer's transfer mode record.
inline constexpr int32_t kTransferFlagPreserveTransparency = 0x1;

// Layer object types.
inline constexpr int32_t kObjectTypeVisual = 0;  // image, solid and null layers
inline constexpr int32_t kObjectTypeLight = 1;
inline constexpr int32_t kObjectTypeCamera = 2;

// Camera types.
inline constexpr int32_t kCameraTypePerspective = 0;
inline constexpr int32_t kCameraTypeOrthographic = 1;

int32_t CompFlags(const Composition& comp);
int32_t LayerFlags(const Layer& layer);
int32_t TransferFlags(const Layer& layer);
int32_t ObjectType(const Layer& layer);
int32_t CameraType(const Layer& camera);

}  // namespace ostrel
