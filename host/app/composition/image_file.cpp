#include "composition/image_file.h"

#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <array>
#include <fstream>
#include <string>

#include "composition/composition_error.h"
#include "composition/library_console.h"
#include "memory_size.h"

namespace ostrel {
namespace {

[[noreturn]] void Fail(const std::filesystem::path& file, const std::string& reason) {
    throw CompositionError("cannot read image '" + file.string() + "': " + reason);
}

// The image library's words, which may run over several lines, as one line.
std::string OneLine(std::string words) {
    while (!words.empty() && words.back() == '\n')
        words.pop_back();
    for (size_t at; (at = words.find('\n')) != std::string::npos;)
        words.replace(at, 1, "; ");
    return words;
}

// A PNG cut short makes the PNG reader leave its error text behind in memory, so the chunks are
// walked first: each must fit in the file, up to the closing IEND.
void CheckPngChunks(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    std::array<unsigned char, 8> header{};
    static constexpr std::array<unsigned char, 8> kSignature = {0x89, 'P',  'N',  'G',
                                                                '\r', '\n', 0x1a, '\n'};
    if (!in.read(reinterpret_cast<char*>(header.data()), 8) || header != kSignature) return;
    const uint64_t size = std::filesystem::file_size(file);
    for (uint64_t at = 8;;) {
        if (!in.seekg(static_cast<std::streamoff>(at)) ||
            !in.read(reinterpret_cast<char*>(header.data()), 8)) {
            Fail(file, "the PNG file is cut short at byte " + std::to_string(size) +
                           ", before its IEND chunk");
        }
        uint64_t length = uint64_t{header[0]} << 24 | uint64_t{header[1]} << 16 |
                          uint64_t{header[2]} << 8 | header[3];
        std::string type(header.begin() + 4, header.end());
        at += 12 + length;  // length, type, data and checksum
        if (at > size) {
            Fail(file, "the PNG file is cut short at byte " + std::to_string(size) +
                           ", inside its " + type + " chunk");
        }
        if (type == "IEND") return;
    }
}

// Decoding takes the file's channels as floats, then four floats a pixel: refused when that
// is more than the machine's memory, before any of it is taken.
void CheckDecodedSize(const std::filesystem::path& file, const OIIO::ImageSpec& layout) {
    double needed = static_cast<double>(layout.width) * layout.height *
                    (4.0 * std::max(layout.nchannels, 0) + 16.0);
    auto memory = static_cast<double>(PhysicalMemoryBytes());
    if (needed > memory) {
        Fail(file, "the image is " + std::to_string(layout.width) + " × " +
                       std::to_string(layout.height) + " pixels of " +
                       std::to_string(layout.nchannels) + " channels; decoding it needs " +
                       SizeText(needed) + ", more than this machine's " + SizeText(memory) +
                       " of memory");
    }
}

std::unique_ptr<OIIO::ImageInput> Open(const std::filesystem::path& file) {
    std::error_code error;
    bool regular = std::filesystem::is_regular_file(file, error);
    if (error && error != std::errc::no_such_file_or_directory &&
        error != std::errc::not_a_directory) {
        Fail(file, error.message());
    }
    if (!regular)
        Fail(file, std::filesystem::exists(file, error) ? "not a regular file" : "no such file");
    CheckPngChunks(file);
    // Ask for colour as stored: readers that can keep alpha unassociated then do so.
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    LibraryConsole console;
    auto input = OIIO::ImageInput::open(file.string(), &config);
    if (!input) {
        std::string reason = OneLine(OIIO::geterror());
        Fail(file, reason.empty() ? "not an image OpenImageIO can read" : reason);
    }
    const OIIO::ImageSpec& layout = input->spec();
    CheckDecodedSize(file, layout);
    return input;
}

}  // namespace

ImageInfo ProbeImage(const std::filesystem::path& file) {
    auto input = Open(file);
    const OIIO::ImageSpec& layout = input->spec();
    return {layout.width, layout.height};
}

DecodedImage DecodeImage(const std::filesystem::path& file) {
    auto input = Open(file);
    const OIIO::ImageSpec layout = input->spec();
    int channels = layout.nchannels;
    if (channels < 1) Fail(file, "the image has no channels");
    size_t count = static_cast<size_t>(layout.width) * static_cast<size_t>(layout.height);
    std::vector<float> stored(count * static_cast<size_t>(channels));
    bool read;
    {
        LibraryConsole console;
        read = input->read_image(0, 0, 0, channels, OIIO::TypeDesc::FLOAT, stored.data());
    }
    if (!read) Fail(file, OneLine(input->geterror()));

    // Grey, grey and alpha, colour, or colour and alpha; further channels are ignored.
    int alphaChannel = layout.alpha_channel >= 0 ? layout.alpha_channel : (channels == 2 ? 1 : -1);
    if (channels >= 4 && alphaChannel < 0) alphaChannel = 3;
    int colorChannels = channels >= 3 ? 3 : 1;
    bool associated =
        alphaChannel >= 0 && layout.get_int_attribute("oiio:UnassociatedAlpha", 0) == 0;

    DecodedImage image;
    image.width = layout.width;
    image.height = layout.height;
    image.eightBit = layout.format == OIIO::TypeDesc::UINT8;
    image.pixels.resize(count * 4);
    for (size_t i = 0; i < count; ++i) {
        const float* in = &stored[i * static_cast<size_t>(channels)];
        float* out = &image.pixels[i * 4];
        float alpha = alphaChannel >= 0 ? in[alphaChannel] : 1.0f;
        // Files that store premultiplied colour (EXR, for one) are made straight here.
        float unpremultiply = associated && alpha > 0.0f ? 1.0f / alpha : 1.0f;
        out[0] = alpha;
        for (int c = 0; c < 3; ++c)
            out[1 + c] = in[colorChannels == 3 ? c : 0] * unpremultiply;
    }
    return image;
}

bool DecodesWhole(const std::filesystem::path& file) {
    try {
        DecodeImage(file);
        return true;
    } catch (const CompositionError&) {
        return false;
    }
}

}  // namespace ostrel
