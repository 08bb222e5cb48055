// The renderer's instance options as a composition file states them: readably, as
// "renderer": {"shadowMapSize": ...}, or as the flattened bytes the host stores with a project
// ("rendererOptions", hexadecimal). The flattened form is major version 1, minor version 0 and
// the shadow map size choice, each a 32-bit big-endian integer.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace ostrel {

// The sizes of the renderer's options popup, in its order; choice 0 (size 0) is "Comp Size",
// a map as large as the frame.
inline constexpr std::array<int32_t, 9> kShadowMapSizes = {0,    250,  500,  750, 1000,
                                                           1500, 2000, 3000, 4000};

// "Comp Size" or the number of pixels, as the popup shows a choice.
std::string ShadowMapSizeText(int32_t choice);

// The flattened options of a choice.
std::vector<uint8_t> FlattenedRendererOptions(int32_t choice);

// The choice the renderer reads from flattened options: 0 for none; nullopt for bytes that
// are not the version 1.0 form of twelve bytes with a choice of the popup, which the renderer
// takes for "Comp Size".
std::optional<int32_t> ShadowMapSizeChoice(const std::vector<uint8_t>& flattened);

// The composition text with the options replaced, in the form the file uses for them: the
// readable value when it has "renderer.shadowMapSize" or neither form (the member is then
// added), the hexadecimal bytes when it has "rendererOptions". Everything else, the formatting
// included, stays as it was. The text must be a composition that loaded.
std::string WithRendererOptions(std::string_view text, const std::vector<uint8_t>& flattened);

}  // namespace ostrel
