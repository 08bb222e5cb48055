#include <gtest/gtest.h>

#include <string>

#include "host/lib/pixel_test_support.h"
#include "pf_draw.h"

namespace {

using pixel_test::Unit;

template <class P>
class DrawLine : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(DrawLine, PixelTypes);

const PF_PixelFloat kWhite = {1, 1, 1, 1};

template <class P>
double AlphaSum(const PF_WorldX<P>& world) {
    double sum = 0;
    for (int32_t y = 0; y < world.height; ++y) {
        for (int32_t x = 0; x < world.width; ++x)
            sum += Unit<P>(world.At(x, y).alpha);
    }
    return sum;
}

// A line along pixel centres fills exactly the pixels it runs through.
TYPED_TEST(DrawLine, AlongPixelCentres) {
    using P = TypeParam;
    PF_WorldX<P> world(10, 8);
    PF_DrawLine(world, 2.5, 3.5, 7.5, 3.5, kWhite);
    for (int32_t y = 0; y < 8; ++y) {
        for (int32_t x = 0; x < 10; ++x) {
            bool on = y == 3 && x >= 2 && x <= 7;
            EXPECT_EQ(Unit<P>(world.At(x, y).alpha), on ? 1.0 : 0.0) << x << "," << y;
            if (on) {
                EXPECT_EQ(Unit<P>(world.At(x, y).red), 1.0);
            }
        }
    }
    PF_WorldX<P> column(4, 9);
    PF_DrawLine(column, 1.5, 8.5, 1.5, 0.5, kWhite);
    EXPECT_DOUBLE_EQ(AlphaSum(column), 9.0);
}

// Between two rows the line is shared by both; the coverage of each column adds up to one.
TYPED_TEST(DrawLine, CoverageIsShared) {
    using P = TypeParam;
    PF_WorldX<P> world(10, 8);
    PF_DrawLine(world, 1.5, 4.0, 8.5, 4.0, kWhite);
    EXPECT_NEAR(Unit<P>(world.At(4, 3).alpha), 0.5, 1.0 / 255);
    EXPECT_NEAR(Unit<P>(world.At(4, 4).alpha), 0.5, 1.0 / 255);
    PF_WorldX<P> diagonal(10, 10);
    PF_DrawLine(diagonal, 0.5, 0.5, 9.5, 6.5, kWhite);
    for (int32_t x = 0; x < 10; ++x) {
        double column = 0;
        for (int32_t y = 0; y < 10; ++y)
            column += Unit<P>(diagonal.At(x, y).alpha);
        EXPECT_NEAR(column, 1.0, 2.0 / 255) << "column " << x;
    }
}

TYPED_TEST(DrawLine, OutsideTheWorldIsSkipped) {
    using P = TypeParam;
    PF_WorldX<P> world(6, 6);
    PF_DrawLine(world, -10, -5, 20, -5, kWhite);
    PF_DrawLine(world, -1e9, 2.5, 1e9, 2.5, kWhite);
    // The second line crosses the whole world on row 2, and nothing else.
    EXPECT_NEAR(AlphaSum(world), 6.0, 1e-6);
    PF_DrawLine(world, 0.0, std::nan(""), 3, 3, kWhite);
    EXPECT_NEAR(AlphaSum(world), 6.0, 1e-6);
}

}  // namespace
