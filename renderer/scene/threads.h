// The process-wide thread count and fragment allocation lock, and the per-frame choice of the
// function that runs row work items.
#pragma once

#include <atomic>
#include <cstdint>

#include "pf_iterate.h"
#include "win_critical_section.h"

// Guards the fragment storage that work items of one iterate call share. While the frame runs
// single-threaded, entering and leaving are skipped.
struct SY_AllocationLock {
    CRITICAL_SECTION section;
    std::atomic<bool> singleThreaded{true};

    void Enter() {
        if (!singleThreaded.load(std::memory_order_relaxed)) EnterCriticalSection(&section);
    }
    void Leave() {
        if (!singleThreaded.load(std::memory_order_relaxed)) LeaveCriticalSection(&section);
    }
};

class SY_AllocationLockScope {
public:
    explicit SY_AllocationLockScope(SY_AllocationLock* lock) : lock_(lock) { lock_->Enter(); }
    ~SY_AllocationLockScope() { lock_->Leave(); }
    SY_AllocationLockScope(const SY_AllocationLockScope&) = delete;
    SY_AllocationLockScope& operator=(const SY_AllocationLockScope&) = delete;

private:
    SY_AllocationLock* lock_;
};

// Error thrown when the lock cannot be made.
inline constexpr int32_t kSY_ErrLockCreation = 1;

// Makes the thread count and lock on the process's first frame and makes both follow this
// frame's multiprocessing flag: with it, the host's thread count and a live lock; without it,
// one thread and no locking. Returns the iterate function the frame runs its items with.
// Frames run one after another, never two at once.
PF_IterateFunction SY_PrepareThreads(bool multiprocessing, const QNGP_IterateSuite1* iterateSuite);

// Number of threads the current frame's items may run on; thread indices lie below it.
int32_t SY_ThreadCount();

SY_AllocationLock* SY_GetAllocationLock();
