// Helpers shared by the pixel library's tests: worlds filled from a seed, and channel values
// in unit range so that one expectation serves all three depths.
#pragma once

#include <cstdint>
#include <random>

#include "pf_pixel.h"
#include "pf_world.h"

namespace pixel_test {

template <class P>
P FromUnit(float a, float r, float g, float b) {
    using Traits = PF_PixelTraits<P>;
    using C = typename Traits::Channel;
    auto c = [](float v) { return static_cast<C>(Traits::kIsFloat ? v : v * Traits::kMax + 0.5f); };
    return {c(a), c(r), c(g), c(b)};
}

template <class P>
double Unit(typename PF_PixelTraits<P>::Channel c) {
    return c / static_cast<double>(PF_PixelTraits<P>::kMax);
}

// One channel step of the depth in unit range (float: a small tolerance).
template <class P>
double Step() {
    return PF_PixelTraits<P>::kIsFloat ? 1e-5 : 1.0 / PF_PixelTraits<P>::kMax;
}

template <class P>
void FillRandom(PF_WorldX<P>& world, uint32_t seed, bool someTransparent = true) {
    std::mt19937 random(seed);
    std::uniform_real_distribution<float> unit(0.0f, 1.0f);
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x) {
            float a = someTransparent && unit(random) < 0.2f ? 0.0f : unit(random);
            world.At(x, y) = FromUnit<P>(a, unit(random), unit(random), unit(random));
        }
    }
}

}  // namespace pixel_test
