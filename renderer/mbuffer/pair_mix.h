// Two records that cross inside a pixel, mixed by the share of the pixel in which each is in
// front. With blending tables the mix happens in linear light: integer pixels through 16-bit
// linear values, float pixels through the tables' exponents.
#pragma once

#include <cmath>
#include <cstdint>

#include "pf_pixel.h"
#include "pf_xfer.h"
#include "renderer/mbuffer/channel_math.h"
#include "renderer/mbuffer/record_apply.h"

// The pixel type a mix in linear light works in, and the conversions into it and back.
template <class P>
struct SY_LinearSpace;

template <>
struct SY_LinearSpace<PF_Pixel8> {
    using Work = PF_Pixel16;
    static Work ToLinear(const PF_Pixel8& p, const PF_LinearBlendingTables& t) {
        return {PF_8To16(p.alpha), uint16_t(PF_LinearFrom8(t, p.red)),
                uint16_t(PF_LinearFrom8(t, p.green)), uint16_t(PF_LinearFrom8(t, p.blue))};
    }
    static PF_Pixel8 FromLinear(const Work& p, const PF_LinearBlendingTables& t) {
        return {uint8_t((p.alpha * 255u + 16384) >> 15), uint8_t(PF_LinearTo8(t, p.red)),
                uint8_t(PF_LinearTo8(t, p.green)), uint8_t(PF_LinearTo8(t, p.blue))};
    }
};

template <>
struct SY_LinearSpace<PF_Pixel16> {
    using Work = PF_Pixel16;
    static Work ToLinear(const PF_Pixel16& p, const PF_LinearBlendingTables& t) {
        return {p.alpha, uint16_t(PF_LinearFrom16(t, p.red)), uint16_t(PF_LinearFrom16(t, p.green)),
                uint16_t(PF_LinearFrom16(t, p.blue))};
    }
    static PF_Pixel16 FromLinear(const Work& p, const PF_LinearBlendingTables& t) {
        return {p.alpha, uint16_t(PF_LinearTo16(t, p.red)), uint16_t(PF_LinearTo16(t, p.green)),
                uint16_t(PF_LinearTo16(t, p.blue))};
    }
};

template <>
struct SY_LinearSpace<PF_PixelFloat> {
    using Work = PF_PixelFloat;
    static Work ToLinear(const PF_PixelFloat& p, const PF_LinearBlendingTables& t) {
        return Raise(p, t.toLinearExponent);
    }
    static PF_PixelFloat FromLinear(const Work& p, const PF_LinearBlendingTables& t) {
        return Raise(p, t.fromLinearExponent);
    }

private:
    // Negative channels have no power; they pass as they are, and so does alpha.
    static PF_PixelFloat Raise(const PF_PixelFloat& p, float exponent) {
        auto raise = [exponent](float c) { return c >= 0.0f ? std::pow(c, exponent) : c; };
        return {p.alpha, raise(p.red), raise(p.green), raise(p.blue)};
    }
};

// d with A then B blended (B in front) where f says, and B then A elsewhere:
// T1 + (T2 − T1) × f per channel, alpha included, with T1 = d + B + A and T2 = d + A + B.
template <class P>
P SY_MixedPair(const P& colorA, uint8_t modeA, const P& colorB, uint8_t modeB, float f,
               const P& d) {
    SY_RecordApplier<P> applier(nullptr);
    P t1 = d;
    applier.Apply(colorB, modeB, &t1);
    applier.Apply(colorA, modeA, &t1);
    P t2 = d;
    applier.Apply(colorA, modeA, &t2);
    applier.Apply(colorB, modeB, &t2);
    using M = SY_ChannelMath<P>;
    return {M::Mix(t1.alpha, t2.alpha, f), M::Mix(t1.red, t2.red, f), M::Mix(t1.green, t2.green, f),
            M::Mix(t1.blue, t2.blue, f)};
}

// Mixes records a (earlier in the list) and b onto *d, f being the share of the pixel in which
// b is in front of a. Each record's keep-alpha bit holds in every blend.
template <class F>
void SY_MixTwoRecords(const F& a, const F& b, float f, const PF_LinearBlendingTables* tables,
                      typename F::Pixel* d) {
    if (!tables) {
        *d = SY_MixedPair(a.color, a.mode, b.color, b.mode, f, *d);
        return;
    }
    using Linear = SY_LinearSpace<typename F::Pixel>;
    const auto mixed =
        SY_MixedPair(Linear::ToLinear(a.color, *tables), a.mode, Linear::ToLinear(b.color, *tables),
                     b.mode, f, Linear::ToLinear(*d, *tables));
    *d = Linear::FromLinear(mixed, *tables);
}
