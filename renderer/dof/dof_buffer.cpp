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

SY_DOFBuffer::SY_DOFBuffer(const M_LRect& bounds, const SY_CameraDOFDesc& dof)
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
      highlightSaturation(dof.highlightSaturation) {}

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
    : SY_DOFBuffer(bounds, dof), world(width, height), kernels(std::move(shapeKernels)) {}

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
    const ShapeKernel* kernel = KernelFor(radius);
    if (!kernel) return drawn();
    SampleKernel(*kernel, ix, iy, out);
}

namespace {

// Adds the kernel's runs around (x, y) over the row sums of a width × height world, whose rows
// and ends are kept within it, to sum (alpha and red, green and blue) and returns the weight of
// the pixels read.
template <class Table>
double AddClippedKernel(const ShapeKernel& kernel, const Table& table, int32_t x, int32_t y,
                        int32_t width, int32_t height, __m128d sum[2]) {
    double weight = 0;
    const ShapeKernel::Segment* segments = kernel.Segments();
    const ShapeKernel::Row* end = kernel.Rows() + kernel.RowCount();
    for (const ShapeKernel::Row* row = kernel.Rows(); row != end; ++row) {
        const int32_t yy = y + row->y;
        if (yy < 0 || yy >= height) continue;
        const double* sums = &table.Row(yy)[0].alpha;
        const ShapeKernel::Segment* s = segments + row->firstSegment;
        for (const ShapeKernel::Segment* last = s + row->segmentCount; s != last; ++s) {
            const int32_t x0 = std::clamp(x + s->x, 0, width);
            const int32_t x1 = std::clamp(x + s->x + s->length, 0, width);
            weight += static_cast<double>(s->weight) * (x1 - x0);
            const double* a = sums + 4 * ptrdiff_t(x0);
            const double* b = sums + 4 * ptrdiff_t(x1);
            const __m128d w = _mm_set1_pd(s->weight);
            sum[0] =
                _mm_add_pd(sum[0], _mm_mul_pd(_mm_sub_pd(_mm_loadu_pd(b), _mm_loadu_pd(a)), w));
            sum[1] = _mm_add_pd(
                sum[1], _mm_mul_pd(_mm_sub_pd(_mm_loadu_pd(b + 2), _mm_loadu_pd(a + 2)), w));
        }
    }
    return weight;
}

// Adds the kernel's runs around each of the kPixels neighbours (x + p, y), the kernel lying
// within the world for every one, to sum[p]. Each pixel takes its terms in the order
// AddClippedKernel takes them, so its sum is the same to the bit; the pixels are interleaved
// because one pixel's additions wait on each other, while the neighbours' run alongside.
template <int32_t kPixels, class Table>
void AddKernel(const ShapeKernel& kernel, const Table& table, int32_t x, int32_t y,
               __m128d sum[][2]) {
    const ShapeKernel::Segment* segments = kernel.Segments();
    const ShapeKernel::Row* end = kernel.Rows() + kernel.RowCount();
    for (const ShapeKernel::Row* row = kernel.Rows(); row != end; ++row) {
        const double* sums = &table.Row(y + row->y)[x].alpha;
        const ShapeKernel::Segment* s = segments + row->firstSegment;
        for (const ShapeKernel::Segment* last = s + row->segmentCount; s != last; ++s) {
            const double* a = sums + 4 * ptrdiff_t(s->x);
            const double* b = a + 4 * ptrdiff_t(s->length);
            const __m128d w = _mm_set1_pd(s->weight);
            for (int32_t p = 0; p < kPixels; ++p, a += 4, b += 4) {
                sum[p][0] = _mm_add_pd(sum[p][0],
                                       _mm_mul_pd(_mm_sub_pd(_mm_loadu_pd(b), _mm_loadu_pd(a)), w));
                sum[p][1] = _mm_add_pd(
                    sum[p][1], _mm_mul_pd(_mm_sub_pd(_mm_loadu_pd(b + 2), _mm_loadu_pd(a + 2)), w));
            }
        }
    }
}

// Stores the kernel sum scaled by n (one over the weight read) as a pixel.
template <class P>
void StoreSum(const __m128d sum[2], double n, P* out) {
    double v[4];
    _mm_storeu_pd(v, sum[0]);
    _mm_storeu_pd(v + 2, sum[1]);
    pf_tables::StoreAverage(
        PF_Float4{static_cast<float>(std::min(v[0] * n, 1.0)), static_cast<float>(v[1] * n),
                  static_cast<float>(v[2] * n), static_cast<float>(v[3] * n)},
        1.0f, out);
}

// Whether a kernel of extent e around (x, y) lies within a width × height world.
bool Within(const int32_t* e, int32_t x, int32_t y, int32_t width, int32_t height) {
    return x + e[0] >= 0 && x + e[2] < width && y + e[1] >= 0 && y + e[3] < height;
}

}  // namespace

template <class P>
void SY_DOFBufferX<P>::SampleKernel(const ShapeKernel& kernel, int32_t x, int32_t y, P* out) const {
    __m128d sum[1][2] = {{_mm_setzero_pd(), _mm_setzero_pd()}};
    double n = kernel.Normalization();
    if (Within(kernel.Extent(), x, y, width, height)) {
        AddKernel<1>(kernel, *rowTable, x, y, sum);
    } else {
        const double weight = AddClippedKernel(kernel, *rowTable, x, y, width, height, sum[0]);
        if (!(weight > 0)) {
            *out = P{};
            return;
        }
        if (averagesWithin) n = 1 / weight;
    }
    StoreSum(sum[0], n, out);
}

template <class P>
void SY_DOFBufferX<P>::SampleSpan(float x, float y, int32_t first, int32_t count,
                                  const float* radius, P* out) const {
    auto at = [&](int32_t k) { return x + static_cast<float>(first + k); };
    if (rowTable && count == kSpanPixels) {
        // Sample finds the pixel it reads from by truncation, as here.
        const ShapeKernel* kernel = KernelFor(radius[0]);
        const auto ix = static_cast<int32_t>(at(0) - static_cast<float>(originX));
        const auto iy = static_cast<int32_t>(y - static_cast<float>(originY));
        bool shared = kernel && Within(kernel->Extent(), ix, iy, width - kSpanPixels + 1, height);
        for (int32_t k = 1; shared && k < count; ++k) {
            shared = KernelFor(radius[k]) == kernel &&
                     static_cast<int32_t>(at(k) - static_cast<float>(originX)) == ix + k;
        }
        if (shared) {
            __m128d sum[kSpanPixels][2];
            for (auto& s : sum)
                s[0] = s[1] = _mm_setzero_pd();
            AddKernel<kSpanPixels>(*kernel, *rowTable, ix, iy, sum);
            for (int32_t k = 0; k < count; ++k)
                StoreSum(sum[k], kernel->Normalization(), out + k);
            return;
        }
    }
    for (int32_t k = 0; k < count; ++k)
        Sample(at(k), y, radius[k], out + k);
}

template class SY_DOFBufferX<PF_Pixel8>;
template class SY_DOFBufferX<PF_Pixel16>;
template class SY_DOFBufferX<PF_PixelFloat>;
