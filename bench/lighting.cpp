// Cost of lighting a layer pixel: one ambient, one point and one spot light on a 1920 × 1080
// layer facing the camera, with diffuse and a highlight, lit one pixel at a time, in pairs and
// four at a time.
// Reports the time per lit pixel ("ns_per_pixel").
#include <benchmark/benchmark.h>

#include <array>
#include <memory>
#include <vector>

#include "renderer/raster/shader.h"
#include "renderer/scene/light_state.h"
#include "renderer/scene/specular_table.h"

namespace {

constexpr int32_t kWidth = 1920;
constexpr int32_t kRows = 8;  // rows spread over the layer's height

struct LitLayer {
    LitLayer() {
        ambient.type = kSY_LightAmbient;
        ambient.color[1] = ambient.color[2] = ambient.color[3] = 0.2;

        point.type = kSY_LightPoint;
        point.position[0] = 400, point.position[1] = 300, point.position[2] = -600;
        point.color[1] = 1, point.color[2] = 0.9, point.color[3] = 0.8;
        point.falloffType = 2;  // inverse square beyond 500
        point.falloffRadius = 500, point.radiusSquared = 500.0 * 500.0;

        // A spot over the layer's centre, 45° cone with a soft edge, aimed straight at it.
        spot.type = kSY_LightSpot;
        spot.position[0] = 960, spot.position[1] = 540, spot.position[2] = -800;
        spot.direction[2] = -1;
        spot.color[1] = spot.color[2] = spot.color[3] = 1;
        spot.cosOuter = 0.70710678f, spot.cosInner = 0.8f;
        spot.coneScale = 1.0f / (spot.cosInner - spot.cosOuter);

        shader.material.acceptsLights = 1;
        shader.shaded = 1;
        shader.needsPoint = 1;
        shader.material.ambient = 1, shader.material.diffuse = 0.5, shader.material.specular = 0.5,
        shader.material.metal = 1;
        shader.specularTable = &tables.ForShininess(5);
        shader.eye[0] = 960, shader.eye[1] = 540, shader.eye[2] = -1500;
        shader.lights.Allocate(3);
        shader.lights[0] = &ambient, shader.lights[1] = &point, shader.lights[2] = &spot;

        for (int32_t row = 0; row < kRows; ++row) {
            for (int32_t x = 0; x < kWidth; ++x)
                points.push_back({x + 0.5, row * 135 + 0.5, 0});
        }
    }

    SY_LightState ambient, point, spot;
    SY_SpecularTables tables;
    SY_LayerShader shader;
    std::vector<std::array<double, 3>> points;
    const double normal[3] = {0, 0, -1};
};

void ReportPerPixel(benchmark::State& state, int64_t pixels) {
    state.counters["ns_per_pixel"] = benchmark::Counter(
        static_cast<double>(pixels),
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void BM_LightOnePixel(benchmark::State& state) {
    LitLayer layer;
    SY_Lighting out;
    for (auto _ : state) {
        for (const auto& p : layer.points) {
            layer.shader.LightOnePixel(p.data(), layer.normal, &out);
            benchmark::DoNotOptimize(out);
        }
    }
    ReportPerPixel(state, static_cast<int64_t>(layer.points.size()));
}
BENCHMARK(BM_LightOnePixel);

void BM_LightTwoPixels(benchmark::State& state) {
    LitLayer layer;
    SY_Lighting out1, out2;
    for (auto _ : state) {
        for (size_t i = 0; i + 1 < layer.points.size(); i += 2) {
            layer.shader.LightTwoPixels(layer.points[i].data(), layer.points[i + 1].data(),
                                        layer.normal, &out1, &out2);
            benchmark::DoNotOptimize(out1);
            benchmark::DoNotOptimize(out2);
        }
    }
    ReportPerPixel(state, static_cast<int64_t>(layer.points.size()));
}
BENCHMARK(BM_LightTwoPixels);

// Four at a time, where the processor has the lanes for it (the span routines' widest form).
void BM_LightFourPixels(benchmark::State& state) {
    if (SY_WidestLightingLanes() != SY_LightingLanes::kFour) {
        state.SkipWithError("no four-pixel lighting on this processor");
        return;
    }
    LitLayer layer;
    // The points as the span routines hand them over: a float ray over W, here W = 1.
    std::vector<SY_FourPoints> fours(layer.points.size() / 4);
    for (size_t i = 0; i < 4 * fours.size(); ++i) {
        for (int k = 0; k < 3; ++k)
            fours[i / 4].ray[k][i % 4] = static_cast<float>(layer.points[i][k]);
        fours[i / 4].invW[i % 4] = 1;
    }
    SY_FourLightings out;
    for (auto _ : state) {
        for (const SY_FourPoints& points : fours) {
            layer.shader.LightFourPixels(points, layer.normal, &out);
            benchmark::DoNotOptimize(out);
        }
    }
    ReportPerPixel(state, static_cast<int64_t>(layer.points.size()));
}
BENCHMARK(BM_LightFourPixels);

}  // namespace

BENCHMARK_MAIN();
