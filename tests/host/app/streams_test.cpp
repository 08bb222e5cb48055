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
        {kQNGP_StreamOpacity, 50},
        {kQNGP_StreamCastsShadows, 2},
        {kQNGP_StreamAcceptsShadows, 0},
        {kQNGP_StreamAcceptsLights, 0},
        {kQNGP_StreamAmbient, 10},
        {kQNGP_StreamDiffuse, 20},
        {kQNGP_StreamSpecularIntensity, 30},
        {kQNGP_StreamShininess, 40},
        {kQNGP_StreamMetal, 50},
        {kQNGP_StreamLightTransmission, 60},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(layer, c.stream, 1.0), c.expected) << c.stream;
    StreamVector scale = StreamValues(layer, kQNGP_StreamScale, 0.0);
    EXPECT_EQ(scale.count, 3);
    EXPECT_DOUBLE_EQ(scale.values[0], 50);
    EXPECT_DOUBLE_EQ(scale.values[1], 25);
    EXPECT_EQ(LayerFlags(layer), kQNGP_LayerFlagMotionBlur);
    EXPECT_EQ(CompFlags(comp), kQNGP_CompFlagMotionBlur | kQNGP_CompFlagNoLightsOrDepthOfField);
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
        {kQNGP_StreamZoom, 800},
        {kQNGP_StreamDepthOfField, 1},
        {kQNGP_StreamFocusDistance, 800},
        {kQNGP_StreamAperture, 40},
        {kQNGP_StreamBlurLevel, 150},
        {kQNGP_StreamIrisShape, 6},
        {kQNGP_StreamIrisRotation, 15},
        {kQNGP_StreamIrisRoundness, 20},
        {kQNGP_StreamIrisAspect, 1.5},
        {kQNGP_StreamDiffractionFringe, 30},
        {kQNGP_StreamHighlightGain, 40},
        {kQNGP_StreamHighlightThreshold, 200},
        {kQNGP_StreamHighlightSaturation, 50},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(camera, c.stream, 0.0), c.expected) << c.stream;
    EXPECT_EQ(CameraType(camera), kQNGP_CameraOrthographic);
    EXPECT_EQ(ObjectType(camera), kQNGP_ObjectTypeCamera);
}

TEST(Streams, LightValues) {
    Composition comp = Parse(R"({"kind": "light", "light": {"type": "spot", "intensity": 150,
        "color": "#ff8000", "coneAngle": 60, "coneFeather": 25, "falloff": "inverse-square",
        "radius": 100, "distance": 300, "castsShadows": true, "shadowDarkness": 70,
        "shadowDiffusion": 12, "lightsOnlyLayersBelow": true}})");
    const Layer& light = comp.layers[0];
    StreamVector color = StreamValues(light, kQNGP_StreamColor, 0.0);
    ASSERT_EQ(color.count, 4);
    const double kOrange[] = {1, 1, 128.0 / 255.0, 0};  // alpha, red, green, blue
    for (int i = 0; i < 4; ++i)
        EXPECT_DOUBLE_EQ(color.values[i], kOrange[i]);
    struct Case {
        int32_t stream;
        double expected;
    };
    const Case cases[] = {
        {kQNGP_StreamIntensity, 150},      {kQNGP_StreamConeAngle, 60},
        {kQNGP_StreamConeFeather, 25},     {kQNGP_StreamFalloff, 3},
        {kQNGP_StreamFalloffRadius, 100},  {kQNGP_StreamFalloffDistance, 300},
        {kQNGP_StreamCastsShadows, 1},     {kQNGP_StreamShadowDarkness, 70},
        {kQNGP_StreamShadowDiffusion, 12},
    };
    for (const Case& c : cases)
        EXPECT_DOUBLE_EQ(StreamValue(light, c.stream, 0.0), c.expected) << c.stream;
    EXPECT_EQ(LayerFlags(light), kQNGP_LayerFlagAdjustment);
    EXPECT_EQ(ObjectType(light), kQNGP_ObjectTypeLight);
    // A spot light aims at the comp centre unless told otherwise.
    StreamVector target = StreamValues(light, kQNGP_StreamPointOfInterest, 0.0);
    EXPECT_DOUBLE_EQ(target.values[0], 180);
    EXPECT_DOUBLE_EQ(target.values[1], 120);
}

TEST(Streams, StreamsALayerLacksAreRefused) {
    Composition comp = Parse(R"({"kind": "camera"}, {"kind": "null"}, {"kind": "light"})");
    EXPECT_FALSE(HasStream(comp.layers[0], kQNGP_StreamAmbient));
    EXPECT_FALSE(HasStream(comp.layers[0], kQNGP_StreamScale));
    EXPECT_TRUE(HasStream(comp.layers[0], kQNGP_StreamZoom));
    EXPECT_TRUE(HasStream(comp.layers[1], kQNGP_StreamOpacity));
    EXPECT_FALSE(HasStream(comp.layers[1], kQNGP_StreamCastsShadows));
    // A point light has no point of interest to aim at.
    EXPECT_FALSE(HasStream(comp.layers[2], kQNGP_StreamPointOfInterest));
    EXPECT_THROW(StreamValue(comp.layers[0], kQNGP_StreamMetal, 0.0), std::out_of_range);
    EXPECT_THROW(StreamValue(comp.layers[1], 99, 0.0), std::out_of_range);
}

}  // namespace
}  // namespace ostrel
