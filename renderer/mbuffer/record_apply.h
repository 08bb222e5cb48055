// The first steps every resolve shares: walking the buffer's rows with progress reports, and
// blending one record onto a pixel with its transfer mode.
#pragma once

#include <cstdint>

#include "m_matrix.h"
#include "pf_xfer.h"
#include "renderer/scene/fetchers.h"

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
