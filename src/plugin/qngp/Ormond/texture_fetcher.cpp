#include "texture_fetcher.h"

namespace {

// The host renders a texture from layer hints when asked with this value.
constexpr int32_t kTextureFromHints = 1;

}  // namespace

int32_t ORM_TTextureFetcher::Fetch(int32_t renderIndex, bool wholeLayer, const double* scaleHint,
                                   const M_LRect* rectHint, M_Matrix3* textureMatrix,
                                   PF_World** world) {
    M_SetIdentityMatrix(textureMatrix);
    const QNGP_CanvasSuite10& canvas = context_->Canvas();
    QNGP_RenderContextH render = context_->Render();
    int16_t dx = 1, dy = 1;
    ORM_Check(canvas.GetDownsample(render, &dx, &dy));
    QNGP_LayerContextH layerContext = nullptr;
    ORM_Check(canvas.GetNthLayerContext(render, renderIndex, &layerContext));
    QNGP_LayerH layer = nullptr;
    ORM_Check(canvas.GetLayerFromLayerContext(render, layerContext, &layer));
    if (wholeLayer) {
        ORM_Check(canvas.RenderLayer(render, layer, layerContext, kQNGP_RenderWholeLayer, world));
        return 0;
    }
    M_Matrix3 source;
    ORM_Check(canvas.RenderTexture(render, layerContext, kTextureFromHints, scaleHint, rectHint,
                                   &source, world));
    // The texture is rendered at the downsampled size; layer pixels map through the source
    // matrix and then up by the downsample factors.
    textureMatrix->mat[0][0] = dx;
    textureMatrix->mat[1][1] = dy;
    ORM_Check(M_ConcatMatrix(&source, textureMatrix, textureMatrix));
    return 0;
}

void ORM_TTextureFetcher::Release(int32_t renderIndex, PF_World* world) {
    const QNGP_CanvasSuite10& canvas = context_->Canvas();
    QNGP_LayerContextH layerContext = nullptr;
    ORM_Check(canvas.GetNthLayerContext(context_->Render(), renderIndex, &layerContext));
    ORM_Check(canvas.DisposeTexture(context_->Render(), layerContext, world));
}
