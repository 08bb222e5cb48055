// The camera's iris at every blur radius a frame can ask for, built once per frame and shared
// by every depth-of-field buffer of the frame.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>

#include "bee_engine.h"
#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/scene_desc.h"

// Kernel i has the radius maxRadius × i / count: one per eighth of a pixel from 0 to the
// largest radius the blur level allows.
struct ShapeKernelArray {
    int32_t stepsPerPixel = 8;
    int32_t count = 0;  // the array holds count + 1 kernels
    SY_AccountedVector<std::shared_ptr<const ShapeKernel>> kernelList;
    float step = 0;  // 1 / count, or 0 when count is 0

    // The kernel for a radius that is the share s (0..1) of the largest; null below one step,
    // where the blur is too small to show.
    const ShapeKernel* ForShare(float s) const {
        if (count == 0 || s < step) return nullptr;
        auto index = static_cast<int32_t>(std::max(s, step) * static_cast<float>(count));
        return kernelList[static_cast<size_t>(std::min(index, count))].get();
    }
};

// The kernels of the camera's iris, or null when the iris shape is one of the simple ones
// (below 3) that blur with a box. Throws 4 without memory, with nothing kept.
std::shared_ptr<const ShapeKernelArray> BuildShapeKernels(const SY_CameraDOFDesc& dof);
