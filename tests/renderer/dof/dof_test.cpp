#include <gtest/gtest.h>

#include <cmath>
#include <cstring>

#include "renderer/dof/dof_buffer.h"
#include "renderer/raster/raster_test_support.h"
#include "u_memory.h"

namespace {

using raster_test::Frame;
using renderer_test::Translation;

// The camera of raster_test::Frame (zoom 400) at blur level 100 %: a focal length of 40, so a
// lens focused at 400 with aperture A blurs depth D by 0.5·A·400·40 / 360 · |1/400 − 1/D|.
SY_CameraDOFDesc Lens(double aperture, double irisShape) {
    SY_CameraDOFDesc dof;
    dof.enabled = true;
    dof.zoom = raster_test::kDistance;
    dof.focusDistance = 400;
    dof.aperture = aperture;
    dof.blurLevel = 1;
    dof.irisShape = irisShape;
    return dof;
}

constexpr int32_t kWidth = 160, kHeight = 80;

// A white card wider and taller than the frame at depth D whose left edge is seen at x = 60,
// rendered in float; returns the alpha of row 40. fail() is called before the frame renders.
template <class Fail>
std::vector<float> EdgeRow(const SY_CameraDOFDesc& dof, double depth, Fail fail) {
    Frame frame(kWidth, kHeight, 1);
    frame.scene.dof = dof;
    auto card = raster_test::FilledWorld<PF_PixelFloat>(800, 800, {1, 1, 1, 1});
    const double scale = depth / raster_test::kDistance;
    frame.Layer(0, card.get(), Translation(80 - 20 * scale, 40 - 200 * scale, depth - 400));
    PF_WorldX<PF_PixelFloat> destination(kWidth, kHeight);
    [[maybe_unused]] auto failing = fail();
    frame.Render(&destination);
    std::vector<float> row;
    for (int32_t x = 0; x < kWidth; ++x)
        row.push_back(destination.At(x, 40).alpha);
    return row;
}

std::vector<float> EdgeRow(const SY_CameraDOFDesc& dof, double depth) {
    return EdgeRow(dof, depth, [] { return 0; });
}

// Where alpha first reaches level along the row, between pixel centres.
double Crossing(const std::vector<float>& row, float level) {
    for (size_t x = 1; x < row.size(); ++x) {
        if (row[x] >= level) return x - 1 + (level - row[x - 1]) / (row[x] - row[x - 1]) + 0.5;
    }
    return -1;
}

// In focus an edge stays within a pixel, through the iris too (its highlights force the
// buffer); a box blur of radius r ramps the edge over 2r, 10 % to 90 % over 1.6r: r = 10 at
// A = 360, D = 800; 20 at twice the aperture; 13.3 at D = 1200.
TEST(DepthOfField, EdgeWidthFollowsApertureAndDepth) {
    SY_CameraDOFDesc iris = Lens(720, 6);
    iris.highlightGain = 1;
    const struct {
        SY_CameraDOFDesc dof;
        double depth, width;
    } cases[] = {{Lens(720, 1), 400, 0},
                 {iris, 400, 0},
                 {Lens(360, 1), 800, 16},
                 {Lens(720, 1), 800, 32},
                 {Lens(360, 1), 1200, 16 * 4 / 3.0}};
    for (const auto& c : cases) {
        std::vector<float> row = EdgeRow(c.dof, c.depth);
        double low = Crossing(row, 0.1f), high = Crossing(row, 0.9f);
        EXPECT_NEAR(high - low, c.width, c.width ? 0.5 : 1.0) << c.depth << " " << c.dof.aperture;
        EXPECT_NEAR((high + low) / 2, 60, 0.5);
    }
}

// No aperture, no blur level, or depth of field off: the frame of a lens without blur.
TEST(DepthOfField, WithoutBlurTheFrameIsTheSharpOne) {
    SY_CameraDOFDesc off = Lens(720, 6);
    off.enabled = false;
    off.highlightGain = 1;
    SY_CameraDOFDesc closed = off, flat = off;
    closed.enabled = flat.enabled = true;
    closed.aperture = 0;
    flat.blurLevel = 0;
    const std::vector<float> sharp = EdgeRow(off, 800);
    for (const SY_CameraDOFDesc& dof : {closed, flat})
        EXPECT_EQ(EdgeRow(dof, 800), sharp);
}

// A point of light spreads into the iris: a hexagon with a corner up is 2r high and √3·r
// wide; turned 30° it lies on its side; an aspect of 2 doubles its width.
TEST(DepthOfField, PointOfLightTakesTheIrisShape) {
    const struct {
        double rotation, aspect, width, height;
    } cases[] = {{0, 1, 34.64, 40}, {30, 1, 40, 34.64}, {0, 2, 69.28, 40}};
    for (const auto& c : cases) {
        SY_CameraDOFDesc dof = Lens(0, 6);
        dof.irisRotation = c.rotation;
        dof.irisAspect = c.aspect;
        auto buffer = SY_DOFBuffer::New({0, 0, 101, 101}, 32, dof, BuildShapeKernels(dof));
        auto& pixels = static_cast<SY_DOFBufferX<PF_PixelFloat>&>(*buffer);
        *pixels.PixelAddress(50, 50) = {1, 1, 1, 1};
        buffer->PrepareTables();
        // The blurred point's extent through its centre, in alpha over the peak's.
        double across = 0, down = 0;
        PF_PixelFloat peak, p;
        pixels.Sample(50.5f, 50.5f, 20, &peak);
        for (int32_t i = 0; i < 101; ++i) {
            pixels.Sample(i + 0.5f, 50.5f, 20, &p);
            across += p.alpha / peak.alpha;
            pixels.Sample(50.5f, i + 0.5f, 20, &p);
            down += p.alpha / peak.alpha;
        }
        EXPECT_NEAR(across, c.width, 1.0) << c.rotation << " " << c.aspect;
        EXPECT_NEAR(down, c.height, 1.0) << c.rotation << " " << c.aspect;
    }
}

// Over a flat grey the blur is the grey; above the threshold (in 8-bit levels) its colour gains
// up to the set gain, ramping from the threshold to white: 0.9 over 127.5 gains 80 %.
TEST(DepthOfField, HighlightsAboveTheThresholdGain) {
    const struct {
        float grey;
        double gain, threshold;
        float expected;
    } cases[] = {{0.9f, 1, 127.5, 1.62f}, {0.3f, 1, 127.5, 0.3f}, {0.9f, 0, 127.5, 0.9f}};
    for (const auto& c : cases) {
        SY_CameraDOFDesc dof = Lens(0, 6);
        dof.highlightGain = c.gain;
        dof.highlightThreshold = c.threshold;
        auto buffer = SY_DOFBuffer::New({0, 0, 40, 40}, 32, dof, BuildShapeKernels(dof));
        auto& pixels = static_cast<SY_DOFBufferX<PF_PixelFloat>&>(*buffer);
        for (int32_t k = 0; k < 40 * 40; ++k)
            *pixels.PixelAddress(k % 40, k / 40) = {1, c.grey, c.grey, c.grey};
        buffer->PrepareTables();
        PF_PixelFloat p;
        pixels.Sample(20.5f, 20.5f, 5, &p);
        EXPECT_NEAR(p.red, c.expected, 1e-4) << c.grey << " " << c.gain;
        EXPECT_NEAR(p.alpha, 1, 1e-4);
    }
}

// A span's pixels sampled together are, to the bit, those sampled one by one, near the
// buffer's ends and rows as within it, with neighbours that share a kernel and some that do
// not; and a flat grey averaged within the buffer stays that grey up to its very ends.
template <class P>
void ExpectSpanSamplesAsItsPixels() {
    constexpr int32_t kCount = SY_DOFBufferX<P>::kSpanPixels, kW = kCount + 6;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    using C = typename PF_PixelTraits<P>::Channel;
    for (bool flat : {false, true}) {
        SY_CameraDOFDesc dof = Lens(0, 8);
        dof.irisRoundness = 0.5;
        auto buffer = SY_DOFBuffer::New({0, 0, kW, 30}, PF_PixelTraits<P>::kBitDepth, dof,
                                        BuildShapeKernels(dof));
        auto& pixels = static_cast<SY_DOFBufferX<P>&>(*buffer);
        buffer->averagesWithin = flat;
        for (int32_t k = 0; k < kW * 30; ++k) {
            const auto grey = static_cast<C>(kMax * (flat ? 0.5f : float(k * 37 % 101) / 100));
            *pixels.PixelAddress(k % kW, k / kW) = {static_cast<C>(kMax), grey, grey, grey};
        }
        buffer->PrepareTables();
        float radius[kCount];
        for (int32_t k = 0; k < kCount; ++k)
            radius[k] = static_cast<float>(3 + k / 7 % 3 * 4);  // runs of 7 sharing a kernel
        for (float y : {0.5f, 6.5f, 15.5f, 29.5f}) {
            for (int32_t first = 0; first <= kW - kCount; ++first) {
                P together[kCount], alone;
                pixels.SampleSpan(0.5f, y, first, kCount, radius, together);
                for (int32_t k = 0; k < kCount; ++k) {
                    pixels.Sample(0.5f + static_cast<float>(first + k), y, radius[k], &alone);
                    EXPECT_EQ(std::memcmp(&alone, &together[k], sizeof alone), 0) << y << " " << k;
                    if (flat) {
                        const float tolerance = PF_PixelTraits<P>::kIsFloat ? 1e-5f : 0.0f;
                        EXPECT_NEAR(alone.alpha, kMax, tolerance) << y << " " << first + k;
                        EXPECT_NEAR(alone.red, float(C(kMax * 0.5f)), tolerance)
                            << y << " " << first + k;
                    }
                }
            }
        }
    }
}

TEST(DepthOfField, SpanSamplesAsItsPixels) {
    ExpectSpanSamplesAsItsPixels<PF_Pixel8>();
    ExpectSpanSamplesAsItsPixels<PF_Pixel16>();
    ExpectSpanSamplesAsItsPixels<PF_PixelFloat>();
}

// Memory that runs out anywhere in a blurred frame fails it with 4 (std::bad_alloc from the
// tracked objects, which the render entry reports as 4) and frees what it took.
// Kernels made as far as one layer needs, then taken over and made further for another, are
// those made all at once; an array that reaches far enough is kept as it is.
TEST(DepthOfField, KernelsMadeInStepsAreThoseMadeAtOnce) {
    SY_CameraDOFDesc dof = Lens(720, 8);
    dof.irisRoundness = 0.5;
    auto whole = BuildShapeKernels(dof), few = BuildShapeKernels(dof, 5);
    auto more = BuildShapeKernels(dof, 12, few);
    EXPECT_EQ(BuildShapeKernels(dof, 3, more), more);
    ASSERT_LT(few->irisList.size(), more->irisList.size());
    for (size_t i = 0; i < more->irisList.size(); ++i) {
        const ShapeIris &a = more->irisList[i], &b = whole->irisList[i];
        ASSERT_EQ(a.edgeCount, b.edgeCount);
        EXPECT_EQ(a.singleCount, b.singleCount);
        for (int32_t k = 0; k < a.edgeCount; ++k) {
            const ShapeEdge &e = a.edges[k], &f = b.edges[k];
            EXPECT_TRUE(e.x == f.x && e.y == f.y && e.rows == f.rows && e.weight == f.weight) << i;
        }
    }
}

TEST(DepthOfField, OutOfMemoryFreesEverything) {
    SY_CameraDOFDesc dof = Lens(720, 6);
    dof.blurLevel = 0.2;  // a blur of 4 pixels: the 33 kernels up to it, of the level's 161
    int32_t failures = renderer_test::FailEachAllocationInTurn(
        [&](auto fail) { EdgeRow(dof, 800, fail); }, true, 1000);
    EXPECT_GT(failures, 2 * 33);  // two blocks a kernel, then the buffer, tables and rows
}

}  // namespace
