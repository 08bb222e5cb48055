// The values of the program's options that need more than a number: frame ranges, downsample
// factors, regions and sizes of memory. Each parser throws std::invalid_argument with a message for
// the user.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "m_matrix.h"

namespace ostrel {

struct FrameRange {
    int32_t first = 0;
    int32_t last = 0;  // included
};

// "A-B" or "A", frames counted from 0; both ends must lie below frameCount.
FrameRange ParseFrameRange(const std::string& text, int32_t frameCount);

struct Downsample {
    int16_t x = 1;
    int16_t y = 1;
};

// "N" for both directions or "XxY", each 1 to 64.
Downsample ParseDownsample(const std::string& text);

// "LEFT,TOP,RIGHT,BOTTOM" in comp pixels, right and bottom exclusive.
M_LRect ParseRegion(const std::string& text);

// Frames as ranges: 3, 4, 5, 9 → "3-5, 9".
std::string FrameList(const std::vector<int32_t>& frames);

// A size of memory in bytes: a number, whole or not, with K, M, G or T for powers of 1024
// ("512M", "1.5G"), at least a megabyte.
int64_t ParseMemorySize(const std::string& text);

}  // namespace ostrel
