#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "mbuffer_test_support.h"
#include "renderer/mbuffer/shadow_fragments.h"

namespace {

using ostrel_test::AccountedBytesCheck;

std::vector<uint16_t> RedsAt(const SY_ShadowFragmentArray& array, int32_t x, int32_t y) {
    std::vector<uint16_t> reds;
    for (const SY_ShadowFragment* r = *array.HeadAt(x, y); r; r = r->next)
        reds.push_back(r->red);
    return reds;
}

TEST(ShadowFragments, NearestToTheLightFirstAndTiesInArrivalOrder) {
    SY_ShadowFragmentArray array({0, 0, 4, 4});
    const struct {
        uint16_t red;
        float depth;
    } added[] = {{1, 5}, {2, 5}, {3, 9}, {4, 2}, {5, 5}};
    for (const auto& a : added) {
        const PF_Pixel16 color{123, a.red, 7, 8};
        array.AddShadowFragment(&color, a.depth, 0.5f, 0xFFFF, array.HeadAt(1, 2), 0);
    }
    EXPECT_EQ(RedsAt(array, 1, 2), (std::vector<uint16_t>{3, 1, 2, 5, 4}));
    EXPECT_EQ(array.fragmentCount.load(), 5u);
    const SY_ShadowFragment* nearest = *array.HeadAt(1, 2);
    EXPECT_EQ(nearest->green, 7);
    EXPECT_EQ(nearest->blue, 8);
    EXPECT_EQ(nearest->value16, 0xFFFF);
    EXPECT_EQ(nearest->value32, 0.5f);
}

TEST(ShadowFragments, EveryOccluderIsKeptEvenWithoutAlpha) {
    SY_ShadowFragmentArray array({0, 0, 1, 1});
    const PF_Pixel16 clear{0, 0, 0, 0};
    array.AddShadowFragment(&clear, 1.0f, 0.0f, 0, array.HeadAt(0, 0), 0);
    EXPECT_EQ(array.fragmentCount.load(), 1u);
    EXPECT_NE(*array.HeadAt(0, 0), nullptr);
}

TEST(ShadowFragments, CompactionDropsEmptyArraysAndKeepsOrder) {
    AccountedBytesCheck memory;
    SY_ShadowFragmentArrayList list;
    const PF_Pixel16 color{0, 1, 1, 1};
    for (int32_t i = 0; i < 5; ++i) {
        SY_ShadowFragmentArray* array = list.Append({0, 0, i + 1, 1});
        if (i % 2 == 1) array->AddShadowFragment(&color, 1.0f, 0.0f, 0, array->HeadAt(0, 0), 0);
    }
    list.Compact();
    ASSERT_EQ(list.Count(), 2);
    EXPECT_EQ(list[0]->Bounds().right, 2);
    EXPECT_EQ(list[1]->Bounds().right, 4);
    list.Compact();
    EXPECT_EQ(list.Count(), 2);
}

TEST(ShadowFragments, OutOfMemoryWhileAppendingReleasesEverything) {
    int32_t failures = scene_test::FailEachAllocationInTurn([](auto fail) {
        auto failing = fail();
        SY_ShadowFragmentArrayList list;
        for (int32_t i = 0; i < 3; ++i)
            list.Append({0, 0, 8, 8});
    });
    EXPECT_GE(failures, 3 * 4);  // at least object, pool array, pool and head table per array
}

}  // namespace
