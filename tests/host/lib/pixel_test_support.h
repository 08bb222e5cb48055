// Helpers shared by the pixel library's tests: worlds filled from a seed, a fifth of them clear,
// channel values in unit range so that one expectation serves all three depths, and a brute-force
// box average.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <random>
#include <string>

#include <gtest/gtest.h>

#include "pf_pixel.h"
#include "pf_world.h"

namespace pixel_test {

// Alpha, red, green and blue in unit range.
using Argb = std::array<double, 4>;

template <class P>
double Unit(typename PF_PixelTraits<P>::Channel c) {
    return c / static_cast<double>(PF_PixelTraits<P>::kMax);
}

template <class P>
P FromUnit(const Argb& v) {
    using Traits = PF_PixelTraits<P>;
    using C = typename Traits::Channel;
    auto c = [](double u) { return static_cast<C>(Traits::kIsFloat ? u : u * Traits::kMax + 0.5); };
    return {c(v[0]), c(v[1]), c(v[2]), c(v[3])};
}

template <class P>
Argb Channels(const P& p) {
    return {Unit<P>(p.alpha), Unit<P>(p.red), Unit<P>(p.green), Unit<P>(p.blue)};
}

// One channel step of the depth in unit range (float: a small tolerance).
template <class P>
double Step() {
    return PF_PixelTraits<P>::kIsFloat ? 1e-5 : 1.0 / PF_PixelTraits<P>::kMax;
}

template <class P>
void FillRandom(PF_WorldX<P>& world, uint32_t seed) {
    std::mt19937 random(seed);
    std::uniform_real_distribution<float> unit(0.0f, 1.0f);
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x) {
            float a = unit(random) < 0.2f ? 0.0f : unit(random);
            world.At(x, y) = FromUnit<P>({a, unit(random), unit(random), unit(random)});
        }
    }
}

// The exact average over the box [x0, x1] × [y0, y1], pixel (i, j) covering [i, i + 1) ×
// [j, j + 1) and weighted by the share of it inside; alpha over the box's area, straight colour
// from premultiplied sums. Clear when nothing is covered.
template <class P>
Argb BoxAverage(const PF_WorldX<P>& world, double x0, double y0, double x1, double y1) {
    double sum[4] = {0, 0, 0, 0};
    for (int32_t j = 0; j < world.height; ++j) {
        double wy = std::max(0.0, std::min(y1, j + 1.0) - std::max(y0, double(j)));
        for (int32_t i = 0; i < world.width; ++i) {
            double wx = std::max(0.0, std::min(x1, i + 1.0) - std::max(x0, double(i)));
            const Argb p = Channels(world.At(i, j));
            for (int c = 0; c < 4; ++c)
                sum[c] += p[0] * wx * wy * (c ? p[c] : 1.0);
        }
    }
    if (sum[0] <= 0) return {0, 0, 0, 0};
    return {sum[0] / ((x1 - x0) * (y1 - y0)), sum[1] / sum[0], sum[2] / sum[0], sum[3] / sum[0]};
}

// Alpha, red, green and blue each within the tolerance, in unit range.
template <class P>
void ExpectChannels(const P& got, const Argb& want, double tolerance, const std::string& what) {
    const Argb channels = Channels(got);
    for (int c = 0; c < 4; ++c)
        EXPECT_NEAR(channels[c], want[c], tolerance) << what << ", channel " << c;
}

}  // namespace pixel_test
