#include "renderer/scene/renderable_list.h"

#include "renderer/scene/layer_projection.h"
#include "renderer/scene/light_state.h"

namespace {

const SY_LightState* FindLight(int32_t id, const SY_LightState* lightStates, int32_t count) {
    for (int32_t i = 0; i < count; ++i) {
        if (lightStates[i].id == id) return &lightStates[i];
    }
    return nullptr;
}

void AssignLights(const SY_LayerDesc& layer, const SY_LightState* lightStates, int32_t lightCount,
                  SY_TRLayer* renderable) {
    int32_t matched = 0;
    for (int32_t id : layer.lightIds) {
        if (FindLight(id, lightStates, lightCount)) ++matched;
    }
    renderable->lights.Allocate(matched);
    int32_t next = 0;
    for (int32_t id : layer.lightIds) {
        if (const SY_LightState* light = FindLight(id, lightStates, lightCount)) {
            renderable->lights[next++] = light;
        }
    }
    if (matched == 0) renderable->material.acceptsLights = false;
}

}  // namespace

void SY_BuildRenderables(const SY_RenderableSources& sources, SY_Renderables* renderables) {
    renderables->clear();
    SY_SetUpOptions options;
    options.dof = sources.dof;
    options.output = {0, 0, static_cast<double>(sources.outputWidth),
                      static_cast<double>(sources.outputHeight)};
    for (int32_t i = 0; i < sources.layerCount; ++i) {
        const SY_LayerDesc& layer = sources.layers[i];
        if (layer.material.opacity == 0 || !(layer.material.renders || layer.material.wireframe))
            continue;
        SY_TRLayer renderable(layer);
        options.depthOffset = layer.material.depthIndex * kSY_DepthStepPerIndex;
        const SY_CameraView& camera =
            layer.material.motionBlur ? sources.motionCamera : sources.frameCamera;
        if (!SY_SetUpRenderable(layer, camera, options, &renderable)) continue;
        AssignLights(layer, sources.lightStates, sources.lightCount, &renderable);
        renderables->push_back(std::move(renderable));
    }
}
