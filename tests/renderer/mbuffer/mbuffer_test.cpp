#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <type_traits>
#include <vector>

#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/scene/row_work.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

using renderer_test::AccountedBytesCheck;
using renderer_test::Channels;
using renderer_test::PixelOf;

constexpr M_LRect kRow{0, 0, 16, 1};

template <class P>
class FragmentArrayByDepth : public ::testing::Test {};
TYPED_TEST_SUITE(FragmentArrayByDepth, renderer_test::PixelTypes);

// A source of zero alpha is dropped whatever the coverage; otherwise coverage goes to the
// stored alpha only (colour stays straight), and only a normal-mode record at full alpha is
// opaque.
TYPED_TEST(FragmentArrayByDepth, CoverageFoldsIntoAlphaAndDecidesOpacity) {
    using P = TypeParam;
    using C = SY_Coverage<P>;
    const C full = PF_PixelTraits<P>::kMax, half = full / 2;
    const C justBelow = std::is_floating_point_v<C> ? C(0.9999999f) : C(full - 1);
    struct Case {
        float alpha;
        C coverage;
        int32_t mode;
        bool stored, opaque;
    };
    const Case cases[] = {
        {0, half, 2, false, false}, {0, full, 2, false, false},     {1, 0, 2, true, false},
        {1, full, 2, true, true},   {1, justBelow, 2, true, false}, {1, full, 130, true, false},
        {1, full, 5, true, false},
    };
    SY_FragmentArray<SY_FragmentDraftX<P>> array(kRow);
    for (int32_t x = 0; x < 7; ++x) {
        const Case& c = cases[x];
        const P p = PixelOf<P>(c.alpha, 1, 0.5f, 0.25f);
        array.AddFragment(&p, c.coverage, c.mode, 1.0f, array.HeadAt(x, 0), 0);
        const auto* record = *array.HeadAt(x, 0);
        ASSERT_EQ(record != nullptr, c.stored) << x;
        if (!record) continue;
        EXPECT_EQ(record->color.alpha, c.coverage) << x;  // full alpha times the coverage
        EXPECT_EQ(record->color.red, p.red) << x;
        EXPECT_EQ(record->mode, c.mode) << x;
        EXPECT_EQ(record->opaque, c.opaque) << x;
    }
}

// t / 255 rounded for 8 bits: 255·254 = 64770 → 254; 128·128 = 16384 → 64.25 → 64;
// 1·127 → 0.498 → 0; 1·128 → 0.502 → 1. (a·c + 16383) >> 15 for 16 bits: 1·16384 → 0;
// 1·16385 → 1; 16384·16384 → 8192.
TEST(FragmentArray, AlphaTimesCoverageRoundsToNearest) {
    const int32_t eight[][3] = {{255, 254, 254}, {128, 128, 64}, {1, 127, 0}, {1, 128, 1}};
    for (const auto& [a, c, stored] : eight)
        EXPECT_EQ(SY_ChannelMath<PF_Pixel8>::ScaleByCoverage(a, c), stored) << a << " × " << c;
    const int32_t sixteen[][3] = {{1, 16384, 0}, {1, 16385, 1}, {16384, 16384, 8192}};
    for (const auto& [a, c, stored] : sixteen)
        EXPECT_EQ(SY_ChannelMath<PF_Pixel16>::ScaleByCoverage(a, c), stored) << a << " × " << c;
    // A float alpha that is not a number is not zero: it is stored.
    SY_FragmentArray<SY_FragmentDraftX<PF_PixelFloat>> array(kRow);
    const PF_PixelFloat nan{std::numeric_limits<float>::quiet_NaN(), 0, 0, 0};
    array.AddFragment(&nan, 1.0f, 2, 0.0f, array.HeadAt(0, 0), 0);
    EXPECT_NE(*array.HeadAt(0, 0), nullptr);
}

// Arrival i has depth depths[i]. Object lists ascend (the camera's nearest last), occluder
// lists descend (the light's nearest first); both keep ties in the order they came in. Every
// occluder is kept, even one without alpha.
TEST(FragmentArray, ListsKeepDepthOrderAndTiesInArrivalOrder) {
    const float depths[] = {5, 5, 2, 9, 5};
    SY_FragmentArray<SY_FragmentDraftX<PF_Pixel8>> objects(kRow);
    SY_ShadowFragmentArray occluders(kRow);
    for (uint8_t i = 0; i < 5; ++i) {
        const PF_Pixel8 p{255, i, 0, 0};
        objects.AddFragment(&p, 255, 2, depths[i], objects.HeadAt(7, 0), 0);
        const PF_Pixel16 t{0, i, 7, 8};
        occluders.AddShadowFragment(&t, depths[i], 0.5f, 0xFFFF, occluders.HeadAt(7, 0), 0);
    }
    std::vector<int32_t> objectOrder, occluderOrder;
    objects.Order(objects.HeadAt(7, 0));
    for (auto* r = *objects.HeadAt(7, 0); r; r = r->next)
        objectOrder.push_back(r->color.red);
    for (auto* r = *occluders.HeadAt(7, 0); r; r = r->next)
        occluderOrder.push_back(r->red);
    EXPECT_EQ(objectOrder, (std::vector<int32_t>{2, 0, 1, 4, 3}));
    EXPECT_EQ(occluderOrder, (std::vector<int32_t>{3, 0, 1, 4, 2}));
    EXPECT_EQ(occluders.FragmentCount(), 5u);
}

// Lists short enough to be sorted on the stack and lists longer than that come out alike:
// ascending, ties in arrival order. Arrival i has depth (37·i) mod 5.
TEST(FragmentArray, OrderIsStableForShortAndLongLists) {
    for (int32_t length : {2, 3, 256, 257, 700}) {
        SY_FragmentArray<SY_FragmentDraftX<PF_Pixel16>> array(kRow);
        std::vector<int32_t> expected(static_cast<size_t>(length));
        for (int32_t i = 0; i < length; ++i) {
            const PF_Pixel16 p{32768, static_cast<uint16_t>(i), 0, 0};
            array.AddFragment(&p, 32768, 2, float(i * 37 % 5), array.HeadAt(0, 0), 0);
            expected[i] = i;
        }
        std::stable_sort(expected.begin(), expected.end(),
                         [](int32_t a, int32_t b) { return a * 37 % 5 < b * 37 % 5; });
        array.Order(array.HeadAt(0, 0));
        std::vector<int32_t> order;
        for (auto* r = *array.HeadAt(0, 0); r; r = r->next)
            order.push_back(r->color.red);
        EXPECT_EQ(order, expected) << length;
    }
}

// A plane of W 2 at the pixel centre, falling ¼ per pixel in x and rising ½ in y, and 1 lower
// at shutter close: a draft record keys at the centre at mid-shutter (1.5), an anti-aliased one
// spans the plane's range over the pixel, 2 ∓ ⅜, and a motion-blur one that range over the
// shutter too, from 0.625 to 2.375: the ranges depth groups are made of.
TEST(FragmentRecords, KeysAndExtentsSpanThePlaneOverThePixel) {
    using P = PF_Pixel8;
    EXPECT_FLOAT_EQ(SY_FragmentDraftX<P>::Key(2, -0.25f, 0.5f, -1), 1.5f);
    SY_FragmentAAX<P> aa{};
    aa.depth = SY_FragmentAAX<P>::Key(2, aa.dzdx = -0.25f, aa.dzdy = 0.5f, -1);
    EXPECT_FLOAT_EQ(aa.depth, 1.625f);
    EXPECT_FLOAT_EQ(aa.Extent(), 2.375f);
    SY_FragmentMBX<P> mb{};
    mb.depth = SY_FragmentMBX<P>::Key(2, mb.dzdx = -0.25f, mb.dzdy = 0.5f, mb.dzdt = -1);
    EXPECT_FLOAT_EQ(mb.depth, 0.625f);
    EXPECT_FLOAT_EQ(mb.Extent(), 2.375f);
}

TEST(ShadowFragments, CompactionDropsEmptyArraysAndKeepsOrder) {
    AccountedBytesCheck memory;
    SY_ShadowFragmentArrayList list;
    const PF_Pixel16 t{0, 1, 1, 1};
    for (int32_t i = 0; i < 5; ++i) {
        SY_ShadowFragmentArray* array = list.Append({0, 0, i + 1, 1});
        if (i % 2 == 1) array->AddShadowFragment(&t, 1.0f, 0.0f, 0, array->HeadAt(0, 0), 0);
    }
    list.Compact();
    ASSERT_EQ(list.Count(), 2);
    EXPECT_EQ(list[0]->Bounds().right, 2);
    EXPECT_EQ(list[1]->Bounds().right, 4);
}

// Four workers draw the rows of one draft buffer through their own pools, eight layers a row,
// layer l at key (37·l) mod 8 so that each list's order differs from the order of drawing.
using Buffer = SY_MBufferDraftX<PF_Pixel16>;
constexpr M_LRect kBounds{3, 5, 131, 133};  // 128 × 128 pixels: 49 blocks of records

void DrawRow(const void* closure, int32_t row, int32_t, int32_t thread) {
    Buffer* buffer = *static_cast<Buffer* const*>(closure);
    for (uint16_t layer = 0; layer < 8; ++layer) {
        const PF_Pixel16 color{32768, layer, 0, 0};
        for (int32_t x = kBounds.left; x < kBounds.right; ++x)
            buffer->AddFragment(&color, 32768, 2, float(layer * 37 % 8), buffer->HeadAt(x, row),
                                thread);
    }
}

TEST(FragmentArrayThreads, WorkersFillOneBufferThroughTheirOwnPools) {
    AccountedBytesCheck memory;
    renderer_test::ThreadedFrame<4> frame;
    auto owner = SY_MBuffer::New(kBounds, 16, false, false);
    Buffer* buffer = static_cast<Buffer*>(owner.get());
    ASSERT_EQ(buffer->PoolCount(), 4);
    EXPECT_EQ(buffer->Pool(3).lock, SY_GetAllocationLock());
    renderer_test::RecordingProgress progress;
    SY_RunRowWork({frame.iterate, &progress, kBounds.top, 128, 0, &DrawRow, &buffer});
    int32_t wrong = 0;
    for (int32_t y = kBounds.top; y < kBounds.bottom; ++y) {
        for (int32_t x = kBounds.left; x < kBounds.right; ++x) {
            int32_t count = 0;
            buffer->Order(buffer->HeadAt(x, y));
            for (const Buffer::Record* r = *buffer->HeadAt(x, y); r; r = r->next, ++count)
                wrong += r->depth != float(count) || r->color.red * 37 % 8 != count;
            wrong += count != 8;
        }
    }
    EXPECT_EQ(wrong, 0);
}

TEST(MBufferDraft, ProgressAtRowsThatAreMultiplesOf32) {
    struct Case {
        M_LRect bounds;
        std::vector<std::pair<int32_t, int32_t>> reports;
    };
    const Case cases[] = {
        {{0, 0, 2, 70}, {{0, 70}, {32, 70}, {64, 70}}},
        {{0, 40, 2, 100}, {{24, 60}, {56, 60}}},  // a band from row 40 first reports at 64
        {{0, 33, 2, 63}, {}},
    };
    for (const Case& c : cases) {
        PF_WorldX<PF_Pixel8> world(2, c.bounds.bottom);
        SY_MBufferDraftX<PF_Pixel8> buffer(c.bounds);
        renderer_test::RecordingProgress progress;
        buffer.Resolve(&progress, nullptr, world);
        EXPECT_EQ(progress.rows, c.reports) << "rows from " << c.bounds.top;
    }
}

// A draft blends plainly whatever tables it is handed: half-alpha red over opaque blue is
// 255 − 127.5 → 128 red and 127 blue. A cancel thrown from the report before row 32 leaves
// the rows above it resolved.
TEST(MBufferDraft, ResolveBlendsWithoutTablesAndStopsAtACancel) {
    struct Cancel : renderer_test::RecordingProgress {
        void ReportRows(int32_t row, int32_t) override {
            if (row > 0) throw int32_t{7};
        }
    } cancel;
    PF_LinearBlendingTables tables;
    PF_BuildLinearBlendingTablesGamma(2.2f, &tables);
    PF_WorldX<PF_Pixel8> world(1, 64);
    world.At(0, 0) = {255, 0, 0, 255};
    SY_MBufferDraftX<PF_Pixel8> buffer({0, 0, 1, 64});
    const PF_Pixel8 red{255, 255, 0, 0}, halfRed{128, 255, 0, 0};
    for (int32_t y = 0; y < 64; ++y)
        buffer.AddFragment(y ? &red : &halfRed, 255, 2, 0.0f, buffer.HeadAt(0, y), 0);
    EXPECT_THROW(buffer.Resolve(&cancel, &tables, world), int32_t);
    EXPECT_EQ(Channels(world.At(0, 0)), Channels(PF_Pixel8{255, 128, 0, 127}));
    EXPECT_EQ(Channels(world.At(0, 31)), Channels(red));
    EXPECT_EQ(Channels(world.At(0, 32)), Channels(PF_Pixel8{}));
}

// A draft buffer made with three render threads, each filling a row one record longer than a
// block holds: records never straddle blocks, so each row takes two.
void FillBuffer() {
    constexpr int32_t kPerBlock = kSY_FragmentRecordBytes / sizeof(Buffer::Record);
    auto owner = SY_MBuffer::New({0, 0, kPerBlock + 1, 3}, 16, false, false);
    auto* buffer = static_cast<Buffer*>(owner.get());
    const PF_Pixel16 p{32768, 1, 2, 3};
    for (int32_t y = 0; y < 3; ++y) {
        for (int32_t x = 0; x <= kPerBlock; ++x)
            buffer->AddFragment(&p, 32768, 2, 0.0f, buffer->HeadAt(x, y), y);
    }
}

// A column of three pixels of an anti-aliased or motion-blur buffer (whose records take their
// travel over the shutter as well), one per thread, each of three crossing records, resolved.
template <class B, float... kTravel>
void FillAndResolveSplitting() {
    auto owner = SY_MBuffer::New({0, 0, 1, 3}, 16, true, sizeof...(kTravel) > 0);
    auto* buffer = static_cast<B*>(owner.get());
    const PF_Pixel16 p{32768, 1, 2, 3};
    for (int32_t y = 0; y < 3; ++y) {
        for (float slope : {-1.0f, 1.0f, 0.5f})
            buffer->AddFragment(&p, 32768, 2, -0.5f, slope, 0.0f, kTravel..., buffer->HeadAt(0, y),
                                y);
    }
    PF_Pixel16 pixels[3] = {};
    PF_World world(1, 3, sizeof(PF_Pixel16), 16, pixels);
    buffer->Resolve(nullptr, nullptr, world);
}

void AppendShadowArrays() {
    SY_ShadowFragmentArrayList list;
    for (int32_t i = 0; i < 3; ++i)
        list.Append({0, 0, 8, 8});
}

// Every allocation of each piece of work failed in turn: each failure is error 4 and leaves
// nothing allocated.
TEST(MBuffer, OutOfMemoryAnywhereReleasesEverything) {
    renderer_test::ThreadedFrame<3> frame;
    const struct {
        const char* what;
        void (*work)();
        int32_t failures;
    } cases[] = {
        // Object, pool array, three pools, head table, two blocks in each pool.
        {"draft buffer", &FillBuffer, 1 + 1 + 3 + 1 + 6},
        // Object, pool array, three pools, head table, a block in each pool, and the eight
        // stores of the resolve that splits pixels.
        {"anti-aliased buffer", &FillAndResolveSplitting<SY_MBufferAAX<PF_Pixel16>>,
         1 + 1 + 3 + 1 + 3 + 8},
        // The same, and the list of instants the motion-blur resolve composites at.
        {"motion-blur buffer", &FillAndResolveSplitting<SY_MBufferMBX<PF_Pixel16>, 0.0f>,
         1 + 1 + 3 + 1 + 3 + 9},
        // Per array: object, pool array, three pools, head table, the pools' record counts;
        // the list grows to 1, 2, 4.
        {"shadow arrays", &AppendShadowArrays, 3 * 7 + 3},
    };
    for (const auto& c : cases) {
        int32_t failures = renderer_test::FailEachAllocationInTurn([&](auto fail) {
            auto failing = fail();
            c.work();
        });
        EXPECT_EQ(failures, c.failures) << c.what;
    }
}

}  // namespace
