// One instance of an artisan for the length of a render: set up from the composition's flattened
// options, set down at the end.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "plugins/plugin_host.h"
#include "session/frame_session.h"

namespace ostrel {

// The renderer the composition files use.
inline constexpr char kRendererMatchName[] = "VLMR Ormond";

// Loads the plug-ins of every folder in order (a library whose file name was loaded from an
// earlier folder is skipped; folders that do not exist are too) and returns the artisan with
// the match name. Throws HostError when none registers it.
const Artisan& LoadArtisan(PluginHost& plugins, const std::vector<std::filesystem::path>& folders,
                           const std::string& matchName);

// The folder of plug-ins beside the running program.
std::filesystem::path DefaultPluginFolder();

class ArtisanInstance {
public:
    // Throws HostError with the artisan's error code when the set-up fails.
    ArtisanInstance(const PluginHost& plugins, const Artisan& artisan,
                    const std::vector<uint8_t>& flattenedOptions);
    ~ArtisanInstance();
    ArtisanInstance(const ArtisanInstance&) = delete;
    ArtisanInstance& operator=(const ArtisanInstance&) = delete;

    // Calls the render entry for the session's current pass; returns its error code.
    int32_t Render(FrameSession& session);

    // Calls the options dialog entry; true when the user changed the options. Throws HostError
    // when the artisan has no dialog or it fails.
    bool ShowDialog();

    // The options in the flattened form the host stores. Throws HostError when flattening
    // fails.
    std::vector<uint8_t> Flatten();

private:
    const QNGP_InData* in_;
    const Artisan& artisan_;
    QNGP_MemHandle options_ = nullptr;
};

}  // namespace ostrel
