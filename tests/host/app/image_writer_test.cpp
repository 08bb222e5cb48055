#include <gtest/gtest.h>

#include <OpenImageIO/imagebuf.h>

#include <filesystem>
#include <vector>

#include "host_error.h"
#include "output/frame_writer.h"
#include "output/image_writer.h"
#include "test_files.h"

namespace {

namespace fs = std::filesystem;
using ostrel::TempFolder;
using ostrel::WriteWorld;

size_t FileCount(const ostrel::TempFolder& folder) {
    return static_cast<size_t>(std::distance(fs::directory_iterator(folder.Path()), {}));
}

// Reads back RGBA as floats, as stored (no premultiplying on the way in).
std::vector<float> ReadBack(const fs::path& path, OIIO::TypeDesc* stored) {
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    OIIO::ImageBuf image(path.string(), 0, 0, nullptr, &config);
    EXPECT_TRUE(image.read(0, 0, true, OIIO::TypeDesc::FLOAT)) << image.geterror();
    *stored = image.nativespec().format;
    std::vector<float> pixels(image.roi().npixels() * static_cast<size_t>(image.nchannels()));
    image.get_pixels(image.roi(), OIIO::TypeDesc::FLOAT, pixels.data());
    return pixels;
}

TEST(ImageWriter, KeepsDepthAndValues) {
    TempFolder folder;
    PF_WorldX<PF_Pixel8> eight(2, 1);
    eight.At(0, 0) = {255, 10, 20, 30};
    eight.At(1, 0) = {128, 255, 0, 1};
    PF_WorldX<PF_Pixel16> sixteen(1, 1);
    sixteen.At(0, 0) = {32768, 16384, 0, 32768};
    PF_WorldX<PF_PixelFloat> floating(1, 1);
    floating.At(0, 0) = {0.5f, 0.25f, 2.0f, 0.0f};

    OIIO::TypeDesc stored;
    WriteWorld(eight, folder.Path() / "eight.png");
    auto p8 = ReadBack(folder.Path() / "eight.png", &stored);
    EXPECT_EQ(stored, OIIO::TypeDesc::UINT8);
    EXPECT_FLOAT_EQ(p8[0] * 255, 10);
    EXPECT_FLOAT_EQ(p8[7] * 255, 128);  // straight alpha: colour is not scaled by it
    EXPECT_FLOAT_EQ(p8[4] * 255, 255);

    WriteWorld(sixteen, folder.Path() / "sixteen.png");
    auto p16 = ReadBack(folder.Path() / "sixteen.png", &stored);
    EXPECT_EQ(stored, OIIO::TypeDesc::UINT16);
    EXPECT_FLOAT_EQ(p16[0] * 65535, 32768);  // 16384 of 32768 is half: 32767.5 rounds up
    EXPECT_FLOAT_EQ(p16[3], 1);

    WriteWorld(floating, folder.Path() / "float.exr");
    auto pf = ReadBack(folder.Path() / "float.exr", &stored);
    EXPECT_FLOAT_EQ(pf[0], 0.125f);  // OpenEXR holds premultiplied colour
    EXPECT_FLOAT_EQ(pf[1], 1.0f);
    EXPECT_FLOAT_EQ(pf[3], 0.5f);
    EXPECT_EQ(FileCount(folder), 3u);
}

TEST(ImageWriter, AFailedWriteLeavesNoFile) {
    TempFolder folder;
    PF_WorldX<PF_Pixel8> world(4, 4);
    struct Case {
        fs::path path;
        const char* problem;
    };
    const Case cases[] = {
        {folder.Path() / "missing-folder" / "frame.png", "cannot write the image"},
        {folder.Path() / "frame.unknownformat", "cannot write images of this kind"},
    };
    for (const Case& c : cases) {
        try {
            ostrel::WriteWorld(world, c.path);
            ADD_FAILURE() << c.path << " was written";
        } catch (const ostrel::HostError& e) {
            std::string message = e.what();
            EXPECT_EQ(message.rfind(c.path.string(), 0), 0u) << message;
            EXPECT_NE(message.find(c.problem), std::string::npos) << message;
        }
    }
    EXPECT_EQ(FileCount(folder), 0u);
}

// Frames written behind the render: a failed write comes back from the next call, naming
// its file, and the frames around it are written whole.
TEST(ImageWriter, FrameWriterReportsAFailureOnTheNextCall) {
    TempFolder folder;
    PF_WorldX<PF_Pixel8> world(4, 4);
    ostrel::FrameWriter writer;
    writer.Write(ostrel::PrepareImage(world, folder.Path() / "0.png"));
    writer.Write(ostrel::PrepareImage(world, folder.Path() / "missing-folder" / "1.png"));
    try {
        writer.Write(ostrel::PrepareImage(world, folder.Path() / "2.png"));
        ADD_FAILURE() << "the failed write went unreported";
    } catch (const ostrel::HostError& e) {
        EXPECT_NE(std::string(e.what()).find("1.png: cannot write the image"), std::string::npos)
            << e.what();
    }
    writer.Write(ostrel::PrepareImage(world, folder.Path() / "3.png"));
    writer.Finish();
    EXPECT_TRUE(fs::exists(folder.Path() / "0.png"));
    EXPECT_FALSE(fs::exists(folder.Path() / "2.png"));
    EXPECT_TRUE(fs::exists(folder.Path() / "3.png"));
    EXPECT_EQ(FileCount(folder), 2u);
}

TEST(ImageWriter, FramePatterns) {
    struct Case {
        const char* pattern;
        int frame;
        const char* expected;
    };
    const Case cases[] = {
        {"shot.####.png", 7, "shot.0007.png"}, {"shot.#.png", 123, "shot.123.png"},
        {"a##b###.tif", 5, "a05b005.tif"},     {"still.png", 9, "still.png"},
        {"neg.###.png", -4, "neg.-004.png"},
    };
    for (const Case& c : cases)
        EXPECT_EQ(ostrel::ExpandFramePattern(c.pattern, c.frame), c.expected);
}

}  // namespace
