// Shadow maps: what a light knows of the layers that stand between it and a point.
#pragma once

#include "u_memory.h"

// Base of the planar and cubic maps; each light state owns at most one.
class SY_ShadowMap : public U_MemTrackedObject {
public:
    virtual ~SY_ShadowMap() = default;
};
