// A texture fetcher over worlds held in memory, counting what the core asks of it.
#pragma once

#include <map>
#include <memory>

#include "pf_world.h"
#include "renderer/scene/fetchers.h"

namespace ostrel_test {

class MemoryTextureFetcher : public SY_TTextureFetcher {
public:
    // The texture of the layer at renderIndex; textureToLayer stays identity.
    void Add(int32_t renderIndex, PF_World* world) { worlds_[renderIndex] = world; }

    int32_t Fetch(int32_t renderIndex, bool, const double*, const M_LRect*, M_Matrix3*,
                  PF_World** world) override {
        ++fetches;
        auto it = worlds_.find(renderIndex);
        *world = it == worlds_.end() ? nullptr : it->second;
        return 0;
    }
    void Release(int32_t, PF_World*) override { ++releases; }

    int32_t fetches = 0;
    int32_t releases = 0;

private:
    std::map<int32_t, PF_World*> worlds_;
};

}  // namespace ostrel_test
