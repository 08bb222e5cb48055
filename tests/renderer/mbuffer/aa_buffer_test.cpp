#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>

#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/pixel_split.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

using Buffer = SY_MBufferAAX<PF_PixelFloat>;

// Plane z(u, v) = z00 + dzdx·u + dzdy·v over the pixel square, stored the way the spans store
// it: its minimum over the square as the key.
void Add(Buffer* buffer, int32_t x, const PF_PixelFloat& color, double z00, double dzdx,
         double dzdy, int32_t mode = 2) {
    const double lowest = z00 + std::min(0.0, dzdx) + std::min(0.0, dzdy);
    buffer->AddFragment(&color, 1.0f, mode, float(lowest), float(dzdx), float(dzdy),
                        buffer->HeadAt(x, 0), 0);
}

// The share of the pixel in which B (later) is in front of A. Lines through the pixel: the
// diagonal from (0, 1) to (1, 0) and the one through (0, 0) both halve it; a line cutting
// legs of 0.5 off corner (0, 0), with B in front there, leaves B 0.5² / 2.
TEST(MBufferAA, PairRuleSharesThePixelByArea) {
    const struct {
        SY_DepthPlane a, b;
        float share;
    } cases[] = {
        {{0, 0, 0}, {1, -1, -1}, 0.5f},          // B − A = 1 − u − v
        {{0, 0, 0}, {0, 1, -1}, 0.5f},           // u − v: through corner (0, 0)
        {{0, 0, 0}, {0.5, -1, -1}, 0.125f},      // 0.5 − u − v
        {{5, 1, 0}, {5, 1, 0}, kSY_NoCrossing},  // one plane: list order
        {{0, 0, 0}, {1, 0.5, 0}, kSY_NoCrossing},
        {{0, 0, 0}, {0, -1, 0}, 0.0f},  // level at u = 0 only: A in front
    };
    for (const auto& c : cases)
        EXPECT_EQ(SY_ShareInFront(SY_DifferenceAtCorners(c.a, c.b)), c.share) << &c - cases;
}

// Colour red where A shows and blue where B does, on clear ground, at 256² sample points.
template <class Visible>
PF_PixelFloat Supersampled(Visible visible) {
    constexpr int32_t kSide = 256;
    PF_PixelFloat sum{1, 0, 0, 0};
    for (int32_t i = 0; i < kSide * kSide; ++i) {
        const int32_t shown = visible((i % kSide + 0.5) / kSide, (i / kSide + 0.5) / kSide);
        (shown == 0 ? sum.red : shown == 1 ? sum.green : sum.blue) += 1.0f / (kSide * kSide);
    }
    return sum;
}

// Along a line at a shallow angle (B − A = 4 − x/8 − (u + v/4)/8... per pixel x of a row) each
// pixel takes the mix of the area where B is in front, against a count over 256² points,
// which lies within a line's length / 256 of the area.
TEST(MBufferAA, ShallowCrossingRampsAlongTheLine) {
    renderer_test::AccountedBytesCheck memory;
    constexpr int32_t kPixels = 40;
    Buffer buffer({0, 0, kPixels, 1});
    PF_WorldX<PF_PixelFloat> world(kPixels, 1);
    for (int32_t x = 0; x < kPixels; ++x) {
        Add(&buffer, x, {1, 1, 0, 0}, 0, 0, 0);
        Add(&buffer, x, {1, 0, 0, 1}, 2.5 - x / 8.0, -1 / 8.0, 1.0);
    }
    buffer.Resolve(nullptr, nullptr, world);
    for (int32_t x = 0; x < kPixels; ++x) {
        const PF_PixelFloat want =
            Supersampled([x](double u, double v) { return 2.5 - (x + u) / 8.0 + v > 0 ? 2 : 0; });
        EXPECT_NEAR(world.At(x, 0).blue, want.blue, 1.5 / 256) << x;
        EXPECT_NEAR(world.At(x, 0).red + world.At(x, 0).blue, 1.0f, 1e-6f) << x;
    }
}

// Three opaque layers meeting in one pixel, each in front in part of it: the region split
// gives each its area, against the visible one at 256² points.
TEST(MBufferAA, ThreeLayersShareOnePixel) {
    renderer_test::AccountedBytesCheck memory;
    const double planes[3][3] = {{0.2, 0.6, -0.3}, {0.5, -0.7, 0.1}, {0.1, 0.2, 0.4}};
    const PF_PixelFloat colors[3] = {{1, 1, 0, 0}, {1, 0, 1, 0}, {1, 0, 0, 1}};
    Buffer buffer({0, 0, 1, 1});
    PF_WorldX<PF_PixelFloat> world(1, 1);
    for (int32_t k = 0; k < 3; ++k)
        Add(&buffer, 0, colors[k], planes[k][0], planes[k][1], planes[k][2]);
    buffer.Resolve(nullptr, nullptr, world);
    const PF_PixelFloat want = Supersampled([&](double u, double v) {
        int32_t front = 0;
        for (int32_t k = 1; k < 3; ++k) {
            auto z = [&](int32_t i) { return planes[i][0] + planes[i][1] * u + planes[i][2] * v; };
            if (z(k) > z(front)) front = k;
        }
        return front;
    });
    EXPECT_GT(std::min({want.red, want.green, want.blue}), 0.1f);
    const PF_PixelFloat& got = world.At(0, 0);
    EXPECT_NEAR(got.red, want.red, 3.0 / 256);
    EXPECT_NEAR(got.green, want.green, 3.0 / 256);
    EXPECT_NEAR(got.blue, want.blue, 3.0 / 256);
}

// Half-alpha red A and opaque blue B keeping the alpha beneath cross on the diagonal over
// clear ground. A in front: B leaves alpha 0, A brings red at 0.5. B in front: A's red at 0.5
// turns blue, alpha kept. Halfway: alpha 0.5, red and blue 0.5 (1, 0.25, 0, 0.75 if B's bit
// were lost).
TEST(MBufferAA, KeptAlphaHoldsInsideACrossing) {
    Buffer buffer({0, 0, 1, 1});
    PF_WorldX<PF_PixelFloat> world(1, 1);
    Add(&buffer, 0, {0.5f, 1, 0, 0}, 0, 0, 0);
    Add(&buffer, 0, {1, 0, 0, 1}, 1, -1, -1, 2 | 128);
    buffer.Resolve(nullptr, nullptr, world);
    EXPECT_EQ(renderer_test::Channels(world.At(0, 0)),
              renderer_test::Channels(PF_PixelFloat{0.5f, 0.5f, 0, 0.5f}));
}

}  // namespace
