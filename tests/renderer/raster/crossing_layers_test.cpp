#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "raster_test_support.h"

namespace {

using raster_test::Equal;
using raster_test::FilledWorld;
using raster_test::Frame;
using raster_test::Opaque;
using renderer_test::SetRect;
using renderer_test::Translation;

template <class P>
class CrossingLayers : public ::testing::Test {};
TYPED_TEST_SUITE(CrossingLayers, renderer_test::PixelTypes);

// A title card at 50 % lying on a background card (one plane 300 nearer than the plane seen
// 1:1, the title first in render order, keys equal in a float) and a third card, flat far
// behind them on one frame and on the next crossing both along the column x = 32. In the
// columns from 34 on, where the third card stays behind, nothing changes from one frame to the
// next: the title stays on top, and at best quality blends in linear light in the fragment
// buffer as it did drawn straight. The title covers 2 × 4 pixels there, 14 × 16 under
// perspective.
TYPED_TEST(CrossingLayers, NothingChangesBesideAnIntersectionThatStarts) {
    using P = TypeParam;
    constexpr int32_t kWidth = 64, kHeight = 48, kFrom = 34;
    PF_LinearBlendingTables gamma;
    PF_BuildLinearBlendingTablesGamma(2.2f, &gamma);
    auto title = FilledWorld<P>(8, 4, Opaque<P>(255, 0, 0));
    auto card = FilledWorld<P>(16, 12, Opaque<P>(255, 255, 255));
    auto third = FilledWorld<P>(10, 12, Opaque<P>(0, 0, 255));
    for (bool perspective : {true, false}) {
        for (bool best : {false, true}) {
            PF_WorldX<P> before(kWidth, kHeight), during(kWidth, kHeight);
            for (PF_WorldX<P>* world : {&before, &during}) {
                raster_test::Frame frame(kWidth, kHeight, 3);
                renderer_test::SetDefaultCamera(&frame.scene, kWidth, kHeight,
                                                raster_test::kDistance, 1, perspective);
                frame.scene.colorSettings = best ? &gamma : nullptr;
                frame.Layer(0, title.get(), Translation(28, 22, -300)).material.opacity = 0.5;
                frame.Layer(1, card.get(), Translation(24, 18, -300));
                const bool crossing = world == &during;
                frame.Layer(2, third.get(),
                            renderer_test::Turned(5, 6, 0, crossing ? -0.6 : 0, 32, 24,
                                                  crossing ? -300 : -280));
                for (int32_t i = 0; i < 3; ++i)
                    frame.scene.layers[i].material.bestQuality = best;
                frame.Render(world);
            }
            int32_t titled = 0, changed = 0;
            for (int32_t y = 0; y < kHeight; ++y) {
                for (int32_t x = kFrom; x < kWidth; ++x) {
                    const P& p = before.At(x, y);
                    changed += !raster_test::Equal(p, during.At(x, y));
                    titled += p.alpha != 0 && p.green != card->At(0, 0).green;
                }
            }
            EXPECT_EQ(changed, 0) << "perspective " << perspective << " best " << best;
            EXPECT_EQ(titled, perspective ? 14 * 16 : 2 * 4);
        }
    }
}

// Two opaque cards, red and blue, turned about their centres, which both sit at the world point
// C, seen by cameras that look at C from distance D and turned positions, C's image off the
// pixel grid. Each pixel is checked against a ray cast: a draft pixel shows the card that the
// ray through its centre meets first (unless the centre lies within 0.02 of the crossing), and
// a best-quality pixel mixes the two by the share of 16 × 16 sample rays that meet blue first,
// within 2 codes on average over the pixels the crossing cuts and 8 at worst. The last card is
// a strip 10 wide; pixels reaching past a card's edge are skipped.
TEST(CrossingLayers, EachPixelShowsTheCardInFrontWhereItsRaysMeetThem) {
    constexpr int32_t kWidth = 160, kHeight = 40, kSize = 600;
    constexpr double kC[3] = {300, 200, 100}, kD = 400, kCx = 80.3, kCy = 20.4;
    const double turns[][4] = {{0, 0.5, 0, -0.5}, {0.4, 0.3, -0.3, -0.4}, {0.2, 0.9, 0.1, 0.2}};
    const struct {
        bool perspective;
        double rx, ry, rz;
    } views[] = {{true, 0, 0, 0},
                 {false, 0, 0, 0},
                 {true, 0.35, -0.5, 0},
                 {true, -0.3, 0.4, 0.3},
                 {false, 0.3, 0.5, 0}};
    const auto red = FilledWorld<PF_Pixel8>(kSize, kSize, Opaque<PF_Pixel8>(255, 0, 0));
    const auto blue = FilledWorld<PF_Pixel8>(kSize, kSize, Opaque<PF_Pixel8>(0, 0, 255));
    int32_t cut = 0;
    double worst = 0, sum = 0;
    for (int32_t c = 0; c < 4; ++c) {
        const double* turn = turns[c % 3];
        const int32_t widths[2] = {kSize, c < 3 ? kSize : 10};
        for (const auto& v : views) {
            M_Matrix4 camera = Translation(0, 0, -kD), projection = renderer_test::Identity();
            M_RotateMatrix4XYZ(v.rx, v.ry, v.rz, &camera);
            M_TranslateMatrix4(kC[0], kC[1], kC[2], &camera);
            if (v.perspective) projection.Project(kD);
            M_TranslateMatrix4(kCx, kCy, 0, &projection);
            M_Matrix4 cards[2], eyeToCard[2];
            for (int32_t k = 0; k < 2; ++k) {
                cards[k] = renderer_test::Turned(widths[k] / 2, kSize / 2, turn[2 * k],
                                                 turn[2 * k + 1], kC[0], kC[1], kC[2]);
                M_Matrix4 inverse;
                M_InverseMatrix4(&cards[k], &inverse);
                M_ConcatMatrix4(&camera, &inverse, &eyeToCard[k]);
            }
            // How far the ray of screen point (sx, sy) runs to card k; NaN past its edges.
            auto distance = [&](int32_t k, double sx, double sy) {
                const double x = sx - kCx, y = sy - kCy, p = v.perspective;
                const double from[4] = {x * !p, y * !p, 0, 1},
                             to[4] = {x * p / kD, y * p / kD, 1, 0};
                double o[3] = {0, 0, 0}, d[3] = {0, 0, 0};
                for (int32_t i = 0; i < 3; ++i) {
                    for (int32_t j = 0; j < 4; ++j) {
                        o[i] += from[j] * eyeToCard[k].mat[j][i];
                        d[i] += to[j] * eyeToCard[k].mat[j][i];
                    }
                }
                const double t = -o[2] / d[2], u = o[0] + t * d[0], w = o[1] + t * d[1];
                return u > 0 && u < widths[k] && w > 0 && w < kSize ? t : std::nan("");
            };
            auto blueLeads = [&](double sx, double sy) {  // > 0 where blue is in front
                return distance(0, sx, sy) - distance(1, sx, sy);
            };
            for (int32_t run = 0; run < 4; ++run) {
                const bool best = run & 1, blueFirst = run & 2;
                Frame frame(kWidth, kHeight, 2);
                frame.scene.cameraPlacements[0] = frame.scene.framePlacement = camera;
                frame.scene.cameraProjections[0] = frame.scene.frameProjection = projection;
                frame.scene.perspective = v.perspective;
                for (int32_t k = 0; k < 2; ++k) {
                    SY_LayerDesc& layer =
                        frame.Layer(k == blueFirst, (k ? blue : red).get(), cards[k]);
                    layer.material.bestQuality = best;
                    SetRect(&layer, 0, 0, widths[k], kSize);
                }
                PF_WorldX<PF_Pixel8> image(kWidth, kHeight);
                frame.Render(&image);
                int32_t wrong = 0;
                for (int32_t i = 0; i < kWidth * kHeight; ++i) {
                    const int32_t x = i % kWidth, y = i / kWidth;
                    const double lead[4] = {blueLeads(x, y), blueLeads(x + 1, y),
                                            blueLeads(x, y + 1), blueLeads(x + 1, y + 1)};
                    if (std::isnan(lead[0] + lead[1] + lead[2] + lead[3])) continue;
                    const auto [low, high] = std::minmax({lead[0], lead[1], lead[2], lead[3]});
                    const bool crossed = low < 0 && high > 0;
                    // Of the sample rays, those that meet blue first.
                    int32_t shown = best && !crossed && low > 0 ? 256 : 0;
                    for (int32_t s = 0; s < (!best ? 4 : crossed ? 256 : 0); ++s) {
                        const double a = best ? (s % 16 + 0.5) / 16 : 0.48 + s % 2 * 0.04;
                        const double b = best ? (s / 16 + 0.5) / 16 : 0.48 + s / 2 * 0.04;
                        shown += blueLeads(x + a, y + b) > 0;
                    }
                    const PF_Pixel8& got = image.At(x, y);
                    if (!best && shown % 4 == 0)
                        wrong += !Equal(got, (shown ? blue : red)->At(0, 0));
                    const double error = std::fabs(got.blue - 255.0 * shown / 256);
                    worst = best ? std::max(worst, error) : worst;
                    cut += best && crossed;
                    sum += best && crossed ? error : 0;
                }
                EXPECT_EQ(wrong, 0) << "crossing " << c << " view " << &v - views << " run " << run;
            }
        }
    }
    EXPECT_LE(sum, 2 * cut) << "mean " << sum / cut;
    EXPECT_LE(worst, 8);
}

}  // namespace
