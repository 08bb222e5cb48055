#include "cli/artisan_instance.h"

#include <algorithm>
#include <cstring>
#include <set>

#include "host_error.h"
#include "suites/memory_suite.h"

namespace ostrel {

const Artisan& LoadArtisan(PluginHost& plugins, const std::vector<std::filesystem::path>& folders,
                           const std::string& matchName) {
    std::set<std::filesystem::path> loaded;
    std::string searched;
    for (const auto& folder : folders) {
        searched += (searched.empty() ? "" : ", ") + folder.string();
        std::error_code error;
        std::vector<std::filesystem::path> libraries;
        for (const auto& entry : std::filesystem::directory_iterator(folder, error)) {
            if (entry.path().extension() == ".so" &&
                std::filesystem::exists(PluginHost::PropertyListPath(entry.path()))) {
                libraries.push_back(entry.path());
            }
        }
        std::sort(libraries.begin(), libraries.end());
        for (const auto& library : libraries) {
            if (loaded.insert(library.filename()).second) plugins.Load(library);
        }
    }
    const Artisan* artisan = plugins.FindArtisan(matchName);
    if (!artisan) {
        throw HostError("no plug-in registers the renderer \"" + matchName + "\" (searched " +
                        (searched.empty() ? std::string("no folder") : searched) + ")");
    }
    return *artisan;
}

std::filesystem::path DefaultPluginFolder() {
    std::error_code error;
    std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe", error);
    return error ? std::filesystem::path("plugins") : program.parent_path() / "plugins";
}

namespace {

// The flattened options in a memory handle, freed when it goes.
class FlattenedHandle {
public:
    explicit FlattenedHandle(const std::vector<uint8_t>& bytes) {
        if (bytes.empty()) return;
        const QNGP_MemorySuite1& memory = *MemorySuite();
        void* pointer = nullptr;
        if (memory.NewHandle(0, "flattened options", static_cast<uint32_t>(bytes.size()), 0,
                             &handle_) != 0 ||
            memory.LockHandle(handle_, &pointer) != 0) {
            throw HostError("cannot hold the renderer's options");
        }
        std::memcpy(pointer, bytes.data(), bytes.size());
        memory.UnlockHandle(handle_);
    }
    ~FlattenedHandle() {
        if (handle_) MemorySuite()->FreeHandle(handle_);
    }
    FlattenedHandle(const FlattenedHandle&) = delete;
    FlattenedHandle& operator=(const FlattenedHandle&) = delete;

    QNGP_MemHandle Get() const { return handle_; }

private:
    QNGP_MemHandle handle_ = nullptr;
};

}  // namespace

ArtisanInstance::ArtisanInstance(const PluginHost& plugins, const Artisan& artisan,
                                 const std::vector<uint8_t>& flattenedOptions)
    : in_(plugins.InDataFor(artisan.pluginId)), artisan_(artisan) {
    if (!in_ || !artisan.entries.instanceSetUp || !artisan.entries.render) {
        throw HostError("the renderer \"" + artisan.displayName + "\" cannot render");
    }
    FlattenedHandle flattened(flattenedOptions);
    if (int32_t error = artisan.entries.instanceSetUp(in_, nullptr, nullptr, nullptr, nullptr,
                                                      flattened.Get(), &options_)) {
        throw HostError("the renderer \"" + artisan.displayName +
                        "\" could not set up its options (error " + std::to_string(error) + ")");
    }
}

ArtisanInstance::~ArtisanInstance() {
    if (options_ && artisan_.entries.instanceSetDown) {
        artisan_.entries.instanceSetDown(in_, nullptr, nullptr, nullptr, options_);
    }
}

int32_t ArtisanInstance::Render(FrameSession& session) {
    return artisan_.entries.render(in_, nullptr, nullptr, session.RenderContext(), nullptr,
                                   options_, nullptr);
}

bool ArtisanInstance::ShowDialog() {
    if (!artisan_.entries.instanceDialog) {
        throw HostError("the renderer \"" + artisan_.displayName + "\" has no options dialog");
    }
    int32_t changed = 0;
    if (int32_t error =
            artisan_.entries.instanceDialog(in_, nullptr, nullptr, nullptr, options_, &changed)) {
        throw HostError("the renderer's options dialog failed with error " + std::to_string(error));
    }
    return changed != 0;
}

std::vector<uint8_t> ArtisanInstance::Flatten() {
    const QNGP_MemorySuite1& memory = *MemorySuite();
    QNGP_MemHandle flattened = nullptr;
    int32_t error =
        artisan_.entries.flattenInstance
            ? artisan_.entries.flattenInstance(in_, nullptr, nullptr, nullptr, options_, &flattened)
            : 0;
    std::vector<uint8_t> bytes;
    void* pointer = nullptr;
    uint32_t size = 0;
    if (flattened && error == 0 && (error = memory.GetHandleSize(flattened, &size)) == 0 &&
        (error = memory.LockHandle(flattened, &pointer)) == 0) {
        bytes.assign(static_cast<const uint8_t*>(pointer),
                     static_cast<const uint8_t*>(pointer) + size);
        memory.UnlockHandle(flattened);
    }
    if (flattened) memory.FreeHandle(flattened);
    if (error || !flattened) {
        throw HostError("the renderer \"" + artisan_.displayName +
                        "\" could not flatten its options (error " + std::to_string(error) + ")");
    }
    return bytes;
}

}  // namespace ostrel
