// Depth grouping: which renderables must be drawn before which where they overlap on screen,
// and the cut of that relation into groups that can be drawn one after another. A group of one
// is drawn straight; a larger group (renderables that cross or occlude each other in a cycle)
// needs a fragment buffer.
#pragma once

#include <cstdint>

#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/renderable.h"

// Which way screen depth grows. A perspective projection gives zoom / eye depth (larger is
// nearer); an orthographic one keeps the eye depth (larger is farther).
enum class SY_DepthSense { kLargerIsNearer, kLargerIsFarther };

inline SY_DepthSense SY_DepthSenseOf(bool perspective) {
    return perspective ? SY_DepthSense::kLargerIsNearer : SY_DepthSense::kLargerIsFarther;
}

// aFirst: somewhere A lies behind B (or level with it), so A is drawn before B there; bFirst
// likewise for B. Both are set when the two cross or touch in depth.
struct SY_DrawOrder {
    bool aFirst = false;
    bool bFirst = false;
};

// Compares A and B at the points where their screen polygons meet (edge crossings and touching
// points, and vertices of one inside the other), subsample by subsample. Renderables whose
// screen boxes do not overlap with positive area get neither flag.
SY_DrawOrder SY_RelateRenderables(const SY_TRLayer& a, const SY_TRLayer& b, SY_DepthSense sense);

using SY_RenderableGroup = SY_AccountedVector<SY_TRLayer*>;
using SY_RenderableGroups = SY_AccountedVector<SY_RenderableGroup>;

// Cuts the renderables (in render order) into groups, replacing the contents of groups. The
// groups are to be drawn in their order: every renderable that must be drawn before another
// one stands in an earlier group or in the same group.
void SY_GroupByDepth(SY_TRLayer* const* renderables, int32_t count, SY_DepthSense sense,
                     SY_RenderableGroups* groups);
