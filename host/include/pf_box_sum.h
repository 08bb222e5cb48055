// Box sums with fractional edges over a summed-area table, at constant cost whatever the box
// size: the shared core of area sampling and the summed-area table samplers.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <type_traits>

#include "pf_pixel.h"
#include "pf_vec4.h"

// One axis of a box: four texel edges (clamped to the table) and the weights of the three
// ranges between them: the partly covered first texel, the whole texels, the partly covered
// last texel. Ranges outside the texture come out empty, which makes outside transparent.
struct PF_BoxAxis {
    int32_t edge[4];
    float weight[3];
};

// The box [a, b] in edge coordinates, where texel i covers [i, i + 1), over size texels. The
// box is first cut to the texture, as what lies outside adds nothing.
inline PF_BoxAxis PF_MakeBoxAxis(float a, float b, int32_t size) {
    float limit = static_cast<float>(size);
    a = std::min(limit, std::max(0.0f, a));
    b = std::min(limit, std::max(a, b));
    float first = std::floor(a), last = std::max(std::floor(b), first + 1.0f);
    auto e0 = static_cast<int32_t>(first), e2 = static_cast<int32_t>(last);
    // Inside one texel the last range is empty and its weight zero.
    return {{e0, std::min(e0 + 1, size), std::min(e2, size), std::min(e2 + 1, size)},
            {std::min(first + 1.0f, b) - a, 1.0f, std::max(b - last, 0.0f)}};
}

// The same for a box given in 16.16 fixed point: integer steps throughout, short to compute.
[[gnu::always_inline]] inline PF_BoxAxis PF_MakeBoxAxisFixed(int64_t lo, int64_t hi, int32_t size) {
    constexpr float kUnit = 1.0f / 65536.0f;
    int64_t limit = int64_t(size) << 16;
    lo = std::min(limit, std::max(int64_t(0), lo));
    hi = std::min(limit, std::max(lo, hi));
    int64_t first = lo >> 16, last = std::max(hi >> 16, first + 1);
    auto e0 = static_cast<int32_t>(first), e2 = static_cast<int32_t>(last);
    return {{e0, std::min(e0 + 1, size), std::min(e2, size), std::min(e2 + 1, size)},
            {static_cast<float>(std::min((first + 1) << 16, hi) - lo) * kUnit, 1.0f,
             static_cast<float>(std::max(hi - (last << 16), int64_t(0))) * kUnit}};
}

// The same for a box [lo, hi] of at least a texel inside the texture (0 ≤ lo, lo + 65536 ≤ hi
// ≤ size × 65536), the usual case: nothing to cut, the last texel lies beyond the first, and the
// partly covered ranges are what the ends leave of their texels. Fewer steps than the general
// case, with the same edges and weights.
[[gnu::always_inline]] inline PF_BoxAxis PF_MakeBoxAxisInside(int64_t lo, int64_t hi,
                                                              int32_t size) {
    constexpr float kUnit = 1.0f / 65536.0f;
    auto e0 = static_cast<int32_t>(lo >> 16), e2 = static_cast<int32_t>(hi >> 16);
    auto w0 = static_cast<int32_t>(65536 - (lo & 0xFFFF)), w2 = static_cast<int32_t>(hi & 0xFFFF);
    return {{e0, e0 + 1, e2, std::min(e2 + 1, size)},
            {static_cast<float>(w0) * kUnit, 1.0f, static_cast<float>(w2) * kUnit}};
}

// Table cells that hold unsigned sums modulo 2^32: differences are exact as long as the box's
// true sum stays below 2^32. kBelow2To31 says the caller knows it stays below 2^31, where the
// conversion to float is a single instruction.
template <bool kBelow2To31>
struct PF_BoxCellsUint {
    using Stored = PF_Uint4;
    using Cell = PF_Uint4;
    using Acc = PF_Float4;
    static Cell Load(const Stored* p) { return *p; }
    static Cell Sub(Cell a, Cell b) { return a - b; }
    static Acc Widen(Cell r) {
        if constexpr (kBelow2To31) {
            return _mm_cvtepi32_ps(reinterpret_cast<__m128i>(r));
        } else {
            // High and low halves convert exactly; their sum rounds once.
            PF_Float4 high = _mm_cvtepi32_ps(reinterpret_cast<__m128i>(r >> 16));
            PF_Float4 low = _mm_cvtepi32_ps(reinterpret_cast<__m128i>(r & 0xFFFF));
            return high * 65536.0f + low;
        }
    }
    static PF_Float4 ToFloat4(Acc acc) { return acc; }
};

// 64-bit sums of 16-bit premultiplied texels, modulo 2^64 like the 32-bit ones.
struct PF_AreaSum64 {
    uint64_t alpha, red, green, blue;
};

// Four doubles with the arithmetic the box sum needs, two lanes to a register: the same
// correctly rounded operations, two channels at a time.
struct PF_Double4 {
    __m128d alphaRed, greenBlue;
    PF_Double4 operator+(const PF_Double4& o) const {
        return {_mm_add_pd(alphaRed, o.alphaRed), _mm_add_pd(greenBlue, o.greenBlue)};
    }
    PF_Double4 operator*(float w) const {
        __m128d d = _mm_set1_pd(w);
        return {_mm_mul_pd(alphaRed, d), _mm_mul_pd(greenBlue, d)};
    }
};

// Table cells with named channels: float sums accumulate in float, double sums in double.
template <class Pixel>
struct PF_BoxCellsPixel {
    using Stored = Pixel;
    using Cell = Pixel;
    static Cell Load(const Stored* p) { return *p; }
    using Value = decltype(Pixel::alpha);
    static constexpr bool kFloat = std::is_same_v<Value, float>;
    using Acc = std::conditional_t<kFloat, PF_Float4, PF_Double4>;
    static Cell Sub(const Cell& a, const Cell& b) {
        return {a.alpha - b.alpha, a.red - b.red, a.green - b.green, a.blue - b.blue};
    }
    static Acc Widen(const Cell& r) {
        if constexpr (kFloat) {
            return PF_Float4{r.alpha, r.red, r.green, r.blue};
        } else {
            return {_mm_setr_pd(double(r.alpha), double(r.red)),
                    _mm_setr_pd(double(r.green), double(r.blue))};
        }
    }
    static PF_Float4 ToFloat4(const Acc& acc) {
        if constexpr (kFloat) {
            return acc;
        } else {
            return _mm_movelh_ps(_mm_cvtpd_ps(acc.alphaRed), _mm_cvtpd_ps(acc.greenBlue));
        }
    }
};

// Table cells of 64-bit sums, modulo 2^64, two channels to a register. A box's sum lies below
// 2^52 (at most 201 × 201 texels of 65535²), where setting the bits of the double 2^52 over it
// and taking 2^52 away converts it exactly: the value a conversion one channel at a time gives.
struct PF_BoxCellsUint64 {
    using Stored = PF_AreaSum64;
    struct Cell {
        __m128i alphaRed, greenBlue;
    };
    using Acc = PF_Double4;
    static Cell Load(const Stored* p) {
        return {_mm_loadu_si128(reinterpret_cast<const __m128i*>(&p->alpha)),
                _mm_loadu_si128(reinterpret_cast<const __m128i*>(&p->green))};
    }
    static Cell Sub(const Cell& a, const Cell& b) {
        return {_mm_sub_epi64(a.alphaRed, b.alphaRed), _mm_sub_epi64(a.greenBlue, b.greenBlue)};
    }
    static Acc Widen(const Cell& r) {
        const __m128d two52 = _mm_set1_pd(4503599627370496.0);
        auto exact = [two52](__m128i v) {
            return _mm_sub_pd(_mm_castsi128_pd(_mm_or_si128(v, _mm_castpd_si128(two52))), two52);
        };
        return {exact(r.alphaRed), exact(r.greenBlue)};
    }
    static PF_Float4 ToFloat4(const Acc& acc) {
        return PF_BoxCellsPixel<PF_PixelDouble>::ToFloat4(acc);
    }
};

// Weighted sum over the box of a table whose cell (x, y), stride cells per row, holds the sum
// of the texels [0, x) × [0, y): edges ex and ey, corner weights cx and cy (those of the edges
// x1, x2, x3 and y1, y2, y3). Every difference is taken against the box's first row and column,
// so it sums texels inside the box only: small, and exact for integer cells.
template <class Cells>
[[gnu::always_inline]] inline PF_Float4 PF_BoxSumAtCorners(const typename Cells::Stored* table,
                                                           ptrdiff_t stride, const int32_t (&ex)[4],
                                                           const int32_t (&ey)[4],
                                                           const float (&cx)[3],
                                                           const float (&cy)[3]) {
    using Cell = typename Cells::Cell;
    using Stored = typename Cells::Stored;
    const Stored* top = table + ey[0] * stride;
    const Cell t0 = Cells::Load(top + ex[0]), t1 = Cells::Load(top + ex[1]),
               t2 = Cells::Load(top + ex[2]), t3 = Cells::Load(top + ex[3]);
    typename Cells::Acc rows[3];
    for (int l = 1; l < 4; ++l) {
        const Stored* row = table + ey[l] * stride;
        // Sums over [x0, xk) × [y0, yl).
        Cell left = Cells::Sub(Cells::Load(row + ex[0]), t0);
        auto box = [&](int32_t k, const Cell& t) {
            return Cells::Widen(Cells::Sub(Cells::Sub(Cells::Load(row + ex[k]), t), left));
        };
        rows[l - 1] = (box(1, t1) * cx[0] + box(2, t2) * cx[1]) + box(3, t3) * cx[2];
    }
    typename Cells::Acc sum = (rows[0] * cy[0] + rows[1] * cy[1]) + rows[2] * cy[2];
    return Cells::ToFloat4(sum);
}

// The same over the box of two axes.
template <class Cells>
inline PF_Float4 PF_BoxSum(const typename Cells::Stored* table, ptrdiff_t stride,
                           const PF_BoxAxis& ax, const PF_BoxAxis& ay) {
    // Weights of the box's corners from those of its ranges.
    const float cx[3] = {ax.weight[0] - ax.weight[1], ax.weight[1] - ax.weight[2], ax.weight[2]};
    const float cy[3] = {ay.weight[0] - ay.weight[1], ay.weight[1] - ay.weight[2], ay.weight[2]};
    return PF_BoxSumAtCorners<Cells>(table, stride, ax.edge, ay.edge, cx, cy);
}
