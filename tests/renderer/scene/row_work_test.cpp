#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

#include "frame_test_support.h"
#include "renderer/scene/row_work.h"
#include "renderer/scene/threads.h"

namespace {

using ostrel_test::RecordingProgress;
using ostrel_test::ThreadedIterateSuite;

std::vector<int32_t> RowsDrawn(int32_t fieldMode, int32_t rows, RecordingProgress* progress) {
    std::vector<int32_t> drawn;
    SY_RowWork work{
        &PF_IterateGeneric_Static,
        progress,
        0,
        rows,
        fieldMode,
        [](const void* closure, int32_t row, int32_t, int32_t) {
            static_cast<std::vector<int32_t>*>(const_cast<void*>(closure))->push_back(row);
        },
        &drawn};
    SY_RunRowWork(work);
    return drawn;
}

TEST(RowWork, FieldModesSkipRows) {
    struct Case {
        int32_t fieldMode;
        std::vector<int32_t> rows;
    };
    const Case cases[] = {{0, {0, 1, 2, 3, 4}}, {1, {0, 2, 4}}, {2, {1, 3}}};
    for (const Case& c : cases) {
        RecordingProgress progress;
        EXPECT_EQ(RowsDrawn(c.fieldMode, 5, &progress), c.rows) << "field mode " << c.fieldMode;
    }
}

TEST(RowWork, ProgressEveryFourthRowFromThreadZero) {
    RecordingProgress progress;
    RowsDrawn(0, 10, &progress);
    using Report = std::pair<int32_t, int32_t>;
    EXPECT_EQ(progress.rows, (std::vector<Report>{{0, 10}, {4, 10}, {8, 10}}));
    RecordingProgress single;
    RowsDrawn(0, 1, &single);
    EXPECT_EQ(single.rows, (std::vector<Report>{{0, 1}}));
}

TEST(RowWork, TheFirstFailureStopsTheRestAndIsRethrown) {
    int32_t drawn = 0;
    RecordingProgress progress;
    SY_RowWork work{&PF_IterateGeneric_Static,
                    &progress,
                    0,
                    10,
                    0,
                    [](const void* closure, int32_t row, int32_t, int32_t) {
                        if (row == 3) throw int32_t{4};
                        ++*static_cast<int32_t*>(const_cast<void*>(closure));
                    },
                    &drawn};
    EXPECT_THROW(
        {
            try {
                SY_RunRowWork(work);
            } catch (int32_t code) {
                EXPECT_EQ(code, 4);
                throw;
            }
        },
        int32_t);
    EXPECT_EQ(drawn, 3);
}

// Items that share a counter through the allocation lock, as fragment pools share blocks.
struct SharedCounter {
    int64_t value = 0;
};

void CountUnderLock(const void* closure, int32_t, int32_t, int32_t) {
    auto* counter = static_cast<SharedCounter*>(const_cast<void*>(closure));
    for (int i = 0; i < 100; ++i) {
        SY_AllocationLockScope scope(SY_GetAllocationLock());
        ++counter->value;
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
        SharedCounter counter;
        RecordingProgress progress;
        SY_RunRowWork({iterate, &progress, 0, 64, 0, &CountUnderLock, &counter});
        EXPECT_EQ(counter.value, 6400);
    }
}

}  // namespace
