#include "u_memory.h"

#include "block_cache.h"

#include <atomic>
#include <cstdint>
#include <cstring>
#include <new>

namespace {

// Every block carries its size in front so that freeing can account it.
struct alignas(16) BlockHeader {
    size_t bytes;
};

std::atomic<int64_t> gAccountedBytes{0};
std::atomic<int64_t> gHeldBytes{0};      // in blocks handed out, headers included
std::atomic<int64_t> gLimitBytes{0};     // 0: none
std::atomic<int64_t> gRefusedDemand{0};  // the largest total held had a refused block been given
std::atomic<int64_t> gFailCountdown{0};
std::atomic<U_PurgeHandler> gPurgeHandler{nullptr};

bool SimulatedFailure() {
    int64_t left = gFailCountdown.load(std::memory_order_relaxed);
    while (left > 0) {
        if (gFailCountdown.compare_exchange_weak(left, left - 1)) return left == 1;
    }
    return false;
}

// Counts bytes as held, unless that would pass the limit.
bool Hold(int64_t bytes) {
    int64_t limit = gLimitBytes.load(std::memory_order_relaxed);
    int64_t held = gHeldBytes.load(std::memory_order_relaxed);
    do {
        if (limit > 0 && held + bytes > limit) return false;
    } while (!gHeldBytes.compare_exchange_weak(held, held + bytes, std::memory_order_relaxed));
    return true;
}

// Remembers what a refused block would have brought the total to.
void NoteRefusal(int64_t bytes) {
    int64_t demand = gHeldBytes.load(std::memory_order_relaxed) + bytes;
    int64_t largest = gRefusedDemand.load(std::memory_order_relaxed);
    while (demand > largest && !gRefusedDemand.compare_exchange_weak(largest, demand)) {
    }
}

void* HeaderOf(void* block) {
    return static_cast<BlockHeader*>(block) - 1;
}

}  // namespace

void* U_AllocatePtr(uint32_t, const char*, size_t bytes) {
    if (SimulatedFailure() || bytes > INT64_MAX / 2) return nullptr;
    const size_t whole = sizeof(BlockHeader) + bytes;
    if (!Hold(static_cast<int64_t>(whole))) {
        NoteRefusal(static_cast<int64_t>(whole));
        return nullptr;
    }
    auto* header = static_cast<BlockHeader*>(u_memory::TakeRawBlock(whole));
    if (!header) {
        gHeldBytes.fetch_sub(static_cast<int64_t>(whole), std::memory_order_relaxed);
        NoteRefusal(static_cast<int64_t>(whole));
        return nullptr;
    }
    header->bytes = bytes;
    return header + 1;
}

int32_t U_ResizePtr(uint32_t tag, size_t bytes, const char* name, void** address) {
    if (!address) return kU_ErrOutOfMemory;
    void* resized = U_AllocatePtr(tag, name, bytes);
    if (!resized) return kU_ErrOutOfMemory;
    if (*address) {
        size_t old = static_cast<BlockHeader*>(HeaderOf(*address))->bytes;
        std::memcpy(resized, *address, old < bytes ? old : bytes);
        U_FreePtr(*address);
    }
    *address = resized;
    return 0;
}

void U_FreePtr(void* block) {
    if (!block) return;
    auto* header = static_cast<BlockHeader*>(HeaderOf(block));
    const size_t whole = sizeof(BlockHeader) + header->bytes;
    gHeldBytes.fetch_sub(static_cast<int64_t>(whole), std::memory_order_relaxed);
    u_memory::GiveBackRawBlock(header, whole);
}

int32_t U_PurgeLoop(size_t bytes, U_ElementConstructor constructor, U_PurgeRecord* record,
                    int32_t) {
    record->error = 0;
    record->array = U_AllocatePtr(0, "purge loop", bytes);
    if (!record->array) {
        U_PurgeHandler purge = gPurgeHandler.load();
        if (purge) purge();
        record->array = U_AllocatePtr(0, "purge loop", bytes);
    }
    if (!record->array) {
        record->error = kU_ErrOutOfMemory;
        return 0;
    }
    if (constructor && record->count > 0) {
        size_t elementBytes = bytes / static_cast<size_t>(record->count);
        auto* element = static_cast<char*>(record->array);
        for (int32_t i = 0; i < record->count; ++i, element += elementBytes)
            constructor(element);
    }
    return 0;
}

void U_AccountAllocationEx(size_t bytes, int32_t taking) {
    auto delta = static_cast<int64_t>(bytes);
    gAccountedBytes.fetch_add(taking ? delta : -delta, std::memory_order_relaxed);
}

int64_t U_AccountedBytes() {
    return gAccountedBytes.load(std::memory_order_relaxed);
}

void U_SetPurgeHandler(U_PurgeHandler handler) {
    gPurgeHandler.store(handler);
}

void U_SetAllocationLimit(int64_t bytes) {
    gLimitBytes.store(bytes < 0 ? 0 : bytes);
}

int64_t U_TakeRefusedDemand() {
    return gRefusedDemand.exchange(0);
}

void U_FailAllocationAfter(int64_t n) {
    gFailCountdown.store(n < 0 ? 0 : n);
}

void* U_MemTrackedObject::operator new(size_t bytes) {
    void* object = U_AllocatePtr(0, "tracked object", bytes);
    if (!object) throw std::bad_alloc();
    U_AccountAllocationEx(bytes, 1);
    return object;
}

void U_MemTrackedObject::operator delete(void* object, size_t bytes) noexcept {
    if (!object) return;
    U_AccountAllocationEx(bytes, 0);
    U_FreePtr(object);
}
