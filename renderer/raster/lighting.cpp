// Lighting of layer pixels: one pixel, or two pixels of one layer at once (pixel_lighting.h).
#include "renderer/raster/pixel_lighting.h"
#include "u_cpu.h"

using sy_lighting::Light;

void SY_LayerShader::LightOnePixel(const double p[3], const double n[3], SY_Lighting* out) const {
    const double* const points[1] = {p};
    SY_Lighting* const outs[1] = {out};
    Light<SY_OneLane>(*this, points, n, outs);
}

void SY_LayerShader::LightTwoPixels(const double p1[3], const double p2[3], const double n[3],
                                    SY_Lighting* out1, SY_Lighting* out2) const {
    const double* const points[2] = {p1, p2};
    SY_Lighting* const outs[2] = {out1, out2};
    Light<SY_TwoLanes>(*this, points, n, outs);
}

void SY_LayerShader::ShadowOnePixel(const double p[3], const double n[3], SY_Lighting* out) const {
    const double* const points[1] = {p};
    SY_Lighting* const outs[1] = {out};
    Light<SY_OneLane>(*this, points, n, outs, true);
}

SY_LightingLanes SY_WidestLightingLanes() {
    if (U_G_CPU_DataP()->hasVectorUnits == 0) return SY_LightingLanes::kOne;
    return __builtin_cpu_supports("avx2") ? SY_LightingLanes::kFour : SY_LightingLanes::kTwo;
}
