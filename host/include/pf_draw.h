// Drawing into worlds.
#pragma once

#include "pf_pixel.h"
#include "pf_world.h"

// Draws an anti-aliased line of one pixel's width from (x0, y0) to (x1, y1), in pixel
// coordinates with pixel (i, j) covering [i, i + 1) × [j, j + 1), blending colour (straight,
// converted to the world's depth) over the world with the normal mode at the line's coverage.
// Parts outside the world are skipped. Throws PF_UnexpectedBitDepth for a world of a depth
// other than 8, 16 and 32.
void PF_DrawLine(const PF_World& world, double x0, double y0, double x1, double y1,
                 const PF_PixelFloat& color);
