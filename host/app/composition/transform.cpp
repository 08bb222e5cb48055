#include "composition/transform.h"

#include <cmath>
#include <numbers>
#include <stdexcept>

namespace ostrel {
namespace {

constexpr double kRadiansPerDegree = std::numbers::pi / 180.0;

// The math library fails only on null arguments; a failure here is a programming error.
void Check(int32_t error) {
    if (error != 0) throw std::logic_error(M_ErrorMessage(error));
}

void Rotate(const Vec<3>& degrees, M_Matrix4* m) {
    Check(M_RotateMatrix4XYZ(degrees[0] * kRadiansPerDegree, degrees[1] * kRadiansPerDegree,
                             degrees[2] * kRadiansPerDegree, m));
}

// Turns +z toward direction d without roll: a rotation about x, then about y, takes (0, 0, 1)
// to (cos rx · sin ry, −sin rx, cos rx · cos ry), which keeps the x axis level.
void Aim(const Vec<3>& d, M_Matrix4* m) {
    double horizontal = std::hypot(d[0], d[2]);
    if (horizontal == 0.0 && d[1] == 0.0) return;  // point of interest at the eye: no aim
    Check(M_RotateMatrix4XYZ(std::atan2(-d[1], horizontal), std::atan2(d[0], d[2]), 0.0, m));
}

}  // namespace

double DefaultCameraDistance(const Composition& comp) {
    return comp.width * 50.0 / 36.0;
}

M_Matrix4 LayerToParent(const Layer& layer, double seconds) {
    const Transform& t = layer.transform;
    M_Matrix4 m;
    Check(M_IdentityMatrix4(&m));
    bool placesPixels = layer.kind != LayerKind::kCamera && layer.kind != LayerKind::kLight;
    if (placesPixels) {
        Vec<3> anchor = t.anchorPoint.At(seconds);
        Vec<3> scale = t.scale.At(seconds);
        Check(M_TranslateMatrix4(-anchor[0], -anchor[1], -anchor[2], &m));
        Check(M_ScaleMatrix4(scale[0] / 100.0, scale[1] / 100.0, scale[2] / 100.0, &m));
    }
    Rotate(t.orientation.At(seconds), &m);
    Rotate(
        {t.rotationX.ValueAt(seconds), t.rotationY.ValueAt(seconds), t.rotationZ.ValueAt(seconds)},
        &m);
    Vec<3> position = t.position.At(seconds);
    if (!placesPixels && layer.hasPointOfInterest) {
        Vec<3> target = layer.pointOfInterest.At(seconds);
        Aim({target[0] - position[0], target[1] - position[1], target[2] - position[2]}, &m);
    }
    Check(M_TranslateMatrix4(position[0], position[1], position[2], &m));
    return m;
}

M_Matrix4 LayerToWorld(const Composition& comp, int32_t layerIndex, double seconds) {
    const Layer* layer = &comp.layers.at(static_cast<size_t>(layerIndex));
    M_Matrix4 m = LayerToParent(*layer, seconds);
    // The loader rejects parent cycles, so the chain ends.
    while (layer->parent >= 0) {
        layer = &comp.layers[static_cast<size_t>(layer->parent)];
        M_Matrix4 parent = LayerToParent(*layer, seconds);
        Check(M_ConcatMatrix4(&m, &parent, &m));
    }
    return m;
}

int32_t ActiveCamera(const Composition& comp, double seconds) {
    for (size_t i = 0; i < comp.layers.size(); ++i) {
        const Layer& layer = comp.layers[i];
        if (layer.kind == LayerKind::kCamera && layer.IsActiveAt(seconds)) {
            return static_cast<int32_t>(i);
        }
    }
    return -1;
}

M_Matrix4 DefaultCameraPlacement(const Composition& comp) {
    M_Matrix4 m;
    Check(M_IdentityMatrix4(&m));
    Check(
        M_TranslateMatrix4(comp.width * 0.5, comp.height * 0.5, -DefaultCameraDistance(comp), &m));
    return m;
}

}  // namespace ostrel
