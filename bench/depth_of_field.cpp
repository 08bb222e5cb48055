// A 1920 × 1080 frame of five 512 × 512 cards side by side at five depths, the nearest in
// focus, the others blurred by the camera's depth of field up to a largest circle of confusion
// (radius 5 to 40 pixels) on the farthest. Reports the time per frame and per covered pixel,
// on one thread, for the sharp frame and for the blurred one through the fast rectangle (a box
// over summed areas) and through a hexagonal and a half-rounded octagonal iris (kernels over
// row sums), at 8 bits and in float; and, when OpenCV is
// there, filter2D with a disc of radius 40 over one flat frame of the same size, as a floor.
#include <benchmark/benchmark.h>

#include <cmath>

#include "card_scene.h"
#include "renderer/frame/frame_driver.h"

#ifdef OSTREL_HAVE_OPENCV
#include <opencv2/core.hpp>
#include <opencv2/imgproc.hpp>
#endif

namespace {

using bench::Identity;
using bench::kDistance;
using bench::kHeight;
using bench::kWidth;

constexpr int32_t kCards = 5, kTextureSize = 512;
// Eye depths of the cards; the camera focuses on the first. At blur level 100 % the lens'
// focal length is 200, so the aperture A blurs depth D by 0.5·A·2000·200 / 1800 · |1/2000 −
// 1/D|: 40 pixels at 4000 for A = 1440, 13, 23 and 31 pixels on the cards between.
constexpr double kDepths[kCards] = {2000, 2400, 2800, 3300, 4000};
constexpr double kApertureFor40 = 1440;

// Card k: 340 pixels wide on screen, centred at the kth fifth of the frame.
M_Matrix4 CardPlacement(int32_t k) {
    const double depth = kDepths[k], scale = depth / kDistance;
    const double sx = kWidth * (k + 0.5) / kCards, sy = kHeight / 2.0;
    M_Matrix4 m = Identity();
    M_TranslateMatrix4(-kTextureSize / 2.0, -kTextureSize / 2.0, 0, &m);
    M_ScaleMatrix4(340.0 / kTextureSize * scale, 340.0 / kTextureSize * scale, 1, &m);
    M_TranslateMatrix4(kWidth / 2.0 + (sx - kWidth / 2.0) * scale,
                       kHeight / 2.0 + (sy - kHeight / 2.0) * scale, depth - kDistance, &m);
    return m;
}

template <class P>
struct Scene : bench::CardScene<P> {
    Scene() : bench::CardScene<P>(kCards, kTextureSize, true, 11, &CardPlacement) {}

    // irisShape 0: no depth of field; 1: the fast rectangle; 6: a hexagon; 8: an octagon
    // with roundness one half.
    void Focus(int32_t irisShape, double largestRadius) {
        SY_CameraDOFDesc& dof = this->scene.dof;
        dof.enabled = irisShape != 0;
        dof.zoom = kDistance;
        dof.focusDistance = kDepths[0];
        dof.aperture = kApertureFor40 * largestRadius / 40;
        dof.blurLevel = 1;
        dof.irisShape = irisShape;
        dof.irisRoundness = irisShape == 8 ? 0.5 : 0;
    }

    void Render(PF_World* destination) {
        SY_RenderFrame(this->scene, &this->fetcher, &this->progress, nullptr, false, destination,
                       nullptr);
    }
};

double CoveredPixels() {
    static const double covered = Scene<PF_Pixel8>().CoveredPixels();
    return covered;
}

void ReportPerCoveredPixel(benchmark::State& state) {
    state.counters["per_pixel"] =
        benchmark::Counter(CoveredPixels(), benchmark::Counter::kIsIterationInvariantRate |
                                                benchmark::Counter::kInvert);
}

// Arguments: iris shape (0 sharp, 1 box, 6 hexagon, 8 rounded octagon), largest blur radius
// in pixels. P: the pixels of the cards and the frame.
template <class P>
void BM_Frame(benchmark::State& state) {
    Scene<P> scene;
    scene.Focus(static_cast<int32_t>(state.range(0)), static_cast<double>(state.range(1)));
    PF_WorldX<P> frame(kWidth, kHeight);
    CoveredPixels();
    for (auto _ : state) {
        scene.Render(&frame);
        benchmark::ClobberMemory();
    }
    ReportPerCoveredPixel(state);
}

void Frames(benchmark::internal::Benchmark* b) {
    b->ArgNames({"iris", "radius"})->Args({0, 0});
    for (int64_t iris : {1, 6, 8}) {
        for (int64_t radius : {5, 10, 20, 40})
            b->Args({iris, radius});
    }
    b->Unit(benchmark::kMillisecond)->Iterations(3);
}

BENCHMARK(BM_Frame<PF_Pixel8>)->Apply(Frames);
BENCHMARK(BM_Frame<PF_PixelFloat>)->Apply(Frames);

#ifdef OSTREL_HAVE_OPENCV
// A disc of the given radius, normalised, filtered over one flat 8-bit RGBA frame of random
// pixels on one thread. Per pixel of the frame: every pixel is blurred here.
void BM_OpenCVDisc(benchmark::State& state) {
    const int previousThreads = cv::getNumThreads();
    cv::setNumThreads(1);
    const auto radius = static_cast<int>(state.range(0));
    cv::Mat kernel(2 * radius + 1, 2 * radius + 1, CV_32F, cv::Scalar(0));
    cv::circle(kernel, {radius, radius}, radius, cv::Scalar(1), cv::FILLED);
    kernel /= cv::sum(kernel)[0];
    cv::Mat frame(kHeight, kWidth, CV_8UC4), blurred;
    cv::randu(frame, cv::Scalar::all(0), cv::Scalar::all(255));
    for (auto _ : state) {
        cv::filter2D(frame, blurred, -1, kernel);
        benchmark::ClobberMemory();
    }
    state.counters["per_pixel"] =
        benchmark::Counter(double(kWidth) * kHeight, benchmark::Counter::kIsIterationInvariantRate |
                                                         benchmark::Counter::kInvert);
    cv::setNumThreads(previousThreads);
}
BENCHMARK(BM_OpenCVDisc)
    ->ArgName("radius")
    ->Arg(5)
    ->Arg(20)
    ->Arg(40)
    ->Unit(benchmark::kMillisecond)
    ->Iterations(3);
#endif

}  // namespace

BENCHMARK_MAIN();
