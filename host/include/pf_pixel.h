// Pixel types of the host's pixel library and the traits that let one template serve all three.
#pragma once

#include <cstdint>

// Channels are stored alpha first; colour is straight (not premultiplied).
struct PF_Pixel8 {
    uint8_t alpha, red, green, blue;
};

// 16-bit channels run from 0 to 32768 so that products scale by a shift of 15.
struct PF_Pixel16 {
    uint16_t alpha, red, green, blue;
};

// Float channels are nominally 0..1; colour may run above 1.
struct PF_PixelFloat {
    float alpha, red, green, blue;
};

// Double channels, for sums that must not lose precision.
struct PF_PixelDouble {
    double alpha, red, green, blue;
};

// What differs between the three pixel types, for templates written once over them.
template <class P>
struct PF_PixelTraits;

template <>
struct PF_PixelTraits<PF_Pixel8> {
    using Channel = uint8_t;
    static constexpr int16_t kBitDepth = 8;
    static constexpr bool kIsFloat = false;
    static constexpr float kMax = 255.0f;
    static constexpr uint32_t kMaxInt = 255;
};

template <>
struct PF_PixelTraits<PF_Pixel16> {
    using Channel = uint16_t;
    static constexpr int16_t kBitDepth = 16;
    static constexpr bool kIsFloat = false;
    static constexpr float kMax = 32768.0f;
    static constexpr uint32_t kMaxInt = 32768;
};

template <>
struct PF_PixelTraits<PF_PixelFloat> {
    using Channel = float;
    static constexpr int16_t kBitDepth = 32;
    static constexpr bool kIsFloat = true;
    static constexpr float kMax = 1.0f;
    static constexpr uint32_t kMaxInt = 1;
};

// Product of two 16-bit channel values, rounded, in the 0..32768 range.
constexpr uint32_t PF_Mul16(uint32_t a, uint32_t b) {
    return (a * b + 16383) >> 15;
}

// The host's exact conversions between depths: 255 maps to 32768 and 1.0f to 32768.
constexpr uint16_t PF_8To16(uint32_t c) {
    return static_cast<uint16_t>((c * 0x808080u + 33200u) >> 16);
}
constexpr uint16_t PF_FloatTo16(float c) {
    return static_cast<uint16_t>(c * 32768.0f + 0.5f);
}
