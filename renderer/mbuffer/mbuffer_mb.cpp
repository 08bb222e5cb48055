#include <algorithm>
#include <cmath>
#include <cstdint>

#include "renderer/mbuffer/group_resolve.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/region_resolve.h"
#include "renderer/mbuffer/shutter_split.h"

namespace {

// Records meet where their planes cross inside the pixel and the shutter. A run of three or
// more is split into regions afresh at each instant it is composited at, and the composites
// are integrated over the shutter.
template <class F>
class ShutterGeometry {
public:
    using Pixel = typename F::Pixel;

    // One allocation besides the regions'.
    ShutterGeometry() { times_.reserve(32); }

    static bool Cross(const F& a, const F& b) { return SY_CrossInsideCube(Differences(a, b)); }
    static float ShareInFront(const F& a, const F& b) {
        return SY_ShareInFrontOverShutter(Differences(a, b));
    }

    void ResolveRun(F* const* run, int32_t count, const PF_LinearBlendingTables* tables,
                    Pixel* pixel) {
        run_ = run;
        count_ = count;
        tables_ = tables;
        before_ = *pixel;
        const float travel = run[0]->dzdt;
        if (std::all_of(run, run + count, [travel](const F* r) { return r->dzdt == travel; })) {
            // The order never changes: one instant tells it all.
            SY_WriteAccumulated(Sample(0).c, pixel);
            return;
        }
        // A record can show up in front of another one, or vanish behind it, only where the two
        // start or stop crossing inside the pixel; in between, the composite follows the
        // regions' areas, which the adaptive rule can trust.
        times_.clear();
        for (int32_t i = 0; i < count; ++i) {
            for (int32_t j = i + 1; j < count; ++j)
                Differences(*run[i], *run[j]).AppendCrossingEnds(&times_);
        }
        std::sort(times_.begin(), times_.end());
        times_.push_back(1.0);
        Sums total;
        double start = 0;
        for (const double t : times_) {
            if (t < 1 && t - start < kFinest) continue;
            Integrate(start, t - start, &total);
            start = t;
        }
        SY_WriteAccumulated(total.c, pixel);
    }

private:
    // Alpha, red, green, blue of a composite, weighted by area (and time, once integrated).
    struct Sums {
        float c[4] = {};
    };

    // Segments of the shutter this long or shorter are not split further.
    static constexpr double kFinest = 1.0 / 64;
    // Composites that agree this closely, 4 % of full scale, need no finer instants.
    static constexpr float kTolerance = 0.04f * PF_PixelTraits<Pixel>::kMax;

    static SY_CubeDifferences Differences(const F& a, const F& b) {
        return {SY_MotionPlaneOf(a), SY_MotionPlaneOf(b)};
    }

    // The run composited onto the pixel as it was before it, with the records where they are
    // at shutter time t.
    Sums Sample(double t) {
        regions_.Split(run_, count_, [t](const F& r) { return SY_MotionPlaneOf(r).At(t); });
        SY_RegionAccumulator<Pixel> sum(before_, tables_);
        regions_.AddRegionsTo(&sum);
        Sums sums;
        std::copy_n(sum.Sums(), 4, sums.c);
        return sums;
    }

    // Adds the integral over [t, t + d] to *total: from its two Gauss points where they agree
    // within the tolerance, else by halves.
    void Integrate(double t, double d, Sums* total) {
        const Sums a = Sample(t + (0.5 - kSY_GaussOffset) * d);
        const Sums b = Sample(t + (0.5 + kSY_GaussOffset) * d);
        bool agree = true;
        for (int32_t k = 0; k < 4; ++k)
            agree = agree && std::fabs(a.c[k] - b.c[k]) < kTolerance;
        if (agree || d <= kFinest) {
            const auto w = static_cast<float>(0.5 * d);
            for (int32_t k = 0; k < 4; ++k)
                total->c[k] += w * (a.c[k] + b.c[k]);
            return;
        }
        Integrate(t, 0.5 * d, total);
        Integrate(t + 0.5 * d, 0.5 * d, total);
    }

    SY_RegionResolver<F> regions_;
    SY_AccountedVector<double> times_;
    // The run being resolved.
    F* const* run_ = nullptr;
    int32_t count_ = 0;
    const PF_LinearBlendingTables* tables_ = nullptr;
    Pixel before_{};
};

}  // namespace

template <class P>
void SY_MBufferMBX<P>::Resolve(SY_ProgressAbort* progress,
                               const PF_LinearBlendingTables* blendTables, PF_World& destination) {
    SY_ResolveSplitting<ShutterGeometry<Record>>(*this, progress, blendTables, destination);
}

template class SY_MBufferMBX<PF_Pixel8>;
template class SY_MBufferMBX<PF_Pixel16>;
template class SY_MBufferMBX<PF_PixelFloat>;
