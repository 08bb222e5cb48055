// Area samples of two neighbouring pixels at once in AVX registers. This file alone is compiled
// for AVX2 (without fused multiply-add, which would round differently), and it is called only
// where SY_ProcessorHasAvx2() holds. Every lane takes the operation the one-pixel path
// (samplers.h, pf_sampling.h) takes for its value, so each pixel agrees bit for bit with its
// sample alone. Of the shared inline functions it calls only those that are always inlined, so
// that none is compiled here for AVX2 and then taken by other files.
#include <immintrin.h>

#include <atomic>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "renderer/raster/samplers.h"

namespace {

// Lanes (u0, v0, u1, v1): the first pixel's pair, then the second's.
__m256d Pair(__m128d first, __m128d second) {
    return _mm256_insertf128_pd(_mm256_castpd128_pd256(first), second, 1);
}

// Rounds halves away from zero, as sy_sampling::RoundAway does.
__m128i RoundAwayFour(__m256d v) {
    const __m256d half = _mm256_or_pd(_mm256_and_pd(v, _mm256_set1_pd(-0.0)), _mm256_set1_pd(0.5));
    return _mm256_cvttpd_epi32(_mm256_add_pd(v, half));
}

// The 8-bit table cells of both pixels, the first in the low half.
__m256i Cells8(const PF_Uint4* first, const PF_Uint4* second) {
    return _mm256_loadu2_m128i(reinterpret_cast<const __m128i*>(second),
                               reinterpret_cast<const __m128i*>(first));
}

// Both 8-bit pixels' box sums (PF_BoxSumAtCorners with cells below 2^31), one to a half; the
// weights hold each pixel's corner weights in all lanes of its half.
__m256 BoxSums8(const PF_Uint4* cells, ptrdiff_t stride, const int32_t (&ex)[2][4],
                const int32_t (&ey)[2][4], const __m256 (&cx)[3], const __m256 (&cy)[3]) {
    const PF_Uint4* top[2] = {cells + ey[0][0] * stride, cells + ey[1][0] * stride};
    __m256i t[4];
    for (int k = 0; k < 4; ++k)
        t[k] = Cells8(top[0] + ex[0][k], top[1] + ex[1][k]);
    __m256 rows[3];
    for (int l = 1; l < 4; ++l) {
        const PF_Uint4* row[2] = {cells + ey[0][l] * stride, cells + ey[1][l] * stride};
        const __m256i left = _mm256_sub_epi32(Cells8(row[0] + ex[0][0], row[1] + ex[1][0]), t[0]);
        __m256 box[3];
        for (int k = 1; k < 4; ++k) {
            const __m256i cell = Cells8(row[0] + ex[0][k], row[1] + ex[1][k]);
            box[k - 1] = _mm256_cvtepi32_ps(_mm256_sub_epi32(_mm256_sub_epi32(cell, t[k]), left));
        }
        rows[l - 1] =
            _mm256_add_ps(_mm256_add_ps(_mm256_mul_ps(box[0], cx[0]), _mm256_mul_ps(box[1], cx[1])),
                          _mm256_mul_ps(box[2], cx[2]));
    }
    return _mm256_add_ps(
        _mm256_add_ps(_mm256_mul_ps(rows[0], cy[0]), _mm256_mul_ps(rows[1], cy[1])),
        _mm256_mul_ps(rows[2], cy[2]));
}

// Both 8-bit pixels' sums, one to a half, stored as PF_StorePremultiplied stores each with its
// alpha divisor: alpha over the divisor, colour over alpha, rounded and kept in range; a pixel
// whose alpha rounds to 0 is clear.
void StorePair8(__m256 sum, const float (&divisor)[2], PF_Pixel8* firstOut, PF_Pixel8* secondOut) {
    const __m256 divisors =
        _mm256_blend_ps(_mm256_permute_ps(sum, 0x00),
                        _mm256_setr_ps(divisor[0], 0, 0, 0, divisor[1], 0, 0, 0), 0b00010001);
    const __m256 channels = _mm256_add_ps(
        _mm256_min_ps(_mm256_set1_ps(255.0f), _mm256_div_ps(sum, divisors)), _mm256_set1_ps(0.5f));
    const __m256i lanes = _mm256_cvttps_epi32(channels);
    const __m128i shorts =
        _mm_packs_epi32(_mm256_castsi256_si128(lanes), _mm256_extracti128_si256(lanes, 1));
    const uint64_t bytes =
        static_cast<uint64_t>(_mm_cvtsi128_si64(_mm_packus_epi16(shorts, shorts)));
    alignas(32) float alphas[8];
    _mm256_store_ps(alphas, sum);
    const uint32_t texels[2] = {
        alphas[0] > 0.5f * divisor[0] ? static_cast<uint32_t>(bytes) : 0u,
        alphas[4] > 0.5f * divisor[1] ? static_cast<uint32_t>(bytes >> 32) : 0u};
    std::memcpy(firstOut, &texels[0], sizeof texels[0]);
    std::memcpy(secondOut, &texels[1], sizeof texels[1]);
}

// 16-bit and float table cells (PF_BoxCellsUint64, PF_BoxCellsPixel<PF_PixelDouble>): one
// pixel's four channels in one register of four doubles.
struct WideCells16 {
    using Stored = PF_AreaSum64;
    static __m256i Load(const Stored* p) {
        return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(p));
    }
    static __m256i Sub(__m256i a, __m256i b) { return _mm256_sub_epi64(a, b); }
    static __m256d Widen(__m256i r) {
        const __m256d two52 = _mm256_set1_pd(4503599627370496.0);
        return _mm256_sub_pd(_mm256_castsi256_pd(_mm256_or_si256(r, _mm256_castpd_si256(two52))),
                             two52);
    }
};
struct WideCellsFloat {
    using Stored = PF_PixelDouble;
    static __m256d Load(const Stored* p) { return _mm256_loadu_pd(&p->alpha); }
    static __m256d Sub(__m256d a, __m256d b) { return _mm256_sub_pd(a, b); }
    static __m256d Widen(__m256d r) { return r; }
};

// One pixel's box sum (PF_BoxSumAtCorners) in registers of four doubles.
template <class Cells>
PF_Float4 WideBoxSum(const typename Cells::Stored* table, ptrdiff_t stride, const int32_t (&ex)[4],
                     const int32_t (&ey)[4], const float (&cx)[3], const float (&cy)[3]) {
    using Stored = typename Cells::Stored;
    auto times = [](__m256d v, float w) { return _mm256_mul_pd(v, _mm256_set1_pd(w)); };
    const Stored* top = table + ey[0] * stride;
    const auto t0 = Cells::Load(top + ex[0]), t1 = Cells::Load(top + ex[1]),
               t2 = Cells::Load(top + ex[2]), t3 = Cells::Load(top + ex[3]);
    __m256d rows[3];
    for (int l = 1; l < 4; ++l) {
        const Stored* row = table + ey[l] * stride;
        const auto left = Cells::Sub(Cells::Load(row + ex[0]), t0);
        auto box = [&](int32_t k, const auto& t) {
            return Cells::Widen(Cells::Sub(Cells::Sub(Cells::Load(row + ex[k]), t), left));
        };
        rows[l - 1] =
            _mm256_add_pd(_mm256_add_pd(times(box(1, t1), cx[0]), times(box(2, t2), cx[1])),
                          times(box(3, t3), cx[2]));
    }
    return _mm256_cvtpd_ps(_mm256_add_pd(
        _mm256_add_pd(times(rows[0], cy[0]), times(rows[1], cy[1])), times(rows[2], cy[2])));
}

template <class P>
bool AreaPairOf(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0, double v0,
                double w0, double invW0, double u1, double v1, double w1, double invW1, P* firstOut,
                P* secondOut) {
    using namespace sy_sampling;
    using Traits = PF_PixelTraits<P>;
    constexpr bool kEightBit = !Traits::kIsFloat && Traits::kBitDepth == 8;
    const bool perspective = texture.perspective;
    if (perspective && !(w0 + m.low > 0 && w1 + m.low > 0)) return false;
    const PF_World& world = *texture.world;
    const PF_AreaTable* table = world.samplingTables.area.load(std::memory_order_acquire);
    if (!table) return false;  // the one-pixel path builds it

    // The footprints (FootprintLanesOf).
    const __m256d invW = Pair(_mm_set1_pd(invW0), _mm_set1_pd(invW1));
    const __m256d point = _mm256_mul_pd(_mm256_setr_pd(u0, v0, u1, v1), invW);
    const __m128d dx2 = _mm_cvtps_pd(_mm_setr_ps(m.dudx, m.dvdx, 0, 0));
    const __m128d dy2 = _mm_cvtps_pd(_mm_setr_ps(m.dudy, m.dvdy, 0, 0));
    __m256d dx = Pair(dx2, dx2), dy = Pair(dy2, dy2);
    if (perspective) {
        dx = _mm256_mul_pd(_mm256_sub_pd(dx, _mm256_mul_pd(point, _mm256_set1_pd(m.dwdx))), invW);
        dy = _mm256_mul_pd(_mm256_sub_pd(dy, _mm256_mul_pd(point, _mm256_set1_pd(m.dwdy))), invW);
    }
    const __m256d sign = _mm256_set1_pd(-0.0);
    const __m256d radius = _mm256_mul_pd(
        _mm256_set1_pd(0.5), _mm256_max_pd(_mm256_andnot_pd(sign, dy), _mm256_andnot_pd(sign, dx)));
    // A pixel whose radii both lie below half a texel interpolates (Subpixel).
    const int subpixel =
        _mm256_movemask_pd(_mm256_cmp_pd(radius, _mm256_set1_pd(kSubpixelBelow), _CMP_LT_OQ));
    if ((subpixel & 3) == 3 || (subpixel & 12) == 12) return false;

    // 16.16 positions and radii (ToFixed, RadiusToFixed), lanes (x0, y0, x1, y1).
    const __m256d far = _mm256_set1_pd(kFarTexels);
    const __m128i xy = RoundAwayFour(
        _mm256_mul_pd(_mm256_min_pd(far, _mm256_max_pd(_mm256_set1_pd(-kFarTexels), point)),
                      _mm256_set1_pd(65536.0)));
    const __m128i radii = RoundAwayFour(
        _mm256_mul_pd(_mm256_min_pd(_mm256_set1_pd(kMaxRadius), radius), _mm256_set1_pd(65536.0)));

    // The boxes, as pf_sampling::AreaSampleLanes works them out, for both pixels.
    const __m128i sizes = _mm_setr_epi32(world.width, world.height, world.width, world.height);
    const auto [r, lo, hi, outside] = pf_sampling::MakeBoxLanes<kEightBit>(xy, radii, sizes);
    if (!_mm_testz_si128(outside, outside)) return false;

    // Shares, lanes (x, y, x, y) of each pixel: 1 − frac(lo), then frac(hi).
    const __m256i fractions =
        _mm256_and_si256(_mm256_setr_m128i(_mm_unpacklo_epi64(lo, hi), _mm_unpackhi_epi64(lo, hi)),
                         _mm256_set1_epi32(0xFFFF));
    const __m256 shares =
        _mm256_mul_ps(_mm256_cvtepi32_ps(_mm256_abs_epi32(_mm256_sub_epi32(
                          fractions, _mm256_setr_epi32(65536, 65536, 0, 0, 65536, 65536, 0, 0)))),
                      _mm256_set1_ps(pf_sampling::kFixedToTexels));
    const __m256 one = _mm256_set1_ps(1.0f);
    // Corner weights share − 1 of the first edges and 1 − share of the last ones.
    const __m256 inner = _mm256_sub_ps(_mm256_blend_ps(shares, one, 0b11001100),
                                       _mm256_blend_ps(shares, one, 0b00110011));

    // Edges: first, first + 1, last, end.
    const __m128i firstEdges = _mm_srai_epi32(lo, 16), lastEdges = _mm_srai_epi32(hi, 16);
    const __m128i endEdges = _mm_min_epi32(_mm_add_epi32(lastEdges, _mm_set1_epi32(1)), sizes);
    alignas(16) int32_t e[3][4];
    _mm_store_si128(reinterpret_cast<__m128i*>(e[0]), firstEdges);
    _mm_store_si128(reinterpret_cast<__m128i*>(e[1]), lastEdges);
    _mm_store_si128(reinterpret_cast<__m128i*>(e[2]), endEdges);
    const int32_t ex[2][4] = {{e[0][0], e[0][0] + 1, e[1][0], e[2][0]},
                              {e[0][2], e[0][2] + 1, e[1][2], e[2][2]}};
    const int32_t ey[2][4] = {{e[0][1], e[0][1] + 1, e[1][1], e[2][1]},
                              {e[0][3], e[0][3] + 1, e[1][3], e[2][3]}};

    // The areas 4·rx·ry in texels divide alpha.
    alignas(16) float rf[4];
    _mm_store_ps(rf, _mm_cvtepi32_ps(r));
    constexpr float kTexelsSquared = pf_sampling::kFixedToTexels * pf_sampling::kFixedToTexels;
    const float area[2] = {4.0f * rf[0] * rf[1] * kTexelsSquared,
                           4.0f * rf[2] * rf[3] * kTexelsSquared};
    if constexpr (kEightBit) {
        // Each pixel's corner weights in all lanes of its half.
        const __m256 cx[3] = {_mm256_permute_ps(inner, 0x00), _mm256_permute_ps(inner, 0xAA),
                              _mm256_permute_ps(shares, 0xAA)};
        const __m256 cy[3] = {_mm256_permute_ps(inner, 0x55), _mm256_permute_ps(inner, 0xFF),
                              _mm256_permute_ps(shares, 0xFF)};
        StorePair8(BoxSums8(table->Cells<PF_Uint4>(), table->Stride(), ex, ey, cx, cy), area,
                   firstOut, secondOut);
    } else {
        using Cells = std::conditional_t<Traits::kIsFloat, WideCellsFloat, WideCells16>;
        const auto* cells = table->Cells<typename Cells::Stored>();
        alignas(32) float innerWeights[8], shareWeights[8];
        _mm256_store_ps(innerWeights, inner);
        _mm256_store_ps(shareWeights, shares);
        P* const out[2] = {firstOut, secondOut};
        for (int i = 0; i < 2; ++i) {
            const float* in = innerWeights + 4 * i;
            const float* sh = shareWeights + 4 * i;
            const float cx[3] = {in[0], in[2], sh[2]}, cy[3] = {in[1], in[3], sh[3]};
            PF_StorePremultiplied(WideBoxSum<Cells>(cells, table->Stride(), ex[i], ey[i], cx, cy),
                                  out[i], area[i]);
        }
    }
    return true;
}

}  // namespace

bool sy_sampling::AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0,
                           double v0, double w0, double invW0, double u1, double v1, double w1,
                           double invW1, PF_Pixel8* firstOut, PF_Pixel8* secondOut) {
    return AreaPairOf(texture, m, u0, v0, w0, invW0, u1, v1, w1, invW1, firstOut, secondOut);
}
bool sy_sampling::AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0,
                           double v0, double w0, double invW0, double u1, double v1, double w1,
                           double invW1, PF_Pixel16* firstOut, PF_Pixel16* secondOut) {
    return AreaPairOf(texture, m, u0, v0, w0, invW0, u1, v1, w1, invW1, firstOut, secondOut);
}
bool sy_sampling::AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0,
                           double v0, double w0, double invW0, double u1, double v1, double w1,
                           double invW1, PF_PixelFloat* firstOut, PF_PixelFloat* secondOut) {
    return AreaPairOf(texture, m, u0, v0, w0, invW0, u1, v1, w1, invW1, firstOut, secondOut);
}
