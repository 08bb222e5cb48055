#include <gtest/gtest.h>

#include <string>

#include "composition/composition_loader.h"
#include "composition/transform.h"

namespace ostrel {
namespace {

constexpr double kTolerance = 1e-9;

Composition Parse(const std::string& layers) {
    return ParseComposition(
        R"({"width": 720, "height": 480, "duration": 2, "layers": [)" + layers + "]}",
        "transform_test.json");
}

Vec<3> Apply(const M_Matrix4& m, const Vec<3>& p) {
    double in[4] = {p[0], p[1], p[2], 1.0};
    double out[4];
    M_TransformVector4NoDivide(&m, in, out);
    return {out[0] / out[3], out[1] / out[3], out[2] / out[3]};
}

void ExpectPoint(const Vec<3>& actual, const Vec<3>& expected) {
    for (int i = 0; i < 3; ++i)
        EXPECT_NEAR(actual[i], expected[i], kTolerance) << "component " << i;
}

TEST(Transform, AnchorScaleAndPositionByHand) {
    // p' = (p − anchor) × scale + position: (x − 50)·2 + 300, (y − 25)·0.5 + 200.
    Composition comp = Parse(R"({"kind": "null", "threeD": true, "transform": {
        "anchorPoint": [50, 25, 0], "scale": [200, 50, 100], "position": [300, 200, 0]}})");
    ExpectPoint(Apply(LayerToWorld(comp, 0, 0.0), {50, 25, 0}), {300, 200, 0});
    ExpectPoint(Apply(LayerToWorld(comp, 0, 0.0), {0, 0, 7}), {200, 187.5, 7});
}

TEST(Transform, DefaultCameraIsA50mmLensOverTheCompWidth) {
    Composition comp = Parse("");
    // 720 × 50 / 36 = 1000 pixels.
    EXPECT_DOUBLE_EQ(DefaultCameraDistance(comp), 1000.0);
    ExpectPoint(Apply(DefaultCameraPlacement(comp), {1, 2, 3}), {361, 242, -997});
    EXPECT_EQ(ActiveCamera(comp, 0.0), -1);
}

TEST(Transform, ActiveCameraIsTheTopmostOneShowing) {
    Composition comp = Parse(R"(
        {"name": "late", "kind": "camera", "in": 1},
        {"name": "off", "kind": "camera", "on": false},
        {"name": "always", "kind": "camera"})");
    EXPECT_EQ(ActiveCamera(comp, 0.5), 2);
    EXPECT_EQ(ActiveCamera(comp, 1.0), 0);
}

}  // namespace
}  // namespace ostrel
