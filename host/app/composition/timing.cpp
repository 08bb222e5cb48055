#include "composition/timing.h"

#include <stdexcept>

namespace ostrel {
namespace {

// Degrees of a frame as a time: frameDuration × degrees / 360.
T_Time FrameFraction(const Composition& comp, int32_t degrees) {
    T_Time frame = comp.FrameDuration();
    T_Time scaled{};
    T_Time result{};
    if (T_MultiplyTime(&frame, degrees, &scaled) != 0 || T_DivideTime(&scaled, 360, &result) != 0) {
        throw std::overflow_error(comp.file.string() +
                                  ": the shutter's time is beyond what a time value can hold");
    }
    return result;
}

}  // namespace

ShutterInterval ShutterIntervalAt(const Composition& comp, T_Time frameTime) {
    ShutterInterval interval{};
    T_Time offset = FrameFraction(comp, comp.motionBlur.shutterPhase);
    if (T_AddTimes(&frameTime, &offset, &interval.start) != 0) {
        throw std::overflow_error(comp.file.string() +
                                  ": the shutter's time is beyond what a time value can hold");
    }
    interval.duration = FrameFraction(comp, comp.motionBlur.shutterAngle);
    return interval;
}

int32_t MotionBlurSamples(const Composition& comp) {
    return comp.motionBlur.samplesPerFrame;
}

}  // namespace ostrel
