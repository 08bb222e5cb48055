#include <cstdint>

#include "renderer/mbuffer/depth_groups.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/mbuffer/pair_mix.h"
#include "renderer/mbuffer/pixel_split.h"
#include "renderer/mbuffer/record_apply.h"
#include "renderer/mbuffer/region_resolve.h"

namespace {

template <class F>
bool Cross(const F& a, const F& b) {
    return SY_CrossInside(SY_DifferenceAtCorners(SY_PlaneOf(a), SY_PlaneOf(b)));
}

// Resolves the pixels of one buffer, one after another, keeping what splitting them needs.
template <class F>
class PixelResolver {
public:
    using P = typename F::Pixel;

    // Takes the room most groups need up front: eight allocations.
    explicit PixelResolver(const PF_LinearBlendingTables* tables)
        : tables_(tables), applier_(tables) {
        members_.reserve(8);
    }

    // Blends the list from first (the farthest record) on, group by group of records whose
    // depth ranges overlap.
    void Resolve(F* first, P* pixel) {
        while (first) {
            const SY_DepthGroup<F> group = SY_NextDepthGroup(first);
            if (group.count == 1)
                applier_.Apply(*first, pixel);
            else if (group.count == 2)
                ResolvePair(*first, *first->next, pixel);
            else
                ResolveGroup(group, pixel);
            first = group.after;
        }
    }

private:
    // b later in the list: in front of a, or sharing the pixel with it where the two cross.
    void ResolvePair(const F& a, const F& b, P* pixel) {
        const float f = SY_ShareInFront(SY_DifferenceAtCorners(SY_PlaneOf(a), SY_PlaneOf(b)));
        if (f == kSY_NoCrossing) {
            applier_.Apply(a, pixel);
            applier_.Apply(b, pixel);
            return;
        }
        SY_MixTwoRecords(a, b, f, tables_, pixel);
    }

    // Cuts the group into runs of records that cross one another: a record that crosses none
    // of the later ones is blended alone; a run reaches from it to the first record it crosses
    // and on while the next record crosses any record of the run.
    void ResolveGroup(const SY_DepthGroup<F>& group, P* pixel) {
        members_.clear();
        for (F* r = group.first; r != group.after; r = r->next)
            members_.push_back(r);
        const auto n = static_cast<int32_t>(members_.size());
        int32_t i = 0;
        while (n - i > 2) {
            const F& r = *members_[i];
            int32_t end = i + 1;
            while (end < n && !Cross(r, *members_[end]))
                ++end;
            if (end == n) {
                applier_.Apply(r, pixel);
                ++i;
                continue;
            }
            for (++end; end < n && CrossesRun(i, end); ++end) {
            }
            if (end - i == 2)
                ResolvePair(r, *members_[i + 1], pixel);
            else
                regions_.Resolve(&members_[i], end - i, tables_, pixel);
            i = end;
        }
        if (n - i == 2) ResolvePair(*members_[i], *members_[i + 1], pixel);
        if (n - i == 1) applier_.Apply(*members_[i], pixel);
    }

    // Whether member u crosses any member from first up to the one before it.
    bool CrossesRun(int32_t first, int32_t u) const {
        for (int32_t k = first; k < u; ++k) {
            if (Cross(*members_[k], *members_[u])) return true;
        }
        return false;
    }

    const PF_LinearBlendingTables* tables_;
    SY_RecordApplier<P> applier_;
    SY_AccountedVector<F*> members_;
    SY_RegionResolver<F> regions_;
};

}  // namespace

template <class P>
void SY_MBufferAAX<P>::Resolve(SY_ProgressAbort* progress,
                               const PF_LinearBlendingTables* blendTables, PF_World& destination) {
    PixelResolver<Record> resolver(blendTables);
    const int32_t left = this->bounds.left;
    const int32_t count = this->width;
    SY_WalkRows(this->bounds, kSY_SplitProgressCadence, progress, [&](int32_t y) {
        Record** rowHeads = this->HeadAt(left, y);
        P* pixels = destination.PixelAt<P>(left, y);
        for (int32_t i = 0; i < count; ++i) {
            if (!rowHeads[i]) continue;
            this->Order(&rowHeads[i]);
            resolver.Resolve(rowHeads[i], &pixels[i]);
        }
    });
}

template class SY_MBufferAAX<PF_Pixel8>;
template class SY_MBufferAAX<PF_Pixel16>;
template class SY_MBufferAAX<PF_PixelFloat>;
