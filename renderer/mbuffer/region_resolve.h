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
        records_.reserve(64);
        regions_.reserve(16);
        fresh_.reserve(16);
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
    template <class PlaneOf>
    void Split(F* const* run, int32_t count, PlaneOf&& planeOf) {
        vertices_.clear();
        records_.clear();
        regions_.clear();
        for (int32_t i = 0; i < count; ++i)
            run[i]->scratchIndex = static_cast<uint16_t>(i);
        constexpr SY_SplitPoint kSquare[4] = {{0, 0}, {0, 1}, {1, 1}, {1, 0}};
        vertices_.assign(kSquare, kSquare + 4);
        records_.push_back(run[0]);
        regions_.push_back({0, 4, 0, 1});
        for (int32_t r = 1; r < count; ++r)
            Add(*run[r], planeOf);
    }

    // Each region of the last Split, weighted by its area.
    void AddRegionsTo(SY_RegionAccumulator<Pixel>* sum) const {
        for (const Region& region : regions_) {
            sum->AddRegion(SY_PolygonArea(&vertices_[region.firstVertex], region.vertexCount),
                           &records_[region.firstRecord], region.recordCount);
        }
    }

private:
    // A convex piece of the square and the records seen there, front first. Both are ranges of
    // the shared stores, which only grow during a run.
    struct Region {
        int32_t firstVertex, vertexCount;
        int32_t firstRecord, recordCount;
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
        fresh_.clear();
        const auto regionCount = static_cast<int32_t>(regions_.size());
        for (int32_t g = 0; g < regionCount; ++g) {
            Region region = regions_[g];
            int32_t at = region.recordCount;  // where r goes in the list
            for (int32_t s = 0; s < region.recordCount; ++s) {
                const double* line = LineOf(plane, *records_[region.firstRecord + s], planeOf);
                front_.clear();
                behind_.clear();
                SY_SplitPolygon(&vertices_[region.firstVertex], region.vertexCount, line, &front_,
                                &behind_);
                if (front_.empty()) continue;
                if (behind_.empty()) {
                    at = s;
                    break;
                }
                Region part = Stored(front_);
                Insert(region, s, r, &part);
                fresh_.push_back(part);
                const Region rest = Stored(behind_);
                region.firstVertex = rest.firstVertex;
                region.vertexCount = rest.vertexCount;
            }
            // Behind an opaque record r is hidden here.
            if (at == 0 || !records_[region.firstRecord + at - 1]->opaque)
                Insert(region, at, r, &region);
            regions_[g] = region;
        }
        // Each new region goes to the front of the list, the last one made first.
        regions_.insert(regions_.begin(), fresh_.rbegin(), fresh_.rend());
    }

    // a·u + b·v + c = zR − zS over the square; a record wholly in front of S (level with it
    // counting as in front, as later records of equal key are) or wholly behind it gives a
    // line that leaves the whole region on one side.
    template <class PlaneOf>
    const double* LineOf(const SY_DepthPlane& plane, const F& s, PlaneOf& planeOf) {
        CachedLine& cached = lines_[s.scratchIndex];
        if (!cached.known) {
            const SY_DepthPlane other = planeOf(s);
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

    // A region of the polygon, its records still to be set.
    Region Stored(const SY_AccountedVector<SY_SplitPoint>& polygon) {
        const auto first = static_cast<int32_t>(vertices_.size());
        vertices_.insert(vertices_.end(), polygon.begin(), polygon.end());
        return {first, static_cast<int32_t>(polygon.size()), 0, 0};
    }

    // Gives *to the list of `from` with r put before its record `at`, without the records
    // behind r when r is opaque.
    void Insert(const Region& from, int32_t at, const F& r, Region* to) {
        const auto first = static_cast<int32_t>(records_.size());
        const int32_t end = r.opaque ? at : from.recordCount;
        for (int32_t i = 0; i < end; ++i) {
            if (i == at) records_.push_back(&r);
            const F* kept = records_[from.firstRecord + i];
            records_.push_back(kept);
        }
        if (end == at) records_.push_back(&r);
        to->firstRecord = first;
        to->recordCount = static_cast<int32_t>(records_.size()) - first;
    }

    SY_AccountedVector<SY_SplitPoint> vertices_, front_, behind_;
    SY_AccountedVector<const F*> records_;
    SY_AccountedVector<Region> regions_, fresh_;
    SY_AccountedVector<CachedLine> lines_;  // by the earlier record's scratchIndex
};
