// The ostrel program run as a user runs it: exit status, messages, and the files it leaves.
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

std::string ReadAll(const fs::path& file) {
    std::stringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

size_t FilesIn(const fs::path& folder) {
    size_t count = 0;
    for (const auto& entry : fs::recursive_directory_iterator(folder))
        count += entry.is_regular_file();
    return count;
}

// Each run starts in a fresh folder holding a copy of the cards example in shot/ and a
// composition that is not JSON.
TEST(OstrelProgram, RunsAsTheArgumentsSay) {
    using OIIO::TypeDesc;
    struct Frames {
        int count = 0;     // how many it writes
        const char* file;  // one of them
        int width, height;
        TypeDesc::BASETYPE type;
    };
    struct Case {
        const char* name;
        std::string arguments;
        int status;                    // 101 stands for any status above 100, a usage error
        std::vector<std::string> out;  // parts of the standard output, in order
        const char* err;               // a part of the error output; "": none at all
        Frames frames;
    };
    const Case kCases[] = {
        // Not on a terminal: one line for each frame, and the statistics.
        {"frames beside the composition",
         "render shot/cards.json --frames 2-3 --threads 2 --stats",
         0,
         {"frame 2: ", "3 layers -> shot/cards.0002.png\n", "frame 3 split: ", "plug-in ",
          "total, 2 frames with loading: "},
         "",
         {2, "shot/cards.0002.png", 960, 540, TypeDesc::UINT8}},
        {"float to OpenEXR",
         "render shot/cards.json --frames 0 --depth 32 -o f.####.exr",
         0,
         {" s, 3 layers -> f.0000.exr"},
         "",
         {1, "f.0000.exr", 960, 540, TypeDesc::FLOAT}},
        {"region and downsample, interlaced, one thread",
         "render shot/cards.json --frames 0 -o f.####.png --region 100,50,301,150 "
         "--downsample 2x1 --fields upper --multiprocessing off --threads 1",
         0,
         {" s, 3 layers -> f.0000.png"},
         "",
         {1, "f.0000.png", 101, 100, TypeDesc::UINT8}},
        {"info",
         "info shot/cards.json",
         0,
         {"960 x 540", "8 bits", "frames       0-47 at 24 fps", "\"camera\", perspective",
          "\"key light\" (spot, casts shadows: a map of 960 x 960)", "\"fill light\" (ambient)",
          "\"disc\"", "\"grid\"", "\"floor\""},
         "",
         {}},
        {"about", "about", 0, {"Ostrel 3D\n"}, "", {}},
        // Without a terminal the dialog reads a line; with none to read it is cancelled.
        {"options",
         "options shot/cards.json </dev/null",
         0,
         {"Shadow Map Resolution:\n1  ✓ Comp Size\n", "Cancelled\n",
          "shot/cards.json: unchanged\n"},
         "",
         {}},
        // A frame that cannot be written whole is not left behind in part.
        {"unwritable output",
         "render shot/cards.json --frames 0 -o stdout.txt/c.####.png",
         1,
         {},
         "ostrel: stdout.txt/c.0000.png",
         {}},
        {"usage", "render shot/cards.json --depth 12", 101, {}, "--help", {}},
        {"empty value", "render shot/cards.json --region ''", 101, {}, "--region: an empty", {}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        fs::copy(fs::path(OSTREL_EXAMPLES_DIR) / "cards", folder.Path() / "shot");
        folder.WriteText("broken.json", R"({"width": 64, "height": )");
        size_t before = FilesIn(folder.Path());
        fs::path out = folder.Path() / "stdout.txt", err = folder.Path() / "stderr.txt";
        std::string command = "cd '" + folder.Path().string() + "' && '" OSTREL_PROGRAM "' " +
                              c.arguments + " >'" + out.string() + "' 2>'" + err.string() + "'";
        int status = std::system(command.c_str());
        std::string printed = ReadAll(out), errors = ReadAll(err);
        EXPECT_EQ(std::min(WIFEXITED(status) ? WEXITSTATUS(status) : -1, 101), c.status) << errors;
        if (*c.err) {
            EXPECT_NE(errors.find(c.err), std::string::npos) << errors;
        } else {
            EXPECT_EQ(errors, "");
        }
        if (c.status == 1) {
            EXPECT_EQ(errors.rfind("ostrel: ", 0), 0u) << errors;
        }
        size_t at = 0;
        for (const std::string& part : c.out) {
            at = printed.find(part, at);
            ASSERT_NE(at, std::string::npos) << part << "\n" << printed;
        }
        // Besides the captured output, only the frames it was asked for.
        EXPECT_EQ(FilesIn(folder.Path()), before + 2 + c.frames.count);
        if (!c.frames.count) continue;
        auto in = OIIO::ImageInput::open((folder.Path() / c.frames.file).string());
        ASSERT_TRUE(in);
        EXPECT_EQ(std::tuple(in->spec().width, in->spec().height, in->spec().format.basetype),
                  std::tuple(c.frames.width, c.frames.height, c.frames.type));
    }
}

}  // namespace
}  // namespace ostrel
