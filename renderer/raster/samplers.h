// Texture samplers of the span routines: the texel of the current span position, nearest or
// filtered by the pixel library, for one geometry sample or averaged over motion subsamples.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>

#include "pf_pixel.h"
#include "pf_sampling.h"
#include "renderer/raster/span_state.h"

namespace sy_sampling {

// Texture positions beyond this many texels from the origin are outside every texture, and
// stay inside 16.16 fixed point.
inline constexpr double kFarTexels = 32000.0;
inline constexpr double kMaxRadius = 100.0;  // texels; larger footprints are capped

// The conversions and the footprint below work on both axes at once, lanes (u, v) of doubles:
// each lane takes the same correctly rounded steps one axis alone would.

// Rounds halves away from zero, both lanes; they must lie well inside the int32 range.
inline __m128i RoundAway(__m128d v) {
    const __m128d half = _mm_or_pd(_mm_and_pd(v, _mm_set1_pd(-0.0)), _mm_set1_pd(0.5));
    return _mm_cvttpd_epi32(_mm_add_pd(v, half));
}

// 16.16 fixed point, rounded halves away from zero. The operand order of the bounds keeps a
// position that is not a number as it is.
inline __m128i ToFixed(__m128d texels) {
    const __m128d clamped =
        _mm_min_pd(_mm_set1_pd(kFarTexels), _mm_max_pd(_mm_set1_pd(-kFarTexels), texels));
    return RoundAway(_mm_mul_pd(clamped, _mm_set1_pd(65536.0)));
}

// Radii from kMaxRadius on are capped to it.
inline __m128i RadiusToFixed(__m128d radius) {
    return RoundAway(_mm_mul_pd(_mm_min_pd(_mm_set1_pd(kMaxRadius), radius), _mm_set1_pd(65536.0)));
}

// The sample point (u, v) and the footprint's half-sizes (ru, rv) in texels, as lanes.
struct FootprintLanes {
    __m128d point, radius;
};

inline FootprintLanes FootprintLanesOf(const SY_SpanMapping& m, bool perspective) {
    const __m128d invW = _mm_set1_pd(m.invW);
    FootprintLanes f;
    f.point = _mm_mul_pd(_mm_setr_pd(m.u, m.v), invW);
    __m128d dx = _mm_cvtps_pd(_mm_setr_ps(m.dudx, m.dvdx, 0, 0));
    __m128d dy = _mm_cvtps_pd(_mm_setr_ps(m.dudy, m.dvdy, 0, 0));
    if (perspective) {
        dx = _mm_mul_pd(_mm_sub_pd(dx, _mm_mul_pd(f.point, _mm_set1_pd(m.dwdx))), invW);
        dy = _mm_mul_pd(_mm_sub_pd(dy, _mm_mul_pd(f.point, _mm_set1_pd(m.dwdy))), invW);
    }
    const __m128d sign = _mm_set1_pd(-0.0);
    // The larger of |dx| and |dy|, or |dx| where either is not a number.
    f.radius =
        _mm_mul_pd(_mm_set1_pd(0.5), _mm_max_pd(_mm_andnot_pd(sign, dy), _mm_andnot_pd(sign, dx)));
    return f;
}

// The second lane (v) of a pair.
inline double HighLane(__m128d v) {
    return _mm_cvtsd_f64(_mm_unpackhi_pd(v, v));
}

// The same footprint as four numbers.
struct Footprint {
    double u, v, ru, rv;
};

inline Footprint FootprintOf(const SY_SpanMapping& m, bool perspective) {
    const FootprintLanes f = FootprintLanesOf(m, perspective);
    return {_mm_cvtsd_f64(f.point), HighLane(f.point), _mm_cvtsd_f64(f.radius), HighLane(f.radius)};
}

// Under perspective a pixel whose W range reaches the eye plane has no sensible footprint.
inline bool InFront(const SY_SpanMapping& m, bool perspective) {
    return !perspective || m.w + m.low > 0;
}

// A radius rounds to at most 32768 (half a texel) in fixed point below this many texels.
inline constexpr double kSubpixelBelow = 32768.5 / 65536.0;

// Whether both radii lie below kSubpixelBelow.
inline bool Subpixel(__m128d radius) {
    return _mm_movemask_pd(_mm_cmplt_pd(radius, _mm_set1_pd(kSubpixelBelow))) == 3;
}

// Bicubic interpolation, kept out of line: its sixteen taps outweigh a call, and the bilinear
// path beside it keeps to few registers.
template <class P>
[[gnu::noinline]] void InterpolateBicubic(int32_t x, int32_t y, const PF_SampPB& pb, P* out) {
    PF_SubpixelBicubic(x, y, pb, out);
}

// The pixel library's interpolation (bilinear or bicubic) at the fixed-point position xy.
template <class P>
[[gnu::always_inline]] inline void Interpolate(SY_SpanTexture& texture, __m128i xy, P* out) {
    if (texture.samplingFilter == SY_SamplingFilter::kBicubic)
        InterpolateBicubic(_mm_cvtsi128_si32(xy), _mm_extract_epi32(xy, 1), texture.sampling, out);
    else
        pf_sampling::BilinearLanes(xy, texture.sampling, out);
}

// The pixel library's filter at the point with the half-sizes radius: interpolation while the
// footprint stays within half a texel, the box average beyond.
template <class P>
[[gnu::always_inline]] inline void Filter(SY_SpanTexture& texture, __m128d point, __m128d radius,
                                          P* out) {
    const __m128i xy = ToFixed(point);
    if (Subpixel(radius))
        Interpolate(texture, xy, out);
    else
        pf_sampling::AreaSampleLanes(xy, RadiusToFixed(radius), texture.sampling, out);
}
template <class P>
[[gnu::always_inline]] inline void Filter(SY_SpanTexture& texture, double u, double v, double ru,
                                          double rv, P* out) {
    Filter(texture, _mm_setr_pd(u, v), _mm_setr_pd(ru, rv), out);
}

// Whether the footprint stays within half a texel at each of the count pixels from m on, so
// that every one of them interpolates. Without perspective the footprint is the same at every
// pixel. Under perspective its derivatives are (dU·W − U·dW) / W²: numerators linear and W
// positive along the span, so their largest size is bounded by the ends' numerators over the
// smaller end's W². The bound is kept a hundredth of a texel inside the limit, far beyond the
// rounding of the per-pixel footprint, and the ends must lie within the texture's reach so
// that no term grows large enough to round by that much.
inline bool InterpolatesThroughout(const SY_SpanMapping& m, bool perspective, int32_t count) {
    if (!perspective) {
        return Subpixel(FootprintLanesOf(m, false).radius);
    }
    constexpr double kBelow = 0.49;
    const double last = count - 1;
    const double w[2] = {m.w, m.w + last * m.dwdx};
    const double u[2] = {m.u, m.u + last * m.dudx};
    const double v[2] = {m.v, m.v + last * m.dvdx};
    double largest[4] = {0, 0, 0, 0};  // |dU/dx|, |dU/dy|, |dV/dx|, |dV/dy| numerators
    for (int e = 0; e < 2; ++e) {
        if (!(w[e] + m.low > 0)) return false;
        if (!(std::fabs(u[e]) < kFarTexels * w[e] && std::fabs(v[e]) < kFarTexels * w[e]))
            return false;
        const double numerators[4] = {m.dudx * w[e] - u[e] * m.dwdx, m.dudy * w[e] - u[e] * m.dwdy,
                                      m.dvdx * w[e] - v[e] * m.dwdx, m.dvdy * w[e] - v[e] * m.dwdy};
        for (int k = 0; k < 4; ++k)
            largest[k] = std::max(largest[k], std::fabs(numerators[k]));
    }
    const double limit = 2.0 * kBelow * std::min(w[0], w[1]) * std::min(w[0], w[1]);
    return std::max({largest[0], largest[1], largest[2], largest[3]}) < limit;
}

// The integer texel under (u, v), or false outside the texture.
inline bool TexelAt(const PF_World& world, double u, double v, int32_t* column, int32_t* row) {
    double fu = std::floor(u), fv = std::floor(v);
    if (!(fu >= 0 && fv >= 0 && fu < world.width && fv < world.height)) return false;
    *column = static_cast<int32_t>(fu);
    *row = static_cast<int32_t>(fv);
    return true;
}

// Straight colour weighted by alpha, summed over subsamples.
struct Accumulator {
    double a = 0, r = 0, g = 0, b = 0;

    template <class P>
    void Add(const P& p) {
        double alpha = p.alpha;
        a += alpha;
        r += p.red * alpha;
        g += p.green * alpha;
        b += p.blue * alpha;
    }

    // Alpha falls with the share of subsamples (absent ones included) that add nothing; the
    // colour is the alpha-weighted mean of those that do.
    template <class P>
    void Resolve(int32_t count, P* out) const {
        using C = typename PF_PixelTraits<P>::Channel;
        if (a == 0) {
            *out = P{};
            return;
        }
        double round = PF_PixelTraits<P>::kIsFloat ? 0.0 : 0.5;
        out->alpha = static_cast<C>(a / count + round);
        out->red = static_cast<C>(r / a + round);
        out->green = static_cast<C>(g / a + round);
        out->blue = static_cast<C>(b / a + round);
    }
};

// The filtered texels of two pixels of one span, both area samples of boxes inside the
// texture, in wide registers: the texels SY_SampleFiltered gives each alone. m gives the slopes,
// (u, v, w, 1/W) each pixel's position; they come in registers, as the caller has just worked
// them out. False, with nothing written, for any other pair. Only for processors where
// SY_ProcessorHasAvx2() holds.
bool AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0, double v0,
              double w0, double invW0, double u1, double v1, double w1, double invW1,
              PF_Pixel8* firstOut, PF_Pixel8* secondOut);
bool AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0, double v0,
              double w0, double invW0, double u1, double v1, double w1, double invW1,
              PF_Pixel16* firstOut, PF_Pixel16* secondOut);
bool AreaPair(const SY_SpanTexture& texture, const SY_SpanMapping& m, double u0, double v0,
              double w0, double invW0, double u1, double v1, double w1, double invW1,
              PF_PixelFloat* firstOut, PF_PixelFloat* secondOut);

// One filtered sample at the mapping m.
template <class P>
[[gnu::always_inline]] inline void FilterAt(SY_SpanTexture& texture, const SY_SpanMapping& m,
                                            P* out) {
    if (!InFront(m, texture.perspective)) {
        *out = P{};
        return;
    }
    const FootprintLanes f = FootprintLanesOf(m, texture.perspective);
    Filter(texture, f.point, f.radius, out);
}

}  // namespace sy_sampling

// Nearest texel, one sample. U·invW is used under both cameras: invW is 1 without perspective.
template <class P>
inline void SY_SampleNearest(SY_SpanSampleState<P>& state, P* out) {
    const SY_SpanMapping& m = state.mapping;
    int32_t column, row;
    if (!(m.invW > 0) ||
        !sy_sampling::TexelAt(*state.texture.world, m.u * m.invW, m.v * m.invW, &column, &row)) {
        *out = P{};
        return;
    }
    if (column != state.lastColumn || row != state.lastRow) {
        state.lastColumn = column;
        state.lastRow = row;
        state.lastTexel = *state.texture.world->template PixelAt<P>(column, row);
    }
    *out = state.lastTexel;
}

// Filtered texel, one sample, with the texture's filter (bilinear or bicubic). Where pairs
// are available, samples are taken for this pixel and the next at once, and the next pixel's
// texel waits in the state for the step to it.
template <class P>
inline void SY_SampleFiltered(SY_SpanSampleState<P>& state, P* out) {
    const SY_SpanMapping& m = state.mapping;
    if (state.texture.pairs) {
        // The sample is a function of the position alone: the slopes stay with the span.
        if (m.u == state.aheadU && m.v == state.aheadV && m.w == state.aheadW) {
            *out = state.aheadTexel;
            return;
        }
        SY_SpanMapping next = m;
        next.Step(state.texture.perspective);
        if (!sy_sampling::AreaPair(state.texture, m, m.u, m.v, m.w, m.invW, next.u, next.v, next.w,
                                   next.invW, out, &state.aheadTexel)) {
            sy_sampling::FilterAt(state.texture, m, out);
            sy_sampling::FilterAt(state.texture, next, &state.aheadTexel);
        }
        state.aheadU = next.u;
        state.aheadV = next.v;
        state.aheadW = next.w;
        return;
    }
    sy_sampling::FilterAt(state.texture, m, out);
}

// Interpolated texel, one sample, for spans where InterpolatesThroughout holds: the same texel
// SY_SampleFiltered gives there, without working out the footprint.
template <class P>
inline void SY_SampleInterpolated(SY_SpanSampleState<P>& state, P* out) {
    const SY_SpanMapping& m = state.mapping;
    if (!sy_sampling::InFront(m, state.texture.perspective)) {
        *out = P{};
        return;
    }
    sy_sampling::Interpolate(
        state.texture, sy_sampling::ToFixed(_mm_mul_pd(_mm_setr_pd(m.u, m.v), _mm_set1_pd(m.invW))),
        out);
}

// Whether SY_SampleInterpolated serves the count pixels from the state's position on. The
// subsample state always works out footprints.
template <class P>
inline bool SY_SpanInterpolates(const SY_SpanSampleState<P>& state, int32_t count) {
    return sy_sampling::InterpolatesThroughout(state.mapping, state.texture.perspective, count);
}
template <class P>
inline bool SY_SpanInterpolates(const SY_SpanSubsampleState<P>&, int32_t) {
    return false;
}

// Nearest texel averaged over the present subsamples.
template <class P>
inline void SY_SampleNearest(SY_SpanSubsampleState<P>& state, P* out) {
    const PF_World& world = *state.texture.world;
    sy_sampling::Accumulator sum;
    int32_t lastColumn = -1, lastRow = -1;
    P texel{};
    for (int32_t i = state.first; i <= state.last; ++i) {
        const SY_SpanMapping& m = state.mappings[i];
        if (!(m.invW > 0)) continue;
        int32_t column, row;
        if (!sy_sampling::TexelAt(world, m.u * m.invW, m.v * m.invW, &column, &row)) continue;
        if (column != lastColumn || row != lastRow) {
            lastColumn = column;
            lastRow = row;
            texel = *world.template PixelAt<P>(column, row);
        }
        sum.Add(texel);
    }
    sum.Resolve(state.count, out);
}

// Filtered texel averaged over the present subsamples. The footprint of the first present
// subsample serves them all; the filter runs again only when the sample point has moved by
// more than a quarter of the footprint since it last ran.
template <class P>
inline void SY_SampleFiltered(SY_SpanSubsampleState<P>& state, P* out) {
    bool perspective = state.texture.perspective;
    int32_t i = state.first;
    while (i <= state.last && !(state.mappings[i].invW > 0))
        ++i;
    if (i > state.last) {
        *out = P{};
        return;
    }
    // Capped as the single sample's radii are; the bound's operand order keeps one that is
    // not a number.
    const __m128d radius =
        _mm_min_pd(_mm_set1_pd(sy_sampling::kMaxRadius),
                   sy_sampling::FootprintLanesOf(state.mappings[i], perspective).radius);
    const double ru = _mm_cvtsd_f64(radius), rv = sy_sampling::HighLane(radius);
    double lastU = 0, lastV = 0;
    bool sampled = false;
    P texel{};
    sy_sampling::Accumulator sum;
    for (; i <= state.last; ++i) {
        const SY_SpanMapping& m = state.mappings[i];
        if (!(m.invW > 0) || !sy_sampling::InFront(m, perspective)) continue;
        double u = m.u * m.invW, v = m.v * m.invW;
        if (!sampled || std::fabs(u - lastU) > 0.25 * ru || std::fabs(v - lastV) > 0.25 * rv) {
            sy_sampling::Filter(state.texture, _mm_setr_pd(u, v), radius, &texel);
            lastU = u;
            lastV = v;
            sampled = true;
        }
        sum.Add(texel);
    }
    sum.Resolve(state.count, out);
}
