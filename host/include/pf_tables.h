// Summed-area and row-sum tables over a world, with their box samplers: the depth-of-field
// buffer and the soft-shadow samplers average layer pixels over large boxes through them.
#pragma once

#include <cstddef>
#include <cstdint>

#include "pf_box_sum.h"
#include "pf_pixel.h"
#include "pf_vec4.h"
#include "pf_world.h"
#include "pf_xfer.h"
#include "u_memory.h"

// Premultiplied sums over a world of any depth, normalised: alpha in 0..1 and alpha × colour
// with colour in 0..1. Sums(x, y), (Width() + 1) per row and Height() + 1 rows, holds the sum
// over pixels [0, x) × [0, y), as PF_PixelDouble when built with doubleSums, else as
// PF_PixelFloat (enough for small worlds only). Throws std::bad_alloc without memory and
// PF_UnexpectedBitDepth for a world of a depth other than 8, 16 and 32.
class PF_SummedAreaTable : public U_MemTrackedObject {
public:
    PF_SummedAreaTable(const PF_World& world, bool doubleSums);
    ~PF_SummedAreaTable();
    PF_SummedAreaTable(const PF_SummedAreaTable&) = delete;
    PF_SummedAreaTable& operator=(const PF_SummedAreaTable&) = delete;

    int32_t Width() const { return width_; }
    int32_t Height() const { return height_; }
    bool HasDoubleSums() const { return doubleSums_; }
    const PF_PixelFloat* FloatSums() const {
        return doubleSums_ ? nullptr : static_cast<const PF_PixelFloat*>(sums_);
    }
    const PF_PixelDouble* DoubleSums() const {
        return doubleSums_ ? static_cast<const PF_PixelDouble*>(sums_) : nullptr;
    }

private:
    int32_t width_;
    int32_t height_;
    bool doubleSums_;
    size_t bytes_;
    void* sums_;
};

namespace pf_tables {

// Turns a normalised premultiplied box sum into channel units for P and stores it.
template <class P>
inline void StoreAverage(PF_Float4 sum, float area, P* out) {
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    if (!(area > 0.0f)) {
        *out = P{};
        return;
    }
    float a = kMax / area, c = kMax * kMax / area;
    PF_StorePremultiplied(sum * PF_Float4{a, c, c, c}, out);
}

}  // namespace pf_tables

// Average over the pixels [x0, x1) × [y0, y1) of a summed-area table of width × height pixels
// (sums are PF_PixelFloat or PF_PixelDouble); pixels outside count as transparent.
template <class P, class S>
inline void PF_SummedAreaTable_SampleDraft(int32_t width, int32_t height, const S* sums, int32_t x0,
                                           int32_t y0, int32_t x1, int32_t y1, P* out) {
    using Cells = PF_BoxCellsPixel<S>;
    ptrdiff_t stride = ptrdiff_t(width) + 1;
    const S* top = sums + ptrdiff_t(std::clamp(y0, 0, height)) * stride;
    const S* bottom = sums + ptrdiff_t(std::clamp(y1, 0, height)) * stride;
    int32_t left = std::clamp(x0, 0, width), right = std::clamp(x1, 0, width);
    S box = Cells::Sub(Cells::Sub(bottom[right], top[right]), Cells::Sub(bottom[left], top[left]));
    float area = x1 > x0 && y1 > y0 ? float(x1 - x0) * float(y1 - y0) : 0.0f;
    pf_tables::StoreAverage(Cells::ToFloat4(Cells::Widen(box)), area, out);
}

// Average over the box [x0, x1] × [y0, y1] with fractional edges, where pixel i covers
// [i, i + 1): partly covered pixels count by the share covered, outside is transparent.
template <class P, class S>
inline void PF_SummedAreaTable_SampleAA(int32_t width, int32_t height, const S* sums, float x0,
                                        float y0, float x1, float y1, P* out) {
    PF_BoxAxis ax = PF_MakeBoxAxis(x0, x1, width);
    PF_BoxAxis ay = PF_MakeBoxAxis(y0, y1, height);
    float area = x1 > x0 && y1 > y0 ? (x1 - x0) * (y1 - y0) : 0.0f;
    PF_Float4 sum = PF_BoxSum<PF_BoxCellsPixel<S>>(sums, ptrdiff_t(width) + 1, ax, ay);
    pf_tables::StoreAverage(sum, area, out);
}

// Per-row prefix sums of a world's pixels for kernels that walk an iris row by row. Values are
// premultiplied and normalised like those of PF_SummedAreaTable, with bright pixels boosted:
// a pixel whose luminance lies above highlightThreshold (a fraction of full scale) has its
// colour raised by up to highlightGain and its saturation by up to highlightSaturation, both
// ramping in between the threshold and full scale.
template <class P>
class PF_HorizontalSumTable : public U_MemTrackedObject {
public:
    // originX, originY: the world's top-left pixel in the caller's coordinates. exposure: stops
    // applied to colour first. irisAspect, irisRotation: the iris whose kernels walk the
    // table, kept for them. linearLight with colorSettings: colour summed in linear light (the
    // float exponent). keepExtendedRange: float colour above 1 is summed as it is rather than
    // clipped to full scale. Throws std::bad_alloc without memory.
    PF_HorizontalSumTable(const PF_World& world, int32_t originX, int32_t originY, double exposure,
                          double highlightGain, double highlightThreshold,
                          double highlightSaturation, double irisAspect, double irisRotation,
                          bool linearLight, const PF_LinearBlendingTables* colorSettings,
                          bool keepExtendedRange);
    ~PF_HorizontalSumTable();
    PF_HorizontalSumTable(const PF_HorizontalSumTable&) = delete;
    PF_HorizontalSumTable& operator=(const PF_HorizontalSumTable&) = delete;

    int32_t Width() const { return width_; }
    int32_t Height() const { return height_; }
    int32_t OriginX() const { return originX_; }
    int32_t OriginY() const { return originY_; }
    double IrisAspect() const { return irisAspect_; }
    double IrisRotation() const { return irisRotation_; }

    // Width() + 1 prefix sums of the world's row y (0 ≤ y < Height()): entry x sums [0, x).
    const PF_PixelDouble* Row(int32_t y) const { return sums_ + ptrdiff_t(y) * (width_ + 1); }

    // Sum over the pixels [x0, x1) of row y, in the caller's coordinates; the ends are clamped
    // to the row and a row outside the world sums to zero.
    PF_PixelDouble SegmentSum(int32_t y, int32_t x0, int32_t x1) const {
        y -= originY_;
        if (y < 0 || y >= height_) return {0.0, 0.0, 0.0, 0.0};
        x0 = std::clamp(x0 - originX_, 0, width_);
        x1 = std::clamp(x1 - originX_, x0, width_);
        const PF_PixelDouble& a = Row(y)[x0];
        const PF_PixelDouble& b = Row(y)[x1];
        return {b.alpha - a.alpha, b.red - a.red, b.green - a.green, b.blue - a.blue};
    }

private:
    int32_t width_;
    int32_t height_;
    int32_t originX_;
    int32_t originY_;
    double irisAspect_;
    double irisRotation_;
    size_t bytes_;
    PF_PixelDouble* sums_;
};

extern template class PF_HorizontalSumTable<PF_Pixel8>;
extern template class PF_HorizontalSumTable<PF_Pixel16>;
extern template class PF_HorizontalSumTable<PF_PixelFloat>;
