#include <gtest/gtest.h>

#include <cmath>

#include "renderer/scene/light_state.h"

namespace {

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
