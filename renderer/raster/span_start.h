// The state a span starts from: the texture and the screen-to-texture mappings of a layer's
// geometry, set up at the centre of the span's first pixel.
#pragma once

#include <cstdint>

#include "renderer/raster/processor.h"
#include "renderer/raster/span_state.h"
#include "renderer/scene/screen_geometry.h"

// Calls body(state) with the single sample state when the geometry has one mapping, else
// with the subsample state, both standing at the centre of pixel (x, y).
template <class P, class Body>
void SY_WithSpanState(const SY_ScreenGeometry& geometry, int32_t x, int32_t y, Body&& body) {
    auto startTexture = [&](SY_SpanTexture* texture) {
        texture->world = geometry.texture;
        texture->samplingFilter = geometry.samplingFilter;
        texture->sampling.src = geometry.texture;
        texture->perspective = geometry.perspective;
        texture->pairs = SY_ProcessorHasAvx2();
    };
    double cx = x + 0.5, cy = y + 0.5;
    int32_t matrices = geometry.screenToTexture.Count();
    if (matrices == 1) {
        SY_SpanSampleState<P> state;
        startTexture(&state.texture);
        state.mapping.Start(geometry.screenToTexture[0], cx, cy, geometry.perspective, 1.0f);
        body(state);
        return;
    }
    SY_SpanSubsampleState<P> state;
    startTexture(&state.texture);
    state.count = matrices;
    state.first = geometry.firstValid;
    state.last = geometry.lastValid;
    for (int32_t i = state.first; i <= state.last; ++i) {
        const M_Matrix3& m = geometry.screenToTexture[i];
        if (m.IsZeroWithinEpsilon(0.0))
            state.mappings[i].StartAbsent();
        else
            state.mappings[i].Start(m, cx, cy, geometry.perspective, 0.5f);
    }
    body(state);
}
