#include "camera_capture.h"

#include "layer_streams.h"

double ORM_CameraPair(const ORM_CameraView& view, const M_Matrix4* cameraLayerToWorld,
                      double cameraZoom, M_Matrix4* placement, M_Matrix4* projection) {
    double a = view.pixelAspect;
    double zoom = 0;
    if (cameraLayerToWorld) {
        *placement = *cameraLayerToWorld;
        ORM_Check(M_ScaleMatrix4(a, 1, 1, placement));
        zoom = view.perspective ? cameraZoom : 0;
    } else {
        ORM_Check(M_IdentityMatrix4(placement));
        ORM_Check(M_TranslateMatrix4(a * view.width * 0.5, view.height * 0.5, -view.defaultDistance,
                                     placement));
        zoom = view.defaultDistance;
    }
    ORM_Check(M_IdentityMatrix4(projection));
    if (view.perspective) projection->Project(zoom);
    ORM_Check(M_ScaleMatrix4(1 / a, 1, 1, projection));
    ORM_Check(M_TranslateMatrix4(view.width * 0.5 - view.regionLeft,
                                 view.height * 0.5 - view.regionTop, 0, projection));
    ORM_Check(M_ScaleMatrix4(1.0 / view.downsampleX, 1.0 / view.downsampleY, 1, projection));
    return zoom;
}

namespace {

void CaptureDepthOfField(ORM_SuiteTable& suites, QNGP_LayerH camera, const ORM_CameraView& view,
                         double zoom, const T_Time& time, SY_CameraDOFDesc* dof) {
    auto number = [&](QNGP_Stream stream) {
        return ORM_StreamNumber(suites, camera, stream, time);
    };
    auto fraction = [&](QNGP_Stream stream) {
        return ORM_StreamFraction(suites, camera, stream, time);
    };
    dof->zoom = zoom;
    dof->focusDistance = number(kQNGP_StreamFocusDistance);
    dof->aperture = number(kQNGP_StreamAperture);
    dof->blurLevel = fraction(kQNGP_StreamBlurLevel);
    dof->downsampleX = view.downsampleX;
    dof->downsampleY = view.downsampleY;
    dof->pixelAspect = view.pixelAspect;
    dof->irisShape = number(kQNGP_StreamIrisShape);
    dof->irisRotation = number(kQNGP_StreamIrisRotation);
    dof->irisRoundness = fraction(kQNGP_StreamIrisRoundness);
    dof->irisAspect = number(kQNGP_StreamIrisAspect);
    dof->diffractionFringe = fraction(kQNGP_StreamDiffractionFringe);
    dof->highlightGain = fraction(kQNGP_StreamHighlightGain);
    dof->highlightThreshold = number(kQNGP_StreamHighlightThreshold);
    dof->highlightSaturation = fraction(kQNGP_StreamHighlightSaturation);
}

}  // namespace

void ORM_CaptureCamera(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene) {
    ORM_SuiteTable& suites = context.Suites();
    const QNGP_CanvasSuite10& canvas = context.Canvas();
    const auto& comps = suites.Get<QNGP_CompSuite9>();
    const auto& cameras = suites.Get<QNGP_CameraSuite2>();
    QNGP_RenderContextH render = context.Render();

    ORM_CameraView view{};
    view.pixelAspect = frame.pixelAspect;
    ORM_Check(canvas.GetDownsample(render, &view.downsampleX, &view.downsampleY));
    QNGP_ShortRect region{};
    ORM_Check(canvas.GetRegionOfInterest(render, &region));
    view.regionTop = region.top;
    view.regionLeft = region.left;
    QNGP_ItemH item = nullptr;
    ORM_Check(comps.GetItemFromComp(context.Comp(), &item));
    ORM_Check(suites.Get<QNGP_ItemSuite7>().GetItemDimensions(item, &view.width, &view.height));
    ORM_Check(cameras.GetDefaultCameraDistanceToImagePlane(context.Comp(), &view.defaultDistance));
    int32_t compFlags = 0;
    ORM_Check(comps.GetCompFlags(context.Comp(), &compFlags));

    QNGP_LayerH camera = nullptr;
    ORM_Check(cameras.GetCamera(render, &frame.renderTime, &camera));
    view.perspective = true;
    if (camera) {
        int32_t type = 0;
        ORM_Check(cameras.GetCameraType(camera, &type));
        view.perspective = type != kQNGP_CameraOrthographic;
    }
    scene->perspective = view.perspective;

    auto pairAt = [&](const T_Time& time, M_Matrix4* placement, M_Matrix4* projection) {
        if (!camera) return ORM_CameraPair(view, nullptr, 0, placement, projection);
        M_Matrix4 cameraToWorld;
        ORM_Check(
            suites.Get<QNGP_LayerSuite10>().GetLayerToWorldXform(camera, &time, &cameraToWorld));
        double zoom =
            view.perspective ? ORM_StreamNumber(suites, camera, kQNGP_StreamZoom, time) : 0;
        return ORM_CameraPair(view, &cameraToWorld, zoom, placement, projection);
    };
    auto count = static_cast<int32_t>(frame.samples.size());
    scene->cameraPlacements.Allocate(count);
    scene->cameraProjections.Allocate(count);
    for (int32_t i = 0; i < count; ++i) {
        pairAt(frame.samples[static_cast<size_t>(i)], &scene->cameraPlacements[i],
               &scene->cameraProjections[i]);
    }
    double zoom = pairAt(frame.renderTime, &scene->framePlacement, &scene->frameProjection);

    scene->dof.enabled =
        !(compFlags & kQNGP_CompFlagNoLightsOrDepthOfField) && camera &&
        ORM_StreamNumber(suites, camera, kQNGP_StreamDepthOfField, frame.renderTime) != 0;
    if (scene->dof.enabled) {
        CaptureDepthOfField(suites, camera, view, zoom, frame.samples.front(), &scene->dof);
    }
}
