// The prepared form of one light, read by shading and shadowing while rows render.
#pragma once

#include <cstdint>
#include <memory>

#include "renderer/scene/scene_desc.h"
#include "renderer/shadow/shadow_map.h"

struct SY_LightState {
    int32_t type = kSY_LightParallel;
    int32_t id = 0;
    double position[3] = {};  // not set for ambient lights
    double direction[3] =
        {};  // unit vector from the lit area back toward the light; not set for ambient
    double color[4] = {};
    float cosOuter = 0;   // spot only: cosine of the cone's half angle
    float cosInner = 0;   // spot only: cosine of the fully lit inner angle
    float coneScale = 0;  // spot only: 1 / (cosInner − cosOuter); 0 for a zero cone
    std::unique_ptr<SY_ShadowMap> shadowMap;
    double shadowDiffusion = 0;  // pixels, at most 1024
    double shadowDarkness = 0;
    int32_t falloffType = 0;
    double falloffRadius = 0;
    double falloffDistance = 0;
    double radiusSquared = 0;
    double outerSquared = 0;     // (radius + distance)²
    double inverseDistance = 1;  // 1 / distance, or 1 when the distance is 0
    double distanceSquared = 0;
};

// Fills state from the light record. Throws the math library's zero-length code for a light
// whose placement has no usable z axis.
void SY_PrepareLightState(const SY_LightDesc& light, SY_LightState* state);

// The resolution of a light's shadow map: the chosen size (0: the larger of 400 and the
// output's larger side), divided by the horizontal downsample, by 3 when no layer both accepts
// shadows and is of best quality, and never below 64.
int32_t SY_ShadowMapSize(int32_t chosenSize, int32_t outputWidth, int32_t outputHeight,
                         int32_t downsampleX, bool bestQualityReceiver);
