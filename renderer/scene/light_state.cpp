#include "renderer/scene/light_state.h"

#include <algorithm>
#include <cmath>

#include "renderer/scene/messages.h"

namespace {

// Below this feather angle (radians) a spot keeps a minimal soft edge.
constexpr double kSmallestFeather = 0.0068;
constexpr double kMaxShadowDiffusion = 1024;

void SetDirection(const M_Matrix4& placement, SY_LightState* state) {
    double d[3] = {-placement.mat[2][0], -placement.mat[2][1], -placement.mat[2][2]};
    bool negligible = std::all_of(d, d + 3, [](double c) { return std::fabs(c) <= 1e-12; });
    double lengthSquared = d[0] * d[0] + d[1] * d[1] + d[2] * d[2];
    if (!negligible && lengthSquared < 1e-48) SY_ThrowZeroLengthVector();
    double scale = negligible ? 1.0 : 1.0 / std::sqrt(lengthSquared);
    for (int k = 0; k < 3; ++k) {
        state->position[k] = placement.mat[3][k];
        state->direction[k] = d[k] * scale;
    }
}

void SetCone(double halfAngle, double feather, SY_LightState* state) {
    double inner = halfAngle * feather < kSmallestFeather ? halfAngle - kSmallestFeather
                                                          : halfAngle * (1.0 - feather);
    inner = std::max(inner, 0.0);
    state->cosOuter = static_cast<float>(std::cos(halfAngle));
    state->cosInner = static_cast<float>(std::cos(inner));
    state->coneScale = halfAngle == 0.0 ? 0.0f : 1.0f / (state->cosInner - state->cosOuter);
}

}  // namespace

void SY_PrepareLightState(const SY_LightDesc& light, SY_LightState* state) {
    state->type = light.type;
    state->id = light.id;
    std::copy(light.color, light.color + 4, state->color);
    if (light.type != kSY_LightAmbient && !light.placements.Empty()) {
        SetDirection(light.placements[light.placements.Count() / 2], state);
    }
    if (light.type == kSY_LightSpot) SetCone(light.coneHalfAngle, light.coneFeather, state);

    double r = light.falloffRadius, f = light.falloffDistance;
    state->falloffType = light.falloffType;
    state->falloffRadius = r;
    state->falloffDistance = f;
    state->radiusSquared = r * r;
    state->outerSquared = (r + f) * (r + f);
    state->inverseDistance = f == 0.0 ? 1.0 : 1.0 / f;
    state->distanceSquared = f * f;
    state->shadowDarkness = light.shadowDarkness;
    state->shadowDiffusion = std::min(light.shadowDiffusion, kMaxShadowDiffusion);
}

int32_t SY_ShadowMapSize(int32_t chosenSize, int32_t outputWidth, int32_t outputHeight,
                         int32_t downsampleX, bool bestQualityReceiver) {
    constexpr int32_t kSmallest = 64;
    int32_t size = chosenSize != 0 ? chosenSize : std::max({400, outputWidth, outputHeight});
    size /= std::max(downsampleX, 1);
    if (!bestQualityReceiver) size /= 3;
    return std::max(size, kSmallest);
}
