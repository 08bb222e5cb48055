#include <algorithm>
#include <cstddef>
#include <vector>

#include "m_matrix.h"

namespace {

double Cross(const M_Point2& o, const M_Point2& a, const M_Point2& b) {
    return (a.x - o.x) * (b.y - o.y) - (a.y - o.y) * (b.x - o.x);
}

}  // namespace

// Andrew's monotone chain: O(n log n), exact on the input points.
int32_t M_ComputeConvexHull(int32_t count, const M_Point2* points, int32_t* hullCount,
                            M_Point2* hull) {
    if (count < 0 || (count > 0 && (!points || !hull)) || !hullCount) return kM_ErrBadArgument;
    std::vector<M_Point2> sorted(points, points + count);
    std::sort(sorted.begin(), sorted.end(), [](const M_Point2& a, const M_Point2& b) {
        return a.x < b.x || (a.x == b.x && a.y < b.y);
    });
    sorted.erase(
        std::unique(sorted.begin(), sorted.end(),
                    [](const M_Point2& a, const M_Point2& b) { return a.x == b.x && a.y == b.y; }),
        sorted.end());
    if (sorted.size() < 3) {
        std::copy(sorted.begin(), sorted.end(), hull);
        *hullCount = static_cast<int32_t>(sorted.size());
        return 0;
    }
    std::vector<M_Point2> chain(2 * sorted.size());
    size_t k = 0;
    for (const auto& p : sorted) {
        while (k >= 2 && Cross(chain[k - 2], chain[k - 1], p) <= 0)
            --k;
        chain[k++] = p;
    }
    for (size_t i = sorted.size() - 1, lower = k + 1; i-- > 0;) {
        while (k >= lower && Cross(chain[k - 2], chain[k - 1], sorted[i]) <= 0)
            --k;
        chain[k++] = sorted[i];
    }
    --k;  // the last point repeats the first
    std::copy(chain.begin(), chain.begin() + static_cast<ptrdiff_t>(k), hull);
    *hullCount = static_cast<int32_t>(k);
    return 0;
}
