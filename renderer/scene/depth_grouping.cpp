#include "renderer/scene/depth_grouping.h"

#include <algorithm>
#include <cmath>

namespace {

// Depths closer than this count as level, so both draw orders hold there.
constexpr double kDepthTolerance = 1e-12;
// A cross product this small puts a point on a line.
constexpr double kLineTolerance = 1e-12;

// Nearness of B minus nearness of A at a screen point: a linear function of x and y.
struct DepthDifference {
    double kx, ky, k0;

    double At(double x, double y) const { return kx * x + ky * y + k0; }
};

DepthDifference MakeDifference(const SY_Subsample& a, const SY_Subsample& b, SY_DepthSense sense) {
    const double* pa = a.plane;
    const double* pb = b.plane;
    double sign = sense == SY_DepthSense::kLargerIsNearer ? 1.0 : -1.0;
    return {sign * (pa[0] / pa[2] - pb[0] / pb[2]), sign * (pa[1] / pa[2] - pb[1] / pb[2]),
            sign * (pa[3] / pa[2] - pb[3] / pb[2])};
}

int Side(double cross) {
    if (cross > kLineTolerance) return 1;
    if (cross < -kLineTolerance) return -1;
    return 0;
}

// Side of p with respect to the line through a and b, as the 2-D cross product.
double Cross(const SY_Vertex& a, const SY_Vertex& b, const SY_Vertex& p) {
    return (b.x - a.x) * (p.y - a.y) - (b.y - a.y) * (p.x - a.x);
}

bool EdgeBoxesMeet(const SY_Vertex& p0, const SY_Vertex& p1, const SY_Vertex& q0,
                   const SY_Vertex& q1) {
    return std::max(std::min(p0.x, p1.x), std::min(q0.x, q1.x)) <=
               std::min(std::max(p0.x, p1.x), std::max(q0.x, q1.x)) &&
           std::max(std::min(p0.y, p1.y), std::min(q0.y, q1.y)) <=
               std::min(std::max(p0.y, p1.y), std::max(q0.y, q1.y));
}

bool WithinSpan(double v, double end0, double end1) {
    return v >= std::min(end0, end1) - kLineTolerance && v <= std::max(end0, end1) + kLineTolerance;
}

// Even-odd rule over the horizontal ray from v toward increasing x.
bool Inside(const SY_Vertex& v, const SY_Polygon& polygon) {
    uint16_t crossings = 0;
    const SY_Vertex* a = &polygon.back();
    for (const SY_Vertex& b : polygon) {
        bool aAtOrBeyond = a->y >= v.y;
        bool bAtOrBeyond = b.y >= v.y;
        if (aAtOrBeyond != bAtOrBeyond) {
            bool aRight = a->x >= v.x;
            bool bRight = b.x >= v.x;
            if (aRight && bRight) {
                ++crossings;
            } else if (aRight || bRight) {
                double x = a->x + (v.y - a->y) * (b.x - a->x) / (b.y - a->y);
                if (x >= v.x) ++crossings;
            }
        }
        a = &b;
    }
    return (crossings & 1) != 0;
}

// Samples the depth difference of two subsample polygons where they meet.
class PolygonComparison {
public:
    PolygonComparison(const SY_Subsample& p, const SY_Subsample& q, SY_DepthSense sense,
                      SY_DrawOrder* order)
        : p_(p.vertices), q_(q.vertices), difference_(MakeDifference(p, q, sense)), order_(order) {}

    void Run() {
        const SY_Vertex* p0 = &p_.back();
        for (const SY_Vertex& p1 : p_) {
            const SY_Vertex* q0 = &q_.back();
            for (const SY_Vertex& q1 : q_) {
                if (EdgeBoxesMeet(*p0, p1, *q0, q1)) {
                    SampleEdges(*p0, p1, *q0, q1);
                    if (Done()) return;
                }
                q0 = &q1;
            }
            p0 = &p1;
        }
        if (SampleInside(p_, q_)) return;
        SampleInside(q_, p_);
    }

private:
    bool Done() const { return order_->aFirst && order_->bFirst; }

    void Sample(double x, double y) {
        double d = difference_.At(x, y);
        if (d > -kDepthTolerance) order_->aFirst = true;
        if (d < kDepthTolerance) order_->bFirst = true;
    }
    void Sample(const SY_Vertex& v) { Sample(v.x, v.y); }

    void SampleEdges(const SY_Vertex& p0, const SY_Vertex& p1, const SY_Vertex& q0,
                     const SY_Vertex& q1) {
        double cp0 = Cross(q0, q1, p0), cp1 = Cross(q0, q1, p1);
        double cq0 = Cross(p0, p1, q0), cq1 = Cross(p0, p1, q1);
        int sp0 = Side(cp0), sp1 = Side(cp1), sq0 = Side(cq0), sq1 = Side(cq1);
        if (sp0 == 0 && sp1 == 0 && sq0 == 0 && sq1 == 0) {
            SampleCollinear(p0, p1, q0, q1);
            return;
        }
        // Both ends strictly on one side of the other edge's line: the edges do not meet.
        if (sp0 * sp1 > 0 || sq0 * sq1 > 0) return;
        // An end on the other edge's line is the point where the edges touch.
        if (sp0 == 0 && sp1 != 0) return Sample(p0);
        if (sp1 == 0 && sp0 != 0) return Sample(p1);
        if (sq0 == 0 && sq1 != 0) return Sample(q0);
        if (sq1 == 0 && sq0 != 0) return Sample(q1);
        // A proper crossing, found along whichever edge straddles the other's line strictly.
        if (sp0 != 0) {
            double t = cp0 / (cp0 - cp1);
            Sample(p0.x + t * (p1.x - p0.x), p0.y + t * (p1.y - p0.y));
        } else {
            double t = cq0 / (cq0 - cq1);
            Sample(q0.x + t * (q1.x - q0.x), q0.y + t * (q1.y - q0.y));
        }
    }

    // Edges on one line: an end of each that lies within the other, along P's longer axis.
    void SampleCollinear(const SY_Vertex& p0, const SY_Vertex& p1, const SY_Vertex& q0,
                         const SY_Vertex& q1) {
        bool alongX = std::fabs(p1.x - p0.x) > std::fabs(p1.y - p0.y);
        auto along = [alongX](const SY_Vertex& v) { return alongX ? v.x : v.y; };
        Sample(WithinSpan(along(p0), along(q0), along(q1)) ? p0 : p1);
        Sample(WithinSpan(along(q0), along(p0), along(p1)) ? q0 : q1);
    }

    // Samples the vertices of inner that lie inside outer; true once both flags are set.
    bool SampleInside(const SY_Polygon& inner, const SY_Polygon& outer) {
        for (const SY_Vertex& v : inner) {
            if (!Inside(v, outer)) continue;
            Sample(v);
            if (Done()) return true;
        }
        return false;
    }

    const SY_Polygon& p_;
    const SY_Polygon& q_;
    DepthDifference difference_;
    SY_DrawOrder* order_;
};

struct Node {
    SY_AccountedVector<int32_t> successors;  // drawn before this node
    bool visited = false;
    bool emitted = false;
    int32_t low = 0;
};

// Cuts the graph into groups. Both walks keep their own stacks, so the depth of the graph is
// bounded by memory, not by the thread's stack.
class GroupCutter {
public:
    GroupCutter(SY_AccountedVector<Node>* nodes, SY_TRLayer* const* renderables,
                SY_RenderableGroups* groups)
        : nodes_(*nodes), renderables_(renderables), groups_(*groups) {}

    void Run() {
        for (size_t i = 0; i < nodes_.size(); ++i) {
            if (!nodes_[i].visited) Visit(static_cast<int32_t>(i));
        }
    }

private:
    struct VisitFrame {
        int32_t node;
        int32_t depth;
        size_t next;    // the successor to look at next
        int32_t child;  // the successor being visited, or −1
    };
    struct CollectFrame {
        int32_t node;
        size_t next;
    };

    // A node is emitted once nothing it reaches lies above it on the walk; the root always is.
    void Visit(int32_t root) {
        nodes_[root].visited = true;
        nodes_[root].low = 0;
        visits_.push_back({root, 0, 0, -1});
        while (!visits_.empty()) {
            VisitFrame& frame = visits_.back();
            Node& node = nodes_[frame.node];
            if (frame.child >= 0) {
                node.low = std::min(node.low, nodes_[frame.child].low);
                frame.child = -1;
            }
            bool descended = false;
            while (frame.next < node.successors.size()) {
                int32_t s = node.successors[frame.next++];
                Node& successor = nodes_[s];
                if (successor.emitted) continue;
                if (!successor.visited) {
                    successor.visited = true;
                    successor.low = frame.depth + 1;
                    frame.child = s;
                    descended = true;
                    visits_.push_back({s, frame.depth + 1, 0, -1});
                    break;
                }
                node.low = std::min(node.low, successor.low);
            }
            if (descended) continue;
            VisitFrame done = visits_.back();
            visits_.pop_back();
            if (done.depth == 0 || node.low == done.depth) Emit(done.node);
        }
    }

    // A new group with the node and every node it reaches that is not emitted yet, depth first.
    void Emit(int32_t first) {
        groups_.emplace_back();
        SY_RenderableGroup& group = groups_.back();
        Take(first, &group);
        collects_.push_back({first, 0});
        while (!collects_.empty()) {
            CollectFrame& frame = collects_.back();
            const auto& successors = nodes_[frame.node].successors;
            if (frame.next == successors.size()) {
                collects_.pop_back();
                continue;
            }
            int32_t s = successors[frame.next++];
            if (nodes_[s].emitted) continue;
            Take(s, &group);
            collects_.push_back({s, 0});
        }
    }

    void Take(int32_t node, SY_RenderableGroup* group) {
        group->push_back(renderables_[node]);
        nodes_[node].emitted = true;
    }

    SY_AccountedVector<Node>& nodes_;
    SY_TRLayer* const* renderables_;
    SY_RenderableGroups& groups_;
    SY_AccountedVector<VisitFrame> visits_;
    SY_AccountedVector<CollectFrame> collects_;
};

}  // namespace

SY_DrawOrder SY_RelateRenderables(const SY_TRLayer& a, const SY_TRLayer& b, SY_DepthSense sense) {
    SY_DrawOrder order;
    if (a.HasEmptyBounds() || b.HasEmptyBounds()) return order;
    if (!(std::max(a.bounds[0], b.bounds[0]) < std::min(a.bounds[2], b.bounds[2])) ||
        !(std::max(a.bounds[1], b.bounds[1]) < std::min(a.bounds[3], b.bounds[3]))) {
        return order;
    }
    int32_t countA = a.subsamples.Count(), countB = b.subsamples.Count();
    for (int32_t k = 0; k < std::max(countA, countB); ++k) {
        const SY_Subsample& p = a.subsamples[std::min(k, countA - 1)];
        const SY_Subsample& q = b.subsamples[std::min(k, countB - 1)];
        if (p.vertices.empty() || q.vertices.empty()) continue;
        PolygonComparison(p, q, sense, &order).Run();
        if (order.aFirst && order.bFirst) break;
    }
    return order;
}

void SY_GroupByDepth(SY_TRLayer* const* renderables, int32_t count, SY_DepthSense sense,
                     SY_RenderableGroups* groups) {
    groups->clear();
    SY_AccountedVector<Node> nodes(static_cast<size_t>(std::max(count, 0)));
    // Only renderables whose screen boxes overlap with positive area can be related, so the
    // boxes are swept by their left edges: a box stays open while its right edge lies beyond
    // the left edge reached, and each box meets only the open ones.
    SY_AccountedVector<int32_t> byLeft;
    for (int32_t i = 0; i < count; ++i) {
        if (!renderables[i]->HasEmptyBounds()) byLeft.push_back(i);
    }
    std::sort(byLeft.begin(), byLeft.end(), [renderables](int32_t a, int32_t b) {
        return renderables[a]->bounds[0] < renderables[b]->bounds[0];
    });
    SY_AccountedVector<int32_t> open;
    for (int32_t b : byLeft) {
        const double* boxB = renderables[b]->bounds;
        for (size_t k = 0; k < open.size();) {
            const int32_t a = open[k];
            const double* boxA = renderables[a]->bounds;
            if (!(boxA[2] > boxB[0])) {
                open[k] = open.back();
                open.pop_back();
                continue;
            }
            ++k;
            if (!(std::max(boxA[1], boxB[1]) < std::min(boxA[3], boxB[3]))) continue;
            // Related in render order, as the successors are listed.
            const int32_t i = std::min(a, b), j = std::max(a, b);
            SY_DrawOrder order = SY_RelateRenderables(*renderables[i], *renderables[j], sense);
            if (order.aFirst) nodes[j].successors.push_back(i);
            if (order.bFirst) nodes[i].successors.push_back(j);
        }
        open.push_back(b);
    }
    // The cut visits successors in render order, which decides the groups' order.
    for (Node& node : nodes)
        std::sort(node.successors.begin(), node.successors.end());
    GroupCutter(&nodes, renderables, groups).Run();
}
