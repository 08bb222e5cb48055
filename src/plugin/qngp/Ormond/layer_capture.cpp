#include "layer_capture.h"

#include <memory>

#include "layer_streams.h"
#include "track_matte_fetcher.h"

// The renderer's switches carry the host's stream values and filters.
static_assert(kSY_AcceptsShadowsOff == kQNGP_ShadowsOff &&
              kSY_AcceptsShadowsOn == kQNGP_ShadowsOn &&
              kSY_AcceptsShadowsOnly == kQNGP_ShadowsOnly);
static_assert(static_cast<uint8_t>(SY_SamplingFilter::kNearest) == kQNGP_SamplingNearest &&
              static_cast<uint8_t>(SY_SamplingFilter::kBilinear) == kQNGP_SamplingBilinear &&
              static_cast<uint8_t>(SY_SamplingFilter::kBicubic) == kQNGP_SamplingBicubic);

uint8_t ORM_StoredTransferMode(const QNGP_LayerTransferMode& mode, const QNGP_EngineLayer& engine) {
    auto stored =
        static_cast<uint8_t>(mode.mode == 3 || mode.mode == 17 || mode.mode == 18 ? 2 : mode.mode);
    bool ignoresKeepAlpha = engine.isAVLayer && engine.ignoresPreserveAlpha;
    if ((mode.flags & kQNGP_TransferPreserveAlpha) && !ignoresKeepAlpha)
        stored |= kORM_KeepAlphaBit;
    return stored;
}

void ORM_ApplyQuality(int16_t quality, const ORM_ShadowStreams& streams, SY_Material* material) {
    material->bestQuality = quality == kQNGP_QualityBest;
    if (quality == kQNGP_QualityWireframe) {
        material->renders = false;
        material->wireframe = true;
        material->castsShadows = false;
        material->acceptsShadows = kSY_AcceptsShadowsOff;
        material->acceptsLights = false;
        return;
    }
    material->wireframe = false;
    material->renders = true;
    material->castsShadows = streams.castsShadows != 0;
    if (streams.castsShadows > kQNGP_ShadowsOn) material->renders = false;
    material->acceptsShadows = static_cast<uint8_t>(static_cast<int32_t>(streams.acceptsShadows));
    if (material->acceptsShadows == kSY_AcceptsShadowsOnly) {
        material->acceptsLights = false;
        material->mode = kORM_ShadowsOnlyMode;
    } else {
        material->acceptsLights = streams.acceptsLights != 0;
    }
}

namespace {

void CapturePlacements(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       QNGP_LayerContextH layerContext, bool motionBlur, SY_LayerDesc* record) {
    auto count = motionBlur ? static_cast<int32_t>(frame.samples.size()) : 1;
    record->placements.Allocate(count);
    for (int32_t i = 0; i < count; ++i) {
        const T_Time& time = motionBlur ? frame.samples[static_cast<size_t>(i)] : frame.renderTime;
        ORM_Check(context.Canvas().GetRenderLayerToWorldXform(context.Render(), layerContext, &time,
                                                              &record->placements[i]));
        ORM_Check(M_ScaleMatrix4(frame.pixelAspect, 1, 1, &record->placements[i]));
    }
}

void CaptureLayer(ORM_RenderContext& context, const ORM_CaptureFrame& frame, int32_t index,
                  SY_LayerDesc* record) {
    ORM_SuiteTable& suites = context.Suites();
    const QNGP_CanvasSuite10& canvas = context.Canvas();
    const auto& layers = suites.Get<QNGP_LayerSuite10>();
    QNGP_RenderContextH render = context.Render();
    const T_Time& now = frame.renderTime;
    SY_Material& material = record->material;

    QNGP_LayerContextH layerContext = nullptr;
    ORM_Check(canvas.GetNthLayerContext(render, index, &layerContext));
    QNGP_LayerH layer = nullptr;
    ORM_Check(canvas.GetLayerFromLayerContext(render, layerContext, &layer));
    int32_t flags = 0;
    ORM_Check(layers.GetLayerFlags(layer, &flags));
    CapturePlacements(context, frame, layerContext, flags & kQNGP_LayerFlagMotionBlur, record);

    QNGP_ShortRect bounds{};
    ORM_Check(canvas.GetRenderLayerBounds(render, layerContext, &now, &bounds));
    record->left = bounds.left;
    record->top = bounds.top;
    record->right = bounds.right;
    record->bottom = bounds.bottom;
    QNGP_StreamValue scale = ORM_StreamValue(suites, layer, kQNGP_StreamScale, now);
    record->scaleX = scale.v[0] / 100;
    record->scaleY = scale.v[1] / 100;

    QNGP_LayerTransferMode transfer{};
    ORM_Check(layers.GetLayerTransferMode(layer, &transfer));
    QNGP_EngineLayer engine{};
    ORM_Check(layers.GetEngineLayer(layer, &engine));
    material.mode = ORM_StoredTransferMode(transfer, engine);
    material.engineFlag = engine.isAVLayer ? static_cast<SY_SamplingFilter>(engine.samplingFilter)
                                           : SY_SamplingFilter::kNearest;
    ORM_Check(canvas.GetRenderOpacity(render, layerContext, &now, &material.opacity));

    int16_t quality = 0;
    ORM_Check(layers.GetLayerQuality(layer, &quality));
    ORM_ShadowStreams streams{};
    if (quality != kQNGP_QualityWireframe) {
        streams.castsShadows = ORM_StreamNumber(suites, layer, kQNGP_StreamCastsShadows, now);
        streams.acceptsShadows = ORM_StreamNumber(suites, layer, kQNGP_StreamAcceptsShadows, now);
        if (static_cast<int32_t>(streams.acceptsShadows) != kQNGP_ShadowsOnly) {
            streams.acceptsLights = ORM_StreamNumber(suites, layer, kQNGP_StreamAcceptsLights, now);
        }
    }
    ORM_ApplyQuality(quality, streams, &material);

    material.ambient = ORM_StreamFraction(suites, layer, kQNGP_StreamAmbient, now);
    material.diffuse = ORM_StreamFraction(suites, layer, kQNGP_StreamDiffuse, now);
    material.specular = ORM_StreamFraction(suites, layer, kQNGP_StreamSpecularIntensity, now);
    material.shininess = ORM_StreamNumber(suites, layer, kQNGP_StreamShininess, now);
    material.metal = ORM_StreamFraction(suites, layer, kQNGP_StreamMetal, now);
    material.lightTransmission =
        ORM_StreamFraction(suites, layer, kQNGP_StreamLightTransmission, now);

    ORM_Check(canvas.IsLayerUnbounded(render, layerContext, &record->unbounded));
    material.motionBlur = flags & kQNGP_LayerFlagMotionBlur;
    record->collapsed = flags & kQNGP_LayerFlagCollapse;
    material.renderIndex = index;
    material.depthIndex = index;

    bool hasMatte = false;
    ORM_Check(layers.LayerHasTrackMatte(layer, &hasMatte));
    if (hasMatte) {
        QNGP_LayerContextH matteContext = nullptr;
        ORM_Check(canvas.GetTrackMatteContext(render, layerContext, &matteContext));
        if (matteContext) {
            record->trackMatte = std::make_unique<ORM_TTrackMatteFetcher>(
                &context, layer, layerContext, static_cast<ORM_MatteType>(transfer.trackMatte));
        }
    }

    QNGP_LayerH topLevel = nullptr;
    ORM_Check(canvas.GetTopLevelLayer(render, layerContext, &topLevel));
    ORM_Check(layers.GetLayerIndex(topLevel, &record->compIndex));
}

}  // namespace

void ORM_CaptureLayers(ORM_RenderContext& context, const ORM_CaptureFrame& frame,
                       SY_SceneDesc* scene) {
    int32_t count = 0;
    ORM_Check(context.Canvas().GetNumLayersToRender(context.Render(), &count));
    scene->layers.Allocate(count);
    for (int32_t i = 0; i < count; ++i)
        CaptureLayer(context, frame, i, &scene->layers[i]);
}
