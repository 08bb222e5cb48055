#include "renderer/scene/fetchers.h"

SY_TTextureFetcher::Texture SY_TTextureFetcher::Acquire(int32_t renderIndex, bool wholeLayer,
                                                        const double* scaleHint,
                                                        const M_LRect* rectHint) {
    auto it = held_.find(renderIndex);
    if (it != held_.end() && it->second.uses > 0) {
        ++it->second.uses;
        return it->second.texture;
    }
    Texture texture{nullptr, {}};
    M_SetIdentityMatrix(&texture.textureToLayer);
    if (int32_t error = Fetch(renderIndex, wholeLayer, scaleHint, rectHint, &texture.textureToLayer,
                              &texture.world)) {
        throw error;
    }
    if (!texture.world) return texture;
    try {
        held_[renderIndex] = Entry{texture, 1};
    } catch (...) {
        Release(renderIndex, texture.world);
        throw;
    }
    return texture;
}

void SY_TTextureFetcher::ReleaseTexture(int32_t renderIndex) {
    auto it = held_.find(renderIndex);
    if (it == held_.end()) return;
    if (--it->second.uses > 0) return;
    PF_World* world = it->second.texture.world;
    held_.erase(it);
    Release(renderIndex, world);
}

int32_t SY_TTextureFetcher::UseCount(int32_t renderIndex) const {
    auto it = held_.find(renderIndex);
    return it == held_.end() ? 0 : it->second.uses;
}
