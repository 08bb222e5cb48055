// Renderable construction: one SY_TRLayer per drawn layer, in render order.
#pragma once

#include <cstdint>

#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/scene_desc.h"

struct SY_LightState;

// Renderables by value; grouping and drawing refer to them by pointer once the list is built.
using SY_Renderables = SY_AccountedVector<SY_TRLayer>;

struct SY_RenderableSources {
    const SY_LayerDesc* layers = nullptr;  // in render order
    int32_t layerCount = 0;
    SY_CameraView motionCamera;  // world to screen per camera subsample, for motion-blurred layers
    SY_CameraView frameCamera;   // world to screen at the frame's own time, for the others
    const SY_CameraDOFDesc* dof = nullptr;
    int32_t outputWidth = 0;
    int32_t outputHeight = 0;
    const SY_LightState* lightStates = nullptr;  // the prepared lights, in scene order
    int32_t lightCount = 0;
};

// Replaces the contents of renderables by the layers that are drawn: a layer with opacity 0, or
// that neither renders nor is drawn as a wireframe, is skipped, and one whose set-up leaves no
// visible subsample is dropped. Each renderable's light list holds, in the order of the layer's
// light ids, the first light state with each id; ids without a light leave no entry. A
// renderable left without lights does not accept lights. Throws as the set-up does.
void SY_BuildRenderables(const SY_RenderableSources& sources, SY_Renderables* renderables);
