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
// builds it, concurrent callers wait for it. Throws std::bad_alloc when memory runs out and
// PF_UnexpectedBitDepth for any other depth.
const PF_AreaTable& PF_BuildAreaTable(const PF_World& world, int16_t bitDepth);

// The area table of a world of pixel type P, built on first use.
template <class P>
inline const PF_AreaTable& PF_AreaTableOf(const PF_World& world) {
    const PF_AreaTable* table = world.samplingTables.area.load(std::memory_order_acquire);
    return table ? *table : PF_BuildAreaTable(world, PF_PixelTraits<P>::kBitDepth);
}

namespace pf_sampling {

// Sample positions and radii are 16.16 fixed point texels.
inline constexpr float kFixedToTexels = 1.0f / 65536.0f;
// Area radii are capped at 100 texels: the renderer asks no more, and the integer sums of a
// box that size stay exact.
inline constexpr int32_t kMaxAreaRadius = 100 << 16;

// The texel at (x, y), or transparent outside the texture.
template <class P>
inline P TexelOrClear(const PF_World& w, int32_t x, int32_t y) {
    if (static_cast<uint32_t>(x) >= static_cast<uint32_t>(w.width) ||
        static_cast<uint32_t>(y) >= static_cast<uint32_t>(w.height))
        return P{};
    return *w.PixelAt<P>(x, y);
}

// The n × n texels from (x, y): rows[j] points at row j's texels, in the texture when the
// block lies inside it, otherwise in copy, with transparent texels for those outside.
template <class P, int n>
inline void TexelBlock(const PF_World& w, int32_t x, int32_t y, P (&copy)[n * n],
                       const P* (&rows)[n]) {
    if (x >= 0 && y >= 0 && x + n <= w.width && y + n <= w.height) {
        const char* first = reinterpret_cast<const char*>(w.PixelAt<P>(x, y));
        for (int j = 0; j < n; ++j)
            rows[j] = reinterpret_cast<const P*>(first + j * static_cast<ptrdiff_t>(w.rowBytes));
    } else {
        for (int j = 0; j < n; ++j) {
            for (int i = 0; i < n; ++i)
                copy[j * n + i] = TexelOrClear<P>(w, x + i, y + j);
            rows[j] = copy + j * n;
        }
    }
}

// The weights (1 − f, f) of the fractions of the position xy (lanes x, y), as (65536 − fx, fx,
// 65536 − fy, fy): whole numbers, so that a texel centre gets the weight 65536 exactly. Worked
// out in integers, which keeps the weights' latency below the texels'.
inline PF_Float4 LinearWeights(__m128i xy) {
    __m128i fractions =
        _mm_and_si128(_mm_shuffle_epi32(xy, _MM_SHUFFLE(1, 1, 0, 0)), _mm_set1_epi32(0xFFFF));
    // |f − 65536| and |f − 0|
    return _mm_cvtepi32_ps(
        _mm_abs_epi32(_mm_sub_epi32(fractions, _mm_setr_epi32(65536, 0, 65536, 0))));
}

// Catmull-Rom weights of the four taps around a fraction t: interpolating, so a texel centre
// returns the texel itself. Lane i holds tap i's cubic, evaluated by Horner's rule.
inline PF_Float4 CubicWeights(float t) {
    PF_Float4 v = {t, t, t, t};
    return ((PF_Float4{-0.5f, 1.5f, -1.5f, 0.5f} * v + PF_Float4{1.0f, -2.5f, 2.0f, -0.5f}) * v +
            PF_Float4{-0.5f, 0.0f, 0.5f, 0.0f}) *
               v +
           PF_Float4{0.0f, 1.0f, 0.0f, 0.0f};
}

// Lane i of v in all four lanes.
template <int i>
inline PF_Float4 Broadcast(PF_Float4 v) {
    return __builtin_shufflevector(v, v, i, i, i, i);
}

}  // namespace pf_sampling

// Both filters weight each texel's premultiplied value: with w the filter weight and a the
// texel's alpha, the sample's alpha is Σ w·a and its colour Σ w·a·c / Σ w·a. So the texels'
// alphas are folded into the weights first, and colour planes are multiplied only once.

namespace pf_sampling {

// The bilinear sample of PF_SubpixelBilinear with the position as lanes (x, y).
template <class P>
[[gnu::always_inline]] inline void BilinearLanes(__m128i xy, const PF_SampPB& pb, P* out) {
    const int32_t x = _mm_cvtsi128_si32(xy), y = _mm_extract_epi32(xy, 1);
    P copy[4];
    const P* rows[2];
    TexelBlock<P, 2>(*pb.src, x >> 16, y >> 16, copy, rows);
    if constexpr (PF_PixelTraits<P>::kIsFloat) {
        // Float texels need no conversion, and interpolating them premultiplied one by one
        // takes fewer shuffles than gathering them into planes.
        PF_Float4 fx = PF_Float4{} + static_cast<float>(x & 0xFFFF) * kFixedToTexels;
        PF_Float4 fy = PF_Float4{} + static_cast<float>(y & 0xFFFF) * kFixedToTexels;
        PF_Float4 t00 = PF_LoadPremultiplied(rows[0][0]), t01 = PF_LoadPremultiplied(rows[0][1]);
        PF_Float4 t10 = PF_LoadPremultiplied(rows[1][0]), t11 = PF_LoadPremultiplied(rows[1][1]);
        PF_Float4 top = t00 + (t01 - t00) * fx;
        PF_Float4 bottom = t10 + (t11 - t10) * fx;
        PF_StorePremultiplied(top + (bottom - top) * fy, out);
    } else {
        PF_Float4 f = LinearWeights(xy);
        PF_Float4 weights =
            __builtin_shufflevector(f, f, 0, 1, 0, 1) * __builtin_shufflevector(f, f, 2, 2, 3, 3);
        PF_Planes t = PF_LoadPlanes(rows[0], rows[1]);
        PF_Float4 wa = weights * t.alpha;
        // The weights sum to 65536².
        PF_StorePremultiplied(PF_SumLanes(wa, wa * t.red, wa * t.green, wa * t.blue), out,
                              4294967296.0f);
    }
}

}  // namespace pf_sampling

// Bilinear sample at (x, y).
template <class P>
inline void PF_SubpixelBilinear(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    pf_sampling::BilinearLanes(_mm_setr_epi32(x, y, 0, 0), pb, out);
}

// Bicubic (Catmull-Rom) sample at (x, y).
template <class P>
inline void PF_SubpixelBicubic(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    using namespace pf_sampling;
    P copy[16];
    const P* rows[4];
    TexelBlock<P, 4>(*pb.src, (x >> 16) - 1, (y >> 16) - 1, copy, rows);
    PF_Float4 wx = CubicWeights(static_cast<float>(x & 0xFFFF) * kFixedToTexels);
    PF_Float4 wy = CubicWeights(static_cast<float>(y & 0xFFFF) * kFixedToTexels);
    PF_Float4 rowWeights[4] = {wx * Broadcast<0>(wy), wx * Broadcast<1>(wy), wx * Broadcast<2>(wy),
                               wx * Broadcast<3>(wy)};
    PF_Float4 sums[4] = {};
    for (int j = 0; j < 4; ++j) {
        PF_Planes t = PF_LoadPlanes(rows[j], rows[j] + 2);
        PF_Float4 wa = rowWeights[j] * t.alpha;
        sums[0] += wa;
        sums[1] += wa * t.red;
        sums[2] += wa * t.green;
        sums[3] += wa * t.blue;
    }
    PF_StorePremultiplied(PF_SumLanes(sums[0], sums[1], sums[2], sums[3]), out);
}

namespace pf_sampling {

// The box sum of an area sample over a box of any place and size: edges cut to the texture
// where the box reaches beyond it, and 8-bit sums of up to 32 bits. rx and ry are clamped.
template <class P>
[[gnu::noinline]] PF_Float4 AreaSumAnyBox(const PF_World& w, const PF_AreaTable& table, int32_t x,
                                          int32_t y, int64_t rx, int64_t ry) {
    using Traits = PF_PixelTraits<P>;
    // Texel centres at integers become edges at integers.
    int64_t cx = int64_t(x) + 32768, cy = int64_t(y) + 32768;
    PF_BoxAxis ax, ay;
    // Radii of at least half a texel make boxes of at least a texel.
    if (cx - rx >= 0 && cy - ry >= 0 && cx + rx <= int64_t(w.width) << 16 &&
        cy + ry <= int64_t(w.height) << 16) {
        ax = PF_MakeBoxAxisInside(cx - rx, cx + rx, w.width);
        ay = PF_MakeBoxAxisInside(cy - ry, cy + ry, w.height);
    } else {
        ax = PF_MakeBoxAxisFixed(cx - rx, cx + rx, w.width);
        ay = PF_MakeBoxAxisFixed(cy - ry, cy + ry, w.height);
    }
    if constexpr (Traits::kIsFloat) {
        using Cells = PF_BoxCellsPixel<PF_PixelDouble>;
        return PF_BoxSum<Cells>(table.Cells<PF_PixelDouble>(), table.Stride(), ax, ay);
    } else if constexpr (Traits::kBitDepth == 16) {
        using Cells = PF_BoxCellsUint64;
        return PF_BoxSum<Cells>(table.Cells<PF_AreaSum64>(), table.Stride(), ax, ay);
    } else {
        // Sums of alpha × colour (at most 65025 a texel) fit 31 bits in boxes of up to 33025
        // texels: radii below about 90.
        int32_t texels = (ax.edge[3] - ax.edge[0]) * (ay.edge[3] - ay.edge[0]);
        const PF_Uint4* cells = table.Cells<PF_Uint4>();
        return texels <= 33025 ? PF_BoxSum<PF_BoxCellsUint<true>>(cells, table.Stride(), ax, ay)
                               : PF_BoxSum<PF_BoxCellsUint<false>>(cells, table.Stride(), ax, ay);
    }
}

// 8-bit boxes with radii up to this (89.5 texels, 16.16) span at most 181 texels a side: their
// sums stay below 2^31.
inline constexpr int32_t kSmallBoxRadius = 179 << 15;

// Boxes about the lanes' positions with the lanes' radii (16.16 texels), over textures of the
// lanes' sizes: the radii as clamped, the low and high edges, and the lanes that the general case
// must take: boxes reaching beyond the texture, and, where kSmallOnly, boxes too wide for 8-bit
// sums in 31 bits.
struct BoxLanes {
    __m128i radii, lo, hi, outside;
};

template <bool kSmallOnly>
[[gnu::always_inline]] inline BoxLanes MakeBoxLanes(__m128i xy, __m128i radii, __m128i sizes) {
    BoxLanes b;
    b.radii =
        _mm_min_epi32(_mm_max_epi32(radii, _mm_set1_epi32(32768)), _mm_set1_epi32(kMaxAreaRadius));
    // Edge coordinates in 32 bits. Where one wraps, the box's low end comes out above its high
    // end, which sends it to the general case with the rest that reach beyond the texture;
    // sizes from 32768 texels on cannot be exceeded in 32 bits.
    const __m128i limits = _mm_blendv_epi8(_mm_slli_epi32(sizes, 16), _mm_set1_epi32(INT32_MAX),
                                           _mm_cmpgt_epi32(sizes, _mm_set1_epi32(32767)));
    const __m128i c = _mm_add_epi32(xy, _mm_set1_epi32(32768));
    b.lo = _mm_sub_epi32(c, b.radii);
    b.hi = _mm_add_epi32(c, b.radii);
    b.outside = _mm_or_si128(
        _mm_or_si128(_mm_cmpgt_epi32(_mm_setzero_si128(), b.lo), _mm_cmpgt_epi32(b.hi, limits)),
        _mm_cmpgt_epi32(b.lo, b.hi));
    if constexpr (kSmallOnly)
        b.outside =
            _mm_or_si128(b.outside, _mm_cmpgt_epi32(b.radii, _mm_set1_epi32(kSmallBoxRadius)));
    return b;
}

// The box average of PF_AreaSample with the position and the radii as lanes (x, y) of 16.16
// texels. Boxes inside the texture, the usual case, take both axes at once in the lanes; the
// edges, weights and sums are those of the general case, term by term.
template <class P>
[[gnu::always_inline]] inline void AreaSampleLanes(__m128i xy, __m128i radii, const PF_SampPB& pb,
                                                   P* out) {
    using Traits = PF_PixelTraits<P>;
    const PF_World& w = *pb.src;
    const PF_AreaTable& table = PF_AreaTableOf<P>(w);
    const __m128i sizes = _mm_setr_epi32(w.width, w.height, 0, 0);
    const auto [r, lo, hi, outside] =
        MakeBoxLanes < !Traits::kIsFloat && Traits::kBitDepth == 8 > (xy, radii, sizes);
    const PF_Float4 rf = _mm_cvtepi32_ps(r);
    const float area = 4.0f * rf[0] * rf[1] * (kFixedToTexels * kFixedToTexels);
    if (__builtin_expect((_mm_movemask_epi8(outside) & 0xFF) != 0, 0)) {
        PF_StorePremultiplied(
            AreaSumAnyBox<P>(w, table, _mm_cvtsi128_si32(xy), _mm_extract_epi32(xy, 1),
                             _mm_cvtsi128_si32(r), _mm_extract_epi32(r, 1)),
            out, area);
        return;
    }
    // The first texels' covered shares 1 − frac(lo) and the last ones' frac(hi), lanes
    // (x, y, x, y), in texels.
    const __m128i fractions = _mm_and_si128(_mm_unpacklo_epi64(lo, hi), _mm_set1_epi32(0xFFFF));
    const PF_Float4 shares = _mm_cvtepi32_ps(_mm_abs_epi32(
                                 _mm_sub_epi32(fractions, _mm_setr_epi32(65536, 65536, 0, 0)))) *
                             kFixedToTexels;
    // Corner weights share − 1 of the first edges and 1 − share of the last ones.
    const PF_Float4 one = {1.0f, 1.0f, 1.0f, 1.0f};
    const PF_Float4 inner = _mm_blend_ps(shares, one, 0b1100) - _mm_blend_ps(shares, one, 0b0011);
    const float cx[3] = {inner[0], inner[2], shares[2]}, cy[3] = {inner[1], inner[3], shares[3]};
    const __m128i first = _mm_srai_epi32(lo, 16), last = _mm_srai_epi32(hi, 16);
    const __m128i end = _mm_min_epi32(_mm_add_epi32(last, _mm_set1_epi32(1)), sizes);
    const int32_t x0 = _mm_cvtsi128_si32(first), y0 = _mm_extract_epi32(first, 1);
    const int32_t ex[4] = {x0, x0 + 1, _mm_cvtsi128_si32(last), _mm_cvtsi128_si32(end)};
    const int32_t ey[4] = {y0, y0 + 1, _mm_extract_epi32(last, 1), _mm_extract_epi32(end, 1)};
    PF_Float4 sum;
    if constexpr (Traits::kIsFloat) {
        using Cells = PF_BoxCellsPixel<PF_PixelDouble>;
        sum = PF_BoxSumAtCorners<Cells>(table.Cells<PF_PixelDouble>(), table.Stride(), ex, ey, cx,
                                        cy);
    } else if constexpr (Traits::kBitDepth == 16) {
        using Cells = PF_BoxCellsUint64;
        sum =
            PF_BoxSumAtCorners<Cells>(table.Cells<PF_AreaSum64>(), table.Stride(), ex, ey, cx, cy);
    } else {
        using Cells = PF_BoxCellsUint<true>;
        sum = PF_BoxSumAtCorners<Cells>(table.Cells<PF_Uint4>(), table.Stride(), ex, ey, cx, cy);
    }
    PF_StorePremultiplied(sum, out, area);
}

}  // namespace pf_sampling

// Box average of the texels over [x − xRadius, x + xRadius] × [y − yRadius, y + yRadius], texel
// squares weighted by the share the box covers. Radii are taken between half a texel (where the
// box equals bilinear interpolation) and 100 texels. The texture's table is built on first use.
template <class P>
inline void PF_AreaSample(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    pf_sampling::AreaSampleLanes(_mm_setr_epi32(x, y, 0, 0),
                                 _mm_setr_epi32(pb.xRadius, pb.yRadius, 0, 0), pb, out);
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
