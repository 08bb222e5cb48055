#include "renderer/scene/renderable.h"

SY_TRLayer::SY_TRLayer(const SY_LayerDesc& layer)
    : material(layer.material),
      collapsed(layer.collapsed),
      unbounded(layer.unbounded),
      trackMatte(layer.trackMatte.get()) {}
