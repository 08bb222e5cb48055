// The ostrel program run as a user runs it: exit status, messages, and the files it leaves.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <OpenImageIO/imageio.h>

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include "output/image_writer.h"
#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

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

// Two hundred moving layers, best quality, parented in chains and every fifth taking the one
// above as a matte, on a small frame: the sanitizers watch the fragment and matte paths at scale.
TEST(OstrelProgram, RendersTwoHundredBlurredMattedParentedLayers) {
    TempFolder folder;
    nlohmann::json layers = nlohmann::json::array();
    layers.push_back({{"name", "camera"}, {"kind", "camera"}, {"camera", {{"zoom", 80}}}});
    layers.push_back({{"kind", "light"}, {"light", {{"type", "point"}}}});
    for (int i = 0; i < 200; ++i) {
        nlohmann::json layer = {
            {"name", "card " + std::to_string(i)},
            {"kind", "solid"},
            {"threeD", true},
            {"motionBlur", true},
            {"source", {{"color", {i % 3 / 2.0, i % 5 / 4.0, 0.5}}, {"width", 24}, {"height", 24}}},
            {"transform",
             {{"position",
               {{"keyframes",
                 {{{"time", 0}, {"value", {20 + i % 7 * 3, 14 + i % 11 * 2, i % 13 - 6}}},
                  {{"time", 1}, {"value", {24 + i % 5 * 4, 18 + i % 3 * 5, 6 - i % 13}}}}}}},
              {"rotationY", i * 17 % 90},
              {"opacity", 40 + i % 60}}}};
        if (i % 10) layer["parent"] = "card " + std::to_string(i - 1);
        if (i % 5 == 1) layer["trackMatte"] = i % 2 ? "luma" : "alpha";
        layers.push_back(layer);
    }
    nlohmann::json comp = {{"width", 64},
                           {"height", 48},
                           {"duration", 1},
                           {"motionBlur", {{"enabled", true}, {"samplesPerFrame", 4}}},
                           {"layers", layers}};
    folder.WriteText("many.json", comp.dump());
    std::string command = "cd '" + folder.Path().string() +
                          "' && '" OSTREL_PROGRAM
                          "' render many.json --frames 12 -o m.####.png >/dev/null";
    EXPECT_EQ(std::system(command.c_str()), 0);
    EXPECT_TRUE(fs::exists(folder.Path() / "m.0012.png"));
}

// Thirty-two full-frame 16-bit cards crossing on one axis need more fragments than 1.3 GB of
// address space holds: the frame fails as out of memory in one line, with nothing written, never an
// abort. (The address sanitizer cannot run under such a limit.)
TEST(OstrelProgram, OutOfMemoryIsAnErrorNotAnAbort) {
#if defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the address sanitizer needs more address space than the limit allows";
#endif
    TempFolder folder;
    nlohmann::json layers = nlohmann::json::array();
    for (int i = 0; i < 32; ++i) {
        layers.push_back(
            {{"kind", "solid"},
             {"threeD", true},
             {"quality", "draft"},
             {"source", {{"color", {0.5, 0.5, 0.5}}, {"width", 1600}, {"height", 900}}},
             {"transform", {{"rotationY", i * 5.625}, {"opacity", 70}}}});
    }
    nlohmann::json comp = {
        {"width", 1920}, {"height", 1080}, {"duration", 1}, {"bitDepth", 16}, {"layers", layers}};
    folder.WriteText("fan.json", comp.dump());
    std::string command = "cd '" + folder.Path().string() +
                          "' && ulimit -v 1300000 && '" OSTREL_PROGRAM
                          "' render fan.json -o f.####.tif >/dev/null 2>err.txt";
    int status = std::system(command.c_str());
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
    std::string error = ReadAll(folder.Path() / "err.txt");
    EXPECT_EQ(error.rfind("ostrel: fan.json: frame 0: the renderer \"Ostrel 3D\" failed with error "
                          "4 (0x4): out of memory; the frame's buffers needed more than ",
                          0),
              0u);
    EXPECT_NE(error.find("more than the system gave\n"), std::string::npos) << error;
    EXPECT_EQ(FilesIn(folder.Path()), 2u);
}

// With --keep-going a frame that fails is reported and the run goes on; it fails at the end,
// naming the frames. The broken image shows only on frame 1.
TEST(OstrelProgram, KeepGoingRendersTheFramesThatCanBe) {
    TempFolder folder;
    fs::copy(fs::path(OSTREL_EXAMPLES_DIR) / "cards", folder.Path());
    std::string png = ReadAll(folder.Path() / "disc.png");
    png[png.find("IDAT") + 100] ^= 0x40;  // whole, but its data no longer checks
    folder.WriteText("bad.png", png);
    nlohmann::json comp = nlohmann::json::parse(ReadAll(folder.Path() / "cards.json"));
    comp["layers"][3].update({{"source", "bad.png"}, {"in", 0.04}, {"out", 0.08}});
    folder.WriteText("c.json", comp.dump());
    std::string command = "cd '" + folder.Path().string() +
                          "' && '" OSTREL_PROGRAM
                          "' render c.json --frames 0-2 --keep-going -o f.####.png >/dev/null "
                          "2>err.txt";
    int status = std::system(command.c_str());
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
    std::string errors = ReadAll(folder.Path() / "err.txt");
    EXPECT_NE(errors.find("bad.png': "), std::string::npos) << errors;
    EXPECT_NE(errors.find("(frame 1)\nostrel: c.json: 1 of 3 frames failed: 1\n"),
              std::string::npos)
        << errors;
    EXPECT_TRUE(fs::exists(folder.Path() / "f.0000.png") &&
                fs::exists(folder.Path() / "f.0002.png"));
    EXPECT_FALSE(fs::exists(folder.Path() / "f.0001.png"));
}

// A render killed outright leaves at most the temporaries of a process that is gone, which the
// next render into the folder removes; an interrupted one stops with whole frames only.
TEST(OstrelProgram, KilledAndInterruptedRendersLeaveWholeFramesOnly) {
    TempFolder folder;
    fs::copy(fs::path(OSTREL_EXAMPLES_DIR) / "cards", folder.Path() / "shot");
    auto start = [&] {
        pid_t pid = ::fork();
        if (pid == 0) {
            if (::chdir(folder.Path().c_str()) != 0 || !std::freopen("/dev/null", "w", stdout) ||
                !std::freopen("/dev/null", "w", stderr))
                ::_exit(127);
            ::execl(OSTREL_PROGRAM, "ostrel", "render", "shot/cards.json", "-o", "f/c.####.png",
                    "--downsample", "2", nullptr);
            ::_exit(127);
        }
        return pid;
    };
    auto frames = [&] {
        int count = 0;
        while (fs::exists(folder.Path() / ExpandFramePattern("f/c.####.png", count)))
            ++count;
        return count;
    };
    // Stops the render with the signal once it has written two frames more than there were.
    auto stop = [&](int signal) {
        int target = frames() + 2, status = 0;
        pid_t pid = start();
        for (int wait = 0; wait < 4000 && frames() < target; ++wait)
            ::usleep(5000);
        ::kill(pid, signal);
        ::waitpid(pid, &status, 0);
        return status;
    };
    EXPECT_TRUE(WIFSIGNALED(stop(SIGKILL)));
    int interrupted = stop(SIGINT);
    EXPECT_TRUE(WIFEXITED(interrupted) && WEXITSTATUS(interrupted) == 130) << interrupted;
    EXPECT_LT(frames(), 48);
    int finished = 0;
    ::waitpid(start(), &finished, 0);
    EXPECT_EQ(finished, 0);
    EXPECT_EQ(frames(), 48);
    EXPECT_EQ(FilesIn(folder.Path() / "f"), 48u);
    for (int frame = 0; frame < 48; ++frame) {
        auto in = OIIO::ImageInput::open(
            (folder.Path() / ExpandFramePattern("f/c.####.png", frame)).string());
        std::vector<uint8_t> pixels(480 * 270 * 4);
        EXPECT_TRUE(in && in->read_image(0, 0, 0, 4, OIIO::TypeDesc::UINT8, pixels.data()))
            << frame;
    }
}

}  // namespace
}  // namespace ostrel
