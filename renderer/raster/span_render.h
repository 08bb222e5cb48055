// The span renderer's entry: draws one row of a layer into the render target.
#pragma once

#include <cstdint>

#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/scene/render_target.h"

class SY_ScreenGeometry;
class SY_Shader;

// Draws count pixels of row y from x on with an SY_LayerShader into targets of kind 1
// (composited into a world), 2 (fragments into a draft buffer; the anti-aliased and motion-blur
// classes receive nothing from these spans) and 3 (stored into the image of an
// SY_SpanImageRecord); into a shadow fragment array (kind 4) the spans of an SY_ShadowShader add
// occluders, with the texture at any depth and no matte, and a layer shader adds nothing. matte,
// when given, is a world of the target's depth in output coordinates whose alpha gates and scales
// the layer. tables may be null. A target and a texture of different depths, or a depth other than
// 8, 16 or 32, are reported and throw 3 before any pixel is drawn.
void SY_RenderLayerSpan_SwitchDepth(const SY_ScreenGeometry& geometry, const SY_Shader* shader,
                                    const PF_World* matte, int32_t x, int32_t count, int32_t y,
                                    const PF_LinearBlendingTables* tables,
                                    const SY_RenderTarget& target, int32_t thread);
