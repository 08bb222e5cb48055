// Shadow maps on a 1920 × 1080 frame of ten 512 × 512 cards that cast and accept shadows, in an
// overlapping 5 × 2 grid staggered in depth, under a narrow spot light (one planar map) and a
// point light (a cubic map of six faces), with an ambient light. Reports, on one thread:
// - BM_MapBuilding: the time to build both lights' maps, for 2, 5 and 10 casters and for map
//   sizes that follow 960- and 1920-wide outputs (the cost should follow the casters' texels,
//   not the map's area);
// - BM_Frame: the whole frame, lit without shadows and with them, with nanoseconds per lit
//   pixel (a pixel of a card, counted once per card that covers it), draft and best, 8-bit and
//   float. The ratio of the two is the price of shadows.
#include <benchmark/benchmark.h>

#include <map>
#include <memory>
#include <random>
#include <vector>

#include "m_matrix.h"
#include "pf_world.h"
#include "renderer/frame/frame_driver.h"
#include "renderer/frame/shadow_maps.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/render_context.h"
#include "renderer/scene/scene_desc.h"

namespace {

constexpr int32_t kWidth = 1920, kHeight = 1080;
constexpr int32_t kCards = 10, kTextureSize = 512;
constexpr double kDistance = 2000;  // the camera sees z = 0 at 1:1

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

M_Matrix4 Identity() {
    M_Matrix4 m;
    M_IdentityMatrix4(&m);
    return m;
}

// Card k: centred on a 5 × 2 grid 340 apart (so neighbours overlap), 80 deeper than card
// k − 1, turned a little about both axes.
M_Matrix4 CardPlacement(int32_t k) {
    M_Matrix4 m = Identity();
    M_TranslateMatrix4(-kTextureSize / 2.0, -kTextureSize / 2.0, 0, &m);
    M_RotateMatrix4XYZ(k % 2 ? 0.2 : -0.2, k % 3 ? 0.25 : -0.25, 0, &m);
    M_TranslateMatrix4(280 + (k % 5) * 340, 330 + (k / 5) * 420, -400 + 80.0 * k, &m);
    return m;
}

template <class P>
struct Scene {
    Scene(bool best, int32_t casters) {
        M_Matrix4 placement = Identity(), projection = Identity();
        M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, -kDistance, &placement);
        projection.Project(kDistance);
        M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, 0, &projection);
        scene.cameraPlacements.Allocate(1);
        scene.cameraProjections.Allocate(1);
        scene.cameraPlacements[0] = scene.framePlacement = placement;
        scene.cameraProjections[0] = scene.frameProjection = projection;
        scene.layers.Allocate(kCards);
        std::mt19937 random(11);
        std::uniform_real_distribution<float> unit(0.0f, 1.0f);
        using C = typename PF_PixelTraits<P>::Channel;
        auto channel = [](float v) { return static_cast<C>(v * PF_PixelTraits<P>::kMax); };
        for (int32_t k = 0; k < kCards; ++k) {
            auto texture = std::make_unique<PF_WorldX<P>>(kTextureSize, kTextureSize);
            for (int32_t y = 0; y < kTextureSize; ++y) {
                for (int32_t x = 0; x < kTextureSize; ++x)
                    texture->At(x, y) = {channel(1), channel(unit(random)), channel(unit(random)),
                                         channel(unit(random))};
            }
            SY_LayerDesc& layer = scene.layers[k];
            layer.placements.Allocate(1);
            layer.placements[0] = CardPlacement(k);
            layer.right = layer.bottom = kTextureSize;
            layer.material.renderIndex = layer.material.depthIndex = k;
            layer.material.bestQuality = best;
            layer.material.engineFlag =
                best ? SY_SamplingFilter::kBilinear : SY_SamplingFilter::kNearest;
            layer.material.castsShadows = k < casters;
            layer.material.acceptsShadows = kSY_AcceptsShadowsOn;
            layer.lightIds = {0, 1, 2};
            fetcher.worlds[k] = texture.get();
            textures.push_back(std::move(texture));
        }
        scene.lights.Allocate(3);
        const int32_t types[] = {kSY_LightAmbient, kSY_LightSpot, kSY_LightPoint};
        for (int32_t i = 0; i < 3; ++i) {
            SY_LightDesc& light = scene.lights[i];
            light.type = types[i];
            light.id = i;
            light.color[1] = light.color[2] = light.color[3] = i == 0 ? 0.2 : 0.7;
            light.shadowDarkness = 0.8;
            light.shadowDiffusion = 4;
            if (light.type == kSY_LightAmbient) continue;
            light.placements.Allocate(1);
            light.placements[0] = Identity();
            M_TranslateMatrix4(kWidth * (i == 1 ? 0.35 : 0.7), kHeight * 0.4, -1400,
                               &light.placements[0]);
        }
        scene.lights[1].coneHalfAngle = 35 * 0.017453292519943295;  // one face
        scene.lights[1].coneFeather = 0.3;
        scene.lightsEnabled = true;
    }

    void CastShadows(bool on) {
        for (SY_LightDesc& light : scene.lights)
            light.castsShadows = on;
    }

    SY_SceneDesc scene;
    Fetcher fetcher;
    NoProgress progress;
    std::vector<std::unique_ptr<PF_WorldX<P>>> textures;
};

// Pixels of each card, summed over the cards: each card drawn alone.
double LitPixels() {
    static const double lit = [] {
        Scene<PF_Pixel8> one(false, kCards);
        double sum = 0;
        for (int32_t k = 0; k < kCards; ++k) {
            for (int32_t j = 0; j < kCards; ++j)
                one.scene.layers[j].material.opacity = j == k ? 1 : 0;
            PF_WorldX<PF_Pixel8> frame(kWidth, kHeight);
            SY_RenderFrame(one.scene, &one.fetcher, &one.progress, nullptr, false, &frame, nullptr);
            for (int32_t y = 0; y < kHeight; ++y) {
                for (int32_t x = 0; x < kWidth; ++x)
                    sum += frame.At(x, y).alpha != 0;
            }
        }
        return sum;
    }();
    return lit;
}

// Arguments: casters, output width (the map follows it), best quality.
void BM_MapBuilding(benchmark::State& state) {
    int32_t casters = static_cast<int32_t>(state.range(0));
    int32_t width = static_cast<int32_t>(state.range(1));
    Scene<PF_Pixel8> scene(state.range(2) != 0, casters);
    scene.CastShadows(true);
    PF_WorldX<PF_Pixel8> frame(width, width * 9 / 16);
    for (auto _ : state) {
        SY_RenderContext context;
        SY_SetUpContext(&context, scene.scene, &scene.fetcher, &scene.progress, nullptr, false,
                        &frame);
        SY_PrepareLights(&context);
        SY_BuildShadowMaps(&context);
        benchmark::DoNotOptimize(context.lightStates[1].shadowMap.get());
    }
    state.counters["map_size"] = SY_PlanShadowMap(scene.scene, 1, width, width * 9 / 16).size;
}
BENCHMARK(BM_MapBuilding)
    ->ArgsProduct({{2, 5, 10}, {960, 1920}, {0, 1}})
    ->ArgNames({"casters", "width", "best"})
    ->Unit(benchmark::kMillisecond);

// Arguments: shadows on, best quality.
template <class P>
void BM_Frame(benchmark::State& state) {
    Scene<P> scene(state.range(1) != 0, kCards);
    scene.CastShadows(state.range(0) != 0);
    PF_WorldX<P> frame(kWidth, kHeight);
    for (auto _ : state) {
        SY_RenderFrame(scene.scene, &scene.fetcher, &scene.progress, nullptr, false, &frame,
                       nullptr);
        benchmark::ClobberMemory();
    }
    state.counters["per_lit_pixel"] = benchmark::Counter(
        LitPixels(), benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}
BENCHMARK_TEMPLATE(BM_Frame, PF_Pixel8)
    ->ArgsProduct({{0, 1}, {0, 1}})
    ->ArgNames({"shadows", "best"})
    ->Unit(benchmark::kMillisecond);
BENCHMARK_TEMPLATE(BM_Frame, PF_PixelFloat)
    ->ArgsProduct({{0, 1}, {0, 1}})
    ->ArgNames({"shadows", "best"})
    ->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
