// The composition model: what a composition file describes, resolved and validated. Values are
// kept as the host shows them to the user: percents, degrees, pixels, seconds.
#pragma once

#include <array>
#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

#include "composition/keyframes.h"
#include "qngp_suites.h"
#include "t_time.h"

namespace ostrel {

using Color = std::array<double, 3>;  // red, green, blue; 0 to 1

enum class LayerKind { kImage, kSolid, kNull, kCamera, kLight };

// The values are the host's quality codes.
enum class Quality : int16_t {
    kWireframe = kQNGP_QualityWireframe,
    kDraft = kQNGP_QualityDraft,
    kBest = kQNGP_QualityBest,
};

// Texture sampling at best quality.
enum class Sampling { kBilinear, kBicubic };

// The values are the host's track matte types; the matte comes from another layer's pixels.
enum class TrackMatte : int32_t {
    kNone = kQNGP_TrackMatteNone,
    kAlpha = kQNGP_TrackMatteAlpha,
    kAlphaInverted = kQNGP_TrackMatteInvertedAlpha,
    kLuma = kQNGP_TrackMatteLuma,
    kLumaInverted = kQNGP_TrackMatteInvertedLuma,
};

// Shadow casting and accepting; the values are the host's stream values (2: only shadows).
// The values are the host's shadow switch values.
enum class ShadowMode : int32_t {
    kOff = kQNGP_ShadowsOff,
    kOn = kQNGP_ShadowsOn,
    kOnly = kQNGP_ShadowsOnly,
};

// The values are the host's light types.
enum class LightType : int32_t {
    kParallel = kQNGP_LightParallel,
    kSpot = kQNGP_LightSpot,
    kPoint = kQNGP_LightPoint,
    kAmbient = kQNGP_LightAmbient,
};

// The values are the host's falloff stream values (one more than the renderer's type).
enum class Falloff : int32_t { kNone = 1, kSmooth = 2, kInverseSquare = 3 };

// A one-node camera looks along its own +z; a two-node camera aims it at its point of interest.
enum class CameraNodes { kOneNode, kTwoNode };

struct Transform {
    Vector3 anchorPoint;                   // layer pixels
    Vector3 position;                      // parent's space, or world
    Vector3 scale{Vec<3>{100, 100, 100}};  // percent
    Vector3 orientation;  // degrees about x, y, z, applied before the three rotations
    Scalar rotationX, rotationY, rotationZ;  // degrees
    Scalar opacity{Vec<1>{100}};             // percent
};

struct Material {
    ShadowMode castsShadows = ShadowMode::kOff;
    ShadowMode acceptsShadows = ShadowMode::kOn;
    bool acceptsLights = true;
    Scalar ambient{Vec<1>{100}};  // percent, like the five below
    Scalar diffuse{Vec<1>{50}};
    Scalar specularIntensity{Vec<1>{50}};
    Scalar shininess{Vec<1>{5}};
    Scalar metal{Vec<1>{100}};
    Scalar lightTransmission{Vec<1>{0}};
};

// Iris shape codes: 1 is the fast rectangle; from 3 on, the number of sides of a polygon.
inline constexpr int32_t kIrisFastRectangle = 1;

struct DepthOfField {
    bool enabled = false;
    Scalar focusDistance;           // pixels; the loader's default is the zoom
    Scalar aperture{Vec<1>{25}};    // pixels
    Scalar blurLevel{Vec<1>{100}};  // percent
    int32_t irisShape = kIrisFastRectangle;
    Scalar irisRotation;   // degrees
    Scalar irisRoundness;  // percent
    Scalar irisAspect{Vec<1>{1}};
    Scalar diffractionFringe;                // percent
    Scalar highlightGain;                    // percent
    Scalar highlightThreshold{Vec<1>{255}};  // in 8-bit levels, as the host shows it
    Scalar highlightSaturation;              // percent
};

struct CameraSettings {
    CameraNodes nodes = CameraNodes::kTwoNode;
    bool orthographic = false;
    Scalar zoom;  // pixels; the loader's default is DefaultCameraDistance
    DepthOfField depthOfField;
};

struct LightSettings {
    LightType type = LightType::kPoint;
    Scalar intensity{Vec<1>{100}};  // percent
    Vector3 color{Vec<3>{1, 1, 1}};
    Scalar coneAngle{Vec<1>{90}};    // degrees, spot lights
    Scalar coneFeather{Vec<1>{50}};  // percent, spot lights
    Falloff falloff = Falloff::kNone;
    Scalar radius{Vec<1>{500}};    // pixels
    Scalar distance{Vec<1>{500}};  // pixels
    bool castsShadows = false;
    Scalar shadowDarkness{Vec<1>{100}};  // percent
    Scalar shadowDiffusion;              // pixels
    bool lightsOnlyLayersBelow = false;
};

// What an image or solid layer shows. Sizes are in layer pixels.
struct Source {
    std::filesystem::path image;  // absolute; empty for a solid
    Color solidColor{};
    int32_t width = 0;
    int32_t height = 0;
    // A solid plane without edges: frames show it wherever its plane is seen. Its size is
    // still the comp's, which places its default anchor point and is its source rectangle.
    bool unbounded = false;
};

struct Layer {
    std::string name;
    LayerKind kind = LayerKind::kNull;
    Source source;       // image and solid layers
    double inPoint = 0;  // seconds; the layer shows for inPoint <= t < outPoint
    double outPoint = 0;
    bool on = true;
    bool threeD = false;
    int32_t parent = -1;  // index in the composition's layers, or -1
    Transform transform;
    // Two-node cameras, spot and parallel lights aim their +z axis at this point.
    bool hasPointOfInterest = false;
    Vector3 pointOfInterest;
    Quality quality = Quality::kBest;
    Sampling sampling = Sampling::kBilinear;
    std::string transferMode = "normal";  // a name from the pixel library's mode table
    bool preserveTransparency = false;
    TrackMatte trackMatte = TrackMatte::kNone;
    int32_t matteLayer = -1;  // index of the layer whose pixels make the matte, or -1
    bool motionBlur = false;
    bool collapse = false;
    Material material;      // image and solid layers
    CameraSettings camera;  // camera layers
    LightSettings light;    // light layers

    // On, and inside its in and out times.
    bool IsActiveAt(double seconds) const { return on && seconds >= inPoint && seconds < outPoint; }
    bool HasPixels() const { return kind == LayerKind::kImage || kind == LayerKind::kSolid; }
};

struct MotionBlurSettings {
    bool enabled = false;
    int32_t samplesPerFrame = 16;
    int32_t shutterAngle = 180;  // degrees of a frame the shutter stays open
    int32_t shutterPhase = -90;  // degrees from the frame's time to the shutter's opening
};

struct Blending {
    bool linear = false;
    double gamma = 2.2;
};

// Frames per second as numerator / denominator, so that 30000/1001 stays exact.
struct FrameRate {
    int32_t numerator = 24;
    int32_t denominator = 1;
};

struct Composition {
    std::filesystem::path file;  // the file it was read from, for messages
    int32_t width = 0;
    int32_t height = 0;
    double pixelAspect = 1;
    FrameRate frameRate;
    double duration = 0;   // seconds
    int16_t bitDepth = 8;  // 8, 16 or 32
    Color background{};
    bool renderBackground = false;  // frames are opaque, over the background colour
    MotionBlurSettings motionBlur;
    bool lightsAndDepthOfField = true;  // false renders without lights and depth of field
    Blending blending;
    std::vector<uint8_t> rendererOptions;  // the renderer's flattened instance options
    std::vector<Layer> layers;             // comp order: index 0 is the top layer

    int32_t FrameCount() const;
    T_Time FrameDuration() const {
        return {frameRate.denominator, static_cast<uint32_t>(frameRate.numerator)};
    }
    // Throws std::overflow_error when the time does not fit a T_Time.
    T_Time FrameTime(int32_t frame) const;
    // Index of the layer with that name, or -1.
    int32_t LayerIndex(std::string_view name) const;
};

}  // namespace ostrel
