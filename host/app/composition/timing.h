// Motion blur timing: the shutter interval of a frame and the number of samples in it.
#pragma once

#include <cstdint>

#include "composition/composition.h"
#include "t_time.h"

namespace ostrel {

struct ShutterInterval {
    T_Time start;
    T_Time duration;
};

// The shutter opens shutterPhase / 360 of a frame after the frame's time and stays open for
// shutterAngle / 360 of a frame. Exact in T_Time; throws std::overflow_error when the result
// does not fit.
ShutterInterval ShutterIntervalAt(const Composition& comp, T_Time frameTime);

// Geometry samples per frame with motion blur, as the comp states it (1 to 64); the renderer's
// capture clamps it further.
int32_t MotionBlurSamples(const Composition& comp);

}  // namespace ostrel
