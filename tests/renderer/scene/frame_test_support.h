// Scenes, reporters and iterators for driving the renderer core in tests.
#pragma once

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "m_matrix.h"
#include "pf_iterate.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/scene_desc.h"
#include "u_report.h"

namespace ostrel_test {

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

}  // namespace ostrel_test
