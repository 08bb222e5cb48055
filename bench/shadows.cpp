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

#include "card_scene.h"
#include "renderer/frame/frame_driver.h"
#include "renderer/frame/shadow_maps.h"
#include "renderer/scene/render_context.h"

namespace {

using bench::Identity;
using bench::kHeight;
using bench::kWidth;

constexpr int32_t kCards = 10, kTextureSize = 512;

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
struct Scene : bench::CardScene<P> {
    using bench::CardScene<P>::scene;

    Scene(bool best, int32_t casters)
        : bench::CardScene<P>(kCards, kTextureSize, best, 11, &CardPlacement) {
        for (int32_t k = 0; k < kCards; ++k) {
            SY_LayerDesc& layer = scene.layers[k];
            layer.material.castsShadows = k < casters;
            layer.material.acceptsShadows = kSY_AcceptsShadowsOn;
            layer.lightIds = {0, 1, 2};
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
};

// Pixels of each card, summed over the cards: each card drawn alone.
double LitPixels() {
    static const double lit = Scene<PF_Pixel8>(false, kCards).CoveredPixels();
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
