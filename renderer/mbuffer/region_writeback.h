// Writing back a pixel that was split into regions: each region composited on its own from
// the pixel as it was, the results summed by area, and the sum rounded into the pixel.
#pragma once

#include <cstdint>

#include "pf_xfer.h"
#include "renderer/mbuffer/channel_math.h"
#include "renderer/mbuffer/record_apply.h"

// The pixel from weighted sums of alpha, red, green and blue; with no alpha summed,
// transparent black whatever it held.
template <class P>
void SY_WriteAccumulated(const float sum[4], P* d) {
    if (sum[0] == 0.0f) {
        *d = P{};
        return;
    }
    using M = SY_ChannelMath<P>;
    *d = {M::AlphaFromSum(sum[0]), M::ColorFromSum(sum[1]), M::ColorFromSum(sum[2]),
          M::ColorFromSum(sum[3])};
}

template <class P>
class SY_RegionAccumulator {
public:
    // before: the pixel as it stood before the group; tables: the frame's blending tables.
    SY_RegionAccumulator(const P& before, const PF_LinearBlendingTables* tables)
        : before_(before), applier_(tables) {}

    // A region of the pixel of area `weight`, showing `count` records listed front to back.
    // Regions that weigh nothing or composite to zero alpha add nothing.
    template <class F>
    void AddRegion(double weight, const F* const* frontToBack, int32_t count) {
        if (weight == 0.0) return;
        P composite = before_;
        for (int32_t i = count - 1; i >= 0; --i)
            applier_.Apply(*frontToBack[i], &composite);
        if (composite.alpha == 0) return;
        const auto w = static_cast<float>(weight);
        sum_[0] += w * static_cast<float>(composite.alpha);
        sum_[1] += w * static_cast<float>(composite.red);
        sum_[2] += w * static_cast<float>(composite.green);
        sum_[3] += w * static_cast<float>(composite.blue);
    }

    // Alpha, red, green, blue: area-weighted straight values.
    const float* Sums() const { return sum_; }

    void WriteTo(P* d) const { SY_WriteAccumulated(sum_, d); }

private:
    P before_;
    SY_RecordApplier<P> applier_;
    float sum_[4] = {};
};
