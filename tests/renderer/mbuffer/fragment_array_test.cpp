#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <limits>
#include <type_traits>
#include <vector>

#include "mbuffer_test_support.h"
#include "renderer/mbuffer/fragment_array.h"

namespace {

using ostrel_test::AccountedBytesCheck;
using ostrel_test::PixelOf;

constexpr M_LRect kRow{0, 0, 16, 1};

template <class F>
std::vector<const F*> ListAt(const SY_FragmentArray<F>& array, int32_t x, int32_t y) {
    std::vector<const F*> list;
    for (const F* r = *array.HeadAt(x, y); r; r = r->next)
        list.push_back(r);
    return list;
}

template <class P>
class FragmentArrayByDepth : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(FragmentArrayByDepth, PixelTypes);

TYPED_TEST(FragmentArrayByDepth, ZeroAlphaIsDroppedWhateverTheCoverage) {
    using P = TypeParam;
    using F = SY_FragmentDraftX<P>;
    AccountedBytesCheck memory;
    SY_FragmentArray<F> array(kRow);
    const P clear = PixelOf<P>(0, 1, 1, 1);
    for (float coverage : {0.0f, 0.5f, 1.0f}) {
        const auto c = static_cast<SY_Coverage<P>>(coverage * PF_PixelTraits<P>::kMax);
        array.AddFragment(&clear, c, 2, 1.0f, array.HeadAt(3, 0), 0);
    }
    EXPECT_EQ(*array.HeadAt(3, 0), nullptr);
    EXPECT_EQ(array.Pool(0).firstBlock, nullptr) << "nothing carved";
}

TYPED_TEST(FragmentArrayByDepth, NonZeroAlphaAtZeroCoverageIsStoredTransparent) {
    using P = TypeParam;
    using F = SY_FragmentDraftX<P>;
    SY_FragmentArray<F> array(kRow);
    const P red = PixelOf<P>(1, 1, 0, 0);
    array.AddFragment(&red, 0, 2, 1.0f, array.HeadAt(0, 0), 0);
    const F* record = *array.HeadAt(0, 0);
    ASSERT_NE(record, nullptr);
    EXPECT_EQ(record->color.alpha, 0);
    EXPECT_EQ(record->color.red, red.red) << "colour is straight: coverage goes to alpha only";
    EXPECT_FALSE(record->opaque);
}

TYPED_TEST(FragmentArrayByDepth, EqualDepthsKeepTheOrderTheyCameIn) {
    using P = TypeParam;
    using F = SY_FragmentDraftX<P>;
    SY_FragmentArray<F> array(kRow);
    const auto full = static_cast<SY_Coverage<P>>(PF_PixelTraits<P>::kMax);
    // Told apart by their red channel: A, B at depth 5, C at 2, D at 9, E at 5 again.
    const struct {
        float red;
        float depth;
    } added[] = {{0.1f, 5}, {0.2f, 5}, {0.3f, 2}, {0.4f, 9}, {0.5f, 5}};
    for (const auto& a : added) {
        const P p = PixelOf<P>(1, a.red, 0, 0);
        array.AddFragment(&p, full, 2, a.depth, array.HeadAt(7, 0), 0);
    }
    std::vector<typename PF_PixelTraits<P>::Channel> order;
    for (const F* r : ListAt(array, 7, 0))
        order.push_back(r->color.red);
    auto red = [](float v) { return PixelOf<P>(0, v, 0, 0).red; };
    EXPECT_EQ(order, (decltype(order){red(0.3f), red(0.1f), red(0.2f), red(0.5f), red(0.4f)}));
}

// Alpha × coverage stored in a record of an array of type P, for each case {alpha, coverage,
// stored}.
template <class P, class C>
void ExpectStoredAlpha(const std::vector<std::array<C, 3>>& cases) {
    SY_FragmentArray<SY_FragmentDraftX<P>> array(kRow);
    for (const auto& [alpha, coverage, stored] : cases) {
        P p{alpha, 9, 9, 9};
        auto** head = array.HeadAt(0, 0);
        array.AddFragment(&p, coverage, 2, 0.0f, head, 0);
        EXPECT_EQ((*head)->color.alpha, stored) << +alpha << " × " << +coverage;
        *head = nullptr;
    }
}

TEST(FragmentArray, AlphaTimesCoverageRoundsToNearest) {
    // t / 255 rounded: 255·254 = 64770 → 254; 128·128 = 16384 → 64.25 → 64; 1·127 → 0.498 → 0;
    // 1·128 → 0.502 → 1; 3·85 = 255 → 1.
    ExpectStoredAlpha<PF_Pixel8, uint8_t>(
        {{255, 255, 255}, {255, 254, 254}, {128, 128, 64}, {1, 127, 0}, {1, 128, 1}, {3, 85, 1}});
    // (a·c + 16383) >> 15: 1·16384 → 0; 1·16385 → 1; 32768·32768 → 32768; 16384·16384 → 8192.
    ExpectStoredAlpha<PF_Pixel16, uint16_t>(
        {{1, 16384, 0}, {1, 16385, 1}, {32768, 32768, 32768}, {16384, 16384, 8192}});
}

TEST(FragmentArray, OpaqueOnlyInNormalModeAtFullAlpha) {
    struct Case {
        uint8_t coverage;
        int32_t mode;
        bool opaque;
    };
    const Case cases[] = {
        {255, 2, true}, {254, 2, false}, {255, 130, false}, {255, 5, false}, {255, 0, false}};
    SY_FragmentArray<SY_FragmentDraftX<PF_Pixel8>> array(kRow);
    const PF_Pixel8 p{255, 1, 2, 3};
    for (const Case& c : cases) {
        auto** head = array.HeadAt(1, 0);
        array.AddFragment(&p, c.coverage, c.mode, 0.0f, head, 0);
        EXPECT_EQ((*head)->opaque, c.opaque) << "coverage " << +c.coverage << " mode " << c.mode;
        EXPECT_EQ((*head)->mode, static_cast<uint8_t>(c.mode));
        *head = nullptr;
    }
}

TYPED_TEST(FragmentArrayByDepth, OpaqueNeedsFullCoverageAtEveryDepth) {
    using P = TypeParam;
    using C = SY_Coverage<P>;
    SY_FragmentArray<SY_FragmentDraftX<P>> array(kRow);
    const P p = PixelOf<P>(1, 0.1f, 0.2f, 0.3f);
    const C full = PF_PixelTraits<P>::kMax;
    const C justBelow = std::is_floating_point_v<C> ? C(0.9999999f) : C(full - 1);
    array.AddFragment(&p, full, 2, 0.0f, array.HeadAt(0, 0), 0);
    array.AddFragment(&p, justBelow, 2, 0.0f, array.HeadAt(1, 0), 0);
    EXPECT_TRUE((*array.HeadAt(0, 0))->opaque);
    EXPECT_FALSE((*array.HeadAt(1, 0))->opaque);
}

TEST(FragmentArray, FloatAlphaThatIsNotANumberIsStored) {
    SY_FragmentArray<SY_FragmentDraftX<PF_PixelFloat>> array(kRow);
    const PF_PixelFloat p{std::numeric_limits<float>::quiet_NaN(), 0, 0, 0};
    array.AddFragment(&p, 1.0f, 2, 0.0f, array.HeadAt(0, 0), 0);
    EXPECT_NE(*array.HeadAt(0, 0), nullptr);
}

TEST(FragmentArray, GradientRecordsKeepTheirPlanes) {
    SY_FragmentArray<SY_FragmentAAX<PF_Pixel16>> aa(kRow);
    const PF_Pixel16 p{32768, 1, 2, 3};
    aa.AddFragment(&p, 16384, 130, 4.0f, 0.5f, -0.25f, aa.HeadAt(2, 0), 0);
    const auto* a = *aa.HeadAt(2, 0);
    EXPECT_EQ(a->color.alpha, 16384);
    EXPECT_EQ(a->mode, 130);
    EXPECT_EQ(a->depth, 4.0f);
    EXPECT_EQ(a->dzdx, 0.5f);
    EXPECT_EQ(a->dzdy, -0.25f);
    EXPECT_EQ(a->Extent(), 4.75f);

    SY_FragmentArray<SY_FragmentMBX<PF_PixelFloat>> mb(kRow);
    const PF_PixelFloat q{1.0f, 0.5f, 0.5f, 0.5f};
    mb.AddFragment(&q, 1.0f, 2, 1.0f, -0.5f, 0.25f, -2.0f, mb.HeadAt(2, 0), 0);
    mb.AddFragment(&q, 1.0f, 2, 0.5f, 0.0f, 0.0f, 0.0f, mb.HeadAt(2, 0), 0);
    const auto* first = *mb.HeadAt(2, 0);
    EXPECT_EQ(first->depth, 0.5f);
    ASSERT_NE(first->next, nullptr);
    EXPECT_EQ(first->next->dzdt, -2.0f);
    EXPECT_EQ(first->next->Extent(), 3.75f);
    EXPECT_TRUE(first->opaque);
}

TEST(FragmentArray, HeadsAreAddressedInOutputCoordinates) {
    SY_FragmentArray<SY_FragmentDraftX<PF_Pixel8>> array({100, 40, 110, 45});
    EXPECT_EQ(array.HeadAt(101, 40), array.HeadAt(100, 40) + 1);
    EXPECT_EQ(array.HeadAt(100, 41), array.HeadAt(100, 40) + 10);
    const PF_Pixel8 p{255, 0, 0, 0};
    array.AddFragment(&p, 255, 2, 0.0f, array.HeadAt(109, 44), 0);
    EXPECT_NE(*array.HeadAt(109, 44), nullptr);
    EXPECT_EQ(*array.HeadAt(108, 44), nullptr);
}

// 24-byte records: 2,730 fit in the 65,536 bytes of a block, the last 16 bytes stay unused.
TEST(FragmentArray, RecordsNeverStraddleBlocks) {
    using F = SY_FragmentDraftX<PF_Pixel8>;
    constexpr int32_t kPerBlock = kSY_FragmentRecordBytes / sizeof(F);
    static_assert(kPerBlock == 2730);
    AccountedBytesCheck memory;
    SY_FragmentArray<F> array({0, 0, kPerBlock + 1, 1});
    const int64_t built = memory.Taken();
    const SY_FragmentPool& pool = array.Pool(0);
    EXPECT_EQ(pool.firstBlock, nullptr);
    const PF_Pixel8 p{255, 1, 2, 3};
    array.AddFragment(&p, 255, 2, 0.0f, array.HeadAt(0, 0), 0);
    void* first = pool.firstBlock;
    ASSERT_NE(first, nullptr);
    EXPECT_EQ(memory.Taken() - built, int64_t{kSY_FragmentBlockBytes});
    EXPECT_EQ(static_cast<void*>(*array.HeadAt(0, 0)), static_cast<char*>(first) + 8);
    for (int32_t x = 1; x < kPerBlock; ++x)
        array.AddFragment(&p, 255, 2, 0.0f, array.HeadAt(x, 0), 0);
    EXPECT_EQ(pool.currentBlock, first);
    EXPECT_EQ(pool.bytesLeft, 16);
    array.AddFragment(&p, 255, 2, 0.0f, array.HeadAt(kPerBlock, 0), 0);
    void* second = *static_cast<void**>(first);
    ASSERT_NE(second, nullptr);
    EXPECT_EQ(pool.currentBlock, second);
    EXPECT_EQ(*static_cast<void**>(second), nullptr);
    EXPECT_EQ(static_cast<void*>(*array.HeadAt(kPerBlock, 0)), static_cast<char*>(second) + 8);
    EXPECT_EQ(memory.Taken() - built, 2 * int64_t{kSY_FragmentBlockBytes});
}

TEST(FragmentArray, WithoutSharedLockAPoolLocksNothing) {
    SY_FragmentPool pool(nullptr);
    EXPECT_EQ(pool.lock, &pool.ownLock);
    EXPECT_TRUE(pool.ownLock.singleThreaded.load());
}

TEST(FragmentArray, OnePoolPerRenderThread) {
    ostrel_test::ThreadedFrame<3> frame;
    SY_FragmentArray<SY_FragmentDraftX<PF_Pixel8>> array(kRow);
    ASSERT_EQ(array.PoolCount(), 3);
    EXPECT_EQ(array.Pool(2).lock, SY_GetAllocationLock());
}

// Every allocation of building and filling an array, failed in turn: each failure is error 4
// and leaves nothing allocated.
TEST(FragmentArray, OutOfMemoryAnywhereReleasesEverything) {
    ostrel_test::ThreadedFrame<3> frame;
    using F = SY_FragmentAAX<PF_Pixel8>;
    constexpr int32_t kPerBlock = kSY_FragmentRecordBytes / sizeof(F);
    const M_LRect bounds{0, 0, kPerBlock, 12};  // rows fill whole blocks: four per pool
    const PF_Pixel8 p{255, 1, 2, 3};
    int32_t failures = scene_test::FailEachAllocationInTurn([&](auto fail) {
        auto failing = fail();
        SY_FragmentArray<F> array(bounds);
        for (int32_t y = 0; y < bounds.bottom; ++y) {
            for (int32_t x = 0; x < bounds.right; ++x)
                array.AddFragment(&p, 255, 2, 1.0f, 0.0f, 0.0f, array.HeadAt(x, y), y % 3);
        }
    });
    // Pool array, three pools, head table, twelve blocks.
    EXPECT_EQ(failures, 1 + 3 + 1 + 12);
}

}  // namespace
