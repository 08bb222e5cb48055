// Shadow maps: what a light knows of the layers that stand between it and a point.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

#include "m_matrix.h"
#include "u_memory.h"

// Base of the planar and cubic maps; each light state owns at most one. Lookups run on many
// render threads at once.
class SY_ShadowMap : public U_MemTrackedObject {
public:
    virtual ~SY_ShadowMap() = default;
    // The light that reaches the world point p of the receiving layer: out[1..3] get the red,
    // green and blue transmission in 0..1. A layer never shadows itself.
    virtual void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;
    // As HardLookup, filtered over the neighbouring texels for soft shadow edges.
    virtual void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;
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

    // The map position (x, y) and depth d of p (larger is nearer the light); false for a point
    // behind a spot or point light's face, or behind a parallel light's plane.
    bool Project(const double p[3], double* x, double* y, double* d) const;
    // Transmission at map position (x, y) and depth d, from one texel or filtered.
    void TransmissionAt(double x, double y, double d, uint16_t receiverId, bool soft,
                        float t[3]) const;
    // The tent weight of (x, y) over the face, 1 at its centre, 0 at and beyond its border;
    // inset shrinks the face (texels) for the filter's reach.
    float FaceWeight(double x, double y, double inset) const;
    // (x, y) lies so near the centre of a cube face that no neighbouring face sees it.
    bool SeenByNoOtherFace(double x, double y) const;

private:
    // What every texel a lookup in a tile reads, two texels around the tile included, gives
    // a receiver: all of the light or none of it, found with one read instead of a walk over
    // up to sixteen texel lists. Neither answer holds where shadow edges run.
    struct Tile {
        float litDepth;       // a point at least this near the light is lit in every texel
        float frontLitDepth;  // so is a point of layer frontId at least this near
        float umbraDepth;     // a point farther than this gets no light in any texel,
        uint32_t umbraIds;    // unless it is of a layer whose bit (id mod 32) is set
        uint16_t frontId;     // a layer that sees past its own occluders; 0xFFFF for none
    };
    enum class Settled { kNo, kLit, kDark };

    void Lookup(const double p[3], uint16_t receiverId, bool soft, float out[4]) const;
    void TexelTransmission(int32_t i, int32_t j, double d, uint16_t receiverId, float t[3]) const;
    void BuildTiles();
    // Whether the texels read around texel (i, j), which lies in the texels, all let the light
    // through to depth d of the receiver, or all keep it back.
    Settled SettledAt(int32_t i, int32_t j, double d, uint16_t receiverId) const {
        const Tile& t = tiles_[static_cast<size_t>((j - texels_.top) >> kTileShift) * tileStride_ +
                               ((i - texels_.left) >> kTileShift)];
        if (d >= t.litDepth || (t.frontId == receiverId && d >= t.frontLitDepth))
            return Settled::kLit;
        if (d < t.umbraDepth && !((t.umbraIds >> (receiverId & 31)) & 1)) return Settled::kDark;
        return Settled::kNo;
    }

    // Tiles of 4 × 4 texels.
    static constexpr int32_t kTileShift = 2;

    M_Matrix4 matrix_;
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

private:
    void Lookup(const double p[3], uint16_t receiverId, bool soft, float out[4]) const;

    std::unique_ptr<SY_PlanarShadowMap> faces_[kMaxFaces];
    int32_t count_ = 0;
};
