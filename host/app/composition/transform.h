// Placement of layers in world space: x right, y down, z away from the viewer. Matrices take
// row vectors (p' = p·M) with the translation in row 3.
#pragma once

#include <cstdint>

#include "composition/composition.h"
#include "m_matrix.h"

namespace ostrel {

// Distance of the default camera from the comp plane, which is also its zoom: the focal
// length of a 50 mm lens on a 36 mm film back spanning the comp's width, width × 50 / 36.
double DefaultCameraDistance(const Composition& comp);

// The layer's placement in its parent's space (in world space when it has no parent).
// Layers with pixels: minus the anchor point, scale, orientation, then the X, Y and Z
// rotations, plus the position. Cameras and lights: orientation and rotations, then the aim
// of +z at the point of interest where they have one, plus the position; anchor point and
// scale do not apply to them.
M_Matrix4 LayerToParent(const Layer& layer, double seconds);

// The layer's placement through its whole parent chain: layer pixels to world. For a camera
// it is the eye-to-world placement (the eye looks down +z with y down).
M_Matrix4 LayerToWorld(const Composition& comp, int32_t layerIndex, double seconds);

// The camera the comp renders through at that time: the topmost active camera layer, or -1
// when the comp has none and the default camera applies.
int32_t ActiveCamera(const Composition& comp, double seconds);

// Eye-to-world placement of the default camera: at (w / 2, h / 2, −DefaultCameraDistance)
// looking down +z.
M_Matrix4 DefaultCameraPlacement(const Composition& comp);

}  // namespace ostrel
