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

// The box [a, b] in edge coordinates, where texel i covers [i, i + 1), over size texels.
inline PF_BoxAxis PF_MakeBoxAxis(float a, float b, int32_t size) {
    float limit = static_cast<float>(size) + 1.0f;
    a = std::clamp(a, -1.0f, limit);
    b = std::clamp(b, a, limit);
    float fa = std::floor(a), fb = std::floor(b);
    auto ia = static_cast<int32_t>(fa), ib = static_cast<int32_t>(fb);
    PF_BoxAxis axis;
    if (ia == ib) {
        axis = {{ia, ia + 1, ia + 1, ia + 1}, {b - a, 0.0f, 0.0f}};
    } else {
        axis = {{ia, ia + 1, ib, ib + 1}, {fa + 1.0f - a, 1.0f, b - fb}};
    }
    for (int32_t& e : axis.edge)
        e = std::clamp(e, 0, size);
    return axis;
}

// Table cells that hold unsigned sums modulo 2^32: a difference of four cells is exact as
// long as the box's true sum stays below 2^32.
struct PF_BoxCellsUint {
    using Cell = PF_Uint4;
    using Acc = PF_Float4;
    static Acc Zero() { return Acc{0.0f, 0.0f, 0.0f, 0.0f}; }
    static Cell Sub(Cell a, Cell b) { return a - b; }
    static void Add(Acc& acc, Cell r, float w) { acc += __builtin_convertvector(r, PF_Float4) * w; }
    static PF_Float4 ToFloat4(Acc acc) { return acc; }
};

// 64-bit sums of 16-bit premultiplied texels, modulo 2^64 like the 32-bit ones.
struct PF_AreaSum64 {
    uint64_t alpha, red, green, blue;
};

// Table cells with named channels (float, double or 64-bit sums); float cells accumulate in
// float, the others in double.
template <class Pixel>
struct PF_BoxCellsPixel {
    using Cell = Pixel;
    using Value = decltype(Pixel::alpha);
    using AccValue = std::conditional_t<std::is_same_v<Value, float>, float, double>;
    struct Acc {
        AccValue v[4];
    };
    static Acc Zero() { return Acc{{0, 0, 0, 0}}; }
    static Cell Sub(const Cell& a, const Cell& b) {
        return {a.alpha - b.alpha, a.red - b.red, a.green - b.green, a.blue - b.blue};
    }
    static void Add(Acc& acc, const Cell& r, float w) {
        acc.v[0] += static_cast<AccValue>(r.alpha) * w;
        acc.v[1] += static_cast<AccValue>(r.red) * w;
        acc.v[2] += static_cast<AccValue>(r.green) * w;
        acc.v[3] += static_cast<AccValue>(r.blue) * w;
    }
    static PF_Float4 ToFloat4(const Acc& acc) {
        return PF_Float4{static_cast<float>(acc.v[0]), static_cast<float>(acc.v[1]),
                         static_cast<float>(acc.v[2]), static_cast<float>(acc.v[3])};
    }
};

// Weighted sum over the box of a table whose cell (x, y), stride cells per row, holds the sum
// of the texels [0, x) × [0, y).
template <class Cells>
inline PF_Float4 PF_BoxSum(const typename Cells::Cell* table, ptrdiff_t stride,
                           const PF_BoxAxis& ax, const PF_BoxAxis& ay) {
    using Cell = typename Cells::Cell;
    // Per table row, the sums of the three column ranges up to that row.
    Cell columns[4][3];
    for (int l = 0; l < 4; ++l) {
        const Cell* row = table + ay.edge[l] * stride;
        Cell e0 = row[ax.edge[0]], e1 = row[ax.edge[1]], e2 = row[ax.edge[2]], e3 = row[ax.edge[3]];
        columns[l][0] = Cells::Sub(e1, e0);
        columns[l][1] = Cells::Sub(e2, e1);
        columns[l][2] = Cells::Sub(e3, e2);
    }
    typename Cells::Acc acc = Cells::Zero();
    for (int j = 0; j < 3; ++j) {
        for (int i = 0; i < 3; ++i) {
            Cells::Add(acc, Cells::Sub(columns[j + 1][i], columns[j][i]),
                       ax.weight[i] * ay.weight[j]);
        }
    }
    return Cells::ToFloat4(acc);
}
