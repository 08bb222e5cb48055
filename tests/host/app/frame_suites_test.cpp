#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <tuple>

#include "qngp_suites.h"
#include "served_frame.h"
#include "suites/suite_registry.h"
#include "u_memory.h"
#include "world_pixels.h"

namespace ostrel {
namespace {

// Top to bottom: an unbounded white veil that serves as the card's matte, the card, and an
// unbounded wall behind it.
const std::string kBackdrop = R"(
  {"name": "veil", "kind": "solid", "threeD": true,
   "source": {"color": "#ffffff", "unbounded": true}},
  {"name": "card", "kind": "solid", "threeD": true, "trackMatte": "alpha",
   "source": {"color": "#ff0000", "width": 65, "height": 33}},
  {"name": "wall", "kind": "solid", "threeD": true,
   "source": {"color": "#336699", "unbounded": true}}
)";

// Frames of one run share each layer's texture, made once.
TEST(CanvasSuite, TexturesAreSharedAcrossTheFramesOfARun) {
    int64_t startBytes = U_AccountedBytes();
    {
        HostSuites suites;
        Composition comp = ParseComposition(CompJson("", kBackdrop), "test.json");
        ImageCache images;
        // Both frames hold the texture at once: without sharing they would hold two worlds.
        FrameSession first(comp, images, {}, 0), second(comp, images, {}, 1);
        PF_World* textures[2] = {};
        FrameSession* sessions[2] = {&first, &second};
        for (int32_t frame = 0; frame < 2; ++frame) {
            QNGP_RenderContextH render = sessions[frame]->RenderContext();
            QNGP_LayerContextH card = nullptr;
            M_Matrix3 source{};
            ASSERT_EQ(CanvasSuite()->GetNthLayerContext(render, 0, &card), 0);
            ASSERT_EQ(CanvasSuite()->RenderTexture(render, card, 1, nullptr, nullptr, &source,
                                                   &textures[frame]),
                      0);
        }
        EXPECT_EQ(textures[1], textures[0]);
    }
    EXPECT_EQ(U_AccountedBytes(), startBytes);
}

TEST(CanvasSuite, UnboundedLayersComeInOutputCoordinates) {
    using Size = std::tuple<int32_t, int32_t>;
    struct Case {
        int16_t bitDepth, dx, dy;
        std::optional<M_LRect> region;
        Size output, texture;  // the texture: the comp at the downsample
        Size card;             // the 65 × 33 card: rounded up
        Channels wall;         // #336699, opaque
    };
    const M_LRect kRegion{100, 50, 401, 250};
    // At full size and 8 bits the wall is the backdrop example's, in its references.
    const Case kCases[] = {
        // At 2 × 3; trunc(c × 32768 + 0.5) of 0.2, 0.4 and 0.6.
        {16, 2, 3, {}, {480, 180}, {480, 180}, {33, 11}, {32768, 6554, 13107, 19661}},
        // The 301 × 200 region at half size: ceil(301 / 2) × 100.
        {32, 2, 2, kRegion, {151, 100}, {480, 270}, {33, 17}, {1, .2f, .4f, .6f}},
    };
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.bitDepth);
        int64_t startBytes = U_AccountedBytes();
        {
            RenderSettings settings;
            settings.bitDepth = c.bitDepth;
            settings.downsampleX = c.dx;
            settings.downsampleY = c.dy;
            settings.region = c.region;
            ServedFrame frame(CompJson("", kBackdrop), 0, settings);
            QNGP_RenderContextH render = frame.Render();
            QNGP_LayerContextH wall = nullptr, card = nullptr, veil = nullptr;
            ASSERT_EQ(canvas.GetNthLayerContext(render, 1, &wall), 0);
            PF_World* world = nullptr;
            ASSERT_EQ(
                canvas.RenderLayer(render, frame.Layer(2), wall, kQNGP_RenderWholeLayer, &world),
                0);
            EXPECT_EQ(Size(world->width, world->height), c.output);
            EXPECT_EQ(PixelsOtherThan(*world, c.wall), 0);
            EXPECT_EQ(canvas.DisposeTexture(render, wall, world), 0);

            // Textures (which frames do not ask for) cover the source rectangle.
            M_Matrix3 source{};
            ASSERT_EQ(canvas.RenderTexture(render, wall, 1, nullptr, nullptr, &source, &world), 0);
            EXPECT_EQ(Size(world->width, world->height), c.texture);
            EXPECT_EQ(canvas.DisposeTexture(render, wall, world), 0);

            // The veil as the card's matte: output-sized, white and opaque everywhere.
            ASSERT_EQ(canvas.GetNthLayerContext(render, 0, &card), 0);
            ASSERT_EQ(canvas.GetTrackMatteContext(render, card, &veil), 0);
            ASSERT_EQ(canvas.RenderLayer(render, frame.Layer(0), veil, kQNGP_RenderMatte, &world),
                      0);
            std::unique_ptr<PF_World> matte(world);
            EXPECT_EQ(Size(matte->width, matte->height), c.output);
            double max = c.wall[0];
            EXPECT_EQ(PixelsOtherThan(*matte, {max, max, max, max}), 0);
            EXPECT_EQ(canvas.RenderLayer(render, frame.Layer(0), veil, 7, &world),
                      kQNGP_ErrBadArgument);
            EXPECT_EQ(canvas.DisposeTexture(render, wall, matte.get()), kQNGP_ErrBadHandle);
            ASSERT_EQ(canvas.RenderTexture(render, card, 1, nullptr, nullptr, &source, &world), 0);
            EXPECT_EQ(Size(world->width, world->height), c.card);
            EXPECT_EQ(canvas.DisposeTexture(render, card, world), 0);
            // A texture left out: the session takes it back when it ends.
            ASSERT_EQ(canvas.RenderTexture(render, wall, 1, nullptr, nullptr, &source, &world), 0);
        }
        EXPECT_EQ(U_AccountedBytes(), startBytes);
    }
}

TEST(CanvasSuite, LowerFieldFirstRendersOddRowsThenEvenRowsHalfAFrameLater) {
    RenderSettings settings;
    settings.fields = RenderSettings::Fields::kLowerFirst;
    ServedFrame frame(CompJson("", kBackdrop), 24, settings);
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    QNGP_RenderContextH render = frame.Render();
    ASSERT_EQ(frame.Session().PassCount(), 2);
    const std::tuple<int32_t, double> kPasses[] = {{2, 1.0}, {1, 1.0 + 1.0 / 48}};
    for (int32_t pass = 0; pass < 2; ++pass) {
        frame.Session().BeginPass(pass);
        int32_t fieldMode = 0;
        T_Time time{}, step{};
        ASSERT_EQ(canvas.GetFieldRender(render, &fieldMode), 0);
        ASSERT_EQ(canvas.GetRenderTime(render, &time, &step), 0);
        EXPECT_EQ(std::tuple(fieldMode, T_Seconds(time)), kPasses[pass]);
    }
}

TEST(CanvasSuite, ProgressAnswersTheUsersCancel) {
    struct Cancelling : FrameProgress {
        bool Renderables(int32_t done, int32_t) override { return done < 2; }
        bool Rows(int32_t, int32_t) override { return true; }
    } progress;
    ServedFrame frame(CompJson("", kBackdrop));
    const QNGP_CanvasSuite13& canvas = *CanvasSuite();
    frame.Session().SetProgress(&progress);
    EXPECT_EQ(canvas.ReportRenderProgress(frame.Render(), 1, 3), 0);
    EXPECT_EQ(canvas.ReportRenderProgress(frame.Render(), 2, 3), kQNGP_ErrUserCancel);
}

}  // namespace
}  // namespace ostrel
