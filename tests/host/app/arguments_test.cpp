#include "cli/arguments.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace ostrel {
namespace {

// Each argument read back as "first,last" (or "x,y", "left,top,right,bottom"); "" where it is
// refused. Frames are checked against a 48-frame comp.
TEST(Arguments, ReadOrRefused) {
    auto frames = [](const char* text) {
        FrameRange r = ParseFrameRange(text, 48);
        return std::to_string(r.first) + "," + std::to_string(r.last);
    };
    auto downsample = [](const char* text) {
        Downsample d = ParseDownsample(text);
        return std::to_string(d.x) + "," + std::to_string(d.y);
    };
    auto region = [](const char* text) {
        M_LRect r = ParseRegion(text);
        return std::to_string(r.left) + "," + std::to_string(r.top) + "," +
               std::to_string(r.right) + "," + std::to_string(r.bottom);
    };
    struct Case {
        std::string (*parse)(const char*);
        const char* text;
        const char* read;
    };
    const Case kCases[] = {
        {frames, "0-47", "0,47"},
        {frames, "12", "12,12"},
        {frames, "3-3", "3,3"},
        {frames, "", ""},
        {frames, "-", ""},
        {frames, "1-", ""},
        {frames, "-1", ""},
        {frames, "a-b", ""},
        {frames, "1-2-3", ""},
        {frames, "48", ""},
        {frames, "0-48", ""},
        {frames, "5-2", ""},
        {frames, "1.5", ""},
        {downsample, "2", "2,2"},
        {downsample, "2x1", "2,1"},
        {downsample, "1x64", "1,64"},
        {downsample, "", ""},
        {downsample, "0", ""},
        {downsample, "65", ""},
        {downsample, "2x", ""},
        {downsample, "x2", ""},
        {downsample, "2x2x2", ""},
        {downsample, "-2", ""},
        {downsample, "two", ""},
        {region, "10,20,300,400", "10,20,300,400"},
        {region, "", ""},
        {region, "1,2,3", ""},
        {region, "1,2,3,4,5", ""},
        {region, "1,2,3,x", ""},
        {region, "1;2;3;4", ""},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.text);
        if (*c.read) {
            EXPECT_EQ(c.parse(c.text), c.read);
        } else {
            EXPECT_THROW(c.parse(c.text), std::invalid_argument);
        }
    }
}

}  // namespace
}  // namespace ostrel
