// Shadow maps: what a light knows of the layers that stand between it and a point.
#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

#include "m_matrix.h"
#include "u_memory.h"

// Base of the planar and cubic maps; each light state owns at most one. Lookups run on many
// render threads at once.
class SY_PlanarShadowMap;
class SY_CubicShadowMap;

class SY_ShadowMap : public U_MemTrackedObject {
public:
    virtual ~SY_ShadowMap() = default;
    // The light that reaches the world point p of the receiving layer: out[1..3] get the red,
    // green and blue transmission in 0..1. A layer never shadows itself.
    virtual void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;
    // As HardLookup, filtered over the neighbouring texels for soft shadow edges.
    virtual void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;

    // SoftLookup where soft, else HardLookup, without a virtual call for the planar and cubic
    // maps: the lighting looks up every pixel of a receiver.
    void Lookup(const double p[3], uint16_t receiverId, bool soft, float out[4]) const;

    // This map as a planar one, or null.
    const SY_PlanarShadowMap* AsPlanar() const;
    // This map as a cubic one, or null.
    const SY_CubicShadowMap* AsCubic() const;

protected:
    enum class Kind : uint8_t { kOther, kPlanar, kCubic };
    SY_ShadowMap() = default;
    explicit SY_ShadowMap(Kind kind) : kind_(kind) {}

private:
    Kind kind_ = Kind::kOther;
};

// One occluder of a texel, 12 bytes. Within a texel the entries run from the nearest to the
// light to the farthest, and each one's transmission is what is left of the light just behind
// it, every layer passed so far included.
struct SY_ShadowEntry {
    float depth;  // larger is nearer the light
    // Bits 0-10: the casting layer's id (kSY_ShadowNoLayer for none). Bit 15 (kSY_ShadowStep):
    // the next entry belongs to another layer, so a point between the two takes this entry's
    // transmission unblended; between two entries of one layer (its blur levels) it blends.
    uint16_t tag;
    uint16_t red, green, blue;  // × 32768
};
static_assert(sizeof(SY_ShadowEntry) == 12);

inline constexpr uint16_t kSY_ShadowNoLayer = 2047;
inline constexpr uint16_t kSY_ShadowIdMask = 0x07FF;
inline constexpr uint16_t kSY_ShadowStep = 0x8000;

// The id a layer's entries carry; ids that do not fit are no layer, so they never match.
inline uint16_t SY_ShadowLayerId(int32_t renderIndex) {
    return renderIndex >= 0 && renderIndex < kSY_ShadowNoLayer ? static_cast<uint16_t>(renderIndex)
                                                               : kSY_ShadowNoLayer;
}

// A block of count T from the host's tagged allocator, accounted while held. Throws 4 when the
// memory is not there.
template <class T>
class SY_ShadowBlock {
public:
    SY_ShadowBlock() = default;
    SY_ShadowBlock(const char* name, size_t count) : bytes_(sizeof(T) * (count == 0 ? 1 : count)) {
        data_ = static_cast<T*>(U_AllocatePtr(kTag, name, bytes_));
        if (!data_) throw kU_ErrOutOfMemory;
        U_AccountAllocationEx(bytes_, 1);
    }
    ~SY_ShadowBlock() { Release(); }
    SY_ShadowBlock(SY_ShadowBlock&& other) noexcept
        : data_(std::exchange(other.data_, nullptr)), bytes_(std::exchange(other.bytes_, 0)) {}
    SY_ShadowBlock& operator=(SY_ShadowBlock&& other) noexcept {
        if (this != &other) {
            Release();
            data_ = std::exchange(other.data_, nullptr);
            bytes_ = std::exchange(other.bytes_, 0);
        }
        return *this;
    }

    T& operator[](size_t i) { return data_[i]; }
    const T& operator[](size_t i) const { return data_[i]; }
    T* Data() { return data_; }
    const T* Data() const { return data_; }

private:
    static constexpr uint32_t kTag = 0x004B0007;

    void Release() noexcept {
        if (!data_) return;
        U_AccountAllocationEx(bytes_, 0);
        U_FreePtr(data_);
        data_ = nullptr;
    }

    T* data_ = nullptr;
    size_t bytes_ = 0;
};

// A grid of texels seen from the light through one matrix: orthographic for a parallel light,
// perspective for a face of a spot or point light.
class SY_PlanarShadowMap : public SY_ShadowMap {
public:
    // worldToMap maps world points (row vectors) to map x, y in texels, with the depth in z
    // (orthographic) or w (perspective). mapRect (x0, y0, x1, y1) is the face the map covers.
    // The entries of texel (i, j) of texels are entries[starts[t]] up to entries[starts[t + 1]],
    // t = (j − top) × width + (i − left).
    SY_PlanarShadowMap(const M_Matrix4& worldToMap, bool perspective, const double mapRect[4],
                       const M_LRect& texels, SY_ShadowBlock<uint32_t> starts,
                       SY_ShadowBlock<SY_ShadowEntry> entries);

    void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const override;
    void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const override;
    void Lookup(const double p[3], uint16_t receiverId, bool soft, float out[4]) const {
        double x, y, d;
        if (!Project(p, &x, &y, &d)) {
            out[1] = out[2] = out[3] = 1.0f;
            return;
        }
        TransmissionAt(x, y, d, receiverId, soft, out + 1);
    }

    // The map position (x, y) and depth d of p (larger is nearer the light); false for a point
    // behind a spot or point light's face, or behind a parallel light's plane.
    bool Project(const double p[3], double* x, double* y, double* d) const {
        // A point this close to a spot or point light's eye plane, or in front of a parallel
        // light's far plane, lies outside the map.
        constexpr double kNearestDepth = 0.001;
        if (perspective_) {
            double w = Row(3, p);
            if (w < kNearestDepth) return false;
            // x and y in one pair of lanes: the same products and sums, one division.
            const Pair xy = (columnsXY_[0] * p[0] + columnsXY_[1] * p[1] + columnsXY_[2] * p[2] +
                             columnsXY_[3]) /
                            w;
            *x = xy[0];
            *y = xy[1];
            *d = 1.0 / w;
            return true;
        }
        // The map's z grows away from the light; the depth key grows toward it.
        *d = -Row(2, p);
        if (*d > -kNearestDepth) return false;
        *x = Row(0, p);
        *y = Row(1, p);
        return true;
    }
    // Project for the L::kCount points of a lane pack at once, each lane through the same
    // operations as Project; the returned mask has the lanes that lie in the map.
    template <class L>
    typename L::Mask ProjectLanes(const typename L::Real p[3], typename L::Real* x,
                                  typename L::Real* y, typename L::Real* d) const {
        using Real = typename L::Real;
        auto row = [&](int column) {
            return p[0] * L::Splat(matrix_.mat[0][column]) +
                   p[1] * L::Splat(matrix_.mat[1][column]) +
                   p[2] * L::Splat(matrix_.mat[2][column]) + L::Splat(matrix_.mat[3][column]);
        };
        constexpr double kNearestDepth = 0.001;
        if (perspective_) {
            const Real w = row(3);
            *x = row(0) / w;
            *y = row(1) / w;
            *d = L::Splat(1.0) / w;
            return L::AndNot(L::Less(w, L::Splat(kNearestDepth)), L::All());
        }
        *d = -row(2);
        *x = row(0);
        *y = row(1);
        return L::AndNot(L::Less(L::Splat(-kNearestDepth), *d), L::All());
    }
    // What every texel a lookup in a tile reads, two texels around the tile included, gives
    // a receiver: all of the light or none of it, found with one read instead of a walk over
    // up to sixteen texel lists. Neither answer holds where shadow edges run.
    struct Tile {
        float litDepth;       // a point at least this near the light is lit in every texel
        float frontLitDepth;  // so is a point of layer frontId at least this near
        float umbraDepth;     // a point farther than this gets no light in any texel,
        uint16_t umbraIds;    // unless it is of a layer whose bit (id mod 16) is set
        uint16_t frontId;     // a layer that sees past its own occluders; 0xFFFF for none
    };
    static_assert(sizeof(Tile) == 16, "four tiles to a cache line");
    enum class Settled : uint8_t { kNo, kLit, kDark };

    // Transmission at map position (x, y) and depth d, from one texel or filtered.
    void TransmissionAt(double x, double y, double d, uint16_t receiverId, bool soft,
                        float t[3]) const {
        if (const Tile* tile = TileAt(x, y, soft)) {
            switch (SettledBy(*tile, d, receiverId)) {
                case Settled::kLit:
                    t[0] = t[1] = t[2] = 1.0f;
                    return;
                case Settled::kDark:
                    // Every weighed texel gives 0, and so does their mean.
                    t[0] = t[1] = t[2] = 0.0f;
                    return;
                case Settled::kNo:
                    break;
            }
        }
        WalkTexels(x, y, d, receiverId, soft, t);
    }
    // The tile whose reach holds every texel a lookup at (x, y) reads, or null where they do
    // not all lie in the texels.
    const Tile* TileAt(double x, double y, bool soft) const {
        // A soft lookup weighs the texels from one before to two after the one at (x − ½,
        // y − ½); they lie within two of the one after it, in its tile's reach.
        const double shift = soft ? 0.5 : 0.0, before = soft ? 1.0 : 0.0, after = soft ? 2.0 : 0.0;
        const double fi = std::floor(x - shift), fj = std::floor(y - shift);
        if (!(fi - before >= texels_.left && fi + after < texels_.right &&
              fj - before >= texels_.top && fj + after < texels_.bottom))
            return nullptr;
        const auto i = static_cast<int32_t>(fi + before), j = static_cast<int32_t>(fj + before);
        return &tiles_[static_cast<size_t>((j - texels_.top) >> kTileShift) * tileStride_ +
                       ((i - texels_.left) >> kTileShift)];
    }
    // Whether tile t lets the light through to depth d of the receiver in every texel it
    // reaches, or keeps it all back.
    static Settled SettledBy(const Tile& t, double d, uint16_t receiverId) {
        if (d >= t.litDepth || (t.frontId == receiverId && d >= t.frontLitDepth))
            return Settled::kLit;
        if (d < t.umbraDepth && !((t.umbraIds >> (receiverId & 15)) & 1)) return Settled::kDark;
        return Settled::kNo;
    }
    // TransmissionAt from the texel lists, where no tile settles it.
    void WalkTexels(double x, double y, double d, uint16_t receiverId, bool soft, float t[3]) const;
    // The tent weight of (x, y) over the face, 1 at its centre, 0 at and beyond its border;
    // inset shrinks the face (texels) for the filter's reach.
    float FaceWeight(double x, double y, double inset) const {
        double wx = 1.0 - std::fabs(x - centre_[0]) / (half_[0] - inset);
        double wy = 1.0 - std::fabs(y - centre_[1]) / (half_[1] - inset);
        return wx > 0 && wy > 0 ? static_cast<float>(wx * wy) : 0.0f;
    }
    // (x, y) lies so near the centre of a cube face that no neighbouring face sees it.
    bool SeenByNoOtherFace(double x, double y) const {
        // Within 40° of the axis a point lies 50° or more off the axes of the faces around,
        // which span 50° to each side: tan 40° / tan 50° of the half size, a little less to be
        // safe.
        constexpr double kOwnShare = 0.7;
        return std::fabs(x - centre_[0]) < kOwnShare * half_[0] &&
               std::fabs(y - centre_[1]) < kOwnShare * half_[1];
    }

private:
    double Row(int column, const double p[3]) const {
        return p[0] * matrix_.mat[0][column] + p[1] * matrix_.mat[1][column] +
               p[2] * matrix_.mat[2][column] + matrix_.mat[3][column];
    }
    void TexelTransmission(int32_t i, int32_t j, double d, uint16_t receiverId, float t[3]) const;
    void BuildTiles();

    // Tiles of 4 × 4 texels.
    static constexpr int32_t kTileShift = 2;

    // Two doubles worked as one; no wider alignment than a double's asked of the allocator.
    typedef double Pair __attribute__((vector_size(16), aligned(8)));

    M_Matrix4 matrix_;
    Pair columnsXY_[4];  // row k of the matrix's x and y columns
    bool perspective_;
    M_LRect texels_;
    int32_t stride_;
    SY_ShadowBlock<uint32_t> starts_;
    SY_ShadowBlock<SY_ShadowEntry> entries_;
    int32_t tileStride_;
    SY_ShadowBlock<Tile> tiles_;
    double centre_[2];
    double half_[2];
};

// The faces of a spot or point light, each a perspective planar map; neighbouring faces
// overlap and a point takes the mean of the faces that see it, weighted by how near it lies to
// each face's centre, so no seam shows.
class SY_CubicShadowMap : public SY_ShadowMap {
public:
    static constexpr int32_t kMaxFaces = 6;

    SY_CubicShadowMap() : SY_ShadowMap(Kind::kCubic) {}

    // Takes the face; at most kMaxFaces.
    void Add(std::unique_ptr<SY_PlanarShadowMap> face) { faces_[count_++] = std::move(face); }
    int32_t FaceCount() const { return count_; }
    // Hands the only face over, leaving the cube empty.
    std::unique_ptr<SY_PlanarShadowMap> TakeOnlyFace() {
        count_ = 0;
        return std::move(faces_[0]);
    }

    void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const override;
    void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const override;
    void Lookup(const double p[3], uint16_t receiverId, bool soft, float out[4]) const {
        LookupProjected([&](int32_t f, double* x, double* y,
                            double* d) { return faces_[f]->Project(p, x, y, d); },
                        receiverId, soft, out);
    }
    // Lookup of the L::kCount points p of a lane pack, lane i into t[0..2][i]; the lanes off
    // in active let all light through. A face projects the whole pack at once, the first time
    // a lane asks for it: most points are answered by the first face alone.
    template <class L>
    void TransmissionLanes(const typename L::Real p[3], typename L::Mask active,
                           uint16_t receiverId, bool soft, float t[3][L::kCount]) const {
        typename L::Real x[kMaxFaces], y[kMaxFaces], d[kMaxFaces];
        typename L::Mask in[kMaxFaces];
        bool projected[kMaxFaces] = {};
        for (int i = 0; i < L::kCount; ++i) {
            float out[4] = {1.0f, 1.0f, 1.0f, 1.0f};
            if (L::LaneOn(active, i)) {
                LookupProjected(
                    [&](int32_t f, double* xi, double* yi, double* di) {
                        if (!projected[f]) {
                            in[f] = faces_[f]->ProjectLanes<L>(p, &x[f], &y[f], &d[f]);
                            projected[f] = true;
                        }
                        *xi = L::Lane(x[f], i);
                        *yi = L::Lane(y[f], i);
                        *di = L::Lane(d[f], i);
                        return L::LaneOn(in[f], i);
                    },
                    receiverId, soft, out);
            }
            for (int c = 0; c < 3; ++c)
                t[c][i] = out[1 + c];
        }
    }

private:
    // Lookup of the point that project(f, &x, &y, &d) projects onto face f, false where the
    // face does not see it.
    template <class Project>
    void LookupProjected(Project project, uint16_t receiverId, bool soft, float out[4]) const {
        // The soft filter reaches two texels beyond the point, so its faces end two texels
        // sooner.
        double inset = soft ? 2.0 : 0.0;
        float sum[3] = {0, 0, 0}, weights = 0;
        for (int32_t f = 0; f < count_; ++f) {
            double x, y, d;
            if (!project(f, &x, &y, &d)) continue;
            if (faces_[f]->SeenByNoOtherFace(x, y)) {
                faces_[f]->TransmissionAt(x, y, d, receiverId, soft, out + 1);
                return;
            }
            float w = faces_[f]->FaceWeight(x, y, inset);
            if (w <= 0) continue;
            float t[3];
            faces_[f]->TransmissionAt(x, y, d, receiverId, soft, t);
            for (int c = 0; c < 3; ++c)
                sum[c] += w * t[c];
            weights += w;
        }
        if (weights <= 0) {
            out[1] = out[2] = out[3] = 1.0f;
            return;
        }
        for (int c = 0; c < 3; ++c)
            out[1 + c] = sum[c] / weights;
    }

    std::unique_ptr<SY_PlanarShadowMap> faces_[kMaxFaces];
    int32_t count_ = 0;
};

inline const SY_PlanarShadowMap* SY_ShadowMap::AsPlanar() const {
    return kind_ == Kind::kPlanar ? static_cast<const SY_PlanarShadowMap*>(this) : nullptr;
}

inline const SY_CubicShadowMap* SY_ShadowMap::AsCubic() const {
    return kind_ == Kind::kCubic ? static_cast<const SY_CubicShadowMap*>(this) : nullptr;
}

inline void SY_ShadowMap::Lookup(const double p[3], uint16_t receiverId, bool soft,
                                 float out[4]) const {
    switch (kind_) {
        case Kind::kPlanar:
            static_cast<const SY_PlanarShadowMap*>(this)->Lookup(p, receiverId, soft, out);
            return;
        case Kind::kCubic:
            static_cast<const SY_CubicShadowMap*>(this)->Lookup(p, receiverId, soft, out);
            return;
        case Kind::kOther:
            break;
    }
    if (soft)
        SoftLookup(p, receiverId, out);
    else
        HardLookup(p, receiverId, out);
}
