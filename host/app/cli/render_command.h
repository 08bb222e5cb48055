// `ostrel render`: a composition rendered frame by frame through the renderer plug-in, each
// frame written to an image file.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "cli/arguments.h"
#include "composition/image_cache.h"
#include "session/frame_session.h"

namespace ostrel {

struct RenderOptions {
    std::filesystem::path composition;
    std::string outputPattern;  // empty: the composition's stem + ".####.png" beside it
    std::string frames;         // "A-B" or "A"; empty: every frame
    RenderSettings settings;
    bool multiprocessing = true;
    int32_t threads = 0;  // 0: one per processor
    std::vector<std::filesystem::path> pluginFolders;
    bool stats = false;
    bool background = false;    // frames over the comp's background colour, whatever it says
    bool skipExisting = false;  // leave out frames whose file is there and decodes whole
    bool keepGoing = false;     // a frame that fails is reported and the next one rendered
    int64_t maxMemory = 0;      // bytes the frame's buffers may hold; 0: a share of the machine's
    bool terminal = false;      // draw a progress bar instead of a line per frame
};

// What a render of the options draws: the composition, its frames and their files.
struct RenderPlan {
    Composition comp;
    FrameRange range;
    std::string pattern;
};

// Loads the composition and checks the options against it, as a render does before it loads
// any plug-in. Throws HostError or CompositionError with a message for the user.
RenderPlan PlanRender(const RenderOptions& options, ImageCache& images);

// Renders and writes every frame; throws HostError or CompositionError with a message for the
// user at the first problem. A frame's file is written whole or not at all.
void RunRender(const RenderOptions& options, std::ostream& out);

// The pattern used when none is given.
std::string DefaultOutputPattern(const std::filesystem::path& composition);

}  // namespace ostrel
