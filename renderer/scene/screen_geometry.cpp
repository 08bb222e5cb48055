#include "renderer/scene/screen_geometry.h"

#include <algorithm>
#include <cmath>

#include "renderer/scene/messages.h"
#include "renderer/scene/render_context.h"

namespace {

void Check(int32_t error) {
    if (error) throw error;
}

// Layer-pixel rectangle and average screen scale of the texture over the valid subsamples: the
// hints that let the host deliver the texture at the size it is seen.
struct Footprint {
    double scale = 0;
    M_LRect rect{0, 0, 0, 0};
};

Footprint MeasureFootprint(const SY_TRLayer& renderable, const M_Matrix4* cameras,
                           int32_t cameraCount) {
    Footprint footprint;
    bool haveRect = false;
    int32_t valid = 0;
    for (int32_t i = renderable.firstValid; i >= 0 && i <= renderable.lastValid; ++i) {
        const SY_Subsample& subsample = renderable.subsamples[i];
        if (!subsample.IsValid()) continue;
        ++valid;
        M_Matrix4 m;
        Check(M_ConcatMatrix4(&subsample.placement, &cameras[std::min(i, cameraCount - 1)], &m));
        M_Matrix3 f, h;
        f.AssignFromByDroppingZ(m);
        Check(M_InverseMatrix(&f, &h));
        const double* F = &f.mat[0][0];
        const double* H = &h.mat[0][0];
        double largest = 0;
        for (const SY_Vertex& v : subsample.vertices) {
            double w = H[2] * v.x + H[5] * v.y + H[8];
            if (std::fabs(w) <= 1e-12) continue;
            double u = (H[0] * v.x + H[3] * v.y + H[6]) / w;
            double t = (H[1] * v.x + H[4] * v.y + H[7]) / w;
            M_LRect texel{static_cast<int32_t>(std::floor(u)), static_cast<int32_t>(std::floor(t)),
                          static_cast<int32_t>(std::floor(u)) + 1,
                          static_cast<int32_t>(std::floor(t)) + 1};
            if (!haveRect) {
                footprint.rect = texel;
                haveRect = true;
            } else {
                footprint.rect.left = std::min(footprint.rect.left, texel.left);
                footprint.rect.top = std::min(footprint.rect.top, texel.top);
                footprint.rect.right = std::max(footprint.rect.right, texel.right);
                footprint.rect.bottom = std::max(footprint.rect.bottom, texel.bottom);
            }
            double su =
                std::max(std::fabs((F[0] - F[2] * v.x) * w), std::fabs((F[1] - F[2] * v.y) * w));
            double sv =
                std::max(std::fabs((F[3] - F[5] * v.x) * w), std::fabs((F[4] - F[5] * v.y) * w));
            largest = std::max({largest, su, sv});
        }
        footprint.scale += largest;
    }
    if (valid == 0) {
        Mp_ReportErr(kM_ErrBadArgument);
        throw kM_ErrBadArgument;
    }
    footprint.scale /= valid;
    return footprint;
}

}  // namespace

SY_ScreenGeometry::~SY_ScreenGeometry() {
    if (!texture) return;
    // A host that fails to take a texture back cannot undo the frame; the texture stays its own.
    try {
        textureFetcher->ReleaseTexture(renderIndex);
    } catch (...) {
    }
}

void SY_ScreenGeometry::Build(const SY_RenderContext& context, const SY_TRLayer& renderable,
                              const M_Matrix4* cameras, int32_t cameraCount,
                              const SY_GeometryFlags& flags) {
    textureFetcher = context.textureFetcher;
    renderIndex = renderable.material.renderIndex;
    perspective = flags.perspective;
    samplingFilter = flags.samplingFilter;
    firstValid = renderable.firstValid;
    lastValid = renderable.lastValid;

    Footprint footprint;
    if (flags.screenSizedTexture) footprint = MeasureFootprint(renderable, cameras, cameraCount);
    SY_TTextureFetcher::Texture acquired = textureFetcher->Acquire(
        renderIndex, flags.wholeLayer, flags.screenSizedTexture ? &footprint.scale : nullptr,
        flags.screenSizedTexture ? &footprint.rect : nullptr);
    texture = acquired.world;
    if (!texture) return;
    if (flags.blurred) casterSums = context.shadowSums.For(renderIndex, *texture, flags.alphaOnly);

    int32_t count = renderable.subsamples.Count();
    screenToTexture.Allocate(count);
    M_Matrix4 textureToLayer;
    M_Matrix3ToMatrix4(&acquired.textureToLayer, &textureToLayer);
    for (int32_t i = 0; i < count; ++i) {
        const SY_Subsample& subsample = renderable.subsamples[i];
        if (!subsample.IsValid()) continue;  // stays all zero
        M_Matrix4 a, b;
        Check(M_ConcatMatrix4(&textureToLayer, &subsample.placement, &a));
        Check(M_ConcatMatrix4(&a, &cameras[subsample.cameraIndex], &b));
        M_Matrix3 flat;
        flat.AssignFromByDroppingZ(b);
        M_Matrix3& m = screenToTexture[i];
        Check(M_InverseMatrix(&flat, &m));
        if (i == firstValid && flags.needsSurfacePoint) {
            M_Matrix3 textureToWorld;
            textureToWorld.AssignFromByDroppingIndices(a, 2, 3);
            Check(M_ConcatMatrix(&m, &textureToWorld, &eyeRay));
        }
        // A filter weighs texels by their centres, half a texel in from their corners.
        if (samplingFilter != SY_SamplingFilter::kNearest) Check(M_TranslateMatrix(&m, -0.5, -0.5));
        if (!perspective) {
            const double* plane = subsample.plane;
            m.mat[0][2] = plane[0] / plane[2];
            m.mat[1][2] = plane[1] / plane[2];
            m.mat[2][2] = plane[3] / plane[2];
        }
    }

    M_Matrix4 inverse;
    Check(M_InverseMatrix4(&renderable.subsamples[firstValid].placement, &inverse));
    double n[3] = {inverse.mat[0][2], inverse.mat[1][2], inverse.mat[2][2]};
    double e = inverse.mat[3][2];
    const double* eye = context.cameraPosition;
    double sign = n[0] * eye[0] + n[1] * eye[1] + n[2] * eye[2] + e < 0 ? -1.0 : 1.0;
    double lengthSquared = n[0] * n[0] + n[1] * n[1] + n[2] * n[2];
    if (lengthSquared < 1e-48) SY_ThrowZeroLengthVector();
    double scale = sign / std::sqrt(lengthSquared);
    for (int k = 0; k < 3; ++k)
        normal[k] = n[k] * scale;

    projectionW = -1.0;
    if (perspective && !context.projectionW.Empty()) {
        projectionW = context.projectionW[std::min(firstValid, context.projectionW.Count() - 1)];
    }
}
