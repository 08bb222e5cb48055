// Where a layer render delivers its pixels.
#pragma once

#include <cstdint>

enum SY_TargetMode : int32_t {
    kSY_TargetDestination = 1,     // composited into the destination world
    kSY_TargetFragmentBuffer = 2,  // added as fragments to an SY_MBuffer
    kSY_TargetDepthOfField = 3,    // stored into a depth-of-field buffer
    kSY_TargetShadowArray = 4,     // inserted as occluders into a shadow fragment array
};

struct SY_RenderTarget {
    int32_t mode;
    void* object;
};
