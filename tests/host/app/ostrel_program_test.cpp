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

#include "test_files.h"

namespace ostrel {
namespace {

const std::filesystem::path kExamples = OSTREL_EXAMPLES_DIR;

struct Outcome {
    int status;
    std::string out;
    std::string err;
};

std::string ReadAll(const std::filesystem::path& file) {
    std::ifstream in(file);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

// Runs the program with the arguments (already quoted for the shell) from the folder.
Outcome Ostrel(const TempFolder& folder, const std::string& arguments) {
    std::filesystem::path out = folder.Path() / "stdout.txt";
    std::filesystem::path err = folder.Path() / "stderr.txt";
    std::string command = "cd '" + folder.Path().string() + "' && '" OSTREL_PROGRAM "' " +
                          arguments + " >'" + out.string() + "' 2>'" + err.string() + "'";
    int status = std::system(command.c_str());
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, ReadAll(out), ReadAll(err)};
}

std::string Quote(const std::filesystem::path& path) {
    std::string quoted = "'";
    quoted += path.string();
    quoted += '\'';
    return quoted;
}

// Files the run left in the folder, beside its own captured output.
std::vector<std::string> Images(const TempFolder& folder) {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder.Path())) {
        std::string name = entry.path().filename().string();
        if (entry.is_regular_file() && name.find(".png") != std::string::npos) {
            names.push_back(name);
        }
    }
    return names;
}

TEST(OstrelProgram, WithoutAnOutputPatternFramesGoBesideTheComposition) {
    TempFolder folder;
    std::filesystem::copy(kExamples / "cards", folder.Path() / "shot");
    Outcome run = Ostrel(folder, "render shot/cards.json --frames 2-3 --threads 2 --stats");
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
    auto in = OIIO::ImageInput::open((folder.Path() / "shot" / "cards.0002.png").string());
    ASSERT_TRUE(in);
    EXPECT_EQ(std::tuple(in->spec().width, in->spec().height, in->spec().format.basetype),
              std::tuple(960, 540, OIIO::TypeDesc::UINT8));
    EXPECT_EQ(Images(folder).size(), 4u);  // the two frames and the example's own images
    // Not on a terminal: one line for each frame, and the statistics.
    EXPECT_EQ(run.out.rfind("frame 2: ", 0), 0u) << run.out;
    for (const char* part : {"3 layers -> shot/cards.0002.png\n", "frame 3 split: ", "plug-in ",
                             "total, 2 frames with loading: "}) {
        EXPECT_NE(run.out.find(part), std::string::npos) << part << "\n" << run.out;
    }
}

TEST(OstrelProgram, BadInputEndsWithAMessageAndNoOutput) {
    struct Case {
        const char* name;
        const char* composition;  // written as comp.json; empty: the cards example
        const char* options;
        int status;           // 101 stands for any status above 100, a usage error
        const char* message;  // a part of the message
    };
    const Case kCases[] = {
        {"malformed JSON", R"({"width": 64, "height": )", "--frames 0", 1,
         "comp.json: malformed JSON"},
        {"unwritable output", "", "--frames 0 -o stdout.txt/cards.####.png", 1,
         "ostrel: stdout.txt/cards.0000.png"},
        {"usage", "", "--depth 12", 101, "--help"},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        std::string comp = Quote(kExamples / "cards" / "cards.json");
        if (*c.composition) comp = Quote(folder.WriteText("comp.json", c.composition));
        Outcome run = Ostrel(folder, "render " + comp + " " + c.options);
        EXPECT_EQ(std::min(run.status, 101), c.status);
        EXPECT_EQ(run.err.rfind(c.status == 1 ? "ostrel: " : "", 0), 0u) << run.err;
        EXPECT_NE(run.err.find(c.message), std::string::npos) << run.err;
        EXPECT_TRUE(Images(folder).empty());
    }
}

TEST(OstrelProgram, InfoAndAboutShowWhatWillRender) {
    TempFolder folder;
    Outcome run = Ostrel(folder, "info " + Quote(kExamples / "cards" / "cards.json"));
    ASSERT_EQ(run.status, 0) << run.err;
    for (const char* part :
         {"960 x 540", "8 bits", "frames       0-47 at 24 fps", "\"camera\", perspective",
          "\"key light\" (spot, casts shadows)", "\"fill light\" (ambient)", "\"grid\""}) {
        EXPECT_NE(run.out.find(part), std::string::npos) << part << "\n" << run.out;
    }
    EXPECT_LT(run.out.find("\"disc\""), run.out.find("\"floor\""));
    run = Ostrel(folder, "about");
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out.rfind("Ostrel 3D\n", 0), 0u) << run.out;
}

}  // namespace
}  // namespace ostrel
