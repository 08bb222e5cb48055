// Transfer functions for every mode number and pixel type, and the mode-name table.
//
// Every mode composites source over backdrop in the W3C model: the blend formula acts where
// both are present, each shows alone where the other is absent. Integer normal blends take an
// exact integer path (it is most of the renderer's blending); the other modes compute in
// normalised float and round once.
#include <array>
#include <cmath>
#include <cstring>
#include <utility>

#include <emmintrin.h>

#include "blend_formulas.h"
#include "pf_vec4.h"
#include "pf_xfer.h"

namespace {

using namespace pf_blend;

// Channels normalised to 0..1 (float pixels may lie outside), in pixel order.
using Unit = PF_Float4;

template <class P>
Unit ToUnit(const P& p) {
    return PF_LoadFloat4(p) * (1.0f / PF_PixelTraits<P>::kMax);
}

template <class P>
void FromUnit(Unit u, P& p) {
    if constexpr (PF_PixelTraits<P>::kIsFloat) u[0] = std::clamp(u[0], 0.0f, 1.0f);
    PF_StoreChannels(u * PF_PixelTraits<P>::kMax, &p);
}

// Straight result of premultiplied colour over alpha ao.
inline Unit Straight(float ao, Unit premultiplied) {
    if (!(ao > 0.0f)) return Unit{0.0f, 0.0f, 0.0f, 0.0f};
    Unit c = premultiplied * (1.0f / ao);
    c[0] = ao;
    return c;
}

// The blend formula of a mode on the colour lanes.
template <int kMode>
Unit Blend(Unit cb, Unit cs) {
    if constexpr (IsNonSeparable(kMode)) {
        Rgb c = NonSeparable<kMode>({cb[1], cb[2], cb[3]}, {cs[1], cs[2], cs[3]});
        return Unit{0.0f, c.r, c.g, c.b};
    } else if constexpr (kMode == kMultiply) {
        return cb * cs;  // the formula, all lanes at once
    } else if constexpr (kMode == kScreen) {
        return cb + cs - cb * cs;
    } else {
        return Unit{0.0f, Separable<kMode>(cb[1], cs[1]), Separable<kMode>(cb[2], cs[2]),
                    Separable<kMode>(cb[3], cs[3])};
    }
}

template <int kMode>
Unit Composite(Unit s, float opacity, Unit d) {
    if constexpr (kMode == kCopy) {
        // Opacity is coverage: the copy replaces that share of the pixel.
        if (opacity >= 1.0f) return s;
        float ws = s[0] * opacity, wd = d[0] * (1.0f - opacity);
        return Straight(ws + wd, s * ws + d * wd);
    } else {
        float as = std::clamp(s[0], 0.0f, 1.0f) * opacity, ab = d[0];
        if constexpr (kMode == kBehind) {
            float ws = as * (1.0f - ab);
            return Straight(ab + ws, d * ab + s * ws);
        } else if constexpr (kMode == kAdd) {
            // Sum of the premultiplied colours, capped at full intensity.
            float ao = std::min(1.0f, as + ab);
            return Straight(ao, _mm_min_ps(s * as + d * ab, _mm_set1_ps(ao)));
        } else {
            float wS = as * (1.0f - ab), wBoth = as * ab, wB = (1.0f - as) * ab;
            return Straight(as + wB, s * wS + Blend<kMode>(d, s) * wBoth + d * wB);
        }
    }
}

// Exact x / max rounded to nearest, halves up, for x up to max².
template <class P>
uint32_t DivMaxRound(uint32_t x) {
    if constexpr (PF_PixelTraits<P>::kMaxInt == 255) {
        uint32_t t = x + 128;
        return (t + (t >> 8)) >> 8;
    } else {
        return (x + 16384) >> 15;
    }
}

template <class P>
uint32_t MulRound(uint32_t a, uint32_t b) {
    return DivMaxRound<P>(a * b);
}

// 8-bit source over an opaque backdrop, the common case, with all channels in 16-bit lanes
// (255 × 255 fits): the same exact rounding as DivMaxRound.
[[gnu::always_inline]] inline PF_Pixel8 OverOpaque8(const PF_Pixel8& s, uint32_t as,
                                                    const PF_Pixel8& d) {
    int32_t sBits, dBits;
    std::memcpy(&sBits, &s, sizeof sBits);
    std::memcpy(&dBits, &d, sizeof dBits);
    const __m128i zero = _mm_setzero_si128();
    __m128i src = _mm_unpacklo_epi8(_mm_cvtsi32_si128(sBits), zero);
    __m128i dst = _mm_unpacklo_epi8(_mm_cvtsi32_si128(dBits), zero);
    __m128i x = _mm_add_epi16(_mm_mullo_epi16(src, _mm_set1_epi16(int16_t(as))),
                              _mm_mullo_epi16(dst, _mm_set1_epi16(int16_t(255 - as))));
    __m128i t = _mm_add_epi16(x, _mm_set1_epi16(128));
    __m128i q = _mm_srli_epi16(_mm_add_epi16(t, _mm_srli_epi16(t, 8)), 8);
    // Alpha comes first in memory, so it is the low byte: the result is opaque.
    int32_t bits = _mm_cvtsi128_si32(_mm_packus_epi16(q, q)) | 0xFF;
    PF_Pixel8 out;
    std::memcpy(&out, &bits, sizeof out);
    return out;
}

// Normal mode on integer channels, rounded to nearest (halves up) in every case.
template <class P>
[[gnu::always_inline]] inline void NormalInteger(const P& s, PF_XferOpacity<P> opacity, P& d) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr uint32_t kMax = PF_PixelTraits<P>::kMaxInt;
    uint32_t as = opacity == kMax ? s.alpha : MulRound<P>(s.alpha, opacity);
    if (!as) return;
    if (as == kMax) {
        d = s;
        return;
    }
    uint32_t ab = d.alpha;
    if (ab == kMax) {
        if constexpr (PF_PixelTraits<P>::kBitDepth == 8) {
            d = OverOpaque8(s, as, d);
            return;
        }
        auto over = [&](uint32_t cs, uint32_t cb) {
            return static_cast<C>(DivMaxRound<P>(as * cs + (kMax - as) * cb));
        };
        d = {C(kMax), over(s.red, d.red), over(s.green, d.green), over(s.blue, d.blue)};
        return;
    }
    // Weights of source and backdrop scaled by max²; their sum is the result alpha × max.
    uint64_t wS = uint64_t(as) * kMax, wB = uint64_t(ab) * (kMax - as);
    double inv = 1.0 / double(wS + wB);
    // The quotient's fraction is a multiple of 1/(wS + wB) ≥ 2^−30, far above the rounding
    // error of the reciprocal, so the offset settles exact halves upward and nothing else.
    auto over = [&](uint32_t cs, uint32_t cb) {
        return static_cast<C>(double(wS * cs + wB * cb) * inv + (0.5 + 1e-10));
    };
    d = {static_cast<C>(as + MulRound<P>(ab, kMax - as)), over(s.red, d.red),
         over(s.green, d.green), over(s.blue, d.blue)};
}

// Normal mode on float pixels: the general compositing with the blend formula folded away.
[[gnu::always_inline]] inline void NormalFloat(const PF_PixelFloat& s, float opacity,
                                               PF_PixelFloat& d) {
    float as = std::clamp(s.alpha, 0.0f, 1.0f) * std::clamp(opacity, 0.0f, 1.0f);
    float wB = d.alpha * (1.0f - as), ao = as + wB;
    if (!(ao > 0.0f)) {
        d = {0.0f, 0.0f, 0.0f, 0.0f};
        return;
    }
    PF_Float4 c = (_mm_loadu_ps(&s.alpha) * as + _mm_loadu_ps(&d.alpha) * wB) * (1.0f / ao);
    c[0] = std::min(ao, 1.0f);
    _mm_storeu_ps(&d.alpha, c);
}

// True when the blend leaves the destination as it is.
template <class P, int kMode>
bool LeavesDestination(const P& s, PF_XferOpacity<P> opacity) {
    if constexpr (kMode == kCopy) return !(opacity > 0);
    return !(s.alpha > 0) || !(opacity > 0);
}

template <class P, int kMode>
void BlendDirect(const P& s, PF_XferOpacity<P> opacity, P& d) {
    using Traits = PF_PixelTraits<P>;
    if constexpr (kMode == kNormal && !Traits::kIsFloat) {
        NormalInteger(s, opacity, d);
    } else {
        constexpr float k = 1.0f / Traits::kMax;
        float o = std::clamp(opacity * k, 0.0f, 1.0f);
        FromUnit(Composite<kMode>(ToUnit(s), o, ToUnit(d)), d);
    }
}

template <class P>
PF_Pixel16 ToLinear(const P& p, const PF_LinearBlendingTables& t) {
    if constexpr (PF_PixelTraits<P>::kBitDepth == 8) {
        return {PF_8To16(p.alpha), uint16_t(PF_LinearFrom8(t, p.red)),
                uint16_t(PF_LinearFrom8(t, p.green)), uint16_t(PF_LinearFrom8(t, p.blue))};
    } else {
        return {p.alpha, uint16_t(PF_LinearFrom16(t, p.red)), uint16_t(PF_LinearFrom16(t, p.green)),
                uint16_t(PF_LinearFrom16(t, p.blue))};
    }
}

template <class P>
P FromLinear(const PF_Pixel16& p, const PF_LinearBlendingTables& t) {
    if constexpr (PF_PixelTraits<P>::kBitDepth == 8) {
        return {uint8_t((p.alpha * 255u + 16384) >> 15), uint8_t(PF_LinearTo8(t, p.red)),
                uint8_t(PF_LinearTo8(t, p.green)), uint8_t(PF_LinearTo8(t, p.blue))};
    } else {
        return {p.alpha, uint16_t(PF_LinearTo16(t, p.red)), uint16_t(PF_LinearTo16(t, p.green)),
                uint16_t(PF_LinearTo16(t, p.blue))};
    }
}

PF_PixelFloat RaiseColor(PF_PixelFloat p, float exponent) {
    auto raise = [&](float c) { return c >= 0.0f ? std::pow(c, exponent) : c; };
    return {p.alpha, raise(p.red), raise(p.green), raise(p.blue)};
}

// Blending in linear light: convert, blend, convert back. Kept out of line so that the plain
// path keeps a short prologue.
template <class P, int kMode>
[[gnu::noinline]] void ApplyLinear(const P& src, const PF_LinearBlendingTables& tables,
                                   PF_XferOpacity<P> opacity, P* dst) {
    if constexpr (PF_PixelTraits<P>::kIsFloat) {
        PF_PixelFloat d = RaiseColor(*dst, tables.toLinearExponent);
        BlendDirect<P, kMode>(RaiseColor(src, tables.toLinearExponent), opacity, d);
        *dst = RaiseColor(d, tables.fromLinearExponent);
    } else {
        PF_Pixel16 d = ToLinear(*dst, tables);
        uint16_t opacity16 = PF_PixelTraits<P>::kBitDepth == 8 ? PF_8To16(opacity) : opacity;
        BlendDirect<PF_Pixel16, kMode>(ToLinear(src, tables), opacity16, d);
        *dst = FromLinear<P>(d, tables);
    }
}

// Inlined into both calling forms, so that the one without opacity folds it away.
template <class P, int kMode>
[[gnu::always_inline]] inline void Apply(const P* src, const PF_LinearBlendingTables* tables,
                                         PF_XferOpacity<P> opacity, P* dst) {
    if (LeavesDestination<P, kMode>(*src, opacity)) return;
    if (tables) {
        ApplyLinear<P, kMode>(*src, *tables, opacity, dst);
    } else if constexpr (kMode == kNormal) {
        // Most of the renderer's blending: inlined here, where the opacity may be a constant.
        if constexpr (PF_PixelTraits<P>::kIsFloat)
            NormalFloat(*src, opacity, *dst);
        else
            NormalInteger(*src, opacity, *dst);
    } else {
        BlendDirect<P, kMode>(*src, opacity, *dst);
    }
}

template <class P, int kMode>
void XferOpacity(const P* src, const PF_LinearBlendingTables* tables, PF_XferOpacity<P> opacity,
                 P* dst) {
    Apply<P, kMode>(src, tables, opacity, dst);
}

template <class P, int kMode>
void Xfer(const P* src, const PF_LinearBlendingTables* tables, P* dst) {
    Apply<P, kMode>(src, tables, static_cast<PF_XferOpacity<P>>(PF_PixelTraits<P>::kMax), dst);
}

constexpr int kModeNumbers = 128;

template <class P, size_t... I>
constexpr std::array<PF_Xfer1Func<P>, kModeNumbers> MakeTable(std::index_sequence<I...>) {
    return {&Xfer<P, CanonicalMode(int(I))>...};
}

template <class P, size_t... I>
constexpr std::array<PF_Xfer1OpacityFunc<P>, kModeNumbers> MakeOpacityTable(
    std::index_sequence<I...>) {
    return {&XferOpacity<P, CanonicalMode(int(I))>...};
}

template <class P>
constexpr auto kTable = MakeTable<P>(std::make_index_sequence<kModeNumbers>());
template <class P>
constexpr auto kOpacityTable = MakeOpacityTable<P>(std::make_index_sequence<kModeNumbers>());

}  // namespace

PF_Xfer1Func<PF_Pixel8> PF_Get_Xfer1_table8(int32_t mode) {
    return kTable<PF_Pixel8>[mode & 127];
}
PF_Xfer1Func<PF_Pixel16> PF_Get_Xfer1_table16(int32_t mode) {
    return kTable<PF_Pixel16>[mode & 127];
}
PF_Xfer1Func<PF_PixelFloat> PF_Get_Xfer1_tableF(int32_t mode) {
    return kTable<PF_PixelFloat>[mode & 127];
}
PF_Xfer1OpacityFunc<PF_Pixel8> PF_Get_Xfer1_Opacity_table8(int32_t mode) {
    return kOpacityTable<PF_Pixel8>[mode & 127];
}
PF_Xfer1OpacityFunc<PF_Pixel16> PF_Get_Xfer1_Opacity_table16(int32_t mode) {
    return kOpacityTable<PF_Pixel16>[mode & 127];
}
PF_Xfer1OpacityFunc<PF_PixelFloat> PF_Get_Xfer1_Opacity_tableF(int32_t mode) {
    return kOpacityTable<PF_PixelFloat>[mode & 127];
}

template <class P>
PF_Xfer1Func<P> PF_Get_Xfer1(int32_t mode) {
    return kTable<P>[mode & 127];
}
template <class P>
PF_Xfer1OpacityFunc<P> PF_Get_Xfer1_Opacity(int32_t mode) {
    return kOpacityTable<P>[mode & 127];
}
template PF_Xfer1Func<PF_Pixel8> PF_Get_Xfer1(int32_t);
template PF_Xfer1Func<PF_Pixel16> PF_Get_Xfer1(int32_t);
template PF_Xfer1Func<PF_PixelFloat> PF_Get_Xfer1(int32_t);
template PF_Xfer1OpacityFunc<PF_Pixel8> PF_Get_Xfer1_Opacity(int32_t);
template PF_Xfer1OpacityFunc<PF_Pixel16> PF_Get_Xfer1_Opacity(int32_t);
template PF_Xfer1OpacityFunc<PF_PixelFloat> PF_Get_Xfer1_Opacity(int32_t);

const PF_XferModeName PF_XferModeNames[] = {
    {kCopy, "copy"},
    {kBehind, "behind"},
    {kNormal, "normal"},
    {kDissolve, "dissolve"},
    {kAdd, "add"},
    {kMultiply, "multiply"},
    {kScreen, "screen"},
    {kOverlay, "overlay"},
    {kSoftLight, "soft-light"},
    {kHardLight, "hard-light"},
    {kDarken, "darken"},
    {kLighten, "lighten"},
    {kDifference, "difference"},
    {kHue, "hue"},
    {kSaturation, "saturation"},
    {kColor, "color"},
    {kLuminosity, "luminosity"},
    {kStencilAlpha, "stencil-alpha"},
    {kStencilLuma, "stencil-luma"},
    {kColorDodge, "color-dodge"},
    {kColorBurn, "color-burn"},
    {kExclusion, "exclusion"},
    {kSubtract, "subtract"},
    {kDivide, "divide"},
    {kLinearDodge, "linear-dodge"},
    {kLinearBurn, "linear-burn"},
    {kLinearLight, "linear-light"},
    {kVividLight, "vivid-light"},
    {kPinLight, "pin-light"},
    {kHardMix, "hard-mix"},
    {kLighterColor, "lighter-color"},
    {kDarkerColor, "darker-color"},
};
const int32_t PF_XferModeNameCount = sizeof(PF_XferModeNames) / sizeof(PF_XferModeNames[0]);
static_assert(sizeof(PF_XferModeNames) / sizeof(PF_XferModeNames[0]) == kModeCount);

const char* PF_XferModeToName(int32_t mode) {
    for (const PF_XferModeName& m : PF_XferModeNames) {
        if (m.number == mode) return m.name;
    }
    return nullptr;
}

int32_t PF_XferModeFromName(std::string_view name) {
    for (const PF_XferModeName& m : PF_XferModeNames) {
        if (name == m.name) return m.number;
    }
    return -1;
}
