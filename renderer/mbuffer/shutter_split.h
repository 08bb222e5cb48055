// The geometry of moving records over a pixel and the shutter interval: the pixel becomes the
// cube (u, v, t), t running from shutter open (0) to close (1), and a record's depth is the
// plane z(u, v, t) = z000 + dzdx·u + dzdy·v + dzdt·t; larger is nearer the camera.
#pragma once

#include <algorithm>
#include <cstdint>

#include "renderer/mbuffer/pixel_split.h"

// Where the two Gauss points of a stretch of the shutter lie from its middle, in stretch
// lengths: their mean is exact for cubics, and they never land on the stretch's ends, where
// parallel planes can be level over the whole pixel.
inline constexpr double kSY_GaussOffset = 0.28867513459481288;  // 1 / (2√3)

struct SY_MotionPlane {
    double z000, dzdx, dzdy, dzdt;

    // The plane over the pixel square at shutter time t.
    SY_DepthPlane At(double t) const { return {z000 + dzdt * t, dzdx, dzdy}; }
};

// The plane of a motion-blur record, whose depth key is its minimum over the cube.
template <class F>
SY_MotionPlane SY_MotionPlaneOf(const F& record) {
    const SY_DepthPlane square = SY_PlaneOf(record);
    const double z000 = record.dzdt > 0 ? square.z00 : square.z00 - record.dzdt;
    return {z000, square.dzdx, square.dzdy, record.dzdt};
}

// zB − zA at the cube's corners, corner i having u = bit 0, v = bit 1, t = bit 2 of i.
struct SY_CubeDifferences {
    double e[8];
    double dt;  // change of every corner's value over the shutter

    SY_CubeDifferences(const SY_MotionPlane& a, const SY_MotionPlane& b) : dt(b.dzdt - a.dzdt) {
        const double d[3] = {b.dzdx - a.dzdx, b.dzdy - a.dzdy, dt};
        for (int32_t i = 0; i < 8; ++i) {
            e[i] = b.z000 - a.z000;
            for (int32_t axis = 0; axis < 3; ++axis)
                e[i] += (i >> axis & 1) ? d[axis] : 0.0;
        }
    }

    // The corners of the pixel square at shutter time t, in SY_CornerDifferences' order.
    SY_CornerDifferences At(double t) const {
        return {{e[0] + dt * t, e[1] + dt * t, e[3] + dt * t, e[2] + dt * t}};
    }

    // The times inside the shutter at which a corner of the square changes sign, appended to
    // *times: between two of them each corner keeps its side.
    template <class Out>
    void AppendCornerSwaps(Out* times) const {
        if (dt == 0) return;
        for (int32_t i = 0; i < 4; ++i) {
            const double t = -e[i] / dt;
            if (t > 0 && t < 1) times->push_back(t);
        }
    }

    // The times inside the shutter at which the two start and stop crossing inside the square
    // (the first and the last corner to change sign), appended to *times: before and after,
    // one is in front over the whole square.
    template <class Out>
    void AppendCrossingEnds(Out* times) const {
        if (dt == 0) return;
        double first = -e[0] / dt, last = first;
        for (int32_t i = 1; i < 4; ++i) {
            first = std::min(first, -e[i] / dt);
            last = std::max(last, -e[i] / dt);
        }
        if (first > 0 && first < 1) times->push_back(first);
        if (last > first && last > 0 && last < 1) times->push_back(last);
    }
};

// Whether the two records change places inside the cube: taken with the sign that makes corner
// 0 not negative, some other corner is strictly negative. Touching is not crossing.
inline bool SY_CrossInsideCube(const SY_CubeDifferences& d) {
    const double sign = d.e[0] < 0 ? -1.0 : 1.0;
    for (int32_t i = 1; i < 8; ++i) {
        if (sign * d.e[i] < 0) return true;
    }
    return false;
}

// The share of the cube in which B is in front of A (zB − zA > 0): kSY_NoCrossing when it is
// nowhere behind, so that list order already holds. The share of the square at time t is
// quadratic in t between the instants at which a corner of the square changes sign.
inline float SY_ShareInFrontOverShutter(const SY_CubeDifferences& d) {
    if (d.dt == 0) return SY_ShareInFront(d.At(0));  // the same at every instant
    if (std::all_of(d.e, d.e + 8, [](double e) { return e >= 0; })) return kSY_NoCrossing;
    auto share = [&d](double t) {
        const float s = SY_ShareInFront(d.At(t));
        return s == kSY_NoCrossing ? 1.0 : double(s);
    };
    // The piece boundaries: 0, the corner swaps in order, 1.
    struct Times {
        double t[6] = {0};
        int32_t count = 1;
        void push_back(double v) {  // keeps them sorted
            int32_t at = count++;
            for (; t[at - 1] > v; --at)
                t[at] = t[at - 1];
            t[at] = v;
        }
    } times;
    d.AppendCornerSwaps(&times);
    times.push_back(1);
    double volume = 0;
    for (int32_t i = 1; i < times.count; ++i) {
        const double length = times.t[i] - times.t[i - 1];
        const double middle = times.t[i - 1] + 0.5 * length;
        volume +=
            0.5 * length *
            (share(middle - kSY_GaussOffset * length) + share(middle + kSY_GaussOffset * length));
    }
    return static_cast<float>(std::clamp(volume, 0.0, 1.0));
}
