// Running row work items: the host's threaded iterator and the pixel library's serial one.
#pragma once

#include <cstdint>

// Runs one work item; thread index lies below the iterator's thread count.
using PF_IterateCallback = int32_t (*)(void* closure, int32_t threadIndex, int32_t itemIndex);

// Runs items 0 to count − 1, returns 0 or the first non-zero result of a callback.
using PF_IterateFunction = int32_t (*)(int32_t count, void* closure, PF_IterateCallback callback);

// Runs every item on the calling thread with thread index 0.
int32_t PF_IterateGeneric_Static(int32_t count, void* closure, PF_IterateCallback callback);

// "QNGP Iterate Suite" version 1, the host's threaded iterator.
struct QNGP_IterateSuite1 {
    // Number of threads the iterator runs items on.
    int32_t (*GetThreadCount)(int32_t* count);
    // Runs the items on the worker threads.
    PF_IterateFunction Iterate;
};
