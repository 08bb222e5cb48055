// The span routine of shadow maps: one row of a casting layer, seen from the light, turned
// into occluders of the map's texels.
#pragma once

#include <cstdint>

class SY_ScreenGeometry;
class SY_ShadowShader;
class SY_ShadowFragmentArray;

// Adds an occluder to texels x .. x + count − 1 of map row y for every blur level at which the
// layer is not transparent there. The texture may be of any of the three depths. Throws 4 when
// fragment memory runs out.
void SY_RenderShadowSpan(const SY_ScreenGeometry& geometry, const SY_ShadowShader& shader,
                         int32_t x, int32_t count, int32_t y, SY_ShadowFragmentArray* array,
                         int32_t thread);
