#include "renderer/scene/depth_grouping.h"

#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <deque>
#include <vector>

#include "tests/renderer/scene/scene_fixtures.h"
#include "u_memory.h"

namespace {

using namespace scene_test;

struct Point {
    double x, y;
};

// A renderable with one subsample: a screen polygon on the plane of depth kx·x + ky·y + k0.
SY_TRLayer Flat(const std::vector<Point>& polygon, double kx, double ky, double k0,
                int32_t renderIndex = 0) {
    SY_LayerDesc layer;
    layer.renderIndex = renderIndex;
    SY_TRLayer r(layer);
    r.subsamples.Allocate(1);
    SY_Subsample& s = r.subsamples[0];
    double length = std::sqrt(kx * kx + ky * ky + 1);
    s.plane[0] = kx / length;
    s.plane[1] = ky / length;
    s.plane[2] = -1 / length;
    s.plane[3] = k0 / length;
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
        {"B behind A", s0, {0, 0, 2}, s5, {0, 0, 1}, nearer, false, true},
        {"boxes only touch", s0, {0, 0, 1}, Square(10, 0, 10), {0, 0, 2}, nearer, false, false},
        {"apart", s0, {0, 0, 1}, Square(30, 30, 10), {0, 0, 2}, nearer, false, false},
        {"crossing in depth", big, {0.01, 0, 0}, big, {0, 0, 0.5}, nearer, true, true},
        {"level", s0, {0, 0, 1}, s5, {0, 0, 1}, nearer, true, true},
        {"level within 1e-12", s0, {0, 0, 1}, s5, {0, 0, 1 + 1e-13}, nearer, true, true},
        {"coplanar, B a step behind", s0, {0, 0, 1}, s5, {0, 0, 1 - 1e-7}, nearer, false, true},
        {"B inside A, no edges meet", big, {0, 0, 1}, s40, {0, 0, 2}, nearer, true, false},
        {"A inside B, no edges meet", s40, {0, 0, 1}, big, {0, 0, 2}, nearer, true, false},
        {"triangles sharing a diagonal", upper, {0, 0, 1}, lower, {0, 0, 2}, nearer, true, false},
        // Orthographic depths are eye depths: A at 500 is behind B at 300.
        {"orthographic, A behind B", s0, {0, 0, 500}, s5, {0, 0, 300}, farther, true, false},
        {"orthographic, B behind A", s0, {0, 0, 300}, s5, {0, 0, 500}, farther, false, true},
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

// Render indices of each group, in drawing order.
std::vector<std::vector<int32_t>> Indices(const SY_RenderableGroups& groups) {
    std::vector<std::vector<int32_t>> result;
    for (const SY_RenderableGroup& group : groups) {
        result.emplace_back();
        for (const SY_TRLayer* r : group)
            result.back().push_back(r->material.renderIndex);
    }
    return result;
}

using Groups = std::vector<std::vector<int32_t>>;

Groups Group(std::deque<SY_TRLayer>& renderables, SY_DepthSense sense) {
    std::vector<SY_TRLayer*> list;
    for (SY_TRLayer& r : renderables)
        list.push_back(&r);
    SY_RenderableGroups groups;
    SY_GroupByDepth(list.data(), static_cast<int32_t>(list.size()), sense, &groups);
    return Indices(groups);
}

// A: top strip, depth rising to the right (up to 1); B: right strip at depth 1.1; C: diagonal
// strip from the top-left corner (depth −0.5) to the bottom-right one (1.5). A is behind B at the
// top right, B behind C at the bottom right, C behind A at the top left.
std::deque<SY_TRLayer> CycleOfThree() {
    std::deque<SY_TRLayer> renderables;
    renderables.push_back(Flat({{0, 0}, {100, 0}, {100, 10}, {0, 10}}, 0.01, 0, 0, 0));
    renderables.push_back(Flat({{90, 0}, {100, 0}, {100, 100}, {90, 100}}, 0, 0, 1.1, 1));
    renderables.push_back(
        Flat({{0, 0}, {10, 0}, {100, 90}, {100, 100}, {90, 100}, {0, 10}}, 0.01, 0.01, -0.5, 2));
    return renderables;
}

TEST(DepthGroupingCut, CycleOfThreeFormsOneGroup) {
    std::deque<SY_TRLayer> renderables = CycleOfThree();
    const auto sense = SY_DepthSense::kLargerIsNearer;
    SY_DrawOrder ab = SY_RelateRenderables(renderables[0], renderables[1], sense);
    SY_DrawOrder bc = SY_RelateRenderables(renderables[1], renderables[2], sense);
    SY_DrawOrder ca = SY_RelateRenderables(renderables[2], renderables[0], sense);
    EXPECT_TRUE(ab.aFirst && !ab.bFirst);
    EXPECT_TRUE(bc.aFirst && !bc.bFirst);
    EXPECT_TRUE(ca.aFirst && !ca.bFirst);
    Groups groups = Group(renderables, sense);
    ASSERT_EQ(groups.size(), 1u);
    EXPECT_EQ(groups[0], (std::vector<int32_t>{0, 2, 1}));
}

TEST(DepthGroupingCut, LongChainNeedsNoDeepRecursion) {
    // Every renderable lies behind the one before it and overlaps only its neighbours: the walk
    // goes 3000 deep and the groups come out back to front.
    constexpr int32_t kCount = 3000;
    std::deque<SY_TRLayer> renderables;
    for (int32_t i = 0; i < kCount; ++i) {
        renderables.push_back(Flat(Square(i, 0, 2), 0, 0, -i, i));
    }
    Groups groups = Group(renderables, SY_DepthSense::kLargerIsNearer);
    ASSERT_EQ(groups.size(), static_cast<size_t>(kCount));
    for (int32_t i = 0; i < kCount; ++i) {
        EXPECT_EQ(groups[static_cast<size_t>(i)], (std::vector<int32_t>{kCount - 1 - i}));
    }
}

}  // namespace
