#include <gtest/gtest.h>

#include <cmath>

#include "renderer/scene/light_state.h"

namespace {

TEST(LightState, SpotInnerAngle) {
    struct Case {
        double halfAngle, feather, inner;
    };
    const Case cases[] = {
        {0.5, 0.5, 0.25},             // a·(1 − φ)
        {0.5, 0.01, 0.5 - 0.0068},    // a·φ below the smallest feather
        {0.5, 0.0136, 0.5 * 0.9864},  // a·φ exactly at it
        {0.005, 1.0, 0.0},            // never below zero
    };
    for (const Case& c : cases) {
        SY_LightDesc light;
        light.type = kSY_LightSpot;
        light.coneHalfAngle = c.halfAngle;
        light.coneFeather = c.feather;
        SY_LightState state;
        SY_PrepareLightState(light, &state);
        EXPECT_EQ(state.cosOuter, static_cast<float>(std::cos(c.halfAngle)));
        EXPECT_NEAR(state.cosInner, std::cos(c.inner), 1e-7) << c.halfAngle << " " << c.feather;
        EXPECT_FLOAT_EQ(state.coneScale, 1.0f / (state.cosInner - state.cosOuter));
    }
    SY_LightDesc closed;
    closed.type = kSY_LightSpot;
    SY_LightState state;
    SY_PrepareLightState(closed, &state);
    EXPECT_EQ(state.coneScale, 0.0f);
}

TEST(LightState, FalloffValues) {
    struct Case {
        double radius, distance;
        double radiusSquared, outerSquared, inverseDistance, distanceSquared;
    };
    const Case cases[] = {
        {100, 50, 10000, 22500, 0.02, 2500},
        {10, 0, 100, 100, 1.0, 0},
    };
    for (const Case& c : cases) {
        SY_LightDesc light;
        light.falloffRadius = c.radius;
        light.falloffDistance = c.distance;
        light.shadowDiffusion = 5000;
        SY_LightState state;
        SY_PrepareLightState(light, &state);
        EXPECT_DOUBLE_EQ(state.radiusSquared, c.radiusSquared);
        EXPECT_DOUBLE_EQ(state.outerSquared, c.outerSquared);
        EXPECT_DOUBLE_EQ(state.inverseDistance, c.inverseDistance);
        EXPECT_DOUBLE_EQ(state.distanceSquared, c.distanceSquared);
        EXPECT_DOUBLE_EQ(state.shadowDiffusion, 1024);
    }
}

TEST(LightState, PositionAndDirectionFromTheMiddlePlacement) {
    SY_LightDesc light;
    light.type = kSY_LightParallel;
    light.placements.Allocate(3);
    for (int32_t i = 0; i < 3; ++i) {
        M_IdentityMatrix4(&light.placements[i]);
        M_ScaleMatrix4(1, 1, 4,
                       &light.placements[i]);  // a long z axis still gives a unit direction
        M_TranslateMatrix4(i, 10, 20, &light.placements[i]);
    }
    SY_LightState state;
    SY_PrepareLightState(light, &state);
    EXPECT_EQ(state.position[0], 1);
    EXPECT_EQ(state.position[2], 20);
    EXPECT_DOUBLE_EQ(state.direction[2], -1);

    // A z axis that vanishes within the tolerance is kept as it is, not normalised.
    light.placements[1].mat[2][2] = 4e-13;
    SY_PrepareLightState(light, &state);
    EXPECT_DOUBLE_EQ(state.direction[2], -4e-13);
}

TEST(LightState, ShadowMapSize) {
    struct Case {
        int32_t chosen, width, height, downsample;
        bool bestReceiver;
        int32_t size;
    };
    const Case cases[] = {
        {0, 300, 200, 1, false, 133},
        {0, 300, 200, 1, true, 400},
        {0, 1920, 1080, 1, true, 1920},
        {0, 300, 200, 4, false, 64},  // 400 / 4 / 3 = 33 is raised to the floor
        {2048, 300, 200, 2, true, 1024},
        {100, 300, 200, 1, false, 64},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(SY_ShadowMapSize(c.chosen, c.width, c.height, c.downsample, c.bestReceiver),
                  c.size);
    }
}

}  // namespace
