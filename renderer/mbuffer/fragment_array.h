// Per-pixel fragment lists over a rectangle of the output: a flat head table, one record pool
// per render thread, and the insertion that keeps each list in depth order.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "m_matrix.h"
#include "pf_pixel.h"
#include "renderer/mbuffer/channel_math.h"
#include "renderer/mbuffer/fragment_pool.h"
#include "renderer/mbuffer/records.h"

// What every array owns, whatever its records: the pools and the head table. Building throws
// 4 when memory runs out, with everything taken so far released.
class SY_FragmentStorage {
public:
    // One pool per thread of SY_ThreadCount(), blocks under the shared allocation lock; a head
    // table of (right − left) × (bottom − top) null heads of headBytes each.
    SY_FragmentStorage(const M_LRect& bounds, size_t headBytes);
    ~SY_FragmentStorage();
    SY_FragmentStorage(const SY_FragmentStorage&) = delete;
    SY_FragmentStorage& operator=(const SY_FragmentStorage&) = delete;

    const M_LRect& Bounds() const { return bounds; }
    int32_t PoolCount() const { return poolCount; }
    const SY_FragmentPool& Pool(int32_t i) const { return *pools[i]; }

protected:
    M_LRect bounds;
    int32_t width;  // row stride of the head table, in heads
    SY_FragmentPool** pools = nullptr;
    void* heads = nullptr;
    int32_t poolCount = 0;

private:
    void Release() noexcept;
    size_t poolArrayBytes = 0;
    size_t headTableBytes = 0;
};

// Puts `record` into the list at `head` after the last record that stays ahead of it
// (staysAhead(existing, record)), so records that tie keep the order they came in.
template <class F, class StaysAhead>
inline void SY_InsertInOrder(F** head, F* record, StaysAhead staysAhead) {
    F* at = *head;
    if (!at || !staysAhead(*at, *record)) {
        record->next = at;
        *head = record;
        return;
    }
    while (at->next && staysAhead(*at->next, *record))
        at = at->next;
    record->next = at->next;
    at->next = record;
}

// The lists of records F. Pixel (x, y) in output coordinates inside the bounds has its head at
// HeadAt(x, y); the heads of a row are consecutive.
template <class F>
class SY_FragmentLists : public SY_FragmentStorage {
public:
    using Record = F;

    explicit SY_FragmentLists(const M_LRect& rect)
        : SY_FragmentStorage(rect, sizeof(F*)),
          origin(static_cast<F**>(heads) - rect.left - static_cast<ptrdiff_t>(rect.top) * width) {}

    F** HeadAt(int32_t x, int32_t y) const {
        return origin + static_cast<ptrdiff_t>(y) * width + x;
    }

protected:
    F* Carve(int32_t poolIndex) { return pools[poolIndex]->template Carve<F>(); }

    F** origin;  // heads − left − top × width
};

// Lists of object fragments. AddFragment is called by the span routines for every covered pixel;
// each thread passes its own pool index and only pixels of its own rows. A list is gathered
// newest first, at a constant cost whatever the pixel's depth complexity, and sorted into its
// walking order once drawing is done: farthest first, ties in the order they came in.
template <class F>
class SY_FragmentArray : public SY_FragmentLists<F> {
public:
    using Pixel = typename F::Pixel;
    using Coverage = SY_Coverage<Pixel>;

    explicit SY_FragmentArray(const M_LRect& rect) : SY_FragmentLists<F>(rect) {}

    // Calls visit(record) for every record of the list at head in walking order: ascending
    // depth, records of equal depth in the order they were added. A stable merge sort, n log n
    // compares and no allocation. A list of up to kOnStack records is sorted as (depth, record)
    // pairs on the stack and left as it is, so its records are only read; a longer one is
    // relinked in order first.
    template <class Visit>
    static void VisitInOrder(F** head, Visit&& visit) {
        F* first = *head;
        if (!first || !first->next) {  // nothing to sort
            if (first) visit(*first);
            return;
        }
        Entry entries[kOnStack];
        Entry spare[kOnStack];
        int32_t count = 0;
        for (F* record = first; record; record = record->next) {
            if (count == kOnStack) {
                MergeRuns(head);
                for (F* r = *head; r; r = r->next)
                    visit(*r);
                return;
            }
            entries[count++] = {record->depth, record};
        }
        const Entry* sorted = Sort(entries, spare, count);
        for (int32_t i = 0; i < count; ++i)
            visit(*sorted[i].record);
    }

    // Relinks the list at head in walking order, for walks that follow the links.
    static void Order(F** head) {
        F** tail = head;
        VisitInOrder(head, [&tail](F& record) {
            *tail = &record;
            tail = &record.next;
        });
        *tail = nullptr;
    }

    // Draft records. A source of zero alpha is dropped whatever the coverage; otherwise the
    // coverage is folded into the stored alpha.
    void AddFragment(const Pixel* color, Coverage coverage, int32_t mode, float depth, F** head,
                     int32_t poolIndex) requires(F::kGradients == 0) {
        if (color->alpha == 0) return;
        Insert(head, Fill(color, coverage, mode, depth, poolIndex));
    }

    // Anti-aliased records: depth is the plane's minimum over the pixel.
    void AddFragment(const Pixel* color, Coverage coverage, int32_t mode, float depth, float dzdx,
                     float dzdy, F** head, int32_t poolIndex) requires(F::kGradients == 2) {
        if (color->alpha == 0) return;
        F* record = Fill(color, coverage, mode, depth, poolIndex);
        record->dzdx = dzdx;
        record->dzdy = dzdy;
        Insert(head, record);
    }

    // Motion-blur records: depth is the minimum over the pixel and the shutter interval.
    void AddFragment(const Pixel* color, Coverage coverage, int32_t mode, float depth, float dzdx,
                     float dzdy, float dzdt, F** head,
                     int32_t poolIndex) requires(F::kGradients == 3) {
        if (color->alpha == 0) return;
        F* record = Fill(color, coverage, mode, depth, poolIndex);
        record->dzdx = dzdx;
        record->dzdy = dzdy;
        record->dzdt = dzdt;
        Insert(head, record);
    }

private:
    F* Fill(const Pixel* color, Coverage coverage, int32_t mode, float depth, int32_t poolIndex) {
        F* record = this->Carve(poolIndex);
        record->color = *color;
        record->color.alpha = SY_ChannelMath<Pixel>::ScaleByCoverage(color->alpha, coverage);
        record->mode = static_cast<uint8_t>(mode);
        record->opaque = mode == 2 && record->color.alpha == PF_PixelTraits<Pixel>::kMax;
        record->scratchIndex = 0;
        record->depth = depth;
        return record;
    }

    static constexpr int32_t kOnStack = 256;
    struct Entry {
        float depth;
        F* record;
    };

    // Sorts count entries gathered newest first; gives the buffer, entries or spare, that
    // holds them in walking order.
    static const Entry* Sort(Entry* entries, Entry* spare, int32_t count);
    // Order for lists too long for the stack: a stable merge of linked runs.
    static void MergeRuns(F** head);

    static void Insert(F** head, F* record) {
        record->next = *head;
        *head = record;
    }
};

template <class F>
auto SY_FragmentArray<F>::Sort(Entry* entries, Entry* spare, int32_t count) -> const Entry* {
    std::reverse(entries, entries + count);  // oldest first
    // Runs of kRun by insertion, cheapest for the few records most pixels hold; then merges.
    constexpr int32_t kRun = 8;
    for (int32_t start = 0; start < count; start += kRun) {
        const int32_t end = std::min(start + kRun, count);
        for (int32_t i = start + 1; i < end; ++i) {
            const Entry entry = entries[i];
            int32_t j = i;
            for (; j > start && entries[j - 1].depth > entry.depth; --j)
                entries[j] = entries[j - 1];
            entries[j] = entry;
        }
    }
    Entry* from = entries;
    Entry* to = spare;
    for (int32_t width = kRun; width < count; width *= 2) {
        for (int32_t start = 0; start < count; start += 2 * width) {
            const int32_t middle = std::min(start + width, count);
            const int32_t end = std::min(start + 2 * width, count);
            int32_t older = start, newer = middle;
            for (int32_t out = start; out < end; ++out) {
                const bool takeNewer =
                    newer < end && (older == middle || from[older].depth > from[newer].depth);
                to[out] = from[takeNewer ? newer++ : older++];
            }
        }
        std::swap(from, to);
    }
    return from;
}

template <class F>
void SY_FragmentArray<F>::MergeRuns(F** head) {
    F* list = *head;
    // Each pass merges neighbouring runs of `width` records. The list is newest first, so of
    // two runs the later one came in earlier and wins ties.
    for (int32_t width = 1;; width *= 2) {
        F* newer = list;
        F** tail = &list;
        int32_t merges = 0;
        while (newer) {
            ++merges;
            F* older = newer;
            int32_t newerLeft = 0;
            for (; older && newerLeft < width; ++newerLeft)
                older = older->next;
            int32_t olderLeft = width;
            while (newerLeft > 0 || (olderLeft > 0 && older)) {
                F* taken;
                if (newerLeft > 0 && (olderLeft == 0 || !older || older->depth > newer->depth)) {
                    taken = newer;
                    newer = newer->next;
                    --newerLeft;
                } else {
                    taken = older;
                    older = older->next;
                    --olderLeft;
                }
                *tail = taken;
                tail = &taken->next;
            }
            newer = older;
        }
        *tail = nullptr;
        if (merges == 1) break;
    }
    *head = list;
}
