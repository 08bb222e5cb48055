// The scene model: the renderer's whole input for one frame. Scene capture fills it; the frame
// driver and everything below only read it, so any thread may read it without locking.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "m_matrix.h"
#include "pf_xfer.h"
#include "renderer/scene/fetchers.h"
#include "renderer/scene/owned_array.h"

struct SY_CameraDOFDesc {
    bool enabled = false;
    double zoom = 0;  // focal length in pixels; 0 for an orthographic camera
    double focusDistance = 0;
    double aperture = 0;
    double blurLevel = 0;  // fraction
    int16_t downsampleX = 1;
    int16_t downsampleY = 1;
    double pixelAspect = 1;
    double irisShape = 0;      // from 3 on the iris kernels shape the blur
    double irisRotation = 0;   // degrees
    double irisRoundness = 0;  // fraction
    double irisAspect = 1;
    double diffractionFringe = 0;  // fraction
    double highlightGain = 0;      // fraction; non-zero boosts highlights
    double highlightThreshold = 0;
    double highlightSaturation = 0;  // fraction
};

enum SY_LightType : int32_t {
    kSY_LightParallel = 0,
    kSY_LightSpot = 1,
    kSY_LightPoint = 2,
    kSY_LightAmbient = 3,
};

struct SY_LightDesc {
    int32_t type = kSY_LightParallel;
    int32_t id = 0;                       // the light layer's index in the composition
    SY_OwnedArray<M_Matrix4> placements;  // per subsample; only the middle one is used
    double color[4] = {1, 0, 0, 0};       // alpha, red, green, blue; colour times intensity
    double coneHalfAngle = 0;             // radians; spot lights only
    double coneFeather = 0;               // fraction
    bool castsShadows = false;
    double shadowDarkness = 0;   // fraction
    double shadowDiffusion = 0;  // pixels
    int32_t falloffType = 0;
    double falloffRadius = 0;
    double falloffDistance = 0;
    int32_t shadowMapSize = 0;  // pixels; 0 chooses from the output size
};

// How a best-quality layer's texture is sampled. The values are the host engine's, which the
// layer record keeps as it reports them.
// Whether a layer is darkened by shadows; "only" draws nothing but the shadows on it.
enum SY_AcceptsShadows : uint8_t {
    kSY_AcceptsShadowsOff = 0,
    kSY_AcceptsShadowsOn = 1,
    kSY_AcceptsShadowsOnly = 2,
};

enum class SY_SamplingFilter : uint8_t {
    kNearest = 0,
    kBilinear = 1,
    kBicubic = 2,
};

// What a layer is drawn with, from its position in the render order to its motion-blur switch.
// The layer record holds it, and the renderable and its shader copy it whole, so a setting is
// added in one place.
struct SY_Material {
    int32_t renderIndex = 0;
    int32_t depthIndex = 0;
    uint8_t mode = 2;  // transfer mode in bits 0-6, keep-alpha in bit 7
    double opacity = 1;
    double ambient = 1;
    double diffuse = 0.5;
    double specular = 0.5;
    double shininess = 5;
    double lightTransmission = 0;
    double metal = 1;
    bool renders = true;
    bool wireframe = false;
    bool castsShadows = false;
    uint8_t acceptsShadows = kSY_AcceptsShadowsOff;
    bool acceptsLights = true;
    bool bestQuality = false;                                    // false: draft
    SY_SamplingFilter engineFlag = SY_SamplingFilter::kNearest;  // used at best quality only
    bool motionBlur = false;
};

// A draft layer samples the nearest texel whatever its engine asks for.
inline SY_SamplingFilter SY_SamplingFilterOf(const SY_Material& material) {
    return material.bestQuality ? material.engineFlag : SY_SamplingFilter::kNearest;
}

struct SY_LayerDesc {
    SY_OwnedArray<M_Matrix4> placements;  // layer pixels to world, per subsample
    double scaleX = 1, scaleY = 1;
    int32_t left = 0, top = 0, right = 0, bottom = 0;  // source rectangle in layer pixels
    SY_Material material;
    bool collapsed = false;
    bool unbounded = false;
    std::vector<int32_t> lightIds;
    int32_t compIndex = 0;
    std::unique_ptr<SY_TImageFetcher> trackMatte;
};

struct SY_SceneDesc {
    SY_OwnedArray<M_Matrix4> cameraPlacements;   // eye to world, per subsample
    SY_OwnedArray<M_Matrix4> cameraProjections;  // eye to screen, per subsample
    M_Matrix4 framePlacement{};
    M_Matrix4 frameProjection{};
    bool perspective = true;
    SY_CameraDOFDesc dof;
    double pixelAspect = 1;
    int16_t downsampleX = 1, downsampleY = 1;
    int32_t fieldMode = 0;  // 0 every row, 1 even rows only, 2 odd rows only
    SY_OwnedArray<SY_LayerDesc> layers;
    SY_OwnedArray<SY_LightDesc> lights;
    bool lightsEnabled = false;
    // The host's blending tables for the frame, handed unchanged to the spans and the resolve;
    // null blends the stored values.
    const PF_LinearBlendingTables* colorSettings = nullptr;
};
