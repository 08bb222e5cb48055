#include <gtest/gtest.h>

#include <vector>

#include "raster_test_support.h"
#include "renderer/raster/span_routine.h"

namespace {

// A delivery that keeps the depth of every pixel, as a fragment buffer's would.
struct RecordingDelivery {
    static constexpr bool kUsesDepth = true;
    void Deliver(int32_t x, const PF_Pixel8&, SY_Coverage<PF_Pixel8>, const SY_FragmentDepth& d,
                 int32_t) {
        xs.push_back(x);
        depths.push_back(d);
    }
    std::vector<int32_t> xs;
    std::vector<SY_FragmentDepth> depths;
};

// W = 10 + x/4 + y/2 (orthographic): over pixel (x, y) it runs from W at the pixel's top-left
// corner up; the key lies one W extent (¼ + ½) below that corner, plus the layer's offset.
M_Matrix3 Plane(double w0) {
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[1][1] = 1;
    m.mat[0][2] = 0.25;
    m.mat[1][2] = 0.5;
    m.mat[2][2] = w0;
    return m;
}

TEST(FragmentDepth, OneSampleKeyIsTheCornerLessTheExtentPlusTheOffset) {
    auto texture = raster_test::PatternTexture<PF_Pixel8>(8, 8);
    SY_SpanSampleState<PF_Pixel8> state;
    state.texture.world = texture.get();
    state.texture.sampling.src = texture.get();
    state.texture.perspective = false;
    state.mapping.Start(Plane(10), 2.5, 3.5, false, 1.0f);
    SY_SpanRayState ray{};
    SY_LayerShader shader;
    shader.depthOffset = -0.125f;
    RecordingDelivery delivery;
    SY_DrawSpan(shader, false, state, ray, static_cast<const PF_Pixel8*>(nullptr), 2, 3, delivery,
                0);
    ASSERT_EQ(delivery.xs, (std::vector<int32_t>{2, 3, 4}));
    for (int i = 0; i < 3; ++i) {
        double corner = 10 + (2 + i) * 0.25 + 3 * 0.5;
        EXPECT_FLOAT_EQ(delivery.depths[i].depth, corner - 0.75 - 0.125) << i;
        EXPECT_EQ(delivery.depths[i].dzdx, 0.25f);
        EXPECT_EQ(delivery.depths[i].dzdy, 0.5f);
        EXPECT_EQ(delivery.depths[i].dzdt, 0.0f);
    }
}

// Two subsamples whose W differ by −2 over the shutter: the key starts from the smaller W
// with half the extent of one sample, and the travel is handed on.
TEST(FragmentDepth, SubsampleKeyCoversTheShutterTravel) {
    auto texture = raster_test::PatternTexture<PF_Pixel8>(8, 8);
    SY_SpanSubsampleState<PF_Pixel8> state;
    state.texture.world = texture.get();
    state.texture.sampling.src = texture.get();
    state.texture.perspective = false;
    state.count = 2;
    state.last = 1;
    state.mappings[0].Start(Plane(10), 2.5, 3.5, false, 0.5f);
    state.mappings[1].Start(Plane(8), 2.5, 3.5, false, 0.5f);
    SY_SpanRayState ray{};
    SY_LayerShader shader;
    RecordingDelivery delivery;
    SY_DrawSpan(shader, false, state, ray, static_cast<const PF_Pixel8*>(nullptr), 2, 1, delivery,
                0);
    ASSERT_EQ(delivery.depths.size(), 1u);
    double centre = 10 + 2.5 * 0.25 + 3.5 * 0.5;
    EXPECT_FLOAT_EQ(delivery.depths[0].depth, centre - 0.375 - 2 - 0.375);
    EXPECT_EQ(delivery.depths[0].dzdt, -2.0f);
}

}  // namespace
