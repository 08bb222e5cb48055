#include "renderer/mbuffer/shadow_fragments.h"

#include <algorithm>
#include <new>

SY_ShadowFragmentArray* SY_ShadowFragmentArrayList::Append(const M_LRect& rect) {
    std::unique_ptr<SY_ShadowFragmentArray> array;
    try {
        array.reset(new SY_ShadowFragmentArray(rect));
    } catch (const std::bad_alloc&) {
        throw kU_ErrOutOfMemory;
    }
    arrays_.push_back(std::move(array));
    return arrays_.back().get();
}

void SY_ShadowFragmentArrayList::Compact() {
    std::erase_if(arrays_, [](const std::unique_ptr<SY_ShadowFragmentArray>& array) {
        return array->FragmentCount() == 0;
    });
}
