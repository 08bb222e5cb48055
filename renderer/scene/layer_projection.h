// Set-up of one renderable: per geometry subsample, the layer's plane in screen space and its
// quadrilateral projected and clipped to the output.
#pragma once

#include <cstdint>

#include "renderer/scene/renderable.h"
#include "renderer/scene/scene_desc.h"

// An output rectangle in screen pixels, right and bottom exclusive.
struct SY_ScreenRect {
    double x0 = 0, y0 = 0, x1 = 0, y1 = 0;
};

struct SY_SetUpOptions {
    // Separates a coplanar stack: the frame driver passes depthIndex × 1e-7. A larger offset
    // puts the layer farther from the camera, whichever way the projection counts depth.
    double depthOffset = 0;
    // Depth of field of the camera, or null. When it is on, the blur at the layer's corners
    // sets the renderable's dofMargin, which widens the clip rectangle and the bounds.
    const SY_CameraDOFDesc* dof = nullptr;
    double margin = 0;  // output pixels by which the quadrilateral grows on every side
    SY_ScreenRect output;
    bool noClip = false;  // keep x and y beyond the output rectangle
    bool fill = true;     // an unbounded layer covers the whole output rectangle
};

// Fills the subsamples, validity range, multiSample flag and bounds of a renderable fresh from
// its constructor, from the layer and the camera. Returns true when some subsample faces the screen
// and projects to a non-empty polygon. Throws 0x4B01 after message 1 when the layer and the camera
// both have several subsamples, in different numbers; throws the host's memory code when memory
// runs out.
bool SY_SetUpRenderable(const SY_LayerDesc& layer, const SY_CameraView& camera,
                        const SY_SetUpOptions& options, SY_TRLayer* renderable);
