// Layer capture: one record per layer the host asks the artisan to render, in render order.
#pragma once

#include <cstdint>

#include "qngp_suites.h"
#include "renderer/scene/scene_desc.h"
#include "scene_assembly.h"

// The transfer mode a layer that only receives shadows is drawn with.
inline constexpr uint8_t kORM_ShadowsOnlyMode = 5;
// Keep-alpha flag of the stored transfer mode.
inline constexpr uint8_t kORM_KeepAlphaBit = 0x80;

// The host's transfer mode as the renderer stores it: the host's three variants of the normal
// mode (3, 17, 18) arrive as 2, and the keep-alpha flag becomes bit 7 unless the engine's layer
// ignores it.
uint8_t ORM_StoredTransferMode(const QNGP_LayerTransferMode& mode, const QNGP_EngineLayer& engine);

// The shadow and light switches of a layer as its streams read them.
struct ORM_ShadowStreams {
    double castsShadows;    // 0 off, 1 on, 2 (above 1) casts only
    double acceptsShadows;  // a kQNGP_Shadows… value
    double acceptsLights;   // read only when acceptsShadows is not "only"
};

// Sets renders, wireframe, bestQuality and the shadow and light switches from the layer's
// quality (0 wireframe, 1 draft, 2 best) and, except for a wireframe, its streams; a layer that
// only receives shadows is drawn with the shadows-only mode.
void ORM_ApplyQuality(int16_t quality, const ORM_ShadowStreams& streams, SY_Material* material);

void ORM_CaptureLayers(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene);
