// Depth groups: runs of a pixel's records whose depth ranges chain into one another, so that
// only records inside one group can cross inside the pixel.
#pragma once

#include <algorithm>
#include <cstdint>

template <class F>
struct SY_DepthGroup {
    F* first;
    F* after;  // the record that starts the next group, or null
    int32_t count;
};

// The group that starts at `first`: following records join while their depth is not beyond the
// largest extent of the group so far.
template <class F>
SY_DepthGroup<F> SY_NextDepthGroup(F* first) {
    float reach = first->Extent();
    int32_t count = 1;
    F* record = first->next;
    for (; record && !(record->depth > reach); record = record->next) {
        reach = std::max(reach, record->Extent());
        ++count;
    }
    return {first, record, count};
}
