// Image files through OpenImageIO: their size, and their pixels as straight colour.
#pragma once

#include <cstdint>
#include <filesystem>
#include <vector>

namespace ostrel {

struct ImageInfo {
    int32_t width = 0;
    int32_t height = 0;
};

// A decoded image: width × height pixels of four floats (alpha, red, green, blue), straight
// colour, rows top to bottom. Channel values are the file's levels over its maximum.
struct DecodedImage {
    int32_t width = 0;
    int32_t height = 0;
    // True for files of 8 bits per channel, whose 16-bit form follows the host's exact
    // 8-to-16 conversion rather than the float one.
    bool eightBit = false;
    std::vector<float> pixels;
};

// Both throw CompositionError naming the file and the reason when it cannot be read.
ImageInfo ProbeImage(const std::filesystem::path& file);
DecodedImage DecodeImage(const std::filesystem::path& file);

// Whether the file is there and every pixel of it decodes: a frame cut short by a copy or a
// full disk does not.
bool DecodesWhole(const std::filesystem::path& file);

}  // namespace ostrel
