#include "renderer/raster/shadow_reach.h"

#include <algorithm>
#include <cmath>

namespace {

// The texels i of [left, right) with x0 ≤ i + ½ ≤ x1, as a run (empty when none).
SY_ShadowReach::Run TexelsWithin(double x0, double x1, int32_t left, int32_t right) {
    const double first = std::clamp(std::ceil(x0 - 0.5), double(left), double(right));
    const double last = std::clamp(std::floor(x1 - 0.5) + 1, first, double(right));
    return {static_cast<int32_t>(first), static_cast<int32_t>(last)};
}

}  // namespace

SY_ShadowReach::SY_ShadowReach(const M_LRect& rows, const SY_AccountedVector<Box>& boxes,
                               const Disc& disc)
    : top_(rows.top), bounds_{rows.right, rows.bottom, rows.left, rows.top} {
    rowStarts_.reserve(size_t(rows.bottom - rows.top) + 1);
    SY_AccountedVector<Run> row;
    row.reserve(boxes.size());
    for (int32_t y = rows.top; y < rows.bottom; ++y) {
        rowStarts_.push_back(static_cast<uint32_t>(runs_.size()));
        const double cy = y + 0.5;
        // The disc's chord through the row's centres bounds every run.
        Run chord{rows.left, rows.right};
        if (disc.radius > 0) {
            const double dy = cy - disc.y, across = disc.radius * disc.radius - dy * dy;
            if (across < 0) continue;
            const double half = std::sqrt(across);
            chord = TexelsWithin(disc.x - half, disc.x + half, rows.left, rows.right);
        }
        row.clear();
        for (const Box& b : boxes) {
            if (!(cy >= b.y0 && cy <= b.y1)) continue;
            Run r = TexelsWithin(b.x0, b.x1, chord.begin, chord.end);
            if (r.begin < r.end) row.push_back(r);
        }
        std::sort(row.begin(), row.end(),
                  [](const Run& a, const Run& b) { return a.begin < b.begin; });
        // Runs that overlap or touch become one.
        for (const Run& r : row) {
            if (runs_.size() > rowStarts_.back() && r.begin <= runs_.back().end)
                runs_.back().end = std::max(runs_.back().end, r.end);
            else
                runs_.push_back(r);
        }
    }
    rowStarts_.push_back(static_cast<uint32_t>(runs_.size()));
    for (int32_t y = rows.top; y < rows.bottom; ++y) {
        const Run* first = RowBegin(y);
        const Run* end = RowEnd(y);
        if (first == end) continue;
        bounds_.left = std::min(bounds_.left, first->begin);
        bounds_.right = std::max(bounds_.right, end[-1].end);
        bounds_.top = std::min(bounds_.top, y);
        bounds_.bottom = y + 1;
    }
}
