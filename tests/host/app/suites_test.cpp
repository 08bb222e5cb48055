#include <gtest/gtest.h>

#include <atomic>
#include <mutex>
#include <set>

#include "suites/iterate_suite.h"

namespace {

struct Seen {
    std::mutex mutex;
    std::set<int32_t> threads;
    std::atomic<int32_t> items{0};
};

TEST(IterateSuiteThreads, RunsEveryItemWithIndicesBelowTheCount) {
    ostrel::SetIterateThreads(3);
    const QNGP_IterateSuite1* iterate = ostrel::IterateSuite();
    int32_t count = 0;
    ASSERT_EQ(iterate->GetThreadCount(&count), 0);
    EXPECT_EQ(count, 3);
    Seen seen;
    auto callback = [](void* closure, int32_t thread, int32_t) -> int32_t {
        auto* s = static_cast<Seen*>(closure);
        std::lock_guard lock(s->mutex);
        s->threads.insert(thread);
        ++s->items;
        return 0;
    };
    ASSERT_EQ(iterate->Iterate(1000, &seen, callback), 0);
    EXPECT_EQ(seen.items.load(), 1000);
    for (int32_t thread : seen.threads) {
        EXPECT_GE(thread, 0);
        EXPECT_LT(thread, count);
    }
    auto failing = [](void*, int32_t, int32_t item) -> int32_t { return item == 17 ? 4 : 0; };
    EXPECT_EQ(iterate->Iterate(100, nullptr, failing), 4);
    ostrel::SetIterateThreads(0);
}

}  // namespace
