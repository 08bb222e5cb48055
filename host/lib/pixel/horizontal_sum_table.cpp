#include <algorithm>
#include <cmath>
#include <new>

#include "pf_tables.h"

namespace {

struct RowSumSettings {
    double exposureScale;
    double gain;
    double threshold;
    double saturation;
    const PF_LinearBlendingTables* linear;  // null: colour as stored
    bool keepExtendedRange;
};

// One pixel's contribution: straight colour normalised, exposed, linearised and boosted, then
// premultiplied.
template <class P>
PF_PixelDouble Contribution(const P& p, const RowSumSettings& s) {
    constexpr double k = 1.0 / PF_PixelTraits<P>::kMax;
    auto finite = [](double v) { return std::isfinite(v) ? v : 0.0; };
    double a = std::clamp(finite(p.alpha * k), 0.0, 1.0);
    double c[3] = {finite(p.red * k), finite(p.green * k), finite(p.blue * k)};
    for (double& v : c) {
        if (!s.keepExtendedRange) v = std::clamp(v, 0.0, 1.0);
        v *= s.exposureScale;
        if (s.linear && v > 0.0) v = std::pow(v, double(s.linear->toLinearExponent));
    }
    if (s.gain != 0.0 || s.saturation != 0.0) {
        double lum = 0.3 * c[0] + 0.59 * c[1] + 0.11 * c[2];
        // Boost ramps in from the threshold to full scale.
        double ramp =
            std::clamp((lum - s.threshold) / std::max(1.0 - s.threshold, 1.0 / 256.0), 0.0, 1.0);
        if (ramp > 0.0) {
            double spread = 1.0 + s.saturation * ramp, gain = 1.0 + s.gain * ramp;
            for (double& v : c)
                v = std::max(0.0, lum + (v - lum) * spread) * gain;
        }
    }
    return {a, a * c[0], a * c[1], a * c[2]};
}

}  // namespace

template <class P>
PF_HorizontalSumTable<P>::PF_HorizontalSumTable(
    const PF_World& world, int32_t originX, int32_t originY, double exposure, double highlightGain,
    double highlightThreshold, double highlightSaturation, double irisAspect, double irisRotation,
    bool linearLight, const PF_LinearBlendingTables* colorSettings, bool keepExtendedRange)
    : width_(world.width),
      height_(world.height),
      originX_(originX),
      originY_(originY),
      irisAspect_(irisAspect),
      irisRotation_(irisRotation) {
    bytes_ = sizeof(PF_PixelDouble) * (size_t(width_) + 1) * size_t(height_);
    sums_ = static_cast<PF_PixelDouble*>(U_AllocatePtr(0, "row-sum table", bytes_ ? bytes_ : 1));
    if (!sums_) throw std::bad_alloc();
    U_AccountAllocationEx(bytes_, 1);
    RowSumSettings settings = {std::exp2(exposure),
                               highlightGain,
                               highlightThreshold,
                               highlightSaturation,
                               linearLight ? colorSettings : nullptr,
                               keepExtendedRange};
    for (int32_t y = 0; y < height_; ++y) {
        const P* pixels = world.Row<P>(y);
        PF_PixelDouble* row = sums_ + ptrdiff_t(y) * (width_ + 1);
        row[0] = {0.0, 0.0, 0.0, 0.0};
        for (int32_t x = 0; x < width_; ++x) {
            PF_PixelDouble p = Contribution(pixels[x], settings);
            row[x + 1] = {row[x].alpha + p.alpha, row[x].red + p.red, row[x].green + p.green,
                          row[x].blue + p.blue};
        }
    }
}

template <class P>
PF_HorizontalSumTable<P>::~PF_HorizontalSumTable() {
    U_AccountAllocationEx(bytes_, 0);
    U_FreePtr(sums_);
}

template class PF_HorizontalSumTable<PF_Pixel8>;
template class PF_HorizontalSumTable<PF_Pixel16>;
template class PF_HorizontalSumTable<PF_PixelFloat>;
