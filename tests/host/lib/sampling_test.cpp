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

using pixel_test::FromUnit;
using pixel_test::Step;
using pixel_test::Unit;

constexpr int32_t kOne = 1 << 16;

enum class Filter { kBilinear, kBicubic, kArea };

template <class P>
P Sample(Filter filter, const PF_World& world, double x, double y, double radius = 0.5) {
    PF_SampPB pb;
    pb.src = &world;
    pb.xRadius = pb.yRadius = static_cast<int32_t>(std::lround(radius * kOne));
    auto fx = static_cast<int32_t>(std::lround(x * kOne));
    auto fy = static_cast<int32_t>(std::lround(y * kOne));
    P out{};
    switch (filter) {
        case Filter::kBilinear:
            PF_SubpixelBilinear(fx, fy, pb, &out);
            break;
        case Filter::kBicubic:
            PF_SubpixelBicubic(fx, fy, pb, &out);
            break;
        case Filter::kArea:
            PF_AreaSample(fx, fy, pb, &out);
            break;
    }
    return out;
}

const char* Name(Filter f) {
    return f == Filter::kBilinear ? "bilinear" : f == Filter::kBicubic ? "bicubic" : "area";
}

template <class P>
class Samplers : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(Samplers, PixelTypes);

TYPED_TEST(Samplers, ExactAtTexelCentres) {
    using P = TypeParam;
    PF_WorldX<P> world(9, 7);
    pixel_test::FillRandom(world, 7, false);
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-6 : 0.0;
    for (Filter filter : {Filter::kBilinear, Filter::kBicubic, Filter::kArea}) {
        for (int32_t y = 0; y < world.height; ++y) {
            for (int32_t x = 0; x < world.width; ++x) {
                P got = Sample<P>(filter, world, x, y);
                const P& want = world.At(x, y);
                std::string where = std::string(Name(filter)) + " at " + std::to_string(x) + "," +
                                    std::to_string(y);
                EXPECT_NEAR(got.alpha, want.alpha, tolerance) << where;
                EXPECT_NEAR(got.red, want.red, tolerance * 10) << where;
                EXPECT_NEAR(got.green, want.green, tolerance * 10) << where;
                EXPECT_NEAR(got.blue, want.blue, tolerance * 10) << where;
            }
        }
    }
}

// An opaque red texel beside a transparent green one: halfway between, alpha halves and the
// colour stays pure red.
TYPED_TEST(Samplers, TransparentTexelsDoNotBleed) {
    using P = TypeParam;
    PF_WorldX<P> world(8, 8);
    for (int32_t y = 0; y < 8; ++y) {
        for (int32_t x = 0; x < 8; ++x) {
            world.At(x, y) = x < 4 ? FromUnit<P>(1, 1, 0, 0) : FromUnit<P>(0, 0, 1, 0);
        }
    }
    for (Filter filter : {Filter::kBilinear, Filter::kBicubic, Filter::kArea}) {
        for (double radius : {0.5, 3.0}) {
            if (filter != Filter::kArea && radius > 0.5) continue;
            P got = Sample<P>(filter, world, 3.5, 4.0, radius);
            EXPECT_NEAR(Unit<P>(got.alpha), 0.5, Step<P>()) << Name(filter) << " " << radius;
            EXPECT_NEAR(Unit<P>(got.red), 1.0, Step<P>()) << Name(filter);
            EXPECT_EQ(Unit<P>(got.green), 0.0) << Name(filter);
        }
    }
}

// Outside the texture is transparent: alpha falls from full at the edge texel's centre to
// zero one texel further out, through a half at the texture's border.
TYPED_TEST(Samplers, EdgesFadeOverOneTexel) {
    using P = TypeParam;
    PF_WorldX<P> world(6, 6);
    for (int32_t y = 0; y < 6; ++y) {
        for (int32_t x = 0; x < 6; ++x)
            world.At(x, y) = FromUnit<P>(1, 0.2f, 0.4f, 0.6f);
    }
    struct Case {
        double x, y, alpha;
    };
    const Case cases[] = {{0, 3, 1},     {-0.5, 3, 0.5},     {-1, 3, 0},     {-7, 3, 0},
                          {5, 3, 1},     {5.5, 3, 0.5},      {6, 3, 0},      {3, -0.5, 0.5},
                          {3, 5.5, 0.5}, {-0.5, -0.5, 0.25}, {5.75, 2, 0.25}};
    for (Filter filter : {Filter::kBilinear, Filter::kArea}) {
        for (const Case& c : cases) {
            P got = Sample<P>(filter, world, c.x, c.y);
            std::string where = std::string(Name(filter)) + " at " + std::to_string(c.x) + "," +
                                std::to_string(c.y);
            EXPECT_NEAR(Unit<P>(got.alpha), c.alpha, Step<P>()) << where;
            if (c.alpha > 0) {
                EXPECT_NEAR(Unit<P>(got.blue), 0.6, Step<P>()) << where;
            }
        }
    }
    // Bicubic reaches two texels out; a texel beyond that is clear.
    EXPECT_EQ(Sample<P>(Filter::kBicubic, world, -2, 3).alpha, 0);
    EXPECT_NEAR(Unit<P>(Sample<P>(Filter::kBicubic, world, -0.5, 3).alpha), 0.5, Step<P>());
}

TYPED_TEST(Samplers, ResultsStayInRange) {
    using P = TypeParam;
    // A hard step, where bicubic overshoots.
    PF_WorldX<P> world(8, 4);
    for (int32_t y = 0; y < 4; ++y) {
        for (int32_t x = 0; x < 8; ++x) {
            world.At(x, y) = x < 4 ? FromUnit<P>(1, 0, 0, 0) : FromUnit<P>(1, 1, 1, 1);
        }
    }
    for (double x = 2.0; x < 5.0; x += 0.125) {
        P got = Sample<P>(Filter::kBicubic, world, x, 1.5);
        EXPECT_LE(Unit<P>(got.alpha), 1.0);
        if constexpr (!PF_PixelTraits<P>::kIsFloat) {
            EXPECT_LE(Unit<P>(got.red), 1.0);
            EXPECT_GE(Unit<P>(got.red), 0.0);
        }
    }
}

// Premultiplied interpolation worked out by hand: between texels (a0, c0) and (a1, c1) at
// weights 1 − t and t, alpha is (1 − t)·a0 + t·a1 and colour ((1 − t)·a0·c0 + t·a1·c1) / alpha.
// Integer results are the nearest channel value to that, up to float rounding (a twentieth of a
// step).
TYPED_TEST(Samplers, BilinearInterpolatesPremultipliedTexels) {
    using P = TypeParam;
    struct Case {
        float a0, c0, a1, c1;
        double t, alpha, color;
    };
    const Case cases[] = {
        {1, 0.8f, 0.2f, 0, 0.5, 0.6, 0.4 / 0.6},      // colour leans to the opaque texel
        {1, 1, 0, 0, 0.25, 0.75, 1},                  // a clear texel adds no colour
        {0.5f, 0.2f, 0.5f, 0.6f, 0.75, 0.5, 0.5},     // equal alphas: plain interpolation
        {0.1f, 1, 0.9f, 0, 0.5, 0.5, 0.05 / 0.5},     // faint texels count little
        {0.02f, 0.4f, 0.02f, 1, 0.125, 0.02, 0.475},  // colour stays exact at low alpha
    };
    // Texel quantisation moves the integer cases off the hand values by up to a step; the
    // expectations below recompute them from the stored texels by the same formulas.
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-6 : 0.55 * Step<P>();
    for (const Case& c : cases) {
        PF_WorldX<P> world(4, 4);
        for (int32_t y = 0; y < 4; ++y) {
            world.At(1, y) = FromUnit<P>(c.a0, c.c0, 0, 1);
            world.At(2, y) = FromUnit<P>(c.a1, c.c1, 0, 1);
        }
        const P& p0 = world.At(1, 0);
        const P& p1 = world.At(2, 0);
        double alpha = (1 - c.t) * Unit<P>(p0.alpha) + c.t * Unit<P>(p1.alpha);
        double color = ((1 - c.t) * Unit<P>(p0.alpha) * Unit<P>(p0.red) +
                        c.t * Unit<P>(p1.alpha) * Unit<P>(p1.red)) /
                       alpha;
        EXPECT_NEAR(alpha, c.alpha, Step<P>());
        EXPECT_NEAR(color, c.color, 2 * Step<P>());
        // On a row, and halfway between two equal rows.
        for (double y : {1.0, 2.5}) {
            P got = Sample<P>(Filter::kBilinear, world, 1 + c.t, y);
            std::string what = "t " + std::to_string(c.t) + " y " + std::to_string(y);
            EXPECT_NEAR(Unit<P>(got.alpha), alpha, tolerance) << what;
            EXPECT_NEAR(Unit<P>(got.red), color, tolerance) << what;
            EXPECT_EQ(Unit<P>(got.green), 0.0) << what;
            EXPECT_NEAR(Unit<P>(got.blue), 1.0, tolerance) << what;
        }
    }
}

// The centre of four texels is the mean of their premultiplied values: alpha (1 + 0.5 + 0 +
// 0.5) / 4 = 0.5 and red (1·1 + 0.5·0.6 + 0 + 0.5·0.2) / 2 = 0.7.
TYPED_TEST(Samplers, BilinearCentreOfFourTexels) {
    using P = TypeParam;
    PF_WorldX<P> world(2, 2);
    world.At(0, 0) = FromUnit<P>(1, 1, 0, 0);
    world.At(1, 0) = FromUnit<P>(0.5f, 0.6f, 0, 0);
    world.At(0, 1) = FromUnit<P>(0, 1, 1, 1);
    world.At(1, 1) = FromUnit<P>(0.5f, 0.2f, 0, 0);
    P got = Sample<P>(Filter::kBilinear, world, 0.5, 0.5);
    EXPECT_NEAR(Unit<P>(got.alpha), 0.5, Step<P>());
    EXPECT_NEAR(Unit<P>(got.red), 0.7, Step<P>());
    EXPECT_EQ(Unit<P>(got.green), 0.0);
}

// Double-precision filters over a texture with clear, faint and opaque texels: each integer
// channel is within half a step (the rounding) of the exact value, plus a twentieth of a step
// for float arithmetic (sums of up to 16 terms, each good to about 2^-24 of the largest). Colour
// is a ratio over alpha, so where a sum of alphas can cancel (bicubic's negative lobes, float
// interpolation by differences) it is compared only where the sample is not nearly clear.
template <class P>
std::vector<double> Reference(Filter filter, const PF_WorldX<P>& world, int32_t x, int32_t y) {
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
            const P& p = world.At(tx, ty);
            double wa = wx[i] * wy[j] * Unit<P>(p.alpha);
            sum[0] += wa;
            sum[1] += wa * Unit<P>(p.red);
            sum[2] += wa * Unit<P>(p.green);
            sum[3] += wa * Unit<P>(p.blue);
        }
    }
    // Integer samples below half a step of alpha round to clear.
    double minAlpha = PF_PixelTraits<P>::kIsFloat ? 0.0 : 0.5 * Step<P>();
    if (!(sum[0] > minAlpha)) return {0, 0, 0, 0};
    return {std::min(sum[0], 1.0), sum[1] / sum[0], sum[2] / sum[0], sum[3] / sum[0]};
}

TYPED_TEST(Samplers, FiltersMatchADoublePrecisionReference) {
    using P = TypeParam;
    using Traits = PF_PixelTraits<P>;
    PF_WorldX<P> world(13, 9);
    std::mt19937 random(3);
    std::uniform_real_distribution<float> unit(0.0f, 1.0f);
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x) {
            float alphas[] = {0.0f, 1.0f, 0.01f, unit(random)};
            world.At(x, y) =
                FromUnit<P>(alphas[random() % 4], unit(random), unit(random), unit(random));
        }
    }
    double tolerance = Traits::kIsFloat ? 1e-5 : 0.55 * Step<P>();
    for (Filter filter : {Filter::kBilinear, Filter::kBicubic}) {
        for (int k = 0; k < 4000; ++k) {
            auto x = static_cast<int32_t>(random() % (17u << 16)) - (2 << 16);
            auto y = static_cast<int32_t>(random() % (13u << 16)) - (2 << 16);
            PF_SampPB pb;
            pb.src = &world;
            P got;
            if (filter == Filter::kBilinear)
                PF_SubpixelBilinear(x, y, pb, &got);
            else
                PF_SubpixelBicubic(x, y, pb, &got);
            std::vector<double> want = Reference(filter, world, x, y);
            std::string what =
                std::string(Name(filter)) + " at " + std::to_string(x) + "," + std::to_string(y);
            ASSERT_NEAR(Unit<P>(got.alpha), want[0], tolerance) << what;
            if ((filter == Filter::kBicubic || Traits::kIsFloat) && want[0] < 0.25) continue;
            if constexpr (!Traits::kIsFloat) {
                for (double& c : want)
                    c = std::clamp(c, 0.0, 1.0);
            }
            ASSERT_NEAR(Unit<P>(got.red), want[1], tolerance) << what;
            ASSERT_NEAR(Unit<P>(got.green), want[2], tolerance) << what;
            ASSERT_NEAR(Unit<P>(got.blue), want[3], tolerance) << what;
        }
    }
}

// Brute force: the exact box average, each texel square weighted by the share of it that
// the box [x − r, x + r] covers (texel i centred on i), straight colour from premultiplied sums.
template <class P>
std::vector<double> BoxAverage(const PF_WorldX<P>& world, double x, double y, double rx,
                               double ry) {
    double sum[4] = {0, 0, 0, 0};
    for (int32_t j = 0; j < world.height; ++j) {
        double wy = std::max(0.0, std::min(y + ry, j + 0.5) - std::max(y - ry, j - 0.5));
        for (int32_t i = 0; i < world.width; ++i) {
            double wx = std::max(0.0, std::min(x + rx, i + 0.5) - std::max(x - rx, i - 0.5));
            const P& p = world.At(i, j);
            double a = Unit<P>(p.alpha) * wx * wy;
            sum[0] += a;
            sum[1] += a * Unit<P>(p.red);
            sum[2] += a * Unit<P>(p.green);
            sum[3] += a * Unit<P>(p.blue);
        }
    }
    double alpha = sum[0] / (4 * rx * ry);
    if (sum[0] <= 0) return {0, 0, 0, 0};
    return {alpha, sum[1] / sum[0], sum[2] / sum[0], sum[3] / sum[0]};
}

TYPED_TEST(Samplers, AreaSampleIsTheBoxAverage) {
    using P = TypeParam;
    PF_WorldX<P> world(41, 29);
    pixel_test::FillRandom(world, 11, false);
    struct Case {
        double x, y, rx, ry;
    };
    const Case cases[] = {{20, 14, 0.75, 0.75}, {20.3, 14.6, 3.2, 1.7},  {3.1, 2.9, 5.5, 5.5},
                          {0, 0, 10, 10},       {40.2, 28.7, 2.25, 6.0}, {-3, 10, 4, 4},
                          {20, 14, 100, 100},   {17.49, 9.51, 0.6, 12.3}};
    double tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-4 : 1.01 * Step<P>();
    for (const Case& c : cases) {
        PF_SampPB pb;
        pb.src = &world;
        pb.xRadius = static_cast<int32_t>(std::lround(c.rx * kOne));
        pb.yRadius = static_cast<int32_t>(std::lround(c.ry * kOne));
        P got;
        PF_AreaSample(static_cast<int32_t>(std::lround(c.x * kOne)),
                      static_cast<int32_t>(std::lround(c.y * kOne)), pb, &got);
        std::vector<double> want = BoxAverage(world, std::lround(c.x * kOne) / double(kOne),
                                              std::lround(c.y * kOne) / double(kOne),
                                              pb.xRadius / double(kOne), pb.yRadius / double(kOne));
        std::string what = "box at " + std::to_string(c.x) + "," + std::to_string(c.y);
        EXPECT_NEAR(Unit<P>(got.alpha), want[0], tolerance) << what;
        EXPECT_NEAR(Unit<P>(got.red), want[1], tolerance) << what;
        EXPECT_NEAR(Unit<P>(got.green), want[2], tolerance) << what;
        EXPECT_NEAR(Unit<P>(got.blue), want[3], tolerance) << what;
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
    PF_SampPB pb;
    pb.src = &world;
    pb.xRadius = pb.yRadius = 2 * kOne;
    PF_PixelFloat out;
    PF_AreaSample(5 * kOne, 5 * kOne, pb, &out);
    EXPECT_FLOAT_EQ(out.alpha, 1.0f);
    EXPECT_FLOAT_EQ(out.red, 0.5f);
}

TEST(AreaTable, LivesAndDiesWithItsWorld) {
    int64_t start = U_AccountedBytes();
    {
        PF_WorldX<PF_Pixel8> world(32, 16);
        int64_t withWorld = U_AccountedBytes();
        PF_SampPB pb;
        pb.src = &world;
        pb.xRadius = pb.yRadius = 4 * kOne;
        PF_Pixel8 out;
        PF_AreaSample(8 * kOne, 8 * kOne, pb, &out);
        EXPECT_EQ(U_AccountedBytes() - withWorld, 33 * 17 * 16);
        PF_AreaSample(9 * kOne, 8 * kOne, pb, &out);
        EXPECT_EQ(U_AccountedBytes() - withWorld, 33 * 17 * 16) << "built once";
        // A copy is a new view: it builds its own table when it needs one.
        PF_World view = world;
        EXPECT_EQ(view.samplingTables.area.load(), nullptr);
        world.samplingTables.Drop();
        EXPECT_EQ(U_AccountedBytes(), withWorld);
        PF_AreaSample(9 * kOne, 8 * kOne, pb, &out);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

TEST(AreaTable, FailedBuildTakesNothing) {
    int64_t start = U_AccountedBytes();
    {
        PF_WorldX<PF_Pixel16> world(16, 16);
        int64_t withWorld = U_AccountedBytes();
        PF_SampPB pb;
        pb.src = &world;
        pb.xRadius = pb.yRadius = 2 * kOne;
        PF_Pixel16 out;
        U_FailAllocationAfter(1);
        EXPECT_THROW(PF_AreaSample(kOne, kOne, pb, &out), std::bad_alloc);
        EXPECT_EQ(U_AccountedBytes(), withWorld);
        PF_AreaSample(kOne, kOne, pb, &out);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

// Many threads take their first area sample of a texture at once: one table is built and
// every thread sees it whole.
TEST(AreaTableThreads, ConcurrentFirstUse) {
    for (int round = 0; round < 20; ++round) {
        PF_WorldX<PF_Pixel8> world(64, 48);
        pixel_test::FillRandom(world, 100 + round);
        int64_t before = U_AccountedBytes();
        PF_SampPB pb;
        pb.src = &world;
        pb.xRadius = pb.yRadius = 5 * kOne;
        constexpr int kThreads = 6;
        std::vector<PF_Pixel8> results(kThreads);
        std::vector<std::thread> threads;
        for (int t = 0; t < kThreads; ++t) {
            threads.emplace_back(
                [&, t] { PF_AreaSample(30 * kOne + 1234, 20 * kOne, pb, &results[t]); });
        }
        for (std::thread& t : threads)
            t.join();
        EXPECT_EQ(U_AccountedBytes() - before, 65 * 49 * 16);
        for (const PF_Pixel8& r : results) {
            EXPECT_EQ(r.alpha, results[0].alpha);
            EXPECT_EQ(r.red, results[0].red);
            EXPECT_EQ(r.blue, results[0].blue);
        }
        std::vector<double> want = BoxAverage(world, 30 + 1234.0 / kOne, 20, 5, 5);
        EXPECT_NEAR(results[0].alpha / 255.0, want[0], 1.01 / 255);
        EXPECT_NEAR(results[0].red / 255.0, want[1], 1.01 / 255);
    }
}

}  // namespace
