#include <gtest/gtest.h>

#include <atomic>
#include <mutex>
#include <set>

#include "suites/iterate_suite.h"
#include "suites/memory_suite.h"
#include "suites/persistent_data_suite.h"

namespace {

TEST(MemorySuite, HandlesLockAndFree) {
    const QNGP_MemorySuite1* memory = ostrel::MemorySuite();
    QNGP_MemHandle handle = nullptr;
    ASSERT_EQ(memory->NewHandle(1, "Tessary 3D options data", 16, 1, &handle), 0);
    void* bytes = nullptr;
    ASSERT_EQ(memory->LockHandle(handle, &bytes), 0);
    EXPECT_EQ(ostrel::LockedMemoryHandles(), 1);
    static_cast<int32_t*>(bytes)[3] = 7;
    EXPECT_EQ(memory->UnlockHandle(handle), 0);
    EXPECT_EQ(memory->UnlockHandle(handle), kQNGP_ErrBadHandle);
    uint32_t size = 0;
    EXPECT_EQ(memory->GetHandleSize(handle, &size), 0);
    EXPECT_EQ(size, 16u);
    EXPECT_EQ(memory->FreeHandle(handle), 0);
    EXPECT_EQ(ostrel::LiveMemoryHandles(), 0);
    EXPECT_EQ(ostrel::LockedMemoryHandles(), 0);
}

TEST(PersistentDataSuite, SettingsWithDefaults) {
    const QNGP_PersistentDataSuite3* data = ostrel::PersistentDataSuite();
    QNGP_PersistentBlobH blob = nullptr;
    ASSERT_EQ(data->GetApplicationBlob(&blob), 0);
    int32_t value = -1;
    ostrel::ClearApplicationSettings();
    EXPECT_EQ(data->GetLong(blob, "Tessary 3D", "Enable Multiprocessing", 1, &value), 0);
    EXPECT_EQ(value, 1);
    ostrel::SetApplicationSetting("Tessary 3D", "Enable Multiprocessing", 0);
    EXPECT_EQ(data->GetLong(blob, "Tessary 3D", "Enable Multiprocessing", 1, &value), 0);
    EXPECT_EQ(value, 0);
    ostrel::ClearApplicationSettings();
}

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
