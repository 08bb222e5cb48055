#include <gtest/gtest.h>

#include <cmath>

#include "raster_test_support.h"
#include "u_memory.h"

namespace {

using raster_test::Equal;
using raster_test::FilledWorld;
using raster_test::Frame;
using raster_test::Opaque;
using scene_test::Translation;

template <class P>
class GroupRender : public ::testing::Test {};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(GroupRender, PixelTypes);

constexpr int32_t kWidth = 64, kHeight = 48;
constexpr double kTurn = 0.5;  // radians about the vertical axis through the output's centre

// A layer of the output's size turned about the vertical line through the output's centre,
// which lies on the plane z = 0: it crosses a facing layer at z = 0 along that line. True when
// its left half comes nearer the camera (which looks along +z).
bool LeftHalfNearer(const M_Matrix4& turned) {
    const auto& m = turned.mat;
    return m[0][2] * 0 + m[1][2] * (kHeight / 2.0) + m[3][2] < 0;  // z of the left edge
}

M_Matrix4 TurnedThroughTheCentre() {
    return scene_test::Turned(kWidth / 2.0, kHeight / 2.0, 0, kTurn, kWidth / 2.0, kHeight / 2.0,
                              0);
}

// Checks that the nearer layer shows on each side of the centre line, away from the pixels
// the line crosses; `inside` limits the check to where both layers are.
template <class P, class Inside>
void ExpectNearerOnEachSide(const PF_WorldX<P>& frame, bool leftNearer, const P& turned,
                            const P& facing, Inside inside) {
    int32_t checked = 0;
    for (int32_t y = 0; y < kHeight; ++y) {
        for (int32_t x = 0; x < kWidth; ++x) {
            if (std::abs(x + 0.5 - kWidth / 2.0) < 2 || !inside(x, y)) continue;
            bool left = x < kWidth / 2;
            const P& expected = left == leftNearer ? turned : facing;
            ASSERT_TRUE(Equal(frame.At(x, y), expected)) << x << "," << y;
            ++checked;
        }
    }
    EXPECT_GT(checked, kWidth * kHeight / 4);
}

TYPED_TEST(GroupRender, CrossingLayersShowTheNearerOneOnEachSide) {
    using P = TypeParam;
    const P red = Opaque<P>(255, 0, 0), blue = Opaque<P>(0, 0, 255);
    auto facingTexture = FilledWorld<P>(kWidth, kHeight, red);
    auto turnedTexture = FilledWorld<P>(kWidth, kHeight, blue);
    int64_t start = U_AccountedBytes();
    {
        Frame frame(kWidth, kHeight, 2);
        frame.Layer(0, facingTexture.get(), Translation(0, 0, 0));
        M_Matrix4 turned = TurnedThroughTheCentre();
        frame.Layer(1, turnedTexture.get(), turned);
        PF_WorldX<P> destination(kWidth, kHeight);
        frame.Render(&destination);
        // The turned layer is narrower on screen than the output; check where it lies.
        ExpectNearerOnEachSide(destination, LeftHalfNearer(turned), blue, red,
                               [&](int32_t x, int32_t) { return x > 12 && x < kWidth - 12; });
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

// An unbounded layer shows its image (in output coordinates) everywhere, and where it crosses
// a textured layer the two sort by depth per pixel.
TYPED_TEST(GroupRender, UnboundedLayerSortsAgainstATexturedLayer) {
    using P = TypeParam;
    const P red = Opaque<P>(255, 0, 0), blue = Opaque<P>(0, 0, 255);
    constexpr int32_t kCardLeft = 8, kCardTop = 6;
    auto card = FilledWorld<P>(kWidth - 2 * kCardLeft, kHeight - 2 * kCardTop, red);
    auto wallImage = FilledWorld<P>(kWidth, kHeight, blue);
    int64_t start = U_AccountedBytes();
    {
        Frame frame(kWidth, kHeight, 2);
        frame.Layer(0, card.get(), Translation(kCardLeft, kCardTop, 0));
        M_Matrix4 turned = TurnedThroughTheCentre();
        SY_LayerDesc& wall = frame.Layer(1, wallImage.get(), turned);
        wall.unbounded = true;
        PF_WorldX<P> destination(kWidth, kHeight);
        frame.Render(&destination);
        auto onCard = [&](int32_t x, int32_t y) {
            return x >= kCardLeft && x < kWidth - kCardLeft && y >= kCardTop &&
                   y < kHeight - kCardTop;
        };
        ExpectNearerOnEachSide(destination, LeftHalfNearer(turned), blue, red, onCard);
        for (int32_t y = 0; y < kHeight; ++y) {
            for (int32_t x = 0; x < kWidth; ++x) {
                if (!onCard(x, y)) {
                    ASSERT_TRUE(Equal(destination.At(x, y), blue)) << x << "," << y;
                }
            }
        }
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
