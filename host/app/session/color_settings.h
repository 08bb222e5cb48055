#pragma once

#include <cstdint>

#include "composition/composition.h"

namespace ostrel {

uint64_t FrameColorSettings(const Composition& comp);

}  // namespace ostrel
