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
        case kStreamPosition:
            return Three(x.position.At(t));
        case kStreamOrientation:
            return Three(x.orientation.At(t));
        case kStreamRotationX:
            return One(x.rotationX.ValueAt(t));
        case kStreamRotationY:
            return One(x.rotationY.ValueAt(t));
        case kStreamRotationZ:
            return One(x.rotationZ.ValueAt(t));
        case kStreamPointOfInterest:
            if (layer.hasPointOfInterest) return Three(layer.pointOfInterest.At(t));
            return std::nullopt;
        default:
            break;
    }
    if (!hasPixelSpace) return std::nullopt;
    switch (stream) {
        case kStreamAnchorPoint:
            return Three(x.anchorPoint.At(t));
        case kStreamScale:
            return Three(x.scale.At(t));
        case kStreamOpacity:
            return One(x.opacity.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> MaterialStream(const Material& m, int32_t stream, double t) {
    switch (stream) {
        case kStreamAcceptsShadows:
            return One(static_cast<double>(m.acceptsShadows));
        case kStreamAcceptsLights:
            return Switch(m.acceptsLights);
        case kStreamAmbient:
            return One(m.ambient.ValueAt(t));
        case kStreamDiffuse:
            return One(m.diffuse.ValueAt(t));
        case kStreamSpecularIntensity:
            return One(m.specularIntensity.ValueAt(t));
        case kStreamShininess:
            return One(m.shininess.ValueAt(t));
        case kStreamCastsShadows:
            return One(static_cast<double>(m.castsShadows));
        case kStreamLightTransmission:
            return One(m.lightTransmission.ValueAt(t));
        case kStreamMetal:
            return One(m.metal.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> CameraStream(const CameraSettings& c, int32_t stream, double t) {
    const DepthOfField& d = c.depthOfField;
    switch (stream) {
        case kStreamZoom:
            return One(c.zoom.ValueAt(t));
        case kStreamDepthOfField:
            return Switch(d.enabled);
        case kStreamFocusDistance:
            return One(d.focusDistance.ValueAt(t));
        case kStreamAperture:
            return One(d.aperture.ValueAt(t));
        case kStreamBlurLevel:
            return One(d.blurLevel.ValueAt(t));
        case kStreamIrisShape:
            return One(d.irisShape);
        case kStreamIrisRotation:
            return One(d.irisRotation.ValueAt(t));
        case kStreamIrisRoundness:
            return One(d.irisRoundness.ValueAt(t));
        case kStreamIrisAspect:
            return One(d.irisAspect.ValueAt(t));
        case kStreamDiffractionFringe:
            return One(d.diffractionFringe.ValueAt(t));
        case kStreamHighlightGain:
            return One(d.highlightGain.ValueAt(t));
        case kStreamHighlightThreshold:
            return One(d.highlightThreshold.ValueAt(t));
        case kStreamHighlightSaturation:
            return One(d.highlightSaturation.ValueAt(t));
        default:
            return std::nullopt;
    }
}

std::optional<StreamVector> LightStream(const LightSettings& l, int32_t stream, double t) {
    switch (stream) {
        case kStreamIntensity:
            return One(l.intensity.ValueAt(t));
        case kStreamColor: {
            Vec<3> rgb = l.color.At(t);
            return StreamVector{{1.0, rgb[0], rgb[1], rgb[2]}, 4};
        }
        case kStreamConeAngle:
            return One(l.coneAngle.ValueAt(t));
        case kStreamConeFeather:
            return One(l.coneFeather.ValueAt(t));
        case kStreamShadowDarkness:
            return One(l.shadowDarkness.ValueAt(t));
        case kStreamShadowDiffusion:
            return One(l.shadowDiffusion.ValueAt(t));
        case kStreamCastsShadows:
            return Switch(l.castsShadows);
        case kStreamFalloff:
            return One(static_cast<double>(l.falloff));
        case kStreamFalloffRadius:
            return One(l.radius.ValueAt(t));
        case kStreamFalloffDistance:
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
