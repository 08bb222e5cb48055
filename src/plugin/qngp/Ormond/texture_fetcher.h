// ORM_TTextureFetcher: the renderer's layer textures, rendered by the host on request.
#pragma once

#include "render_context.h"
#include "renderer/scene/fetchers.h"

class ORM_TTextureFetcher : public SY_TTextureFetcher {
public:
    explicit ORM_TTextureFetcher(ORM_RenderContext* context) : context_(context) {}

    // Host failures are thrown; the result is always 0.
    int32_t Fetch(int32_t renderIndex, bool wholeLayer, const double* scaleHint,
                  const M_LRect* rectHint, M_Matrix3* textureMatrix, PF_World** world) override;
    void Release(int32_t renderIndex, PF_World* world) override;

private:
    ORM_RenderContext* context_;
};
