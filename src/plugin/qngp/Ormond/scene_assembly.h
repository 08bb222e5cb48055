// Scene assembly: one frame of the host's comp into the renderer's scene record, through the
// render context's suites only.
#pragma once

#include <vector>

#include "render_context.h"
#include "renderer/scene/scene_desc.h"
#include "t_time.h"

// What every capture step receives beside the render context and the scene.
struct ORM_CaptureFrame {
    double pixelAspect;
    T_Time renderTime;
    std::vector<T_Time> samples;  // one, or 2 to 64 over the shutter
};

// Fills the scene: frame-wide values, then layers, lights, camera and colour settings. A host
// failure is thrown; what the scene already holds stays its own and goes with it.
void ORM_AssembleScene(ORM_RenderContext& context, SY_SceneDesc* scene);
