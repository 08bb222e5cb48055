// The camera's depth of field as a blur radius per screen depth: a thin lens focused at the
// focus distance, whose circle of confusion the blur level scales and limits.
#pragma once

#include <algorithm>
#include <cfloat>
#include <cmath>

#include "renderer/scene/scene_desc.h"

// The horizontal scale that makes a blur round on screen: downsampling and pixel aspect.
inline double SY_DOFXScale(const SY_CameraDOFDesc& dof) {
    return 1 / ((static_cast<double>(dof.downsampleY) / dof.downsampleX) * dof.pixelAspect);
}

struct SY_DOFModel {
    explicit SY_DOFModel(const SY_CameraDOFDesc& dof) {
        invFocusDistance = std::fabs(dof.focusDistance) < 1e-12
                               ? FLT_MAX
                               : static_cast<float>(1 / dof.focusDistance);
        // The lens' focal length grows with the blur level: 10 % of the zoom at 100 %.
        double f = dof.zoom * dof.blurLevel * 0.1;
        double s = dof.focusDistance;
        blurScale =
            s - f >= 1e-12
                ? static_cast<float>(0.5 * dof.aperture * s * f / ((s - f) * dof.downsampleY))
                : -1.0f;
        maxRadius = static_cast<float>(std::min(500.0, 100 * dof.blurLevel) / dof.downsampleY);
        inverseZoom = dof.zoom != 0 ? 1 / dof.zoom : 0;
    }

    // True when some depth blurs at all.
    bool Blurs() const { return blurScale != 0 && maxRadius > 0 && inverseZoom != 0; }

    // Blur radius in output pixels at a point whose screen W (zoom over eye depth, larger
    // nearer) is w. A lens that cannot focus (its focal length at or beyond the focus distance)
    // blurs everything but the focus plane as far as the blur level allows.
    float RadiusAtW(double w) const {
        if (!Blurs()) return 0;
        double focusW = invFocusDistance / inverseZoom;
        double larger = std::max(std::fabs(w), std::fabs(focusW));
        if (std::fabs(w - focusW) <= std::max(1e-6 * larger, 0.0005369186401367188)) return 0;
        if (blurScale < 0 || std::fabs(w) < 1e-12) return maxRadius;
        double r = blurScale * std::fabs(invFocusDistance - w * inverseZoom);
        return static_cast<float>(std::min<double>(r, maxRadius));
    }

    float invFocusDistance;  // FLT_MAX when focused at 0
    float blurScale;     // radius per unit of |1/focus − 1/depth|; −1: the lens cannot focus
    float maxRadius;     // output pixels
    double inverseZoom;  // 0 for an orthographic camera, which does not blur
};
