#include <gtest/gtest.h>

#include "raster_test_support.h"
#include "renderer/raster/samplers.h"
#include "renderer/scene/scene_print.h"

namespace {

using raster_test::Code;
using raster_test::Equal;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;
using raster_test::PatternTexture;

template <class P>
class Samplers : public ::testing::Test {};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(Samplers, PixelTypes);

// The identity mapping of screen to texture: U = x, V = y, W = 1.
M_Matrix3 Identity() {
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[1][1] = m.mat[2][2] = 1;
    return m;
}

template <class P>
void StartTexture(const PF_World& world, SY_SamplingFilter filter, bool perspective,
                  SY_SpanTexture* t) {
    t->world = &world;
    t->samplingFilter = filter;
    t->sampling.src = &world;
    t->perspective = perspective;
}

TYPED_TEST(Samplers, NearestTakesTheFlooredTexelAndNothingOutside) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(8, 4);
    struct Case {
        double x, y;
        bool inside;
        int32_t i, j;
    };
    const Case cases[] = {
        {0.5, 0.5, true, 0, 0},    {7.99, 3.99, true, 7, 3},
        {3.0, 2.0, true, 3, 2},    {8.0, 1.5, false, 0, 0},  // column = width
        {1.5, 4.0, false, 0, 0},                             // row = height
        {-0.25, 1.5, false, 0, 0},                           // floor, not truncation
    };
    for (const Case& c : cases) {
        SY_SpanSampleState<P> state;
        StartTexture<P>(*texture, SY_SamplingFilter::kNearest, false, &state.texture);
        state.mapping.Start(Identity(), c.x, c.y, false, 1.0f);
        P got;
        SY_SampleNearest(state, &got);
        if (c.inside)
            EXPECT_TRUE(Equal(got, PatternTexel<P>(c.i, c.j))) << c.x << "," << c.y;
        else
            EXPECT_TRUE(IsClear(got)) << c.x << "," << c.y;
    }
}

TYPED_TEST(Samplers, FilteredAtATexelCentreIsTheTexelForBothQualities) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(8, 8);
    for (SY_SamplingFilter filter : {SY_SamplingFilter::kBilinear, SY_SamplingFilter::kBicubic}) {
        SY_SpanSampleState<P> state;
        StartTexture<P>(*texture, filter, false, &state.texture);
        state.mapping.Start(Identity(), 4, 3, false, 1.0f);
        P got;
        SY_SampleFiltered(state, &got);
        EXPECT_TRUE(Equal(got, PatternTexel<P>(4, 3))) << filter;
    }
}

// One texel to a pixel is a footprint of half a texel: still interpolated. Three texels to two
// pixels average a box of 1.5 texels, which mixes in the neighbours.
TYPED_TEST(Samplers, HalfATexelFootprintInterpolatesAndWiderAverages) {
    using P = TypeParam;
    auto texture = raster_test::FilledWorld<P>(8, 8, Opaque<P>(0, 0, 0));
    texture->At(4, 3) = Opaque<P>(255, 255, 255);
    for (double scale : {1.0, 1.5}) {
        M_Matrix3 m = Identity();
        m.mat[0][0] = m.mat[1][1] = scale;
        SY_SpanSampleState<P> state;
        StartTexture<P>(*texture, SY_SamplingFilter::kBilinear, false, &state.texture);
        state.mapping.Start(m, 4 / scale, 3 / scale, false, 1.0f);
        P got;
        SY_SampleFiltered(state, &got);
        EXPECT_EQ(Equal(got, Opaque<P>(255, 255, 255)), scale == 1.0) << scale;
    }
}

TYPED_TEST(Samplers, FootprintReachingTheEyePlaneIsTransparent) {
    using P = TypeParam;
    auto texture = raster_test::FilledWorld<P>(8, 8, Opaque<P>(10, 20, 30));
    // W = 0.1 + 0.2·x: at x = 0 the pixel's W range [W − 0.2·½·2, …] reaches below zero.
    M_Matrix3 m = Identity();
    m.mat[0][2] = 0.2;
    m.mat[2][2] = 0.1;
    m.mat[0][0] = 0.2;  // U and V follow W so that u, v stay inside the texture
    m.mat[1][1] = 0;
    m.mat[2][1] = 0.1;
    SY_SpanSampleState<P> state;
    StartTexture<P>(*texture, SY_SamplingFilter::kBilinear, true, &state.texture);
    state.mapping.Start(m, 0.0, 0.5, true, 1.0f);
    P got;
    SY_SampleFiltered(state, &got);
    EXPECT_TRUE(IsClear(got));
    state.mapping.Start(m, 2.0, 0.5, true, 1.0f);
    SY_SampleFiltered(state, &got);
    EXPECT_FALSE(IsClear(got));
}

// Two subsamples, the second absent: alpha is halved, the colour stays. With both absent the
// sample is transparent.
TYPED_TEST(Samplers, AbsentSubsamplesHalveAlphaAndKeepColor) {
    using P = TypeParam;
    const P color = {Code<P>(255), Code<P>(200), Code<P>(100), Code<P>(50)};
    auto texture = raster_test::FilledWorld<P>(8, 8, color);
    for (SY_SamplingFilter filter : {SY_SamplingFilter::kNearest, SY_SamplingFilter::kBilinear}) {
        SY_SpanSubsampleState<P> state;
        StartTexture<P>(*texture, filter, false, &state.texture);
        state.count = 2;
        state.first = 0;
        state.last = 1;
        state.mappings[0].Start(Identity(), 4, 4, false, 0.5f);
        state.mappings[1].StartAbsent();
        P got;
        if (filter == SY_SamplingFilter::kNearest)
            SY_SampleNearest(state, &got);
        else
            SY_SampleFiltered(state, &got);
        EXPECT_NEAR(got.alpha, PF_PixelTraits<P>::kMax / 2, PF_PixelTraits<P>::kMax / 255.0);
        EXPECT_EQ(got.red, color.red);
        EXPECT_EQ(got.green, color.green);
        EXPECT_EQ(got.blue, color.blue);

        state.mappings[0].StartAbsent();
        if (filter == SY_SamplingFilter::kNearest)
            SY_SampleNearest(state, &got);
        else
            SY_SampleFiltered(state, &got);
        EXPECT_TRUE(IsClear(got));
    }
}

// A mapping whose x slope of W is below 1e-12 keeps W exactly constant along the row.
TEST(SpanMapping, TinyWSlopeKeepsWConstant) {
    M_Matrix3 m = Identity();
    m.mat[0][2] = 1e-13;
    m.mat[2][2] = 2;
    SY_SpanMapping mapping;
    mapping.Start(m, 0.5, 0.5, true, 1.0f);
    double w = mapping.w;
    for (int i = 0; i < 100; ++i)
        mapping.Step(true);
    EXPECT_EQ(mapping.dwdx, 0.0f);
    EXPECT_EQ(mapping.w, w);
    EXPECT_EQ(mapping.u, 100.5);
}

}  // namespace
