#include "renderer/scene/depth_grouping.h"

#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <deque>
#include <vector>

#include "tests/renderer/renderer_test_support.h"

namespace {

using namespace renderer_test;

struct Point {
    double x, y;
};

// A renderable with one subsample: a screen polygon on the plane of depth kx·x + ky·y + k0.
SY_TRLayer Flat(const std::vector<Point>& polygon, double kx, double ky, double k0,
                int32_t renderIndex = 0) {
    SY_LayerDesc layer;
    layer.material.renderIndex = renderIndex;
    SY_TRLayer r(layer);
    r.subsamples.Allocate(1);
    SY_Subsample& s = r.subsamples[0];
    const double plane[4] = {kx, ky, -1, k0}, length = std::sqrt(kx * kx + ky * ky + 1);
    for (int i = 0; i < 4; ++i)
        s.plane[i] = plane[i] / length;
    for (const Point& p : polygon) {
        double z = kx * p.x + ky * p.y + k0;
        s.vertices.push_back({p.x, p.y, z, 1});
        r.bounds[0] = std::min(r.bounds[0], p.x);
        r.bounds[1] = std::min(r.bounds[1], p.y);
        r.bounds[2] = std::max(r.bounds[2], p.x);
        r.bounds[3] = std::max(r.bounds[3], p.y);
        r.bounds[4] = std::min(r.bounds[4], z);
        r.bounds[5] = std::max(r.bounds[5], z);
    }
    r.firstValid = r.lastValid = 0;
    return r;
}

std::vector<Point> Square(double left, double top, double size) {
    return {{left, top}, {left + size, top}, {left + size, top + size}, {left, top + size}};
}

TEST(DepthRelation, SamplesWherePolygonsMeet) {
    using Plane = std::array<double, 3>;  // depth kx·x + ky·y + k0
    struct Case {
        const char* name;
        std::vector<Point> a;
        Plane az;
        std::vector<Point> b;
        Plane bz;
        SY_DepthSense sense;
        bool aFirst, bFirst;
    };
    const auto nearer = SY_DepthSense::kLargerIsNearer;
    const auto farther = SY_DepthSense::kLargerIsFarther;
    const auto s0 = Square(0, 0, 10), s5 = Square(5, 5, 10), s40 = Square(40, 40, 10);
    const auto big = Square(0, 0, 100);
    const std::vector<Point> upper{{0, 0}, {10, 0}, {0, 10}}, lower{{10, 0}, {10, 10}, {0, 10}};
    const Case cases[] = {
        {"A behind B", s0, {0, 0, 1}, s5, {0, 0, 2}, nearer, true, false},
        {"boxes only touch", s0, {0, 0, 1}, Square(10, 0, 10), {0, 0, 2}, nearer, false, false},
        {"crossing in depth", big, {0.01, 0, 0}, big, {0, 0, 0.5}, nearer, true, true},
        {"level", s0, {0, 0, 1}, s5, {0, 0, 1}, nearer, true, true},
        {"coplanar, B a step behind", s0, {0, 0, 1}, s5, {0, 0, 1 - 1e-7}, nearer, false, true},
        {"B inside A, no edges meet", big, {0, 0, 1}, s40, {0, 0, 2}, nearer, true, false},
        {"triangles sharing a diagonal", upper, {0, 0, 1}, lower, {0, 0, 2}, nearer, true, false},
        // Orthographic depths are eye depths: A at 500 is behind B at 300.
        {"orthographic, A behind B", s0, {0, 0, 500}, s5, {0, 0, 300}, farther, true, false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        SY_TRLayer a = Flat(c.a, c.az[0], c.az[1], c.az[2]);
        SY_TRLayer b = Flat(c.b, c.bz[0], c.bz[1], c.bz[2]);
        SY_DrawOrder order = SY_RelateRenderables(a, b, c.sense);
        EXPECT_EQ(order.aFirst, c.aFirst);
        EXPECT_EQ(order.bFirst, c.bFirst);
    }
}

using Groups = std::vector<std::vector<int32_t>>;

// The render indices of each group the renderables are cut into, in drawing order.
Groups Group(std::deque<SY_TRLayer>& renderables) {
    std::vector<SY_TRLayer*> list;
    for (SY_TRLayer& r : renderables)
        list.push_back(&r);
    SY_RenderableGroups groups;
    SY_GroupByDepth(list.data(), static_cast<int32_t>(list.size()), SY_DepthSense::kLargerIsNearer,
                    &groups);
    Groups result;
    for (const SY_RenderableGroup& group : groups) {
        result.emplace_back();
        for (const SY_TRLayer* r : group)
            result.back().push_back(r->material.renderIndex);
    }
    return result;
}

TEST(DepthGroupingCut, CycleOfThreeFormsOneGroup) {
    // A: top strip, depth rising to the right (up to 1); B: right strip at depth 1.1; C: diagonal
    // strip from the top-left corner (depth −0.5) to the bottom-right one (1.5). A is behind B at
    // the top right, B behind C at the bottom right, C behind A at the top left.
    std::deque<SY_TRLayer> renderables;
    renderables.push_back(Flat({{0, 0}, {100, 0}, {100, 10}, {0, 10}}, 0.01, 0, 0, 0));
    renderables.push_back(Flat({{90, 0}, {100, 0}, {100, 100}, {90, 100}}, 0, 0, 1.1, 1));
    renderables.push_back(
        Flat({{0, 0}, {10, 0}, {100, 90}, {100, 100}, {90, 100}, {0, 10}}, 0.01, 0.01, -0.5, 2));
    EXPECT_EQ(Group(renderables), (Groups{{0, 2, 1}}));
}

TEST(DepthGroupingCut, SeparateCardsBehindOneComeOutInRenderOrder) {
    // A wide card in front of 1 (on the right) and 2 (on the left), which do not meet: both go
    // before it, 1 first because it comes first in render order, wherever it lies on screen.
    std::deque<SY_TRLayer> renderables;
    renderables.push_back(Flat(Square(0, 0, 100), 0, 0, 5, 0));
    renderables.push_back(Flat(Square(60, 10, 20), 0, 0, 1, 1));
    renderables.push_back(Flat(Square(10, 10, 20), 0, 0, 1, 2));
    EXPECT_EQ(Group(renderables), (Groups{{1}, {2}, {0}}));
}

TEST(DepthGroupingCut, LongChainNeedsNoDeepRecursion) {
    // Every renderable lies behind the one before it and overlaps only its neighbours: the walk
    // goes 3000 deep and the groups come out back to front.
    constexpr int32_t kCount = 3000;
    std::deque<SY_TRLayer> renderables;
    Groups expected;
    for (int32_t i = 0; i < kCount; ++i) {
        renderables.push_back(Flat(Square(i, 0, 2), 0, 0, -i, i));
        expected.push_back({kCount - 1 - i});
    }
    EXPECT_EQ(Group(renderables), expected);
}

}  // namespace
