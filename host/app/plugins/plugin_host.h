// Loads plug-ins the way the host does: read the property list beside each library, check
// its kind and entry point, load the code, call the entry with the basic suite, and keep the
// artisans it registers. Unloading runs the death hooks.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "plugins/property_list.h"
#include "qngp_suites.h"

namespace ostrel {

struct Artisan {
    std::string matchName;
    std::string displayName;
    QNGP_Version16 apiVersion;
    QNGP_Version16 version;
    int32_t pluginId;
    int64_t reference;
    QNGP_ArtisanEntryPoints entries;
};

class PluginHost {
public:
    PluginHost();
    ~PluginHost();
    PluginHost(const PluginHost&) = delete;
    PluginHost& operator=(const PluginHost&) = delete;

    // The property list of a library: the file of the same name with the extension ".prpl".
    static std::filesystem::path PropertyListPath(const std::filesystem::path& library);

    // Loads every plug-in library ("*.so" with a property list beside it) in the folder.
    void LoadFolder(const std::filesystem::path& folder);
    // Loads one library. Throws HostError naming the file and the problem.
    void Load(const std::filesystem::path& library);

    // The registered artisan with this match name, or null.
    const Artisan* FindArtisan(const std::string& matchName) const;
    const std::vector<Artisan>& Artisans() const { return artisans_; }

    // The in-data the host hands the entry points of a plug-in.
    const QNGP_InData* InDataFor(int32_t pluginId) const;

private:
    struct Plugin;
    static int32_t RegisterArtisan(QNGP_Version16 api, QNGP_Version16 artisan, int32_t pluginId,
                                   int64_t reference, const char* matchName,
                                   const char* displayName, const QNGP_ArtisanEntryPoints* entries);
    static int32_t RegisterDeathHook(int32_t pluginId, QNGP_DeathHook hook, int64_t reference);

    std::vector<std::unique_ptr<Plugin>> plugins_;
    std::vector<Artisan> artisans_;
};

}  // namespace ostrel
