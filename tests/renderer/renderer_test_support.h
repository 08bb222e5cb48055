// Scenes, textures, reporters, threads and memory checks for driving the renderer core in
// tests, with layer placements built the way scene capture builds them.
#pragma once

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <initializer_list>
#include <map>
#include <new>
#include <string>
#include <thread>
#include <vector>

#include "m_matrix.h"
#include "pf_iterate.h"
#include "pf_world.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/scene_desc.h"
#include "renderer/scene/threads.h"
#include "u_memory.h"
#include "u_report.h"

namespace renderer_test {

using PixelTypes = ::testing::Types<PF_Pixel8, PF_Pixel16, PF_PixelFloat>;

// The camera a composition without a camera layer gets: at (w/2, h/2, −d) looking down +z with
// zoom d, so that the plane z = 0 maps 1:1 onto the output; orthographic, it does at any depth.
inline void SetDefaultCamera(SY_SceneDesc* scene, double width, double height, double distance,
                             int32_t subsamples = 1, bool perspective = true) {
    M_Matrix4 placement, projection;
    M_IdentityMatrix4(&placement);
    M_TranslateMatrix4(width * 0.5, height * 0.5, -distance, &placement);
    M_IdentityMatrix4(&projection);
    if (perspective) projection.Project(distance);
    M_TranslateMatrix4(width * 0.5, height * 0.5, 0, &projection);
    scene->cameraPlacements.Allocate(subsamples);
    scene->cameraProjections.Allocate(subsamples);
    for (int32_t i = 0; i < subsamples; ++i) {
        scene->cameraPlacements[i] = placement;
        scene->cameraProjections[i] = projection;
    }
    scene->framePlacement = placement;
    scene->frameProjection = projection;
    scene->perspective = perspective;
}

// The world-to-screen matrix of the default camera.
inline M_Matrix4 DefaultCamera(double width, double height, double distance, bool perspective) {
    SY_SceneDesc scene;
    SetDefaultCamera(&scene, width, height, distance, 1, perspective);
    M_Matrix4 eye, worldToScreen;
    M_InverseMatrix4(&scene.framePlacement, &eye);
    M_ConcatMatrix4(&eye, &scene.frameProjection, &worldToScreen);
    return worldToScreen;
}

inline M_Matrix4 Identity() {
    M_Matrix4 m;
    M_IdentityMatrix4(&m);
    return m;
}

inline M_Matrix4 Translation(double x, double y, double z) {
    M_Matrix4 m = Identity();
    M_TranslateMatrix4(x, y, z, &m);
    return m;
}

// A placement that turns the layer about its point (cx, cy) by rx about x, then ry about y,
// and puts that point at (x, y, z) in the world.
inline M_Matrix4 Turned(double cx, double cy, double rx, double ry, double x, double y, double z) {
    M_Matrix4 m = Translation(-cx, -cy, 0);
    M_RotateMatrix4XYZ(rx, ry, 0, &m);
    M_TranslateMatrix4(x, y, z, &m);
    return m;
}

// Placements of a layer or a light.
template <class Record>
void SetPlacements(Record* layer, std::initializer_list<M_Matrix4> placements) {
    layer->placements.Allocate(static_cast<int32_t>(placements.size()));
    int32_t i = 0;
    for (const M_Matrix4& m : placements)
        layer->placements[i++] = m;
}

inline void SetRect(SY_LayerDesc* layer, int32_t left, int32_t top, int32_t right, int32_t bottom) {
    layer->left = left;
    layer->top = top;
    layer->right = right;
    layer->bottom = bottom;
}

// A texture fetcher over worlds held in memory, counting what the core asks of it.
class MemoryTextureFetcher : public SY_TTextureFetcher {
public:
    // The texture of the layer at renderIndex; textureToLayer stays identity.
    void Add(int32_t renderIndex, PF_World* world) { worlds_[renderIndex] = world; }

    int32_t Fetch(int32_t renderIndex, bool, const double*, const M_LRect*, M_Matrix3*,
                  PF_World** world) override {
        ++fetches;
        auto it = worlds_.find(renderIndex);
        *world = it == worlds_.end() ? nullptr : it->second;
        return 0;
    }
    void Release(int32_t, PF_World*) override { ++releases; }

    int32_t fetches = 0;
    int32_t releases = 0;

private:
    std::map<int32_t, PF_World*> worlds_;
};

// Records the progress reports of a frame.
class RecordingProgress : public SY_ProgressAbort {
public:
    void ReportRenderables(int32_t done, int32_t count) override {
        renderables.emplace_back(done, count);
    }
    void ReportRows(int32_t row, int32_t count) override { rows.emplace_back(row, count); }

    std::vector<std::pair<int32_t, int32_t>> renderables;
    std::vector<std::pair<int32_t, int32_t>> rows;
};

// Collects everything reported while it lives.
class ReportCapture {
public:
    ReportCapture() : previous_(U_SetReporter(&Collect)) { reports().clear(); }
    ~ReportCapture() { U_SetReporter(previous_); }
    ReportCapture(const ReportCapture&) = delete;
    ReportCapture& operator=(const ReportCapture&) = delete;

    struct Entry {
        int32_t code;
        std::string text;
    };
    static std::vector<Entry>& reports() {
        static std::vector<Entry> entries;
        return entries;
    }

private:
    static void Collect(const U_Report& report) { reports().push_back({report.code, report.text}); }
    U_Reporter previous_;
};

// A threaded iterator like the host's: items over a fixed number of threads of stable index.
template <int32_t kThreads>
struct ThreadedIterateSuite {
    static int32_t GetThreadCount(int32_t* count) {
        *count = kThreads;
        return 0;
    }
    static int32_t Iterate(int32_t count, void* closure, PF_IterateCallback callback) {
        std::atomic<int32_t> next{0};
        std::atomic<int32_t> firstError{0};
        std::vector<std::thread> threads;
        for (int32_t t = 0; t < kThreads; ++t) {
            threads.emplace_back([&, t] {
                for (int32_t i; (i = next.fetch_add(1)) < count;) {
                    if (int32_t error = callback(closure, t, i)) {
                        int32_t none = 0;
                        firstError.compare_exchange_strong(none, error);
                    }
                }
            });
        }
        for (auto& thread : threads)
            thread.join();
        return firstError.load();
    }
    static const QNGP_IterateSuite1* Suite() {
        static const QNGP_IterateSuite1 suite{&GetThreadCount, &Iterate};
        return &suite;
    }
};

// Frames run on kThreads workers with the shared lock live while it exists; single-threaded
// again afterwards, as every other test expects.
template <int32_t kThreads>
struct ThreadedFrame {
    ThreadedFrame() { iterate = SY_PrepareThreads(true, ThreadedIterateSuite<kThreads>::Suite()); }
    ~ThreadedFrame() { SY_PrepareThreads(false, nullptr); }
    ThreadedFrame(const ThreadedFrame&) = delete;
    ThreadedFrame& operator=(const ThreadedFrame&) = delete;

    PF_IterateFunction iterate;
};

// A pixel from channel values given as fractions of the type's maximum.
template <class P>
P PixelOf(float alpha, float red, float green, float blue) {
    using C = typename PF_PixelTraits<P>::Channel;
    constexpr float kMax = PF_PixelTraits<P>::kMax;
    return {C(alpha * kMax), C(red * kMax), C(green * kMax), C(blue * kMax)};
}

// Alpha, red, green, blue: compared and printed as one value.
template <class P>
std::array<double, 4> Channels(const P& p) {
    return {double(p.alpha), double(p.red), double(p.green), double(p.blue)};
}

// Fails the test when the accounted byte count is not back where it was at construction.
struct AccountedBytesCheck {
    ~AccountedBytesCheck() { EXPECT_EQ(U_AccountedBytes(), start) << "memory left accounted"; }

    const int64_t start = U_AccountedBytes();
};

// Makes the nth allocation from now fail for good: the host's purge-and-retry fails as well.
class FailingAllocation {
public:
    explicit FailingAllocation(int64_t n) {
        U_SetPurgeHandler([] {
            U_FailAllocationAfter(1);
            return true;
        });
        U_FailAllocationAfter(n);
    }
    ~FailingAllocation() {
        U_FailAllocationAfter(0);
        U_SetPurgeHandler(nullptr);
    }
    FailingAllocation(const FailingAllocation&) = delete;
    FailingAllocation& operator=(const FailingAllocation&) = delete;
};

// Runs work(fail) with its first, second, ... allocation failing until it runs through; work
// calls `auto failing = fail();` where failures are to start. Every failure must throw the
// out-of-memory code (or std::bad_alloc where `standardToo`, as tracked objects do) and leave
// the accounted bytes where they were. Returns the failure count.
template <class Work>
int32_t FailEachAllocationInTurn(Work work, bool standardToo = false, int64_t limit = 500) {
    int32_t failures = 0;
    for (int64_t n = 1; n <= limit; ++n) {
        int64_t start = U_AccountedBytes();
        bool completed = false;
        try {
            work([n] { return FailingAllocation(n); });
            completed = true;
        } catch (int32_t code) {
            EXPECT_EQ(code, kU_ErrOutOfMemory) << "failing allocation " << n;
            ++failures;
        } catch (const std::bad_alloc&) {
            EXPECT_TRUE(standardToo) << "std::bad_alloc at failing allocation " << n;
            ++failures;
        }
        EXPECT_EQ(U_AccountedBytes(), start) << "failing allocation " << n;
        if (completed) return failures;
    }
    ADD_FAILURE() << "still failing after " << limit << " allocations";
    return failures;
}

}  // namespace renderer_test
