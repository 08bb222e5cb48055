#include "renderer/scene/sum_table_cache.h"

#include <algorithm>
#include <new>

#include "pf_bit_depth.h"
#include "u_memory.h"

namespace {

bool AllOpaque(const PF_World& world) {
    return PF_DispatchBitDepth(world.bitDepth, [&]<class P>() {
        for (int32_t y = 0; y < world.height; ++y) {
            const P* row = world.Row<P>(y);
            // A count over the whole row, without a branch per texel, vectorises.
            int32_t full = 0;
            for (int32_t x = 0; x < world.width; ++x)
                full += row[x].alpha == PF_PixelTraits<P>::kMax;
            if (full != world.width) return false;
        }
        return true;
    });
}

}  // namespace

template <class S>
SY_FullAlphaSums<S>::SY_FullAlphaSums(int32_t width, int32_t height)
    : width_(width),
      height_(height),
      rows_(size_t(kNarrow) * (size_t(width) + 1)),
      columns_((size_t(height) + 1) * kNarrow) {
    using V = decltype(S::alpha);
    for (int32_t y = 0; y < kNarrow; ++y) {
        for (int32_t x = 0; x <= width; ++x)
            rows_[size_t(y) * (size_t(width) + 1) + size_t(x)] = {V(int64_t{x} * y), 0, 0, 0};
    }
    for (int32_t y = 0; y <= height; ++y) {
        for (int32_t x = 0; x < kNarrow; ++x)
            columns_[size_t(y) * kNarrow + size_t(x)] = {V(int64_t{x} * y), 0, 0, 0};
    }
}

template class SY_FullAlphaSums<PF_PixelFloat>;
template class SY_FullAlphaSums<PF_PixelDouble>;

SY_CasterSums SY_SumTableCache::For(int32_t renderIndex, const PF_World& texture, bool alphaOnly) {
    // Float sums keep six binary places of a texel's alpha at the far corner of a 512 × 512
    // texture, enough for averages over the boxes of blurred occluders, at half the memory;
    // larger textures take double sums.
    constexpr int64_t kFloatSumsUpTo = 1 << 18;
    const bool doubleSums = int64_t{texture.width} * texture.height > kFloatSumsUpTo;
    try {
        auto found = std::find_if(entries_.begin(), entries_.end(), [&](const Entry& e) {
            return e.renderIndex == renderIndex && e.pixels == texture.data &&
                   e.width == texture.width && e.height == texture.height;
        });
        if (found == entries_.end()) {
            entries_.push_back({renderIndex, texture.data, texture.width, texture.height,
                                AllOpaque(texture), nullptr, nullptr, nullptr});
            found = entries_.end() - 1;
        }
        Entry& e = *found;
        SY_CasterSums sums;
        sums.opaque = e.opaque;
        if (e.opaque && alphaOnly) {
            // The alpha of every box sum is known without the texture's table.
            if (doubleSums) {
                if (!e.doubleFullAlpha)
                    e.doubleFullAlpha = std::make_unique<SY_FullAlphaSums<PF_PixelDouble>>(
                        texture.width, texture.height);
                sums.doubleFullAlpha = e.doubleFullAlpha.get();
            } else {
                if (!e.floatFullAlpha)
                    e.floatFullAlpha = std::make_unique<SY_FullAlphaSums<PF_PixelFloat>>(
                        texture.width, texture.height);
                sums.floatFullAlpha = e.floatFullAlpha.get();
            }
            return sums;
        }
        // The table's constructor has checked the depth.
        if (!e.table) e.table = std::make_unique<PF_SummedAreaTable>(texture, doubleSums);
        sums.table = e.table.get();
        return sums;
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;
    }
}
