// Lights, shadow maps and layer shaders built by hand for the lighting tests. The layer lies in
// the plane z = 0 facing the eye at (0, 0, -1000): its normal is (0, 0, -1).
#pragma once

#include <cmath>
#include <initializer_list>
#include <memory>

#include "renderer/raster/shader.h"
#include "renderer/scene/light_state.h"

namespace lighting_test {

inline constexpr double kFront[3] = {0, 0, -1};

inline SY_LightState Ambient(double r, double g, double b) {
    SY_LightState light;
    light.type = kSY_LightAmbient;
    light.color[0] = 1, light.color[1] = r, light.color[2] = g, light.color[3] = b;
    return light;
}

// A parallel light shining from the unit direction (x, y, z), as seen from the lit area.
inline SY_LightState Parallel(double x, double y, double z) {
    SY_LightState light = Ambient(1, 1, 1);
    light.type = kSY_LightParallel;
    light.direction[0] = x, light.direction[1] = y, light.direction[2] = z;
    return light;
}

inline SY_LightState Point(double x, double y, double z) {
    SY_LightState light = Ambient(1, 1, 1);
    light.type = kSY_LightPoint;
    light.position[0] = x, light.position[1] = y, light.position[2] = z;
    return light;
}

// A spot at (x, y, z) aimed along the negated unit axis (ax, ay, az).
inline SY_LightState Spot(double x, double y, double z, double ax, double ay, double az,
                          float cosOuter, float cosInner) {
    SY_LightState light = Point(x, y, z);
    light.type = kSY_LightSpot;
    light.direction[0] = ax, light.direction[1] = ay, light.direction[2] = az;
    light.cosOuter = cosOuter;
    light.cosInner = cosInner;
    light.coneScale = cosInner == cosOuter ? 0.0f : 1.0f / (cosInner - cosOuter);
    return light;
}

inline void SetFalloff(SY_LightState* light, int32_t type, double radius, double distance) {
    light->falloffType = type;
    light->falloffRadius = radius;
    light->falloffDistance = distance;
    light->radiusSquared = radius * radius;
    light->outerSquared = (radius + distance) * (radius + distance);
    light->inverseDistance = distance == 0 ? 1.0 : 1.0 / distance;
    light->distanceSquared = distance * distance;
}

// A shadow map that lets through a fixed transmission, or one that varies with the point, and
// records which lookup was asked.
class FixedShadow : public SY_ShadowMap {
public:
    FixedShadow(float r, float g, float b) : t_{r, g, b} {}
    void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const override {
        Fill(p, receiverId, out);
        ++hardLookups;
    }
    void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const override {
        Fill(p, receiverId, out);
        ++softLookups;
    }
    bool varying = false;  // transmission from the point's x, so neighbouring pixels differ
    mutable int hardLookups = 0;
    mutable int softLookups = 0;
    mutable int lastReceiver = -1;

private:
    void Fill(const double p[3], uint16_t receiverId, float out[4]) const {
        lastReceiver = receiverId;
        out[0] = 1;
        for (int c = 0; c < 3; ++c) {
            double x = p[0] * 0.01 + c * 0.3;
            out[1 + c] = varying ? static_cast<float>(x - std::floor(x)) : t_[c];
        }
    }
    float t_[3];
};

// A layer shader that takes light, with the given lights and no material terms but those set.
inline std::unique_ptr<SY_LayerShader> LitShader(
    std::initializer_list<const SY_LightState*> lights) {
    auto shader = std::make_unique<SY_LayerShader>();
    shader->material.acceptsLights = 1;
    shader->shaded = 1;
    shader->needsPoint = 1;
    shader->eye[2] = -1000;
    shader->lights.Allocate(static_cast<int32_t>(lights.size()));
    int32_t i = 0;
    for (const SY_LightState* light : lights)
        shader->lights[i++] = light;
    return shader;
}

inline SY_Lighting LightAt(const SY_LayerShader& shader, double x, double y, double z,
                           const double n[3] = kFront) {
    const double p[3] = {x, y, z};
    SY_Lighting out{};
    shader.LightOnePixel(p, n, &out);
    return out;
}

}  // namespace lighting_test
