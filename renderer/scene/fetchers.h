// The three interfaces through which the renderer core reaches back to the host.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "pf_world.h"

// Layer textures. Implemented by the host side; the core keeps its own acquisition state
// beside it (one host fetch while any screen geometry holds a texture).
class SY_TTextureFetcher {
public:
    // Has the host render the texture of the layer at renderIndex. With wholeLayer the layer is
    // delivered at its own size and textureMatrix stays identity; otherwise the hints (average
    // screen scale, layer-pixel rectangle; either may be null) let the host choose a size, and
    // textureMatrix maps layer pixels to texture pixels. Returns 0 or an error code; *world is
    // null when the host has nothing to deliver.
    virtual int32_t Fetch(int32_t renderIndex, bool wholeLayer, const double* scaleHint,
                          const M_LRect* rectHint, M_Matrix3* textureMatrix, PF_World** world) = 0;
    // Hands a fetched world back to the host.
    virtual void Release(int32_t renderIndex, PF_World* world) = 0;
    virtual ~SY_TTextureFetcher() = default;
};

// Progress and abort. A cancel by the user arrives as an integer thrown from either report.
class SY_ProgressAbort {
public:
    // After each renderable: (renderables drawn, renderable count).
    virtual void ReportRenderables(int32_t done, int32_t count) = 0;
    // From the row work items of thread 0: (row, row count).
    virtual void ReportRows(int32_t row, int32_t count) = 0;
    virtual ~SY_ProgressAbort() = default;
};

// A layer's track matte, fetched on demand and owned by the layer record.
class SY_TImageFetcher {
public:
    virtual ~SY_TImageFetcher() = default;
    // The matte world (alpha holds the matte), or null when the layer has none this frame.
    virtual PF_World* Fetch() = 0;
    // Drops the held world.
    virtual void Release() = 0;
    // True when the area outside a missing matte is clear, so the layer is invisible.
    virtual bool OutsideIsClear() const = 0;
};
