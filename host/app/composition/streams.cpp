#include "composition/streams.h"

#include <optional>
#include <stdexcept>
#include <string>

namespace ostrel {
namespace {

StreamVector One(double value) {
    return {{value, 0, 0, 0}, 1};
}
StreamVector Three(const Vec<3>& v) {
    return {{v[0], v[1], v[2], 0}, 3};
}
StreamVector Switch(bool on) {
    return One(on ? 1.0 : 0.0);
}

std::optional<StreamVector> TransformStream(const Layer& layer, int32_t stream, double t) {
    const Transform& x = layer.transform;
    bool hasPixelSpace = layer.kind != LayerKind::kCamera && layer.kind != LayerKind::kLight;
    switch (stream) {
        case kQNGP_StreamPosition:
            return Three(x.position.At(t));
        case kQNGP_StreamOrientation:
            return Three(x.orientation.At(t));
        case kQNGP_StreamRotationX:
            return One(x.rotationX.ValueAt(t));
        case kQNGP_StreamRotationY:
            return One(x.rotationY.ValueAt(t));
        case kQNGP_StreamRotationZ:
            return One(x.rotationZ.ValueAt(t));
        case kQNGP_StreamPointOfInterest:
            if (layer.hasPointOfInterest) return Three(layer.pointOfInterest.At(t));
            return std::nullopt;
        default:
            break;
    }
    if (!hasPixelSpace) return std::nullopt;
    switch (stream) {
        case kQNGP_StreamAnchorPoint:
            return Three(x.anchorPoint.At(t));
        case kQNGP_StreamScale:
            return Three(x.scale.At(t));
        case kQNGP_StreamOpacity:
            return One(x.opacity.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> MaterialStream(const Material& m, int32_t stream, double t) {
    switch (stream) {
        case kQNGP_StreamAcceptsShadows:
            return One(static_cast<double>(m.acceptsShadows));
        case kQNGP_StreamAcceptsLights:
            return Switch(m.acceptsLights);
        case kQNGP_StreamAmbient:
            return One(m.ambient.ValueAt(t));
        case kQNGP_StreamDiffuse:
            return One(m.diffuse.ValueAt(t));
        case kQNGP_StreamSpecularIntensity:
            return One(m.specularIntensity.ValueAt(t));
        case kQNGP_StreamShininess:
            return One(m.shininess.ValueAt(t));
        case kQNGP_StreamCastsShadows:
            return One(static_cast<double>(m.castsShadows));
        case kQNGP_StreamLightTransmission:
            return One(m.lightTransmission.ValueAt(t));
        case kQNGP_StreamMetal:
            return One(m.metal.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> CameraStream(const CameraSettings& c, int32_t stream, double t) {
    const DepthOfField& d = c.depthOfField;
    switch (stream) {
        case kQNGP_StreamZoom:
            return One(c.zoom.ValueAt(t));
        case kQNGP_StreamDepthOfField:
            return Switch(d.enabled);
        case kQNGP_StreamFocusDistance:
            return One(d.focusDistance.ValueAt(t));
        case kQNGP_StreamAperture:
            return One(d.aperture.ValueAt(t));
        case kQNGP_StreamBlurLevel:
            return One(d.blurLevel.ValueAt(t));
        case kQNGP_StreamIrisShape:
            return One(d.irisShape);
        case kQNGP_StreamIrisRotation:
            return One(d.irisRotation.ValueAt(t));
        case kQNGP_StreamIrisRoundness:
            return One(d.irisRoundness.ValueAt(t));
        case kQNGP_StreamIrisAspect:
            return One(d.irisAspect.ValueAt(t));
        case kQNGP_StreamDiffractionFringe:
            return One(d.diffractionFringe.ValueAt(t));
        case kQNGP_StreamHighlightGain:
            return One(d.highlightGain.ValueAt(t));
        case kQNGP_StreamHighlightThreshold:
            return One(d.highlightThreshold.ValueAt(t));
        case kQNGP_StreamHighlightSaturation:
            return One(d.highlightSaturation.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> LightStream(const LightSettings& l, int32_t stream, double t) {
    switch (stream) {
        case kQNGP_StreamIntensity:
            return One(l.intensity.ValueAt(t));
        case kQNGP_StreamColor: {
            Vec<3> rgb = l.color.At(t);
            return StreamVector{{1.0, rgb[0], rgb[1], rgb[2]}, 4};
        }
        case kQNGP_StreamConeAngle:
            return One(l.coneAngle.ValueAt(t));
        case kQNGP_StreamConeFeather:
            return One(l.coneFeather.ValueAt(t));
        case kQNGP_StreamShadowDarkness:
            return One(l.shadowDarkness.ValueAt(t));
        case kQNGP_StreamShadowDiffusion:
            return One(l.shadowDiffusion.ValueAt(t));
        case kQNGP_StreamCastsShadows:
            return Switch(l.castsShadows);
        case kQNGP_StreamFalloff:
            return One(static_cast<double>(l.falloff));
        case kQNGP_StreamFalloffRadius:
            return One(l.radius.ValueAt(t));
        case kQNGP_StreamFalloffDistance:
            return One(l.distance.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> Lookup(const Layer& layer, int32_t stream, double t) {
    if (auto value = TransformStream(layer, stream, t)) return value;
    switch (layer.kind) {
        case LayerKind::kImage:
        case LayerKind::kSolid:
            return MaterialStream(layer.material, stream, t);
        case LayerKind::kCamera:
            return CameraStream(layer.camera, stream, t);
        case LayerKind::kLight:
            return LightStream(layer.light, stream, t);
        case LayerKind::kNull:
            break;
    }
    return std::nullopt;
}

}  // namespace

bool HasStream(const Layer& layer, int32_t stream) {
    return Lookup(layer, stream, 0.0).has_value();
}

StreamVector StreamValues(const Layer& layer, int32_t stream, double seconds) {
    if (auto value = Lookup(layer, stream, seconds)) return *value;
    throw std::out_of_range("layer \"" + layer.name + "\" has no stream " + std::to_string(stream));
}

double StreamValue(const Layer& layer, int32_t stream, double seconds) {
    return StreamValues(layer, stream, seconds).values[0];
}

}  // namespace ostrel
