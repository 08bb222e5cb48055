// The numbers by which the host's suites describe a comp and its layers, from the composition.
#pragma once

#include <cstdint>

#include "composition/composition.h"
#include "qngp_suites.h"

namespace ostrel {

// Each answers with the host's numbers declared in qngp_suites.h.
int32_t CompFlags(const Composition& comp);
int32_t LayerFlags(const Layer& layer);
int32_t TransferFlags(const Layer& layer);
int32_t ObjectType(const Layer& layer);
int32_t CameraType(const Layer& camera);

}  // namespace ostrel
