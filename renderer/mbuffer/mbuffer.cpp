#include "renderer/mbuffer/mbuffer.h"

#include <new>

#include "pf_bit_depth.h"
#include "renderer/mbuffer/record_apply.h"
#include "u_memory.h"
#include "u_report.h"

namespace {

template <class P>
SY_MBuffer* NewOfQuality(SY_MBufferQuality quality, const M_LRect& bounds) {
    switch (quality) {
        case SY_MBufferQuality::kAntialiased:
            return new SY_MBufferAAX<P>(bounds);
        case SY_MBufferQuality::kMotionBlur:
            return new SY_MBufferMBX<P>(bounds);
        case SY_MBufferQuality::kDraft:
            return new SY_MBufferDraftX<P>(bounds);
    }
    __builtin_unreachable();
}

}  // namespace

SY_MBufferQuality SY_MBufferQualityFor(bool antialias, bool motionBlur) {
    if (motionBlur) return SY_MBufferQuality::kMotionBlur;
    if (antialias) return SY_MBufferQuality::kAntialiased;
    return SY_MBufferQuality::kDraft;
}

std::unique_ptr<SY_MBuffer> SY_MBuffer::New(const M_LRect& bounds, int16_t bitDepth, bool antialias,
                                            bool motionBlur) {
    const SY_MBufferQuality quality = SY_MBufferQualityFor(antialias, motionBlur);
    return PF_DispatchBitDepth(
        bitDepth,
        [&]<class P>() {
            try {
                return std::unique_ptr<SY_MBuffer>(NewOfQuality<P>(quality, bounds));
            } catch (const std::bad_alloc&) {
                throw kU_ErrOutOfMemory;  // the object itself could not be had
            }
        },
        U_BitDepthVerification("Unexpected bitdepth in SY_MBuffer::New()"));
}

template <class P>
void SY_MBufferDraftX<P>::Resolve(SY_ProgressAbort* progress, const PF_LinearBlendingTables*,
                                  PF_World& destination) {
    SY_RecordApplier<P> applier(nullptr);
    const int32_t left = this->bounds.left;
    const int32_t count = this->width;
    SY_WalkRows(this->bounds, kSY_DraftProgressCadence, progress, [&](int32_t y) {
        Record** rowHeads = this->HeadAt(left, y);
        P* pixels = destination.PixelAt<P>(left, y);
        for (int32_t i = 0; i < count; ++i) {
            this->VisitInOrder(&rowHeads[i],
                               [&](const Record& record) { applier.Apply(record, &pixels[i]); });
        }
    });
}

template class SY_MBufferDraftX<PF_Pixel8>;
template class SY_MBufferDraftX<PF_Pixel16>;
template class SY_MBufferDraftX<PF_PixelFloat>;
