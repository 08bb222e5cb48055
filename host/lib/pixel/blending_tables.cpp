// Building the linear-light blending tables from a transfer curve.
#include <algorithm>
#include <cmath>

#include "pf_xfer.h"

namespace {

constexpr double kLinearMax = 32768.0;

// Forward: the curve at every 8-bit code, but never below 8 linear units per code: with this
// toe (the sRGB curve has one of 10) the darkest codes stay apart and the inverse table, read
// in steps of 8, follows the forward polyline exactly there. Inverse: the exact inverse of that
// polyline, so that code → linear → code returns every code.
template <class Curve>
void Build(Curve toLinear, float exponent, PF_LinearBlendingTables* t) {
    t->forward[0] = 0;
    for (int c = 1; c < 256; ++c) {
        auto v = static_cast<int>(std::lround(kLinearMax * toLinear(c / 255.0)));
        t->forward[c] = static_cast<uint16_t>(std::min(std::max(v, 8 * c), 32768));
    }
    int c = 0;
    for (int i = 0; i <= 4096; ++i) {
        int v = 8 * i;
        while (c < 254 && t->forward[c + 1] <= v)
            ++c;
        double f = double(v - t->forward[c]) / double(t->forward[c + 1] - t->forward[c]);
        double code = (c + std::min(f, 1.0)) * kLinearMax / 255.0;
        t->inverse[i] = static_cast<uint16_t>(std::lround(std::min(code, kLinearMax)));
    }
    t->toLinearExponent = exponent;
    t->fromLinearExponent = 1.0f / exponent;
}

}  // namespace

void PF_BuildLinearBlendingTablesGamma(float gamma, PF_LinearBlendingTables* tables) {
    Build([gamma](double x) { return std::pow(x, double(gamma)); }, gamma, tables);
}

void PF_BuildLinearBlendingTablesSRGB(PF_LinearBlendingTables* tables) {
    auto srgb = [](double x) {
        return x <= 0.04045 ? x / 12.92 : std::pow((x + 0.055) / 1.055, 2.4);
    };
    Build(srgb, 2.2f, tables);
}
