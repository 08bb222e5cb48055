// Four-lane vectors for the pixel library's per-pixel arithmetic: one lane per channel, in the
// pixel order alpha, red, green, blue. Compiler vectors that are SSE registers, so arithmetic
// reads as arithmetic and loads and stores use the SSE2 instructions every x86-64 has.
#pragma once

#include <cstdint>
#include <cstring>

#include <emmintrin.h>

#include "pf_pixel.h"

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

// (1, v0, v0, v0): the factors that premultiply, or with v0 = 1/alpha unpremultiply.
inline PF_Float4 PF_AlphaFactors(PF_Float4 v) {
    return _mm_move_ss(_mm_shuffle_ps(v, v, 0), _mm_set_ss(1.0f));
}

// A texel in premultiplied form: (alpha, alpha × colour) in channel units.
template <class P>
inline PF_Float4 PF_LoadPremultiplied(const P& p) {
    PF_Float4 v = PF_LoadFloat4(p);
    return v * PF_AlphaFactors(v);
}

// N adjacent texels (N = 2 or 4) premultiplied.
template <int N, class P>
inline void PF_LoadPremultipliedRow(const P* texels, PF_Float4* out) {
    for (int i = 0; i < N; ++i)
        out[i] = PF_LoadPremultiplied(texels[i]);
}

// Writes channel values in channel units: integer channels clamped to their range and rounded,
// float channels as they are.
template <class P>
inline void PF_StoreChannels(PF_Float4 c, P* out) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat) {
        _mm_storeu_ps(&out->alpha, c);
    } else {
        c = _mm_min_ps(_mm_max_ps(c, _mm_setzero_ps()), _mm_set1_ps(Traits::kMax));
        __m128i lanes = _mm_cvttps_epi32(c + 0.5f);
        if constexpr (Traits::kBitDepth == 8) {
            __m128i bytes = _mm_packus_epi16(_mm_packs_epi32(lanes, lanes), lanes);
            int32_t packed = _mm_cvtsi128_si32(bytes);
            std::memcpy(out, &packed, sizeof packed);
        } else {
            // 0..32768 does not fit the signed pack: shift into its range and back.
            __m128i bias = _mm_set1_epi32(32768);
            __m128i shorts = _mm_packs_epi32(_mm_sub_epi32(lanes, bias), lanes);
            shorts = _mm_xor_si128(shorts, _mm_set1_epi16(static_cast<int16_t>(0x8000)));
            _mm_storel_epi64(reinterpret_cast<__m128i*>(out), shorts);
        }
    }
}

// Writes a premultiplied value (alpha, alpha × colour in channel units) as a straight pixel,
// its alpha scaled by alphaScale (colour is a ratio: the scale does not change it). Integer
// channels are rounded and kept in range; float alpha is kept in 0..1 and float colour keeps
// its extended range. A pixel without alpha is transparent black.
template <class P>
inline void PF_StorePremultiplied(PF_Float4 v, P* out, float alphaScale = 1.0f) {
    using Traits = PF_PixelTraits<P>;
    float a = v[0] * alphaScale;
    constexpr float kMinAlpha = Traits::kIsFloat ? 0.0f : 0.5f;
    if (!(a > kMinAlpha)) {
        *out = P{};
        return;
    }
    // (alphaScale, 1/alpha, 1/alpha, 1/alpha)
    PF_Float4 inverse = _mm_div_ss(_mm_set_ss(1.0f), v);
    PF_Float4 c = v * _mm_move_ss(_mm_shuffle_ps(inverse, inverse, 0), _mm_set_ss(alphaScale));
    if constexpr (Traits::kIsFloat) c[0] = a < 1.0f ? a : 1.0f;
    PF_StoreChannels(c, out);
}
