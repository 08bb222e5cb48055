// The three interfaces through which the renderer core reaches back to the host.
#pragma once

#include <cstdint>
#include <functional>
#include <map>

#include "m_matrix.h"
#include "pf_world.h"
#include "renderer/scene/accounted_allocator.h"

// Layer textures. The host side implements the fetch and release; the core keeps the
// acquisition state, so that the host renders a layer once for as long as some screen geometry
// holds its texture, and again when it is acquired after its last release.
class SY_TTextureFetcher {
public:
    struct Texture {
        PF_World* world;  // null when the host delivers nothing
        M_Matrix3
            textureToLayer;  // texture pixels to layer pixels: diagonal dx, dy at a downsample
    };

    // The texture of the layer at renderIndex: the held one, or a fresh fetch. Throws a
    // non-zero fetch result.
    Texture Acquire(int32_t renderIndex, bool wholeLayer, const double* scaleHint,
                    const M_LRect* rectHint);
    // Gives up one hold; the last one hands the world back to the host. Unknown indices are
    // ignored.
    void ReleaseTexture(int32_t renderIndex);
    // Holds on the texture of renderIndex (0 when it is not held).
    int32_t UseCount(int32_t renderIndex) const;

    // Has the host render the texture of the layer at renderIndex. With wholeLayer the layer is
    // delivered at its own size and textureMatrix stays identity; otherwise the hints (average
    // screen scale, layer-pixel rectangle; either may be null) let the host choose a size, and
    // textureMatrix maps texture pixels to layer pixels. Returns 0 or an error code; *world is
    // null when the host has nothing to deliver.
    virtual int32_t Fetch(int32_t renderIndex, bool wholeLayer, const double* scaleHint,
                          const M_LRect* rectHint, M_Matrix3* textureMatrix, PF_World** world) = 0;
    // Hands a fetched world back to the host.
    virtual void Release(int32_t renderIndex, PF_World* world) = 0;
    virtual ~SY_TTextureFetcher() = default;

private:
    struct Entry {
        Texture texture;
        int32_t uses;
    };
    using Value = std::pair<const int32_t, Entry>;
    std::map<int32_t, Entry, std::less<>, SY_AccountedAllocator<Value>> held_;
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
