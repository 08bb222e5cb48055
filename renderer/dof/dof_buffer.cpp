#include "renderer/dof/dof_buffer.h"

#include <algorithm>
#include <cmath>
#include <new>

#include "pf_bit_depth.h"
#include "u_memory.h"
#include "u_report.h"

namespace {

// The host's tables and worlds throw std::bad_alloc; the renderer speaks in codes.
template <class Make>
auto OrOutOfMemory(Make make) {
    try {
        return make();
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;
    }
}

}  // namespace

SY_DOFBuffer::SY_DOFBuffer(const M_LRect& bounds, const SY_CameraDOFDesc& dof,
                           std::shared_ptr<const ShapeKernelArray> shapeKernels)
    : originX(bounds.left),
      originY(bounds.top),
      width(std::max(bounds.right - bounds.left, 0)),
      height(std::max(bounds.bottom - bounds.top, 0)),
      xScale(static_cast<float>(SY_DOFXScale(dof))),
      model(dof),
      irisShape(dof.irisShape),
      irisAspect(dof.irisAspect),
      irisRotation(dof.irisRotation),
      highlightGain(dof.highlightGain),
      // The camera gives the threshold in 8-bit levels whatever the depth.
      highlightThreshold(dof.highlightThreshold / 255),
      highlightSaturation(dof.highlightSaturation),
      kernels(std::move(shapeKernels)) {}

std::unique_ptr<SY_DOFBuffer> SY_DOFBuffer::New(const M_LRect& bounds, int16_t bitDepth,
                                                const SY_CameraDOFDesc& dof,
                                                std::shared_ptr<const ShapeKernelArray> kernels) {
    return PF_DispatchBitDepth(
        bitDepth,
        [&]<class P>() {
            return OrOutOfMemory([&] {
                return std::unique_ptr<SY_DOFBuffer>(
                    new SY_DOFBufferX<P>(bounds, dof, std::move(kernels)));
            });
        },
        U_BitDepthVerification("unexpected bitdepth in SY_DOFBuffer::New()"));
}

template <class P>
SY_DOFBufferX<P>::SY_DOFBufferX(const M_LRect& bounds, const SY_CameraDOFDesc& dof,
                                std::shared_ptr<const ShapeKernelArray> shapeKernels)
    : SY_DOFBuffer(bounds, dof, std::move(shapeKernels)), world(width, height) {}

template <class P>
void SY_DOFBufferX<P>::PrepareTables() {
    OrOutOfMemory([&] {
        if (irisShape < 3) {
            // Whole frames sum beyond what float keeps exactly.
            areaTable = std::make_unique<PF_SummedAreaTable>(world, true);
        } else {
            rowTable = std::make_unique<PF_HorizontalSumTable<P>>(
                world, 0, 0, 0.0, highlightGain, highlightThreshold, highlightSaturation,
                irisAspect, irisRotation, false, nullptr, false);
            if constexpr (PF_PixelTraits<P>::kIsFloat) return;
            const size_t stride = 4 * (size_t(width) + 1);
            columnSums.assign(stride * (size_t(height) + 1), 0.0);
            for (int32_t y = 0; y < height; ++y) {
                const double* row = &rowTable->Row(y)[0].alpha;
                const double* above = columnSums.data() + stride * size_t(y);
                double* below = columnSums.data() + stride * (size_t(y) + 1);
                for (size_t i = 0; i < stride; ++i)
                    below[i] = above[i] + row[i];
            }
        }
    });
}

template <class P>
void SY_DOFBufferX<P>::Sample(float x, float y, float radius, P* out) const {
    const float lx = x - static_cast<float>(originX), ly = y - static_cast<float>(originY);
    const auto ix = static_cast<int32_t>(lx), iy = static_cast<int32_t>(ly);
    auto drawn = [&] {
        *out = ix >= 0 && ix < width && iy >= 0 && iy < height ? world.At(ix, iy) : P{};
    };
    if (areaTable) {
        // A box of half a pixel each way is the pixel itself.
        float rx = std::max(xScale * radius, 0.5f), ry = std::max(radius, 0.5f);
        if (rx == 0.5f && ry == 0.5f) return drawn();
        float x0 = lx - rx, y0 = ly - ry, x1 = lx + rx, y1 = ly + ry;
        if (averagesWithin) {
            x0 = std::max(x0, 0.0f), y0 = std::max(y0, 0.0f);
            x1 = std::min(x1, static_cast<float>(width)),
            y1 = std::min(y1, static_cast<float>(height));
        }
        PF_SummedAreaTable_SampleAA(width, height, areaTable->DoubleSums(), x0, y0, x1, y1, out);
        return;
    }
    const ShapeIris* kernel = KernelFor(radius);
    if (!kernel) return drawn();
    SampleKernel(*kernel, ix, iy, 1, out);
}

namespace {

// One pixel's alpha, red, green and blue sums. Processors with wide registers add them in one
// instruction, others in two; each channel's arithmetic is the same either way (no fused
// multiply-add: the wide path asks for the wide registers only).
typedef double Sums4 __attribute__((vector_size(32), aligned(8)));

// Adds weight × (b − a) for the prefix sums a and b of one row to sum.
[[gnu::always_inline]] inline void AddRun(const double* a, const double* b, double weight,
                                          Sums4* sum) {
    Sums4 from, to;
    __builtin_memcpy(&from, a, sizeof from);
    __builtin_memcpy(&to, b, sizeof to);
    *sum += (to - from) * Sums4{weight, weight, weight, weight};
}

// Adds weight × a for the prefix sum a of one row to sum.
[[gnu::always_inline]] inline void AddEnd(const double* a, double weight, Sums4* sum) {
    Sums4 at;
    __builtin_memcpy(&at, a, sizeof at);
    *sum += at * Sums4{weight, weight, weight, weight};
}

// How far the kernels around a group of pixels reach: within the world; beyond its top or
// bottom only, whose rows are then left out; or beyond its ends too, which are then kept within
// it. Beyond the world each pixel sums the weight of the pixels it read.
enum class Reach { kWithin, kBeyondRows, kBeyondEnds };

// Adds the ends of an iris around each of the kPixels neighbours from (x, y) on to their sums,
// as far as kReach says: row and column prefix sums from rows and columns, stride doubles a
// row, of a width × height world. An end beyond the world's ends reads the end's sums there.
template <Reach kReach, int32_t kPixels>
[[gnu::always_inline]] inline void AddEnds(const ShapeIris& iris, const double* rows,
                                           const double* columns, ptrdiff_t stride, int32_t x,
                                           int32_t y, int32_t width, int32_t height, Sums4* sum) {
    constexpr bool kClipRows = kReach != Reach::kWithin;
    // Where pixel p finds its end at column offset dx in a row.
    auto at = [&](int32_t dx, int32_t p) {
        const ptrdiff_t column = ptrdiff_t(x) + dx + p;
        return 4 *
               (kReach == Reach::kBeyondEnds ? std::clamp<ptrdiff_t>(column, 0, width) : column);
    };
    Sums4 kept[kPixels];
    for (int32_t p = 0; p < kPixels; ++p)
        kept[p] = sum[p];
    const ShapeEdge* e = iris.edges;
    const ShapeEdge* single = e + iris.singleCount;
    for (; e != single; ++e) {
        const int32_t yy = y + e->y;
        if (kClipRows && (yy < 0 || yy >= height)) continue;
        const double* row = rows + stride * yy;
        for (int32_t p = 0; p < kPixels; ++p)
            AddEnd(row + at(e->x, p), e->weight, kept + p);
    }
    for (const ShapeEdge* last = iris.edges + iris.edgeCount; e != last; ++e) {
        int32_t y0 = y + e->y, y1 = y0 + e->rows;
        if constexpr (kClipRows) {
            y0 = std::max(y0, 0), y1 = std::min(y1, height);
            if (y0 >= y1) continue;
        }
        const double* a = columns + stride * y0;
        const double* b = columns + stride * y1;
        for (int32_t p = 0; p < kPixels; ++p)
            AddRun(a + at(e->x, p), b + at(e->x, p), e->weight, kept + p);
    }
    for (int32_t p = 0; p < kPixels; ++p)
        sum[p] = kept[p];
}

// Adds the iris' ends around each of the count neighbours (x + p, y) to sum[p], kTogether at a
// time: one pixel's additions wait on each other while the others' run alongside, and each
// end's sums are read once from memory for all of them. Every pixel takes its terms in the
// same order whatever its neighbours, so that its sum is the same to the bit.
template <Reach kReach, int32_t kTogether>
[[gnu::always_inline]] inline void AddKernelEnds(const ShapeIris& iris, const double* rows,
                                                 const double* columns, ptrdiff_t stride, int32_t x,
                                                 int32_t y, int32_t count, int32_t width,
                                                 int32_t height, Sums4* sum) {
    int32_t p = 0;
    for (; p + kTogether <= count; p += kTogether)
        AddEnds<kReach, kTogether>(iris, rows, columns, stride, x + p, y, width, height, sum + p);
    for (; p < count; ++p)
        AddEnds<kReach, 1>(iris, rows, columns, stride, x + p, y, width, height, sum + p);
}

// Whether the processor has the wide (AVX) registers; asked once.
bool HasWideRegisters() {
    static const bool wide = (__builtin_cpu_init(), __builtin_cpu_supports("avx"));
    return wide;
}

// AddKernelEnds through the wide registers, for processors that have them.
template <Reach kReach>
[[gnu::target("avx")]] void AddKernelEndsWide(const ShapeIris& iris, const double* rows,
                                              const double* columns, ptrdiff_t stride, int32_t x,
                                              int32_t y, int32_t count, int32_t width,
                                              int32_t height, Sums4* sum) {
    // Sixteen wide registers hold eight pixels' sums and what they add.
    AddKernelEnds<kReach, 8>(iris, rows, columns, stride, x, y, count, width, height, sum);
}

template <Reach kReach>
void AddKernelEndsOnAny(const ShapeIris& iris, const double* rows, const double* columns,
                        ptrdiff_t stride, int32_t x, int32_t y, int32_t count, int32_t width,
                        int32_t height, Sums4* sum) {
    if (count <= 0) return;
    if (HasWideRegisters()) {
        AddKernelEndsWide<kReach>(iris, rows, columns, stride, x, y, count, width, height, sum);
    } else {
        AddKernelEnds<kReach, 4>(iris, rows, columns, stride, x, y, count, width, height, sum);
    }
}

// Adds one kernel row's runs s to last around each of the kPixels neighbours from x on to
// their sums, sums being the row's prefix sums of width pixels.
template <Reach kReach, int32_t kPixels>
[[gnu::always_inline]] inline void AddRow(const ShapeKernel::Segment* s,
                                          const ShapeKernel::Segment* last, const double* sums,
                                          int32_t x, int32_t width, Sums4* sum, double* weight) {
    // Sums kept apart from the table's memory stay in registers.
    Sums4 kept[kPixels];
    for (int32_t p = 0; p < kPixels; ++p)
        kept[p] = sum[p];
    for (; s != last; ++s) {
        if constexpr (kReach == Reach::kBeyondEnds) {
            for (int32_t p = 0; p < kPixels; ++p) {
                const int32_t x0 = std::clamp(x + p + s->x, 0, width);
                const int32_t x1 = std::clamp(x + p + s->x + s->length, 0, width);
                weight[p] += static_cast<double>(s->weight) * (x1 - x0);
                AddRun(sums + 4 * ptrdiff_t(x0), sums + 4 * ptrdiff_t(x1), s->weight, kept + p);
            }
        } else {
            // The neighbours' runs lie side by side: fixed steps from the first one's ends.
            const double* a = sums + 4 * (ptrdiff_t(x) + s->x);
            const double* b = a + 4 * ptrdiff_t(s->length);
            for (int32_t p = 0; p < kPixels; ++p) {
                if constexpr (kReach == Reach::kBeyondRows)
                    weight[p] += static_cast<double>(s->weight) * s->length;
                AddRun(a + 4 * p, b + 4 * p, s->weight, kept + p);
            }
        }
    }
    for (int32_t p = 0; p < kPixels; ++p)
        sum[p] = kept[p];
}

// Adds the kernel's runs around each of the count neighbours (x + p, y) over the row prefix
// sums of a width × height world, rows stride doubles apart, to sum[p], as far as kReach says.
// The terms go row by row and run by run, the neighbours through each kernel row together,
// kTogether at a time, as for the ends. Each pixel's reach, which only its place decides,
// picks the order of its terms.
template <Reach kReach, int32_t kTogether>
[[gnu::always_inline]] inline void AddKernel(const ShapeKernel& kernel, const double* rows,
                                             ptrdiff_t stride, int32_t x, int32_t y, int32_t count,
                                             int32_t width, int32_t height, Sums4* sum,
                                             double* weight) {
    const ShapeKernel::Segment* segments = kernel.Segments();
    const ShapeKernel::Row* end = kernel.Rows() + kernel.RowCount();
    for (const ShapeKernel::Row* row = kernel.Rows(); row != end; ++row) {
        const int32_t yy = y + row->y;
        if (kReach != Reach::kWithin && (yy < 0 || yy >= height)) continue;
        const double* sums = rows + stride * yy;
        const ShapeKernel::Segment* s = segments + row->firstSegment;
        const ShapeKernel::Segment* last = s + row->segmentCount;
        int32_t p = 0;
        for (; p + kTogether <= count; p += kTogether)
            AddRow<kReach, kTogether>(s, last, sums, x + p, width, sum + p, weight + p);
        for (; p < count; ++p)
            AddRow<kReach, 1>(s, last, sums, x + p, width, sum + p, weight + p);
    }
}

// AddKernel through the wide registers, for processors that have them.
template <Reach kReach>
[[gnu::target("avx")]] void AddKernelWide(const ShapeKernel& kernel, const double* rows,
                                          ptrdiff_t stride, int32_t x, int32_t y, int32_t count,
                                          int32_t width, int32_t height, Sums4* sum,
                                          double* weight) {
    AddKernel<kReach, 8>(kernel, rows, stride, x, y, count, width, height, sum, weight);
}

template <Reach kReach>
void AddKernelOnAny(const ShapeKernel& kernel, const double* rows, ptrdiff_t stride, int32_t x,
                    int32_t y, int32_t count, int32_t width, int32_t height, Sums4* sum,
                    double* weight) {
    if (count <= 0) return;
    if (HasWideRegisters()) {
        AddKernelWide<kReach>(kernel, rows, stride, x, y, count, width, height, sum, weight);
    } else {
        AddKernel<kReach, 4>(kernel, rows, stride, x, y, count, width, height, sum, weight);
    }
}

// The weight of the pixels of a width × height world that the kernel around (x, y) reads, added
// up as the row-by-row reading adds it.
double WeightRead(const ShapeKernel& kernel, int32_t x, int32_t y, int32_t width, int32_t height) {
    double weight = 0;
    const ShapeKernel::Row* end = kernel.Rows() + kernel.RowCount();
    for (const ShapeKernel::Row* row = kernel.Rows(); row != end; ++row) {
        if (y + row->y < 0 || y + row->y >= height) continue;
        const ShapeKernel::Segment* s = kernel.Segments() + row->firstSegment;
        for (int32_t k = 0; k < row->segmentCount; ++k, ++s) {
            const int32_t x0 = std::clamp(x + s->x, 0, width);
            const int32_t x1 = std::clamp(x + s->x + s->length, 0, width);
            weight += static_cast<double>(s->weight) * (x1 - x0);
        }
    }
    return weight;
}

// Stores the kernel sum scaled by n (one over the weight read) as a pixel.
template <class P>
void StoreSum(const Sums4& sum, double n, P* out) {
    pf_tables::StoreAverage(
        PF_Float4{static_cast<float>(std::min(sum[0] * n, 1.0)), static_cast<float>(sum[1] * n),
                  static_cast<float>(sum[2] * n), static_cast<float>(sum[3] * n)},
        1.0f, out);
}

}  // namespace

template <class P>
void SY_DOFBufferX<P>::SampleKernel(const ShapeIris& iris, int32_t x, int32_t y, int32_t count,
                                    P* out) const {
    const ShapeKernel& kernel = *iris.kernel;
    // Pixels k below left reach beyond the world's left end, from right on beyond its right;
    // those between, beyond its rows or not, for all of them alike.
    const int32_t* e = kernel.Extent();
    const int32_t left = std::clamp(-e[0] - x, 0, count);
    const int32_t right = std::clamp(width - e[2] - x, left, count);
    const bool rowsWithin = y + e[1] >= 0 && y + e[3] < height;
    Sums4 sum[kSpanPixels] = {};
    double weight[kSpanPixels] = {};
    const double* rows = &rowTable->Row(0)[0].alpha;
    const ptrdiff_t stride = 4 * (ptrdiff_t(width) + 1);
    if (!columnSums.empty()) {
        // Pixels within the world's ends read the kernel's ends, those that reach beyond them
        // clamped to them; the pixels beyond go row by row.
        const double* columns = columnSums.data();
        const int32_t first = std::clamp(-x, 0, count), last = std::clamp(width - x, first, count);
        const int32_t inner = std::clamp(left, first, last), outer = std::clamp(right, inner, last);
        AddKernelOnAny<Reach::kBeyondEnds>(kernel, rows, stride, x, y, first, width, height, sum,
                                           weight);
        AddKernelEndsOnAny<Reach::kBeyondEnds>(iris, rows, columns, stride, x + first, y,
                                               inner - first, width, height, sum + first);
        if (rowsWithin) {
            AddKernelEndsOnAny<Reach::kWithin>(iris, rows, columns, stride, x + inner, y,
                                               outer - inner, width, height, sum + inner);
        } else {
            AddKernelEndsOnAny<Reach::kBeyondRows>(iris, rows, columns, stride, x + inner, y,
                                                   outer - inner, width, height, sum + inner);
        }
        AddKernelEndsOnAny<Reach::kBeyondEnds>(iris, rows, columns, stride, x + outer, y,
                                               last - outer, width, height, sum + outer);
        AddKernelOnAny<Reach::kBeyondEnds>(kernel, rows, stride, x + last, y, count - last, width,
                                           height, sum + last, weight + last);
        if (averagesWithin) {
            for (int32_t k = first; k < last; ++k) {
                if (!rowsWithin || k < left || k >= right)
                    weight[k] = WeightRead(kernel, x + k, y, width, height);
            }
        }
    } else {
        AddKernelOnAny<Reach::kBeyondEnds>(kernel, rows, stride, x, y, left, width, height, sum,
                                           weight);
        if (rowsWithin) {
            AddKernelOnAny<Reach::kWithin>(kernel, rows, stride, x + left, y, right - left, width,
                                           height, sum + left, nullptr);
        } else {
            AddKernelOnAny<Reach::kBeyondRows>(kernel, rows, stride, x + left, y, right - left,
                                               width, height, sum + left, weight + left);
        }
        AddKernelOnAny<Reach::kBeyondEnds>(kernel, rows, stride, x + right, y, count - right, width,
                                           height, sum + right, weight + right);
    }
    // A kernel that reads nothing sums to zero, which stores clear; only an average within the
    // world needs the weight read.
    const double n = kernel.Normalization();
    for (int32_t k = 0; k < count; ++k) {
        if (!averagesWithin || (rowsWithin && k >= left && k < right)) {
            StoreSum(sum[k], n, out + k);
        } else if (!(weight[k] > 0)) {
            out[k] = P{};
        } else {
            StoreSum(sum[k], 1 / weight[k], out + k);
        }
    }
}

template <class P>
void SY_DOFBufferX<P>::SampleSpan(float x, float y, int32_t first, int32_t count,
                                  const float* radius, P* out) const {
    // Sample finds the pixel it reads from by truncation, as here.
    auto at = [&](int32_t k) { return x + static_cast<float>(first + k); };
    auto column = [&](int32_t k) {
        return static_cast<int32_t>(at(k) - static_cast<float>(originX));
    };
    const auto iy = static_cast<int32_t>(y - static_cast<float>(originY));
    for (int32_t k = 0; k < count;) {
        const ShapeIris* kernel = rowTable ? KernelFor(radius[k]) : nullptr;
        if (!kernel) {
            Sample(at(k), y, radius[k], out + k);
            ++k;
            continue;
        }
        // The neighbours that read through the same kernel.
        const int32_t ix = column(k);
        int32_t n = 1;
        while (k + n < count && KernelFor(radius[k + n]) == kernel && column(k + n) == ix + n)
            ++n;
        SampleKernel(*kernel, ix, iy, n, out + k);
        k += n;
    }
}

template class SY_DOFBufferX<PF_Pixel8>;
template class SY_DOFBufferX<PF_Pixel16>;
template class SY_DOFBufferX<PF_PixelFloat>;
