#include <gtest/gtest.h>

#include <cmath>

#include "renderer/scene/specular_table.h"
#include "u_memory.h"

namespace {

TEST(SpecularTables, OneTablePerExponent) {
    int64_t start = U_AccountedBytes();
    {
        SY_SpecularTables tables;
        // 100/9 % shininess gives the exponent 2¹ = 2, keyed by 1: the table holds q itself.
        const SY_SpecularTable& two = tables.ForShininess(100.0 / 9.0);
        EXPECT_EQ(&tables.ForShininess(100.0 / 9.0), &two);
        EXPECT_EQ(tables.Count(), 1u);
        EXPECT_FLOAT_EQ(two.exponent, 1);
        EXPECT_FLOAT_EQ(two.values[0], 0);
        EXPECT_FLOAT_EQ(two.values[1024], 0.5f);
        EXPECT_FLOAT_EQ(two.values[2048], 1);
        EXPECT_FLOAT_EQ(two.values[2068], 1);
        tables.ForShininess(20);
        EXPECT_EQ(tables.Count(), 2u);
        EXPECT_GT(U_AccountedBytes(), start);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

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

TEST(SpecularTables, HighlightNarrowsWithShininess) {
    // The highlight at a half-vector angle of 20° (q = cos² 20°): nearly full at low shininess,
    // nearly gone at full shininess, and falling in between.
    SY_SpecularTables tables;
    auto index = static_cast<int32_t>(std::pow(std::cos(20 * M_PI / 180), 2) * 2048);
    float previous = 2;
    for (double shininess : {0.0, 5.0, 25.0, 50.0, 75.0, 100.0}) {
        float power = tables.ForShininess(shininess).values[index];
        EXPECT_LT(power, previous) << shininess;
        previous = power;
    }
    EXPECT_GT(tables.ForShininess(0).values[index], 0.93f);  // cos 20° = 0.9397
    EXPECT_LT(tables.ForShininess(100).values[index], 1e-13f);
}

}  // namespace
