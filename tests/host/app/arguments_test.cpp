#include "cli/arguments.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <tuple>

namespace ostrel {
namespace {

TEST(Arguments, FrameRanges) {
    struct Case {
        const char* text;
        int32_t first, last;
    };
    for (const Case& c : {Case{"0-47", 0, 47}, Case{"12", 12, 12}, Case{"3-3", 3, 3}}) {
        SCOPED_TRACE(c.text);
        FrameRange range = ParseFrameRange(c.text, 48);
        EXPECT_EQ(std::tuple(range.first, range.last), std::tuple(c.first, c.last));
    }
    for (const char* bad : {"", "-", "1-", "-1", "a-b", "1-2-3", "48", "0-48", "5-2", "1.5"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseFrameRange(bad, 48), std::invalid_argument);
    }
}

TEST(Arguments, DownsampleFactors) {
    struct Case {
        const char* text;
        int16_t x, y;
    };
    for (const Case& c : {Case{"2", 2, 2}, Case{"2x1", 2, 1}, Case{"1x64", 1, 64}}) {
        SCOPED_TRACE(c.text);
        Downsample factors = ParseDownsample(c.text);
        EXPECT_EQ(std::tuple(factors.x, factors.y), std::tuple(c.x, c.y));
    }
    for (const char* bad : {"", "0", "65", "2x", "x2", "2x2x2", "-2", "two"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseDownsample(bad), std::invalid_argument);
    }
}

TEST(Arguments, Regions) {
    M_LRect region = ParseRegion("10,20,300,400");
    EXPECT_EQ(std::tuple(region.left, region.top, region.right, region.bottom),
              std::tuple(10, 20, 300, 400));
    for (const char* bad : {"", "1,2,3", "1,2,3,4,5", "1,2,3,x", "1;2;3;4"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseRegion(bad), std::invalid_argument);
    }
}

}  // namespace
}  // namespace ostrel
