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
    const ShapeKernel* kernel =
        kernels ? kernels->ForShare(std::min(1.0f, radius / model.maxRadius)) : nullptr;
    if (!kernel) return drawn();
    SampleKernel(*kernel, ix, iy, out);
}

template <class P>
void SY_DOFBufferX<P>::SampleKernel(const ShapeKernel& kernel, int32_t x, int32_t y, P* out) const {
    double sum[4] = {0, 0, 0, 0}, weight = 0;  // weight: of the pixels within the buffer
    const ShapeKernel::Segment* segments = kernel.Segments();
    for (const ShapeKernel::Row* row = kernel.Rows(); row != kernel.Rows() + kernel.RowCount();
         ++row) {
        const int32_t yy = y + row->y;
        if (yy < 0 || yy >= height) continue;
        const PF_PixelDouble* sums = rowTable->Row(yy);
        for (int32_t k = row->firstSegment; k < row->firstSegment + row->segmentCount; ++k) {
            const ShapeKernel::Segment& s = segments[k];
            const int32_t x0 = std::clamp(x + s.x, 0, width);
            const int32_t x1 = std::clamp(x + s.x + s.length, 0, width);
            const PF_PixelDouble& a = sums[x0];
            const PF_PixelDouble& b = sums[x1];
            const double w = s.weight;
            weight += w * (x1 - x0);
            sum[0] += (b.alpha - a.alpha) * w;
            sum[1] += (b.red - a.red) * w;
            sum[2] += (b.green - a.green) * w;
            sum[3] += (b.blue - a.blue) * w;
        }
    }
    if (!(weight > 0)) {
        *out = P{};
        return;
    }
    const double n = averagesWithin ? 1 / weight : kernel.Normalization();
    pf_tables::StoreAverage(
        PF_Float4{static_cast<float>(std::min(sum[0] * n, 1.0)), static_cast<float>(sum[1] * n),
                  static_cast<float>(sum[2] * n), static_cast<float>(sum[3] * n)},
        1.0f, out);
}

template class SY_DOFBufferX<PF_Pixel8>;
template class SY_DOFBufferX<PF_Pixel16>;
template class SY_DOFBufferX<PF_PixelFloat>;
