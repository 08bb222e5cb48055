#include "sample_times.h"

#include <gtest/gtest.h>

#include <optional>
#include <vector>

namespace {

// Times compared exactly, whatever their scales.
void ExpectTimes(const std::vector<T_Time>& actual, const std::vector<T_Time>& expected) {
    ASSERT_EQ(actual.size(), expected.size());
    for (size_t i = 0; i < actual.size(); ++i) {
        EXPECT_EQ(T_CompareTimes(&actual[i], &expected[i]), 0)
            << "sample " << i << ": " << actual[i].value << "/" << actual[i].scale;
    }
}

TEST(SampleTimes, WithoutMotionBlurTheRenderTimeAlone) {
    ExpectTimes(ORM_SampleTimes({5, 24}, std::nullopt), {{5, 24}});
}

TEST(SampleTimes, CountsBelowThreeGiveStartAndHalfway) {
    // A shutter opening at 1/24 s for 1/48 s: samples at 1/24 and 1/24 + 1/96 = 5/96.
    for (int32_t samples : {0, 1, 2, -3}) {
        SCOPED_TRACE(samples);
        ExpectTimes(ORM_SampleTimes({5, 24}, ORM_Shutter{{1, 24}, {1, 48}, samples}),
                    {{1, 24}, {5, 96}});
    }
}

TEST(SampleTimes, ThreeToSixtyFourSpacedDurationOverCountFromTheStart) {
    ExpectTimes(ORM_SampleTimes({0, 1}, ORM_Shutter{{0, 1}, {3, 10}, 3}),
                {{0, 10}, {1, 10}, {2, 10}});
    // 64/600 s over 64 samples: 1/600 s apart, the end not sampled; a hundred give the same.
    std::vector<T_Time> expected;
    for (int32_t i = 0; i < 64; ++i)
        expected.push_back({60 + i, 600});
    for (int32_t samples : {64, 100}) {
        SCOPED_TRACE(samples);
        ExpectTimes(ORM_SampleTimes({0, 1}, ORM_Shutter{{1, 10}, {64, 600}, samples}), expected);
    }
}

TEST(SampleTimes, TimeThatCannotBeHeldIsThrown) {
    int32_t thrown = 0;
    try {
        ORM_SampleTimes({0, 1}, ORM_Shutter{{0, 1}, {1, 0}, 4});
    } catch (int32_t code) {
        thrown = code;
    }
    EXPECT_EQ(thrown, kT_ErrZeroScale);
}

}  // namespace
