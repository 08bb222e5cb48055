#include "output/background.h"

#include <cmath>

#include "pf_bit_depth.h"

namespace ostrel {
namespace {

template <class P>
void Composite(const PF_World& frame, const Color& background) {
    using Traits = PF_PixelTraits<P>;
    using Channel = typename Traits::Channel;
    // The background in the frame's levels, as the frame's own channels would hold it.
    Channel under[3];
    for (int i = 0; i < 3; ++i) {
        under[i] = static_cast<Channel>(
            Traits::kIsFloat ? background[i] : std::lround(background[i] * Traits::kMax));
    }
    for (int32_t y = 0; y < frame.height; ++y) {
        P* pixel = frame.Row<P>(y);
        for (int32_t x = 0; x < frame.width; ++x, ++pixel) {
            Channel* over[3] = {&pixel->red, &pixel->green, &pixel->blue};
            if constexpr (Traits::kIsFloat) {
                for (int i = 0; i < 3; ++i)
                    *over[i] = *over[i] * pixel->alpha + under[i] * (1.0f - pixel->alpha);
            } else {
                // Integer levels: alpha and colour are at most kMaxInt, so the sums fit 32 bits.
                uint32_t alpha = pixel->alpha, rest = Traits::kMaxInt - alpha;
                for (int i = 0; i < 3; ++i) {
                    *over[i] = static_cast<Channel>(
                        (*over[i] * alpha + under[i] * rest + Traits::kMaxInt / 2) /
                        Traits::kMaxInt);
                }
            }
            pixel->alpha = static_cast<Channel>(Traits::kMaxInt);
        }
    }
}

}  // namespace

void CompositeOverBackground(const PF_World& frame, const Color& background) {
    PF_DispatchBitDepth(frame.bitDepth, [&]<class P>() { Composite<P>(frame, background); });
}

}  // namespace ostrel
