#include "output/image_writer.h"

#include <unistd.h>

#include <OpenImageIO/imageio.h>

#include <cstdint>
#include <system_error>
#include <vector>

#include "host_error.h"
#include "pf_bit_depth.h"

namespace ostrel {
namespace {

namespace OIIO = OIIO_NAMESPACE;

// libpng's code for writing rows unfiltered.
constexpr int kPngFilterNone = 0x08;

bool HoldsFloat(const std::string& format) {
    return format == "openexr" || format == "tiff" || format == "hdr";
}

struct Pixels {
    OIIO::TypeDesc type;
    std::vector<uint8_t> bytes;
};

float Clamp01(float v) {
    return v < 0 ? 0 : v > 1 ? 1 : v;
}

// Interleaved RGBA of the file's channel type, from the world's alpha-first pixels.
template <class P, class Out, class Encode>
Pixels Interleave(const PF_World& world, bool premultiply, OIIO::TypeDesc type, Encode encode) {
    std::vector<uint8_t> bytes(static_cast<size_t>(world.width) *
                               static_cast<size_t>(world.height) * 4 * sizeof(Out));
    auto* o = reinterpret_cast<Out*>(bytes.data());
    constexpr float kScale = 1.0f / PF_PixelTraits<P>::kMax;
    for (int32_t y = 0; y < world.height; ++y) {
        const P* row = world.Row<P>(y);
        for (int32_t x = 0; x < world.width; ++x, o += 4) {
            float a = static_cast<float>(row[x].alpha) * kScale;
            float color = premultiply ? a * kScale : kScale;
            o[0] = encode(static_cast<float>(row[x].red) * color);
            o[1] = encode(static_cast<float>(row[x].green) * color);
            o[2] = encode(static_cast<float>(row[x].blue) * color);
            o[3] = encode(a);
        }
    }
    return {type, std::move(bytes)};
}

// 8-bit frames stay 8 bits and 16-bit frames 16 bits, value for value; float frames stay float
// where the format holds it. OpenEXR holds premultiplied float.
template <class P>
Pixels Convert(const PF_World& world, const std::string& format) {
    bool premultiply = format == "openexr";
    if (premultiply || (PF_PixelTraits<P>::kIsFloat && HoldsFloat(format))) {
        return Interleave<P, float>(world, premultiply, OIIO::TypeDesc::FLOAT,
                                    [](float v) { return v; });
    }
    if constexpr (PF_PixelTraits<P>::kBitDepth == 8) {
        return Interleave<P, uint8_t>(world, false, OIIO::TypeDesc::UINT8, [](float v) {
            return static_cast<uint8_t>(Clamp01(v) * 255.0f + 0.5f);
        });
    } else {
        return Interleave<P, uint16_t>(world, false, OIIO::TypeDesc::UINT16, [](float v) {
            return static_cast<uint16_t>(Clamp01(v) * 65535.0f + 0.5f);
        });
    }
}

Pixels Convert(const PF_World& world, const std::string& format) {
    return PF_DispatchBitDepth(world.bitDepth,
                               [&]<class P>() { return Convert<P>(world, format); });
}

// The writer of the file's kind, chosen by its extension.
auto WriterFor(const std::string& name) {
    auto out = OIIO::ImageOutput::create(name);
    if (!out)
        throw HostError(name + ": cannot write images of this kind (" + OIIO::geterror() + ")");
    return out;
}

}  // namespace

PreparedImage PrepareImage(const PF_World& world, const std::filesystem::path& path) {
    Pixels pixels = Convert(world, WriterFor(path.string())->format_name());
    return {path, world.width, world.height, pixels.type.basetype, std::move(pixels.bytes)};
}

void WritePrepared(const PreparedImage& image) {
    std::string name = image.path.string();
    auto out = WriterFor(name);
    std::string format = out->format_name();
    OIIO::TypeDesc type(static_cast<OIIO::TypeDesc::BASETYPE>(image.channelType));
    OIIO::ImageSpec layout(image.width, image.height, 4, type);
    if (format != "openexr") layout.attribute("oiio:UnassociatedAlpha", 1);
    // Frames are written by the hundred: the fastest deflate level without row filters costs
    // some size and saves most of the time a frame spends in the PNG writer.
    layout.attribute("png:compressionLevel", 1);
    layout.attribute("png:filter", kPngFilterNone);
    // The temporary keeps the extension so that the same writer handles it.
    std::filesystem::path partial = image.path;
    std::string partialName = ".";
    partialName += image.path.stem().string();
    partialName += ".partial-" + std::to_string(::getpid());
    partialName += image.path.extension().string();
    partial.replace_filename(partialName);
    bool written =
        out->open(partial.string(), layout) && out->write_image(type, image.bytes.data());
    written = out->close() && written;
    std::error_code ignored;
    if (!written) {
        std::string problem = out->geterror();
        std::filesystem::remove(partial, ignored);
        throw HostError(
            name + ": cannot write the image: " + (problem.empty() ? "unknown error" : problem));
    }
    std::error_code renamed;
    std::filesystem::rename(partial, image.path, renamed);
    if (renamed) {
        std::filesystem::remove(partial, ignored);
        throw HostError(name + ": cannot write the image: " + renamed.message());
    }
}

void WriteWorld(const PF_World& world, const std::filesystem::path& path) {
    WritePrepared(PrepareImage(world, path));
}

std::string ExpandFramePattern(const std::string& pattern, int frame) {
    std::string out;
    for (size_t i = 0; i < pattern.size();) {
        if (pattern[i] != '#') {
            out += pattern[i++];
            continue;
        }
        size_t run = pattern.find_first_not_of('#', i);
        size_t width = (run == std::string::npos ? pattern.size() : run) - i;
        std::string number = std::to_string(frame < 0 ? -frame : frame);
        if (number.size() < width) number.insert(0, width - number.size(), '0');
        if (frame < 0) out += '-';
        out += number;
        i += width;
    }
    return out;
}

}  // namespace ostrel
