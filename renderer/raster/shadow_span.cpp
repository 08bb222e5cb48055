#include "renderer/raster/shadow_span.h"

#include <algorithm>
#include <cmath>

#include "pf_bit_depth.h"
#include "pf_box_sum.h"
#include "pf_tables.h"
#include "renderer/mbuffer/shadow_fragments.h"
#include "renderer/raster/samplers.h"
#include "renderer/raster/shader.h"
#include "renderer/raster/shadow_reach.h"
#include "renderer/raster/span_start.h"
#include "renderer/scene/screen_geometry.h"
#include "u_report.h"

namespace {

constexpr uint32_t kOne = 32768;

// The powers of two that blur levels take below 90 % of the diffusion.
constexpr float kLevelRadii[] = {2, 4, 8, 16, 32, 64, 128, 256, 512};

uint16_t ToFixed(double fraction) {
    return static_cast<uint16_t>(std::lround(std::clamp(fraction, 0.0, 1.0) * kOne));
}

template <class P>
uint32_t To16(typename PF_PixelTraits<P>::Channel c) {
    if constexpr (PF_PixelTraits<P>::kIsFloat)
        return PF_FloatTo16(std::clamp(c, 0.0f, 1.0f));
    else if constexpr (PF_PixelTraits<P>::kBitDepth == 8)
        return PF_8To16(c);
    else
        return c;
}

// What the layer sample lets through, × 32768: grey as the layer is opaque, tinted by its
// colour as far as its light transmission goes. False where the layer is transparent.
template <class P>
bool Occluder(const P& sample, const SY_ShadowShader& shader, PF_Pixel16* out) {
    uint32_t alpha = To16<P>(sample.alpha);
    if (alpha == 0) return false;
    uint32_t a = PF_Mul16(alpha, shader.opacity);
    uint32_t open = kOne - a;  // light that misses the layer
    uint32_t t = shader.transmission;
    uint32_t colour[3] = {To16<P>(sample.red), To16<P>(sample.green), To16<P>(sample.blue)};
    uint16_t* channels[3] = {&out->red, &out->green, &out->blue};
    for (int c = 0; c < 3; ++c) {
        uint32_t filtered = kOne - PF_Mul16(kOne - colour[c], a);  // white where transparent
        uint32_t v = t == 0 ? open : t >= kOne ? filtered : (((filtered - open) * t) >> 15) + open;
        *channels[c] = static_cast<uint16_t>(v);
    }
    return true;
}

// Box averages of a texture whose texels all have full alpha, for a layer that shadows by alpha
// alone: a whole-texel box inside the texture sums to its own area without a look at the
// table, so every box of one area averages alike. Colour is left black.
template <class P>
class OpaqueBoxes {
public:
    // Of a box wide × high texels, both at least 1.
    const P& Average(int32_t wide, int32_t high) {
        // Boxes along a span take a few sizes by turns, as their edges round one way or the
        // other: one slot per width and height modulo kSides, so that neighbouring sizes never
        // share one, whereas their areas modulo the slot count may.
        const float area = float(wide) * float(high);
        Slot& slot = slots_[static_cast<uint32_t>(wide % kSides) * kSides +
                            static_cast<uint32_t>(high % kSides)];
        if (slot.area != area) {
            slot.area = area;
            pf_tables::StoreAverage(PF_Float4{area, 0.0f, 0.0f, 0.0f}, area, &slot.average);
        }
        return slot.average;
    }

private:
    static constexpr int32_t kSides = 4;
    struct Slot {
        float area = 0.0f;  // no box has it
        P average{};
    };
    Slot slots_[kSides * kSides];
};

// Box averages from the texture's summed-area table, of cells S.
template <class S>
class TableSums {
public:
    TableSums(const PF_SummedAreaTable& table, const S* sums)
        : width_(table.Width()), height_(table.Height()), sums_(sums) {}
    int32_t Width() const { return width_; }
    int32_t Height() const { return height_; }
    // Over the texels [x0, x1) × [y0, y1).
    template <class P>
    void Whole(int32_t x0, int32_t y0, int32_t x1, int32_t y1, P* out) const {
        PF_SummedAreaTable_SampleDraft(width_, height_, sums_, x0, y0, x1, y1, out);
    }
    // Over [x0, x1] × [y0, y1], edges anywhere.
    template <class P>
    void Fractional(float x0, float y0, float x1, float y1, P* out) const {
        PF_SummedAreaTable_SampleAA(width_, height_, sums_, x0, y0, x1, y1, out);
    }

private:
    int32_t width_, height_;
    const S* sums_;
};

// The same averages' alpha for a texture whose texels all have full alpha, without its table:
// every difference of sums the table would give is the area of a box of whole texels, an
// integer the cells hold exactly, and comes out the same here, so the alpha does too. Colour
// is left 0.
template <class S>
class FullAlphaSums {
public:
    explicit FullAlphaSums(const SY_FullAlphaSums<S>& sums) : sums_(sums) {}
    int32_t Width() const { return sums_.Width(); }
    int32_t Height() const { return sums_.Height(); }
    template <class P>
    void Whole(int32_t x0, int32_t y0, int32_t x1, int32_t y1, P* out) const {
        using Cells = PF_BoxCellsPixel<S>;
        using V = decltype(S::alpha);
        // Texels outside count as transparent.
        const int64_t wide = std::clamp(x1, 0, Width()) - std::clamp(x0, 0, Width());
        const int64_t high = std::clamp(y1, 0, Height()) - std::clamp(y0, 0, Height());
        const S box{V(wide * high), 0, 0, 0};
        float area = x1 > x0 && y1 > y0 ? float(x1 - x0) * float(y1 - y0) : 0.0f;
        pf_tables::StoreAverage(Cells::ToFloat4(Cells::Widen(box)), area, out);
    }
    // A box with fractional edges is less than four texels across along one axis, so it
    // spans at most six of the axis's edges: moved to the first of them it lies in the
    // narrow rows or columns.
    template <class P>
    void Fractional(float x0, float y0, float x1, float y1, P* out) const {
        using Cells = PF_BoxCellsPixel<S>;
        constexpr int32_t kNarrow = SY_FullAlphaSums<S>::kNarrow;
        PF_BoxAxis ax = PF_MakeBoxAxis(x0, x1, Width());
        PF_BoxAxis ay = PF_MakeBoxAxis(y0, y1, Height());
        float area = x1 > x0 && y1 > y0 ? (x1 - x0) * (y1 - y0) : 0.0f;
        auto moveToFirst = [](PF_BoxAxis* a) {
            for (int k = 3; k >= 0; --k)
                a->edge[k] -= a->edge[0];
        };
        PF_Float4 sum;
        if (ay.edge[3] - ay.edge[0] < kNarrow) {
            moveToFirst(&ay);
            sum = PF_BoxSum<Cells>(sums_.Rows(), ptrdiff_t(Width()) + 1, ax, ay);
        } else {
            moveToFirst(&ax);
            sum = PF_BoxSum<Cells>(sums_.Columns(), kNarrow, ax, ay);
        }
        pf_tables::StoreAverage(sum, area, out);
    }

private:
    const SY_FullAlphaSums<S>& sums_;
};

// Where the box `scale` times the footprint of the mapping's pixel lies in the texture, in
// texels: its centre from the texels' corners, its half-sizes, and the footprint's own centre.
struct BoxPlace {
    double u, v;    // texel centres on whole numbers where filtered
    double cu, cv;  // from the texels' corners
    double ru, rv;
    bool filtered;

    // Whole-texel boxes for draft layers, and wherever the box is wide enough that its
    // fractional edges (under a quarter of its width) do not show.
    bool WholeTexels() const {
        constexpr double kWholeTexelsFrom = 2.0;
        return !filtered || (ru >= kWholeTexelsFrom && rv >= kWholeTexelsFrom);
    }
    // The whole texels [x0, x1) × [y0, y1) the box covers.
    void Whole(int32_t* x0, int32_t* y0, int32_t* x1, int32_t* y1) const {
        *x0 = static_cast<int32_t>(std::floor(cu - ru));
        *y0 = static_cast<int32_t>(std::floor(cv - rv));
        *x1 = static_cast<int32_t>(std::ceil(cu + ru));
        *y1 = static_cast<int32_t>(std::ceil(cv + rv));
    }
    // Whether Whole()'s texels are at least one and all lie in a texture of width × height,
    // found without rounding the edges: floor(a) ≥ 0 just where a ≥ 0, ceil(b) ≤ width just where b
    // ≤ width, and ceil(b) > floor(a) where b > a, or where they are one number but not a whole
    // one.
    bool WholeWithin(int32_t width, int32_t height) const {
        const double left = cu - ru, right = cu + ru, top = cv - rv, bottom = cv + rv;
        return left >= 0 && top >= 0 && right <= width && bottom <= height &&
               (right > left || left != std::floor(left)) &&
               (bottom > top || top != std::floor(top));
    }
};

// False for a pixel behind the eye, which samples nothing.
[[gnu::always_inline]] inline bool PlaceBox(const SY_SpanTexture& texture, const SY_SpanMapping& m,
                                            float scale, BoxPlace* b) {
    using sy_sampling::kFarTexels;
    if (!sy_sampling::InFront(m, texture.perspective)) return false;
    sy_sampling::Footprint f = sy_sampling::FootprintOf(m, texture.perspective);
    b->ru = std::min(scale * f.ru, kFarTexels);
    b->rv = std::min(scale * f.rv, kFarTexels);
    b->u = std::clamp(f.u, -kFarTexels, kFarTexels);
    b->v = std::clamp(f.v, -kFarTexels, kFarTexels);
    // Filtered mappings put texel centres on whole numbers; the table counts from corners.
    b->filtered = texture.samplingFilter != SY_SamplingFilter::kNearest;
    b->cu = b->filtered ? b->u + 0.5 : b->u;
    b->cv = b->filtered ? b->v + 0.5 : b->v;
    return true;
}

// Whether the whole texels [x0, x1) × [y0, y1) are at least one and all lie in a texture of
// width × height.
bool WithinTexture(int32_t x0, int32_t y0, int32_t x1, int32_t y1, int32_t width, int32_t height) {
    return x0 >= 0 && y0 >= 0 && x1 <= width && y1 <= height && x1 > x0 && y1 > y0;
}

// Whether the box of a texture whose texels all have full alpha lies inside it with its centre
// at least kDeep texels from every edge, so that the filter of every level there, down to a
// bicubic one at the texel's own footprint, reads texels of full alpha only. The average over
// it is not needed then: a layer that passes no colour lets the same grey through at every
// level.
[[gnu::always_inline]] inline bool DeepInOpaque(int32_t width, int32_t height,
                                                const SY_SpanTexture& texture,
                                                const SY_SpanMapping& m, float scale) {
    constexpr double kDeep = 3.0;
    BoxPlace b;
    if (!PlaceBox(texture, m, scale, &b) || !b.WholeTexels()) return false;
    return b.WholeWithin(width, height) && b.cu >= kDeep && b.cu <= width - kDeep &&
           b.cv >= kDeep && b.cv <= height - kDeep;
}

// Average of the texture over a box `scale` times the footprint of the mapping's pixel, from
// sums (TableSums or FullAlphaSums), or from opaque where there is one.
template <class P, class Sums>
void SampleBox(const Sums& sums, SY_SpanTexture& texture, const SY_SpanMapping& m, float scale,
               OpaqueBoxes<P>* opaque, P* out) {
    BoxPlace b;
    if (!PlaceBox(texture, m, scale, &b)) {
        *out = P{};
        return;
    }
    if (b.WholeTexels()) {
        int32_t x0, y0, x1, y1;
        b.Whole(&x0, &y0, &x1, &y1);
        if (opaque && WithinTexture(x0, y0, x1, y1, sums.Width(), sums.Height())) {
            *out = opaque->Average(x1 - x0, y1 - y0);
            return;
        }
        sums.Whole(x0, y0, x1, y1, out);
        return;
    }
    if (b.ru > 0.5 && b.rv > 0.5) {
        const auto x0 = static_cast<float>(b.cu - b.ru), y0 = static_cast<float>(b.cv - b.rv),
                   x1 = static_cast<float>(b.cu + b.ru), y1 = static_cast<float>(b.cv + b.rv);
        // A box wholly outside the texture sums to nothing, clear, as the sums would give it:
        // blurred casters draw a margin around them where the narrow levels fall outside.
        if (x1 <= 0 || y1 <= 0 || x0 >= sums.Width() || y0 >= sums.Height()) {
            *out = P{};
            return;
        }
        sums.Fractional(x0, y0, x1, y1, out);
        return;
    }
    sy_sampling::Filter(texture, b.u, b.v, b.ru, b.rv, out);
}

template <class P>
const SY_SpanMapping* FirstPresent(const SY_SpanSampleState<P>& state) {
    return &state.mapping;
}
template <class P>
const SY_SpanMapping* FirstPresent(const SY_SpanSubsampleState<P>& state) {
    for (int32_t i = state.first; i <= state.last; ++i) {
        if (state.mappings[i].invW > 0) return &state.mappings[i];
    }
    return nullptr;
}

template <class P, class Sums>
void SampleBlurred(const Sums& sums, SY_SpanSampleState<P>& state, float scale,
                   OpaqueBoxes<P>* opaque, P* out) {
    SampleBox(sums, state.texture, state.mapping, scale, opaque, out);
}

template <class P>
[[gnu::always_inline]] inline bool DeepBlurred(int32_t width, int32_t height,
                                               const SY_SpanSampleState<P>& state, float scale) {
    return DeepInOpaque(width, height, state.texture, state.mapping, scale);
}

// Not every subsample's box need lie deep inside.
template <class P>
bool DeepBlurred(int32_t, int32_t, const SY_SpanSubsampleState<P>&, float) {
    return false;
}

// The box average over the present subsamples, alpha falling with the absent ones.
template <class P, class Sums>
void SampleBlurred(const Sums& sums, SY_SpanSubsampleState<P>& state, float scale,
                   OpaqueBoxes<P>* opaque, P* out) {
    sy_sampling::Accumulator sum;
    for (int32_t i = state.first; i <= state.last; ++i) {
        if (!(state.mappings[i].invW > 0)) continue;
        P texel;
        SampleBox(sums, state.texture, state.mappings[i], scale, opaque, &texel);
        sum.Add(texel);
    }
    sum.Resolve(state.count, out);
}

// The two occluders let the same light through.
bool SameLight(const PF_Pixel16& a, const PF_Pixel16& b) {
    return a.red == b.red && a.green == b.green && a.blue == b.blue;
}

// Steps the state across the span; sample(level, out) gives the layer's colour at a level, and
// deepOpaque() tells whether the widest level's box at the state's position lies deep inside
// an opaque texture (see DeepInOpaque). A level that lets through what both its neighbours let
// through adds nothing that blending between them would not give, so only the levels where the
// light changes are kept: inside an opaque layer one occluder stands for all of them.
template <class P, class State, class Sample, class DeepOpaque>
void DrawSpan(const SY_ShadowShader& shader, State& state, int32_t x, int32_t count, int32_t y,
              SY_ShadowFragmentArray* array, int32_t thread, Sample sample, DeepOpaque deepOpaque) {
    SY_ShadowFragment** heads = array->HeadAt(x, y);
    const int32_t levels = shader.levelCount;
    PF_Pixel16 occluders[SY_ShadowShader::kMaxLevels];
    bool present[SY_ShadowShader::kMaxLevels];
    constexpr auto kOpaque = static_cast<decltype(P::alpha)>(PF_PixelTraits<P>::kMax);
    // What a layer that passes no colour lets through where it is opaque: its colour counts
    // for nothing, so one grey serves the whole span.
    PF_Pixel16 opaqueGrey{};
    P opaque{};
    opaque.alpha = kOpaque;
    Occluder(opaque, shader, &opaqueGrey);
    // Where the widest box is wholly opaque, so is every box inside it, and a layer that
    // passes no colour then lets the same grey through at every level. A float average of full
    // alpha may round just below 1; deep inside an opaque texture every level's still rounds to
    // the same 16-bit grey, so there the average is not taken at all.
    const bool greyWhereOpaque = levels > 1 && shader.transmission == 0;
    auto drawTexel = [&](int32_t i) {
        const SY_SpanMapping* depth = FirstPresent(state);
        if (!depth) return;
        auto addGrey = [&] {
            array->AddShadowFragment(&opaqueGrey, shader.DepthKey(depth->w, 0), 0.0f,
                                     shader.layerId, heads + i, thread);
        };
        if (greyWhereOpaque && deepOpaque()) {
            addGrey();
            return;
        }
        P widest;
        sample(levels - 1, &widest);
        if (greyWhereOpaque && widest.alpha == kOpaque) {
            addGrey();
            return;
        }
        present[levels - 1] = Occluder(widest, shader, &occluders[levels - 1]);
        for (int32_t level = 0; level + 1 < levels; ++level) {
            P texel;
            sample(level, &texel);
            present[level] = Occluder(texel, shader, &occluders[level]);
        }
        for (int32_t level = 0; level < levels; ++level) {
            if (!present[level]) continue;
            bool likeBefore = level > 0 && present[level - 1] &&
                              SameLight(occluders[level - 1], occluders[level]);
            bool likeAfter =
                level + 1 == levels ||
                (present[level + 1] && SameLight(occluders[level + 1], occluders[level]));
            if (likeBefore && likeAfter) continue;
            array->AddShadowFragment(&occluders[level], shader.DepthKey(depth->w, level), 0.0f,
                                     shader.layerId, heads + i, thread);
        }
    };
    // Texels beyond the reach are stepped over rather than cut off by moving the span's start,
    // so the state arrives at each texel drawn exactly as it would across the whole span.
    const SY_ShadowReach::Run whole{x, x + count};
    const SY_ShadowReach::Run* run = shader.reach ? shader.reach->RowBegin(y) : &whole;
    const SY_ShadowReach::Run* lastRun = shader.reach ? shader.reach->RowEnd(y) : &whole + 1;
    int32_t i = 0;
    for (; run < lastRun; ++run) {
        const int32_t begin = std::clamp(run->begin - x, i, count);
        const int32_t end = std::clamp(run->end - x, begin, count);
        for (; i < begin; ++i)
            state.Step();
        for (; i < end; ++i, state.Step())
            drawTexel(i);
    }
}

template <class P, class State>
void DrawWithState(const SY_ScreenGeometry& geometry, const SY_ShadowShader& shader, State& state,
                   int32_t x, int32_t count, int32_t y, SY_ShadowFragmentArray* array,
                   int32_t thread) {
    if (!shader.soft) {
        bool filtered = state.texture.samplingFilter != SY_SamplingFilter::kNearest;
        DrawSpan<P>(
            shader, state, x, count, y, array, thread,
            [&](int32_t, P* out) {
                if (filtered)
                    SY_SampleFiltered(state, out);
                else
                    SY_SampleNearest(state, out);
            },
            [] { return false; });
        return;
    }
    const SY_CasterSums& casterSums = geometry.casterSums;
    // A layer that passes no colour shadows by its alpha alone.
    OpaqueBoxes<P> boxes;
    OpaqueBoxes<P>* opaque = shader.transmission == 0 && casterSums.opaque ? &boxes : nullptr;
    // The box reaches the level's radius, and at least the texel's own footprint.
    auto scale = [&](int32_t level) { return 2.0f * std::max(0.5f, shader.radius[level]); };
    auto draw = [&](const auto& sums) {
        // Copies, as the records written between the tests might alias them.
        const float widest = scale(shader.levelCount - 1);
        const int32_t width = sums.Width(), height = sums.Height();
        DrawSpan<P>(
            shader, state, x, count, y, array, thread,
            [&](int32_t level, P* out) { SampleBlurred(sums, state, scale(level), opaque, out); },
            [&state, opaque, widest, width, height] {
                return opaque && DeepBlurred(width, height, state, widest);
            });
    };
    if (const PF_SummedAreaTable* table = casterSums.table) {
        if (table->HasDoubleSums())
            draw(TableSums(*table, table->DoubleSums()));
        else
            draw(TableSums(*table, table->FloatSums()));
    } else if (casterSums.doubleFullAlpha) {
        draw(FullAlphaSums(*casterSums.doubleFullAlpha));
    } else {
        draw(FullAlphaSums(*casterSums.floatFullAlpha));
    }
}

template <class P>
void DrawAtDepth(const SY_ScreenGeometry& geometry, const SY_ShadowShader& shader, int32_t x,
                 int32_t count, int32_t y, SY_ShadowFragmentArray* array, int32_t thread) {
    SY_WithSpanState<P>(geometry, x, y, [&](auto& state) {
        DrawWithState<P>(geometry, shader, state, x, count, y, array, thread);
    });
}

}  // namespace

SY_ShadowShader::SY_ShadowShader(const SY_Material& material, double diffusionTexels,
                                 bool perspectiveMap)
    : layerId(SY_ShadowLayerId(material.renderIndex)),
      opacity(ToFixed(material.opacity)),
      transmission(ToFixed(material.lightTransmission)),
      diffusion(diffusionTexels),
      soft(diffusionTexels > 0),
      perspective(perspectiveMap) {
    if (!soft) return;
    // A sharp level where the shadow meets its caster, then the blurrier ones behind it.
    levelCount = 1;
    const double d = diffusion;
    for (float r : kLevelRadii) {
        if (!(r < 0.9 * d)) break;
        radius[levelCount] = r;
        ratio[levelCount] = static_cast<float>(r / (d - r));
        ++levelCount;
    }
    float last = static_cast<float>(0.9 * d);
    float previous = radius[levelCount - 1];
    if (std::fabs(last - previous) > std::max(1e-6f * last, 563.0f / (1 << 20))) {
        radius[levelCount] = last;
        ratio[levelCount] = 9.0f;
        ++levelCount;
    }
}

int32_t SY_ShadowShader::ShadowBlurRadius() const {
    return static_cast<int32_t>(std::ceil(diffusion));
}

void SY_RenderShadowSpan(const SY_ScreenGeometry& geometry, const SY_ShadowShader& shader,
                         int32_t x, int32_t count, int32_t y, SY_ShadowFragmentArray* array,
                         int32_t thread) {
    if (count <= 0) return;
    PF_DispatchBitDepth(
        geometry.texture->GetBitDepth(),
        [&]<class P>() { DrawAtDepth<P>(geometry, shader, x, count, y, array, thread); },
        U_BitDepthVerification("Unexpected bitdepth in SY_RenderLayerSpan_SwitchDepth()"));
}
