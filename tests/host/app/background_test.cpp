#include "output/background.h"

#include <gtest/gtest.h>

namespace ostrel {
namespace {

// Three pixels over a background of red 0.5, green 0, blue 1: transparent, partly opaque, and
// opaque. Each depth gives the expected levels of its red channel.
template <class P>
void ExpectComposited(P partial, double expectedRed) {
    using Traits = PF_PixelTraits<P>;
    const auto kMax = static_cast<typename Traits::Channel>(Traits::kMaxInt);
    P pixels[3] = {{0, kMax, kMax, kMax}, partial, {kMax, kMax, 0, 0}};
    PF_World frame(3, 1, sizeof pixels, Traits::kBitDepth, pixels);
    CompositeOverBackground(frame, {0.5, 0.0, 1.0});
    // 127.5 rounds to 128 in 8 bits.
    const double kHalf = Traits::kIsFloat ? 0.5 : (Traits::kMaxInt + 1) / 2;
    EXPECT_EQ(pixels[0].red, static_cast<typename Traits::Channel>(kHalf));
    EXPECT_EQ(pixels[0].blue, kMax);
    EXPECT_EQ(pixels[1].red, static_cast<typename Traits::Channel>(expectedRed));
    EXPECT_EQ(pixels[2].red, kMax);
    EXPECT_EQ(pixels[2].blue, 0);
    for (const P& p : pixels)
        EXPECT_EQ(p.alpha, kMax);
}

TEST(Background, FrameIsCompositedOverTheCompColor) {
    // (2 · 128 + 128 · 127) / 255 = 64.75; 32768 · 0.25 + 16384 · 0.75 = 20480; 0.25 + 0.5 · 0.75.
    ExpectComposited<PF_Pixel8>({128, 2, 0, 0}, 65);
    ExpectComposited<PF_Pixel16>({8192, 32768, 0, 0}, 20480);
    ExpectComposited<PF_PixelFloat>({0.25f, 1.0f, 0, 0}, 0.625);
}

}  // namespace
}  // namespace ostrel
