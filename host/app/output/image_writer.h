// Writing rendered frames to image files through OpenImageIO.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "pf_world.h"

namespace ostrel {

// A frame copied as the renderer left it, with the kind of file it goes to: any thread may then
// convert and write it, so that the copy is all the renderer waits for.
struct PreparedImage {
    std::filesystem::path path;
    std::string format;  // the writer's name for the file's kind
    int32_t width = 0;
    int32_t height = 0;
    int16_t bitDepth = 0;
    std::vector<uint8_t> pixels;  // the world's pixels, rows packed

    PF_World View() const;
};

// Copies the world for the file at path (see WriteWorld). Throws HostError naming the file
// when no writer handles its kind.
PreparedImage PrepareImage(const PF_World& world, const std::filesystem::path& path);

// Writes a prepared frame whole or not at all. Throws HostError naming the file.
void WritePrepared(const PreparedImage& image);

// Writes the world to path, the format chosen by the extension (.png, .tif/.tiff, .exr, .jpg,
// and whatever else OpenImageIO writes). 8-bit worlds are written as 8 bits, 16-bit worlds as
// 16 bits (0..32768 stretched to 0..65535), float worlds as float where the format holds it
// and as 16 bits otherwise. Alpha is straight, except in OpenEXR, which holds premultiplied
// colour. The file is written whole or not at all: encoded in memory, written to a temporary
// file beside it, flushed to the disk and renamed into place. Throws HostError naming the file
// and the problem, also for a full disk.
void WriteWorld(const PF_World& world, const std::filesystem::path& path);

// Whether a file that is replaced keeps who may read and write it, or gets a new file's.
enum class FilePermissions { kNew, kKeep };

// Replaces the file with the bytes, whole or not at all: they are written to a hidden temporary
// beside it, flushed to the disk and renamed over it. Throws HostError naming the file and
// `what` it holds.
void ReplaceFile(const std::filesystem::path& path, const std::vector<unsigned char>& bytes,
                 const std::string& what, FilePermissions permissions);

// Removes the hidden temporaries that writers killed before they finished left in folder: those
// of processes that no longer run. Called once for each folder a render writes into.
void RemoveStalePartials(const std::filesystem::path& folder);

// The output name for a frame: every run of '#' becomes the frame number padded with zeros
// to the run's length ("shot.####.png", 7 → "shot.0007.png"). A pattern without '#' is
// returned as it is.
std::string ExpandFramePattern(const std::string& pattern, int frame);

}  // namespace ostrel
