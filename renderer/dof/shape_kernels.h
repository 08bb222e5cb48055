// The camera's iris at every blur radius a frame can ask for, built once per frame and shared
// by every depth-of-field buffer of the frame.
#pragma once

#include <algorithm>
#include <cstdint>
#include <limits>
#include <memory>

#include "bee_engine.h"
#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/scene_desc.h"

// One end of the kernel's runs over the rows y to y + rows − 1 alike: the run sum of a row is
// its prefix sum at the end less that at the start, so weight is the run's weight at an end
// and its negative at a start. Ends that stay at one column over rows (the iris' upright sides,
// the middle of a polygon) are read once for all those rows from sums down the columns.
struct ShapeEdge {
    int32_t x;
    int32_t y;
    int32_t rows;
    double weight;
};

// A kernel and its ends: the ends over single rows first, then the columns.
struct ShapeIris {
    std::shared_ptr<const ShapeKernel> kernel;
    const ShapeEdge* edges = nullptr;
    int32_t singleCount = 0;  // edges[0, singleCount) span one row each
    int32_t edgeCount = 0;
};

// Kernel i has the radius maxRadius × i / count: one per eighth of a pixel from 0 to the
// largest radius the blur level allows. Only the kernels up to the largest radius the frame's
// layers ask for are made: the rest, up to the blur level's cap, would cost far more than those.
struct ShapeKernelArray {
    int32_t stepsPerPixel = 8;
    int32_t count = 0;  // kernels 0 to count have a place; irisList holds those made, from 0 on
    SY_AccountedVector<ShapeIris> irisList;
    SY_AccountedVector<ShapeEdge> edgeList;  // every kernel's ends, irisList's point into it
    float step = 0;                          // 1 / count, or 0 when count is 0

    // The index of the kernel for a radius that is the share s (0..1) of the largest.
    int32_t IndexForShare(float s) const {
        return std::min(static_cast<int32_t>(s * static_cast<float>(count)), count);
    }

    // The kernel for a radius that is the share s (0..1) of the largest; null below one step,
    // where the blur is too small to show. Shares beyond those made read the largest made.
    const ShapeIris* ForShare(float s) const {
        if (count == 0 || s < step) return nullptr;
        return &irisList[static_cast<size_t>(
            std::min(IndexForShare(s), static_cast<int32_t>(irisList.size()) - 1))];
    }
};

// The kernels of the camera's iris for radii up to largestRadius (output pixels), or null when
// the iris shape is one of the simple ones (below 3) that blur with a box. made, when given, is
// an array of the same camera's: returned as it is when it reaches far enough, otherwise its
// kernels are taken over. Throws 4 without memory, with nothing kept.
std::shared_ptr<const ShapeKernelArray> BuildShapeKernels(
    const SY_CameraDOFDesc& dof, float largestRadius = std::numeric_limits<float>::max(),
    std::shared_ptr<const ShapeKernelArray> made = nullptr);
