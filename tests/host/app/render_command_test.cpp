// `ostrel render` in this process: every way a render can be refused, and the frames it writes.
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>

#include <filesystem>
#include <functional>
#include <sstream>
#include <string>
#include <tuple>

#include "cli/render_command.h"
#include "suites/memory_suite.h"
#include "suites/persistent_data_suite.h"
#include "suites/suite_registry.h"
#include "test_files.h"
#include "u_memory.h"

namespace ostrel {
namespace {

const std::filesystem::path kCards =
    std::filesystem::path(OSTREL_EXAMPLES_DIR) / "cards" / "cards.json";

RenderOptions OptionsFor(const std::filesystem::path& comp, const TempFolder& folder,
                         const char* pattern = "frame.####.png") {
    RenderOptions options;
    options.composition = comp;
    options.outputPattern = (folder.Path() / "out" / pattern).string();
    options.frames = std::string("0");  // moved in: GCC 12 misreads assigning a literal here
    options.pluginFolders = {ORMOND_PLUGIN_DIR};
    return options;
}

// The message of the render's failure, or "" when it succeeds.
std::string Failure(const RenderOptions& options, std::string* out = nullptr) {
    std::ostringstream printed;
    std::string message;
    try {
        RunRender(options, printed);
    } catch (const std::exception& error) {
        message = error.what();
    }
    if (out) *out = printed.str();
    return message;
}

size_t FilesIn(const std::filesystem::path& folder) {
    size_t count = 0;
    std::error_code error;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder, error))
        count += entry.is_regular_file();
    return count;
}

TEST(RenderCommand, RefusesWithAMessageNamingTheFileAndWritesNothing) {
    struct Case {
        const char* name;
        const char* composition;  // written as comp.json; empty: the cards example
        std::function<void(RenderOptions&)> change;
        const char* message;
    };
    const Case kCases[] = {
        {"unknown transfer mode",
         R"({"width": 64, "height": 64, "duration": 1, "layers": [
              {"kind": "solid", "source": {"color": "#ffffff"}, "threeD": true,
               "transferMode": "sparkle"}]})",
         [](RenderOptions&) {},
         "comp.json: layers[0].transferMode: no transfer mode is named \"sparkle\" (frame 0)"},
        {"frame past the end", "", [](RenderOptions& o) { o.frames = "40-48"; },
         "cards.json: --frames: the frame range 40-48 reaches outside the frames 0-47"},
        {"region outside the comp", "",
         [](RenderOptions& o) {
             o.settings.region = M_LRect{0, 0, 2000, 100};
         },
         "cards.json: render settings: a region of interest that is empty or reaches outside"},
        {"unknown image format", "", [](RenderOptions& o) { o.outputPattern += ".nothing"; },
         ".png.nothing: cannot write"},
        {"no renderer", "", [](RenderOptions& o) { o.pluginFolders.clear(); },
         "no plug-in registers the renderer \"VLMR Ormond\""},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        std::filesystem::path comp = kCards;
        if (*c.composition) comp = folder.WriteText("comp.json", c.composition);
        RenderOptions options = OptionsFor(comp, folder);
        c.change(options);
        size_t before = FilesIn(folder.Path());
        int64_t bytes = U_AccountedBytes();
        std::string failure = Failure(options);
        EXPECT_NE(failure.find(c.message), std::string::npos) << failure;
        EXPECT_EQ(FilesIn(folder.Path()), before);
        EXPECT_EQ(U_AccountedBytes(), bytes);
        EXPECT_EQ(LiveMemoryHandles(), 0);
        EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 0);
    }
    ClearApplicationSettings();
}

// The examples' references cover depths and sizes in TIFF; here the other formats and the
// settings the references leave alone.
TEST(RenderCommand, FramesOfTheRequestedSizeDepthAndFormat) {
    struct Case {
        const char* name;
        std::function<void(RenderOptions&)> change;
        const char* pattern;
        const char* file;
        int width, height;
        OIIO::TypeDesc::BASETYPE type;
    };
    const Case kCases[] = {
        {"float to OpenEXR", [](RenderOptions& o) { o.settings.bitDepth = 32; }, "frame.####.exr",
         "frame.0000.exr", 960, 540, OIIO::TypeDesc::FLOAT},
        {"region and downsample, interlaced, one thread",
         [](RenderOptions& o) {
             o.settings.region = M_LRect{100, 50, 301, 150};
             o.settings.downsampleX = 2;
             o.settings.fields = RenderSettings::Fields::kUpperFirst;
             o.multiprocessing = false;
             o.threads = 1;
         },
         "frame.####.png", "frame.0000.png", 101, 100, OIIO::TypeDesc::UINT8},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        RenderOptions options = OptionsFor(kCards, folder, c.pattern);
        c.change(options);
        std::string out;
        ASSERT_EQ(Failure(options, &out), "");
        EXPECT_NE(out.find(" s, 3 layers -> " + (folder.Path() / "out" / c.file).string()),
                  std::string::npos)
            << out;
        auto in = OIIO::ImageInput::open((folder.Path() / "out" / c.file).string());
        ASSERT_TRUE(in);
        EXPECT_EQ(std::tuple(in->spec().width, in->spec().height, in->spec().format.basetype),
                  std::tuple(c.width, c.height, c.type));
    }
    ClearApplicationSettings();
}

}  // namespace
}  // namespace ostrel
