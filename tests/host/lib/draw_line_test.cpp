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

// Which pixels a line covers and by how much shows in the wireframe example's reference
// images; here, lines the examples never draw: outside the world, far beyond it or not a
// number are skipped. The second line crosses the whole world on row 2, and nothing else.
TYPED_TEST(DrawLine, ClipsWhatLiesOutsideTheWorld) {
    using P = TypeParam;
    PF_WorldX<P> world(6, 6);
    PF_DrawLine(world, -10, -5, 20, -5, kWhite);
    PF_DrawLine(world, -1e9, 2.5, 1e9, 2.5, kWhite);
    PF_DrawLine(world, 0.0, std::nan(""), 3, 3, kWhite);
    for (int32_t y = 0; y < 6; ++y) {
        for (int32_t x = 0; x < 6; ++x)
            EXPECT_NEAR(Unit<P>(world.At(x, y).alpha), y == 2 ? 1.0 : 0.0, 1e-6) << x << "," << y;
    }
}

}  // namespace
