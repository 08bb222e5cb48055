// A layer's properties by the host's stream numbers, the way the stream suite serves them.
#pragma once

#include <array>
#include <cstdint>

#include "composition/composition.h"

namespace ostrel {

enum Stream : int32_t {
    kStreamAnchorPoint = 0,
    kStreamPosition = 1,
    kStreamScale = 2,        // percent
    kStreamOrientation = 3,  // degrees
    kStreamRotationX = 4,
    kStreamRotationY = 5,
    kStreamRotationZ = 6,
    kStreamOpacity = 7,  // percent
    kStreamPointOfInterest = 8,
    kStreamZoom = 11,          // pixels
    kStreamDepthOfField = 12,  // 0 or 1
    kStreamFocusDistance = 13,
    kStreamAperture = 14,
    kStreamBlurLevel = 15,        // percent
    kStreamIntensity = 16,        // percent
    kStreamColor = 17,            // alpha 1, red, green, blue
    kStreamConeAngle = 18,        // degrees
    kStreamConeFeather = 19,      // percent
    kStreamShadowDarkness = 20,   // percent
    kStreamShadowDiffusion = 21,  // pixels
    kStreamAcceptsShadows = 22,   // 0 off, 1 on, 2 only
    kStreamAcceptsLights = 23,    // 0 or 1
    kStreamAmbient = 24,          // percent, like the two after it
    kStreamDiffuse = 25,
    kStreamSpecularIntensity = 26,
    kStreamShininess = 27,          // percent
    kStreamCastsShadows = 28,       // layers: 0 off, 1 on, 2 only; lights: 0 or 1
    kStreamLightTransmission = 29,  // percent
    kStreamMetal = 30,              // percent
    kStreamIrisShape = 32,          // 1 fast rectangle, 3 and up the sides of a polygon
    kStreamIrisRotation = 33,       // degrees
    kStreamIrisRoundness = 34,      // percent
    kStreamIrisAspect = 35,
    kStreamDiffractionFringe = 36,    // percent
    kStreamHighlightGain = 37,        // percent
    kStreamHighlightThreshold = 38,   // 8-bit levels
    kStreamHighlightSaturation = 39,  // percent
    kStreamFalloff = 40,              // 1 none, 2 smooth, 3 inverse square
    kStreamFalloffRadius = 41,        // pixels
    kStreamFalloffDistance = 42,      // pixels
};

// Up to four components: x, y, z for points and scales; alpha, red, green, blue for colours.
struct StreamVector {
    std::array<double, 4> values{};
    int32_t count = 0;
};

// True when the layer has that stream: transforms on every layer (anchor point, scale and
// opacity only on layers with pixels and nulls), materials on image and solid layers, the
// camera's streams on cameras, the light's on lights.
bool HasStream(const Layer& layer, int32_t stream);

// The stream's value at that time. Throws std::out_of_range for a stream the layer lacks.
StreamVector StreamValues(const Layer& layer, int32_t stream, double seconds);

// The first component of StreamValues: the whole value of a one-dimensional stream.
double StreamValue(const Layer& layer, int32_t stream, double seconds);

}  // namespace ostrel
