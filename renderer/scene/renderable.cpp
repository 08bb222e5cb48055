#include "renderer/scene/renderable.h"

SY_Material SY_MaterialOf(const SY_LayerDesc& layer) {
    SY_Material m;
    m.renderIndex = layer.renderIndex;
    m.depthIndex = layer.depthIndex;
    m.mode = layer.mode;
    m.opacity = layer.opacity;
    m.ambient = layer.ambient;
    m.diffuse = layer.diffuse;
    m.specular = layer.specular;
    m.shininess = layer.shininess;
    m.lightTransmission = layer.lightTransmission;
    m.metal = layer.metal;
    m.renders = layer.renders;
    m.wireframe = layer.wireframe;
    m.castsShadows = layer.castsShadows;
    m.acceptsShadows = layer.acceptsShadows;
    m.acceptsLights = layer.acceptsLights;
    m.bestQuality = layer.bestQuality;
    m.engineFlag = layer.engineFlag;
    m.motionBlur = layer.motionBlur;
    return m;
}

SY_TRLayer::SY_TRLayer(const SY_LayerDesc& layer)
    : material(SY_MaterialOf(layer)),
      collapsed(layer.collapsed),
      unbounded(layer.unbounded),
      trackMatte(layer.trackMatte.get()) {}
