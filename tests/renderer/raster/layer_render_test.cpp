#include <gtest/gtest.h>

#include <cmath>

#include "raster_test_support.h"
#include "u_memory.h"

namespace {

using raster_test::Code;
using raster_test::Equal;
using raster_test::Frame;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;
using raster_test::PatternTexture;
using scene_test::Translation;

template <class P>
class LayerRender : public ::testing::Test {};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(LayerRender, PixelTypes);

// Output 64 × 48; a 20 × 10 texture with its corner at (7, 5) on the plane the camera sees 1:1.
constexpr int32_t kWidth = 64, kHeight = 48;
constexpr int32_t kLeft = 7, kTop = 5, kTexW = 20, kTexH = 10;

bool InsideLayer(int32_t x, int32_t y) {
    return x >= kLeft && x < kLeft + kTexW && y >= kTop && y < kTop + kTexH;
}

TYPED_TEST(LayerRender, FacingLayerAtZoomDistanceCopiesItsTexturePixelForPixel) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(kTexW, kTexH);
    Frame frame(kWidth, kHeight, 1);
    frame.Layer(0, texture.get(), Translation(kLeft, kTop, 0));
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);
    for (int32_t y = 0; y < kHeight; ++y) {
        for (int32_t x = 0; x < kWidth; ++x) {
            const P& got = destination.At(x, y);
            if (InsideLayer(x, y))
                ASSERT_TRUE(Equal(got, PatternTexel<P>(x - kLeft, y - kTop))) << x << "," << y;
            else
                ASSERT_TRUE(IsClear(got)) << x << "," << y;
        }
    }
    EXPECT_EQ(frame.progress.renderables.back(), std::make_pair(1, 1));
}

// The camera sees the plane z = 0 1:1, so a layer at depth z is scaled by D / (D + z) about
// the output's centre. Pixel centres away from texel borders must show the texel that the ray
// through them meets.
TYPED_TEST(LayerRender, TurnedLayerShowsTheTexelItsPixelRayMeets) {
    using P = TypeParam;
    constexpr int32_t kSize = 32;
    auto texture = PatternTexture<P>(kSize, kSize);
    Frame frame(kWidth, kHeight, 1);
    // Turned 0.5 rad about the vertical axis through the texture's centre, moved 50 deeper.
    M_Matrix4 placement = scene_test::Turned(16, 16, 0, 0.5, kWidth / 2.0, kHeight / 2.0, 50);
    frame.Layer(0, texture.get(), placement);
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);

    // Layer point (u, v) lies at o + u·eu + v·ev in the world; the ray of pixel centre (sx, sy)
    // leaves the camera at c along (sx − W/2, sy − H/2, D).
    const auto& m = placement.mat;
    double c[3] = {kWidth / 2.0, kHeight / 2.0, -raster_test::kDistance};
    int32_t checked = 0;
    for (int32_t y = 0; y < kHeight; ++y) {
        for (int32_t x = 0; x < kWidth; ++x) {
            double dir[3] = {x + 0.5 - kWidth / 2.0, y + 0.5 - kHeight / 2.0,
                             raster_test::kDistance};
            // Solve u·eu + v·ev − t·dir = c − o by Cramer's rule.
            double a[3][3], r[3];
            for (int k = 0; k < 3; ++k) {
                a[k][0] = m[0][k];
                a[k][1] = m[1][k];
                a[k][2] = -dir[k];
                r[k] = c[k] - m[3][k];
            }
            auto det = [](double q[3][3]) {
                return q[0][0] * (q[1][1] * q[2][2] - q[1][2] * q[2][1]) -
                       q[0][1] * (q[1][0] * q[2][2] - q[1][2] * q[2][0]) +
                       q[0][2] * (q[1][0] * q[2][1] - q[1][1] * q[2][0]);
            };
            double d = det(a), uv[2];
            for (int col = 0; col < 2; ++col) {
                double b[3][3];
                for (int k = 0; k < 3; ++k) {
                    for (int j = 0; j < 3; ++j)
                        b[k][j] = j == col ? r[k] : a[k][j];
                }
                uv[col] = det(b) / d;
            }
            double fu = uv[0] - std::floor(uv[0]), fv = uv[1] - std::floor(uv[1]);
            bool nearBorder = fu < 0.01 || fu > 0.99 || fv < 0.01 || fv > 0.99;
            bool inside = uv[0] > 0 && uv[0] < kSize && uv[1] > 0 && uv[1] < kSize;
            if (nearBorder) continue;
            const P& got = destination.At(x, y);
            if (inside) {
                auto i = static_cast<int32_t>(std::floor(uv[0]));
                auto j = static_cast<int32_t>(std::floor(uv[1]));
                ASSERT_TRUE(Equal(got, PatternTexel<P>(i, j))) << x << "," << y;
                ++checked;
            }
        }
    }
    EXPECT_GT(checked, 300);
}

TYPED_TEST(LayerRender, BestQualitySamplesHalfATexelUpAndLeft) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(kTexW, kTexH);
    Frame frame(kWidth, kHeight, 1);
    SY_LayerDesc& layer = frame.Layer(0, texture.get(), Translation(kLeft, kTop, 0));
    layer.material.bestQuality = true;
    layer.material.engineFlag = SY_SamplingFilter::kBilinear;
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);
    // Pixel centre (x + ½, y + ½) moved by half a texel is texel (x − left, y − top)'s centre,
    // where bilinear interpolation gives the texel itself.
    for (int32_t y = kTop; y < kTop + kTexH; ++y) {
        for (int32_t x = kLeft; x < kLeft + kTexW; ++x) {
            ASSERT_TRUE(Equal(destination.At(x, y), PatternTexel<P>(x - kLeft, y - kTop)))
                << x << "," << y;
        }
    }
}

TYPED_TEST(LayerRender, MultiplyDarkensAKnownBackground) {
    using P = TypeParam;
    auto texture = raster_test::FilledWorld<P>(kTexW, kTexH, Opaque<P>(255, 0, 102));
    Frame frame(kWidth, kHeight, 1);
    frame.Layer(0, texture.get(), Translation(kLeft, kTop, 0)).material.mode = kPF_XferMultiply;
    auto destination = raster_test::FilledWorld<P>(kWidth, kHeight, Opaque<P>(200, 100, 50));
    frame.Render(destination.get());
    // Multiply of opaque colours: each channel is the product in units of the maximum.
    P inside = destination->At(kLeft + 3, kTop + 3);
    double max = PF_PixelTraits<P>::kMax;
    double tolerance = max / 255.0;
    EXPECT_NEAR(inside.alpha, max, tolerance);
    EXPECT_NEAR(inside.red, Code<P>(200), tolerance);
    EXPECT_NEAR(inside.green, 0, tolerance);
    EXPECT_NEAR(inside.blue, Code<P>(50) * 0.4, tolerance);
    EXPECT_TRUE(Equal(destination->At(0, 0), Opaque<P>(200, 100, 50)));
}

TYPED_TEST(LayerRender, HalfOpacityHalvesCoverage) {
    using P = TypeParam;
    auto texture = raster_test::FilledWorld<P>(kTexW, kTexH, Opaque<P>(255, 255, 255));
    Frame frame(kWidth, kHeight, 1);
    frame.Layer(0, texture.get(), Translation(kLeft, kTop, 0)).material.opacity = 0.5;
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);
    P got = destination.At(kLeft + 1, kTop + 1);
    double max = PF_PixelTraits<P>::kMax;
    EXPECT_NEAR(got.alpha, max / 2, max / 255.0);
    EXPECT_EQ(got.red, Code<P>(255));
}

// A matte the test holds; outside it the layer is hidden unless the matte is an inverted one.
class WorldMatte : public SY_TImageFetcher {
public:
    explicit WorldMatte(PF_World* world, bool outsideIsClear = true)
        : world_(world), outsideIsClear_(outsideIsClear) {}
    PF_World* Fetch() override {
        ++fetches;
        return world_;
    }
    void Release() override { ++releases; }
    bool OutsideIsClear() const override { return outsideIsClear_; }

    int32_t fetches = 0;
    int32_t releases = 0;

private:
    PF_World* world_;
    bool outsideIsClear_;
};

// Alpha only on the right half of the output: pixels left of it are untouched, and pixels
// right of it show the texel they would show without a matte.
TYPED_TEST(LayerRender, ZeroMatteAlphaDrawsNothingAndKeepsTheRowInStep) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(kTexW, kTexH);
    PF_WorldX<P> matte(kWidth, kHeight);
    constexpr int32_t kMatteFrom = kLeft + 9;  // odd span offset: the pair loop meets the edge
    for (int32_t y = 0; y < kHeight; ++y) {
        for (int32_t x = kMatteFrom; x < kWidth; ++x)
            matte.At(x, y).alpha = Code<P>(255);
    }
    Frame frame(kWidth, kHeight, 1);
    SY_LayerDesc& layer = frame.Layer(0, texture.get(), Translation(kLeft, kTop, 0));
    auto owned = std::make_unique<WorldMatte>(&matte);
    WorldMatte* fetcher = owned.get();
    layer.trackMatte = std::move(owned);
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);
    for (int32_t y = kTop; y < kTop + kTexH; ++y) {
        for (int32_t x = kLeft; x < kLeft + kTexW; ++x) {
            const P& got = destination.At(x, y);
            if (x < kMatteFrom)
                ASSERT_TRUE(IsClear(got)) << x << "," << y;
            else
                ASSERT_TRUE(Equal(got, PatternTexel<P>(x - kLeft, y - kTop))) << x << "," << y;
        }
    }
    EXPECT_EQ(fetcher->fetches, 1);
    EXPECT_EQ(fetcher->releases, 1);
}

// A matte smaller than the output is read only where it has pixels: beyond it a plain matte
// hides the layer and an inverted one shows it, whether the layer is drawn through its
// projection or from its image.
TYPED_TEST(LayerRender, MatteSmallerThanTheOutputIsNeverReadPastItsEnd) {
    using P = TypeParam;
    constexpr int32_t kMatteW = 21, kMatteH = 13;
    auto texture = PatternTexture<P>(kWidth, kHeight);
    auto matte = raster_test::FilledWorld<P>(kMatteW, kMatteH, Opaque<P>(0, 0, 0));
    for (bool unbounded : {false, true}) {
        for (bool outsideIsClear : {true, false}) {
            Frame frame(kWidth, kHeight, 1);
            SY_LayerDesc& layer = frame.Layer(0, texture.get(), scene_test::Identity());
            layer.unbounded = unbounded;
            layer.trackMatte = std::make_unique<WorldMatte>(matte.get(), outsideIsClear);
            PF_WorldX<P> destination(kWidth, kHeight);
            frame.Render(&destination);
            for (int32_t y = 0; y < kHeight; ++y) {
                for (int32_t x = 0; x < kWidth; ++x) {
                    bool shown = (x < kMatteW && y < kMatteH) || !outsideIsClear;
                    const P& got = destination.At(x, y);
                    ASSERT_TRUE(shown ? Equal(got, PatternTexel<P>(x, y)) : IsClear(got))
                        << x << "," << y << " unbounded " << unbounded << " clear outside "
                        << outsideIsClear;
                }
            }
        }
    }
}

TYPED_TEST(LayerRender, UnboundedLayerCoversTheOutput) {
    using P = TypeParam;
    auto texture = PatternTexture<P>(kWidth, kHeight);
    Frame frame(kWidth, kHeight, 1);
    SY_LayerDesc& layer = frame.Layer(0, texture.get(), scene_test::Identity());
    scene_test::SetRect(&layer, 10, 10, 12, 12);  // the source rectangle does not bound it
    layer.unbounded = true;
    PF_WorldX<P> destination(kWidth, kHeight);
    frame.Render(&destination);
    for (int32_t y = 0; y < kHeight; ++y) {
        for (int32_t x = 0; x < kWidth; ++x)
            ASSERT_TRUE(Equal(destination.At(x, y), PatternTexel<P>(x, y))) << x << "," << y;
    }
}

}  // namespace
