#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <tuple>

#include "pf_xfer.h"

namespace {

// Each curve with one point worked by hand. sRGB: code 128 is ((128/255 + 0.055)/1.055)^2.4
// = 0.2158; code 10 lies on the toe: 10/255/12.92 = 0.003035. Gamma 2.2 at code 128:
// 0.5020^2.2 = 0.2195, and likewise for the other gammas.
struct Curve {
    const char* name;
    float gamma;  // 0: sRGB
    int code;
    double linear;  // 0..1
};

const Curve kCurves[] = {{"sRGB", 0.0f, 128, 0.21586},       {"sRGB toe", 0.0f, 10, 0.003035},
                         {"gamma 1.0", 1.0f, 51, 0.2},       {"gamma 1.8", 1.8f, 128, 0.28920},
                         {"gamma 2.2", 2.2f, 128, 0.21953},  {"gamma 2.4", 2.4f, 128, 0.19125},
                         {"gamma 0.45", 0.45f, 128, 0.73333}};

PF_LinearBlendingTables Build(const Curve& c) {
    PF_LinearBlendingTables t;
    if (c.gamma > 0.0f)
        PF_BuildLinearBlendingTablesGamma(c.gamma, &t);
    else
        PF_BuildLinearBlendingTablesSRGB(&t);
    return t;
}

TEST(LinearBlendingTables, FollowTheirCurvesAndEveryCodeSurvivesTheRoundTrip) {
    for (const Curve& c : kCurves) {
        SCOPED_TRACE(c.name);
        PF_LinearBlendingTables t = Build(c);
        EXPECT_NEAR(t.forward[c.code] / 32768.0, c.linear, 1.0 / 32768);
        EXPECT_EQ(std::tuple(t.forward[0], t.forward[255], t.inverse[0], t.inverse[4096]),
                  std::tuple(0, 32768, 0, 32768));
        for (uint32_t code = 0; code < 256; ++code) {
            EXPECT_EQ(PF_LinearTo8(t, PF_LinearFrom8(t, code)), code);
            if (code) {
                EXPECT_GT(t.forward[code], t.forward[code - 1]) << code;
            }
        }
        // 16-bit codes come back within a few steps of 1/32768 (the tables are 8-bit fine).
        for (uint32_t code = 0; code <= 32768; code += 7)
            EXPECT_NEAR(PF_LinearTo16(t, PF_LinearFrom16(t, code)), code, 16);
    }
}

// 16-bit linear values read the inverse table in steps of 8 (the forward table's reading
// shows where the renderer linearizes wide channels): 8 × 2048 = 16384 is entry 2048; 16388
// lies halfway on.
TEST(LinearBlendingTables, SixteenBitLinearValuesInterpolate) {
    PF_LinearBlendingTables t;
    PF_BuildLinearBlendingTablesSRGB(&t);
    EXPECT_EQ(PF_LinearTo16(t, 16384), t.inverse[2048]);
    EXPECT_EQ(PF_LinearTo16(t, 16388),
              t.inverse[2048] + (t.inverse[2049] - t.inverse[2048] + 1) / 2);
    EXPECT_EQ(PF_LinearTo16(t, 32768), 32768u);
}

// With tables, 8- and 16-bit blends mix light, not code values: black at half opacity over
// white gives linear 0.5, which sRGB writes as code 188 (0.7354 × 255 = 187.5).
TEST(LinearBlendingTables, BlendsHappenInLinearLight) {
    PF_LinearBlendingTables t;
    PF_BuildLinearBlendingTablesSRGB(&t);
    PF_Pixel8 black8 = {128, 0, 0, 0}, white8 = {255, 255, 255, 255};
    PF_Get_Xfer1_table8(kPF_XferNormal)(&black8, &t, &white8);
    EXPECT_NEAR(white8.red, 188, 1);
    EXPECT_EQ(white8.alpha, 255);

    PF_Pixel16 black16 = {16384, 0, 0, 0}, white16 = {32768, 32768, 32768, 32768};
    PF_Get_Xfer1_table16(kPF_XferNormal)(&black16, &t, &white16);
    EXPECT_NEAR(white16.red / 32768.0, 0.7354, 0.002);

    PF_PixelFloat blackF = {0.5f, 0, 0, 0}, whiteF = {1, 1, 1, 1};
    PF_Get_Xfer1_tableF(kPF_XferNormal)(&blackF, &t, &whiteF);
    EXPECT_NEAR(whiteF.red, std::pow(0.5, 1 / 2.2), 1e-5);
}

}  // namespace
