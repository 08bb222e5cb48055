// What the frame driver needs of the layer render beyond the renderable's own operation.
#pragma once

#include "renderer/scene/renderable.h"

class SY_DOFBuffer;

// The second half of a layer drawn through depth of field: its screen geometry built again,
// the iris kernels its blur needs handed to the buffer (and kept in the context for the
// frame's later layers), and the rows of the buffer within the output combined into the target
// (the destination or a fragment buffer), each pixel blurred by its depth, through the layer's
// track matte. Throws what the texture fetch, the matte fetch, the kernels and the row work
// throw, with both handed back.
void SY_CombineDepthOfField(SY_RenderContext* context, const SY_TRLayer& renderable,
                            const SY_CameraView& camera, const SY_Shader* shader,
                            SY_DOFBuffer* buffer, const SY_RenderTarget& target);
