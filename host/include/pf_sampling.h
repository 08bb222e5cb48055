// Texture samplers of the host's pixel library. Positions and radii are 16.16 fixed point in
// texel units with texel (i, j) centred on (i, j). Filtering is done in premultiplied form and
// the result is straight colour, so transparent texels never bleed their colour; outside the
// texture everything is transparent, so edges fade out over one texel.
#pragma once

#include <cstddef>
#include <cstdint>

#include "pf_box_sum.h"
#include "pf_pixel.h"
#include "pf_vec4.h"
#include "pf_world.h"

// The sampling block: footprint half-sizes (16.16 texels) and the texture.
struct PF_SampPB {
    int32_t xRadius = 0;
    int32_t yRadius = 0;
    const PF_World* src = nullptr;
};

// Premultiplied prefix sums of one texture, so that a box average costs the same at any size.
// Integer textures keep exact sums of alpha and alpha × colour, modulo 2^32 for 8-bit and 2^64
// for 16-bit; float textures keep double sums. Cell (x, y) of (width + 1) × (height + 1) holds
// the sum over texels [0, x) × [0, y).
class PF_AreaTable {
public:
    int32_t width = 0;
    int32_t height = 0;
    void* cells = nullptr;
    size_t bytes = 0;

    template <class Cell>
    const Cell* Cells() const {
        return static_cast<const Cell*>(cells);
    }
    ptrdiff_t Stride() const { return static_cast<ptrdiff_t>(width) + 1; }
};

// Builds the area table of a world of the given bit depth (8, 16 or 32); the first caller
// builds it, concurrent callers wait for it. Throws std::bad_alloc when memory runs out.
const PF_AreaTable& PF_BuildAreaTable(const PF_World& world, int16_t bitDepth);

// The area table of a world of pixel type P, built on first use.
template <class P>
inline const PF_AreaTable& PF_AreaTableOf(const PF_World& world) {
    const PF_AreaTable* table = world.samplingTables.area.load(std::memory_order_acquire);
    return table ? *table : PF_BuildAreaTable(world, PF_PixelTraits<P>::kBitDepth);
}

namespace pf_sampling {

inline constexpr float kFixedToTexels = 1.0f / 65536.0f;
// Area radii are capped at 100 texels: the renderer asks no more, and the integer sums of a
// box that size stay exact.
inline constexpr int32_t kMaxAreaRadius = 100 << 16;

template <class P>
inline const P& Texel(const PF_World& w, int32_t x, int32_t y) {
    return *w.PixelAt<P>(x, y);
}

// Texel (x, y) premultiplied, or transparent outside the texture.
template <class P>
inline PF_Float4 TexelOrClear(const PF_World& w, int32_t x, int32_t y) {
    if (static_cast<uint32_t>(x) >= static_cast<uint32_t>(w.width) ||
        static_cast<uint32_t>(y) >= static_cast<uint32_t>(w.height))
        return PF_Float4{0.0f, 0.0f, 0.0f, 0.0f};
    return PF_LoadPremultiplied(Texel<P>(w, x, y));
}

// Catmull-Rom weights of the four taps around a fraction t: interpolating, so a texel centre
// returns the texel itself.
inline void CubicWeights(float t, float w[4]) {
    w[0] = ((-0.5f * t + 1.0f) * t - 0.5f) * t;
    w[1] = (1.5f * t - 2.5f) * t * t + 1.0f;
    w[2] = ((-1.5f * t + 2.0f) * t + 0.5f) * t;
    w[3] = (0.5f * t - 0.5f) * t * t;
}

}  // namespace pf_sampling

// Bilinear sample at (x, y).
template <class P>
inline void PF_SubpixelBilinear(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    using namespace pf_sampling;
    const PF_World& w = *pb.src;
    int32_t ix = x >> 16, iy = y >> 16;
    float fx = static_cast<float>(x & 0xFFFF) * kFixedToTexels;
    float fy = static_cast<float>(y & 0xFFFF) * kFixedToTexels;
    PF_Float4 t0[2], t1[2];  // rows iy and iy + 1
    if (ix >= 0 && iy >= 0 && ix + 1 < w.width && iy + 1 < w.height) {
        PF_LoadPremultipliedRow<2>(w.PixelAt<P>(ix, iy), t0);
        PF_LoadPremultipliedRow<2>(w.PixelAt<P>(ix, iy + 1), t1);
    } else {
        for (int i = 0; i < 2; ++i) {
            t0[i] = TexelOrClear<P>(w, ix + i, iy);
            t1[i] = TexelOrClear<P>(w, ix + i, iy + 1);
        }
    }
    PF_Float4 top = t0[0] + (t0[1] - t0[0]) * fx;
    PF_Float4 bottom = t1[0] + (t1[1] - t1[0]) * fx;
    PF_StorePremultiplied(top + (bottom - top) * fy, out);
}

// Bicubic (Catmull-Rom) sample at (x, y).
template <class P>
inline void PF_SubpixelBicubic(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    using namespace pf_sampling;
    const PF_World& w = *pb.src;
    int32_t ix = (x >> 16) - 1, iy = (y >> 16) - 1;
    float wx[4], wy[4];
    CubicWeights(static_cast<float>(x & 0xFFFF) * kFixedToTexels, wx);
    CubicWeights(static_cast<float>(y & 0xFFFF) * kFixedToTexels, wy);
    // Sums are taken in pairs so that few additions wait on each other.
    PF_Float4 rows[4];
    if (ix >= 0 && iy >= 0 && ix + 3 < w.width && iy + 3 < w.height) {
        for (int j = 0; j < 4; ++j) {
            PF_Float4 t[4];
            PF_LoadPremultipliedRow<4>(w.PixelAt<P>(ix, iy + j), t);
            rows[j] = (t[0] * wx[0] + t[1] * wx[1]) + (t[2] * wx[2] + t[3] * wx[3]);
        }
    } else {
        for (int j = 0; j < 4; ++j) {
            rows[j] = PF_Float4{0.0f, 0.0f, 0.0f, 0.0f};
            for (int i = 0; i < 4; ++i)
                rows[j] += TexelOrClear<P>(w, ix + i, iy + j) * wx[i];
        }
    }
    PF_StorePremultiplied((rows[0] * wy[0] + rows[1] * wy[1]) + (rows[2] * wy[2] + rows[3] * wy[3]),
                          out);
}

// Box average of the texels over [x − xRadius, x + xRadius] × [y − yRadius, y + yRadius], texel
// squares weighted by the share the box covers. Radii are taken between half a texel (where the
// box equals bilinear interpolation) and 100 texels. The texture's table is built on first use.
template <class P>
inline void PF_AreaSample(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    using namespace pf_sampling;
    using Traits = PF_PixelTraits<P>;
    const PF_World& w = *pb.src;
    const PF_AreaTable& table = PF_AreaTableOf<P>(w);
    int64_t rx = std::clamp(pb.xRadius, 32768, kMaxAreaRadius);
    int64_t ry = std::clamp(pb.yRadius, 32768, kMaxAreaRadius);
    // Texel centres at integers become edges at integers.
    int64_t cx = int64_t(x) + 32768, cy = int64_t(y) + 32768;
    PF_BoxAxis ax = PF_MakeBoxAxisFixed(cx - rx, cx + rx, w.width);
    PF_BoxAxis ay = PF_MakeBoxAxisFixed(cy - ry, cy + ry, w.height);
    PF_Float4 sum;
    if constexpr (Traits::kIsFloat) {
        using Cells = PF_BoxCellsPixel<PF_PixelDouble>;
        sum = PF_BoxSum<Cells>(table.Cells<PF_PixelDouble>(), table.Stride(), ax, ay);
    } else if constexpr (Traits::kBitDepth == 16) {
        using Cells = PF_BoxCellsPixel<PF_AreaSum64>;
        sum = PF_BoxSum<Cells>(table.Cells<PF_AreaSum64>(), table.Stride(), ax, ay);
    } else {
        // Sums of alpha × colour (at most 65025 a texel) fit 31 bits in boxes of up to 33025
        // texels: radii below about 90.
        int32_t texels = (ax.edge[3] - ax.edge[0]) * (ay.edge[3] - ay.edge[0]);
        const PF_Uint4* cells = table.Cells<PF_Uint4>();
        sum = texels <= 33025 ? PF_BoxSum<PF_BoxCellsUint<true>>(cells, table.Stride(), ax, ay)
                              : PF_BoxSum<PF_BoxCellsUint<false>>(cells, table.Stride(), ax, ay);
    }
    float area =
        4.0f * static_cast<float>(rx) * static_cast<float>(ry) * (kFixedToTexels * kFixedToTexels);
    PF_StorePremultiplied(sum, out, 1.0f / area);
}

// The host's entry points, by the names the renderer calls. progress is not used (pass null).
inline void PF_SubpixelSample_Straight(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                       PF_Pixel8* out) {
    PF_SubpixelBilinear(x, y, *pb, out);
}
inline void PF_SubpixelSample_Straight16(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                         PF_Pixel16* out) {
    PF_SubpixelBilinear(x, y, *pb, out);
}
inline void PF_SubpixelBilinearFloat(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                     PF_PixelFloat* out) {
    PF_SubpixelBilinear(x, y, *pb, out);
}
inline void PF_SubpixelBicubic8(void*, int32_t x, int32_t y, const PF_SampPB* pb, PF_Pixel8* out) {
    PF_SubpixelBicubic(x, y, *pb, out);
}
inline void PF_SubpixelBicubic16(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                 PF_Pixel16* out) {
    PF_SubpixelBicubic(x, y, *pb, out);
}
inline void PF_SubpixelBicubicFloat(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                    PF_PixelFloat* out) {
    PF_SubpixelBicubic(x, y, *pb, out);
}
// The box average has no quality levels: both of the caller's qualities get the exact box.
template <class P>
inline void PF_AreaSample_CPlusPlus(void*, int32_t x, int32_t y, const PF_SampPB* pb, P* out) {
    PF_AreaSample(x, y, *pb, out);
}
inline void PF_AreaSample_Straight(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                   PF_Pixel8* out) {
    PF_AreaSample(x, y, *pb, out);
}
inline void PF_AreaSample_Straight16(void*, int32_t x, int32_t y, const PF_SampPB* pb,
                                     PF_Pixel16* out) {
    PF_AreaSample(x, y, *pb, out);
}
