#include <algorithm>

#include "renderer/raster/shader.h"
#include "renderer/scene/render_context.h"

namespace {

// Layers later in render order lie this much farther behind per index, as in their geometry.
constexpr double kDepthStepPerIndex = 1e-7;

}  // namespace

std::unique_ptr<SY_LayerShader> SY_MakeLayerShader(SY_RenderContext* context,
                                                   const SY_TRLayer& renderable) {
    const SY_Material& material = renderable.material;
    auto shader = std::make_unique<SY_LayerShader>();
    shader->layerId = static_cast<uint16_t>(material.renderIndex);
    shader->mode = material.mode;
    shader->opacity = material.opacity;
    shader->ambient = material.ambient;
    shader->diffuse = material.diffuse;
    shader->specular = material.specular;
    shader->lightTransmission = material.lightTransmission;
    shader->metal = material.metal;
    std::copy(context->cameraPosition, context->cameraPosition + 3, shader->eye);
    shader->depthOffset = static_cast<float>(-material.depthIndex * kDepthStepPerIndex);
    shader->acceptsShadows = material.acceptsShadows;
    shader->acceptsLights = material.acceptsLights;

    shader->lights.Allocate(renderable.lights.Count());
    std::copy(renderable.lights.begin(), renderable.lights.end(), shader->lights.begin());
    auto casting = [](const SY_LightState* light) { return light->shadowMap != nullptr; };
    auto located = [](const SY_LightState* light) { return light->type != kSY_LightAmbient; };
    bool lit = material.acceptsLights && !shader->lights.Empty();
    bool shadowed = !material.acceptsLights &&
                    std::any_of(shader->lights.begin(), shader->lights.end(), casting);
    shader->shaded = lit || shadowed;
    shader->needsPoint =
        shader->shaded && std::any_of(shader->lights.begin(), shader->lights.end(), located);
    if (lit && material.specular != 0.0) {
        shader->specularTable = &context->specularTables.ForShininess(material.shininess);
    }
    return shader;
}
