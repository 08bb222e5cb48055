#include <algorithm>
#include <climits>
#include <cmath>
#include <cstring>
#include <new>
#include <utility>
#include <vector>

#include "bee_engine.h"

namespace {

constexpr double kPi = 3.14159265358979323846;
// The diffraction rim is the outer 15 % of the iris.
constexpr double kInnerScale = 0.85;

struct Point {
    double x, y;
};

// The iris outline at unit radius as seen on screen (y down), turned half a turn for gathering.
// Corners of the polygon lie on the unit circle; roundness moves each point of a side toward
// that circle. A rounded iris is traced with eight points per side.
std::vector<Point> Outline(int32_t sides, double roundness, double aspect, double xStretch,
                           double rotation) {
    const int32_t n = std::max(sides, 3);
    const int32_t points = roundness > 0 ? 8 * n : n;
    const double sector = 2 * kPi / n, half = kPi / n;
    const double turn = rotation * kPi / 180, c = std::cos(turn), s = std::sin(turn);
    std::vector<Point> outline;
    outline.reserve(static_cast<size_t>(points));
    for (int32_t k = 0; k < points; ++k) {
        double within = sector * k / (points / n);  // angle from the first corner
        double local = std::fmod(within, sector) - half;
        double r = std::cos(half) / std::cos(local);
        r += (1 - r) * roundness;
        double angle = within - kPi / 2;  // the first corner points up
        double x = r * std::cos(angle) * aspect, y = r * std::sin(angle);
        outline.push_back({-(x * c - y * s) * xStretch, -(x * s + y * c)});
    }
    return outline;
}

// An iris outline with its sides sorted by height: bucket b of count spans the heights from
// y0 + b / perHeight on, and lists every side that reaches into it.
struct Trace {
    int32_t sides = 0;
    double roundness = 0, aspect = 0, xStretch = 0, rotation = 0;
    std::vector<Point> outline;
    double y0 = 0, perHeight = 0;
    std::vector<int32_t> first;   // bucket b's sides are listed[first[b], first[b + 1])
    std::vector<int32_t> listed;  // side k runs from outline[k − 1] (the last for 0) to [k]

    int32_t Bucket(double y) const {
        const double at = (y - y0) * perHeight;
        const auto count = static_cast<int32_t>(first.size()) - 1;
        return !(at >= 0) ? 0 : at >= count ? count - 1 : static_cast<int32_t>(at);
    }
};

// The outline of an iris and its buckets. A frame traces the same iris at every radius, so
// each thread keeps the last one.
const Trace& TraceOf(int32_t sides, double roundness, double aspect, double xStretch,
                     double rotation) {
    thread_local Trace kept;
    if (!kept.outline.empty() && kept.sides == sides && kept.roundness == roundness &&
        kept.aspect == aspect && kept.xStretch == xStretch && kept.rotation == rotation)
        return kept;
    Trace trace;
    trace.sides = sides;
    trace.roundness = roundness;
    trace.aspect = aspect;
    trace.xStretch = xStretch;
    trace.rotation = rotation;
    trace.outline = Outline(sides, roundness, aspect, xStretch, rotation);
    const std::vector<Point>& outline = trace.outline;
    const auto n = static_cast<int32_t>(outline.size());
    double top = HUGE_VAL, bottom = -HUGE_VAL;
    for (const Point& p : outline) {
        top = std::min(top, p.y);
        bottom = std::max(bottom, p.y);
    }
    // A side goes into the buckets from its top's to its bottom's; Bucket never decreases with
    // the height, so a side that reaches height y is in y's bucket.
    const int32_t count = 2 * n;
    trace.y0 = top;
    trace.perHeight = bottom > top ? count / (bottom - top) : 0;
    trace.first.resize(static_cast<size_t>(count) + 1);
    std::vector<std::vector<int32_t>> buckets(static_cast<size_t>(count));
    for (int32_t k = 0; k < n; ++k) {
        const Point& p = outline[static_cast<size_t>((k + n - 1) % n)];
        const Point& q = outline[static_cast<size_t>(k)];
        const int32_t b0 = trace.Bucket(std::min(p.y, q.y)), b1 = trace.Bucket(std::max(p.y, q.y));
        for (int32_t b = b0; b <= b1; ++b)
            buckets[static_cast<size_t>(b)].push_back(k);
    }
    for (size_t b = 0; b < buckets.size(); ++b) {
        trace.listed.insert(trace.listed.end(), buckets[b].begin(), buckets[b].end());
        trace.first[b + 1] = static_cast<int32_t>(trace.listed.size());
    }
    kept = std::move(trace);
    return kept;
}

// Where the horizontal line at y crosses the convex outline scaled by scale: false when it
// misses.
bool Cross(const Trace& trace, double scale, double y, double* left, double* right) {
    y /= scale;
    double lo = HUGE_VAL, hi = -HUGE_VAL;
    const std::vector<Point>& outline = trace.outline;
    const auto n = static_cast<int32_t>(outline.size());
    const int32_t b = trace.Bucket(y);
    for (int32_t i = trace.first[static_cast<size_t>(b)]; i < trace.first[size_t(b) + 1]; ++i) {
        const int32_t k = trace.listed[static_cast<size_t>(i)];
        const Point* p = &outline[static_cast<size_t>((k + n - 1) % n)];
        const Point& q = outline[static_cast<size_t>(k)];
        if ((p->y <= y && y <= q.y) || (q.y <= y && y <= p->y)) {
            double x0 = p->x, x1 = q.x;
            if (p->y != q.y) x0 = x1 = p->x + (y - p->y) * (q.x - p->x) / (q.y - p->y);
            lo = std::min({lo, x0, x1});
            hi = std::max({hi, x0, x1});
        }
    }
    *left = lo * scale;
    *right = hi * scale;
    return lo <= hi;
}

}  // namespace

ShapeKernel::ShapeKernel(int32_t sides, double roundness, double radius, double aspect,
                         double xStretch, double rotation, double fringe) {
    const Trace& trace = TraceOf(sides, roundness, aspect, xStretch, rotation);
    const std::vector<Point>& outline = trace.outline;
    double top = HUGE_VAL, bottom = -HUGE_VAL;
    for (const Point& p : outline) {
        top = std::min(top, p.y * radius);
        bottom = std::max(bottom, p.y * radius);
    }
    // Rows whose pixel band [y − ½, y + ½] overlaps the iris; at radius 0 only the centre.
    std::vector<Row> rows;
    std::vector<Segment> segments;
    double total = 0;
    auto add = [&](int32_t x0, int32_t x1, double weight) {
        if (x1 < x0 || !(weight > 0)) return;
        segments.push_back({x0, x1 - x0 + 1, static_cast<float>(weight)});
        extent_[0] = std::min(extent_[0], x0);
        extent_[2] = std::max(extent_[2], x1);
        total += (x1 - x0 + 1) * weight;
    };
    const bool point = !(radius > 0);
    const auto first = point ? 1 : static_cast<int32_t>(std::floor(top + 0.5));
    const auto last = point ? 0 : static_cast<int32_t>(std::ceil(bottom - 0.5));
    rows.reserve(static_cast<size_t>(std::max(last - first + 1, 1)));
    segments.reserve(5 * rows.capacity());  // at most five runs a row
    if (point) {
        add(0, 0, 1);
        rows.push_back({0, 0, 1});
    }
    const double rim = 1 + std::max(fringe, 0.0);
    for (int32_t dy = first; dy <= last; ++dy) {
        double share = std::min(dy + 0.5, bottom) - std::max(dy - 0.5, top);
        double y = std::clamp(static_cast<double>(dy), top, bottom);
        double xl, xr;
        if (!(share > 0) || !Cross(trace, radius, y, &xl, &xr)) continue;
        // Pixels whose centres lie within the inner outline are off the rim; without a fringe
        // every pixel is.
        int32_t innerFirst = INT32_MIN, innerLast = INT32_MAX;
        double il, ir;
        if (rim != 1 && Cross(trace, radius * kInnerScale, y, &il, &ir)) {
            innerFirst = static_cast<int32_t>(std::ceil(il));
            innerLast = static_cast<int32_t>(std::floor(ir));
        } else if (rim != 1) {
            innerFirst = INT32_MAX;
            innerLast = INT32_MIN;
        }
        auto weightOf = [&](int32_t x) { return x >= innerFirst && x <= innerLast ? 1.0 : rim; };

        const auto rowStart = static_cast<int32_t>(segments.size());
        const auto p0 = static_cast<int32_t>(std::floor(xl + 0.5));
        const auto p1 = static_cast<int32_t>(std::ceil(xr - 0.5));
        if (p0 >= p1) {
            add(p0, p0, share * (xr - xl) * weightOf(p0));
        } else {
            add(p0, p0, share * (p0 + 0.5 - xl) * weightOf(p0));
            int32_t m0 = p0 + 1, m1 = p1 - 1;
            int32_t i0 = std::clamp(innerFirst, m0, m1 + 1), i1 = std::clamp(innerLast, i0 - 1, m1);
            add(m0, i0 - 1, share * rim);
            add(i0, i1, share);
            add(i1 + 1, m1, share * rim);
            add(p1, p1, share * (xr - (p1 - 0.5)) * weightOf(p1));
        }
        const auto rowEnd = static_cast<int32_t>(segments.size());
        if (rowEnd > rowStart) {
            rows.push_back({dy, rowStart, rowEnd - rowStart});
            extent_[1] = std::min(extent_[1], dy);
            extent_[3] = std::max(extent_[3], dy);
        }
    }
    normalization_ = total > 0 ? static_cast<float>(1 / total) : 0.0f;

    // The frame keeps every kernel: rows and runs go into one block of the host's memory.
    rowCount_ = static_cast<int32_t>(rows.size());
    bytes_ = sizeof(Row) * rows.size() + sizeof(Segment) * segments.size();
    rows_ = static_cast<Row*>(U_AllocatePtr(0, "iris kernel", bytes_));
    if (!rows_) throw std::bad_alloc();
    U_AccountAllocationEx(bytes_, 1);
    segments_ = reinterpret_cast<Segment*>(rows_ + rowCount_);
    std::memcpy(rows_, rows.data(), sizeof(Row) * rows.size());
    std::memcpy(segments_, segments.data(), sizeof(Segment) * segments.size());
}

ShapeKernel::~ShapeKernel() {
    U_AccountAllocationEx(bytes_, 0);
    U_FreePtr(rows_);
}

void BEE_ComputeDOFExpansionRect(float irisAspect, float xStretch, float irisRotation, float radius,
                                 int32_t rect[4]) {
    // The half extents of an ellipse of half axes aspect × radius and radius, turned.
    double turn = irisRotation * kPi / 180, c = std::cos(turn), s = std::sin(turn);
    double a = double(irisAspect) * radius, b = radius;
    double hx = std::sqrt(a * a * c * c + b * b * s * s) * xStretch;
    double hy = std::sqrt(a * a * s * s + b * b * c * c);
    auto x = static_cast<int32_t>(std::ceil(hx)), y = static_cast<int32_t>(std::ceil(hy));
    rect[0] = -x;
    rect[1] = -y;
    rect[2] = x;
    rect[3] = y;
}
