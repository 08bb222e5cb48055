// Which layers the artisan renders at a time, in which order, and over which pixels.
#pragma once

#include <cstdint>
#include <vector>

#include "composition/composition.h"
#include "m_matrix.h"

namespace ostrel {

// Comp indices of the layers the host hands to the artisan at that time: the 3-D image and
// solid layers that are active and do not serve another layer as its track matte, from the
// top of the comp to the bottom. Position i in this list is the layer's render index.
std::vector<int32_t> RenderOrder(const Composition& comp, double seconds);

// The layer's source rectangle in its own pixels (left, top, right, bottom; right and bottom
// exclusive): the image or solid size, empty for layers without pixels. An unbounded solid has
// the comp's size here: frames draw it over the whole output, but a texture the host delivers
// for it covers this rectangle only.
M_LRect SourceBounds(const Layer& layer);

}  // namespace ostrel
