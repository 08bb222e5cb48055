// Decoded images kept across frames, and layer sources delivered as host worlds.
#pragma once

#include <cstdint>
#include <filesystem>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <tuple>
#include <unordered_map>

#include "composition/composition.h"
#include "composition/image_file.h"
#include "pf_world.h"

namespace ostrel {

// Each file is decoded once, on first use; later frames share the decoded pixels. Safe to
// call from several threads.
class ImageCache {
public:
    // Throws CompositionError when the file cannot be read.
    std::shared_ptr<const DecodedImage> Get(const std::filesystem::path& file);
    size_t Count() const;

    // The layer's source pixels as LayerSource delivers them, made once per layer, depth and
    // downsample and shared by every later frame: textures are read-only to the renderer, so
    // those frames skip the conversion and keep what the renderer built on the world (its
    // sampling tables). Throws as LayerSource does.
    std::shared_ptr<PF_World> SharedSource(const Layer& layer, int16_t bitDepth,
                                           int32_t downsampleX, int32_t downsampleY);

private:
    using SourceKey = std::tuple<const Layer*, int16_t, int32_t, int32_t>;

    mutable std::mutex mutex_;
    std::unordered_map<std::string, std::shared_ptr<const DecodedImage>> images_;
    std::map<SourceKey, std::shared_ptr<PF_World>> sources_;
};

// The layer's source pixels at bitDepth (8, 16 or 32), straight colour, alpha first, reduced
// by the downsample factors to ceil(width / dx) × ceil(height / dy) pixels, each the
// alpha-weighted mean of its block. 16-bit channels run to 32768. Throws std::invalid_argument
// for a layer without pixels or bad arguments, CompositionError for an unreadable image and
// std::bad_alloc when the world cannot be had.
std::unique_ptr<PF_World> LayerSource(ImageCache& cache, const Layer& layer, int16_t bitDepth,
                                      int32_t downsampleX, int32_t downsampleY);

// width × height pixels of the opaque straight colour at bitDepth (8, 16 or 32), converted as
// solid sources are. Throws std::invalid_argument for another depth and std::bad_alloc when the
// world cannot be had.
std::unique_ptr<PF_World> SolidPixels(const Color& color, int16_t bitDepth, int32_t width,
                                      int32_t height);

}  // namespace ostrel
