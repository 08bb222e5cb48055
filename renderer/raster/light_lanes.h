// Lane packs for the lighting routines: one pixel in plain doubles and floats, or two pixels side
// by side in SSE2 registers. The lighting is written once over these, so both forms run the same
// operations in the same order on every lane and agree bit for bit: every operation used here is
// correctly rounded IEEE arithmetic in both its scalar and its packed instruction.
#pragma once

#include <cmath>
#include <cstdint>

#include <emmintrin.h>

// One pixel. Masks are plain booleans, so after a `None` test the compiler drops the selects.
struct SY_OneLane {
    static constexpr int kCount = 1;
    using Real = double;   // geometry
    using Single = float;  // light terms
    using Mask = bool;

    static Real Splat(double v) { return v; }
    static Single SplatSingle(float v) { return v; }
    static Real Load(const double* const lanes[kCount], int k) { return lanes[0][k]; }
    static double Lane(Real v, int) { return v; }
    static float LaneSingle(Single v, int) { return v; }
    static Single FromLanes(const float lanes[kCount]) { return lanes[0]; }

    static Real Sqrt(Real v) { return std::sqrt(v); }
    static Single ToSingle(Real v) { return static_cast<float>(v); }
    static Real ToReal(Single v) { return v; }
    static Single Max(Single a, Single b) { return a > b ? a : b; }

    static Mask All() { return true; }
    static Mask Uniform(bool on) { return on; }
    static Mask Less(Real a, Real b) { return a < b; }
    static Mask LessEqual(Real a, Real b) { return a <= b; }
    static Mask LessEqualSingle(Single a, Single b) { return a <= b; }
    static Mask EqualSingle(Single a, Single b) { return a == b; }
    static Mask AndNot(Mask drop, Mask m) { return m && !drop; }
    static Mask Or(Mask a, Mask b) { return a || b; }
    static bool None(Mask m) { return !m; }
    static bool Any(Mask m) { return m; }
    static bool LaneOn(Mask m, int) { return m; }

    static Real Select(Mask m, Real a, Real b) { return m ? a : b; }
    static Single SelectSingle(Mask m, Single a, Single b) { return m ? a : b; }
    // a on the lanes of m, +0 elsewhere: a contribution that leaves other lanes' sums unchanged.
    static Single Keep(Mask m, Single a) { return m ? a : 0.0f; }

    // table[trunc(q × steps)]; the caller keeps q in the table's range.
    static Single Lookup(const float* table, Real q, double steps) {
        return table[static_cast<int32_t>(q * steps)];
    }
};

// Two pixels: lane 0 the first, lane 1 the second. Doubles fill a register; floats use the low
// two lanes of theirs. Masks are 64-bit lanes of all ones or all zeros.
struct SY_TwoLanes {
    static constexpr int kCount = 2;
    using Real = __m128d;
    using Single = __m128;
    using Mask = __m128d;

    static Real Splat(double v) { return _mm_set1_pd(v); }
    static Single SplatSingle(float v) { return _mm_set1_ps(v); }
    static Real Load(const double* const lanes[kCount], int k) {
        return _mm_set_pd(lanes[1][k], lanes[0][k]);
    }
    static double Lane(Real v, int i) {
        double d[2];
        _mm_storeu_pd(d, v);
        return d[i];
    }
    static float LaneSingle(Single v, int i) {
        float f[4];
        _mm_storeu_ps(f, v);
        return f[i];
    }
    static Single FromLanes(const float lanes[kCount]) {
        return _mm_setr_ps(lanes[0], lanes[1], 0.0f, 0.0f);
    }

    static Real Sqrt(Real v) { return _mm_sqrt_pd(v); }
    static Single ToSingle(Real v) { return _mm_cvtpd_ps(v); }
    static Real ToReal(Single v) { return _mm_cvtps_pd(v); }
    static Single Max(Single a, Single b) {
        return _mm_or_ps(_mm_and_ps(_mm_cmpgt_ps(a, b), a), _mm_andnot_ps(_mm_cmpgt_ps(a, b), b));
    }

    static Mask All() { return _mm_castsi128_pd(_mm_set1_epi32(-1)); }
    static Mask Uniform(bool on) { return on ? All() : _mm_setzero_pd(); }
    static Mask Less(Real a, Real b) { return _mm_cmplt_pd(a, b); }
    static Mask LessEqual(Real a, Real b) { return _mm_cmple_pd(a, b); }
    static Mask LessEqualSingle(Single a, Single b) { return Widen(_mm_cmple_ps(a, b)); }
    static Mask EqualSingle(Single a, Single b) { return Widen(_mm_cmpeq_ps(a, b)); }
    static Mask AndNot(Mask drop, Mask m) { return _mm_andnot_pd(drop, m); }
    static Mask Or(Mask a, Mask b) { return _mm_or_pd(a, b); }
    static bool None(Mask m) { return _mm_movemask_pd(m) == 0; }
    static bool Any(Mask m) { return _mm_movemask_pd(m) != 0; }
    static bool LaneOn(Mask m, int i) { return (_mm_movemask_pd(m) >> i) & 1; }

    static Real Select(Mask m, Real a, Real b) {
        return _mm_or_pd(_mm_and_pd(m, a), _mm_andnot_pd(m, b));
    }
    static Single SelectSingle(Mask m, Single a, Single b) {
        Single n = Narrow(m);
        return _mm_or_ps(_mm_and_ps(n, a), _mm_andnot_ps(n, b));
    }
    static Single Keep(Mask m, Single a) { return _mm_and_ps(Narrow(m), a); }

    static Single Lookup(const float* table, Real q, double steps) {
        __m128i index = _mm_cvttpd_epi32(_mm_mul_pd(q, _mm_set1_pd(steps)));
        return _mm_setr_ps(table[_mm_cvtsi128_si32(index)],
                           table[_mm_cvtsi128_si32(_mm_srli_si128(index, 4))], 0.0f, 0.0f);
    }

private:
    // Float-lane mask (lanes 0 and 1) to double-lane mask, and back.
    static Mask Widen(Single m) {
        return _mm_castsi128_pd(_mm_shuffle_epi32(_mm_castps_si128(m), _MM_SHUFFLE(1, 1, 0, 0)));
    }
    static Single Narrow(Mask m) {
        return _mm_castsi128_ps(_mm_shuffle_epi32(_mm_castpd_si128(m), _MM_SHUFFLE(2, 2, 2, 0)));
    }
};
