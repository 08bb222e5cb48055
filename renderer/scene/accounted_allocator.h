// Growable arrays for the renderer core's per-frame state. Their memory comes through the host's
// purge loop and is accounted while held, so a frame, also a failed one, leaves the accounted
// byte count where it found it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <vector>

#include "u_memory.h"

template <class T>
class SY_AccountedAllocator {
public:
    using value_type = T;

    SY_AccountedAllocator() noexcept = default;
    template <class U>
    SY_AccountedAllocator(const SY_AccountedAllocator<U>&) noexcept {}

    // Throws the host's out-of-memory code when the memory is not there even after a purge.
    T* allocate(size_t count) {
        if (count > std::numeric_limits<size_t>::max() / sizeof(T) ||
            count > static_cast<size_t>(std::numeric_limits<int32_t>::max())) {
            throw kU_ErrOutOfMemory;
        }
        U_PurgeRecord record;
        record.count = static_cast<int32_t>(count);
        size_t bytes = count * sizeof(T);
        if (int32_t error = U_PurgeLoop(bytes, nullptr, &record, 0)) throw error;
        if (record.error) throw record.error;
        U_AccountAllocationEx(bytes, 1);
        return static_cast<T*>(record.array);
    }

    void deallocate(T* block, size_t count) noexcept {
        U_AccountAllocationEx(count * sizeof(T), 0);
        U_FreePtr(block);
    }

    template <class U>
    bool operator==(const SY_AccountedAllocator<U>&) const noexcept {
        return true;
    }
};

template <class T>
using SY_AccountedVector = std::vector<T, SY_AccountedAllocator<T>>;
