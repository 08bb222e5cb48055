#include "composition/composition.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace ostrel {

int32_t Composition::FrameCount() const {
    double frames = duration * frameRate.numerator / frameRate.denominator;
    return std::max<int32_t>(1, static_cast<int32_t>(std::llround(frames)));
}

T_Time Composition::FrameTime(int32_t frame) const {
    T_Time step = FrameDuration();
    T_Time time{};
    if (T_MultiplyTime(&step, frame, &time) != 0) {
        throw std::overflow_error(
            file.string() + ": frame " + std::to_string(frame) + ": its time, " +
            std::to_string(frame) + " × " + std::to_string(frameRate.denominator) + "/" +
            std::to_string(frameRate.numerator) + " s, is beyond what a time value can hold");
    }
    return time;
}

int32_t Composition::LayerIndex(std::string_view name) const {
    auto found = std::find_if(layers.begin(), layers.end(),
                              [name](const Layer& layer) { return layer.name == name; });
    return found == layers.end() ? -1 : static_cast<int32_t>(found - layers.begin());
}

}  // namespace ostrel
