// Spans of a layer that reaches the renderer as an image in output coordinates (an unbounded
// layer): pixel (x, y) of the image is output pixel (x, y), and only the depth of its pixels
// comes from the layer's plane, so such a layer still sorts against the textured layers.
#pragma once

#include <cstdint>

#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/scene/render_target.h"

class SY_DOFBuffer;
class SY_ScreenGeometry;
class SY_LayerShader;

// How the image is put into the frame.
struct SY_SpanBlend {
    uint8_t mode = 2;        // transfer mode, keep-alpha in bit 7
    double opacity = 1;      // 0..1
    float depthOffset = 0;   // added to every depth key, as for the layer's textured spans
    bool colorOnly = false;  // shadows only: the colour becomes white, its alpha kept
    // Darkens each pixel by the shadows that fall on the layer's plane there (the geometry's
    // eye ray must be set); null: no shadow falls on it.
    const SY_LayerShader* shadows = nullptr;
};

// Draws count pixels of row y from x on from the geometry's texture, an image in output
// coordinates of the target's depth; the first valid screen-to-texture mapping gives each
// pixel's depth. Kinds 1 (composite into a world), 2 (fragments into a draft buffer) and 3
// (stored into a depth-of-field buffer's pixels) are served; kind 4 draws nothing. Pixels outside
// the image, and under a perspective camera pixels where the plane lies behind the camera, are not
// drawn. matte, when given, is a world of the target's depth in output coordinates whose alpha
// gates and scales the layer. tables may be null. A depth other than 8, 16 or 32 of the target or
// the image is reported and throws 3 before any pixel is drawn.
void SY_RenderLayerSpanFromImage_SwitchDepth(const SY_SpanBlend& blend,
                                             const SY_ScreenGeometry& layer, const PF_World* matte,
                                             int32_t x, int32_t count, int32_t y,
                                             const PF_LinearBlendingTables* tables,
                                             const SY_RenderTarget& target, int32_t thread);

// The same for a layer already drawn into a depth-of-field buffer: each pixel is the buffer's
// average over the blur that the plane's depth at the pixel calls for, and pixels the blur
// leaves clear are not drawn. Kinds 1 and 2 are served. A buffer of another depth than the
// target's is reported and throws 3.
void SY_RenderLayerSpanFromDOFBuffer_SwitchDepth(const SY_SpanBlend& blend,
                                                 const SY_ScreenGeometry& layer,
                                                 const SY_DOFBuffer& buffer, const PF_World* matte,
                                                 int32_t x, int32_t count, int32_t y,
                                                 const PF_LinearBlendingTables* tables,
                                                 const SY_RenderTarget& target, int32_t thread);
