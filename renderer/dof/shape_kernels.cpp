#include "renderer/dof/shape_kernels.h"

#include <algorithm>
#include <cmath>
#include <new>
#include <utility>
#include <vector>

#include "renderer/scene/dof_model.h"
#include "u_memory.h"

namespace {

// What finding a kernel's ends works in, kept from kernel to kernel.
struct EdgeScratch {
    std::vector<ShapeEdge> found;
    std::vector<size_t> above, here;               // indices in found of the ends reaching a row
    std::vector<std::pair<int32_t, double>> ends;  // one row's, left to right
};

// Appends the kernel's ends to edges, ends that continue the row above at the same column and
// weight joined to it, the ends over one row first, and says how many there are of those.
int32_t AppendEdges(const ShapeKernel& kernel, EdgeScratch* scratch,
                    SY_AccountedVector<ShapeEdge>* edges) {
    // Plain references, not structured bindings, so that the lambdas below may capture them.
    std::vector<ShapeEdge>& found = scratch->found;
    std::vector<size_t>& above = scratch->above;
    std::vector<size_t>& here = scratch->here;
    std::vector<std::pair<int32_t, double>>& ends = scratch->ends;
    found.clear();
    above.clear();
    for (int32_t r = 0; r < kernel.RowCount(); ++r) {
        const ShapeKernel::Row& row = kernel.Rows()[r];
        here.clear();
        auto add = [&](int32_t x, double weight) {
            auto joined = std::find_if(above.begin(), above.end(), [&](size_t i) {
                const ShapeEdge& e = found[i];
                return e.x == x && e.weight == weight && e.y + e.rows == row.y;
            });
            if (joined != above.end()) {
                ++found[*joined].rows;
                here.push_back(*joined);
                above.erase(joined);  // one end of this row per end above
            } else {
                found.push_back({x, row.y, 1, weight});
                here.push_back(found.size() - 1);
            }
        };
        // Runs that meet (a rim pixel beside the inside) share one end, weighing the step.
        ends.clear();
        const ShapeKernel::Segment* s = kernel.Segments() + row.firstSegment;
        for (int32_t k = 0; k < row.segmentCount; ++k, ++s) {
            const double weight = s->weight;
            if (!ends.empty() && ends.back().first == s->x) {
                ends.back().second -= weight;
            } else {
                ends.emplace_back(s->x, -weight);
            }
            ends.emplace_back(s->x + s->length, weight);
        }
        for (const auto& [x, weight] : ends) {
            if (weight != 0) add(x, weight);
        }
        std::swap(above, here);
    }
    // Each kind in the order found.
    const size_t start = edges->size();
    for (const ShapeEdge& e : found) {
        if (e.rows == 1) edges->push_back(e);
    }
    const auto singles = static_cast<int32_t>(edges->size() - start);
    for (const ShapeEdge& e : found) {
        if (e.rows != 1) edges->push_back(e);
    }
    return singles;
}

}  // namespace

std::shared_ptr<const ShapeKernelArray> BuildShapeKernels(
    const SY_CameraDOFDesc& dof, float largestRadius,
    std::shared_ptr<const ShapeKernelArray> made) {
    if (dof.irisShape < 3) return nullptr;
    const SY_DOFModel model(dof);
    const double maxRadius = model.maxRadius;
    const auto count = static_cast<int32_t>(8 * maxRadius);
    try {
        auto array =
            std::allocate_shared<ShapeKernelArray>(SY_AccountedAllocator<ShapeKernelArray>());
        array->count = count;
        array->step = array->count ? 1.0f / static_cast<float>(array->count) : 0.0f;
        // The kernel the sampling picks for largestRadius, found as it finds it.
        const int32_t last = array->IndexForShare(std::min(1.0f, largestRadius / model.maxRadius));
        if (made && static_cast<int32_t>(made->irisList.size()) > last) return made;
        const size_t kept = made ? made->irisList.size() : 0;
        array->irisList.reserve(static_cast<size_t>(last) + 1);
        // Each run has at most two ends: room for every kernel's, so that the list grows once.
        size_t ends = made ? made->edgeList.size() : 0;
        for (int32_t i = 0; i <= last; ++i) {
            ShapeIris iris;
            if (static_cast<size_t>(i) < kept) {
                iris = made->irisList[static_cast<size_t>(i)];
            } else {
                double t = array->count ? static_cast<double>(i) / array->count : 0.0;
                iris.kernel = std::allocate_shared<const ShapeKernel>(
                    SY_AccountedAllocator<ShapeKernel>(), static_cast<int32_t>(dof.irisShape),
                    dof.irisRoundness, t * maxRadius, dof.irisAspect, SY_DOFXScale(dof),
                    dof.irisRotation, dof.diffractionFringe);
                const ShapeKernel& kernel = *iris.kernel;
                if (kernel.RowCount()) {
                    const ShapeKernel::Row& row = kernel.Rows()[kernel.RowCount() - 1];
                    ends += 2 * size_t(row.firstSegment + row.segmentCount);
                }
            }
            array->irisList.push_back(std::move(iris));
        }
        array->edgeList.reserve(ends);
        std::vector<size_t> firstEdge;
        EdgeScratch scratch;
        for (size_t i = 0; i < array->irisList.size(); ++i) {
            ShapeIris& iris = array->irisList[i];
            firstEdge.push_back(array->edgeList.size());
            if (i < kept) {
                array->edgeList.insert(array->edgeList.end(), iris.edges,
                                       iris.edges + iris.edgeCount);
            } else {
                iris.singleCount = AppendEdges(*iris.kernel, &scratch, &array->edgeList);
                iris.edgeCount = static_cast<int32_t>(array->edgeList.size() - firstEdge.back());
            }
        }
        // The list has stopped growing: its ends stay where they are.
        for (size_t i = 0; i < firstEdge.size(); ++i)
            array->irisList[i].edges = array->edgeList.data() + firstEdge[i];
        return array;
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;  // a kernel's rows could not be had
    }
}
