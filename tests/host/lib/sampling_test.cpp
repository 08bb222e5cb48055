#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "host/lib/pixel_test_support.h"
#include "pf_sampling.h"
#include "u_memory.h"

namespace {

using pixel_test::Argb;
using pixel_test::BoxAverage;
using pixel_test::Channels;
using pixel_test::ExpectChannels;
using pixel_test::FromUnit;
using pixel_test::Step;
using pixel_test::Unit;

constexpr int32_t kOne = 1 << 16;

enum class Filter { kBilinear, kBicubic, kArea };
const char* const kNames[] = {"bilinear", "bicubic", "area"};

// The sample at (x, y) in 16.16 fixed point, an area sample over ±radius.
template <class P>
P SampleFixed(Filter filter, const PF_World& world, int32_t x, int32_t y, int32_t rx = kOne / 2,
              int32_t ry = kOne / 2) {
    PF_SampPB pb;
    pb.src = &world;
    pb.xRadius = rx;
    pb.yRadius = ry;
    P out{};
    if (filter == Filter::kBilinear) PF_SubpixelBilinear(x, y, pb, &out);
    if (filter == Filter::kBicubic) PF_SubpixelBicubic(x, y, pb, &out);
    if (filter == Filter::kArea) PF_AreaSample(x, y, pb, &out);
    return out;
}

int32_t Fixed(double v) {
    return static_cast<int32_t>(std::lround(v * kOne));
}

template <class P>
class Samplers : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(Samplers, PixelTypes);

// Double-precision filters over a texture with clear, faint and opaque texels: each integer
// channel is within half a step (the rounding) of the exact value, plus a twentieth of a step
// for float arithmetic (sums of up to 16 terms, each good to about 2^-24 of the largest). Colour
// is a ratio over alpha, so where a sum of alphas can cancel (bicubic's negative lobes, float
// interpolation by differences) it is compared only where the sample is not nearly clear.
// Bicubic overshoots at hard steps: alpha stays at most 1 and integer colour within range.
template <class P>
Argb Reference(Filter filter, const PF_WorldX<P>& world, int32_t x, int32_t y) {
    auto weights = [filter](double t, double w[4]) {
        if (filter == Filter::kBilinear) {
            w[0] = 0, w[1] = 1 - t, w[2] = t, w[3] = 0;
        } else {
            w[0] = t * (-0.5 + t * (1 - 0.5 * t));
            w[1] = 1 + t * t * (-2.5 + 1.5 * t);
            w[2] = t * (0.5 + t * (2 - 1.5 * t));
            w[3] = t * t * (-0.5 + 0.5 * t);
        }
    };
    double wx[4], wy[4];
    weights((x & 0xFFFF) / double(kOne), wx);
    weights((y & 0xFFFF) / double(kOne), wy);
    double sum[4] = {0, 0, 0, 0};
    for (int j = 0; j < 4; ++j) {
        for (int i = 0; i < 4; ++i) {
            int32_t tx = (x >> 16) - 1 + i, ty = (y >> 16) - 1 + j;
            if (tx < 0 || ty < 0 || tx >= world.width || ty >= world.height) continue;
            const Argb p = Channels(world.At(tx, ty));
            for (int c = 0; c < 4; ++c)
                sum[c] += wx[i] * wy[j] * p[0] * (c ? p[c] : 1.0);
        }
    }
    // Integer samples below half a step of alpha round to clear.
    double minAlpha = PF_PixelTraits<P>::kIsFloat ? 0.0 : 0.5 * Step<P>();
    if (!(sum[0] > minAlpha)) return {0, 0, 0, 0};
    Argb out = {std::min(sum[0], 1.0), sum[1] / sum[0], sum[2] / sum[0], sum[3] / sum[0]};
    for (int c = 1; c < 4 && !PF_PixelTraits<P>::kIsFloat; ++c)
        out[c] = std::clamp(out[c], 0.0, 1.0);
    return out;
}

TYPED_TEST(Samplers, FiltersMatchADoublePrecisionReference) {
    using P = TypeParam;
    PF_WorldX<P> world(13, 9);
    std::mt19937 random(3);
    std::uniform_real_distribution<float> unit(0.0f, 1.0f);
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x) {
            float alphas[] = {0.0f, 1.0f, 0.01f, unit(random)};
            world.At(x, y) =
                FromUnit<P>({alphas[random() % 4], unit(random), unit(random), unit(random)});
        }
    }
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-5 : 0.55 * Step<P>();
    for (Filter filter : {Filter::kBilinear, Filter::kBicubic}) {
        for (int k = 0; k < 4000; ++k) {
            auto x = static_cast<int32_t>(random() % (17u << 16)) - (2 << 16);
            auto y = static_cast<int32_t>(random() % (13u << 16)) - (2 << 16);
            // Every fourth on a texel centre, where each filter gives the texel itself.
            if (k % 4 == 0) x &= ~0xFFFF, y &= ~0xFFFF;
            P got = SampleFixed<P>(filter, world, x, y);
            Argb want = Reference(filter, world, x, y);
            std::string what = std::string(kNames[int(filter)]) + " at " + std::to_string(x) + "," +
                               std::to_string(y);
            ASSERT_NEAR(Unit<P>(got.alpha), want[0], tolerance) << what;
            if ((filter == Filter::kBicubic || PF_PixelTraits<P>::kIsFloat) && want[0] < 0.25)
                continue;
            ExpectChannels(got, want, tolerance, what);
            if (this->HasFailure()) return;
        }
    }
}

TYPED_TEST(Samplers, AreaSampleIsTheBoxAverage) {
    using P = TypeParam;
    // A fifth of the texels clear: their colour must not bleed into the average.
    PF_WorldX<P> world(41, 29);
    pixel_test::FillRandom(world, 11);
    struct Case {
        double x, y, rx, ry;
    };
    const Case cases[] = {{7, 5, 0.5, 0.5},     {20, 14, 0.75, 0.75}, {20.3, 14.6, 3.2, 1.7},
                          {3.1, 2.9, 5.5, 5.5}, {0, 0, 10, 10},       {40.2, 28.7, 2.25, 6.0},
                          {-3, 10, 4, 4},       {20, 14, 100, 100},   {17.49, 9.51, 0.6, 12.3},
                          {40, 28, 0.5, 0.5},   {32767.4, 10, 3, 3},  {-32767.9, -32767.9, 2, 2}};
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-4 : 1.01 * Step<P>();
    for (const Case& c : cases) {
        int32_t x = Fixed(c.x), y = Fixed(c.y), rx = Fixed(c.rx), ry = Fixed(c.ry);
        // Texel i is centred on i: its square is [i − 0.5, i + 0.5).
        double cx = x / double(kOne) + 0.5, cy = y / double(kOne) + 0.5;
        double hx = rx / double(kOne), hy = ry / double(kOne);
        ExpectChannels(SampleFixed<P>(Filter::kArea, world, x, y, rx, ry),
                       BoxAverage(world, cx - hx, cy - hy, cx + hx, cy + hy), tolerance,
                       "box at " + std::to_string(c.x) + "," + std::to_string(c.y));
    }
}

// A float texel that is not a number must not spoil every box after it in the table.
TEST(AreaTable, FloatTexelsThatAreNotNumbersAddNothing) {
    PF_WorldX<PF_PixelFloat> world(8, 8);
    for (int32_t y = 0; y < 8; ++y) {
        for (int32_t x = 0; x < 8; ++x)
            world.At(x, y) = {1, 0.5f, 0.5f, 0.5f};
    }
    world.At(1, 1).red = std::nanf("");
    world.At(2, 1).alpha = INFINITY;
    PF_PixelFloat out =
        SampleFixed<PF_PixelFloat>(Filter::kArea, world, 5 * kOne, 5 * kOne, 2 * kOne, 2 * kOne);
    EXPECT_FLOAT_EQ(out.alpha, 1.0f);
    EXPECT_FLOAT_EQ(out.red, 0.5f);
}

// Many threads take their first area sample of a texture at once: one table is built and
// every thread sees it whole. It is given back with its world.
TEST(AreaTableThreads, ConcurrentFirstUse) {
    const int64_t start = U_AccountedBytes();
    for (int round = 0; round < 20; ++round) {
        PF_WorldX<PF_Pixel8> world(64, 48);
        pixel_test::FillRandom(world, 100 + round);
        int64_t before = U_AccountedBytes();
        constexpr int kThreads = 6;
        std::vector<PF_Pixel8> results(kThreads);
        std::vector<std::thread> threads;
        for (int t = 0; t < kThreads; ++t) {
            threads.emplace_back([&, t] {
                results[t] = SampleFixed<PF_Pixel8>(Filter::kArea, world, 30 * kOne + 1234,
                                                    20 * kOne, 5 * kOne, 5 * kOne);
            });
        }
        for (std::thread& t : threads)
            t.join();
        EXPECT_EQ(U_AccountedBytes() - before, 65 * 49 * 16);
        double x = 30.5 + 1234.0 / kOne;
        ExpectChannels(results[0], BoxAverage(world, x - 5, 15.5, x + 5, 25.5), 1.01 / 255,
                       "round " + std::to_string(round));
        for (const PF_Pixel8& r : results)
            EXPECT_EQ(std::tuple(r.alpha, r.red, r.blue),
                      std::tuple(results[0].alpha, results[0].red, results[0].blue));
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
