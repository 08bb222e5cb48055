// The host's time library: exact arithmetic on rational times.
#pragma once

#include <cstdint>

// A time as an exact fraction: seconds = value / scale.
struct T_Time {
    int32_t value;
    uint32_t scale;
};

// The time library's error codes.
inline constexpr int32_t kT_ErrOverflow = 0x1201;
inline constexpr int32_t kT_ErrZeroScale = 0x1202;

// Each gives the exact result in the smallest scale that holds it, or kT_ErrOverflow when it
// cannot be held in a T_Time, or kT_ErrZeroScale for a time of scale 0 or a division by 0.
int32_t T_AddTimes(const T_Time* a, const T_Time* b, T_Time* sum);
int32_t T_MultiplyTime(const T_Time* t, int32_t factor, T_Time* product);
int32_t T_DivideTime(const T_Time* t, int32_t divisor, T_Time* quotient);

// Compares two times exactly: negative, 0 or positive.
int32_t T_CompareTimes(const T_Time* a, const T_Time* b);

// The time in seconds, for display and for interpolating keyframes.
double T_Seconds(const T_Time& t);
