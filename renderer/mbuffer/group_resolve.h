// The resolve shared by the buffers that split pixels: each list is taken group by group of
// records whose depth ranges overlap; inside a group, runs of records that really cross are
// found, a pair is mixed by the share in which the later one is in front, and longer runs go
// to the buffer's own run resolve.
//
// Geometry<F> says where records meet: static Cross(a, b) and ShareInFront(a, b) (the share in
// which b is in front of a, or kSY_NoCrossing), and a member ResolveRun(run, count, tables,
// pixel) for runs of three or more records in list order.
#pragma once

#include <cmath>
#include <cstdint>

#include "m_matrix.h"
#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/mbuffer/depth_groups.h"
#include "renderer/mbuffer/pair_mix.h"
#include "renderer/mbuffer/pixel_split.h"
#include "renderer/mbuffer/record_apply.h"
#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/fetchers.h"

// Resolves the pixels of one buffer, one after another, keeping what splitting them needs.
template <class F, class Geometry>
class SY_GroupResolver {
public:
    using P = typename F::Pixel;

    // Takes the room most groups need up front: one allocation besides the geometry's.
    explicit SY_GroupResolver(const PF_LinearBlendingTables* tables)
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
        const float f = Geometry::ShareInFront(a, b);
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
            int32_t end = FirstCrossing(i, n);
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
                geometry_.ResolveRun(&members_[i], end - i, tables_, pixel);
            i = end;
        }
        if (n - i == 2) ResolvePair(*members_[i], *members_[i + 1], pixel);
        if (n - i == 1) applier_.Apply(*members_[i], pixel);
    }

    // The depth beyond which a record lies wholly in front of r: Extent widened by far more than
    // its float rounding, so that a record starting beyond it never crosses r by Cross's test.
    static double Reach(const F& r) {
        const double extent = r.Extent();
        return extent + 1e-6 * (std::fabs(double(r.depth)) + std::fabs(extent));
    }

    // The first member after member i that crosses it, or n. Members ascend in depth, so once
    // one starts beyond i's reach, so does every later one.
    int32_t FirstCrossing(int32_t i, int32_t n) const {
        const F& r = *members_[i];
        const double reach = Reach(r);
        for (int32_t k = i + 1; k < n && !(members_[k]->depth > reach); ++k) {
            if (Geometry::Cross(r, *members_[k])) return k;
        }
        return n;
    }

    // Whether member u crosses any member from first up to the one before it.
    bool CrossesRun(int32_t first, int32_t u) const {
        const F& s = *members_[u];
        for (int32_t k = first; k < u; ++k) {
            if (!(s.depth > Reach(*members_[k])) && Geometry::Cross(*members_[k], s)) return true;
        }
        return false;
    }

    const PF_LinearBlendingTables* tables_;
    SY_RecordApplier<P> applier_;
    SY_AccountedVector<F*> members_;
    Geometry geometry_;
};

// The resolve of a splitting buffer: every list of `lists` (an SY_FragmentArray) put in depth
// order and resolved onto its pixel of destination, a world of the lists' pixel type.
template <class Geometry, class Lists>
void SY_ResolveSplitting(Lists& lists, SY_ProgressAbort* progress,
                         const PF_LinearBlendingTables* tables, PF_World& destination) {
    using F = typename Lists::Record;
    using P = typename F::Pixel;
    SY_GroupResolver<F, Geometry> resolver(tables);
    const M_LRect& bounds = lists.Bounds();
    const int32_t count = bounds.right - bounds.left;
    SY_WalkRows(bounds, kSY_SplitProgressCadence, progress, [&](int32_t y) {
        F** rowHeads = lists.HeadAt(bounds.left, y);
        P* pixels = destination.PixelAt<P>(bounds.left, y);
        for (int32_t i = 0; i < count; ++i) {
            if (!rowHeads[i]) continue;
            Lists::Order(&rowHeads[i]);
            resolver.Resolve(rowHeads[i], &pixels[i]);
        }
    });
}
