#include <gtest/gtest.h>

#include <new>
#include <stdexcept>
#include <thread>
#include <vector>

#include "composition/composition_error.h"
#include "composition/image_cache.h"
#include "test_files.h"
#include "u_memory.h"
#include "world_pixels.h"

namespace ostrel {
namespace {

Layer ImageLayer(const std::filesystem::path& file, int32_t width, int32_t height) {
    Layer layer;
    layer.kind = LayerKind::kImage;
    layer.source = {file, {}, width, height};
    return layer;
}

class ImageCacheTest : public ::testing::Test {
protected:
    TempFolder folder_;
    ImageCache cache_;
};

TEST_F(ImageCacheTest, SixteenBitFileScalesToTheHostMaximum) {
    // 65535 → 32768; 32768 → 32768 × 32768 / 65535 = 16384.25, rounded to 16384. No alpha
    // channel means opaque.
    auto file = folder_.WriteImage<uint16_t>("deep.png", 1, 1, 3, {65535, 32768, 0});
    auto world = LayerSource(cache_, ImageLayer(file, 1, 1), 16, 1, 1);
    EXPECT_EQ(ChannelsAt(*world, 0, 0), (Channels{32768, 32768, 16384, 0}));
}

TEST_F(ImageCacheTest, PremultipliedFloatFileBecomesStraight) {
    // EXR stores colour premultiplied: 0.25 under alpha 0.5 is 0.5 straight.
    auto file = folder_.WriteImage<float>("float.exr", 1, 1, 4, {0.25f, 0.1f, 0.0f, 0.5f});
    auto world = LayerSource(cache_, ImageLayer(file, 1, 1), 32, 1, 1);
    const Channels actual = ChannelsAt(*world, 0, 0), expected{0.5, 0.5, 0.2, 0};
    for (int i = 0; i < 4; ++i)
        EXPECT_NEAR(actual[i], expected[i], 1e-3);  // EXR keeps half floats by default
}

TEST_F(ImageCacheTest, GreyFileFillsAllThreeColors) {
    auto file = folder_.WriteImage<uint8_t>("grey.png", 1, 1, 1, {77});
    EXPECT_EQ(ChannelsAt(*LayerSource(cache_, ImageLayer(file, 1, 1), 8, 1, 1), 0, 0),
              (Channels{255, 77, 77, 77}));
}

TEST_F(ImageCacheTest, WorldsReturnTheirMemoryAlsoWhenAllocationFails) {
    auto file = folder_.WriteImage<uint8_t>("memory.png", 4, 4, 4, std::vector<uint8_t>(64, 9));
    Layer layer = ImageLayer(file, 4, 4);
    int64_t start = U_AccountedBytes();
    {
        auto world = LayerSource(cache_, layer, 32, 1, 1);
        EXPECT_GT(U_AccountedBytes(), start);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
    U_FailAllocationAfter(1);
    EXPECT_THROW(LayerSource(cache_, layer, 16, 1, 1), std::bad_alloc);
    U_FailAllocationAfter(0);
    EXPECT_EQ(U_AccountedBytes(), start);
}

TEST_F(ImageCacheTest, RefusesWhatItCannotDeliver) {
    Layer null;
    null.name = "null";
    EXPECT_THROW(LayerSource(cache_, null, 8, 1, 1), std::invalid_argument);
    Layer solid;
    solid.kind = LayerKind::kSolid;
    solid.source = {{}, {1, 1, 1}, 1, 1};
    EXPECT_THROW(LayerSource(cache_, solid, 12, 1, 1), std::invalid_argument);
    EXPECT_THROW(LayerSource(cache_, solid, 8, 0, 1), std::invalid_argument);
    // An image that went away after loading is reported, and not cached.
    Layer gone = ImageLayer(folder_.Path() / "gone.png", 1, 1);
    EXPECT_THROW(LayerSource(cache_, gone, 8, 1, 1), CompositionError);
    EXPECT_EQ(cache_.Count(), 0u);
}

// Texture fetches arrive from the renderer's worker threads.
TEST(ImageCacheThreads, ConcurrentFetchesShareOneDecode) {
    TempFolder folder;
    auto file = folder.WriteImage<uint8_t>("shared.png", 2, 2, 4, std::vector<uint8_t>(16, 200));
    Layer layer = ImageLayer(file, 2, 2);
    ImageCache cache;
    std::vector<std::thread> threads;
    std::vector<int> red(4, 0);
    for (size_t i = 0; i < red.size(); ++i) {
        threads.emplace_back(
            [&, i] { red[i] = LayerSource(cache, layer, 8, 1, 1)->PixelAt<PF_Pixel8>(1, 1)->red; });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(red, (std::vector<int>{200, 200, 200, 200}));
    EXPECT_EQ(cache.Count(), 1u);
}

}  // namespace
}  // namespace ostrel
