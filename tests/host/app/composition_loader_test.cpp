#include <gtest/gtest.h>

#include <string>
#include <tuple>

#include "composition/composition_loader.h"
#include "test_files.h"

namespace ostrel {
namespace {

// The message of the CompositionError that parsing the text throws, or "" when none is.
std::string ErrorOf(const std::string& text, const std::filesystem::path& file = "bad.json") {
    try {
        ParseComposition(text, file);
    } catch (const CompositionError& e) {
        return e.what();
    }
    return "";
}

std::string WithLayers(const std::string& layers) {
    return R"({"width": 100, "height": 100, "duration": 1, "layers": [)" + layers + "]}";
}

TEST(CompositionLoader, ReadsEveryCompSetting) {
    Composition comp = ParseComposition(R"({
        "width": 1920, "height": 1080, "pixelAspect": 0.9, "frameRate": [30000, 1001],
        "duration": 4, "bitDepth": 16, "background": "#336699",
        "motionBlur": {"enabled": true, "samplesPerFrame": 8, "shutterAngle": 270, "shutterPhase": -45},
        "lightsAndDepthOfField": false, "blending": {"linear": true, "gamma": 1.8},
        "rendererOptions": "00ff10"})",
                                        "good.json");
    EXPECT_EQ(std::tuple(comp.width, comp.height, comp.pixelAspect, comp.frameRate.numerator,
                         comp.frameRate.denominator, comp.bitDepth, comp.background[2]),
              std::tuple(1920, 1080, 0.9, 30000, 1001, 16, 0x99 / 255.0));
    const MotionBlurSettings& blur = comp.motionBlur;
    EXPECT_EQ(std::tuple(blur.enabled, blur.samplesPerFrame, blur.shutterAngle, blur.shutterPhase),
              std::tuple(true, 8, 270, -45));
    EXPECT_EQ(std::tuple(comp.lightsAndDepthOfField, comp.blending.linear, comp.blending.gamma),
              std::tuple(false, true, 1.8));
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
    // Hold keeps 10 to the next key; ease runs u²(3 − 2u): at u = 0.25, 0.15625 of the way.
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(0.25), 10.0);
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(0.5), 20.0);
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(0.625), 23.125);
    EXPECT_DOUBLE_EQ(t.rotationZ.ValueAt(5.0), 40.0);
    // [x, y] keeps the default z of 0.
    EXPECT_EQ(t.position.At(0.5), (Vec<3>{5, 10, 15}));
}

TEST(CompositionLoader, BadInputNamesFilePlaceAndProblem) {
    struct Case {
        std::string text;
        std::string message;
    };
    const std::string solid = R"("kind": "solid", "source": {"color": [1, 1, 1]})";
    const Case cases[] = {
        {"{\n  \"width\": 10,\n  \"height\" 10\n}",
         "bad.json: malformed JSON: line 3, column 13: syntax error while parsing object "
         "separator"},
        {R"({"width": 10, "duration": 1})", "bad.json: height: is required"},
        {R"({"width": 10, "height": 10, "duration": 1, "bitDepth": 12})",
         "bad.json: bitDepth: must be 8, 16 or 32, got 12"},
        {WithLayers(R"({"kind": "sprite"})"),
         "bad.json: layers[0].kind: unknown value \"sprite\"; expected one of \"image\", "
         "\"solid\""},
        {WithLayers(R"({"kind": "null"}, {"kind": "null", "transform": {"positon": [1, 2]}})"),
         "bad.json: layers[1].transform: unknown key \"positon\" (did you mean \"position\"?)"},
        {R"({"width": 1, "height": 1, "duration": 1, ")" + std::string(70, 'k') + R"(": 1})",
         "bad.json: unknown key \"" + std::string(64, 'k') + "…\" (70 characters)"},
        {WithLayers(R"({"kind": "image", "source": "card\u0000.png"})"),
         "bad.json: layers[0].source: a string with a NUL character"},
        {WithLayers(R"({"kind": "null", "transform": {"position": [1, "2", 3]}})"),
         "bad.json: layers[0].transform.position[1]: expected a number, got a string"},
        {WithLayers("{" + solid + R"(, "transform": {"opacity": 120}})"),
         "bad.json: layers[0].transform.opacity: must be between 0 and 100, got 120"},
        {WithLayers(
             "{" + solid +
             R"(, "transform": {"opacity": {"keyframes": [{"time": 1, "value": 5}, {"time": 1, "value": 6}]}}})"),
         "bad.json: layers[0].transform.opacity.keyframes[1].time: keyframe times must increase, "
         "got 1 after 1"},
        {WithLayers("{" + solid + R"(, "in": 2, "out": 1})"),
         "bad.json: layers[0].out: must be after the in time"},
        {WithLayers(R"({"kind": "camera", "material": {}})"),
         "bad.json: layers[0].material: does not apply to a camera layer"},
        {WithLayers(R"({"name": "a", "kind": "null"}, {"name": "a", "kind": "null"})"),
         "bad.json: layers[1].name: duplicate layer name \"a\" (layers[0] has it too)"},
        {WithLayers(
             R"({"name": "top", "kind": "null", "parent": "a"}, {"name": "a", "kind": "null", "parent": "b"}, {"name": "b", "kind": "null", "parent": "c"}, {"name": "c", "kind": "null", "parent": "a"})"),
         "bad.json: layers[1].parent: the parent chain loops: a → b → c → a"},
        {WithLayers("{" + solid + R"(, "trackMatte": "luma"})"),
         "bad.json: layers[0].trackMatte: the top layer has no layer above it to take a matte "
         "from"},
        {WithLayers(R"({"name": "n", "kind": "null"}, {)" + solid + R"(, "trackMatte": "alpha"})"),
         "bad.json: layers[1].trackMatte: layer \"n\" has no pixels to make a matte from"},
        {WithLayers(
             R"({"kind": "solid", "source": {"color": "#336699", "unbounded": true, "width": 20}})"),
         "bad.json: layers[0].source.width: an unbounded solid has no size"},
        {R"({"width": 1, "height": 1, "duration": 1, "renderer": {"shadowMapSize": 600}})",
         "bad.json: renderer.shadowMapSize: got 600; the renderer offers \"Comp Size\", 250, 500, "
         "750, 1000, 1500, 2000, 3000, 4000"},
        {R"({"width": 1, "height": 1, "duration": 1, "rendererOptions": "",
             "renderer": {"shadowMapSize": 500}})",
         "bad.json: renderer.shadowMapSize: the renderer's options are given twice"},

    };
    for (const Case& c : cases)
        EXPECT_EQ(ErrorOf(c.text).substr(0, c.message.size()), c.message) << c.text;
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

    const std::string file = (folder.Path() / "comp.json").string();
    std::string missing =
        ErrorOf(WithLayers(R"({"kind": "image", "source": "images/gone.png"})"), comp);
    EXPECT_EQ(missing, file + ": layers[0].source: cannot read image '" +
                           (folder.Path() / "images" / "gone.png").string() + "': no such file");
    // A folder or a device is refused before it is read (a read of /dev/zero would never end).
    for (const std::filesystem::path& odd :
         {folder.Path() / "images", std::filesystem::path("/dev/zero")}) {
        try {
            LoadComposition(odd);
            ADD_FAILURE() << odd << " loaded";
        } catch (const CompositionError& e) {
            EXPECT_EQ(e.what(), odd.string() + ": not a regular file");
        }
    }
}

}  // namespace
}  // namespace ostrel
