#include <gtest/gtest.h>

#include <vector>

#include "renderer/scene/row_work.h"
#include "renderer/scene/threads.h"
#include "tests/renderer/renderer_test_support.h"

namespace {

using renderer_test::RecordingProgress;
using renderer_test::ThreadedIterateSuite;

// Runs work over `rows` rows in a field mode and returns the rows drawn; row `failing` throws 4,
// which comes back negated after the rows drawn.
std::vector<int32_t> RowsDrawn(int32_t fieldMode, int32_t rows, int32_t failing,
                               RecordingProgress* progress) {
    struct Closure {
        std::vector<int32_t> drawn;
        int32_t failing;
    } closure{{}, failing};
    auto draw = [](const void* c, int32_t row, int32_t, int32_t) {
        auto* self = static_cast<Closure*>(const_cast<void*>(c));
        if (row == self->failing) throw int32_t{4};
        self->drawn.push_back(row);
    };
    try {
        SY_RunRowWork({&PF_IterateGeneric_Static, progress, 0, rows, fieldMode, draw, &closure});
    } catch (int32_t code) {
        closure.drawn.push_back(-code);
    }
    return closure.drawn;
}

TEST(RowWork, FieldModesSkipRowsProgressComesEveryFourthRowAndAFailureStopsTheRest) {
    using Reports = std::vector<std::pair<int32_t, int32_t>>;
    struct Case {
        int32_t fieldMode, rows, failing;
        std::vector<int32_t> drawn;
        Reports progress;
    };
    const Case kCases[] = {
        {0, 5, -1, {0, 1, 2, 3, 4}, {{0, 5}, {4, 5}}},
        {1, 5, -1, {0, 2, 4}, {{0, 5}, {4, 5}}},
        {2, 5, -1, {1, 3}, {}},
        {0, 10, -1, {0, 1, 2, 3, 4, 5, 6, 7, 8, 9}, {{0, 10}, {4, 10}, {8, 10}}},
        {0, 10, 3, {0, 1, 2, -4}, {{0, 10}}},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(testing::Message() << "field mode " << c.fieldMode << ", " << c.rows
                                        << " rows, failing at " << c.failing);
        RecordingProgress progress;
        EXPECT_EQ(RowsDrawn(c.fieldMode, c.rows, c.failing, &progress), c.drawn);
        EXPECT_EQ(progress.rows, c.progress);
    }
}

// Items that share a counter through the allocation lock, as fragment pools share blocks.
void CountUnderLock(const void* closure, int32_t, int32_t, int32_t) {
    for (int i = 0; i < 100; ++i) {
        SY_AllocationLockScope scope(SY_GetAllocationLock());
        ++*static_cast<int64_t*>(const_cast<void*>(closure));
    }
}

// The lock follows the frame that runs: a frame without multiprocessing before one with it must
// not leave the threaded frame unlocked.
TEST(RowWorkThreads, LockModeFollowsEachFrame) {
    using Threaded = ThreadedIterateSuite<4>;
    for (bool multiprocessing : {false, true, false, true}) {
        PF_IterateFunction iterate = SY_PrepareThreads(multiprocessing, Threaded::Suite());
        EXPECT_EQ(SY_GetAllocationLock()->singleThreaded.load(), !multiprocessing);
        EXPECT_EQ(SY_ThreadCount(), multiprocessing ? 4 : 1);
        int64_t counter = 0;
        RecordingProgress progress;
        SY_RunRowWork({iterate, &progress, 0, 64, 0, &CountUnderLock, &counter});
        EXPECT_EQ(counter, 6400);
    }
}

}  // namespace
