#include <gtest/gtest.h>

#include <limits>

#include "t_time.h"

namespace {

TEST(Time, OverflowIsReportedNotWrapped) {
    T_Time big{std::numeric_limits<int32_t>::max(), 1}, out{7, 7};
    EXPECT_EQ(T_MultiplyTime(&big, 2, &out), kT_ErrOverflow);
    EXPECT_EQ(out.value, 7);
    T_Time fine{1, 4000000000u};
    EXPECT_EQ(T_DivideTime(&fine, 3, &out), kT_ErrOverflow);
    T_Time zero{1, 0};
    EXPECT_EQ(T_AddTimes(&zero, &fine, &out), kT_ErrZeroScale);
    EXPECT_EQ(T_DivideTime(&fine, 0, &out), kT_ErrZeroScale);
}

}  // namespace
