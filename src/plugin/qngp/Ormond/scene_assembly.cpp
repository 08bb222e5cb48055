#include "scene_assembly.h"

#include <optional>

#include "camera_capture.h"
#include "layer_capture.h"
#include "light_capture.h"
#include "sample_times.h"

namespace {

std::optional<ORM_Shutter> CompShutter(ORM_RenderContext& context, int32_t compFlags) {
    if (!(compFlags & kQNGP_CompFlagMotionBlur)) return std::nullopt;
    ORM_Shutter shutter{};
    ORM_Check(context.Suites().Get<QNGP_CanvasSuite13>().GetShutterInterval(
        context.Render(), &shutter.start, &shutter.duration));
    ORM_Check(context.Suites().Get<QNGP_CompSuite14>().GetCompMotionBlurSamples(context.Comp(),
                                                                                &shutter.samples));
    return shutter;
}

}  // namespace

void ORM_AssembleScene(ORM_RenderContext& context, SY_SceneDesc* scene) {
    ORM_SuiteTable& suites = context.Suites();
    const QNGP_CanvasSuite10& canvas = context.Canvas();
    const auto& comps = suites.Get<QNGP_CompSuite9>();
    QNGP_RenderContextH render = context.Render();

    ORM_CaptureFrame frame{};
    T_Time timeStep;
    ORM_Check(canvas.GetRenderTime(render, &frame.renderTime, &timeStep));
    int32_t compFlags = 0;
    ORM_Check(comps.GetCompFlags(context.Comp(), &compFlags));
    frame.samples = ORM_SampleTimes(frame.renderTime, CompShutter(context, compFlags));

    QNGP_ItemH item = nullptr;
    ORM_Check(comps.GetItemFromComp(context.Comp(), &item));
    QNGP_Ratio aspect{1, 1};
    ORM_Check(suites.Get<QNGP_ItemSuite7>().GetItemPixelAspectRatio(item, &aspect));
    frame.pixelAspect = static_cast<double>(aspect.num) / aspect.den;
    scene->pixelAspect = frame.pixelAspect;

    ORM_Check(canvas.GetDownsample(render, &scene->downsampleX, &scene->downsampleY));
    ORM_Check(canvas.GetFieldRender(render, &scene->fieldMode));

    ORM_CaptureLayers(context, frame, scene);
    ORM_CaptureLights(context, frame, scene);
    ORM_CaptureCamera(context, frame, scene);

    ORM_Check(suites.Get<PF_ColorSettingsSuite1>().GetColorSettings(render, &scene->colorSettings));
}
