// The lighting of layer pixels written once over the lane packs (light_lanes.h): one pixel,
// two, or four at once all run the same operations in the same order on every lane, so a pixel
// lights bit for bit the same in any of them. Geometry is worked in doubles, the light terms
// are gathered in floats.
#pragma once

#include "renderer/raster/light_terms.h"
#include "renderer/raster/shader.h"
#include "renderer/scene/messages.h"

namespace sy_lighting {

template <class L>
struct PixelLighting {
    using Real = typename L::Real;
    using Single = typename L::Single;
    using Mask = typename L::Mask;

    // Every lane array is written before it is read: Lit() sets the points and the normal,
    // Run() the terms. Left unset here, as clearing them cost a string store on every pixel.
    PixelLighting(const SY_LayerShader& layerShader, SY_LightSet lightsReaching)
        : shader(layerShader), reaching(lightsReaching) {}

    const SY_LayerShader& shader;
    SY_LightSet reaching;  // the lit path leaves the other lights out
    Real p[3];             // surface points; read only when the shader needs them
    Real n[3];
    Single diffuse[3];
    Single specular[3];

    void Store(SY_Lighting* const out[L::kCount]) const {
        for (int i = 0; i < L::kCount; ++i) {
            for (int c = 0; c < 3; ++c) {
                out[i]->diffuse[c] = L::LaneSingle(diffuse[c], i);
                out[i]->specular[c] = L::LaneSingle(specular[c], i);
            }
        }
    }

    // Unit vector from the surface toward the eye; an eye on the surface ends the frame.
    void ViewVector(Real v[3]) const {
        for (int k = 0; k < 3; ++k)
            v[k] = L::Splat(shader.eye[k]) - p[k];
        Real lengthSquared = SY_Dot<L>(v, v);
        if (L::Any(L::Less(lengthSquared, L::Splat(1e-48)))) SY_ThrowZeroLengthVector();
        Real inverse = L::Splat(1.0) / L::Sqrt(lengthSquared);
        for (int k = 0; k < 3; ++k)
            v[k] = v[k] * inverse;
    }

    void Lit() {
        for (int c = 0; c < 3; ++c)
            diffuse[c] = specular[c] = L::SplatSingle(0.0f);
        Real v[3] = {L::Splat(0.0), L::Splat(0.0), L::Splat(0.0)};
        if (shader.needsPoint) ViewVector(v);
        for (int32_t i = 0; i < shader.lights.Count(); ++i) {
            const SY_LightState* light = shader.lights[i];
            if (i < 64 && !((reaching >> i) & 1)) continue;
            if (light->type == kSY_LightAmbient) {
                if (shader.material.ambient == 0.0) continue;
                for (int c = 0; c < 3; ++c) {
                    diffuse[c] = diffuse[c] + L::SplatSingle(static_cast<float>(
                                                  light->color[1 + c] * shader.material.ambient));
                }
                continue;
            }
            LightFromSource(*light, v);
        }
    }

    void LightFromSource(const SY_LightState& light, const Real v[3]) {
        Mask active = L::All();
        Real l[3];
        Real distanceSquared = L::Splat(0.0);
        if (light.type == kSY_LightParallel) {
            for (int k = 0; k < 3; ++k)
                l[k] = L::Splat(light.direction[k]);
            if (SY_FalloffUsesDistance(light)) distanceSquared = SY_DistanceSquared<L>(light, p);
        } else {
            for (int k = 0; k < 3; ++k)
                l[k] = L::Splat(light.position[k]) - p[k];
            // The light vector's length is the light's distance.
            distanceSquared = SY_Dot<L>(l, l);
            // A light on the surface point has no direction: it is left out, not reported.
            active = L::AndNot(L::Less(distanceSquared, L::Splat(1e-12)), active);
            if (L::None(active)) return;
            Real inverse = L::Splat(1.0) / L::Sqrt(distanceSquared);
            for (int k = 0; k < 3; ++k)
                l[k] = l[k] * inverse;
        }

        // A light in the layer's plane counts as behind it.
        Real facing = SY_Dot<L>(n, l);
        Mask behind = L::LessEqual(facing, L::Splat(0.0));
        if (shader.material.lightTransmission == 0.0) {
            active = L::AndNot(behind, active);
            if (L::None(active)) return;
        } else {
            facing = L::Select(behind, -facing, facing);
        }

        Single spot = L::SplatSingle(1.0f);
        if (light.type == kSY_LightSpot) {
            Real axis[3] = {L::Splat(light.direction[0]), L::Splat(light.direction[1]),
                            L::Splat(light.direction[2])};
            Real c = SY_Dot<L>(l, axis);
            active = L::AndNot(L::Less(c, L::Splat(light.cosOuter)), active);
            if (L::None(active)) return;
            spot = SY_SpotEdge<L>(light, c);
        }
        // The falloff is looked at only where it can be other than 1: a call for nothing costs
        // the registers it makes the caller save.
        Single k =
            SY_FalloffUsesDistance(light) ? spot * SY_Falloff<L>(light, distanceSquared) : spot;
        if (shader.material.lightTransmission != 0.0) {
            k = L::SelectSingle(
                behind, k * L::SplatSingle(static_cast<float>(shader.material.lightTransmission)),
                k);
        }

        Single e[3];
        for (int c = 0; c < 3; ++c)
            e[c] = L::SplatSingle(static_cast<float>(light.color[1 + c]));
        if (shader.material.acceptsShadows != 0 && light.shadowMap) {
            Single t[3], a[3];
            // Where all of the light passes, the attenuation is 1 and changes nothing.
            if (!SY_ShadowTransmission<L>(*light.shadowMap, shader.softShadowLookup != 0,
                                          shader.layerId, p, active, t)) {
                SY_ShadowAttenuation<L>(t, L::SplatSingle(static_cast<float>(light.shadowDarkness)),
                                        L::Uniform(light.shadowDarkness == 1.0), a);
                Single most = L::Max(L::Max(a[0], a[1]), a[2]);
                active = L::AndNot(L::LessEqualSingle(most, L::SplatSingle(0.0f)), active);
                if (L::None(active)) return;
                for (int c = 0; c < 3; ++c)
                    e[c] = e[c] * a[c];
            }
        }

        if (shader.material.diffuse != 0.0) {
            Single amount = L::ToSingle(L::ToReal(k) * L::Splat(shader.material.diffuse) * facing);
            for (int c = 0; c < 3; ++c)
                diffuse[c] = diffuse[c] + L::Keep(active, e[c] * amount);
        }
        if (shader.material.specular != 0.0) Highlight(l, v, facing, behind, k, e, active);
    }

    // Blinn highlight from the power table; a light behind the layer shines through toward the
    // eye instead.
    void Highlight(const Real l[3], const Real v[3], Real facing, Mask behind, Single k,
                   const Single e[3], Mask active) {
        Real h[3] = {l[0] + v[0], l[1] + v[1], l[2] + v[2]};
        Real nh = SY_Dot<L>(n, h);
        Real q = nh * nh / SY_Dot<L>(h, h);
        Mask turnedAway = L::LessEqual(nh, L::Splat(0.0));
        if (shader.material.lightTransmission != 0.0) {
            Real lv = SY_Dot<L>(l, v);
            q = L::Select(behind, lv * lv, q);
            turnedAway = L::AndNot(behind, turnedAway);
        }
        active = L::AndNot(turnedAway, active);
        if (L::None(active)) return;
        Single power = L::Lookup(shader.specularTable->values, L::Select(active, q, L::Splat(0.0)),
                                 SY_SpecularTable::kSteps);
        Single sigma = L::ToSingle(L::ToReal(k) * L::Splat(shader.material.specular)) * power;
        // Highlights fade out as the light grazes the surface.
        sigma = L::SelectSingle(L::Less(facing, L::Splat(0.01)),
                                sigma * L::ToSingle(L::Splat(100.0) * facing), sigma);
        const float metal = static_cast<float>(shader.material.metal);
        for (int c = 0; c < 3; ++c) {
            // Metal gives the highlight the texture's colour by adding it to the diffuse factor.
            Single highlight = L::Keep(active, e[c] * sigma);
            if (metal == 0.0f) {
                specular[c] = specular[c] + highlight;
            } else if (metal == 1.0f) {
                diffuse[c] = diffuse[c] + highlight;
            } else {
                diffuse[c] = diffuse[c] + L::SplatSingle(metal) * highlight;
                specular[c] = specular[c] + L::SplatSingle(1.0f - metal) * highlight;
            }
        }
    }

    // A layer that takes no light shows its texture, darkened where shadows fall on it.
    void ShadowOnly() {
        for (int c = 0; c < 3; ++c) {
            diffuse[c] = L::SplatSingle(1.0f);
            specular[c] = L::SplatSingle(0.0f);
        }
        for (const SY_LightState* light : shader.lights) {
            if (light->shadowMap) Darken(*light);
        }
    }

    void Darken(const SY_LightState& light) {
        Real l[3];
        for (int k = 0; k < 3; ++k) {
            l[k] = light.type == kSY_LightParallel ? L::Splat(light.direction[k])
                                                   : L::Splat(light.position[k]) - p[k];
        }
        Mask active = L::AndNot(L::LessEqual(SY_Dot<L>(n, l), L::Splat(0.0)), L::All());
        if (L::None(active)) return;
        // For a light with a position, its distance is the light vector's length.
        Real distanceSquared =
            light.type == kSY_LightParallel ? SY_DistanceSquared<L>(light, p) : SY_Dot<L>(l, l);
        Single spot = L::SplatSingle(1.0f);
        if (light.type == kSY_LightSpot) {
            active = L::AndNot(L::Less(distanceSquared, L::Splat(1e-12)), active);
            if (L::None(active)) return;
            Real axis[3] = {L::Splat(light.direction[0]), L::Splat(light.direction[1]),
                            L::Splat(light.direction[2])};
            Real c = SY_Dot<L>(l, axis) / L::Sqrt(distanceSquared);
            active = L::AndNot(L::Less(c, L::Splat(light.cosOuter)), active);
            if (L::None(active)) return;
            spot = SY_SpotEdge<L>(light, c);
        }
        Single w = L::ToSingle(L::ToReal(spot) * L::Splat(light.shadowDarkness) *
                               L::ToReal(SY_Falloff<L>(light, distanceSquared)));
        active = L::AndNot(L::LessEqualSingle(w, L::SplatSingle(0.0f)), active);
        if (L::None(active)) return;
        Single t[3], a[3];
        // Where all of the light passes, nothing darkens.
        if (SY_ShadowTransmission<L>(*light.shadowMap, shader.softShadowLookup != 0, shader.layerId,
                                     p, active, t))
            return;
        SY_ShadowAttenuation<L>(t, w, L::EqualSingle(w, L::SplatSingle(1.0f)), a);
        for (int c = 0; c < 3; ++c)
            diffuse[c] = L::SelectSingle(active, diffuse[c] * a[c], diffuse[c]);
    }

    void Run(bool shadowsOnly) {
        if (shader.material.acceptsLights && !shadowsOnly) {
            Lit();
        } else {
            ShadowOnly();
        }
    }
};

// The lighting of L::kCount points of the layer, left in the lanes of the returned terms.
// loadPoints(p) sets p[k] to coordinate k of the points, one a lane; it writes the lighting's
// own array, as a copy of it went through memory in halves that the next wide read waited on.
template <class L, class LoadPoints>
PixelLighting<L> Lit(const SY_LayerShader& shader, LoadPoints loadPoints, const double n[3],
                     SY_LightSet reaching, bool shadowsOnly = false) {
    PixelLighting<L> lighting(shader, reaching);
    for (int k = 0; k < 3; ++k)
        lighting.n[k] = L::Splat(n[k]);
    // Without the need the span routine does not work out the points. Two loops, not a choice
    // per coordinate, which the compiler turned into clearing the points with a string store.
    if (shader.needsPoint) {
        loadPoints(lighting.p);
    } else {
        for (int k = 0; k < 3; ++k)
            lighting.p[k] = L::Splat(0.0);
    }
    lighting.Run(shadowsOnly);
    return lighting;
}

template <class L>
void Light(const SY_LayerShader& shader, const double* const p[L::kCount], const double n[3],
           SY_Lighting* const out[L::kCount], SY_LightSet reaching, bool shadowsOnly = false) {
    auto load = [p](typename L::Real points[3]) {
        for (int k = 0; k < 3; ++k)
            points[k] = L::Load(p, k);
    };
    Lit<L>(shader, load, n, reaching, shadowsOnly).Store(out);
}

}  // namespace sy_lighting
