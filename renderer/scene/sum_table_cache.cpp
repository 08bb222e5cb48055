#include "renderer/scene/sum_table_cache.h"

#include <new>

#include "pf_bit_depth.h"
#include "u_memory.h"

namespace {

bool AllOpaque(const PF_World& world) {
    return PF_DispatchBitDepth(world.bitDepth, [&]<class P>() {
        for (int32_t y = 0; y < world.height; ++y) {
            const P* row = world.Row<P>(y);
            for (int32_t x = 0; x < world.width; ++x) {
                if (row[x].alpha != PF_PixelTraits<P>::kMax) return false;
            }
        }
        return true;
    });
}

}  // namespace

const PF_SummedAreaTable& SY_SumTableCache::For(int32_t renderIndex, const PF_World& texture,
                                                bool* opaque) {
    for (const Entry& e : entries_) {
        if (e.renderIndex == renderIndex && e.pixels == texture.data && e.width == texture.width &&
            e.height == texture.height) {
            *opaque = e.opaque;
            return *e.table;
        }
    }
    // Float sums keep six binary places of a texel's alpha at the far corner of a 512 × 512
    // texture, enough for averages over the boxes of blurred occluders, at half the memory;
    // larger textures take double sums.
    constexpr int64_t kFloatSumsUpTo = 1 << 18;
    bool doubleSums = int64_t{texture.width} * texture.height > kFloatSumsUpTo;
    entries_.reserve(entries_.size() + 1);
    try {
        // The table's constructor has checked the depth.
        entries_.push_back({renderIndex, texture.data, texture.width, texture.height,
                            std::make_unique<PF_SummedAreaTable>(texture, doubleSums),
                            AllOpaque(texture)});
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;
    }
    *opaque = entries_.back().opaque;
    return *entries_.back().table;
}
