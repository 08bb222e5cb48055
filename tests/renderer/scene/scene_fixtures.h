// Cameras and layer placements built the way scene capture builds them, for geometry tests.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <initializer_list>
#include <new>

#include "frame_test_support.h"
#include "m_matrix.h"
#include "renderer/scene/renderable.h"
#include "renderer/scene/scene_desc.h"
#include "u_memory.h"

namespace scene_test {

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

// The world-to-screen matrix of the default camera (see SetDefaultCamera).
inline M_Matrix4 DefaultCamera(double width, double height, double distance, bool perspective) {
    SY_SceneDesc scene;
    ostrel_test::SetDefaultCamera(&scene, width, height, distance, 1, perspective);
    M_Matrix4 eye, worldToScreen;
    M_InverseMatrix4(&scene.framePlacement, &eye);
    M_ConcatMatrix4(&eye, &scene.frameProjection, &worldToScreen);
    return worldToScreen;
}

// A placement that turns the layer about its point (cx, cy) by rx about x, then ry about y,
// and puts that point at (x, y, z) in the world.
inline M_Matrix4 Turned(double cx, double cy, double rx, double ry, double x, double y, double z) {
    M_Matrix4 m = Translation(-cx, -cy, 0);
    M_RotateMatrix4XYZ(rx, ry, 0, &m);
    M_TranslateMatrix4(x, y, z, &m);
    return m;
}

inline void SetPlacements(SY_LayerDesc* layer, std::initializer_list<M_Matrix4> placements) {
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

}  // namespace scene_test
