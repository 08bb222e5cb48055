// Which texels of a shadow caster's rows some lookup can read: a caster is drawn only there.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "renderer/scene/accounted_allocator.h"

class SY_ShadowReach {
public:
    // Texels [begin, end) of a row.
    struct Run {
        int32_t begin;
        int32_t end;
    };
    // A box of map positions (x0, y0, x1, y1): the texels whose centres lie in it are read.
    struct Box {
        double x0, y0, x1, y1;
    };
    // A disc of map positions outside which no texel is read; a radius of 0 bounds nothing.
    struct Disc {
        double x = 0, y = 0, radius = 0;
    };

    // The runs of the texels of rows whose centres lie in one of the boxes and in the disc.
    // Throws std::bad_alloc without memory.
    SY_ShadowReach(const M_LRect& rows, const SY_AccountedVector<Box>& boxes, const Disc& disc);

    // The smallest rectangle that holds every run; empty (right ≤ left) where there are none.
    const M_LRect& Bounds() const { return bounds_; }
    // The runs of row y (within the rows), left to right, disjoint and not touching.
    const Run* RowBegin(int32_t y) const { return runs_.data() + rowStarts_[size_t(y - top_)]; }
    const Run* RowEnd(int32_t y) const { return runs_.data() + rowStarts_[size_t(y - top_) + 1]; }

private:
    int32_t top_;
    M_LRect bounds_;
    SY_AccountedVector<uint32_t> rowStarts_;  // one per row and one more
    SY_AccountedVector<Run> runs_;
};
