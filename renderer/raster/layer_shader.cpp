#include <algorithm>

#include "renderer/raster/light_terms.h"
#include "renderer/raster/shader.h"
#include "renderer/scene/render_context.h"
#include "renderer/shadow/shadow_map.h"

namespace {

// The lit path reads the surface point for the light's direction and distance, for the view
// vector of highlights, and for shadow lookups.
bool LitReadsPoint(const SY_LayerShader& shader, const SY_LightState& light) {
    if (light.type == kSY_LightAmbient) return false;
    return light.type != kSY_LightParallel || SY_FalloffUsesDistance(light) ||
           shader.material.specular != 0.0 ||
           (shader.material.acceptsShadows != 0 && light.shadowMap);
}

}  // namespace

std::unique_ptr<SY_LayerShader> SY_MakeLayerShader(SY_RenderContext* context,
                                                   const SY_TRLayer& renderable) {
    const SY_Material& material = renderable.material;
    auto shader = std::make_unique<SY_LayerShader>();
    shader->layerId = SY_ShadowLayerId(material.renderIndex);
    shader->material = material;
    std::copy(context->cameraPosition, context->cameraPosition + 3, shader->eye);
    shader->depthOffset = SY_DepthOffset(material);
    shader->softShadowLookup = material.acceptsShadows != 0 && material.bestQuality;

    shader->lights.Allocate(renderable.lights.Count());
    std::copy(renderable.lights.begin(), renderable.lights.end(), shader->lights.begin());
    const SY_LightState* const* first = shader->lights.begin();
    const SY_LightState* const* last = shader->lights.end();
    if (material.acceptsLights) {
        shader->shaded = first != last;
        shader->needsPoint = std::any_of(first, last, [&](const SY_LightState* light) {
            return LitReadsPoint(*shader, *light);
        });
        bool located = std::any_of(first, last, [](const SY_LightState* light) {
            return light->type != kSY_LightAmbient;
        });
        if (material.specular != 0.0 && located) {
            shader->specularTable = &context->specularTables.ForShininess(material.shininess);
        }
    } else {
        // Only shadows can change such a layer's pixels, and every shadow lookup reads the point.
        shader->shaded = material.acceptsShadows != 0 &&
                         std::any_of(first, last, [](const SY_LightState* light) {
                             return light->shadowMap != nullptr;
                         });
        shader->needsPoint = shader->shaded;
    }
    return shader;
}
