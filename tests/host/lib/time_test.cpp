#include <gtest/gtest.h>

#include <limits>

#include "t_time.h"

namespace {

TEST(Time, ArithmeticIsExact) {
    T_Time a{1, 3}, b{1, 6}, out{};
    ASSERT_EQ(T_AddTimes(&a, &b, &out), 0);
    EXPECT_EQ(out.value, 1);
    EXPECT_EQ(out.scale, 2u);
    T_Time frame{1001, 24000};
    ASSERT_EQ(T_DivideTime(&frame, 64, &out), 0);
    EXPECT_EQ(out.value, 1001);
    EXPECT_EQ(out.scale, 1536000u);
    ASSERT_EQ(T_MultiplyTime(&out, 64, &out), 0);
    EXPECT_EQ(T_CompareTimes(&out, &frame), 0);
    T_Time negative{-5, 10};
    ASSERT_EQ(T_AddTimes(&negative, &a, &out), 0);
    EXPECT_EQ(out.value, -1);
    EXPECT_EQ(out.scale, 6u);
}

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
