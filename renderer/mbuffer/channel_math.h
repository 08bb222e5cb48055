// Channel arithmetic that differs by pixel type: folding coverage into alpha, mixing two
// results by a fraction, and rounding accumulated float channels back into the pixel.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>

#include "pf_pixel.h"

template <class P>
struct SY_ChannelMath;

// Coverage comes in the channel's own range: 0..255, 0..32768 or 0..1.
template <class P>
using SY_Coverage = typename PF_PixelTraits<P>::Channel;

// x / 255 rounded to nearest for x in −255² .. 255², exact also for negative x.
constexpr int32_t SY_DivideBy255Rounded(int32_t t) {
    return (t + ((t + 128) >> 8) + 128) >> 8;
}

// Integer channels write accumulated values rounded to nearest; only out-of-range sums, which
// weights adding up to one cannot produce, are held to the channel type.
template <class C>
C SY_RoundAccumulated(float value) {
    float rounded = std::trunc(value + 0.5f);
    return static_cast<C>(std::clamp(rounded, 0.0f, float(std::numeric_limits<C>::max())));
}

template <>
struct SY_ChannelMath<PF_Pixel8> {
    static uint8_t ScaleByCoverage(uint8_t alpha, uint8_t coverage) {
        return static_cast<uint8_t>(SY_DivideBy255Rounded(int32_t{alpha} * coverage));
    }
    // from + (to − from) × f with f in 255ths, so that f = 1 gives `to` exactly.
    static uint8_t Mix(uint8_t from, uint8_t to, float f) {
        auto w = static_cast<int32_t>(255.0f * f);
        return static_cast<uint8_t>(from + SY_DivideBy255Rounded((int32_t{to} - from) * w));
    }
    static uint8_t AlphaFromSum(float sum) { return SY_RoundAccumulated<uint8_t>(sum); }
    static uint8_t ColorFromSum(float sum) { return SY_RoundAccumulated<uint8_t>(sum); }
};

template <>
struct SY_ChannelMath<PF_Pixel16> {
    static uint16_t ScaleByCoverage(uint16_t alpha, uint16_t coverage) {
        return static_cast<uint16_t>((uint32_t{alpha} * coverage + 16383) >> 15);
    }
    // f in 32768ths; the difference is floored (arithmetic shift).
    static uint16_t Mix(uint16_t from, uint16_t to, float f) {
        auto w = static_cast<int32_t>(32768.0f * f);
        return static_cast<uint16_t>(from + (((int32_t{to} - from) * w) >> 15));
    }
    static uint16_t AlphaFromSum(float sum) { return SY_RoundAccumulated<uint16_t>(sum); }
    static uint16_t ColorFromSum(float sum) { return SY_RoundAccumulated<uint16_t>(sum); }
};

template <>
struct SY_ChannelMath<PF_PixelFloat> {
    static float ScaleByCoverage(float alpha, float coverage) { return alpha * coverage; }
    // Exact at both ends, which from + (to − from) × f is not in floating point.
    static float Mix(float from, float to, float f) { return std::lerp(from, to, f); }
    // Alpha a hair above one from summing weights is one; a vanishing alpha is none.
    static float AlphaFromSum(float sum) {
        if (sum > 1.0f) return 1.0f;
        return sum < 1e-16f ? 0.0f : sum;
    }
    static float ColorFromSum(float sum) { return sum; }
};
