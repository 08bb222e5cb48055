#include <gtest/gtest.h>

#include <functional>

#include "raster_test_support.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/raster/image_span.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_render.h"
#include "renderer/scene/screen_geometry.h"

namespace {

using raster_test::Code;
using raster_test::Equal;
using raster_test::IsClear;
using raster_test::Opaque;
using raster_test::PatternTexel;
using raster_test::PatternTexture;

template <class P>
class SpanDispatch : public ::testing::Test {
protected:
    // An orthographic layer whose texel (i, j) lies under output pixel (i, j).
    SpanDispatch() : texture_(PatternTexture<P>(16, 8)) {
        geometry_.textureFetcher = &fetcher_;
        geometry_.texture = texture_.get();
        geometry_.screenToTexture.Allocate(1);
        M_Matrix3& m = geometry_.screenToTexture[0];
        m.mat[0][0] = m.mat[1][1] = m.mat[2][2] = 1;
        geometry_.firstValid = geometry_.lastValid = 0;
        geometry_.perspective = false;
    }

    void Draw(PF_World* target, int32_t x, int32_t count, int32_t y) {
        SY_RenderLayerSpan_SwitchDepth(geometry_, &shader_, nullptr, x, count, y, nullptr,
                                       SY_RenderTarget(*target), 0);
    }

    ostrel_test::MemoryTextureFetcher fetcher_;
    std::unique_ptr<PF_WorldX<P>> texture_;
    SY_ScreenGeometry geometry_;
    SY_LayerShader shader_;
};

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;
TYPED_TEST_SUITE(SpanDispatch, PixelTypes);

// Pixels drawn by a span of row y from x: exactly those.
template <class P>
void ExpectOnly(const PF_WorldX<P>& world, int32_t x, int32_t count, int32_t y) {
    for (int32_t j = 0; j < world.height; ++j) {
        for (int32_t i = 0; i < world.width; ++i) {
            bool drawn = j == y && i >= x && i < x + count;
            if (drawn)
                EXPECT_TRUE(Equal(world.At(i, j), PatternTexel<P>(i, j))) << i << "," << j;
            else
                EXPECT_TRUE(IsClear(world.At(i, j))) << i << "," << j;
        }
    }
}

TYPED_TEST(SpanDispatch, SpansOfEveryLengthDrawExactlyTheirPixels) {
    using P = TypeParam;
    struct Case {
        int32_t x, count;
    };
    // Nothing, nothing, the single-pixel tail only, a pair, pairs and a tail.
    const Case cases[] = {{3, 0}, {3, -2}, {5, 1}, {5, 2}, {2, 7}};
    for (const Case& c : cases) {
        PF_WorldX<P> destination(16, 8);
        this->Draw(&destination, c.x, c.count, 2);
        ExpectOnly(destination, c.x, std::max(c.count, 0), 2);
    }
}

TYPED_TEST(SpanDispatch, StoreTargetWritesAtTheImageOrigin) {
    using P = TypeParam;
    PF_WorldX<P> image(10, 4);
    SY_SpanImageRecord record{&image, 3, 1};
    SY_RenderTarget target(record);
    EXPECT_EQ(target.mode(), kSY_TargetDepthOfField);
    SY_RenderLayerSpan_SwitchDepth(this->geometry_, &this->shader_, nullptr, 4, 5, 2, nullptr,
                                   target, 0);
    for (int32_t i = 0; i < 10; ++i) {
        bool drawn = i >= 1 && i < 6;
        EXPECT_EQ(drawn, Equal(image.At(i, 1), PatternTexel<P>(i + 3, 2))) << i;
    }
    EXPECT_TRUE(IsClear(image.At(1, 0)));
}

TYPED_TEST(SpanDispatch, ShadowArraysReceiveNothingFromLayerSpans) {
    SY_ShadowFragmentArray occluders({0, 0, 16, 8});
    SY_RenderTarget target(occluders);
    EXPECT_EQ(target.mode(), kSY_TargetShadowArray);
    SY_RenderLayerSpan_SwitchDepth(this->geometry_, &this->shader_, nullptr, 0, 16, 1, nullptr,
                                   target, 0);
    EXPECT_EQ(occluders.fragmentCount, 0u);
}

// Fragments of a span resolve to what compositing the span straight gives.
TYPED_TEST(SpanDispatch, FragmentsResolveToTheDirectComposite) {
    using P = TypeParam;
    int64_t start = U_AccountedBytes();
    {
        PF_WorldX<P> direct(16, 8), resolved(16, 8);
        this->Draw(&direct, 2, 9, 3);
        std::unique_ptr<SY_MBuffer> buffer =
            SY_MBuffer::New({0, 0, 16, 8}, PF_PixelTraits<P>::kBitDepth, false, false);
        SY_RenderTarget target(*buffer);
        SY_RenderLayerSpan_SwitchDepth(this->geometry_, &this->shader_, nullptr, 2, 9, 3, nullptr,
                                       target, 0);
        ostrel_test::RecordingProgress progress;
        buffer->Resolve(&progress, nullptr, resolved);
        for (int32_t y = 0; y < 8; ++y) {
            for (int32_t x = 0; x < 16; ++x)
                EXPECT_TRUE(Equal(direct.At(x, y), resolved.At(x, y))) << x << "," << y;
        }
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

// Ambient light of half strength halves every colour channel: c·½ + ½, truncated for integer
// channels; the shadows-only layer lights the channel maximum instead of the texel's colour.
TYPED_TEST(SpanDispatch, ShadingScalesTexelsByTheLightingTerms) {
    using P = TypeParam;
    using Traits = PF_PixelTraits<P>;
    SY_LightState ambient;
    ambient.type = kSY_LightAmbient;
    ambient.color[1] = ambient.color[2] = ambient.color[3] = 0.5;
    this->shader_.lights.Allocate(1);
    this->shader_.lights[0] = &ambient;
    this->shader_.material.ambient = 1;
    this->shader_.material.acceptsLights = 1;
    this->shader_.shaded = 1;
    auto half = [](auto c) {
        double v = c * 0.5;
        return Traits::kIsFloat ? v : std::floor(v + 0.5);
    };
    for (uint8_t acceptsShadows : {0, 2}) {
        this->shader_.material.acceptsShadows = acceptsShadows;
        PF_WorldX<P> destination(16, 8);
        this->Draw(&destination, 1, 3, 4);  // a pair and the tail
        for (int32_t i = 1; i < 4; ++i) {
            P texel = PatternTexel<P>(i, 4);
            if (acceptsShadows == 2) texel = Opaque<P>(255, 255, 255);
            const P& got = destination.At(i, 4);
            EXPECT_EQ(got.alpha, texel.alpha);
            EXPECT_FLOAT_EQ(got.red, half(texel.red)) << i;
            EXPECT_FLOAT_EQ(got.green, half(texel.green)) << i;
            EXPECT_FLOAT_EQ(got.blue, half(texel.blue)) << i;
        }
    }
}

// Both span dispatchers refuse a texture whose depth differs from the target's.
TEST(SpanDispatchDepth, TextureOfAnotherDepthIsReportedAndThrowsThree) {
    ostrel_test::MemoryTextureFetcher fetcher;
    PF_WorldX<PF_Pixel8> texture(4, 4);
    SY_ScreenGeometry geometry;
    geometry.textureFetcher = &fetcher;
    geometry.texture = &texture;
    geometry.screenToTexture.Allocate(1);
    SY_LayerShader shader;
    PF_WorldX<PF_Pixel16> destination(4, 4);
    SY_RenderTarget target(destination);
    struct Case {
        const char* message;
        std::function<void()> draw;
    };
    const Case cases[] = {
        {"Unexpected bitdepth in SY_RenderLayerSpan_SwitchDepth()",
         [&] {
             SY_RenderLayerSpan_SwitchDepth(geometry, &shader, nullptr, 0, 4, 0, nullptr, target,
                                            0);
         }},
        {"Unexpected bitdepth in SY_RenderLayerSpanFromImage_SwitchDepth()",
         [&] {
             SY_RenderLayerSpanFromImage_SwitchDepth({}, geometry, nullptr, 0, 4, 0, nullptr,
                                                     target, 0);
         }},
    };
    for (const Case& c : cases) {
        ostrel_test::ReportCapture capture;
        int32_t thrown = 0;
        try {
            c.draw();
        } catch (int32_t code) {
            thrown = code;
        }
        EXPECT_EQ(thrown, 3) << c.message;
        ASSERT_EQ(ostrel_test::ReportCapture::reports().size(), 1u) << c.message;
        EXPECT_EQ(ostrel_test::ReportCapture::reports()[0].text, c.message);
    }
}

}  // namespace
