// Per-thread pools that fragment records are carved from: 65,544-byte blocks from the host
// allocator, chained and released together with the pool, never record by record.
#pragma once

#include <cstddef>
#include <cstdint>
#include <new>
#include <type_traits>

#include "renderer/scene/threads.h"

inline constexpr int32_t kSY_FragmentRecordBytes = 65536;  // record space of one block
inline constexpr size_t kSY_FragmentBlockBytes = 8 + kSY_FragmentRecordBytes;  // with link word
inline constexpr uint32_t kSY_FragmentAllocTag = 0x004B0004;

// One pool per render thread and array. Only the thread with the pool's index carves from it,
// so carving takes no lock; fetching and releasing blocks goes through the host allocator
// under the shared allocation lock.
struct SY_FragmentPool {
    // Takes blocks under `shared`, or under a lock of its own that never locks when null.
    explicit SY_FragmentPool(SY_AllocationLock* shared);
    // Hands every block back.
    ~SY_FragmentPool();
    SY_FragmentPool(const SY_FragmentPool&) = delete;
    SY_FragmentPool& operator=(const SY_FragmentPool&) = delete;

    // Uninitialised room for one record. Throws 4 when no block can be had.
    template <class R>
    R* Carve() {
        static_assert(std::is_trivially_destructible_v<R> && sizeof(R) % 8 == 0);
        if (bytesLeft < static_cast<int32_t>(sizeof(R))) ChainBlock();
        R* record = ::new (static_cast<void*>(nextFree)) R;
        nextFree += sizeof(R);
        bytesLeft -= static_cast<int32_t>(sizeof(R));
        return record;
    }

    // First word of the pool: the link word of a zeroth block that is the pool itself, so the
    // first block chained lands here.
    void* firstBlock = nullptr;
    void* currentBlock;  // whose link word receives the next block
    char* nextFree = nullptr;
    int32_t bytesLeft = 0;
    const char* allocName;
    uint32_t allocTag = kSY_FragmentAllocTag;
    SY_AllocationLock ownLock;  // single-threaded: stands in when there is no shared lock
    SY_AllocationLock* lock;

private:
    // The rest of the current block is abandoned; records never straddle blocks.
    [[gnu::noinline]] void ChainBlock();
};

static_assert(std::is_standard_layout_v<SY_FragmentPool> &&
                  offsetof(SY_FragmentPool, firstBlock) == 0,
              "the pool doubles as the zeroth block of its chain");
