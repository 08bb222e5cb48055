// The matrix and time libraries: results worked by hand, and what cannot be computed reported
// rather than wrapped.
#include <gtest/gtest.h>

#include <limits>

#include "m_matrix.h"
#include "t_time.h"

namespace {

TEST(Matrix, SingularInverseFails) {
    M_Matrix3 flat{}, out;
    EXPECT_EQ(M_InverseMatrix(&flat, &out), kM_ErrSingularMatrix);
}

TEST(Matrix, TranslateMatrix3MovesMappedPoints) {
    M_Matrix3 m;
    M_SetIdentityMatrix(&m);
    m.mat[0][2] = 0.5;  // a homography with w = 1 + x/2
    ASSERT_EQ(M_TranslateMatrix(&m, -0.5, -0.5), 0);
    // (x, y, 1) = (2, 4, 1): U = 2 − 0.5·2, W = 2 → U/W = 1 − 0.5.
    double u = 2 * m.mat[0][0] + 4 * m.mat[1][0] + m.mat[2][0];
    double w = 2 * m.mat[0][2] + 4 * m.mat[1][2] + m.mat[2][2];
    EXPECT_DOUBLE_EQ(u / w, 0.5);
}

TEST(Matrix, ConvexHullDropsInteriorAndCollinearPoints) {
    const M_Point2 points[] = {{0, 0}, {2, 0}, {1, 0}, {2, 2}, {0, 2}, {1, 1}, {0, 2}};
    M_Point2 hull[7];
    int32_t count = 0;
    ASSERT_EQ(M_ComputeConvexHull(7, points, &count, hull), 0);
    ASSERT_EQ(count, 4);
    double area = 0;
    for (int i = 0; i < count; ++i) {
        const M_Point2& a = hull[i];
        const M_Point2& b = hull[(i + 1) % count];
        area += a.x * b.y - b.x * a.y;
    }
    EXPECT_DOUBLE_EQ(area / 2, 4);  // counter-clockwise in a y-up frame: positive area
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
