// Area samples of two neighbouring 8-bit pixels at once in AVX registers. This file alone is
// compiled for AVX2 (without fused multiply-add, which would round differently), and it is
// called only where sy_sampling::PairsAvailable() holds. Every lane takes the operation the
// one-pixel path (samplers.h, pf_sampling.h) takes for its value, so each pixel agrees bit for
// bit with its sample alone. It uses intrinsics only, so that no shared inline function is
// compiled here for AVX2.
#include <immintrin.h>

#include <atomic>
#include <cstdint>
#include <cstring>

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
__m256i Cells(const PF_Uint4* first, const PF_Uint4* second) {
    return _mm256_loadu2_m128i(reinterpret_cast<const __m128i*>(second),
                               reinterpret_cast<const __m128i*>(first));
}

}  // namespace

bool sy_sampling::AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0,
                           double v0, double w0, double invW0, double u1, double v1, double w1,
                           double invW1, PF_Pixel8* firstOut, PF_Pixel8* secondOut) {
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
    const __m128i r = _mm_min_epi32(_mm_max_epi32(radii, _mm_set1_epi32(32768)),
                                    _mm_set1_epi32(pf_sampling::kMaxAreaRadius));
    const __m128i sizes = _mm_setr_epi32(world.width, world.height, world.width, world.height);
    const __m128i limits = _mm_blendv_epi8(_mm_slli_epi32(sizes, 16), _mm_set1_epi32(INT32_MAX),
                                           _mm_cmpgt_epi32(sizes, _mm_set1_epi32(32767)));
    const __m128i c = _mm_add_epi32(xy, _mm_set1_epi32(32768));
    const __m128i lo = _mm_sub_epi32(c, r), hi = _mm_add_epi32(c, r);
    const __m128i outside = _mm_or_si128(
        _mm_or_si128(_mm_cmpgt_epi32(_mm_setzero_si128(), lo), _mm_cmpgt_epi32(hi, limits)),
        _mm_or_si128(_mm_cmpgt_epi32(lo, hi),
                     _mm_cmpgt_epi32(r, _mm_set1_epi32(pf_sampling::kSmallBoxRadius))));
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
    const __m256 inner = _mm256_sub_ps(_mm256_blend_ps(shares, one, 0b11001100),
                                       _mm256_blend_ps(shares, one, 0b00110011));
    // Corner weights, each pixel's in all lanes of its half.
    const __m256 cx[3] = {_mm256_permute_ps(inner, 0x00), _mm256_permute_ps(inner, 0xAA),
                          _mm256_permute_ps(shares, 0xAA)};
    const __m256 cy[3] = {_mm256_permute_ps(inner, 0x55), _mm256_permute_ps(inner, 0xFF),
                          _mm256_permute_ps(shares, 0xFF)};

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

    // The box sums (PF_BoxSumAtCorners with 8-bit cells below 2^31), both pixels at once.
    const PF_Uint4* cells = table->Cells<PF_Uint4>();
    const ptrdiff_t stride = table->Stride();
    const PF_Uint4* top[2] = {cells + ey[0][0] * stride, cells + ey[1][0] * stride};
    __m256i t[4];
    for (int k = 0; k < 4; ++k)
        t[k] = Cells(top[0] + ex[0][k], top[1] + ex[1][k]);
    __m256 rows[3];
    for (int l = 1; l < 4; ++l) {
        const PF_Uint4* row[2] = {cells + ey[0][l] * stride, cells + ey[1][l] * stride};
        const __m256i left = _mm256_sub_epi32(Cells(row[0] + ex[0][0], row[1] + ex[1][0]), t[0]);
        __m256 box[3];
        for (int k = 1; k < 4; ++k) {
            const __m256i cell = Cells(row[0] + ex[0][k], row[1] + ex[1][k]);
            box[k - 1] = _mm256_cvtepi32_ps(_mm256_sub_epi32(_mm256_sub_epi32(cell, t[k]), left));
        }
        rows[l - 1] =
            _mm256_add_ps(_mm256_add_ps(_mm256_mul_ps(box[0], cx[0]), _mm256_mul_ps(box[1], cx[1])),
                          _mm256_mul_ps(box[2], cx[2]));
    }
    const __m256 sum =
        _mm256_add_ps(_mm256_add_ps(_mm256_mul_ps(rows[0], cy[0]), _mm256_mul_ps(rows[1], cy[1])),
                      _mm256_mul_ps(rows[2], cy[2]));

    // The areas 4·rx·ry in texels and the stores (PF_StorePremultiplied): alpha over the area,
    // colour over alpha, rounded and kept in range; a pixel whose alpha rounds to 0 is clear.
    alignas(16) float rf[4];
    _mm_store_ps(rf, _mm_cvtepi32_ps(r));
    constexpr float kTexelsSquared = pf_sampling::kFixedToTexels * pf_sampling::kFixedToTexels;
    const float area[2] = {4.0f * rf[0] * rf[1] * kTexelsSquared,
                           4.0f * rf[2] * rf[3] * kTexelsSquared};
    const __m256 divisors =
        _mm256_blend_ps(_mm256_permute_ps(sum, 0x00),
                        _mm256_setr_ps(area[0], 0, 0, 0, area[1], 0, 0, 0), 0b00010001);
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
        alphas[0] > 0.5f * area[0] ? static_cast<uint32_t>(bytes) : 0u,
        alphas[4] > 0.5f * area[1] ? static_cast<uint32_t>(bytes >> 32) : 0u};
    std::memcpy(firstOut, &texels[0], sizeof texels[0]);
    std::memcpy(secondOut, &texels[1], sizeof texels[1]);
    return true;
}
