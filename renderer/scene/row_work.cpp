#include "renderer/scene/row_work.h"

#include "renderer/scene/fetchers.h"

namespace {

// Shared by the items of one call; the failure fields are touched only on the failure path.
struct RunState {
    const SY_RowWork* work;
    std::atomic<bool> failed{false};
    std::mutex failureMutex;
    std::exception_ptr failure;
};

// Progress every fourth row keeps the host's progress calls off the hot path.
constexpr int32_t kProgressEvery = 4;

int32_t RunItem(void* closure, int32_t thread, int32_t item) {
    auto* state = static_cast<RunState*>(closure);
    if (state->failed.load(std::memory_order_relaxed)) return 0;
    const SY_RowWork& work = *state->work;
    int32_t row = work.firstRow + item;
    if (SY_FieldSkipsRow(work.fieldMode, row)) return 0;
    try {
        work.draw(work.closure, row, item, thread);
        if (thread == 0 && item % kProgressEvery == 0)
            work.progress->ReportRows(item, work.itemCount);
    } catch (...) {
        std::lock_guard lock(state->failureMutex);
        if (!state->failure) state->failure = std::current_exception();
        state->failed.store(true);
    }
    return 0;
}

}  // namespace

void SY_RunRowWork(const SY_RowWork& work) {
    RunState state;
    state.work = &work;
    int32_t error = work.iterate(work.itemCount, &state, &RunItem);
    if (state.failure) std::rethrow_exception(state.failure);
    if (error) throw error;
}
