// Screen geometry: while a renderable is drawn, its texture and the mappings from screen pixels
// to texture pixels that the span routines step across each row.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "pf_tables.h"
#include "pf_world.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/owned_array.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/sum_table_cache.h"

struct SY_RenderContext;

struct SY_GeometryFlags {
    bool perspective = true;
    bool screenSizedTexture = false;  // ask the host for a texture sized to the screen footprint
    bool needsSurfacePoint = false;   // the shader lights points: fill the eye-ray mapping
    bool blurred = false;             // the shader samples a blurred texture
    bool alphaOnly = false;           // it reads the blurred samples' alpha alone
    bool wholeLayer = false;          // fetch the whole layer at its own size
    SY_SamplingFilter samplingFilter = SY_SamplingFilter::kNearest;
};

// Owns its hold on the texture: destruction hands it back through the fetcher.
class SY_ScreenGeometry {
public:
    SY_ScreenGeometry() = default;
    ~SY_ScreenGeometry();
    SY_ScreenGeometry(const SY_ScreenGeometry&) = delete;
    SY_ScreenGeometry& operator=(const SY_ScreenGeometry&) = delete;

    // Builds the geometry of a renderable's subsamples under the camera matrices. The geometry
    // stays empty (no texture) when the host delivers none. Throws failing matrix operations,
    // fetch results, the zero-length code for a layer without a usable normal, and 4 when the
    // summed-area table of a blurred layer finds no memory.
    void Build(const SY_RenderContext& context, const SY_TRLayer& renderable,
               const M_Matrix4* cameraMatrices, int32_t cameraCount, const SY_GeometryFlags& flags);

    bool Empty() const { return texture == nullptr; }

    SY_TTextureFetcher* textureFetcher = nullptr;
    int32_t renderIndex = 0;
    PF_World* texture = nullptr;
    // Sums over the texture for the box averages of a blurred shadow caster, kept by the
    // render context; all null otherwise.
    SY_CasterSums casterSums;
    // Per subsample: U = m0·x + m3·y + m6, V = m1·x + m4·y + m7, W = m2·x + m5·y + m8 for the
    // screen point (x, y); the texture position is (U/W, V/W) under perspective and (U, V)
    // otherwise, and a larger W is nearer. All zero for a subsample that is not valid.
    SY_OwnedArray<M_Matrix3> screenToTexture;
    int32_t firstValid = -1;
    int32_t lastValid = -1;
    // Rows: the per-x step, the per-y step and the origin of the ray to the surface point,
    // scaled by W. All zero unless the shader needs the surface point.
    M_Matrix3 eyeRay{};
    double normal[3] = {};  // unit normal in world space, turned toward the camera
    bool perspective = true;
    double projectionW = -1;  // the camera's [2][3] under perspective, else −1
    SY_SamplingFilter samplingFilter = SY_SamplingFilter::kNearest;
};
