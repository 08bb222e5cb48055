#include "renderer/mbuffer/fragment_array.h"

#include <algorithm>
#include <cstring>
#include <new>

#include "renderer/scene/messages.h"
#include "u_memory.h"

namespace {

// Taken and accounted, or throws 4.
void* TakeAccounted(const char* name, size_t bytes) {
    void* block = U_AllocatePtr(kSY_FragmentAllocTag, name, bytes);
    if (!block) throw kU_ErrOutOfMemory;
    U_AccountAllocationEx(bytes, 1);
    return block;
}

void GiveBack(void* block, size_t bytes) {
    U_FreePtr(block);
    U_AccountAllocationEx(bytes, 0);
}

}  // namespace

SY_FragmentStorage::SY_FragmentStorage(const M_LRect& rect, size_t headBytes)
    : bounds(rect), width(std::max(0, rect.right - rect.left)) {
    try {
        const int32_t threads = SY_ThreadCount();
        poolArrayBytes = sizeof(SY_FragmentPool*) * static_cast<size_t>(threads);
        pools = static_cast<SY_FragmentPool**>(TakeAccounted("fragment pools", poolArrayBytes));
        SY_AllocationLock* shared = SY_GetAllocationLock();
        for (; poolCount < threads; ++poolCount) {
            void* memory = TakeAccounted("fragment pool", sizeof(SY_FragmentPool));
            pools[poolCount] = ::new (memory) SY_FragmentPool(shared);
        }
        const int32_t height = std::max(0, rect.bottom - rect.top);
        headTableBytes = headBytes * static_cast<size_t>(width) * static_cast<size_t>(height);
        heads = TakeAccounted(SY_LookupString(SY_Message::kFragmentArray), headTableBytes);
        std::memset(heads, 0, headTableBytes);
    } catch (...) {
        Release();
        throw;
    }
}

SY_FragmentStorage::~SY_FragmentStorage() {
    Release();
}

void SY_FragmentStorage::Release() noexcept {
    for (int32_t i = 0; i < poolCount; ++i) {
        pools[i]->~SY_FragmentPool();
        GiveBack(pools[i], sizeof(SY_FragmentPool));
    }
    if (pools) GiveBack(pools, poolArrayBytes);
    if (heads) GiveBack(heads, headTableBytes);
    pools = nullptr;
    heads = nullptr;
    poolCount = 0;
}
