#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "mbuffer_test_support.h"
#include "renderer/mbuffer/mbuffer.h"

namespace {

using ostrel_test::AccountedBytesCheck;
using ostrel_test::PixelIs;
using ostrel_test::PixelOf;
using ostrel_test::RecordingProgress;

TEST(MBuffer, QualityFollowsTheFlags) {
    struct Case {
        bool antialias, motionBlur;
        SY_MBufferQuality quality;
    };
    using Q = SY_MBufferQuality;
    const Case cases[] = {
        {false, false, Q::kDraft},
        {true, false, Q::kAntialiased},
        {false, true, Q::kMotionBlur},
        {true, true, Q::kMotionBlur},
    };
    for (const Case& c : cases)
        EXPECT_EQ(SY_MBufferQualityFor(c.antialias, c.motionBlur), c.quality)
            << c.antialias << c.motionBlur;
}

// Best-quality requests get a buffer whose class answers for itself, so the spans add to it
// with the AddFragment its answers choose; a draft request gets the draft buffer of its depth.
TEST(MBuffer, EveryRequestGetsABufferThatDescribesItself) {
    AccountedBytesCheck memory;
    for (int16_t depth : {8, 16, 32}) {
        for (bool antialias : {false, true}) {
            for (bool motionBlur : {false, true}) {
                SCOPED_TRACE(testing::Message() << depth << antialias << motionBlur);
                auto buffer = SY_MBuffer::New({0, 0, 4, 4}, depth, antialias, motionBlur);
                ASSERT_NE(buffer, nullptr);
                EXPECT_EQ(buffer->GetBitDepth(), depth);
                auto* container = dynamic_cast<PF_PixelContainerBase*>(buffer.get());
                ASSERT_NE(container, nullptr);
                EXPECT_EQ(container->GetBitDepth(), buffer->GetBitDepth());
                if (!antialias && !motionBlur) {
                    EXPECT_FALSE(buffer->IsAntialiased());
                }
                if (buffer->IsAntialiased()) continue;
                EXPECT_FALSE(buffer->HasMotionBlur());
                bool draft = dynamic_cast<SY_MBufferDraftX<PF_Pixel8>*>(buffer.get()) ||
                             dynamic_cast<SY_MBufferDraftX<PF_Pixel16>*>(buffer.get()) ||
                             dynamic_cast<SY_MBufferDraftX<PF_PixelFloat>*>(buffer.get());
                EXPECT_TRUE(draft);
            }
        }
    }
}

template <class P>
class MBufferDraftByDepth : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(MBufferDraftByDepth, PixelTypes);

// Two opaque layers crossing over a row of eight pixels: A's key is x + 0.25, B's 7.25 − x, so B
// is nearer (larger key) up to x = 3 and A from x = 4. Whichever layer is drawn first, each
// pixel shows the nearer one; pixels outside the buffer stay as they were.
TYPED_TEST(MBufferDraftByDepth, CrossingLayersShowTheNearerOneAtEachPixel) {
    using P = TypeParam;
    using Buffer = SY_MBufferDraftX<P>;
    const P red = PixelOf<P>(1, 1, 0, 0), blue = PixelOf<P>(1, 0, 0, 1);
    const P grey = PixelOf<P>(1, 0.5f, 0.5f, 0.5f);
    const auto full = static_cast<SY_Coverage<P>>(PF_PixelTraits<P>::kMax);
    for (bool aFirst : {true, false}) {
        AccountedBytesCheck memory;
        PF_WorldX<P> world(10, 3);
        for (int32_t y = 0; y < 3; ++y) {
            for (int32_t x = 0; x < 10; ++x)
                world.At(x, y) = grey;
        }
        {
            auto owner = SY_MBuffer::New({1, 1, 9, 2}, PF_PixelTraits<P>::kBitDepth, false, false);
            auto* buffer = static_cast<Buffer*>(owner.get());
            for (int32_t pass = 0; pass < 2; ++pass) {
                const bool a = (pass == 0) == aFirst;
                for (int32_t x = 1; x < 9; ++x) {
                    const float key = a ? (x - 1) + 0.25f : 7.25f - (x - 1);
                    buffer->AddFragment(a ? &red : &blue, full, 2, key, buffer->HeadAt(x, 1), 0);
                }
            }
            owner->Resolve(nullptr, nullptr, world);
        }
        for (int32_t x = 1; x < 9; ++x)
            EXPECT_TRUE(PixelIs(world.At(x, 1), x - 1 <= 3 ? blue : red)) << "x " << x;
        EXPECT_TRUE(PixelIs(world.At(0, 1), grey));
        EXPECT_TRUE(PixelIs(world.At(9, 1), grey));
        EXPECT_TRUE(PixelIs(world.At(4, 0), grey));
    }
}

TYPED_TEST(MBufferDraftByDepth, KeepAlphaChangesColorNotAlpha) {
    using P = TypeParam;
    PF_WorldX<P> world(2, 1);
    const P halfGrey = PixelOf<P>(0.5f, 0.5f, 0.5f, 0.5f);
    world.At(0, 0) = halfGrey;
    world.At(1, 0) = halfGrey;
    SY_MBufferDraftX<P> buffer({0, 0, 2, 1});
    const P red = PixelOf<P>(1, 1, 0, 0);
    const auto full = static_cast<SY_Coverage<P>>(PF_PixelTraits<P>::kMax);
    buffer.AddFragment(&red, full, 2 | 128, 0.0f, buffer.HeadAt(0, 0), 0);
    buffer.AddFragment(&red, full, 2, 0.0f, buffer.HeadAt(1, 0), 0);
    buffer.Resolve(nullptr, nullptr, world);
    EXPECT_TRUE(PixelIs(world.At(0, 0), PixelOf<P>(0.5f, 1, 0, 0)));
    EXPECT_TRUE(PixelIs(world.At(1, 0), red));
}

// A draft resolve blends the tables never: with them the result is the same.
TEST(MBufferDraft, ResolveIgnoresBlendingTables) {
    PF_LinearBlendingTables tables;
    PF_BuildLinearBlendingTablesGamma(2.2f, &tables);
    const PF_Pixel8 half{128, 255, 0, 0};
    std::vector<PF_Pixel8> results;
    for (const PF_LinearBlendingTables* t :
         {static_cast<PF_LinearBlendingTables*>(nullptr), &tables}) {
        PF_WorldX<PF_Pixel8> world(1, 1);
        world.At(0, 0) = {255, 0, 0, 255};
        SY_MBufferDraftX<PF_Pixel8> buffer({0, 0, 1, 1});
        buffer.AddFragment(&half, 255, 2, 0.0f, buffer.HeadAt(0, 0), 0);
        buffer.Resolve(nullptr, t, world);
        results.push_back(world.At(0, 0));
    }
    EXPECT_TRUE(PixelIs(results[1], results[0]));
    EXPECT_TRUE(PixelIs(results[0], PF_Pixel8{255, 128, 0, 127}));
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
        RecordingProgress progress;
        buffer.Resolve(&progress, nullptr, world);
        EXPECT_EQ(progress.rows, c.reports) << "rows from " << c.bounds.top;
    }
}

TEST(MBufferDraft, CancelFromProgressEndsTheResolve) {
    struct Cancel : SY_ProgressAbort {
        void ReportRenderables(int32_t, int32_t) override {}
        void ReportRows(int32_t row, int32_t) override {
            if (row > 0) throw int32_t{7};
        }
    } cancel;
    PF_WorldX<PF_Pixel8> world(1, 64);
    SY_MBufferDraftX<PF_Pixel8> buffer({0, 0, 1, 64});
    const PF_Pixel8 red{255, 255, 0, 0};
    for (int32_t y = 0; y < 64; ++y)
        buffer.AddFragment(&red, 255, 2, 0.0f, buffer.HeadAt(0, y), 0);
    EXPECT_THROW(buffer.Resolve(&cancel, nullptr, world), int32_t);
    EXPECT_TRUE(PixelIs(world.At(0, 31), red));
    EXPECT_TRUE(PixelIs(world.At(0, 32), PF_Pixel8{}));
}

TEST(MBuffer, OutOfMemoryAnywhereReleasesEverything) {
    using Buffer = SY_MBufferDraftX<PF_Pixel16>;
    constexpr int32_t kPerBlock = kSY_FragmentRecordBytes / sizeof(Buffer::Record);
    const M_LRect bounds{0, 0, kPerBlock, 3};  // three full blocks
    const PF_Pixel16 p{32768, 1, 2, 3};
    int32_t failures = scene_test::FailEachAllocationInTurn([&](auto fail) {
        auto failing = fail();
        auto owner = SY_MBuffer::New(bounds, 16, false, false);
        auto* buffer = static_cast<Buffer*>(owner.get());
        for (int32_t y = 0; y < bounds.bottom; ++y) {
            for (int32_t x = 0; x < bounds.right; ++x)
                buffer->AddFragment(&p, 32768, 2, 0.0f, buffer->HeadAt(x, y), 0);
        }
    });
    EXPECT_EQ(failures, 1 + 1 + 1 + 1 + 3);  // object, pool array, pool, head table, blocks
}

// Lists of 0 to 3 opaque records over a row of five: the nearest (largest key) shows, whatever
// the order of adding, and the empty pixel keeps what it had.
TEST(MBufferDraft, ListsOfEveryLengthBlendFarthestFirst) {
    const PF_Pixel8 colors[] = {{255, 255, 0, 0}, {255, 0, 255, 0}, {255, 0, 0, 255}};
    const int32_t lengths[] = {0, 1, 2, 3, 1};
    PF_WorldX<PF_Pixel8> world(5, 1);
    const PF_Pixel8 before{128, 10, 20, 30};
    for (int32_t x = 0; x < 5; ++x)
        world.At(x, 0) = before;
    SY_MBufferDraftX<PF_Pixel8> buffer({0, 0, 5, 1});
    for (int32_t x = 0; x < 5; ++x) {
        for (int32_t k = lengths[x] - 1; k >= 0; --k)  // nearest first
            buffer.AddFragment(&colors[k], 255, 2, static_cast<float>(k), buffer.HeadAt(x, 0), 0);
    }
    buffer.Resolve(nullptr, nullptr, world);
    EXPECT_TRUE(PixelIs(world.At(0, 0), before));
    for (int32_t x = 1; x < 5; ++x)
        EXPECT_TRUE(PixelIs(world.At(x, 0), colors[lengths[x] - 1])) << "x " << x;
}

}  // namespace
