// The frame driver's per-frame state. Everything a frame allocates lives here and goes when the
// context goes, also when a failure unwinds the frame.
#pragma once

#include <cstdint>
#include <memory>

#include "m_matrix.h"
#include "pf_iterate.h"
#include "pf_world.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/light_state.h"
#include "renderer/scene/owned_array.h"
#include "renderer/scene/renderable_list.h"
#include "renderer/scene/scene_desc.h"
#include "renderer/scene/specular_table.h"
#include "renderer/scene/sum_table_cache.h"

struct ShapeKernelArray;

struct SY_RenderContext {
    const SY_SceneDesc* scene = nullptr;
    SY_Renderables renderables;                   // one per drawn layer, in render order
    SY_OwnedArray<SY_LightState> lightStates;     // same order as the scene's lights
    SY_OwnedArray<M_Matrix4> worldToScreen;       // per camera subsample
    SY_OwnedArray<M_Matrix4> frameWorldToScreen;  // one: at the frame's own time
    SY_OwnedArray<double> projectionW;            // element [2][3] of each camera projection
    bool perspective = true;
    double cameraPosition[3] = {};
    double cameraAxis[3] = {};  // unit z axis of the camera at the frame's time
    PF_World* destination = nullptr;
    SY_TTextureFetcher* textureFetcher = nullptr;
    SY_ProgressAbort* progress = nullptr;
    const QNGP_IterateSuite1* iterateSuite = nullptr;
    PF_IterateFunction iterate = nullptr;
    int32_t renderableCount = 0;
    int32_t renderablesDone = 0;
    SY_SpecularTables specularTables;
    // The camera's iris kernels, made as far as the layers drawn so far have needed them.
    std::shared_ptr<const ShapeKernelArray> dofKernels;
    // Caster textures' sums while shadow maps are built; a cache, so filled through const.
    mutable SY_SumTableCache shadowSums;
};

// Context set-up: stores the frame's objects, prepares the threads, and validates the camera
// into the per-subsample world-to-screen matrices. Reports and throws the camera messages.
void SY_SetUpContext(SY_RenderContext* context, const SY_SceneDesc& scene,
                     SY_TTextureFetcher* fetcher, SY_ProgressAbort* progress,
                     const QNGP_IterateSuite1* iterateSuite, bool multiprocessing,
                     PF_World* destination);

// Fills the context's light states from the scene's lights.
void SY_PrepareLights(SY_RenderContext* context);
