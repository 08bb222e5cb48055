// The host utility library's memory services: tagged blocks, purge-and-retry arrays,
// accounting of bytes held, and tracked objects.
#pragma once

#include <cstddef>
#include <cstdint>

// The memory services' error code: the memory is not there.
inline constexpr int32_t kU_ErrOutOfMemory = 4;

// Memory for a tagged block, or null. The tag and name identify the owner in reports.
void* U_AllocatePtr(uint32_t tag, const char* name, size_t bytes);

// Resizes the block *address points to (null allocates); 0 on success, else an error code
// with the old block left as it was.
int32_t U_ResizePtr(uint32_t tag, size_t bytes, const char* name, void** address);

// Frees a block of U_AllocatePtr, U_ResizePtr or U_PurgeLoop; null is allowed.
void U_FreePtr(void* block);

// Runs over one element of a freshly allocated array.
using U_ElementConstructor = void (*)(void* element);

// In: count of elements. Out: the error (0 or 4) and the array, or null.
struct U_PurgeRecord {
    int32_t count = 0;
    int32_t error = 0;
    void* array = nullptr;
};

// Allocates bytes for record->count elements and constructs each one. When the memory is
// not there the host purges its caches and tries once more. The array is freed with
// U_FreePtr. Returns 0 when the call itself ran; the outcome is in the record.
int32_t U_PurgeLoop(size_t bytes, U_ElementConstructor constructor, U_PurgeRecord* record,
                    int32_t flags);

// Accounting of bytes held by the caller: taking = 1 adds, 0 subtracts.
void U_AccountAllocationEx(size_t bytes, int32_t taking);

// Bytes currently accounted. A frame, also a failed one, returns it to where it started.
int64_t U_AccountedBytes();

// The host's cache purge, run by U_PurgeLoop before its retry. Returns true when it freed
// anything. Null restores the default, which has nothing to purge.
using U_PurgeHandler = bool (*)();
void U_SetPurgeHandler(U_PurgeHandler handler);

// The most bytes the blocks of U_AllocatePtr, U_ResizePtr and U_PurgeLoop may hold at once; an
// allocation beyond it fails as if the memory were not there. 0 (the default) sets no limit.
void U_SetAllocationLimit(int64_t bytes);

// The most bytes the blocks would have held, had the largest block refused since the last
// call been given (by the limit or by the system); 0 when none was refused. Resets it.
int64_t U_TakeRefusedDemand();

// Memory-pressure simulation for testing failure paths: the nth allocation from now
// (1 = the next) through any of the services above fails; 0 turns it off.
void U_FailAllocationAfter(int64_t n);

// Objects created with new are accounted like any other block.
class U_MemTrackedObject {
public:
    static void* operator new(size_t bytes);
    static void operator delete(void* object, size_t bytes) noexcept;
};
