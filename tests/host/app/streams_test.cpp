#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "composition/composition_loader.h"
#include "composition/host_codes.h"
#include "composition/streams.h"

namespace ostrel {
namespace {

Composition Parse(const std::string& layers) {
    return ParseComposition(
        R"({"width": 360, "height": 240, "duration": 2, "motionBlur": {"enabled": true},
            "lightsAndDepthOfField": false, "layers": [)" +
            layers + "]}",
        "streams_test.json");
}

TEST(Streams, LayerValuesComeAsTheHostShowsThem) {
    Composition comp = Parse(R"({"kind": "solid", "threeD": true, "motionBlur": true,
        "source": {"color": [1, 0, 0], "width": 10, "height": 10},
        "transform": {"scale": [50, 25, 100], "opacity": {"keyframes": [
            {"time": 0, "value": 0}, {"time": 2, "value": 100}]}},
        "material": {"castsShadows": "only", "acceptsShadows": "off", "acceptsLights": false,
                     "ambient": 10, "diffuse": 20, "specularIntensity": 30, "shininess": 40,
                     "metal": 50, "lightTransmission": 60}})");
    const Layer& layer = comp.layers[0];
    struct Case {
        int32_t stream;
        double expected;
    };
    const Case cases[] = {
        {kStreamOpacity, 50},           {kStreamCastsShadows, 2}, {kStreamAcceptsShadows, 0},
        {kStreamAcceptsLights, 0},      {kStreamAmbient, 10},     {kStreamDiffuse, 20},
        {kStreamSpecularIntensity, 30}, {kStreamShininess, 40},   {kStreamMetal, 50},
        {kStreamLightTransmission, 60},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(layer, c.stream, 1.0), c.expected) << c.stream;
    StreamVector scale = StreamValues(layer, kStreamScale, 0.0);
    EXPECT_EQ(scale.count, 3);
    EXPECT_DOUBLE_EQ(scale.values[0], 50);
    EXPECT_DOUBLE_EQ(scale.values[1], 25);
    EXPECT_EQ(LayerFlags(layer), kLayerFlagMotionBlur);
    EXPECT_EQ(CompFlags(comp), kCompFlagMotionBlur | kCompFlagNoLightsNoDepthOfField);
}

TEST(Streams, CameraValues) {
    Composition comp = Parse(R"({"kind": "camera", "camera": {"zoom": 800, "orthographic": true,
        "depthOfField": {"enabled": true, "aperture": 40, "blurLevel": 150, "irisShape": "hexagon",
                         "irisRotation": 15, "irisRoundness": 20, "irisAspect": 1.5,
                         "diffractionFringe": 30, "highlightGain": 40, "highlightThreshold": 200,
                         "highlightSaturation": 50}}})");
    const Layer& camera = comp.layers[0];
    struct Case {
        int32_t stream;
        double expected;
    };
    const Case cases[] = {
        {kStreamZoom, 800},
        {kStreamDepthOfField, 1},
        {kStreamFocusDistance, 800},
        {kStreamAperture, 40},
        {kStreamBlurLevel, 150},
        {kStreamIrisShape, 6},
        {kStreamIrisRotation, 15},
        {kStreamIrisRoundness, 20},
        {kStreamIrisAspect, 1.5},
        {kStreamDiffractionFringe, 30},
        {kStreamHighlightGain, 40},
        {kStreamHighlightThreshold, 200},
        {kStreamHighlightSaturation, 50},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(camera, c.stream, 0.0), c.expected) << c.stream;
    EXPECT_EQ(CameraType(camera), kCameraTypeOrthographic);
    EXPECT_EQ(ObjectType(camera), kObjectTypeCamera);
}

TEST(Streams, LightValues) {
    Composition comp = Parse(R"({"kind": "light", "light": {"type": "spot", "intensity": 150,
        "color": "#ff8000", "coneAngle": 60, "coneFeather": 25, "falloff": "inverse-square",
        "radius": 100, "distance": 300, "castsShadows": true, "shadowDarkness": 70,
        "shadowDiffusion": 12, "lightsOnlyLayersBelow": true}})");
    const Layer& light = comp.layers[0];
    StreamVector color = StreamValues(light, kStreamColor, 0.0);
    ASSERT_EQ(color.count, 4);
    const double kOrange[] = {1, 1, 128.0 / 255.0, 0};  // alpha, red, green, blue
    for (int i = 0; i < 4; ++i)
        EXPECT_DOUBLE_EQ(color.values[i], kOrange[i]);
    struct Case {
        int32_t stream;
        double expected;
    };
    const Case cases[] = {
        {kStreamIntensity, 150},  {kStreamConeAngle, 60},      {kStreamConeFeather, 25},
        {kStreamFalloff, 3},      {kStreamFalloffRadius, 100}, {kStreamFalloffDistance, 300},
        {kStreamCastsShadows, 1}, {kStreamShadowDarkness, 70}, {kStreamShadowDiffusion, 12},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(light, c.stream, 0.0), c.expected) << c.stream;
    EXPECT_EQ(LayerFlags(light), kLayerFlagLightsOnlyLayersBelow);
    EXPECT_EQ(ObjectType(light), kObjectTypeLight);
    // A spot light aims at the comp centre unless told otherwise.
    StreamVector target = StreamValues(light, kStreamPointOfInterest, 0.0);
    EXPECT_DOUBLE_EQ(target.values[0], 180);
    EXPECT_DOUBLE_EQ(target.values[1], 120);
}

TEST(Streams, StreamsALayerLacksAreRefused) {
    Composition comp = Parse(R"({"kind": "camera"}, {"kind": "null"}, {"kind": "light"})");
    EXPECT_FALSE(HasStream(comp.layers[0], kStreamAmbient));
    EXPECT_FALSE(HasStream(comp.layers[0], kStreamScale));
    EXPECT_TRUE(HasStream(comp.layers[0], kStreamZoom));
    EXPECT_TRUE(HasStream(comp.layers[1], kStreamOpacity));
    EXPECT_FALSE(HasStream(comp.layers[1], kStreamCastsShadows));
    // A point light has no point of interest to aim at.
    EXPECT_FALSE(HasStream(comp.layers[2], kStreamPointOfInterest));
    EXPECT_THROW(StreamValue(comp.layers[0], kStreamMetal, 0.0), std::out_of_range);
    EXPECT_THROW(StreamValue(comp.layers[1], 99, 0.0), std::out_of_range);
}

}  // namespace
}  // namespace ostrel
