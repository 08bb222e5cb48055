// Pixels, thread set-ups and memory checks shared by the fragment buffer tests.
#pragma once

#include <gtest/gtest.h>

#include <array>
#include <cstdint>

#include "pf_pixel.h"
#include "renderer/scene/frame_test_support.h"
#include "renderer/scene/scene_fixtures.h"
#include "renderer/scene/threads.h"
#include "u_memory.h"

namespace ostrel_test {

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;

// A pixel from channel values given as fractions of the type's maximum.
template <class P>
P PixelOf(float alpha, float red, float green, float blue) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    return {C(alpha * kMax), C(red * kMax), C(green * kMax), C(blue * kMax)};
}

// Alpha, red, green, blue: compared and printed as one value.
template <class P>
std::array<double, 4> Channels(const P& p) {
    return {double(p.alpha), double(p.red), double(p.green), double(p.blue)};
}

// Frames run on kThreads workers with the shared lock live while it exists; single-threaded
// again afterwards, as every other test expects.
template <int32_t kThreads>
struct ThreadedFrame {
    ThreadedFrame() { iterate = SY_PrepareThreads(true, ThreadedIterateSuite<kThreads>::Suite()); }
    ~ThreadedFrame() { SY_PrepareThreads(false, nullptr); }
    ThreadedFrame(const ThreadedFrame&) = delete;
    ThreadedFrame& operator=(const ThreadedFrame&) = delete;

    PF_IterateFunction iterate;
};

// Fails the test when the accounted byte count is not back where it was at construction.
struct AccountedBytesCheck {
    ~AccountedBytesCheck() { EXPECT_EQ(U_AccountedBytes(), start) << "memory left accounted"; }

    const int64_t start = U_AccountedBytes();
};

}  // namespace ostrel_test
