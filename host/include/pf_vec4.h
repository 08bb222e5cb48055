// Four-lane vectors for the pixel library's per-pixel arithmetic: one lane per channel, in the
// pixel order alpha, red, green, blue. Compiler vectors that are SSE registers, so arithmetic
// reads as arithmetic; loads, stores and lane sums use instructions up to SSE4.1, which every
// processor the build targets has.
#pragma once

#include <cstdint>
#include <cstring>

#include <smmintrin.h>

#include "pf_pixel.h"

// Four float lanes and four unsigned 32-bit lanes, one per channel.
typedef float PF_Float4 __attribute__((vector_size(16)));
typedef uint32_t PF_Uint4 __attribute__((vector_size(16)));

// The channels of a pixel as a vector: one load and a widening conversion.
inline PF_Float4 PF_LoadFloat4(const PF_Pixel8& p) {
    int32_t bytes;
    std::memcpy(&bytes, &p, sizeof bytes);
    __m128i zero = _mm_setzero_si128();
    __m128i lanes = _mm_unpacklo_epi16(_mm_unpacklo_epi8(_mm_cvtsi32_si128(bytes), zero), zero);
    return _mm_cvtepi32_ps(lanes);
}
inline PF_Float4 PF_LoadFloat4(const PF_Pixel16& p) {
    __m128i shorts = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(&p));
    return _mm_cvtepi32_ps(_mm_unpacklo_epi16(shorts, _mm_setzero_si128()));
}
inline PF_Float4 PF_LoadFloat4(const PF_PixelFloat& p) {
    return _mm_loadu_ps(&p.alpha);
}

// (1, v0, v0, v0): the factors that premultiply.
inline PF_Float4 PF_AlphaFactors(PF_Float4 v) {
    return _mm_move_ss(_mm_shuffle_ps(v, v, 0), _mm_set_ss(1.0f));
}

// A texel in premultiplied form: (alpha, alpha × colour) in channel units.
template <class P>
inline PF_Float4 PF_LoadPremultiplied(const P& p) {
    PF_Float4 v = PF_LoadFloat4(p);
    return v * PF_AlphaFactors(v);
}

// Four texels as channel planes: one vector per channel, one lane per texel, in the order
// first[0], first[1], second[0], second[1]. Filters weight whole planes at once, which costs
// fewer instructions than weighting texel by texel.
struct PF_Planes {
    PF_Float4 alpha, red, green, blue;
};

inline PF_Planes PF_LoadPlanes(const PF_Pixel8* first, const PF_Pixel8* second) {
    __m128i texels = _mm_unpacklo_epi64(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(first)),
                                        _mm_loadl_epi64(reinterpret_cast<const __m128i*>(second)));
    // Byte c of each texel into the low byte of its lane, the others cleared (−1).
    auto channel = [texels](char c) {
        return _mm_cvtepi32_ps(
            _mm_shuffle_epi8(texels, _mm_setr_epi8(c, -1, -1, -1, c + 4, -1, -1, -1, c + 8, -1, -1,
                                                   -1, c + 12, -1, -1, -1)));
    };
    return {channel(0), channel(1), channel(2), channel(3)};
}
inline PF_Planes PF_LoadPlanes(const PF_Pixel16* first, const PF_Pixel16* second) {
    __m128 a = _mm_castsi128_ps(_mm_loadu_si128(reinterpret_cast<const __m128i*>(first)));
    __m128 b = _mm_castsi128_ps(_mm_loadu_si128(reinterpret_cast<const __m128i*>(second)));
    // Each texel is two 32-bit halves: alpha and red, then green and blue.
    __m128i alphaRed = _mm_castps_si128(_mm_shuffle_ps(a, b, _MM_SHUFFLE(2, 0, 2, 0)));
    __m128i greenBlue = _mm_castps_si128(_mm_shuffle_ps(a, b, _MM_SHUFFLE(3, 1, 3, 1)));
    __m128i low = _mm_set1_epi32(0xFFFF);
    return {_mm_cvtepi32_ps(_mm_and_si128(alphaRed, low)),
            _mm_cvtepi32_ps(_mm_srli_epi32(alphaRed, 16)),
            _mm_cvtepi32_ps(_mm_and_si128(greenBlue, low)),
            _mm_cvtepi32_ps(_mm_srli_epi32(greenBlue, 16))};
}
inline PF_Planes PF_LoadPlanes(const PF_PixelFloat* first, const PF_PixelFloat* second) {
    __m128 t0 = _mm_loadu_ps(&first[0].alpha), t1 = _mm_loadu_ps(&first[1].alpha);
    __m128 t2 = _mm_loadu_ps(&second[0].alpha), t3 = _mm_loadu_ps(&second[1].alpha);
    _MM_TRANSPOSE4_PS(t0, t1, t2, t3);
    return {t0, t1, t2, t3};
}

// The lane sums of four vectors as the channels of one pixel: (Σ a, Σ r, Σ g, Σ b).
inline PF_Float4 PF_SumLanes(PF_Float4 a, PF_Float4 r, PF_Float4 g, PF_Float4 b) {
    return _mm_hadd_ps(_mm_hadd_ps(a, r), _mm_hadd_ps(g, b));
}

// Writes channel values in channel units: integer channels clamped to their range and rounded,
// float channels as they are.
template <class P>
[[gnu::always_inline]] inline void PF_StoreChannels(PF_Float4 c, P* out) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat) {
        _mm_storeu_ps(&out->alpha, c);
    } else {
        // Only the top needs clamping: the packs saturate, and what is below zero or not a
        // number converts to a negative integer, which they turn into 0.
        c = _mm_min_ps(_mm_set1_ps(Traits::kMax), c);
        __m128i lanes = _mm_cvttps_epi32(c + 0.5f);
        if constexpr (Traits::kBitDepth == 8) {
            __m128i shorts = _mm_packs_epi32(lanes, lanes);
            __m128i bytes = _mm_packus_epi16(shorts, shorts);
            int32_t packed = _mm_cvtsi128_si32(bytes);
            std::memcpy(out, &packed, sizeof packed);
        } else {
            _mm_storel_epi64(reinterpret_cast<__m128i*>(out), _mm_packus_epi32(lanes, lanes));
        }
    }
}

// Writes a premultiplied value (alpha, alpha × colour in channel units) as a straight pixel,
// its alpha divided by alphaDivisor (colour is a ratio: the divisor does not change it).
// Integer channels are rounded and kept in range; float alpha is kept in 0..1 and float colour
// keeps its extended range. A pixel without alpha is transparent black.
template <class P>
[[gnu::always_inline]] inline void PF_StorePremultiplied(PF_Float4 v, P* out,
                                                         float alphaDivisor = 1.0f) {
    using Traits = PF_PixelTraits<P>;
    // Integer alpha that rounds to 0 is clear too.
    float minAlpha = Traits::kIsFloat ? 0.0f : 0.5f * alphaDivisor;
    if (!(v[0] > minAlpha)) {
        *out = P{};
        return;
    }
    // One division by (alphaDivisor, alpha, alpha, alpha) gives alpha and the colour.
    PF_Float4 alpha = _mm_castsi128_ps(_mm_shuffle_epi32(_mm_castps_si128(v), 0));
    PF_Float4 c = v / _mm_move_ss(alpha, _mm_set_ss(alphaDivisor));
    if constexpr (Traits::kIsFloat) c[0] = c[0] < 1.0f ? c[0] : 1.0f;
    PF_StoreChannels(c, out);
}
