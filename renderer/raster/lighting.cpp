#include <cmath>

#include "renderer/raster/shader.h"
#include "renderer/scene/messages.h"

namespace {

double Dot(const double a[3], const double b[3]) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

// Smooth step of the spot cone between its outer and inner cosines; 1 inside, 0 outside.
float SpotFactor(const SY_LightState& light, double cosine) {
    if (cosine < light.cosOuter) return -1.0f;  // outside the cone: the light is skipped
    if (cosine > light.cosInner) return 1.0f;
    float t = static_cast<float>(cosine - light.cosOuter) * light.coneScale;
    return t * t * (3.0f - 2.0f * t);
}

// Distance falloff for the squared distance d2 from the light.
float Falloff(const SY_LightState& light, float d2) {
    switch (light.falloffType) {
        case 1: {
            if (d2 < light.radiusSquared) return 1.0f;
            if (d2 > light.outerSquared || light.falloffDistance == 0.0) return 0.0f;
            auto u = static_cast<float>(1.0 - (std::sqrt(d2) - light.falloffRadius) *
                                                  light.inverseDistance);
            return u * u * (3.0f - 2.0f * u);
        }
        case 2:
            if (d2 < light.radiusSquared) return 1.0f;
            return d2 == 0.0f ? 0.0f : static_cast<float>(light.radiusSquared / d2);
        default:
            return 1.0f;
    }
}

float DistanceSquared(const SY_LightState& light, const double p[3]) {
    double d[3] = {p[0] - light.position[0], p[1] - light.position[1], p[2] - light.position[2]};
    return static_cast<float>(Dot(d, d));
}

}  // namespace

void SY_LayerShader::LightOnePixel(const double p[3], const double n[3], SY_Lighting* out) const {
    if (!acceptsLights) {
        // Only shadows change what shows; without shadow maps every light passes whole.
        for (int c = 0; c < 3; ++c)
            out->diffuse[c] = 1.0f, out->specular[c] = 0.0f;
        return;
    }
    for (int c = 0; c < 3; ++c)
        out->diffuse[c] = out->specular[c] = 0.0f;
    double v[3] = {};
    if (needsPoint) {
        for (int k = 0; k < 3; ++k)
            v[k] = eye[k] - p[k];
        double lengthSquared = Dot(v, v);
        if (lengthSquared < 1e-48) SY_ThrowZeroLengthVector();
        double inverse = 1.0 / std::sqrt(lengthSquared);
        for (double& component : v)
            component *= inverse;
    }
    for (const SY_LightState* light : lights) {
        const double* color = light->color + 1;
        if (light->type == kSY_LightAmbient) {
            for (int c = 0; c < 3; ++c)
                out->diffuse[c] += static_cast<float>(color[c] * ambient);
            continue;
        }
        double l[3];
        if (light->type == kSY_LightParallel) {
            for (int k = 0; k < 3; ++k)
                l[k] = light->direction[k];
        } else {
            for (int k = 0; k < 3; ++k)
                l[k] = light->position[k] - p[k];
            double lengthSquared = Dot(l, l);
            if (lengthSquared < 1e-12) continue;
            double inverse = 1.0 / std::sqrt(lengthSquared);
            for (double& component : l)
                component *= inverse;
        }
        double facing = Dot(n, l);
        bool backLit = facing <= 0.0;
        if (backLit) {
            if (lightTransmission == 0.0) continue;
            facing = -facing;
        }
        float spot = 1.0f;
        if (light->type == kSY_LightSpot) {
            spot = SpotFactor(*light, Dot(l, light->direction));
            if (spot < 0.0f) continue;
        }
        float k = spot * Falloff(*light, DistanceSquared(*light, p));
        if (backLit) k *= static_cast<float>(lightTransmission);
        if (diffuse != 0.0) {
            auto amount = static_cast<float>(k * diffuse * facing);
            for (int c = 0; c < 3; ++c)
                out->diffuse[c] += static_cast<float>(color[c]) * amount;
        }
        if (specular == 0.0) continue;
        double q;
        if (backLit) {
            q = Dot(l, v) * Dot(l, v);
        } else {
            double h[3] = {l[0] + v[0], l[1] + v[1], l[2] + v[2]};
            double nh = Dot(n, h);
            if (nh <= 0.0) continue;
            q = nh * nh / Dot(h, h);
        }
        auto sigma = static_cast<float>(k * specular) *
                     specularTable->values[static_cast<int32_t>(q * SY_SpecularTable::kSteps)];
        if (facing < 0.01) sigma *= static_cast<float>(100.0 * facing);
        auto toDiffuse = static_cast<float>(metal), toSpecular = 1.0f - toDiffuse;
        for (int c = 0; c < 3; ++c) {
            float highlight = static_cast<float>(color[c]) * sigma;
            out->diffuse[c] += toDiffuse * highlight;
            out->specular[c] += toSpecular * highlight;
        }
    }
}

void SY_LayerShader::LightTwoPixels(const double p1[3], const double p2[3], const double n[3],
                                    SY_Lighting* out1, SY_Lighting* out2) const {
    LightOnePixel(p1, n, out1);
    LightOnePixel(p2, n, out2);
}
