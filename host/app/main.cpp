// ostrel: renders 3-D compositions described in files through the renderer plug-in.
#include <malloc.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <iostream>

#include "cli/arguments.h"
#include "cli/artisan_instance.h"
#include "cli/info_command.h"
#include "cli/options_command.h"
#include "cli/progress_display.h"
#include "cli/render_command.h"
#include "composition/composition_error.h"
#include "composition/composition_loader.h"
#include "host_error.h"

namespace {

constexpr int kExitFailure = 1;
constexpr int kExitInterrupted = 130;

std::vector<std::filesystem::path> PluginFolders(const std::vector<std::string>& given) {
    std::vector<std::filesystem::path> folders(given.begin(), given.end());
    folders.push_back(ostrel::DefaultPluginFolder());
    return folders;
}

// The value of an option, or a message that names the option.
template <class Parse>
auto Option(const char* name, Parse&& parse) {
    try {
        return parse();
    } catch (const std::invalid_argument& error) {
        throw ostrel::HostError(std::string(name) + ": " + error.what());
    }
}

// The parser takes an empty value as given; it is a mistake the user should hear of, not a
// default.
const CLI::Validator kNonEmpty(
    [](std::string& value) {
        return value.empty() ? std::string("an empty value") : std::string();
    },
    "", "NONEMPTY");

}  // namespace

int main(int argc, char** argv) {
    // Every frame allocates and frees buffers of the same few sizes (the destination, the
    // textures, the file's pixels). Keeping freed memory in the heap spares the page faults of
    // fetching it from the system again, frame after frame.
    mallopt(M_MMAP_THRESHOLD, 512 << 20);
    mallopt(M_TRIM_THRESHOLD, 1024 << 20);
    CLI::App app{"Renders 3-D compositions through the Ostrel 3D renderer plug-in."};
    app.require_subcommand(1);
    std::vector<std::string> pluginFolders;

    ostrel::RenderOptions render;
    std::string composition, frames, downsample, region, fields = "off", multiprocessing = "on";
    int bitDepth = 0;
    CLI::App* renderCommand = app.add_subcommand("render", "Render frames to image files");
    renderCommand->add_option("COMP", composition, "Composition file (JSON)")
        ->required()
        ->check(kNonEmpty);
    renderCommand
        ->add_option("-o,--output", render.outputPattern,
                     "Output files; #### becomes the frame number (default: COMP's "
                     "name with .####.png, beside it)")
        ->check(kNonEmpty);
    renderCommand->add_option("--frames", frames, "Frames to render, A-B or A (default: all)")
        ->check(kNonEmpty);
    renderCommand->add_option("--depth", bitDepth, "Bit depth instead of the comp's: 8, 16, 32")
        ->check(CLI::IsMember({8, 16, 32}))
        ->check(kNonEmpty);
    renderCommand->add_option("--downsample", downsample, "Render at 1/N size: N or XxY")
        ->check(kNonEmpty);
    renderCommand->add_option("--fields", fields, "Field rendering: off, upper or lower first")
        ->check(CLI::IsMember({"off", "upper", "lower"}));
    renderCommand
        ->add_option("--region", region, "Render only LEFT,TOP,RIGHT,BOTTOM of the comp (pixels)")
        ->check(kNonEmpty);
    renderCommand
        ->add_option("--multiprocessing", multiprocessing,
                     "Let the renderer use several threads: on or off")
        ->check(CLI::IsMember({"on", "off"}));
    renderCommand->add_option("--threads", render.threads, "Worker threads (0: one per core)")
        ->check(CLI::Range(0, 256));
    renderCommand
        ->add_option("--plugins", pluginFolders,
                     "Folder to search for plug-ins before the default one")
        ->check(kNonEmpty);
    renderCommand->add_flag("--background", render.background,
                            "Composite the frames over the comp's background colour");
    renderCommand->add_flag("--stats", render.stats,
                            "Print the time spent inside and outside the plug-in");

    CLI::App* aboutCommand = app.add_subcommand("about", "Show the renderer's about box");
    aboutCommand
        ->add_option("--plugins", pluginFolders,
                     "Folder to search for plug-ins before the default one")
        ->check(kNonEmpty);

    CLI::App* optionsCommand =
        app.add_subcommand("options", "Choose the renderer's options for a composition");
    optionsCommand->add_option("COMP", composition, "Composition file (JSON), rewritten on OK")
        ->required()
        ->check(kNonEmpty);
    optionsCommand
        ->add_option("--plugins", pluginFolders,
                     "Folder to search for plug-ins before the default one")
        ->check(kNonEmpty);

    int32_t infoFrame = 0;
    CLI::App* infoCommand = app.add_subcommand("info", "List what a composition will render");
    infoCommand->add_option("COMP", composition, "Composition file (JSON)")
        ->required()
        ->check(kNonEmpty);
    infoCommand->add_option("--frame", infoFrame, "The frame whose layers are listed")
        ->check(CLI::NonNegativeNumber);

    CLI11_PARSE(app, argc, argv);

    try {
        if (renderCommand->parsed()) {
            render.composition = composition;
            render.frames = frames;
            render.settings.bitDepth = static_cast<int16_t>(bitDepth);
            if (!downsample.empty()) {
                ostrel::Downsample factors =
                    Option("--downsample", [&] { return ostrel::ParseDownsample(downsample); });
                render.settings.downsampleX = factors.x;
                render.settings.downsampleY = factors.y;
            }
            if (!region.empty()) {
                render.settings.region =
                    Option("--region", [&] { return ostrel::ParseRegion(region); });
            }
            using Fields = ostrel::RenderSettings::Fields;
            render.settings.fields = fields == "upper"   ? Fields::kUpperFirst
                                     : fields == "lower" ? Fields::kLowerFirst
                                                         : Fields::kOff;
            render.multiprocessing = multiprocessing == "on";
            render.pluginFolders.assign(pluginFolders.begin(), pluginFolders.end());
            render.terminal = ::isatty(STDOUT_FILENO) != 0;
            ostrel::RunRender(render, std::cout);
        } else if (aboutCommand->parsed()) {
            ostrel::ShowAbout(PluginFolders(pluginFolders));
        } else if (optionsCommand->parsed()) {
            ostrel::RunOptionsDialog(composition, PluginFolders(pluginFolders), std::cout);
        } else if (infoCommand->parsed()) {
            ostrel::Composition comp = ostrel::LoadComposition(composition);
            if (infoFrame >= comp.FrameCount()) {
                throw ostrel::HostError(
                    comp.file.string() + ": --frame " + std::to_string(infoFrame) +
                    ": the composition has frames 0-" + std::to_string(comp.FrameCount() - 1));
            }
            ostrel::PrintInfo(comp, infoFrame, std::cout);
        }
    } catch (const std::exception& error) {
        std::cout << std::flush;
        std::cerr << "ostrel: " << error.what() << '\n';
        return ostrel::Interrupted() ? kExitInterrupted : kExitFailure;
    }
    return 0;
}
