#include "renderer/scene/motion_thinning.h"

#include <utility>

void SY_ThinDraftMotionBlur(SY_TRLayer* renderable) {
    if (renderable->material.bestQuality || renderable->firstValid == renderable->lastValid) {
        return;
    }
    int32_t count = renderable->subsamples.Count();
    int32_t parity = renderable->firstValid % 2;
    SY_OwnedArray<SY_Subsample> kept;
    kept.Allocate((count + 1 - parity) / 2);
    renderable->firstValid = -1;
    renderable->lastValid = -1;
    for (int32_t i = 0; i < kept.Count(); ++i) {
        kept[i] = std::move(renderable->subsamples[parity + 2 * i]);
        if (!kept[i].IsValid()) continue;
        if (renderable->firstValid < 0) renderable->firstValid = i;
        renderable->lastValid = i;
    }
    renderable->subsamples = std::move(kept);
    renderable->multiSample = renderable->subsamples.Count() > 1;
}
