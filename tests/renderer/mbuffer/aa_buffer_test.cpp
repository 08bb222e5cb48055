#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <numeric>

#include "renderer/mbuffer/mbuffer.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

// Three opaque layers over a row, at X = x + u and Y = v: red z = 0, green
// z = −(X − 20) / 8 + Y, blue z = (X − 24.5) / 2 + (Y − 0.5625). Green crosses red at a
// shallow angle over eight pixels, starting from corner (0, 0) of pixel 20, and all three
// meet inside pixel 24. Each pixel shows each layer by the area it is in front in, against a
// count at 256² points, which is off by at most the length of the lines in the pixel / 256.
TEST(MBufferAA, CrossingLayersShareEachPixelByArea) {
    constexpr int32_t kPixels = 40, kSide = 256;
    const double planes[3][3] = {{0, 0, 0}, {2.5, -0.125, 1}, {-12.8125, 0.5, 1}};  // z at 0, 0
    SY_MBufferAAX<PF_PixelFloat> buffer({0, 0, kPixels, 1});
    PF_WorldX<PF_PixelFloat> world(kPixels, 1);
    for (int32_t x = 0; x < kPixels; ++x) {
        for (int32_t k = 0; k < 3; ++k) {
            const PF_PixelFloat color{1, float(k == 0), float(k == 1), float(k == 2)};
            const auto [z, dzdx, dzdy] = planes[k];
            const double lowest = z + dzdx * x + std::min(0.0, dzdx) + std::min(0.0, dzdy);
            buffer.AddFragment(&color, 1.0f, 2, float(lowest), float(dzdx), float(dzdy),
                               buffer.HeadAt(x, 0), 0);
        }
    }
    buffer.Resolve(nullptr, nullptr, world);
    for (int32_t x = 0; x < kPixels; ++x) {
        double want[3] = {};
        for (int32_t i = 0; i < kSide * kSide; ++i) {
            const double at[3] = {1, x + (i % kSide + 0.5) / kSide, (i / kSide + 0.5) / kSide};
            auto z = [&](int32_t k) { return std::inner_product(at, at + 3, planes[k], 0.0); };
            want[z(1) > z(0) && z(1) > z(2) ? 1 : z(2) > z(0) ? 2 : 0] += 1.0 / (kSide * kSide);
        }
        const PF_PixelFloat& got = world.At(x, 0);
        EXPECT_NEAR(got.red, want[0], 4.0 / kSide) << x;
        EXPECT_NEAR(got.green, want[1], 4.0 / kSide) << x;
        EXPECT_NEAR(got.blue, want[2], 4.0 / kSide) << x;
    }
    const PF_PixelFloat& meeting = world.At(24, 0);
    EXPECT_GT(std::min({meeting.red, meeting.green, meeting.blue}), 0.04f);
}

// Five half-transparent layers turned about one vertical line through the pixel's centre
// (z = s · (X − 0.5) + t · (Y − 0.5)): every pair crosses inside the pixel, so a new layer
// lands in the middle of lists already cut many times. At each of 256² points a layer with n
// layers in front shows by 0.5ⁿ⁺¹ of its red, over an alpha of 1 − 0.5⁵; the area average may
// differ by the lines' length / 256.
TEST(MBufferAA, ManyLayersCrossingInOnePixel) {
    constexpr int32_t kLayers = 5, kSide = 256;
    const float slope[kLayers][2] = {{-3, .2f}, {-1, -.1f}, {-.5f, .05f}, {.5f, .3f}, {2, 0}};
    SY_MBufferAAX<PF_PixelFloat> buffer({0, 0, 1, 1});
    PF_PixelFloat color[kLayers];
    for (int32_t k = 0; k < kLayers; ++k) {
        color[k] = {0.5f, k / 4.0f, 0, 0};
        const float key = -0.5f * (std::fabs(slope[k][0]) + std::fabs(slope[k][1]));  // lowest z
        buffer.AddFragment(&color[k], 1.0f, 2, key, slope[k][0], slope[k][1], buffer.HeadAt(0, 0),
                           0);
    }
    PF_WorldX<PF_PixelFloat> world(1, 1);
    buffer.Resolve(nullptr, nullptr, world);
    double want = 0;
    for (int32_t i = 0; i < kSide * kSide; ++i) {
        const double u = (i % kSide + 0.5) / kSide - 0.5, v = (i / kSide + 0.5) / kSide - 0.5;
        auto z = [&](int32_t k) { return slope[k][0] * u + slope[k][1] * v; };
        for (int32_t k = 0; k < kLayers; ++k) {
            double share = 0.5 / (kSide * kSide * (31.0 / 32));
            for (int32_t j = 0; j < kLayers; ++j)
                share *= z(j) > z(k) ? 0.5 : 1.0;
            want += share * color[k].red;
        }
    }
    EXPECT_FLOAT_EQ(world.At(0, 0).alpha, 31.0f / 32);
    EXPECT_NEAR(world.At(0, 0).red, want, 4.0 / kSide);
}

}  // namespace
