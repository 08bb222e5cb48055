#include <gtest/gtest.h>

#include <cstring>

#include "u_memory.h"

namespace {

int gPurges = 0;
bool CountPurge() {
    ++gPurges;
    return true;
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

TEST(Memory, PurgeLoopRetriesOnceAfterPurging) {
    struct Case {
        int64_t failAfter;
        bool succeeds;
        int purges;
    };
    for (const Case& c : {Case{0, true, 0}, Case{1, true, 1}}) {
        gPurges = 0;
        U_SetPurgeHandler(&CountPurge);
        U_FailAllocationAfter(c.failAfter);
        U_PurgeRecord record;
        record.count = 4;
        EXPECT_EQ(U_PurgeLoop(
                      4 * sizeof(int), [](void* e) { *static_cast<int*>(e) = 7; }, &record, 0),
                  0);
        EXPECT_EQ(record.array != nullptr, c.succeeds);
        EXPECT_EQ(gPurges, c.purges);
        ASSERT_NE(record.array, nullptr);
        EXPECT_EQ(static_cast<int*>(record.array)[3], 7);
        U_FreePtr(record.array);
    }
    U_SetPurgeHandler(nullptr);
}

TEST(Memory, PurgeLoopReportsExhaustionInTheRecord) {
    U_FailAllocationAfter(1);
    // The second allocation (the retry) fails too: make the countdown hit both.
    U_PurgeRecord record;
    record.count = 1;
    U_SetPurgeHandler([] {
        U_FailAllocationAfter(1);
        return true;
    });
    EXPECT_EQ(U_PurgeLoop(16, nullptr, &record, 0), 0);
    EXPECT_EQ(record.error, kU_ErrOutOfMemory);
    EXPECT_EQ(record.array, nullptr);
    U_SetPurgeHandler(nullptr);
}

// A frame asks for the blocks the frame before it freed: large ones come back as they were
// left, small ones and other sizes do not.
TEST(Memory, LargeBlocksFreedByOneFrameServeTheNext) {
    constexpr size_t kLarge = 3 << 20;
    void* first = U_AllocatePtr(0, "frame", kLarge);
    ASSERT_NE(first, nullptr);
    static_cast<char*>(first)[kLarge - 1] = 1;
    U_FreePtr(first);
    void* other = U_AllocatePtr(0, "frame", kLarge + 16);
    void* again = U_AllocatePtr(0, "frame", kLarge);
    EXPECT_NE(other, first);
    EXPECT_EQ(again, first);
    U_FreePtr(other);
    U_FreePtr(again);
}

struct Tracked : U_MemTrackedObject {
    double payload[8];
};

TEST(Memory, TrackedObjectsAreAccounted) {
    int64_t start = U_AccountedBytes();
    auto* object = new Tracked;
    EXPECT_EQ(U_AccountedBytes(), start + static_cast<int64_t>(sizeof(Tracked)));
    delete object;
    EXPECT_EQ(U_AccountedBytes(), start);
    U_FailAllocationAfter(1);
    EXPECT_THROW(new Tracked, std::bad_alloc);
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
