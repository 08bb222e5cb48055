// Camera capture: the scene's camera placements and projections, per sample time and at the
// render time, and the camera's depth-of-field settings.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "scene_assembly.h"

// The comp-wide values a camera pair is built from.
struct ORM_CameraView {
    int32_t width, height;  // comp size in pixels
    double pixelAspect;
    int16_t downsampleX, downsampleY;
    int16_t regionTop, regionLeft;  // top-left corner of the region of interest
    double defaultDistance;         // of the default camera from the image plane
    bool perspective;
};

// Builds the placement (eye to world) and projection (eye to screen) at one time. With a camera
// layer its layer-to-world transform places the eye and cameraZoom (ignored by an orthographic
// view) sets the projection; without one a default camera looks at the comp's centre from the
// default distance. The screen origin moves to the region of interest's corner and screen
// coordinates shrink by the downsample factors. Returns the zoom used: 0 for an orthographic
// view.
double ORM_CameraPair(const ORM_CameraView& view, const M_Matrix4* cameraLayerToWorld,
                      double cameraZoom, M_Matrix4* placement, M_Matrix4* projection);

void ORM_CaptureCamera(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene);
