// Runs of three or more records that cross one another inside a pixel: the pixel square is cut
// into convex regions, each showing its own front-to-back list of records, and the regions are
// composited one by one and added by area.
#pragma once

#include <algorithm>
#include <cstdint>

#include "pf_xfer.h"
#include "renderer/mbuffer/pixel_split.h"
#include "renderer/mbuffer/region_writeback.h"
#include "renderer/scene/accounted_allocator.h"

// Reused from run to run of one resolve, so that its storage is taken only while a pixel needs
// more than any pixel before it. Throws 4 when that memory is not there.
template <class F>
class SY_RegionResolver {
public:
    using Pixel = typename F::Pixel;

    // Room for runs of a few records, taken once: seven allocations.
    SY_RegionResolver() {
        vertices_.reserve(64);
        front_.reserve(16);
        behind_.reserve(16);
        positions_.reserve(64);
        regions_.reserve(16);
        frontToBack_.reserve(16);
        lines_.reserve(8);
    }

    // Composites the run (count ≥ 3 records in list order) onto *pixel, passing tables. Writes
    // each record's position in the run into its scratchIndex.
    void Resolve(F* const* run, int32_t count, const PF_LinearBlendingTables* tables,
                 Pixel* pixel) {
        Split(run, count, [](const F& r) { return SY_PlaneOf(r); });
        SY_RegionAccumulator<Pixel> sum(*pixel, tables);
        AddRegionsTo(&sum);
        sum.WriteTo(pixel);
    }

    // Cuts the pixel into regions for the run with each record's plane given by
    // planeOf(record), an SY_DepthPlane. Writes each record's position into its scratchIndex.
    // The run must stay in place until AddRegionsTo.
    template <class PlaneOf>
    void Split(F* const* run, int32_t count, PlaneOf&& planeOf) {
        run_ = run;
        count_ = count;
        vertices_.clear();
        positions_.clear();
        regions_.clear();
        for (int32_t i = 0; i < count; ++i)
            run[i]->scratchIndex = static_cast<uint16_t>(i);
        constexpr SY_SplitPoint kSquare[4] = {{0, 0}, {0, 1}, {1, 1}, {1, 0}};
        vertices_.assign(kSquare, kSquare + 4);
        regions_.push_back({0, 4, NewSlot(), 1, {0, 0}, {1, 1}});
        positions_[0] = 0;
        for (int32_t r = 1; r < count; ++r)
            Add(*run[r], planeOf);
    }

    // Each region of the last Split, weighted by its area.
    void AddRegionsTo(SY_RegionAccumulator<Pixel>* sum) {
        for (const Region& region : regions_) {
            frontToBack_.clear();
            for (int32_t i = 0; i < region.recordCount; ++i)
                frontToBack_.push_back(run_[positions_[region.firstRecord + i]]);
            sum->AddRegion(SY_PolygonArea(&vertices_[region.firstVertex], region.vertexCount),
                           frontToBack_.data(), region.recordCount);
        }
    }

private:
    // A convex piece of the square, a range of the shared vertex store, and the records seen
    // there, front first, by their positions in the run. Each region's list has a slot of its
    // own, room for the whole run, so that a record goes into it in place; only a region cut
    // off takes a copy. Both stores only grow during a run.
    struct Region {
        int32_t firstVertex, vertexCount;
        int32_t firstRecord, recordCount;
        SY_SplitPoint low, high;  // the box around the vertices, for a quick test
    };
    struct CachedLine {
        double line[3];
        bool known;
    };

    // Puts record r into every region, in front of the first record it is wholly in front of
    // there; where it is in front of a record in only part of a region, that part becomes a
    // region of its own.
    template <class PlaneOf>
    void Add(const F& r, PlaneOf& planeOf) {
        const SY_DepthPlane plane = planeOf(r);
        lines_.assign(r.scratchIndex, CachedLine{{0, 0, 0}, false});
        const auto regionCount = static_cast<int32_t>(regions_.size());
        for (int32_t g = 0; g < regionCount; ++g) {
            Region region = regions_[g];
            int32_t at = 0;  // where r goes in the list
            for (; at < region.recordCount; ++at) {
                const double* line = LineOf(plane, positions_[region.firstRecord + at], planeOf);
                // Most records are wholly in front of r over the region, as a corner of its box
                // shows; the vertices are looked at only near where r goes, and only a region
                // r cuts is copied.
                if (SY_BoxBehindLine(region.low, region.high, line)) continue;
                const SY_LineSide side =
                    SY_SideOfLine(&vertices_[region.firstVertex], region.vertexCount, line);
                if (side == SY_LineSide::kBehind) continue;
                if (side == SY_LineSide::kFront) break;
                front_.clear();
                behind_.clear();
                SY_SplitPolygon(&vertices_[region.firstVertex], region.vertexCount, line, &front_,
                                &behind_);
                Region part = Stored(front_, NewSlot());
                CopyWith(region, at, r, &part);
                regions_.push_back(part);
                region = Stored(behind_, region.firstRecord, region.recordCount);
            }
            // Behind an opaque record r is hidden here.
            if (at == 0 || !run_[positions_[region.firstRecord + at - 1]]->opaque) {
                uint16_t* list = &positions_[region.firstRecord];
                const int32_t kept = r.opaque ? at : region.recordCount;
                std::copy_backward(list + at, list + kept, list + kept + 1);
                list[at] = r.scratchIndex;
                region.recordCount = kept + 1;
            }
            regions_[g] = region;
        }
        // Each new region goes to the front of the list, the last one made first.
        std::reverse(regions_.begin() + regionCount, regions_.end());
        std::rotate(regions_.begin(), regions_.begin() + regionCount, regions_.end());
    }

    // a·u + b·v + c = zR − zS over the square for S at `position` in the run; a record wholly
    // in front of S (level with it counting as in front, as later records of equal key are) or
    // wholly behind it gives a line that leaves the whole region on one side.
    template <class PlaneOf>
    const double* LineOf(const SY_DepthPlane& plane, uint16_t position, PlaneOf& planeOf) {
        CachedLine& cached = lines_[position];
        if (!cached.known) {
            const SY_DepthPlane other = planeOf(*run_[position]);
            const SY_CornerDifferences d = SY_DifferenceAtCorners(other, plane);
            const double lowest = std::min({d.e[0], d.e[1], d.e[2], d.e[3]});
            const double highest = std::max({d.e[0], d.e[1], d.e[2], d.e[3]});
            if (lowest >= 0)
                cached = {{0, 0, 1}, true};
            else if (highest <= 0)
                cached = {{0, 0, -1}, true};
            else
                cached = {{plane.dzdx - other.dzdx, plane.dzdy - other.dzdy, d.e[0]}, true};
        }
        return cached.line;
    }

    // A region of the polygon showing the list at firstRecord.
    Region Stored(const SY_AccountedVector<SY_SplitPoint>& polygon, int32_t firstRecord,
                  int32_t recordCount = 0) {
        Region region{static_cast<int32_t>(vertices_.size()),
                      static_cast<int32_t>(polygon.size()),
                      firstRecord,
                      recordCount,
                      polygon[0],
                      polygon[0]};
        for (const SY_SplitPoint& p : polygon) {
            region.low = {std::min(region.low.u, p.u), std::min(region.low.v, p.v)};
            region.high = {std::max(region.high.u, p.u), std::max(region.high.v, p.v)};
        }
        vertices_.insert(vertices_.end(), polygon.begin(), polygon.end());
        return region;
    }

    // Room for a list of the whole run; its first index.
    int32_t NewSlot() {
        const auto first = static_cast<int32_t>(positions_.size());
        positions_.resize(positions_.size() + static_cast<size_t>(count_));
        return first;
    }

    // Gives *to the list of `from` with r put before its record `at`, without the records
    // behind r when r is opaque.
    void CopyWith(const Region& from, int32_t at, const F& r, Region* to) {
        const uint16_t* list = &positions_[from.firstRecord];
        uint16_t* copy = &positions_[to->firstRecord];
        std::copy(list, list + at, copy);
        copy[at] = r.scratchIndex;
        const int32_t kept = r.opaque ? at : from.recordCount;
        std::copy(list + at, list + kept, copy + at + 1);
        to->recordCount = kept + 1;
    }

    SY_AccountedVector<SY_SplitPoint> vertices_, front_, behind_;
    SY_AccountedVector<uint16_t> positions_;  // the regions' lists, a slot of count_ each
    // New regions are made at the end of the list and then moved to its front.
    SY_AccountedVector<Region> regions_;
    SY_AccountedVector<const F*> frontToBack_;  // one region's records, to composite them
    SY_AccountedVector<CachedLine> lines_;      // by the earlier record's position
    F* const* run_ = nullptr;
    int32_t count_ = 0;
};
