// Light capture: every active light layer of the comp into the scene's lights, each linked to
// the layer records it reaches.
#pragma once

#include <cstdint>

#include "renderer/scene/owned_array.h"
#include "renderer/scene/scene_desc.h"
#include "scene_assembly.h"

// Adds the light at comp index lightIndex to the lightIds of the layers it reaches: every layer,
// or, for a light that lights only what lies below it, the layers with a greater comp index.
void ORM_LinkLight(int32_t lightIndex, bool layersBelowOnly, SY_OwnedArray<SY_LayerDesc>* layers);

// Needs the layer records: runs after layer capture. A comp that switches lights off leaves the
// scene without lights and lightsEnabled false.
void ORM_CaptureLights(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene);
