// The incremental state of a span: homogeneous texture coordinates at the current pixel centre
// and their steps per pixel, for one geometry sample or for every motion subsample, and the ray
// to the surface point that lighting needs.
#pragma once

#include <cstdint>
#include <limits>

#include "m_matrix.h"
#include "pf_sampling.h"
#include "pf_world.h"
#include "renderer/scene/scene_desc.h"

// One screen-to-texture mapping evaluated at a pixel centre: U, V and W with their slopes.
// The W extent is the range W takes over the pixel's square relative to its centre.
struct SY_SpanMapping {
    double u, v, w;
    double invW;  // 1/W under perspective, 1 otherwise; −1 for an absent subsample
    float dudx, dudy, dvdx, dvdy, dwdx, dwdy;
    float low, high;

    // Sets up the mapping m at the screen point (x, y). extentScale is 1 for a single sample
    // and ½ for subsamples. dW/dx below 1e-12 is taken as exactly 0, so W stays constant
    // along the row and 1/W is never recomputed.
    void Start(const M_Matrix3& m, double x, double y, bool perspective, float extentScale) {
        const double* e = &m.mat[0][0];
        u = e[0] * x + e[3] * y + e[6];
        v = e[1] * x + e[4] * y + e[7];
        w = e[2] * x + e[5] * y + e[8];
        invW = perspective ? 1.0 / w : 1.0;
        dudx = static_cast<float>(e[0]);
        dudy = static_cast<float>(e[3]);
        dvdx = static_cast<float>(e[1]);
        dvdy = static_cast<float>(e[4]);
        dwdx = e[2] > -1e-12 && e[2] < 1e-12 ? 0.0f : static_cast<float>(e[2]);
        dwdy = static_cast<float>(e[5]);
        float extent = extentScale * ((dwdx < 0 ? -dwdx : dwdx) + (dwdy < 0 ? -dwdy : dwdy));
        low = -extent;
        high = extent;
    }

    // An absent subsample: nothing steps it and every sampler skips it.
    void StartAbsent() {
        u = v = 0;
        w = invW = -1;
        dudx = dudy = dvdx = dvdy = dwdx = dwdy = 0;
        low = high = 0;
    }

    void Step(bool perspective) {
        // U and V step as one pair and are stored as one, the way the samplers load them.
        _mm_storeu_pd(&u,
                      _mm_add_pd(_mm_loadu_pd(&u), _mm_cvtps_pd(_mm_setr_ps(dudx, dvdx, 0, 0))));
        if (dwdx != 0.0f) {
            w += dwdx;
            if (perspective) invW = 1.0 / w;
        }
    }
};

// What the samplers read of the texture, shared by both state forms.
struct SY_SpanTexture {
    const PF_World* world = nullptr;
    SY_SamplingFilter samplingFilter = SY_SamplingFilter::kNearest;
    PF_SampPB sampling;  // the pixel library's block: its texture; radii go with each sample
    bool perspective = true;
    bool pairs = false;  // filtered samples may be taken two pixels at once
};

// The single sample state, for a layer with one geometry sample. The nearest sampler keeps the
// texel it fetched last and reads memory again only when the integer texel changes.
template <class P>
struct SY_SpanSampleState {
    SY_SpanMapping mapping;
    SY_SpanTexture texture;
    int32_t lastColumn = -1;
    int32_t lastRow = -1;
    P lastTexel{};
    // The filtered texel of the pixel after the last one sampled in pairs, and where that
    // pixel stands: it serves while the mapping stands there.
    P aheadTexel{};
    double aheadU = std::numeric_limits<double>::quiet_NaN(), aheadV = 0, aheadW = 0;

    void Step() { mapping.Step(texture.perspective); }
};

inline constexpr int32_t kSY_MaxSubsamples = 64;

// The subsample state, for a layer with several geometry subsamples: one mapping each. Only
// the subsamples from first to last are ever read; absent ones among them have W = −1.
template <class P>
struct SY_SpanSubsampleState {
    SY_SpanMapping mappings[kSY_MaxSubsamples];
    SY_SpanTexture texture;
    int32_t count = 0;  // every subsample of the layer, absent ones included
    int32_t first = 0;
    int32_t last = 0;

    void Step() {
        for (int32_t i = first; i <= last; ++i)
            mappings[i].Step(texture.perspective);
    }
};

// The ray to the surface point, scaled by W, at the current pixel centre: the surface point is
// d·(1/W). Stepped only when the shader needs the point.
struct SY_SpanRayState {
    float d[3];
    float sx[3];  // step per pixel
    double normal[3];
};
