#include "composition/render_order.h"

namespace ostrel {

std::vector<int32_t> RenderOrder(const Composition& comp, double seconds) {
    std::vector<bool> isMatte(comp.layers.size(), false);
    for (const Layer& layer : comp.layers) {
        if (layer.trackMatte != TrackMatte::kNone)
            isMatte[static_cast<size_t>(layer.matteLayer)] = true;
    }
    // Top to bottom: the renderer moves each layer away from the camera by its render index
    // times 1e-7 in screen depth, so where layers lie in one plane the lower render index is
    // in front. Starting from the top keeps the upper layer in front, as in the comp.
    std::vector<int32_t> order;
    for (size_t i = 0; i < comp.layers.size(); ++i) {
        const Layer& layer = comp.layers[i];
        if (layer.threeD && layer.HasPixels() && !isMatte[i] && layer.IsActiveAt(seconds)) {
            order.push_back(static_cast<int32_t>(i));
        }
    }
    return order;
}

M_LRect SourceBounds(const Layer& layer) {
    if (!layer.HasPixels()) return {0, 0, 0, 0};
    return {0, 0, layer.source.width, layer.source.height};
}

}  // namespace ostrel
