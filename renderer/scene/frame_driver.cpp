#include "renderer/scene/frame_driver.h"

#include "renderer/scene/render_context.h"

void SY_RenderFrame(const SY_SceneDesc& scene, SY_TTextureFetcher* fetcher,
                    SY_ProgressAbort* progress, const QNGP_IterateSuite1* iterateSuite,
                    bool multiprocessing, PF_World* destination, void* /*compHandle*/) {
    SY_RenderContext context;
    SY_SetUpContext(&context, scene, fetcher, progress, iterateSuite, multiprocessing, destination);
    SY_PrepareLights(&context);
}
