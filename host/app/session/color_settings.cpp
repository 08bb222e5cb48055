#include "session/color_settings.h"

namespace ostrel {

uint64_t FrameColorSettings(const Composition&) {
    return 0;
}

}  // namespace ostrel
