// What the frame benchmarks share: a 1920 × 1080 frame seen by a camera that shows the plane
// z = 0 at 1:1 from kDistance in front of it, and square cards of random texels that each
// benchmark places and lights its own way.
#pragma once

#include <map>
#include <memory>
#include <random>
#include <vector>

#include "m_matrix.h"
#include "pf_world.h"
#include "renderer/frame/frame_driver.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/scene_desc.h"

namespace bench {

inline constexpr int32_t kWidth = 1920, kHeight = 1080;
inline constexpr double kDistance = 2000;

class Fetcher : public SY_TTextureFetcher {
public:
    std::map<int32_t, PF_World*> worlds;
    int32_t Fetch(int32_t index, bool, const double*, const M_LRect*, M_Matrix3*,
                  PF_World** world) override {
        *world = worlds[index];
        return 0;
    }
    void Release(int32_t, PF_World*) override {}
};

class NoProgress : public SY_ProgressAbort {
public:
    void ReportRenderables(int32_t, int32_t) override {}
    void ReportRows(int32_t, int32_t) override {}
};

inline M_Matrix4 Identity() {
    M_Matrix4 m;
    M_IdentityMatrix4(&m);
    return m;
}

// Cards of size × size random opaque texels, card k at place(k), drawn in draft (nearest
// texel) or best quality (bilinear).
template <class P>
struct CardScene {
    CardScene(int32_t cards, int32_t size, bool best, uint32_t seed, M_Matrix4 (*place)(int32_t)) {
        M_Matrix4 placement = Identity(), projection = Identity();
        M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, -kDistance, &placement);
        projection.Project(kDistance);
        M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, 0, &projection);
        scene.cameraPlacements.Allocate(1);
        scene.cameraProjections.Allocate(1);
        scene.cameraPlacements[0] = scene.framePlacement = placement;
        scene.cameraProjections[0] = scene.frameProjection = projection;
        scene.layers.Allocate(cards);
        std::mt19937 random(seed);
        std::uniform_real_distribution<float> unit(0.0f, 1.0f);
        using C = typename PF_PixelTraits<P>::Channel;
        auto channel = [](float v) { return static_cast<C>(v * PF_PixelTraits<P>::kMax); };
        for (int32_t k = 0; k < cards; ++k) {
            auto texture = std::make_unique<PF_WorldX<P>>(size, size);
            for (int32_t y = 0; y < size; ++y) {
                for (int32_t x = 0; x < size; ++x)
                    texture->At(x, y) = {channel(1), channel(unit(random)), channel(unit(random)),
                                         channel(unit(random))};
            }
            SY_LayerDesc& layer = scene.layers[k];
            layer.placements.Allocate(1);
            layer.placements[0] = place(k);
            layer.right = layer.bottom = size;
            layer.material.renderIndex = layer.material.depthIndex = k;
            layer.material.bestQuality = best;
            layer.material.engineFlag =
                best ? SY_SamplingFilter::kBilinear : SY_SamplingFilter::kNearest;
            fetcher.worlds[k] = texture.get();
            textures.push_back(std::move(texture));
        }
    }

    // Pixels covered by each card, summed over the cards: each card drawn alone, unlit. It
    // leaves every card transparent.
    double CoveredPixels() {
        const int32_t cards = scene.layers.Count();
        const bool lit = scene.lightsEnabled;
        scene.lightsEnabled = false;
        double sum = 0;
        for (int32_t k = 0; k < cards; ++k) {
            for (int32_t j = 0; j < cards; ++j)
                scene.layers[j].material.opacity = j == k ? 1 : 0;
            PF_WorldX<PF_Pixel8> frame(kWidth, kHeight);
            SY_RenderFrame(scene, &fetcher, &progress, nullptr, false, &frame, nullptr);
            for (int32_t y = 0; y < kHeight; ++y) {
                for (int32_t x = 0; x < kWidth; ++x)
                    sum += frame.At(x, y).alpha != 0;
            }
        }
        scene.lightsEnabled = lit;
        return sum;
    }

    SY_SceneDesc scene;
    Fetcher fetcher;
    NoProgress progress;
    std::vector<std::unique_ptr<PF_WorldX<P>>> textures;
};

}  // namespace bench
