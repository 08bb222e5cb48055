// Reading a composition file (JSON, described in docs/composition.md) into the model.
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "composition/composition.h"
#include "composition/composition_error.h"

namespace ostrel {

// Reads, validates and resolves the file: layer names become indices, image paths become
// absolute, defaults are filled in, and every image is opened once to learn its size. Any
// problem throws CompositionError; nothing is returned half-loaded.
Composition LoadComposition(const std::filesystem::path& file);

// The text of a composition file, refused unread when it is not a regular file or is larger
// than 64 MiB. Throws CompositionError.
std::string ReadCompositionText(const std::filesystem::path& file);

// The same as LoadComposition for text already in memory; file names it in messages and anchors
// relative paths.
Composition ParseComposition(std::string_view text, const std::filesystem::path& file);

}  // namespace ostrel
