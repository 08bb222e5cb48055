// Compositions from arbitrary bytes: the loader either builds a model or throws its one kind of
// error, and the model answers every query a render makes at the first, middle and last frame.
// The composition stands beside the cards example (run from the repository), so that the
// seeds' images are found.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <string_view>

#include "composition/composition_error.h"
#include "composition/composition_loader.h"
#include "composition/render_order.h"
#include "composition/transform.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace ostrel;
    Composition comp;
    try {
        comp = ParseComposition(std::string_view(reinterpret_cast<const char*>(data), size),
                                "examples/cards/fuzzed.json");
    } catch (const CompositionError&) {
        return 0;
    }
    const int32_t frames = comp.FrameCount();
    for (int32_t frame : {0, frames / 2, std::max(frames - 1, 0)}) {
        double seconds = 0;
        try {
            T_Time time = comp.FrameTime(frame);
            seconds = static_cast<double>(time.value) / time.scale;
        } catch (const std::overflow_error&) {
            continue;  // reported to the user by name; nothing to query
        }
        ActiveCamera(comp, seconds);
        for (int32_t layer : RenderOrder(comp, seconds))
            LayerToWorld(comp, layer, seconds);
    }
    return 0;
}
