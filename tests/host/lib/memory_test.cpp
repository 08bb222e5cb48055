#include <gtest/gtest.h>

#include <cstring>
#include <functional>

#include "pf_sampling.h"
#include "pf_tables.h"
#include "u_memory.h"

namespace {

// Every allocation of the pixel and utility libraries that can fail: the failure is thrown and
// the accounted bytes return to where they were before the work began.
TEST(Memory, FailedAllocationsGiveEverythingBack) {
    PF_WorldX<PF_PixelFloat> world(10, 6);
    PF_WorldX<PF_Pixel8> texture(32, 16);
    PF_SampPB pb;
    pb.src = &texture;
    struct Case {
        const char* name;
        std::function<void()> run;
    };
    const Case kCases[] = {
        {"summed-area table", [&] { PF_SummedAreaTable(world, false); }},
        {"horizontal sum table",
         [&] {
             PF_HorizontalSumTable<PF_PixelFloat>(world, 0, 0, 0.0, 0, 0, 0, 1, 0, false, nullptr,
                                                  false);
         }},
        {"area-sampling table",
         [&] {
             PF_Pixel8 out;
             PF_AreaSample(1 << 16, 1 << 16, pb, &out);
         }},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        int64_t start = U_AccountedBytes();
        U_FailAllocationAfter(1);
        EXPECT_THROW(c.run(), std::bad_alloc);
        EXPECT_EQ(U_AccountedBytes(), start);
    }
}

TEST(Memory, ResizeKeepsContentsAndAFailureKeepsTheBlock) {
    void* block = nullptr;
    ASSERT_EQ(U_ResizePtr(0, 4, "test", &block), 0);
    std::memcpy(block, "abc", 4);
    ASSERT_EQ(U_ResizePtr(0, 1000, "test", &block), 0);
    EXPECT_STREQ(static_cast<char*>(block), "abc");
    void* before = block;
    U_FailAllocationAfter(1);
    EXPECT_EQ(U_ResizePtr(0, 4000, "test", &block), kU_ErrOutOfMemory);
    EXPECT_EQ(block, before);
    U_FreePtr(block);
}

int gPurges = 0;
bool gRetryFails = false;
bool Purge() {
    ++gPurges;
    if (gRetryFails) U_FailAllocationAfter(1);
    return true;
}

// The purge loop retries once after the host purges; a retry that fails too is reported in the
// record, not thrown.
TEST(Memory, PurgeLoopRetriesOnceAfterPurging) {
    struct Case {
        int64_t failAfter;
        bool retryFails;
        int32_t error;
    };
    for (const Case& c : {Case{0, false, 0}, Case{1, false, 0}, Case{1, true, kU_ErrOutOfMemory}}) {
        SCOPED_TRACE(c.failAfter + c.retryFails);
        gPurges = 0;
        gRetryFails = c.retryFails;
        U_SetPurgeHandler(&Purge);
        U_FailAllocationAfter(c.failAfter);
        U_PurgeRecord record;
        record.count = 4;
        EXPECT_EQ(U_PurgeLoop(
                      4 * sizeof(int), [](void* e) { *static_cast<int*>(e) = 7; }, &record, 0),
                  0);
        EXPECT_EQ(gPurges, c.failAfter);
        EXPECT_EQ(record.error, c.error);
        if (c.error) {
            EXPECT_EQ(record.array, nullptr);
            continue;
        }
        ASSERT_NE(record.array, nullptr);
        EXPECT_EQ(static_cast<int*>(record.array)[3], 7);
        U_FreePtr(record.array);
    }
    U_SetPurgeHandler(nullptr);
}

}  // namespace
