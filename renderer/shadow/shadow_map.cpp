#include "renderer/shadow/shadow_map.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>

namespace {

constexpr float kFromFixed = 1.0f / 32768.0f;

// Filter weights of the soft lookup by squared texel distance q: weight[trunc(16·q)] is
// exp(−q), a table rather than a call per texel.
const std::array<float, 32> kSoftWeights = [] {
    std::array<float, 32> w{};
    for (int i = 0; i < 32; ++i)
        w[i] = static_cast<float>(std::exp(-i / 16.0));
    return w;
}();

void SetFull(float t[3]) {
    t[0] = t[1] = t[2] = 1.0f;
}

void SetEntry(const SY_ShadowEntry& e, float t[3]) {
    t[0] = e.red * kFromFixed;
    t[1] = e.green * kFromFixed;
    t[2] = e.blue * kFromFixed;
}

}  // namespace

SY_PlanarShadowMap::SY_PlanarShadowMap(const M_Matrix4& worldToMap, bool perspective,
                                       const double mapRect[4], const M_LRect& texels,
                                       SY_ShadowBlock<uint32_t> starts,
                                       SY_ShadowBlock<SY_ShadowEntry> entries)
    : SY_ShadowMap(Kind::kPlanar),
      matrix_(worldToMap),
      perspective_(perspective),
      texels_(texels),
      stride_(texels.right - texels.left),
      starts_(std::move(starts)),
      entries_(std::move(entries)),
      tileStride_(((texels.right - texels.left) >> kTileShift) + 1),
      centre_{(mapRect[0] + mapRect[2]) * 0.5, (mapRect[1] + mapRect[3]) * 0.5},
      half_{(mapRect[2] - mapRect[0]) * 0.5, (mapRect[3] - mapRect[1]) * 0.5} {
    for (int k = 0; k < 4; ++k)
        columnsXY_[k] = Pair{matrix_.mat[k][0], matrix_.mat[k][1]};
    BuildTiles();
}

namespace {

constexpr float kInfinity = std::numeric_limits<float>::infinity();
// A summary that singles out no layer; it matches no receiver.
constexpr uint16_t kNoFront = 0xFFFF;

uint16_t IdOf(const SY_ShadowEntry& e) {
    return e.tag & kSY_ShadowIdMask;
}

bool Dark(const SY_ShadowEntry& e) {
    return e.red == 0 && e.green == 0 && e.blue == 0;
}

// What a group of texels gives a receiver, as it is gathered: one layer (front) is singled
// out, and the texels whose first occluder is of that layer are kept apart from the others,
// since a receiver of that layer sees past its own occluders.
struct TexelSummary {
    uint16_t front = kNoFront;
    float frontFirst = -kInfinity;   // nearest first occluder of the front layer's texels
    float frontPass = -kInfinity;    // nearest occluder after the front layer's in those texels
    float othersFirst = -kInfinity;  // nearest first occluder of the other occupied texels
    float umbraDepth = kInfinity;
    uint16_t umbraIds = 0;

    void Join(const TexelSummary& s) {
        if (front == kNoFront) {
            front = s.front;
            frontFirst = s.frontFirst;
            frontPass = s.frontPass;
        } else if (s.front == front) {
            frontFirst = std::max(frontFirst, s.frontFirst);
            frontPass = std::max(frontPass, s.frontPass);
        } else {
            othersFirst = std::max(othersFirst, s.frontFirst);
        }
        othersFirst = std::max(othersFirst, s.othersFirst);
        umbraDepth = std::min(umbraDepth, s.umbraDepth);
        umbraIds = static_cast<uint16_t>(umbraIds | s.umbraIds);
    }
};

TexelSummary SummaryOf(const SY_ShadowEntry* first, const SY_ShadowEntry* end) {
    TexelSummary s;
    if (first == end) {
        s.umbraDepth = -kInfinity;
        return s;
    }
    // A point nearer than the first occluder, or behind only its own layer's, is lit.
    const uint16_t id = IdOf(*first);
    if (id == kSY_ShadowNoLayer) {
        s.othersFirst = first->depth;
    } else {
        s.front = id;
        s.frontFirst = first->depth;
        const SY_ShadowEntry* other = first;
        while (other < end && IdOf(*other) == id)
            ++other;
        if (other < end) s.frontPass = other->depth;
    }
    // Behind the first of a run of opaque entries that ends the list no light is left, unless
    // the receiver owns that first entry and looks past its own layer.
    const SY_ShadowEntry* dark = end;
    while (dark > first && Dark(dark[-1]))
        --dark;
    if (dark == end) {
        s.umbraDepth = -kInfinity;
    } else {
        s.umbraDepth = dark->depth;
        s.umbraIds = static_cast<uint16_t>(1u << (IdOf(*dark) & 15));
    }
    return s;
}

}  // namespace

void SY_PlanarShadowMap::BuildTiles() {
    // Cells of 2 × 2 texels, so that a tile's reach, two texels to each side, is whole cells.
    const int32_t width = stride_, height = texels_.bottom - texels_.top;
    const int32_t cellsWide = (width >> 1) + 1, cellsHigh = (height >> 1) + 1;
    SY_ShadowBlock<TexelSummary> cells("shadow map tiles",
                                       static_cast<size_t>(cellsWide) * cellsHigh);
    std::fill_n(cells.Data(), static_cast<size_t>(cellsWide) * cellsHigh, TexelSummary{});
    const SY_ShadowEntry* entries = entries_.Data();
    size_t texel = 0;
    for (int32_t j = 0; j < height; ++j) {
        TexelSummary* row = &cells[static_cast<size_t>(j >> 1) * cellsWide];
        for (int32_t i = 0; i < width; ++i, ++texel) {
            // An empty texel lets all light through: no darkness anywhere in its cell.
            if (starts_[texel] == starts_[texel + 1])
                row[i >> 1].umbraDepth = -kInfinity;
            else
                row[i >> 1].Join(SummaryOf(entries + starts_[texel], entries + starts_[texel + 1]));
        }
    }
    const int32_t tilesHigh = (height >> kTileShift) + 1;
    tiles_ = SY_ShadowBlock<Tile>("shadow map tiles", static_cast<size_t>(tileStride_) * tilesHigh);
    for (int32_t b = 0; b < tilesHigh; ++b) {
        for (int32_t a = 0; a < tileStride_; ++a) {
            // The tile's own cells first, so that its front layer is the one they hold.
            TexelSummary sum;
            auto take = [&](int32_t x, int32_t y) {
                if (x >= 0 && x < cellsWide && y >= 0 && y < cellsHigh)
                    sum.Join(cells[static_cast<size_t>(y) * cellsWide + x]);
            };
            for (int32_t y = 2 * b; y <= 2 * b + 1; ++y) {
                for (int32_t x = 2 * a; x <= 2 * a + 1; ++x)
                    take(x, y);
            }
            for (int32_t y = 2 * b - 1; y <= 2 * b + 2; ++y) {
                for (int32_t x = 2 * a - 1; x <= 2 * a + 2; ++x) {
                    if (y < 2 * b || y > 2 * b + 1 || x < 2 * a || x > 2 * a + 1) take(x, y);
                }
            }
            tiles_[static_cast<size_t>(b) * tileStride_ + a] = {
                std::max(sum.frontFirst, sum.othersFirst), std::max(sum.frontPass, sum.othersFirst),
                sum.umbraDepth, sum.umbraIds, sum.front};
        }
    }
}

namespace {

// The light left at depth d behind the occluders [first, end) of one texel, for the layer
// receiverId; false, with t untouched, where all of it is left.
[[gnu::always_inline]] inline bool ListTransmission(const SY_ShadowEntry* first,
                                                    const SY_ShadowEntry* end, double d,
                                                    uint16_t receiverId, float t[3]) {
    if (first == end || d >= first->depth) return false;
    // e: the last occluder nearer the light than the point. Lists are short, a few layers and
    // their blur levels, so a walk from the front costs less than keeping a cursor per thread.
    const SY_ShadowEntry* e = first;
    while (e + 1 < end && e[1].depth > d)
        ++e;
    if (receiverId != kSY_ShadowNoLayer && (e->tag & kSY_ShadowIdMask) == receiverId) {
        // The receiver's own occluders: the light that reached its front counts.
        while (e >= first && (e->tag & kSY_ShadowIdMask) == receiverId)
            --e;
        if (e < first) return false;
        SetEntry(*e, t);
        return true;
    }
    SetEntry(*e, t);
    if (e + 1 < end && !(e->tag & kSY_ShadowStep)) {
        // Between two blur levels of one layer the shadow softens gradually with depth.
        float f = static_cast<float>((d - e->depth) / (e[1].depth - e->depth));
        float next[3];
        SetEntry(e[1], next);
        for (int c = 0; c < 3; ++c)
            t[c] += (next[c] - t[c]) * f;
    }
    return true;
}

}  // namespace

void SY_PlanarShadowMap::TexelTransmission(int32_t i, int32_t j, double d, uint16_t receiverId,
                                           float t[3]) const {
    SetFull(t);
    if (i < texels_.left || i >= texels_.right || j < texels_.top || j >= texels_.bottom) return;
    size_t texel = static_cast<size_t>(j - texels_.top) * stride_ + (i - texels_.left);
    ListTransmission(entries_.Data() + starts_[texel], entries_.Data() + starts_[texel + 1], d,
                     receiverId, t);
}

void SY_PlanarShadowMap::WalkTexels(double x, double y, double d, uint16_t receiverId, bool soft,
                                    float t[3]) const {
    if (!soft) {
        double i = std::floor(x), j = std::floor(y);
        if (!(i >= texels_.left && i < texels_.right && j >= texels_.top && j < texels_.bottom)) {
            SetFull(t);
            return;
        }
        TexelTransmission(static_cast<int32_t>(i), static_cast<int32_t>(j), d, receiverId, t);
        return;
    }
    // Far outside the texels nothing is near enough to filter (and the texel index would not
    // fit its type).
    if (!(x > texels_.left - 3 && x < texels_.right + 3 && y > texels_.top - 3 &&
          y < texels_.bottom + 3)) {
        SetFull(t);
        return;
    }
    // Texel centres lie at half-integers; the 4 × 4 texels around the point within a squared
    // distance of 2 are weighed by exp(−q).
    double cx = x - 0.5, cy = y - 0.5;
    double fi = std::floor(cx), fj = std::floor(cy);
    double fx = cx - fi, fy = cy - fj;
    int32_t i0 = static_cast<int32_t>(fi), j0 = static_cast<int32_t>(fj);
    bool inside = i0 - 1 >= texels_.left && i0 + 2 < texels_.right && j0 - 1 >= texels_.top &&
                  j0 + 2 < texels_.bottom;
    double qx[4], qy[4];
    for (int k = 0; k < 4; ++k) {
        qx[k] = (k - 1 - fx) * (k - 1 - fx);
        qy[k] = (k - 1 - fy) * (k - 1 - fy);
    }
    const SY_ShadowEntry* entries = entries_.Data();
    float sum[3] = {0, 0, 0}, weights = 0;
    bool shaded = false;  // some texel keeps back some light
    for (int32_t dj = 0; dj < 4; ++dj) {
        const uint32_t* row =
            inside ? &starts_[static_cast<size_t>(j0 - 1 + dj - texels_.top) * stride_ +
                              (i0 - 1 - texels_.left)]
                   : nullptr;
        for (int32_t di = 0; di < 4; ++di) {
            double q = qx[di] + qy[dj];
            if (q >= 2.0) continue;
            float w = kSoftWeights[static_cast<int32_t>(16.0 * q)];
            float texel[3] = {1.0f, 1.0f, 1.0f};
            if (inside) {
                shaded |= ListTransmission(entries + row[di], entries + row[di + 1], d, receiverId,
                                           texel);
            } else {
                TexelTransmission(i0 - 1 + di, j0 - 1 + dj, d, receiverId, texel);
                shaded = true;
            }
            for (int c = 0; c < 3; ++c)
                sum[c] += w * texel[c];
            weights += w;
        }
    }
    if (!shaded) {
        SetFull(t);
        return;
    }
    for (int c = 0; c < 3; ++c)
        t[c] = weights > 0 ? sum[c] / weights : 0.0f;
}

void SY_PlanarShadowMap::HardLookup(const double p[3], uint16_t receiverId, float out[4]) const {
    Lookup(p, receiverId, false, out);
}

void SY_PlanarShadowMap::SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const {
    Lookup(p, receiverId, true, out);
}

void SY_CubicShadowMap::HardLookup(const double p[3], uint16_t receiverId, float out[4]) const {
    Lookup(p, receiverId, false, out);
}

void SY_CubicShadowMap::SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const {
    Lookup(p, receiverId, true, out);
}
