// Shadow maps: what a light knows of the layers that stand between it and a point.
#pragma once

#include <cstdint>

#include "u_memory.h"

// Base of the planar and cubic maps; each light state owns at most one. Lookups run on many
// render threads at once.
class SY_ShadowMap : public U_MemTrackedObject {
public:
    virtual ~SY_ShadowMap() = default;
    // The light that reaches the world point p of the receiving layer: out[1..3] get the red,
    // green and blue transmission in 0..1. A layer never shadows itself.
    virtual void HardLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;
    // As HardLookup, filtered over the neighbouring texels for soft shadow edges.
    virtual void SoftLookup(const double p[3], uint16_t receiverId, float out[4]) const = 0;
};
