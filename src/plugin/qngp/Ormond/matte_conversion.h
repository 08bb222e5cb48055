// Turning a rendered track-matte layer into an alpha matte, in place, at any of the three depths.
#pragma once

#include <cstdint>

#include "pf_pixel.h"
#include "pf_world.h"
#include "qngp_suites.h"

// How a layer uses its matte layer: the host's track matte types but none.
enum class ORM_MatteType : int32_t {
    kAlpha = kQNGP_TrackMatteAlpha,
    kInvertedAlpha = kQNGP_TrackMatteInvertedAlpha,
    kLuma = kQNGP_TrackMatteLuma,
    kInvertedLuma = kQNGP_TrackMatteInvertedLuma,
};

// Luma with weights summing to 32768 (0.299, 0.587, 0.114), truncated: white gives the maximum.
template <class P>
constexpr uint32_t ORM_IntegerLuma(const P& p) {
    return (9798u * p.red + 19235u * p.green + 3735u * p.blue + 16384u) >> 15;
}

// The matte value of luma times alpha at each depth.
template <class P>
struct ORM_LumaMatte;

template <>
struct ORM_LumaMatte<PF_Pixel8> {
    // t / 255 rounded to nearest, without a division.
    static uint8_t Of(const PF_Pixel8& p) {
        uint32_t t = p.alpha * ORM_IntegerLuma(p) + 128;
        return static_cast<uint8_t>((t + (t >> 8)) >> 8);
    }
};

template <>
struct ORM_LumaMatte<PF_Pixel16> {
    static uint16_t Of(const PF_Pixel16& p) {
        return static_cast<uint16_t>((p.alpha * ORM_IntegerLuma(p) + 16383u) >> 15);
    }
};

template <>
struct ORM_LumaMatte<PF_PixelFloat> {
    // Products this small are taken as no matte at all, so that a black matte clears exactly.
    static constexpr float kSmallest = 1e-16f;
    static float Of(const PF_PixelFloat& p) {
        float v = (0.299f * p.red + 0.587f * p.green + 0.114f * p.blue) * p.alpha;
        return v > 1.0f ? 1.0f : v < kSmallest ? 0.0f : v;
    }
};

template <class P, class Matte>
void ORM_ReplaceAlpha(const PF_World& world, Matte matte) {
    for (int32_t y = 0; y < world.height; ++y) {
        P* row = world.Row<P>(y);
        for (int32_t x = 0; x < world.width; ++x)
            row[x].alpha = matte(row[x]);
    }
}

// Replaces every pixel's alpha by the matte its type reads; colour stays. The inverted forms are
// the maximum less the plain ones (for float the clamp commutes with the inversion).
template <class P>
void ORM_ConvertMatte(const PF_World& world, ORM_MatteType type) {
    using Channel = typename PF_PixelTraits<P>::Channel;
    constexpr auto kMax = static_cast<Channel>(PF_PixelTraits<P>::kMax);
    switch (type) {
        case ORM_MatteType::kAlpha:
            break;
        case ORM_MatteType::kInvertedAlpha:
            ORM_ReplaceAlpha<P>(world,
                                [](const P& p) { return static_cast<Channel>(kMax - p.alpha); });
            break;
        case ORM_MatteType::kLuma:
            ORM_ReplaceAlpha<P>(world, [](const P& p) { return ORM_LumaMatte<P>::Of(p); });
            break;
        case ORM_MatteType::kInvertedLuma:
            ORM_ReplaceAlpha<P>(world, [](const P& p) {
                return static_cast<Channel>(kMax - ORM_LumaMatte<P>::Of(p));
            });
            break;
    }
}
