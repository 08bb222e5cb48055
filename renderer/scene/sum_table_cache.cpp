#include "renderer/scene/sum_table_cache.h"

#include <new>

#include "u_memory.h"

const PF_SummedAreaTable& SY_SumTableCache::For(int32_t renderIndex, const PF_World& texture) {
    for (const Entry& e : entries_) {
        if (e.renderIndex == renderIndex && e.pixels == texture.data && e.width == texture.width &&
            e.height == texture.height) {
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
        entries_.push_back({renderIndex, texture.data, texture.width, texture.height,
                            std::make_unique<PF_SummedAreaTable>(texture, doubleSums)});
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;
    }
    return *entries_.back().table;
}
