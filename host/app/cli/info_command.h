// `ostrel info` and `ostrel about`: what a composition will render, and the renderer's note.
#pragma once

#include <cstdint>
#include <filesystem>
#include <ostream>
#include <vector>

#include "composition/composition.h"

namespace ostrel {

// Size, depth, frames, motion blur, the layers the renderer gets at the frame in render order
// (kind, 3-D, quality, transfer mode), the camera and the lights.
void PrintInfo(const Composition& comp, int32_t frame, std::ostream& out);

// Loads the plug-ins and has the renderer show its about box, which a terminal gets as a note on
// standard output. Throws HostError when the renderer is missing or its about box fails.
void ShowAbout(const std::vector<std::filesystem::path>& pluginFolders);

}  // namespace ostrel
