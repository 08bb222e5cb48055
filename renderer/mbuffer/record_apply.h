// The first steps every resolve shares: walking the buffer's rows with progress reports, and
// blending one record onto a pixel with its transfer mode.
#pragma once

#include <algorithm>
#include <cstdint>

#include "m_matrix.h"
#include "pf_xfer.h"
#include "renderer/scene/fetchers.h"

// The mode of a layer that shows only the shadows on it, a number no host transfer mode takes
// (SY_CatchShadow blends it).
inline constexpr uint8_t kSY_ShadowCatchMode = 127;

// Blends a pixel of a layer that shows only the shadows on it (its colour is the light the
// shadows leave, white where none falls) onto pixel at opacity 0..1. It multiplies what lies
// beneath as though that were opaque; where that is transparent, or partly so, the shadow adds
// its darkness as black, so that it still shows over whatever is put under the frame later.
// Where no shadow falls the pixel stays as it was, and the layer never adds white.
template <class P>
void SY_CatchShadow(const P& color, float opacity, P* pixel) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    constexpr float kRound = PF_PixelTraits<P>::kIsFloat ? 0.0f : 0.5f;
    const float as = color.alpha / kMax * opacity;
    const float light[3] = {color.red / kMax, color.green / kMax, color.blue / kMax};
    const float beneath = pixel->alpha / kMax;
    const float dark = as * (1.0f - (light[0] + light[1] + light[2]) / 3.0f);
    const float alpha = beneath + (1.0f - beneath) * dark;
    if (!(alpha > 0.0f)) {
        *pixel = P{};
        return;
    }
    C* channels[3] = {&pixel->red, &pixel->green, &pixel->blue};
    for (int c = 0; c < 3; ++c) {
        float v = *channels[c] * (1.0f - as * (1.0f - light[c])) * (beneath / alpha);
        *channels[c] = static_cast<C>(std::clamp(v, 0.0f, kMax) + kRound);
    }
    pixel->alpha = static_cast<C>(std::clamp(alpha * kMax, 0.0f, kMax) + kRound);
}

// Blends records onto pixels with the host's transfer functions, passing `tables` (null:
// blend the stored values). The function of the last mode seen is kept, since neighbouring
// records mostly share a mode.
template <class P>
class SY_RecordApplier {
public:
    explicit SY_RecordApplier(const PF_LinearBlendingTables* tables) : tables_(tables) {}

    // Mode bits 0-6 choose the blend; with bit 7 the pixel's alpha comes through unchanged.
    void Apply(const P& color, uint8_t mode, P* pixel) {
        const int32_t number = mode & 127;
        if (number == kSY_ShadowCatchMode) {
            // The record's alpha holds its coverage already.
            SY_CatchShadow(color, 1.0f, pixel);
            return;
        }
        if (number != number_) {
            number_ = number;
            xfer_ = PF_Get_Xfer1<P>(number);
        }
        if (mode & 128) {
            const auto alpha = pixel->alpha;
            xfer_(&color, tables_, pixel);
            pixel->alpha = alpha;
        } else {
            xfer_(&color, tables_, pixel);
        }
    }

    template <class F>
    void Apply(const F& record, P* pixel) {
        Apply(record.color, record.mode, pixel);
    }

private:
    const PF_LinearBlendingTables* tables_;
    int32_t number_ = -1;
    PF_Xfer1Func<P> xfer_ = nullptr;
};

// Rows of a resolve cadence: draft buffers report progress every 32 rows, the buffers that
// split pixels every 8.
inline constexpr int32_t kSY_DraftProgressCadence = 32;
inline constexpr int32_t kSY_SplitProgressCadence = 8;

// Calls resolveRow(y) for every row of bounds, top to bottom. Before a row whose number is a
// multiple of the cadence, reports (y − top, bottom − top) to progress when there is one; a
// cancel thrown from the report ends the walk.
template <class ResolveRow>
void SY_WalkRows(const M_LRect& bounds, int32_t cadence, SY_ProgressAbort* progress,
                 ResolveRow&& resolveRow) {
    const int32_t rows = bounds.bottom - bounds.top;
    for (int32_t y = bounds.top; y < bounds.bottom; ++y) {
        if (progress && y % cadence == 0) progress->ReportRows(y - bounds.top, rows);
        resolveRow(y);
    }
}
