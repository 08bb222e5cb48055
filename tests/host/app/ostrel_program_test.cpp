// The ostrel program run as a user runs it: exit status, messages, and the files it leaves.
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>

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

// Frames of the given size and channel type in the file.
void ExpectImage(const std::filesystem::path& file, int width, int height,
                 OIIO::TypeDesc::BASETYPE type) {
    auto in = OIIO::ImageInput::open(file.string());
    ASSERT_TRUE(in) << file;
    EXPECT_EQ(std::tuple(in->spec().width, in->spec().height), std::tuple(width, height));
    EXPECT_EQ(in->spec().nchannels, 4);
    EXPECT_EQ(in->spec().format.basetype, type);
}

TEST(OstrelProgram, WithoutAnOutputPatternFramesGoBesideTheComposition) {
    TempFolder folder;
    std::filesystem::copy(kExamples / "cards", folder.Path() / "shot");
    Outcome run = Ostrel(folder, "render shot/cards.json --frames 2");
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
    ExpectImage(folder.Path() / "shot" / "cards.0002.png", 960, 540, OIIO::TypeDesc::UINT8);
    // Not on a terminal: one line for the frame.
    EXPECT_EQ(run.out.rfind("frame 2: ", 0), 0u) << run.out;
    EXPECT_NE(run.out.find("3 layers -> shot/cards.0002.png\n"), std::string::npos) << run.out;
}

TEST(OstrelProgram, RendersToThePatternWithTheOptionsAndStats) {
    TempFolder folder;
    Outcome run = Ostrel(folder, "render " + Quote(kExamples / "cards" / "cards.json") +
                                     " -o out/cards.####.png --frames 3-4 --depth 16 "
                                     "--downsample 2 --threads 2 --stats");
    ASSERT_EQ(run.status, 0) << run.err;
    ExpectImage(folder.Path() / "out" / "cards.0003.png", 480, 270, OIIO::TypeDesc::UINT16);
    ExpectImage(folder.Path() / "out" / "cards.0004.png", 480, 270, OIIO::TypeDesc::UINT16);
    EXPECT_EQ(Images(folder).size(), 2u);
    for (const char* part : {"frame 3 split: ", "frame 4 split: ", "plug-in ", "host ",
                             "total, 2 frames with loading: "}) {
        EXPECT_NE(run.out.find(part), std::string::npos) << part << "\n" << run.out;
    }
}

TEST(OstrelProgram, BadInputEndsWithAMessageAndNoOutput) {
    struct Case {
        const char* name;
        const char* composition;  // written as comp.json; empty: the cards example
        const char* options;
        const char* message;  // a part of the message
    };
    const Case kCases[] = {
        {"malformed JSON", R"({"width": 64, "height": )", "--frames 0",
         "comp.json: malformed JSON"},
        {"unwritable output", "", "--frames 0 -o stdout.txt/cards.####.png",
         "stdout.txt/cards.0000.png"},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        TempFolder folder;
        std::string comp = Quote(kExamples / "cards" / "cards.json");
        if (*c.composition) comp = Quote(folder.WriteText("comp.json", c.composition));
        Outcome run = Ostrel(folder, "render " + comp + " " + c.options);
        EXPECT_EQ(run.status, 1);
        EXPECT_EQ(run.err.rfind("ostrel: ", 0), 0u) << run.err;
        EXPECT_NE(run.err.find(c.message), std::string::npos) << run.err;
        EXPECT_TRUE(Images(folder).empty());
    }
}

TEST(OstrelProgram, InfoListsWhatWillRender) {
    TempFolder folder;
    Outcome run = Ostrel(folder, "info " + Quote(kExamples / "cards" / "cards.json"));
    ASSERT_EQ(run.status, 0) << run.err;
    for (const char* part : {"960 x 540", "8 bits", "frames       0-47 at 24 fps",
                             "\"camera\", perspective", "\"key light\" (spot, casts shadows)",
                             "\"fill light\" (ambient)", "\"disc\"", "\"grid\"", "\"floor\""}) {
        EXPECT_NE(run.out.find(part), std::string::npos) << part << "\n" << run.out;
    }
    EXPECT_LT(run.out.find("\"disc\""), run.out.find("\"floor\""));

    run = Ostrel(folder, "info " + Quote(kExamples / "backdrop" / "backdrop.json"));
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_NE(run.out.find("solid  3-D  best      normal, unbounded"), std::string::npos)
        << run.out;
}

TEST(OstrelProgram, AboutShowsTheRenderersNote) {
    TempFolder folder;
    Outcome run = Ostrel(folder, "about");
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out.rfind("Ostrel 3D\n", 0), 0u) << run.out;
}

TEST(OstrelProgram, UsageErrorsAreRejected) {
    TempFolder folder;
    EXPECT_NE(Ostrel(folder, "render x.json --depth 12").status, 0);
}

}  // namespace
}  // namespace ostrel
