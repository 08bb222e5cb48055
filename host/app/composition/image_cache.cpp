#include "composition/image_cache.h"

#include <algorithm>
#include <stdexcept>

#include "pf_bit_depth.h"

namespace ostrel {
namespace {

// One channel from a 0..1 float in the world's depth. Files of 8 bits reach 16 bits through
// the host's exact 8-to-16 conversion so that both depths agree.
template <class P>
typename PF_PixelTraits<P>::Channel ToChannel(float c, bool eightBitSource) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat) {
        return c;
    } else {
        float clamped = std::clamp(c, 0.0f, 1.0f);
        if constexpr (Traits::kMaxInt == 32768) {
            if (eightBitSource) return PF_8To16(static_cast<uint32_t>(clamped * 255.0f + 0.5f));
            return PF_FloatTo16(clamped);
        } else {
            return static_cast<uint8_t>(clamped * Traits::kMax + 0.5f);
        }
    }
}

template <class P>
P ToPixel(const float* argb, bool eightBitSource) {
    return {ToChannel<P>(argb[0], eightBitSource), ToChannel<P>(argb[1], eightBitSource),
            ToChannel<P>(argb[2], eightBitSource), ToChannel<P>(argb[3], eightBitSource)};
}

// Mean of a block of straight pixels: colour weighted by alpha, so transparent pixels lend
// the block no colour.
void BlockMean(const DecodedImage& image, int32_t x0, int32_t y0, int32_t x1, int32_t y1,
               float* argb) {
    double alpha = 0, red = 0, green = 0, blue = 0;
    for (int32_t y = y0; y < y1; ++y) {
        const float* p = &image.pixels[(static_cast<size_t>(y) * image.width + x0) * 4];
        for (int32_t x = x0; x < x1; ++x, p += 4) {
            alpha += p[0];
            red += p[0] * p[1];
            green += p[0] * p[2];
            blue += p[0] * p[3];
        }
    }
    double count = static_cast<double>(x1 - x0) * (y1 - y0);
    argb[0] = static_cast<float>(alpha / count);
    argb[1] = alpha > 0 ? static_cast<float>(red / alpha) : 0.0f;
    argb[2] = alpha > 0 ? static_cast<float>(green / alpha) : 0.0f;
    argb[3] = alpha > 0 ? static_cast<float>(blue / alpha) : 0.0f;
}

template <class P>
std::unique_ptr<PF_World> FromImage(const DecodedImage& image, int32_t dx, int32_t dy) {
    int32_t width = (image.width + dx - 1) / dx;
    int32_t height = (image.height + dy - 1) / dy;
    auto world = std::make_unique<PF_WorldX<P>>(width, height);
    for (int32_t y = 0; y < height; ++y) {
        P* row = world->Row(y);
        for (int32_t x = 0; x < width; ++x) {
            float argb[4];
            if (dx == 1 && dy == 1) {
                std::copy_n(&image.pixels[(static_cast<size_t>(y) * image.width + x) * 4], 4, argb);
            } else {
                BlockMean(image, x * dx, y * dy, std::min(image.width, (x + 1) * dx),
                          std::min(image.height, (y + 1) * dy), argb);
            }
            row[x] = ToPixel<P>(argb, image.eightBit);
        }
    }
    return world;
}

template <class P>
std::unique_ptr<PF_World> FromSolid(const Color& color, int32_t width, int32_t height) {
    auto world = std::make_unique<PF_WorldX<P>>(width, height);
    const float argb[4] = {1.0f, static_cast<float>(color[0]), static_cast<float>(color[1]),
                           static_cast<float>(color[2])};
    const P pixel = ToPixel<P>(argb, false);
    for (int32_t y = 0; y < height; ++y)
        std::fill_n(world->Row(y), width, pixel);
    return world;
}

template <class P>
std::unique_ptr<PF_World> Deliver(ImageCache& cache, const Layer& layer, int32_t dx, int32_t dy) {
    if (layer.kind == LayerKind::kSolid) {
        const Source& source = layer.source;
        return FromSolid<P>(source.solidColor, (source.width + dx - 1) / dx,
                            (source.height + dy - 1) / dy);
    }
    return FromImage<P>(*cache.Get(layer.source.image), dx, dy);
}

}  // namespace

std::shared_ptr<const DecodedImage> ImageCache::Get(const std::filesystem::path& file) {
    std::lock_guard lock(mutex_);
    auto found = images_.find(file.string());
    if (found != images_.end()) return found->second;
    // Decoding under the lock keeps two threads from decoding the same file at once.
    auto image = std::make_shared<const DecodedImage>(DecodeImage(file));
    images_.emplace(file.string(), image);
    return image;
}

size_t ImageCache::Count() const {
    std::lock_guard lock(mutex_);
    return images_.size();
}

std::unique_ptr<PF_World> LayerSource(ImageCache& cache, const Layer& layer, int16_t bitDepth,
                                      int32_t downsampleX, int32_t downsampleY) {
    if (!layer.HasPixels()) {
        throw std::invalid_argument("layer \"" + layer.name + "\" has no pixels");
    }
    if (downsampleX < 1 || downsampleY < 1) throw std::invalid_argument("downsample below 1");
    return PF_DispatchBitDepth(
        bitDepth, [&]<class P>() { return Deliver<P>(cache, layer, downsampleX, downsampleY); });
}

std::shared_ptr<PF_World> ImageCache::SharedSource(const Layer& layer, int16_t bitDepth,
                                                   int32_t downsampleX, int32_t downsampleY) {
    SourceKey key{&layer, bitDepth, downsampleX, downsampleY};
    {
        std::lock_guard lock(mutex_);
        if (auto found = sources_.find(key); found != sources_.end()) return found->second;
    }
    // Made outside the lock, which decoding the image takes; a thread that lost the race to
    // make it uses the one that won.
    std::shared_ptr<PF_World> made = LayerSource(*this, layer, bitDepth, downsampleX, downsampleY);
    std::lock_guard lock(mutex_);
    return sources_.emplace(key, std::move(made)).first->second;
}

std::unique_ptr<PF_World> SolidPixels(const Color& color, int16_t bitDepth, int32_t width,
                                      int32_t height) {
    return PF_DispatchBitDepth(bitDepth,
                               [&]<class P>() { return FromSolid<P>(color, width, height); });
}

}  // namespace ostrel
