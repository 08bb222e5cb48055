// Every bundled example rendered through the program at each depth, compared with stored
// references. OSTREL_UPDATE_REFERENCES=1 writes the references instead of comparing.
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;

const fs::path kExamples = OSTREL_EXAMPLES_DIR;
const fs::path kReferences = OSTREL_REFERENCES_DIR;

// Straight RGBA in unit range, as the file holds it.
struct Image {
    int width = 0, height = 0;
    std::vector<float> pixels;
};

Image Read(const fs::path& file) {
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    auto in = OIIO::ImageInput::open(file.string(), &config);
    if (!in) throw std::runtime_error("cannot read " + file.string());
    Image image{in->spec().width, in->spec().height, {}};
    image.pixels.resize(static_cast<size_t>(image.width) * image.height * 4);
    if (in->spec().nchannels != 4 ||
        !in->read_image(0, 0, 0, 4, OIIO::TypeDesc::FLOAT, image.pixels.data())) {
        throw std::runtime_error("cannot read RGBA from " + file.string());
    }
    return image;
}

// A frame matches when no channel is off by more than one 8-bit code and at most one pixel in
// 5000 is off at all (by half a code of its depth; float by the half-float spacing near 1, as
// stored). Renders repeat bit for bit on one machine; the few pixels leave room for an edge
// riding on a rounding under another compiler, while a fault in sampling, lighting, blending
// or depth order moves hundreds, if only by a code. Colour is straight, so it is compared
// only where the reference is not fully clear.
std::string Compare(const Image& got, const Image& want, int depth) {
    if (got.width != want.width || got.height != want.height) {
        return "size " + std::to_string(got.width) + " x " + std::to_string(got.height) +
               ", the reference is " + std::to_string(want.width) + " x " +
               std::to_string(want.height);
    }
    const double kMost = 1.001 / 255;
    const double kDiffers = depth == 8 ? 0.5 / 255 : depth == 16 ? 0.5 / 32768 : 1.0 / 2048;
    size_t worst = 0, differing = 0;
    double worstDifference = 0;
    for (size_t p = 0; p < got.pixels.size(); p += 4) {
        double difference = std::abs(got.pixels[p + 3] - want.pixels[p + 3]);
        for (size_t c = 0; c < 3 && want.pixels[p + 3] > 0; ++c)
            difference =
                std::max<double>(difference, std::abs(got.pixels[p + c] - want.pixels[p + c]));
        differing += difference > kDiffers;
        if (difference > worstDifference) worstDifference = difference, worst = p;
    }
    size_t pixels = got.pixels.size() / 4, at = worst / 4, width = static_cast<size_t>(got.width);
    if (worstDifference <= kMost && differing * 5000 <= pixels) return "";
    std::ostringstream text;
    text << differing << " of " << pixels << " pixels differ; the worst, at (" << at % width << ", "
         << at / width << "), is off by " << worstDifference * 255 << " 8-bit codes";
    return text.str();
}

struct Render {
    fs::path composition;
    int frame, depth;
    std::string file;  // example.frame.depth, as PNG (8 and 16 bits) or float TIFF
    int status = -1;
};

TEST(ReferenceImages, EveryExampleAtEveryDepth) {
    std::vector<Render> renders;
    for (const auto& folder : fs::directory_iterator(kExamples)) {
        for (const auto& entry : fs::directory_iterator(folder.path())) {
            if (entry.path().extension() != ".json") continue;
            std::string name = entry.path().stem().string();
            // The moving camera also at one second, where everything has moved.
            for (int frame : name == "camera-move" ? std::vector{0, 24} : std::vector{0}) {
                for (int depth : {8, 16, 32}) {
                    renders.push_back({entry.path(), frame, depth,
                                       name + "." + std::to_string(frame) + "." +
                                           std::to_string(depth) +
                                           (depth == 32 ? ".tif" : ".png")});
                }
            }
        }
    }
    ASSERT_GE(renders.size(), 15u);
    // Starting the program costs more than the small frame it renders: start a few at once.
    TempFolder folder;
    std::atomic<size_t> next{0};
    std::vector<std::thread> starters;
    for (int t = 0; t < 4; ++t) {
        starters.emplace_back([&] {
            for (size_t i; (i = next++) < renders.size();) {
                Render& r = renders[i];
                // The 960-pixel comps at a quarter: 240 across.
                std::string command = "'" OSTREL_PROGRAM "' render '" + r.composition.string() +
                                      "' -o '" + (folder.Path() / r.file).string() + "' --frames " +
                                      std::to_string(r.frame) + " --depth " +
                                      std::to_string(r.depth) + " --downsample 4 >/dev/null";
                r.status = std::system(command.c_str());
            }
        });
    }
    for (std::thread& starter : starters)
        starter.join();

    bool update = std::getenv("OSTREL_UPDATE_REFERENCES") != nullptr;
    for (const Render& r : renders) {
        SCOPED_TRACE(r.file);
        ASSERT_EQ(r.status, 0) << r.composition;
        if (update) {
            fs::create_directories(kReferences);
            fs::copy_file(folder.Path() / r.file, kReferences / r.file,
                          fs::copy_options::overwrite_existing);
            continue;
        }
        ASSERT_TRUE(fs::exists(kReferences / r.file))
            << r.file << " is missing; OSTREL_UPDATE_REFERENCES=1 writes it";
        std::string problem =
            Compare(Read(folder.Path() / r.file), Read(kReferences / r.file), r.depth);
        EXPECT_EQ(problem, "") << r.file << ": " << problem;
    }
}

// Blur reaches into a region from layers beyond its edges: a region renders the very pixels
// of the full frame.
TEST(ReferenceImages, ARegionOfABlurredFrameIsThatPartOfTheFullFrame) {
    TempFolder folder;
    auto render = [&](const std::string& file, const std::string& options) {
        std::string command = "'" OSTREL_PROGRAM "' render '" +
                              (kExamples / "depth-of-field/depth-of-field.json").string() +
                              "' -o '" + (folder.Path() / file).string() + "' --frames 0 " +
                              options + " >/dev/null";
        return std::system(command.c_str());
    };
    ASSERT_EQ(render("full.tif", "--depth 32"), 0);
    ASSERT_EQ(render("region.tif", "--depth 32 --region 350,100,700,400"), 0);
    Image full = Read(folder.Path() / "full.tif"), region = Read(folder.Path() / "region.tif");
    ASSERT_EQ(region.width, 350);
    Image cut{350, 300, {}};
    for (int y = 100; y < 400; ++y) {
        auto row = full.pixels.begin() + (static_cast<ptrdiff_t>(y) * full.width + 350) * 4;
        cut.pixels.insert(cut.pixels.end(), row, row + 350 * 4);
    }
    EXPECT_EQ(Compare(region, cut, 32), "");
}

}  // namespace
}  // namespace ostrel
