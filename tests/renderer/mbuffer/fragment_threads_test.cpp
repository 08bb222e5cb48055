#include <gtest/gtest.h>

#include <cstdint>

#include "mbuffer_test_support.h"
#include "renderer/mbuffer/mbuffer.h"
#include "renderer/scene/row_work.h"

namespace {

using ostrel_test::AccountedBytesCheck;

constexpr int32_t kLayers = 8;
constexpr M_LRect kBounds{3, 5, 131, 133};  // 128 × 128 pixels

using Buffer = SY_MBufferDraftX<PF_Pixel16>;

struct LayerDraw {
    Buffer* buffer;
    int32_t layer;
};

// Layer l lies at key (l · 37) mod 8 at every pixel, so each list's order differs from the
// order the layers arrive in.
float KeyOf(int32_t layer) {
    return static_cast<float>((layer * 37) % kLayers);
}

void DrawRow(const void* closure, int32_t row, int32_t, int32_t thread) {
    const auto& draw = *static_cast<const LayerDraw*>(closure);
    const PF_Pixel16 color{32768, static_cast<uint16_t>(draw.layer), 0, 0};
    Buffer::Record** head = draw.buffer->HeadAt(kBounds.left, row);
    for (int32_t x = kBounds.left; x < kBounds.right; ++x, ++head)
        draw.buffer->AddFragment(&color, 32768, 2, KeyOf(draw.layer), head, thread);
}

TEST(FragmentArrayThreads, WorkersFillOneBufferThroughTheirOwnPools) {
    AccountedBytesCheck memory;
    ostrel_test::ThreadedFrame<4> frame;
    auto owner = SY_MBuffer::New(kBounds, 16, false, false);
    auto* buffer = static_cast<Buffer*>(owner.get());
    ASSERT_EQ(buffer->PoolCount(), 4);
    const int32_t rows = kBounds.bottom - kBounds.top;
    for (int32_t layer = 0; layer < kLayers; ++layer) {
        LayerDraw draw{buffer, layer};
        ostrel_test::RecordingProgress progress;
        SY_RunRowWork({frame.Iterate(), &progress, kBounds.top, rows, 0, &DrawRow, &draw});
    }
    int32_t wrong = 0;
    for (int32_t y = kBounds.top; y < kBounds.bottom; ++y) {
        for (int32_t x = kBounds.left; x < kBounds.right; ++x) {
            int32_t count = 0;
            float last = -1.0f;
            for (const Buffer::Record* r = *buffer->HeadAt(x, y); r; r = r->next, ++count) {
                if (!(r->depth > last) || r->depth != KeyOf(r->color.red)) ++wrong;
                last = r->depth;
            }
            if (count != kLayers) ++wrong;
        }
    }
    EXPECT_EQ(wrong, 0);
    // 131,072 records at 2,730 a block fill 48 blocks and start a 49th; each of the other pools
    // may end on a block of its own that is only partly used.
    int32_t blocksInUse = 0;
    for (int32_t i = 0; i < buffer->PoolCount(); ++i) {
        for (void* b = buffer->Pool(i).firstBlock; b; b = *static_cast<void**>(b))
            ++blocksInUse;
    }
    EXPECT_GE(blocksInUse, 49);
    EXPECT_LE(blocksInUse, 48 + 4);
}

}  // namespace
