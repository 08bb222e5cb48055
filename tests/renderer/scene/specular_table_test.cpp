#include <gtest/gtest.h>

#include "renderer/scene/specular_table.h"
#include "u_memory.h"

namespace {

TEST(SpecularTables, OneTablePerExponent) {
    int64_t start = U_AccountedBytes();
    {
        SY_SpecularTables tables;
        const SY_SpecularTable& ten = tables.ForShininess(10);
        EXPECT_EQ(&tables.ForShininess(10), &ten);
        EXPECT_EQ(tables.Count(), 1u);
        EXPECT_FLOAT_EQ(ten.exponent, 5);
        EXPECT_FLOAT_EQ(ten.values[0], 0);
        EXPECT_FLOAT_EQ(ten.values[1024], 0.03125f);  // 0.5⁵
        EXPECT_FLOAT_EQ(ten.values[2048], 1);
        EXPECT_FLOAT_EQ(ten.values[2068], 1);
        tables.ForShininess(20);
        EXPECT_EQ(tables.Count(), 2u);
        EXPECT_GT(U_AccountedBytes(), start);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
