#include "render_entry.h"

#include "entry_guard.h"
#include "progress_abort.h"
#include "render_context.h"
#include "renderer/frame/frame_driver.h"
#include "renderer/scene/scene_desc.h"
#include "scene_assembly.h"
#include "texture_fetcher.h"
#include "u_cpu.h"

bool ORM_MultiprocessingSetting(ORM_SuiteTable& suites) {
    const auto& persistent = suites.Get<QNGP_PersistentDataSuite3>();
    QNGP_PersistentBlobH blob = nullptr;
    ORM_Check(persistent.GetApplicationBlob(&blob));
    int32_t value = 1;
    ORM_Check(persistent.GetLong(blob, kORM_SettingsSection, kORM_MultiprocessingKey, 1, &value));
    return value != 0;
}

int32_t ORM_Render(const QNGP_InData* in, QNGP_HostHandle first, QNGP_HostHandle second,
                   QNGP_RenderContextH renderContext, QNGP_HostHandle fourth,
                   QNGP_MemHandle options, QNGP_HostHandle sixth) {
    return ORM_Guard([&] {
        bool multiprocessing = false;
        {
            ORM_SuiteTable suites(in->basic);
            multiprocessing = ORM_MultiprocessingSetting(suites);
        }
        // Declared in this order so that leaving the scope, also by a throw, destroys the
        // fetchers, then unlocks the options and releases the suites, then frees the scene's
        // lights, layers and camera matrices.
        SY_SceneDesc scene;
        ORM_RenderContext context(in, {first, second, renderContext, fourth, options, sixth});
        ORM_TTextureFetcher textures(&context);
        ORM_TProgressAbort progress(&context);

        ORM_AssembleScene(context, &scene);
        const auto& iterate = context.Suites().Get<QNGP_IterateSuite1>();
        SY_RenderFrame(scene, &textures, &progress, &iterate,
                       multiprocessing && U_G_CPU_DataP()->processorCount > 1,
                       context.Destination(), context.Comp());
        context.UnlockOptions();
    });
}
