// Shadow maps of a frame's lights: the casting layers drawn from each light's point of view
// into occluder lists, and the lists merged into the maps that shading looks up.
#pragma once

#include <cstdint>

#include "renderer/scene/scene_desc.h"

struct SY_RenderContext;

// What a light's shadow map will be: its texel grid's side (0: the light builds none) and the
// number of faces rendered for it (1 for a parallel light and a narrow spot).
struct SY_ShadowMapPlan {
    int32_t size = 0;
    int32_t faces = 0;
};

// The map of light lightIndex of the scene for an output of width × height pixels. A light
// gets one when it casts shadows with a non-zero darkness, is not ambient, and some layer
// casts and some layer accepts shadows.
SY_ShadowMapPlan SY_PlanShadowMap(const SY_SceneDesc& scene, int32_t lightIndex,
                                  int32_t outputWidth, int32_t outputHeight);

// Builds the shadow map of every light that gets one into its light state; a face that no
// layer shadows is left out, and a light whose faces all are has no map. Throws 4, with every
// map and occluder list released, when memory runs out, and what layer rendering throws.
void SY_BuildShadowMaps(SY_RenderContext* context);
