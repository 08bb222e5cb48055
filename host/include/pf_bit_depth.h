// The one place where a bit depth known only at run time becomes a pixel type.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

#include "pf_pixel.h"

// A depth other than 8, 16 or 32 where pixels of one of the three types were expected.
class PF_UnexpectedBitDepth : public std::invalid_argument {
public:
    explicit PF_UnexpectedBitDepth(int32_t bitDepth)
        : std::invalid_argument("a bit depth of " + std::to_string(bitDepth) +
                                " (expected 8, 16 or 32)") {}
};

// The host's own answer to an unknown depth.
struct PF_ThrowUnexpectedBitDepth {
    [[noreturn]] void operator()(int32_t bitDepth) const { throw PF_UnexpectedBitDepth(bitDepth); }
};

// Runs body.template operator()<P>() with P the pixel type of bitDepth (8: PF_Pixel8,
// 16: PF_Pixel16, 32: PF_PixelFloat) and returns its result, so that a routine written once as
// a template is chosen once per call, not per pixel:
//     PF_DispatchBitDepth(world.bitDepth, [&]<class P>() { Fill<P>(world); });
// An unknown depth is never taken for one of the three: unknown(bitDepth) is called, and it
// throws. Plug-in and renderer code pass U_BitDepthVerification (u_report.h), which reports the
// failed check and throws the error code.
template <class Body, class Unknown = PF_ThrowUnexpectedBitDepth>
decltype(auto) PF_DispatchBitDepth(int32_t bitDepth, Body&& body, Unknown unknown = {}) {
    switch (bitDepth) {
        case PF_PixelTraits<PF_Pixel8>::kBitDepth:
            return body.template operator()<PF_Pixel8>();
        case PF_PixelTraits<PF_Pixel16>::kBitDepth:
            return body.template operator()<PF_Pixel16>();
        case PF_PixelTraits<PF_PixelFloat>::kBitDepth:
            return body.template operator()<PF_PixelFloat>();
        default:
            unknown(bitDepth);
    }
}
