// The instants of a frame at which moving geometry is sampled.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "t_time.h"

inline constexpr int32_t kORM_MinMotionBlurSamples = 2;
inline constexpr int32_t kORM_MaxMotionBlurSamples = 64;

// The comp's shutter when its motion blur is on.
struct ORM_Shutter {
    T_Time start;
    T_Time duration;
    int32_t samples;  // as the comp asks; clamped to 2..64
};

// Without a shutter, the render time alone; with one, n = clamped samples instants from the
// shutter's start, duration / n apart (its end is not sampled). A time the host's time library
// cannot hold is thrown as its error code.
std::vector<T_Time> ORM_SampleTimes(const T_Time& renderTime,
                                    const std::optional<ORM_Shutter>& shutter);
