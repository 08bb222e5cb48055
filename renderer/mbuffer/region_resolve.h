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
        nodes_.reserve(64);
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
    template <class PlaneOf>
    void Split(F* const* run, int32_t count, PlaneOf&& planeOf) {
        vertices_.clear();
        nodes_.clear();
        regions_.clear();
        for (int32_t i = 0; i < count; ++i)
            run[i]->scratchIndex = static_cast<uint16_t>(i);
        constexpr SY_SplitPoint kSquare[4] = {{0, 0}, {0, 1}, {1, 1}, {1, 0}};
        vertices_.assign(kSquare, kSquare + 4);
        nodes_.push_back({run[0], kEnd});
        regions_.push_back({0, 4, 0});
        for (int32_t r = 1; r < count; ++r)
            Add(*run[r], planeOf);
    }

    // Each region of the last Split, weighted by its area.
    void AddRegionsTo(SY_RegionAccumulator<Pixel>* sum) {
        for (const Region& region : regions_) {
            frontToBack_.clear();
            for (int32_t n = region.firstNode; n != kEnd; n = nodes_[n].next)
                frontToBack_.push_back(nodes_[n].record);
            sum->AddRegion(SY_PolygonArea(&vertices_[region.firstVertex], region.vertexCount),
                           frontToBack_.data(), static_cast<int32_t>(frontToBack_.size()));
        }
    }

private:
    // A record seen in a region and the index of the one behind it, or kEnd.
    struct Node {
        const F* record;
        int32_t next;
    };
    static constexpr int32_t kEnd = -1;
    // A convex piece of the square, a range of the shared vertex store, and the list of the
    // records seen there, front first. A record goes into a list in place; only a region cut
    // off takes a copy. Both stores only grow during a run.
    struct Region {
        int32_t firstVertex, vertexCount;
        int32_t firstNode;
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
            // r goes between before and at.
            int32_t before = kEnd, at = region.firstNode;
            for (; at != kEnd; before = at, at = nodes_[at].next) {
                const double* line = LineOf(plane, *nodes_[at].record, planeOf);
                // Most records leave the region whole: only a region r cuts is copied.
                const SY_LineSide side =
                    SY_SideOfLine(&vertices_[region.firstVertex], region.vertexCount, line);
                if (side == SY_LineSide::kBehind) continue;
                if (side == SY_LineSide::kFront) break;
                front_.clear();
                behind_.clear();
                SY_SplitPolygon(&vertices_[region.firstVertex], region.vertexCount, line, &front_,
                                &behind_);
                Region part = Stored(front_);
                part.firstNode = CopyWith(region.firstNode, at, r);
                regions_.push_back(part);
                const Region rest = Stored(behind_);
                region.firstVertex = rest.firstVertex;
                region.vertexCount = rest.vertexCount;
            }
            // Behind an opaque record r is hidden here.
            if (before == kEnd || !nodes_[before].record->opaque) {
                const auto node = static_cast<int32_t>(nodes_.size());
                nodes_.push_back({&r, r.opaque ? kEnd : at});
                (before == kEnd ? region.firstNode : nodes_[before].next) = node;
            }
            regions_[g] = region;
        }
        // Each new region goes to the front of the list, the last one made first.
        std::reverse(regions_.begin() + regionCount, regions_.end());
        std::rotate(regions_.begin(), regions_.begin() + regionCount, regions_.end());
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
        return {first, static_cast<int32_t>(polygon.size()), kEnd};
    }

    // A copy of the list from node first with r put before node at, without the records behind
    // r when r is opaque; its first node.
    int32_t CopyWith(int32_t first, int32_t at, const F& r) {
        const auto copy = static_cast<int32_t>(nodes_.size());
        auto append = [this](const F* record) {
            nodes_.push_back({record, static_cast<int32_t>(nodes_.size()) + 1});
        };
        for (int32_t n = first; n != at; n = nodes_[n].next)
            append(nodes_[n].record);
        append(&r);
        if (!r.opaque) {
            for (int32_t n = at; n != kEnd; n = nodes_[n].next)
                append(nodes_[n].record);
        }
        nodes_.back().next = kEnd;
        return copy;
    }

    SY_AccountedVector<SY_SplitPoint> vertices_, front_, behind_;
    SY_AccountedVector<Node> nodes_;
    // New regions are made at the end of the list and then moved to its front.
    SY_AccountedVector<Region> regions_;
    SY_AccountedVector<const F*> frontToBack_;  // one region's records, to composite them
    SY_AccountedVector<CachedLine> lines_;      // by the earlier record's scratchIndex
};
