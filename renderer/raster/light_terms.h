// The terms of one light at a pixel, written once over the lane packs so that the one-pixel and
// the two-pixel lighting share them.
#pragma once

#include <cstdint>

#include "renderer/raster/light_lanes.h"
#include "renderer/scene/light_state.h"

inline constexpr int32_t kSY_FalloffSmooth = 1;
inline constexpr int32_t kSY_FalloffInverseSquare = 2;

// The light's falloff reads the distance from the light to the surface point.
inline bool SY_FalloffUsesDistance(const SY_LightState& light) {
    return light.falloffType == kSY_FalloffSmooth || light.falloffType == kSY_FalloffInverseSquare;
}

template <class L>
typename L::Real SY_Dot(const typename L::Real a[3], const typename L::Real b[3]) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

template <class L>
typename L::Single SY_Smoothstep(typename L::Single t) {
    return t * t * (L::SplatSingle(3.0f) - L::SplatSingle(2.0f) * t);
}

// The spot's soft edge for the cosine c between the light vector and the axis, on lanes already
// inside the outer cone: rises from 0 on the outer cone to 1 on the inner one.
template <class L>
typename L::Single SY_SpotEdge(const SY_LightState& light, typename L::Real c) {
    typename L::Single t =
        L::ToSingle(c - L::Splat(light.cosOuter)) * L::SplatSingle(light.coneScale);
    return L::SelectSingle(L::LessEqual(c, L::Splat(light.cosInner)), SY_Smoothstep<L>(t),
                           L::SplatSingle(1.0f));
}

// Squared distance between the light and the surface points; equal, bit for bit, to the squared
// length of the unnormalised light vector, which callers that have it pass instead.
template <class L>
typename L::Real SY_DistanceSquared(const SY_LightState& light, const typename L::Real p[3]) {
    typename L::Real d[3] = {p[0] - L::Splat(light.position[0]), p[1] - L::Splat(light.position[1]),
                             p[2] - L::Splat(light.position[2])};
    return SY_Dot<L>(d, d);
}

// Distance falloff for the squared distance from the light: 1 inside the radius; beyond it a
// smooth fade over the falloff distance, or the inverse square of the distance relative to the
// radius.
template <class L>
typename L::Single SY_Falloff(const SY_LightState& light, typename L::Real distanceSquared) {
    using Real = typename L::Real;
    using Single = typename L::Single;
    const Single one = L::SplatSingle(1.0f), zero = L::SplatSingle(0.0f);
    if (!SY_FalloffUsesDistance(light)) return one;
    // Rounded to a float: the zone edges are compared at that precision.
    Real d2 = L::ToReal(L::ToSingle(distanceSquared));
    typename L::Mask inside = L::Less(d2, L::Splat(light.radiusSquared));
    if (light.falloffType == kSY_FalloffInverseSquare) {
        // With a zero radius the light's own position gets nothing rather than infinity.
        Single square = L::SelectSingle(L::LessEqual(d2, L::Splat(0.0)), zero,
                                        L::ToSingle(L::Splat(light.radiusSquared) / d2));
        return L::SelectSingle(inside, one, square);
    }
    if (light.falloffDistance == 0.0) return L::SelectSingle(inside, one, zero);
    Single u = L::ToSingle(L::Splat(1.0) - (L::Sqrt(d2) - L::Splat(light.falloffRadius)) *
                                               L::Splat(light.inverseDistance));
    return L::SelectSingle(
        inside, one,
        L::SelectSingle(L::Less(L::Splat(light.outerSquared), d2), zero, SY_Smoothstep<L>(u)));
}

// The pack t of the transmissions lanes[c][i]; true where every lane gets all of the light.
// Such a pack is made whole rather than read back from lanes just written one by one.
template <class L>
bool SY_ShadowLanesToPack(const float lanes[3][L::kCount], typename L::Single t[3]) {
    bool allLit = true;
    for (int c = 0; c < 3; ++c) {
        for (int i = 0; i < L::kCount; ++i)
            allLit &= lanes[c][i] == 1.0f;
    }
    for (int c = 0; c < 3; ++c)
        t[c] = allLit ? L::SplatSingle(1.0f) : L::FromLanes(lanes[c]);
    return allLit;
}

// The shadow step. The red, green and blue transmission t of the light's shadow map at the
// surface points of the active lanes (full transmission on the others). A light without a map
// is never looked up: all of its light passes. True where every lane gets all of the light, so
// the caller may leave the light as it is.
template <class L>
bool SY_ShadowTransmission(const SY_ShadowMap& map, bool soft, uint16_t receiverId,
                           const typename L::Real p[3], typename L::Mask active,
                           typename L::Single t[3]) {
    float lanes[3][L::kCount];
    // A planar map projects the whole pack at once, and its tiles settle most packs whole.
    if (const SY_PlanarShadowMap* planar = map.AsPlanar()) {
        using Settled = SY_PlanarShadowMap::Settled;
        typename L::Real x, y, d;
        const typename L::Mask inMap = planar->ProjectLanes<L>(p, &x, &y, &d);
        Settled settled[L::kCount];
        bool allLit = true, allDark = true;
        for (int i = 0; i < L::kCount; ++i) {
            settled[i] = Settled::kLit;
            if (L::LaneOn(active, i) && L::LaneOn(inMap, i)) {
                const SY_PlanarShadowMap::Tile* tile =
                    planar->TileAt(L::Lane(x, i), L::Lane(y, i), soft);
                settled[i] = tile ? SY_PlanarShadowMap::SettledBy(*tile, L::Lane(d, i), receiverId)
                                  : Settled::kNo;
            }
            allLit &= settled[i] == Settled::kLit;
            allDark &= settled[i] == Settled::kDark;
        }
        if (allLit || allDark) {
            for (int c = 0; c < 3; ++c)
                t[c] = L::SplatSingle(allLit ? 1.0f : 0.0f);
            return allLit;
        }
        for (int i = 0; i < L::kCount; ++i) {
            float out[3] = {1.0f, 1.0f, 1.0f};
            if (settled[i] == Settled::kDark)
                out[0] = out[1] = out[2] = 0.0f;
            else if (settled[i] == Settled::kNo)
                planar->WalkTexels(L::Lane(x, i), L::Lane(y, i), L::Lane(d, i), receiverId, soft,
                                   out);
            for (int c = 0; c < 3; ++c)
                lanes[c][i] = out[c];
        }
        return SY_ShadowLanesToPack<L>(lanes, t);
    }
    if (const SY_CubicShadowMap* cube = map.AsCubic()) {
        cube->TransmissionLanes<L>(p, active, receiverId, soft, lanes);
        return SY_ShadowLanesToPack<L>(lanes, t);
    }
    for (int i = 0; i < L::kCount; ++i) {
        float out[4] = {1.0f, 1.0f, 1.0f, 1.0f};
        if (L::LaneOn(active, i)) {
            const double point[3] = {L::Lane(p[0], i), L::Lane(p[1], i), L::Lane(p[2], i)};
            map.Lookup(point, receiverId, soft, out);
        }
        for (int c = 0; c < 3; ++c)
            lanes[c][i] = out[1 + c];
    }
    return SY_ShadowLanesToPack<L>(lanes, t);
}

// The share of a light that a shadow lets through at darkness w: the transmission itself where
// `full` (darkness 1), else max(0, 1 − (1 − t)·w), so a lighter shadow never blocks all light.
template <class L>
void SY_ShadowAttenuation(const typename L::Single t[3], typename L::Single w,
                          typename L::Mask full, typename L::Single a[3]) {
    const typename L::Single one = L::SplatSingle(1.0f);
    for (int c = 0; c < 3; ++c) {
        a[c] = L::SelectSingle(full, t[c], L::Max(one - (one - t[c]) * w, L::SplatSingle(0.0f)));
    }
}
