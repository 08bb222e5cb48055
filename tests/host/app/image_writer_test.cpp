#include <gtest/gtest.h>

#include <OpenImageIO/imagebuf.h>

#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
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

// TIFF and PNG keep straight colour value for value (the reference images read them back);
// OpenEXR holds premultiplied colour.
TEST(ImageWriter, FloatToOpenEXRIsPremultiplied) {
    TempFolder folder;
    PF_WorldX<PF_PixelFloat> floating(1, 1);
    floating.At(0, 0) = {0.5f, 0.25f, 2.0f, 0.0f};
    WriteWorld(floating, folder.Path() / "float.exr");
    OIIO::TypeDesc stored;
    auto pf = ReadBack(folder.Path() / "float.exr", &stored);
    EXPECT_EQ(stored, OIIO::TypeDesc::FLOAT);
    EXPECT_EQ(std::vector<float>(pf.begin(), pf.begin() + 4),
              (std::vector<float>{0.125f, 1.0f, 0.0f, 0.5f}));
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
    EXPECT_TRUE(fs::exists(folder.Path() / "0.png") && fs::exists(folder.Path() / "3.png"));
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

// A full disk is an error in every format and leaves no file behind: image writers may report
// success from writes the disk refused.
TEST(ImageWriter, FullDiskIsAnErrorAndLeavesNothing) {
    TempFolder folder;
    if (::mount("tmpfs", folder.Path().c_str(), "tmpfs", 0, "size=64k") != 0)
        GTEST_SKIP() << "mounting a small tmpfs needs root: " << std::strerror(errno);
    for (std::ofstream fill(folder.Path() / "fill", std::ios::binary); fill.put('\0');) {
    }
    PF_WorldX<PF_Pixel8> world(64, 64);
    for (const char* name : {"f.png", "f.tif", "f.exr", "f.jpg"}) {
        EXPECT_THROW(WriteWorld(world, folder.Path() / name), ostrel::HostError) << name;
        EXPECT_EQ(FileCount(folder), 1u) << name;
    }
    ::umount(folder.Path().c_str());
}

// The temporaries of writers that no longer run go; those of a running one, and frames, stay.
TEST(ImageWriter, StalePartialsOfEndedWritersGo) {
    TempFolder folder;
    const std::string stale = ".a.partial-2147483646.png";  // beyond any pid the kernel gives
    for (const std::string& name :
         {stale, ".a.partial-" + std::to_string(::getpid()) + ".png", std::string("a.png")})
        std::ofstream(folder.Path() / name) << "x";
    ostrel::RemoveStalePartials(folder.Path());
    EXPECT_FALSE(fs::exists(folder.Path() / stale));
    EXPECT_EQ(FileCount(folder), 2u);
}

}  // namespace
