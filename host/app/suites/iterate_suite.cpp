#include "suites/iterate_suite.h"

#include <atomic>
#include <memory>
#include <mutex>

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/task_arena.h>

namespace ostrel {
namespace {

std::mutex gArenaMutex;
std::unique_ptr<tbb::task_arena> gArena;

tbb::task_arena& Arena() {
    std::lock_guard lock(gArenaMutex);
    if (!gArena) gArena = std::make_unique<tbb::task_arena>();
    return *gArena;
}

int32_t GetThreadCount(int32_t* count) {
    *count = Arena().max_concurrency();
    return 0;
}

// Thread indices come from the arena's slots, so each worker keeps one index below the count
// for the whole call.
int32_t Iterate(int32_t count, void* closure, PF_IterateCallback callback) {
    std::atomic<int32_t> firstError{0};
    Arena().execute([&] {
        tbb::parallel_for(tbb::blocked_range<int32_t>(0, count), [&](const auto& range) {
            int32_t thread = tbb::this_task_arena::current_thread_index();
            for (int32_t item = range.begin(); item != range.end(); ++item) {
                if (int32_t error = callback(closure, thread, item)) {
                    int32_t none = 0;
                    firstError.compare_exchange_strong(none, error);
                }
            }
        });
    });
    return firstError.load();
}

}  // namespace

const QNGP_IterateSuite1* IterateSuite() {
    static const QNGP_IterateSuite1 suite{&GetThreadCount, &Iterate};
    return &suite;
}

void SetIterateThreads(int32_t threads) {
    std::lock_guard lock(gArenaMutex);
    gArena = threads > 0 ? std::make_unique<tbb::task_arena>(threads)
                         : std::make_unique<tbb::task_arena>();
}

}  // namespace ostrel
