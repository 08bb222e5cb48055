// The depth-of-field buffer: a layer drawn flat into pixels, then read back blurred, each
// output pixel averaging the layer over the blur its depth calls for.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <utility>

#include "m_matrix.h"
#include "pf_tables.h"
#include "pf_world.h"
#include "renderer/dof/shape_kernels.h"
#include "renderer/scene/dof_model.h"
#include "renderer/scene/render_target.h"
#include "renderer/scene/scene_desc.h"

template <class P>
class SY_DOFBufferX;

// Use: New; draw the layer into Target(); PrepareTables; Sample from any number of threads;
// destroy. Iris shapes below 3 blur with a box over a summed-area table; the others walk the
// iris kernels over per-row sums (at 8 and 16 bits also over sums down the columns), with
// highlights boosted.
class SY_DOFBuffer : public PF_PixelContainer<SY_DOFBufferX<PF_Pixel8>, SY_DOFBufferX<PF_Pixel16>,
                                              SY_DOFBufferX<PF_PixelFloat>> {
public:
    // A cleared buffer over bounds (output pixels) of the depth bitDepth, for the camera's
    // depth of field. kernels: the frame's iris kernels (see UseKernels), null for the simple
    // shapes. Reports and throws 3 for a depth other than 8, 16 or 32, and throws 4 without
    // memory.
    static std::unique_ptr<SY_DOFBuffer> New(const M_LRect& bounds, int16_t bitDepth,
                                             const SY_CameraDOFDesc& dof,
                                             std::shared_ptr<const ShapeKernelArray> kernels);

    // Builds the sums that sampling reads, once the layer is drawn. Throws 4 without memory.
    virtual void PrepareTables() = 0;

    // The iris kernels sampling reads from now on, which must reach the largest radius it is
    // asked for.
    void UseKernels(std::shared_ptr<const ShapeKernelArray> shapeKernels) {
        kernels = std::move(shapeKernels);
    }

    // Where a layer render stores its pixels.
    virtual SY_SpanImageRecord Target() = 0;

    // The blur radius in output pixels at a point of screen W (zoom over eye depth).
    float RadiusAtW(double w) const { return model.RadiusAtW(w); }

    int32_t originX, originY;  // the buffer's top-left pixel in output coordinates
    int32_t width, height;
    float xScale;  // a blur is this much wider than high, so that it is round on screen
    SY_DOFModel model;
    double irisShape;
    double irisAspect;
    double irisRotation;
    double highlightGain;       // fraction
    double highlightThreshold;  // fraction of full scale
    double highlightSaturation;
    // Blur averages over the buffer's pixels only, as for a layer that goes on beyond them
    // (an unbounded layer, whose image ends with the output); otherwise beyond is clear.
    bool averagesWithin = false;

protected:
    SY_DOFBuffer(const M_LRect& bounds, const SY_CameraDOFDesc& dof,
                 std::shared_ptr<const ShapeKernelArray> shapeKernels);

    std::shared_ptr<const ShapeKernelArray> kernels;
};

template <class P>
class SY_DOFBufferX final : public SY_DOFBuffer {
public:
    SY_DOFBufferX(const M_LRect& bounds, const SY_CameraDOFDesc& dof,
                  std::shared_ptr<const ShapeKernelArray> kernels);

    int16_t GetBitDepth() const override { return PF_PixelTraits<P>::kBitDepth; }
    void PrepareTables() override;
    SY_SpanImageRecord Target() override { return {&world, originX, originY}; }

    P* PixelAddress(int32_t x, int32_t y) { return world.Row(y - originY) + (x - originX); }

    // The layer at output point (x, y) (pixel centres at half pixels) blurred over radius
    // output pixels. A radius too small to show gives the drawn pixel itself.
    void Sample(float x, float y, float radius, P* out) const;

    // As Sample for the count points x + first + k (k below count, at most kSpanPixels) of the
    // row at y, pixel k blurred over radius[k] into out[k], with the same results. Neighbours
    // that share an iris kernel are read together, row by row of the kernel, which keeps the
    // rows' sums in cache and lets the neighbours' sums add up side by side.
    static constexpr int32_t kSpanPixels = 64;
    void SampleSpan(float x, float y, int32_t first, int32_t count, const float* radius,
                    P* out) const;

private:
    const ShapeIris* KernelFor(float radius) const {
        return kernels ? kernels->ForShare(std::min(1.0f, radius / model.maxRadius)) : nullptr;
    }
    // The count neighbours from (x, y) on (in the world's pixels), blurred through kernel.
    void SampleKernel(const ShapeIris& iris, int32_t x, int32_t y, int32_t count, P* out) const;

    PF_WorldX<P> world;
    std::unique_ptr<PF_SummedAreaTable> areaTable;
    using Table = PF_HorizontalSumTable<P>;
    std::unique_ptr<Table> rowTable;
    // Sums of rowTable down its columns: row y, laid out as rowTable's, sums its rows [0, y).
    // Empty only for float layers: reading a kernel by its ends takes differences of sums far
    // larger than the kernel's, which leaves traces of rounding where the layer is clear, and
    // float colour, divided by such an alpha, would show them; 8- and 16-bit levels round them
    // away.
    SY_AccountedVector<double> columnSums;
};
