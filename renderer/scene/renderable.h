// Renderables: what the frame driver draws. A layer renderable carries the layer's material and
// flags and, per geometry subsample, its clipped screen polygon and the plane it lies in.
#pragma once

#include <cfloat>
#include <cstdint>

#include "m_matrix.h"
#include "renderer/scene/accounted_allocator.h"
#include "renderer/scene/owned_array.h"
#include "renderer/scene/scene_desc.h"

struct SY_LightState;
struct SY_RenderContext;
class SY_RenderTarget;
class SY_Shader;

// The camera as the geometry sees it: world-to-screen matrices, one per camera subsample.
struct SY_CameraView {
    const M_Matrix4* worldToScreen = nullptr;
    int32_t count = 0;
    bool perspective = true;
};

// A screen vertex; after the perspective division w is 1.
struct SY_Vertex {
    double x, y, z, w;
};

using SY_Polygon = SY_AccountedVector<SY_Vertex>;

// Separates the layers of a coplanar stack in depth, per position in the render order: later
// layers lie this much farther behind, in their geometry and in their fragments' depth keys.
inline constexpr double kSY_DepthStepPerIndex = 1e-7;

// Below this the plane's depth coefficient is taken as zero: the layer is seen edge-on.
inline constexpr double kSY_PlaneDepthEpsilon = 1e-12;

struct SY_Subsample {
    SY_Polygon vertices;  // the clipped screen polygon; empty when nothing is visible
    // a·x + b·y + c·z + d = 0 in screen space, (a, b, c) of length 1 and c < 0; all zero for a
    // subsample that was skipped.
    double plane[4] = {};
    M_Matrix4 placement{};  // layer pixels to world
    int32_t cameraIndex = 0;

    // The plane faces the screen, so depth is a function of screen x and y.
    bool IsValid() const {
        return plane[2] > kSY_PlaneDepthEpsilon || plane[2] < -kSY_PlaneDepthEpsilon;
    }
    // Screen depth of the plane at (x, y); only for a valid subsample.
    double DepthAt(double x, double y) const {
        return -(plane[0] * x + plane[1] * y + plane[3]) / plane[2];
    }
};

// What the layer's position in the render order adds to its fragments' depth keys.
inline float SY_DepthOffset(const SY_Material& material) {
    return static_cast<float>(-material.depthIndex * kSY_DepthStepPerIndex);
}

class SY_TRenderable {
public:
    virtual ~SY_TRenderable() = default;
    virtual void Render(SY_RenderContext* context, const SY_CameraView& camera, SY_Shader* shader,
                        int32_t fieldMode, const SY_RenderTarget& target) = 0;

protected:
    SY_TRenderable() = default;
    SY_TRenderable(const SY_TRenderable&) = default;
    SY_TRenderable(SY_TRenderable&&) = default;
    SY_TRenderable& operator=(const SY_TRenderable&) = default;
    SY_TRenderable& operator=(SY_TRenderable&&) = default;
};

class SY_TRLayer final : public SY_TRenderable {
public:
    // Material, flags and the borrowed track matte of the layer; no geometry yet.
    explicit SY_TRLayer(const SY_LayerDesc& layer);
    SY_TRLayer(SY_TRLayer&&) noexcept = default;
    SY_TRLayer& operator=(SY_TRLayer&&) noexcept = default;

    // Draws the layer into the target row by row, counts it as done and reports progress.
    // Modes 1 and 3 need a layer shader. Throws what the texture fetch, the geometry and the
    // row work throw, with the texture and the track matte handed back.
    void Render(SY_RenderContext* context, const SY_CameraView& camera, SY_Shader* shader,
                int32_t fieldMode, const SY_RenderTarget& target) override;

    // The screen box is empty when it has no area.
    bool HasEmptyBounds() const { return !(bounds[0] < bounds[2]) || !(bounds[1] < bounds[3]); }

    // Minimum x, y, maximum x, y, minimum z, maximum z of every kept screen vertex.
    double bounds[6] = {DBL_MAX, DBL_MAX, -DBL_MAX, -DBL_MAX, DBL_MAX, -DBL_MAX};
    SY_Material material;
    bool multiSample = false;
    bool collapsed = false;
    bool unbounded = false;
    SY_OwnedArray<const SY_LightState*> lights;  // in the order of the layer's light ids
    int32_t dofMargin[4] = {};  // left, top (negative), right, bottom, in output pixels
    SY_TImageFetcher* trackMatte = nullptr;  // borrowed from the layer record
    SY_OwnedArray<SY_Subsample> subsamples;
    int32_t firstValid = -1;  // first and last subsample whose plane faces the screen
    int32_t lastValid = -1;
};
