#include "composition/renderer_options.h"

#include <gtest/gtest.h>

#include <string>

#include "composition/composition_loader.h"

namespace ostrel {
namespace {

TEST(RendererOptions, ReadableSizeIsTheFlattenedChoice) {
    const std::vector<uint8_t> k750{0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 3};
    EXPECT_EQ(FlattenedRendererOptions(3), k750);
    const std::pair<const char*, int32_t> kSizes[] = {
        {"\"Comp Size\"", 0}, {"750.0", 3}, {"4000", 8}};
    for (auto [size, choice] : kSizes) {
        Composition comp = ParseComposition(
            std::string(
                R"({"width": 8, "height": 8, "duration": 1, "renderer": {"shadowMapSize": )") +
                size + "}}",
            "c.json");
        EXPECT_EQ(ShadowMapSizeChoice(comp.rendererOptions), choice) << size;
    }
    // Eight bytes are not the renderer's form; it renders with Comp Size.
    EXPECT_EQ(ShadowMapSizeChoice({0, 0, 0, 1, 0, 0, 0, 3}), std::nullopt);
}

TEST(RendererOptions, WrittenInTheFormTheFileUses) {
    struct Case {
        std::string before;
        int32_t choice;
        std::string after;
    };
    const Case kCases[] = {
        {"{\n  \"width\": 1,\n  \"layers\": []\n}", 3,
         "{\n  \"width\": 1,\n  \"layers\": [],\n  \"renderer\": {\"shadowMapSize\": 750}\n}"},
        {R"({"w": 1, "renderer": {"shadowMapSize": "Comp Size"}, "d": 1})", 8,
         R"({"w": 1, "renderer": {"shadowMapSize": 4000}, "d": 1})"},
        {R"({"rendererOptions": "0000000100000003", "w": 1})", 0,
         R"({"rendererOptions": "000000010000000000000000", "w": 1})"},
        {R"({"renderer": {}, "w": "}"})", 0,
         R"({"renderer": {"shadowMapSize": "Comp Size"}, "w": "}"})"},
        {R"({"a\"renderer": "{[", "renderer": { "shadowMapSize": 250 } })", 4,
         R"({"a\"renderer": "{[", "renderer": { "shadowMapSize": 1000 } })"},
    };
    for (const Case& c : kCases)
        EXPECT_EQ(WithRendererOptions(c.before, FlattenedRendererOptions(c.choice)), c.after);
}

}  // namespace
}  // namespace ostrel
