#include <gtest/gtest.h>

#include <cmath>

#include "renderer/scene/specular_table.h"

namespace {

TEST(SpecularTables, ShininessToExponent) {
    struct Case {
        double shininess, exponent;
    };
    const Case cases[] = {
        {0, 1},                  // cos¹: the broadest highlight
        {100.0 / 9.0, 2},        // every ninth of the range doubles the exponent
        {50, std::sqrt(512.0)},  // halfway is the geometric middle
        {100, 512},              // the tightest
    };
    for (const Case& c : cases)
        EXPECT_NEAR(SY_SpecularExponent(c.shininess), c.exponent, 1e-9 * c.exponent) << c.shininess;
}

}  // namespace
