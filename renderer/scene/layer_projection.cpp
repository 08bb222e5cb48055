#include "renderer/scene/layer_projection.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "bee_engine.h"
#include "renderer/scene/dof_model.h"
#include "renderer/scene/messages.h"

namespace {

// Screen w (perspective) or eye depth (orthographic) below this is at or behind the camera.
constexpr double kNearLimit = 1e-6;
// A plane whose depth coefficient is this small is seen edge-on; its depth is unusable.
constexpr double kEdgeOnLimit = 1e-6;
// Clipped x and y stay this far inside the output rectangle.
constexpr double kClipInset = 1e-12;

void ThrowIfFailed(int32_t error) {
    if (error) throw error;
}

bool AllPlacementsEqual(const SY_OwnedArray<M_Matrix4>& placements) {
    for (int32_t i = 1; i < placements.Count(); ++i) {
        if (std::memcmp(&placements[i], &placements[0], sizeof(M_Matrix4)) != 0) return false;
    }
    return true;
}

// The plane z = 0 of the layer in screen space, normalised with c < 0. False when the
// layer-to-screen matrix is singular or the layer is seen edge-on.
bool ScreenPlane(const M_Matrix4& layerToScreen, double plane[4]) {
    M_Matrix4 inverse;
    if (M_InverseMatrix4Quiet(&layerToScreen, &inverse) != 0 || !inverse.IsFinite()) return false;
    // Planes transform by the transposed inverse of the point transformation.
    M_Matrix4 transposed;
    ThrowIfFailed(M_TransposeMatrix4(&inverse, &transposed));
    const double layerPlane[4] = {0, 0, -1, 0};
    double p[4];
    ThrowIfFailed(M_TransformVector4NoDivide(&transposed, layerPlane, p));
    if (std::fabs(p[2]) < kEdgeOnLimit) return false;
    // The length is at least |c|, so it cannot vanish here.
    double length = std::sqrt(p[0] * p[0] + p[1] * p[1] + p[2] * p[2]);
    for (double& v : p)
        v /= length;
    if (std::fabs(p[2]) <= kEdgeOnLimit) return false;
    if (p[2] > 0) {
        for (double& v : p)
            v = -v;
    }
    std::memcpy(plane, p, sizeof p);
    return true;
}

// Sutherland–Hodgman against one half-space: keeps the part of a convex polygon where
// distance(vertex) ≥ 0. Crossing points interpolate all four coordinates.
template <class Distance>
void ClipPolygon(const SY_Polygon& in, Distance distance, SY_Polygon* out) {
    out->clear();
    if (in.empty()) return;
    const SY_Vertex* previous = &in.back();
    double previousDistance = distance(*previous);
    for (const SY_Vertex& current : in) {
        double currentDistance = distance(current);
        if ((currentDistance >= 0) != (previousDistance >= 0)) {
            double t = previousDistance / (previousDistance - currentDistance);
            out->push_back({previous->x + t * (current.x - previous->x),
                            previous->y + t * (current.y - previous->y),
                            previous->z + t * (current.z - previous->z),
                            previous->w + t * (current.w - previous->w)});
        }
        if (currentDistance >= 0) out->push_back(current);
        previous = &current;
        previousDistance = currentDistance;
    }
}

// Clips polygon in place through scratch; false when nothing is left.
template <class Distance>
bool KeepWhere(SY_Polygon* polygon, SY_Polygon* scratch, Distance distance) {
    ClipPolygon(*polygon, distance, scratch);
    polygon->swap(*scratch);
    return !polygon->empty();
}

// The margin by which the camera's blur widens a layer, from its plane's screen W (zoom over
// eye depth; 0 at or behind the camera's plane) at the corners of what it covers: the largest
// blur radius at a corner (depth along the layer is linear in W, so no point between them
// blurs more), spread by the iris. Blur under half a pixel adds nothing.
void DepthOfFieldMargin(const SY_CameraDOFDesc& dof, const double (&cornerW)[4],
                        int32_t margin[4]) {
    const SY_DOFModel model(dof);
    float radius = 0;
    for (double w : cornerW)
        radius = std::max(radius, model.RadiusAtW(w));
    if (radius < 0.5f) return;
    const auto xStretch = static_cast<float>(SY_DOFXScale(dof));
    // A box blur spreads as a round iris without turn or aspect does.
    if (dof.irisShape < 3) {
        BEE_ComputeDOFExpansionRect(1, xStretch, 0, radius, margin);
    } else {
        BEE_ComputeDOFExpansionRect(static_cast<float>(dof.irisAspect), xStretch,
                                    static_cast<float>(dof.irisRotation), radius, margin);
    }
}

// dof, when given, sets margin and widens the clip rectangle by it.
void ProjectQuadrilateral(const SY_LayerDesc& layer, const M_Matrix4& layerToScreen,
                          bool perspective, const SY_SetUpOptions& options,
                          const SY_CameraDOFDesc* dof, int32_t margin[4], SY_Polygon* polygon,
                          SY_Polygon* scratch) {
    // Best quality samples half a pixel beyond the source so that its edges are filtered.
    double grow = layer.material.bestQuality ? 0.5 : 0.0;
    double scale = std::min(std::fabs(layer.scaleX), std::fabs(layer.scaleY));
    grow += scale > 1e-6 ? options.margin / scale : options.margin;
    double left = layer.left - grow, top = layer.top - grow;
    double right = layer.right + grow, bottom = layer.bottom + grow;
    const double corners[4][4] = {
        {left, top, 0, 1}, {right, top, 0, 1}, {right, bottom, 0, 1}, {left, bottom, 0, 1}};
    polygon->clear();
    for (const auto& corner : corners) {
        double v[4];
        ThrowIfFailed(M_TransformVector4NoDivide(&layerToScreen, corner, v));
        polygon->push_back({v[0], v[1], v[2], v[3]});
    }
    if (dof && perspective) {  // an orthographic camera has no depth of field
        double cornerW[4];
        for (int k = 0; k < 4; ++k) {
            double w = (*polygon)[static_cast<size_t>(k)].w;
            cornerW[k] = std::fabs(w) > 1e-12 ? 1 / w : 0;
        }
        DepthOfFieldMargin(*dof, cornerW, margin);
    }

    if (perspective) {
        if (!KeepWhere(polygon, scratch, [](const SY_Vertex& v) { return v.w - kNearLimit; })) {
            return;
        }
        for (SY_Vertex& v : *polygon) {
            v.x /= v.w;
            v.y /= v.w;
            v.z /= v.w;
            v.w = 1;
        }
    } else if (!KeepWhere(polygon, scratch, [](const SY_Vertex& v) { return v.z - kNearLimit; })) {
        return;
    }
    if (options.noClip) return;
    const SY_ScreenRect& r = options.output;
    double x0 = r.x0 + margin[0] + kClipInset, x1 = r.x1 + margin[2] - kClipInset;
    double y0 = r.y0 + margin[1] + kClipInset, y1 = r.y1 + margin[3] - kClipInset;
    if (!KeepWhere(polygon, scratch, [x0](const SY_Vertex& v) { return v.x - x0; })) return;
    if (!KeepWhere(polygon, scratch, [x1](const SY_Vertex& v) { return x1 - v.x; })) return;
    if (!KeepWhere(polygon, scratch, [y0](const SY_Vertex& v) { return v.y - y0; })) return;
    KeepWhere(polygon, scratch, [y1](const SY_Vertex& v) { return y1 - v.y; });
}

// An unbounded layer covers the output rectangle; each corner lies on the layer's plane.
void FillOutput(const SY_Subsample& subsample, const SY_ScreenRect& r, SY_Polygon* polygon) {
    const double corners[4][2] = {{r.x0, r.y0}, {r.x1, r.y0}, {r.x1, r.y1}, {r.x0, r.y1}};
    polygon->clear();
    for (const auto& c : corners) {
        polygon->push_back({c[0], c[1], subsample.DepthAt(c[0], c[1]), 1});
    }
}

void ExtendBounds(const SY_Polygon& polygon, double bounds[6]) {
    for (const SY_Vertex& v : polygon) {
        bounds[0] = std::min(bounds[0], v.x);
        bounds[1] = std::min(bounds[1], v.y);
        bounds[2] = std::max(bounds[2], v.x);
        bounds[3] = std::max(bounds[3], v.y);
        bounds[4] = std::min(bounds[4], v.z);
        bounds[5] = std::max(bounds[5], v.z);
    }
}

}  // namespace

bool SY_SetUpRenderable(const SY_LayerDesc& layer, const SY_CameraView& camera,
                        const SY_SetUpOptions& options, SY_TRLayer* renderable) {
    int32_t layerCount = layer.placements.Count();
    int32_t cameraCount = camera.count;
    if (layerCount > 1 && AllPlacementsEqual(layer.placements)) layerCount = 1;
    if (layerCount != 1 && cameraCount != 1 && layerCount != cameraCount) {
        SY_ReportAndThrow(SY_Message::kSubsampleMismatch, 0x4B0002, kSY_ErrGeometry);
    }
    if (layerCount < 1 || cameraCount < 1) return false;

    int32_t count = std::max(layerCount, cameraCount);
    renderable->subsamples.Allocate(count);
    renderable->multiSample = count > 1;
    renderable->firstValid = -1;
    renderable->lastValid = -1;
    // Screen depth grows toward the camera under perspective and away from it under an
    // orthographic projection; the offset always moves the layer away.
    double depthShift = camera.perspective ? -options.depthOffset : options.depthOffset;

    bool projected = false;
    bool dofMeasured = false;
    SY_Polygon scratch;
    for (int32_t i = 0; i < count; ++i) {
        SY_Subsample& subsample = renderable->subsamples[i];
        subsample.placement = layer.placements[std::min(i, layerCount - 1)];
        subsample.cameraIndex = std::min(i, cameraCount - 1);
        M_Matrix4 layerToScreen;
        ThrowIfFailed(M_ConcatMatrix4(
            &subsample.placement, &camera.worldToScreen[subsample.cameraIndex], &layerToScreen));
        ThrowIfFailed(M_TranslateMatrix4(0, 0, depthShift, &layerToScreen));
        if (!ScreenPlane(layerToScreen, subsample.plane)) continue;
        if (renderable->firstValid < 0) renderable->firstValid = i;
        renderable->lastValid = i;

        // The blur margin is measured once, on the first subsample that gets here.
        const SY_CameraDOFDesc* dof =
            options.dof && options.dof->enabled && !dofMeasured ? options.dof : nullptr;
        dofMeasured = dofMeasured || dof;
        if (options.fill && layer.unbounded) {
            FillOutput(subsample, options.output, &subsample.vertices);
            // The corners lie on the plane, at its screen depth, which is W.
            const SY_Polygon& v = subsample.vertices;
            if (dof && camera.perspective)
                DepthOfFieldMargin(*dof, {v[0].z, v[1].z, v[2].z, v[3].z}, renderable->dofMargin);
        } else {
            ProjectQuadrilateral(layer, layerToScreen, camera.perspective, options, dof,
                                 renderable->dofMargin, &subsample.vertices, &scratch);
        }
        ExtendBounds(subsample.vertices, renderable->bounds);
        projected = projected || !subsample.vertices.empty();
    }
    const int32_t* m = renderable->dofMargin;
    if (projected && m[0] != m[2] && m[1] != m[3]) {
        // Blur reaches beyond the layer, but the frame ends at the output.
        const SY_ScreenRect& r = options.output;
        double* b = renderable->bounds;
        b[0] = std::clamp(b[0] + m[0], r.x0, r.x1);
        b[1] = std::clamp(b[1] + m[1], r.y0, r.y1);
        b[2] = std::clamp(b[2] + m[2], r.x0, r.x1);
        b[3] = std::clamp(b[3] + m[3], r.y0, r.y1);
    }
    return projected;
}
