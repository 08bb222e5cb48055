#include "track_matte_fetcher.h"

#include "pf_bit_depth.h"
#include "u_report.h"

void ORM_ConvertMatteWorld(const PF_World& world, ORM_MatteType type) {
    PF_DispatchBitDepth(
        world.GetBitDepth(), [&]<class P>() { ORM_ConvertMatte<P>(world, type); },
        U_BitDepthVerification("Unexpected bitdepth in PF_IteratePixels()"));
}

PF_World* ORM_TTrackMatteFetcher::Fetch() {
    if (matte_) return matte_.get();
    const QNGP_CanvasSuite10& canvas = context_->Canvas();
    QNGP_RenderContextH render = context_->Render();
    QNGP_LayerContextH matteContext = nullptr;
    ORM_Check(canvas.GetTrackMatteContext(render, layerContext_, &matteContext));
    if (!matteContext) return nullptr;
    QNGP_LayerH matteLayer = nullptr;
    ORM_Check(canvas.GetLayerFromLayerContext(render, matteContext, &matteLayer));
    PF_World* rendered = nullptr;
    ORM_Check(canvas.RenderLayer(render, matteLayer, matteContext, kQNGP_RenderMatte, &rendered));
    matte_.reset(rendered);
    if (matte_) ORM_ConvertMatteWorld(*matte_, type_);
    return matte_.get();
}
