#include <gtest/gtest.h>

#include <cmath>

#include "host/lib/pixel_test_support.h"
#include "pf_draw.h"

namespace {

using pixel_test::Unit;

template <class P>
class DrawLine : public ::testing::Test {};
using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(DrawLine, PixelTypes);

const PF_PixelFloat kWhite = {1, 1, 1, 1};

TYPED_TEST(DrawLine, CoversThePixelsItCrosses) {
    using P = TypeParam;
    auto alpha = [](const PF_WorldX<P>& world, int32_t x, int32_t y) {
        return Unit<P>(world.At(x, y).alpha);
    };
    // Along pixel centres: exactly the pixels it runs through, whichever way it is drawn.
    PF_WorldX<P> world(10, 8);
    PF_DrawLine(world, 2.5, 3.5, 7.5, 3.5, kWhite);
    PF_DrawLine(world, 1.5, 7.5, 1.5, 5.5, kWhite);
    for (int32_t y = 0; y < 8; ++y) {
        for (int32_t x = 0; x < 10; ++x) {
            bool on = (y == 3 && x >= 2 && x <= 7) || (x == 1 && y >= 5);
            EXPECT_EQ(alpha(world, x, y), on ? 1.0 : 0.0) << x << "," << y;
        }
    }
    EXPECT_EQ(Unit<P>(world.At(4, 3).red), 1.0);
    // A line between rows is shared by them: the coverage of each column adds up to one.
    PF_WorldX<P> diagonal(10, 10);
    PF_DrawLine(diagonal, 0.5, 0.5, 9.5, 6.5, kWhite);
    for (int32_t x = 0; x < 10; ++x) {
        double column = 0;
        for (int32_t y = 0; y < 10; ++y)
            column += alpha(diagonal, x, y);
        EXPECT_NEAR(column, 1.0, 2.0 / 255) << "column " << x;
    }
    // Outside the world, far beyond it or not a number: skipped. The second line crosses the
    // whole world on row 2, and nothing else.
    PF_WorldX<P> small(6, 6);
    PF_DrawLine(small, -10, -5, 20, -5, kWhite);
    PF_DrawLine(small, -1e9, 2.5, 1e9, 2.5, kWhite);
    PF_DrawLine(small, 0.0, std::nan(""), 3, 3, kWhite);
    for (int32_t y = 0; y < 6; ++y) {
        for (int32_t x = 0; x < 6; ++x)
            EXPECT_NEAR(alpha(small, x, y), y == 2 ? 1.0 : 0.0, 1e-6) << x << "," << y;
    }
}

}  // namespace
