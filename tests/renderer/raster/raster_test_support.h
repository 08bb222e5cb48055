// Frames of textured layers for the span renderer's tests: a texture pattern whose texels a
// reader can recompute, layers placed in front of the default camera, and a frame runner.
#pragma once

#include <cstdint>
#include <memory>

#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/frame/frame_driver.h"
#include "tests/renderer/renderer_test_support.h"

namespace raster_test {

// An opaque pixel of colour channels given as 8-bit codes, in the range of P.
template <class P>
P Opaque(uint32_t r, uint32_t g, uint32_t b) {
    using Traits = PF_PixelTraits<P>;
    auto code = [](uint32_t c) -> typename Traits::Channel {
        if constexpr (Traits::kIsFloat) return static_cast<float>(c) / 255.0f;
        if constexpr (Traits::kBitDepth == 16) return PF_8To16(c);
        return static_cast<typename Traits::Channel>(c);
    };
    return {code(255), code(r), code(g), code(b)};
}

// Opaque texel (i, j) of the test pattern: neighbours differ in every channel.
template <class P>
P PatternTexel(int32_t i, int32_t j) {
    return Opaque<P>((i * 37 + j * 11) % 251, (i * 5 + j * 29) % 241, (i * 13 + j * 7) % 239);
}

// A world whose pixel (i, j) is pixelAt(i, j).
template <class P, class PixelAt>
std::unique_ptr<PF_WorldX<P>> WorldOf(int32_t width, int32_t height, PixelAt pixelAt) {
    auto world = std::make_unique<PF_WorldX<P>>(width, height);
    for (int32_t k = 0; k < width * height; ++k)
        world->At(k % width, k / width) = pixelAt(k % width, k / width);
    return world;
}

template <class P>
std::unique_ptr<PF_WorldX<P>> PatternTexture(int32_t width, int32_t height) {
    return WorldOf<P>(width, height, PatternTexel<P>);
}

template <class P>
std::unique_ptr<PF_WorldX<P>> FilledWorld(int32_t width, int32_t height, const P& pixel) {
    return WorldOf<P>(width, height, [&](int32_t, int32_t) { return pixel; });
}

template <class P>
bool Equal(const P& a, const P& b) {
    return a.alpha == b.alpha && a.red == b.red && a.green == b.green && a.blue == b.blue;
}

template <class P>
bool IsClear(const P& p) {
    return Equal(p, P{});
}

// Distance camera–layer plane of the default camera: the plane z = 0 maps 1:1.
inline constexpr double kDistance = 400;

// A frame of layers in front of the default camera, all drawn into one destination.
struct Frame {
    Frame(int32_t w, int32_t h, int32_t layerCount) {
        renderer_test::SetDefaultCamera(&scene, w, h, kDistance);
        scene.layers.Allocate(layerCount);
        for (int32_t i = 0; i < layerCount; ++i) {
            scene.layers[i].material.renderIndex = i;
            scene.layers[i].material.depthIndex = i;
        }
    }

    // Layer i shows texture (width × height texels) with its top-left corner at placement's
    // image of layer point (0, 0).
    SY_LayerDesc& Layer(int32_t i, PF_World* texture, const M_Matrix4& placement) {
        SY_LayerDesc& layer = scene.layers[i];
        renderer_test::SetPlacements(&layer, {placement});
        renderer_test::SetRect(&layer, 0, 0, texture->width, texture->height);
        fetcher.Add(i, texture);
        return layer;
    }

    void Render(PF_World* destination, const QNGP_IterateSuite1* iterate = nullptr) {
        SY_RenderFrame(scene, &fetcher, &progress, iterate, iterate != nullptr, destination,
                       nullptr);
    }

    SY_SceneDesc scene;
    renderer_test::MemoryTextureFetcher fetcher;
    renderer_test::RecordingProgress progress;
};

}  // namespace raster_test
