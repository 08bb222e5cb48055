#include "cli/options_command.h"

#include <string>

#include "cli/artisan_instance.h"
#include "cli/terminal_dialog.h"
#include "composition/composition_loader.h"
#include "composition/renderer_options.h"
#include "host_error.h"
#include "output/image_writer.h"
#include "session/frame_suites.h"

namespace ostrel {

void RunOptionsDialog(const std::filesystem::path& composition,
                      const std::vector<std::filesystem::path>& pluginFolders, std::ostream& out) {
    std::string text = ReadCompositionText(composition);
    Composition comp = ParseComposition(text, composition);
    HostSuites suites;
    PluginHost plugins;
    const Artisan& artisan = LoadArtisan(plugins, pluginFolders, kRendererMatchName);
    ArtisanInstance instance(plugins, artisan, comp.rendererOptions);
    bool changed = false;
    {
        TerminalDialogs dialogs;
        changed = instance.ShowDialog();
    }
    if (!changed) {
        out << composition.string() << ": unchanged\n";
        return;
    }
    std::vector<uint8_t> flattened = instance.Flatten();
    std::string updated = WithRendererOptions(text, flattened);
    // The new text must load, and load to these options, before it replaces the old.
    if (ParseComposition(updated, composition).rendererOptions != flattened) {
        throw HostError(composition.string() +
                        ": cannot write the renderer's options into this composition");
    }
    ReplaceFile(composition, std::vector<unsigned char>(updated.begin(), updated.end()),
                "the composition", FilePermissions::kKeep);
    std::optional<int32_t> choice = ShadowMapSizeChoice(flattened);
    out << composition.string() << ": shadow map resolution "
        << (choice ? ShadowMapSizeText(*choice) : std::string("of the renderer's choosing"))
        << '\n';
}

}  // namespace ostrel
