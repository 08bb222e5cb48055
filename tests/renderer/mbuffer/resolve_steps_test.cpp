#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "mbuffer_test_support.h"
#include "renderer/mbuffer/depth_groups.h"
#include "renderer/mbuffer/pair_mix.h"
#include "renderer/mbuffer/record_apply.h"
#include "renderer/mbuffer/records.h"
#include "renderer/mbuffer/region_writeback.h"

namespace {

using ostrel_test::PixelIs;
using ostrel_test::PixelOf;

template <class P>
SY_FragmentAAX<P> RecordOf(const P& color, uint8_t mode) {
    SY_FragmentAAX<P> record{};
    record.color = color;
    record.mode = mode;
    return record;
}

TEST(ResolveSteps, ApplyingHonoursTheKeepAlphaBit) {
    SY_RecordApplier<PF_Pixel8> applier(nullptr);
    PF_Pixel8 pixel{0, 0, 0, 0};
    applier.Apply(PF_Pixel8{255, 10, 20, 30}, 2 | 128, &pixel);
    EXPECT_TRUE(PixelIs(pixel, PF_Pixel8{0, 10, 20, 30}));
    applier.Apply(PF_Pixel8{255, 40, 50, 60}, 2, &pixel);
    EXPECT_TRUE(PixelIs(pixel, PF_Pixel8{255, 40, 50, 60}));
}

// Depth ranges [depth, extent] chain: a record joins while its depth is not beyond the largest
// extent so far.
TEST(ResolveSteps, DepthGroupsChainOverlappingRanges) {
    struct Range {
        float depth, dzdx, dzdy;
    };
    struct Case {
        std::vector<Range> list;
        std::vector<int32_t> groups;
    };
    const Case cases[] = {
        {{{0, 0, 0}}, {1}},
        {{{0, 1, 0}, {1, 0, 0}, {2, 0, 0}}, {2, 1}},            // touching ends share a group
        {{{0, 1, 0}, {1.5f, 0, 0}}, {1, 1}},                    // a gap parts them
        {{{0, 3, 0}, {0.5f, 0, 0}, {2, 0, 0}}, {3}},            // the first one's reach holds
        {{{0, -1, 0.5f}, {1.5f, 0, 0}, {1.6f, 0, 0}}, {2, 1}},  // |dzdx| + |dzdy| = 1.5
        {{{2, 0, 0}, {2, 0, 0}, {2, 0, 0}}, {3}},               // equal flat records
    };
    for (const Case& c : cases) {
        std::vector<SY_FragmentAAX<PF_Pixel8>> records(c.list.size());
        for (size_t i = 0; i < records.size(); ++i) {
            records[i].depth = c.list[i].depth;
            records[i].dzdx = c.list[i].dzdx;
            records[i].dzdy = c.list[i].dzdy;
            records[i].next = i + 1 < records.size() ? &records[i + 1] : nullptr;
        }
        std::vector<int32_t> groups;
        for (auto* first = records.data(); first;) {
            auto group = SY_NextDepthGroup(first);
            groups.push_back(group.count);
            first = group.after;
        }
        EXPECT_EQ(groups, c.groups) << "list of " << c.list.size();
    }
}

TEST(ResolveSteps, MotionBlurExtentIncludesShutterTravel) {
    SY_FragmentMBX<PF_Pixel16> a{}, b{};
    a.depth = 0;
    a.dzdt = -2;  // reaches 2
    b.depth = 2;
    a.next = &b;
    EXPECT_EQ(SY_NextDepthGroup(&a).count, 2);
    a.dzdt = -1.5f;
    EXPECT_EQ(SY_NextDepthGroup(&a).count, 1);
}

// Opaque red A and opaque blue B over transparent black: T1 (A in front) is red, T2 blue.
template <class P>
class PairMixByDepth : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(PairMixByDepth, PixelTypes);

TYPED_TEST(PairMixByDepth, EndsReproduceEachOrderExactly) {
    using P = TypeParam;
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    const P red = PixelOf<P>(1, 1, 0, 0), blue = PixelOf<P>(1, 0, 0, 1);
    const P translucentGreen = PixelOf<P>(0.5f, 0, 1, 0);
    const auto a = RecordOf(red, 2), b = RecordOf(blue, 2);
    for (const PF_LinearBlendingTables* tables : {static_cast<PF_LinearBlendingTables*>(nullptr),
                                                  static_cast<PF_LinearBlendingTables*>(&gamma)}) {
        for (const P& start : {P{}, translucentGreen}) {
            P d = start;
            SY_MixTwoRecords(a, b, 0.0f, tables, &d);
            EXPECT_TRUE(PixelIs(d, red)) << "f = 0, tables " << (tables != nullptr);
            d = start;
            SY_MixTwoRecords(a, b, 1.0f, tables, &d);
            EXPECT_TRUE(PixelIs(d, blue)) << "f = 1, tables " << (tables != nullptr);
        }
    }
}

// Halfway without tables: 8-bit w = 127, so red 255 − round(255·127/255) = 128 and blue 127;
// 16-bit w = 16384 halves 32768 exactly; float halves.
TYPED_TEST(PairMixByDepth, HalfwayWithoutTables) {
    using P = TypeParam;
    const P red = PixelOf<P>(1, 1, 0, 0), blue = PixelOf<P>(1, 0, 0, 1);
    P d{};
    SY_MixTwoRecords(RecordOf(red, 2), RecordOf(blue, 2), 0.5f, nullptr, &d);
    P expected;
    if constexpr (PF_PixelTraits<P>::kBitDepth == 8)
        expected = {255, 128, 0, 127};
    else
        expected = PixelOf<P>(1, 0.5f, 0, 0.5f);
    EXPECT_TRUE(PixelIs(d, expected));
}

// With tables the 8-bit mix halves linear light: 32768 / 2 = 16384 comes back through the
// inverse table at 16384 / 8 = 2048, then to 8 bits.
TEST(ResolveSteps, EightBitMixHalvesLinearLight) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    PF_Pixel8 d{};
    SY_MixTwoRecords(RecordOf(PF_Pixel8{255, 255, 0, 0}, 2), RecordOf(PF_Pixel8{255, 0, 0, 255}, 2),
                     0.5f, &gamma, &d);
    const auto half = static_cast<uint8_t>((gamma.inverse[2048] * 255 + 16384) >> 15);
    EXPECT_TRUE(PixelIs(d, PF_Pixel8{255, half, 0, half}));
    EXPECT_GT(half, 128) << "half the light is brighter than half the code";
}

TEST(ResolveSteps, MixKeepsEachRecordsKeepAlphaBit) {
    // A keeps the alpha beneath. T1 = black + B (alpha 255) + A (alpha stays 255): red.
    // T2 = black + A (red, alpha stays 0) + B: blue at 255.
    const auto a = RecordOf(PF_Pixel8{255, 255, 0, 0}, 2 | 128);
    const auto b = RecordOf(PF_Pixel8{255, 0, 0, 255}, 2);
    PF_Pixel8 d{};
    SY_MixTwoRecords(a, b, 0.0f, nullptr, &d);
    EXPECT_TRUE(PixelIs(d, PF_Pixel8{255, 255, 0, 0}));
    PF_Pixel8 keptAlpha{};
    SY_RecordApplier<PF_Pixel8>(nullptr).Apply(a, &keptAlpha);
    EXPECT_TRUE(PixelIs(keptAlpha, PF_Pixel8{0, 255, 0, 0}));
}

// 32768 · 255 = 255 · 2^15: k = 255, r = 0, so forward[255] exactly. 16384 · 255 gives k = 127
// and r = 16384, halfway between forward[127] and forward[128].
TEST(ResolveSteps, SixteenBitChannelsLinearizeBetweenTableEntries) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    const PF_Pixel16 p{12345, 32768, 16384, 0};
    const PF_Pixel16 linear = SY_LinearSpace<PF_Pixel16>::ToLinear(p, gamma);
    EXPECT_EQ(linear.alpha, 12345) << "alpha is kept";
    EXPECT_EQ(linear.red, gamma.forward[255]);
    const uint32_t f127 = gamma.forward[127], f128 = gamma.forward[128];
    EXPECT_EQ(linear.green, f127 + ((16384 * (f128 - f127) + 16384) >> 15));
    EXPECT_EQ(linear.blue, 0);
    EXPECT_EQ(SY_LinearSpace<PF_Pixel16>::FromLinear(PF_Pixel16{1, 32768, 0, 8}, gamma).red,
              gamma.inverse[4096]);
}

TEST(ResolveSteps, EightBitLinearizationConvertsAlphaExactly) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    const PF_Pixel16 linear = SY_LinearSpace<PF_Pixel8>::ToLinear(PF_Pixel8{255, 0, 1, 255}, gamma);
    EXPECT_EQ(linear.alpha, 32768);
    EXPECT_EQ(linear.green, gamma.forward[1]);
    const PF_Pixel8 back = SY_LinearSpace<PF_Pixel8>::FromLinear(linear, gamma);
    EXPECT_TRUE(PixelIs(back, PF_Pixel8{255, 0, 1, 255}));
}

TEST(ResolveSteps, FloatLinearizationLeavesNegativesAndAlpha) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.0f, &gamma);
    const PF_PixelFloat linear =
        SY_LinearSpace<PF_PixelFloat>::ToLinear(PF_PixelFloat{0.5f, 0.5f, -0.25f, 2.0f}, gamma);
    EXPECT_TRUE(PixelIs(linear, PF_PixelFloat{0.5f, 0.25f, -0.25f, 4.0f}));
}

// Two regions over transparent black: a quarter shows opaque red, three quarters opaque blue.
TEST(ResolveSteps, RegionsAddByArea) {
    const auto red = RecordOf(PF_Pixel8{255, 255, 0, 0}, 2);
    const auto blue = RecordOf(PF_Pixel8{255, 0, 0, 255}, 2);
    const SY_FragmentAAX<PF_Pixel8>* redOnly[] = {&red};
    const SY_FragmentAAX<PF_Pixel8>* blueOverRed[] = {&blue, &red};  // front to back
    SY_RegionAccumulator<PF_Pixel8> sum(PF_Pixel8{}, nullptr);
    sum.AddRegion(0.25, redOnly, 1);
    sum.AddRegion(0.75, blueOverRed, 2);
    sum.AddRegion(0.0, blueOverRed, 0);
    PF_Pixel8 d{};
    sum.WriteTo(&d);
    // Red 0.25 · 255 = 63.75 → 64; blue 0.75 · 255 = 191.25 → 191.
    EXPECT_TRUE(PixelIs(d, PF_Pixel8{255, 64, 0, 191}));
}

template <class P>
class RegionWritebackByDepth : public ::testing::Test {};
TYPED_TEST_SUITE(RegionWritebackByDepth, PixelTypes);

TYPED_TEST(RegionWritebackByDepth, AllRegionsWithoutAlphaTurnTransparentBlack) {
    using P = TypeParam;
    const P before = PixelOf<P>(0, 0.8f, 0.4f, 0.2f);  // colour, but no alpha
    const auto clear = RecordOf(PixelOf<P>(0, 1, 1, 1), 2);
    const SY_FragmentAAX<P>* list[] = {&clear};
    SY_RegionAccumulator<P> sum(before, nullptr);
    sum.AddRegion(0.5, list, 1);
    sum.AddRegion(0.5, list, 0);
    P d = PixelOf<P>(1, 1, 1, 1);
    sum.WriteTo(&d);
    EXPECT_TRUE(PixelIs(d, P{}));
}

TEST(ResolveSteps, FloatAlphaJustAboveOneIsWrittenAsOne) {
    const auto white = RecordOf(PF_PixelFloat{1, 1, 1, 1}, 2);
    const SY_FragmentAAX<PF_PixelFloat>* list[] = {&white};
    SY_RegionAccumulator<PF_PixelFloat> sum(PF_PixelFloat{}, nullptr);
    sum.AddRegion(0.5, list, 1);
    sum.AddRegion(0.5000001, list, 1);
    PF_PixelFloat d{};
    sum.WriteTo(&d);
    EXPECT_EQ(d.alpha, 1.0f);
    EXPECT_GT(d.red, 1.0f) << "colour is not clamped";
}

}  // namespace
