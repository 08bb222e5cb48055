// Files for the composition tests: a temporary folder, text and images written into it.
#pragma once

#include <OpenImageIO/imageio.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <string_view>
#include <vector>

namespace ostrel {

// The whole of a file, as bytes.
inline std::string ReadAll(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

// A fresh folder under the system's temporary folder, removed with everything in it.
class TempFolder {
public:
    TempFolder() {
        std::random_device random;
        path_ = std::filesystem::temp_directory_path() /
                ("ostrel-comp-" + std::to_string(random()) + std::to_string(random()));
        std::filesystem::create_directories(path_);
    }
    ~TempFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    const std::filesystem::path& Path() const { return path_; }

    std::filesystem::path WriteText(const std::string& name, std::string_view text) const {
        std::filesystem::path file = path_ / name;
        std::ofstream(file, std::ios::binary) << text;
        return file;
    }

    // Pixels interleaved, channels per pixel as given, in the type of T (uint8_t, uint16_t
    // or float), written in that type. Colour is stored as given: straight in formats that
    // keep it straight (PNG), premultiplied in those that keep it so (EXR).
    template <class T>
    std::filesystem::path WriteImage(const std::string& name, int width, int height, int channels,
                                     const std::vector<T>& pixels) const {
        std::filesystem::path file = path_ / name;
        auto type = std::is_same_v<T, uint8_t>    ? OIIO::TypeDesc::UINT8
                    : std::is_same_v<T, uint16_t> ? OIIO::TypeDesc::UINT16
                                                  : OIIO::TypeDesc::FLOAT;
        OIIO::ImageSpec layout(width, height, channels, type);
        if (channels == 4) layout.alpha_channel = 3;
        // Without this the writer would take the pixels for premultiplied and divide them.
        layout.attribute("oiio:UnassociatedAlpha", 1);
        auto out = OIIO::ImageOutput::create(file.string());
        if (!out || !out->open(file.string(), layout) || !out->write_image(type, pixels.data()) ||
            !out->close()) {
            throw std::runtime_error("cannot write test image " + file.string());
        }
        return file;
    }

private:
    std::filesystem::path path_;
};

}  // namespace ostrel
