// The host's engine library: the shape of a camera's iris as a blur kernel, and the screen
// margin such a blur adds around a layer.
#pragma once

#include <cstddef>
#include <cstdint>

#include "u_memory.h"

// The iris of a lens at one blur radius, as rows of weighted pixel runs. Row offsets are where
// a blurred pixel gathers from: the iris turned half a turn, so that a point of light spreads
// into the iris as it is seen. Edge pixels weigh by the share of them the iris covers, which
// lets the blur grow smoothly with the radius.
class ShapeKernel : public U_MemTrackedObject {
public:
    // One run of pixels of a row: offsets x to x + length − 1, each weighing weight.
    struct Segment {
        int32_t x;
        int32_t length;
        float weight;
    };
    struct Row {
        int32_t y;             // vertical offset
        int32_t firstSegment;  // the row's runs are Segments()[firstSegment, + segmentCount)
        int32_t segmentCount;
    };

    // sides: blades of the iris (3 or more), a regular polygon with a corner up. roundness
    // (0..1) bends its sides toward the circle through its corners. radius: half the iris'
    // height in pixels before the aspect. aspect: width over height of the iris, turned with
    // it. xStretch: horizontal scale on screen (pixel aspect and downsampling). rotation:
    // degrees, clockwise on screen. fringe (0 or more): extra weight of the iris' rim, the
    // bright ring of diffraction. Throws std::bad_alloc without memory.
    ShapeKernel(int32_t sides, double roundness, double radius, double aspect, double xStretch,
                double rotation, double fringe);
    ~ShapeKernel();
    ShapeKernel(const ShapeKernel&) = delete;
    ShapeKernel& operator=(const ShapeKernel&) = delete;

    const Row* Rows() const { return rows_; }
    int32_t RowCount() const { return rowCount_; }
    const Segment* Segments() const { return segments_; }
    // The offsets every run lies within: left, top, right and bottom, inclusive.
    const int32_t* Extent() const { return extent_; }
    // One over the sum of every pixel's weight: a flat image blurs to itself.
    float Normalization() const { return normalization_; }

private:
    Row* rows_ = nullptr;
    Segment* segments_ = nullptr;  // in the same block as the rows
    int32_t rowCount_ = 0;
    int32_t extent_[4] = {0, 0, 0, 0};
    size_t bytes_ = 0;
    float normalization_ = 1;
};

// The margin, in whole pixels, by which an elliptic iris of the given aspect, horizontal
// stretch, rotation (degrees) and radius widens what it blurs: rect = left, top (negative or
// zero), right, bottom. Every iris of ShapeKernel lies within that ellipse.
void BEE_ComputeDOFExpansionRect(float irisAspect, float xStretch, float irisRotation, float radius,
                                 int32_t rect[4]);
