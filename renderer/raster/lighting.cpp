// Lighting of layer pixels: one pixel, or two pixels of one layer at once (pixel_lighting.h).
#include <algorithm>
#include <cmath>

#include "renderer/raster/pixel_lighting.h"
#include "renderer/raster/processor.h"
#include "u_cpu.h"

using sy_lighting::Light;

void SY_LayerShader::LightOnePixel(const double p[3], const double n[3], SY_Lighting* out,
                                   SY_LightSet reaching) const {
    const double* const points[1] = {p};
    SY_Lighting* const outs[1] = {out};
    Light<SY_OneLane>(*this, points, n, outs, reaching);
}

void SY_LayerShader::LightTwoPixels(const double p1[3], const double p2[3], const double n[3],
                                    SY_Lighting* out1, SY_Lighting* out2,
                                    SY_LightSet reaching) const {
    const double* const points[2] = {p1, p2};
    SY_Lighting* const outs[2] = {out1, out2};
    Light<SY_TwoLanes>(*this, points, n, outs, reaching);
}

void SY_LayerShader::ShadowOnePixel(const double p[3], const double n[3], SY_Lighting* out) const {
    const double* const points[1] = {p};
    SY_Lighting* const outs[1] = {out};
    Light<SY_OneLane>(*this, points, n, outs, kSY_AllLights, true);
}

namespace {

double Dot(const double a[3], const double b[3]) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

// A stretch of the layer: its points lie within `slack` of the segment between two points,
// and so within `radius` of the segment's centre.
struct Stretch {
    const double* first;
    const double* last;
    double slack;
    double centre[3];
    double radius;
};

// Whether a light with a position can add anything to a stretch of the layer with normal n.
// Every test leaves a margin far above the rounding of the per-pixel tests it stands for, so a
// light it drops is one each pixel would drop.
bool Reaches(const SY_LightState& light, const SY_Material& material, const Stretch& stretch,
             const double n[3]) {
    // The light's height over the layer's plane, along n, varies linearly along the stretch.
    if (material.lightTransmission == 0.0) {
        double height = -HUGE_VAL;
        for (const double* end : {stretch.first, stretch.last}) {
            const double toLight[3] = {light.position[0] - end[0], light.position[1] - end[1],
                                       light.position[2] - end[2]};
            height = std::max(height, Dot(n, toLight));
        }
        if (height + stretch.slack * std::sqrt(Dot(n, n)) < 0.0) return false;
    }
    const double* centre = stretch.centre;
    const double radius = stretch.radius;
    const double toLight[3] = {light.position[0] - centre[0], light.position[1] - centre[1],
                               light.position[2] - centre[2]};
    const double distance = std::sqrt(Dot(toLight, toLight));
    if (!(distance > radius)) return true;
    if (light.falloffType == kSY_FalloffSmooth) {
        // Beyond the zone's outer edge, or the radius for a zone of no width, there is no light.
        const double edgeSquared =
            light.falloffDistance == 0.0 ? light.radiusSquared : light.outerSquared;
        const double nearest = distance - radius;
        if (nearest * nearest > edgeSquared * (1.0 + 1e-5)) return false;
    }
    if (light.type == kSY_LightSpot) {
        // The sphere is seen from the light within an angle of asin(radius / distance) around
        // its centre's direction; all of it outside the cone leaves no pixel lit.
        const double off =
            std::acos(std::clamp(Dot(toLight, light.direction) / distance, -1.0, 1.0));
        const double cone = std::acos(std::clamp(static_cast<double>(light.cosOuter), -1.0, 1.0));
        if (off - std::asin(radius / distance) > cone + 1e-6) return false;
    }
    return true;
}

}  // namespace

SY_LightSet SY_LayerShader::LightsReaching(const double first[3], const double last[3],
                                           const double n[3], double slack) const {
    Stretch stretch{first, last, slack, {}, 0};
    double half[3];
    for (int k = 0; k < 3; ++k) {
        stretch.centre[k] = 0.5 * (first[k] + last[k]);
        half[k] = 0.5 * (last[k] - first[k]);
    }
    stretch.radius = std::sqrt(Dot(half, half)) + slack;
    if (!std::isfinite(stretch.radius) || !std::isfinite(Dot(stretch.centre, stretch.centre)))
        return kSY_AllLights;
    SY_LightSet reaching = kSY_AllLights;
    const int32_t count = std::min<int32_t>(lights.Count(), 64);
    for (int32_t i = 0; i < count; ++i) {
        const SY_LightState& light = *lights[i];
        const bool hasPosition = light.type == kSY_LightSpot || light.type == kSY_LightPoint;
        if (hasPosition && !Reaches(light, material, stretch, n))
            reaching &= ~(SY_LightSet{1} << i);
    }
    return reaching;
}

SY_LightingLanes SY_WidestLightingLanes() {
    if (U_G_CPU_DataP()->hasVectorUnits == 0) return SY_LightingLanes::kOne;
    return SY_ProcessorHasAvx2() ? SY_LightingLanes::kFour : SY_LightingLanes::kTwo;
}
