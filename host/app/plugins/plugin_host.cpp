#include "plugins/plugin_host.h"

#include <dlfcn.h>

#include <fstream>
#include <iterator>

#include "host_error.h"
#include "suites/suite_registry.h"

namespace ostrel {

namespace {

constexpr char kGeneralPluginKind[] = "QNgx";

// Registrations arrive through a C function table while a plug-in's entry runs; they go to the
// host that is loading it.
PluginHost* gLoadingHost = nullptr;

std::vector<uint8_t> ReadFile(const std::filesystem::path& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw HostError(path.string() + ": cannot read the plug-in property list");
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

}  // namespace

struct PluginHost::Plugin {
    std::filesystem::path library;
    void* handle = nullptr;
    QNGP_InData inData{};
    QNGP_DeathHook deathHook = nullptr;
    int64_t deathReference = 0;

    ~Plugin() {
        if (deathHook) deathHook(inData.pluginId, deathReference);
        if (handle) dlclose(handle);
    }
};

PluginHost::PluginHost() = default;

PluginHost::~PluginHost() {
    // Unload in reverse order of loading, as a host shuts down.
    while (!plugins_.empty())
        plugins_.pop_back();
}

std::filesystem::path PluginHost::PropertyListPath(const std::filesystem::path& library) {
    return std::filesystem::path(library).replace_extension(".prpl");
}

void PluginHost::LoadFolder(const std::filesystem::path& folder) {
    std::error_code error;
    for (const auto& entry : std::filesystem::directory_iterator(folder, error)) {
        if (entry.path().extension() == ".so" &&
            std::filesystem::exists(PropertyListPath(entry.path()))) {
            Load(entry.path());
        }
    }
}

void PluginHost::Load(const std::filesystem::path& library) {
    std::filesystem::path listPath = PropertyListPath(library);
    PropertyList list = ParsePropertyList(ReadFile(listPath), listPath.string());
    if (list.kind != kGeneralPluginKind) {
        throw HostError(listPath.string() + ": the plug-in is of kind \"" + list.kind +
                        "\", not a general plug-in (\"" + kGeneralPluginKind + "\")");
    }
    auto plugin = std::make_unique<Plugin>();
    plugin->library = library;
    plugin->handle = dlopen(library.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!plugin->handle) throw HostError(library.string() + ": cannot load: " + dlerror());
    auto main = reinterpret_cast<QNGP_PluginMain>(dlsym(plugin->handle, list.entryPoint.c_str()));
    if (!main) {
        throw HostError(library.string() + ": the entry point \"" + list.entryPoint +
                        "\" that its property list names is not exported");
    }
    plugin->inData = {SuiteRegistry::BasicSuite(), static_cast<int32_t>(plugins_.size() + 1)};
    plugins_.push_back(std::move(plugin));
    Plugin& loaded = *plugins_.back();

    static const QNGP_RegisterSuite6 registerSuite{&RegisterArtisan, &RegisterDeathHook};
    ScopedSuite served(kQNGP_RegisterSuite, 6, &registerSuite);
    gLoadingHost = this;
    int64_t global = 0;
    int32_t error = main(SuiteRegistry::BasicSuite(), 1, 0, loaded.inData.pluginId, &global);
    gLoadingHost = nullptr;
    if (error) {
        std::erase_if(artisans_,
                      [&](const Artisan& a) { return a.pluginId == loaded.inData.pluginId; });
        plugins_.pop_back();
        throw HostError(library.string() + ": the plug-in's entry failed with error " +
                        std::to_string(error));
    }
}

const Artisan* PluginHost::FindArtisan(const std::string& matchName) const {
    for (const Artisan& artisan : artisans_) {
        if (artisan.matchName == matchName) return &artisan;
    }
    return nullptr;
}

const QNGP_InData* PluginHost::InDataFor(int32_t pluginId) const {
    for (const auto& plugin : plugins_) {
        if (plugin->inData.pluginId == pluginId) return &plugin->inData;
    }
    return nullptr;
}

int32_t PluginHost::RegisterArtisan(QNGP_Version16 api, QNGP_Version16 artisan, int32_t pluginId,
                                    int64_t reference, const char* matchName,
                                    const char* displayName,
                                    const QNGP_ArtisanEntryPoints* entries) {
    if (!gLoadingHost || !matchName || !displayName || !entries) return kQNGP_ErrMissingSuite;
    gLoadingHost->artisans_.push_back(
        {matchName, displayName, api, artisan, pluginId, reference, *entries});
    return 0;
}

int32_t PluginHost::RegisterDeathHook(int32_t pluginId, QNGP_DeathHook hook, int64_t reference) {
    if (!gLoadingHost || gLoadingHost->plugins_.empty()) return kQNGP_ErrMissingSuite;
    Plugin& plugin = *gLoadingHost->plugins_.back();
    if (plugin.inData.pluginId != pluginId) return kQNGP_ErrMissingSuite;
    plugin.deathHook = hook;
    plugin.deathReference = reference;
    return 0;
}

}  // namespace ostrel
