// Row work items: one per output row, run through the frame's iterate function.
#pragma once

#include <atomic>
#include <cstdint>
#include <exception>
#include <mutex>

#include "pf_iterate.h"

class SY_ProgressAbort;

// Draws output row `row` (item `item` of the call) on the worker with index `thread`.
using SY_RowDrawer = void (*)(const void* closure, int32_t row, int32_t item, int32_t thread);

struct SY_RowWork {
    PF_IterateFunction iterate;
    SY_ProgressAbort* progress;
    int32_t firstRow;
    int32_t itemCount;
    int32_t fieldMode;  // 1 skips odd rows, 2 skips even rows
    SY_RowDrawer draw;
    const void* closure;
};

// Runs the items and returns when all are done. The first failure of any item (a thrown code,
// the user's cancel from the progress report, or any exception) stops the items that have not
// started yet and is rethrown here on the calling thread.
void SY_RunRowWork(const SY_RowWork& work);

// True when field rendering skips this output row.
constexpr bool SY_FieldSkipsRow(int32_t fieldMode, int32_t row) {
    return fieldMode != 0 && (row & 1) == 2 - fieldMode;
}
