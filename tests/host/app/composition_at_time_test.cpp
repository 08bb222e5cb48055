// What a composition gives at a moment: where layers are, which camera looks, which layers
// render in what order, and when the shutter is open.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "composition/composition_loader.h"
#include "composition/render_order.h"
#include "composition/timing.h"
#include "composition/transform.h"

namespace ostrel {
namespace {

// A 720 × 480 composition, ten seconds long, with the settings and layers given.
Composition Parse(const std::string& settings, const std::string& layers = "") {
    return ParseComposition(R"({"width": 720, "height": 480, "duration": 10, )" + settings +
                                R"("layers": [)" + layers + "]}",
                            "test.json");
}

Vec<3> Apply(const M_Matrix4& m, const Vec<3>& p) {
    double in[4] = {p[0], p[1], p[2], 1.0};
    double out[4];
    M_TransformVector4NoDivide(&m, in, out);
    return {out[0] / out[3], out[1] / out[3], out[2] / out[3]};
}

void ExpectPoint(const Vec<3>& actual, const Vec<3>& expected) {
    for (int i = 0; i < 3; ++i)
        EXPECT_NEAR(actual[i], expected[i], 1e-9) << "component " << i;
}

TEST(Transform, AnchorScaleAndPositionByHand) {
    // p' = (p − anchor) × scale + position: (x − 50)·2 + 300, (y − 25)·0.5 + 200.
    Composition comp = Parse("", R"({"kind": "null", "threeD": true, "transform": {
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
    Composition comp = Parse("", R"(
        {"name": "late", "kind": "camera", "in": 1},
        {"name": "off", "kind": "camera", "on": false},
        {"name": "always", "kind": "camera"})");
    EXPECT_EQ(ActiveCamera(comp, 0.5), 2);
    EXPECT_EQ(ActiveCamera(comp, 1.0), 0);
}

TEST(RenderOrder, ActiveThreeDLayersWithPixelsFromTopToBottom) {
    Composition comp = Parse("", R"(
        {"name": "camera", "kind": "camera"},
        {"name": "top", "kind": "solid", "threeD": true, "source": {"color": [1, 1, 1]}},
        {"name": "flat", "kind": "solid", "source": {"color": [1, 1, 1]}},
        {"name": "off", "kind": "solid", "threeD": true, "on": false, "source": {"color": [1, 1, 1]}},
        {"name": "later", "kind": "solid", "threeD": true, "in": 1, "out": 2, "source": {"color": [1, 1, 1]}},
        {"name": "null", "kind": "null", "threeD": true},
        {"name": "matte", "kind": "solid", "threeD": true, "source": {"color": [1, 1, 1]}},
        {"name": "matted", "kind": "solid", "threeD": true, "trackMatte": "luma", "source": {"color": [1, 1, 1]}},
        {"name": "light", "kind": "light"})");
    EXPECT_EQ(RenderOrder(comp, 0.0), (std::vector<int32_t>{1, 7}));
    EXPECT_EQ(RenderOrder(comp, 1.0), (std::vector<int32_t>{1, 4, 7}));
    // The out time is the first moment the layer no longer shows.
    EXPECT_EQ(RenderOrder(comp, 2.0), (std::vector<int32_t>{1, 7}));
    EXPECT_EQ(comp.layers[7].matteLayer, 6);
}

::testing::AssertionResult SameTime(T_Time actual, T_Time expected) {
    if (T_CompareTimes(&actual, &expected) == 0) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << actual.value << "/" << actual.scale << " is not "
                                         << expected.value << "/" << expected.scale;
}

TEST(Timing, ShutterIntervals) {
    struct Case {
        int32_t frame;
        T_Time start, duration;
        const char* settings;
    };
    const Case cases[] = {
        // 360° with no phase at 30000/1001: open from the frame's time for a whole frame.
        {3, {3003, 30000}, {1001, 30000}, R"("frameRate": [30000, 1001], "motionBlur":
            {"enabled": true, "shutterAngle": 360, "shutterPhase": 0},)"},
        // 720° opening a frame late at 25 fps: frame 0 opens at 1/25 s for 2/25 s.
        {0, {1, 25}, {2, 25}, R"("frameRate": 25,
            "motionBlur": {"shutterAngle": 720, "shutterPhase": 360},)"},
        // A closed shutter has no duration.
        {1, {1, 24}, {0, 1}, R"("motionBlur": {"shutterAngle": 0, "shutterPhase": 0},)"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.settings);
        Composition comp = Parse(c.settings);
        ShutterInterval interval = ShutterIntervalAt(comp, comp.FrameTime(c.frame));
        EXPECT_TRUE(SameTime(interval.start, c.start));
        EXPECT_TRUE(SameTime(interval.duration, c.duration));
    }
}

}  // namespace
}  // namespace ostrel
