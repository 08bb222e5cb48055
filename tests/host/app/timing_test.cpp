#include <gtest/gtest.h>

#include <string>

#include "composition/composition_loader.h"
#include "composition/timing.h"

namespace ostrel {
namespace {

Composition WithRate(const std::string& rate, const std::string& blur) {
    return ParseComposition(R"({"width": 8, "height": 8, "duration": 10, "frameRate": )" + rate +
                                R"(, "motionBlur": )" + blur + "}",
                            "timing_test.json");
}

::testing::AssertionResult SameTime(T_Time actual, T_Time expected) {
    if (T_CompareTimes(&actual, &expected) == 0) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << actual.value << "/" << actual.scale << " is not "
                                         << expected.value << "/" << expected.scale;
}

TEST(Timing, ShutterIntervals) {
    struct Case {
        const char* rate;
        const char* blur;
        int32_t frame;
        T_Time start;
        T_Time duration;
    };
    const Case cases[] = {
        // 360° with no phase at 30000/1001: open from the frame's time for a whole frame.
        {"[30000, 1001]",
         R"({"enabled": true, "shutterAngle": 360, "shutterPhase": 0})",
         3,
         {3003, 30000},
         {1001, 30000}},
        // 720° opening a frame late at 25 fps: frame 0 opens at 1/25 s for 2/25 s.
        {"25", R"({"shutterAngle": 720, "shutterPhase": 360})", 0, {1, 25}, {2, 25}},
        // A closed shutter has no duration.
        {"24", R"({"shutterAngle": 0, "shutterPhase": 0})", 1, {1, 24}, {0, 1}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(std::string(c.rate) + " " + c.blur);
        Composition comp = WithRate(c.rate, c.blur);
        ShutterInterval interval = ShutterIntervalAt(comp, comp.FrameTime(c.frame));
        EXPECT_TRUE(SameTime(interval.start, c.start));
        EXPECT_TRUE(SameTime(interval.duration, c.duration));
    }
}

}  // namespace
}  // namespace ostrel
