// The layer streams scene capture reads, and reading them through the Stream suite.
#pragma once

#include <cstdint>

#include "qngp_suites.h"
#include "suite_table.h"

enum class ORM_Stream : int32_t {
    kScale = 2,  // x and y, percent
    // Camera.
    kZoom = 11,  // pixels
    kDepthOfField = 12,
    kFocusDistance = 13,
    kAperture = 14,
    kBlurLevel = 15,
    // Light.
    kIntensity = 16,
    kColor = 17,      // alpha, red, green, blue
    kConeAngle = 18,  // degrees
    kConeFeather = 19,
    kShadowDarkness = 20,
    kShadowDiffusion = 21,
    // Material.
    kAcceptsShadows = 22,  // 0 off, 1 on, 2 only
    kAcceptsLights = 23,
    kAmbient = 24,
    kDiffuse = 25,
    kSpecular = 26,
    kShininess = 27,
    kCastsShadows = 28,  // 0 off, 1 on, 2 only; also a light's switch
    kLightTransmission = 29,
    kMetal = 30,
    // Camera iris and highlights.
    kIrisShape = 32,
    kIrisRotation = 33,
    kIrisRoundness = 34,
    kIrisAspect = 35,
    kDiffractionFringe = 36,
    kHighlightGain = 37,
    kHighlightThreshold = 38,
    kHighlightSaturation = 39,
    // Light falloff.
    kFalloff = 40,  // the host's menu, from 1
    kFalloffRadius = 41,
    kFalloffDistance = 42,
};

// The stream's value on the layer at that time, in layer time.
QNGP_StreamValue ORM_StreamValue(ORM_SuiteTable& suites, QNGP_LayerH layer, ORM_Stream stream,
                                 const T_Time& time);

// A one-number stream.
inline double ORM_StreamNumber(ORM_SuiteTable& suites, QNGP_LayerH layer, ORM_Stream stream,
                               const T_Time& time) {
    return ORM_StreamValue(suites, layer, stream, time).v[0];
}

// A percentage stream as a fraction.
inline double ORM_StreamFraction(ORM_SuiteTable& suites, QNGP_LayerH layer, ORM_Stream stream,
                                 const T_Time& time) {
    return ORM_StreamNumber(suites, layer, stream, time) / 100;
}
