#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "renderer/mbuffer/depth_groups.h"
#include "renderer/mbuffer/fragment_array.h"
#include "renderer/mbuffer/pair_mix.h"
#include "renderer/mbuffer/region_writeback.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

using renderer_test::Channels;
using renderer_test::PixelOf;

template <class P>
SY_FragmentAAX<P> RecordOf(const P& color, uint8_t mode = 2) {
    SY_FragmentAAX<P> record{};
    record.color = color;
    record.mode = mode;
    return record;
}

// Depth ranges [depth, extent] chain: a record joins while its depth is not beyond the largest
// extent so far; the extent takes in the plane's slopes and its travel over the shutter, which
// the array keeps with each record.
TEST(ResolveSteps, DepthGroupsChainOverlappingRanges) {
    struct Case {
        std::vector<std::array<float, 4>> list;  // depth, dzdx, dzdy, dzdt
        std::vector<int32_t> groups;
    };
    const Case cases[] = {
        {{{0, 0, 0, 0}}, {1}},
        {{{0, 1, 0, 0}, {1, 0, 0, 0}, {2, 0, 0, 0}}, {2, 1}},            // touching ends join
        {{{0, 1, 0, 0}, {1.5f, 0, 0, 0}}, {1, 1}},                       // a gap parts them
        {{{0, 3, 0, 0}, {0.5f, 0, 0, 0}, {2, 0, 0, 0}}, {3}},            // the first one's reach
        {{{0, -1, 0.5f, 0}, {1.5f, 0, 0, 0}, {1.6f, 0, 0, 0}}, {2, 1}},  // |dzdx| + |dzdy|
        {{{2, 0, 0, 0}, {2, 0, 0, 0}, {2, 0, 0, 0}}, {3}},               // equal flat records
        {{{0, 0, 0, -2}, {2, 0, 0, 0}}, {2}},                            // the shutter travel
        {{{0, 0, 0, -1.5f}, {2, 0, 0, 0}}, {1, 1}},
    };
    for (const Case& c : cases) {
        SY_FragmentArray<SY_FragmentMBX<PF_Pixel16>> array({0, 0, 1, 1});
        const PF_Pixel16 p{32768, 0, 0, 0};
        for (const auto& [depth, dzdx, dzdy, dzdt] : c.list)
            array.AddFragment(&p, 32768, 2, depth, dzdx, dzdy, dzdt, array.HeadAt(0, 0), 0);
        std::vector<int32_t> groups;
        array.Order(array.HeadAt(0, 0));
        for (auto* first = *array.HeadAt(0, 0); first;) {
            auto group = SY_NextDepthGroup(first);
            groups.push_back(group.count);
            first = group.after;
        }
        EXPECT_EQ(groups, c.groups) << "case " << &c - cases;
    }
    SY_FragmentArray<SY_FragmentAAX<PF_Pixel16>> aa({0, 0, 1, 1});  // keeps the plane, no travel
    const PF_Pixel16 p{32768, 0, 0, 0};
    aa.AddFragment(&p, 32768, 2, 4.0f, 0.5f, -0.25f, aa.HeadAt(0, 0), 0);
    EXPECT_EQ((*aa.HeadAt(0, 0))->Extent(), 4.0f + 0.5f + 0.25f);
}

template <class P>
class PairMixByDepth : public ::testing::Test {};
TYPED_TEST_SUITE(PairMixByDepth, renderer_test::PixelTypes);

// Opaque red A and opaque blue B: A in front all the way (f = 0) is red and B (f = 1) blue,
// exactly, with or without tables, over translucent green. Halfway without tables: 8-bit
// w = 127, so red 255 − round(255·127/255) = 128 and blue 127; 16-bit and float halve exactly.
TYPED_TEST(PairMixByDepth, EndsReproduceEachOrderAndHalfwayMixes) {
    using P = TypeParam;
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    const P red = PixelOf<P>(1, 1, 0, 0), blue = PixelOf<P>(1, 0, 0, 1);
    for (const PF_LinearBlendingTables* tables : {&gamma, static_cast<decltype(&gamma)>(nullptr)}) {
        for (float f : {0.0f, 1.0f}) {
            P d = PixelOf<P>(0.5f, 0, 1, 0);
            SY_MixTwoRecords(RecordOf(red), RecordOf(blue), f, tables, &d);
            EXPECT_EQ(Channels(d), Channels(f == 0 ? red : blue)) << f << " " << !!tables;
        }
    }
    P d{};
    SY_MixTwoRecords(RecordOf(red), RecordOf(blue), 0.5f, nullptr, &d);
    const bool eightBit = PF_PixelTraits<P>::kBitDepth == 8;
    EXPECT_EQ(Channels(d), Channels(eightBit ? P{255, 128, 0, 127} : PixelOf<P>(1, 0.5f, 0, 0.5f)));
}

// With tables the 8-bit mix halves linear light: 32768 / 2 = 16384 comes back through the
// inverse table at 16384 / 8 = 2048, then to 8 bits. A record keeping the alpha beneath keeps
// it in the mix: black + half-alpha B (alpha 128) + A (alpha stays 128) is red at 128.
TEST(ResolveSteps, EightBitMixInLinearLightAndKeepingAlpha) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    const auto a = RecordOf(PF_Pixel8{255, 255, 0, 0}), b = RecordOf(PF_Pixel8{255, 0, 0, 255});
    PF_Pixel8 d{};
    SY_MixTwoRecords(a, b, 0.5f, &gamma, &d);
    const auto half = static_cast<uint8_t>((gamma.inverse[2048] * 255 + 16384) >> 15);
    EXPECT_EQ(Channels(d), Channels(PF_Pixel8{255, half, 0, half}));
    EXPECT_GT(half, 128) << "half the light is brighter than half the code";
    d = {};
    SY_MixTwoRecords(RecordOf(a.color, 2 | 128), RecordOf(PF_Pixel8{128, 0, 0, 255}), 0.0f, nullptr,
                     &d);
    EXPECT_EQ(Channels(d), Channels(PF_Pixel8{128, 255, 0, 0}));
}

// 16-bit: 32768 · 255 = 255 · 2^15 gives forward[255] exactly; 16384 · 255 lies halfway
// between forward[127] and forward[128]. Float raises colour to the exponent and leaves
// negatives and alpha.
TEST(ResolveSteps, LinearizationOfWideChannels) {
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    using Linear16 = SY_LinearSpace<PF_Pixel16>;
    const uint32_t f127 = gamma.forward[127], f128 = gamma.forward[128];
    EXPECT_EQ(Channels(Linear16::ToLinear(PF_Pixel16{12345, 32768, 16384, 0}, gamma)),
              Channels(PF_Pixel16{12345, gamma.forward[255],
                                  uint16_t(f127 + ((16384 * (f128 - f127) + 16384) >> 15)), 0}));
    EXPECT_EQ(Linear16::FromLinear(PF_Pixel16{1, 32768, 0, 8}, gamma).red, gamma.inverse[4096]);

    PF_BuildLinearBlendingTablesGamma(2.0f, &gamma);
    EXPECT_EQ(Channels(SY_LinearSpace<PF_PixelFloat>::ToLinear({0.5f, 0.5f, -0.25f, 2}, gamma)),
              Channels(PF_PixelFloat{0.5f, 0.25f, -0.25f, 4}));
}

// Regions over transparent black add by area: a quarter showing opaque red and three quarters
// blue over red give red 0.25 · 255 = 63.75 → 64 and blue 191.25 → 191. A region without
// alpha adds nothing, not even its colour.
TEST(ResolveSteps, RegionsAddByArea) {
    const auto red = RecordOf(PF_Pixel8{255, 255, 0, 0});
    const auto blue = RecordOf(PF_Pixel8{255, 0, 0, 255});
    const auto clear = RecordOf(PF_Pixel8{0, 255, 255, 255});
    const SY_FragmentAAX<PF_Pixel8>* blueOverRed[] = {&blue, &red};  // front to back
    const SY_FragmentAAX<PF_Pixel8>* clearOnly[] = {&clear};
    SY_RegionAccumulator<PF_Pixel8> sum(PF_Pixel8{}, nullptr);
    sum.AddRegion(0.25, blueOverRed + 1, 1);
    sum.AddRegion(0.75, blueOverRed, 2);
    sum.AddRegion(0.0, blueOverRed, 0);
    sum.AddRegion(0.5, clearOnly, 1);
    PF_Pixel8 d{};
    sum.WriteTo(&d);
    EXPECT_EQ(Channels(d), Channels(PF_Pixel8{255, 64, 0, 191}));

    // Float alpha summed a hair above one is written as one; colour is not clamped.
    const auto white = RecordOf(PF_PixelFloat{1, 1, 1, 1});
    const SY_FragmentAAX<PF_PixelFloat>* whiteOnly[] = {&white};
    SY_RegionAccumulator<PF_PixelFloat> over(PF_PixelFloat{}, nullptr);
    over.AddRegion(0.5, whiteOnly, 1);
    over.AddRegion(0.5000001, whiteOnly, 1);
    PF_PixelFloat f{};
    over.WriteTo(&f);
    EXPECT_EQ(f.alpha, 1.0f);
    EXPECT_GT(f.red, 1.0f);
}

}  // namespace
