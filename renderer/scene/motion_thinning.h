// Draft motion blur samples half as many instants as best quality.
#pragma once

#include "renderer/scene/renderable.h"

// A draft renderable that is valid at more than one subsample keeps every second subsample,
// starting at the parity of its first valid one, and its validity range is recomputed over the
// kept ones. Best-quality renderables and those valid at a single subsample are left as they
// are. Throws the host's memory code when memory runs out; the renderable is then unchanged.
void SY_ThinDraftMotionBlur(SY_TRLayer* renderable);
