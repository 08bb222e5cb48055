// `ostrel options`: the renderer's options dialog on a composition, whose file keeps the choice.
#pragma once

#include <filesystem>
#include <ostream>
#include <vector>

namespace ostrel {

// Sets up the renderer's options from the composition, shows the renderer's options dialog on
// the terminal and, when the user changed them and pressed OK, writes the new options into the
// composition file (replacing it whole, the rest of its text unchanged). Throws HostError or
// CompositionError with a message for the user.
void RunOptionsDialog(const std::filesystem::path& composition,
                      const std::vector<std::filesystem::path>& pluginFolders, std::ostream& out);

}  // namespace ostrel
