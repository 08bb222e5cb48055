// A layer's properties by the host's stream numbers (QNGP_Stream), the way the stream suite
// serves them.
#pragma once

#include <array>
#include <cstdint>

#include "composition/composition.h"
#include "qngp_suites.h"

namespace ostrel {

// Up to four components: x, y, z for points and scales; alpha, red, green, blue for colours.
struct StreamVector {
    std::array<double, 4> values{};
    int32_t count = 0;
};

// True when the layer has that stream: transforms on every layer (anchor point, scale and
// opacity only on layers with pixels and nulls), materials on image and solid layers, the
// camera's streams on cameras, the light's on lights.
bool HasStream(const Layer& layer, int32_t stream);

// The stream's value at that time. Throws std::out_of_range for a stream the layer lacks.
StreamVector StreamValues(const Layer& layer, int32_t stream, double seconds);

// The first component of StreamValues: the whole value of a one-dimensional stream.
double StreamValue(const Layer& layer, int32_t stream, double seconds);

}  // namespace ostrel
