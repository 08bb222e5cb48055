// Anti-aliased lines: each step along the major axis covers the two pixels nearest the line,
// shared by its distance to their centres. Ends are capped half a pixel beyond the end points,
// so that edges meeting at a vertex cover its pixel fully.
#include <algorithm>
#include <cmath>
#include <utility>

#include "pf_bit_depth.h"
#include "pf_draw.h"
#include "pf_xfer.h"

namespace {

template <class P>
P Converted(const PF_PixelFloat& c) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat) {
        return c;
    } else {
        using C = typename Traits::Channel;
        auto convert = [](float v) {
            return static_cast<C>(std::clamp(v, 0.0f, 1.0f) * Traits::kMax + 0.5f);
        };
        return {convert(c.alpha), convert(c.red), convert(c.green), convert(c.blue)};
    }
}

// Clips the segment to the rectangle [lo, hi] on both axes (Liang-Barsky); false when nothing
// is left.
bool Clip(double& x0, double& y0, double& x1, double& y1, double loX, double loY, double hiX,
          double hiY) {
    double t0 = 0.0, t1 = 1.0, dx = x1 - x0, dy = y1 - y0;
    auto edge = [&](double p, double q) {
        if (p == 0.0) return q >= 0.0;
        double r = q / p;
        if (p < 0.0) {
            if (r > t1) return false;
            t0 = std::max(t0, r);
        } else {
            if (r < t0) return false;
            t1 = std::min(t1, r);
        }
        return true;
    };
    if (!edge(-dx, x0 - loX) || !edge(dx, hiX - x0) || !edge(-dy, y0 - loY) || !edge(dy, hiY - y0))
        return false;
    x1 = x0 + t1 * dx;
    y1 = y0 + t1 * dy;
    x0 += t0 * dx;
    y0 += t0 * dy;
    return true;
}

template <class P>
void Draw(const PF_World& world, double x0, double y0, double x1, double y1,
          const PF_PixelFloat& color) {
    using Opacity = PF_XferOpacity<P>;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    const P source = Converted<P>(color);
    const PF_Xfer1OpacityFunc<P> blend = PF_Get_Xfer1_Opacity<P>(kPF_XferNormal);
    // Pixel centres at integers from here on.
    x0 -= 0.5, y0 -= 0.5, x1 -= 0.5, y1 -= 0.5;
    if (!Clip(x0, y0, x1, y1, -1.0, -1.0, world.width, world.height)) return;
    bool steep = std::fabs(y1 - y0) > std::fabs(x1 - x0);
    if (steep) std::swap(x0, y0), std::swap(x1, y1);
    if (x0 > x1) std::swap(x0, x1), std::swap(y0, y1);
    auto plot = [&](double major, double minor, double coverage) {
        auto px = static_cast<int32_t>(steep ? minor : major);
        auto py = static_cast<int32_t>(steep ? major : minor);
        if (px < 0 || py < 0 || px >= world.width || py >= world.height || coverage <= 0.0) return;
        Opacity opacity = static_cast<Opacity>(std::min(coverage, 1.0) * kMax +
                                               (PF_PixelTraits<P>::kIsFloat ? 0.0 : 0.5));
        blend(&source, nullptr, opacity, world.PixelAt<P>(px, py));
    };
    double dx = x1 - x0, gradient = dx > 0.0 ? (y1 - y0) / dx : 0.0;
    double first = std::floor(x0), last = std::floor(x1 + 1.0);
    for (double x = first; x <= last; x += 1.0) {
        // The share of this column the capped segment spans, and where it crosses the column.
        double span = std::min(x, x1) - std::max(x, x0) + 1.0;
        double y = y0 + gradient * (std::clamp(x, x0, x1) - x0);
        double below = std::floor(y), share = y - below;
        plot(x, below, span * (1.0 - share));
        plot(x, below + 1.0, span * share);
    }
}

}  // namespace

void PF_DrawLine(const PF_World& world, double x0, double y0, double x1, double y1,
                 const PF_PixelFloat& color) {
    if (!std::isfinite(x0) || !std::isfinite(y0) || !std::isfinite(x1) || !std::isfinite(y1))
        return;
    PF_DispatchBitDepth(world.bitDepth, [&]<class P>() { Draw<P>(world, x0, y0, x1, y1, color); });
}
