// The blend formulas of the transfer modes, on straight colour normalised to 0..1 (float
// pixels may lie outside). Backdrop cb, source cs, as the W3C compositing model writes them.
#pragma once

#include <algorithm>
#include <cmath>

namespace pf_blend {

enum Mode : int {
    kCopy = 0,
    kBehind = 1,
    kNormal = 2,
    kDissolve = 3,
    kAdd = 4,
    kMultiply = 5,
    kScreen = 6,
    kOverlay = 7,
    kSoftLight = 8,
    kHardLight = 9,
    kDarken = 10,
    kLighten = 11,
    kDifference = 12,
    kHue = 13,
    kSaturation = 14,
    kColor = 15,
    kLuminosity = 16,
    kStencilAlpha = 17,
    kStencilLuma = 18,
    kColorDodge = 19,
    kColorBurn = 20,
    kExclusion = 21,
    kSubtract = 22,
    kDivide = 23,
    kLinearDodge = 24,
    kLinearBurn = 25,
    kLinearLight = 26,
    kVividLight = 27,
    kPinLight = 28,
    kHardMix = 29,
    kLighterColor = 30,
    kDarkerColor = 31,
    kModeCount = 32
};

// Dissolve and the stencils need the whole layer stack; one pixel at a time they are normal,
// as is every number without a mode.
constexpr int CanonicalMode(int mode) {
    if (mode >= kModeCount || mode == kDissolve || mode == kStencilAlpha || mode == kStencilLuma)
        return kNormal;
    return mode;
}

constexpr bool IsNonSeparable(int mode) {
    return mode == kHue || mode == kSaturation || mode == kColor || mode == kLuminosity ||
           mode == kLighterColor || mode == kDarkerColor;
}

inline float ColorDodge(float cb, float cs) {
    if (cb <= 0.0f) return 0.0f;
    if (cs >= 1.0f) return 1.0f;
    return std::min(1.0f, cb / (1.0f - cs));
}

inline float ColorBurn(float cb, float cs) {
    if (cb >= 1.0f) return 1.0f;
    if (cs <= 0.0f) return 0.0f;
    return 1.0f - std::min(1.0f, (1.0f - cb) / cs);
}

inline float HardLight(float cb, float cs) {
    if (cs <= 0.5f) return cb * 2.0f * cs;
    float s = 2.0f * cs - 1.0f;
    return cb + s - cb * s;
}

inline float SoftLight(float cb, float cs) {
    if (cs <= 0.5f) return cb - (1.0f - 2.0f * cs) * cb * (1.0f - cb);
    float d = cb <= 0.25f ? ((16.0f * cb - 12.0f) * cb + 4.0f) * cb : std::sqrt(cb);
    return cb + (2.0f * cs - 1.0f) * (d - cb);
}

// Multiply and screen are blended on all lanes at once by the caller.
template <int kMode>
inline float Separable(float cb, float cs) {
    if constexpr (kMode == kNormal) return cs;
    if constexpr (kMode == kOverlay) return HardLight(cs, cb);
    if constexpr (kMode == kSoftLight) return SoftLight(cb, cs);
    if constexpr (kMode == kHardLight) return HardLight(cb, cs);
    if constexpr (kMode == kDarken) return std::min(cb, cs);
    if constexpr (kMode == kLighten) return std::max(cb, cs);
    if constexpr (kMode == kDifference) return std::fabs(cb - cs);
    if constexpr (kMode == kColorDodge) return ColorDodge(cb, cs);
    if constexpr (kMode == kColorBurn) return ColorBurn(cb, cs);
    if constexpr (kMode == kExclusion) return cb + cs - 2.0f * cb * cs;
    if constexpr (kMode == kSubtract) return std::max(0.0f, cb - cs);
    if constexpr (kMode == kDivide) {
        if (cs <= 0.0f) return cb <= 0.0f ? 0.0f : 1.0f;
        return std::min(1.0f, cb / cs);
    }
    if constexpr (kMode == kLinearDodge) return std::min(1.0f, cb + cs);
    if constexpr (kMode == kLinearBurn) return std::max(0.0f, cb + cs - 1.0f);
    if constexpr (kMode == kLinearLight) return std::clamp(cb + 2.0f * cs - 1.0f, 0.0f, 1.0f);
    if constexpr (kMode == kVividLight)
        return cs <= 0.5f ? ColorBurn(cb, 2.0f * cs) : ColorDodge(cb, 2.0f * cs - 1.0f);
    if constexpr (kMode == kPinLight)
        return cs <= 0.5f ? std::min(cb, 2.0f * cs) : std::max(cb, 2.0f * cs - 1.0f);
    if constexpr (kMode == kHardMix) return cb + cs >= 1.0f ? 1.0f : 0.0f;
}

struct Rgb {
    float r, g, b;
};

inline float Lum(Rgb c) {
    return 0.3f * c.r + 0.59f * c.g + 0.11f * c.b;
}

// Brings a colour whose luminosity was moved back into 0..1 along the grey axis.
inline Rgb ClipColor(Rgb c) {
    float l = Lum(c);
    float n = std::min({c.r, c.g, c.b});
    float x = std::max({c.r, c.g, c.b});
    auto towardGrey = [&](float v, float num, float den) { return l + (v - l) * num / den; };
    if (n < 0.0f)
        c = {towardGrey(c.r, l, l - n), towardGrey(c.g, l, l - n), towardGrey(c.b, l, l - n)};
    if (x > 1.0f) {
        c = {towardGrey(c.r, 1.0f - l, x - l), towardGrey(c.g, 1.0f - l, x - l),
             towardGrey(c.b, 1.0f - l, x - l)};
    }
    return c;
}

inline Rgb SetLum(Rgb c, float l) {
    float d = l - Lum(c);
    return ClipColor({c.r + d, c.g + d, c.b + d});
}

inline float Sat(Rgb c) {
    return std::max({c.r, c.g, c.b}) - std::min({c.r, c.g, c.b});
}

// Scales the colour's spread to s, keeping which channel is largest and smallest.
inline Rgb SetSat(Rgb c, float s) {
    float n = std::min({c.r, c.g, c.b});
    float x = std::max({c.r, c.g, c.b});
    if (x <= n) return {0.0f, 0.0f, 0.0f};
    auto scale = [&](float v) { return (v - n) * s / (x - n); };
    return {scale(c.r), scale(c.g), scale(c.b)};
}

template <int kMode>
inline Rgb NonSeparable(Rgb cb, Rgb cs) {
    if constexpr (kMode == kHue) return SetLum(SetSat(cs, Sat(cb)), Lum(cb));
    if constexpr (kMode == kSaturation) return SetLum(SetSat(cb, Sat(cs)), Lum(cb));
    if constexpr (kMode == kColor) return SetLum(cs, Lum(cb));
    if constexpr (kMode == kLuminosity) return SetLum(cb, Lum(cs));
    if constexpr (kMode == kLighterColor) return Lum(cs) > Lum(cb) ? cs : cb;
    if constexpr (kMode == kDarkerColor) return Lum(cs) < Lum(cb) ? cs : cb;
}

}  // namespace pf_blend
