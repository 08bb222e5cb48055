// Pixels, thread set-ups and memory checks shared by the fragment buffer tests.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>

#include "pf_pixel.h"
#include "renderer/scene/frame_test_support.h"
#include "renderer/scene/scene_fixtures.h"
#include "renderer/scene/threads.h"
#include "u_memory.h"

namespace ostrel_test {

// A pixel from channel values given as fractions of the type's maximum.
template <class P>
P PixelOf(float alpha, float red, float green, float blue) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    return {C(alpha * kMax), C(red * kMax), C(green * kMax), C(blue * kMax)};
}

template <class P>
bool SamePixel(const P& a, const P& b) {
    return a.alpha == b.alpha && a.red == b.red && a.green == b.green && a.blue == b.blue;
}

template <class P>
::testing::AssertionResult PixelIs(const P& actual, const P& expected) {
    if (SamePixel(actual, expected)) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure()
           << "got (" << +actual.alpha << ", " << +actual.red << ", " << +actual.green << ", "
           << +actual.blue << "), expected (" << +expected.alpha << ", " << +expected.red << ", "
           << +expected.green << ", " << +expected.blue << ")";
}

// Frames run on kThreads workers with the shared lock live while it exists; single-threaded
// again afterwards, as every other test expects.
template <int32_t kThreads>
class ThreadedFrame {
public:
    ThreadedFrame() { iterate_ = SY_PrepareThreads(true, ThreadedIterateSuite<kThreads>::Suite()); }
    ~ThreadedFrame() { SY_PrepareThreads(false, nullptr); }
    ThreadedFrame(const ThreadedFrame&) = delete;
    ThreadedFrame& operator=(const ThreadedFrame&) = delete;

    PF_IterateFunction Iterate() const { return iterate_; }

private:
    PF_IterateFunction iterate_;
};

// Fails the test when the accounted byte count is not back where it was at construction.
class AccountedBytesCheck {
public:
    AccountedBytesCheck() : start_(U_AccountedBytes()) {}
    ~AccountedBytesCheck() { EXPECT_EQ(U_AccountedBytes(), start_) << "memory left accounted"; }
    AccountedBytesCheck(const AccountedBytesCheck&) = delete;
    AccountedBytesCheck& operator=(const AccountedBytesCheck&) = delete;

    int64_t Taken() const { return U_AccountedBytes() - start_; }

private:
    int64_t start_;
};

}  // namespace ostrel_test
