#include <gtest/gtest.h>

#include "composition/keyframes.h"

namespace ostrel {
namespace {

// Keys at 0 s (value 0) and 2 s (value 10); the first key's interpolation varies.
Scalar TwoKeys(Interpolation out) {
    return Scalar(
        std::vector<Keyframe<1>>{{0.0, {0.0}, out}, {2.0, {10.0}, Interpolation::kLinear}});
}

TEST(Keyframes, ConstantHoldsAtEveryTime) {
    Vector3 constant(Vec<3>{1, 2, 3});
    EXPECT_FALSE(constant.IsAnimated());
    for (double t : {-5.0, 0.0, 7.5})
        EXPECT_EQ(constant.At(t), (Vec<3>{1, 2, 3}));
}

TEST(Keyframes, InterpolationAtAndBetweenKeys) {
    struct Case {
        Interpolation out;
        double time;
        double expected;
    };
    // Ease: u' = u²(3 − 2u); at u = 0.25 that is 0.15625, at u = 0.5 it is 0.5.
    const Case cases[] = {
        {Interpolation::kLinear, -1.0, 0.0}, {Interpolation::kLinear, 0.0, 0.0},
        {Interpolation::kLinear, 0.5, 2.5},  {Interpolation::kLinear, 1.0, 5.0},
        {Interpolation::kLinear, 2.0, 10.0}, {Interpolation::kLinear, 3.0, 10.0},
        {Interpolation::kHold, 0.0, 0.0},    {Interpolation::kHold, 1.999, 0.0},
        {Interpolation::kHold, 2.0, 10.0},   {Interpolation::kEase, 0.5, 1.5625},
        {Interpolation::kEase, 1.0, 5.0},    {Interpolation::kEase, 1.5, 8.4375},
        {Interpolation::kEase, 2.0, 10.0},
    };
    for (const Case& c : cases) {
        EXPECT_DOUBLE_EQ(TwoKeys(c.out).ValueAt(c.time), c.expected)
            << "interpolation " << static_cast<int>(c.out) << " at " << c.time;
    }
}

TEST(Keyframes, EachSegmentUsesItsOwnKey) {
    Vector3 path(std::vector<Keyframe<3>>{{0.0, {0, 0, 0}, Interpolation::kLinear},
                                          {1.0, {10, 20, 30}, Interpolation::kHold},
                                          {2.0, {0, 0, 0}, Interpolation::kLinear}});
    EXPECT_EQ(path.At(0.5), (Vec<3>{5, 10, 15}));
    EXPECT_EQ(path.At(1.5), (Vec<3>{10, 20, 30}));
    EXPECT_EQ(path.At(2.0), (Vec<3>{0, 0, 0}));
}

}  // namespace
}  // namespace ostrel
