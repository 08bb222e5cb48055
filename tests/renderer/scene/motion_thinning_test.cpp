#include "renderer/scene/motion_thinning.h"

#include <gtest/gtest.h>

#include <vector>

#include "u_memory.h"

namespace {

// A renderable whose subsample i is valid where valid[i] is set; each subsample remembers its
// original index in its camera index.
SY_TRLayer MakeRenderable(const std::vector<bool>& valid, bool bestQuality) {
    SY_LayerDesc layer;
    layer.material.bestQuality = bestQuality;
    SY_TRLayer renderable(layer);
    renderable.subsamples.Allocate(static_cast<int32_t>(valid.size()));
    for (int32_t i = 0; i < renderable.subsamples.Count(); ++i) {
        SY_Subsample& s = renderable.subsamples[i];
        s.cameraIndex = i;
        if (!valid[static_cast<size_t>(i)]) continue;
        s.plane[2] = -1;
        s.vertices = {{0, 0, 1, 1}, {1, 0, 1, 1}, {0, 1, 1, 1}};
        if (renderable.firstValid < 0) renderable.firstValid = i;
        renderable.lastValid = i;
    }
    renderable.multiSample = valid.size() > 1;
    return renderable;
}

TEST(MotionThinning, DraftKeepsEverySecondSubsampleFromTheFirstValidParity) {
    struct Case {
        const char* name;
        std::vector<bool> valid;
        bool bestQuality;
        std::vector<int32_t> kept;  // original indices
        int32_t firstValid, lastValid;
    };
    const std::vector<Case> cases = {
        {"four valid, even start", {true, true, true, true}, false, {0, 2}, 0, 1},
        {"first invalid, odd start", {false, true, true, true}, false, {1, 3}, 0, 1},
        {"kept middle invalid", {true, false, false, false, true, true}, false, {0, 2, 4}, 0, 2},
        {"valid at one subsample only", {false, true, false, false}, false, {0, 1, 2, 3}, 1, 1},
        {"best quality", {true, true, true, true}, true, {0, 1, 2, 3}, 0, 3},
    };
    int64_t start = U_AccountedBytes();
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        {
            SY_TRLayer renderable = MakeRenderable(c.valid, c.bestQuality);
            SY_ThinDraftMotionBlur(&renderable);
            std::vector<int32_t> kept;
            for (const SY_Subsample& s : renderable.subsamples)
                kept.push_back(s.cameraIndex);
            EXPECT_EQ(kept, c.kept);
            EXPECT_EQ(renderable.firstValid, c.firstValid);
            EXPECT_EQ(renderable.lastValid, c.lastValid);
            EXPECT_EQ(renderable.multiSample, c.kept.size() > 1);
        }
        EXPECT_EQ(U_AccountedBytes(), start);
    }
}

}  // namespace
