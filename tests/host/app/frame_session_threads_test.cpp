#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "served_frame.h"
#include "u_memory.h"

namespace ostrel {
namespace {

// The renderer fetches and gives back textures from its worker threads at once.
TEST(FrameSessionThreads, TexturesComeAndGoFromManyThreads) {
    int64_t startBytes = U_AccountedBytes();
    {
        ServedFrame frame(CompJson("", R"(
          {"name": "a", "kind": "solid", "threeD": true,
           "source": {"color": "#ff8000", "width": 40, "height": 30}},
          {"name": "b", "kind": "solid", "threeD": true,
           "source": {"color": "#0080ff", "width": 20, "height": 10}})"));
        const QNGP_CanvasSuite13& canvas = *CanvasSuite();
        QNGP_RenderContextH render = frame.Render();
        std::atomic<int32_t> failures{0};
        std::vector<std::thread> threads;
        for (int32_t t = 0; t < 4; ++t) {
            threads.emplace_back([&, t] {
                for (int32_t i = 0; i < 50; ++i) {
                    QNGP_LayerContextH context = nullptr;
                    M_Matrix3 source{};
                    PF_World* world = nullptr;
                    int32_t index = (t + i) % 2;
                    if (canvas.GetNthLayerContext(render, index, &context) != 0 ||
                        canvas.RenderTexture(render, context, 1, nullptr, nullptr, &source,
                                             &world) != 0 ||
                        world->width != (index == 0 ? 40 : 20) ||
                        canvas.DisposeTexture(render, context, world) != 0) {
                        ++failures;
                    }
                }
            });
        }
        for (std::thread& thread : threads)
            thread.join();
        EXPECT_EQ(failures.load(), 0);
    }
    EXPECT_EQ(U_AccountedBytes(), startBytes);
}

}  // namespace
}  // namespace ostrel
