#include "sample_times.h"

#include <algorithm>

#include "suite_table.h"

std::vector<T_Time> ORM_SampleTimes(const T_Time& renderTime,
                                    const std::optional<ORM_Shutter>& shutter) {
    if (!shutter) return {renderTime};
    int32_t count =
        std::clamp(shutter->samples, kORM_MinMotionBlurSamples, kORM_MaxMotionBlurSamples);
    T_Time step;
    ORM_Check(T_DivideTime(&shutter->duration, count, &step));
    std::vector<T_Time> times(static_cast<size_t>(count));
    for (int32_t i = 0; i < count; ++i) {
        T_Time offset;
        ORM_Check(T_MultiplyTime(&step, i, &offset));
        ORM_Check(T_AddTimes(&shutter->start, &offset, &times[static_cast<size_t>(i)]));
    }
    return times;
}
