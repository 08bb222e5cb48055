#include "renderer/scene/threads.h"

#include "u_report.h"

namespace {

constexpr uint32_t kSpinCount = 4000;  // short waits spin instead of entering the kernel

// Kept for the life of the process: work items of any frame may reach it.
SY_AllocationLock gLock;
bool gSectionReady = false;
std::atomic<int32_t> gThreadCount{1};

void MakeSectionOnce() {
    if (gSectionReady) return;
    if (!InitializeCriticalSectionAndSpinCount(&gLock.section, kSpinCount)) {
        Up_ReportErrString(0, 8, "Failure creating critical section");
        throw kSY_ErrLockCreation;
    }
    gSectionReady = true;
}

}  // namespace

PF_IterateFunction SY_PrepareThreads(bool multiprocessing, const QNGP_IterateSuite1* iterateSuite) {
    if (!multiprocessing || !iterateSuite) {
        gLock.singleThreaded.store(true);
        gThreadCount.store(1);
        return &PF_IterateGeneric_Static;
    }
    int32_t count = 0;
    if (int32_t error = iterateSuite->GetThreadCount(&count)) throw error;
    MakeSectionOnce();
    gLock.singleThreaded.store(false);
    gThreadCount.store(count > 0 ? count : 1);
    return iterateSuite->Iterate;
}

int32_t SY_ThreadCount() {
    return gThreadCount.load();
}

SY_AllocationLock* SY_GetAllocationLock() {
    return &gLock;
}
