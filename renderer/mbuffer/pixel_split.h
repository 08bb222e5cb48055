// The geometry of records whose depth planes cross inside a pixel: which share of the pixel
// square each one is in front in, worked out analytically, with no sub-pixel samples.
//
// Over the pixel square (u, v) in [0, 1]², u along x and v along y, a record's depth is the
// plane z(u, v) = z00 + dzdx·u + dzdy·v; larger is nearer the camera.
#pragma once

#include <algorithm>
#include <cstdint>

struct SY_DepthPlane {
    double z00, dzdx, dzdy;
};

// The plane of an anti-aliased record, whose depth key is the plane's minimum over the square.
template <class F>
SY_DepthPlane SY_PlaneOf(const F& record) {
    double z00 = record.depth;
    if (!(record.dzdx > 0)) z00 -= record.dzdx;
    if (!(record.dzdy > 0)) z00 -= record.dzdy;
    return {z00, record.dzdx, record.dzdy};
}

// zB − zA at the corners (0, 0), (1, 0), (1, 1), (0, 1), in this order around the square.
struct SY_CornerDifferences {
    double e[4];
};

inline SY_CornerDifferences SY_DifferenceAtCorners(const SY_DepthPlane& a, const SY_DepthPlane& b) {
    const double e00 = b.z00 - a.z00;
    const double e10 = e00 + (b.dzdx - a.dzdx);
    return {{e00, e10, e10 + (b.dzdy - a.dzdy), e00 + (b.dzdy - a.dzdy)}};
}

// Whether the two planes change places inside the square: taken with the sign that makes the
// first corner not negative, some other corner is strictly negative. Touching is not crossing.
inline bool SY_CrossInside(const SY_CornerDifferences& d) {
    const double sign = d.e[0] < 0 ? -1.0 : 1.0;
    return sign * d.e[1] < 0 || sign * d.e[2] < 0 || sign * d.e[3] < 0;
}

inline constexpr float kSY_NoCrossing = -1.0f;

// The share of the pixel in which B is in front of A (zB − zA > 0), from the two points where
// the line zB = zA leaves the square; kSY_NoCrossing when B is in front everywhere, or the two
// are one plane, so that list order (B after A) already holds. A plane that stays behind or
// level everywhere, which only records of equal key can be, gives 0.
inline float SY_ShareInFront(const SY_CornerDifferences& d) {
    // Edge i runs from corner i to corner i + 1; t is where it crosses, from its start.
    int32_t crossed[2];
    double t[2];
    int32_t count = 0;
    for (int32_t i = 0; i < 4 && count < 2; ++i) {
        const double p = d.e[i], q = d.e[(i + 1) % 4];
        if ((p <= 0) == (q <= 0)) continue;
        crossed[count] = i;
        t[count++] = std::clamp(p / (p - q), 0.0, 1.0);
    }
    if (count < 2) {
        const bool level = d.e[0] == 0 && d.e[1] == 0 && d.e[2] == 0 && d.e[3] == 0;
        return d.e[0] <= 0 && !level ? 0.0f : kSY_NoCrossing;
    }
    // The area on the side of corner (0, 0), by the pair of edges the line cuts.
    const double t1 = t[0], t2 = t[1];
    double s = 0;
    switch (crossed[0] * 4 + crossed[1]) {
        case 0 * 4 + 1:
            s = 1 - (1 - t1) * t2 / 2;
            break;  // bottom and right
        case 0 * 4 + 2:
            s = (t1 + 1 - t2) / 2;
            break;  // bottom and top
        case 0 * 4 + 3:
            s = t1 * (1 - t2) / 2;
            break;  // bottom and left
        case 1 * 4 + 2:
            s = 1 - (1 - t1) * t2 / 2;
            break;  // right and top
        case 1 * 4 + 3:
            s = (t1 + 1 - t2) / 2;
            break;  // right and left
        default:
            s = 1 - (1 - t1) * t2 / 2;
            break;  // top and left
    }
    // Corner (0, 0) itself is on the side where B is not in front unless e00 > 0.
    return static_cast<float>(d.e[0] > 0 ? s : 1 - s);
}

struct SY_SplitPoint {
    double u, v;
};

// The value a·u + b·v + c of the line at p; both the split and the test for one use this one
// expression, so that they put every vertex on the same side.
inline double SY_LineValue(const double line[3], const SY_SplitPoint& p) {
    return line[0] * p.u + line[1] * p.v + line[2];
}

enum class SY_LineSide { kFront, kBehind, kBoth };

// Where the polygon (count ≥ 1 vertices) lies against the line: wholly where the value is ≥ 0,
// wholly where it is < 0, or on both sides, which is when SY_SplitPolygon gives two parts.
inline SY_LineSide SY_SideOfLine(const SY_SplitPoint* polygon, int32_t count,
                                 const double line[3]) {
    if (line[0] == 0 && line[1] == 0 && line[2] != 0)
        return line[2] > 0 ? SY_LineSide::kFront : SY_LineSide::kBehind;
    int32_t inFront = 0;
    for (int32_t i = 0; i < count; ++i)
        inFront += SY_LineValue(line, polygon[i]) >= 0;
    if (inFront == 0) return SY_LineSide::kBehind;
    return inFront == count ? SY_LineSide::kFront : SY_LineSide::kBoth;
}

// Whether every point of the box from low to high, and so every vertex of a polygon inside
// it, gives the line a value < 0, judged from the one corner where the value is greatest. A
// rounded product or sum never decreases when an operand grows, so no vertex can give a
// greater value than that corner: the answer agrees with SY_SideOfLine's wherever it is yes.
inline bool SY_BoxBehindLine(const SY_SplitPoint& low, const SY_SplitPoint& high,
                             const double line[3]) {
    const SY_SplitPoint corner{line[0] >= 0 ? high.u : low.u, line[1] >= 0 ? high.v : low.v};
    return SY_LineValue(line, corner) < 0;
}

// Splits the convex polygon (count vertices) by the line a·u + b·v + c = 0 into the part where
// the value is ≥ 0 (front) and where it is < 0 (behind), appending each part's vertices.
// A crossing point is computed from the edge's end of greater u (then greater v), whichever
// way the edge is walked, so that neighbouring parts share bit-identical vertices.
template <class Out>
void SY_SplitPolygon(const SY_SplitPoint* polygon, int32_t count, const double line[3], Out* front,
                     Out* behind) {
    const double a = line[0], b = line[1];
    auto value = [&](const SY_SplitPoint& p) { return SY_LineValue(line, p); };
    const SY_SplitPoint* previous = &polygon[count - 1];
    bool previousInFront = value(*previous) >= 0;
    for (int32_t i = 0; i < count; ++i) {
        const SY_SplitPoint& vertex = polygon[i];
        const bool inFront = value(vertex) >= 0;
        if (inFront != previousInFront) {
            const bool fromVertex =
                vertex.u > previous->u || (vertex.u == previous->u && vertex.v > previous->v);
            const SY_SplitPoint& end = fromVertex ? vertex : *previous;
            const SY_SplitPoint& other = fromVertex ? *previous : vertex;
            const double du = other.u - end.u, dv = other.v - end.v;
            const double denominator = a * du + b * dv;
            const double s = denominator != 0 ? value(end) / denominator : 0.0;
            const SY_SplitPoint crossing{end.u - du * s, end.v - dv * s};
            front->push_back(crossing);
            behind->push_back(crossing);
        }
        (inFront ? front : behind)->push_back(vertex);
        previous = &vertex;
        previousInFront = inFront;
    }
}

// Area of a polygon by the shoelace sum; fewer than three vertices enclose none.
inline double SY_PolygonArea(const SY_SplitPoint* polygon, int32_t count) {
    if (count < 3) return 0.0;
    double twice = 0;
    const SY_SplitPoint* previous = &polygon[count - 1];
    for (int32_t i = 0; i < count; ++i) {
        twice += previous->u * polygon[i].v - polygon[i].u * previous->v;
        previous = &polygon[i];
    }
    return 0.5 * (twice < 0 ? -twice : twice);
}
