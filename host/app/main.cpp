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
#include "cli/render_arguments.h"
#include "cli/render_command.h"
#include "composition/composition_error.h"
#include "composition/composition_loader.h"
#include "host_error.h"
#include "submit/submit_command.h"

namespace {

constexpr int kExitFailure = 1;
constexpr int kExitInterrupted = 130;

std::vector<std::filesystem::path> PluginFolders(const std::vector<std::string>& given) {
    std::vector<std::filesystem::path> folders(given.begin(), given.end());
    folders.push_back(ostrel::DefaultPluginFolder());
    return folders;
}

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
    ostrel::RenderArguments renderArguments;
    std::string composition;
    CLI::App* renderCommand = app.add_subcommand("render", "Render frames to image files");
    ostrel::AddRenderArguments(*renderCommand, renderArguments);
    renderCommand->add_option("--threads", render.threads, "Worker threads (0: one per core)")
        ->check(CLI::Range(0, 256));
    renderCommand->add_flag("--stats", render.stats,
                            "Print the time spent inside and outside the plug-in");
    renderCommand->add_flag("--keep-going", render.keepGoing,
                            "Go on to the next frame when one fails; fail at the end");
    renderCommand->add_flag("--skip-existing", render.skipExisting,
                            "Leave out frames whose file is already there and reads whole");

    ostrel::SubmitOptions submit;
    CLI::App* submitCommand = ostrel::AddSubmitCommand(app, submit);

    CLI::App* aboutCommand = app.add_subcommand("about", "Show the renderer's about box");
    aboutCommand
        ->add_option("--plugins", pluginFolders,
                     "Folder to search for plug-ins before the default one")
        ->check(ostrel::kNonEmpty);

    CLI::App* optionsCommand =
        app.add_subcommand("options", "Choose the renderer's options for a composition");
    optionsCommand->add_option("COMP", composition, "Composition file (JSON), rewritten on OK")
        ->required()
        ->check(ostrel::kNonEmpty);
    optionsCommand
        ->add_option("--plugins", pluginFolders,
                     "Folder to search for plug-ins before the default one")
        ->check(ostrel::kNonEmpty);

    int32_t infoFrame = 0;
    CLI::App* infoCommand = app.add_subcommand("info", "List what a composition will render");
    infoCommand->add_option("COMP", composition, "Composition file (JSON)")
        ->required()
        ->check(ostrel::kNonEmpty);
    infoCommand->add_option("--frame", infoFrame, "The frame whose layers are listed")
        ->check(CLI::NonNegativeNumber);

    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& help) {
        return app.exit(help);
    } catch (const CLI::ParseError& error) {
        // One line like every other error; the status stays the parser's, above 100.
        std::cerr << "ostrel: " << error.what() << " (ostrel --help lists the options)\n";
        return error.get_exit_code();
    }

    try {
        if (renderCommand->parsed()) {
            ostrel::ApplyRenderArguments(renderArguments, render);
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
        } else if (submitCommand->parsed()) {
            ostrel::RunSubmit(submit, std::cout);
        }
    } catch (const std::exception& error) {
        std::cout << std::flush;
        std::cerr << "ostrel: " << error.what() << '\n';
        return ostrel::Interrupted() ? kExitInterrupted : kExitFailure;
    }
    return 0;
}
