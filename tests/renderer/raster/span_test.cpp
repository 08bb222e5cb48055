#include <gtest/gtest.h>

#include <cmath>
#include <type_traits>

#include "raster_test_support.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/raster/image_span.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_render.h"
#include "renderer/scene/screen_geometry.h"

namespace {

using raster_test::Equal;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;

constexpr int32_t kWidth = 16, kHeight = 8;

// W = w0 + x·dx, with texel (i, j) under output pixel (i, j).
M_Matrix3 Plane(double w0, double dx = 0) {
    M_Matrix3 m{};
    m.mat[0][0] = m.mat[1][1] = 1;
    m.mat[0][2] = dx;
    m.mat[2][2] = w0;
    return m;
}

// A 16 × 8 pattern drawn by a textured layer's routine or, as an image in output coordinates,
// by the image spans; orthographic at W = 1 unless a test moves the plane.
template <class P>
class Span : public ::testing::Test {
protected:
    Span() : texture_(raster_test::PatternTexture<P>(kWidth, kHeight)) {
        geometry_.textureFetcher = &fetcher_;
        geometry_.texture = texture_.get();
        SetPlane(Plane(1), false);
    }
    void SetPlane(const M_Matrix3& m, bool perspective) {
        geometry_.screenToTexture.Allocate(1);
        geometry_.screenToTexture[0] = m;
        geometry_.firstValid = geometry_.lastValid = 0;
        geometry_.perspective = perspective;
    }
    void Draw(bool image, const SY_RenderTarget& target, int32_t x, int32_t count, int32_t y,
              const PF_World* matte = nullptr) {
        if (image)
            SY_RenderLayerSpanFromImage_SwitchDepth(blend_, geometry_, matte, x, count, y, nullptr,
                                                    target, 0);
        else
            SY_RenderLayerSpan_SwitchDepth(geometry_, &shader_, matte, x, count, y, nullptr, target,
                                           0);
    }

    renderer_test::MemoryTextureFetcher fetcher_;
    std::unique_ptr<PF_WorldX<P>> texture_;
    SY_ScreenGeometry geometry_;
    SY_LayerShader shader_;
    SY_SpanBlend blend_;
};

TYPED_TEST_SUITE(Span, renderer_test::PixelTypes);

// A span draws exactly its pixels, each showing the texel under it; an image span only those
// the image has. A store target takes them at its image's origin (3, 1), unblended, and no
// further; shadow arrays receive nothing from either dispatcher.
TYPED_TEST(Span, SpansDrawExactlyTheirPixels) {
    using P = TypeParam;
    struct Case {
        bool image;
        int32_t mode, x, count, y, from, to;
    };
    const Case cases[] = {
        {false, kSY_TargetDestination, 3, 0, 2, 0, 0},  // nothing
        {false, kSY_TargetDestination, 3, -2, 2, 0, 0},
        {false, kSY_TargetDestination, 5, 1, 2, 5, 6},  // the single-pixel tail only
        {false, kSY_TargetDestination, 5, 2, 2, 5, 7},  // a pair
        {false, kSY_TargetDestination, 2, 7, 2, 2, 9},  // pairs and a tail
        {false, kSY_TargetDepthOfField, 4, 5, 2, 4, 9},
        {false, kSY_TargetShadowArray, 0, 16, 2, 0, 0},
        {true, kSY_TargetDestination, 3, 5, 2, 3, 8},
        {true, kSY_TargetDestination, -4, 30, 5, 0, 16},  // clipped to the image
        {true, kSY_TargetDestination, 0, 16, 8, 0, 0},    // the row below the image
        {true, kSY_TargetDepthOfField, 0, 16, 2, 3, 16},  // from the store's first column
        {true, kSY_TargetShadowArray, 0, 16, 2, 0, 0},
    };
    for (const Case& c : cases) {
        PF_WorldX<P> destination(kWidth + 4, kHeight + 2);
        SY_SpanImageRecord store{&destination, 3, 1};
        SY_ShadowFragmentArray occluders({0, 0, kWidth, kHeight});
        const SY_RenderTarget targets[] = {SY_RenderTarget(destination), SY_RenderTarget(store),
                                           SY_RenderTarget(occluders)};
        for (const SY_RenderTarget& target : targets) {
            if (target.mode() == c.mode) this->Draw(c.image, target, c.x, c.count, c.y);
        }
        EXPECT_EQ(occluders.FragmentCount(), 0u);
        const bool stored = c.mode == kSY_TargetDepthOfField;
        for (int32_t j = 0; j < destination.height; ++j) {
            for (int32_t i = 0; i < destination.width; ++i) {
                const int32_t x = stored ? i + 3 : i, y = stored ? j + 1 : j;
                const bool drawn = y == c.y && x >= c.from && x < c.to;
                const P& got = destination.At(i, j);
                ASSERT_TRUE(drawn ? Equal(got, PatternTexel<P>(x, y)) : IsClear(got))
                    << "case " << &c - cases << " at " << i << "," << j;
            }
        }
    }
}

// With bit 7 of the mode set, the destination's alpha survives every transfer mode.
TYPED_TEST(Span, KeepAlphaLeavesTheDestinationAlpha) {
    using P = TypeParam;
    P under = Opaque<P>(60, 120, 180);
    under.alpha = under.alpha * 100 / 255;
    for (int32_t mode : {kPF_XferNormal, 4, kPF_XferMultiply, 6}) {  // also add and screen
        this->blend_.mode = static_cast<uint8_t>(mode | 128);
        auto destination = raster_test::FilledWorld<P>(kWidth, kHeight, under);
        this->Draw(true, SY_RenderTarget(*destination), 0, kWidth, 3);
        for (int32_t x = 0; x < kWidth; ++x) {
            EXPECT_EQ(destination->At(x, 3).alpha, under.alpha) << mode << " at " << x;
            EXPECT_FALSE(Equal(destination->At(x, 3), under)) << mode << " at " << x;
        }
    }
}

// A matte of alpha 0 hides the pixel; half the matte alpha at half the opacity blends the
// pixel over transparent black at a quarter, through either dispatcher.
TYPED_TEST(Span, MatteAndOpacityScaleTheCoverage) {
    using P = TypeParam;
    using Traits = PF_PixelTraits<P>;
    this->blend_.opacity = this->shader_.material.opacity = 0.5;
    PF_WorldX<P> matte(kWidth, kHeight);
    for (int32_t x = 0; x < kWidth; ++x)
        matte.At(x, 4).alpha = x < 8 ? 0 : static_cast<typename Traits::Channel>(Traits::kMax / 2);
    for (bool image : {false, true}) {
        PF_WorldX<P> destination(kWidth, kHeight);
        this->Draw(image, SY_RenderTarget(destination), 0, kWidth, 4, &matte);
        for (int32_t x = 0; x < kWidth; ++x) {
            const double alpha = double(destination.At(x, 4).alpha) / Traits::kMax;
            EXPECT_NEAR(alpha, x < 8 ? 0 : 0.25, 1.0 / 255) << x << " image " << image;
        }
    }
}

// Ambient light of half strength halves every colour channel: c·½ + ½, truncated for integer
// channels; the shadows-only layer lights the channel maximum instead of the texel's colour and
// multiplies what lies beneath, opaque white here. Lit pixels go out in groups of pairs, lit
// four at once where a group's pairs all show: a matte hiding the pair 2–3 and pixel 9 of a
// 15-pixel span leaves every other pixel lit as alone and those untouched.
TYPED_TEST(Span, ShadingScalesTexelsByTheLightingTerms) {
    using P = TypeParam;
    SY_LightState ambient;
    ambient.type = kSY_LightAmbient;
    ambient.color[1] = ambient.color[2] = ambient.color[3] = 0.5;
    SY_LayerShader& shader = this->shader_;
    shader.lights.Allocate(1);
    shader.lights[0] = &ambient;
    shader.material.ambient = shader.shaded = 1;
    shader.material.acceptsLights = true;
    auto half = [](double c) {
        return PF_PixelTraits<P>::kIsFloat ? c / 2 : std::floor(c / 2 + 0.5);
    };
    const P white = Opaque<P>(255, 255, 255);
    auto matte = raster_test::FilledWorld<P>(kWidth, kHeight, white);
    for (int32_t x : {2, 3, 9})
        matte->At(x, 4).alpha = 0;
    for (uint8_t acceptsShadows : {0, 2}) {
        shader.material.acceptsShadows = acceptsShadows;
        auto destination = raster_test::FilledWorld<P>(kWidth, kHeight, white);
        this->Draw(false, SY_RenderTarget(*destination), 0, 15, 4, matte.get());
        for (int32_t i = 0; i < kWidth; ++i) {
            const P texel = acceptsShadows ? white : PatternTexel<P>(i, 4);
            const bool lit = i < 15 && matte->At(i, 4).alpha != 0;
            const P& got = destination->At(i, 4);
            EXPECT_EQ(got.alpha, texel.alpha);
            EXPECT_FLOAT_EQ(got.red, lit ? half(texel.red) : white.red) << i;
            EXPECT_FLOAT_EQ(got.green, lit ? half(texel.green) : white.green) << i;
            EXPECT_FLOAT_EQ(got.blue, lit ? half(texel.blue) : white.blue) << i;
        }
    }
}

// Under a perspective camera W = 1 − x/8 falls to 0 at x = 8: the plane lies behind the camera
// from there on and the image span draws nothing.
TYPED_TEST(Span, PixelsWhereThePlaneIsBehindTheCameraAreNotDrawn) {
    using P = TypeParam;
    this->SetPlane(Plane(1, -0.125), true);
    PF_WorldX<P> destination(kWidth, kHeight);
    this->Draw(true, SY_RenderTarget(destination), 0, kWidth, 0);
    for (int32_t x = 0; x < kWidth; ++x)
        EXPECT_EQ(!IsClear(destination.At(x, 0)), x < 8) << x;
}

// W = 2 + x/4 and the layer's offset is −⅛: a draft fragment's key is W at its pixel's centre
// plus the offset, from either dispatcher; an anti-aliased one's is the plane's minimum over the
// pixel, ⅛ lower; a transparent image pixel adds none. Two subsamples whose W differ by −2 over
// the shutter key a draft fragment at mid-shutter, 1 lower.
TYPED_TEST(Span, FragmentKeysAreThePlaneAtThePixelCentreOrItsMinimum) {
    using P = TypeParam;
    this->texture_->At(5, 1) = P{};
    const struct {
        bool image, antialiased;
        int32_t samples;
        double keyAtZero;
    } cases[] = {{false, false, 1, 2},
                 {true, false, 1, 2},
                 {false, true, 1, 1.875},
                 {true, true, 1, 1.875},
                 {false, false, 2, 1}};
    for (const auto& c : cases) {
        this->SetPlane(Plane(2, 0.25), false);
        if (c.samples == 2) {
            this->geometry_.screenToTexture.Allocate(2);
            this->geometry_.screenToTexture[0] = Plane(2, 0.25);
            this->geometry_.screenToTexture[1] = Plane(0, 0.25);
            this->geometry_.lastValid = 1;
        }
        this->blend_.depthOffset = this->shader_.depthOffset = -0.125f;
        auto buffer = SY_MBuffer::New({0, 0, kWidth, kHeight}, PF_PixelTraits<P>::kBitDepth,
                                      c.antialiased, false);
        this->Draw(c.image, SY_RenderTarget(*buffer), 2, 6, 1);
        auto check = [&](auto& fragments) {
            for (int32_t x = 0; x < kWidth; ++x) {
                const auto* f = *fragments.HeadAt(x, 1);
                ASSERT_EQ(f != nullptr, x >= 2 && x < 8 && x != 5) << x << " case " << &c - cases;
                if (!f) continue;
                EXPECT_EQ(f->next, nullptr);
                EXPECT_FLOAT_EQ(f->depth, c.keyAtZero + x * 0.25) << x << " case " << &c - cases;
                EXPECT_TRUE(Equal(f->color, PatternTexel<P>(x, 1))) << x;
            }
        };
        if (c.antialiased)
            check(static_cast<SY_MBufferAAX<P>&>(*buffer));
        else
            check(static_cast<SY_MBufferDraftX<P>&>(*buffer));
    }
}

// Both dispatchers refuse a texture whose depth differs from the target's: reported, thrown 3.
TYPED_TEST(Span, TextureOfAnotherDepthIsReportedAndThrowsThree) {
    using Other = std::conditional_t<std::is_same_v<TypeParam, PF_Pixel8>, PF_Pixel16, PF_Pixel8>;
    PF_WorldX<Other> destination(kWidth, kHeight);
    for (bool image : {false, true}) {
        renderer_test::ReportCapture capture;
        int32_t thrown = 0;
        try {
            this->Draw(image, SY_RenderTarget(destination), 0, 4, 0);
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, 3) << image;
        EXPECT_EQ(capture.reports().size(), 1u) << image;
    }
}

}  // namespace
