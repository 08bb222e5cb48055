// Four-lane vectors for the pixel library's per-pixel arithmetic: one lane per channel, in the
// pixel order alpha, red, green, blue. Plain compiler vectors, so they map to SSE registers.
#pragma once

#include <cstdint>

#include "pf_pixel.h"

typedef float PF_Float4 __attribute__((vector_size(16)));
typedef uint32_t PF_Uint4 __attribute__((vector_size(16)));

template <class P>
inline PF_Float4 PF_LoadFloat4(const P& p) {
    return PF_Float4{static_cast<float>(p.alpha), static_cast<float>(p.red),
                     static_cast<float>(p.green), static_cast<float>(p.blue)};
}

// A texel in premultiplied form: (alpha, alpha × colour) in channel units.
template <class P>
inline PF_Float4 PF_LoadPremultiplied(const P& p) {
    PF_Float4 v = PF_LoadFloat4(p);
    return v * PF_Float4{1.0f, v[0], v[0], v[0]};
}

// Writes a premultiplied value (alpha, alpha × colour in channel units) as a straight pixel.
// Integer channels are rounded and kept in range; float alpha is kept in 0..1 and float colour
// keeps its extended range. A pixel without alpha is transparent black.
template <class P>
inline void PF_StorePremultiplied(PF_Float4 v, P* out) {
    using Traits = PF_PixelTraits<P>;
    using C = typename Traits::Channel;
    float a = v[0];
    if constexpr (Traits::kIsFloat) {
        if (!(a > 0.0f)) {
            *out = {0.0f, 0.0f, 0.0f, 0.0f};
            return;
        }
        PF_Float4 c = v * (1.0f / a);
        *out = {a < 1.0f ? a : 1.0f, c[1], c[2], c[3]};
    } else {
        if (!(a >= 0.5f)) {
            *out = {0, 0, 0, 0};
            return;
        }
        PF_Float4 c = v * PF_Float4{1.0f, 1.0f / a, 1.0f / a, 1.0f / a};
        PF_Float4 lo = {0.0f, 0.0f, 0.0f, 0.0f},
                  hi = {Traits::kMax, Traits::kMax, Traits::kMax, Traits::kMax};
        c = (c < lo ? lo : c);
        c = (c > hi ? hi : c) + 0.5f;
        *out = {static_cast<C>(c[0]), static_cast<C>(c[1]), static_cast<C>(c[2]),
                static_cast<C>(c[3])};
    }
}
