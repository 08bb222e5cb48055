#include "renderer/scene/span_table.h"

#include <algorithm>
#include <cfloat>
#include <cmath>
#include <limits>

namespace {

int16_t ToSpanX(double x) {
    constexpr double kLow = std::numeric_limits<int16_t>::min();
    constexpr double kHigh = std::numeric_limits<int16_t>::max();
    return static_cast<int16_t>(std::clamp(x, kLow, kHigh));
}

// Rows and columns beyond the span range carry nothing a span could hold.
int32_t ToRow(double y) {
    return static_cast<int32_t>(std::clamp(y, -32768.0, 32768.0));
}

}  // namespace

void SY_CoveredPolygon(const SY_TRLayer& renderable, SY_AccountedVector<M_Point2>* polygon) {
    polygon->clear();
    const SY_OwnedArray<SY_Subsample>& subsamples = renderable.subsamples;
    for (const SY_Subsample& subsample : subsamples) {
        for (const SY_Vertex& v : subsample.vertices)
            polygon->push_back({v.x, v.y});
    }
    if (subsamples.Count() < 2) return;
    SY_AccountedVector<M_Point2> hull(polygon->size());
    int32_t hullCount = 0;
    if (int32_t error = M_ComputeConvexHull(static_cast<int32_t>(polygon->size()), polygon->data(),
                                            &hullCount, hull.data())) {
        throw error;
    }
    hull.resize(static_cast<size_t>(hullCount));
    polygon->swap(hull);
}

void SY_BuildSpanTable(const M_Point2* polygon, int32_t count, SY_SpanTable* table) {
    table->rows.clear();
    table->firstRow = 0;
    if (count <= 0) return;
    double minY = DBL_MAX, maxY = -DBL_MAX;
    for (int32_t i = 0; i < count; ++i) {
        minY = std::min(minY, polygon[i].y);
        maxY = std::max(maxY, polygon[i].y);
    }
    int32_t firstRow = ToRow(std::floor(minY));
    int32_t endRow = ToRow(std::ceil(maxY));
    if (endRow <= firstRow) return;
    // Smallest and largest boundary x per row band, gathered edge by edge.
    SY_AccountedVector<double> low(static_cast<size_t>(endRow - firstRow), DBL_MAX);
    SY_AccountedVector<double> high(low.size(), -DBL_MAX);
    for (int32_t i = 0; i < count; ++i) {
        M_Point2 a = polygon[i == 0 ? count - 1 : i - 1];
        M_Point2 b = polygon[i];
        if (a.y > b.y) std::swap(a, b);
        double slope = b.y > a.y ? (b.x - a.x) / (b.y - a.y) : 0.0;
        // Every band [r, r + 1] that the edge reaches, its ends included.
        int32_t first = std::max(firstRow, ToRow(std::ceil(a.y)) - 1);
        int32_t last = std::min(endRow - 1, ToRow(std::floor(b.y)));
        for (int32_t r = first; r <= last; ++r) {
            double top = std::max(a.y, static_cast<double>(r));
            double bottom = std::min(b.y, static_cast<double>(r + 1));
            double xTop = b.y > a.y ? a.x + (top - a.y) * slope : a.x;
            double xBottom = b.y > a.y ? a.x + (bottom - a.y) * slope : b.x;
            size_t k = static_cast<size_t>(r - firstRow);
            low[k] = std::min({low[k], xTop, xBottom});
            high[k] = std::max({high[k], xTop, xBottom});
        }
    }
    table->firstRow = firstRow;
    table->rows.resize(low.size());
    for (size_t k = 0; k < low.size(); ++k) {
        table->rows[k] = {ToSpanX(std::floor(low[k])), ToSpanX(std::ceil(high[k]))};
    }
}
