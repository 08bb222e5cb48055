#include "submit/submit_command.h"

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "cli/arguments.h"
#include "cli/artisan_instance.h"
#include "composition/composition_error.h"
#include "host_error.h"
#include "output/image_writer.h"
#include "session/frame_suites.h"
#include "submit/batch_script.h"
#include "submit/slurm_client.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

// The cluster shares the file system, not this process's working folder.
fs::path Absolute(const fs::path& path) {
    return fs::absolute(path).lexically_normal();
}

// Every image is decoded whole here: the loader reads only their headers, and a file cut short
// would otherwise fail every task on the cluster.
void CheckImages(const Composition& comp, ImageCache& images) {
    for (size_t i = 0; i < comp.layers.size(); ++i) {
        const fs::path& image = comp.layers[i].source.image;
        if (image.empty()) continue;
        try {
            images.Get(image);
        } catch (const CompositionError& error) {
            throw CompositionError(comp.file.string() + ": layers[" + std::to_string(i) +
                                   "].source: " + error.what());
        }
    }
}

// The plug-in folders a task searches: those given, then the one beside this program, named too
// so that the script shows where the plug-in comes from.
std::vector<fs::path> PluginFolders(const RenderOptions& render) {
    std::vector<fs::path> folders;
    for (const fs::path& folder : render.pluginFolders)
        folders.push_back(Absolute(folder));
    folders.push_back(DefaultPluginFolder());
    return folders;
}

// The command each task runs, less its frames: the options as given, every path absolute.
std::vector<std::string> RenderCommand(const SubmitOptions& options, const RenderPlan& plan,
                                       const std::vector<fs::path>& pluginFolders) {
    const RenderArguments& given = options.render;
    std::vector<std::string> command = {fs::read_symlink("/proc/self/exe").string(), "render",
                                        Absolute(plan.comp.file).string(), "-o",
                                        Absolute(plan.pattern).string()};
    auto add = [&](const char* option, const std::string& value, const std::string& unset) {
        if (value != unset) command.insert(command.end(), {option, value});
    };
    add("--depth", given.bitDepth ? std::to_string(given.bitDepth) : "", "");
    add("--downsample", given.downsample, "");
    add("--region", given.region, "");
    add("--fields", given.fields, "off");
    add("--multiprocessing", given.multiprocessing, "on");
    if (given.background) command.push_back("--background");
    add("--max-memory", given.maxMemory, "");
    for (const fs::path& folder : pluginFolders)
        add("--plugins", folder.string(), "");
    return command;
}

// After the job: each task whose frames are not all there and whole, with its log.
void CheckFrames(const BatchJob& job, const std::string& jobId, const std::string& pattern,
                 std::ostream& out) {
    std::string failures;
    int32_t count = 0;
    for (size_t task = 0; task < job.chunks.size(); ++task) {
        std::vector<int32_t> missing;
        for (int32_t frame = job.chunks[task].first; frame <= job.chunks[task].last; ++frame) {
            if (!DecodesWhole(ExpandFramePattern(pattern, frame))) missing.push_back(frame);
        }
        if (missing.empty()) continue;
        count += static_cast<int32_t>(missing.size());
        failures += (failures.empty() ? "" : "; ") + std::string("frames ") + FrameList(missing) +
                    " (task " + std::to_string(task) + ", log " +
                    TaskLog(job, jobId, std::to_string(task)).string() + ")";
    }
    if (count) {
        throw HostError(pattern + ": job " + jobId + " left " + std::to_string(count) +
                        " frames missing or unreadable: " + failures);
    }
    out << "job " << jobId << " done: every frame is written\n";
}

// Whole or not at all, as frames are: written beside and renamed into place.
void WriteScript(const fs::path& file, const std::string& text) {
    std::error_code error;
    fs::create_directories(file.parent_path(), error);
    fs::path partial = file.string() + ".partial";
    std::ofstream stream(partial, std::ios::binary);
    stream << text;
    stream.close();
    if (stream) fs::rename(partial, file, error);
    if (!stream || error) {
        std::error_code ignored;
        fs::remove(partial, ignored);
        throw HostError(file.string() + ": cannot write the batch script" +
                        (error ? ": " + error.message() : std::string()));
    }
}

}  // namespace

CLI::App* AddSubmitCommand(CLI::App& app, SubmitOptions& options) {
    CLI::App* command =
        app.add_subcommand("submit", "Queue the render on a Slurm cluster, a task per chunk");
    AddRenderArguments(*command, options.render);
    command->add_option("--chunk", options.chunk, "Frames per task (default: 10)")
        ->check(CLI::Range(1, 1 << 20));
    command
        ->add_option("--cpus-per-task", options.cpusPerTask,
                     "CPUs of each task, all rendering (default: 1)")
        ->check(CLI::Range(1, 256));
    command->add_option("--partition", options.partition, "The cluster's partition (queue)")
        ->check(kNonEmpty);
    command->add_option("--time", options.timeLimit, "Time limit of each task, as sbatch takes it")
        ->check(kNonEmpty);
    command->add_option("--mem", options.memory, "Memory of each task, as sbatch takes it")
        ->check(kNonEmpty);
    command->add_flag("--wait", options.wait,
                      "Wait for the job, then check that every frame was written");
    command->add_flag("--dry-run", options.dryRun, "Print the batch script, submit nothing");
    return command;
}

void RunSubmit(const SubmitOptions& options, std::ostream& out) {
    RenderOptions render;
    ApplyRenderArguments(options.render, render);
    ImageCache images;
    const RenderPlan plan = PlanRender(render, images);
    CheckImages(plan.comp, images);
    std::vector<fs::path> pluginFolders = PluginFolders(render);
    {
        HostSuites suites;
        PluginHost plugins;
        LoadArtisan(plugins, pluginFolders, kRendererMatchName);
    }

    fs::path jobs = Absolute(plan.pattern).parent_path() / ".ostrel-jobs";
    std::string stem = plan.comp.file.stem().string();
    BatchJob job;
    job.name = "ostrel-" + stem;
    job.chunks = SplitFrames(plan.range, options.chunk);
    job.render = RenderCommand(options, plan, pluginFolders);
    job.logPattern = jobs / (stem + ".%A_%a.log");
    job.cpusPerTask = options.cpusPerTask;
    job.partition = options.partition;
    job.timeLimit = options.timeLimit;
    job.memory = options.memory;
    std::string script = BatchScript(job);
    if (options.dryRun) {
        out << script;
        return;
    }

    fs::path file = jobs / (stem + ".sh");
    WriteScript(file, script);
    std::string id = SubmitBatch(file);
    out << "submitted job " << id << ": frames " << plan.range.first << "-" << plan.range.last
        << " in " << job.chunks.size() << " task" << (job.chunks.size() == 1 ? "" : "s") << " -> "
        << Absolute(plan.pattern).string() << "\n  follow it:  squeue --jobs=" << id
        << "\n  logs:       " << TaskLog(job, id, "*").string() << '\n'
        << std::flush;
    if (!options.wait) return;
    WaitForJob(id, out);
    CheckFrames(job, id, Absolute(plan.pattern).string(), out);
}

}  // namespace ostrel
