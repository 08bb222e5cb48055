// `ostrel render` in this process: every way a render can be refused gives back all it took.
#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <sstream>
#include <string>

#include "cli/render_command.h"
#include "suites/memory_suite.h"
#include "suites/persistent_data_suite.h"
#include "suites/suite_registry.h"
#include "test_files.h"
#include "u_memory.h"

namespace ostrel {
namespace {

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
        {"no renderer", "", [](RenderOptions& o) { o.pluginFolders.clear(); },
         "no plug-in registers the renderer \"VLMR Ormond\""},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        RenderOptions options;
        options.composition = std::filesystem::path(OSTREL_EXAMPLES_DIR) / "cards" / "cards.json";
        if (*c.composition) options.composition = folder.WriteText("comp.json", c.composition);
        options.outputPattern = (folder.Path() / "out" / "frame.####.png").string();
        options.frames = std::string("0");  // moved in: GCC 12 misreads assigning a literal here
        options.pluginFolders = {ORMOND_PLUGIN_DIR};
        c.change(options);
        size_t before = FilesIn(folder.Path());
        int64_t bytes = U_AccountedBytes();
        std::ostringstream printed;
        std::string failure;
        try {
            RunRender(options, printed);
        } catch (const std::exception& error) {
            failure = error.what();
        }
        EXPECT_NE(failure.find(c.message), std::string::npos) << failure;
        EXPECT_EQ(FilesIn(folder.Path()), before);
        EXPECT_EQ(U_AccountedBytes(), bytes);
        EXPECT_EQ(LiveMemoryHandles(), 0);
        EXPECT_EQ(SuiteRegistry::Instance().Outstanding(), 0);
    }
    ClearApplicationSettings();
}

}  // namespace
}  // namespace ostrel
