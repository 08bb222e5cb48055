#include "light_capture.h"

#include <utility>
#include <vector>

#include "layer_streams.h"
#include "resources/shadow_map_sizes.h"

namespace {

// The scene model numbers light types as the host does, so a type passes through unchanged.
static_assert(kSY_LightParallel == kQNGP_LightParallel && kSY_LightSpot == kQNGP_LightSpot &&
              kSY_LightPoint == kQNGP_LightPoint && kSY_LightAmbient == kQNGP_LightAmbient);

// Degrees of the full cone to radians of half of it: π / 360.
constexpr double kHalfConeRadiansPerDegree = 0.008726646259971648;

struct LightSource {
    QNGP_LayerH layer;
    int32_t compIndex;
    int32_t type;
};

// The record's values come from the middle sample time; its placements from every sample.
SY_LightDesc CaptureLight(ORM_SuiteTable& suites, const LightSource& light,
                          const ORM_CaptureFrame& frame, int32_t shadowMapSize) {
    const T_Time& middle = frame.samples[frame.samples.size() / 2];
    auto number = [&](QNGP_Stream stream) {
        return ORM_StreamNumber(suites, light.layer, stream, middle);
    };
    auto fraction = [&](QNGP_Stream stream) {
        return ORM_StreamFraction(suites, light.layer, stream, middle);
    };
    bool ambient = light.type == kQNGP_LightAmbient;
    bool spot = light.type == kQNGP_LightSpot;

    SY_LightDesc record;
    record.type = light.type;
    record.id = light.compIndex;
    QNGP_StreamValue color = ORM_StreamValue(suites, light.layer, kQNGP_StreamColor, middle);
    double intensity = fraction(kQNGP_StreamIntensity);
    record.color[0] = 1.0;
    for (int c = 1; c < 4; ++c)
        record.color[c] = color.v[c] * intensity;
    record.coneHalfAngle = spot ? number(kQNGP_StreamConeAngle) * kHalfConeRadiansPerDegree : 0;
    record.coneFeather = spot ? fraction(kQNGP_StreamConeFeather) : 0;
    record.castsShadows = number(kQNGP_StreamCastsShadows) != 0;
    record.shadowDarkness = fraction(kQNGP_StreamShadowDarkness);
    record.shadowDiffusion =
        light.type == kQNGP_LightParallel ? 0 : number(kQNGP_StreamShadowDiffusion);
    if (!ambient) {
        // The host's falloff menu counts from 1.
        record.falloffType = static_cast<int32_t>(number(kQNGP_StreamFalloff) - 1);
        record.falloffRadius = number(kQNGP_StreamFalloffRadius);
        record.falloffDistance = number(kQNGP_StreamFalloffDistance);
    }
    record.shadowMapSize = shadowMapSize;

    if (!ambient) {
        auto count = static_cast<int32_t>(frame.samples.size());
        record.placements.Allocate(count);
        const auto& layers = suites.Get<QNGP_LayerSuite10>();
        for (int32_t i = 0; i < count; ++i) {
            ORM_Check(layers.GetLayerToWorldXform(
                light.layer, &frame.samples[static_cast<size_t>(i)], &record.placements[i]));
            ORM_Check(M_ScaleMatrix4(frame.pixelAspect, 1, 1, &record.placements[i]));
        }
    }
    return record;
}

}  // namespace

void ORM_LinkLight(int32_t lightIndex, bool layersBelowOnly, SY_OwnedArray<SY_LayerDesc>* layers) {
    for (SY_LayerDesc& layer : *layers) {
        if (!layersBelowOnly || layer.compIndex > lightIndex) layer.lightIds.push_back(lightIndex);
    }
}

void ORM_CaptureLights(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene) {
    ORM_SuiteTable& suites = context.Suites();
    scene->lightsEnabled = false;
    int32_t compFlags = 0;
    ORM_Check(suites.Get<QNGP_CompSuite9>().GetCompFlags(context.Comp(), &compFlags));
    if (compFlags & kQNGP_CompFlagNoLightsOrDepthOfField) return;

    int32_t shadowMapSize = ORM_ShadowMapSize(context.Options().shadowMapSizeChoice);
    const auto& layers = suites.Get<QNGP_LayerSuite10>();
    int32_t layerCount = 0;
    ORM_Check(layers.GetCompNumLayers(context.Comp(), &layerCount));
    std::vector<SY_LightDesc> captured;
    for (int32_t i = 0; i < layerCount; ++i) {
        QNGP_LayerH layer = nullptr;
        ORM_Check(layers.GetCompLayerByIndex(context.Comp(), i, &layer));
        int32_t objectType = 0;
        ORM_Check(layers.GetLayerObjectType(layer, &objectType));
        if (objectType != kQNGP_ObjectTypeLight) continue;
        bool active = false;
        ORM_Check(layers.IsLayerActive(layer, &frame.renderTime, &active));
        if (!active) continue;
        LightSource light{layer, i, 0};
        ORM_Check(suites.Get<QNGP_LightSuite1>().GetLightType(layer, &light.type));
        captured.push_back(CaptureLight(suites, light, frame, shadowMapSize));
        int32_t layerFlags = 0;
        ORM_Check(layers.GetLayerFlags(layer, &layerFlags));
        ORM_LinkLight(i, layerFlags & kQNGP_LayerFlagAdjustment, &scene->layers);
    }

    scene->lights.Allocate(static_cast<int32_t>(captured.size()));
    for (int32_t i = 0; i < scene->lights.Count(); ++i)
        scene->lights[i] = std::move(captured[static_cast<size_t>(i)]);
    scene->lightsEnabled = true;
}
