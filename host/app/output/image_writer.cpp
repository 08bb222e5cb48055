#include "output/image_writer.h"

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <OpenImageIO/filesystem.h>
#include <OpenImageIO/imageio.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>
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

// The hidden temporary beside the frame, named after it and the process writing it.
std::filesystem::path PartialPath(const std::filesystem::path& path) {
    std::string name = ".";
    name += path.stem().string();
    name += ".partial-" + std::to_string(::getpid());
    name += path.extension().string();
    return std::filesystem::path(path).replace_filename(name);
}

// Writes bytes to a new file and makes them durable. Returns "" or what went wrong: a short
// write, a failed flush or close (a full disk often shows only there) is never success.
std::string WriteDurably(const std::filesystem::path& file,
                         const std::vector<unsigned char>& bytes) {
    int fd = ::open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (fd < 0) return std::strerror(errno);
    std::string problem;
    for (size_t done = 0; done < bytes.size() && problem.empty();) {
        ssize_t n = ::write(fd, bytes.data() + done, bytes.size() - done);
        if (n > 0)
            done += static_cast<size_t>(n);
        else if (n == 0 || errno != EINTR)
            problem = n == 0 ? "nothing written" : std::strerror(errno);
    }
    if (problem.empty() && ::fsync(fd) != 0) problem = std::strerror(errno);
    if (::close(fd) != 0 && problem.empty()) problem = std::strerror(errno);
    std::error_code sized;
    if (problem.empty() && std::filesystem::file_size(file, sized) != bytes.size())
        problem = "the file is shorter than its image";
    return problem;
}

// Makes the rename that put the frame in place durable too.
void SyncFolder(const std::filesystem::path& folder) {
    int fd = ::open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return;
    ::fsync(fd);
    ::close(fd);
}

}  // namespace

PF_World PreparedImage::View() const {
    const auto rowBytes = static_cast<int32_t>(pixels.size() / static_cast<size_t>(height));
    return PF_World(width, height, rowBytes, bitDepth, const_cast<uint8_t*>(pixels.data()));
}

PreparedImage PrepareImage(const PF_World& world, const std::filesystem::path& path) {
    PreparedImage image{path,           WriterFor(path.string())->format_name(),
                        world.width,    world.height,
                        world.bitDepth, {}};
    const size_t rowBytes =
        static_cast<size_t>(world.width) *
        PF_DispatchBitDepth(world.bitDepth, []<class P>() { return sizeof(P); });
    image.pixels.resize(rowBytes * static_cast<size_t>(world.height));
    for (int32_t y = 0; y < world.height; ++y)
        std::memcpy(image.pixels.data() + rowBytes * static_cast<size_t>(y), world.Row<char>(y),
                    rowBytes);
    return image;
}

void WritePrepared(const PreparedImage& image) {
    std::string name = image.path.string();
    auto out = WriterFor(name);
    const std::string& format = image.format;
    // Encoded in memory and written by us: image writers may report success from a write the
    // disk refused, and only a whole file is ever renamed into place.
    if (!out->supports("ioproxy"))
        throw HostError(name + ": cannot write images of this kind (" + format +
                        " files cannot be checked before they are kept)");
    Pixels pixels = Convert(image.View(), format);
    OIIO::ImageSpec layout(image.width, image.height, 4, pixels.type);
    if (format != "openexr") layout.attribute("oiio:UnassociatedAlpha", 1);
    // Frames are written by the hundred: the fastest deflate level without row filters costs
    // some size and saves most of the time a frame spends in the PNG writer.
    layout.attribute("png:compressionLevel", 1);
    layout.attribute("png:filter", kPngFilterNone);
    // The TIFF writer cannot add its Exif block in memory, and frames have nothing to put there.
    layout.attribute("tiff:write_exif", 0);
    std::vector<unsigned char> encoded;
    OIIO::Filesystem::IOVecOutput memory(encoded);
    bool written = out->set_ioproxy(&memory) && out->open(name, layout) &&
                   out->write_image(pixels.type, pixels.bytes.data());
    written = out->close() && written && !out->has_error();
    if (!written) {
        std::string problem = out->geterror();
        throw HostError(
            name + ": cannot write the image: " + (problem.empty() ? "unknown error" : problem));
    }
    ReplaceFile(image.path, encoded, "the image", FilePermissions::kNew);
}

void ReplaceFile(const std::filesystem::path& path, const std::vector<unsigned char>& bytes,
                 const std::string& what, FilePermissions permissions) {
    std::filesystem::path partial = PartialPath(path);
    std::string problem = WriteDurably(partial, bytes);
    std::error_code failed;
    std::filesystem::file_status old = std::filesystem::status(path, failed);
    if (problem.empty() && permissions == FilePermissions::kKeep &&
        std::filesystem::is_regular_file(old)) {
        std::filesystem::permissions(partial, old.permissions(), failed);
        if (failed) problem = failed.message();
    }
    if (problem.empty()) {
        std::filesystem::rename(partial, path, failed);
        if (failed) problem = failed.message();
    }
    if (!problem.empty()) {
        std::filesystem::remove(partial, failed);
        throw HostError(path.string() + ": cannot write " + what + ": " + problem);
    }
    SyncFolder(path.parent_path());
}

void WriteWorld(const PF_World& world, const std::filesystem::path& path) {
    WritePrepared(PrepareImage(world, path));
}

void RemoveStalePartials(const std::filesystem::path& folder) {
    const std::string kMark = ".partial-";
    std::error_code error;
    for (const auto& entry :
         std::filesystem::directory_iterator(folder.empty() ? "." : folder, error)) {
        std::string name = entry.path().filename().string();
        size_t mark = name.rfind(kMark);
        if (name[0] != '.' || mark == std::string::npos) continue;
        // Signal 0 only asks whether the process exists; a pid that runs again keeps its files.
        long pid = std::strtol(name.c_str() + mark + kMark.size(), nullptr, 10);
        if (pid > 0 && ::kill(static_cast<pid_t>(pid), 0) != 0 && errno == ESRCH)
            std::filesystem::remove(entry.path(), error);
    }
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
