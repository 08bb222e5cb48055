// The pixel library's hot paths: nanoseconds per texture sample for each sampler and depth,
// and per pixel for the normal and multiply blends.
#include <benchmark/benchmark.h>

#include <memory>
#include <random>
#include <vector>

#include "pf_sampling.h"
#include "pf_xfer.h"

namespace {

constexpr int32_t kTextureSize = 1024;
constexpr int kSamplesPerRun = 4096;

template <class P>
P RandomPixel(std::mt19937& random, bool opaque) {
    using Traits = PF_PixelTraits<P>;
    using C = typename Traits::Channel;
    std::uniform_real_distribution<float> unit(0.0f, 1.0f);
    auto c = [&](float v) { return static_cast<C>(Traits::kIsFloat ? v : v * Traits::kMax); };
    return {opaque ? c(1.0f) : c(unit(random)), c(unit(random)), c(unit(random)), c(unit(random))};
}

template <class P>
std::unique_ptr<PF_WorldX<P>> RandomTexture() {
    auto world = std::make_unique<PF_WorldX<P>>(kTextureSize, kTextureSize);
    std::mt19937 random(1);
    for (int32_t y = 0; y < kTextureSize; ++y) {
        for (int32_t x = 0; x < kTextureSize; ++x)
            world->At(x, y) = RandomPixel<P>(random, false);
    }
    return world;
}

// Time per item, printed in seconds with an SI prefix ("3.2n" is 3.2 ns).
void ReportPerItem(benchmark::State& state, const char* name, int items) {
    state.counters[name] = benchmark::Counter(
        static_cast<double>(items),
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

enum Filter { kBilinear, kBicubic, kArea };

// Samples as the rasterizer does over a layer minified to the footprint: each sample one
// footprint (2 × radius, at least 1.37 texels) further along the row, rows one footprint
// apart, wrapping inside the texture.
template <class P, Filter kFilter>
void BM_Sample(benchmark::State& state) {
    static const std::unique_ptr<PF_WorldX<P>> texture = RandomTexture<P>();
    double radius = kFilter == kArea ? static_cast<double>(state.range(0)) : 0.4;
    PF_SampPB pb;
    pb.src = texture.get();
    pb.xRadius = pb.yRadius = static_cast<int32_t>(radius * 65536);
    const int32_t step = static_cast<int32_t>(std::max(1.37, 2 * radius) * 65536);
    const int32_t wrap = (kTextureSize - 1) << 16;
    P out{};
    PF_AreaSample(0, 0, pb, &out);  // the table is built once per texture, outside the timing
    int32_t x = 12345, y = 6789;
    for (auto _ : state) {
        for (int i = 0; i < kSamplesPerRun; ++i) {
            if constexpr (kFilter == kBilinear) PF_SubpixelBilinear(x, y, pb, &out);
            if constexpr (kFilter == kBicubic) PF_SubpixelBicubic(x, y, pb, &out);
            if constexpr (kFilter == kArea) PF_AreaSample(x, y, pb, &out);
            benchmark::DoNotOptimize(out);
            x += step;
            if (x >= wrap) {
                x -= wrap;
                y += step;
                if (y >= wrap) y -= wrap;
            }
        }
    }
    ReportPerItem(state, "per_sample", kSamplesPerRun);
}

// Blends a row of sources onto a row of destinations through the fetched function, as the
// span compositor does. Range 0: backdrop opaque; 1: backdrop translucent too.
template <class P>
void BM_Blend(benchmark::State& state, int32_t mode) {
    std::mt19937 random(2);
    std::vector<P> sources(kSamplesPerRun), backdrop(kSamplesPerRun), work(kSamplesPerRun);
    bool opaqueBackdrop = state.range(0) == 0;
    for (int i = 0; i < kSamplesPerRun; ++i) {
        sources[i] = RandomPixel<P>(random, false);
        backdrop[i] = RandomPixel<P>(random, opaqueBackdrop);
    }
    PF_Xfer1Func<P> blend = PF_Get_Xfer1<P>(mode);
    for (auto _ : state) {
        state.PauseTiming();
        work = backdrop;
        state.ResumeTiming();
        for (int i = 0; i < kSamplesPerRun; ++i)
            blend(&sources[i], nullptr, &work[i]);
        benchmark::ClobberMemory();
    }
    ReportPerItem(state, "per_pixel", kSamplesPerRun);
}

template <class P>
void BM_BlendNormal(benchmark::State& state) {
    BM_Blend<P>(state, kPF_XferNormal);
}
template <class P>
void BM_BlendMultiply(benchmark::State& state) {
    BM_Blend<P>(state, kPF_XferMultiply);
}

}  // namespace

BENCHMARK(BM_Sample<PF_Pixel8, kBilinear>);
BENCHMARK(BM_Sample<PF_Pixel16, kBilinear>);
BENCHMARK(BM_Sample<PF_PixelFloat, kBilinear>);
BENCHMARK(BM_Sample<PF_Pixel8, kBicubic>);
BENCHMARK(BM_Sample<PF_Pixel16, kBicubic>);
BENCHMARK(BM_Sample<PF_PixelFloat, kBicubic>);
BENCHMARK(BM_Sample<PF_Pixel8, kArea>)->Arg(1)->Arg(10)->Arg(100);
BENCHMARK(BM_Sample<PF_Pixel16, kArea>)->Arg(1)->Arg(10)->Arg(100);
BENCHMARK(BM_Sample<PF_PixelFloat, kArea>)->Arg(1)->Arg(10)->Arg(100);
BENCHMARK(BM_BlendNormal<PF_Pixel8>)->Arg(0)->Arg(1);
BENCHMARK(BM_BlendNormal<PF_Pixel16>)->Arg(0)->Arg(1);
BENCHMARK(BM_BlendNormal<PF_PixelFloat>)->Arg(0)->Arg(1);
BENCHMARK(BM_BlendMultiply<PF_Pixel8>)->Arg(0)->Arg(1);
BENCHMARK(BM_BlendMultiply<PF_Pixel16>)->Arg(0)->Arg(1);
BENCHMARK(BM_BlendMultiply<PF_PixelFloat>)->Arg(0)->Arg(1);

BENCHMARK_MAIN();
