// Reading a world's pixels in tests whatever its depth.
#pragma once

#include <array>
#include <cstdint>

#include "pf_bit_depth.h"
#include "pf_world.h"

namespace ostrel {

// Alpha, red, green, blue, in the world's own units (up to 255, 32768 or 1.0).
using Channels = std::array<double, 4>;

inline Channels ChannelsAt(const PF_World& world, int32_t x, int32_t y) {
    return PF_DispatchBitDepth(world.bitDepth, [&]<class P>() {
        const P& p = *world.PixelAt<P>(x, y);
        return Channels{double(p.alpha), double(p.red), double(p.green), double(p.blue)};
    });
}

// How many pixels of the world are not exactly the colour.
inline int64_t PixelsOtherThan(const PF_World& world, const Channels& color) {
    int64_t count = 0;
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x)
            count += ChannelsAt(world, x, y) != color;
    }
    return count;
}

}  // namespace ostrel
