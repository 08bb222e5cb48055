// A 1920 × 1080 frame of twenty 512 × 512 cards in perspective, one behind the other and
// slightly turned, so that no two cross in depth and each is drawn straight into the frame.
// Reports nanoseconds per covered pixel per layer for best quality (bilinear) and draft
// (nearest texel) at each depth, on one thread and on all, and, when OpenCV is there, for
// warpPerspective (bilinear) plus a straight-alpha over of the same cards on the same frame.
// Best quality box-filters the cards it shrinks, which a plain warp does not, so OpenCV is timed
// twice: the bilinear warp alone (area = 0), and with each shrunk card first resized to its
// size on screen by area averaging (area = 1), which filters as our best quality does.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <vector>

#include "card_scene.h"
#include "renderer/frame/frame_driver.h"
#include "suites/iterate_suite.h"

#ifdef OSTREL_HAVE_OPENCV
#include <opencv2/core.hpp>
#include <opencv2/imgproc.hpp>
#endif

namespace {

using bench::Identity;
using bench::kDistance;
using bench::kHeight;
using bench::kWidth;

// The cards stand from 600 in front of the plane z = 0 to 540 behind it, 60 apart, so they are
// magnified by 1.43 down to 0.79 (the farther half shrunk) and turned by 0.05 rad (±13 in
// depth).
constexpr int32_t kCards = 20, kTextureSize = 512;

// The threaded runs spread rows with the stand-in host's own iterator, whose pool lives across
// calls as a host's does.
int32_t AllThreads() {
    int32_t count = 1;
    ostrel::IterateSuite()->GetThreadCount(&count);
    return count;
}

// Card k: its centre shows at a point of a 5 × 4 grid over the frame, nearer cards first. The
// cards are tilted by at most ±26 in depth at their corners; 60 apart they never cross, so the
// frame measures layers drawn straight (crossing layers are measured by mbuffer_fan).
M_Matrix4 CardPlacement(int32_t k) {
    double z = -600 + 60.0 * k;
    double sx = 240 + (k % 5) * 360, sy = 170 + (k / 5 % 4) * 250;
    double scale = (kDistance + z) / kDistance;
    M_Matrix4 m = Identity();
    M_TranslateMatrix4(-kTextureSize / 2.0, -kTextureSize / 2.0, 0, &m);
    M_RotateMatrix4XYZ(k % 2 ? 0.05 : -0.05, k % 3 ? 0.05 : -0.05, 0, &m);
    M_TranslateMatrix4(kWidth / 2.0 + (sx - kWidth / 2.0) * scale,
                       kHeight / 2.0 + (sy - kHeight / 2.0) * scale, z, &m);
    return m;
}

template <class P>
struct Scene : bench::CardScene<P> {
    using bench::CardScene<P>::scene;

    explicit Scene(bool best)
        : bench::CardScene<P>(kCards, kTextureSize, best, 7, &CardPlacement) {}

    // One ambient, one point and one spot light over the cards, all reaching every card.
    void Light() {
        scene.lights.Allocate(3);
        const int32_t types[] = {kSY_LightAmbient, kSY_LightPoint, kSY_LightSpot};
        for (int32_t i = 0; i < 3; ++i) {
            SY_LightDesc& light = scene.lights[i];
            light.type = types[i];
            light.id = i;
            light.color[1] = light.color[2] = light.color[3] = i == 0 ? 0.2 : 0.8;
            if (light.type == kSY_LightAmbient) continue;
            light.placements.Allocate(1);
            light.placements[0] = Identity();
            M_TranslateMatrix4(kWidth * (0.25 + 0.5 * (i - 1)), kHeight * 0.3, -800,
                               &light.placements[0]);
        }
        scene.lights[2].coneHalfAngle = 40 * 0.008726646259971648;
        scene.lights[2].coneFeather = 0.5;
        scene.lightsEnabled = true;
        for (SY_LayerDesc& layer : scene.layers)
            layer.lightIds = {0, 1, 2};
    }

    void Render(PF_World* destination, bool threaded) {
        SY_RenderFrame(scene, &this->fetcher, &this->progress,
                       threaded ? ostrel::IterateSuite() : nullptr, threaded, destination, nullptr);
    }
};

// Pixels covered by each card, summed over the cards: each card drawn alone in draft.
double CoveredPixels() {
    static const double covered = Scene<PF_Pixel8>(false).CoveredPixels();
    return covered;
}

void ReportPerCoveredPixel(benchmark::State& state) {
    state.counters["per_pixel"] =
        benchmark::Counter(CoveredPixels(), benchmark::Counter::kIsIterationInvariantRate |
                                                benchmark::Counter::kInvert);
}

template <class P>
void BM_Cards(benchmark::State& state) {
    bool best = state.range(0) != 0, threaded = state.range(1) != 0;
    Scene<P> scene(best);
    if (state.range(2) != 0) scene.Light();
    PF_WorldX<P> frame(kWidth, kHeight);
    CoveredPixels();
    for (auto _ : state) {
        scene.Render(&frame, threaded);
        benchmark::ClobberMemory();
    }
    ReportPerCoveredPixel(state);
}

#ifdef OSTREL_HAVE_OPENCV
M_Matrix4 WorldToScreen() {
    M_Matrix4 eye = Identity(), projection = Identity(), out;
    M_TranslateMatrix4(-kWidth / 2.0, -kHeight / 2.0, kDistance, &eye);
    projection.Project(kDistance);
    M_TranslateMatrix4(kWidth / 2.0, kHeight / 2.0, 0, &projection);
    M_ConcatMatrix4(&eye, &projection, &out);
    return out;
}

template <class P>
int CvType() {
    if constexpr (PF_PixelTraits<P>::kIsFloat)
        return CV_32FC4;
    else if constexpr (PF_PixelTraits<P>::kBitDepth == 16)
        return CV_16UC4;
    else
        return CV_8UC4;
}

// Straight-alpha over of src onto dst, channel 0 being alpha.
template <class P>
void Over(const cv::Mat& src, cv::Mat& dst) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    constexpr float kRound = PF_PixelTraits<P>::kIsFloat ? 0.0f : 0.5f;
    cv::parallel_for_(cv::Range(0, src.rows), [&](const cv::Range& rows) {
        for (int y = rows.start; y < rows.end; ++y) {
            const P* s = src.ptr<P>(y);
            P* d = dst.ptr<P>(y);
            for (int x = 0; x < src.cols; ++x) {
                float a = s[x].alpha / kMax;
                if (a <= 0) continue;
                if (a >= 1) {  // the same shortcut the renderer takes for opaque pixels
                    d[x] = s[x];
                    continue;
                }
                float da = d[x].alpha / kMax * (1 - a);
                float oa = a + da;
                float inv = 1 / oa;
                d[x].red = static_cast<C>((s[x].red * a + d[x].red * da) * inv + kRound);
                d[x].green = static_cast<C>((s[x].green * a + d[x].green * da) * inv + kRound);
                d[x].blue = static_cast<C>((s[x].blue * a + d[x].blue * da) * inv + kRound);
                d[x].alpha = static_cast<C>(oa * kMax + kRound);
            }
        }
    });
}

template <class P>
void BM_OpenCV(benchmark::State& state) {
    bool threaded = state.range(1) != 0;
    int previousThreads = cv::getNumThreads();
    cv::setNumThreads(threaded ? AllThreads() : 1);
    Scene<P> scene(true);
    cv::Mat frame(kHeight, kWidth, CvType<P>(), cv::Scalar::all(0));
    M_Matrix4 worldToScreen = WorldToScreen();
    const bool area = state.range(2) != 0;
    struct Card {
        cv::Mat texture, homography, warped, resized;
        cv::Rect rect;
        cv::Size shrunk;  // empty when the card is not shrunk on screen
        double depth;
    };
    std::vector<Card> cards;
    for (int32_t k = 0; k < kCards; ++k) {
        M_Matrix4 textureToScreen;
        M_ConcatMatrix4(&scene.scene.layers[k].placements[0], &worldToScreen, &textureToScreen);
        M_Matrix3 f;
        f.AssignFromByDroppingZ(textureToScreen);
        // Row vectors to OpenCV's column vectors, with pixel centres moved onto integers.
        cv::Matx33d h(f.mat[0][0], f.mat[1][0], f.mat[2][0], f.mat[0][1], f.mat[1][1], f.mat[2][1],
                      f.mat[0][2], f.mat[1][2], f.mat[2][2]);
        cv::Matx33d in(1, 0, 0.5, 0, 1, 0.5, 0, 0, 1), out(1, 0, -0.5, 0, 1, -0.5, 0, 0, 1);
        h = out * h * in;
        std::vector<cv::Point2f> corners;
        for (double u : {0.0, 1.0 * kTextureSize}) {
            for (double v : {0.0, 1.0 * kTextureSize}) {
                cv::Vec3d p = h * cv::Vec3d(u - 0.5, v - 0.5, 1);
                corners.emplace_back(static_cast<float>(p[0] / p[2]),
                                     static_cast<float>(p[1] / p[2]));
            }
        }
        Card card;
        card.rect = cv::boundingRect(corners) & cv::Rect(0, 0, kWidth, kHeight);
        cv::Matx33d shift(1, 0, -card.rect.x, 0, 1, -card.rect.y, 0, 0, 1);
        // Screen pixels per texel, from the mean length of the card's four edges on screen.
        double edges = cv::norm(corners[0] - corners[1]) + cv::norm(corners[1] - corners[3]) +
                       cv::norm(corners[3] - corners[2]) + cv::norm(corners[2] - corners[0]);
        double magnification = edges / (4.0 * kTextureSize);
        if (area && magnification < 1) {
            int size = static_cast<int>(std::ceil(kTextureSize * magnification));
            card.shrunk = cv::Size(size, size);
            // Resized texel centres back to the texture's, where the homography starts.
            double r = static_cast<double>(kTextureSize) / size;
            h = h * cv::Matx33d(r, 0, 0.5 * r - 0.5, 0, r, 0.5 * r - 0.5, 0, 0, 1);
        }
        card.homography = cv::Mat(shift * h);
        const PF_World& t = *scene.textures[k];
        card.texture = cv::Mat(t.height, t.width, CvType<P>(), t.data, t.rowBytes);
        card.depth = scene.scene.layers[k].placements[0].mat[3][2];
        cards.push_back(card);
    }
    std::sort(cards.begin(), cards.end(),
              [](const Card& a, const Card& b) { return a.depth > b.depth; });  // far first
    CoveredPixels();
    for (auto _ : state) {
        for (Card& card : cards) {
            const cv::Mat* source = &card.texture;
            if (!card.shrunk.empty()) {
                cv::resize(card.texture, card.resized, card.shrunk, 0, 0, cv::INTER_AREA);
                source = &card.resized;
            }
            cv::warpPerspective(*source, card.warped, card.homography, card.rect.size(),
                                cv::INTER_LINEAR, cv::BORDER_CONSTANT, cv::Scalar::all(0));
            cv::Mat target = frame(card.rect);
            Over<P>(card.warped, target);
        }
        benchmark::ClobberMemory();
    }
    ReportPerCoveredPixel(state);
    cv::setNumThreads(previousThreads);
}
#endif

// One thread is timed by processor time, which other work on the machine disturbs least; all
// threads by the wall clock, the only time that shows what they share.
// The lit frame (lit = 1) shows what lighting adds to the same best-quality frame.
void OneThread(benchmark::internal::Benchmark* b) {
    b->ArgNames({"best", "threads", "lit"})->Args({1, 0, 0})->Args({0, 0, 0})->Args({1, 0, 1});
    b->Unit(benchmark::kMillisecond)->Iterations(3);
}

void EveryThread(benchmark::internal::Benchmark* b) {
    b->ArgNames({"best", "threads", "lit"})->Args({1, 1, 0})->Args({0, 1, 0})->Args({1, 1, 1});
    b->Unit(benchmark::kMillisecond)->Iterations(3)->UseRealTime();
}

BENCHMARK(BM_Cards<PF_Pixel8>)->Apply(OneThread);
BENCHMARK(BM_Cards<PF_Pixel16>)->Apply(OneThread);
BENCHMARK(BM_Cards<PF_PixelFloat>)->Apply(OneThread);
BENCHMARK(BM_Cards<PF_Pixel8>)->Apply(EveryThread);
BENCHMARK(BM_Cards<PF_Pixel16>)->Apply(EveryThread);
BENCHMARK(BM_Cards<PF_PixelFloat>)->Apply(EveryThread);
#ifdef OSTREL_HAVE_OPENCV
void OpenCVOneThread(benchmark::internal::Benchmark* b) {
    b->ArgNames({"best", "threads", "area"})->Args({1, 0, 0})->Args({1, 0, 1});
    b->Unit(benchmark::kMillisecond)->Iterations(3);
}

void OpenCVEveryThread(benchmark::internal::Benchmark* b) {
    b->ArgNames({"best", "threads", "area"})->Args({1, 1, 0})->Args({1, 1, 1});
    b->Unit(benchmark::kMillisecond)->Iterations(3)->UseRealTime();
}

BENCHMARK(BM_OpenCV<PF_Pixel8>)->Apply(OpenCVOneThread);
BENCHMARK(BM_OpenCV<PF_Pixel16>)->Apply(OpenCVOneThread);
BENCHMARK(BM_OpenCV<PF_PixelFloat>)->Apply(OpenCVOneThread);
BENCHMARK(BM_OpenCV<PF_Pixel8>)->Apply(OpenCVEveryThread);
BENCHMARK(BM_OpenCV<PF_Pixel16>)->Apply(OpenCVEveryThread);
BENCHMARK(BM_OpenCV<PF_PixelFloat>)->Apply(OpenCVEveryThread);
#endif

}  // namespace

BENCHMARK_MAIN();
