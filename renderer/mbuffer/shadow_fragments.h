// Occluder lists of the shadow maps: fragment arrays of shadow records, kept in a list from
// which arrays that received nothing are dropped.
#pragma once

#include <cstdint>
#include <memory>

#include "m_matrix.h"
#include "pf_pixel.h"
#include "renderer/mbuffer/fragment_array.h"
#include "renderer/scene/accounted_allocator.h"
#include "u_memory.h"

class SY_ShadowFragmentArray : public SY_FragmentLists<SY_ShadowFragment>,
                               public U_MemTrackedObject {
public:
    explicit SY_ShadowFragmentArray(const M_LRect& rect)
        : SY_FragmentLists(rect), tallies_(static_cast<size_t>(PoolCount())) {}

    // Adds an occluder of transmission `color` (red, green, blue) to the texel list at `head`,
    // which is kept descending in depth; equal depths keep the order they came in. Every
    // record is kept, whatever its colour. Throws 4 when memory runs out.
    void AddShadowFragment(const PF_Pixel16* color, float depth, float value32, uint16_t value16,
                           SY_ShadowFragment** head, int32_t poolIndex) {
        SY_ShadowFragment* record = Carve(poolIndex);
        record->depth = depth;
        record->red = color->red;
        record->green = color->green;
        record->blue = color->blue;
        record->value16 = value16;
        record->value32 = value32;
        ++tallies_[static_cast<size_t>(poolIndex)].records;
        SY_InsertInOrder(head, record,
                         [](const SY_ShadowFragment& existing, const SY_ShadowFragment& added) {
                             return !(existing.depth < added.depth);
                         });
    }

    // Every record added so far; read it after the drawing threads finish.
    uint32_t FragmentCount() const {
        uint32_t count = 0;
        for (const Tally& t : tallies_)
            count += t.records;
        return count;
    }

private:
    // The records each pool's thread added, a cache line apart: one count shared by the
    // threads, bumped atomically, cost more than writing the record.
    struct Tally {
        uint32_t records = 0;
        char apart[60];
    };
    SY_AccountedVector<Tally> tallies_;
};

// The shadow arrays of a frame, in the order they were made.
class SY_ShadowFragmentArrayList {
public:
    // A new empty array for rect, appended at the end. Throws 4 when memory runs out.
    SY_ShadowFragmentArray* Append(const M_LRect& rect);
    // Destroys the arrays that hold no record; the others keep their order.
    void Compact();

    int32_t Count() const { return static_cast<int32_t>(arrays_.size()); }
    SY_ShadowFragmentArray* operator[](int32_t i) const { return arrays_[i].get(); }

private:
    SY_AccountedVector<std::unique_ptr<SY_ShadowFragmentArray>> arrays_;
};
