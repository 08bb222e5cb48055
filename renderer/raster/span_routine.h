// The span loop, written once for every pixel type, both sample-state forms and every kind of
// delivery: it steps the state across the row, samples, colours, lights and hands each pixel
// with its coverage and depth to the delivery.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>

#include <smmintrin.h>

#include "pf_pixel.h"
#include "pf_vec4.h"
#include "pf_xfer.h"
#include "renderer/raster/samplers.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/span_state.h"

// What a fragment buffer needs of a pixel's depth (W, larger is nearer): its value at the pixel
// centre at shutter open, with the layer's offset, its steps per pixel in x and y, and its
// travel over the shutter. Each kind of record makes its key from these. Deliveries into images
// ignore it.
struct SY_FragmentDepth {
    double center;
    float dzdx;
    float dzdy;
    float dzdt;
};

template <class P>
using SY_Coverage = PF_XferOpacity<P>;

namespace sy_span {

template <class P>
const SY_SpanMapping& FirstMapping(const SY_SpanSampleState<P>& s) {
    return s.mapping;
}
template <class P>
const SY_SpanMapping& FirstMapping(const SY_SpanSubsampleState<P>& s) {
    return s.mappings[s.first];
}
template <class P>
double ShutterTravel(const SY_SpanSampleState<P>&) {
    return 0.0;
}
template <class P>
double ShutterTravel(const SY_SpanSubsampleState<P>& s) {
    return s.mappings[s.last].w - s.mappings[s.first].w;
}

// The layer's opacity in the channel range.
template <class P>
SY_Coverage<P> LayerCoverage(double opacity) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat)
        return static_cast<float>(opacity);
    else if constexpr (Traits::kBitDepth == 16)
        return static_cast<uint16_t>(std::lround(32768.0 * opacity) & 0xFFFF);
    else
        return static_cast<uint8_t>(std::lround(255.0 * opacity));
}

// The layer's coverage scaled by the matte's alpha.
template <class P>
SY_Coverage<P> MatteCoverage(typename PF_PixelTraits<P>::Channel matte, SY_Coverage<P> layer) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat)
        return matte * layer;
    else if constexpr (Traits::kBitDepth == 16)
        return static_cast<uint16_t>(PF_Mul16(matte, layer));
    else
        return static_cast<uint8_t>((uint32_t{matte} * layer + 127) / 255);
}

// A pixel's four channels (alpha, red, green, blue) from floats that are in the channel's
// range, and whole for integer channels.
template <class P>
void StoreChannels(__m128 c, P* texel) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (Traits::kIsFloat) {
        _mm_storeu_ps(&texel->alpha, c);
    } else {
        const __m128i v = _mm_cvttps_epi32(c);
        if constexpr (Traits::kBitDepth == 16) {
            _mm_storel_epi64(reinterpret_cast<__m128i*>(texel), _mm_packus_epi32(v, v));
        } else {
            const __m128i shorts = _mm_packs_epi32(v, v);
            const uint32_t bytes =
                static_cast<uint32_t>(_mm_cvtsi128_si32(_mm_packus_epi16(shorts, shorts)));
            std::memcpy(texel, &bytes, sizeof bytes);
        }
    }
}

// texel × diffuse + specular on four lanes, with specular in units of the channel maximum;
// integer channels round and clamp, float channels keep their range. Each lane takes the same
// float operations, in the same order, as one channel alone would.
template <class P>
__m128 LitChannels(__m128 texel, __m128 diffuse, __m128 specular) {
    using Traits = PF_PixelTraits<P>;
    const __m128 c = _mm_mul_ps(texel, diffuse);
    if constexpr (Traits::kIsFloat) return _mm_add_ps(c, specular);
    const __m128 max = _mm_set1_ps(Traits::kMax);
    const __m128 lit = _mm_add_ps(c, _mm_add_ps(_mm_set1_ps(0.5f), _mm_mul_ps(specular, max)));
    return _mm_min_ps(_mm_max_ps(lit, _mm_setzero_ps()), max);
}

// One pixel's lighting, its three colour channels in one vector; alpha passes unchanged.
template <class P>
[[gnu::always_inline]] inline void ApplyLighting(const SY_Lighting& light, P* texel) {
    const __m128 t = PF_LoadFloat4(*texel);
    const __m128 diffuse = _mm_setr_ps(1.0f, light.diffuse[0], light.diffuse[1], light.diffuse[2]);
    const __m128 specular =
        _mm_setr_ps(0.0f, light.specular[0], light.specular[1], light.specular[2]);
    StoreChannels(_mm_move_ss(LitChannels<P>(t, diffuse, specular), t), texel);
}

// One pixel on its way from the sampler to the delivery.
template <class P>
struct Pixel {
    P texel;
    SY_Coverage<P> coverage;
    bool skipped;            // the matte hides it
    SY_FragmentDepth depth;  // set only for deliveries that use it
};

// Four pixels' lighting, channel by channel as the lighting gives it: the texels turned into
// channel planes, lit a plane at a time and turned back; alpha passes unchanged.
template <class P>
[[gnu::always_inline]] inline void ApplyLighting(const SY_FourLightings& light, Pixel<P>* pixels) {
    __m128 t[4];
    for (int i = 0; i < 4; ++i)
        t[i] = PF_LoadFloat4(pixels[i].texel);
    _MM_TRANSPOSE4_PS(t[0], t[1], t[2], t[3]);
    for (int c = 0; c < 3; ++c) {
        t[1 + c] =
            LitChannels<P>(t[1 + c], _mm_load_ps(light.diffuse[c]), _mm_load_ps(light.specular[c]));
    }
    _MM_TRANSPOSE4_PS(t[0], t[1], t[2], t[3]);
    for (int i = 0; i < 4; ++i)
        StoreChannels(t[i], &pixels[i].texel);
}

// The per-span constants of the loop.
template <class P>
struct SpanSetup {
    SY_Coverage<P> coverage0;
    float depthOffset;
    bool filtered;
    bool interpolated;  // filtered, and every pixel's footprint is within half a texel
    bool colorOnly;     // shadows only: the texel's colour is replaced by the channel maximum
    bool shaded;
    bool needsPoint;
};

// The span's sampler, chosen once per span: no per-pixel footprint where none can leave the
// interpolation's range.
template <class P, class State>
[[gnu::always_inline]] inline void Sample(const SpanSetup<P>& setup, State& state, P* out) {
    if constexpr (requires { SY_SampleInterpolated(state, out); }) {
        if (setup.interpolated) return SY_SampleInterpolated(state, out);
    }
    if (setup.filtered)
        SY_SampleFiltered(state, out);
    else
        SY_SampleNearest(state, out);
}

template <bool kDepth, class P, class State>
[[gnu::always_inline]] inline void Fetch(const SpanSetup<P>& setup, State& state,
                                         const SY_SpanRayState& ray, const P* matte, Pixel<P>* out,
                                         SY_FourPoints& points, int lane) {
    using Traits = PF_PixelTraits<P>;
    using C = typename Traits::Channel;
    const SY_SpanMapping& first = FirstMapping(state);
    if (setup.shaded) {
        for (int k = 0; k < 3; ++k)
            points.ray[k][lane] = ray.d[k];
        points.invW[lane] = first.invW;
    }
    out->skipped = matte && matte->alpha == 0;
    if (out->skipped) {
        out->texel = P{};
        return;
    }
    Sample(setup, state, &out->texel);
    if (setup.colorOnly) {
        constexpr C kMax = static_cast<C>(Traits::kMax);
        out->texel.red = out->texel.green = out->texel.blue = kMax;
    }
    out->coverage = matte ? MatteCoverage<P>(matte->alpha, setup.coverage0) : setup.coverage0;
    if constexpr (kDepth) {
        out->depth.center = first.w + setup.depthOffset;
        out->depth.dzdx = first.dwdx;
        out->depth.dzdy = first.dwdy;
        out->depth.dzdt = static_cast<float>(ShutterTravel(state));
    }
}

template <class State>
[[gnu::always_inline]] inline void Advance(bool needsPoint, State& state, SY_SpanRayState& ray) {
    state.Step();
    if (needsPoint) {
        for (int k = 0; k < 3; ++k)
            ray.d[k] += ray.sx[k];
    }
}

// kPairs pairs of pixels from their fetching to their delivery, with their lighting. Each
// quad (two pairs) is lit four at once where both its pairs are taken and the processor
// allows, into fours; the other pairs pixel by pixel, into light.
template <int kPairs, class P>
struct LitPairs {
    static constexpr int kQuads = (kPairs + 1) / 2;
    Pixel<P> pixels[2 * kPairs];
    bool taken[kPairs];  // a pair the matte hides wholly is not
    bool four[kQuads];
    SY_FourLightings fours[kQuads];
    SY_Lighting light[2 * kPairs];
};

// Lights the pairs taken as widely as the processor allows. Kept out of line: the lighting
// outweighs a call, and the span loop stays small. The quads' lightings do not depend on each
// other, so one runs on while the next starts.
template <int kPairs, class P>
[[gnu::noinline]] void LightPairs(const SY_LayerShader& shader, SY_LightingLanes lanes,
                                  SY_LightSet reaching, const double normal[3],
                                  const SY_FourPoints* points, LitPairs<kPairs, P>& group) {
    for (int quad = 0; quad < group.kQuads; ++quad) {
        group.four[quad] = kPairs > 1 && lanes == SY_LightingLanes::kFour &&
                           group.taken[2 * quad] && group.taken[2 * quad + 1];
        if (group.four[quad])
            shader.LightFourPixels(points[quad], normal, &group.fours[quad], reaching);
    }
    for (int pair = 0; pair < kPairs; ++pair) {
        if (!group.taken[pair] || group.four[pair / 2]) continue;
        SY_Lighting* light = group.light + 2 * pair;
        double p[2][3];
        for (int k = 0; k < 2; ++k)
            points[pair / 2].Point(2 * (pair % 2) + k, p[k]);
        if (lanes != SY_LightingLanes::kOne) {
            shader.LightTwoPixels(p[0], p[1], normal, &light[0], &light[1], reaching);
        } else {
            shader.LightOnePixel(p[0], normal, &light[0], reaching);
            shader.LightOnePixel(p[1], normal, &light[1], reaching);
        }
    }
}

template <int kPairs, class P>
void ApplyLighting(LitPairs<kPairs, P>& group) {
    for (int pair = 0; pair < kPairs; ++pair) {
        if (group.four[pair / 2]) {
            if (pair % 2 == 0) ApplyLighting(group.fours[pair / 2], group.pixels + 2 * pair);
        } else if (group.taken[pair]) {
            for (int k = 2 * pair; k < 2 * pair + 2; ++k)
                ApplyLighting(group.light[k], &group.pixels[k].texel);
        }
    }
}

// The lights that can reach the count pixels from the state's position on, from the layer
// points of the first and the last. The points the loop steps to stray from that segment by
// the rounding of the float ray steps: at most 6e-8 of the ray per step, which 1/W, changing
// along the span by at most the ratio of its ends, scales into the points.
template <class State>
SY_LightSet LightsReachingSpan(const SY_LayerShader& shader, const State& state,
                               const SY_SpanRayState& ray, int32_t count) {
    const SY_SpanMapping& m = FirstMapping(state);
    const double steps = count - 1;
    const double lastInvW = state.texture.perspective ? 1.0 / (m.w + steps * m.dwdx) : m.invW;
    if (!(m.invW > 0) || !(lastInvW > 0)) return kSY_AllLights;
    double first[3], last[3], size = 0;
    for (int k = 0; k < 3; ++k) {
        first[k] = ray.d[k] * m.invW;
        last[k] = (ray.d[k] + steps * ray.sx[k]) * lastInvW;
        size += std::fabs(first[k]) + std::fabs(last[k]);
    }
    const double ratio = std::max(m.invW, lastInvW) / std::min(m.invW, lastInvW);
    return shader.LightsReaching(first, last, ray.normal, (1e-6 + 1e-7 * count * ratio) * size);
}

}  // namespace sy_span

// Draws count pixels of row y from x on: the state and the ray stand at the centre of pixel x.
// matte, when given, points at the matte pixel under pixel x. Pixels are taken in pairs, and
// lit ones in groups of pairs, so that lighting can work on several at once; a pair the matte
// hides wholly is only stepped over. The delivery receives (x, pixel, coverage, depth, thread) for
// every pixel the matte shows, in order; the depth is worked out only for deliveries whose
// kUsesDepth is true.
template <class P, class State, class Delivery>
void SY_DrawSpan(const SY_LayerShader& shader, SY_LightingLanes lanes, State& state,
                 SY_SpanRayState& ray, const P* matte, int32_t x, int32_t count, Delivery& delivery,
                 int32_t thread) {
    using namespace sy_span;
    SpanSetup<P> setup;
    setup.coverage0 = LayerCoverage<P>(shader.material.opacity);
    setup.depthOffset = shader.depthOffset;
    setup.filtered = state.texture.samplingFilter != SY_SamplingFilter::kNearest;
    setup.interpolated = setup.filtered && SY_SpanInterpolates(state, count);
    setup.colorOnly = shader.material.acceptsShadows == kSY_AcceptsShadowsOnly;
    setup.shaded = shader.shaded != 0;
    setup.needsPoint = shader.NeedsSurfacePoint();
    const SY_LightSet reaching = setup.shaded && setup.needsPoint
                                     ? LightsReachingSpan(shader, state, ray, count)
                                     : kSY_AllLights;

    int32_t i = 0;
    SY_FourPoints points[2];
    // Fetches kPairs pairs from pixel i on into pixels, stepping past them.
    auto fetchPairs = [&]<int kPairs>(Pixel<P>* pixels, bool(&taken)[kPairs]) {
        for (int pair = 0; pair < kPairs; ++pair)
            taken[pair] = false;
        for (int pair = 0; pair < kPairs && i + 1 < count; ++pair, i += 2) {
            taken[pair] = !(matte && matte[i].alpha == 0 && matte[i + 1].alpha == 0);
            for (int k = 0; k < 2; ++k) {
                if (taken[pair]) {
                    Fetch<Delivery::kUsesDepth>(setup, state, ray, matte ? matte + i + k : nullptr,
                                                &pixels[2 * pair + k], points[pair / 2],
                                                2 * (pair % 2) + k);
                }
                Advance(setup.needsPoint, state, ray);
            }
        }
    };
    auto deliverPairs = [&]<int kPairs>(const Pixel<P>* pixels, const bool(&taken)[kPairs],
                                        int32_t from) {
        for (int k = 0; k < 2 * kPairs; ++k) {
            if (taken[k / 2] && !pixels[k].skipped)
                delivery.Deliver(x + from + k, pixels[k].texel, pixels[k].coverage, pixels[k].depth,
                                 thread);
        }
    };
    // Lit pixels go out one group late: the lighting of a group, a long chain of dependent
    // steps, runs on while the next group is sampled.
    auto drawLit = [&]<int kPairs>() {
        LitPairs<kPairs, P> groups[2];
        int32_t from[2] = {0, 0};
        int current = 0;
        bool pending = false;
        while (i + 1 < count) {
            LitPairs<kPairs, P>& group = groups[current];
            from[current] = i;
            fetchPairs.template operator()<kPairs>(group.pixels, group.taken);
            LitPairs<kPairs, P>& last = groups[current ^ 1];
            if (pending) {
                ApplyLighting(last);
                deliverPairs(last.pixels, last.taken, from[current ^ 1]);
            }
            LightPairs(shader, lanes, reaching, ray.normal, points, group);
            pending = true;
            current ^= 1;
        }
        if (pending) {
            LitPairs<kPairs, P>& last = groups[current ^ 1];
            ApplyLighting(last);
            deliverPairs(last.pixels, last.taken, from[current ^ 1]);
        }
    };
    Pixel<P> pixels[2];
    if (!setup.shaded) {
        while (i + 1 < count) {
            const int32_t pairFrom = i;
            bool taken[1];
            fetchPairs.template operator()<1>(pixels, taken);
            deliverPairs(pixels, taken, pairFrom);
        }
    } else if (lanes == SY_LightingLanes::kFour) {
        drawLit.template operator()<4>();
    } else {
        drawLit.template operator()<1>();
    }
    if (i < count) {
        Fetch<Delivery::kUsesDepth>(setup, state, ray, matte ? matte + i : nullptr, &pixels[0],
                                    points[0], 0);
        if (pixels[0].skipped) return;
        if (setup.shaded) {
            double p[3];
            points[0].Point(0, p);
            SY_Lighting light;
            shader.LightOnePixel(p, ray.normal, &light, reaching);
            ApplyLighting(light, &pixels[0].texel);
        }
        delivery.Deliver(x + i, pixels[0].texel, pixels[0].coverage, pixels[0].depth, thread);
    }
}
