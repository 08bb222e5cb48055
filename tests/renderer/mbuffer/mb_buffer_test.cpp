#include <gtest/gtest.h>

#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shutter_split.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

// zB − zA = e + dx·u + dy·v + dt·t over the cube (u, v, t); the share in which B is in front is
// the volume where that is positive.
TEST(MBufferMB, ShareOfTheCubeInFront) {
    const double cases[][5] = {
        // e, dx, dy, dt, share
        {-1, 0, 0, 2, 0.5},          // parallel, swapping at mid-shutter
        {0.5, -1, -1, -1, 1 / 48.},  // the corner u + v + t < 0.5
        {-0.5, 0, 1, 0.75, 5 / 6.},  // v + 0.75t > 0.5
        {0, 1, 0, 1, kSY_NoCrossing},
    };
    for (const auto& [e, dx, dy, dt, share] : cases) {
        const SY_CubeDifferences d({0, 0, 0, 0}, {e, dx, dy, dt});
        EXPECT_NEAR(SY_ShareInFrontOverShutter(d), share, 1e-6) << e << " " << dt;
    }
}

template <class P>
class MBufferMBByDepth : public ::testing::Test {};
TYPED_TEST_SUITE(MBufferMBByDepth, renderer_test::PixelTypes);

// Two red cards fly through each other, z = 2 − 4t and z = −2 + 4t (records keyed by their
// minimum), past a still blue one at z = 0.5: blue is in front from t = 0.375 to 0.625 only,
// while red is in front at both ends of the shutter. The pixel reads a quarter blue.
TYPED_TEST(MBufferMBByDepth, ACardInFrontOnlyMidShutterShowsForThatTime) {
    using P = TypeParam;
    constexpr auto kMax = static_cast<decltype(P{}.alpha)>(PF_PixelTraits<P>::kMax);
    auto owner = SY_MBuffer::New({0, 0, 1, 1}, PF_PixelTraits<P>::kBitDepth, false, true);
    auto* buffer = static_cast<SY_MBufferMBX<P>*>(owner.get());
    const P red{kMax, kMax, 0, 0}, blue{kMax, 0, 0, kMax};
    buffer->AddFragment(&red, kMax, 2, -2, 0, 0, -4, buffer->HeadAt(0, 0), 0);
    buffer->AddFragment(&red, kMax, 2, -2, 0, 0, 4, buffer->HeadAt(0, 0), 0);
    buffer->AddFragment(&blue, kMax, 2, 0.5f, 0, 0, 0, buffer->HeadAt(0, 0), 0);
    PF_WorldX<P> world(1, 1);
    buffer->Resolve(nullptr, nullptr, world);
    EXPECT_NEAR(world.At(0, 0).blue, 0.25 * kMax, 0.01 * kMax);
    EXPECT_NEAR(world.At(0, 0).red, 0.75 * kMax, 0.01 * kMax);
}

}  // namespace
