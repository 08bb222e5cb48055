#include <gtest/gtest.h>

#include "raster_test_support.h"
#include "renderer/raster/processor.h"
#include "renderer/raster/samplers.h"
#include "renderer/scene/scene_print.h"

namespace {

using raster_test::Equal;
using raster_test::FilledWorld;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;

using Filter = SY_SamplingFilter;

// Screen to texture: U = s·x, V = s·y, W = 1.
M_Matrix3 Scaled(double s) {
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[1][1] = s;
    m.mat[2][2] = 1;
    return m;
}

template <class State>
void StartTexture(const PF_World& texture, Filter filter, bool perspective, State* state) {
    state->texture.world = state->texture.sampling.src = &texture;
    state->texture.samplingFilter = filter;
    state->texture.perspective = perspective;
}

template <class P, class State>
P Take(State& state, Filter filter) {
    P got;
    filter == Filter::kNearest ? SY_SampleNearest(state, &got) : SY_SampleFiltered(state, &got);
    return got;
}

// The sample at screen point (x, y) through m with the given filter.
template <class P>
P Sample(const PF_World& texture, Filter filter, const M_Matrix3& m, double x, double y,
         bool perspective = false) {
    SY_SpanSampleState<P> state;
    StartTexture(texture, filter, perspective, &state);
    state.mapping.Start(m, x, y, perspective, 1.0f);
    return Take<P>(state, filter);
}

template <class P>
class Samplers : public ::testing::Test {};
TYPED_TEST_SUITE(Samplers, renderer_test::PixelTypes);

// Nearest: the floored texel, nothing beyond the texture (column = width, row = height, and
// −0.25 floors to −1).
TYPED_TEST(Samplers, NearestTakesTheFlooredTexelAndNothingOutside) {
    using P = TypeParam;
    auto texture = raster_test::PatternTexture<P>(8, 4);
    const double cases[][3] = {{0.5, 0.5, 1}, {7.99, 3.99, 1}, {3.0, 2.0, 1},
                               {8.0, 1.5, 0}, {1.5, 4.0, 0},   {-0.25, 1.5, 0}};
    for (const auto& [x, y, inside] : cases) {
        const P got = Sample<P>(*texture, Filter::kNearest, Scaled(1), x, y);
        EXPECT_TRUE(inside ? Equal(got, PatternTexel<P>(int32_t(x), int32_t(y))) : IsClear(got))
            << x << "," << y;
    }
}

// Filtered at a texel centre with one texel to a pixel (a footprint of half a texel, still
// interpolated) is the texel, bilinear or bicubic. Three texels to two pixels average a box of
// 1.5 texels, which mixes in the neighbours of a lone white texel.
TYPED_TEST(Samplers, FilteredInterpolatesSmallFootprintsAndAveragesWideOnes) {
    using P = TypeParam;
    auto pattern = raster_test::PatternTexture<P>(8, 8);
    for (Filter filter : {Filter::kBilinear, Filter::kBicubic})
        EXPECT_TRUE(Equal(Sample<P>(*pattern, filter, Scaled(1), 4, 3), PatternTexel<P>(4, 3)));
    const P white = Opaque<P>(255, 255, 255);
    auto dot = FilledWorld<P>(8, 8, Opaque<P>(0, 0, 0));
    dot->At(4, 3) = white;
    EXPECT_TRUE(Equal(Sample<P>(*dot, Filter::kBilinear, Scaled(1), 4, 3), white));
    EXPECT_FALSE(Equal(Sample<P>(*dot, Filter::kBilinear, Scaled(1.5), 4 / 1.5, 3 / 1.5), white));
}

// W = 0.1 + 0.2·x, with U and V following W so they stay inside the texture: at x = 0 the
// pixel's W range reaches below zero and the sample is transparent; at x = 2 it is not.
TYPED_TEST(Samplers, FootprintReachingTheEyePlaneIsTransparent) {
    using P = TypeParam;
    auto texture = FilledWorld<P>(8, 8, Opaque<P>(10, 20, 30));
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[0][2] = 0.2;
    m.mat[2][1] = m.mat[2][2] = 0.1;
    EXPECT_TRUE(IsClear(Sample<P>(*texture, Filter::kBilinear, m, 0.0, 0.5, true)));
    EXPECT_FALSE(IsClear(Sample<P>(*texture, Filter::kBilinear, m, 2.0, 0.5, true)));
}

// W = 1 − x/100 grows the footprint's U half-size 0.35/W² from 0.35 texel at x = 0 past half
// a texel near x = 16. Spans short of that interpolate throughout, each pixel as filtered.
TYPED_TEST(Samplers, SpansThatInterpolateThroughoutGiveTheFilteredTexels) {
    using P = TypeParam;
    auto texture = raster_test::PatternTexture<P>(32, 8);
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[1][1] = 0.7;
    m.mat[0][2] = -0.01;
    m.mat[2][2] = 1;
    const int32_t cases[][3] = {{0, 10, 1}, {5, 8, 1}, {0, 30, 0}, {20, 10, 0}};
    for (const auto& [x, count, interpolates] : cases) {
        SY_SpanSampleState<P> state;
        StartTexture(*texture, Filter::kBilinear, true, &state);
        state.mapping.Start(m, x + 0.5, 3.5, true, 1.0f);
        EXPECT_EQ(SY_SpanInterpolates(state, count), interpolates != 0) << x;
        for (int32_t i = 0; i < count && interpolates; ++i, state.Step()) {
            P got, filtered;
            SY_SampleInterpolated(state, &got);
            SY_SampleFiltered(state, &filtered);
            EXPECT_TRUE(Equal(got, filtered)) << x + i;
        }
    }
}

// Two subsamples, the second absent: alpha is halved, the colour stays. With both absent the
// sample is transparent.
TYPED_TEST(Samplers, AbsentSubsamplesHalveAlphaAndKeepColor) {
    using P = TypeParam;
    constexpr double kMax = PF_PixelTraits<P>::kMax;
    const P color = Opaque<P>(200, 100, 50);
    auto texture = FilledWorld<P>(8, 8, color);
    for (Filter filter : {Filter::kNearest, Filter::kBilinear}) {
        SY_SpanSubsampleState<P> state;
        StartTexture(*texture, filter, false, &state);
        state.count = 2;
        state.last = 1;
        state.mappings[0].Start(Scaled(1), 4, 4, false, 0.5f);
        state.mappings[1].StartAbsent();
        const P got = Take<P>(state, filter);
        EXPECT_NEAR(got.alpha, kMax / 2, kMax / 255) << filter;
        EXPECT_TRUE(Equal(P{got.alpha, color.red, color.green, color.blue}, got)) << filter;
        state.mappings[0].StartAbsent();
        EXPECT_TRUE(IsClear(Take<P>(state, filter))) << filter;
    }
}

}  // namespace

// Taken two pixels at once, filtered samples are the ones taken alone: along spans whose
// footprints grow from interpolation to boxes of a few texels, reaching in and out of a texture
// of varied alpha, with every seventh pixel hidden by a matte and so not sampled.
TYPED_TEST(Samplers, PairsGiveTheTexelsOfSingleSamples) {
    using P = TypeParam;
    if (!SY_ProcessorHasAvx2()) GTEST_SKIP();
    auto texture = raster_test::WorldOf<P>(64, 48, [](int32_t i, int32_t j) {
        P p = PatternTexel<P>(i, j);
        p.alpha = PatternTexel<P>(j, i).red;
        return p;
    });
    M_Matrix3 m{};
    m.mat[0][0] = 0.9, m.mat[1][0] = 0.2, m.mat[2][0] = -3;
    m.mat[0][1] = -0.15, m.mat[1][1] = 1.1;
    m.mat[0][2] = -0.006, m.mat[2][2] = 1;
    int32_t paired = 0;
    for (double y : {10.5, 30.5}) {
        SY_SpanSampleState<P> pairs, single;
        for (auto* state : {&pairs, &single}) {
            StartTexture(*texture, Filter::kBilinear, true, state);
            state->mapping.Start(m, 0.5, y, true, 1.0f);
        }
        pairs.texture.pairs = true;
        for (int32_t x = 0; x < 90; ++x, pairs.Step(), single.Step()) {
            if (x % 7 == 3) continue;
            P got, want, next;
            SY_SampleFiltered(pairs, &got);
            SY_SampleFiltered(single, &want);
            EXPECT_TRUE(Equal(got, want)) << x << "," << y;
            const SY_SpanMapping& a = single.mapping;
            SY_SpanMapping b = a;
            b.Step(true);
            paired += sy_sampling::AreaPair(single.texture, a, a.u, a.v, a.w, a.invW, b.u, b.v, b.w,
                                            b.invW, &want, &next);
        }
    }
    EXPECT_GT(paired, 20);
}
