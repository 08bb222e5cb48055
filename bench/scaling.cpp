// How the cost of a frame grows with the work in it. Five curves, each a whole frame rendered
// on one thread as the amount of one kind of work doubles:
//   layers      small cards scattered over a 1920 × 1080 frame, none crossing another much;
//   depth       cards of a fan through one axis, all crossing there (draft and best quality);
//   resolution  eight crossing cards scaled with the frame, against the frame's pixel count;
//   lights      twenty cards lit by more and more point lights;
//   samples     twenty moving cards with more and more motion samples.
// After the table comes the exponent k of a least-squares fit time ∝ amountᵏ for each curve:
// 1 is linear, 2 quadratic. Times are CPU time of the rendering thread, which neighbours on a
// shared machine disturb less than wall time. The table is always plain text; for JSON, add
// --benchmark_out=FILE --benchmark_out_format=json, which `bench/plot_scaling.py` turns into
// the plot of docs/performance.md.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

#include "card_scene.h"

namespace {

using bench::Identity;

constexpr double kPi = 3.14159265358979323846;
constexpr int32_t kTextureSize = 64;

// A card of width × height screen pixels at rest, its centre at (x, y) of the frame and z in
// front of (negative) or behind the plane the camera sees at 1:1, turned about its vertical
// axis; it travels by `travel` in x over the frame's motion samples.
struct Card {
    double x, y, z, turn, width, height, travel = 0;
};

class Frame {
public:
    Frame(int32_t width, int32_t height, int32_t samples, bool best)
        : width_(width),
          height_(height),
          samples_(samples),
          best_(best),
          texture_(kTextureSize, kTextureSize) {
        // Every layer shows the same small texture: the curves measure drawing, not fetching.
        for (int32_t y = 0; y < kTextureSize; ++y) {
            for (int32_t x = 0; x < kTextureSize; ++x)
                texture_.At(x, y) = {255, static_cast<uint8_t>(x * 4), static_cast<uint8_t>(y * 4),
                                     160};
        }
        const double distance = 2.0 * width;  // keeps the view the same at every size
        M_Matrix4 placement = Identity(), projection = Identity();
        M_TranslateMatrix4(width / 2.0, height / 2.0, -distance, &placement);
        projection.Project(distance);
        M_TranslateMatrix4(width / 2.0, height / 2.0, 0, &projection);
        scene_.cameraPlacements.Allocate(samples);
        scene_.cameraProjections.Allocate(samples);
        for (int32_t s = 0; s < samples; ++s) {
            scene_.cameraPlacements[s] = placement;
            scene_.cameraProjections[s] = projection;
        }
        scene_.framePlacement = placement;
        scene_.frameProjection = projection;
    }

    void SetCards(const std::vector<Card>& cards) {
        scene_.layers.Allocate(static_cast<int32_t>(cards.size()));
        for (int32_t k = 0; k < scene_.layers.Count(); ++k) {
            const Card& card = cards[k];
            SY_LayerDesc& layer = scene_.layers[k];
            layer.placements.Allocate(samples_);
            for (int32_t s = 0; s < samples_; ++s) {
                const double along = samples_ > 1 ? double(s) / (samples_ - 1) - 0.5 : 0;
                M_Matrix4& m = layer.placements[s];
                m = Identity();
                M_TranslateMatrix4(-kTextureSize / 2.0, -kTextureSize / 2.0, 0, &m);
                M_ScaleMatrix4(card.width / kTextureSize, card.height / kTextureSize, 1, &m);
                M_RotateMatrix4XYZ(0, card.turn, 0, &m);
                M_TranslateMatrix4(card.x + along * card.travel, card.y, card.z, &m);
            }
            layer.right = layer.bottom = kTextureSize;
            layer.material.renderIndex = layer.material.depthIndex = k;
            layer.material.bestQuality = best_;
            layer.material.motionBlur = samples_ > 1;
            layer.material.engineFlag =
                best_ ? SY_SamplingFilter::kBilinear : SY_SamplingFilter::kNearest;
            layer.lightIds = lightIds_;
            fetcher_.worlds[k] = &texture_;
        }
    }

    // `count` point lights in a row above the frame, all reaching every card.
    void SetLights(int32_t count) {
        scene_.lights.Allocate(count);
        for (int32_t i = 0; i < count; ++i) {
            SY_LightDesc& light = scene_.lights[i];
            light.type = kSY_LightPoint;
            light.id = i;
            light.color[1] = light.color[2] = light.color[3] = 1.0 / count;
            light.placements.Allocate(1);
            light.placements[0] = Identity();
            M_TranslateMatrix4(width_ * (i + 0.5) / count, height_ * 0.3, -800,
                               &light.placements[0]);
            lightIds_.push_back(i);
        }
        scene_.lightsEnabled = count > 0;
    }

    void Render() {
        PF_WorldX<PF_Pixel8> destination(width_, height_);
        SY_RenderFrame(scene_, &fetcher_, &progress_, nullptr, false, &destination, nullptr);
    }

private:
    int32_t width_, height_, samples_;
    bool best_;
    std::vector<int32_t> lightIds_;
    PF_WorldX<PF_Pixel8> texture_;
    SY_SceneDesc scene_;
    bench::Fetcher fetcher_;
    bench::NoProgress progress_;
};

// n cards of 16 × 16 spread evenly but in no order over the frame, between 100 in front and
// 100 behind, turned by up to 30°.
std::vector<Card> Scattered(int32_t n) {
    std::vector<Card> cards;
    for (int32_t i = 0; i < n; ++i) {
        cards.push_back({double(i * 7919 % 1920), double(i * 104729 % 1080),
                         double(i * 31 % 200 - 100), (i * 37 % 60 - 30) * kPi / 180, 16, 16});
    }
    return cards;
}

// n cards of half the frame's width and height through the frame's vertical centre line,
// turned evenly over half a turn: near the line every card covers every pixel.
std::vector<Card> Fan(int32_t n, int32_t width, int32_t height) {
    std::vector<Card> cards;
    for (int32_t i = 0; i < n; ++i)
        cards.push_back(
            {width / 2.0, height / 2.0, 0, (i + 0.5) * kPi / n, width / 2.0, height / 2.0});
    return cards;
}

// Twenty cards of 300 × 300 on a 5 × 4 grid, 40 apart in depth, slightly turned: they never
// cross. `travel` moves each over the shutter interval.
std::vector<Card> Grid(double travel) {
    std::vector<Card> cards;
    for (int32_t k = 0; k < 20; ++k)
        cards.push_back({240.0 + k % 5 * 360, 170.0 + k / 5 * 250, -400.0 + 40 * k,
                         (k % 2 ? 0.05 : -0.05), 300, 300, travel});
    return cards;
}

struct Shape {
    int32_t width = 1920, height = 1080, samples = 1;
    bool best = false;
};

// Renders a frame of `shape` that `fill` puts cards and lights in, once untimed and then timed;
// reports the seconds per unit of the curve's amount.
template <class Fill>
void Register(const std::string& curve, int32_t amount, double units, Shape shape, Fill fill) {
    benchmark::RegisterBenchmark(
        (curve + "/" + std::to_string(amount)).c_str(),
        [=](benchmark::State& state) {
            Frame frame(shape.width, shape.height, shape.samples, shape.best);
            fill(frame);
            // Frames of a sequence reuse the blocks the frame before gave back; only the first
            // of them pays for fresh pages, so the timing starts warm at every amount.
            frame.Render();
            for (auto _ : state)
                frame.Render();
            state.counters["per_unit"] = benchmark::Counter(
                units, benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
        })
        ->Unit(benchmark::kMillisecond);
}

void RegisterCurves() {
    for (int32_t n : {1000, 2000, 4000, 8000, 16000})
        Register("layers", n, n, {}, [n](Frame& frame) { frame.SetCards(Scattered(n)); });
    for (bool best : {false, true}) {
        for (int32_t n : {4, 8, 16, 32, 64, 128}) {
            Register(best ? "depth_best" : "depth_draft", n, n, {1920, 1080, 1, best},
                     [n](Frame& frame) { frame.SetCards(Fan(n, 1920, 1080)); });
        }
    }
    for (int32_t width : {480, 960, 1920, 3840}) {
        const int32_t height = width * 9 / 16;
        Register("resolution", width * height, double(width) * height, {width, height, 1, false},
                 [width, height](Frame& frame) { frame.SetCards(Fan(8, width, height)); });
    }
    for (int32_t lights : {1, 2, 4, 8, 16}) {
        Register("lights", lights, lights, {1920, 1080, 1, true}, [lights](Frame& frame) {
            frame.SetLights(lights);
            frame.SetCards(Grid(0));
        });
    }
    for (int32_t samples : {2, 4, 8, 16}) {
        Register("samples", samples, samples, {1920, 1080, samples, true},
                 [](Frame& frame) { frame.SetCards(Grid(120)); });
    }
}

// The console table, then the fitted exponent of each curve, over the median time of each
// point when the runs are repeated.
class FittingReporter : public benchmark::ConsoleReporter {
public:
    FittingReporter() : ConsoleReporter(OO_Tabular) {}

    void ReportRuns(const std::vector<Run>& runs) override {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            if (run.run_type != Run::RT_Iteration || run.error_occurred) continue;
            const std::string name = run.run_name.function_name;
            const size_t slash = name.rfind('/');
            times_[name.substr(0, slash)][std::stod(name.substr(slash + 1))].push_back(
                run.GetAdjustedCPUTime());
        }
    }

    void Finalize() override {
        ConsoleReporter::Finalize();
        std::printf("\n%-12s  exponent k of time ∝ amountᵏ\n", "curve");
        for (auto& [curve, points] : times_) {
            if (points.size() < 2) continue;
            // Least squares on logarithms: the slope is the exponent.
            double sx = 0, sy = 0, sxx = 0, sxy = 0;
            for (auto& [amount, times] : points) {
                std::sort(times.begin(), times.end());
                const double x = std::log(amount), y = std::log(times[times.size() / 2]);
                sx += x;
                sy += y;
                sxx += x * x;
                sxy += x * y;
            }
            const double n = static_cast<double>(points.size());
            std::printf("%-12s  %.2f\n", curve.c_str(), (n * sxy - sx * sy) / (n * sxx - sx * sx));
        }
    }

private:
    std::map<std::string, std::map<double, std::vector<double>>> times_;
};

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    RegisterCurves();
    FittingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
