#include "cli/render_arguments.h"

#include <stdexcept>

#include "cli/arguments.h"
#include "host_error.h"

namespace ostrel {
namespace {

// The value of an option, or a message that names the option.
template <class Parse>
auto Option(const char* name, Parse&& parse) {
    try {
        return parse();
    } catch (const std::invalid_argument& error) {
        throw HostError(std::string(name) + ": " + error.what());
    }
}

}  // namespace

const CLI::Validator kNonEmpty(
    [](std::string& value) {
        return value.empty() ? std::string("an empty value") : std::string();
    },
    "", "NONEMPTY");

void AddRenderArguments(CLI::App& command, RenderArguments& arguments) {
    command.add_option("COMP", arguments.composition, "Composition file (JSON)")
        ->required()
        ->check(kNonEmpty);
    command
        .add_option("-o,--output", arguments.output,
                    "Output files; #### becomes the frame number (default: COMP's "
                    "name with .####.png, beside it)")
        ->check(kNonEmpty);
    command.add_option("--frames", arguments.frames, "Frames to render, A-B or A (default: all)")
        ->check(kNonEmpty);
    command.add_option("--depth", arguments.bitDepth, "Bit depth instead of the comp's: 8, 16, 32")
        ->check(CLI::IsMember({8, 16, 32}))
        ->check(kNonEmpty);
    command.add_option("--downsample", arguments.downsample, "Render at 1/N size: N or XxY")
        ->check(kNonEmpty);
    command.add_option("--fields", arguments.fields, "Field rendering: off, upper or lower first")
        ->check(CLI::IsMember({"off", "upper", "lower"}));
    command
        .add_option("--region", arguments.region,
                    "Render only LEFT,TOP,RIGHT,BOTTOM of the comp (pixels)")
        ->check(kNonEmpty);
    command
        .add_option("--multiprocessing", arguments.multiprocessing,
                    "Let the renderer use several threads: on or off")
        ->check(CLI::IsMember({"on", "off"}));
    command
        .add_option("--plugins", arguments.pluginFolders,
                    "Folder to search for plug-ins before the default one")
        ->check(kNonEmpty);
    command.add_flag("--background", arguments.background,
                     "Composite the frames over the comp's background colour");
    command
        .add_option("--max-memory", arguments.maxMemory,
                    "The most memory the frame's buffers may hold, such as 8G or 512M "
                    "(default: three quarters of the machine's)")
        ->check(kNonEmpty);
}

void ApplyRenderArguments(const RenderArguments& arguments, RenderOptions& options) {
    options.composition = arguments.composition;
    options.outputPattern = arguments.output;
    options.frames = arguments.frames;
    options.settings.bitDepth = static_cast<int16_t>(arguments.bitDepth);
    if (!arguments.downsample.empty()) {
        Downsample factors =
            Option("--downsample", [&] { return ParseDownsample(arguments.downsample); });
        options.settings.downsampleX = factors.x;
        options.settings.downsampleY = factors.y;
    }
    if (!arguments.region.empty()) {
        options.settings.region = Option("--region", [&] { return ParseRegion(arguments.region); });
    }
    using Fields = RenderSettings::Fields;
    options.settings.fields = arguments.fields == "upper"   ? Fields::kUpperFirst
                              : arguments.fields == "lower" ? Fields::kLowerFirst
                                                            : Fields::kOff;
    options.multiprocessing = arguments.multiprocessing == "on";
    options.pluginFolders.assign(arguments.pluginFolders.begin(), arguments.pluginFolders.end());
    options.background = arguments.background;
    if (!arguments.maxMemory.empty()) {
        options.maxMemory =
            Option("--max-memory", [&] { return ParseMemorySize(arguments.maxMemory); });
    }
}

}  // namespace ostrel
