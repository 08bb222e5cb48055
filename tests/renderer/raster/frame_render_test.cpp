#include <gtest/gtest.h>

#include <cmath>
#include <cstring>

#include "raster_test_support.h"
#include "u_memory.h"

namespace {

using raster_test::Equal;
using raster_test::Frame;
using raster_test::IsClear;
using raster_test::PatternTexel;
using raster_test::PatternTexture;
using renderer_test::Translation;

// Output 64 × 48; the plane z = 0 is seen 1:1.
constexpr int32_t kWidth = 64, kHeight = 48;
constexpr int32_t kLeft = 7, kTop = 5;

template <class P>
class FrameRender : public ::testing::Test {};
TYPED_TEST_SUITE(FrameRender, renderer_test::PixelTypes);

// The layer point each pixel centre's ray meets: the placement's rows are the layer's axes, its
// normal and its origin, and the ray of pixel centre (sx, sy) leaves the camera at
// (W/2, H/2, −D) along (sx − W/2, sy − H/2, D).
void LayerPointOfPixel(const M_Matrix4& placement, int32_t x, int32_t y, double* u, double* v) {
    const auto& m = placement.mat;
    auto dot = [](const double* a, const double* b) {
        return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
    };
    const double from[3] = {kWidth / 2.0 - m[3][0], kHeight / 2.0 - m[3][1],
                            -raster_test::kDistance - m[3][2]};
    const double dir[3] = {x + 0.5 - kWidth / 2.0, y + 0.5 - kHeight / 2.0, raster_test::kDistance};
    const double t = -dot(from, m[2]) / dot(dir, m[2]);
    const double hit[3] = {from[0] + t * dir[0], from[1] + t * dir[1], from[2] + t * dir[2]};
    *u = dot(hit, m[0]);
    *v = dot(hit, m[1]);
}

// Each pixel centre away from texel borders shows the texel its ray meets, and pixels off the
// layer stay clear. A layer facing the camera at the zoom distance maps its pixels 1:1; at best
// quality the pixel centre moved by half a texel up and left is the texel's centre, where
// bilinear interpolation gives the texel. A layer turned 0.5 rad about the vertical axis through
// its centre and moved 50 deeper is checked at its draft quality.
TYPED_TEST(FrameRender, EachPixelShowsTheTexelItsRayMeets) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(32, 32);
    const struct {
        M_Matrix4 placement;
        bool best;
        int32_t pixels;  // checked at least
    } cases[] = {
        {Translation(kLeft, kTop, 0), false, 32 * 32},
        {Translation(kLeft, kTop, 0), true, 32 * 32},
        {renderer_test::Turned(16, 16, 0, 0.5, kWidth / 2.0, kHeight / 2.0, 50), false, 300}};
    for (const auto& c : cases) {
        Frame frame(kWidth, kHeight, 1);
        SY_LayerDesc& layer = frame.Layer(0, texture.get(), c.placement);
        layer.material.bestQuality = c.best;
        layer.material.engineFlag = SY_SamplingFilter::kBilinear;  // at best quality only
        PF_WorldX<P> destination(kWidth, kHeight);
        frame.Render(&destination);
        int32_t checked = 0;
        for (int32_t y = 0; y < kHeight; ++y) {
            for (int32_t x = 0; x < kWidth; ++x) {
                double u, v;
                LayerPointOfPixel(c.placement, x, y, &u, &v);
                const double fu = u - std::floor(u), fv = v - std::floor(v);
                if (fu < 0.01 || fu > 0.99 || fv < 0.01 || fv > 0.99) continue;  // near a border
                const bool inside = u > 0 && u < 32 && v > 0 && v < 32;
                const P& got = destination.At(x, y);
                ASSERT_TRUE(inside ? Equal(got, PatternTexel<P>(int32_t(u), int32_t(v)))
                                   : IsClear(got))
                    << x << "," << y << " case " << &c - cases;
                checked += inside;
            }
        }
        EXPECT_GE(checked, c.pixels);
        EXPECT_EQ(frame.progress.renderables.back(), std::make_pair(1, 1));
    }
}

// A matte the test holds; outside it the layer is hidden unless the matte is an inverted one.
struct WorldMatte : SY_TImageFetcher {
    WorldMatte(PF_World* matte, bool clear) : world(matte), outsideIsClear(clear) {}
    PF_World* Fetch() override {
        ++fetches;
        return world;
    }
    void Release() override { ++releases; }
    bool OutsideIsClear() const override { return outsideIsClear; }

    PF_World* world;
    bool outsideIsClear;
    int32_t fetches = 0, releases = 0;
};

// A matte smaller than the output, with alpha only from column 9 on (odd, so the pair loop
// meets its edge): the layer shows where the matte has alpha and not where it has none, and
// beyond the matte an inverted matte shows it (a plain one hides it: the stage example),
// whether the layer is drawn through its projection or from its image. The matte is fetched
// and released once.
TYPED_TEST(FrameRender, TrackMatteIsReadOnlyWhereItHasPixels) {
    using P = TypeParam;
    constexpr int32_t kMatteW = 21, kMatteH = 13, kFrom = 9;
    auto texture = PatternTexture<P>(kWidth, kHeight);
    auto matte = raster_test::WorldOf<P>(kMatteW, kMatteH, [](int32_t x, int32_t) {
        return x < kFrom ? P{} : raster_test::Opaque<P>(0, 0, 0);
    });
    for (bool unbounded : {false, true}) {
        Frame frame(kWidth, kHeight, 1);
        SY_LayerDesc& layer = frame.Layer(0, texture.get(), renderer_test::Identity());
        layer.unbounded = unbounded;
        auto owned = std::make_unique<WorldMatte>(matte.get(), false);
        const WorldMatte& fetcher = *owned;
        layer.trackMatte = std::move(owned);
        PF_WorldX<P> destination(kWidth, kHeight);
        frame.Render(&destination);
        for (int32_t y = 0; y < kHeight; ++y) {
            for (int32_t x = 0; x < kWidth; ++x) {
                const bool shown = x >= kFrom || y >= kMatteH;
                const P& got = destination.At(x, y);
                ASSERT_TRUE(shown ? Equal(got, PatternTexel<P>(x, y)) : IsClear(got))
                    << x << "," << y << " unbounded " << unbounded;
            }
        }
        EXPECT_EQ(fetcher.fetches, 1);
        EXPECT_EQ(fetcher.releases, 1);
    }
}

TEST(FrameRender, FieldModesDrawEveryOtherRow) {
    auto texture = PatternTexture<PF_Pixel8>(8, 8);
    const int32_t skippedParity[] = {-1, 1, 0};  // by field mode; −1: no row skipped
    for (int32_t fieldMode = 0; fieldMode < 3; ++fieldMode) {
        Frame frame(kWidth, kHeight, 1);
        frame.Layer(0, texture.get(), Translation(4, 4, 0));
        frame.scene.fieldMode = fieldMode;
        PF_WorldX<PF_Pixel8> destination(kWidth, kHeight);
        frame.Render(&destination);
        for (int32_t y = 4; y < 12; ++y)
            EXPECT_EQ(IsClear(destination.At(6, y)), (y & 1) == skippedParity[fieldMode]) << y;
    }
}

// A fetch that fails and a cancel from the progress report both end the frame with their code,
// hand the textures back and leave the accounted bytes as they were.
TEST(FrameRender, FailuresFreeWhatTheFrameTook) {
    struct FailingFetcher : renderer_test::MemoryTextureFetcher {
        int32_t Fetch(int32_t, bool, const double*, const M_LRect*, M_Matrix3*,
                      PF_World**) override {
            return 7;
        }
    };
    struct CancellingProgress : renderer_test::RecordingProgress {
        void ReportRows(int32_t, int32_t) override { throw int32_t{9}; }
    };
    auto texture = PatternTexture<PF_Pixel16>(20, 20);
    const int64_t start = U_AccountedBytes();
    for (bool cancel : {false, true}) {
        Frame frame(kWidth, kHeight, 1);
        frame.Layer(0, texture.get(), Translation(3, 3, 0));
        FailingFetcher failing;
        CancellingProgress cancelling;
        PF_WorldX<PF_Pixel16> destination(kWidth, kHeight);
        int32_t thrown = 0;
        try {
            SY_RenderFrame(frame.scene, cancel ? &frame.fetcher : &failing,
                           cancel ? &cancelling : &frame.progress, nullptr, false, &destination,
                           nullptr);
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, cancel ? 9 : 7);
        EXPECT_EQ(frame.fetcher.fetches, cancel ? 1 : 0);
        EXPECT_EQ(frame.fetcher.releases, frame.fetcher.fetches);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

template <class P>
class FrameRenderThreads : public ::testing::Test {};
TYPED_TEST_SUITE(FrameRenderThreads, renderer_test::PixelTypes);

// Layers of every kind the span routines know (plain, turned bilinear, bicubic multiplied at
// 70 %, moving), drawn over three threads and over one: the frames are equal byte for byte.
TYPED_TEST(FrameRenderThreads, ThreadedFrameEqualsSingleThreadedFrame) {
    using P = TypeParam;
    auto plain = PatternTexture<P>(30, 20), large = PatternTexture<P>(64, 64);
    auto render = [&](PF_WorldX<P>* destination, const QNGP_IterateSuite1* iterate) {
        Frame frame(kWidth, kHeight, 4);
        frame.Layer(0, plain.get(), Translation(2, 3, 0));
        SY_LayerDesc& turned =
            frame.Layer(1, large.get(),
                        renderer_test::Turned(32, 32, 0.3, 0.6, kWidth / 2.0, kHeight / 2.0, 80));
        turned.material.bestQuality = true;
        turned.material.engineFlag = SY_SamplingFilter::kBilinear;
        SY_LayerDesc& bicubic =
            frame.Layer(2, plain.get(), renderer_test::Turned(15, 10, 0, 0.4, 40, 30, 20));
        bicubic.material.bestQuality = true;
        bicubic.material.engineFlag = SY_SamplingFilter::kBicubic;
        bicubic.material.opacity = 0.7;
        bicubic.material.mode = kPF_XferMultiply;
        SY_LayerDesc& moving = frame.Layer(3, plain.get(), Translation(30, 5, 0));
        renderer_test::SetPlacements(&moving, {Translation(30, 5, 0), Translation(34, 9, -30)});
        moving.material.motionBlur = moving.material.bestQuality = true;
        moving.material.engineFlag = SY_SamplingFilter::kBilinear;
        frame.Render(destination, iterate);
    };
    PF_WorldX<P> single(kWidth, kHeight), threaded(kWidth, kHeight);
    render(&single, nullptr);
    render(&threaded, renderer_test::ThreadedIterateSuite<3>::Suite());
    int32_t drawn = 0;
    for (int32_t y = 0; y < kHeight; ++y) {
        ASSERT_EQ(std::memcmp(single.Row(y), threaded.Row(y), sizeof(P) * kWidth), 0) << y;
        for (int32_t x = 0; x < kWidth; ++x)
            drawn += !IsClear(single.At(x, y));
    }
    EXPECT_GT(drawn, kWidth * kHeight / 3);
}

}  // namespace
