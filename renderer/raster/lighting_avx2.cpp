// Lighting of four layer pixels at once in AVX registers. This file alone is compiled for AVX2
// (without fused multiply-add, which would round differently), and it is called only where
// SY_WidestLightingLanes() has found the processor able to run it.
#include <immintrin.h>

#include "renderer/raster/pixel_lighting.h"

namespace {

// Four pixels, lane i the i-th: the two-pixel pack (light_lanes.h) widened, with the same
// instruction for every operation, so each lane agrees bit for bit with one pixel alone.
struct SY_FourLanes {
    static constexpr int kCount = 4;
    using Real = __m256d;
    using Single = __m128;
    using Mask = __m256d;

    static Real Splat(double v) { return _mm256_set1_pd(v); }
    static Single SplatSingle(float v) { return _mm_set1_ps(v); }
    static double Lane(Real v, int i) {
        double d[4];
        _mm256_storeu_pd(d, v);
        return d[i];
    }
    static float LaneSingle(Single v, int i) {
        float f[4];
        _mm_storeu_ps(f, v);
        return f[i];
    }
    static Single FromLanes(const float lanes[kCount]) { return _mm_loadu_ps(lanes); }

    static Real Sqrt(Real v) { return _mm256_sqrt_pd(v); }
    static Single ToSingle(Real v) { return _mm256_cvtpd_ps(v); }
    static Real ToReal(Single v) { return _mm256_cvtps_pd(v); }
    static Single Max(Single a, Single b) {
        return _mm_or_ps(_mm_and_ps(_mm_cmpgt_ps(a, b), a), _mm_andnot_ps(_mm_cmpgt_ps(a, b), b));
    }

    static Mask All() { return _mm256_castsi256_pd(_mm256_set1_epi32(-1)); }
    static Mask Uniform(bool on) { return on ? All() : _mm256_setzero_pd(); }
    // The predicates of the two-pixel pack's compares.
    static Mask Less(Real a, Real b) { return _mm256_cmp_pd(a, b, _CMP_LT_OS); }
    static Mask LessEqual(Real a, Real b) { return _mm256_cmp_pd(a, b, _CMP_LE_OS); }
    static Mask LessEqualSingle(Single a, Single b) { return Widen(_mm_cmple_ps(a, b)); }
    static Mask EqualSingle(Single a, Single b) { return Widen(_mm_cmpeq_ps(a, b)); }
    static Mask AndNot(Mask drop, Mask m) { return _mm256_andnot_pd(drop, m); }
    static Mask Or(Mask a, Mask b) { return _mm256_or_pd(a, b); }
    static bool None(Mask m) { return _mm256_movemask_pd(m) == 0; }
    static bool Any(Mask m) { return _mm256_movemask_pd(m) != 0; }
    static bool LaneOn(Mask m, int i) { return (_mm256_movemask_pd(m) >> i) & 1; }

    // A mask lane is all ones or all zeros, so a blend on its sign picks as and/or would.
    static Real Select(Mask m, Real a, Real b) { return _mm256_blendv_pd(b, a, m); }
    static Single SelectSingle(Mask m, Single a, Single b) {
        return _mm_blendv_ps(b, a, Narrow(m));
    }
    static Single Keep(Mask m, Single a) { return _mm_and_ps(Narrow(m), a); }

    static Single Lookup(const float* table, Real q, double steps) {
        return _mm_i32gather_ps(table, _mm256_cvttpd_epi32(_mm256_mul_pd(q, _mm256_set1_pd(steps))),
                                4);
    }

private:
    // Float-lane mask to double-lane mask, and back.
    static Mask Widen(Single m) {
        return _mm256_castsi256_pd(_mm256_cvtepi32_epi64(_mm_castps_si128(m)));
    }
    static Single Narrow(Mask m) {
        __m128 low = _mm_castpd_ps(_mm256_castpd256_pd128(m));
        __m128 high = _mm_castpd_ps(_mm256_extractf128_pd(m, 1));
        return _mm_shuffle_ps(low, high, _MM_SHUFFLE(2, 0, 2, 0));
    }
};

}  // namespace

void SY_LayerShader::LightFourPixels(const SY_FourPoints& p, const double n[3],
                                     SY_FourLightings* out, SY_LightSet reaching) const {
    // Widening a float is exact, so each lane's product is the one SY_FourPoints::Point makes.
    auto load = [&p](__m256d points[3]) {
        const __m256d invW = _mm256_load_pd(p.invW);
        for (int k = 0; k < 3; ++k)
            points[k] = _mm256_mul_pd(_mm256_cvtps_pd(_mm_load_ps(p.ray[k])), invW);
    };
    const auto lighting = sy_lighting::Lit<SY_FourLanes>(*this, load, n, reaching);
    for (int c = 0; c < 3; ++c) {
        _mm_store_ps(out->diffuse[c], lighting.diffuse[c]);
        _mm_store_ps(out->specular[c], lighting.specular[c]);
    }
}
