#include "cli/arguments.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace ostrel {
namespace {

// Well-formed values reach the program's output (frame count, frame size), where the program
// and reference image tests read them; here, what is refused.
TEST(Arguments, MalformedTextIsRefused) {
    for (const char* bad : {"", "-", "1-", "-1", "a-b", "1-2-3", "48", "0-48", "5-2", "1.5"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseFrameRange(bad, 48), std::invalid_argument);
    }
    EXPECT_NO_THROW(ParseFrameRange("47", 48));
    for (const char* bad : {"", "0", "65", "2x", "x2", "2x2x2", "-2", "two"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseDownsample(bad), std::invalid_argument);
    }
    EXPECT_NO_THROW(ParseDownsample("1x64"));
    for (const char* bad : {"", "1,2,3", "1,2,3,4,5", "1,2,3,x", "1;2;3;4"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseRegion(bad), std::invalid_argument);
    }
    for (const char* bad : {"", "G", "8X", "8GB", "1023K", "-1G", "1e30", "nanG"}) {
        SCOPED_TRACE(bad);
        EXPECT_THROW(ParseMemorySize(bad), std::invalid_argument);
    }
    EXPECT_EQ(ParseMemorySize("1.5G"), int64_t{3} << 29);
    EXPECT_EQ(ParseMemorySize("1048576"), int64_t{1} << 20);
}

}  // namespace
}  // namespace ostrel
