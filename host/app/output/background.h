// The comp's background colour under a rendered frame, for users who want opaque frames.
#pragma once

#include "composition/composition.h"
#include "pf_world.h"

namespace ostrel {

// Composites the frame (straight colour) over the opaque colour: every pixel becomes
// colour · alpha + background · (1 − alpha) with full alpha, rounded to the nearest level in 8
// and 16 bits. Throws PF_UnexpectedBitDepth for a world of another depth.
void CompositeOverBackground(const PF_World& frame, const Color& background);

}  // namespace ostrel
