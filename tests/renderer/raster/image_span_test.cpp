#include <gtest/gtest.h>

#include <vector>

#include "raster_test_support.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/raster/image_span.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_render.h"
#include "renderer/scene/screen_geometry.h"
#include "u_memory.h"

namespace {

using raster_test::Code;
using raster_test::Equal;
using raster_test::FilledWorld;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;
using raster_test::PatternTexture;

constexpr int32_t kWidth = 16, kHeight = 8;

// The plane's depth W = w0 + x·dx as a screen-to-texture mapping, orthographic unless asked.
void SetPlane(SY_ScreenGeometry* geometry, double w0, double dx, bool perspective) {
    geometry->screenToTexture.Allocate(1);
    M_Matrix3& m = geometry->screenToTexture[0];
    m = M_Matrix3{};
    m.mat[0][0] = m.mat[1][1] = 1;
    m.mat[0][2] = dx;
    m.mat[2][2] = w0;
    geometry->firstValid = geometry->lastValid = 0;
    geometry->perspective = perspective;
}

template <class P>
class ImageSpan : public ::testing::Test {
protected:
    ImageSpan() : image_(PatternTexture<P>(kWidth, kHeight)) {
        geometry_.textureFetcher = &fetcher_;
        geometry_.texture = image_.get();
        SetPlane(&geometry_, 1, 0, false);
    }
    void Draw(const SY_RenderTarget& target, int32_t x, int32_t count, int32_t y,
              const PF_World* matte = nullptr) {
        SY_RenderLayerSpanFromImage_SwitchDepth(blend_, geometry_, matte, x, count, y, nullptr,
                                                target, 0);
    }

    ostrel_test::MemoryTextureFetcher fetcher_;
    std::unique_ptr<PF_WorldX<P>> image_;
    SY_ScreenGeometry geometry_;
    SY_SpanBlend blend_;
};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(ImageSpan, PixelTypes);

// Image pixel (x, y) lands on output pixel (x, y); a span reaching past the image draws only
// the pixels the image has, and other target kinds draw nothing.
TYPED_TEST(ImageSpan, SpansCopyTheirImagePixelsClippedToTheImage) {
    using P = TypeParam;
    struct Case {
        int32_t mode, x, count, y, from, to;
    };
    const Case cases[] = {
        {kSY_TargetDestination, 3, 5, 2, 3, 8},   {kSY_TargetDestination, -4, 30, 5, 0, 16},
        {kSY_TargetDestination, 10, 0, 1, 0, 0},  {kSY_TargetDestination, 0, 16, 8, 0, 0},
        {kSY_TargetDepthOfField, 0, 16, 2, 0, 0}, {kSY_TargetShadowArray, 0, 16, 2, 0, 0},
    };
    for (const Case& c : cases) {
        PF_WorldX<P> destination(kWidth + 4, kHeight + 2);
        SY_ShadowFragmentArray occluders({0, 0, kWidth, kHeight});
        const SY_RenderTarget targets[] = {SY_RenderTarget(destination),
                                           SY_RenderTarget(SY_SpanImageRecord{&destination, 0, 0}),
                                           SY_RenderTarget(occluders)};
        for (const SY_RenderTarget& target : targets) {
            if (target.mode() == c.mode) this->Draw(target, c.x, c.count, c.y);
        }
        EXPECT_EQ(occluders.fragmentCount, 0u);
        for (int32_t y = 0; y < destination.height; ++y) {
            for (int32_t x = 0; x < destination.width; ++x) {
                bool drawn = y == c.y && x >= c.from && x < c.to;
                const P& got = destination.At(x, y);
                EXPECT_TRUE(drawn ? Equal(got, PatternTexel<P>(x, y)) : IsClear(got))
                    << "case x=" << c.x << " count=" << c.count << " at " << x << "," << y;
            }
        }
    }
}

// With bit 7 of the mode set, the destination's alpha survives every transfer mode.
TYPED_TEST(ImageSpan, KeepAlphaLeavesTheDestinationAlpha) {
    using P = TypeParam;
    const P under = {Code<P>(100), Code<P>(60), Code<P>(120), Code<P>(180)};
    // normal, add, multiply, screen
    for (int32_t mode : {kPF_XferNormal, 4, kPF_XferMultiply, 6}) {
        this->blend_.mode = static_cast<uint8_t>(mode | 128);
        auto destination = FilledWorld<P>(kWidth, kHeight, under);
        this->Draw(SY_RenderTarget(*destination), 0, kWidth, 3);
        for (int32_t x = 0; x < kWidth; ++x) {
            EXPECT_EQ(destination->At(x, 3).alpha, under.alpha) << mode << " at " << x;
            EXPECT_FALSE(Equal(destination->At(x, 3), under)) << mode << " at " << x;
        }
    }
}

// A matte of alpha 0 hides the pixel; half the matte alpha at half the opacity blends the
// pixel over transparent black at a quarter.
TYPED_TEST(ImageSpan, MatteAndOpacityScaleTheCoverage) {
    using P = TypeParam;
    using Traits = PF_PixelTraits<P>;
    this->blend_.opacity = 0.5;
    PF_WorldX<P> matte(kWidth, kHeight);
    for (int32_t x = 0; x < kWidth; ++x)
        matte.At(x, 4).alpha = x < 8 ? 0 : static_cast<typename Traits::Channel>(Traits::kMax / 2);
    PF_WorldX<P> destination(kWidth, kHeight);
    this->Draw(SY_RenderTarget(destination), 0, kWidth, 4, &matte);
    for (int32_t x = 0; x < kWidth; ++x) {
        const P& got = destination.At(x, 4);
        if (x < 8)
            EXPECT_TRUE(IsClear(got)) << x;
        else
            EXPECT_NEAR(static_cast<double>(got.alpha) / Traits::kMax, 0.25, 1.0 / 255) << x;
    }
}

// Fragments carry the plane's depth key: W at the pixel's top-left corner less one W extent,
// plus the layer's offset. A transparent image pixel adds no fragment.
TYPED_TEST(ImageSpan, FragmentsTakeTheirDepthFromThePlane) {
    using P = TypeParam;
    int64_t start = U_AccountedBytes();
    {
        SetPlane(&this->geometry_, 2, 0.25, false);
        this->blend_.depthOffset = -0.125f;
        this->image_->At(5, 1) = P{};
        auto buffer =
            SY_MBuffer::New({0, 0, kWidth, kHeight}, PF_PixelTraits<P>::kBitDepth, false, false);
        this->Draw(SY_RenderTarget(*buffer), 2, 6, 1);
        auto& draft = static_cast<SY_MBufferDraftX<P>&>(*buffer);
        for (int32_t x = 0; x < kWidth; ++x) {
            const SY_FragmentDraftX<P>* f = *draft.HeadAt(x, 1);
            if (x < 2 || x >= 8 || x == 5) {
                EXPECT_EQ(f, nullptr) << x;
                continue;
            }
            ASSERT_NE(f, nullptr) << x;
            EXPECT_EQ(f->next, nullptr);
            EXPECT_FLOAT_EQ(f->depth, 2 + x * 0.25f - 0.25f - 0.125f) << x;
            EXPECT_TRUE(Equal(f->color, PatternTexel<P>(x, 1))) << x;
        }
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

// Under a perspective camera W = 1 − x/8 falls to 0 at x = 8: the plane lies behind the
// camera from there on and nothing is drawn.
TYPED_TEST(ImageSpan, PixelsWhereThePlaneIsBehindTheCameraAreNotDrawn) {
    using P = TypeParam;
    SetPlane(&this->geometry_, 1, -0.125, true);
    PF_WorldX<P> destination(kWidth, kHeight);
    this->Draw(SY_RenderTarget(destination), 0, kWidth, 0);
    for (int32_t x = 0; x < kWidth; ++x)
        EXPECT_EQ(!IsClear(destination.At(x, 0)), x < 8) << x;
}

// An unbounded layer whose plane turns through a textured layer of constant depth: the one
// nearer the camera shows on each side of the crossing, through one draft buffer.
TYPED_TEST(ImageSpan, ImageLayersSortAgainstTexturedLayersByDepth) {
    using P = TypeParam;
    SetPlane(&this->geometry_, 1, 0.125, false);
    SY_ScreenGeometry wall;
    auto grey = FilledWorld<P>(kWidth, kHeight, Opaque<P>(128, 128, 128));
    wall.textureFetcher = &this->fetcher_;
    wall.texture = grey.get();
    SetPlane(&wall, 2.0625, 0, false);
    SY_LayerShader shader;
    auto buffer =
        SY_MBuffer::New({0, 0, kWidth, kHeight}, PF_PixelTraits<P>::kBitDepth, false, false);
    SY_RenderTarget target(*buffer);
    SY_RenderLayerSpan_SwitchDepth(wall, &shader, nullptr, 0, kWidth, 6, nullptr, target, 0);
    this->Draw(SY_RenderTarget(*buffer), 0, kWidth, 6);
    PF_WorldX<P> destination(kWidth, kHeight);
    ostrel_test::RecordingProgress progress;
    buffer->Resolve(&progress, nullptr, destination);
    // The image plane's key 1 + (x − 1)/8 passes the wall's 2.0625 between x = 9 and x = 10.
    for (int32_t x = 0; x < kWidth; ++x) {
        P expected = x >= 10 ? PatternTexel<P>(x, 6) : Opaque<P>(128, 128, 128);
        EXPECT_TRUE(Equal(destination.At(x, 6), expected)) << x;
    }
}

}  // namespace
