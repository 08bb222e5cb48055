// The span renderer's entry: draws one row of a layer into the render target.
#pragma once

#include <cstdint>

#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/scene/render_target.h"

class SY_ScreenGeometry;
class SY_Shader;

// The object of a store target (mode 3): pixel (x, y) of the frame goes to
// (x − x0, y − y0) of the image, which has the depth of the frame.
struct SY_SpanImageRecord {
    PF_World* image;
    int32_t x0;
    int32_t y0;
};

// Draws count pixels of row y from x on. Modes 1 (composite into a world) and 3 (store into an
// SY_SpanImageRecord) take an SY_LayerShader; other modes draw nothing. matte, when given, is a
// world of the target's depth in output coordinates whose alpha gates and scales the layer.
// tables may be null. A depth other than 8, 16 or 32 of the target or the texture is reported
// and throws 3 before any pixel is drawn.
void SY_RenderLayerSpan_SwitchDepth(const SY_ScreenGeometry& geometry, const SY_Shader* shader,
                                    const PF_World* matte, int32_t x, int32_t count, int32_t y,
                                    const PF_LinearBlendingTables* tables,
                                    const SY_RenderTarget& target, int32_t thread);
