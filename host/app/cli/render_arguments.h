// The options of a render as the user gives them on the command line, shared by `ostrel render`
// and `ostrel submit`, which hands them on to the renders it queues.
#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

#include "cli/render_command.h"

namespace ostrel {

// The parser takes an empty value as given; it is a mistake the user should hear of, not a
// default.
extern const CLI::Validator kNonEmpty;

struct RenderArguments {
    std::string composition;
    std::string output;
    std::string frames;
    int bitDepth = 0;  // 0: the comp's
    std::string downsample;
    std::string region;
    std::string fields = "off";
    std::string multiprocessing = "on";
    std::vector<std::string> pluginFolders;
    bool background = false;
    std::string maxMemory;
};

// COMP, -o, --frames, --depth, --downsample, --fields, --region, --multiprocessing, --plugins,
// --background, --max-memory.
void AddRenderArguments(CLI::App& command, RenderArguments& arguments);

// Sets the options the arguments give. Throws HostError naming the option that is wrong.
void ApplyRenderArguments(const RenderArguments& arguments, RenderOptions& options);

}  // namespace ostrel
