// The rows a renderable covers on screen, as the general render path hands them to the row work
// items: per output row the first pixel and the end (exclusive) of the run the layer touches.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/renderable.h"

struct SY_Span {
    int16_t start;
    int16_t end;  // exclusive
};

struct SY_SpanTable {
    int32_t firstRow = 0;
    SY_AccountedVector<SY_Span> rows;  // rows[i] belongs to output row firstRow + i
};

// The screen area a renderable covers: its only subsample's polygon, or, with several
// subsamples, the convex hull of all their vertices (the area swept while the shutter is open).
void SY_CoveredPolygon(const SY_TRLayer& renderable, SY_AccountedVector<M_Point2>* polygon);

// One entry per row from floor(minimum y) to ceil(maximum y) − 1 of a convex polygon: floor of
// the smallest and ceil of the largest x its boundary reaches within the row's band, so that
// every pixel the polygon touches lies in the span. An empty polygon gives an empty table.
void SY_BuildSpanTable(const M_Point2* polygon, int32_t count, SY_SpanTable* table);
