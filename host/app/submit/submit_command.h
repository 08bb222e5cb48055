// `ostrel submit`: a render of a composition queued on a Slurm cluster as one job, a task for
// each chunk of frames. The composition, its images and the plug-in are checked here first, so
// that a bad file never reaches the cluster.
#pragma once

#include <CLI/CLI.hpp>
#include <cstdint>
#include <ostream>
#include <string>

#include "cli/render_arguments.h"

namespace ostrel {

struct SubmitOptions {
    RenderArguments render;
    int32_t chunk = 10;  // frames per task
    int32_t cpusPerTask = 1;
    std::string partition;  // empty: the cluster's default, and so on
    std::string timeLimit;
    std::string memory;
    bool wait = false;
    bool dryRun = false;  // print the script, submit nothing
};

CLI::App* AddSubmitCommand(CLI::App& app, SubmitOptions& options);

// Throws HostError or CompositionError with a message for the user: for a bad composition, a
// cluster that refuses the job and, with wait, frames the job left missing.
void RunSubmit(const SubmitOptions& options, std::ostream& out);

}  // namespace ostrel
