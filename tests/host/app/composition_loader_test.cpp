#include <gtest/gtest.h>

#include <string>
#include <tuple>
#include <utility>

#include "composition/composition_loader.h"
#include "test_files.h"

namespace ostrel {
namespace {

std::string WithLayers(const std::string& layers) {
    return R"({"width": 100, "height": 100, "duration": 1, "layers": [)" + layers + "]}";
}

// Size, rate, background and motion blur show in the examples' reference images and the
// shutter timing; lights and depth of field in scene capture. The rest is read here.
TEST(CompositionLoader, ReadsCompSettings) {
    Composition comp = ParseComposition(R"({"width": 8, "height": 8, "duration": 4,
        "pixelAspect": 0.9, "bitDepth": 16, "blending": {"linear": true, "gamma": 1.8},
        "rendererOptions": "00ff10"})",
                                        "good.json");
    EXPECT_EQ(
        std::tuple(comp.pixelAspect, comp.bitDepth, comp.blending.linear, comp.blending.gamma),
        std::tuple(0.9, 16, true, 1.8));
    EXPECT_EQ(comp.rendererOptions, (std::vector<uint8_t>{0x00, 0xff, 0x10}));
}

TEST(CompositionLoader, ReadsKeyframes) {
    Composition comp = ParseComposition(WithLayers(R"({"kind": "null", "transform": {
        "rotationZ": {"keyframes": [{"time": 0, "value": 10, "interpolation": "hold"},
                                    {"time": 0.5, "value": 20, "interpolation": "ease"},
                                    {"time": 1, "value": 40}]},
        "position": {"keyframes": [{"time": 0, "value": [0, 0]}, {"time": 1, "value": [10, 20, 30]}]}}})"),
                                        "keys.json");
    const Transform& t = comp.layers[0].transform;
    // Hold keeps 10 to the next key; the ease after it shows in the examples' references.
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(0.25), 10.0);
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(0.5), 20.0);
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(5.0), 40.0);
    // [x, y] keeps the default z of 0.
    EXPECT_EQ(t.position.At(0.5), (Vec<3>{5, 10, 15}));
}

// The program's table of bad inputs checks every other key's message; the renderer's settings
// in readable form are checked here.
TEST(CompositionLoader, RendererSettingsItCannotUseAreRefused) {
    const std::pair<std::string, std::string> kCases[] = {
        {R"({"width": 1, "height": 1, "duration": 1, "renderer": {"shadowMapSize": 600}})",
         "bad.json: renderer.shadowMapSize: got 600; the renderer offers \"Comp Size\", 250"},
        {R"({"width": 1, "height": 1, "duration": 1, "rendererOptions": "",
             "renderer": {"shadowMapSize": 500}})",
         "bad.json: renderer.shadowMapSize: the renderer's options are given twice"},
    };
    for (const auto& [text, message] : kCases) {
        try {
            ParseComposition(text, "bad.json");
            ADD_FAILURE() << text;
        } catch (const CompositionError& e) {
            EXPECT_EQ(std::string(e.what()).substr(0, message.size()), message);
        }
    }
}

TEST(CompositionLoader, FilesAreFoundBesideTheComposition) {
    TempFolder folder;
    std::filesystem::create_directories(folder.Path() / "images");
    folder.WriteImage<uint8_t>("images/card.png", 3, 2, 4, std::vector<uint8_t>(24, 255));
    std::filesystem::path comp = folder.WriteText(
        "comp.json", WithLayers(R"({"kind": "image", "source": "images/card.png"})"));

    Composition loaded = LoadComposition(comp);
    EXPECT_EQ(loaded.layers[0].source.image, folder.Path() / "images" / "card.png");
    EXPECT_EQ(loaded.layers[0].source.width, 3);
    EXPECT_EQ(loaded.layers[0].source.height, 2);
    // The anchor point defaults to the image centre.
    EXPECT_EQ(loaded.layers[0].transform.anchorPoint.At(0.0), (Vec<3>{1.5, 1, 0}));
}

}  // namespace
}  // namespace ostrel
