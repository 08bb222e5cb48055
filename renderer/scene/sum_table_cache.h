// Summed-area tables of the textures that blurred shadow casters are drawn from. Every face of
// every diffused light samples the same caster textures, so each table is made once and kept
// while the frame's shadow maps are built.
#pragma once

#include <cstdint>
#include <memory>

#include "pf_tables.h"
#include "pf_world.h"
#include "renderer/scene/accounted_allocator.h"

// The summed-area table of a texture whose texels all have full alpha holds x·y at (x, y) in
// its alpha. A box less than kNarrow − 1 texels across along one axis reads only kNarrow of its
// rows or columns, once moved to the box's first row or column; these are they, with S the
// cell type the texture's own table would have, and colour left 0.
template <class S>
class SY_FullAlphaSums {
public:
    static constexpr int32_t kNarrow = 8;

    // Throws std::bad_alloc without memory.
    SY_FullAlphaSums(int32_t width, int32_t height);

    int32_t Width() const { return width_; }
    int32_t Height() const { return height_; }
    const S* Rows() const { return rows_.data(); }        // kNarrow rows of Width() + 1 cells
    const S* Columns() const { return columns_.data(); }  // Height() + 1 rows of kNarrow cells

private:
    int32_t width_;
    int32_t height_;
    SY_AccountedVector<S> rows_;
    SY_AccountedVector<S> columns_;
};

// What a blurred caster's box averages are read from.
struct SY_CasterSums {
    // Null where the texture is opaque and only its alpha is read: one of the full-alpha sums
    // stands in.
    const PF_SummedAreaTable* table = nullptr;
    bool opaque = false;  // every texel has full alpha
    const SY_FullAlphaSums<PF_PixelFloat>* floatFullAlpha = nullptr;
    const SY_FullAlphaSums<PF_PixelDouble>* doubleFullAlpha = nullptr;
};

class SY_SumTableCache {
public:
    // The sums over texture, which the fetcher delivered for the layer renderIndex; made on
    // first use. alphaOnly: the caller reads the averages' alpha alone, so an opaque texture
    // needs no table. Throws 4 when memory runs out.
    SY_CasterSums For(int32_t renderIndex, const PF_World& texture, bool alphaOnly);
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
        bool opaque;
        std::unique_ptr<PF_SummedAreaTable> table;
        std::unique_ptr<SY_FullAlphaSums<PF_PixelFloat>> floatFullAlpha;
        std::unique_ptr<SY_FullAlphaSums<PF_PixelDouble>> doubleFullAlpha;
    };
    SY_AccountedVector<Entry> entries_;
};
