#include "cli/render_command.h"

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <iostream>
#include <optional>
#include <sstream>
#include <stdexcept>

#include "cli/arguments.h"
#include "cli/artisan_instance.h"
#include "cli/progress_display.h"
#include "composition/composition_loader.h"
#include "composition/image_file.h"
#include "host_error.h"
#include "memory_size.h"
#include "output/background.h"
#include "output/frame_writer.h"
#include "qngp_suites.h"
#include "session/frame_suites.h"
#include "suites/iterate_suite.h"
#include "suites/persistent_data_suite.h"
#include "u_memory.h"
#include "u_report.h"

namespace ostrel {
namespace {

using Clock = std::chrono::steady_clock;

double Seconds(Clock::duration d) {
    return std::chrono::duration<double>(d).count();
}

// Where the time of a frame went: inside the plug-in's render entry (less the host's work of
// delivering layer pixels, which the entry waits for), and the host's own work.
struct FrameTimes {
    double total = 0;
    double entry = 0;
    double pixels = 0;
    double output = 0;

    double PlugIn() const { return entry - pixels; }
    double Host() const { return total - PlugIn(); }
    FrameTimes& operator+=(const FrameTimes& o) {
        total += o.total;
        entry += o.entry;
        pixels += o.pixels;
        output += o.output;
        return *this;
    }
};

std::string Milliseconds(double seconds) {
    char text[32];
    std::snprintf(text, sizeof text, "%.1f ms", seconds * 1000);
    return text;
}

std::string Split(const FrameTimes& t) {
    char share[32];
    std::snprintf(share, sizeof share, " (%.1f %%)", t.total > 0 ? 100 * t.PlugIn() / t.total : 0);
    return Milliseconds(t.total) + "; plug-in " + Milliseconds(t.PlugIn()) + share + ", host " +
           Milliseconds(t.Host()) + " (layer pixels " + Milliseconds(t.pixels) + ", output " +
           Milliseconds(t.output) + ")";
}

// Rethrows a problem of the options as one that names the composition file.
template <class Parse>
auto Checked(const Composition& comp, const std::string& option, Parse&& parse) {
    try {
        return parse();
    } catch (const std::invalid_argument& error) {
        throw HostError(comp.file.string() + ": " + option + ": " + error.what());
    }
}

std::string FrameFailure(const Composition& comp, const Artisan& artisan, int32_t frame,
                         int32_t code, const std::string& hostFailure, int64_t memoryLimit,
                         int64_t refusedDemand) {
    std::string where = comp.file.string() + ": frame " + std::to_string(frame) + ": ";
    if (code == kQNGP_ErrUserCancel) return where + "interrupted";
    if (!hostFailure.empty()) return hostFailure + " (frame " + std::to_string(frame) + ")";
    std::ostringstream text;
    text << where << "the renderer \"" << artisan.displayName << "\" failed with error " << code
         << " (0x" << std::hex << code << ")";
    if (code == kU_ErrUnexpectedBitDepth) text << ": pixels of a depth other than 8, 16 or 32 bits";
    if (code == kU_ErrOutOfMemory) {
        text << ": out of memory; the frame's buffers ";
        // How far past the limit the frame reached tells the user what to ask for.
        if (refusedDemand > 0)
            text << "needed more than " << SizeText(static_cast<double>(refusedDemand));
        if (refusedDemand > memoryLimit) text << " and ";
        if (refusedDemand == 0 || refusedDemand > memoryLimit) {
            text << "may hold at most " << SizeText(static_cast<double>(memoryLimit))
                 << " (--max-memory)";
        } else {
            text << ", more than the system gave";
        }
    }
    return text.str();
}

// The most the frame's buffers may hold, for this run only.
class AllocationLimit {
public:
    explicit AllocationLimit(int64_t bytes) { U_SetAllocationLimit(bytes); }
    ~AllocationLimit() { U_SetAllocationLimit(0); }
    AllocationLimit(const AllocationLimit&) = delete;
    AllocationLimit& operator=(const AllocationLimit&) = delete;
};

void MakeOutputFolder(const std::filesystem::path& file) {
    std::filesystem::path folder = file.parent_path();
    if (folder.empty()) return;
    std::error_code error;
    std::filesystem::create_directories(folder, error);
    if (error) {
        throw HostError(file.string() + ": cannot make the folder " + folder.string() + ": " +
                        error.message());
    }
}

}  // namespace

std::string DefaultOutputPattern(const std::filesystem::path& composition) {
    return (composition.parent_path() / composition.stem()).string() + ".####.png";
}

RenderPlan PlanRender(const RenderOptions& options, ImageCache& images) {
    RenderPlan plan{LoadComposition(options.composition), {}, options.outputPattern};
    const Composition& comp = plan.comp;
    plan.range = {0, comp.FrameCount() - 1};
    if (!options.frames.empty()) {
        plan.range = Checked(comp, "--frames",
                             [&] { return ParseFrameRange(options.frames, comp.FrameCount()); });
    }
    // Times grow with the frame: when the last frame's fits, every frame's does.
    comp.FrameTime(plan.range.last);
    if (plan.pattern.empty()) plan.pattern = DefaultOutputPattern(comp.file);
    // Settings the comp cannot take fail here, before any plug-in is loaded.
    Checked(comp, "render settings", [&] {
        FrameSession probe(comp, images, options.settings, plan.range.first);
        return 0;
    });
    return plan;
}

void RunRender(const RenderOptions& options, std::ostream& out) {
    Clock::time_point start = Clock::now();
    ImageCache images;
    const RenderPlan plan = PlanRender(options, images);
    const Composition& comp = plan.comp;
    const std::string& pattern = plan.pattern;
    std::vector<int32_t> frames;
    for (int32_t frame = plan.range.first; frame <= plan.range.last; ++frame) {
        if (!options.skipExisting || !DecodesWhole(ExpandFramePattern(pattern, frame)))
            frames.push_back(frame);
    }
    auto skipped = static_cast<int32_t>(plan.range.last - plan.range.first + 1 - frames.size());
    // Nothing left to draw needs no plug-in.
    if (frames.empty()) {
        out << "0 frames, " << skipped << " skipped (already written)\n";
        return;
    }

    SetApplicationSetting("Tessary 3D", "Enable Multiprocessing", options.multiprocessing ? 1 : 0);
    SetIterateThreads(options.threads);
    // Three quarters of the machine leaves room for the program, its images and the system.
    const int64_t memoryLimit =
        options.maxMemory ? options.maxMemory : static_cast<int64_t>(PhysicalMemoryBytes() / 4 * 3);
    AllocationLimit limit(memoryLimit);
    HostSuites suites;
    PluginHost plugins;
    std::vector<std::filesystem::path> folders = options.pluginFolders;
    folders.push_back(DefaultPluginFolder());
    const Artisan& artisan = LoadArtisan(plugins, folders, kRendererMatchName);
    ArtisanInstance instance(plugins, artisan, comp.rendererOptions);

    auto frameCount = static_cast<int32_t>(frames.size());
    ProgressDisplay progress(out, options.terminal, frameCount);
    CatchInterrupts();
    FrameTimes all;
    std::string firstFile, lastFile;
    // Frame n is written while frame n + 1 renders, and reported once its file is whole: when
    // the next write starts, or when the last one finishes.
    FrameWriter writer;
    struct Rendered {
        int32_t frame;
        FrameTimes times;
        int32_t layers;
        std::string file;
    };
    std::optional<Rendered> inFlight;
    auto report = [&](const Rendered& r) {
        progress.FrameWritten(r.frame, r.times.total, r.layers, r.file);
        if (options.stats) {
            progress.Clear();
            out << "frame " << r.frame << " split: " << Split(r.times) << '\n';
        }
    };
    std::optional<std::filesystem::path> cleanedFolder;  // of stale temporaries
    std::vector<int32_t> failed;                         // with --keep-going
    for (int32_t frame : frames) {
        if (Interrupted()) {
            throw HostError(comp.file.string() + ": frame " + std::to_string(frame) +
                            ": interrupted");
        }
        Clock::time_point frameStart = Clock::now();
        FrameTimes times;
        FrameSession session(comp, images, options.settings, frame);
        session.SetProgress(&progress);
        progress.BeginFrame(frame);
        int32_t layers = session.LayerContextCount();
        int32_t code = 0;
        U_TakeRefusedDemand();
        for (int32_t pass = 0; !code && pass < session.PassCount(); ++pass) {
            session.BeginPass(pass);
            Clock::time_point entry = Clock::now();
            code = instance.Render(session);
            times.entry += Seconds(Clock::now() - entry);
        }
        if (code) {
            std::string failure = FrameFailure(comp, artisan, frame, code, session.Failure(),
                                               memoryLimit, U_TakeRefusedDemand());
            if (!options.keepGoing || code == kQNGP_ErrUserCancel) throw HostError(failure);
            progress.Clear();
            std::cerr << "ostrel: " << failure << '\n';
            failed.push_back(frame);
            progress.EndFrame();
            continue;
        }
        times.pixels = static_cast<double>(session.PixelDeliveryNanoseconds()) * 1e-9;
        if (options.background || comp.renderBackground)
            CompositeOverBackground(session.Destination(), comp.background);

        Clock::time_point output = Clock::now();
        std::filesystem::path file = ExpandFramePattern(pattern, frame);
        MakeOutputFolder(file);
        if (cleanedFolder != file.parent_path()) {
            RemoveStalePartials(file.parent_path());
            cleanedFolder = file.parent_path();
        }
        writer.Write(PrepareImage(session.Destination(), file));
        times.output = Seconds(Clock::now() - output);
        times.total = Seconds(Clock::now() - frameStart);
        all += times;
        if (firstFile.empty()) firstFile = file.string();
        lastFile = file.string();
        progress.EndFrame();
        if (inFlight) report(*inFlight);
        inFlight = Rendered{frame, times, layers, file.string()};
    }
    Clock::time_point lastWrite = Clock::now();
    writer.Finish();
    all.output += Seconds(Clock::now() - lastWrite);
    if (inFlight) report(*inFlight);
    progress.Clear();
    if (!failed.empty()) {
        throw HostError(comp.file.string() + ": " + std::to_string(failed.size()) + " of " +
                        std::to_string(frameCount) + " frames failed: " + FrameList(failed));
    }
    // The bar is gone: one line says what became of the run. A log of a resumed run needs
    // it too, for the frames it left out.
    if (options.terminal || options.skipExisting) {
        char summary[64];
        std::snprintf(summary, sizeof summary, "%d frame%s in %.2f s", frameCount,
                      frameCount == 1 ? "" : "s", Seconds(Clock::now() - start));
        out << summary;
        if (options.skipExisting) out << ", " << skipped << " skipped (already written)";
        out << " -> " << firstFile << (frameCount > 1 ? " ... " + lastFile : "") << '\n';
    }
    if (options.stats) {
        // Loading the composition and the plug-ins counts as the host's.
        all.total = Seconds(Clock::now() - start);
        out << "total, " << frameCount << " frame" << (frameCount == 1 ? "" : "s")
            << " with loading: " << Split(all) << '\n';
    }
}

}  // namespace ostrel
