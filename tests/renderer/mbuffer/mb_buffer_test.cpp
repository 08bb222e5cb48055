#include <gtest/gtest.h>

#include <cstdint>

#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shutter_split.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

// zB − zA = e + dx·u + dy·v + dt·t over the cube; the share in which B is in front is the
// volume where that is positive.
TEST(MBufferMB, ShareOfTheCubeInFront) {
    const struct {
        double e, dx, dy, dt;
        float share;
    } cases[] = {
        {-1, 0, 0, 2, 0.5f},           // parallel, swapping at mid-shutter
        {-1, 1, 1, 0, 0.5f},           // still, crossing along the diagonal
        {-1, 1, 0, 1, 0.5f},           // u + t > 1
        {0.5, -1, -1, -1, 1 / 48.0f},  // the corner u + v + t < 0.5
        {-0.5, 1, 1, 1, 47 / 48.0f},   // the other side of it
        {-0.5, 0, 0, 0.75, 1 / 3.0f},  // in front after t = 2/3
        {0, 1, 0, 1, kSY_NoCrossing},  // in front or level everywhere
    };
    for (const auto& c : cases) {
        const SY_MotionPlane a{0, 0, 0, 0}, b{c.e, c.dx, c.dy, c.dt};
        EXPECT_NEAR(SY_ShareInFrontOverShutter(SY_CubeDifferences(a, b)), c.share, 1e-6)
            << c.e << " " << c.dx << " " << c.dy << " " << c.dt;
    }
}

template <class P>
class MBufferMBByDepth : public ::testing::Test {};
TYPED_TEST_SUITE(MBufferMBByDepth, renderer_test::PixelTypes);

// Two red cards fly through each other, z = 2 − 4t and z = −2 + 4t, past a still blue one at
// z = 0.5: blue is in front only from t = 0.375 to 0.625, although red is in front at both
// ends of the shutter. A pixel of one flat card each reads a quarter blue.
TYPED_TEST(MBufferMBByDepth, ACardInFrontOnlyMidShutterShowsForThatTime) {
    using P = TypeParam;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    using C = typename PF_PixelTraits<P>::Channel;
    auto owner = SY_MBuffer::New({0, 0, 1, 1}, PF_PixelTraits<P>::kBitDepth, false, true);
    ASSERT_TRUE(owner->HasMotionBlur() && owner->IsAntialiased());
    auto* buffer = static_cast<SY_MBufferMBX<P>*>(owner.get());
    const P red{C(kMax), C(kMax), 0, 0}, blue{C(kMax), 0, 0, C(kMax)};
    const struct {
        const P* color;
        float depth, dzdt;  // depth: the minimum over the shutter
    } cards[] = {{&red, -2, -4}, {&red, -2, 4}, {&blue, 0.5f, 0}};
    for (const auto& card : cards)
        buffer->AddFragment(card.color, C(kMax), 2, card.depth, 0, 0, card.dzdt,
                            buffer->HeadAt(0, 0), 0);
    PF_WorldX<P> world(1, 1);
    buffer->Resolve(nullptr, nullptr, world);
    EXPECT_NEAR(world.At(0, 0).blue, 0.25 * kMax, 0.01 * kMax);
    EXPECT_NEAR(world.At(0, 0).red, 0.75 * kMax, 0.01 * kMax);
    EXPECT_EQ(world.At(0, 0).alpha, C(kMax));
}

}  // namespace
