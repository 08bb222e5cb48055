// The renderer's single entry for one frame.
#pragma once

#include "pf_iterate.h"
#include "pf_world.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/scene_desc.h"

// Renders the scene into destination. multiprocessing is false when the machine has one
// processor or the user turned it off; compHandle is the host's, passed on to depth-of-field
// buffers. Failures leave as thrown 32-bit error codes, with everything of the frame freed.
void SY_RenderFrame(const SY_SceneDesc& scene, SY_TTextureFetcher* fetcher,
                    SY_ProgressAbort* progress, const QNGP_IterateSuite1* iterateSuite,
                    bool multiprocessing, PF_World* destination, void* compHandle);
