// Summed-area tables of the textures that blurred shadow casters are drawn from. Every face of
// every diffused light samples the same caster textures, so each table is made once and kept
// while the frame's shadow maps are built.
#pragma once

#include <cstdint>
#include <memory>

#include "pf_tables.h"
#include "pf_world.h"
#include "renderer/scene/accounted_allocator.h"

class SY_SumTableCache {
public:
    // The table over texture, which the fetcher delivered for the layer renderIndex; made on
    // first use. *opaque tells whether every texel of the texture has full alpha. Throws 4
    // when memory runs out.
    const PF_SummedAreaTable& For(int32_t renderIndex, const PF_World& texture, bool* opaque);
    // Frees every table.
    void Clear() { entries_.clear(); }

private:
    // A texture is known by its layer, its pixels and its size: the host may deliver a layer
    // at another size for another view.
    struct Entry {
        int32_t renderIndex;
        const void* pixels;
        int32_t width;
        int32_t height;
        std::unique_ptr<PF_SummedAreaTable> table;
        bool opaque;
    };
    SY_AccountedVector<Entry> entries_;
};
